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

// Copies the tree entry by entry, so that a failure names the entry: an unreadable file, a
// special file (a pipe, a device), a full disk.
bool CopyTree(const fs::path& from, const fs::path& to, std::string* error) {
    std::error_code code;
    fs::recursive_directory_iterator entries(from, code);
    for (const fs::recursive_directory_iterator end; !code && entries != end;
         entries.increment(code)) {
        const fs::path& source = entries->path();
        const fs::path target = to / source.lexically_relative(from);
        const fs::file_status status = entries->symlink_status(code);
        if (code) {
            break;
        }
        if (fs::is_symlink(status)) {
            fs::copy_symlink(source, target, code);
        } else if (fs::is_directory(status)) {
            fs::create_directory(target, source, code);
        } else if (fs::is_regular_file(status)) {
            fs::copy_file(source, target, code);
        } else {
            code = std::make_error_code(std::errc::not_supported);
        }
        if (code) {
            *error = "cannot copy " + source.string() + " to " + target.string() + ": " +
                     (code == std::errc::not_supported
                          ? std::string("not a file, folder or symbolic link")
                          : code.message());
            return false;
        }
    }
    if (code) {
        *error = "cannot copy " + from.string() + " to " + to.string() + ": " + code.message();
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

namespace {

std::string TemporaryFolder() {
    const char* base = std::getenv("TMPDIR");
    return base != nullptr && *base == '/' ? base : "/tmp";
}

}  // namespace

std::string MakeTemporaryRunFolder(std::string* error) {
    std::string pattern = JoinPath(TemporaryFolder(), RUN_FOLDER_PREFIX + std::string("XXXXXX"));
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
    if (!CopyTree(machine, run, error)) {
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

namespace {

// The working folders of the processes that this user can see: a run still going has its
// command in RUN/install.
std::vector<fs::path> WorkingFolders() {
    std::vector<fs::path> folders;
    std::error_code code;
    for (fs::directory_iterator entries("/proc", code), end; !code && entries != end;
         entries.increment(code)) {
        std::error_code unreadable;
        const fs::path folder = fs::read_symlink(entries->path() / "cwd", unreadable);
        if (!unreadable) {
            folders.push_back(folder);
        }
    }
    return folders;
}

}  // namespace

std::vector<std::string> RemoveRunFolders(std::string* error) {
    std::vector<std::string> removed;
    const std::vector<fs::path> busy = WorkingFolders();
    std::error_code code;
    const std::string base = TemporaryFolder();
    for (fs::directory_iterator entries(base, code), end; !code && entries != end;
         entries.increment(code)) {
        const fs::path& path = entries->path();
        struct stat info {};
        // Only the folders of this user that velhsim made: its name pattern, no symbolic link.
        if (path.filename().string().rfind(RUN_FOLDER_PREFIX, 0) != 0 ||
            lstat(path.c_str(), &info) != 0 || !S_ISDIR(info.st_mode) || info.st_uid != getuid()) {
            continue;
        }
        bool inUse = false;
        for (const fs::path& folder : busy) {
            inUse = inUse || IsInside(folder, path);
        }
        if (inUse) {
            continue;
        }
        // A run may leave folders without write permission, which would keep their files.
        std::error_code ignored;
        for (fs::recursive_directory_iterator inner(path, ignored), last; !ignored && inner != last;
             inner.increment(ignored)) {
            if (inner->is_directory(ignored) && !inner->is_symlink(ignored)) {
                fs::permissions(inner->path(), fs::perms::owner_all, fs::perm_options::add,
                                ignored);
            }
        }
        std::error_code failed;
        fs::remove_all(path, failed);
        if (failed) {
            *error = "cannot remove " + path.string() + ": " + failed.message();
            return removed;
        }
        removed.push_back(path.string());
    }
    if (code) {
        *error = base + ": " + code.message();
    }
    return removed;
}

}  // namespace velhsim
