// The ASL packet: the binary table of systems, busses, slots and their names. Packed,
// little-endian, identical on the 32- and 64-bit builds.
#pragma once

#include <cstddef>
#include <cstdint>

// Capacity of the buffer that every producer of a packet writes into.
constexpr uint32_t ASL_PACKET_CAPACITY = 80016;

constexpr uint8_t BUS_TYPE = 0x81;
constexpr uint8_t SLOT_TYPE = 0x82;
constexpr uint8_t CHASSIS_TYPE = 0x86;
constexpr uint8_t DRAWER_TYPE = 0x87;
constexpr uint8_t STRING_TYPE = 0x91;
constexpr uint8_t END_TYPE = 0xA0;
constexpr uint8_t VALID_DESCRIPTOR = 0x80;

constexpr char ASL_SIGNATURE[4] = {'V', 'H', 'S', 'L'};

typedef uint8_t RAW_ASL_DATA;

#pragma pack(push, 1)

struct _ASL_TABLE_HEADER {
    char Signature[4];
    uint8_t Length;
    uint8_t Revision;
    uint8_t MinorRevision;
    char MachineID[6];
    uint8_t Reserved[3];
};

struct _ASL_BUS_DESCRIPTOR {
    uint8_t DescriptorType;
    uint8_t Length;
    uint8_t BusID;
    uint8_t ChassisID;
    uint8_t DrawerID;
    uint8_t BusNumber;
    uint8_t ParentBusID;
    uint8_t Attribute;
    uint8_t CurrentBusSpeed;
    uint8_t MaxAdapterAt33;
    uint8_t MaxAdapterAt66;
    uint8_t MaxAdapterAtX66;
    uint8_t MaxAdapterAtX100;
    uint8_t MaxAdapterAtX133;
    uint8_t Reserved[2];
};

struct _ASL_SLOT_DESCRIPTOR {
    uint8_t DescriptorType;
    uint8_t Length;
    uint16_t SlotID;
    uint8_t BusID;
    uint8_t DeviceNum;
    uint8_t Sun;
    uint8_t Attrib1;
    uint8_t Attrib2;
    uint8_t AttnReason;
    uint8_t Status;
    uint8_t LedStatus;
    uint8_t SlotUiNumber;
    uint8_t Reserved[3];
};

// Chassis and drawer descriptors share one layout; byte 2 is the chassis or drawer number.
struct _ASL_CHASSIS_DESCRIPTOR {
    uint8_t DescriptorType;
    uint8_t Length;
    uint8_t ChassisID;
    uint8_t Reserved0;
    uint8_t StringID;
    uint8_t Reserved[11];
};

struct _ASL_DRAWER_DESCRIPTOR {
    uint8_t DescriptorType;
    uint8_t Length;
    uint8_t DrawerID;
    uint8_t Reserved0;
    uint8_t StringID;
    uint8_t Reserved[11];
};

// Variable length: the text and its terminating NUL follow StringNum.
struct _ASL_STRING_DESCRIPTOR {
    uint8_t DescriptorType;
    uint8_t StringNum;
    char String[1];
};

struct _ASL_PACKET {
    _ASL_TABLE_HEADER Header;
    RAW_ASL_DATA Data[ASL_PACKET_CAPACITY - sizeof(_ASL_TABLE_HEADER)];
};

#pragma pack(pop)

static_assert(sizeof(_ASL_TABLE_HEADER) == 16, "table header layout");
static_assert(offsetof(_ASL_TABLE_HEADER, MachineID) == 7, "table header layout");
static_assert(sizeof(_ASL_BUS_DESCRIPTOR) == 16, "bus descriptor layout");
static_assert(offsetof(_ASL_BUS_DESCRIPTOR, CurrentBusSpeed) == 8, "bus descriptor layout");
static_assert(sizeof(_ASL_SLOT_DESCRIPTOR) == 16, "slot descriptor layout");
static_assert(offsetof(_ASL_SLOT_DESCRIPTOR, SlotID) == 2, "slot descriptor layout");
static_assert(offsetof(_ASL_SLOT_DESCRIPTOR, SlotUiNumber) == 12, "slot descriptor layout");
static_assert(sizeof(_ASL_CHASSIS_DESCRIPTOR) == 16, "chassis descriptor layout");
static_assert(sizeof(_ASL_DRAWER_DESCRIPTOR) == 16, "drawer descriptor layout");
static_assert(offsetof(_ASL_CHASSIS_DESCRIPTOR, StringID) == 4, "chassis descriptor layout");
static_assert(offsetof(_ASL_STRING_DESCRIPTOR, String) == 2, "string descriptor layout");
static_assert(sizeof(_ASL_PACKET) == ASL_PACKET_CAPACITY, "packet buffer size");
