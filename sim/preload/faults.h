// Faults for a sweep: with VELHSIM_FAULT=KIND:N in its environment the emulation fails the N-th
// call of that kind that the agent's library (libvelhlib) makes, counted over the whole process
// and its forked children; with VELHSIM_FAULT=count it only counts. Every counted call is
// appended to RUN/faults.log as "KIND N" ("KIND N failed" for the one that failed), and at the
// process's exit every descriptor that the library opened and left open as "leak FD TARGET".
// Calls made by anything else (the JVM, the monitor, a shell) pass untouched.
#pragma once

#include <cstddef>

namespace velhsim {

enum class FaultKind {
    Driver,        // a request to the slot driver (open, version, size, table, blink): EIO
    QueryModule,   // query_module: ENOENT, as for a module unloaded meanwhile
    ModuleGrowth,  // query_module with a buffer: ENOSPC, the list having grown since its size
    Uname,         // uname: EFAULT
    Getcwd,        // getcwd: ENOMEM
    Scandir,       // scandir: ENOMEM
    Fork,          // fork, and the second fork in the child: EAGAIN
    Exec,          // execlp: ENOENT
    Short,         // a regular file opened for reading holds only the first half of its bytes
    Partial,       // read() hands out half the bytes asked for (at least one)
    Count
};

// Whether the library made this call (caller: the hook's return address) and it is the one to
// fail. Counts the call when faults are on.
bool CallFails(FaultKind kind, const void* caller);
// Whether the address lies in the agent's library.
bool FromLibrary(const void* caller);
// Remembers a descriptor that the library opened, for the leak check at exit.
void NoteLibraryDescriptor(int fd);

}  // namespace velhsim
