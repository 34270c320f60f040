// IdentifyOS over an arbitrary release file: GetOS matches the words of its first line; its
// second line is the kernel release that uname reports, which IdentifyOS cuts; and VerCompare
// compares its second and third lines as dotted versions.
#include <sys/stat.h>
#include <sys/utsname.h>

#include <sstream>

#include "fuzz/fuzzsupport.h"
#include "setup/linsetup.h"

static std::string KernelRelease;

// Fills the record the way a kernel would, except that a release too long for its field is
// cut without a terminator.
static int FakeUname(struct utsname* name) {
    *name = {"Linux", "", "", "", "i686"};
    std::strncpy(name->release, KernelRelease.c_str(), sizeof(name->release));
    return 0;
}

static void CheckVersions(const std::string& first, const std::string& second) {
    for (int fields : {3, 16}) {
        const int forward = VerCompare(first.c_str(), second.c_str(), fields);
        const int backward = VerCompare(second.c_str(), first.c_str(), fields);
        Check(forward >= -2 && forward <= 1, "VerCompare answered outside -2..1");
        Check((forward == -2) == (backward == -2) && (forward == -2 || forward == -backward),
              "VerCompare is not antisymmetric");
        const int same = VerCompare(first.c_str(), first.c_str(), fields);
        Check(same == 0 || same == -2, "VerCompare finds a version unequal to itself");
    }
}

void SetUpHarness() {
    SysPaths().Etc = ScratchPath("etc");
    Check(mkdir(SysPaths().Etc.c_str(), 0700) == 0, "cannot make the etc folder");
    SysCalls().Uname = FakeUname;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const InputScope input;
    HwInfoPrintLevel = TRACE_PREREQ_CHECK;
    ResetPreReqState();
    std::istringstream text(std::string(reinterpret_cast<const char*>(data), size));
    std::string lines[3];
    std::getline(std::getline(std::getline(text, lines[0]), lines[1]), lines[2]);
    KernelRelease = lines[1];
    WriteFile(SysPaths().Etc + "/SuSE-release", data, size);
    IdentifyOS();
    Check(!SupportedOsProduct || (Distributor != nullptr && DistVersion != nullptr &&
                                  std::strcmp(Distributor, OsVendors[0]) == 0 &&
                                  std::strcmp(DistVersion, OsProducts[0]) == 0),
          "a matched distribution is not the supported one");
    if (KernVersion != nullptr) {
        Check(std::strchr(KernVersion, '-') == nullptr, "the kernel version still holds a dash");
        VerCompare(KernVersion, "2.4.19", 3);
    }
    CheckVersions(lines[1], lines[2]);
    return 0;
}
