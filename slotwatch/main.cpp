// slotwatch: the agent's event monitor. It watches the kernel's PCI device list and writes a
// line to its log whenever a function appears, disappears or changes its driver, until it is
// asked to stop (the agent stops it with killall, that is SIGTERM).

#include <signal.h>
#include <time.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "slotwatch/devlist.h"

namespace {

volatile sig_atomic_t StopRequested = 0;

void OnStopSignal(int) {
    StopRequested = 1;
}

struct Options {
    std::string Devices = "/proc/bus/pci/devices";
    std::string Log = "../log/slotwatch.log";
    double Interval = 2.0;
    bool Once = false;
};

void Usage() {
    std::fputs(
        "usage: slotwatch [--devices FILE] [--log FILE] [--interval SECONDS] [--once]\n"
        "  Watches the PCI device list and logs functions that appear, disappear or change\n"
        "  driver. --once prints the present functions and exits.\n",
        stderr);
}

bool ParseOptions(int argc, char** argv, Options* options) {
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i];
        bool hasValue = i + 1 < argc;
        if (arg == "--once") {
            options->Once = true;
        } else if (arg == "--devices" && hasValue) {
            options->Devices = argv[++i];
        } else if (arg == "--log" && hasValue) {
            options->Log = argv[++i];
        } else if (arg == "--interval" && hasValue) {
            char* end = nullptr;
            options->Interval = std::strtod(argv[++i], &end);
            if (*end != '\0' || !(options->Interval >= 0.01 && options->Interval <= 3600)) {
                std::fputs("slotwatch: interval must be between 0.01 and 3600 seconds\n", stderr);
                return false;
            }
        } else {
            Usage();
            return false;
        }
    }
    return true;
}

void LogLine(const Options& options, const std::string& text) {
    char stamp[32] = "";
    time_t now = time(nullptr);
    struct tm local {};
    if (localtime_r(&now, &local) != nullptr) {
        strftime(stamp, sizeof stamp, "%Y-%m-%dT%H:%M:%S", &local);
    }
    // Opened per line so that nothing waits in a buffer and a rotated log is picked up.
    if (std::FILE* log = std::fopen(options.Log.c_str(), "a")) {
        std::fprintf(log, "%s %s\n", stamp, text.c_str());
        std::fclose(log);
    } else {
        std::fprintf(stderr, "slotwatch: %s %s\n", stamp, text.c_str());
    }
}

bool ReadDevices(const Options& options, DeviceList* list, std::string* error) {
    std::FILE* in = std::fopen(options.Devices.c_str(), "r");
    if (in == nullptr) {
        *error = options.Devices + ": " + std::strerror(errno);
        return false;
    }
    int skipped = 0;
    *list = ParseDeviceList(in, &skipped);
    std::fclose(in);
    if (skipped > 0) {
        *error = options.Devices + ": " + std::to_string(skipped) + " malformed line(s) skipped";
    }
    return true;
}

void Pause(double seconds) {
    struct timespec delay {};
    delay.tv_sec = static_cast<time_t>(seconds);
    delay.tv_nsec = static_cast<long>((seconds - static_cast<double>(delay.tv_sec)) * 1e9);
    // A stop signal interrupts the sleep, so the monitor ends promptly.
    nanosleep(&delay, nullptr);
}

int Watch(const Options& options) {
    DeviceList current;
    std::string error;
    bool readable = ReadDevices(options, &current, &error);
    LogLine(options, "slotwatch started, watching " + options.Devices + ", " +
                         std::to_string(current.size()) + " function(s) present");
    if (!error.empty()) {
        LogLine(options, "error: " + error);
    }
    while (!StopRequested) {
        Pause(options.Interval);
        if (StopRequested) {
            break;
        }
        DeviceList next;
        std::string readError;
        if (!ReadDevices(options, &next, &readError)) {
            if (readable) {
                LogLine(options, "error: " + readError);
            }
            readable = false;
            continue;
        }
        if (!readable) {
            LogLine(options, "device list readable again");
        }
        readable = true;
        for (const std::string& change : DiffDeviceLists(current, next)) {
            LogLine(options, change);
        }
        current = std::move(next);
    }
    LogLine(options, "slotwatch stopped");
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    if (!ParseOptions(argc, argv, &options)) {
        return 2;
    }
    if (options.Once) {
        DeviceList list;
        std::string error;
        if (!ReadDevices(options, &list, &error)) {
            std::fprintf(stderr, "slotwatch: %s\n", error.c_str());
            return 1;
        }
        for (const PciFunction& function : list) {
            std::printf("%s\n", DescribeFunction(function).c_str());
        }
        return 0;
    }
    struct sigaction action {};
    action.sa_handler = OnStopSignal;
    sigemptyset(&action.sa_mask);
    sigaction(SIGTERM, &action, nullptr);
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGHUP, &action, nullptr);
    return Watch(options);
}
