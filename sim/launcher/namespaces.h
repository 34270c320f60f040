// Entering the private namespaces a run needs.
#pragma once

#include <sys/types.h>

#include <string>

namespace velhsim {

// A private mount namespace, inside a new user namespace unless the process is root, with every
// mount made private so that nothing reaches the real system. False with the reason otherwise.
bool EnterPrivateNamespaces(std::string* error);

// Whether a process namespace of our own, with its own /proc, can be had here. Tried in a
// throwaway child so that a refusal leaves this process as it was.
bool CanHaveProcessNamespace(std::string* reason);

// Like fork, but the child is the first process of a new process namespace, with a mount
// namespace of its own (a copy of the caller's), so that the /proc it mounts and the mounts it
// makes stay out of the caller's view. The caller's namespaces stay as they were.
pid_t ForkIntoProcessNamespace();

}  // namespace velhsim
