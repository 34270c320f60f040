// The launcher: what the command sees, where it runs, what it returns, and what stays untouched.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "sim/launcher/argpaths.h"
#include "sim/tests/testmachine.h"

namespace velhsim::test {
namespace {

namespace fs = std::filesystem;
using ::testing::HasSubstr;

// Every path below `root` with the contents of its files, to compare before and after a run.
std::string Snapshot(const std::string& root) {
    std::string snapshot;
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(root)) {
        snapshot += entry.path().string() + "\n" + FileText(entry.path()) + "\n";
    }
    return snapshot;
}

TEST(VelhsimMachine, ShowsTheMachinesFilesOverTheSystemAndNeverChangesThem) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    const std::string before = Snapshot(machine);
    const RunResult result = RunScript(machine, dir / "run",
                                       "cat /etc/SuSE-release /etc/sysconfig/kernel\n"
                                       "test -s /etc/passwd && echo passwd stays\n"
                                       "cat /usr/share/pci.ids\n"
                                       "ls /proc/bus/pci /proc/bus/pci/02\n"
                                       "cat /proc/bus/pci/devices\n"
                                       "stat -c %s /proc/bus/pci/00/01.0 /proc/bus/pci/02/1f.3\n"
                                       "stat -c %s /dev/mem\n"
                                       "od -An -c -j $((0xF1234)) -N 5 /dev/mem\n"
                                       "od -An -c -j $((0xF1234 + 40)) -N 7 /dev/mem\n"
                                       "echo x > /dev/null && echo null works\n"
                                       "pwd; test -d ../log && echo log beside\n"
                                       "$PROBE blink 1 1\n"
                                       "echo changed > $VELHSIM_RUN/uname\n"
                                       "rm $VELHSIM_RUN/driver/version\n"
                                       "echo x >> /etc/SuSE-release 2>/dev/null\n"
                                       "echo log > ../log/test.log\n");
    EXPECT_EQ(result.Status, 0) << result.Err;
    EXPECT_EQ(result.Out,
              "SuSE SLES-8 (i386)\nVERSION = 8.1\nINITRD_MODULES=\"alpha\"\npasswd stays\n"
              "8086  Intel Corporation\n\t1229  82557\n"
              "/proc/bus/pci:\n00\n02\ndevices\n\n/proc/bus/pci/02:\n1f.3\n"
              "0008\t80861229\tb\tf4fff000\t00000000\t00000000\t00000000\t00000000\t00000000"
              "\t00000000\t00001000\t00000000\t00000000\t00000000\t00000000\t00000000\t00000000"
              "\talpha\n"
              "02fb\t80861229\t0\t00000000\t00000000\t00000000\t00000000\t00000000\t00000000"
              "\t00000000\t00000000\t00000000\t00000000\t00000000\t00000000\t00000000\t00000000"
              "\t\n"
              "64\n20\n1048576\n"
              " 252   U   V   P   D\n"
              "   K   7   4   0   C   4   D\n"
              "null works\n" +
                  dir / "run/install\nlog beside\nblink ok\n");
    EXPECT_EQ(Snapshot(machine), before);
    // What the run built and wrote lies in the run folder only.
    EXPECT_TRUE(fs::exists(dir / "run/dev/mem") && fs::exists(dir / "run/proc/bus/pci/devices"));
    EXPECT_EQ(FileText(dir / "run/driver/blink.log"), "1 1\n");
    EXPECT_EQ(FileText(dir / "run/log/test.log"), "log\n");
    EXPECT_EQ(FileText(dir / "run/etc/SuSE-release"), FileText(machine + "/etc/SuSE-release"));
}

TEST(VelhsimMachine, RebuildsAFolderWhereAnEntryHasNoPlace) {
    // /proc/bus has no entry of this name, so the launcher rebuilds /proc/bus around it; the
    // entries the machine does not replace stay.
    const ScratchDir dir;
    dir.Write("machine/proc/bus/velhsim-extra", "extra\n");
    dir.Write("machine/dev/velhsim-node", "node\n");
    const RunResult result = RunScript(dir / "machine", dir / "run",
                                       "cat /proc/bus/velhsim-extra /dev/velhsim-node\n"
                                       "test -e /proc/bus/pci/devices && echo pci stays\n"
                                       "test -c /dev/zero && head -c 2 /dev/zero | od -An -tx1\n"
                                       "test -L /dev/fd && echo links stay\n");
    EXPECT_EQ(result.Out, "extra\nnode\npci stays\n 00 00\nlinks stay\n") << result.Err;
}

TEST(VelhsimLauncher, ReturnsTheCommandsStatusAndRefusesWhatItCannotRun) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    dir.Write("used/something", "x");
    const std::string marker = dir / "ran";
    const std::vector<std::string> touch = {"--", "touch", marker};
    const auto in = [&](const std::string& run, std::vector<std::string> command) {
        command.insert(command.begin(), {VELHSIM_LAUNCHER, "--machine", machine, "--run-dir", run});
        return command;
    };
    const struct {
        std::vector<std::string> Command;
        int Status;
        std::string Err;
    } cases[] = {
        {in(dir / "a", {"--", "sh", "-c", "exit 7"}), 7, ""},
        {in(dir / "b", {"--", "sh", "-c", "kill -9 $$"}), 128 + 9, ""},
        {in(dir / "c", {"--", "velhsim-no-such-cmd"}), 127, "cannot run velhsim-no-such-cmd"},
        {in(dir / "used", touch), 125, "is not a new or empty folder"},
        {in(machine + "/run", touch), 125, "lies inside the machine folder"},
        {{VELHSIM_LAUNCHER, "--machine", dir / "nothing", "--", "touch", marker},
         125,
         "no machine folder"},
        {{VELHSIM_LAUNCHER, "--machine", machine}, 125, "usage:"},
        // A user namespace of the test's own in which no mount namespace may be made.
        {{"unshare", "--user", "--map-root-user", "sh", "-c",
          "echo 0 > /proc/sys/user/max_mnt_namespaces && exec \"$@\"", "sh", VELHSIM_LAUNCHER,
          "--machine", machine, "--run-dir", dir / "d", "--", "touch", marker},
         125,
         "velhsim: cannot create a private mount namespace: No space left on device (a "
         "namespace limit"},
    };
    for (const auto& c : cases) {
        const RunResult result = RunProgram(c.Command);
        EXPECT_EQ(result.Status, c.Status) << c.Command.back();
        EXPECT_THAT(result.Err, HasSubstr(c.Err));
    }
    EXPECT_FALSE(fs::exists(marker));
    EXPECT_FALSE(fs::exists(machine + "/run"));
    EXPECT_FALSE(fs::exists(dir / "d"));
}

TEST(VelhsimLauncher, MakesATemporaryRunFolderAndNamesIt) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    const RunResult result =
        RunVelhsim({"--machine", machine, "--", "sh", "-c", "echo $VELHSIM_RUN; pwd"});
    ASSERT_EQ(result.Status, 0) << result.Err;
    const std::string run = result.Out.substr(0, result.Out.find('\n'));
    EXPECT_EQ(run.rfind("/tmp/velhsim.", 0), 0u) << run;
    EXPECT_EQ(result.Out, run + "\n" + run + "/install\n");
    EXPECT_THAT(result.Err, HasSubstr("velhsim: run folder " + run + "\n"));
    EXPECT_TRUE(fs::exists(run + "/driver/asl.bin"));
    fs::remove_all(run);
}

TEST(VelhsimLauncher, EndsWhatTheCommandLeftRunning) {
    // A monitor that the command starts and never stops goes when the command ends.
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    const RunResult result = RunScript(machine, dir / "run",
                                       "(sleep 1; touch $VELHSIM_RUN/survivor) &\n"
                                       "echo started\n");
    EXPECT_EQ(result.Out, "started\n");
    std::this_thread::sleep_for(std::chrono::seconds(2));
    EXPECT_FALSE(fs::exists(dir / "run/survivor"));
}

TEST(VelhsimLauncher, ResolvesRelativeArgumentsFromWhereItStarted) {
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    const std::string origin = dir / "origin";
    for (const char* name : {"data/x.txt", "build/agent.jar", "lib/a.jar", "tools/run", "build2"}) {
        dir.Write("origin/" + std::string(name), "from origin\n");
    }
    // A name that also exists in the install folder means the install folder's file.
    dir.Write("origin/dbgprint", "from origin\n");
    const RunResult result = RunVelhsim({"--machine", machine, "--run-dir", dir / "run", "--",
                                         "env", "LIST=data:nothing-here:data/x.txt", "sh", "-c",
                                         "cat \"$1\" dbgprint; echo $LIST", "sh", "data/x.txt"},
                                        origin);
    EXPECT_EQ(result.Out, "from origin\nhwdbgprint 0x0\n" + origin +
                              "/data:nothing-here:" + origin + "/data/x.txt\n")
        << result.Err;

    // Options with a path, class path lists; a command given with a folder is resolved too, one
    // without is left to PATH.
    const std::vector<std::string> expected = {
        origin + "/tools/run",
        "-Djava.library.path=" + origin + "/build",
        "-cp",
        origin + "/build/agent.jar:" + origin + "/lib/a.jar:missing.jar",
        "/abs/build",
        "com.example.Main",
        origin + "/build",
        "-Dx="};
    EXPECT_EQ(ResolveArguments({"tools/run", "-Djava.library.path=build", "-cp",
                                "build/agent.jar:lib/a.jar:missing.jar", "/abs/build",
                                "com.example.Main", "build", "-Dx="},
                               origin, machine + "/install"),
              expected);
    EXPECT_EQ(ResolveArguments({"build2"}, origin, machine + "/install")[0], "build2");
}

TEST(VelhsimLauncher, RunsUnprivilegedInAUserNamespace) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "every other test already runs without root";
    }
    // Copies of the launcher, its preload library, the probe and a machine that the unprivileged
    // user can reach.
    const ScratchDir dir;
    const std::string machine = WriteTestMachine(dir);
    const std::string bin = dir / "bin";
    fs::create_directories(bin);
    const fs::path launcher = VELHSIM_LAUNCHER;
    fs::copy(launcher, bin + "/velhsim");
    fs::copy(launcher.parent_path() / "libvelhsim-preload.so", bin + "/libvelhsim-preload.so");
    fs::copy(VELHSIM_PROBE, bin + "/probe");
    fs::permissions(dir.Path(), fs::perms::all, fs::perm_options::add);
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(dir.Path())) {
        fs::permissions(entry.path(), fs::perms::others_read | fs::perms::others_exec,
                        fs::perm_options::add);
    }
    const RunResult result =
        RunProgram({"setpriv", "--reuid=65534", "--regid=65534", "--clear-groups", bin + "/velhsim",
                    "--machine", machine, "--run-dir", dir / "run", "--", "sh", "-c",
                    "id -u; head -1 /etc/SuSE-release; " + bin + "/probe version; " + bin +
                        "/probe uname; od -An -c -j $((0xF1234 + 2)) -N 3 /dev/mem"});
    EXPECT_EQ(result.Out,
              "65534\nSuSE SLES-8 (i386)\nversion 1.2.3\nrelease 2.4.19-64GB-SMP\n   V   P   D\n")
        << result.Err;
}

}  // namespace
}  // namespace velhsim::test
