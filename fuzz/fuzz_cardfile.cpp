// ReadAdapterFile over an arbitrary card file, then the cross-reference and the merge against
// one slot and one discovered adapter, as the acquisition runs them.
#include "cardfile/cardfile.h"
#include "fuzz/fuzzsupport.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const InputScope input;
    ReadAdapterFile(InputStream(data, size));
    SlotList.Add(new SlotDescriptor{1, 2, 3, 0, 0, 4, 5});
    auto* found = new AdapterDescriptor;
    found->SlotID = 1;
    AdapterList.Add(found);
    XRefAdapterFile();
    MergeAdapterFile();
    return 0;
}
