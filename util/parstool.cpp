#include "util/parstool.h"

#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <initializer_list>

#include "diag/hwdebug.h"
#include "diag/linport.h"

namespace {

// Space, the control characters and every byte from 0x80 up: the original read bytes as signed.
bool IsBlank(char c) {
    return static_cast<signed char>(c) <= 32;
}

// A blank that is not the terminator, so that skipping blanks stops at the end of the text.
bool IsInnerBlank(char c) {
    return c != '\0' && IsBlank(c);
}

wchar_t TokenWide[WIDE_BUFFER_CHARS];

}  // namespace

bool getline(FILE* stream, char* buffer, int size) {
    // With room for less than one byte fgets reads nothing and the end is never reached.
    if (stream == nullptr || buffer == nullptr || size < 2) {
        return false;
    }
    if (std::fgets(buffer, size, stream) == nullptr) {
        // End of file or a read error (a directory, say): nothing new, the buffer keeps the
        // previous line.
        return false;
    }
    size_t length = std::strlen(buffer);
    if (length > 0 && buffer[length - 1] == '\n') {
        buffer[length - 1] = '\0';
    }
    return true;
}

char* TrimLine(char* line) {
    if (line == nullptr) {
        return nullptr;
    }
    char* comment = std::strstr(line, "//");
    if (comment != nullptr) {
        *comment = '\0';
    }
    return TrimStr(line);
}

char* TrimStr(char* text) {
    if (text == nullptr) {
        return nullptr;
    }
    size_t length = std::strlen(text);
    while (length > 0 && IsBlank(text[length - 1])) {
        text[--length] = '\0';
    }
    while (IsInnerBlank(*text)) {
        text++;
    }
    return text;
}

char* GetToken(char** cursor) {
    if (cursor == nullptr || *cursor == nullptr || **cursor == '\0') {
        return nullptr;
    }
    char* start = *cursor;
    char* end = nullptr;  // the delimiter, or the terminator when the token runs to the end
    if (*start == '"') {
        char* close = std::strchr(start + 1, '"');
        if (close == nullptr) {
            dbgprint("GetToken(), missing end double quote: %s\n",
                     MakeWideString(start, TokenWide));
            end = start + std::strlen(start);
        } else {
            end = close;
        }
        start++;
    } else if (*start == '[') {
        char* close = std::strchr(start, ']');
        if (close == nullptr) {
            dbgprint("GetToken(), missing end '%c': %s\n", ']', MakeWideString(start, TokenWide));
            end = start + std::strlen(start);
        } else {
            end = close + 1;
        }
    } else {
        end = start;
        while (*end != '\0' && !IsBlank(*end)) {
            end++;
        }
    }
    if (*end == '\0') {
        *cursor = end;
    } else {
        *end++ = '\0';
        while (IsInnerBlank(*end)) {
            end++;
        }
        *cursor = end;
    }
    return start;
}

int StrIsNum(const char* text) {
    if (text == nullptr) {
        return -2;
    }
    if (text[0] == '0' && text[1] == 'x') {
        for (const char* p = text + 2; *p != '\0'; p++) {
            if (!((*p >= '0' && *p <= '9') || (*p >= 'a' && *p <= 'f'))) {
                return 0;
            }
        }
        return 1;
    }
    for (const char* p = text; *p != '\0'; p++) {
        if (*p < '0' || *p > '9') {
            return 0;
        }
    }
    return 1;
}

int StrNum(char* text) {
    if (text == nullptr) {
        return 0;
    }
    _strlwr(text);
    // Unvalidated, modulo 2^32 as on the original target; unsigned so that it cannot overflow.
    uint32_t value = 0;
    if (text[0] == '0' && text[1] == 'x') {
        for (const char* p = text + 2; *p != '\0'; p++) {
            int digit = *p > 0x60 ? *p - 87 : *p - 48;
            value = value * 16 + static_cast<uint32_t>(digit);
        }
    } else {
        for (const char* p = text; *p != '\0'; p++) {
            value = value * 10 + static_cast<uint32_t>(*p - 48);
        }
    }
    return static_cast<int>(value);
}

bool IsBoolStr(const char* text) {
    if (text == nullptr) {
        return false;
    }
    for (const char* word : {"0", "1", "t", "f", "true", "false"}) {
        if (std::strcmp(text, word) == 0) {
            return true;
        }
    }
    return false;
}

bool EvalBoolStr(const char* text) {
    if (text == nullptr) {
        return false;
    }
    return std::strcmp(text, "1") == 0 || std::strcmp(text, "t") == 0 ||
           std::strcmp(text, "true") == 0;
}

uint32_t StrToU32(const char* text, char** end, int base) {
    const char* p = text;
    while (std::isspace(static_cast<unsigned char>(*p))) {
        p++;
    }
    bool negative = *p == '-';
    if (*p == '-' || *p == '+') {
        p++;
    }
    // strtoull would accept a second sign or blanks here; strtoul does not.
    char* stop = const_cast<char*>(p);
    unsigned long long magnitude = 0;
    int saved = errno;
    errno = 0;
    if (*p != '-' && *p != '+' && !std::isspace(static_cast<unsigned char>(*p))) {
        magnitude = std::strtoull(p, &stop, base);
    }
    int error = errno;
    errno = error != 0 ? error : saved;
    if (end != nullptr) {
        *end = stop == p ? const_cast<char*>(text) : stop;
    }
    if (stop == p) {
        return 0;
    }
    if (error == ERANGE || magnitude > UINT32_MAX) {
        errno = ERANGE;
        return UINT32_MAX;
    }
    uint32_t value = static_cast<uint32_t>(magnitude);
    return negative ? 0u - value : value;
}

int32_t StrToI32(const char* text, char** end, int base) {
    int saved = errno;
    errno = 0;
    long long value = std::strtoll(text, end, base);
    if (errno == 0) {
        errno = saved;
    }
    if (value > INT32_MAX) {
        errno = ERANGE;
        return INT32_MAX;
    }
    if (value < INT32_MIN) {
        errno = ERANGE;
        return INT32_MIN;
    }
    return static_cast<int32_t>(value);
}

bool ustrl(const char* text, uint32_t* value, int base) {
    if (text == nullptr || value == nullptr || *text == '\0') {
        return false;
    }
    errno = 0;
    char* end = nullptr;
    uint32_t result = StrToU32(text, &end, base);
    if (errno == ERANGE || errno == EINVAL) {
        return false;
    }
    if (result == 0 && end == text) {
        return false;
    }
    *value = result;
    return true;
}
