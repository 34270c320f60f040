// Owning handles for C library resources: a stdio stream and malloc'ed memory.
#pragma once

#include <cstdio>
#include <cstdlib>
#include <memory>

struct FileCloser {
    void operator()(FILE* file) const { std::fclose(file); }
};
using UniqueFile = std::unique_ptr<FILE, FileCloser>;

struct MallocFreer {
    void operator()(void* memory) const { std::free(memory); }
};
template <typename T>
using UniqueMalloc = std::unique_ptr<T, MallocFreer>;
