#include "slotwatch/devlist.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>

namespace {

// Fields of a line: key, vendor and device, interrupt, seven base addresses, seven sizes, then
// the bound driver's name when there is one.
constexpr size_t FIXED_FIELDS = 17;

std::vector<std::string> SplitTabs(const std::string& line) {
    std::vector<std::string> fields;
    size_t start = 0;
    for (size_t tab = line.find('\t'); tab != std::string::npos; tab = line.find('\t', start)) {
        fields.push_back(line.substr(start, tab - start));
        start = tab + 1;
    }
    if (start < line.size()) {
        fields.push_back(line.substr(start));
    }
    return fields;
}

bool ParseHex(const std::string& text, size_t digits, uint32_t* value) {
    if (text.size() != digits) {
        return false;
    }
    char* end = nullptr;
    unsigned long parsed = std::strtoul(text.c_str(), &end, 16);
    if (*end != '\0') {
        return false;
    }
    *value = static_cast<uint32_t>(parsed);
    return true;
}

void AddLine(const std::string& line, DeviceList* list, int* skipped) {
    std::vector<std::string> fields = SplitTabs(line);
    PciFunction function;
    if (fields.size() < 2 || !ParseHex(fields[0], 4, &function.Key) ||
        !ParseHex(fields[1], 8, &function.VendorDevice)) {
        if (skipped != nullptr && !line.empty()) {
            ++*skipped;
        }
        return;
    }
    if (fields.size() > FIXED_FIELDS) {
        function.Driver = fields[FIXED_FIELDS];
    }
    auto place =
        std::lower_bound(list->begin(), list->end(), function.Key,
                         [](const PciFunction& entry, uint32_t key) { return entry.Key < key; });
    if (place != list->end() && place->Key == function.Key) {
        *place = function;
    } else {
        list->insert(place, function);
    }
}

}  // namespace

DeviceList ParseDeviceList(std::FILE* in, int* skipped) {
    DeviceList list;
    std::string line;
    char chunk[256];
    while (std::fgets(chunk, sizeof chunk, in) != nullptr) {
        line += chunk;
        if (line.back() != '\n') {
            continue;  // the rest of a long line follows, or the file ends without a newline
        }
        line.pop_back();
        AddLine(line, &list, skipped);
        line.clear();
    }
    if (!line.empty()) {
        AddLine(line, &list, skipped);
    }
    return list;
}

std::string DescribeFunction(const PciFunction& function) {
    char text[32];
    std::snprintf(text, sizeof text, "%02x:%02x.%x %04x:%04x", function.Key >> 8 & 0xFF,
                  function.Key >> 3 & 0x1F, function.Key & 0x7, function.VendorDevice >> 16,
                  function.VendorDevice & 0xFFFF);
    std::string description = text;
    if (!function.Driver.empty()) {
        description += " " + function.Driver;
    }
    return description;
}

std::vector<std::string> DiffDeviceLists(const DeviceList& before, const DeviceList& after) {
    std::vector<std::string> changes;
    auto old = before.begin();
    auto now = after.begin();
    while (old != before.end() || now != after.end()) {
        if (now == after.end() || (old != before.end() && old->Key < now->Key)) {
            changes.push_back("removed " + DescribeFunction(*old));
            ++old;
        } else if (old == before.end() || now->Key < old->Key) {
            changes.push_back("added " + DescribeFunction(*now));
            ++now;
        } else {
            if (!(*old == *now)) {
                changes.push_back("changed " + DescribeFunction(*old) + " -> " +
                                  DescribeFunction(*now));
            }
            ++old;
            ++now;
        }
    }
    return changes;
}
