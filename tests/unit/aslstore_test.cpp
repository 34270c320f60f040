#include "hw/aslstore.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "aslbuilder.h"
#include "diag/hwdebug.h"
#include "hwobjects.h"
#include "scratchdir.h"

namespace {

template <typename T>
std::vector<T*> InPacketOrder(ObjListTemp<T>& list) {
    std::vector<T*> objects;
    list.BeginEnumeration();
    while (T* object = list.Next()) {
        objects.push_back(object);
    }
    std::reverse(objects.begin(), objects.end());
    return objects;
}

class AslStoreTest : public ::testing::Test {
  protected:
    void TearDown() override { Clear(); }
    static void Clear() {
        HwInfoPrintLevel = 0;
        SystemList.DestroyAll();
        BusList.DestroyAll();
        SlotList.DestroyAll();
    }

    void Store(const AslBuilder& packet) {
        const auto buffer = packet.Packet();
        StoreAslTable(buffer.get(), static_cast<uint32_t>(packet.Size()));
    }

    InstallTree Tree;
};

}  // namespace

TEST_F(AslStoreTest, NumbersValidSystemsTogetherAndNamesThem) {
    AslBuilder packet;
    packet.Header()
        .String(1, "Old name")
        .Chassis(0, 1)
        .Chassis(5, 2)
        .Invalid()
        .Drawer(3, 2)
        .Chassis(1, 1)
        .String(2, "Drawer A")
        .String(1, "Main chassis")
        .End();
    Store(packet);
    const auto systems = InPacketOrder(SystemList);
    ASSERT_EQ(systems.size(), 3u);
    EXPECT_EQ(systems[0]->SystemID, 0u);
    EXPECT_EQ(systems[0]->ChassisNum, 0u);
    EXPECT_EQ(systems[0]->DrawerNum, 255u);
    EXPECT_EQ(systems[0]->ExpnDrawer, 0u);
    EXPECT_EQ(systems[1]->SystemID, 1u);
    EXPECT_EQ(systems[1]->ChassisNum, 255u);
    EXPECT_EQ(systems[1]->DrawerNum, 3u);
    EXPECT_EQ(systems[1]->ExpnDrawer, 1u);
    EXPECT_EQ(systems[1]->StringID, 2u);
    EXPECT_EQ(systems[2]->SystemID, 2u);
    EXPECT_EQ(systems[2]->ChassisNum, 1u);
    // The later string of a number wins, even after the system that names it.
    EXPECT_EQ(systems[0]->Name, L"Main chassis");
    EXPECT_EQ(systems[1]->Name, L"Drawer A");
    EXPECT_EQ(systems[2]->Name, L"Main chassis");
    EXPECT_EQ(Tree.Log(), "");
}

TEST_F(AslStoreTest, SlotAttributeBitsAndFields) {
    AslBuilder packet;
    packet.Header()
        .Bus({4})
        .Slot({0x1234, 4, 9, 2, 0x05, 0x03, 0x11, 0x18, 0x08, 6})
        .Slot({2, 4, 1, 255, 0xFA, 0x84, 0, 0, 0xF7, 0})
        .Slot({3, 4})
        .Invalid()
        .End();
    Store(packet);
    const auto slots = InPacketOrder(SlotList);
    ASSERT_EQ(slots.size(), 2u);
    const SlotDescriptor& a = *slots[0];
    EXPECT_EQ(a.SlotID, 0x1234u);
    EXPECT_EQ(a.BusID, 4u);
    EXPECT_EQ(a.DevNum, 9u);
    EXPECT_EQ(a.FriendlyNum, 2u);
    EXPECT_EQ(a.AttnReason, 0x11u);
    EXPECT_EQ(a.Status, 0x18u);
    EXPECT_EQ(a.SlotUiNumber, 6u);
    EXPECT_TRUE(a.SupHotPlug);
    EXPECT_EQ(a.Width, 64u);
    EXPECT_FALSE(a.Sup5V || a.SupPME || a.SupSMBUS || a.HalfLength || a.LowProfile);
    EXPECT_EQ(a.SpeedBits, 3u);
    EXPECT_FALSE(a.PciX);
    EXPECT_TRUE(a.AttnLedBlinking);

    const SlotDescriptor& b = *slots[1];
    EXPECT_FALSE(b.SupHotPlug);
    EXPECT_EQ(b.Width, 32u);
    EXPECT_TRUE(b.Sup5V && b.SupPME && b.SupSMBUS && b.HalfLength && b.LowProfile);
    EXPECT_EQ(b.SpeedBits, 4u);
    EXPECT_TRUE(b.PciX);
    EXPECT_FALSE(b.AttnLedBlinking);
    EXPECT_EQ(b.FriendlyNum, 255u);
}

TEST_F(AslStoreTest, BusSpeedCodes) {
    AslBuilder packet;
    packet.Header();
    const uint8_t codes[] = {0, 1, 5, 6, 7, 2, 9};
    for (size_t i = 0; i < sizeof(codes); ++i) {
        const auto id = static_cast<uint8_t>(i);
        packet.Bus({id, 0, 255, id, codes[i], 1, 2, 3, 4, 5});
    }
    packet.End();
    Store(packet);
    const auto busses = InPacketOrder(BusList);
    ASSERT_EQ(busses.size(), sizeof(codes));
    const uint32_t speeds[] = {33, 66, 66, 100, 133, 0, 0};
    const bool pciX[] = {false, false, true, true, true, true, true};
    for (size_t i = 0; i < sizeof(codes); ++i) {
        SCOPED_TRACE(i);
        EXPECT_EQ(busses[i]->CurBusSpeed, speeds[i]);
        EXPECT_EQ(busses[i]->InPciXMode, pciX[i]);
        EXPECT_EQ(busses[i]->FirstSlot, NONE_VALUE);
        EXPECT_EQ(busses[i]->SlotCt, 0u);
        EXPECT_FALSE(busses[i]->SupHotPlug);
    }
    EXPECT_EQ(busses[3]->BusNum, 3u);
    EXPECT_EQ(busses[3]->DrawerNum, 255u);
    EXPECT_EQ(busses[3]->LoadAt33, 1u);
    EXPECT_EQ(busses[3]->LoadAt66, 2u);
    EXPECT_EQ(busses[3]->LoadAtX66, 3u);
    EXPECT_EQ(busses[3]->LoadAtX100, 4u);
    EXPECT_EQ(busses[3]->LoadAtX133, 5u);
    EXPECT_EQ(Tree.Log(),
              "velhlib, StoreBusDescriptor():  Unknown bus speed (02)\n"
              "velhlib, StoreBusDescriptor():  Unknown bus speed (09)\n");
}

TEST_F(AslStoreTest, RefusesAPacketWithoutSignature) {
    AslBuilder packet;
    packet.Header().Chassis(0, 0).Bus({1}).End();
    packet.Bytes[0] = 'X';
    const auto buffer = packet.Packet();
    StoreAslTable(buffer.get(), static_cast<uint32_t>(packet.Size()));
    EXPECT_TRUE(InPacketOrder(SystemList).empty());
    EXPECT_TRUE(InPacketOrder(BusList).empty());
    char expected[128];
    std::snprintf(expected, sizeof(expected),
                  "\nvelhlib, StoreAslTable():  Packet at 0x%08x is not an ASL packet\n\n",
                  static_cast<uint32_t>(reinterpret_cast<uintptr_t>(buffer.get())));
    EXPECT_EQ(Tree.Log(), expected);
}

TEST_F(AslStoreTest, UnknownTypeKeepsWhatWasStoredAndStillLinks) {
    AslBuilder packet;
    packet.Header().Bus({1, 0, 255, 7}).Slot({4, 1}).Raw({0x55}).Chassis(0, 0).End();
    Store(packet);
    const auto slots = InPacketOrder(SlotList);
    ASSERT_EQ(slots.size(), 1u);
    EXPECT_EQ(slots[0]->BusNum, 7u);  // linked by XRefAsl
    EXPECT_TRUE(InPacketOrder(SystemList).empty());
    EXPECT_EQ(Tree.Log(),
              "\nvelhlib, StoreAslTable():  Unknown descriptor type (0x55)\n\n"
              "\nVELHLIB, DescriptorSize():  Invalid descriptor type: 0x55\n");
}

TEST_F(AslStoreTest, MalformedPacketKeepsWhatWasStoredAndStillLinks) {
    AslBuilder packet;
    packet.Header().String(0, "Main").Chassis(0, 0).Bus({1}).Slot({4, 1}).Length(0).End();
    Store(packet);
    const auto systems = InPacketOrder(SystemList);
    ASSERT_EQ(systems.size(), 1u);
    EXPECT_EQ(systems[0]->Name, L"Main");
    EXPECT_TRUE(InPacketOrder(SlotList).empty());
    ASSERT_EQ(InPacketOrder(BusList).size(), 1u);
    EXPECT_NE(Tree.Log().find("has length 0"), std::string::npos);
}

TEST_F(AslStoreTest, ParseTraceLines) {
    HwInfoPrintLevel = TRACE_PARSE;
    AslBuilder packet;
    packet.Header().Bus({1}).String(0, "x").End();
    const auto buffer = packet.Packet();
    StoreAslTable(buffer.get(), static_cast<uint32_t>(packet.Size()));
    const auto* base = reinterpret_cast<const uint8_t*>(buffer.get());
    char expected[1024];
    std::snprintf(expected, sizeof(expected),
                  "StoreAslTable():  entry\n"
                  "StoreAslTable():  packet is valid\n"
                  "StoreAslTable():  strings initialized\n"
                  "StoreAslTable();  first descriptor:  %08x\n"
                  "StoreAslTable():  BUS_TYPE\n"
                  "StoreAslTable();  next descriptor:  %08x\n"
                  "StoreAslTable():  STRING_TYPE\n"
                  "StoreAslTable();  next descriptor:  %08x\n"
                  "StoreAslTable();  parse complete, calling XRefAsl()\n"
                  "StoreAslTable():  exit\n",
                  static_cast<uint32_t>(reinterpret_cast<uintptr_t>(base + 16)),
                  static_cast<uint32_t>(reinterpret_cast<uintptr_t>(base + 32)),
                  static_cast<uint32_t>(reinterpret_cast<uintptr_t>(base + 36)));
    EXPECT_EQ(Tree.Log(), expected);
}

TEST_F(AslStoreTest, StoreAndXRefTraceLines) {
    struct Case {
        uint32_t Level;
        AslBuilder Packet;
        const char* Log;
    };
    const Case cases[] = {
        {TRACE_STORE_SYSTEM | TRACE_STORE_STRING,
         AslBuilder().Header().Drawer(3, 1).String(1, "Drawer").End(), "aslstore-store-trace.log"},
        {TRACE_STORE_ASL,
         AslBuilder()
             .Header()
             .Bus({0x12, 1, 255, 0x20, 6, 1, 2, 3, 4, 5})
             .Slot({0x102, 0x12, 3, 4, 0x81, 0x84, 0, 0x18, 8, 1})
             .End(),
         "aslstore-bus-slot-trace.log"},
        {TRACE_XREF_ASL,
         AslBuilder()
             .Header()
             .String(0, "D")
             .Drawer(2, 0)
             .Bus({5, 0, 2, 8})
             .Slot({6, 5, 1, 1, 1})
             .End(),
         "aslstore-xref-trace.log"},
    };
    for (const Case& c : cases) {
        ResetDebugOut();
        HwInfoPrintLevel = c.Level;
        Store(c.Packet);
        EXPECT_EQ(Tree.Log(), TestData(c.Log));
        Clear();
    }
}

TEST_F(AslStoreTest, XRefLinksSlotsToBusses) {
    AslBuilder packet;
    packet.Header()
        .Bus({1, 0, 255, 10})
        .Bus({2, 0, 255, 20})
        .Slot({7, 1, 1, 1, 0x01})  // hot plug
        .Slot({3, 1, 2, 2, 0x00})
        .Slot({5, 1, 3, 3, 0x00})
        .Slot({9, 4})  // no such bus
        .End();
    Store(packet);
    const auto busses = InPacketOrder(BusList);
    ASSERT_EQ(busses.size(), 2u);
    EXPECT_EQ(busses[0]->FirstSlot, 3u);
    EXPECT_EQ(busses[0]->SlotCt, 3u);
    EXPECT_TRUE(busses[0]->SupHotPlug);  // set by one slot, whatever the later ones say
    EXPECT_EQ(busses[1]->FirstSlot, NONE_VALUE);
    EXPECT_EQ(busses[1]->SlotCt, 0u);
    EXPECT_FALSE(busses[1]->SupHotPlug);

    const auto slots = InPacketOrder(SlotList);
    ASSERT_EQ(slots.size(), 4u);
    EXPECT_EQ(slots[1]->BusNum, 10u);
    EXPECT_EQ(slots[1]->DrawerNum, 255u);
    EXPECT_EQ(slots[3]->BusNum, 0u);
    EXPECT_EQ(slots[3]->DrawerNum, 0u);
    EXPECT_EQ(Tree.Log(),
              "velhlib, XRefDescriptors():  Slot with ID 9 associated with an invalid bus\n");
}

TEST_F(AslStoreTest, XRefGivesChassisAndDrawersTheirOwnBusses) {
    AslBuilder packet;
    packet.Header()
        .String(0, "Chassis")
        .String(1, "Drawer")
        .Chassis(0, 0)
        .Drawer(0, 1)
        .Chassis(1, 9)  // no string 9, no busses
        .Bus({1, 0, 255, 1})
        .Bus({2, 0, 255, 2})  // no slots
        .Bus({3, 0, 0, 3})
        .Bus({4, 1, 0, 4})  // in drawer 0, though of chassis 1
        .Slot({9, 1})
        .Slot({12, 1})
        .Slot({4, 3})
        .Slot({2, 4})
        .End();
    Store(packet);
    const auto systems = InPacketOrder(SystemList);
    ASSERT_EQ(systems.size(), 3u);
    EXPECT_EQ(systems[0]->FirstSlotNum, 9u);
    EXPECT_EQ(systems[0]->UnitSlotCount, 2u);
    EXPECT_EQ(systems[1]->FirstSlotNum, 2u);
    EXPECT_EQ(systems[1]->UnitSlotCount, 2u);
    EXPECT_EQ(systems[2]->FirstSlotNum, NONE_VALUE);
    EXPECT_EQ(systems[2]->UnitSlotCount, 0u);
    EXPECT_EQ(systems[2]->Name, L"");
    EXPECT_EQ(Tree.Log(),
              "\nVELHLIB, XRefAsl():  System 2 names string 9, which the packet does not hold\n");
}
