// StoreAslTable, with the cross-reference it calls, over arbitrary bytes (at most one buffer's
// worth) in a packet buffer of the size every producer writes into. Bit 0 of the header's first
// reserved byte (ignored by the reader) switches every storing trace on, so that the trace lines
// are formatted from the same bytes; bit 1 dumps the packet, raw and decoded, first.
#include <sanitizer/asan_interface.h>

#include "asl.h"
#include "fuzz/fuzzsupport.h"
#include "hw/aslstore.h"
#include "sources/asldump.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static auto* packet = new _ASL_PACKET;
    const InputScope input;
    const auto delivered = static_cast<uint32_t>(std::min(size, sizeof(_ASL_PACKET)));
    auto* bytes = reinterpret_cast<uint8_t*>(packet);
    std::copy(data, data + delivered, bytes);
    // The reader is told how many bytes arrived and must not look past them: the rest of the
    // buffer is poisoned, so that any read of it stops the run.
    std::fill(bytes + delivered, bytes + sizeof(_ASL_PACKET), 0xA0);
    ASAN_POISON_MEMORY_REGION(bytes + delivered, sizeof(_ASL_PACKET) - delivered);
    const uint8_t switches = delivered > sizeof(_ASL_TABLE_HEADER) ? packet->Header.Reserved[0] : 0;
    if ((switches & 1) != 0) {
        HwInfoPrintLevel = TRACE_PARSE | TRACE_STORE_ASL | TRACE_XREF_ASL | TRACE_STORE_SYSTEM |
                           TRACE_STORE_BUS | TRACE_STORE_SLOT | TRACE_STORE_STRING;
    }
    if ((switches & 2) != 0) {
        HwInfoPrintLevel |= RAW_ASL;
        DumpRawAslPacket(packet, delivered);
        DumpAslPacket(packet, delivered);
    }
    StoreAslTable(packet, delivered);
    ASAN_UNPOISON_MEMORY_REGION(bytes, sizeof(_ASL_PACKET));
    return 0;
}
