// The 32-bit program's entry code (crt1.o) hands main to __libc_start_main, which today's C
// library exports at GLIBC_2.34. The entry code binds to this definition first, which forwards
// to the GLIBC_2.0 version that every C library since has. It passes the program's constructors
// as the initialisation function, as the entry code of that time did: an older C library runs
// only what it is given, today's runs exactly that when it is given one.
#include <cstddef>

using MainFunction = int (*)(int, char**, char**);
using InitFunction = void (*)(int, char**, char**);

extern "C" {

int StartMainGlibc20(MainFunction main, int argc, char** argv, InitFunction init, void (*fini)(),
                     void (*rtldFini)(), void* stackEnd) __asm__("__libc_start_main_glibc20");
__asm__(".symver __libc_start_main_glibc20,__libc_start_main@GLIBC_2.0");

// Laid out by the linker and crti.o in every executable.
extern InitFunction __preinit_array_start[], __preinit_array_end[];
extern InitFunction __init_array_start[], __init_array_end[];
void _init();

}  // extern "C"

namespace {

void RunConstructors(int argc, char** argv, char** envp) {
    for (InitFunction* run = __preinit_array_start; run != __preinit_array_end; ++run) {
        (*run)(argc, argv, envp);
    }
    _init();
    for (InitFunction* run = __init_array_start; run != __init_array_end; ++run) {
        (*run)(argc, argv, envp);
    }
}

}  // namespace

// The destructors of the program's objects run through atexit; its finalisation array holds only
// the compiler's own housekeeping, which the dynamic loader runs.
extern "C" __attribute__((visibility("hidden"))) int __libc_start_main(MainFunction main, int argc,
                                                                       char** argv, InitFunction,
                                                                       void (*)(),
                                                                       void (*rtldFini)(),
                                                                       void* stackEnd) {
    return StartMainGlibc20(main, argc, argv, RunConstructors, nullptr, rtldFini, stackEnd);
}
