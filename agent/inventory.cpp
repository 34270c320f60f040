#include "agent/inventory.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <memory>
#include <new>
#include <string>
#include <type_traits>

#include "agent/jnilog.h"
#include "agent/utf16.h"
#include "model/hwobjects.h"

jchar UTF16Buf[UTF16_BUF_UNITS];

int32_t BusInvCount = 0;
int32_t SlotInvCount = 0;
int32_t SystemInvCount = 0;
int32_t AdapterInvCount = 0;

namespace {

template <typename T>
int32_t CountList(ObjListTemp<T>& list) {
    int32_t count = 0;
    list.BeginEnumeration();
    while (list.Next() != nullptr) {
        ++count;
    }
    return count;
}

// A 32-bit field reaches Java zero-extended, so the none value arrives as 4294967295.
jlong Value(uint32_t field) {
    return static_cast<jlong>(field);
}
jlong Value(bool flag) {
    return flag ? 1 : 0;
}

template <typename Values>
void Store(const Values& values, jlong* out) {
    for (jlong value : values) {
        *out++ = value;
    }
}

constexpr jsize BUS_VALUES = 12;
constexpr jsize SLOT_VALUES = 18;
constexpr jsize SYSTEM_VALUES = 6;
constexpr jsize ADAPTER_VALUES = 12;

void FillBus(const BusDescriptor& bus, jlong* out) {
    const std::array values{Value(bus.BusID),       Value(bus.BusNum),     Value(bus.ChassisNum),
                            Value(bus.DrawerNum),   Value(bus.LoadAt33),   Value(bus.LoadAt66),
                            Value(bus.LoadAtX66),   Value(bus.LoadAtX100), Value(bus.LoadAtX133),
                            Value(bus.CurBusSpeed), Value(bus.InPciXMode), Value(bus.SupHotPlug)};
    static_assert(values.size() == BUS_VALUES);
    Store(values, out);
}

void FillSlot(const SlotDescriptor& slot, jlong* out) {
    const std::array values{
        Value(slot.SlotID),          Value(slot.BusID),      Value(slot.ChassisNum),
        Value(slot.DrawerNum),       Value(slot.DevNum),     Value(slot.FriendlyNum),
        Value(slot.Width),           Value(slot.AttnReason), Value(slot.Status),
        Value(slot.Sup5V),           Value(slot.SupPME),     Value(slot.SupSMBUS),
        Value(slot.SupHotPlug),      Value(slot.PciX),       Value(slot.SpeedBits),
        Value(slot.AttnLedBlinking), Value(slot.HalfLength), Value(slot.LowProfile)};
    static_assert(values.size() == SLOT_VALUES);
    Store(values, out);
}

void FillSystem(const SystemDescriptor& system, jlong* out) {
    const std::array values{Value(system.SystemID),     Value(system.StringID),
                            Value(system.ChassisNum),   Value(system.DrawerNum),
                            Value(system.FirstSlotNum), Value(system.UnitSlotCount)};
    static_assert(values.size() == SYSTEM_VALUES);
    Store(values, out);
}

void FillAdapter(const AdapterDescriptor& adapter, jlong* out) {
    const std::array values{
        Value(adapter.AdapterID), Value(adapter.SlotID),  Value(adapter.MaxSpeed),
        Value(adapter.PowerReq),  Value(adapter.Width),   Value(adapter.HasBridge),
        Value(adapter.IsBootDev), Value(adapter.SupPciX), Value(adapter.OnBoard),
        Value(adapter.BusID),     Value(adapter.Device),  Value(adapter.Function)};
    static_assert(values.size() == ADAPTER_VALUES);
    Store(values, out);
}

template <typename T>
struct NumericKind {
    ObjListTemp<T>& List;
    const int32_t& Count;
    jsize Length;
    void (*Fill)(const T& object, jlong* out);
    const char* Opening;
    const char* TempArrayFailed;
    const char* ResultFailed;
    const char* BufferFailed;
    const char* ElementFailed;  // null: no line
};

void LogLine(const char* line) {
    if (line != nullptr) {
        JniLog("%s", line);
    }
}

template <typename T>
jobjectArray BuildNumeric(JNIEnv* env, const NumericKind<T>& kind) {
    LogLine(kind.Opening);
    // An element array exists here only to name the class of the result's elements.
    jlongArray sample = env->NewLongArray(kind.Length);
    if (sample == nullptr) {
        LogLine(kind.TempArrayFailed);
        return nullptr;
    }
    jclass elementClass = env->GetObjectClass(sample);
    env->DeleteLocalRef(sample);
    if (elementClass == nullptr) {
        LogLine(kind.TempArrayFailed);
        return nullptr;
    }
    jobjectArray result = env->NewObjectArray(kind.Count, elementClass, nullptr);
    env->DeleteLocalRef(elementClass);
    if (result == nullptr) {
        LogLine(kind.ResultFailed);
        return nullptr;
    }
    std::unique_ptr<jlong[]> values(new (std::nothrow) jlong[kind.Length]);
    if (!values) {
        LogLine(kind.BufferFailed);
        env->DeleteLocalRef(result);
        return nullptr;
    }

    kind.List.BeginEnumeration();
    // The walk stops at the array's length even if the list has grown since it was counted.
    for (jsize index = 0; index < kind.Count; ++index) {
        const T* object = kind.List.Next();
        if (object == nullptr) {
            break;
        }
        jlongArray element = env->NewLongArray(kind.Length);
        if (element == nullptr) {
            LogLine(kind.ElementFailed);
            env->DeleteLocalRef(result);
            return nullptr;
        }
        std::fill_n(values.get(), kind.Length, 0);
        kind.Fill(*object, values.get());
        env->SetLongArrayRegion(element, 0, kind.Length, values.get());
        env->SetObjectArrayElement(result, index, element);
        // One local reference per element would run out on a large table.
        env->DeleteLocalRef(element);
        if (JniLogOn()) {
            PrintNumInv(values.get(), kind.Length);
        }
    }
    return result;
}

template <typename T>
struct StringKind {
    ObjListTemp<T>& List;
    const int32_t& Count;
    std::wstring T::*Field;
    const char* Opening;
    const char* ValueLine;  // one "%s" for the field's text
};

template <typename T>
jobjectArray BuildStrings(JNIEnv* env, const StringKind<T>& kind) {
    LogLine(kind.Opening);
    // After a failed call its exception is pending: no further JNI call is made but the
    // release of local references, which the JNI allows then.
    jclass stringClass = env->FindClass("java/lang/String");
    if (stringClass == nullptr) {
        return nullptr;
    }
    jstring empty = env->NewStringUTF("");
    jobjectArray result = nullptr;
    if (empty != nullptr) {
        result = env->NewObjectArray(kind.Count, stringClass, empty);
        env->DeleteLocalRef(empty);
    }
    env->DeleteLocalRef(stringClass);
    if (result == nullptr) {
        return nullptr;
    }

    kind.List.BeginEnumeration();
    for (jsize index = 0; index < kind.Count; ++index) {
        const T* object = kind.List.Next();
        if (object == nullptr) {
            break;
        }
        const std::wstring& text = object->*kind.Field;
        jstring value = env->NewString(UTF16Buf, WcharToUnicode(text.c_str()));
        if (value == nullptr) {
            env->DeleteLocalRef(result);
            return nullptr;
        }
        env->SetObjectArrayElement(result, index, value);
        env->DeleteLocalRef(value);
        if (JniLogOn()) {
            JniLog(kind.ValueLine, NarrowForLog(text.c_str()).c_str());
        }
    }
    return result;
}

}  // namespace

void CountInventories() {
    BusInvCount = CountList(BusList);
    SlotInvCount = CountList(SlotList);
    SystemInvCount = CountList(SystemList);
    AdapterInvCount = CountList(AdapterList);
}

int WcharToUnicode(const wchar_t* text) {
    static_assert(std::is_same<jchar, uint16_t>::value, "jchar is a 16-bit unit");
    std::fill(std::begin(UTF16Buf), std::end(UTF16Buf), 0);
    return TextToUtf16(text, UTF16Buf, UTF16_MAX_CHARS);
}

void PrintNumInv(const jlong* values, int count) {
    std::string line;
    for (int i = 0; i < count; ++i) {
        char number[16];
        std::snprintf(number, sizeof number, "*%d",
                      static_cast<int32_t>(static_cast<uint32_t>(values[i])));
        line += number;
    }
    line += '\n';
    JniLog("%s", line.c_str());
}

jobjectArray BusNumInv(JNIEnv* env) {
    return BuildNumeric<BusDescriptor>(
        env,
        {BusList, BusInvCount, BUS_VALUES, FillBus, "Bus Numeric Inventory \n",
         "getBusNumInv: Failed allocating tempArray \n",
         "getBusNumInv: Failed allocating result \n", "getBusNumInv: Failed allocating ulongbuf \n",
         "getBusNumInv: Failed allocating DescInfo \n"});
}

jobjectArray SlotNumInv(JNIEnv* env) {
    return BuildNumeric<SlotDescriptor>(
        env, {SlotList, SlotInvCount, SLOT_VALUES, FillSlot, "getSlotNumInv: Beginning \n",
              "getSlotNumInv: Failed allocating tempArray \n",
              "getSlotNumInv: Failed allocating result \n",
              "getSlotNumInv: Failed allocating ulongbuf \n",
              "getSlotNumInv: Failed allocating DescInfo \n"});
}

jobjectArray SystemNumInv(JNIEnv* env) {
    return BuildNumeric<SystemDescriptor>(
        env, {SystemList, SystemInvCount, SYSTEM_VALUES, FillSystem,
              "getSystemNumInv: Beginning \n", "getSystemNumInv: Failed allocating tempArray \n",
              "getSystemNumInv: Failed allocating result \n",
              "getSystemNumInv: Failed allocating ulongbuf \n",
              "ggetSystemNumInv: Failed allocating DescInfo \n"});
}

jobjectArray AdapterNumInv(JNIEnv* env) {
    return BuildNumeric<AdapterDescriptor>(
        env, {AdapterList, AdapterInvCount, ADAPTER_VALUES, FillAdapter,
              "getAdapterNumInv: Begining \n", "getAdapterNumInv: Failed allocating tempArray \n",
              "getAdapterNumInv: Failed allocating result \n",
              "getAdapterNumInv: Failed allocating ulongbuf \n", nullptr});
}

jobjectArray SystemNameInv(JNIEnv* env) {
    return BuildStrings<SystemDescriptor>(
        env, {SystemList, SystemInvCount, &SystemDescriptor::Name, "getSystemNameInv: Begining \n",
              "System Name=%s\n"});
}

jobjectArray AdapterNameInv(JNIEnv* env) {
    return BuildStrings<AdapterDescriptor>(
        env, {AdapterList, AdapterInvCount, &AdapterDescriptor::Name,
              "getAdapterNameInv: Beginning \n", "Adapter Name=%s \n"});
}

jobjectArray AdapterPciIdInv(JNIEnv* env) {
    return BuildStrings<AdapterDescriptor>(
        env, {AdapterList, AdapterInvCount, &AdapterDescriptor::PciId,
              "getAdapterPCIIDInv: Beginning \n", "Adapter PCI=%s \n"});
}

jobjectArray AdapterDriverInv(JNIEnv* env) {
    return BuildStrings<AdapterDescriptor>(
        env, {AdapterList, AdapterInvCount, &AdapterDescriptor::Driver,
              "getAdapterDriverInv: Beginning \n", "Adapter Driver=%s \n"});
}
