// The firmware's vital product data record in the BIOS segment of physical memory.
#pragma once

#include <cstddef>
#include <cstdint>

// The BIOS segment F000 that holds the record, as offset into the memory device and length.
constexpr uint32_t VPD_SEGMENT_OFFSET = 0xF0000;
constexpr uint32_t VPD_SEGMENT_SIZE = 0x10000;

#pragma pack(push, 1)
struct _VPD_LAYOUT {
    uint8_t Header1;    // 0xAA
    uint8_t Header2;    // 0x55
    char Signature[3];  // "VPD"
    uint8_t VpdLength;
    uint8_t Reserved[7];
    char BuildId[9];
    char BoxSerialNumber[7];
    char UniqueId[11];
    char MachineTypeModel[7];  // 4 characters of machine type, 3 of model; not terminated
    uint8_t Checksum;
};
#pragma pack(pop)

static_assert(sizeof(_VPD_LAYOUT) == 48, "vital product data layout");
static_assert(offsetof(_VPD_LAYOUT, BuildId) == 13, "vital product data layout");
static_assert(offsetof(_VPD_LAYOUT, MachineTypeModel) == 40, "vital product data layout");

// The record once found; zero before. ValidVPD is never reset once set.
extern _VPD_LAYOUT Vpd;
extern bool ValidVPD;

// Searches the BIOS segment for the record and copies the first one found into *vpd.
bool GetVPD(_VPD_LAYOUT* vpd);
