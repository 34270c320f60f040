// Relative paths in the command's arguments, which the command would otherwise look for in the
// install folder it starts in.
#pragma once

#include <string>
#include <vector>

namespace velhsim {

// Makes absolute every part of an argument that names an existing path relative to `origin` (the
// folder velhsim was started in) and none relative to `install`. The parts of an argument are the
// argument itself, or the text after its first "=", each split at ":" (class paths). The command
// name itself is looked up along PATH unless it holds a "/".
std::vector<std::string> ResolveArguments(const std::vector<std::string>& command,
                                          const std::string& origin, const std::string& install);

// The parts of the arguments (as above) that name existing paths by absolute paths.
std::vector<std::string> ExistingAbsolutePaths(const std::vector<std::string>& command);

}  // namespace velhsim
