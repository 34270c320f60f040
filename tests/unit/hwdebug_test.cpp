#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <cwchar>
#include <string>
#include <utility>
#include <vector>

#include "diag/hwdebug.h"
#include "diag/linport.h"
#include "diag/progname.h"
#include "scratchdir.h"
#include "util/debuglevel.h"

namespace {

// Runs each test in an install tree with the trace state of a freshly loaded library.
class HwDebugTest : public ::testing::Test {
  protected:
    void SetUp() override {
        HwInfoPrintLevel = 0;
        EnterExitIndent = 0;
    }
    void TearDown() override {
        HwInfoPrintLevel = 0;
        EnterExitIndent = 0;
        MessageAlloc = std::malloc;
    }

    uint32_t LevelFrom(const std::string& content) {
        tree.Scratch().Write("inst/dbgprint", content);
        HwInfoPrintLevel = 0x5A5A;
        GetDebugPrintLevel(0);
        return HwInfoPrintLevel;
    }

    InstallTree tree;
};

}  // namespace

TEST_F(HwDebugTest, LevelFileLines) {
    const std::vector<std::pair<const char*, uint32_t>> cases = {
        {"", 0},
        {"HWDBGPRINT 0X10010 // dumps\n", 0x00010010},
        {"hwdbgprint 16\n", 0x10},
        {"hwdbgprint 010\n", 10},
        {"hwdbgprint -1\n", 0xFFFFFFFF},
        {"hwdbgprint0x4\n", 0x4},
        {"hwdbgprint\t \t0x20\r\n", 0x20},
        {"hwdbgprint = 5\n", 0},
        {"hwdbgprint 0x4\nhwdbgprint = 5\n", 0x4},
        {"hwdbgprint 0x4\nhwdbgprint\n", 0x4},
        {"hwdbgprint 0x4\nhwdbgprint 0x\n", 0x4},
        // "0" alone ends inside the hex pattern: no decimal reading, the level stays.
        {"hwdbgprint 0x10\nhwdbgprint 0\n", 0x10},
        {"hwdbgprint 0\n", 0},
        {"hwdbgprint 0x10\nhwdbgprint 0x2\n", 0x2},
        {"  x hwdbgprint 5\n// hwdbgprint 6\n", 0},
        {"hwdbgprintlevel 7\n", 0},
        // A last line without a line feed counts.
        {"hwdbgprint 0x40", 0x40},
        // Values beyond 32 bits clamp as on the 32-bit target.
        {"hwdbgprint 0x100000000\n", 0xFFFFFFFF},
        {"hwdbgprint 4294967296\n", 0x7FFFFFFF},
        {"hwdbgprint -4294967296\n", 0x80000000},
    };
    for (const auto& [content, level] : cases) {
        EXPECT_EQ(LevelFrom(content), level) << content;
    }
    EXPECT_EQ(tree.Log(), "");
}

TEST_F(HwDebugTest, MissingOrUnreadableLevelFileGivesLevelZero) {
    HwInfoPrintLevel = 0x10;
    GetDebugPrintLevel(1);
    EXPECT_EQ(HwInfoPrintLevel, 0u);
    ASSERT_EQ(mkdir(tree.InstFile("dbgprint").c_str(), 0700), 0);
    HwInfoPrintLevel = 0x10;
    GetDebugPrintLevel(1);
    EXPECT_EQ(HwInfoPrintLevel, 0u);
    EXPECT_EQ(tree.Log(), "");
}

TEST_F(HwDebugTest, ResetStartsANewLogWithTheHelpBlock) {
    dbgprint("from the previous acquisition\n");
    tree.Scratch().Write("inst/dbgprint", "hwdbgprint 0x80000000\n");
    ResetDebugOut();
    GetDebugPrintLevel(0);
    EXPECT_EQ(HwInfoPrintLevel, DBGPRINT_HELP);
    EXPECT_EQ(tree.Log(), "");

    GetDebugPrintLevel(1);
    EXPECT_EQ(tree.Log(), TestData("dbgprint-help.log"));
}

TEST_F(HwDebugTest, TraceAndErrorLineFormats) {
    dbgprint("%s has %d slots, %S\n", MakeWideString("drawer 100%", WideBuffer), 4, L"wide");
    dbg("StoreAslTable()", "%s", L"no newline");
    ErrMsg("GetInstallDir", "Called with a NULL buffer");
    EXPECT_EQ(tree.Log(),
              "drawer 100% has 4 slots, wide\n"
              "velhlib, StoreAslTable():  no newline"
              "\nVELHLIB, GetInstallDir:  Called with a NULL buffer\n");

    ResetDebugOut();
    FILE* missing = std::fopen("no such file", "r");
    ASSERT_EQ(missing, nullptr);
    EXPECT_EQ(LastErr(nullptr, "GetAslTable()", "Open \"%S\" failed", L"/dev/x"), 2);
    const int32_t denied = EACCES;
    errno = 0;
    EXPECT_EQ(LastErrorMsg("ioctl() failed", &denied), EACCES);
    EXPECT_EQ(tree.Log(),
              std::string("\nVELHLIB, GetAslTable():  Open \"/dev/x\" failed (0x00000002):  ") +
                  std::strerror(ENOENT) + "\n\n" +
                  "ioctl() failed (0x0000000d):  " + std::strerror(EACCES) + "\n");
}

TEST_F(HwDebugTest, TracingLeavesErrnoForTheErrorReport) {
    errno = EACCES;
    dbgprint("%s, %s:  ", _ProgramName, L"HwSetBlinkState()");
    MakeWideString(std::string(2000, 'x').c_str(), WideBuffer);  // writes its warning
    EXPECT_EQ(LastErrorMsg("ioctl() failed", nullptr), EACCES);
    EXPECT_NE(tree.Log().find("velhlib, HwSetBlinkState():  MakeWideString():  Warning"),
              std::string::npos);
}

TEST_F(HwDebugTest, ErrorTextSurvivesAFailedAllocation) {
    MessageAlloc = [](size_t) -> void* { return nullptr; };
    const int32_t error = ENOENT;
    LastErr(&error, "F", "m");
    LastErrorMsg("t", &error);
    EXPECT_EQ(tree.Log(), std::string("\nVELHLIB, F:  m (0x00000002):  ") + std::strerror(ENOENT) +
                              "\n\nt (0x00000002):  " + std::strerror(ENOENT) + "\n");
}

TEST_F(HwDebugTest, EnterExitPrefixesFollowTheDepth) {
    int32_t one = 0, two = 0, three = 0;
    Enter(&one, "A\n");  // not enabled: nothing, depth untouched
    EXPECT_EQ(EnterExitIndent, 0);
    EXPECT_EQ(tree.Log(), "");

    HwInfoPrintLevel = ENTER_EXIT;
    Enter(&one, "A(%d)\n", 1);
    Enter(&two, "B\n");
    Enter(&three, "C %s\n", L"in");
    Enter(nullptr, "plain\n");
    Exit(&three, "c\n");
    Exit(&two, "b\n");
    Exit(&one, "a\n");
    Exit(nullptr, "plain\n");
    EXPECT_EQ(one, 1);
    EXPECT_EQ(two, 2);
    EXPECT_EQ(three, 3);
    EXPECT_EQ(EnterExitIndent, 0);
    EXPECT_EQ(tree.Log(),
              "    A(1)\n"
              "    |   B\n"
              "    |   |   C in\n"
              "plain\n"
              "    |   |   c\n"
              "    |   b\n"
              "    a\n"
              "plain\n");

    // A depth beyond the buffer is cut, not overrun.
    int32_t deep = 100000;
    Exit(&deep, "x\n");
    std::string log = tree.Log();
    EXPECT_NE(log.find("MakeWideStringI():  Warning, buffer overflow\n"), std::string::npos);
    EXPECT_EQ(log.size() - log.rfind('\n') - 1, WIDE_BUFFER_CHARS - 1);
}

TEST_F(HwDebugTest, WideningLimits) {
    wchar_t target[WIDE_BUFFER_CHARS];
    std::string text(1023, 'a');
    EXPECT_EQ(MakeWideString(text.c_str(), target), target);
    EXPECT_EQ(std::wcslen(target), 1023u);
    EXPECT_EQ(tree.Log(), "");

    text += "bc";
    MakeWideString(text.c_str(), target);
    EXPECT_EQ(std::wstring(target), std::wstring(1023, L'a'));
    EXPECT_EQ(tree.Log(), "MakeWideString():  Warning, buffer overflow\n");

    ResetDebugOut();
    MakeWideStringI("ab", target, 9);
    EXPECT_STREQ(target, L"    |   |ab");
    MakeWideStringI(std::string(1015, 'x').c_str(), target, 8);
    EXPECT_EQ(std::wcslen(target), 1023u);
    EXPECT_EQ(tree.Log(), "");
    MakeWideStringI(std::string(1016, 'x').c_str(), target, 8);
    EXPECT_EQ(std::wcslen(target), 1023u);
    EXPECT_EQ(target[1022], L'x');
    MakeWideStringI("", target, 5000);
    EXPECT_EQ(std::wcslen(target), 1023u);
    EXPECT_EQ(tree.Log(),
              "MakeWideStringI():  Warning, buffer overflow\n"
              "MakeWideStringI():  Warning, buffer overflow\n");

    ResetDebugOut();
    const char bytes[] = {'a', '\0', '\xE9', 'z'};
    MakeWideStringN(bytes, target, 3);
    EXPECT_EQ(target[0], L'a');
    EXPECT_EQ(target[1], L'\0');
    EXPECT_EQ(target[2], L'\xE9');  // bytes from 0x80 keep their code, never negative
    EXPECT_EQ(target[3], L'\0');
    std::string long_(2000, 'n');
    MakeWideStringN(long_.c_str(), target, 1023);
    EXPECT_EQ(tree.Log(), "");
    MakeWideStringN(long_.c_str(), target, 1024);
    EXPECT_EQ(target[1023], L'\0');
    EXPECT_EQ(tree.Log(), "MakeWideStringN():  Warning, buffer overflow\n");

    MakeWideString(nullptr, target);
    EXPECT_EQ(target[0], L'\0');
}

TEST_F(HwDebugTest, LongTextIsCutToTheLineBuffer) {
    std::wstring text(3000, L'm');
    dbgprint("%s", text.c_str());
    EXPECT_EQ(tree.Log(), std::string(1023, 'm'));

    // Composed lines keep their closing newlines.
    ResetDebugOut();
    ErrMsg("F", "%s", text.c_str());
    std::string log = tree.Log();
    EXPECT_EQ(log.size(), 1023u);
    EXPECT_EQ(log.substr(0, 15), "\nVELHLIB, F:  m");
    EXPECT_EQ(log.back(), '\n');

    ResetDebugOut();
    const int32_t error = ENOENT;
    LastErr(&error, std::string(2000, 'f').c_str(), "%s", text.c_str());
    const std::string warning = "MakeWideString():  Warning, buffer overflow\n";
    log = tree.Log();
    ASSERT_EQ(log.substr(0, warning.size()), warning);
    log.erase(0, warning.size());
    EXPECT_EQ(log, "\nVELHLIB, " + std::string(1023 - 12, 'f') + "\n\n");

    ResetDebugOut();
    dbg("F", "%s", text.c_str());
    EXPECT_EQ(tree.Log(), "velhlib, F:  " + std::string(1023 - 13, 'm'));
}

TEST_F(HwDebugTest, FailedFormattingWritesOnlyWhatWasFormatted) {
    // In the C locale a %c above 0x7f cannot be converted; what came before it stays.
    dbgprint("ab%cde\n", 0xE9);
    EXPECT_EQ(tree.Log(), "ab");
}

TEST_F(HwDebugTest, CharactersTheLocaleCannotEncodeDoNotLoseTheLine) {
    dbgprint("%s\n", MakeWideString("caf\xE9 ok", WideBuffer));
    EXPECT_EQ(tree.Log(), "caf? ok\n");
    std::string previous = std::setlocale(LC_CTYPE, nullptr);
    if (std::setlocale(LC_CTYPE, "C.UTF-8") == nullptr) {
        GTEST_SKIP() << "no C.UTF-8 locale";
    }
    dbgprint("%s\n", MakeWideString("caf\xE9 ok", WideBuffer));
    std::setlocale(LC_CTYPE, previous.c_str());
    EXPECT_EQ(tree.Log(), "caf? ok\ncaf\xC3\xA9 ok\n");
}

namespace {

int CallVarargs(wchar_t* out, unsigned int size, wchar_t* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    int result = varargs(out, size, format, arguments);
    va_end(arguments);
    return result;
}

}  // namespace

TEST(Varargs, RewritesOnlyBarePercentSAndAlwaysTerminates) {
    wchar_t format[] = L"s%s %-5s %S %d";
    wchar_t out[64];
    EXPECT_EQ(CallVarargs(out, 64, format, L"w", "n", L"x", 7), 12);
    EXPECT_STREQ(format, L"s%S %-5s %S %d");
    EXPECT_STREQ(out, L"sw n     x 7");

    // Truncated output reports -1 but keeps what fit, terminated.
    wchar_t small[4] = {L'?', L'?', L'?', L'?'};
    wchar_t longFormat[] = L"abcdef";
    EXPECT_LT(CallVarargs(small, 4, longFormat), 0);
    EXPECT_STREQ(small, L"abc");
    wchar_t empty[] = L"";
    EXPECT_EQ(CallVarargs(small, 4, empty), 0);
    EXPECT_STREQ(small, L"");
    EXPECT_LT(CallVarargs(small, 4, nullptr), 0);
    EXPECT_STREQ(small, L"");
}

TEST(HexToAscii, WritesTheLowDigitsWithoutTerminator) {
    char out[12] = "..........";
    EXPECT_EQ(HexToAscii(0x1a2b, out, 2), 2);
    EXPECT_STREQ(out, "2b........");
    EXPECT_EQ(HexToAscii(0xDEADBEEF, out, 10), 10);
    EXPECT_STREQ(out, "00deadbeef");
    EXPECT_EQ(HexToAscii(0x1, out, 0), 0);
    EXPECT_EQ(HexToAscii(0x1, out, -3), 0);
    EXPECT_STREQ(out, "00deadbeef");
}
