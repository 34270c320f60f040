// The hardware object model: systems, busses, slots and adapters, and the global lists that
// hold them. Lists never own their objects: whoever removes an object destroys it.
#pragma once

#include <cstdint>
#include <memory>
#include <new>
#include <string>

// A 32-bit field holding this value means none or unknown.
constexpr uint32_t NONE_VALUE = 0xFFFFFFFFu;
// Chassis and drawer numbers and slot FriendlyNum use 255 for none.
constexpr uint32_t NONE_BYTE = 255;
constexpr size_t PCI_CONFIG_SIZE = 256;

struct SystemDescriptor {
    uint32_t SystemID = 0;
    uint32_t StringID = 0;
    uint32_t ChassisNum = 0;
    uint32_t DrawerNum = 0;
    std::wstring Name;
    uint32_t ExpnDrawer = 0;
    uint32_t FirstSlotNum = 0;
    uint32_t UnitSlotCount = 0;
};

struct BusDescriptor {
    uint32_t BusID = 0;
    uint32_t FirstSlot = 0;
    uint32_t SlotCt = 0;
    uint32_t BusNum = 0;
    uint32_t ChassisNum = 0;
    uint32_t DrawerNum = 0;
    uint32_t LoadAt33 = 0;
    uint32_t LoadAt66 = 0;
    uint32_t LoadAtX66 = 0;
    uint32_t LoadAtX100 = 0;
    uint32_t LoadAtX133 = 0;
    uint32_t CurBusSpeed = 0;
    bool InPciXMode = false;
    bool SupHotPlug = false;
};

struct SlotDescriptor {
    uint32_t SlotID = 0;
    uint32_t BusID = 0;
    uint32_t BusNum = 0;
    uint32_t ChassisNum = 0;
    uint32_t DrawerNum = 0;
    uint32_t DevNum = 0;
    uint32_t FriendlyNum = 0;
    uint32_t Width = 0;
    uint32_t AttnReason = 0;
    uint32_t Status = 0;
    bool Sup5V = false;
    bool SupPME = false;
    bool SupSMBUS = false;
    bool SupHotPlug = false;
    bool PciX = false;
    uint32_t SpeedBits = 0;
    bool AttnLedBlinking = false;
    bool HalfLength = false;
    bool LowProfile = false;
    uint32_t SlotUiNumber = 0;
};

// A narrow heap string that may be null and is owned by exactly one holder.
using HeapCString = std::unique_ptr<char[]>;
HeapCString DupHeapCString(const char* text);

struct AdapterDescriptor {
    AdapterDescriptor() = default;
    AdapterDescriptor(const AdapterDescriptor&) = delete;
    // Copies every field; the module name is duplicated so that each adapter owns its own.
    AdapterDescriptor& operator=(const AdapterDescriptor& other);

    uint32_t AdapterID = NONE_VALUE;
    uint32_t FriendlyNum = NONE_VALUE;
    uint32_t SlotID = NONE_VALUE;
    uint32_t BusID = NONE_VALUE;
    std::wstring Name = L"<Unavailable>";
    std::wstring PciId = L"<Unavailable>";
    std::wstring Driver = L"<Unavailable>";
    uint32_t MaxSpeed = 33;
    uint32_t PowerReq = NONE_VALUE;
    uint32_t Width = 0;
    bool HasBridge = false;
    bool IsBootDev = false;
    bool SupPciX = false;
    bool OnBoard = true;
    uint32_t Bus = NONE_VALUE;
    uint32_t Device = NONE_VALUE;
    uint32_t Function = NONE_VALUE;
    HeapCString ModuleName;
    uint8_t ConfigSpace[PCI_CONFIG_SIZE] = {};
};

struct ObjListEntry {
    void* Object = nullptr;
    ObjListEntry* Next = nullptr;
};

// A singly linked list of non-owning references with one enumeration cursor. Add inserts at
// the front; an enumeration may delete the object it has just been handed and go on.
template <typename T>
class ObjListTemp {
  public:
    ObjListTemp() = default;
    ObjListTemp(const ObjListTemp&) = delete;
    ObjListTemp& operator=(const ObjListTemp&) = delete;
    ~ObjListTemp() {
        while (Head != nullptr) {
            ObjListEntry* next = Head->Next;
            delete Head;
            Head = next;
        }
    }

    int Add(T* object) {
        Insert(object);
        return 0;
    }

    // Add that tells whether the entry could be allocated, so a caller can keep ownership.
    bool Insert(T* object) {
        auto* entry = new (std::nothrow) ObjListEntry;
        if (entry == nullptr) {
            return false;
        }
        entry->Object = object;
        entry->Next = Head;
        Head = entry;
        return true;
    }

    void Delete(T* object) {
        for (ObjListEntry** link = &Head; *link != nullptr; link = &(*link)->Next) {
            ObjListEntry* entry = *link;
            if (entry->Object != object) {
                continue;
            }
            if (Cursor == &entry->Next) {
                Cursor = link;
            }
            *link = entry->Next;
            delete entry;
            return;
        }
    }

    int BeginEnumeration() {
        Cursor = &Head;
        return 0;
    }

    T* Next() {
        if (*Cursor == nullptr) {
            return nullptr;
        }
        ObjListEntry* entry = *Cursor;
        Cursor = &entry->Next;
        return static_cast<T*>(entry->Object);
    }

    // Enumerates the list, unlinking and destroying every object.
    void DestroyAll() {
        BeginEnumeration();
        while (T* object = Next()) {
            Delete(object);
            delete object;
        }
    }

  private:
    ObjListEntry* Head = nullptr;
    ObjListEntry** Cursor = &Head;
};

// Hands a new object to a list; the object is destroyed when the list has no room for it.
template <typename T>
T* AddOwned(ObjListTemp<T>& list, std::unique_ptr<T> object) {
    if (object == nullptr || !list.Insert(object.get())) {
        return nullptr;
    }
    return object.release();
}

extern ObjListTemp<SystemDescriptor> SystemList;
extern ObjListTemp<BusDescriptor> BusList;
extern ObjListTemp<SlotDescriptor> SlotList;
extern ObjListTemp<AdapterDescriptor> AdapterList;
extern ObjListTemp<AdapterDescriptor> FileAdapters;
extern uint32_t AdapterIndex;
