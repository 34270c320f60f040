// A stand-in for Linux 2.4's query_module over a table of loaded modules, answering as the
// kernel does (ENOSPC with the size needed, native-word records).
#pragma once

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "adapters/modquery.h"
#include "util/sysaccess.h"

using FakeSymbols = std::vector<std::pair<unsigned long, std::string>>;

struct FakeModule {
    std::string Name;
    unsigned long Flags = 1;
    FakeSymbols Symbols;
    // Symbols that appear between the size question and the read (a module still loading).
    FakeSymbols LateSymbols;
};

struct FakeModuleTable {
    std::vector<FakeModule> Modules;
    int Calls = 0;
};

inline FakeModuleTable& FakeModules() {
    static FakeModuleTable table;
    return table;
}

// The QM_SYMBOLS answer for a list of symbols: entries, then the names they point at.
inline std::vector<char> SymbolImage(const FakeSymbols& symbols) {
    std::vector<char> image(symbols.size() * sizeof(module_symbol));
    size_t index = 0;
    for (const auto& [value, name] : symbols) {
        module_symbol entry{value, image.size()};
        std::memcpy(image.data() + index++ * sizeof(entry), &entry, sizeof(entry));
        image.insert(image.end(), name.c_str(), name.c_str() + name.size() + 1);
    }
    return image;
}

inline int FakeQueryModule(const char* name, int which, void* buffer, size_t size, size_t* ret) {
    ++FakeModules().Calls;
    for (FakeModule& module : FakeModules().Modules) {
        if (module.Name != name) {
            continue;
        }
        std::vector<char> image;
        if (which == QM_INFO) {
            const module_info info{0xC8800000ul, 4096, module.Flags, 1};
            image.assign(reinterpret_cast<const char*>(&info),
                         reinterpret_cast<const char*>(&info) + sizeof(info));
        } else if (which == QM_SYMBOLS) {
            image = SymbolImage(module.Symbols);
        } else {
            errno = EINVAL;
            return -1;
        }
        *ret = image.size();
        if (size < image.size()) {
            module.Symbols.insert(module.Symbols.end(), module.LateSymbols.begin(),
                                  module.LateSymbols.end());
            module.LateSymbols.clear();
            errno = ENOSPC;
            return -1;
        }
        std::copy(image.begin(), image.end(), static_cast<char*>(buffer));
        *ret = which == QM_SYMBOLS ? module.Symbols.size() : image.size();
        return 0;
    }
    errno = ENOENT;
    return -1;
}

// Installs the fake through SysCalls() over an empty table.
inline void InstallFakeModules() {
    FakeModules() = FakeModuleTable{};
    SysCalls().QueryModule = FakeQueryModule;
}
