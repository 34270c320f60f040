// A stand-in for Linux 2.4's query_module over a table of loaded modules, answering as the
// kernel does (ENOSPC with the size needed, native-word records).
#pragma once

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

struct FakeModule {
    std::string Name;
    unsigned long Flags = 1;
    std::vector<std::pair<unsigned long, std::string>> Symbols;
    // Symbols that appear between the size question and the read (a module still loading).
    std::vector<std::pair<unsigned long, std::string>> LateSymbols;
};

struct FakeModuleTable {
    std::vector<FakeModule> Modules;
    int Calls = 0;
};

FakeModuleTable& FakeModules();
// Installs the fake through SysCalls() over an empty table.
void InstallFakeModules();
int FakeQueryModule(const char* name, int which, void* buffer, size_t size, size_t* ret);
// The QM_SYMBOLS answer for a list of symbols: entries, then the names they point at.
std::vector<char> SymbolImage(const std::vector<std::pair<unsigned long, std::string>>& symbols);
