#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <string>
#include <vector>

#include "filehandle.h"
#include "scratchdir.h"
#include "util/parstool.h"

namespace {

using Strings = std::vector<std::string>;

Strings ReadLines(const std::string& path, int size) {
    UniqueFile file(std::fopen(path.c_str(), "r"));
    Strings lines;
    char buffer[64] = "untouched";
    while (file != nullptr && getline(file.get(), buffer, size)) {
        lines.emplace_back(buffer);
    }
    return lines;
}

Strings Tokens(std::string text) {
    Strings tokens;
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
    // The last line without a line feed is handed out too; longer lines come in size - 1 pieces.
    EXPECT_EQ(ReadLines(dir.Write("a", "one\ntwo\n"), 64), (Strings{"one", "two"}));
    EXPECT_EQ(ReadLines(dir.Write("b", "one\ntwo"), 64), (Strings{"one", "two"}));
    EXPECT_EQ(ReadLines(dir.Write("c", "abcdefg\nh\n"), 4), (Strings{"abc", "def", "g", "h"}));
    EXPECT_EQ(ReadLines(dir.Write("d", ""), 64), Strings{});
    // A directory cannot be read, a one-byte buffer never reaches the end: neither may spin.
    EXPECT_EQ(ReadLines(dir.Path(), 64), Strings{});
    EXPECT_EQ(ReadLines(dir.Path("a"), 1), Strings{});
    // At the end the buffer keeps the previous line.
    UniqueFile file(std::fopen(dir.Path("a").c_str(), "r"));
    char buffer[16];
    ASSERT_TRUE(getline(file.get(), buffer, sizeof(buffer)));
    ASSERT_TRUE(getline(file.get(), buffer, sizeof(buffer)));
    EXPECT_FALSE(getline(file.get(), buffer, sizeof(buffer)));
    EXPECT_STREQ(buffer, "two");
}

TEST(Trim, LineCutsTheFirstCommentAndStrRemovesBlanksControlsAndHighBytes) {
    for (auto [in, line, str] : {std::tuple{"// only a comment", "", "// only a comment"},
                                 {"  a //b// c ", "a", "a //b// c"},
                                 {"path /", "path /", "path /"},
                                 {"/", "/", "/"},
                                 {"", "", ""},
                                 {" \t \r\n", "", ""},
                                 {"\t\xE9 a b\xE9\r\t", "a b", "a b"},
                                 {"x", "x", "x"}}) {
        std::string text = in;
        EXPECT_STREQ(TrimLine(text.data()), line) << in;
        text = in;
        EXPECT_STREQ(TrimStr(text.data()), str) << in;
    }
}

TEST(GetToken, SplitsWordsQuotesAndBracketsAndReportsAMissingEnd) {
    InstallTree tree;
    const std::pair<const char*, Strings> cases[] = {
        {"bus \"two words\"  [x y]", {"bus", "two words", "[x y]"}},
        {"[ab]c  d", {"[ab]", "d"}},  // the byte after "]" is the delimiter and is dropped
        {"[ab]", {"[ab]"}},           // the cursor rests on the terminator
        {"\"q\"", {"q"}},
        {"a\tb\xE9\x01"
         "c   ",
         {"a", "b", "c"}},
        {"\"\" x", {"", "x"}},
        {"", {}},
        {"name \"open quote", {"name", "open quote"}},
        {"[x y", {"[x y"}},
    };
    for (const auto& [text, tokens] : cases) {
        EXPECT_EQ(Tokens(text), tokens) << text;
    }
    char* null = nullptr;
    EXPECT_EQ(GetToken(&null), nullptr);
    EXPECT_EQ(GetToken(nullptr), nullptr);
    EXPECT_EQ(tree.Log(),
              "GetToken(), missing end double quote: \"open quote\n"
              "GetToken(), missing end ']': [x y\n");
}

TEST(Numbers, StrIsNumAndStrNumAndBoolWords) {
    for (const char* yes : {"123", "0x1f", "", "0x", "0"}) {
        EXPECT_EQ(StrIsNum(yes), 1) << yes;
    }
    for (const char* no : {"0x1F", "12a", "abc", "-1", "0X1f", "1 "}) {
        EXPECT_EQ(StrIsNum(no), 0) << no;
    }
    EXPECT_EQ(StrIsNum(nullptr), -2);
    // Lower-cased in place, accumulated modulo 32 bits as on the original target.
    for (auto [in, value, after] : {std::tuple{"0x1F", 31, "0x1f"},
                                    {"42", 42, "42"},
                                    {"4x", 112, "4x"},
                                    {"0xFFFFFFFF", -1, "0xffffffff"},
                                    {"99999999999", 1215752191, "99999999999"},
                                    {"0x123456789", 0x23456789, "0x123456789"},
                                    {"", 0, ""}}) {
        std::string text = in;
        EXPECT_EQ(StrNum(text.data()), value) << in;
        EXPECT_EQ(text, after);
    }
    for (auto [word, is, value] : {std::tuple{"0", true, false},
                                   {"1", true, true},
                                   {"t", true, true},
                                   {"f", true, false},
                                   {"true", true, true},
                                   {"false", true, false},
                                   {"yes", false, false},
                                   {"TRUE", false, false},
                                   {"", false, false},
                                   {"true ", false, false}}) {
        EXPECT_EQ(IsBoolStr(word), is) << word;
        EXPECT_EQ(EvalBoolStr(word), value) << word;
    }
}

TEST(Ustrl, ConvertsInThe32BitRange) {
    // A sign negates as strtoul does on the 32-bit target.
    for (auto [text, base, expected] : {std::tuple{"0", 10, 0u},
                                        {"12ab", 10, 12u},
                                        {"0x1F", 16, 31u},
                                        {" 7", 0, 7u},
                                        {"4294967295", 10, 4294967295u},
                                        {"-1", 10, 0xFFFFFFFFu}}) {
        uint32_t value = 77;
        EXPECT_TRUE(ustrl(text, &value, base)) << text;
        EXPECT_EQ(value, expected) << text;
    }
    uint32_t value = 77;
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
