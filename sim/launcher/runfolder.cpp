#include "sim/launcher/runfolder.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>
#include <vector>

#include "sim/common/textfile.h"
#include "sim/launcher/process.h"
#include "sim/machine/firmware.h"
#include "sim/machine/pcitree.h"

namespace velhsim {

namespace fs = std::filesystem;

namespace {

bool IsInside(const fs::path& path, const fs::path& dir) {
    const std::string inner = path.string();
    const std::string outer = dir.string();
    return inner == outer ||
           (inner.size() > outer.size() && inner.compare(0, outer.size(), outer) == 0 &&
            inner[outer.size()] == '/');
}

bool Exists(const std::string& path) {
    struct stat info {};
    return lstat(path.c_str(), &info) == 0;
}

bool MakeFolder(const std::string& path, std::string* error) {
    std::error_code code;
    fs::create_directories(path, code);
    if (code) {
        *error = path + ": " + code.message();
        return false;
    }
    return true;
}

// The table from its text form, through the library's own reader in the pci2asl tool.
bool CompileTable(const std::string& run, const std::string& toolDir, std::string* error) {
    const std::string source = JoinPath(run, "driver/asl.pci");
    const std::string table = JoinPath(run, "driver/asl.bin");
    const std::string tool = JoinPath(toolDir, "pci2asl");
    if (access(tool.c_str(), X_OK) != 0) {
        *error = source + " needs the table compiler " + tool + ", which is not built";
        return false;
    }
    const int status = RunProgram({tool, source, table}, run);
    if (status != 0 || !IsRegularFile(table)) {
        *error = "pci2asl could not compile " + source + " (status " + std::to_string(status) + ")";
        return false;
    }
    return true;
}

}  // namespace

bool CheckRunFolder(const std::string& machine, const std::string& run, std::string* error) {
    if (run.find_first_of(",:\\") != std::string::npos) {
        *error = "the run folder's path must not hold ',', ':' or '\\': " + run;
        return false;
    }
    std::error_code code;
    const fs::path machinePath = fs::weakly_canonical(machine, code);
    const fs::path runPath = fs::weakly_canonical(run, code);
    if (IsInside(runPath, machinePath)) {
        *error = "the run folder " + run + " lies inside the machine folder " + machine;
        return false;
    }
    if (Exists(run) && (!IsDirectory(run) || !fs::is_empty(run, code))) {
        *error = "the run folder " + run + " is not a new or empty folder";
        return false;
    }
    return true;
}

std::string MakeTemporaryRunFolder(std::string* error) {
    const char* base = std::getenv("TMPDIR");
    std::string pattern =
        JoinPath(base != nullptr && *base == '/' ? base : "/tmp", "velhsim.XXXXXX");
    if (mkdtemp(pattern.data()) == nullptr) {
        *error = pattern + ": " + std::strerror(errno);
        return {};
    }
    return pattern;
}

bool PrepareRunFolder(const std::string& machine, const std::string& run,
                      const std::string& toolDir, std::string* error) {
    if (!MakeFolder(run, error)) {
        return false;
    }
    std::error_code code;
    fs::copy(machine, run, fs::copy_options::recursive | fs::copy_options::copy_symlinks, code);
    if (code) {
        *error = "cannot copy " + machine + " to " + run + ": " + code.message();
        return false;
    }
    if (Exists(JoinPath(run, "firmware")) && !Exists(JoinPath(run, "dev/mem")) &&
        !(MakeFolder(JoinPath(run, "dev"), error) &&
          BuildMemoryImage(JoinPath(run, "firmware"), JoinPath(run, "dev/mem"), error))) {
        return false;
    }
    if (Exists(JoinPath(run, "lspci.txt")) && !Exists(JoinPath(run, "proc/bus/pci")) &&
        !BuildPciTree(JoinPath(run, "lspci.txt"), JoinPath(run, "proc/bus/pci"), error)) {
        return false;
    }
    if (Exists(JoinPath(run, "driver/asl.pci")) && !Exists(JoinPath(run, "driver/asl.bin")) &&
        !CompileTable(run, toolDir, error)) {
        return false;
    }
    return MakeFolder(JoinPath(run, "install"), error) && MakeFolder(JoinPath(run, "log"), error);
}

}  // namespace velhsim
