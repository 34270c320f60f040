// The distribution's release file and version comparison: GetOS reads the release file's
// first line and matches its words, IdentifyOS cuts the kernel release, and VerCompare
// compares dotted versions.
//
// Input: the release file. Its second line is also the kernel release that uname reports, and
// its second and third lines are compared with each other as versions.
#include <sys/stat.h>
#include <sys/utsname.h>

#include <cstdint>
#include <cstring>
#include <string>

#include "dbglevel.h"
#include "fuzz/fuzzsupport.h"
#include "setup/linsetup.h"
#include "util/sysaccess.h"

namespace {

std::string KernelRelease;

// Fills the record the way a kernel would, except that a release too long for its field is
// cut without a terminator.
int FakeUname(struct utsname* name) {
    std::memset(name, 0, sizeof(*name));
    std::strcpy(name->sysname, "Linux");
    std::strcpy(name->machine, "i686");
    std::strncpy(name->release, KernelRelease.c_str(), sizeof(name->release));
    return 0;
}

std::string Line(const std::string& text, int index) {
    size_t start = 0;
    for (int i = 0; i < index; i++) {
        start = text.find('\n', start);
        if (start == std::string::npos) {
            return std::string();
        }
        start++;
    }
    size_t end = text.find('\n', start);
    return text.substr(start, end == std::string::npos ? std::string::npos : end - start);
}

void CheckVersions(const std::string& first, const std::string& second) {
    for (int fields : {3, 16}) {
        const int forward = VerCompare(first.c_str(), second.c_str(), fields);
        const int backward = VerCompare(second.c_str(), first.c_str(), fields);
        if (forward < -2 || forward > 1) {
            Violated("VerCompare answered outside -2..1");
        }
        if ((forward == -2) != (backward == -2) || (forward != -2 && forward != -backward)) {
            Violated("VerCompare is not antisymmetric");
        }
        const int same = VerCompare(first.c_str(), first.c_str(), fields);
        if (same != 0 && same != -2) {
            Violated("VerCompare finds a version unequal to itself");
        }
    }
}

}  // namespace

void SetUpHarness() {
    SysPaths().Etc = ScratchPath("etc");
    if (mkdir(SysPaths().Etc.c_str(), 0700) != 0) {
        Violated("cannot make the etc folder");
    }
    SysCalls().Uname = FakeUname;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    StartInput();
    HwInfoPrintLevel = TRACE_PREREQ_CHECK;
    ResetPreReqState();
    const std::string text(reinterpret_cast<const char*>(data), size);
    KernelRelease = Line(text, 1);
    WriteFile(SysPaths().Etc + "/SuSE-release", data, size);

    IdentifyOS();
    if (SupportedOsProduct && (Distributor == nullptr || DistVersion == nullptr ||
                               std::strcmp(Distributor, OsVendors[0]) != 0 ||
                               std::strcmp(DistVersion, OsProducts[0]) != 0)) {
        Violated("a matched distribution is not the supported one");
    }
    if (KernVersion != nullptr) {
        if (std::strchr(KernVersion, '-') != nullptr) {
            Violated("the kernel version still holds a dash");
        }
        VerCompare(KernVersion, "2.4.19", 3);
    }
    CheckVersions(Line(text, 1), Line(text, 2));
    return 0;
}
