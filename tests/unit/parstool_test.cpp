#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <string>
#include <tuple>
#include <utility>
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
    // At the end the buffer keeps the previous line.
    EXPECT_EQ(buffer, lines.empty() ? "untouched" : lines.back());
    return lines;
}

// The tokens of a text, each followed by "|".
std::string Tokens(std::string text) {
    std::string tokens;
    char* cursor = text.data();
    for (int i = 0; i < 10 && cursor != nullptr; i++) {
        const char* token = GetToken(&cursor);
        tokens += token != nullptr ? token + std::string("|") : "";
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
    // A directory cannot be read, a one-byte buffer never reaches the end: neither may spin.
    EXPECT_EQ(ReadLines(dir.Path(), 64), Strings{});
    EXPECT_EQ(ReadLines(dir.Path("a"), 1), Strings{});
}

TEST(Trim, LineCutsTheFirstCommentAndStrRemovesBlanksControlsAndHighBytes) {
    using Case = std::tuple<const char*, const char*, const char*>;
    for (auto [in, line, str] :
         {Case("// only a comment", "", "// only a comment"),
          Case("  a //b// c ", "a", "a //b// c"), Case("path /", "path /", "path /"),
          Case("/", "/", "/"), Case("", "", ""), Case(" \t \r\n", "", ""),
          Case("\t\xE9 a b\xE9\r\t", "a b", "a b"), Case("x", "x", "x")}) {
        std::string text = in;
        EXPECT_STREQ(TrimLine(text.data()), line) << in;
        text = in;
        EXPECT_STREQ(TrimStr(text.data()), str) << in;
    }
}

TEST(GetToken, SplitsWordsQuotesAndBracketsAndReportsAMissingEnd) {
    InstallTree tree;
    using Case = std::pair<const char*, const char*>;
    for (auto [text, tokens] :
         {Case("bus \"two words\"  [x y]", "bus|two words|[x y]|"),
          // The byte after "]" is the delimiter and is dropped.
          Case("[ab]c  d", "[ab]|d|"), Case("[ab]", "[ab]|"), Case("\"q\"", "q|"),
          Case("a\tb\351\001c   ", "a|b|c|"), Case("\"\" x", "|x|"), Case("", ""),
          Case("name \"open quote", "name|open quote|"), Case("[x y", "[x y|")}) {
        EXPECT_EQ(Tokens(text), tokens) << text;
    }
    char* null = nullptr;
    EXPECT_EQ(GetToken(&null), nullptr);
    EXPECT_EQ(GetToken(nullptr), nullptr);
    EXPECT_EQ(tree.Log(),
              "GetToken(), missing end double quote: \"open quote\n"
              "GetToken(), missing end ']': [x y\n");
}

// The boolean words are read by the card file's parser, whose test covers every one of them.
TEST(Numbers, StrIsNumAndStrNum) {
    for (const char* yes : {"123", "0x1f", "", "0x", "0"}) {
        EXPECT_EQ(StrIsNum(yes), 1) << yes;
    }
    for (const char* no : {"0x1F", "12a", "abc", "-1", "0X1f", "1 "}) {
        EXPECT_EQ(StrIsNum(no), 0) << no;
    }
    EXPECT_EQ(StrIsNum(nullptr), -2);
    EXPECT_FALSE(IsBoolStr(nullptr));
    // Lower-cased in place, accumulated modulo 32 bits as on the original target.
    using Case = std::tuple<const char*, int, const char*>;
    for (auto [in, value, after] :
         {Case("0x1F", 31, "0x1f"), Case("42", 42, "42"), Case("4x", 112, "4x"),
          Case("0xFFFFFFFF", -1, "0xffffffff"), Case("99999999999", 1215752191, "99999999999"),
          Case("0x123456789", 0x23456789, "0x123456789"), Case("", 0, "")}) {
        std::string text = in;
        EXPECT_EQ(StrNum(text.data()), value) << in;
        EXPECT_EQ(text, after);
    }
}

TEST(Ustrl, ConvertsInThe32BitRange) {
    // A sign negates as strtoul does on the 32-bit target.
    using Case = std::tuple<const char*, int, uint32_t>;
    for (auto [text, base, expected] :
         {Case("0", 10, 0u), Case("12ab", 10, 12u), Case("0x1F", 16, 31u), Case(" 7", 0, 7u),
          Case("4294967295", 10, 4294967295u), Case("-1", 10, 0xFFFFFFFFu)}) {
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
    // errno is untouched (EBADF) on success; a negative count of characters read passes no end.
    using Case = std::tuple<const char*, int, bool, int64_t, int, int>;
    for (auto [text, base, u32, value, error, read] :
         {Case("99999999999z", 10, false, INT32_MAX, ERANGE, 11),
          Case("-99999999999", 10, false, INT32_MIN, ERANGE, -1),
          Case("-2147483648", 10, false, INT32_MIN, EBADF, -1),
          Case("2147483647", 10, false, INT32_MAX, EBADF, -1), Case("-5", 10, false, -5, EBADF, -1),
          Case("0x10", 16, true, 16, EBADF, -1), Case("  +", 10, true, 0, EBADF, 0),
          Case("4294967296", 10, true, 0xFFFFFFFF, ERANGE, -1)}) {
        errno = EBADF;
        char* end = nullptr;
        char** ends = read < 0 ? nullptr : &end;
        EXPECT_EQ(u32 ? int64_t{StrToU32(text, ends, base)} : StrToI32(text, ends, base), value);
        EXPECT_EQ(errno, error) << text;
        EXPECT_EQ(end, read < 0 ? nullptr : text + read) << text;
    }
}
