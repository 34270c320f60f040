// Sorted, filtered listing of one directory, one entry per call.
#pragma once

#include <dirent.h>

#include <cstdint>

constexpr uint32_t ATTR_DIRECTORY = 0x01;
constexpr uint32_t ATTR_FILE = 0x02;
constexpr uint32_t ATTR_CHAR_DEVICE = 0x04;
constexpr uint32_t ATTR_BLOCK_DEVICE = 0x08;
constexpr uint32_t ATTR_FIFO = 0x10;
constexpr uint32_t ATTR_SYMLINK = 0x20;
constexpr uint32_t ATTR_SOCKET = 0x40;
constexpr uint32_t ATTR_DOT = 0x80;

constexpr int FILE_ATTRIBS_TEXT = 4096;

struct _FILE_ATTRIBS {
    uint32_t Attribs;
    int32_t AccessTime;
    int32_t WriteTime;
    uint32_t Size;
    char EntryName[FILE_ATTRIBS_TEXT];
    char EntryPath[FILE_ATTRIBS_TEXT];
};

class EnumDir {
  public:
    EnumDir();
    EnumDir(const char* directory, const char* pattern, uint32_t mask);
    ~EnumDir();
    EnumDir(const EnumDir&) = delete;
    EnumDir& operator=(const EnumDir&) = delete;

    // Scans the directory; false when it holds no entry or cannot be read.
    bool StartEnum(const char* directory, const char* pattern, uint32_t mask);
    // Starts with the arguments on the first call only; later calls walk the stored scan.
    bool Next(const char* directory, const char* pattern, uint32_t mask, _FILE_ATTRIBS* attribs);
    bool Next(_FILE_ATTRIBS* attribs);
    bool Rewind();
    bool Reset();

  private:
    void InitVars();
    void ReleaseResources();
    bool EnumNext(_FILE_ATTRIBS* attribs);
    static bool SetAttribs(const char* directory, const dirent64* entry, _FILE_ATTRIBS* attribs);

    dirent64** NameList;
    int32_t NameCount;
    int32_t NameIndex;
    char* Directory;
    char* Pattern;
    uint32_t TypeMask;
    bool Started;
};
