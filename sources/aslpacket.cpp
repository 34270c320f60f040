#include "sources/aslpacket.h"

#include <algorithm>

#include "diag/hwdebug.h"

namespace {

// Offset of the header's Length byte, and of a fixed descriptor's Length byte.
constexpr uint32_t HEADER_LENGTH_OFFSET = 4;
constexpr uint32_t DESCRIPTOR_LENGTH_OFFSET = 1;
// Type byte and string number ahead of a string descriptor's text.
constexpr uint32_t STRING_TEXT_OFFSET = 2;

bool IsFixedType(uint8_t validType) {
    return validType == BUS_TYPE || validType == SLOT_TYPE || validType == CHASSIS_TYPE ||
           validType == DRAWER_TYPE;
}

// The byte at `offset` of a descriptor, if it lies within `available` bytes.
uint32_t SizeByte(const RAW_ASL_DATA* descriptor, uint32_t available, uint32_t offset) {
    return offset < available ? descriptor[offset] : ASL_SIZE_PAST_END;
}

}  // namespace

uint32_t DescriptorSize(const RAW_ASL_DATA* descriptor, uint32_t available) {
    if (available == 0) {
        return ASL_SIZE_PAST_END;
    }
    uint8_t type = descriptor[0];
    if (type != static_cast<uint8_t>(ASL_SIGNATURE[0])) {
        type |= VALID_DESCRIPTOR;
    }
    if (type == static_cast<uint8_t>(ASL_SIGNATURE[0])) {
        return SizeByte(descriptor, available, HEADER_LENGTH_OFFSET);
    }
    if (IsFixedType(type)) {
        return SizeByte(descriptor, available, DESCRIPTOR_LENGTH_OFFSET);
    }
    if (type == END_TYPE) {
        return 1;
    }
    if (type == STRING_TYPE) {
        if (available <= STRING_TEXT_OFFSET) {
            return ASL_SIZE_PAST_END;
        }
        const auto* text = reinterpret_cast<const char*>(descriptor + STRING_TEXT_OFFSET);
        const uint32_t room = available - STRING_TEXT_OFFSET;
        const auto length = static_cast<uint32_t>(strnlen(text, room));
        return length < room ? STRING_TEXT_OFFSET + length + 1 : ASL_SIZE_PAST_END;
    }
    ErrMsg("DescriptorSize()", "Invalid descriptor type: 0x%02x", descriptor[0]);
    return 0;
}

bool IsAslPacket(const _ASL_PACKET* packet, uint32_t size) {
    return packet != nullptr && size >= sizeof(ASL_SIGNATURE) &&
           std::memcmp(packet->Header.Signature, ASL_SIGNATURE, sizeof(ASL_SIGNATURE)) == 0;
}

AslWalkEnd WalkAslPacket(const _ASL_PACKET* packet, uint32_t size, AslVisitor& visitor) {
    const auto* base = reinterpret_cast<const RAW_ASL_DATA*>(packet);
    const uint32_t limit = packet == nullptr ? 0 : std::min(size, ASL_PACKET_CAPACITY);
    uint32_t offset = sizeof(_ASL_TABLE_HEADER);
    for (;;) {
        if (offset >= limit) {
            ErrMsg("WalkAslPacket()", "No end marker within the %d bytes of the packet", limit);
            return AslWalkEnd::Malformed;
        }
        AslDescriptor descriptor{};
        descriptor.At = base + offset;
        descriptor.Type = *descriptor.At;
        if (descriptor.Type == END_TYPE) {
            return AslWalkEnd::EndMarker;
        }
        descriptor.ValidType = descriptor.Type | VALID_DESCRIPTOR;
        const uint32_t available = limit - offset;
        const bool known = IsFixedType(descriptor.ValidType) || descriptor.ValidType == STRING_TYPE;

        if (!known) {
            // The visitor reports the unknown type before DescriptorSize adds its own message.
            // The walk ends here whatever size the type claims: where it leads is only traced.
            visitor.Visit(descriptor);
            descriptor.Size = DescriptorSize(descriptor.At, available);
            const bool told = descriptor.Size != ASL_SIZE_PAST_END;
            visitor.Stepped(offset + (told ? descriptor.Size : available));
            return AslWalkEnd::UnknownType;
        }
        // A known descriptor is checked before anyone reads it.
        descriptor.Size = DescriptorSize(descriptor.At, available);
        if (descriptor.Size == 0) {
            ErrMsg("WalkAslPacket()", "Descriptor type 0x%02x at offset %d has length 0",
                   descriptor.Type, offset);
            return AslWalkEnd::Malformed;
        }
        if (descriptor.Size > available) {
            ErrMsg("WalkAslPacket()",
                   "Descriptor type 0x%02x at offset %d runs past the %d bytes of the packet",
                   descriptor.Type, offset, limit);
            return AslWalkEnd::Malformed;
        }

        RAW_ASL_DATA record[ASL_FIXED_DESCRIPTOR_SIZE] = {};
        if (IsFixedType(descriptor.ValidType)) {
            std::memcpy(record, descriptor.At,
                        std::min(descriptor.Size, ASL_FIXED_DESCRIPTOR_SIZE));
            descriptor.Fields = record;
        } else {
            descriptor.Fields = descriptor.At;
        }
        visitor.Visit(descriptor);
        offset += descriptor.Size;
        visitor.Stepped(offset);
    }
}
