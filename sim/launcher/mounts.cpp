#include "sim/launcher/mounts.h"

#include <dirent.h>
#include <fcntl.h>
#include <limits.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <memory>
#include <system_error>
#include <utility>
#include <vector>

#include "filehandle.h"
#include "sim/common/textfile.h"

namespace velhsim {

namespace {

struct Entry {
    std::string Name;
    mode_t Type;
};

bool Failed(std::string* error, const std::string& what) {
    *error = what + ": " + std::strerror(errno);
    return false;
}

std::vector<Entry> ListEntries(const std::string& dir) {
    std::vector<Entry> entries;
    std::unique_ptr<DIR, int (*)(DIR*)> listing(opendir(dir.c_str()), closedir);
    if (!listing) {
        return entries;
    }
    while (const dirent* entry = readdir(listing.get())) {
        const std::string name = entry->d_name;
        struct stat info {};
        if (name != "." && name != ".." && lstat(JoinPath(dir, name).c_str(), &info) == 0) {
            entries.push_back({name, static_cast<mode_t>(info.st_mode & S_IFMT)});
        }
    }
    std::sort(entries.begin(), entries.end(),
              [](const Entry& a, const Entry& b) { return a.Name < b.Name; });
    return entries;
}

// The path through which a descriptor's file stays reachable after something is mounted over it.
std::string DescriptorPath(int fd, const std::string& name = "") {
    std::string path = "/proc/self/fd/" + std::to_string(fd);
    return name.empty() ? path : JoinPath(path, name);
}

// An empty file or folder to mount on.
bool MakeMountPoint(const std::string& path, bool directory, std::string* error) {
    if (directory ? mkdir(path.c_str(), 0755) == 0 || errno == EEXIST
                  : UniqueFd(open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0644)).Get() >= 0) {
        return true;
    }
    return Failed(error, "cannot make the mount point " + path);
}

bool Bind(const std::string& source, const std::string& target, std::string* error) {
    if (mount(source.c_str(), target.c_str(), nullptr, MS_BIND | MS_REC, nullptr) != 0) {
        return Failed(error, "cannot bind " + source + " onto " + target);
    }
    return true;
}

// Makes `path` a symbolic link like `name` in the folder `dir`.
bool CopyLink(int dir, const std::string& name, const std::string& path) {
    char link[PATH_MAX];
    const ssize_t length = readlinkat(dir, name.c_str(), link, sizeof link - 1);
    if (length < 0) {
        return false;
    }
    link[length] = '\0';
    return symlink(link, path.c_str()) == 0;
}

// Puts a tmpfs over `target` that shows its former entries (bound back, symbolic links copied)
// except those that `additions` replaces, plus the additions from `source`.
bool RebuildFolder(const std::string& target, const std::string& source,
                   const std::vector<Entry>& additions, std::string* error) {
    const UniqueFd original(open(target.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!original) {
        return Failed(error, "cannot open " + target);
    }
    const std::vector<Entry> entries = ListEntries(target);
    if (mount("tmpfs", target.c_str(), "tmpfs", MS_NOSUID, "mode=0755") != 0) {
        return Failed(error, "cannot mount a tmpfs on " + target);
    }
    for (const Entry& entry : entries) {
        const bool replaced =
            std::any_of(additions.begin(), additions.end(),
                        [&](const Entry& addition) { return addition.Name == entry.Name; });
        if (replaced) {
            continue;
        }
        const std::string path = JoinPath(target, entry.Name);
        std::string problem;
        if (entry.Type == S_IFLNK) {
            if (!CopyLink(original.Get(), entry.Name, path)) {
                std::fprintf(stderr, "velhsim: warning: %s not shown: %s\n", path.c_str(),
                             std::strerror(errno));
            }
        } else if (!MakeMountPoint(path, entry.Type == S_IFDIR, &problem) ||
                   !Bind(DescriptorPath(original.Get(), entry.Name), path, &problem)) {
            std::fprintf(stderr, "velhsim: warning: %s not shown: %s\n", path.c_str(),
                         problem.c_str());
        }
    }
    for (const Entry& addition : additions) {
        const std::string path = JoinPath(target, addition.Name);
        if (!MakeMountPoint(path, addition.Type == S_IFDIR, error) ||
            !Bind(JoinPath(source, addition.Name), path, error)) {
            return false;
        }
    }
    return true;
}

// Shows every entry of `source` at the same name in `target`: bound over the existing entry, or,
// when one of them has no place there, by rebuilding `target`.
bool LayOverEntries(const std::string& source, const std::string& target, std::string* error) {
    const std::vector<Entry> additions = ListEntries(source);
    if (additions.empty()) {
        return true;
    }
    if (!IsDirectory(target)) {
        *error = "the machine's " + source + " has no place to go: " + target + " is missing";
        return false;
    }
    const bool allInPlace = std::all_of(additions.begin(), additions.end(), [&](const Entry& e) {
        struct stat info {};
        return stat(JoinPath(target, e.Name).c_str(), &info) == 0 &&
               S_ISDIR(info.st_mode) == (e.Type == S_IFDIR) && e.Type != S_IFLNK;
    });
    if (!allInPlace) {
        return RebuildFolder(target, source, additions, error);
    }
    for (const Entry& addition : additions) {
        if (!Bind(JoinPath(source, addition.Name), JoinPath(target, addition.Name), error)) {
            return false;
        }
    }
    return true;
}

// /proc/self/mountinfo escapes blanks and backslashes as three octal digits.
std::string UnescapeMountPath(std::string_view text) {
    std::string path;
    for (size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '\\' && i + 3 < text.size() &&
            text.substr(i + 1, 3).find_first_not_of("01234567") == std::string_view::npos) {
            path += static_cast<char>((text[i + 1] - '0') * 64 + (text[i + 2] - '0') * 8 +
                                      (text[i + 3] - '0'));
            i += 3;
        } else {
            path += text[i];
        }
    }
    return path;
}

bool IsBelow(const std::string& path, const std::string& dir) {
    return path.size() > dir.size() && path.compare(0, dir.size(), dir) == 0 &&
           path[dir.size()] == '/';
}

// The mounts below `dir`, leaving out those inside others, which come along when those are bound.
std::vector<std::string> MountsBelow(const std::string& dir) {
    std::vector<std::string> mounts;
    const std::optional<std::string> table = ReadWholeFile("/proc/self/mountinfo");
    if (table) {
        for (std::string_view line : SplitLines(*table)) {
            const std::vector<std::string> fields = SplitWords(line);
            if (fields.size() > 4 && IsBelow(UnescapeMountPath(fields[4]), dir)) {
                mounts.push_back(UnescapeMountPath(fields[4]));
            }
        }
    }
    std::sort(mounts.begin(), mounts.end());
    mounts.erase(std::unique(mounts.begin(), mounts.end()), mounts.end());
    std::vector<std::string> outermost;
    for (const std::string& path : mounts) {
        if (std::none_of(outermost.begin(), outermost.end(),
                         [&](const std::string& outer) { return IsBelow(path, outer); })) {
            outermost.push_back(path);
        }
    }
    return outermost;
}

// Lays the files of `source` over `target` with a read-only overlay whose lower layers are the
// machine's folder and the real one; mounts inside the real folder are bound back on top.
bool Overlay(const std::string& source, const std::string& target, std::string* error) {
    if (!IsDirectory(source)) {
        return true;
    }
    if (!IsDirectory(target)) {
        *error = "the machine's " + source + " has no place to go: " + target + " is missing";
        return false;
    }
    std::vector<std::pair<std::string, UniqueFd>> inner;
    for (const std::string& path : MountsBelow(target)) {
        UniqueFd fd(open(path.c_str(), O_PATH | O_CLOEXEC));
        if (fd) {
            inner.emplace_back(path, std::move(fd));
        }
    }
    const std::string options = "lowerdir=" + source + ":" + target;
    if (mount("overlay", target.c_str(), "overlay", MS_RDONLY, options.c_str()) != 0) {
        return Failed(error, "cannot lay " + source + " over " + target +
                                 " (overlayfs in a user namespace needs Linux 5.11)");
    }
    for (const auto& [path, fd] : inner) {
        std::string problem;
        if (!Bind(DescriptorPath(fd.Get()), path, &problem)) {
            std::fprintf(stderr, "velhsim: warning: %s\n", problem.c_str());
        }
    }
    return true;
}

// The folders whose files every program of a machine shares; each run gets its own.
const char* const TEMPORARY_FOLDERS[] = {"/tmp", "/var/tmp"};

bool InTemporaryFolder(const std::string& path) {
    return std::any_of(std::begin(TEMPORARY_FOLDERS), std::end(TEMPORARY_FOLDERS),
                       [&](const char* dir) { return IsBelow(path, dir); });
}

// Binds RUN/tmp and RUN/var/tmp over /tmp and /var/tmp, so that runs side by side share no
// temporary file (a JVM's perf data file is named after its process number, the same in every
// run). The folders of `reachable` that lay in them are bound back at their paths.
bool PrivateTemporaryFolders(const std::string& run, const std::vector<std::string>& reachable,
                             std::string* error) {
    std::vector<std::string> paths;
    for (const std::string& path : reachable) {
        // A file is shown with its folder; a link with the folder that holds it as well as with
        // the folder of what it points to.
        std::vector<std::filesystem::path> shown{path};
        if (!IsDirectory(path)) {
            shown = {std::filesystem::path(path).parent_path(), path};
        }
        for (const std::filesystem::path& candidate : shown) {
            std::error_code code;
            std::filesystem::path real = std::filesystem::weakly_canonical(candidate, code);
            if (!code && !IsDirectory(real.string())) {
                real = real.parent_path();
            }
            if (!code && InTemporaryFolder(real.string())) {
                paths.push_back(real.string());
            }
        }
    }
    // Shortest first, and none inside another: binding the outer brings the inner along.
    std::sort(paths.begin(), paths.end());
    std::vector<std::pair<std::string, UniqueFd>> kept;
    for (const std::string& path : paths) {
        if (std::none_of(kept.begin(), kept.end(), [&](const auto& outer) {
                return path == outer.first || IsBelow(path, outer.first);
            })) {
            UniqueFd fd(open(path.c_str(), O_PATH | O_CLOEXEC));
            if (!fd) {
                return Failed(error, "cannot open " + path);
            }
            kept.emplace_back(path, std::move(fd));
        }
    }
    // The run's own folders are opened first: the run itself may lie in /tmp.
    std::vector<std::pair<const char*, UniqueFd>> own;
    for (const char* dir : TEMPORARY_FOLDERS) {
        const std::string path = JoinPath(run, dir + 1);
        std::error_code code;
        std::filesystem::create_directories(path, code);
        UniqueFd fd(open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
        if (code || chmod(path.c_str(), 01777) != 0 || !fd) {
            return Failed(error, "cannot make " + path);
        }
        own.emplace_back(dir, std::move(fd));
    }
    for (const auto& [dir, fd] : own) {
        if (IsDirectory(dir) && !Bind(DescriptorPath(fd.Get()), dir, error)) {
            return false;
        }
    }
    for (const auto& [path, fd] : kept) {
        std::error_code code;
        std::filesystem::create_directories(path, code);
        if (code || !Bind(DescriptorPath(fd.Get()), path, error)) {
            return Failed(error, "cannot show " + path + " in the run's temporary folder");
        }
    }
    return true;
}

}  // namespace

bool ShowMachine(const std::string& run, const std::vector<std::string>& reachable, bool ownProc,
                 std::string* error) {
    if (ownProc && mount("proc", "/proc", "proc", MS_NOSUID | MS_NODEV | MS_NOEXEC, nullptr) != 0) {
        return Failed(error, "cannot mount /proc");
    }
    return LayOverEntries(JoinPath(run, "proc/bus"), "/proc/bus", error) &&
           Overlay(JoinPath(run, "etc"), "/etc", error) &&
           Overlay(JoinPath(run, "usr/share"), "/usr/share", error) &&
           LayOverEntries(JoinPath(run, "dev"), "/dev", error) &&
           PrivateTemporaryFolders(run, reachable, error);
}

}  // namespace velhsim
