#include "sim/preload/kmodules.h"

#include <dirent.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "sim/common/textfile.h"

namespace velhsim {

namespace {

// Module addresses as a 32-bit kernel hands them out from its vmalloc area.
constexpr unsigned long MODULE_AREA = 0xd0800000UL;
constexpr unsigned long MODULE_SPACING = 0x00100000UL;
constexpr unsigned long DEFAULT_SIZE = 0x4000UL;

struct Symbol {
    unsigned long Value;
    std::string Name;
};

struct Module {
    std::string Name;
    KernelModuleInfo Info{};
    std::vector<Symbol> Symbols;
    std::vector<std::string> Deps;
};

int Fail(int error) {
    errno = error;
    return -1;
}

std::string ModulesDir(const std::string& run) {
    return JoinPath(run, "modules");
}

// The loaded modules, in name order.
std::vector<std::string> ModuleNames(const std::string& run) {
    std::vector<std::string> names;
    const std::string dir = ModulesDir(run);
    std::unique_ptr<DIR, int (*)(DIR*)> listing(opendir(dir.c_str()), closedir);
    if (!listing) {
        return names;
    }
    while (const dirent* entry = readdir(listing.get())) {
        const std::string name = entry->d_name;
        if (name != "." && name != ".." && IsDirectory(JoinPath(dir, name))) {
            names.push_back(name);
        }
    }
    std::sort(names.begin(), names.end());
    return names;
}

std::vector<std::string> ReadNameList(const std::string& path) {
    std::vector<std::string> names;
    const std::optional<std::string> text = ReadWholeFile(path);
    if (text) {
        for (std::string_view line : SplitLines(*text)) {
            for (std::string& word : SplitWords(StripComment(line))) {
                names.push_back(std::move(word));
            }
        }
    }
    return names;
}

// A number file of the module, or the fallback when it is absent; a malformed one is reported.
bool ReadNumberFile(const std::string& path, unsigned long fallback, unsigned long* value) {
    const std::optional<std::string> text = ReadWholeFile(path);
    if (!text) {
        *value = fallback;
        return true;
    }
    const std::optional<uint64_t> number = ParseNumber(StripComment(*text));
    if (!number) {
        std::fprintf(stderr, "velhsim: %s: not a number\n", path.c_str());
        return false;
    }
    *value = static_cast<unsigned long>(*number);
    return true;
}

bool ReadSymbols(const std::string& path, std::vector<Symbol>* symbols) {
    const std::optional<std::string> text = ReadWholeFile(path);
    if (!text) {
        return true;
    }
    for (std::string_view line : SplitLines(*text)) {
        const std::vector<std::string> words = SplitWords(StripComment(line));
        if (words.empty()) {
            continue;
        }
        if (words.size() == 1) {
            symbols->push_back({0, words[0]});
            continue;
        }
        const std::optional<uint64_t> value = ParseHex(words[0]);
        if (!value) {
            std::fprintf(stderr, "velhsim: %s: \"%s\" is not a hexadecimal symbol value\n",
                         path.c_str(), words[0].c_str());
            return false;
        }
        symbols->push_back({static_cast<unsigned long>(*value), words[1]});
    }
    return true;
}

std::optional<Module> LoadModule(const std::string& run, const std::string& name, size_t index) {
    const std::string dir = JoinPath(ModulesDir(run), name);
    Module module;
    module.Name = name;
    unsigned long useCount = 0;
    if (!ReadNumberFile(JoinPath(dir, "address"), MODULE_AREA + MODULE_SPACING * index,
                        &module.Info.Address) ||
        !ReadNumberFile(JoinPath(dir, "flags"), MOD_RUNNING, &module.Info.Flags) ||
        !ReadNumberFile(JoinPath(dir, "size"), DEFAULT_SIZE, &module.Info.Size) ||
        !ReadNumberFile(JoinPath(dir, "usecount"), 0, &useCount) ||
        !ReadSymbols(JoinPath(dir, "symbols"), &module.Symbols)) {
        return std::nullopt;
    }
    module.Info.UseCount = static_cast<long>(useCount);
    module.Deps = ReadNameList(JoinPath(dir, "deps"));
    return module;
}

// Copies NUL-separated names out as QM_MODULES, QM_DEPS and QM_REFS do: the count in *ret, or
// ENOSPC with the space needed.
int CopyNameList(const std::vector<std::string>& names, char* buffer, size_t size, size_t* ret) {
    size_t space = 0;
    for (const std::string& name : names) {
        space += name.size() + 1;
    }
    if (space > size) {
        *ret = space;
        return Fail(ENOSPC);
    }
    if (buffer == nullptr && space != 0) {
        return Fail(EFAULT);
    }
    size_t offset = 0;
    for (const std::string& name : names) {
        std::memcpy(buffer + offset, name.c_str(), name.size() + 1);
        offset += name.size() + 1;
    }
    *ret = names.size();
    return 0;
}

bool CanQuery(const Module& module) {
    return (module.Info.Flags & (MOD_RUNNING | MOD_INITIALIZING)) != 0 &&
           (module.Info.Flags & MOD_DELETED) == 0;
}

// Pairs of native words (value, offset of the name from the buffer's start), then the names.
int CopySymbols(const Module& module, char* buffer, size_t size, size_t* ret) {
    if (!CanQuery(module)) {
        *ret = 0;
        return 0;
    }
    const size_t table = module.Symbols.size() * 2 * sizeof(unsigned long);
    size_t space = table;
    for (const Symbol& symbol : module.Symbols) {
        space += symbol.Name.size() + 1;
    }
    if (space > size) {
        *ret = space;
        return Fail(ENOSPC);
    }
    if (buffer == nullptr && space != 0) {
        return Fail(EFAULT);
    }
    size_t offset = table;
    for (size_t i = 0; i < module.Symbols.size(); ++i) {
        const Symbol& symbol = module.Symbols[i];
        const unsigned long pair[2] = {symbol.Value, static_cast<unsigned long>(offset)};
        std::memcpy(buffer + i * sizeof pair, pair, sizeof pair);
        std::memcpy(buffer + offset, symbol.Name.c_str(), symbol.Name.size() + 1);
        offset += symbol.Name.size() + 1;
    }
    *ret = module.Symbols.size();
    return 0;
}

int CopyInfo(const Module& module, void* buffer, size_t size, size_t* ret) {
    *ret = sizeof(KernelModuleInfo);
    if (size < sizeof(KernelModuleInfo)) {
        return Fail(ENOSPC);
    }
    if (buffer == nullptr) {
        return Fail(EFAULT);
    }
    std::memcpy(buffer, &module.Info, sizeof module.Info);
    return 0;
}

std::vector<std::string> ReferringModules(const std::string& run, const std::string& name) {
    std::vector<std::string> referrers;
    for (const std::string& other : ModuleNames(run)) {
        const std::vector<std::string> deps =
            ReadNameList(JoinPath(JoinPath(ModulesDir(run), other), "deps"));
        if (std::find(deps.begin(), deps.end(), name) != deps.end()) {
            referrers.push_back(other);
        }
    }
    return referrers;
}

}  // namespace

int QueryModule(const std::string& run, const char* name, int which, void* buffer, size_t size,
                size_t* ret) {
    if (ret == nullptr && which != 0) {
        return Fail(EFAULT);
    }
    char* bytes = static_cast<char*>(buffer);
    // No name (or an empty one) means the kernel itself, which exports nothing here.
    if (name == nullptr || *name == '\0') {
        switch (which) {
            case 0:
                return 0;
            case QM_MODULES:
                return CopyNameList(ModuleNames(run), bytes, size, ret);
            case QM_SYMBOLS:
                *ret = 0;
                return 0;
            case QM_DEPS:
            case QM_REFS:
            case QM_INFO:
            default:
                return Fail(EINVAL);
        }
    }
    // The module is looked up directly; the folder is listed only for the answers that depend
    // on the module's place in name order (its default address) or on the other modules, since a
    // driver asks about its modules once for every PCI function.
    const std::string_view wanted(name);
    if (wanted == "." || wanted == ".." || wanted.find('/') != std::string_view::npos ||
        !IsDirectory(JoinPath(ModulesDir(run), name))) {
        return Fail(ENOENT);
    }
    std::vector<std::string> names;
    size_t index = 0;
    if (which == QM_INFO || which == QM_MODULES) {
        names = ModuleNames(run);
        index = static_cast<size_t>(std::find(names.begin(), names.end(), wanted) - names.begin());
    }
    const std::optional<Module> module = LoadModule(run, name, index);
    if (!module) {
        return Fail(EIO);
    }
    switch (which) {
        case 0:
            return 0;
        case QM_MODULES:
            return CopyNameList(names, bytes, size, ret);
        case QM_DEPS:
            return CopyNameList(module->Deps, bytes, size, ret);
        case QM_REFS:
            return CopyNameList(ReferringModules(run, module->Name), bytes, size, ret);
        case QM_SYMBOLS:
            return CopySymbols(*module, bytes, size, ret);
        case QM_INFO:
            return CopyInfo(*module, buffer, size, ret);
        default:
            return Fail(EINVAL);
    }
}

}  // namespace velhsim
