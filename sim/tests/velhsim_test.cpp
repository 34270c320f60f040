// velhsim as its users meet it: what a command sees, where it runs, what it returns, and what stays
// untouched.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <sstream>
#include <thread>

#include "sim/common/textfile.h"
#include "sim/launcher/argpaths.h"
#include "sim/launcher/process.h"
#include "tests/unit/scratchdir.h"

namespace velhsim::test {
namespace {

namespace fs = std::filesystem;
using ::testing::HasSubstr;

struct RunResult {
    int Status;
    std::string Out;
    std::string Err;
};

// Runs a program to its end in `dir`.
RunResult Execute(std::vector<std::string> command, const std::string& dir = ".") {
    const ScratchDir output;
    command.insert(
        command.begin(),
        {"sh", "-c", "exec \"$@\" </dev/null >" + output.Path("out") + " 2>" + output.Path("err"),
         "sh"});
    const int status = RunProgram(command, dir);
    return {status, output.Read("out"), output.Read("err")};
}

// A copy of the test machine (the folder `machine` beside this file) in `dir`.
std::string CopyTestMachine(const ScratchDir& dir) {
    fs::copy(VELHSIM_TEST_MACHINE, dir.Path("machine"), fs::copy_options::recursive);
    return dir.Path("machine");
}

// Every path below `root` with the contents of its files, to compare before and after a run.
std::string Snapshot(const std::string& root) {
    std::string snapshot;
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(root)) {
        snapshot += entry.path().string() + "\n" + ReadWholeFile(entry.path()).value_or("") + "\n";
    }
    return snapshot;
}

// A transcript (transcripts/*.t) holds commands ("$ " lines), each followed by exactly what it
// prints, and comments ("#" lines). The commands of each run in one sh, in a scratch folder that
// holds a copy of the test machine, under velhsim on that machine (all but launcher.t), with the
// paths of velhsim, the probe and the tools in $VELHSIM, $PROBE, $MKPCITREE, $MKDEVMEM and
// $PCI2ASL; RUN stands for the run folder, SCRATCH for the scratch folder.
TEST(Velhsim, PrintsWhatEachTranscriptSaysAndLeavesTheMachineAsItWas) {
    for (const std::string name : {"launcher.t", "machine.t", "driver.t", "modules.t", "tools.t"}) {
        const ScratchDir dir;
        const std::string machine = CopyTestMachine(dir);
        const std::string before = Snapshot(machine);
        std::istringstream transcript(*ReadWholeFile(VELHSIM_TRANSCRIPTS "/" + name));
        std::string expected;
        std::string script = "VELHSIM=" VELHSIM_LAUNCHER " PROBE=" VELHSIM_PROBE " PCI2ASL=" PCI2ASL
                             " MKPCITREE=" MKPCITREE " MKDEVMEM=" MKDEVMEM "\n";
        std::vector<std::string> commands;
        for (std::string line; std::getline(transcript, line);) {
            if (line.rfind('#', 0) != 0) {
                expected += line + "\n";
            }
            if (line.rfind("$ ", 0) == 0) {
                commands.push_back(line + "\n");
                script += "echo '\036'\n" + line.substr(2) + "\n";
            }
        }
        std::vector<std::string> command{"sh", "-c", script};
        if (name != "launcher.t") {
            command.insert(command.begin(), {VELHSIM_LAUNCHER, "--machine", machine, "--run-dir",
                                             dir.Path("run"), "--"});
        }
        const RunResult result = Execute(command, dir.Path());
        // Each separator stands for the command whose output follows it.
        std::string actual = result.Out;
        size_t at = 0;
        for (const std::string& command : commands) {
            if ((at = actual.find("\036\n", at)) != std::string::npos) {
                actual.replace(at, 2, command);
            }
        }
        for (const auto& [path, token] :
             {std::pair{dir.Path("run"), "RUN"}, {dir.Path(), "SCRATCH"}}) {
            while ((at = actual.find(path)) != std::string::npos) {
                actual.replace(at, path.size(), token);
            }
        }
        EXPECT_EQ(actual, expected) << name;
        EXPECT_EQ(result.Err, "") << name;
        EXPECT_EQ(Snapshot(machine), before) << name;
    }
}

TEST(Velhsim, MakesANamedRunFolderAndEndsWhatTheCommandLeftRunning) {
    const ScratchDir dir;
    const RunResult result =
        Execute({VELHSIM_LAUNCHER, "--machine", CopyTestMachine(dir), "--", "sh", "-c",
                 "echo $VELHSIM_RUN; pwd; (sleep 1; touch $VELHSIM_RUN/survivor) &"});
    ASSERT_EQ(result.Status, 0) << result.Err;
    const std::string run = result.Out.substr(0, result.Out.find('\n'));
    EXPECT_EQ(run.rfind("/tmp/velhsim.", 0), 0u) << run;
    EXPECT_EQ(result.Out, run + "\n" + run + "/install\n");
    EXPECT_THAT(result.Err, HasSubstr("velhsim: run folder " + run + "\n"));
    std::this_thread::sleep_for(std::chrono::seconds(2));
    EXPECT_TRUE(fs::exists(run + "/driver/asl.bin"));
    EXPECT_FALSE(fs::exists(run + "/survivor"));
    fs::remove_all(run);
}

TEST(Velhsim, ResolvesRelativeArgumentsFromWhereItStarted) {
    const ScratchDir dir;
    const std::string machine = CopyTestMachine(dir);
    const std::string origin = dir.Path("origin");
    for (const char* name :
         {"data/x.txt", "build/agent.jar", "lib/a.jar", "tools/run", "dbgprint"}) {
        fs::create_directories(fs::path(origin + "/" + name).parent_path());
        dir.Write("origin/" + std::string(name), "#!/bin/sh\nprintf '%s\\n' \"$0\" \"$@\"\n");
    }
    fs::permissions(origin + "/tools/run", fs::perms::owner_exec, fs::perm_options::add);
    // Options with a path, class path lists, the command; a name that also exists in the install
    // folder (dbgprint) means the install folder's file.
    const RunResult result = Execute(
        {VELHSIM_LAUNCHER, "--machine", machine, "--run-dir", dir.Path("run"), "--", "tools/run",
         "-Djava.library.path=build", "-cp", "build/agent.jar:lib/a.jar:missing.jar", "/abs/build",
         "com.example.Main", "build", "-Dx=", "LIST=data:nothing-here:data/x.txt", "dbgprint"},
        origin);
    EXPECT_EQ(result.Out, origin + "/tools/run\n-Djava.library.path=" + origin + "/build\n-cp\n" +
                              origin + "/build/agent.jar:" + origin +
                              "/lib/a.jar:missing.jar\n/abs/build\ncom.example.Main\n" + origin +
                              "/build\n-Dx=\nLIST=" + origin + "/data:nothing-here:" + origin +
                              "/data/x.txt\ndbgprint\n")
        << result.Err;
    // A command without a folder is left to PATH.
    EXPECT_EQ(ResolveArguments({"build"}, origin, machine + "/install")[0], "build");
}

TEST(Velhsim, RunsUnprivilegedInAUserNamespace) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "every other test already runs without root";
    }
    // Copies of the launcher, its preload library, the probe and a machine that the unprivileged
    // user can reach.
    const ScratchDir dir;
    const std::string machine = CopyTestMachine(dir);
    const std::string bin = dir.Path("bin");
    const std::string launcher = VELHSIM_LAUNCHER;
    ASSERT_EQ(
        Execute({"sh", "-c", "mkdir $0 && cp $1 $2 $3 $0 && chmod -R a+rX $4 && chmod a+w $4", bin,
                 launcher, launcher.substr(0, launcher.rfind('/')) + "/libvelhsim-preload.so",
                 VELHSIM_PROBE, dir.Path()})
            .Status,
        0);
    const RunResult result =
        Execute({"setpriv", "--reuid=65534", "--regid=65534", "--clear-groups", bin + "/velhsim",
                 "--machine", machine, "--run-dir", dir.Path("run"), "--", "sh", "-c",
                 "id -u; head -1 /etc/SuSE-release; " + bin + "/velhsim_probe version; " + bin +
                     "/velhsim_probe uname; od -An -c -j $((0xF1234 + 2)) -N 3 /dev/mem"});
    EXPECT_EQ(result.Out,
              "65534\nSuSE SLES-8 (i386)\nversion 1.2.3\nrelease 2.4.19-64GB-SMP\n   V   P   D\n")
        << result.Err;
}

}  // namespace
}  // namespace velhsim::test
