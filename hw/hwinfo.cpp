#include "hw/hwinfo.h"

#include <memory>

#include "adapters/adapterdump.h"
#include "adapters/linadapt.h"
#include "asl.h"
#include "cardfile/cardfile.h"
#include "cardfile/spclcase.h"
#include "diag/checkedalloc.h"
#include "diag/hwdebug.h"
#include "diag/hwdump.h"
#include "hw/adapterxref.h"
#include "hw/aslstore.h"
#include "hw/busspeed.h"
#include "model/hwobjects.h"
#include "setup/linsetup.h"
#include "sources/asldump.h"
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

// The dumps the debug level asks for once the lists are complete.
void DumpResults() {
    if ((HwInfoPrintLevel & DUMP_AGENT_STATS) != 0) {
        DumpAgentStats(&AgentStatistics, L"After hardware collection");
    }
    if ((HwInfoPrintLevel & DUMP_SYSTEMS) != 0) {
        DumpSystems();
    }
    if ((HwInfoPrintLevel & DUMP_BUSSES) != 0) {
        DumpBusses();
    }
    if ((HwInfoPrintLevel & DUMP_SLOTS) != 0) {
        DumpSlots();
    }
    if ((HwInfoPrintLevel & DUMP_ADAPTERS) != 0) {
        DumpAdapters();
    }
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
    std::unique_ptr<_ASL_PACKET> packet = NewObject<_ASL_PACKET>("GetHwInfo()");
    if (packet == nullptr) {
        StopHwInfo();
        return false;
    }
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

    if ((HwInfoPrintLevel & RAW_ASL) != 0) {
        DumpRawAslPacket(packet.get(), size);
    }
    if ((HwInfoPrintLevel & COOKED_ASL) != 0) {
        DumpAslPacket(packet.get(), size);
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
    DumpResults();
    StopHwInfo();
    return true;
}
