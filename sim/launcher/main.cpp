// velhsim: runs a command against a described machine.
//
//   velhsim --machine DIR [--run-dir RUN] -- COMMAND [ARG...]
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

const char* const USAGE =
    "usage: velhsim --machine DIR [--run-dir RUN] -- COMMAND [ARG...]\n"
    "Copies the machine folder DIR into the run folder RUN (a new temporary folder when not\n"
    "given) and runs COMMAND in RUN/install against that machine.\n";

struct Options {
    std::string Machine;
    std::string RunDir;
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
    int i = 1;
    for (; i < argc && std::strcmp(argv[i], "--") != 0; ++i) {
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
    const std::string preload = JoinPath(toolDir, PRELOAD_LIBRARY);
    const std::string machine = Absolute(options.Machine);
    std::string run = options.RunDir.empty() ? std::string() : Absolute(options.RunDir);
    std::string error;
    if (!IsRegularFile(preload)) {
        return Fail("the preload library " + preload + " is not built");
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
    const std::vector<std::string> command = ResolveArguments(options.Command, origin, install);
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
    return Run(*options);
}
