#include "sources/aslpacket.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "aslbuilder.h"
#include "scratchdir.h"

namespace {

struct Seen {
    uint8_t Type;
    uint32_t Offset;
    uint32_t Size;
    std::vector<uint8_t> Fields;
};

// Records what the walk hands out, in order.
class Recorder : public AslVisitor {
  public:
    explicit Recorder(const void* base) : Base(static_cast<const RAW_ASL_DATA*>(base)) {}

    void Visit(const AslDescriptor& d) override {
        Seen seen{d.Type, static_cast<uint32_t>(d.At - Base), d.Size, {}};
        if (d.Fields != nullptr) {
            const uint32_t count = d.ValidType == STRING_TYPE ? d.Size : ASL_FIXED_DESCRIPTOR_SIZE;
            seen.Fields.assign(d.Fields, d.Fields + count);
        }
        Visits.push_back(seen);
    }
    void Stepped(const RAW_ASL_DATA* next) override {
        Steps.push_back(static_cast<uint32_t>(next - Base));
    }

    const RAW_ASL_DATA* Base;
    std::vector<Seen> Visits;
    std::vector<uint32_t> Steps;
};

struct Walked {
    AslWalkEnd End;
    std::vector<Seen> Visits;
    std::vector<uint32_t> Steps;
};

// Walks a copy of the packet's first `size` bytes in a heap buffer of exactly that size, so
// that a read past the delivered bytes is caught by the sanitizers.
Walked Walk(const std::vector<uint8_t>& bytes, size_t size) {
    const std::vector<uint8_t> buffer(bytes.begin(), bytes.begin() + static_cast<long>(size));
    Recorder recorder(buffer.data());
    const AslWalkEnd end = WalkAslPacket(reinterpret_cast<const _ASL_PACKET*>(buffer.data()),
                                         static_cast<uint32_t>(size), recorder);
    return Walked{end, recorder.Visits, recorder.Steps};
}

Walked Walk(const AslBuilder& builder) {
    return Walk(builder.Bytes, builder.Size());
}

}  // namespace

TEST(DescriptorSize, SizesByTypeWithBitSevenForced) {
    InstallTree tree;
    const uint8_t bus[] = {0x81, 20, 0};
    const uint8_t invalidSlot[] = {0x02, 16};
    const uint8_t header[] = {'V', 'H', 'S', 'L', 16};
    const uint8_t string[] = {0x91, 4, 'a', 'b', 'c', 0, 0x55};
    const uint8_t invalidString[] = {0x11, 4, 0};
    const uint8_t end[] = {0xA0};
    const uint8_t blank[] = {0x20};
    EXPECT_EQ(DescriptorSize(bus, sizeof(bus)), 20u);
    EXPECT_EQ(DescriptorSize(invalidSlot, sizeof(invalidSlot)), 16u);
    EXPECT_EQ(DescriptorSize(header, sizeof(header)), 16u);
    EXPECT_EQ(DescriptorSize(string, sizeof(string)), 6u);
    EXPECT_EQ(DescriptorSize(invalidString, sizeof(invalidString)), 3u);
    EXPECT_EQ(DescriptorSize(end, sizeof(end)), 1u);
    // 0x20 with bit 7 forced reads as the end marker: size 1 and no message.
    EXPECT_EQ(DescriptorSize(blank, sizeof(blank)), 1u);
    EXPECT_EQ(tree.Log(), "");

    const uint8_t unknown[] = {0x55, 16};
    EXPECT_EQ(DescriptorSize(unknown, sizeof(unknown)), 0u);
    EXPECT_EQ(tree.Log(), "\nVELHLIB, DescriptorSize():  Invalid descriptor type: 0x55\n");
}

TEST(DescriptorSize, NeverReadsPastTheAvailableBytes) {
    InstallTree tree;
    const uint8_t string[] = {0x91, 4, 'a', 'b', 'c', 0};
    // The terminator is the last available byte, then one byte short of it.
    EXPECT_EQ(DescriptorSize(string, 6), 6u);
    EXPECT_EQ(DescriptorSize(string, 5), ASL_SIZE_PAST_END);
    EXPECT_EQ(DescriptorSize(string, 2), ASL_SIZE_PAST_END);
    const uint8_t bus[] = {0x81, 16};
    EXPECT_EQ(DescriptorSize(bus, 1), ASL_SIZE_PAST_END);
    EXPECT_EQ(DescriptorSize(bus, 0), ASL_SIZE_PAST_END);
    const uint8_t header[] = {'V', 'H', 'S', 'L', 16};
    EXPECT_EQ(DescriptorSize(header, 4), ASL_SIZE_PAST_END);
    EXPECT_EQ(tree.Log(), "");
}

TEST(WalkAslPacket, HandsOutEveryDescriptorInOrderAndStepsOverInvalidOnes) {
    InstallTree tree;
    AslBuilder packet;
    packet.Header()
        .Bus({1, 0, 255, 4, 7})
        .Slot({3, 1})
        .Invalid()
        .String(2, "abc")
        .Chassis(0, 2)
        .Length(20)
        .Raw({1, 2, 3, 4})  // the chassis' four extra bytes
        .End();
    const Walked walked = Walk(packet);
    EXPECT_EQ(walked.End, AslWalkEnd::EndMarker);
    ASSERT_EQ(walked.Visits.size(), 4u);
    EXPECT_EQ(walked.Visits[0].Type, 0x81);
    EXPECT_EQ(walked.Visits[0].Offset, 16u);
    EXPECT_EQ(walked.Visits[0].Fields[5], 4);  // BusNumber
    EXPECT_EQ(walked.Visits[1].Type, 0x02);
    EXPECT_EQ(walked.Visits[1].Offset, 32u);
    EXPECT_EQ(walked.Visits[2].Type, 0x91);
    EXPECT_EQ(walked.Visits[2].Size, 6u);
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(&walked.Visits[2].Fields[2])), "abc");
    EXPECT_EQ(walked.Visits[3].Type, 0x86);
    EXPECT_EQ(walked.Visits[3].Size, 20u);
    EXPECT_EQ(walked.Steps, (std::vector<uint32_t>{32, 48, 54, 74}));
    EXPECT_EQ(tree.Log(), "");

    // A header followed directly by the end marker is a valid, empty packet.
    AslBuilder empty;
    empty.Header().End();
    const Walked none = Walk(empty);
    EXPECT_EQ(none.End, AslWalkEnd::EndMarker);
    EXPECT_TRUE(none.Visits.empty());
}

TEST(WalkAslPacket, UnknownTypeEndsTheWalkAfterSteppingOverIt) {
    InstallTree tree;
    AslBuilder blank;
    blank.Header().Chassis(0, 0).Raw({0x20}).Bus({1}).End();
    Walked walked = Walk(blank);
    EXPECT_EQ(walked.End, AslWalkEnd::UnknownType);
    ASSERT_EQ(walked.Visits.size(), 2u);
    EXPECT_EQ(walked.Visits[1].Type, 0x20);
    EXPECT_EQ(walked.Steps, (std::vector<uint32_t>{32, 33}));
    EXPECT_EQ(tree.Log(), "");

    AslBuilder odd;
    odd.Header().Raw({0x55, 0, 0}).End();
    walked = Walk(odd);
    EXPECT_EQ(walked.End, AslWalkEnd::UnknownType);
    ASSERT_EQ(walked.Visits.size(), 1u);
    EXPECT_EQ(walked.Visits[0].Fields.size(), 0u);
    EXPECT_EQ(walked.Steps, (std::vector<uint32_t>{16}));  // stepped by a size of 0
    EXPECT_EQ(tree.Log(), "\nVELHLIB, DescriptorSize():  Invalid descriptor type: 0x55\n");
}

TEST(WalkAslPacket, ShortFixedDescriptorReadsZeroPastItsEnd) {
    InstallTree tree;
    AslBuilder packet;
    packet.Header().Raw({0x86, 5, 7, 0, 9}).Raw({0x87, 3, 4}).End();
    // Deliver exactly the bytes up to the end marker.
    const Walked walked = Walk(packet);
    EXPECT_EQ(walked.End, AslWalkEnd::EndMarker);
    ASSERT_EQ(walked.Visits.size(), 2u);
    EXPECT_EQ(walked.Visits[0].Fields,
              (std::vector<uint8_t>{0x86, 5, 7, 0, 9, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0}));
    EXPECT_EQ(walked.Visits[1].Fields[2], 4);
    EXPECT_EQ(walked.Visits[1].Fields[4], 0);  // not the end marker that follows it
}

TEST(WalkAslPacket, HostilePacketsEndTheWalkWithAnErrorLine) {
    InstallTree tree;
    {
        // A zero Length would step on the same place for ever.
        AslBuilder packet;
        packet.Header().Chassis(0, 0).Bus({1}).Length(0).End();
        const Walked walked = Walk(packet);
        EXPECT_EQ(walked.End, AslWalkEnd::Malformed);
        EXPECT_EQ(walked.Visits.size(), 1u);
        EXPECT_NE(tree.Log().find("\nVELHLIB, WalkAslPacket():  Descriptor type 0x81 at offset 32 "
                                  "has length 0\n"),
                  std::string::npos);
    }
    {
        // Delivered bytes end in the middle of a slot descriptor.
        AslBuilder packet;
        packet.Header().Chassis(0, 0).Slot({1}).End();
        const Walked walked = Walk(packet.Bytes, 40);
        EXPECT_EQ(walked.End, AslWalkEnd::Malformed);
        EXPECT_EQ(walked.Visits.size(), 1u);
        EXPECT_NE(tree.Log().find("Descriptor type 0x82 at offset 32 runs past the 40 bytes of "
                                  "the packet\n"),
                  std::string::npos);
    }
    {
        // A Length byte that reaches past the delivered bytes.
        AslBuilder packet;
        packet.Header().Bus({1}).Length(200).End();
        EXPECT_EQ(Walk(packet).End, AslWalkEnd::Malformed);
    }
    {
        // No end marker: the walk stops at the last delivered byte.
        AslBuilder packet;
        packet.Header().Bus({1}).Slot({2});
        const Walked walked = Walk(packet);
        EXPECT_EQ(walked.End, AslWalkEnd::Malformed);
        EXPECT_EQ(walked.Visits.size(), 2u);
        EXPECT_NE(tree.Log().find("No end marker within the 48 bytes of the packet\n"),
                  std::string::npos);
    }
    {
        // A string whose text runs to the end of the delivered bytes without a terminator.
        AslBuilder packet;
        packet.Header().String(1, "Main");
        packet.Bytes.pop_back();
        const Walked walked = Walk(packet);
        EXPECT_EQ(walked.End, AslWalkEnd::Malformed);
        EXPECT_TRUE(walked.Visits.empty());
        EXPECT_NE(tree.Log().find("Descriptor type 0x91 at offset 16 runs past the 22 bytes"),
                  std::string::npos);
    }
    {
        // Fewer bytes than the header.
        EXPECT_EQ(Walk(AslBuilder().Header().Bytes, 10).End, AslWalkEnd::Malformed);
        Recorder recorder(nullptr);
        EXPECT_EQ(WalkAslPacket(nullptr, 100, recorder), AslWalkEnd::Malformed);
        EXPECT_TRUE(recorder.Visits.empty());
    }
}

TEST(WalkAslPacket, NeverWalksPastThePacketBuffer) {
    InstallTree tree;
    // Bus descriptors up to the last one, which reaches past the buffer; the source claims more
    // bytes than the buffer holds.
    AslBuilder packet;
    packet.Header();
    while (packet.Size() + 32 <= ASL_PACKET_CAPACITY) {
        packet.Bus({1});
    }
    packet.Bus({2}).Length(40);
    ASSERT_EQ(packet.Size(), ASL_PACKET_CAPACITY);
    Recorder recorder(packet.Bytes.data());
    EXPECT_EQ(
        WalkAslPacket(reinterpret_cast<const _ASL_PACKET*>(packet.Bytes.data()), 200000, recorder),
        AslWalkEnd::Malformed);
    EXPECT_EQ(recorder.Visits.size(), (ASL_PACKET_CAPACITY - 32) / 16);
    EXPECT_NE(tree.Log().find("Descriptor type 0x81 at offset 80000 runs past the 80016 bytes "
                              "of the packet\n"),
              std::string::npos);

    // Without the last one the buffer is full of descriptors and has no end marker.
    packet.Bytes.resize(ASL_PACKET_CAPACITY - 16);
    packet.Bus({2});
    Recorder full(packet.Bytes.data());
    EXPECT_EQ(WalkAslPacket(reinterpret_cast<const _ASL_PACKET*>(packet.Bytes.data()), 80017, full),
              AslWalkEnd::Malformed);
    EXPECT_EQ(full.Visits.size(), (ASL_PACKET_CAPACITY - 16) / 16);
    EXPECT_NE(tree.Log().find("No end marker within the 80016 bytes of the packet\n"),
              std::string::npos);
}

TEST(IsAslPacket, ChecksTheSignatureWithinTheDeliveredBytes) {
    auto packet = AslBuilder().Header().End().Packet();
    EXPECT_TRUE(IsAslPacket(packet.get(), 17));
    EXPECT_FALSE(IsAslPacket(packet.get(), 3));
    EXPECT_FALSE(IsAslPacket(nullptr, 17));
    packet->Header.Signature[3] = 'X';
    EXPECT_FALSE(IsAslPacket(packet.get(), 17));
}
