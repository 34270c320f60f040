#include "sim/tests/simrun.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <stdexcept>

#include "sim/common/textfile.h"
#include "sim/launcher/process.h"
#include "sim/tests/testmachine.h"

namespace velhsim::test {

namespace fs = std::filesystem;

ScratchDir::ScratchDir() : Root("/tmp/velhsim-test.XXXXXX") {
    if (mkdtemp(Root.data()) == nullptr) {
        throw std::runtime_error("mkdtemp failed");
    }
}

ScratchDir::~ScratchDir() {
    std::error_code ignored;
    fs::remove_all(Root, ignored);
}

void ScratchDir::Write(const std::string& name, const std::string& content) const {
    fs::create_directories(fs::path(*this / name).parent_path());
    if (!WriteWholeFile(*this / name, content)) {
        throw std::runtime_error("cannot write " + name);
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
    std::vector<std::string> redirected{
        "sh", "-c", "exec \"$@\" </dev/null >" + output / "out" + " 2>" + output / "err", "sh"};
    redirected.insert(redirected.end(), command.begin(), command.end());
    const int status = velhsim::RunProgram(redirected, dir.empty() ? "." : dir);
    return {status, FileText(output / "out"), FileText(output / "err")};
}

RunResult RunVelhsim(const std::vector<std::string>& arguments, const std::string& dir) {
    std::vector<std::string> command{VELHSIM_LAUNCHER};
    command.insert(command.end(), arguments.begin(), arguments.end());
    return RunProgram(command, dir);
}

RunResult RunScript(const std::string& machine, const std::string& run, const std::string& script) {
    return RunVelhsim({"--machine", machine, "--run-dir", run, "--", "sh", "-c",
                       std::string("PROBE=") + VELHSIM_PROBE + "\n" + script});
}

std::string TestTable() {
    return FileText(VELHSIM_TEST_MACHINE "/driver/asl.bin");
}

std::string WriteTestMachine(const ScratchDir& dir, const std::string& name) {
    fs::copy(VELHSIM_TEST_MACHINE, dir / name, fs::copy_options::recursive);
    return dir / name;
}

}  // namespace velhsim::test
