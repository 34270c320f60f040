#include "sim/machine/pcitree.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "sim/common/textfile.h"

namespace velhsim {

namespace {

constexpr size_t HEADER_TYPE = 0x0e;
constexpr size_t FIRST_BAR = 0x10;
constexpr size_t INTERRUPT_LINE = 0x3c;
constexpr size_t INTERRUPT_PIN = 0x3d;
constexpr uint32_t BAR_SPACE_IO = 0x1;
constexpr uint32_t BAR_MEM_TYPE_MASK = 0x6;
constexpr uint32_t BAR_MEM_TYPE_64 = 0x4;
constexpr uint32_t ROM_ADDRESS_MASK = ~uint32_t{0x7ff};
constexpr uint32_t ROM_ENABLE = 0x1;

// A configuration byte; bytes beyond the dump read as zero.
uint8_t ConfigByte(const std::string& config, size_t offset) {
    return offset < config.size() ? static_cast<uint8_t>(config[offset]) : 0;
}

uint32_t ConfigDword(const std::string& config, size_t offset) {
    uint32_t value = 0;
    for (size_t i = 0; i < 4; ++i) {
        value |= static_cast<uint32_t>(ConfigByte(config, offset + i)) << (8 * i);
    }
    return value;
}

// The start of each resource with its low flag bits, as the kernel prints them: the register
// values themselves, except that the upper half of a 64-bit address takes no slot of its own.
void BaseAddresses(const std::string& config, uint32_t bases[PCI_RESOURCE_COUNT]) {
    std::memset(bases, 0, sizeof(uint32_t) * PCI_RESOURCE_COUNT);
    size_t barCount = 6;
    size_t romOffset = 0x30;
    switch (ConfigByte(config, HEADER_TYPE) & 0x7f) {
        case 1:
            barCount = 2;
            romOffset = 0x38;
            break;
        case 2:
            barCount = 1;
            romOffset = 0;
            break;
        default:
            break;
    }
    for (size_t i = 0; i < barCount; ++i) {
        uint32_t bar = ConfigDword(config, FIRST_BAR + 4 * i);
        if (bar == 0xffffffffU) {
            bar = 0;
        }
        bases[i] = bar;
        if ((bar & BAR_SPACE_IO) == 0 && (bar & BAR_MEM_TYPE_MASK) == BAR_MEM_TYPE_64) {
            ++i;
        }
    }
    if (romOffset != 0) {
        const uint32_t rom = ConfigDword(config, romOffset);
        bases[PCI_ROM_RESOURCE] = (rom & ROM_ADDRESS_MASK) | (rom & ROM_ENABLE);
    }
}

std::string BusFolderName(const PciFunctionDump& function) {
    char name[16];
    if (function.Domain == 0) {
        std::snprintf(name, sizeof name, "%02x", function.Bus);
    } else {
        std::snprintf(name, sizeof name, "%04x:%02x", function.Domain, function.Bus);
    }
    return name;
}

std::string FunctionFileName(const PciFunctionDump& function) {
    char name[8];
    std::snprintf(name, sizeof name, "%02x.%x", function.Device, function.Function);
    return name;
}

}  // namespace

std::string DevicesLine(const PciFunctionDump& function) {
    const std::string& config = function.Config;
    const unsigned devfn = (function.Device << 3) | function.Function;
    const unsigned irq = function.Irq.value_or(
        ConfigByte(config, INTERRUPT_PIN) != 0 ? ConfigByte(config, INTERRUPT_LINE) : 0);
    char field[32];
    std::snprintf(field, sizeof field, "%02x%02x\t%04x%04x\t%x", function.Bus & 0xff, devfn,
                  ConfigByte(config, 0) | (ConfigByte(config, 1) << 8),
                  ConfigByte(config, 2) | (ConfigByte(config, 3) << 8), irq);
    std::string line = field;
    uint32_t bases[PCI_RESOURCE_COUNT];
    BaseAddresses(config, bases);
    for (uint32_t base : bases) {
        std::snprintf(field, sizeof field, "\t%08x", base);
        line += field;
    }
    for (uint64_t size : function.RegionSizes) {
        std::snprintf(field, sizeof field, "\t%08x", static_cast<uint32_t>(size));
        line += field;
    }
    line += '\t';
    line += function.Driver;
    line += '\n';
    return line;
}

bool WritePciTree(const std::vector<PciFunctionDump>& functions, const std::string& dir,
                  std::string* error) {
    std::string devices;
    for (const PciFunctionDump& function : functions) {
        const std::string busDir = JoinPath(dir, BusFolderName(function));
        std::error_code code;
        std::filesystem::create_directories(busDir, code);
        if (code) {
            *error = busDir + ": " + code.message();
            return false;
        }
        const std::string path = JoinPath(busDir, FunctionFileName(function));
        if (!WriteWholeFile(path, function.Config)) {
            *error = path + ": " + std::strerror(errno);
            return false;
        }
        devices += DevicesLine(function);
    }
    std::error_code code;
    std::filesystem::create_directories(dir, code);
    const std::string path = JoinPath(dir, "devices");
    if (code || !WriteWholeFile(path, devices)) {
        *error = path + ": " + (code ? code.message() : std::strerror(errno));
        return false;
    }
    return true;
}

bool BuildPciTree(const std::string& dumpPath, const std::string& dir, std::string* error) {
    const std::optional<std::string> text = ReadWholeFile(dumpPath);
    if (!text) {
        *error = dumpPath + ": " + std::strerror(errno);
        return false;
    }
    std::vector<PciFunctionDump> functions;
    if (!ParseLspciDump(*text, &functions, error)) {
        *error = dumpPath + ": " + *error;
        return false;
    }
    return WritePciTree(functions, dir, error);
}

}  // namespace velhsim
