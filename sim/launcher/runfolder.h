// The run folder: a copy of the machine folder that a run may change, completed with what the
// machine describes in readable form.
#pragma once

#include <string>

namespace velhsim {

// Checks a requested run folder: a new or empty folder outside the machine folder, with a path
// that the overlay mounts can take. False with the reason otherwise.
bool CheckRunFolder(const std::string& machine, const std::string& run, std::string* error);

// A fresh folder under $TMPDIR (or /tmp); empty on failure with the reason.
std::string MakeTemporaryRunFolder(std::string* error);

// Copies the machine into `run` and builds there what the machine gives in readable form:
// dev/mem from "firmware", proc/bus/pci from "lspci.txt", driver/asl.bin from driver/asl.pci
// (with the pci2asl tool in `toolDir`), each unless the machine already has the result. Makes
// install/ and log/.
bool PrepareRunFolder(const std::string& machine, const std::string& run,
                      const std::string& toolDir, std::string* error);

}  // namespace velhsim
