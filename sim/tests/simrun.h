// What the simulator's tests share: scratch folders, the test machine, and running velhsim.
#pragma once

#include <string>
#include <vector>

namespace velhsim::test {

// A fresh folder under /tmp, removed with everything in it.
class ScratchDir {
  public:
    ScratchDir();
    ~ScratchDir();
    ScratchDir(const ScratchDir&) = delete;
    ScratchDir& operator=(const ScratchDir&) = delete;
    const std::string& Path() const { return Root; }
    std::string operator/(const std::string& name) const { return Root + "/" + name; }
    // Writes a file below the folder, making the folders on its way.
    void Write(const std::string& name, const std::string& content) const;

  private:
    std::string Root;
};

struct RunResult {
    int Status = -1;
    std::string Out;
    std::string Err;
};

// Runs a program to its end in `dir` (the current folder when empty), with its output collected.
RunResult RunProgram(const std::vector<std::string>& command, const std::string& dir = "");
// Runs velhsim with these arguments.
RunResult RunVelhsim(const std::vector<std::string>& arguments, const std::string& dir = "");
// Runs `script` with sh under velhsim against `machine`, in the run folder `run`; the probe
// program's path is in $PROBE.
RunResult RunScript(const std::string& machine, const std::string& run, const std::string& script);
// The text of a file, empty when it cannot be read.
std::string FileText(const std::string& path);
// Bytes as lowercase hexadecimal digits, as the probe prints a table.
std::string Hex(const std::string& bytes);

}  // namespace velhsim::test
