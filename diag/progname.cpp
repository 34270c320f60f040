#include "diag/progname.h"

wchar_t _ProgramName[8] = L"velhlib";
