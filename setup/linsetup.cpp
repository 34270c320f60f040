#include "setup/linsetup.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>

#include "adapters/linvpd.h"
#include "adapters/modquery.h"
#include "asl.h"
#include "diag/hwdebug.h"
#include "diag/hwdump.h"
#include "filehandle.h"
#include "runtime/heap.h"
#include "sources/linhw.h"
#include "sources/pcifile.h"
#include "util/enumdir.h"
#include "util/parstool.h"
#include "util/sysaccess.h"

_AgentStats AgentStatistics;

const char OsDistFiles[SUPPORTED_OS_COUNT][OS_TABLE_TEXT] = {"SuSE-release"};
const char OsVendors[SUPPORTED_OS_COUNT][OS_TABLE_TEXT] = {"SuSE"};
const char OsProducts[SUPPORTED_OS_COUNT][OS_TABLE_TEXT] = {"SLES-8"};

OsInformation OsInfo;
const char* KernVersion = nullptr;
const char* Distributor = nullptr;
const char* DistVersion = nullptr;
bool SupportedOsVendor = false;
bool SupportedOsProduct = false;
bool UsingPciFile = false;
bool DriverLoaded = false;
bool DriverVerValid = false;
const char* DriverVersion = nullptr;
bool AslTableAvailable = false;

namespace {

constexpr const char* SLOT_DRIVER_MODULE = "velhpdrv";
constexpr const char* MINIMUM_KERNEL = "2.4.19";
constexpr const char* MINIMUM_DRIVER = "1.0.0";
constexpr int VERSION_FIELDS = 3;
constexpr int MAX_VERSION_FIELDS = 16;

// The OS has not been identified yet.
bool doOneTime = true;
// The driver has handed out its table once.
bool checkedASL = false;

bool Tracing() {
    return (HwInfoPrintLevel & TRACE_PREREQ_CHECK) != 0;
}

void Trace(const char* format) {
    if (Tracing()) {
        dbgprint(format);
    }
}

// One trace line with a narrow text for its "%s"; a missing text shows as empty.
void TraceText(const char* format, const char* text) {
    if (Tracing()) {
        dbgprint(format, MakeWideString(text != nullptr ? text : "", WideBuffer));
    }
}

void TraceIndexed(const char* format, int index, const char* text) {
    if (Tracing()) {
        dbgprint(format, index, MakeWideString(text, WideBuffer));
    }
}

bool Equal(const char* token, const char* expected) {
    return token != nullptr && std::strcmp(token, expected) == 0;
}

template <typename Action>
void ForEachUtsField(struct utsname& uts, Action action) {
    action(uts.sysname, sizeof(uts.sysname));
    action(uts.nodename, sizeof(uts.nodename));
    action(uts.release, sizeof(uts.release));
    action(uts.version, sizeof(uts.version));
    action(uts.machine, sizeof(uts.machine));
    action(uts.domainname, sizeof(uts.domainname));
}

// Reads the first line of the release file found for entry i into info->Line; false when
// there is none or it cannot be read.
bool ReadReleaseLine(int i, OsInformation* info) {
    EnumDir etc;
    _FILE_ATTRIBS attribs;
    if (!etc.Next(SysPaths().Etc.c_str(), OsDistFiles[i], ATTR_FILE, &attribs)) {
        return false;
    }
    TraceText("    GetOS(), opening:  %s\n", attribs.EntryPath);
    UniqueFile stream(std::fopen(attribs.EntryPath, "r"));
    if (!stream) {
        return false;
    }
    // A first line without a line feed is still a line.
    info->Line[0] = '\0';
    return getline(stream.get(), info->Line, OS_LINE_CHARS) || info->Line[0] != '\0';
}

// Matches the release line against entry i; true when vendor and product both match.
bool MatchRelease(int i, OsInformation* info) {
    TraceText("           read line:  >%s<\n", info->Line);
    char* cursor = info->Line;
    char* vendor = GetToken(&cursor);
    char* product = vendor != nullptr ? GetToken(&cursor) : nullptr;
    TraceIndexed("        OsVendors[%d]:  %s\n", i, OsVendors[i]);
    TraceText("              vendor:  %s\n", vendor);
    TraceIndexed("       OsProducts[%d]:  %s\n", i, OsProducts[i]);
    TraceText("             version:  %s\n", product);

    bool matched = false;
    SupportedOsVendor = false;
    if (Equal(vendor, OsVendors[i])) {
        SupportedOsVendor = true;
        SupportedOsProduct = false;
        if (Equal(product, OsProducts[i])) {
            Distributor = vendor;
            DistVersion = product;
            SupportedOsProduct = true;
            matched = true;
            Trace("    Matched vendor and version\n");
        }
    }
    Trace("\n");
    return matched;
}

// Runs the checks in order and gives the first failing code, or 0.
uint32_t PreReqCode() {
    if (!SupportedOsVendor) {
        return PREREQ_OS_VENDOR;
    }
    if (!SupportedOsProduct) {
        return PREREQ_OS_PRODUCT;
    }
    // Without a kernel release there is nothing to compare, which counts as too old.
    if (KernVersion == nullptr || KernVersion[0] == '\0' ||
        VerCompare(KernVersion, MINIMUM_KERNEL, VERSION_FIELDS) < 0) {
        TraceText("Insufficient kernel version:  %s\n", KernVersion);
        return PREREQ_KERNEL_VERSION;
    }
    Trace("\n");
    if (UsingPciFile) {
        return PREREQ_OK;
    }
    if (!DriverLoaded) {
        return PREREQ_NO_DRIVER;
    }
    // A running driver whose version could not be read cannot be compared.
    if (!DriverVerValid || DriverVersion == nullptr ||
        VerCompare(DriverVersion, MINIMUM_DRIVER, VERSION_FIELDS) < 0) {
        return PREREQ_DRIVER_VERSION;
    }
    if (!AslTableAvailable) {
        return PREREQ_NO_ASL_TABLE;
    }
    return PREREQ_OK;
}

// Asks the driver whether it hands out a table, until it has done so once: a read that failed
// (the device busy, no memory) would otherwise count as no table for the library's lifetime.
void CheckAslTable() {
    std::unique_ptr<_ASL_PACKET> scratch(new (std::nothrow) _ASL_PACKET);
    if (!scratch) {
        LastErr(nullptr, "InitCheckPreReqs()", "packet malloc(%d) failed",
                static_cast<int>(sizeof(_ASL_PACKET)));
        return;
    }
    AslTableAvailable = GetAslTable(scratch.get()) != 0;
    checkedASL = AslTableAvailable;
}

// Converts one version field; a missing field counts as 0.
bool FieldNumber(const char* field, uint32_t* value) {
    *value = 0;
    return field == nullptr || ustrl(field, value, 10);
}

}  // namespace

void SetupVelhSlot() {
    AgentStatistics.AgentVersion = AGENT_VERSION;
    CheckPreRequisites(&AgentStatistics.PreReqError);
    if ((HwInfoPrintLevel & TRACE_PREREQ_CHECK) != 0) {
        DumpAgentStats(&AgentStatistics, L"After setup");
    }
}

bool CheckPreRequisites(uint32_t* preReqError) {
    Trace("\n");
    Trace("CheckPreRequisites(),  entry\n");
    Trace("\n");
    InitCheckPreReqs();
    uint32_t code = PreReqCode();
    if (preReqError != nullptr) {
        *preReqError = code;
    }
    return code == PREREQ_OK;
}

void InitCheckPreReqs() {
    DriverVersion = nullptr;
    UsingPciFile = false;
    DriverLoaded = false;
    DriverVerValid = false;

    // Identified once; an identification that found no supported distribution or no kernel
    // release (uname failed, the release file could not be read) is tried again.
    if (doOneTime) {
        IdentifyOS();
        doOneTime = !SupportedOsProduct || KernVersion == nullptr || KernVersion[0] == '\0';
    }
    if (!ValidVPD) {
        GetVPD(&Vpd);
    }
    if (FindPciFile() != nullptr) {
        UsingPciFile = true;
        return;
    }

    UniqueMalloc<module_info> info;
    DriverLoaded = GetModuleInfo(SLOT_DRIVER_MODULE, &info);
    if (!info) {
        return;
    }
    if ((info->flags & MOD_RUNNING) == 0) {
        DriverLoaded = false;
        return;
    }
    const char* version = GetDriverVersion();
    if (version == nullptr) {
        return;
    }
    DriverVerValid = true;
    DriverVersion = version;
    if (!checkedASL) {
        CheckAslTable();
    }
}

int IdentifyOS() {
    struct utsname& uts = OsInfo.Uts;
    ForEachUtsField(uts, [](char* field, size_t) { field[0] = '\0'; });
    OsInfo.Line[0] = '\0';

    GetOS(&OsInfo);

    if (uts.release[0] != '\0') {
        char* dash = std::strchr(uts.release, '-');
        if (dash != nullptr) {
            *dash = '\0';
        }
        KernVersion = uts.release;
    }
    return 1;
}

bool GetOS(OsInformation* info) {
    struct utsname& uts = info->Uts;
    if (SysCalls().Uname(&uts) != 0) {
        LastErr(nullptr, "GetOS()", "uname() failed");
    }
    // Whatever the call left there, every field ends inside its array.
    ForEachUtsField(uts, [](char* field, size_t size) { field[size - 1] = '\0'; });
    Trace("\n");
    for (int i = 0; i < SUPPORTED_OS_COUNT; ++i) {
        if (ReadReleaseLine(i, info) && MatchRelease(i, info)) {
            break;
        }
    }
    return true;
}

char* GetField(char** cursor, char separator) {
    if (cursor == nullptr || *cursor == nullptr || **cursor == '\0') {
        return nullptr;
    }
    char* field = *cursor;
    char* end = field;
    while (*end != '\0' && *end != separator) {
        ++end;
    }
    if (*end != '\0') {
        *end++ = '\0';
        while (*end != '\0' && *end == separator) {
            ++end;
        }
    }
    *cursor = end;
    return field;
}

int VerCompare(const char* version1, const char* version2, int fields) {
    int count = std::clamp(fields, 0, MAX_VERSION_FIELDS);
    UniqueMalloc<char> copy1(HeapStrdup(version1 != nullptr ? version1 : ""));
    if (!copy1) {
        LastErr(nullptr, "VerCompare()", "ver1 malloc() failed");
        return -2;
    }
    UniqueMalloc<char> copy2(HeapStrdup(version2 != nullptr ? version2 : ""));
    if (!copy2) {
        LastErr(nullptr, "VerCompare()", "ver2 malloc() failed");
        return -2;
    }

    uint32_t numbers1[MAX_VERSION_FIELDS];
    uint32_t numbers2[MAX_VERSION_FIELDS];
    char* cursor1 = copy1.get();
    char* cursor2 = copy2.get();
    int seen = 0;
    for (; seen < count; ++seen) {
        char* field1 = GetField(&cursor1, '.');
        char* field2 = GetField(&cursor2, '.');
        if (field1 == nullptr && field2 == nullptr) {
            break;
        }
        bool good1 = FieldNumber(field1, &numbers1[seen]);
        bool good2 = FieldNumber(field2, &numbers2[seen]);
        if (!good1) {
            ErrMsg("VerCompare()", "numeric conversion error:  %s",
                   MakeWideString(version1, WideBuffer));
        }
        if (!good2) {
            ErrMsg("VerCompare()", "numeric conversion error:  %s",
                   MakeWideString(version2, WideBuffer));
        }
        if (!good1 || !good2) {
            return -2;
        }
    }
    for (int i = 0; i < seen; ++i) {
        if (numbers1[i] != numbers2[i]) {
            return numbers1[i] < numbers2[i] ? -1 : 1;
        }
    }
    return 0;
}

void ResetPreReqState() {
    doOneTime = true;
    checkedASL = false;
    KernVersion = nullptr;
    Distributor = nullptr;
    DistVersion = nullptr;
    SupportedOsVendor = false;
    SupportedOsProduct = false;
    UsingPciFile = false;
    DriverLoaded = false;
    DriverVerValid = false;
    DriverVersion = nullptr;
    AslTableAvailable = false;
}
