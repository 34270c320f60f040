// Making the run folder's machine the one the command sees: bind mounts, overlays over /etc and
// /usr/share, and rebuilt folders where a path has no place to mount on.
#pragma once

#include <string>
#include <vector>

namespace velhsim {

// Lays the machine of `run` over the system: proc/bus/* over /proc/bus, etc/ over /etc,
// usr/share/ over /usr/share, dev/* over /dev, and the run's own tmp/ and var/tmp/ over /tmp and
// /var/tmp, where the folders of `reachable` stay at their paths. With `ownProc` it first mounts
// a /proc of the current process namespace. False with the reason on failure.
bool ShowMachine(const std::string& run, const std::vector<std::string>& reachable, bool ownProc,
                 std::string* error);

}  // namespace velhsim
