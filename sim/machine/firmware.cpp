#include "sim/machine/firmware.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "filehandle.h"
#include "sim/common/textfile.h"

namespace velhsim {

namespace {

// Field places of the record.
constexpr size_t VPD_SIGNATURE = 2;
constexpr size_t VPD_LENGTH = 5;
constexpr size_t VPD_BUILD_ID = 13;
constexpr size_t VPD_SERIAL = 22;
constexpr size_t VPD_UNIQUE_ID = 29;
constexpr size_t VPD_TYPE_MODEL = 40;
constexpr size_t VPD_CHECKSUM = 47;

struct TextKey {
    const char* Name;
    std::string FirmwareRecord::*Field;
    size_t Width;
};

constexpr TextKey TEXT_KEYS[] = {
    {"type", &FirmwareRecord::Type, 4},           {"model", &FirmwareRecord::Model, 3},
    {"build-id", &FirmwareRecord::BuildId, 9},    {"serial", &FirmwareRecord::Serial, 7},
    {"unique-id", &FirmwareRecord::UniqueId, 11}, {"signature", &FirmwareRecord::Signature, 3},
};

// A line's key and value; the value may be quoted, so "#" inside quotes is kept.
bool SplitKeyValue(std::string_view line, std::string* key, std::string* value) {
    line = Trim(line);
    const size_t blank = line.find_first_of(" \t");
    *key = std::string(line.substr(0, blank));
    std::string_view rest = blank == std::string_view::npos ? "" : Trim(line.substr(blank));
    if (!rest.empty() && rest.front() == '"') {
        const size_t close = rest.find('"', 1);
        if (close == std::string_view::npos) {
            return false;
        }
        *value = std::string(rest.substr(1, close - 1));
        return StripComment(rest.substr(close + 1)).empty();
    }
    *value = std::string(StripComment(rest));
    return true;
}

void PutText(std::string* bytes, size_t offset, const std::string& text, size_t width) {
    std::string padded = text;
    padded.resize(width, ' ');
    bytes->replace(offset, width, padded);
}

}  // namespace

namespace {

// Applies one line; what is wrong with it, or nothing.
std::string ParseFirmwareLine(std::string_view line, FirmwareDescription* firmware) {
    std::string key;
    std::string value;
    if (!SplitKeyValue(line, &key, &value)) {
        return "unbalanced quote";
    }
    if (key == "segment") {
        firmware->SegmentFile = value;
        return {};
    }
    if (key == "record") {
        const std::optional<uint64_t> offset = ParseNumber(value);
        if (!offset || *offset >= BIOS_SEGMENT_SIZE) {
            return "the record's offset must be a number below 0x10000";
        }
        firmware->Records.emplace_back();
        firmware->Records.back().Offset = static_cast<uint32_t>(*offset);
        return {};
    }
    if (firmware->Records.empty()) {
        return "\"" + key + "\" before the first \"record\" line";
    }
    FirmwareRecord& record = firmware->Records.back();
    for (const TextKey& textKey : TEXT_KEYS) {
        if (key == textKey.Name) {
            if (value.size() > textKey.Width) {
                return key + " has at most " + std::to_string(textKey.Width) + " characters";
            }
            record.*textKey.Field = value;
            return {};
        }
    }
    if (key == "length" || key == "checksum") {
        const std::optional<uint64_t> byte = ParseNumber(value);
        if (!byte || *byte > 0xff) {
            return key + " must be a number from 0 to 255";
        }
        if (key == "length") {
            record.Length = static_cast<uint8_t>(*byte);
        } else {
            record.Checksum = static_cast<uint8_t>(*byte);
        }
        return {};
    }
    return "unknown key \"" + key + "\"";
}

}  // namespace

bool ParseFirmware(std::string_view text, FirmwareDescription* firmware, std::string* error) {
    *firmware = FirmwareDescription{};
    int number = 0;
    for (std::string_view line : SplitLines(text)) {
        ++number;
        if (StripComment(line).empty()) {
            continue;
        }
        const std::string problem = ParseFirmwareLine(line, firmware);
        if (!problem.empty()) {
            *error = "line " + std::to_string(number) + ": " + problem;
            return false;
        }
    }
    return true;
}

std::string EncodeVpdRecord(const FirmwareRecord& record) {
    std::string bytes(VPD_RECORD_SIZE, '\0');
    bytes[0] = static_cast<char>(0xAA);
    bytes[1] = static_cast<char>(0x55);
    PutText(&bytes, VPD_SIGNATURE, record.Signature, 3);
    bytes[VPD_LENGTH] = static_cast<char>(record.Length);
    PutText(&bytes, VPD_BUILD_ID, record.BuildId, 9);
    PutText(&bytes, VPD_SERIAL, record.Serial, 7);
    PutText(&bytes, VPD_UNIQUE_ID, record.UniqueId, 11);
    PutText(&bytes, VPD_TYPE_MODEL, record.Type, 4);
    PutText(&bytes, VPD_TYPE_MODEL + 4, record.Model, 3);
    uint8_t sum = 0;
    for (size_t i = 0; i < VPD_CHECKSUM; ++i) {
        sum = static_cast<uint8_t>(sum + static_cast<uint8_t>(bytes[i]));
    }
    bytes[VPD_CHECKSUM] = static_cast<char>(record.Checksum.value_or(static_cast<uint8_t>(-sum)));
    return bytes;
}

bool BuildMemoryImage(const std::string& descriptionPath, const std::string& imagePath,
                      std::string* error) {
    const std::optional<std::string> text = ReadWholeFile(descriptionPath);
    if (!text) {
        *error = descriptionPath + ": " + std::strerror(errno);
        return false;
    }
    FirmwareDescription firmware;
    if (!ParseFirmware(*text, &firmware, error)) {
        *error = descriptionPath + ": " + *error;
        return false;
    }
    std::string segment(BIOS_SEGMENT_SIZE, '\0');
    if (!firmware.SegmentFile.empty()) {
        const std::string path =
            (std::filesystem::path(descriptionPath).parent_path() / firmware.SegmentFile).string();
        const std::optional<std::string> captured = ReadWholeFile(path);
        if (!captured || captured->size() != BIOS_SEGMENT_SIZE) {
            *error =
                path + ": " +
                (captured ? "a captured segment holds exactly 65536 bytes" : std::strerror(errno));
            return false;
        }
        segment = *captured;
    }
    for (const FirmwareRecord& record : firmware.Records) {
        const std::string bytes = EncodeVpdRecord(record);
        // A record near the segment's end is cut there, as it would be by the memory after it.
        const size_t room = std::min<size_t>(bytes.size(), BIOS_SEGMENT_SIZE - record.Offset);
        segment.replace(record.Offset, room, bytes.substr(0, room));
    }
    const UniqueFd fd(open(imagePath.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644));
    // The image is sparse: only the BIOS segment holds data.
    if (!fd || ftruncate(fd.Get(), MEMORY_IMAGE_SIZE) != 0 ||
        pwrite(fd.Get(), segment.data(), segment.size(), BIOS_SEGMENT_OFFSET) !=
            static_cast<ssize_t>(segment.size())) {
        *error = imagePath + ": " + std::strerror(errno);
        return false;
    }
    return true;
}

}  // namespace velhsim
