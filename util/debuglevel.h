// The debug level file of the install directory, read into HwInfoPrintLevel.
#pragma once

constexpr const char* DEBUG_LEVEL_FILE = "dbgprint";

// Reads the level from the file (0 when it is missing or names none); with showHelp and the help
// bit set, lists the level bits in the log.
void GetDebugPrintLevel(int showHelp);
