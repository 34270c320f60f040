#include "adapters/linadapt.h"

#include <cctype>
#include <cstring>
#include <memory>

#include "adapters/cfgspace.h"
#include "adapters/moddriver.h"
#include "adapters/pciname.h"
#include "diag/checkedalloc.h"
#include "diag/hwdebug.h"
#include "model/hwobjects.h"
#include "util/parstool.h"
#include "util/sysaccess.h"

namespace {

constexpr const char* SEPARATOR = "******************************************************\n";

bool Tracing() {
    return (HwInfoPrintLevel & GET_ADAPTER) != 0;
}

void TraceEntry(const char* kind, const char* path) {
    if (Tracing()) {
        dbgprint(SEPARATOR);
        dbgprint("\n");
        dbgprint(kind, MakeWideString(path, WideBuffer));
    }
}

bool IsHexDigit(char c) {
    return std::isxdigit(static_cast<unsigned char>(c)) != 0;
}

// Current kernels name a bus of a PCI domain "0000:01": four hex digits, a colon, two more.
constexpr size_t DOMAIN_DIGITS = 4;
constexpr size_t BUS_DIGITS = 2;

bool IsDomainBus(const char* name) {
    const char* hex = "0123456789abcdefABCDEF";
    return std::strlen(name) == DOMAIN_DIGITS + 1 + BUS_DIGITS && name[DOMAIN_DIGITS] == ':' &&
           std::strspn(name, hex) == DOMAIN_DIGITS &&
           std::strspn(name + DOMAIN_DIGITS + 1, hex) == BUS_DIGITS;
}

// The BusID of the first bus object with this number, or none.
uint32_t BusIdOf(uint32_t busNum) {
    BusList.BeginEnumeration();
    while (BusDescriptor* bus = BusList.Next()) {
        if (bus->BusNum == busNum) {
            return bus->BusID;
        }
    }
    return NONE_VALUE;
}

// Reads one function and hands its adapter to AdapterList; false when it gets no adapter.
bool AddAdapter(const char* path, uint32_t busNum, uint32_t device, uint32_t function) {
    char config[PCI_CONFIG_SIZE] = {};
    const int length = GetPciConfig(path, 0, sizeof(config), config);
    if (length == 0) {
        return false;
    }
    std::unique_ptr<AdapterDescriptor> adapter = NewObject<AdapterDescriptor>("GetAdapterInfo()");
    if (adapter == nullptr) {
        return false;
    }
    adapter->AdapterID = AdapterIndex;
    adapter->Bus = busNum;
    adapter->Device = device;
    adapter->Function = function;
    const auto* image = reinterpret_cast<const _PCI_CONFIG0*>(config);
    StorePciConfig(image, adapter.get(), length);
    GetModuleName(adapter.get(), SysPaths().ProcBusPci.c_str());
    GetAdapterName(adapter.get(), image);
    GetDriverName(adapter.get());
    IsBootDevice(adapter.get());
    adapter->BusID = BusIdOf(busNum);
    if (AddOwned(AdapterList, std::move(adapter)) == nullptr) {
        ErrMsg("GetAdapterInfo()", "no memory to list the adapter of %S",
               MakeWideString(path, WideBuffer));
        return false;
    }
    ++AdapterIndex;
    return true;
}

void WalkBus(const char* directory, uint32_t busNum) {
    EnumDir files;
    _FILE_ATTRIBS file;
    while (files.Next(directory, "*", ATTR_FILE, &file)) {
        TraceEntry("File:  %s\n", file.EntryPath);
        uint32_t device = 0;
        uint32_t function = 0;
        if (!isAdapter(&file, &device, &function)) {
            continue;
        }
        if (Tracing()) {
            dbgprint("       %s  ==>  bus 0x%02x,  device, 0x%02x,  function 0x%02x\n",
                     MakeWideString(file.EntryPath, WideBuffer), busNum, device, function);
        }
        AddAdapter(file.EntryPath, busNum, device, function);
    }
}

}  // namespace

bool isBus(const _FILE_ATTRIBS* attribs, uint32_t* bus) {
    const char* name = attribs->EntryName;
    if (!IsHexDigit(name[0])) {
        return false;
    }
    // Any other name is read from its start, the text after its number ignored.
    if (IsDomainBus(name)) {
        name += DOMAIN_DIGITS + 1;
    }
    return ustrl(name, bus, 16);
}

bool isAdapter(const _FILE_ATTRIBS* attribs, uint32_t* device, uint32_t* function) {
    const char* name = attribs->EntryName;
    if (std::strlen(name) != 4 || name[2] != '.' || !IsHexDigit(name[0]) || !IsHexDigit(name[1]) ||
        !IsHexDigit(name[3])) {
        return false;
    }
    char devicePart[3] = {name[0], name[1], '\0'};
    return ustrl(devicePart, device, 16) && ustrl(name + 3, function, 16);
}

void GetAdapterInfo() {
    EnumDir busses;
    _FILE_ATTRIBS directory;
    while (busses.Next(SysPaths().ProcBusPci.c_str(), "*", ATTR_DIRECTORY, &directory)) {
        TraceEntry("Directory:  %s\n", directory.EntryPath);
        uint32_t busNum = 0;
        if (!isBus(&directory, &busNum)) {
            continue;
        }
        if (Tracing()) {
            dbgprint("            %s  ==>  bus 0x%02x\n",
                     MakeWideString(directory.EntryPath, WideBuffer), busNum);
            dbgprint("\n");
        }
        WalkBus(directory.EntryPath, busNum);
    }
    if (Tracing()) {
        dbgprint(SEPARATOR);
        dbgprint("\n");
    }
}
