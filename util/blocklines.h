// A text file read front to back in large blocks, its lines handed out in place. Made for scans
// that must read a large file again and again and look closely at only a few of its lines: the
// lines a scan does not ask for are skipped many bytes at a time.
#pragma once

#include <cstddef>

#include "filehandle.h"

class BlockLines {
  public:
    // Longest line handed out; the rest of a longer line is dropped, so it never comes back as
    // a line of its own.
    static constexpr size_t LONGEST_LINE = 1023;

    BlockLines() = default;
    BlockLines(const BlockLines&) = delete;
    BlockLines& operator=(const BlockLines&) = delete;

    // Starts reading path from its beginning; false when it cannot be opened (errno tells why)
    // or no buffer can be had.
    bool Open(const char* path);
    explicit operator bool() const { return File && Buffer; }

    // The next line without its line feed (a last line without one counts), at most LONGEST_LINE
    // bytes long and not terminated; null at the end of the file or on a read error.
    const char* Next(size_t* length);

    // The next line that begins with depth tabs followed by the bytes first and second, or that
    // begins with fewer than depth tabs. Every line skipped fails both tests; a line handed out
    // may still be of no interest to the caller.
    const char* NextCandidate(unsigned depth, char first, char second, size_t* length);

  private:
    bool Fill();
    const char* TakeLine(size_t start, size_t* length);
    size_t FindCandidate(size_t from, unsigned depth, char first, char second) const;

    UniqueFd File;
    UniqueMalloc<char> Buffer;
    // Buffer[Begin - 1] is the line feed before the next unread line; bytes up to End are held.
    size_t Begin = 1;
    size_t End = 1;
    bool AtEnd = false;
    bool Skipping = false;  // dropping the rest of an overlong line
};
