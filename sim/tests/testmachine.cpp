#include "sim/tests/testmachine.h"

namespace velhsim::test {

std::string TestTable() {
    std::string table = "VHSL";
    for (int i = 0; i < 36; ++i) {
        table += static_cast<char>(i);
    }
    return table;
}

std::string WriteTestMachine(const ScratchDir& dir, const std::string& name) {
    const std::string root = name + "/";
    dir.Write(root + "driver/version", "1.2.3\n");
    dir.Write(root + "driver/asl.bin", TestTable());
    dir.Write(root + "modules/alpha/flags", "1\n");
    dir.Write(root + "modules/alpha/size", "0x2000\n");
    dir.Write(root + "modules/alpha/usecount", "3\n");
    dir.Write(root + "modules/alpha/deps", "beta\n");
    dir.Write(root + "modules/alpha/symbols",
              "# value and name\n"
              "__insmod_alpha_O/lib/modules/2.4.19/alpha.o_M3D7E1A2B_V132115\n"
              "c8801000 alpha_export\n");
    dir.Write(root + "modules/beta/flags", "0x1\n");
    dir.Write(root + "modules/sleepy/flags", "0\n");
    dir.Write(root + "modules/sleepy/symbols", "sleepy_symbol\n");
    dir.Write(root + "uname", "2.4.19-64GB-SMP\n");
    dir.Write(root + "etc/SuSE-release", "SuSE SLES-8 (i386)\nVERSION = 8.1\n");
    dir.Write(root + "etc/sysconfig/kernel", "INITRD_MODULES=\"alpha\"\n");
    dir.Write(root + "usr/share/pci.ids", "8086  Intel Corporation\n\t1229  82557\n");
    dir.Write(root + "lspci.txt",
              "00:01.0 Ethernet controller: Intel Corporation 82557\n"
              "\tInterrupt: pin A routed to IRQ 11\n"
              "\tRegion 0: Memory at f4fff000 (32-bit, non-prefetchable) [size=4K]\n"
              "\tKernel driver in use: alpha\n"
              "00: 86 80 29 12 07 00 90 02 08 00 00 02 10 40 00 00\n"
              "10: 00 f0 ff f4 00 00 00 00 00 00 00 00 00 00 00 00\n"
              "20: 00 00 00 00 00 00 00 00 00 00 00 00 86 80 01 00\n"
              "30: 00 00 00 00 00 00 00 00 00 00 00 00 0b 01 08 38\n"
              "\n"
              "02:1f.3 Ethernet controller: Intel Corporation 82557\n"
              "00: 86 80 29 12 07 00 90 02 08 00 00 02 10 40 00 00\n"
              "10: 00 00 00 00\n");
    dir.Write(root + "firmware", "record 0x1234\ntype K740\nmodel C4D\n");
    dir.Write(root + "install/dbgprint", "hwdbgprint 0x0\n");
    return dir / name;
}

}  // namespace velhsim::test
