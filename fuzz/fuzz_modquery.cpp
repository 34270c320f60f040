// The kernel's answers about a loaded module: GetModuleSymbols and the names of its symbol
// list, and GetModuleInfo, over answers of query_module that the harness makes up.
//
// Input: a little-endian 16-bit symbol count as the kernel reports it, then the buffer it
// fills (entries, then names). The same bytes are the module information record.
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <vector>

#include "adapters/modquery.h"
#include "fuzz/fuzzsupport.h"
#include "util/sysaccess.h"

namespace {

size_t ReportedCount = 0;
std::vector<uint8_t> Answer;

// query_module's contract: too small a buffer fails with ENOSPC and the size it needs.
int FakeQueryModule(const char*, int which, void* buffer, size_t size, size_t* ret) {
    if (which != QM_SYMBOLS && which != QM_INFO) {
        errno = EINVAL;
        return -1;
    }
    if (size < Answer.size()) {
        *ret = Answer.size();
        errno = ENOSPC;
        return -1;
    }
    if (!Answer.empty()) {
        std::memcpy(buffer, Answer.data(), Answer.size());
    }
    *ret = which == QM_SYMBOLS ? ReportedCount : Answer.size();
    return 0;
}

}  // namespace

void SetUpHarness() {
    SysCalls().QueryModule = FakeQueryModule;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 2) {
        return 0;
    }
    StartInput();
    ReportedCount = data[0] | static_cast<size_t>(data[1]) << 8;
    Answer.assign(data + 2, data + size);

    ModuleSymbols symbols;
    const int count = GetModuleSymbols("velhpdrv", &symbols);
    if (count != symbols.Count ||
        static_cast<size_t>(count) * sizeof(module_symbol) > symbols.Size) {
        Violated("the symbol count does not fit the buffer");
    }
    for (int i = -1; i <= count; i++) {
        const char* name = symbols.Name(i);
        if (name == nullptr) {
            continue;
        }
        if (i < 0 || i >= count || name < symbols.Buffer.get() ||
            name + std::strlen(name) >= symbols.Buffer.get() + symbols.Size) {
            Violated("a symbol name lies outside the buffer");
        }
    }

    UniqueMalloc<module_info> info;
    if (GetModuleInfo("velhpdrv", &info) && (info->flags & MOD_RUNNING) != 0) {
        volatile long uses = info->usecount;
        (void)uses;
    }
    return 0;
}
