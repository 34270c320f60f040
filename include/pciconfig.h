// The PCI configuration image: 256 bytes in the layout of the PCI Local Bus Specification,
// seen through the three header types, and the capability items the library knows.
#pragma once

#include <cstddef>
#include <cstdint>

#include "model/hwobjects.h"

constexpr size_t PCI_HEADER_SIZE = 64;
constexpr size_t PCI_DEVICE_SPECIFIC_SIZE = PCI_CONFIG_SIZE - PCI_HEADER_SIZE;

// Status register bits and offsets that the derivations use.
constexpr uint16_t PCI_STATUS_CAP_LIST = 0x10;
constexpr uint16_t PCI_STATUS_66MHZ = 0x20;
constexpr uint8_t PCI_CAP_POINTER_MASK = 0xFC;

#pragma pack(push, 1)

struct _PCI_CONFIG0 {
    uint16_t VendorID;
    uint16_t DeviceID;
    uint16_t Command;
    uint16_t Status;
    uint8_t RevisionID;
    uint8_t ProgIf;
    uint8_t SubClass;
    uint8_t BaseClass;
    uint8_t CacheLineSize;
    uint8_t LatencyTimer;
    uint8_t HeaderType;
    uint8_t BIST;
    uint32_t BAR[6];
    uint32_t CardbusCisPtr;
    uint16_t SubSysVendorID;
    uint16_t SubSystemID;
    uint32_t RomBaseAddress;
    uint8_t CapabilitiesPtr;
    uint8_t Reserved1[3];
    uint32_t Reserved2;
    uint8_t InterruptLine;
    uint8_t InterruptPin;
    uint8_t MinGrant;
    uint8_t MaxLatency;
    uint8_t DeviceSpecific[PCI_DEVICE_SPECIFIC_SIZE];
};

struct _PCI_CONFIG1 {
    uint16_t VendorID;
    uint16_t DeviceID;
    uint16_t Command;
    uint16_t Status;
    uint8_t RevisionID;
    uint8_t ProgIf;
    uint8_t SubClass;
    uint8_t BaseClass;
    uint8_t CacheLineSize;
    uint8_t LatencyTimer;
    uint8_t HeaderType;
    uint8_t BIST;
    uint32_t BAR[2];
    uint8_t PrimaryBusNum;
    uint8_t SecondaryBusNum;
    uint8_t SubBusNumber;
    uint8_t SecondaryLatencyTimer;
    uint8_t IoBase;
    uint8_t IoLimit;
    uint16_t SecondaryStatus;
    uint16_t MemBase;
    uint16_t MemLimit;
    uint16_t PrefetchMemBase;
    uint16_t PrefetchMemLimit;
    uint32_t PrefetchBaseUpper32;
    uint32_t PrefetchLimitUpper32;
    uint16_t IOBaseUpper16;
    uint16_t IOLimitUpper16;
    uint8_t CapabilitiesPtr;
    uint8_t Reserved[3];
    uint32_t ExpansionRomBAR;
    uint8_t InterruptLine;
    uint8_t InterruptPin;
    uint16_t BridgeControl;
    uint8_t DeviceSpecific[PCI_DEVICE_SPECIFIC_SIZE];
};

struct _PCI_CARDBUS_RANGE {
    uint32_t Base;
    uint32_t Limit;
};

struct _PCI_CONFIG2 {
    uint16_t VendorID;
    uint16_t DeviceID;
    uint16_t Command;
    uint16_t Status;
    uint8_t RevisionID;
    uint8_t ProgIf;
    uint8_t SubClass;
    uint8_t BaseClass;
    uint8_t CacheLineSize;
    uint8_t LatencyTimer;
    uint8_t HeaderType;
    uint8_t BIST;
    uint32_t SocketRegsBaseAddr;
    uint8_t CapabilitiesPtr;
    uint8_t Reserved;
    uint16_t SecondaryStatus;
    uint8_t PrimaryBus;
    uint8_t SecondaryBus;
    uint8_t SubordinateBus;
    uint8_t SecondaryLatency;
    _PCI_CARDBUS_RANGE Range[4];
    uint8_t InterruptLine;
    uint8_t InterruptPin;
    uint16_t BridgeControl;
    uint8_t DeviceSpecific[PCI_DEVICE_SPECIFIC_SIZE];
};

// The first bytes of a capability item; the item's own bytes follow.
struct CAP_ITEM_HEADER {
    uint8_t CapID;
    uint8_t Next;
    uint8_t Data[2];
};

#pragma pack(pop)

// The capability IDs the library knows; any other ID is read as an item of length 0.
enum CAP_TYPE : uint8_t {
    CAP_POWER_MANAGEMENT = 1,
    CAP_AGP = 2,
    CAP_VPD = 3,
    CAP_SLOT_ID = 4,
    CAP_MSI = 5,
    CAP_HOTSWAP = 6,
    CAP_PCIX = 7,
};

static_assert(sizeof(_PCI_CONFIG0) == PCI_CONFIG_SIZE, "type 0 header image");
static_assert(sizeof(_PCI_CONFIG1) == PCI_CONFIG_SIZE, "type 1 header image");
static_assert(sizeof(_PCI_CONFIG2) == PCI_CONFIG_SIZE, "type 2 header image");
static_assert(offsetof(_PCI_CONFIG0, CapabilitiesPtr) == 0x34, "capabilities pointer, type 0");
static_assert(offsetof(_PCI_CONFIG1, CapabilitiesPtr) == 0x34, "capabilities pointer, type 1");
static_assert(offsetof(_PCI_CONFIG2, CapabilitiesPtr) == 0x14, "capabilities pointer, type 2");
static_assert(offsetof(_PCI_CONFIG0, SubSysVendorID) == 0x2C, "subsystem vendor");
static_assert(offsetof(_PCI_CONFIG1, BridgeControl) == 0x3E, "bridge control");
static_assert(offsetof(_PCI_CONFIG2, BridgeControl) == 0x3E, "cardbus bridge control");
