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
    const int count = ReadAdapterFile(input.FromStart());
    int listed = 0;
    FileAdapters.BeginEnumeration();
    while (const AdapterDescriptor* adapter = FileAdapters.Next()) {
        listed++;
        if (adapter->PciId.size() != 18 || adapter->Function > 7 || adapter->OnBoard) {
            Violated("a declared adapter holds a value its record cannot give");
        }
    }
    if (listed != count) {
        Violated("the count differs from the adapters declared");
    }
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
