#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <string>

#include "diag/hwdebug.h"
#include "diag/linport.h"
#include "scratchdir.h"

namespace {

std::wstring Widened(const char* text) {
    std::wstring wide;
    for (; *text != '\0'; text++) {
        wide += static_cast<wchar_t>(static_cast<unsigned char>(*text));
    }
    return wide;
}

// An opener that fails with a chosen errno a given number of times, counting its calls.
int Calls = 0;
int FailuresLeft = 0;
int FailWith = 0;
FILE* FakeOpen(const char*, const char*) {
    Calls++;
    if (FailuresLeft > 0) {
        FailuresLeft--;
        errno = FailWith;
        return nullptr;
    }
    return std::fopen("/dev/null", "a");
}

int OpenAttempts(int failures, int error) {
    Calls = 0;
    FailuresLeft = failures;
    FailWith = error;
    FILE* file = OpenLogFile("log", "a", FakeOpen);
    if (file != nullptr) {
        std::fclose(file);
    }
    return Calls;
}

}  // namespace

TEST(FormatMessage, CopiesOrAllocatesTheSystemText) {
    const std::wstring expected = Widened(std::strerror(ENOENT));
    EXPECT_EQ(FormatMessage(0, nullptr, ENOENT, 0, nullptr, 0, nullptr), 0);
    EXPECT_EQ(FormatMessage(0, nullptr, ENOENT, 0, nullptr, 10, nullptr), 0);

    wchar_t* text = nullptr;
    EXPECT_EQ(FormatMessage(0x70000, nullptr, ENOENT, 0x10001, reinterpret_cast<wchar_t*>(&text), 0,
                            nullptr),
              static_cast<int32_t>(expected.size()));
    ASSERT_NE(text, nullptr);
    EXPECT_EQ(std::wstring(text), expected);
    EXPECT_EQ(LocalFree(text), nullptr);
    EXPECT_EQ(LocalFree(nullptr), nullptr);

    wchar_t buffer[8];
    EXPECT_EQ(FormatMessage(0, nullptr, ENOENT, 0, buffer, 5, nullptr), 4);
    EXPECT_EQ(std::wstring(buffer), expected.substr(0, 4));
    buffer[0] = L'x';
    EXPECT_EQ(FormatMessage(0, nullptr, ENOENT, 0, buffer, 0, nullptr), 0);
    EXPECT_EQ(buffer[0], L'x');

    MessageAlloc = [](size_t) -> void* { return nullptr; };
    text = buffer;
    EXPECT_EQ(FormatMessage(0x70000, nullptr, ENOENT, 0x10001, reinterpret_cast<wchar_t*>(&text), 0,
                            nullptr),
              0);
    EXPECT_EQ(text, nullptr);
    MessageAlloc = std::malloc;
}

TEST(CaseShims, ConvertInPlaceAndReturnTheArgument) {
    char narrow[] = "Ab1-\xE9z";
    EXPECT_EQ(_strupr(narrow), narrow);
    EXPECT_STREQ(narrow, "AB1-\xE9Z");
    EXPECT_EQ(_strlwr(narrow), narrow);
    EXPECT_STREQ(narrow, "ab1-\xE9z");
    wchar_t wide[] = L"Ab1-z";
    EXPECT_EQ(_wcsupr(wide), wide);
    EXPECT_STREQ(wide, L"AB1-Z");
    EXPECT_EQ(_wcslwr(wide), wide);
    EXPECT_STREQ(wide, L"ab1-z");
    EXPECT_EQ(_strupr(nullptr), nullptr);
    EXPECT_EQ(_wcslwr(nullptr), nullptr);

    errno = EPERM;
    EXPECT_EQ(GetLastError(), EPERM);
}

TEST(OpenLogFile, RetriesOnlyFailuresThatCanPassAndIsBounded) {
    for (auto [failures, error, calls] : {std::tuple{0, 0, 1},
                                          {5, ENOENT, 1},
                                          {5, EACCES, 1},
                                          {2, EINTR, 3},
                                          {1, EAGAIN, 2},
                                          {3, ENFILE, 4},
                                          {LOG_OPEN_ATTEMPTS + 10, EMFILE, LOG_OPEN_ATTEMPTS}}) {
        EXPECT_EQ(OpenAttempts(failures, error), calls) << error;
    }
}

TEST(OutputDebugString, AppendsVerbatimAndKeepsErrnoAndWritesNothingWithoutTheLogFolder) {
    {
        InstallTree tree;
        errno = EBUSY;
        OutputDebugString(L"one\n");
        OutputDebugString(L"two %s no newline");
        OutputDebugString(nullptr);
        EXPECT_EQ(errno, EBUSY);
        EXPECT_EQ(tree.Log(), "one\ntwo %s no newline");
    }
    ScratchDir dir;
    ASSERT_EQ(mkdir(dir.Path("inst").c_str(), 0700), 0);
    WorkingDir cwd(dir.Path("inst"));
    errno = EBUSY;
    OutputDebugString(L"lost\n");
    EXPECT_EQ(errno, EBUSY);
    ResetDebugOut();
    EXPECT_NE(access(dir.Path("log").c_str(), F_OK), 0);
}
