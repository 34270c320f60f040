#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <string>
#include <vector>

#include "filehandle.h"
#include "scratchdir.h"
#include "util/parstool.h"

namespace {

std::vector<std::string> ReadLines(const std::string& path, int size) {
    UniqueFile file(std::fopen(path.c_str(), "r"));
    std::vector<std::string> lines;
    char buffer[64] = "untouched";
    while (file != nullptr && getline(file.get(), buffer, size)) {
        lines.emplace_back(buffer);
    }
    return lines;
}

std::vector<std::string> Tokens(std::string text) {
    std::vector<std::string> tokens;
    char* cursor = text.data();
    while (char* token = GetToken(&cursor)) {
        tokens.emplace_back(token);
        if (tokens.size() > 10) {
            break;
        }
    }
    return tokens;
}

}  // namespace

TEST(Getline, ReadsEveryLineAndStopsOnEndOrError) {
    ScratchDir dir;
    EXPECT_EQ(ReadLines(dir.Write("a", "one\ntwo\n"), 64),
              (std::vector<std::string>{"one", "two"}));
    // The last line without a line feed is handed out too.
    EXPECT_EQ(ReadLines(dir.Write("b", "one\ntwo"), 64), (std::vector<std::string>{"one", "two"}));
    // Longer lines come back in pieces of size - 1 bytes.
    EXPECT_EQ(ReadLines(dir.Write("c", "abcdefg\nh\n"), 4),
              (std::vector<std::string>{"abc", "def", "g", "h"}));
    EXPECT_EQ(ReadLines(dir.Write("d", ""), 64), std::vector<std::string>{});

    // A directory opens but cannot be read, and a one-byte buffer never reaches the end: both
    // must end the loop rather than spin.
    EXPECT_EQ(ReadLines(dir.Path(), 64), std::vector<std::string>{});
    EXPECT_EQ(ReadLines(dir.Path("a"), 1), std::vector<std::string>{});

    // At the end the buffer keeps the previous line.
    UniqueFile file(std::fopen(dir.Path("a").c_str(), "r"));
    char buffer[16];
    ASSERT_TRUE(getline(file.get(), buffer, sizeof(buffer)));
    ASSERT_TRUE(getline(file.get(), buffer, sizeof(buffer)));
    EXPECT_FALSE(getline(file.get(), buffer, sizeof(buffer)));
    EXPECT_STREQ(buffer, "two");
}

TEST(TrimLine, CutsTheFirstCommentAndTrims) {
    std::string text = "// only a comment";
    EXPECT_STREQ(TrimLine(text.data()), "");
    text = "  a //b// c ";
    EXPECT_STREQ(TrimLine(text.data()), "a");
    text = "path /";
    EXPECT_STREQ(TrimLine(text.data()), "path /");
    text = "/";
    EXPECT_STREQ(TrimLine(text.data()), "/");
    text = "";
    EXPECT_STREQ(TrimLine(text.data()), "");
}

TEST(TrimStr, RemovesBlanksControlsAndHighBytesAtBothEnds) {
    std::string text = " \t \r\n";
    EXPECT_STREQ(TrimStr(text.data()), "");
    text = "\t\xE9 a b\xE9\r\t";
    EXPECT_STREQ(TrimStr(text.data()), "a b");
    text = "x";
    EXPECT_STREQ(TrimStr(text.data()), "x");
}

TEST(GetToken, SplitsWordsQuotesAndBrackets) {
    EXPECT_EQ(Tokens("bus \"two words\"  [x y]"),
              (std::vector<std::string>{"bus", "two words", "[x y]"}));
    // The byte after "]" is the delimiter and is dropped.
    EXPECT_EQ(Tokens("[ab]c  d"), (std::vector<std::string>{"[ab]", "d"}));
    // Tokens ending at the very end of the text: the cursor rests on the terminator.
    EXPECT_EQ(Tokens("[ab]"), std::vector<std::string>{"[ab]"});
    EXPECT_EQ(Tokens("\"q\""), std::vector<std::string>{"q"});
    EXPECT_EQ(Tokens("a\tb\xE9\x01"
                     "c   "),
              (std::vector<std::string>{"a", "b", "c"}));
    EXPECT_EQ(Tokens("\"\" x"), (std::vector<std::string>{"", "x"}));
    EXPECT_EQ(Tokens(""), std::vector<std::string>{});

    char* null = nullptr;
    EXPECT_EQ(GetToken(&null), nullptr);
    EXPECT_EQ(GetToken(nullptr), nullptr);
}

TEST(GetToken, ReportsAMissingClosingDelimiterAndReturnsTheRest) {
    InstallTree tree;
    EXPECT_EQ(Tokens("name \"open quote"), (std::vector<std::string>{"name", "open quote"}));
    EXPECT_EQ(Tokens("[x y"), std::vector<std::string>{"[x y"});
    EXPECT_EQ(tree.Log(),
              "GetToken(), missing end double quote: \"open quote\n"
              "GetToken(), missing end ']': [x y\n");
}

TEST(StrIsNum, AcceptsDecimalAndLowercaseHex) {
    for (const char* yes : {"123", "0x1f", "", "0x", "0"}) {
        EXPECT_EQ(StrIsNum(yes), 1) << yes;
    }
    for (const char* no : {"0x1F", "12a", "abc", "-1", "0X1f", "1 "}) {
        EXPECT_EQ(StrIsNum(no), 0) << no;
    }
    EXPECT_EQ(StrIsNum(nullptr), -2);
}

TEST(StrNum, AccumulatesModulo32BitsAfterLowerCasing) {
    std::string text = "0x1F";
    EXPECT_EQ(StrNum(text.data()), 31);
    EXPECT_EQ(text, "0x1f");
    text = "42";
    EXPECT_EQ(StrNum(text.data()), 42);
    text = "4x";
    EXPECT_EQ(StrNum(text.data()), 112);
    text = "0xFFFFFFFF";
    EXPECT_EQ(StrNum(text.data()), -1);
    // Past 32 bits the value wraps as on the original target.
    text = "99999999999";
    EXPECT_EQ(StrNum(text.data()), 1215752191);
    text = "0x123456789";
    EXPECT_EQ(StrNum(text.data()), 0x23456789);
    text = "";
    EXPECT_EQ(StrNum(text.data()), 0);
}

TEST(BoolStr, KnowsTheSixWords) {
    for (const char* word : {"0", "1", "t", "f", "true", "false"}) {
        EXPECT_TRUE(IsBoolStr(word)) << word;
    }
    for (const char* word : {"yes", "TRUE", "", "true "}) {
        EXPECT_FALSE(IsBoolStr(word)) << word;
        EXPECT_FALSE(EvalBoolStr(word)) << word;
    }
    for (const char* word : {"1", "t", "true"}) {
        EXPECT_TRUE(EvalBoolStr(word)) << word;
    }
    for (const char* word : {"0", "f", "false"}) {
        EXPECT_FALSE(EvalBoolStr(word)) << word;
    }
}

TEST(Ustrl, ConvertsInThe32BitRange) {
    uint32_t value = 77;
    EXPECT_TRUE(ustrl("0", &value, 10));
    EXPECT_EQ(value, 0u);
    EXPECT_TRUE(ustrl("12ab", &value, 10));
    EXPECT_EQ(value, 12u);
    EXPECT_TRUE(ustrl("0x1F", &value, 16));
    EXPECT_EQ(value, 31u);
    EXPECT_TRUE(ustrl(" 7", &value, 0));
    EXPECT_EQ(value, 7u);
    EXPECT_TRUE(ustrl("4294967295", &value, 10));
    EXPECT_EQ(value, 4294967295u);
    // A sign negates as strtoul does on the 32-bit target.
    EXPECT_TRUE(ustrl("-1", &value, 10));
    EXPECT_EQ(value, 0xFFFFFFFFu);

    value = 77;
    for (const char* bad :
         {"x", "", "4294967296", "18446744073709551616", "-4294967296", "--1", "- 1"}) {
        EXPECT_FALSE(ustrl(bad, &value, 10)) << bad;
    }
    EXPECT_FALSE(ustrl("12", &value, 99));
    EXPECT_EQ(value, 77u);
}

TEST(StrTo32, ClampsAndSetsErangeLikeThe32BitLibrary) {
    errno = 0;
    char* end = nullptr;
    const char* text = "99999999999z";
    EXPECT_EQ(StrToI32(text, &end, 10), INT32_MAX);
    EXPECT_EQ(errno, ERANGE);
    EXPECT_EQ(end, text + 11);
    errno = 0;
    EXPECT_EQ(StrToI32("-99999999999", nullptr, 10), INT32_MIN);
    EXPECT_EQ(errno, ERANGE);

    errno = EBADF;
    EXPECT_EQ(StrToI32("-5", nullptr, 10), -5);
    EXPECT_EQ(StrToU32("0x10", nullptr, 16), 16u);
    EXPECT_EQ(errno, EBADF);  // untouched on success

    text = "  +";
    EXPECT_EQ(StrToU32(text, &end, 10), 0u);
    EXPECT_EQ(end, text);
    EXPECT_EQ(StrToU32("4294967296", nullptr, 10), 0xFFFFFFFFu);
    EXPECT_EQ(errno, ERANGE);
}
