// The inventory builders in a faked JNI environment: what a real JVM cannot provoke (a failing
// JNI call, a list that grew since it was counted, a table larger than the local references a
// native method is given) and the exact JNI log. The end-to-end tests check the contents.
#include "agent/inventory.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "agent/jnilog.h"
#include "fake_jni.h"
#include "hwobjects.h"
#include "scratchdir.h"

namespace {

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

    FakeJni jni;
};

TEST_F(InventoryTest, StringsAreCutTo100UnitsAndKeepTheLow16BitsOfEachCharacter) {
    auto* system = new SystemDescriptor;
    system->Name = std::wstring(150, L'x');
    SystemList.Add(system);
    auto* adapter = new AdapterDescriptor;
    adapter->Driver = std::wstring(L"e\u00e9") + static_cast<wchar_t>(0x1F600);
    AdapterList.Add(adapter);
    CountInventories();

    EXPECT_EQ(FakeJni::Object(SystemNameInv(jni.Env()))->elements.at(0)->text,
              std::u16string(100, u'x'));
    EXPECT_EQ(FakeJni::Object(AdapterDriverInv(jni.Env()))->elements.at(0)->text,
              std::u16string(u"e\u00e9") + char16_t{0xF600});
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
    const struct {
        const char* what;
        FakeJni::Call failing;
        int at;
        jobjectArray (*build)(JNIEnv*);
    } cases[] = {
        {"class sample", FakeJni::NewLongArray, 1, BusNumInv},
        {"result", FakeJni::NewObjectArray, 1, BusNumInv},
        {"third element", FakeJni::NewLongArray, 4, BusNumInv},
        {"String class", FakeJni::FindClass, 1, SystemNameInv},
        {"empty string", FakeJni::NewStringUTF, 1, SystemNameInv},
        {"string result", FakeJni::NewObjectArray, 1, SystemNameInv},
        {"second string", FakeJni::NewString, 2, SystemNameInv},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        FakeJni failing;
        failing.FailAt[c.failing] = c.at;
        EXPECT_EQ(c.build(failing.Env()), nullptr);
        EXPECT_TRUE(failing.ExceptionPending);
        EXPECT_EQ(failing.CallsWithException, 0);
    }
}

TEST_F(InventoryTest, TheJniLogGetsTheOpeningAndOneLinePerElementInUtf8) {
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
    auto* adapter = new AdapterDescriptor;
    adapter->PciId.clear();
    // Two, three and four bytes of UTF-8; a lone surrogate and a code past Unicode's end.
    for (uint32_t code : {0xE9u, 0x20ACu, 0x1F600u, 0xD800u, 0x110000u}) {
        adapter->PciId += static_cast<wchar_t>(code);
    }
    AdapterList.Add(adapter);
    CountInventories();
    BusNumInv(jni.Env());
    SystemNameInv(jni.Env());
    AdapterPciIdInv(jni.Env());
    AdapterNumInv(jni.Env());
    {
        FakeJni failing;
        failing.FailAt[FakeJni::NewLongArray] = 2;
        SystemNumInv(failing.Env());
    }
    JniLogClose();
    EXPECT_EQ(tree.Scratch().Read("log/jni.log"), TestData("inventory-jni.log"));

    // Readable but not appendable (a folder, even for root): the log stays off.
    ASSERT_EQ(std::remove(tree.Scratch().Path("log/jni.log").c_str()), 0);
    ASSERT_EQ(mkdir(tree.Scratch().Path("log/jni.log").c_str(), 0700), 0);
    EXPECT_FALSE(JniLogOpen());
    EXPECT_FALSE(JniLogOn());
    JniLog("dropped\n");
}

}  // namespace
