// The card file: ReadAdapterFile over an arbitrary stream, then the cross-reference and the
// merge against one slot and one discovered adapter, as the acquisition runs them.
//
// Input: the file's content.
#include <cstdint>

#include "cardfile/cardfile.h"
#include "fuzz/fuzzsupport.h"
#include "hwobjects.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    StartInput();
    InputStream input(data, size);
    ReadAdapterFile(input.FromStart());
    SlotList.Add(new SlotDescriptor{1, 2, 3, 0, 0, 4, 5});
    auto* found = new AdapterDescriptor;
    found->SlotID = 1;
    AdapterList.Add(found);
    XRefAdapterFile();
    MergeAdapterFile();
    SlotList.DestroyAll();
    AdapterList.DestroyAll();
    return 0;
}
