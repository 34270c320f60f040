// mkdevmem FIRMWARE IMAGE: writes the 1 MiB physical memory image that a firmware description
// gives, its vital product data records in the BIOS segment at 0xF0000.
#include <cstdio>
#include <string>

#include "sim/machine/firmware.h"

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fprintf(stderr, "usage: mkdevmem FIRMWARE IMAGE\n");
        return 2;
    }
    std::string error;
    if (!velhsim::BuildMemoryImage(argv[1], argv[2], &error)) {
        std::fprintf(stderr, "mkdevmem: %s\n", error.c_str());
        return 1;
    }
    return 0;
}
