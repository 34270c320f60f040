#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>

#include "slotwatch/devlist.h"

namespace fs = std::filesystem;

namespace {

std::string Line(const char* key, const char* ids, const char* driver) {
    std::string line = std::string(key) + "\t" + ids + "\t5";
    for (int i = 0; i < 14; ++i) {
        line += "\t00000000";
    }
    if (driver != nullptr) {
        line += std::string("\t") + driver;
    }
    return line + "\n";
}

std::string ReadAll(const fs::path& path) {
    std::ifstream in(path);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

}  // namespace

TEST(SlotwatchDeviceList, ParsesKernelLinesAndSkipsMalformedOnes) {
    std::istringstream in(Line("0018", "80861010", "e1000") + Line("02fb", "10de0020", nullptr) +
                          "garbage line\n" + Line("zz00", "80861010", nullptr) + "\n");
    int skipped = 0;
    DeviceList list = ParseDeviceList(in, &skipped);
    EXPECT_EQ(skipped, 2);
    ASSERT_EQ(list.size(), 2u);
    EXPECT_EQ(DescribeFunction(list.at(0x0018)), "00:03.0 8086:1010 e1000");
    EXPECT_EQ(DescribeFunction(list.at(0x02fb)), "02:1f.3 10de:0020");
}

TEST(SlotwatchDeviceList, DiffReportsAddedRemovedAndChangedInKeyOrder) {
    std::istringstream first(Line("0008", "80861010", "e1000") + Line("0010", "10de0020", nullptr) +
                             Line("0100", "9005008f", "aic79xx"));
    std::istringstream second(Line("0008", "80861010", nullptr) + Line("0018", "14e41644", "tg3") +
                              Line("0100", "9005008f", "aic79xx"));
    DeviceList before = ParseDeviceList(first, nullptr);
    DeviceList after = ParseDeviceList(second, nullptr);
    std::vector<std::string> expected = {
        "changed 00:01.0 8086:1010 e1000 -> 00:01.0 8086:1010",
        "removed 00:02.0 10de:0020",
        "added 00:03.0 14e4:1644 tg3",
    };
    EXPECT_EQ(DiffDeviceLists(before, after), expected);
    EXPECT_TRUE(DiffDeviceLists(after, after).empty());
}

TEST(SlotwatchProgram, LogsHotPlugEventsAndStopsOnTerm) {
    fs::path dir = fs::temp_directory_path() / ("slotwatch-" + std::to_string(getpid()));
    fs::create_directories(dir);
    fs::path devices = dir / "devices";
    fs::path log = dir / "slotwatch.log";
    std::ofstream(devices) << Line("0008", "80861010", "e1000");

    pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        execl(SLOTWATCH_BINARY, "slotwatch", "--devices", devices.c_str(), "--log", log.c_str(),
              "--interval", "0.05", static_cast<char*>(nullptr));
        _exit(127);
    }
    auto waitFor = [&](const std::string& text) {
        for (int i = 0; i < 400; ++i) {
            if (ReadAll(log).find(text) != std::string::npos) {
                return true;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(25));
        }
        return false;
    };
    EXPECT_TRUE(waitFor("1 function(s) present"));
    std::ofstream(devices) << Line("0008", "80861010", "e1000") +
                                  Line("0110", "9005008f", "aic79xx");
    EXPECT_TRUE(waitFor("added 01:02.0 9005:008f aic79xx"));
    fs::remove(devices);
    EXPECT_TRUE(waitFor("error: " + devices.string()));
    std::ofstream(devices) << Line("0110", "9005008f", "aic79xx");
    EXPECT_TRUE(waitFor("removed 00:01.0 8086:1010 e1000"));

    kill(child, SIGTERM);
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 0);
    EXPECT_NE(ReadAll(log).find("slotwatch stopped"), std::string::npos);
    fs::remove_all(dir);
}
