#include "tests/unit/fake_modules.h"

#include <cerrno>
#include <cstring>

#include "adapters/modquery.h"
#include "util/sysaccess.h"

FakeModuleTable& FakeModules() {
    static FakeModuleTable table;
    return table;
}

void InstallFakeModules() {
    FakeModules() = FakeModuleTable{};
    SysCalls().QueryModule = FakeQueryModule;
}

std::vector<char> SymbolImage(const std::vector<std::pair<unsigned long, std::string>>& symbols) {
    std::vector<char> image(symbols.size() * sizeof(module_symbol));
    size_t index = 0;
    for (const auto& [value, name] : symbols) {
        module_symbol entry{value, image.size()};
        std::memcpy(image.data() + index++ * sizeof(entry), &entry, sizeof(entry));
        image.insert(image.end(), name.begin(), name.end());
        image.push_back('\0');
    }
    return image;
}

int FakeQueryModule(const char* name, int which, void* buffer, size_t size, size_t* ret) {
    ++FakeModules().Calls;
    for (FakeModule& module : FakeModules().Modules) {
        if (module.Name != name) {
            continue;
        }
        if (which == QM_INFO) {
            *ret = sizeof(module_info);
            if (size < sizeof(module_info)) {
                errno = ENOSPC;
                return -1;
            }
            module_info info{0xC8800000ul, 4096, module.Flags, 1};
            std::memcpy(buffer, &info, sizeof(info));
            return 0;
        }
        if (which == QM_SYMBOLS) {
            std::vector<char> image = SymbolImage(module.Symbols);
            if (size < image.size()) {
                *ret = image.size();
                module.Symbols.insert(module.Symbols.end(), module.LateSymbols.begin(),
                                      module.LateSymbols.end());
                module.LateSymbols.clear();
                errno = ENOSPC;
                return -1;
            }
            if (!image.empty()) {
                std::memcpy(buffer, image.data(), image.size());
            }
            *ret = module.Symbols.size();
            return 0;
        }
        errno = EINVAL;
        return -1;
    }
    errno = ENOENT;
    return -1;
}
