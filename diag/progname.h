// The program name at the head of dbg, ErrMsg and LastErr lines.
#pragma once

extern wchar_t _ProgramName[8];
