// GetDebugPrintLevel over an arbitrary "dbgprint" in the install directory (the working
// directory), with the help block it prints when the level asks for it.
#include <cctype>

#include "fuzz/fuzzsupport.h"
#include "util/debuglevel.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const InputScope input;
    WriteFile(DEBUG_LEVEL_FILE, data, size);
    HwInfoPrintLevel = 0xA5A5A5A5u;
    GetDebugPrintLevel(1);
    // Only a keyword line sets the level; the reader starts from 0.
    std::string text(size, '\0');
    std::transform(data, data + size, text.begin(), [](uint8_t c) { return std::tolower(c); });
    Check(HwInfoPrintLevel == 0 || text.find("hwdbgprint") != std::string::npos,
          "a level file without the keyword set a level");
    return 0;
}
