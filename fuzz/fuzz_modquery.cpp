// The kernel's answers about a loaded module: GetModuleSymbols and the names of its symbol
// list, and GetModuleInfo, over answers of query_module that the harness makes up.
//
// Input: a little-endian 16-bit symbol count as the kernel reports it, then the buffer it
// fills (entries, then names). The same bytes are the module information record.
#include "adapters/modquery.h"
#include "fuzz/fuzzsupport.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 2) {
        return 0;
    }
    const InputScope input;
    AnswerQueryModule(data, size);
    ModuleSymbols symbols;
    const int count = GetModuleSymbols("velhpdrv", &symbols);
    Check(count == symbols.Count &&
              static_cast<size_t>(count) * sizeof(module_symbol) <= symbols.Size,
          "the symbol count does not fit the buffer");
    for (int i = -1; i <= count; i++) {
        const char* name = symbols.Name(i);
        Check(name == nullptr || (i >= 0 && i < count && name >= symbols.Buffer.get() &&
                                  name + std::strlen(name) < symbols.Buffer.get() + symbols.Size),
              "a symbol name lies outside the buffer");
    }
    UniqueMalloc<module_info> info;
    if (GetModuleInfo("velhpdrv", &info) && (info->flags & MOD_RUNNING) != 0) {
        volatile long uses = info->usecount;
        (void)uses;
    }
    return 0;
}
