#include "agent/jnilog.h"

#include <cstdarg>
#include <cstdint>
#include <cstdio>

#include "filehandle.h"

namespace {

// The log is on exactly while hDbgLogFile holds an open stream; DbgTurnOn mirrors that.
bool DbgTurnOn = false;
UniqueFile hDbgLogFile;

}  // namespace

bool JniLogOn() {
    return DbgTurnOn;
}

bool JniLogOpen() {
    // The file's existence is the switch: it is never created here.
    if (!UniqueFile(std::fopen(JNI_LOG_PATH, "r"))) {
        return false;
    }
    if (!hDbgLogFile) {
        // Close-on-exec, so that the monitor and killall do not inherit the descriptor.
        hDbgLogFile.reset(std::fopen(JNI_LOG_PATH, "a+e"));
    }
    DbgTurnOn = static_cast<bool>(hDbgLogFile);
    return DbgTurnOn;
}

void JniLog(const char* format, ...) {
    if (!DbgTurnOn || !hDbgLogFile) {
        return;
    }
    va_list arguments;
    va_start(arguments, format);
    std::vfprintf(hDbgLogFile.get(), format, arguments);
    va_end(arguments);
    // Each line reaches the file at once, so that nothing is lost if the process dies.
    std::fflush(hDbgLogFile.get());
}

void JniLogClose() {
    DbgTurnOn = false;
    hDbgLogFile.reset();
}

std::string NarrowForLog(const wchar_t* text) {
    std::string narrow;
    for (size_t i = 0; text[i] != L'\0'; ++i) {
        const auto code = static_cast<uint32_t>(static_cast<int32_t>(text[i]));
        if (code < 0x80) {
            narrow += static_cast<char>(code);
        } else if (code < 0x800) {
            narrow += static_cast<char>(0xC0 | (code >> 6));
            narrow += static_cast<char>(0x80 | (code & 0x3F));
        } else if (code < 0x10000 && (code < 0xD800 || code > 0xDFFF)) {
            narrow += static_cast<char>(0xE0 | (code >> 12));
            narrow += static_cast<char>(0x80 | ((code >> 6) & 0x3F));
            narrow += static_cast<char>(0x80 | (code & 0x3F));
        } else if (code >= 0x10000 && code < 0x110000) {
            narrow += static_cast<char>(0xF0 | (code >> 18));
            narrow += static_cast<char>(0x80 | ((code >> 12) & 0x3F));
            narrow += static_cast<char>(0x80 | ((code >> 6) & 0x3F));
            narrow += static_cast<char>(0x80 | (code & 0x3F));
        } else {
            narrow += '?';
        }
    }
    return narrow;
}
