#include "hw/hwinfo.h"

#include <memory>

#include "adapters/linadapt.h"
#include "asl.h"
#include "cardfile/cardfile.h"
#include "cardfile/spclcase.h"
#include "diag/hwdebug.h"
#include "hw/adapterxref.h"
#include "hw/aslstore.h"
#include "hw/busspeed.h"
#include "hwobjects.h"
#include "setup/linsetup.h"
#include "sources/filetabl.h"
#include "sources/linhw.h"
#include "util/debuglevel.h"

namespace {

void TraceAcquire(const char* line) {
    if ((HwInfoPrintLevel & TRACE_ACQUIRE) != 0) {
        dbgprint(line);
    }
}

// The lists never own their objects: the acquisition that empties them destroys them.
void EmptyLists() {
    SystemList.DestroyAll();
    BusList.DestroyAll();
    SlotList.DestroyAll();
    AdapterList.DestroyAll();
}

}  // namespace

bool StartHwInfo() {
    return true;
}

void StopHwInfo() {}

bool GetHwInfo() {
    ResetDebugOut();
    GetDebugPrintLevel(1);
    EmptyLists();
    AdapterIndex = 0;
    if (!StartHwInfo()) {
        return false;
    }
    SetupVelhSlot();

    // Both sources write into this one buffer; it lives for this call only.
    auto packet = std::make_unique<_ASL_PACKET>();
    TraceAcquire("GetHwInfo():  getting table from file\n");
    uint32_t size = GetFileTable(packet.get(), ASL_PACKET_CAPACITY);
    const bool fileTable = size != 0;
    if (fileTable) {
        TraceAcquire("GetHwInfo():  using PCI architecture file\n");
    } else {
        TraceAcquire("GetHwInfo():  getting ASL table\n");
        size = GetAslTable(packet.get());
        if (size == 0) {
            dbg("GetHwInfo()", "PCI architecture information is unavailable\n");
            StopHwInfo();
            return false;
        }
        TraceAcquire("GetHwInfo():  using PCI architecture ASL\n");
    }

    TraceAcquire("GetHwInfo():  storing PCI architecture table\n");
    StoreAslTable(packet.get(), size);

    TraceAcquire("GetHwInfo():  getting adapter info\n");
    GetAdapterInfo();
    XRefSlotAdapter();

    TraceAcquire("GetHwInfo():  getting adapter info file\n");
    if (GetAdapterFile() != 0) {
        TraceAcquire("GetHwInfo():  xrefing adapter file\n");
        XRefAdapterFile();
        TraceAcquire("GetHwInfo():  merging adapter file()\n");
        MergeAdapterFile();
    }

    TraceAcquire("GetHwInfo():  hardware info acquired\n");
    // Only a table from the file leaves the speeds to be worked out; the driver states them.
    if (fileTable) {
        TraceAcquire("GetHwInfo():  deriving bus speeds\n");
        DeriveCurrentBusSpeeds();
    }

    SpecialCaseSystems();
    SpecialCaseBusses();
    SpecialCaseSlots();
    SpecialCaseAdapters();
    StopHwInfo();
    return true;
}
