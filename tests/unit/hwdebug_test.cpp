#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <cstdarg>
#include <cstdio>
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
    void SetUp() override { TearDown(); }
    void TearDown() override {
        HwInfoPrintLevel = 0;
        EnterExitIndent = 0;
        MessageAlloc = std::malloc;
    }
    InstallTree tree;
};

}  // namespace

TEST_F(HwDebugTest, LevelFileLinesAndTheHelpBlock) {
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
        tree.Scratch().Write("inst/dbgprint", content);
        HwInfoPrintLevel = 0x5A5A;
        GetDebugPrintLevel(0);
        EXPECT_EQ(HwInfoPrintLevel, level) << content;
    }
    // No level file, or a folder in its place: level 0.
    ASSERT_EQ(std::remove(tree.InstFile("dbgprint").c_str()), 0);
    for (int folder = 0; folder < 2; ++folder) {
        HwInfoPrintLevel = 0x10;
        GetDebugPrintLevel(1);
        EXPECT_EQ(HwInfoPrintLevel, 0u);
        mkdir(tree.InstFile("dbgprint").c_str(), 0700);
    }
    EXPECT_EQ(tree.Log(), "");

    // A reset starts a new log; the help bit asks for the help block.
    dbgprint("from the previous acquisition\n");
    ASSERT_EQ(rmdir(tree.InstFile("dbgprint").c_str()), 0);
    tree.Scratch().Write("inst/dbgprint", "hwdbgprint 0x80000000\n");
    ResetDebugOut();
    GetDebugPrintLevel(0);
    EXPECT_EQ(HwInfoPrintLevel, DBGPRINT_HELP);
    EXPECT_EQ(tree.Log(), "");
    GetDebugPrintLevel(1);
    EXPECT_EQ(tree.Log(), TestData("dbgprint-help.log"));
}

// The widening, the trace, error and enter/exit writers, with texts cut to the line buffer and
// the overflow warnings: the log is hwdebug.log.
TEST_F(HwDebugTest, WritersLogAsTheDataFileHasIt) {
    // Widening: a text that fills the buffer is cut with a warning; one that fits is not.
    wchar_t target[WIDE_BUFFER_CHARS];
    EXPECT_EQ(MakeWideString(std::string(1023, 'a').c_str(), target), target);
    EXPECT_EQ(std::wcslen(target), 1023u);
    MakeWideString(std::string(1025, 'a').c_str(), target);
    EXPECT_EQ(std::wstring(target), std::wstring(1023, L'a'));
    MakeWideStringI("ab", target, 9);
    EXPECT_STREQ(target, L"    |   |ab");
    MakeWideStringI(std::string(1015, 'x').c_str(), target, 8);
    EXPECT_EQ(std::wcslen(target), 1023u);
    MakeWideStringI(std::string(1016, 'x').c_str(), target, 8);
    EXPECT_EQ(std::wcslen(target), 1023u);
    EXPECT_EQ(target[1022], L'x');
    MakeWideStringI("", target, 5000);
    EXPECT_EQ(std::wcslen(target), 1023u);
    const char bytes[] = {'a', '\0', '\xE9', 'z'};
    MakeWideStringN(bytes, target, 3);
    // Bytes from 0x80 keep their code, never negative.
    EXPECT_EQ(std::wstring(target, 4), std::wstring(L"a\0\xE9\0", 4));
    MakeWideStringN(std::string(2000, 'n').c_str(), target, 1023);
    MakeWideStringN(std::string(2000, 'n').c_str(), target, 1024);
    EXPECT_EQ(target[1023], L'\0');
    MakeWideString(nullptr, target);
    EXPECT_EQ(target[0], L'\0');

    dbgprint("%s has %d slots, %S\n", MakeWideString("drawer 100%", WideBuffer), 4, L"wide");
    dbg("StoreAslTable()", "%s", L"no newline");
    ErrMsg("GetInstallDir", "Called with a NULL buffer");
    FILE* missing = std::fopen("no such file", "r");
    ASSERT_EQ(missing, nullptr);
    EXPECT_EQ(LastErr(nullptr, "GetAslTable()", "Open \"%S\" failed", L"/dev/x"), ENOENT);
    const int32_t denied = EACCES;
    errno = 0;
    EXPECT_EQ(LastErrorMsg("ioctl() failed", &denied), EACCES);

    // Tracing, and its overflow warning, leave errno for the error report.
    errno = EACCES;
    dbgprint("%s, %s:  ", _ProgramName, L"HwSetBlinkState()");
    MakeWideString(std::string(2000, 'x').c_str(), WideBuffer);
    EXPECT_EQ(LastErrorMsg("ioctl() failed", nullptr), EACCES);

    // The error text survives a failed allocation.
    MessageAlloc = [](size_t) -> void* { return nullptr; };
    const int32_t error = ENOENT;
    LastErr(&error, "F", "m");
    LastErrorMsg("t", &error);
    MessageAlloc = std::malloc;

    // In the C locale a %c above 0x7f cannot be converted: what came before it stays; a wide
    // character the locale cannot encode does not lose the line.
    dbgprint("ab%cde\n", 0xE9);
    dbgprint("%s\n", MakeWideString("caf\xE9 ok", WideBuffer));

    int32_t one = 0, two = 0, three = 0;
    Enter(&one, "A\n");  // not enabled: nothing, depth untouched
    EXPECT_EQ(EnterExitIndent, 0);
    HwInfoPrintLevel = ENTER_EXIT;
    Enter(&one, "A(%d)\n", 1);
    Enter(&two, "B\n");
    Enter(&three, "C %s\n", L"in");
    Enter(nullptr, "plain\n");
    Exit(&three, "c\n");
    Exit(&two, "b\n");
    Exit(&one, "a\n");
    Exit(nullptr, "plain\n");
    EXPECT_EQ(std::vector({one, two, three, EnterExitIndent}), std::vector({1, 2, 3, 0}));
    // Long texts are cut to the line buffer; every line keeps its line end.
    std::wstring text(3000, L'm');
    dbgprint("%s", text.c_str());
    dbgprint("%s\n", text.c_str());
    ErrMsg("F", "%s", text.c_str());
    LastErr(&error, std::string(2000, 'f').c_str(), "%s", text.c_str());
    dbg("F", "%s\n", text.c_str());

    // A depth beyond the buffer is cut, not overrun.
    int32_t deep = 100000;
    Exit(&deep, "x\n");
    EXPECT_EQ(tree.Log(), TestData("hwdebug.log"));
}

TEST_F(HwDebugTest, ALocaleThatEncodesTheCharacterWritesIt) {
    std::string previous = std::setlocale(LC_CTYPE, nullptr);
    if (std::setlocale(LC_CTYPE, "C.UTF-8") == nullptr) {
        GTEST_SKIP() << "no C.UTF-8 locale";
    }
    dbgprint("%s\n", MakeWideString("caf\xE9 ok", WideBuffer));
    std::setlocale(LC_CTYPE, previous.c_str());
    EXPECT_EQ(tree.Log(), "caf\xC3\xA9 ok\n");
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

// varargs rewrites only a bare %s and always terminates.
TEST(Varargs, AndHexToAscii) {
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

    // HexToAscii writes the low digits, without terminator.
    char hex[12] = "..........";
    EXPECT_EQ(HexToAscii(0x1a2b, hex, 2), 2);
    EXPECT_STREQ(hex, "2b........");
    EXPECT_EQ(HexToAscii(0xDEADBEEF, hex, 10), 10);
    EXPECT_STREQ(hex, "00deadbeef");
    EXPECT_EQ(HexToAscii(0x1, hex, 0), 0);
    EXPECT_EQ(HexToAscii(0x1, hex, -3), 0);
    EXPECT_STREQ(hex, "00deadbeef");
}
