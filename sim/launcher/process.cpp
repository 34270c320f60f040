#include "sim/launcher/process.h"

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>

namespace velhsim {

namespace {

volatile sig_atomic_t ForwardTo = 0;

constexpr int FORWARDED_SIGNALS[] = {SIGTERM, SIGHUP, SIGINT, SIGQUIT};

// Signals from the terminal reach the whole process group, the command included, by themselves;
// only those sent to this process alone are passed on.
void ForwardSignal(int signal, siginfo_t* info, void*) {
    if (ForwardTo > 0 && info->si_code != SI_KERNEL) {
        kill(static_cast<pid_t>(ForwardTo), signal);
    }
}

void ForwardSignalsTo(pid_t child) {
    ForwardTo = child;
    struct sigaction action {};
    action.sa_sigaction = ForwardSignal;
    action.sa_flags = SA_SIGINFO | SA_RESTART;
    sigemptyset(&action.sa_mask);
    for (int signal : FORWARDED_SIGNALS) {
        sigaction(signal, &action, nullptr);
    }
}

int ShellStatus(int status) {
    if (WIFEXITED(status)) {
        return WEXITSTATUS(status);
    }
    return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : 125;
}

}  // namespace

int WaitForStatus(pid_t child) {
    int status = 0;
    while (waitpid(child, &status, 0) < 0) {
        if (errno != EINTR) {
            return 125;
        }
    }
    return ShellStatus(status);
}

void ExecCommand(const std::vector<std::string>& command) {
    std::vector<char*> argv;
    argv.reserve(command.size() + 1);
    for (const std::string& argument : command) {
        argv.push_back(const_cast<char*>(argument.c_str()));
    }
    argv.push_back(nullptr);
    execvp(argv[0], argv.data());
    const int error = errno;
    std::fprintf(stderr, "velhsim: cannot run %s: %s\n", argv[0], std::strerror(error));
    _exit(error == ENOENT ? 127 : 126);
}

int RunProgram(const std::vector<std::string>& command, const std::string& dir) {
    const pid_t child = fork();
    if (child == 0) {
        if (chdir(dir.c_str()) != 0) {
            std::fprintf(stderr, "velhsim: cannot enter %s: %s\n", dir.c_str(),
                         std::strerror(errno));
            _exit(125);
        }
        ExecCommand(command);
    }
    return child < 0 ? 125 : WaitForStatus(child);
}

int SuperviseNamespace(pid_t first) {
    ForwardSignalsTo(first);
    return WaitForStatus(first);
}

int RunAsFirstProcess(const std::vector<std::string>& command) {
    // Should the launcher be killed, the whole namespace goes with it.
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    const pid_t child = fork();
    if (child < 0) {
        std::fprintf(stderr, "velhsim: cannot start the command: %s\n", std::strerror(errno));
        return 125;
    }
    if (child == 0) {
        ExecCommand(command);
    }
    ForwardSignalsTo(child);
    for (;;) {
        int status = 0;
        const pid_t ended = wait(&status);
        if (ended == child) {
            return ShellStatus(status);
        }
        if (ended < 0 && errno != EINTR) {
            return 125;
        }
    }
}

}  // namespace velhsim
