// The debug level: read from the level file at the start of an acquisition, with its help block.
#include "util/debuglevel.h"

#include <cstdio>
#include <cstring>

#include "diag/hwdebug.h"
#include "diag/linport.h"
#include "filehandle.h"
#include "util/instdir.h"
#include "util/parstool.h"

namespace {

constexpr char LEVEL_KEYWORD[] = "hwdbgprint";
constexpr size_t LEVEL_KEYWORD_CHARS = sizeof(LEVEL_KEYWORD) - 1;
// Level file lines are read 1023 bytes at a time.
constexpr int LEVEL_LINE_BYTES = 1024;

struct HelpRow {
    const char* format;
    uint32_t value;
    bool blankLineAfter;
};

const HelpRow HELP_ROWS[] = {
    {"    RAW_ASL                 0x%08x\n", RAW_ASL, false},
    {"    COOKED_ASL              0x%08x\n", COOKED_ASL, false},
    {"    GET_ADAPTER             0x%08x\n", GET_ADAPTER, true},
    {"    TRACE_ACQUIRE           0x%08x\n", TRACE_ACQUIRE, false},
    {"    TRACE_PARSE             0x%08x\n", TRACE_PARSE, false},
    {"    TRACE_STORE_ASL         0x%08x\n", TRACE_STORE_ASL, false},
    {"    TRACE_XREF_ASL          0x%08x\n", TRACE_XREF_ASL, true},
    {"    TRACE_STORE_SYSTEM      0x%08x\n", TRACE_STORE_SYSTEM, false},
    {"    TRACE_STORE_BUS         0x%08x\n", TRACE_STORE_BUS, false},
    {"    TRACE_STORE_SLOT        0x%08x\n", TRACE_STORE_SLOT, false},
    {"    TRACE_STORE_STRING      0x%08x\n", TRACE_STORE_STRING, false},
    {"    TRACE_PREREQ_CHECK      0x%08x\n", TRACE_PREREQ_CHECK, true},
    {"    SHOW_OBJECT_ADDRESS     0x%08x\n", SHOW_OBJECT_ADDRESS, false},
    {"    DUMP_SYSTEMS            0x%08x\n", DUMP_SYSTEMS, false},
    {"    DUMP_BUSSES             0x%08x\n", DUMP_BUSSES, false},
    {"    DUMP_SLOTS              0x%08x\n", DUMP_SLOTS, false},
    {"    DUMP_SLOT_ADAPTERS      0x%08x\n", DUMP_SLOT_ADAPTERS, false},
    {"    DUMP_ONBOARD_ADAPTERS   0x%08x\n", DUMP_ONBOARD_ADAPTERS, false},
    {"    DUMP_ADAPTERS           0x%08x\n", DUMP_ADAPTERS, false},
    {"    DUMP_DELETED_ADAPTERS   0x%08x\n", DUMP_DELETED_ADAPTERS, false},
    {"    DUMP_ADAPTER_CFG_SPACE  0x%08x\n", DUMP_ADAPTER_CFG_SPACE, false},
    {"    DUMP_AGENT_STATS        0x%08x\n", DUMP_AGENT_STATS, true},
    {"    ENTER_EXIT              0x%08x\n", ENTER_EXIT, true},
    {"    DBGPRINT_HELP           0x%08x\n", DBGPRINT_HELP, true},
};

void PrintHelp() {
    dbgprint("\n");
    dbgprint("DebugPrintLevel bits:\n");
    dbgprint("\n");
    for (const HelpRow& row : HELP_ROWS) {
        dbgprint(row.format, row.value);
        if (row.blankLineAfter) {
            dbgprint("\n");
        }
    }
}

// One line of the level file: the keyword (as a prefix, any case) and a value, "0x" and hex
// digits or else a decimal. The scans only tell whether a pattern matches; the value is then
// converted in the 32-bit range of the original target.
void ApplyLevelLine(char* line) {
    char* text = TrimLine(line);
    if (*text == '\0') {
        return;
    }
    _strlwr(text);
    if (std::strncmp(text, LEVEL_KEYWORD, LEVEL_KEYWORD_CHARS) != 0) {
        return;
    }
    const char* value = text + LEVEL_KEYWORD_CHARS;
    while (*value == ' ' || *value == '\t') {
        value++;
    }
    int end = -1;
    int matched = std::sscanf(value, "0x%*x%n", &end);
    if (end >= 0) {
        HwInfoPrintLevel = StrToU32(value + 2, nullptr, 16);
        return;
    }
    // The text ended inside the hex pattern ("0" alone, or nothing): not a mismatch, so the
    // decimal pattern is not tried.
    if (matched == EOF) {
        return;
    }
    std::sscanf(value, "%*d%n", &end);
    if (end >= 0) {
        HwInfoPrintLevel = static_cast<uint32_t>(StrToI32(value, nullptr, 10));
    }
}

}  // namespace

void GetDebugPrintLevel(int showHelp) {
    HwInfoPrintLevel = 0;
    UniqueMalloc<char> path(InstallDirFile(DEBUG_LEVEL_FILE));
    if (path == nullptr) {
        return;
    }
    UniqueFile file(std::fopen(path.get(), "r"));
    path.reset();
    if (file == nullptr) {
        return;
    }
    char line[LEVEL_LINE_BYTES];
    while (getline(file.get(), line, sizeof(line))) {
        ApplyLevelLine(line);
    }
    file.reset();
    if (showHelp != 0 && (HwInfoPrintLevel & DBGPRINT_HELP) != 0) {
        PrintHelp();
    }
}
