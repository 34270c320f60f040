#include "sim/launcher/namespaces.h"

#include <sched.h>
#include <sys/mount.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>

#include "sim/common/textfile.h"
#include "sim/launcher/process.h"

namespace velhsim {

namespace {

bool WriteProcFile(const char* path, const std::string& text, std::string* error) {
    if (!WriteWholeFile(path, text)) {
        *error = std::string("cannot write ") + path + ": " + std::strerror(errno);
        return false;
    }
    return true;
}

// Keeps the caller's own user and group inside the namespace, so that the command runs with the
// rights it would have outside.
bool MapOwnIds(uid_t uid, gid_t gid, std::string* error) {
    return WriteProcFile("/proc/self/setgroups", "deny", error) &&
           WriteProcFile("/proc/self/uid_map",
                         std::to_string(uid) + " " + std::to_string(uid) + " 1", error) &&
           WriteProcFile("/proc/self/gid_map",
                         std::to_string(gid) + " " + std::to_string(gid) + " 1", error);
}

std::string UnshareHint(int error, bool asRoot) {
    switch (error) {
        case EPERM:
            return asRoot ? "the process lacks CAP_SYS_ADMIN (an unprivileged container?)"
                          : "user namespaces are not allowed for unprivileged users here "
                            "(kernel.unprivileged_userns_clone, user.max_user_namespaces, or a "
                            "container's seccomp filter)";
        case ENOSPC:
            return "a namespace limit has been reached (user.max_user_namespaces or "
                   "user.max_mnt_namespaces)";
        case EINVAL:
            return "the kernel does not offer user or mount namespaces";
        case ENOMEM:
            return "out of memory";
        default:
            return "";
    }
}

}  // namespace

bool EnterPrivateNamespaces(std::string* error) {
    const uid_t uid = geteuid();
    const gid_t gid = getegid();
    const bool asRoot = uid == 0;
    int result = asRoot ? unshare(CLONE_NEWNS) : -1;
    // Root in a container may be refused a mount namespace yet be given a user namespace.
    bool userNamespace = !asRoot || (result != 0 && errno == EPERM);
    if (userNamespace) {
        result = unshare(CLONE_NEWUSER | CLONE_NEWNS);
    }
    if (result != 0) {
        const int code = errno;
        const std::string hint = UnshareHint(code, asRoot);
        *error = std::string("cannot create a private mount namespace") +
                 (userNamespace ? " in a user namespace" : "") + ": " + std::strerror(code) +
                 (hint.empty() ? "" : " (" + hint + ")");
        return false;
    }
    if (userNamespace && !MapOwnIds(uid, gid, error)) {
        return false;
    }
    if (mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
        *error = std::string("cannot make the mounts private: ") + std::strerror(errno);
        return false;
    }
    return true;
}

pid_t ForkIntoProcessNamespace() {
    // clone without a new stack continues the child on a copy of the caller's, as fork does.
    return static_cast<pid_t>(syscall(SYS_clone, CLONE_NEWPID | CLONE_NEWNS | SIGCHLD, nullptr,
                                      nullptr, nullptr, nullptr));
}

bool CanHaveProcessNamespace(std::string* reason) {
    // The probe, the first process of a new namespace, mounts a /proc of its own in a mount
    // namespace that dies with it, and ends with 0 or the error number that stopped it.
    const pid_t probe = ForkIntoProcessNamespace();
    if (probe == 0) {
        _exit(mount("proc", "/proc", "proc", MS_NOSUID | MS_NODEV | MS_NOEXEC, nullptr) == 0
                  ? 0
                  : errno);
    }
    const int code = probe < 0 ? errno : WaitForStatus(probe);
    if (code != 0) {
        *reason = std::strerror(code);
    }
    return code == 0;
}

}  // namespace velhsim
