#include "hw/aslstore.h"

#include <gtest/gtest.h>

#include <string>

#include "aslbuilder.h"
#include "diag/hwdebug.h"
#include "diag/hwdump.h"
#include "model/hwobjects.h"
#include "scratchdir.h"

namespace {

class AslStoreTest : public ::testing::Test {
  protected:
    void TearDown() override { Clear(); }
    static void Clear() {
        HwInfoPrintLevel = 0;
        SystemList.DestroyAll();
        BusList.DestroyAll();
        SlotList.DestroyAll();
    }
    InstallTree Tree;
};

// The address of byte `offset` of a packet, as the log shows it.
uint32_t Address(const _ASL_PACKET* packet, size_t offset) {
    return static_cast<uint32_t>(reinterpret_cast<uintptr_t>(packet) + offset);
}

}  // namespace

// Each packet is stored at a trace level; the log then holds the trace, the errors and a dump
// of every system, bus and slot object, exactly as the data file has them.
TEST_F(AslStoreTest, StoredObjectsTracesAndErrors) {
    struct Case {
        uint32_t Level;
        AslBuilder Packet;
        const char* Log;
    };
    const Case cases[] = {
        // Valid systems are numbered together; the later string of a number wins, even after
        // the system that names it. Slots take their bus's location; a bus learns its slots'
        // range, count and hot plug support (from any of them); a drawer owns the busses of its
        // drawer, a chassis those in no drawer.
        {0,
         AslBuilder()
             .Header()
             .String(1, "Old name")
             .Chassis(0, 1)
             .Chassis(5, 2)
             .Invalid()
             .Drawer(0, 2)
             .Chassis(1, 9)  // no string 9, no busses
             .String(2, "Drawer")
             .String(1, "Chassis")
             .Bus({1, 0, 255, 10})
             .Bus({2, 0, 255, 20})  // no slots
             .Bus({3, 0, 0, 30})
             .Bus({4, 1, 0, 40})  // in drawer 0, though of chassis 1
             .Slot({9, 1})
             .Slot({7, 1, 1, 1, 0x01})  // hot plug
             .Slot({12, 1})
             .Slot({4, 3})
             .Slot({2, 4})
             .Slot({5, 6})  // no such bus
             .End(),
         "aslstore-systems.log"},
        // Speed codes 0, 1, 5, 6, 7 and the unknown 2 and 9.
        {0,
         AslBuilder()
             .Header()
             .Bus({0, 0, 255, 0, 0, 1, 2, 3, 4, 5})
             .Bus({1, 0, 255, 1, 1, 1, 2, 3, 4, 5})
             .Bus({2, 0, 255, 2, 5, 1, 2, 3, 4, 5})
             .Bus({3, 0, 255, 3, 6, 1, 2, 3, 4, 5})
             .Bus({4, 0, 255, 4, 7, 1, 2, 3, 4, 5})
             .Bus({5, 0, 255, 5, 2, 1, 2, 3, 4, 5})
             .Bus({6, 0, 255, 6, 9, 1, 2, 3, 4, 5})
             .End(),
         "aslstore-bus-speeds.log"},
        // An unknown type or a length of 0 ends the walk; what was stored stays and is linked.
        {0, AslBuilder().Header().Bus({1, 0, 255, 7}).Slot({4, 1}).Raw({0x55}).Chassis(0, 0).End(),
         "aslstore-unknown-type.log"},
        {0,
         AslBuilder()
             .Header()
             .String(0, "Main")
             .Chassis(0, 0)
             .Bus({1})
             .Slot({4, 1})
             .Length(0)
             .End(),
         "aslstore-malformed.log"},
        // Slot attribute bits and fields; the invalid slot is not stored.
        {TRACE_STORE_ASL,
         AslBuilder()
             .Header()
             .Bus({0x12, 1, 255, 0x20, 6, 1, 2, 3, 4, 5})
             .Slot({0x1234, 0x12, 9, 2, 0x05, 0x03, 0x11, 0x18, 0x08, 6})
             .Slot({2, 0x12, 1, 255, 0xFA, 0x84, 0, 0, 0xF7, 0})
             .Slot({3, 0x12})
             .Invalid()
             .End(),
         "aslstore-bus-slot-trace.log"},
        {TRACE_STORE_SYSTEM | TRACE_STORE_STRING | TRACE_XREF_ASL,
         AslBuilder()
             .Header()
             .Chassis(0, 1)
             .Drawer(2, 1)
             .String(1, "D")
             .Bus({5, 0, 2, 8})
             .Bus({7, 0, 255, 9})
             .Slot({6, 5, 1, 1, 1})
             .End(),
         "aslstore-store-xref-trace.log"},
    };
    for (const Case& c : cases) {
        ResetDebugOut();
        HwInfoPrintLevel = c.Level;
        StoreAslTable(c.Packet.Packet().get(), static_cast<uint32_t>(c.Packet.Size()));
        HwInfoPrintLevel = 0;
        DumpSystems();
        DumpBusses();
        DumpSlots();
        EXPECT_EQ(Tree.Log(), TestData(c.Log)) << c.Log;
        Clear();
    }
}

TEST_F(AslStoreTest, ParseTraceAndAPacketWithoutSignature) {
    HwInfoPrintLevel = TRACE_PARSE;
    AslBuilder packet;
    packet.Header().Bus({1}).String(0, "x").End();
    auto buffer = packet.Packet();
    StoreAslTable(buffer.get(), static_cast<uint32_t>(packet.Size()));
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
                  Address(buffer.get(), 16), Address(buffer.get(), 32), Address(buffer.get(), 36));
    EXPECT_EQ(Tree.Log(), expected);

    Clear();
    ResetDebugOut();
    packet.Bytes[0] = 'X';
    buffer = packet.Packet();
    StoreAslTable(buffer.get(), static_cast<uint32_t>(packet.Size()));
    DumpBusses();  // none stored
    std::snprintf(expected, sizeof(expected),
                  "\nvelhlib, StoreAslTable():  Packet at 0x%08x is not an ASL packet\n\n",
                  Address(buffer.get(), 0));
    EXPECT_EQ(Tree.Log(), expected);
}
