#include "util/blocklines.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

#include "runtime/heap.h"

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

// Bytes looked at together when skipping: four vectors, so that one rarely taken branch serves
// them all.
constexpr size_t RUN_BYTES = 64;

#if defined(__SSE2__)
__m128i Load(const char* bytes) {
    return _mm_loadu_si128(reinterpret_cast<const __m128i*>(bytes));
}

// The candidate line starts among the 16 bytes at block: a line feed followed by fewer than
// Depth tabs, or by Depth tabs and the two key bytes.
template <unsigned Depth>
__m128i Candidates(const char* block, __m128i first, __m128i second) {
    __m128i wanted = _mm_and_si128(_mm_cmpeq_epi8(Load(block + 1 + Depth), first),
                                   _mm_cmpeq_epi8(Load(block + 2 + Depth), second));
    for (unsigned t = 0; t < Depth; ++t) {
        __m128i tab = _mm_cmpeq_epi8(Load(block + 1 + t), _mm_set1_epi8('\t'));
        wanted = _mm_or_si128(wanted, _mm_andnot_si128(tab, _mm_set1_epi8(-1)));
    }
    return _mm_and_si128(_mm_cmpeq_epi8(Load(block), _mm_set1_epi8('\n')), wanted);
}
#endif

// From at, skips the runs of RUN_BYTES that hold no candidate line start; returns where a run
// that may hold one begins, or where too few bytes are left for a whole run.
template <unsigned Depth>
size_t SkipPlainRuns(const char* buffer, size_t at, size_t end, char first, char second) {
#if defined(__SSE2__)
    const __m128i keyFirst = _mm_set1_epi8(first);
    const __m128i keySecond = _mm_set1_epi8(second);
    for (; at + RUN_BYTES + Depth + 2 <= end; at += RUN_BYTES) {
        const char* run = buffer + at;
        __m128i any = _mm_or_si128(_mm_or_si128(Candidates<Depth>(run, keyFirst, keySecond),
                                                Candidates<Depth>(run + 16, keyFirst, keySecond)),
                                   _mm_or_si128(Candidates<Depth>(run + 32, keyFirst, keySecond),
                                                Candidates<Depth>(run + 48, keyFirst, keySecond)));
        if (_mm_movemask_epi8(any) != 0) {
            break;
        }
    }
#else
    (void)buffer, (void)end, (void)first, (void)second;
#endif
    return at;
}

}  // namespace

bool BlockLines::Open(const char* path) {
    File.Reset(open(path, O_RDONLY | O_CLOEXEC));
    if (!File) {
        return false;
    }
    if (!Buffer) {
        Buffer.reset(static_cast<char*>(HeapMalloc(BLOCK_BYTES + 1)));
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
    for (;;) {
        switch (depth) {
            case 0:
                at = SkipPlainRuns<0>(buffer, at, End, first, second);
                break;
            case 1:
                at = SkipPlainRuns<1>(buffer, at, End, first, second);
                break;
            case 2:
                at = SkipPlainRuns<2>(buffer, at, End, first, second);
                break;
            default:
                break;
        }
        // Byte by byte through the run that may hold a candidate, or through the last bytes.
        size_t stop = at + RUN_BYTES < End ? at + RUN_BYTES : End;
        for (; at < stop; ++at) {
            if (buffer[at] == '\n' &&
                IsCandidate(buffer + at + 1, buffer + End, depth, first, second)) {
                return at + 1;
            }
        }
        if (at >= End) {
            return End;
        }
    }
}
