// The monitor as a program: its log of a device list that changes under it, and its options.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <ctime>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "scratchdir.h"

namespace {

// Key, vendor and device, interrupt, seven base addresses and seven sizes, and maybe a driver.
std::string Line(const char* key, const char* ids, const char* driver = nullptr) {
    return std::string(key) + "\t" + ids + "\t5\t0\t0\t0\t0\t0\t0\t0\t0\t0\t0\t0\t0\t0\t0" +
           (driver != nullptr ? std::string("\t") + driver : "") + "\n";
}

pid_t Start(std::vector<const char*> args) {
    args.insert(args.begin(), SLOTWATCH_BINARY);
#ifdef SLOTWATCH_EMULATOR
    // A 32-bit build's monitor runs under the tests' own emulator, whatever the kernel can run.
    args.insert(args.begin(), SLOTWATCH_EMULATOR);
#endif
    args.push_back(nullptr);
    pid_t child = fork();
    if (child == 0) {
        execv(args[0], const_cast<char**>(args.data()));
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

TEST(SlotwatchProgram, LogsEachChangeOfTheDeviceListAndRefusesAnUnknownOption) {
    EXPECT_EQ(ExitCode(Start({"--once", "--bogus", "5"})), 2);
    ScratchDir dir;
    const std::string devices = dir.Path("devices");
    // Replaced whole, so that no read sees half a list.
    auto write = [&](const std::string& text) {
        dir.Write("devices.new", text);
        ASSERT_EQ(std::rename(dir.Path("devices.new").c_str(), devices.c_str()), 0);
    };
    write(Line("0008", "80861010", "e1000") + Line("0010", "10de0020") + "garbage line\n" +
          Line("zz00", "80861010") + "\n");
    pid_t child = Start(
        {"--devices", devices.c_str(), "--log", dir.Path("log").c_str(), "--interval", "0.05"});
    ASSERT_GT(child, 0);
    // The log without its times, once it holds the line wanted.
    auto logUntil = [&](const std::string& last) {
        std::string log;
        for (int i = 0; i < 400 && log.find(last) == std::string::npos; ++i) {
            std::this_thread::sleep_for(std::chrono::milliseconds(25));
            log = dir.Read("log");
        }
        std::istringstream lines(log);
        std::string bare;
        for (std::string line; std::getline(lines, line);) {
            struct tm time {};
            const char* rest = strptime(line.c_str(), "%Y-%m-%dT%H:%M:%S ", &time);
            bare += std::string(rest != nullptr ? rest : line.c_str()) + "\n";
        }
        return bare;
    };
    logUntil("skipped");
    write(Line("0008", "80861010") + Line("0018", "14e41644", "tg3") +
          Line("02fb", "9005008f", "aic79xx"));
    logUntil("02:1f.3");
    std::remove(devices.c_str());
    logUntil("No such file");
    write(Line("02fb", "9005008f", "aic79xx"));
    logUntil("removed 00:03.0");
    kill(child, SIGTERM);
    EXPECT_EQ(ExitCode(child), 0);
    EXPECT_EQ(logUntil("stopped"), "slotwatch started, watching " + devices +
                                       ", 2 function(s) present\n"
                                       "error: " +
                                       devices +
                                       ": 2 malformed line(s) skipped\n"
                                       "changed 00:01.0 8086:1010 e1000 -> 00:01.0 8086:1010\n"
                                       "removed 00:02.0 10de:0020\n"
                                       "added 00:03.0 14e4:1644 tg3\n"
                                       "added 02:1f.3 9005:008f aic79xx\n"
                                       "error: " +
                                       devices +
                                       ": No such file or directory\n"
                                       "device list readable again\n"
                                       "removed 00:01.0 8086:1010\n"
                                       "removed 00:03.0 14e4:1644 tg3\n"
                                       "slotwatch stopped\n");
}
