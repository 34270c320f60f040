#include "fuzz/fuzzsupport.h"

#include <ftw.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "dbglevel.h"
#include "diag/hwdebug.h"

namespace {

std::string ScratchRoot;

void RemoveScratch() {
    if (ScratchRoot.empty()) {
        return;
    }
    nftw(
        ScratchRoot.c_str(),
        [](const char* path, const struct stat*, int, struct FTW*) { return std::remove(path); },
        16, FTW_DEPTH | FTW_PHYS);
}

[[noreturn]] void SetupFailed(const char* what, const std::string& path) {
    std::fprintf(stderr, "fuzz harness: %s %s\n", what, path.c_str());
    std::abort();
}

std::string Absolute(const std::string& path, const std::string& directory) {
    return path.empty() || path[0] == '/' ? path : directory + "/" + path;
}

bool StartsWith(const std::string& text, const std::string& prefix) {
    return text.compare(0, prefix.size(), prefix) == 0;
}

// libFuzzer reads its arguments only after LLVMFuzzerInitialize: the paths in them (corpus
// folders, inputs, artifact prefix, dictionary) are made absolute here, since the harness is
// about to leave the directory they were given from. Without an artifact prefix, crashes are
// written where the run was started, as usual.
void AnchorPaths(int* argc, char*** argv, const std::string& directory) {
    static std::vector<std::string> storage;
    static std::vector<char*> anchored;
    bool prefixGiven = false;
    for (int i = 0; i < *argc; i++) {
        std::string argument = (*argv)[i];
        if (i > 0 && !argument.empty() && argument[0] != '-') {
            argument = Absolute(argument, directory);
        }
        for (const char* flag : {"-artifact_prefix=", "-exact_artifact_path=", "-dict="}) {
            if (i > 0 && StartsWith(argument, flag)) {
                argument = flag + Absolute(argument.substr(std::strlen(flag)), directory);
            }
        }
        prefixGiven = prefixGiven || (i > 0 && StartsWith(argument, "-artifact_prefix="));
        storage.push_back(argument);
    }
    if (!prefixGiven) {
        storage.push_back("-artifact_prefix=" + directory + "/");
    }
    for (std::string& argument : storage) {
        anchored.push_back(argument.data());
    }
    anchored.push_back(nullptr);
    *argc = static_cast<int>(storage.size());
    *argv = anchored.data();
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int* argc, char*** argv) {
    char* started = getcwd(nullptr, 0);
    if (started == nullptr) {
        SetupFailed("cannot tell the working directory", "");
    }
    if (argc != nullptr && argv != nullptr) {
        AnchorPaths(argc, argv, started);
    }
    std::free(started);

    // The library opens and closes its log for every line: a tree in memory keeps that fast.
    const char* tmp = std::getenv("TMPDIR");
    std::string base = tmp != nullptr && *tmp != '\0'         ? tmp
                       : access("/dev/shm", W_OK | X_OK) == 0 ? "/dev/shm"
                                                              : "/tmp";
    std::string pattern = base + "/velhfuzz.XXXXXX";
    if (mkdtemp(pattern.data()) == nullptr) {
        SetupFailed("cannot make a scratch directory from", pattern);
    }
    ScratchRoot = pattern;
    std::atexit(RemoveScratch);
    for (const char* name : {"inst", "log"}) {
        if (mkdir(ScratchPath(name).c_str(), 0700) != 0) {
            SetupFailed("cannot make", ScratchPath(name));
        }
    }
    if (chdir(ScratchPath("inst").c_str()) != 0) {
        SetupFailed("cannot enter", ScratchPath("inst"));
    }
    if (SetUpHarness != nullptr) {
        SetUpHarness();
    }
    return 0;
}

std::string ScratchPath(const std::string& name) {
    return ScratchRoot + "/" + name;
}

void StartInput() {
    ResetDebugOut();
    HwInfoPrintLevel = 0;
}

void WriteFile(const std::string& path, const uint8_t* data, size_t size) {
    FILE* file = std::fopen(path.c_str(), "wb");
    if (file == nullptr) {
        SetupFailed("cannot write", path);
    }
    const bool written = size == 0 || std::fwrite(data, 1, size, file) == size;
    if (std::fclose(file) != 0 || !written) {
        SetupFailed("cannot write", path);
    }
}

InputStream::InputStream(const uint8_t* data, size_t size) : Bytes(data, data + size) {
    Bytes.push_back('\0');
    Stream = fmemopen(Bytes.data(), size, "r");
}

InputStream::~InputStream() {
    if (Stream != nullptr) {
        std::fclose(Stream);
    }
}

FILE* InputStream::FromStart() {
    if (Stream == nullptr) {
        Violated("cannot make a stream of the input");
    }
    std::rewind(Stream);
    return Stream;
}

void Violated(const char* what) {
    std::fprintf(stderr, "fuzz harness: violated: %s\n", what);
    std::abort();
}
