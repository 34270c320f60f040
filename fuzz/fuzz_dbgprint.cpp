// The debug level file: GetDebugPrintLevel reads "dbgprint" from the install directory (the
// working directory) and prints the help block when the level asks for it.
//
// Input: the file's content.
#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstring>
#include <string>

#include "dbglevel.h"
#include "diag/hwdebug.h"
#include "fuzz/fuzzsupport.h"
#include "util/debuglevel.h"

namespace {

bool MentionsKeyword(const uint8_t* data, size_t size) {
    std::string text(reinterpret_cast<const char*>(data), size);
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return text.find("hwdbgprint") != std::string::npos;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    StartInput();
    WriteFile(DEBUG_LEVEL_FILE, data, size);
    HwInfoPrintLevel = 0xA5A5A5A5u;
    GetDebugPrintLevel(1);
    // Only a keyword line sets the level; the reader starts from 0.
    if (!MentionsKeyword(data, size) && HwInfoPrintLevel != 0) {
        Violated("a level file without the keyword set a level");
    }
    return 0;
}
