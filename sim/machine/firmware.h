// A machine's physical memory image (dev/mem, 1 MiB, sparse) from a readable firmware description:
// lines of "key value", "#" comments, values in double quotes when they hold blanks.
//
//   segment   FILE    a captured 64 KiB BIOS segment laid at 0xF0000 (path relative to the
//                     description); without it the segment is zero
//   record    OFFSET  starts a vital product data record at OFFSET within the segment; the keys
//                     after it fill that record:
//   type      TEXT    machine type, 4 characters
//   model     TEXT    model, 3 characters
//   build-id  TEXT    9 characters
//   serial    TEXT    box serial number, 7 characters
//   unique-id TEXT    11 characters
//   signature TEXT    3 characters, "VPD" unless given (anything else makes a decoy)
//   length    NUMBER  the record's length byte, 48 unless given
//   checksum  NUMBER  the checksum byte; by default the one that makes the 48 bytes sum to 0
//
// Shorter texts are padded with blanks, as firmware pads them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velhsim {

constexpr uint32_t MEMORY_IMAGE_SIZE = 0x100000;
constexpr uint32_t BIOS_SEGMENT_OFFSET = 0xF0000;
constexpr uint32_t BIOS_SEGMENT_SIZE = 0x10000;
constexpr uint32_t VPD_RECORD_SIZE = 48;

struct FirmwareRecord {
    uint32_t Offset = 0;
    std::string Type;
    std::string Model;
    std::string BuildId;
    std::string Serial;
    std::string UniqueId;
    std::string Signature = "VPD";
    uint8_t Length = VPD_RECORD_SIZE;
    std::optional<uint8_t> Checksum;
};

struct FirmwareDescription {
    std::string SegmentFile;
    std::vector<FirmwareRecord> Records;
};

bool ParseFirmware(std::string_view text, FirmwareDescription* firmware, std::string* error);

// The record's 48 bytes as they lie in memory.
std::string EncodeVpdRecord(const FirmwareRecord& record);

// Reads the description at `descriptionPath` and writes the memory image to `imagePath`.
bool BuildMemoryImage(const std::string& descriptionPath, const std::string& imagePath,
                      std::string* error);

}  // namespace velhsim
