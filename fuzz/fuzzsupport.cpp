#include "fuzz/fuzzsupport.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>

#include "adapters/modquery.h"
#include "diag/hwdebug.h"

namespace {

std::string ScratchRoot;
size_t ReportedCount = 0;
std::vector<uint8_t> Answer;

// query_module's contract: too small a buffer fails with ENOSPC and the size it needs.
int FakeQueryModule(const char*, int which, void* buffer, size_t size, size_t* ret) {
    errno = which != QM_SYMBOLS && which != QM_INFO ? EINVAL : size < Answer.size() ? ENOSPC : 0;
    *ret = errno == ENOSPC || which == QM_INFO ? Answer.size() : ReportedCount;
    if (errno == 0) {
        std::copy(Answer.begin(), Answer.end(), static_cast<uint8_t*>(buffer));
    }
    return errno == 0 ? 0 : -1;
}

// libFuzzer reads its arguments only after LLVMFuzzerInitialize: the paths in them (corpus
// folders, inputs, artifact prefix, dictionary) are made absolute here, since the harness is
// about to leave the folder they were given from. Crashes go there unless a prefix is given.
void AnchorPaths(int* argc, char*** argv, const std::string& directory) {
    static std::vector<std::string> arguments(*argv, *argv + *argc);
    static std::vector<char*> anchored;
    // libFuzzer takes the last of a repeated flag: a prefix given by the caller wins over this.
    arguments.insert(arguments.begin() + 1, "-artifact_prefix=" + directory + "/");
    for (std::string& argument : arguments) {
        size_t at = argument.empty() || argument[0] != '-' ? 0 : std::string::npos;
        for (const char* flag : {"-artifact_prefix=", "-exact_artifact_path=", "-dict="}) {
            at = argument.rfind(flag, 0) == 0 ? std::strlen(flag) : at;
        }
        if (&argument != &arguments[0] && at < argument.size() && argument[at] != '/') {
            argument.insert(at, directory + "/");
        }
        anchored.push_back(argument.data());
    }
    anchored.push_back(nullptr);
    *argc = static_cast<int>(arguments.size());
    *argv = anchored.data();
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int* argc, char*** argv) {
    if (argc != nullptr && argv != nullptr && *argc > 0) {
        AnchorPaths(argc, argv, std::filesystem::current_path());
    }
    // The library opens and closes its log for every line: a tree in memory keeps that fast.
    const char* tmp = std::getenv("TMPDIR");
    ScratchRoot = std::string(tmp != nullptr && *tmp != '\0'         ? tmp
                              : access("/dev/shm", W_OK | X_OK) == 0 ? "/dev/shm"
                                                                     : "/tmp") +
                  "/velhfuzz.XXXXXX";
    Check(mkdtemp(ScratchRoot.data()) != nullptr, "cannot make a scratch directory " + ScratchRoot);
    std::atexit([] {
        std::error_code ignored;
        std::filesystem::remove_all(ScratchRoot, ignored);
    });
    Check(mkdir(ScratchPath("inst").c_str(), 0700) == 0 &&
              mkdir(ScratchPath("log").c_str(), 0700) == 0 &&
              chdir(ScratchPath("inst").c_str()) == 0,
          "cannot make and enter " + ScratchPath("inst"));
    if (SetUpHarness != nullptr) {
        SetUpHarness();
    }
    return 0;
}

std::string ScratchPath(const std::string& name) {
    return ScratchRoot + "/" + name;
}

InputScope::InputScope() {
    ResetDebugOut();
    HwInfoPrintLevel = 0;
}

InputScope::~InputScope() {
    SystemList.DestroyAll();
    BusList.DestroyAll();
    SlotList.DestroyAll();
    AdapterList.DestroyAll();
}

void WriteFile(const std::string& path, const uint8_t* data, size_t size) {
    FILE* file = std::fopen(path.c_str(), "wb");
    const bool written = file != nullptr && (size == 0 || std::fwrite(data, 1, size, file) == size);
    Check(file != nullptr && std::fclose(file) == 0 && written, "cannot write " + path);
}

FILE* InputStream(const uint8_t* data, size_t size) {
    static std::string bytes;
    static FILE* stream = nullptr;
    if (stream != nullptr) {
        std::fclose(stream);
    }
    bytes.assign(data, data + size);
    stream = fmemopen(bytes.data(), size, "r");
    Check(stream != nullptr, "cannot make a stream of the input");
    return stream;
}

void AnswerQueryModule(const uint8_t* data, size_t size) {
    SysCalls().QueryModule = FakeQueryModule;
    ReportedCount = data[0] | static_cast<size_t>(data[1]) << 8;
    Answer.assign(data + 2, data + size);
}

void Check(bool holds, const std::string& violation) {
    if (!holds) {
        std::fprintf(stderr, "fuzz harness: violated: %s\n", violation.c_str());
        std::abort();
    }
}
