// The kernel's PCI device list (/proc/bus/pci/devices) as a set of functions, and the changes
// between two readings of it.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

struct PciFunction {
    uint32_t Key = 0;           // bus << 8 | device << 3 | function
    uint32_t VendorDevice = 0;  // vendor << 16 | device
    std::string Driver;         // empty when no driver is bound

    bool operator==(const PciFunction& other) const {
        return Key == other.Key && VendorDevice == other.VendorDevice && Driver == other.Driver;
    }
};

// In key order, one entry per key.
using DeviceList = std::vector<PciFunction>;

// Reads every well-formed line (a later line of the same key replaces an earlier one); malformed
// lines are skipped and counted in *skipped.
DeviceList ParseDeviceList(std::FILE* in, int* skipped);

// "BB:DD.F VVVV:DDDD" with the driver appended when one is bound.
std::string DescribeFunction(const PciFunction& function);

// One line per change, in key order: "added ...", "removed ...", "changed ... -> ...".
std::vector<std::string> DiffDeviceLists(const DeviceList& before, const DeviceList& after);
