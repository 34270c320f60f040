// The ASL packet walk and storing: StoreAslTable over arbitrary bytes in a packet buffer of
// the size every producer writes into, then the cross-reference it calls.
//
// Input: the bytes the source delivered, at most one buffer's worth. Bit 0 of the header's
// first reserved byte (ignored by the reader) switches every storing trace on, so that the
// trace lines are formatted from the same bytes; bit 1 dumps the packet, raw and decoded, first.
#include <sanitizer/asan_interface.h>

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "asl.h"
#include "dbglevel.h"
#include "fuzz/fuzzsupport.h"
#include "hw/aslstore.h"
#include "hwobjects.h"
#include "sources/asldump.h"

namespace {

constexpr uint32_t STORE_TRACES = TRACE_PARSE | TRACE_STORE_ASL | TRACE_XREF_ASL |
                                  TRACE_STORE_SYSTEM | TRACE_STORE_BUS | TRACE_STORE_SLOT |
                                  TRACE_STORE_STRING;

_ASL_PACKET* Packet = nullptr;

}  // namespace

void SetUpHarness() {
    Packet = new _ASL_PACKET;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    StartInput();
    const auto delivered = static_cast<uint32_t>(std::min<size_t>(size, sizeof(_ASL_PACKET)));
    auto* bytes = reinterpret_cast<uint8_t*>(Packet);
    if (delivered > 0) {
        std::memcpy(bytes, data, delivered);
    }
    // The reader is told how many bytes arrived and must not look past them: the rest of the
    // buffer is poisoned, so that any read of it stops the run.
    std::memset(bytes + delivered, 0xA0, sizeof(_ASL_PACKET) - delivered);
    ASAN_POISON_MEMORY_REGION(bytes + delivered, sizeof(_ASL_PACKET) - delivered);
    if (delivered > sizeof(_ASL_TABLE_HEADER) && (Packet->Header.Reserved[0] & 1) != 0) {
        HwInfoPrintLevel = STORE_TRACES;
    }
    if (delivered > sizeof(_ASL_TABLE_HEADER) && (Packet->Header.Reserved[0] & 2) != 0) {
        HwInfoPrintLevel |= RAW_ASL;
        DumpRawAslPacket(Packet, delivered);
        DumpAslPacket(Packet, delivered);
    }

    StoreAslTable(Packet, delivered);

    ASAN_UNPOISON_MEMORY_REGION(bytes, sizeof(_ASL_PACKET));
    SystemList.DestroyAll();
    BusList.DestroyAll();
    SlotList.DestroyAll();
    return 0;
}
