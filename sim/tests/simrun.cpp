#include "sim/tests/simrun.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <system_error>

#include "filehandle.h"
#include "sim/common/textfile.h"
#include "sim/launcher/process.h"

namespace velhsim::test {

namespace fs = std::filesystem;

ScratchDir::ScratchDir() {
    std::string pattern = "/tmp/velhsim-test.XXXXXX";
    if (mkdtemp(pattern.data()) == nullptr) {
        throw std::runtime_error("mkdtemp failed");
    }
    Root = pattern;
}

ScratchDir::~ScratchDir() {
    std::error_code ignored;
    fs::remove_all(Root, ignored);
}

std::string ScratchDir::operator/(const std::string& name) const {
    return JoinPath(Root, name);
}

void ScratchDir::Write(const std::string& name, const std::string& content) const {
    const std::string path = *this / name;
    fs::create_directories(fs::path(path).parent_path());
    if (!WriteWholeFile(path, content)) {
        throw std::runtime_error("cannot write " + path);
    }
}

std::string FileText(const std::string& path) {
    return ReadWholeFile(path).value_or("");
}

std::string Hex(const std::string& bytes) {
    std::string text;
    char digits[3];
    for (unsigned char byte : bytes) {
        std::snprintf(digits, sizeof digits, "%02x", byte);
        text += digits;
    }
    return text;
}

RunResult RunProgram(const std::vector<std::string>& command, const std::string& dir) {
    const ScratchDir output;
    const std::string outPath = output / "out";
    const std::string errPath = output / "err";
    const pid_t child = fork();
    if (child == 0) {
        const UniqueFd out(open(outPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644));
        const UniqueFd err(open(errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644));
        const UniqueFd none(open("/dev/null", O_RDONLY));
        if (!out || !err || !none || dup2(out.Get(), 1) < 0 || dup2(err.Get(), 2) < 0 ||
            dup2(none.Get(), 0) < 0 || (!dir.empty() && chdir(dir.c_str()) != 0)) {
            _exit(120);
        }
        ExecCommand(command);
    }
    RunResult result;
    int status = 0;
    if (child > 0 && waitpid(child, &status, 0) == child) {
        result.Status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    }
    result.Out = FileText(outPath);
    result.Err = FileText(errPath);
    return result;
}

std::string ProbePath() {
    return VELHSIM_PROBE;
}
std::string LauncherPath() {
    return VELHSIM_LAUNCHER;
}

RunResult RunVelhsim(const std::vector<std::string>& arguments, const std::string& dir) {
    std::vector<std::string> command{LauncherPath()};
    command.insert(command.end(), arguments.begin(), arguments.end());
    return RunProgram(command, dir);
}

RunResult RunScript(const std::string& machine, const std::string& run, const std::string& script) {
    return RunVelhsim({"--machine", machine, "--run-dir", run, "--", "sh", "-c",
                       "PROBE=" + ProbePath() + "\n" + script});
}

}  // namespace velhsim::test
