// ReadFileTable over an arbitrary PCI architecture file, into a packet buffer of the size the
// acquisition provides and into a small one that a few lines fill; each packet built is then
// walked and stored as the acquisition would store it.
#include <memory>

#include "asl.h"
#include "fuzz/fuzzsupport.h"
#include "hw/aslstore.h"
#include "sources/aslpacket.h"
#include "sources/filetabl.h"

struct Nothing : AslVisitor {
    void Visit(const AslDescriptor&) override {}
};

static void ReadInto(FILE* input, uint32_t capacity) {
    const InputScope scope;
    // On the heap and exactly `capacity` bytes long, so that a write past it is caught. It
    // starts with what an earlier table may have left there.
    std::unique_ptr<uint8_t[]> buffer(new uint8_t[capacity]);
    std::memset(buffer.get(), 0xA5, capacity);
    auto* packet = reinterpret_cast<_ASL_PACKET*>(buffer.get());
    uint32_t occupied = 0;
    std::rewind(input);
    Check(ReadFileTable(input, packet, capacity, &occupied) != 0 && occupied != 0 &&
              occupied <= capacity && buffer[occupied - 1] == END_TYPE,
          "the packet built does not lie within the buffer or lacks the end marker");
    // The reader writes only descriptors of known types with their true sizes, so the walk
    // over what it built must arrive at the end marker.
    Nothing nothing;
    Check(WalkAslPacket(packet, occupied, nothing) == AslWalkEnd::EndMarker,
          "the walk does not reach the end marker of a packet built from a file");
    StoreAslTable(packet, occupied);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    FILE* input = InputStream(data, size);
    ReadInto(input, sizeof(_ASL_PACKET));
    ReadInto(input, 64);
    return 0;
}
