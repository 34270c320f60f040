#include "agent/inventory.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "agent/jnilog.h"
#include "fake_jni.h"
#include "hwobjects.h"
#include "scratchdir.h"

namespace {

constexpr jlong NONE = 4294967295LL;

class InventoryTest : public ::testing::Test {
  protected:
    void TearDown() override {
        JniLogClose();
        SystemList.DestroyAll();
        BusList.DestroyAll();
        SlotList.DestroyAll();
        AdapterList.DestroyAll();
        CountInventories();
    }

    static std::vector<std::vector<jlong>> Numbers(jobjectArray result) {
        std::vector<std::vector<jlong>> rows;
        for (FakeObject* element : FakeJni::Object(result)->elements) {
            rows.push_back(element == nullptr ? std::vector<jlong>{} : element->longs);
        }
        return rows;
    }

    static std::vector<std::u16string> Texts(jobjectArray result) {
        std::vector<std::u16string> texts;
        for (FakeObject* element : FakeJni::Object(result)->elements) {
            texts.push_back(element == nullptr ? u"<null>" : element->text);
        }
        return texts;
    }

    FakeJni jni;
};

TEST_F(InventoryTest, EveryInventoryIsEmptyBeforeAnyAcquisition) {
    CountInventories();
    for (auto build : {BusNumInv, SlotNumInv, SystemNumInv, AdapterNumInv}) {
        jobjectArray result = build(jni.Env());
        ASSERT_NE(result, nullptr);
        EXPECT_EQ(FakeJni::Object(result)->className, "[[J");
        EXPECT_TRUE(FakeJni::Object(result)->elements.empty());
    }
    for (auto build : {SystemNameInv, AdapterNameInv, AdapterPciIdInv, AdapterDriverInv}) {
        jobjectArray result = build(jni.Env());
        ASSERT_NE(result, nullptr);
        EXPECT_EQ(FakeJni::Object(result)->className, "[java/lang/String");
        EXPECT_TRUE(FakeJni::Object(result)->elements.empty());
    }
    EXPECT_EQ(jni.CallsWithException, 0);
}

TEST_F(InventoryTest, NumericElementsHoldTheFieldsInTheirOrderZeroExtended) {
    auto* system = new SystemDescriptor;
    system->SystemID = 21;
    system->StringID = 22;
    system->ChassisNum = 23;
    system->DrawerNum = 255;
    system->ExpnDrawer = 1;  // not exported
    system->FirstSlotNum = NONE_VALUE;
    system->UnitSlotCount = 24;
    SystemList.Add(system);
    auto* adapter = new AdapterDescriptor;
    adapter->AdapterID = 31;
    adapter->MaxSpeed = 133;
    adapter->Width = 64;
    adapter->HasBridge = true;
    adapter->IsBootDev = false;
    adapter->SupPciX = true;
    adapter->BusID = 32;
    adapter->Bus = 97;  // not exported
    adapter->Device = 33;
    adapter->Function = 0x80000001u;
    AdapterList.Add(adapter);
    CountInventories();

    // The busses' and slots' fields are checked against data by the end-to-end topology test.
    using Row = std::vector<jlong>;
    EXPECT_EQ(Numbers(SystemNumInv(jni.Env())), std::vector<Row>({{21, 22, 23, 255, NONE, 24}}));
    // An adapter in no slot: SlotID none and OnBoard set; a value with the top bit set stays
    // positive.
    EXPECT_EQ(Numbers(AdapterNumInv(jni.Env())),
              std::vector<Row>({{31, NONE, 133, NONE, 64, 1, 0, 1, 1, 32, 33, 0x80000001LL}}));
}

TEST_F(InventoryTest, ElementsFollowTheListAndAreDistinctArrays) {
    for (uint32_t id = 0; id < 3; ++id) {
        auto* bus = new BusDescriptor{};
        bus->BusID = id;
        BusList.Add(bus);
    }
    CountInventories();
    ASSERT_EQ(BusInvCount, 3);
    jobjectArray result = BusNumInv(jni.Env());
    const auto& elements = FakeJni::Object(result)->elements;
    ASSERT_EQ(elements.size(), 3u);
    EXPECT_NE(elements[0], elements[1]);
    // The list enumerates the last added first.
    EXPECT_EQ(elements[0]->longs[0], 2);
    EXPECT_EQ(elements[2]->longs[0], 0);
    // A second call builds new arrays with equal contents.
    jobjectArray again = BusNumInv(jni.Env());
    EXPECT_NE(FakeJni::Object(again)->elements[0], elements[0]);
    EXPECT_EQ(Numbers(again), Numbers(result));
}

TEST_F(InventoryTest, StringsAreCutTo100UnitsAndKeepTheLow16BitsOfEachCharacter) {
    auto* system = new SystemDescriptor;
    system->Name = std::wstring(150, L'x');
    SystemList.Add(system);
    auto* adapter = new AdapterDescriptor;
    adapter->Name = L"";
    adapter->PciId = L"8086:1229";
    adapter->Driver = std::wstring(L"e\u00e9") + static_cast<wchar_t>(0x1F600);
    AdapterList.Add(adapter);
    CountInventories();

    EXPECT_EQ(Texts(SystemNameInv(jni.Env())),
              std::vector<std::u16string>{std::u16string(100, u'x')});
    EXPECT_EQ(Texts(AdapterNameInv(jni.Env())), std::vector<std::u16string>{u""});
    EXPECT_EQ(Texts(AdapterPciIdInv(jni.Env())), std::vector<std::u16string>{u"8086:1229"});
    EXPECT_EQ(Texts(AdapterDriverInv(jni.Env())),
              std::vector<std::u16string>{std::u16string(u"e\u00e9") + char16_t{0xF600}});
}

TEST_F(InventoryTest, WcharToUnicodeClearsTheBufferAndReturnsTheLength) {
    EXPECT_EQ(WcharToUnicode(std::wstring(120, L'a').c_str()), 100);
    EXPECT_EQ(UTF16Buf[99], u'a');
    EXPECT_EQ(WcharToUnicode(L"bc"), 2);
    EXPECT_EQ(UTF16Buf[0], u'b');
    EXPECT_EQ(UTF16Buf[2], 0);
    EXPECT_EQ(UTF16Buf[99], 0);
    EXPECT_EQ(WcharToUnicode(L""), 0);
}

TEST_F(InventoryTest, LargeTablesDoNotPileUpLocalReferences) {
    for (int i = 0; i < 5000; ++i) {
        SlotList.Add(new SlotDescriptor{});
        AdapterList.Add(new AdapterDescriptor);
    }
    CountInventories();
    ASSERT_EQ(FakeJni::Object(SlotNumInv(jni.Env()))->elements.size(), 5000u);
    ASSERT_EQ(FakeJni::Object(AdapterNameInv(jni.Env()))->elements.size(), 5000u);
    // A JVM guarantees 16 local references to a native method.
    EXPECT_LE(jni.PeakLocalRefs, 16);
}

TEST_F(InventoryTest, AListLongerThanItsCountIsNotWrittenPastTheArray) {
    BusList.Add(new BusDescriptor{});
    SystemList.Add(new SystemDescriptor);
    CountInventories();
    BusList.Add(new BusDescriptor{});
    SystemList.Add(new SystemDescriptor);
    EXPECT_EQ(FakeJni::Object(BusNumInv(jni.Env()))->elements.size(), 1u);
    EXPECT_EQ(FakeJni::Object(SystemNameInv(jni.Env()))->elements.size(), 1u);
    EXPECT_EQ(jni.OutOfBounds, 0);
}

TEST_F(InventoryTest, AFailedJniCallGivesNullAndNoFurtherCall) {
    for (int i = 0; i < 3; ++i) {
        BusList.Add(new BusDescriptor{});
        SystemList.Add(new SystemDescriptor);
    }
    CountInventories();
    struct Case {
        const char* what;
        int FakeJni::*failure;
        int at;
        jobjectArray (*build)(JNIEnv*);
    };
    const Case cases[] = {
        {"class sample", &FakeJni::FailNewLongArray, 1, BusNumInv},
        {"result", &FakeJni::FailNewObjectArray, 1, BusNumInv},
        {"third element", &FakeJni::FailNewLongArray, 4, BusNumInv},
        {"String class", &FakeJni::FailFindClass, 1, SystemNameInv},
        {"empty string", &FakeJni::FailNewStringUTF, 1, SystemNameInv},
        {"string result", &FakeJni::FailNewObjectArray, 1, SystemNameInv},
        {"second string", &FakeJni::FailNewString, 2, SystemNameInv},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        FakeJni failing;
        failing.*c.failure = c.at;
        EXPECT_EQ(c.build(failing.Env()), nullptr);
        EXPECT_TRUE(failing.ExceptionPending);
        EXPECT_EQ(failing.CallsWithException, 0);
    }
}

TEST_F(InventoryTest, TheJniLogGetsTheOpeningAndOneLinePerElement) {
    InstallTree tree;
    tree.Scratch().Write("log/jni.log", "");
    ASSERT_TRUE(JniLogOpen());

    auto* bus = new BusDescriptor{};
    bus->BusID = 5;
    bus->CurBusSpeed = NONE_VALUE;
    bus->SupHotPlug = true;
    BusList.Add(bus);
    auto* system = new SystemDescriptor;
    // Longer than a Java string of the inventories holds: the log shows it whole.
    system->Name = L"Chassis %s " + std::wstring(150, L'n');
    SystemList.Add(system);
    AdapterList.Add(new AdapterDescriptor);
    CountInventories();
    BusNumInv(jni.Env());
    SystemNameInv(jni.Env());
    AdapterPciIdInv(jni.Env());
    AdapterNumInv(jni.Env());
    {
        FakeJni failing;
        failing.FailNewLongArray = 2;
        SystemNumInv(failing.Env());
    }
    JniLogClose();

    EXPECT_EQ(tree.Scratch().Read("log/jni.log"), TestData("inventory-jni.log"));
}

TEST_F(InventoryTest, TheJniLogIsOnlyOnWhenTheFileExists) {
    InstallTree tree;
    EXPECT_FALSE(JniLogOpen());
    EXPECT_FALSE(JniLogOn());
    JniLog("dropped\n");
    EXPECT_NE(access(tree.Scratch().Path("log/jni.log").c_str(), F_OK), 0);

    tree.Scratch().Write("log/jni.log", "old\n");
    ASSERT_TRUE(JniLogOpen());
    // A second switch-on keeps the open stream: each line is written once.
    ASSERT_TRUE(JniLogOpen());
    JniLog("line %d\n", 1);
    JniLogClose();
    EXPECT_FALSE(JniLogOn());
    JniLog("after close\n");
    EXPECT_EQ(tree.Scratch().Read("log/jni.log"), "old\nline 1\n");

    // Readable but not appendable (a folder, even for root): the log stays off.
    ASSERT_EQ(std::remove(tree.Scratch().Path("log/jni.log").c_str()), 0);
    ASSERT_EQ(mkdir(tree.Scratch().Path("log/jni.log").c_str(), 0700), 0);
    EXPECT_FALSE(JniLogOpen());
    EXPECT_FALSE(JniLogOn());
    JniLog("dropped\n");
}

TEST_F(InventoryTest, NarrowForLogWritesUtf8) {
    EXPECT_EQ(NarrowForLog(L"abc"), "abc");
    EXPECT_EQ(NarrowForLog(L"\u00e9\u20ac"), "\xc3\xa9\xe2\x82\xac");
    EXPECT_EQ(NarrowForLog(std::wstring(1, static_cast<wchar_t>(0x1F600)).c_str()),
              "\xf0\x9f\x98\x80");
    EXPECT_EQ(NarrowForLog(std::wstring(1, static_cast<wchar_t>(0xD800)).c_str()), "?");
    EXPECT_EQ(NarrowForLog(std::wstring(1, static_cast<wchar_t>(0x110000)).c_str()), "?");
}

}  // namespace
