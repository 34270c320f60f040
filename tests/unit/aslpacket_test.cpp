#include "sources/aslpacket.h"

#include <gtest/gtest.h>

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
struct Recorder : AslVisitor {
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
    AslWalkEnd End = AslWalkEnd::EndMarker;
};

// Walks a copy of the packet's first `size` bytes in a heap buffer of exactly that size, so
// that a read past the delivered bytes is caught by the sanitizers.
Recorder Walk(const AslBuilder& builder, size_t size = 0) {
    size = size == 0 ? builder.Size() : size;
    const std::vector<uint8_t> buffer(builder.Bytes.begin(), builder.Bytes.begin() + long(size));
    Recorder recorder(buffer.data());
    recorder.End = WalkAslPacket(reinterpret_cast<const _ASL_PACKET*>(buffer.data()),
                                 static_cast<uint32_t>(size), recorder);
    return recorder;
}

}  // namespace

TEST(DescriptorSize, SizesByTypeWithBitSevenForcedAndNeverReadsPastTheAvailableBytes) {
    InstallTree tree;
    // Bytes, available, size. 0x20 with bit 7 forced reads as the end marker.
    const std::tuple<std::vector<uint8_t>, uint32_t, uint32_t> cases[] = {
        {{0x81, 20, 0}, 3, 20},
        {{0x02, 16}, 2, 16},
        {{'V', 'H', 'S', 'L', 16}, 5, 16},
        {{0x91, 4, 'a', 'b', 'c', 0, 0x55}, 7, 6},
        {{0x91, 4, 'a', 'b', 'c', 0}, 6, 6},
        {{0x11, 4, 0}, 3, 3},
        {{0xA0}, 1, 1},
        {{0x20}, 1, 1},
        {{0x91, 4, 'a', 'b', 'c', 0}, 5, ASL_SIZE_PAST_END},
        {{0x91, 4, 'a', 'b', 'c', 0}, 2, ASL_SIZE_PAST_END},
        {{0x81, 16}, 1, ASL_SIZE_PAST_END},
        {{0x81, 16}, 0, ASL_SIZE_PAST_END},
        {{'V', 'H', 'S', 'L', 16}, 4, ASL_SIZE_PAST_END},
    };
    for (const auto& [bytes, available, size] : cases) {
        EXPECT_EQ(DescriptorSize(bytes.data(), available), size) << int(bytes[0]) << available;
    }
    EXPECT_EQ(tree.Log(), "");
    const uint8_t unknown[] = {0x55, 16};
    EXPECT_EQ(DescriptorSize(unknown, sizeof(unknown)), 0u);
    EXPECT_EQ(tree.Log(), "\nVELHLIB, DescriptorSize():  Invalid descriptor type: 0x55\n");
}

TEST(WalkAslPacket, HandsOutEveryDescriptorInOrderAndStepsOverInvalidOnes) {
    InstallTree tree;
    AslBuilder packet;
    packet.Header().Bus({1, 0, 255, 4, 7}).Slot({3, 1}).Invalid().String(2, "abc");
    packet.Chassis(0, 2).Length(20).Raw({1, 2, 3, 4}).End();  // the chassis' four extra bytes
    Recorder walked = Walk(packet);
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

    // A header followed directly by the end marker is a valid, empty packet.
    walked = Walk(AslBuilder().Header().End());
    EXPECT_EQ(walked.End, AslWalkEnd::EndMarker);
    EXPECT_TRUE(walked.Visits.empty());

    // A short fixed descriptor reads zero past its end, not the bytes that follow it.
    walked = Walk(AslBuilder().Header().Raw({0x86, 5, 7, 0, 9}).Raw({0x87, 3, 4}).End());
    EXPECT_EQ(walked.End, AslWalkEnd::EndMarker);
    ASSERT_EQ(walked.Visits.size(), 2u);
    EXPECT_EQ(walked.Visits[0].Fields,
              (std::vector<uint8_t>{0x86, 5, 7, 0, 9, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0}));
    EXPECT_EQ(walked.Visits[1].Fields[2], 4);
    EXPECT_EQ(walked.Visits[1].Fields[4], 0);
    EXPECT_EQ(tree.Log(), "");
}

TEST(WalkAslPacket, UnknownTypesAndHostilePacketsEndTheWalk) {
    AslBuilder noString;
    noString.Header().String(1, "Main");
    noString.Bytes.pop_back();  // text running to the end of the delivered bytes
    struct Case {
        AslBuilder Packet;
        size_t Size;
        AslWalkEnd End;
        size_t Visits;
        std::vector<uint32_t> Steps;
        std::string Log;
    } cases[] = {
        {AslBuilder().Header().Chassis(0, 0).Raw({0x20}).Bus({1}).End(),
         0,
         AslWalkEnd::UnknownType,
         2,
         {32, 33},
         ""},
        {AslBuilder().Header().Raw({0x55, 0, 0}).End(),
         0,
         AslWalkEnd::UnknownType,
         1,
         {16},
         "\nVELHLIB, DescriptorSize():  Invalid descriptor type: 0x55\n"},
        // A zero Length would step on the same place for ever.
        {AslBuilder().Header().Chassis(0, 0).Bus({1}).Length(0).End(),
         0,
         AslWalkEnd::Malformed,
         1,
         {32},
         "\nVELHLIB, WalkAslPacket():  Descriptor type 0x81 at offset 32 has length 0\n"},
        {AslBuilder().Header().Chassis(0, 0).Slot({1}).End(),
         40,
         AslWalkEnd::Malformed,
         1,
         {32},
         "\nVELHLIB, WalkAslPacket():  Descriptor type 0x82 at offset 32 runs past the 40 bytes "
         "of the packet\n"},
        {AslBuilder().Header().Bus({1}).Length(200).End(),
         0,
         AslWalkEnd::Malformed,
         0,
         {},
         "\nVELHLIB, WalkAslPacket():  Descriptor type 0x81 at offset 16 runs past the 33 bytes "
         "of the packet\n"},
        {AslBuilder().Header().Bus({1}).Slot({2}),
         0,
         AslWalkEnd::Malformed,
         2,
         {32, 48},
         "\nVELHLIB, WalkAslPacket():  No end marker within the 48 bytes of the packet\n"},
        {noString,
         0,
         AslWalkEnd::Malformed,
         0,
         {},
         "\nVELHLIB, WalkAslPacket():  Descriptor type 0x91 at offset 16 runs past the 22 bytes "
         "of the packet\n"},
        {AslBuilder().Header(),
         10,
         AslWalkEnd::Malformed,
         0,
         {},
         "\nVELHLIB, WalkAslPacket():  No end marker within the 10 bytes of the packet\n"},
    };
    for (const Case& c : cases) {
        InstallTree tree;
        const Recorder walked = Walk(c.Packet, c.Size);
        EXPECT_EQ(walked.End, c.End) << c.Log;
        ASSERT_EQ(walked.Visits.size(), c.Visits) << c.Log;
        EXPECT_EQ(walked.Steps, c.Steps) << c.Log;
        if (walked.Steps == std::vector<uint32_t>{16}) {
            EXPECT_TRUE(walked.Visits[0].Fields.empty());  // a type of unknown size has none
        }
        EXPECT_EQ(tree.Log(), c.Log);
    }
    Recorder recorder(nullptr);
    EXPECT_EQ(WalkAslPacket(nullptr, 100, recorder), AslWalkEnd::Malformed);
    EXPECT_TRUE(recorder.Visits.empty());
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
    const auto* bytes = reinterpret_cast<const _ASL_PACKET*>(packet.Bytes.data());
    Recorder recorder(bytes);
    EXPECT_EQ(WalkAslPacket(bytes, 200000, recorder), AslWalkEnd::Malformed);
    EXPECT_EQ(recorder.Visits.size(), (ASL_PACKET_CAPACITY - 32) / 16);
    EXPECT_NE(tree.Log().find("Descriptor type 0x81 at offset 80000 runs past the 80016 bytes "
                              "of the packet\n"),
              std::string::npos);

    // Without the last one the buffer is full of descriptors and has no end marker.
    packet.Bytes.resize(ASL_PACKET_CAPACITY - 16);
    packet.Bus({2});
    bytes = reinterpret_cast<const _ASL_PACKET*>(packet.Bytes.data());
    Recorder full(bytes);
    EXPECT_EQ(WalkAslPacket(bytes, 80017, full), AslWalkEnd::Malformed);
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
