#include "diag/hwdebug.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <cwchar>

#include "diag/linport.h"
#include "diag/progname.h"
#include "filehandle.h"

uint32_t HwInfoPrintLevel = 0;
int32_t EnterExitIndent = 0;
wchar_t WideBuffer[WIDE_BUFFER_CHARS];

namespace {

constexpr size_t CAPACITY = WIDE_BUFFER_CHARS;
// The FormatMessage flags of the error reporters; 0x10000 asks for an allocated buffer.
constexpr int32_t ERROR_TEXT_FLAGS = 0x70000;
constexpr int32_t ERROR_TEXT_LANGUAGE = 0x10001;

// Widens source after indent indentation characters into target (CAPACITY characters): up to
// its terminator, or exactly count bytes when counted. Filling the whole buffer is an overflow:
// the warning goes to the log and the text is cut.
wchar_t* WidenInto(const char* source, wchar_t* target, size_t indent, bool counted, size_t count,
                   const wchar_t* warning) {
    if (target == nullptr) {
        return nullptr;
    }
    size_t used = 0;
    for (; used < indent && used < CAPACITY; used++) {
        target[used] = used != 0 && used % 4 == 0 ? L'|' : L' ';
    }
    if (source != nullptr) {
        size_t available = CAPACITY - used;
        size_t bytes = counted ? count : strnlen(source, available);
        bytes = bytes < available ? bytes : available;
        WidenBytes(source, bytes, target + used);
        used += bytes;
    }
    if (used == CAPACITY) {
        OutputDebugString(warning);
        used = CAPACITY - 1;
    }
    target[used] = L'\0';
    return target;
}

// vswprintf that always leaves a terminated text: truncated output keeps what fit, and the
// mark that an encoding failure leaves behind is cut off.
int FormatWideV(wchar_t* out, size_t size, const wchar_t* format, va_list arguments) {
    std::wmemset(out, L'\0', size);
    int result = std::vswprintf(out, size, format, arguments);
    if (result < 0) {
        out[size - 1] = L'\0';
        for (wchar_t* p = out; *p != L'\0'; p++) {
            if (static_cast<uint32_t>(*p) > 0x10FFFF) {
                *p = L'\0';
                break;
            }
        }
    }
    return result;
}

int FormatWide(wchar_t* out, size_t size, const wchar_t* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    int result = FormatWideV(out, size, format, arguments);
    va_end(arguments);
    return result;
}

bool EndsLine(const wchar_t* text) {
    const size_t length = std::wcslen(text);
    return length != 0 && text[length - 1] == L'\n';
}

// Widens a narrow trace format after indent indentation characters and formats it into out. A
// text cut to the buffer keeps the line end that its format closes with.
void FormatNarrow(wchar_t* out, size_t indent, const char* format, va_list arguments) {
    wchar_t wideFormat[CAPACITY];
    if (indent == 0) {
        MakeWideString(format, wideFormat);
    } else {
        MakeWideStringI(format, wideFormat, static_cast<int>(indent));
    }
    if (varargs(out, CAPACITY, wideFormat, arguments) < 0 && EndsLine(wideFormat) &&
        std::wcslen(out) == CAPACITY - 1) {
        out[CAPACITY - 2] = L'\n';
    }
}

// A composed line of at most CAPACITY - 1 characters. Pieces are cut where the line is full,
// except that the room for its closing text (the newlines of an error block) stays free.
class LogLine {
  public:
    explicit LogLine(size_t closingChars)
        : room_(closingChars < CAPACITY - 1 ? CAPACITY - 1 - closingChars : 0) {}

    LogLine& Add(const wchar_t* text) {
        for (; text != nullptr && *text != L'\0' && length_ < room_; text++) {
            text_[length_++] = *text;
        }
        text_[length_] = L'\0';
        return *this;
    }
    LogLine& UpperCase() {
        _wcsupr(text_);
        return *this;
    }
    void Write(const wchar_t* closing) {
        room_ = CAPACITY - 1;
        Add(closing);
        OutputDebugString(text_);
    }

  private:
    wchar_t text_[CAPACITY] = {};
    size_t length_ = 0;
    size_t room_;
};

// "\n", the program name in upper case, ", ", function and ":  ": the head of an error block.
LogLine& AddErrorHead(LogLine& line, const char* function) {
    wchar_t wideFunction[CAPACITY];
    return line.Add(L"\n")
        .Add(_ProgramName)
        .UpperCase()
        .Add(L", ")
        .Add(MakeWideString(function, wideFunction))
        .Add(L":  ");
}

// The system's text for an error number, in a buffer that FormatMessage allocates; when that
// fails the text is copied into a buffer of its own, so the report still names the error.
class ErrorText {
  public:
    explicit ErrorText(int32_t error) {
        FormatMessage(ERROR_TEXT_FLAGS, nullptr, error, ERROR_TEXT_LANGUAGE,
                      reinterpret_cast<wchar_t*>(&allocated_), 0, nullptr);
        if (allocated_ == nullptr) {
            FormatMessage(0, nullptr, error, 0, fallback_, CAPACITY, nullptr);
        }
    }
    ~ErrorText() { LocalFree(allocated_); }
    ErrorText(const ErrorText&) = delete;
    ErrorText& operator=(const ErrorText&) = delete;

    const wchar_t* Text() const { return allocated_ != nullptr ? allocated_ : fallback_; }

  private:
    wchar_t* allocated_ = nullptr;
    wchar_t fallback_[CAPACITY] = {};
};

void WriteIndented(int32_t depth, const char* format, va_list arguments) {
    // Four columns a level; beyond the buffer the widening cuts the line anyway.
    constexpr int32_t MAX_DEPTH = CAPACITY / 4;
    size_t columns =
        depth <= 0 ? 0 : 4 * static_cast<size_t>(depth < MAX_DEPTH ? depth : MAX_DEPTH);
    wchar_t text[CAPACITY];
    FormatNarrow(text, columns, format, arguments);
    OutputDebugString(text);
}

}  // namespace

void WidenBytes(const char* source, size_t count, wchar_t* target) {
    for (size_t i = 0; i < count; i++) {
        target[i] = static_cast<wchar_t>(static_cast<unsigned char>(source[i]));
    }
}

wchar_t* MakeWideString(const char* source, wchar_t* target) {
    return WidenInto(source, target, 0, false, 0, L"MakeWideString():  Warning, buffer overflow\n");
}

wchar_t* MakeWideStringI(const char* source, wchar_t* target, int indent) {
    return WidenInto(source, target, indent > 0 ? static_cast<size_t>(indent) : 0, false, 0,
                     L"MakeWideStringI():  Warning, buffer overflow\n");
}

wchar_t* MakeWideStringN(const char* source, wchar_t* target, int count) {
    return WidenInto(source, target, 0, true, count > 0 ? static_cast<size_t>(count) : 0,
                     L"MakeWideStringN():  Warning, buffer overflow\n");
}

int varargs(wchar_t* out, unsigned int size, wchar_t* format, va_list arguments) {
    if (out == nullptr || size == 0) {
        return -1;
    }
    if (format == nullptr) {
        out[0] = L'\0';
        return -1;
    }
    // Trace arguments are wide strings: "%s" becomes "%S". A "%s" with flags or a width between
    // the two characters is left alone.
    for (size_t i = 1; format[0] != L'\0' && format[i] != L'\0'; i++) {
        if (format[i] == L's' && format[i - 1] == L'%') {
            format[i] = L'S';
        }
    }
    return FormatWideV(out, size, format, arguments);
}

int HexToAscii(uint32_t value, char* out, int digits) {
    if (out == nullptr || digits <= 0) {
        return 0;
    }
    for (int i = 0; i < digits; i++) {
        int shift = 4 * (digits - 1 - i);
        out[i] = shift < 32 ? "0123456789abcdef"[(value >> shift) & 0xF] : '0';
    }
    return digits;
}

void ResetDebugOut() {
    UniqueFile file(OpenLogFile(HWINFO_LOG_PATH, "a", std::fopen));
    if (file != nullptr) {
        file.reset();
        std::remove(HWINFO_LOG_PATH);
    }
}

void dbgprint(const char* format, ...) {
    wchar_t text[CAPACITY];
    va_list arguments;
    va_start(arguments, format);
    FormatNarrow(text, 0, format, arguments);
    va_end(arguments);
    OutputDebugString(text);
}

void dbg(const char* function, const char* format, ...) {
    wchar_t text[CAPACITY];
    va_list arguments;
    va_start(arguments, format);
    FormatNarrow(text, 0, format, arguments);
    va_end(arguments);
    // A line cut to the buffer keeps its line end.
    const bool ended = EndsLine(text);
    if (ended) {
        text[std::wcslen(text) - 1] = L'\0';
    }
    wchar_t wideFunction[CAPACITY];
    LogLine(ended ? 1 : 0)
        .Add(_ProgramName)
        .Add(L", ")
        .Add(MakeWideString(function, wideFunction))
        .Add(L":  ")
        .Add(text)
        .Write(ended ? L"\n" : L"");
}

void Enter(int32_t* indent, const char* format, ...) {
    if ((HwInfoPrintLevel & ENTER_EXIT) == 0) {
        return;
    }
    int32_t depth = 0;
    if (indent != nullptr) {
        if (EnterExitIndent < INT32_MAX) {
            EnterExitIndent++;
        }
        depth = EnterExitIndent;
        *indent = depth;
    }
    va_list arguments;
    va_start(arguments, format);
    WriteIndented(depth, format, arguments);
    va_end(arguments);
}

void Exit(int32_t* indent, const char* format, ...) {
    if ((HwInfoPrintLevel & ENTER_EXIT) == 0) {
        return;
    }
    va_list arguments;
    va_start(arguments, format);
    WriteIndented(indent != nullptr ? *indent : 0, format, arguments);
    va_end(arguments);
    if (indent != nullptr && EnterExitIndent > INT32_MIN) {
        EnterExitIndent--;
    }
}

void DebugPrint(const wchar_t* /*format*/, ...) {}

void ErrMsg(const char* function, const char* format, ...) {
    wchar_t text[CAPACITY];
    va_list arguments;
    va_start(arguments, format);
    FormatNarrow(text, 0, format, arguments);
    va_end(arguments);
    LogLine line(1);
    AddErrorHead(line, function).Add(text).Write(L"\n");
}

int32_t LastErr(const int32_t* error, const char* function, const char* format, ...) {
    int32_t number = error != nullptr ? *error : errno;
    wchar_t text[CAPACITY];
    va_list arguments;
    va_start(arguments, format);
    FormatNarrow(text, 0, format, arguments);
    va_end(arguments);
    wchar_t errorText[CAPACITY];
    FormatWide(errorText, CAPACITY, L" (0x%08x):  %S", static_cast<uint32_t>(number),
               ErrorText(number).Text());
    LogLine line(2);
    AddErrorHead(line, function).Add(text).Add(errorText).Write(L"\n\n");
    return number;
}

int32_t LastErrorMsg(const char* text, const int32_t* error) {
    int32_t number = error != nullptr ? *error : errno;
    wchar_t wideText[CAPACITY];
    dbgprint("%s (0x%08x):  %s\n", MakeWideString(text, wideText), static_cast<uint32_t>(number),
             ErrorText(number).Text());
    return number;
}
