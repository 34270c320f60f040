#include "util/blocklines.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

namespace {

// Few system calls per file, and still small enough to stay in the processor's cache while the
// block is scanned.
constexpr size_t BLOCK_BYTES = 64 * 1024;

// Whether the line at line (bytes held up to end) is a candidate. A line whose deciding bytes
// are not all held yet counts as one; it is looked at again once they are.
bool IsCandidate(const char* line, const char* end, unsigned depth, char first, char second) {
    for (unsigned tab = 0; tab < depth; ++tab) {
        if (line + tab >= end || line[tab] != '\t') {
            return true;
        }
    }
    if (line + depth + 1 >= end) {
        return true;
    }
    return line[depth] == first && line[depth + 1] == second;
}

}  // namespace

bool BlockLines::Open(const char* path) {
    File.Reset(open(path, O_RDONLY | O_CLOEXEC));
    if (!File) {
        return false;
    }
    if (!Buffer) {
        Buffer.reset(static_cast<char*>(std::malloc(BLOCK_BYTES + 1)));
        if (!Buffer) {
            File.Reset();
            errno = ENOMEM;
            return false;
        }
    }
    Buffer.get()[0] = '\n';
    Begin = 1;
    End = 1;
    AtEnd = false;
    Skipping = false;
    return true;
}

// Moves the unread bytes to the front and reads on; false when nothing more can come.
bool BlockLines::Fill() {
    if (AtEnd) {
        return false;
    }
    char* buffer = Buffer.get();
    size_t keep = End - (Begin - 1);
    std::memmove(buffer, buffer + Begin - 1, keep);
    Begin = 1;
    End = keep;
    while (End < BLOCK_BYTES) {
        ssize_t got = read(File.Get(), buffer + End, BLOCK_BYTES - End);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            // A read error ends the file as its end does; a last line without a line feed
            // gets one.
            AtEnd = true;
            Skipping = false;
            if (End > Begin) {
                buffer[End++] = '\n';
                return true;
            }
            return false;
        }
        char* fresh = buffer + End;
        if (Skipping) {
            auto* feed = static_cast<char*>(std::memchr(fresh, '\n', static_cast<size_t>(got)));
            if (feed == nullptr) {
                continue;
            }
            size_t rest = static_cast<size_t>(fresh + got - feed);
            std::memmove(fresh, feed, rest);
            End += rest;
            Skipping = false;
            return true;
        }
        End += static_cast<size_t>(got);
        if (End == BLOCK_BYTES && std::memchr(buffer + Begin, '\n', End - Begin) == nullptr) {
            // One line fills the buffer: keep its head and drop the rest up to its line feed.
            End = Begin + LONGEST_LINE;
            Skipping = true;
            continue;
        }
        return true;
    }
    return false;
}

// Hands out the line that starts at start when its line feed is held.
const char* BlockLines::TakeLine(size_t start, size_t* length) {
    char* buffer = Buffer.get();
    auto* feed = static_cast<char*>(std::memchr(buffer + start, '\n', End - start));
    if (feed == nullptr) {
        return nullptr;
    }
    size_t bytes = static_cast<size_t>(feed - (buffer + start));
    *length = bytes < LONGEST_LINE ? bytes : LONGEST_LINE;
    Begin = static_cast<size_t>(feed - buffer) + 1;
    return buffer + start;
}

const char* BlockLines::Next(size_t* length) {
    if (!*this) {
        return nullptr;
    }
    for (;;) {
        if (Begin < End) {
            if (const char* line = TakeLine(Begin, length)) {
                return line;
            }
        }
        if (!Fill()) {
            return nullptr;
        }
    }
}

const char* BlockLines::NextCandidate(unsigned depth, char first, char second, size_t* length) {
    if (!*this) {
        return nullptr;
    }
    for (;;) {
        size_t start = FindCandidate(Begin - 1, depth, first, second);
        if (start < End) {
            if (const char* line = TakeLine(start, length)) {
                return line;
            }
            Begin = start;  // its line feed is still to be read
        } else {
            const char* buffer = Buffer.get();
            Begin =
                static_cast<size_t>(static_cast<const char*>(memrchr(buffer, '\n', End)) - buffer) +
                1;
        }
        if (!Fill()) {
            return nullptr;
        }
    }
}

// The start of the first candidate line after a line feed at from or later; End when none.
size_t BlockLines::FindCandidate(size_t from, unsigned depth, char first, char second) const {
    const char* buffer = Buffer.get();
    size_t at = from;
#if defined(__SSE2__)
    // Sixteen line starts at a time: a line feed, then (after it) too few tabs or the key.
    const __m128i feed = _mm_set1_epi8('\n');
    const __m128i tab = _mm_set1_epi8('\t');
    const __m128i keyFirst = _mm_set1_epi8(first);
    const __m128i keySecond = _mm_set1_epi8(second);
    const __m128i ones = _mm_set1_epi8(-1);
    auto load = [](const char* bytes) {
        return _mm_loadu_si128(reinterpret_cast<const __m128i*>(bytes));
    };
    for (; at + 16 + depth + 2 <= End; at += 16) {
        const char* block = buffer + at;
        __m128i starts = _mm_cmpeq_epi8(load(block), feed);
        if (_mm_movemask_epi8(starts) == 0) {
            continue;
        }
        __m128i wanted = _mm_and_si128(_mm_cmpeq_epi8(load(block + 1 + depth), keyFirst),
                                       _mm_cmpeq_epi8(load(block + 2 + depth), keySecond));
        for (unsigned t = 0; t < depth; ++t) {
            wanted = _mm_or_si128(wanted,
                                  _mm_andnot_si128(_mm_cmpeq_epi8(load(block + 1 + t), tab), ones));
        }
        int mask = _mm_movemask_epi8(_mm_and_si128(starts, wanted));
        if (mask != 0) {
            return at + static_cast<size_t>(__builtin_ctz(static_cast<unsigned>(mask))) + 1;
        }
    }
#endif
    for (; at < End; ++at) {
        if (buffer[at] == '\n' &&
            IsCandidate(buffer + at + 1, buffer + End, depth, first, second)) {
            return at + 1;
        }
    }
    return End;
}
