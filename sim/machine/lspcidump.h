// Reading `lspci -xxx -vv -k` output: one block per PCI function, a header line
// "BB:DD.F text" or "DDDD:BB:DD.F text", indented detail lines, and rows of configuration bytes
// "00: 86 80 ...". Of the details only these are used: "Kernel driver in use: NAME", the
// "[size=...]" of "Region N:" and "Expansion ROM" lines, and the IRQ of the "Interrupt:" or
// "Flags:" line. Lines that begin with "#" are comments.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velhsim {

// Resource slots as the kernel numbers them: six base address registers, then the ROM.
constexpr int PCI_RESOURCE_COUNT = 7;
constexpr int PCI_ROM_RESOURCE = 6;

struct PciFunctionDump {
    unsigned Domain = 0;
    unsigned Bus = 0;
    unsigned Device = 0;
    unsigned Function = 0;
    std::string Config;  // exactly the dumped bytes
    std::string Driver;
    std::optional<unsigned> Irq;
    uint64_t RegionSizes[PCI_RESOURCE_COUNT] = {};
};

// False with a message naming the line when the text is not such a dump.
bool ParseLspciDump(std::string_view text, std::vector<PciFunctionDump>* functions,
                    std::string* error);

}  // namespace velhsim
