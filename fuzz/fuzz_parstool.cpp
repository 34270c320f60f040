// The line and token helpers over arbitrary text: getline over a stream, TrimLine, TrimStr,
// GetToken and the number and boolean conversions of every token.
//
// Input: the stream.

#include "fuzz/fuzzsupport.h"
#include "util/parstool.h"

static bool Inside(const char* pointer, const std::vector<char>& buffer) {
    return pointer >= buffer.data() && pointer < buffer.data() + buffer.size();
}

static void CheckToken(char* token) {
    Check(!EvalBoolStr(token) || IsBoolStr(token),
          "EvalBoolStr is true for a text that is no boolean word");
    uint32_t value = StrIsNum(token) == 1 ? StrNum(token) : 0;
    for (int base : {0, 10, 16}) {
        ustrl(token, &value, base);
    }
    char* end = nullptr;
    StrToU32(token, &end, 0);
    Check(end != nullptr && end >= token && end <= token + std::strlen(token),
          "StrToU32 set its end outside the text");
    StrToI32(token, &end, 10);
}

static void CheckLine(const std::vector<char>& line) {
    Check(std::memchr(line.data(), '\0', line.size()) != nullptr,
          "getline left the buffer unterminated");
    std::vector<char> copy(line);
    Check(Inside(TrimStr(copy.data()), copy), "TrimStr returned a pointer outside the line");
    copy = line;
    char* cursor = TrimLine(copy.data());
    Check(Inside(cursor, copy), "TrimLine returned a pointer outside the line");
    // Every token takes at least one byte of the line, so there cannot be more of them.
    size_t budget = std::strlen(cursor) + 1;
    while (char* token = GetToken(&cursor)) {
        Check(Inside(token, copy) && Inside(cursor, copy), "GetToken left the line");
        Check(budget-- != 0, "GetToken does not advance");
        CheckToken(token);
    }
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const InputScope input;
    FILE* stream = InputStream(data, size);
    // The size the library reads its files with, and small ones that cut lines into pieces,
    // down to the smallest a caller may give.
    for (int lineChars : {1024, 7, 2}) {
        std::rewind(stream);
        // Exactly the size getline is told, so that a write past it is caught.
        std::vector<char> line(static_cast<size_t>(lineChars));
        size_t budget = size;
        while (getline(stream, line.data(), lineChars)) {
            // Each line read takes at least one byte of the stream.
            Check(budget-- != 0, "getline does not advance");
            CheckLine(line);
        }
    }
    return 0;
}
