#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <string>
#include <tuple>

#include "diag/hwdebug.h"
#include "diag/linport.h"
#include "scratchdir.h"

// The allocating form and the copy into a large buffer are the error reporters' own, whose log
// texts hwdebug_test checks.
TEST(FormatMessage, CutsTheTextToTheBufferAndReportsAFailedAllocation) {
    wchar_t buffer[8] = L"x";
    EXPECT_EQ(FormatMessage(0, nullptr, ENOENT, 0, nullptr, 10, nullptr), 0);
    EXPECT_EQ(FormatMessage(0, nullptr, ENOENT, 0, buffer, 0, nullptr), 0);
    EXPECT_STREQ(buffer, L"x");
    EXPECT_EQ(FormatMessage(0, nullptr, ENOENT, 0, buffer, 5, nullptr), 4);
    EXPECT_STREQ(buffer, L"No s");

    MessageAlloc = [](size_t) -> void* { return nullptr; };
    wchar_t* text = buffer;
    EXPECT_EQ(FormatMessage(0x70000, nullptr, ENOENT, 0x10001, reinterpret_cast<wchar_t*>(&text), 0,
                            nullptr),
              0);
    EXPECT_EQ(text, nullptr);
    MessageAlloc = std::malloc;
}

TEST(CaseShims, ConvertInPlaceAndReturnTheArgument) {
    char narrow[] = "Ab1-\xE9z";
    EXPECT_STREQ(_strupr(narrow), "AB1-\xE9Z");
    EXPECT_STREQ(_strlwr(narrow), "ab1-\xE9z");
    wchar_t wide[] = L"Ab1-z";
    EXPECT_STREQ(_wcsupr(wide), L"AB1-Z");
    EXPECT_STREQ(_wcslwr(wide), L"ab1-z");
    EXPECT_EQ(_strupr(nullptr), nullptr);
    EXPECT_EQ(_wcslwr(nullptr), nullptr);
}

// An opener that fails with a chosen errno a given number of times, counting its calls.
static int Calls = 0, FailuresLeft = 0, FailWith = 0;

TEST(OpenLogFile, RetriesOnlyFailuresThatCanPassAndIsBounded) {
    const auto fakeOpen = [](const char*, const char*) {
        Calls++;
        errno = FailWith;
        return FailuresLeft-- > 0 ? nullptr : std::fopen("/dev/null", "a");
    };
    using Case = std::tuple<int, int, int>;  // failures, their errno, calls made
    for (auto [failures, error, calls] :
         {Case(0, 0, 1), Case(5, ENOENT, 1), Case(5, EACCES, 1), Case(2, EINTR, 3),
          Case(1, EAGAIN, 2), Case(3, ENFILE, 4),
          Case(LOG_OPEN_ATTEMPTS + 10, EMFILE, LOG_OPEN_ATTEMPTS)}) {
        Calls = 0;
        FailuresLeft = failures;
        FailWith = error;
        if (FILE* file = OpenLogFile("log", "a", fakeOpen)) {
            std::fclose(file);
        }
        EXPECT_EQ(Calls, calls) << error;
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
