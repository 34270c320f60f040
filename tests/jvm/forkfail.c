/* Preloaded into a JVM to make fork() fail the way it fails when the process table is full:
 * the first VELH_FORK_FAILURES calls return -1 with EAGAIN. */
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <stdlib.h>
#include <unistd.h>

pid_t fork(void) {
    static long failed;
    const char* failures = getenv("VELH_FORK_FAILURES");
    if (failures != NULL && failed < atol(failures)) {
        ++failed;
        errno = EAGAIN;
        return -1;
    }
    return ((pid_t(*)(void))dlsym(RTLD_NEXT, "fork"))();
}
