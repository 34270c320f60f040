#include "model/hwobjects.h"

#include <cstring>

ObjListTemp<SystemDescriptor> SystemList;
ObjListTemp<BusDescriptor> BusList;
ObjListTemp<SlotDescriptor> SlotList;
ObjListTemp<AdapterDescriptor> AdapterList;
ObjListTemp<AdapterDescriptor> FileAdapters;
uint32_t AdapterIndex = 0;

HeapCString DupHeapCString(const char* text) {
    if (text == nullptr) {
        return nullptr;
    }
    size_t size = std::strlen(text) + 1;
    HeapCString copy(new (std::nothrow) char[size]);
    if (copy) {
        std::memcpy(copy.get(), text, size);
    }
    return copy;
}

AdapterDescriptor& AdapterDescriptor::operator=(const AdapterDescriptor& other) {
    if (this == &other) {
        return *this;
    }
    AdapterID = other.AdapterID;
    FriendlyNum = other.FriendlyNum;
    SlotID = other.SlotID;
    BusID = other.BusID;
    Name = other.Name;
    PciId = other.PciId;
    Driver = other.Driver;
    MaxSpeed = other.MaxSpeed;
    PowerReq = other.PowerReq;
    Width = other.Width;
    HasBridge = other.HasBridge;
    IsBootDev = other.IsBootDev;
    SupPciX = other.SupPciX;
    OnBoard = other.OnBoard;
    Bus = other.Bus;
    Device = other.Device;
    Function = other.Function;
    ModuleName = DupHeapCString(other.ModuleName.get());
    std::memcpy(ConfigSpace, other.ConfigSpace, sizeof ConfigSpace);
    return *this;
}
