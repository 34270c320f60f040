// A PCI function's configuration image, read with the capability items whose layout is known,
// and the adapter fields derived from it; the one bounded walk of a capability list.
#pragma once

#include <cstdint>

#include "model/hwobjects.h"
#include "pciconfig.h"

// Four-byte items between 0x40 and 0xFF: a list that goes on longer runs in a loop.
constexpr unsigned CAP_WALK_LIMIT = 48;

// Copies the valid bytes of the function's image from `offset` on into `out` (at most `size`);
// the count copied, 0 on failure.
int GetPciConfig(const char* path, int offset, int size, char* out);
// Reads the item at `offset` of the open configuration file into `item`, which is that offset of
// a 256-byte image: an item cut short by the file's end keeps the bytes read, one that a longer
// file holds past the image's last byte is left out. Sets `*length` to the bytes read (0 on
// failure or for an unknown ID) and returns the next pointer masked with 0xFC, 0 when the walk
// ends here.
uint8_t ReadCapabilityItem(int file, uint8_t offset, uint8_t* item, int* length);
// The bytes read for an item of this ID: 0 for an ID the library does not know.
int CapabilityLen(const CAP_ITEM_HEADER* item);
// The first item of ID `type` at an offset below `length`, or null.
const CAP_ITEM_HEADER* GetCap(const _PCI_CONFIG0* config, CAP_TYPE type, int length);
// Fills the adapter's image copy, PciId, HasBridge, MaxSpeed, SupPciX and Width.
bool StorePciConfig(const _PCI_CONFIG0* config, AdapterDescriptor* adapter, int length);

// Follows a capability list from the pointer `first`: visit(offset) handles the item there and
// returns its next pointer (0 ends the walk). Pointers are masked with 0xFC; at most
// CAP_WALK_LIMIT items are visited. False when that limit cut the list short.
template <typename Visit>
bool WalkCapabilityList(uint8_t first, Visit&& visit) {
    uint8_t offset = first & PCI_CAP_POINTER_MASK;
    for (unsigned items = 0; offset != 0; ++items) {
        if (items == CAP_WALK_LIMIT) {
            return false;
        }
        offset = static_cast<uint8_t>(visit(offset)) & PCI_CAP_POINTER_MASK;
    }
    return true;
}

// The items of an image's capability list, from the pointer at 0x34 whatever the header type:
// visit(offset, item) for each, returning false to stop. An item whose length reaches past the
// image's last byte ends the walk before it is visited. False when the list was cut short (a
// loop or such an item), true when it ended at a zero pointer or at the visitor's wish.
template <typename Visit>
bool ForEachCapability(const _PCI_CONFIG0* config, Visit&& visit) {
    const auto* image = reinterpret_cast<const uint8_t*>(config);
    bool cut = false;
    bool whole = WalkCapabilityList(config->CapabilitiesPtr, [&](uint8_t offset) -> uint8_t {
        const auto* item = reinterpret_cast<const CAP_ITEM_HEADER*>(image + offset);
        if (offset + static_cast<unsigned>(CapabilityLen(item)) > PCI_CONFIG_SIZE) {
            cut = true;
            return 0;
        }
        return visit(offset, item) ? item->Next : 0;
    });
    return whole && !cut;
}
