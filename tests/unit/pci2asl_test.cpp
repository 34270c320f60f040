// The simulator's table compiler, run as a program.
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "scratchdir.h"

#ifdef PCI2ASL_BINARY

namespace {

int RunTool(const std::string& arguments, const ScratchDir& dir) {
    std::string command = std::string(PCI2ASL_BINARY) + " " + arguments + " 2>" +
                          dir.Path("stderr") + " >" + dir.Path("stdout");
    int status = std::system(command.c_str());
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

TEST(Pci2Asl, CompilesASmallMachine) {
    ScratchDir dir;
    dir.Write("m.pci",
              "[table header]\n"
              "VHSL 1 0 SIM001\n"
              "[chassis]\n"
              "0 1\n"
              "[bus]\n"
              "2 0 255 0x10 0 0 7 1 1 1 1 1\n"
              "[slot]\n"
              "258 2 3 1 0x05 0x7f 0 0 0 1\n"
              "[string]\n"
              "1 \"Sim\"\n");
    WorkingDir cwd(dir.Path());                          // a relative input and output name
    ASSERT_EQ(RunTool("m.pci out/../asl.bin", dir), 1);  // the output folder does not exist
    ASSERT_EQ(RunTool("m.pci asl.bin", dir), 0) << dir.Read("stderr");
    const std::string expected =
        std::string("VHSL\x10\x01\x00SIM001\x00\x00\x00", 16) +
        std::string("\x86\x10\x00\x00\x01\x00\x00\x00\x00\x00\x00\x00\x00\x00\x00\x00", 16) +
        std::string("\x81\x10\x02\x00\xff\x10\x00\x00\x07\x01\x01\x01\x01\x01\x00\x00", 16) +
        std::string("\x82\x10\x02\x01\x02\x03\x01\x05\x7f\x00\x00\x00\x01\x00\x00\x00", 16) +
        std::string("\x91\x01Sim\x00", 6) + std::string("\xa0", 1);
    EXPECT_EQ(dir.Read("asl.bin"), expected);
    EXPECT_EQ(dir.Read("stderr"), "");
}

TEST(Pci2Asl, FaultyFilesAreReportedAndGiveNoOutput) {
    ScratchDir dir;
    dir.Write("stray.pci", "[table header]\nVHSL 1 0 M\n[busses]\n1 2 3\n");
    dir.Write("headless.pci", "[bus]\n1\n");
    // Arguments, exit status, message; with --lenient the output is kept, messages still shown.
    for (auto [arguments, status, message] :
         {std::tuple{"stray.pci a.bin", 1, "ParseLine(): unknown parse mode 0"},
          {"--lenient stray.pci b.bin", 0, "ParseLine(): unknown parse mode 0"},
          {"headless.pci c.bin", 1, "no [table header] line"},
          {"missing.pci d.bin", 1, "missing.pci: No such file"},
          {"stray.pci", 2, ""}}) {  // usage
        WorkingDir cwd(dir.Path());
        EXPECT_EQ(RunTool(arguments, dir), status) << arguments;
        EXPECT_NE(dir.Read("stderr").find(message), std::string::npos) << dir.Read("stderr");
    }
    EXPECT_EQ(access(dir.Path("a.bin").c_str(), F_OK), -1);
    EXPECT_EQ(dir.Read("b.bin").size(), 17u);
    EXPECT_EQ(access(dir.Path("c.bin").c_str(), F_OK), -1);
}

}  // namespace

#else

TEST(Pci2Asl, CompilesASmallMachine) {
    GTEST_SKIP() << "the simulator's tools are not built";
}

#endif
