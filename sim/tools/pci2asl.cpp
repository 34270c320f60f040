// pci2asl: compiles a PCI architecture file into the ASL table that the simulated slot driver
// hands out, with the library's own reader, so that a simulated machine's slots are written as
// readable text.
//
//   pci2asl [--lenient] INPUT.pci OUTPUT.bin
//
// The reader writes its complaints to the hardware-information log beside its working
// directory; the tool runs it in a scratch directory and copies that log to stderr. Without
// --lenient a file that drew complaints, or that has no "VHSL" header line, gives no output and a
// non-zero exit.
#include <fcntl.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>
#include <string>

#include "asl.h"
#include "diag/hwdebug.h"
#include "filehandle.h"
#include "sources/filetabl.h"

namespace {

std::string SystemError() {
    return std::strerror(errno);
}

// A scratch directory holding "run" (the reader's working directory) and "log" (where its log
// lands); removed with everything in it.
class Scratch {
  public:
    bool Create() {
        const char* tmp = getenv("TMPDIR");
        std::string pattern =
            std::string(tmp != nullptr && *tmp != '\0' ? tmp : "/tmp") + "/pci2asl.XXXXXX";
        if (mkdtemp(pattern.data()) == nullptr) {
            return false;
        }
        Root = pattern;
        return mkdir(Run().c_str(), 0700) == 0 && mkdir((Root + "/log").c_str(), 0700) == 0;
    }
    ~Scratch() {
        if (Root.empty()) {
            return;
        }
        unlink(LogPath().c_str());
        rmdir((Root + "/log").c_str());
        rmdir(Run().c_str());
        rmdir(Root.c_str());
    }
    std::string Run() const { return Root + "/run"; }
    std::string LogPath() const { return Run() + "/" + HWINFO_LOG_PATH; }

  private:
    std::string Root;
};

// Back to the directory the tool was started in, whatever happens in between.
class ReturnDir {
  public:
    ReturnDir() : Fd(open(".", O_RDONLY | O_DIRECTORY)) {}
    ~ReturnDir() {
        if (Fd >= 0) {
            Back();
            close(Fd);
        }
    }
    ReturnDir(const ReturnDir&) = delete;
    ReturnDir& operator=(const ReturnDir&) = delete;
    bool Valid() const { return Fd >= 0; }
    bool Back() const { return fchdir(Fd) == 0; }

  private:
    int Fd;
};

int Usage() {
    std::cerr << "usage: pci2asl [--lenient] INPUT.pci OUTPUT.bin\n";
    return 2;
}

int Fail(const std::string& text) {
    std::cerr << "pci2asl: " << text << "\n";
    return 1;
}

}  // namespace

int main(int argc, char** argv) {
    bool lenient = false;
    int first = 1;
    if (argc > 1 && std::strcmp(argv[1], "--lenient") == 0) {
        lenient = true;
        first = 2;
    }
    if (argc - first != 2) {
        return Usage();
    }
    const std::string input = argv[first];
    const std::string output = argv[first + 1];

    UniqueFile stream(std::fopen(input.c_str(), "r"));
    if (stream == nullptr) {
        return Fail(input + ": " + SystemError());
    }
    Scratch scratch;
    if (!scratch.Create()) {
        return Fail("cannot create a scratch directory: " + SystemError());
    }
    auto packet = std::make_unique<_ASL_PACKET>();
    uint32_t packetEnd = 0;
    {
        ReturnDir home;
        if (!home.Valid() || chdir(scratch.Run().c_str()) != 0) {
            return Fail("cannot enter the scratch directory: " + SystemError());
        }
        ReadFileTable(stream.get(), packet.get(), sizeof(_ASL_PACKET), &packetEnd);
        if (!home.Back()) {
            return Fail("cannot return to the working directory: " + SystemError());
        }
    }

    std::ifstream log(scratch.LogPath(), std::ios::binary);
    std::string complaints((std::istreambuf_iterator<char>(log)), std::istreambuf_iterator<char>());
    std::cerr << complaints;
    bool headed = std::memcmp(packet->Header.Signature, ASL_SIGNATURE, sizeof(ASL_SIGNATURE)) == 0;
    if (!lenient && !complaints.empty()) {
        return Fail(input + ": the reader reported the errors above; no output written");
    }
    if (!lenient && !headed) {
        return Fail(input + ": no [table header] line with the signature VHSL; no output written");
    }

    UniqueFile out(std::fopen(output.c_str(), "wb"));
    if (out == nullptr) {
        return Fail(output + ": " + SystemError());
    }
    bool written = std::fwrite(packet.get(), 1, packetEnd, out.get()) == packetEnd;
    if (std::fclose(out.release()) != 0 || !written) {
        return Fail(output + ": write failed: " + SystemError());
    }
    return 0;
}
