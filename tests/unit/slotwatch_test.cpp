#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <regex>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "scratchdir.h"
#include "slotwatch/devlist.h"

namespace {

std::string Line(const char* key, const char* ids, const char* driver) {
    std::string line = std::string(key) + "\t" + ids + "\t5";
    for (int i = 0; i < 14; ++i) {
        line += "\t00000000";
    }
    return line + (driver != nullptr ? std::string("\t") + driver : "") + "\n";
}

pid_t Start(std::vector<const char*> args) {
    args.insert(args.begin(), "slotwatch");
    args.push_back(nullptr);
    pid_t child = fork();
    if (child == 0) {
        execv(SLOTWATCH_BINARY, const_cast<char**>(args.data()));
        _exit(127);
    }
    return child;
}

int ExitCode(pid_t child) {
    int status = 0;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

}  // namespace

TEST(SlotwatchDeviceList, ParsesKernelLinesAndReportsChangesInKeyOrder) {
    std::istringstream first(Line("0008", "80861010", "e1000") + Line("0010", "10de0020", nullptr) +
                             "garbage line\n" + Line("zz00", "80861010", nullptr) + "\n" +
                             Line("02fb", "9005008f", "aic79xx"));
    std::istringstream second(Line("0008", "80861010", nullptr) + Line("0018", "14e41644", "tg3") +
                              Line("02fb", "9005008f", "aic79xx"));
    int skipped = 0;
    DeviceList before = ParseDeviceList(first, &skipped);
    DeviceList after = ParseDeviceList(second, nullptr);
    EXPECT_EQ(skipped, 2);
    EXPECT_EQ(before.size(), 3u);
    EXPECT_EQ(DiffDeviceLists(before, after), std::vector<std::string>({
                                                  "changed 00:01.0 8086:1010 e1000 -> 00:01.0 "
                                                  "8086:1010",
                                                  "removed 00:02.0 10de:0020",
                                                  "added 00:03.0 14e4:1644 tg3",
                                              }));
    EXPECT_EQ(DescribeFunction(after.at(0x02fb)), "02:1f.3 9005:008f aic79xx");
    EXPECT_TRUE(DiffDeviceLists(after, after).empty());
}

TEST(SlotwatchProgram, RefusesAnUnknownOption) {
    EXPECT_EQ(ExitCode(Start({"--once", "--bogus", "5"})), 2);
}

TEST(SlotwatchProgram, LogsHotPlugEventsAndStopsOnTerm) {
    ScratchDir dir;
    dir.Write("devices", Line("0008", "80861010", "e1000"));
    pid_t child = Start({"--devices", dir.Path("devices").c_str(), "--log",
                         dir.Path("slotwatch.log").c_str(), "--interval", "0.05"});
    ASSERT_GT(child, 0);
    auto waitFor = [&](const std::string& text) {
        for (int i = 0; i < 400; ++i) {
            if (dir.Read("slotwatch.log").find(text) != std::string::npos) {
                return true;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(25));
        }
        return false;
    };
    EXPECT_TRUE(waitFor("1 function(s) present"));
    dir.Write("devices", Line("0008", "80861010", "e1000") + Line("0110", "9005008f", "aic79xx"));
    EXPECT_TRUE(waitFor("added 01:02.0 9005:008f aic79xx"));
    std::remove(dir.Path("devices").c_str());
    EXPECT_TRUE(waitFor("error: " + dir.Path("devices")));
    dir.Write("devices", Line("0110", "9005008f", "aic79xx"));
    EXPECT_TRUE(waitFor("removed 00:01.0 8086:1010 e1000"));

    kill(child, SIGTERM);
    EXPECT_EQ(ExitCode(child), 0);
    // Every line has its time; the recovery is told once.
    const std::string log = dir.Read("slotwatch.log");
    EXPECT_TRUE(
        std::regex_match(log, std::regex("(\\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\d .*\n)+")))
        << log;
    EXPECT_NE(log.find("readable again"), std::string::npos);
    EXPECT_EQ(log.find("readable again"), log.rfind("readable again")) << log;
    EXPECT_NE(log.find("slotwatch stopped"), std::string::npos);
}
