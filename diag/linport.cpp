#include "diag/linport.h"

#include <cctype>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <cwctype>

#include "diag/hwdebug.h"
#include "filehandle.h"

void* (*MessageAlloc)(size_t bytes) = std::malloc;

namespace {

bool RetryCanCure(int error) {
    return error == EINTR || error == EAGAIN || error == EMFILE || error == ENFILE;
}

// Writes text in the locale's multibyte encoding, as wide stream output would, but a character
// that the locale cannot encode becomes "?" instead of ending the write there.
void WriteEncoded(FILE* file, const wchar_t* text) {
    char chunk[512];
    size_t used = 0;
    std::mbstate_t state{};
    for (; *text != L'\0'; text++) {
        if (used + MB_LEN_MAX > sizeof(chunk)) {
            std::fwrite(chunk, 1, used, file);
            used = 0;
        }
        size_t bytes = std::wcrtomb(chunk + used, *text, &state);
        if (bytes == static_cast<size_t>(-1)) {
            state = std::mbstate_t{};
            chunk[used++] = '?';
        } else {
            used += bytes;
        }
    }
    std::fwrite(chunk, 1, used, file);
}

}  // namespace

int32_t GetLastError() {
    return errno;
}

int32_t FormatMessage(int32_t flags, const void* /*source*/, int32_t messageId,
                      int32_t /*languageId*/, wchar_t* buffer, int32_t size, char** /*arguments*/) {
    if (buffer == nullptr) {
        return 0;
    }
    const char* message = std::strerror(messageId);
    size_t length = std::strlen(message);
    if ((flags & FORMAT_MESSAGE_ALLOCATE_BUFFER) != 0) {
        auto** target = reinterpret_cast<wchar_t**>(buffer);
        size_t chars = (size > 0 && static_cast<size_t>(size) > length ? size : length) + 1;
        auto* text = static_cast<wchar_t*>(MessageAlloc(chars * sizeof(wchar_t)));
        *target = text;
        if (text == nullptr) {
            return 0;
        }
        WidenBytes(message, length, text);
        text[length] = L'\0';
        return static_cast<int32_t>(length);
    }
    if (size <= 0) {
        return 0;
    }
    size_t count = length < static_cast<size_t>(size) - 1 ? length : static_cast<size_t>(size) - 1;
    WidenBytes(message, count, buffer);
    buffer[count] = L'\0';
    return static_cast<int32_t>(count);
}

void* LocalFree(void* memory) {
    std::free(memory);
    return nullptr;
}

char* _strupr(char* text) {
    for (char* p = text; p != nullptr && *p != '\0'; p++) {
        *p = static_cast<char>(std::toupper(static_cast<unsigned char>(*p)));
    }
    return text;
}

char* _strlwr(char* text) {
    for (char* p = text; p != nullptr && *p != '\0'; p++) {
        *p = static_cast<char>(std::tolower(static_cast<unsigned char>(*p)));
    }
    return text;
}

wchar_t* _wcsupr(wchar_t* text) {
    for (wchar_t* p = text; p != nullptr && *p != L'\0'; p++) {
        *p = static_cast<wchar_t>(std::towupper(static_cast<wint_t>(*p)));
    }
    return text;
}

wchar_t* _wcslwr(wchar_t* text) {
    for (wchar_t* p = text; p != nullptr && *p != L'\0'; p++) {
        *p = static_cast<wchar_t>(std::towlower(static_cast<wint_t>(*p)));
    }
    return text;
}

FILE* OpenLogFile(const char* path, const char* mode, FileOpener opener) {
    for (int attempt = 0; attempt < LOG_OPEN_ATTEMPTS; attempt++) {
        FILE* file = opener(path, mode);
        if (file != nullptr || !RetryCanCure(errno)) {
            return file;
        }
    }
    return nullptr;
}

void OutputDebugString(const wchar_t* text) {
    if (text == nullptr) {
        return;
    }
    // Callers trace between a failing call and the report of its errno.
    int saved = errno;
    UniqueFile file(OpenLogFile(HWINFO_LOG_PATH, "a", std::fopen));
    if (file != nullptr) {
        WriteEncoded(file.get(), text);
    }
    errno = saved;
}
