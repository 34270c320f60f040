// Starting and supervising the command.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace velhsim {

// Status of a process in the shell's terms: its exit code, or 128 plus the signal that ended it.
int WaitForStatus(pid_t child);

// Replaces the process with the command; when that fails, reports why and ends with 127 (not
// found) or 126 (not executable).
[[noreturn]] void ExecCommand(const std::vector<std::string>& command);

// Runs a helper program to its end in `dir`; its status.
int RunProgram(const std::vector<std::string>& command, const std::string& dir);

// The launcher's side of a run in a process namespace: passes termination requests on to the
// namespace's first process and returns its status.
int SuperviseNamespace(pid_t first);

// The namespace's first process: starts the command, reaps every orphan while it runs, and
// returns the command's status. Leaving ends whatever the command left running, such as a
// monitor it started.
int RunAsFirstProcess(const std::vector<std::string>& command);

}  // namespace velhsim
