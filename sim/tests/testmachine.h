// A small machine with every part that velhsim knows: the folder `machine` beside this file.
#pragma once

#include "sim/tests/simrun.h"

namespace velhsim::test {

// The slot driver's table in the test machine: 40 bytes, "VHSL" and then 0 to 35.
std::string TestTable();
// Copies the machine into `dir`/`name` and returns its path.
std::string WriteTestMachine(const ScratchDir& dir, const std::string& name = "machine");

}  // namespace velhsim::test
