// velhsim: runs a command against a described machine.
//
//   velhsim [--i386] --machine DIR [--run-dir RUN] -- COMMAND [ARG...]
//   velhsim --clean | --help
//
// The machine folder is copied into the run folder, and the command runs there, in RUN/install,
// in private namespaces in which the run folder's machine replaces the real one. Its status is
// velhsim's; velhsim's own failures end with 125.
#include <limits.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "sim/common/textfile.h"
#include "sim/launcher/argpaths.h"
#include "sim/launcher/mounts.h"
#include "sim/launcher/namespaces.h"
#include "sim/launcher/process.h"
#include "sim/launcher/runfolder.h"

namespace {

using namespace velhsim;

constexpr int LAUNCHER_FAILED = 125;
constexpr const char* PRELOAD_LIBRARY = "libvelhsim-preload.so";
// A 32-bit command runs under qemu's user-mode emulator, and the programs it starts may be 64-bit
// (slotwatch, killall, a shell). The dynamic loader expands $LIB to the library folder of its own
// architecture (Debian's multiarch names), so one LD_PRELOAD entry gives each process the
// emulation built for it; the build lays out both architectures' copies in these folders.
constexpr const char* PRELOAD_BY_ARCHITECTURE = "$LIB/libvelhsim-preload.so";
constexpr const char* I386_PRELOAD = "lib/i386-linux-gnu/libvelhsim-preload.so";
constexpr const char* I386_EMULATOR = "qemu-i386";

const char* const USAGE =
    "usage: velhsim [--i386] --machine DIR [--run-dir RUN] -- COMMAND [ARG...]\n"
    "       velhsim --clean | --help\n"
    "Copies the machine folder DIR into the run folder RUN (a new temporary folder when not\n"
    "given) and runs COMMAND in RUN/install against that machine; with --i386, a 32-bit\n"
    "COMMAND under qemu-i386. --clean removes the temporary run folders (velhsim.*) that\n"
    "earlier runs left in $TMPDIR or /tmp.\n";

struct Options {
    std::string Machine;
    std::string RunDir;
    bool I386 = false;
    bool Help = false;
    bool Clean = false;
    std::vector<std::string> Command;
};

int Fail(const std::string& message) {
    std::fprintf(stderr, "velhsim: %s\n", message.c_str());
    return LAUNCHER_FAILED;
}

// Takes "--name VALUE" or "--name=VALUE".
bool TakeValue(const std::string& name, int argc, char** argv, int* i, std::string* value) {
    const std::string argument = argv[*i];
    if (argument.compare(0, name.size() + 1, name + "=") == 0) {
        *value = argument.substr(name.size() + 1);
        return true;
    }
    if (argument == name && *i + 1 < argc) {
        *value = argv[++*i];
        return true;
    }
    return false;
}

std::optional<Options> ParseOptions(int argc, char** argv, std::string* error) {
    Options options;
    if (argc == 2) {
        options.Help = std::strcmp(argv[1], "--help") == 0 || std::strcmp(argv[1], "-h") == 0;
        options.Clean = std::strcmp(argv[1], "--clean") == 0;
        if (options.Help || options.Clean) {
            return options;
        }
    }
    int i = 1;
    for (; i < argc && std::strcmp(argv[i], "--") != 0; ++i) {
        if (std::strcmp(argv[i], "--i386") == 0) {
            options.I386 = true;
            continue;
        }
        if (!TakeValue("--machine", argc, argv, &i, &options.Machine) &&
            !TakeValue("--run-dir", argc, argv, &i, &options.RunDir)) {
            *error = std::string("unknown option ") + argv[i];
            return std::nullopt;
        }
    }
    for (++i; i < argc; ++i) {
        options.Command.emplace_back(argv[i]);
    }
    if (options.Machine.empty() || options.Command.empty()) {
        *error = "a machine folder and a command are needed";
        return std::nullopt;
    }
    return options;
}

std::string Absolute(const std::string& path) {
    std::error_code code;
    const std::filesystem::path absolute = std::filesystem::absolute(path, code);
    return code ? path : absolute.lexically_normal().string();
}

// The folder of this program, where the preload library and the tools lie beside it.
std::string ToolFolder() {
    char path[PATH_MAX];
    const ssize_t length = readlink("/proc/self/exe", path, sizeof path - 1);
    if (length <= 0) {
        return ".";
    }
    path[length] = '\0';
    return std::filesystem::path(path).parent_path().string();
}

// The program as execvp would find it: a name without "/" along PATH; empty when there is none.
std::string FindProgram(const std::string& name) {
    if (name.find('/') != std::string::npos) {
        return access(name.c_str(), X_OK) == 0 ? name : std::string();
    }
    const char* path = std::getenv("PATH");
    std::string folders = path != nullptr ? path : "/usr/bin:/bin";
    for (size_t start = 0; start <= folders.size();) {
        size_t end = folders.find(':', start);
        end = end == std::string::npos ? folders.size() : end;
        const std::string folder = end > start ? folders.substr(start, end - start) : ".";
        const std::string candidate = JoinPath(folder, name);
        if (IsRegularFile(candidate) && access(candidate.c_str(), X_OK) == 0) {
            return candidate;
        }
        start = end + 1;
    }
    return std::string();
}

void SetEnvironment(const std::string& run, const std::string& machine, const std::string& origin,
                    const std::string& preload) {
    setenv("VELHSIM_RUN", run.c_str(), 1);
    setenv("VELHSIM_MACHINE", machine.c_str(), 1);
    setenv("VELHSIM_ORIGIN", origin.c_str(), 1);
    const char* existing = std::getenv("LD_PRELOAD");
    const std::string list =
        existing != nullptr && *existing != '\0' ? preload + ":" + existing : preload;
    setenv("LD_PRELOAD", list.c_str(), 1);
}

int Run(const Options& options) {
    const std::string origin = Absolute(".");
    const std::string toolDir = ToolFolder();
    const std::string machine = Absolute(options.Machine);
    std::string run = options.RunDir.empty() ? std::string() : Absolute(options.RunDir);
    std::string error;
    for (const std::string& library : options.I386
                                          ? std::vector<std::string>{PRELOAD_LIBRARY, I386_PRELOAD}
                                          : std::vector<std::string>{PRELOAD_LIBRARY}) {
        if (!IsRegularFile(JoinPath(toolDir, library))) {
            return Fail("the preload library " + JoinPath(toolDir, library) + " is not built");
        }
    }
    const std::string preload =
        JoinPath(toolDir, options.I386 ? PRELOAD_BY_ARCHITECTURE : PRELOAD_LIBRARY);
    std::vector<std::string> command = options.Command;
    if (options.I386) {
        const std::string emulator = FindProgram(I386_EMULATOR);
        if (emulator.empty()) {
            return Fail(std::string(I386_EMULATOR) + " is not installed (package qemu-user)");
        }
        // The emulator opens the program by its path; it does not search PATH.
        const std::string program = FindProgram(command.front());
        if (program.empty()) {
            std::fprintf(stderr, "velhsim: cannot run %s: %s\n", command.front().c_str(),
                         std::strerror(ENOENT));
            return 127;
        }
        command.front() = program;
        // -L /: the guest's libraries are the system's own (i386 multiarch).
        command.insert(command.begin(), {emulator, "-L", "/"});
    }
    if (!IsDirectory(machine)) {
        return Fail("no machine folder " + machine);
    }
    if (!run.empty() && !CheckRunFolder(machine, run, &error)) {
        return Fail(error);
    }
    if (!EnterPrivateNamespaces(&error)) {
        return Fail(error);
    }
    std::string reason;
    const bool processNamespace = CanHaveProcessNamespace(&reason);
    if (!processNamespace) {
        std::fprintf(stderr,
                     "velhsim: warning: no process namespace of its own (%s): \"killall\" in the "
                     "command reaches processes outside the run\n",
                     reason.c_str());
    }
    if (run.empty()) {
        run = MakeTemporaryRunFolder(&error);
        if (run.empty() || !CheckRunFolder(machine, run, &error)) {
            return Fail(error);
        }
        std::fprintf(stderr, "velhsim: run folder %s\n", run.c_str());
    }
    if (!PrepareRunFolder(machine, run, toolDir, &error)) {
        return Fail(error);
    }
    const std::string install = JoinPath(run, "install");
    command = ResolveArguments(command, origin, install);
    SetEnvironment(run, machine, origin, preload);
    if (processNamespace) {
        const pid_t first = ForkIntoProcessNamespace();
        if (first < 0) {
            return Fail(std::string("cannot create a process namespace: ") + std::strerror(errno));
        }
        if (first > 0) {
            return SuperviseNamespace(first);
        }
    }
    // What the command names stays reachable when /tmp and /var/tmp become the run's own.
    std::vector<std::string> reachable = ExistingAbsolutePaths(command);
    reachable.insert(reachable.end(), {run, origin, machine, toolDir});
    if (!ShowMachine(run, reachable, processNamespace, &error)) {
        return Fail(error);
    }
    if (chdir(install.c_str()) != 0) {
        return Fail("cannot enter " + install + ": " + std::strerror(errno));
    }
    if (processNamespace) {
        return RunAsFirstProcess(command);
    }
    ExecCommand(command);
}

}  // namespace

int main(int argc, char** argv) {
    std::string error;
    const std::optional<Options> options = ParseOptions(argc, argv, &error);
    if (!options) {
        std::fprintf(stderr, "velhsim: %s\n%s", error.c_str(), USAGE);
        return LAUNCHER_FAILED;
    }
    if (options->Help) {
        std::fputs(USAGE, stdout);
        return 0;
    }
    if (options->Clean) {
        for (const std::string& folder : RemoveRunFolders(&error)) {
            std::printf("velhsim: removed %s\n", folder.c_str());
        }
        return error.empty() ? 0 : Fail(error);
    }
    return Run(*options);
}
