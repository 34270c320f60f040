#include "agent/launch.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "filehandle.h"

namespace {

// Exit status of the intermediate child when it could not create the program's process.
constexpr int NO_PROCESS = 1;

}  // namespace

bool LaunchDetached(const char* program, const char* argument) {
    // Everything the children need is prepared here: after fork only async-signal-safe calls
    // are allowed, since the JVM's other threads (and their locks) did not come along.
    sigset_t unblocked;
    sigemptyset(&unblocked);
    // The grandchild's exec closes the write end (close-on-exec); a failed exec writes a byte.
    // Waiting for either means that the program runs once the launch returns, so a killall
    // straight after it finds the monitor, and that an exec failure is known.
    int report[2];
    if (pipe(report) != 0) {
        return false;
    }
    const UniqueFd reader(report[0]);
    UniqueFd writer(report[1]);
    fcntl(report[0], F_SETFD, FD_CLOEXEC);
    fcntl(report[1], F_SETFD, FD_CLOEXEC);

    // The program runs as a grandchild whose parent exits at once, so the program is adopted
    // and reaped by init; the only child of ours is waited for right away and that wait is
    // short. No SIGCHLD handler of the JVM is touched.
    pid_t child = fork();
    if (child < 0) {
        return false;
    }
    if (child == 0) {
        // The child has only this thread, and the C library made its own locks usable in it, so
        // a plain fork is safe here (and the oldest target's C library has no other).
        pid_t grandchild = fork();
        if (grandchild < 0) {
            _exit(NO_PROCESS);
        }
        if (grandchild > 0) {
            _exit(0);
        }
        // The calling Java thread may block signals that the program must receive
        // (killall's SIGTERM); a blocked mask would survive the exec.
        sigprocmask(SIG_SETMASK, &unblocked, nullptr);
        execlp(program, program, argument, static_cast<char*>(nullptr));
        const char failed = 1;
        ssize_t ignored = write(report[1], &failed, 1);
        static_cast<void>(ignored);
        _exit(0);
    }
    writer.Reset();

    int status = 0;
    while (waitpid(child, &status, 0) < 0) {
        // Reaped elsewhere (SIGCHLD ignored): only the report tells.
        if (errno != EINTR) {
            break;
        }
    }
    if (WIFEXITED(status) && WEXITSTATUS(status) == NO_PROCESS) {
        return false;
    }
    char failed = 0;
    ssize_t got = 0;
    while ((got = read(reader.Get(), &failed, 1)) < 0 && errno == EINTR) {
    }
    return got == 0;
}
