#include "adapters/modquery.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>

#include "diag/hwdebug.h"
#include "runtime/heap.h"
#include "util/sysaccess.h"

namespace {

// A module may gain symbols between the size question and the read; ask again a few times.
constexpr int SYMBOL_READ_ATTEMPTS = 3;

const char* Printable(const char* text) {
    return text != nullptr ? text : "";
}

}  // namespace

const char* ModuleSymbols::Name(int index) const {
    if (!Buffer || index < 0 || index >= Count) {
        return nullptr;
    }
    module_symbol entry;
    std::memcpy(&entry, Buffer.get() + static_cast<size_t>(index) * sizeof(entry), sizeof(entry));
    size_t namesStart = static_cast<size_t>(Count) * sizeof(module_symbol);
    if (entry.name < namesStart || entry.name >= Size) {
        return nullptr;
    }
    const char* name = Buffer.get() + entry.name;
    if (std::memchr(name, '\0', Size - entry.name) == nullptr) {
        return nullptr;
    }
    return name;
}

int SizeBuffer(const char* module, int which) {
    size_t size = 0;
    // Without a buffer the call fails (ENOSPC) and still reports the size it needs.
    SysCalls().QueryModule(module, which, nullptr, 0, &size);
    return size <= static_cast<size_t>(INT_MAX) ? static_cast<int>(size) : 0;
}

int GetModuleSymbols(const char* module, ModuleSymbols* symbols) {
    *symbols = ModuleSymbols{};
    int size = SizeBuffer(module, QM_SYMBOLS);
    for (int attempt = 0; size > 0 && attempt < SYMBOL_READ_ATTEMPTS; ++attempt) {
        UniqueMalloc<char> buffer(static_cast<char*>(HeapMalloc(static_cast<size_t>(size))));
        if (!buffer) {
            LastErr(nullptr, "GetModuleSymbols()", "locbuf malloc(%d) failed", size);
            return 0;
        }
        size_t returned = 0;
        errno = 0;
        if (SysCalls().QueryModule(module, QM_SYMBOLS, buffer.get(), static_cast<size_t>(size),
                                   &returned) == 0) {
            // Never more entries than the buffer can hold.
            size_t fits = static_cast<size_t>(size) / sizeof(module_symbol);
            size_t count = std::min(returned, fits);
            if (count == 0) {
                return 0;
            }
            symbols->Buffer = std::move(buffer);
            symbols->Size = static_cast<size_t>(size);
            symbols->Count = static_cast<int>(count);
            return symbols->Count;
        }
        if (errno != ENOSPC || returned <= static_cast<size_t>(size) ||
            returned > static_cast<size_t>(INT_MAX)) {
            return 0;
        }
        size = static_cast<int>(returned);
    }
    return 0;
}

bool GetModuleInfo(const char* module, UniqueMalloc<module_info>* info) {
    info->reset();
    int size = SizeBuffer(module, QM_INFO);
    if (size == 0) {
        ErrMsg("GetModuleInfo()", "No info for module %s\n",
               MakeWideString(Printable(module), WideBuffer));
        return false;
    }
    // A kernel record shorter than ours leaves the rest zero rather than unread memory.
    size_t capacity = std::max(static_cast<size_t>(size), sizeof(module_info));
    UniqueMalloc<module_info> record(static_cast<module_info*>(HeapCalloc(1, capacity)));
    if (!record) {
        LastErr(nullptr, "GetModuleInfo()", "malloc %d bytes failed\n", size);
        return false;
    }
    size_t returned = 0;
    if (SysCalls().QueryModule(module, QM_INFO, record.get(), static_cast<size_t>(size),
                               &returned) != 0) {
        return false;
    }
    *info = std::move(record);
    return true;
}
