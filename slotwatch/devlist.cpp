#include "slotwatch/devlist.h"

#include <cstdio>
#include <cstdlib>
#include <sstream>

namespace {

// Fields of a line: key, vendor and device, interrupt, seven base addresses, seven sizes, then
// the bound driver's name when there is one.
constexpr size_t FIXED_FIELDS = 17;

std::vector<std::string> SplitTabs(const std::string& line) {
    std::vector<std::string> fields;
    std::string field;
    std::istringstream in(line);
    while (std::getline(in, field, '\t')) {
        fields.push_back(field);
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

}  // namespace

DeviceList ParseDeviceList(std::istream& in, int* skipped) {
    DeviceList list;
    std::string line;
    while (std::getline(in, line)) {
        std::vector<std::string> fields = SplitTabs(line);
        PciFunction function;
        if (fields.size() < 2 || !ParseHex(fields[0], 4, &function.Key) ||
            !ParseHex(fields[1], 8, &function.VendorDevice)) {
            if (skipped != nullptr && !line.empty()) {
                ++*skipped;
            }
            continue;
        }
        if (fields.size() > FIXED_FIELDS) {
            function.Driver = fields[FIXED_FIELDS];
        }
        list[function.Key] = function;
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
        if (now == after.end() || (old != before.end() && old->first < now->first)) {
            changes.push_back("removed " + DescribeFunction(old->second));
            ++old;
        } else if (old == before.end() || now->first < old->first) {
            changes.push_back("added " + DescribeFunction(now->second));
            ++now;
        } else {
            if (!(old->second == now->second)) {
                changes.push_back("changed " + DescribeFunction(old->second) + " -> " +
                                  DescribeFunction(now->second));
            }
            ++old;
            ++now;
        }
    }
    return changes;
}
