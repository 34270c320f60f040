#include "util/enumdir.h"

#include <fnmatch.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "diag/hwdebug.h"
#include "filehandle.h"
#include "runtime/heap.h"

namespace {

// A slash is matched only by a slash, letters match in either case, a leading dot is ordinary.
constexpr int MATCH_FLAGS = FNM_PATHNAME | FNM_CASEFOLD;
static_assert(MATCH_FLAGS == 17, "fnmatch flags of the walk");

uint32_t TypeBits(mode_t mode) {
    switch (mode & S_IFMT) {
        case S_IFDIR:
            return ATTR_DIRECTORY;
        case S_IFREG:
            return ATTR_FILE;
        case S_IFCHR:
            return ATTR_CHAR_DEVICE;
        case S_IFBLK:
            return ATTR_BLOCK_DEVICE;
        case S_IFIFO:
            return ATTR_FIFO;
        case S_IFLNK:
            return ATTR_SYMLINK;
        case S_IFSOCK:
            return ATTR_SOCKET;
        default:
            return 0;
    }
}

bool IsDotEntry(const char* name) {
    return std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0;
}

// Copies text into a fixed field, cut if need be, always terminated.
void CopyField(char* field, const char* text) {
    std::strncpy(field, text, FILE_ATTRIBS_TEXT - 1);
    field[FILE_ATTRIBS_TEXT - 1] = '\0';
}

}  // namespace

EnumDir::EnumDir() {
    InitVars();
}

EnumDir::EnumDir(const char* directory, const char* pattern, uint32_t mask) {
    InitVars();
    StartEnum(directory, pattern, mask);
}

EnumDir::~EnumDir() {
    ReleaseResources();
}

void EnumDir::InitVars() {
    NameList = nullptr;
    NameCount = 0;
    NameIndex = 0;
    Directory = nullptr;
    Pattern = nullptr;
    TypeMask = 0;
    Started = false;
}

void EnumDir::ReleaseResources() {
    std::free(Directory);
    std::free(Pattern);
    if (NameList != nullptr) {
        for (int32_t i = 0; i < NameCount; i++) {
            std::free(NameList[i]);
        }
        std::free(NameList);
    }
    Directory = nullptr;
    Pattern = nullptr;
    NameList = nullptr;
    NameCount = 0;
    NameIndex = 0;
}

bool EnumDir::StartEnum(const char* directory, const char* pattern, uint32_t mask) {
    if (Started) {
        Reset();
    }
    Started = true;
    if (directory == nullptr) {
        return false;
    }
    if (pattern == nullptr) {
        pattern = "*";
    }

    dirent64** list = nullptr;
    int count = scandir64(directory, &list, nullptr, alphasort64);
    if (count <= 0) {
        if (list != nullptr) {
            std::free(list);
        }
        return false;
    }
    NameList = list;
    NameCount = count;

    Directory = HeapStrdup(directory);
    if (Directory == nullptr) {
        LastErr(nullptr, "EnumDir::StartEnum()", "directory malloc() failed");
        ReleaseResources();
        return false;
    }
    Pattern = HeapStrdup(pattern);
    if (Pattern == nullptr) {
        LastErr(nullptr, "EnumDir::StartEnum()", "pattern malloc() failed");
        ReleaseResources();
        return false;
    }
    NameIndex = 0;
    TypeMask = mask;
    return true;
}

bool EnumDir::Next(const char* directory, const char* pattern, uint32_t mask,
                   _FILE_ATTRIBS* attribs) {
    if (!Started) {
        StartEnum(directory, pattern, mask);
    }
    return EnumNext(attribs);
}

bool EnumDir::Next(_FILE_ATTRIBS* attribs) {
    if (!Started) {
        return false;
    }
    return EnumNext(attribs);
}

bool EnumDir::Rewind() {
    NameIndex = 0;
    return Started;
}

bool EnumDir::Reset() {
    if (Started) {
        ReleaseResources();
        InitVars();
    }
    return true;
}

bool EnumDir::EnumNext(_FILE_ATTRIBS* attribs) {
    // Filled per entry; the caller's record changes only for an entry that is handed out.
    _FILE_ATTRIBS found;
    while (attribs != nullptr && NameIndex < NameCount) {
        const dirent64* entry = NameList[NameIndex++];
        if (fnmatch(Pattern, entry->d_name, MATCH_FLAGS) != 0) {
            continue;
        }
        if (!SetAttribs(Directory, entry, &found)) {
            continue;
        }
        if ((found.Attribs & TypeMask) == 0) {
            continue;
        }
        std::memcpy(attribs, &found, sizeof(_FILE_ATTRIBS));
        return true;
    }
    errno = ENOENT;
    return false;
}

bool EnumDir::SetAttribs(const char* directory, const dirent64* entry, _FILE_ATTRIBS* attribs) {
    size_t dirLength = std::strlen(directory);
    bool needSlash = dirLength == 0 || directory[dirLength - 1] != '/';
    size_t pathSize = dirLength + (needSlash ? 1 : 0) + std::strlen(entry->d_name) + 1;
    UniqueMalloc<char> path(static_cast<char*>(HeapMalloc(pathSize)));
    if (path == nullptr) {
        LastErr(nullptr, "EnumDir::SetAttribs()", "fspec malloc() failed");
        return false;
    }
    std::strcpy(path.get(), directory);
    if (needSlash) {
        std::strcat(path.get(), "/");
    }
    std::strcat(path.get(), entry->d_name);

    struct stat64 status;
    if (lstat64(path.get(), &status) != 0) {
        LastErr(nullptr, "EnumDir::SetAttribs()", "lstat64() failed for %s",
                MakeWideString(path.get(), WideBuffer));
        return false;
    }

    CopyField(attribs->EntryPath, path.get());
    CopyField(attribs->EntryName, entry->d_name);
    attribs->Attribs = TypeBits(status.st_mode);
    if (IsDotEntry(entry->d_name)) {
        attribs->Attribs = (attribs->Attribs & ~ATTR_DIRECTORY) | ATTR_DOT;
    }
    attribs->AccessTime = static_cast<int32_t>(status.st_atime);
    attribs->WriteTime = static_cast<int32_t>(status.st_mtime);
    attribs->Size = static_cast<uint32_t>(status.st_size);
    return true;
}
