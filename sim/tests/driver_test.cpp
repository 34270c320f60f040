// The emulated slot driver and query_module, met through real calls under velhsim.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/utsname.h>

#include <cstring>
#include <string>

#include "sim/tests/simrun.h"
#include "sim/tests/testmachine.h"

namespace velhsim::test {
namespace {

using ::testing::HasSubstr;

TEST(VelhsimDriver, AnswersEachRequestAsTheProtocolSays) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    const RunResult result = RunScript(machine, dir / "run",
                                       "$PROBE version\n"
                                       "$PROBE table\n"
                                       "$PROBE table 39\n"
                                       "$PROBE table 100\n"
                                       "$PROBE blink 4 1\n"
                                       "$PROBE blink 4294967295 0\n"
                                       "$PROBE ioctl 0x1234\n");
    const std::string table = "table 40 " + Hex(TestTable()) + " next ee\n";
    EXPECT_EQ(result.Out,
              "version 1.2.3\n"
              "size 40\n" +
                  table +
                  // A buffer one byte short of the table is refused.
                  "size 40\n"
                  "error EINVAL\n"
                  // A larger one gets the table and its size.
                  "size 40\n" +
                  table +
                  "blink ok\n"
                  "blink ok\n"
                  "error ENOTTY\n");
    EXPECT_EQ(FileText(dir / "run/driver/blink.log"), "4 1\n4294967295 0\n");
}

TEST(VelhsimDriver, FailsTheRequestsThatTheFailFileNames) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    // The fail file is read at every request, so the script changes it between requests.
    const RunResult result =
        RunScript(machine, dir / "run",
                  "fail() { printf '%s\\n' \"$1\" > $VELHSIM_RUN/driver/fail; }\n"
                  "fail open; $PROBE open\n"
                  "fail 'open ENOENT'; $PROBE open\n"
                  "fail 'version # comment'; $PROBE version\n"
                  "fail 'size EBUSY'; $PROBE table\n"
                  "fail 'table 5'; $PROBE table\n"
                  "fail blink; $PROBE blink 1 1\n"
                  "rm $VELHSIM_RUN/driver/fail; $PROBE blink 2 2\n"
                  "rm $VELHSIM_RUN/driver/version; $PROBE version\n"
                  "rm -r $VELHSIM_RUN/driver; $PROBE open\n");
    EXPECT_EQ(result.Out,
              "error EIO\n"
              "error ENOENT\n"
              "error EIO\n"
              "error EBUSY\n"
              "size 40\n"
              "error EIO\n"
              "error EIO\n"
              "blink ok\n"
              "error EIO\n"
              "error ENOENT\n");
    EXPECT_THAT(result.Err, HasSubstr("no three version numbers"));
}

TEST(VelhsimModules, QueryModuleAnswersAsTheLinux24Kernel) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    const std::string marker = "__insmod_alpha_O/lib/modules/2.4.19/alpha.o_M3D7E1A2B_V132115";
    const size_t needed =
        2 * 2 * sizeof(unsigned long) + marker.size() + 1 + std::strlen("alpha_export") + 1;
    const std::string n = std::to_string(needed);
    const std::string infoSize = std::to_string(4 * sizeof(unsigned long));
    const RunResult result = RunScript(machine, dir / "run",
                                       "$PROBE qm alpha 5 0\n"
                                       "$PROBE qm alpha 5 64\n"
                                       "$PROBE qm alpha 4 0\n"
                                       "$PROBE qm alpha 4 " +
                                           std::to_string(needed - 1) +
                                           "\n"
                                           "$PROBE qm alpha 4 " +
                                           n +
                                           "\n"
                                           "$PROBE qm sleepy 4 0\n"
                                           "$PROBE qm nosuch 5 64\n"
                                           "$PROBE qm alpha 9 64\n"
                                           "$PROBE qm - 5 64\n"
                                           "$PROBE qm - 1 256\n"
                                           "$PROBE qm - 1 6\n"
                                           "$PROBE qm alpha 2 256\n"
                                           "$PROBE qm beta 3 256\n");
    EXPECT_EQ(result.Out,
              // QM_INFO: the record's size when the buffer is too small, then the record:
              // address, size, flags and use count.
              "ret " + infoSize + "\nerror ENOSPC\n" + "ret " + infoSize +
                  "\ninfo d0800000 2000 1 3\n" +
                  // QM_SYMBOLS: the space needed, then the pairs and the names.
                  "ret " + n + "\nerror ENOSPC\n" + "ret " + n + "\nerror ENOSPC\n" +
                  "ret 2\nsymbol 0 " + marker + "\nsymbol c8801000 alpha_export\n" +
                  // A module that is not running shows no symbols.
                  "ret 0\n" + "ret 0\nerror ENOENT\n" + "ret 0\nerror EINVAL\n" +
                  // The kernel itself has no information record.
                  "ret 0\nerror EINVAL\n" +
                  // QM_MODULES, QM_DEPS and QM_REFS list names.
                  "ret 3\nname alpha\nname beta\nname sleepy\n" + "ret 18\nerror ENOSPC\n" +
                  "ret 1\nname beta\n" + "ret 1\nname alpha\n");
}

TEST(VelhsimMachine, UnameReportsTheMachinesRelease) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    EXPECT_EQ(RunScript(machine, dir / "run", "$PROBE uname; uname -r").Out,
              "release 2.4.19-64GB-SMP\n2.4.19-64GB-SMP\n");

    // Without a uname file the real release shows.
    dir.Write("bare/etc/hostname-test", "x\n");
    struct utsname real {};
    ASSERT_EQ(uname(&real), 0);
    EXPECT_EQ(RunScript(dir / "bare", dir / "run2", "$PROBE uname").Out,
              std::string("release ") + real.release + "\n");
}

}  // namespace
}  // namespace velhsim::test
