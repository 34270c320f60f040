// Small text and file helpers shared by the launcher, the preload library and the tools: machine
// folders are plain text files of "key value" lines with "#" comments.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velhsim {

// The whole file, or nothing when it cannot be read.
std::optional<std::string> ReadWholeFile(const std::string& path);
// Writes (replaces) the file; false with errno set on failure.
bool WriteWholeFile(const std::string& path, std::string_view data);

std::string_view Trim(std::string_view text);
// The text before the first `mark`, trimmed.
std::string_view StripComment(std::string_view line, char mark = '#');
// Blank-separated words.
std::vector<std::string> SplitWords(std::string_view text);
// The lines of a text, without their line ends.
std::vector<std::string_view> SplitLines(std::string_view text);

// A decimal number, or a hexadecimal one with a 0x prefix; nothing for any other text or a value
// that does not fit.
std::optional<uint64_t> ParseNumber(std::string_view text);
// Hexadecimal digits without prefix (an optional 0x is accepted too).
std::optional<uint64_t> ParseHex(std::string_view text);

std::string JoinPath(std::string_view dir, std::string_view name);
bool IsDirectory(const std::string& path);
bool IsRegularFile(const std::string& path);

}  // namespace velhsim
