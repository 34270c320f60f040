// The run folder: a copy of the machine folder that a run may change, completed with what the
// machine describes in readable form.
#pragma once

#include <string>
#include <vector>

namespace velhsim {

// Checks a requested run folder: a new or empty folder outside the machine folder, with a path
// that the overlay mounts can take. False with the reason otherwise.
bool CheckRunFolder(const std::string& machine, const std::string& run, std::string* error);

// The name of every run folder that velhsim makes itself, followed by six random characters.
constexpr const char* RUN_FOLDER_PREFIX = "velhsim.";

// A fresh folder under $TMPDIR (or /tmp); empty on failure with the reason.
std::string MakeTemporaryRunFolder(std::string* error);

// Removes the run folders that velhsim made under $TMPDIR (or /tmp) and this user owns, but for
// those in which a process works (a run still going); returns their paths. On a failure the reason
// is in `error` and the folders removed so far are returned.
std::vector<std::string> RemoveRunFolders(std::string* error);

// Copies the machine into `run` and builds there what the machine gives in readable form:
// dev/mem from "firmware", proc/bus/pci from "lspci.txt", driver/asl.bin from driver/asl.pci
// (with the pci2asl tool in `toolDir`), each unless the machine already has the result. Makes
// install/ and log/.
bool PrepareRunFolder(const std::string& machine, const std::string& run,
                      const std::string& toolDir, std::string* error);

}  // namespace velhsim
