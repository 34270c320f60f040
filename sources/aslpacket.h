// Size of one descriptor of an ASL packet and the one bounded walk over a packet.
#pragma once

#include <cstdint>
#include <cstring>

#include "asl.h"

// DescriptorSize's answer when the bytes that tell the size, or the descriptor itself, lie past
// the bytes available: larger than any count of available bytes.
constexpr uint32_t ASL_SIZE_PAST_END = 0xFFFFFFFFu;

// Bus, slot, chassis and drawer descriptors: the bytes their records cover.
constexpr uint32_t ASL_FIXED_DESCRIPTOR_SIZE = 16;

// Size of the descriptor (or table header) at `descriptor`, of which `available` bytes may be
// read. 0 for an unknown type, reported as invalid; ASL_SIZE_PAST_END when the size cannot be
// told within `available` bytes (a string with no terminator among them).
uint32_t DescriptorSize(const RAW_ASL_DATA* descriptor, uint32_t available);

// True when the packet's first four of `size` bytes are the signature "VHSL".
bool IsAslPacket(const _ASL_PACKET* packet, uint32_t size);

// One descriptor as the walk hands it out.
struct AslDescriptor {
    uint8_t Type;            // the type byte as read
    uint8_t ValidType;       // the type byte with bit 7 forced on
    const RAW_ASL_DATA* At;  // where the descriptor lies in the packet
    uint32_t Size;           // its size; 0 for an unknown type
    // Bus, slot, chassis, drawer: ASL_FIXED_DESCRIPTOR_SIZE readable bytes, zero past the end of
    // a shorter descriptor. String: the descriptor itself, its text terminated within the packet.
    // Unknown type: null.
    const RAW_ASL_DATA* Fields;
};

// The record of a bus, slot, chassis or drawer descriptor handed out by the walk.
template <typename Record>
Record DescriptorRecord(const AslDescriptor& descriptor) {
    static_assert(sizeof(Record) == ASL_FIXED_DESCRIPTOR_SIZE, "fixed descriptor record");
    Record record;
    std::memcpy(&record, descriptor.Fields, sizeof(record));
    return record;
}

class AslVisitor {
  public:
    virtual ~AslVisitor() = default;
    // Called once per descriptor, also for an unknown type, after which the walk ends.
    virtual void Visit(const AslDescriptor& descriptor) = 0;
    // The walk has stepped over a descriptor to offset `next` of the packet; after an unknown
    // type, the offset its size leads to, which may lie past the packet.
    virtual void Stepped(uint32_t next) { (void)next; }
};

enum class AslWalkEnd {
    EndMarker,    // reached the end marker
    UnknownType,  // stopped at a descriptor of unknown type
    Malformed,    // a descriptor of length 0, or running past the packet; reported
};

// Walks the descriptors from offset 16 to the end marker, never reading past `size` bytes nor
// past the packet buffer. The caller checks the signature first (IsAslPacket).
AslWalkEnd WalkAslPacket(const _ASL_PACKET* packet, uint32_t size, AslVisitor& visitor);
