#include "adapters/cfgspace.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <cwchar>

#include "adapters/adapterdump.h"
#include "diag/hwdebug.h"
#include "filehandle.h"

namespace {

constexpr uint8_t CAP_HEADER_BYTES = sizeof(CAP_ITEM_HEADER);
constexpr uint8_t MSI_64BIT_ADDRESS = 0x80;
// The longest item the library reads: MSI with a 64-bit address.
constexpr int CAP_ITEM_MAX_BYTES = 14;
constexpr uint32_t PCIX_STATUS_64BIT = 0x10000;
constexpr uint32_t PCIX_STATUS_133MHZ = 0x20000;
constexpr uint8_t HEADER_TYPE_BRIDGE = 1;
constexpr uint8_t BASE_CLASS_BRIDGE = 6;
constexpr size_t PCI_ID_CHARS = 19;

// The error of a read that returned `got` bytes: errno after a failure, none after a short read.
int32_t ReadError(int32_t got) {
    return got < 0 ? errno : 0;
}

bool SeekTo(int file, uint8_t offset) {
    return lseek(file, offset, SEEK_SET) == static_cast<off_t>(offset);
}

}  // namespace

int CapabilityLen(const CAP_ITEM_HEADER* item) {
    switch (item->CapID) {
        case CAP_POWER_MANAGEMENT:
            return 8;
        case CAP_AGP:
            return 12;
        case CAP_VPD:
            return 8;
        case CAP_SLOT_ID:
            return 4;
        case CAP_MSI:
            return (item->Data[0] & MSI_64BIT_ADDRESS) != 0 ? CAP_ITEM_MAX_BYTES : 10;
        case CAP_HOTSWAP:
            return 2;
        case CAP_PCIX:
            return 8;
        default:
            return 0;
    }
}

uint8_t ReadCapabilityItem(int file, uint8_t offset, uint8_t* item, int* length) {
    *length = 0;
    if (!SeekTo(file, offset)) {
        LastErr(nullptr, "ReadCapabilityItem()", "header lseek(%d) failed", offset);
        return 0;
    }
    CAP_ITEM_HEADER header{};
    int32_t got = ReadFully(file, &header, CAP_HEADER_BYTES);
    if (got != CAP_HEADER_BYTES) {
        int32_t error = ReadError(got);
        LastErr(&error, "ReadCapabilityItem()", "header read() failed");
        return 0;
    }
    const int itemLength = CapabilityLen(&header);
    // An item the library does not know has no length to read: the walk ends at it.
    if (itemLength == 0) {
        return 0;
    }
    if (!SeekTo(file, offset)) {
        LastErr(nullptr, "ReadCapabilityItem()", "item lseek() failed");
        return 0;
    }
    // Read whole first: an item cut short by the end of a 256-byte file is a short read that
    // keeps what it got; only a longer file can hold an item that the image cannot.
    uint8_t whole[CAP_ITEM_MAX_BYTES] = {};
    got = ReadFully(file, whole, static_cast<uint32_t>(itemLength));
    const int room = static_cast<int>(PCI_CONFIG_SIZE) - offset;
    if (got != itemLength) {
        std::memcpy(item, whole, static_cast<size_t>(std::clamp(got, 0, room)));
        int32_t error = ReadError(got);
        LastErr(&error, "ReadCapabilityItem()", "item read() failed");
        return 0;
    }
    if (itemLength > room) {
        ErrMsg("ReadCapabilityItem()", "item at 0x%02x reaches past the configuration image",
               offset);
        return 0;
    }
    std::memcpy(item, whole, static_cast<size_t>(itemLength));
    *length = itemLength;
    return item[1] & PCI_CAP_POINTER_MASK;
}

int GetPciConfig(const char* path, int offset, int size, char* out) {
    const UniqueFd file(open(path, O_RDONLY));
    if (!file) {
        LastErr(nullptr, "GetPciConfig()", "open(%S) failed", MakeWideString(path, WideBuffer));
        return 0;
    }
    _PCI_CONFIG0 image{};
    auto* bytes = reinterpret_cast<uint8_t*>(&image);
    const int32_t got = ReadFully(file.Get(), bytes, PCI_HEADER_SIZE);
    if (got != static_cast<int32_t>(PCI_HEADER_SIZE)) {
        int32_t error = ReadError(got);
        LastErr(&error, "GetPciConfig()", "header read() failed");
        return 0;
    }
    int length = PCI_HEADER_SIZE;
    if ((image.Status & PCI_STATUS_CAP_LIST) != 0) {
        const bool whole = WalkCapabilityList(image.CapabilitiesPtr, [&](uint8_t at) {
            int read = 0;
            const uint8_t next = ReadCapabilityItem(file.Get(), at, bytes + at, &read);
            length = std::max(length, at + read);
            return next;
        });
        if (!whole) {
            ErrMsg("GetPciConfig()", "capability list of %S cut after %d items",
                   MakeWideString(path, WideBuffer), static_cast<int>(CAP_WALK_LIMIT));
        }
    }
    if (offset < 0 || offset >= length) {
        int32_t none = 0;
        LastErr(&none, "GetPciConfig()", "nothing above offset 0x%02x", offset);
        return 0;
    }
    const int count = std::min(length - offset, std::max(size, 0));
    if (count > 0) {
        std::memcpy(out, bytes + offset, static_cast<size_t>(count));
    }
    return count;
}

const CAP_ITEM_HEADER* GetCap(const _PCI_CONFIG0* config, CAP_TYPE type, int length) {
    if ((config->Status & PCI_STATUS_CAP_LIST) == 0) {
        return nullptr;
    }
    const CAP_ITEM_HEADER* found = nullptr;
    ForEachCapability(config, [&](uint8_t offset, const CAP_ITEM_HEADER* item) {
        if (offset >= length) {
            return false;
        }
        if (item->CapID == type) {
            found = item;
            return false;
        }
        return true;
    });
    return found;
}

bool StorePciConfig(const _PCI_CONFIG0* config, AdapterDescriptor* adapter, int length) {
    if ((HwInfoPrintLevel & GET_ADAPTER) != 0) {
        DumpPciConfigSpace(config, length > static_cast<int>(PCI_HEADER_SIZE));
    }
    std::memcpy(adapter->ConfigSpace, config, PCI_CONFIG_SIZE);
    adapter->HasBridge =
        config->HeaderType == HEADER_TYPE_BRIDGE || config->BaseClass == BASE_CLASS_BRIDGE;

    // A bridge's subsystem registers hold other things, so they do not identify it.
    const unsigned subVendor = adapter->HasBridge ? 0 : config->SubSysVendorID;
    const unsigned subSystem = adapter->HasBridge ? 0 : config->SubSystemID;
    wchar_t pciId[PCI_ID_CHARS];
    std::swprintf(pciId, PCI_ID_CHARS, L"%04x%04x%04x%04x%02x",
                  static_cast<unsigned>(config->VendorID), static_cast<unsigned>(config->DeviceID),
                  subVendor, subSystem, static_cast<unsigned>(config->RevisionID));
    adapter->PciId = pciId;

    adapter->MaxSpeed = (config->Status & PCI_STATUS_66MHZ) != 0 ? 66 : 33;
    adapter->SupPciX = false;
    const CAP_ITEM_HEADER* pcix = GetCap(config, CAP_PCIX, length);
    if (pcix != nullptr) {
        // The status word follows the item's first four bytes; the item lies inside the image.
        const auto* item = reinterpret_cast<const uint8_t*>(pcix);
        const uint32_t status =
            static_cast<uint32_t>(item[4]) | static_cast<uint32_t>(item[5]) << 8 |
            static_cast<uint32_t>(item[6]) << 16 | static_cast<uint32_t>(item[7]) << 24;
        adapter->SupPciX = true;
        adapter->MaxSpeed = (status & PCIX_STATUS_133MHZ) != 0 ? 133 : 66;
        adapter->Width = (status & PCIX_STATUS_64BIT) != 0 ? 64 : 32;
    }
    return true;
}
