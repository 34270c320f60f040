#include "sources/aslpacket.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <tuple>
#include <vector>

#include "aslbuilder.h"
#include "scratchdir.h"

namespace {

// Records what the walk hands out, in order: "type@offset+size" for a visit (marked "nofields"
// when it has no fields), ">offset" for a step, and at last how the walk ended.
struct Recorder : AslVisitor {
    explicit Recorder(const void* base) : Base(static_cast<const RAW_ASL_DATA*>(base)) {}
    void Visit(const AslDescriptor& d) override {
        char seen[40];
        std::snprintf(seen, sizeof(seen), "%02x@%d+%u%s ", d.Type, static_cast<int>(d.At - Base),
                      d.Size, d.Fields == nullptr ? " nofields" : "");
        Trace += seen;
        const uint32_t count = d.ValidType == STRING_TYPE ? d.Size : ASL_FIXED_DESCRIPTOR_SIZE;
        Fields.emplace_back(d.Fields, d.Fields == nullptr ? d.Fields : d.Fields + count);
    }
    void Stepped(uint32_t next) override { Trace += ">" + std::to_string(next) + " "; }
    void Walk(const void* packet, uint32_t size) {
        const AslWalkEnd end = WalkAslPacket(static_cast<const _ASL_PACKET*>(packet), size, *this);
        Trace += end == AslWalkEnd::EndMarker   ? "end"
                 : end == AslWalkEnd::Malformed ? "malformed"
                                                : "unknown";
    }
    const RAW_ASL_DATA* Base;
    std::string Trace;
    std::vector<std::vector<uint8_t>> Fields;
};

// Walks a copy of the packet's first `size` bytes in a heap buffer of exactly that size, so
// that a read past the delivered bytes is caught by the sanitizers.
Recorder Walk(const AslBuilder& builder, size_t size = 0) {
    size = size == 0 ? builder.Size() : size;
    const std::vector<uint8_t> buffer(builder.Bytes.begin(), builder.Bytes.begin() + long(size));
    Recorder recorder(buffer.data());
    recorder.Walk(buffer.data(), static_cast<uint32_t>(size));
    return recorder;
}

}  // namespace

TEST(DescriptorSize, SizesByTypeWithBitSevenForcedAndNeverReadsPastTheAvailableBytes) {
    InstallTree tree;
    // Bytes, available, size. 0x20 with bit 7 forced reads as the end marker.
    const uint32_t past = ASL_SIZE_PAST_END;
    using Case = std::tuple<std::vector<uint8_t>, uint32_t, uint32_t>;
    const std::vector<uint8_t> string{0x91, 4, 'a', 'b', 'c', 0}, header{'V', 'H', 'S', 'L', 16};
    const Case cases[] = {Case({0x81, 20, 0}, 3, 20), Case({0x02, 16}, 2, 16),
                          Case(header, 5, 16),        Case({0x91, 4, 'a', 'b', 'c', 0, 0x55}, 7, 6),
                          Case(string, 6, 6),         Case({0x11, 4, 0}, 3, 3),
                          Case({0xA0}, 1, 1),         Case({0x20}, 1, 1),
                          Case(string, 5, past),      Case(string, 2, past),
                          Case({0x81, 16}, 1, past),  Case({0x81, 16}, 0, past),
                          Case(header, 4, past)};
    for (const auto& [bytes, available, size] : cases) {
        EXPECT_EQ(DescriptorSize(bytes.data(), available), size) << int(bytes[0]) << available;
    }
    EXPECT_EQ(tree.Log(), "");  // an unknown type's size and message are the walk's below
}

TEST(WalkAslPacket, HandsOutEveryDescriptorInOrderAndStepsOverInvalidOnes) {
    InstallTree tree;
    AslBuilder packet;
    packet.Header().Bus({1, 0, 255, 4, 7}).Slot({3, 1}).Invalid().String(2, "abc");
    packet.Chassis(0, 2).Length(20).Raw({1, 2, 3, 4}).End();  // the chassis' four extra bytes
    Recorder walked = Walk(packet);
    EXPECT_EQ(walked.Trace, "81@16+16 >32 02@32+16 >48 91@48+6 >54 86@54+20 >74 end");
    EXPECT_EQ(walked.Fields[0][5], 4);  // BusNumber
    EXPECT_EQ(walked.Fields[2], (std::vector<uint8_t>{0x91, 2, 'a', 'b', 'c', 0}));

    // A header followed directly by the end marker is a valid, empty packet.
    EXPECT_EQ(Walk(AslBuilder().Header().End()).Trace, "end");

    // A short fixed descriptor reads zero past its end, not the bytes that follow it.
    walked = Walk(AslBuilder().Header().Raw({0x86, 5, 7, 0, 9}).Raw({0x87, 3, 4}).End());
    EXPECT_EQ(walked.Trace, "86@16+5 >21 87@21+3 >24 end");
    EXPECT_EQ(walked.Fields, (std::vector<std::vector<uint8_t>>{
                                 {0x86, 5, 7, 0, 9, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0},
                                 {0x87, 3, 4, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0}}));
    EXPECT_EQ(tree.Log(), "");
}

TEST(WalkAslPacket, UnknownTypesAndHostilePacketsEndTheWalk) {
    const std::string head = "\nVELHLIB, WalkAslPacket():  ";
    const struct {
        AslBuilder Packet;
        size_t Size;
        std::string Trace, Log;
    } cases[] = {
        {AslBuilder().Header().Chassis(0, 0).Raw({0x20}).Bus({1}).End(), 0,
         "86@16+16 >32 20@32+0 nofields >33 unknown", ""},
        {AslBuilder().Header().Raw({0x55, 0, 0}).End(), 0, "55@16+0 nofields >16 unknown",
         "\nVELHLIB, DescriptorSize():  Invalid descriptor type: 0x55\n"},
        {AslBuilder().Header().Raw({'V', 0, 0, 0, 200}).End(), 0, "56@16+0 nofields >216 unknown",
         ""},
        // A zero Length would step on the same place for ever.
        {AslBuilder().Header().Chassis(0, 0).Bus({1}).Length(0).End(), 0, "86@16+16 >32 malformed",
         head + "Descriptor type 0x81 at offset 32 has length 0\n"},
        {AslBuilder().Header().Chassis(0, 0).Slot({1}).End(), 40, "86@16+16 >32 malformed",
         head + "Descriptor type 0x82 at offset 32 runs past the 40 bytes of the packet\n"},
        {AslBuilder().Header().Bus({1}).Length(200).End(), 0, "malformed",
         head + "Descriptor type 0x81 at offset 16 runs past the 33 bytes of the packet\n"},
        {AslBuilder().Header().Bus({1}).Slot({2}), 0, "81@16+16 >32 82@32+16 >48 malformed",
         head + "No end marker within the 48 bytes of the packet\n"},
        // Text running to the end of the delivered bytes.
        {AslBuilder().Header().String(1, "Main"), 22, "malformed",
         head + "Descriptor type 0x91 at offset 16 runs past the 22 bytes of the packet\n"},
        {AslBuilder().Header(), 10, "malformed",
         head + "No end marker within the 10 bytes of the packet\n"},
    };
    for (const auto& c : cases) {
        InstallTree tree;
        EXPECT_EQ(Walk(c.Packet, c.Size).Trace, c.Trace) << c.Log;
        EXPECT_EQ(tree.Log(), c.Log);
    }
    Recorder recorder(nullptr);
    recorder.Walk(nullptr, 100);
    EXPECT_EQ(recorder.Trace, "malformed");
    // A wrong signature is aslstore_test's; here the signature must lie within the given bytes.
    const auto packet = AslBuilder().Header().End().Packet();
    EXPECT_TRUE(IsAslPacket(packet.get(), 4));
    EXPECT_FALSE(IsAslPacket(packet.get(), 3));
    EXPECT_FALSE(IsAslPacket(nullptr, 17));
}

TEST(WalkAslPacket, NeverWalksPastThePacketBuffer) {
    InstallTree tree;
    // Bus descriptors fill the buffer, and the source claims more bytes than it holds: the last
    // one reaches past the buffer, or without that the buffer has no end marker.
    AslBuilder packet;
    packet.Header();
    while (packet.Size() + 16 < ASL_PACKET_CAPACITY) {
        packet.Bus({1});
    }
    for (auto [length, claimed, log] :
         {std::tuple{40, 200000u, "Descriptor type 0x81 at offset 80000 runs past the 80016 bytes"},
          {16, 80017u, "No end marker within the 80016 bytes"}}) {
        packet.Bytes.resize(ASL_PACKET_CAPACITY - 16);
        packet.Bus({2}).Length(length);
        Recorder recorder(packet.Bytes.data());
        recorder.Walk(packet.Bytes.data(), claimed);
        EXPECT_EQ(recorder.Fields.size(), (ASL_PACKET_CAPACITY - 32) / 16 + (length == 16));
        EXPECT_TRUE(tree.Logged(std::string(log) + " of the packet\n")) << tree.Log();
        EXPECT_EQ(recorder.Trace.substr(recorder.Trace.size() - 9), "malformed");
    }
}
