// Making the run folder's machine the one the command sees: bind mounts, overlays over /etc and
// /usr/share, and rebuilt folders where a path has no place to mount on.
#pragma once

#include <string>

namespace velhsim {

// Lays the machine of `run` over the system: proc/bus/* over /proc/bus, etc/ over /etc,
// usr/share/ over /usr/share, dev/* over /dev. With `ownProc` it first mounts a /proc of the
// current process namespace. False with the reason on failure.
bool ShowMachine(const std::string& run, bool ownProc, std::string* error);

}  // namespace velhsim
