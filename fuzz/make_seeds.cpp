// Writes the binary seed corpora: ASL packets for fuzz_aslstore, BIOS segment tails for
// fuzz_vpd and query_module answers for fuzz_modquery. Run by hand after changing it:
//   cmake --build build-fuzz --target make_seeds && build-fuzz/fuzz/make_seeds fuzz/corpus
#include <sys/stat.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "adapters/linvpd.h"
#include "adapters/modquery.h"
#include "tests/unit/aslbuilder.h"

namespace {

// Writes one seed, making its folder first if need be.
bool Write(const std::string& path, const std::vector<uint8_t>& bytes) {
    const std::string folder = path.substr(0, path.rfind('/'));
    if (mkdir(folder.c_str(), 0755) != 0 && errno != EEXIST) {
        std::perror(folder.c_str());
        return false;
    }
    FILE* file = std::fopen(path.c_str(), "wb");
    if (file == nullptr) {
        std::perror(path.c_str());
        return false;
    }
    const bool written = std::fwrite(bytes.data(), 1, bytes.size(), file) == bytes.size();
    return std::fclose(file) == 0 && written;
}

// A chassis with two busses and an expansion drawer with one, their names, and slots with a
// spread of attributes and every known bus speed.
AslBuilder Machine() {
    AslBuilder packet;
    packet.Header("MAC001")
        .Chassis(0, 1)
        .Drawer(1, 2)
        .String(1, "Main chassis")
        .String(2, "Expansion drawer 1")
        .Bus({1, 0, 255, 0x02, 0, 4, 2, 0, 0, 0})
        .Bus({2, 0, 255, 0x05, 5, 4, 2, 2, 1, 1})
        .Bus({3, 0, 1, 0x10, 7, 4, 2, 2, 2, 1})
        .Slot({1, 1, 2, 1, 0x05, 0x03, 0, 0, 0, 1})
        .Slot({2, 2, 3, 2, 0xFF, 0x84, 1, 0x18, 0x08, 2})
        .Slot({300, 3, 1, 255, 0x17, 0x7F, 0, 0x08, 0, 3})
        .End();
    return packet;
}

std::vector<uint8_t> TracedMachine() {
    // Bits 0 and 1 of the header's first reserved byte: the harness switches the traces and
    // the packet dumps on.
    std::vector<uint8_t> bytes = Machine().Bytes;
    bytes[offsetof(_ASL_TABLE_HEADER, Reserved)] |= 3;
    return bytes;
}

bool WriteAslSeeds(const std::string& dir) {
    bool ok = Write(dir + "/empty.bin", AslBuilder().Header().End().Bytes);
    ok &= Write(dir + "/machine.bin", Machine().Bytes);
    ok &= Write(dir + "/machine-traced.bin", TracedMachine());
    // Descriptors with bit 7 clear are stepped over, strings included.
    ok &= Write(dir + "/invalid.bin", AslBuilder()
                                          .Header()
                                          .Chassis(0, 1)
                                          .Invalid()
                                          .Chassis(1, 1)
                                          .String(1, "Hidden")
                                          .Invalid()
                                          .Bus({})
                                          .Invalid()
                                          .Slot({})
                                          .Invalid()
                                          .Drawer(2, 1)
                                          .Invalid()
                                          .End()
                                          .Bytes);
    // Unknown types stop the walk; 0x20 and 0x55 are reported differently.
    ok &= Write(dir + "/unknown-type.bin",
                AslBuilder().Header().Chassis(0, 1).Raw({0x55, 16, 0, 0}).End().Bytes);
    ok &= Write(dir + "/blank-type.bin", AslBuilder().Header().Bus({}).Raw({0x20}).End().Bytes);
    // Lengths that the walk must not trust: 0, shorter than the record, longer than it.
    ok &= Write(dir + "/zero-length.bin",
                AslBuilder().Header().Slot({}).Length(0).Slot({}).End().Bytes);
    ok &= Write(dir + "/short-length.bin",
                AslBuilder().Header().Bus({}).Length(5).Raw({0xA0, 0, 0}).End().Bytes);
    ok &= Write(
        dir + "/long-length.bin",
        AslBuilder()
            .Header()
            .Bus({7, 0, 255, 1, 6})
            .Length(40)
            .Raw(std::initializer_list<uint8_t>({1,  2,  3,  4,  5,  6,  7,  8,  9,  10, 11, 12,
                                                 13, 14, 15, 16, 17, 18, 19, 20, 21, 22, 23, 24}))
            .End()
            .Bytes);
    // The bytes delivered end inside a descriptor, or before any end marker.
    std::vector<uint8_t> cut = AslBuilder().Header().Chassis(0, 1).String(1, "Cut").Bytes;
    cut.pop_back();
    ok &= Write(dir + "/unterminated-string.bin", cut);
    std::vector<uint8_t> noEnd = AslBuilder().Header().Chassis(0, 1).Bus({}).Bytes;
    noEnd.resize(noEnd.size() - 3);
    ok &= Write(dir + "/no-end.bin", noEnd);
    // Names: a later string replaces an earlier one; a missing one; string number 255.
    ok &= Write(dir + "/strings.bin", AslBuilder()
                                          .Header()
                                          .String(3, "First")
                                          .String(3, "Second")
                                          .String(255, "")
                                          .Chassis(0, 3)
                                          .Drawer(4, 9)
                                          .Chassis(1, 255)
                                          .End()
                                          .Bytes);
    std::vector<uint8_t> wrong = Machine().Bytes;
    wrong[3] = 'X';
    ok &= Write(dir + "/bad-signature.bin", wrong);
    return ok;
}

std::vector<uint8_t> Record(const char* typeModel) {
    _VPD_LAYOUT record;
    std::memset(&record, ' ', sizeof(record));
    record.Header1 = 0xAA;
    record.Header2 = 0x55;
    std::memcpy(record.Signature, "VPD", 3);
    record.VpdLength = sizeof(record);
    std::memcpy(record.MachineTypeModel, typeModel, sizeof(record.MachineTypeModel));
    record.Checksum = 0;
    const auto* bytes = reinterpret_cast<const uint8_t*>(&record);
    return std::vector<uint8_t>(bytes, bytes + sizeof(record));
}

std::vector<uint8_t> Join(std::initializer_list<std::vector<uint8_t>> parts) {
    std::vector<uint8_t> joined;
    for (const auto& part : parts) {
        joined.insert(joined.end(), part.begin(), part.end());
    }
    return joined;
}

// The harness puts each seed at the end of the BIOS segment.
bool WriteVpdSeeds(const std::string& dir) {
    const std::vector<uint8_t> record = Record("K210K2A");
    const std::vector<uint8_t> tail(100, 0xFF);
    // The last position where a whole record fits.
    bool ok = Write(dir + "/record-at-end.bin", record);
    // A record cut by the end of the segment is not found.
    ok &= Write(dir + "/record-cut.bin", std::vector<uint8_t>(record.begin(), record.end() - 1));
    ok &= Write(dir + "/two-records.bin", Join({record, tail, Record("K360R1X"), tail}));
    // A header followed by another signature, then the record.
    ok &= Write(dir + "/false-start.bin",
                Join({{0xAA, 0x55, 'V', 'P', 'X', 0xAA, 0xAA, 0x55}, record, tail}));
    return ok;
}

// The symbol count the kernel reports (16 bits, little-endian), then the buffer: the entries,
// whose name fields are offsets into the buffer, then the names.
std::vector<uint8_t> SymbolAnswer(uint16_t reported, const std::vector<unsigned long>& offsets,
                                  const std::string& names) {
    std::vector<uint8_t> bytes = {static_cast<uint8_t>(reported & 0xFF),
                                  static_cast<uint8_t>(reported >> 8)};
    for (size_t i = 0; i < offsets.size(); i++) {
        const module_symbol entry{0xC8800000ul + i * 0x40, offsets[i]};
        const auto* raw = reinterpret_cast<const uint8_t*>(&entry);
        bytes.insert(bytes.end(), raw, raw + sizeof(entry));
    }
    bytes.insert(bytes.end(), names.begin(), names.end());
    return bytes;
}

bool WriteModuleSeeds(const std::string& dir) {
    const unsigned long names = 3 * sizeof(module_symbol);
    const std::string text("velh_open\0velh_ioctl\0velh_release", 33);
    bool ok = Write(dir + "/three-symbols.bin",
                    SymbolAnswer(3, {names, names + 10, names + 21}, text + std::string(1, '\0')));
    // Names inside the entries, past the buffer, and one without its terminator.
    ok &= Write(dir + "/bad-offsets.bin", SymbolAnswer(3, {4, names + 4096, names + 21}, text));
    // More symbols reported than the buffer holds.
    ok &= Write(dir + "/count-too-large.bin", SymbolAnswer(1000, {names, names + 10}, text));
    return ok;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: %s CORPUS_DIR\n", argv[0]);
        return 2;
    }
    const std::string corpus = argv[1];
    const bool ok = WriteAslSeeds(corpus + "/aslstore") && WriteVpdSeeds(corpus + "/vpd") &&
                    WriteModuleSeeds(corpus + "/modquery");
    return ok ? 0 : 1;
}
