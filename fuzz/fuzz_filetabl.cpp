// The PCI architecture file: ReadFileTable over an arbitrary stream, into a packet buffer of
// the size the acquisition provides and into a small one that a few lines overflow; each
// packet built is then walked and stored as the acquisition would store it.
//
// Input: the file's content.
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <memory>

#include "asl.h"
#include "fuzz/fuzzsupport.h"
#include "hw/aslstore.h"
#include "hwobjects.h"
#include "sources/aslpacket.h"
#include "sources/filetabl.h"

namespace {

// A buffer that a table of a few lines fills: the reader's own bound is what keeps it inside.
constexpr uint32_t SMALL_BUFFER = 64;

class Nothing : public AslVisitor {
  public:
    void Visit(const AslDescriptor&) override {}
};

void ReadInto(InputStream& input, uint32_t capacity) {
    // On the heap and exactly `capacity` bytes long, so that a write past it is caught. It
    // starts with what an earlier table may have left there.
    std::unique_ptr<uint8_t[]> buffer(new uint8_t[capacity]);
    std::memset(buffer.get(), 0xA5, capacity);
    auto* packet = reinterpret_cast<_ASL_PACKET*>(buffer.get());
    uint32_t occupied = 0;
    const uint32_t count = ReadFileTable(input.FromStart(), packet, capacity, &occupied);

    if (count == 0 || occupied == 0 || occupied > capacity) {
        Violated("the packet built does not lie within the buffer");
    }
    if (buffer[occupied - 1] != END_TYPE) {
        Violated("the packet built does not end with the end marker");
    }
    // The reader writes only descriptors of known types with their true sizes, so the walk
    // over what it built must arrive at the end marker.
    Nothing nothing;
    if (WalkAslPacket(packet, occupied, nothing) != AslWalkEnd::EndMarker) {
        Violated("the walk does not reach the end marker of a packet built from a file");
    }

    StoreAslTable(packet, occupied);
    SystemList.DestroyAll();
    BusList.DestroyAll();
    SlotList.DestroyAll();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    StartInput();
    InputStream input(data, size);
    ReadInto(input, sizeof(_ASL_PACKET));
    ReadInto(input, SMALL_BUFFER);
    return 0;
}
