// mkpcitree DUMP DIR: writes the /proc/bus/pci tree of an `lspci -xxx -vv -k` dump into DIR.
#include <cstdio>
#include <string>

#include "sim/machine/pcitree.h"

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fprintf(stderr, "usage: mkpcitree DUMP DIR\n");
        return 2;
    }
    std::string error;
    if (!velhsim::BuildPciTree(argv[1], argv[2], &error)) {
        std::fprintf(stderr, "mkpcitree: %s\n", error.c_str());
        return 1;
    }
    return 0;
}
