#include "util/instdir.h"

#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <cwchar>

#include "diag/hwdebug.h"
#include "filehandle.h"
#include "runtime/heap.h"

bool GetInstallDir(wchar_t* buffer, int32_t size) {
    if (buffer == nullptr) {
        ErrMsg("GetInstallDir", "Called with a NULL buffer");
        return false;
    }
    UniqueMalloc<char> directory(getcwd(nullptr, 0));
    if (directory == nullptr) {
        LastErr(nullptr, "GetInstallDir", "getcwd() failed");
        return false;
    }
    size_t length = std::strlen(directory.get());
    if (size > 0 && static_cast<size_t>(size) > length) {
        WidenBytes(directory.get(), length, buffer);
        buffer[length] = L'\0';
        return true;
    }
    ErrMsg("GetInstallDir", "Insufficient buffer for install path");
    return false;
}

char* InstallDirFile(const char* name) {
    wchar_t directory[INSTALL_DIR_CHARS];
    if (!GetInstallDir(directory, INSTALL_DIR_CHARS)) {
        return nullptr;
    }
    size_t directoryLength = std::wcslen(directory);
    size_t nameLength = name != nullptr ? std::strlen(name) : 0;
    bool addSlash = nameLength > 0 && name[0] != '/';
    auto* path = static_cast<char*>(HeapMalloc(directoryLength + nameLength + (addSlash ? 2 : 1)));
    if (path == nullptr) {
        LastErr(nullptr, "InstallDirFile", "malloc() failed");
        return nullptr;
    }
    for (size_t i = 0; i < directoryLength; i++) {
        path[i] = static_cast<char>(directory[i] & 0xFF);
    }
    char* end = path + directoryLength;
    if (addSlash) {
        *end++ = '/';
    }
    std::memcpy(end, name != nullptr ? name : "", nameLength);
    end[nameLength] = '\0';
    return path;
}

bool Exist(const char* path) {
    if (path == nullptr) {
        return false;
    }
    UniqueFile file(std::fopen(path, "r"));
    return file != nullptr;
}
