// Linux 2.4's query_module, answered from the run folder's modules/: one folder per loaded module,
// holding "flags" (the module's flags word; running when absent), "symbols" (one per line: a name,
// or a hexadecimal value and a name as /proc/ksyms shows them), and optionally "address", "size",
// "usecount" and "deps" (names of the modules it uses, one per line).
#pragma once

#include <cstddef>
#include <string>

namespace velhsim {

// The kernel's request codes and module flags.
constexpr int QM_MODULES = 1;
constexpr int QM_DEPS = 2;
constexpr int QM_REFS = 3;
constexpr int QM_SYMBOLS = 4;
constexpr int QM_INFO = 5;

constexpr unsigned long MOD_RUNNING = 1;
constexpr unsigned long MOD_DELETED = 2;
constexpr unsigned long MOD_INITIALIZING = 64;

// The record that QM_INFO copies out, in native words.
struct KernelModuleInfo {
    unsigned long Address;
    unsigned long Size;
    unsigned long Flags;
    long UseCount;
};

// The system call's semantics: 0, or -1 with errno (ENOENT for an unknown module, ENOSPC with the
// size needed in *ret when the buffer is too small, EINVAL for an unknown request).
int QueryModule(const std::string& run, const char* name, int which, void* buffer, size_t size,
                size_t* ret);

}  // namespace velhsim
