// The inventory builders in a faked JNI environment: what a real JVM cannot provoke (a failing
// JNI call, a list that grew since it was counted, a table larger than the local references a
// native method is given) and the exact JNI log. The end-to-end tests check the contents.
#include "agent/inventory.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "agent/jnilog.h"
#include "fake_jni.h"
#include "model/hwobjects.h"
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

// A large table, grown since it was counted; each JNI call that can fail, failing.
TEST_F(InventoryTest, ElementsStayWithinTheArrayAndTheLocalReferencesAndAFailedCallEndsTheBuild) {
    for (int i = 0; i < 5000; ++i) {
        SlotList.Add(new SlotDescriptor{});
        AdapterList.Add(new AdapterDescriptor);
    }
    CountInventories();
    SlotList.Add(new SlotDescriptor{});
    AdapterList.Add(new AdapterDescriptor);
    EXPECT_EQ(FakeJni::Object(SlotNumInv(jni.Env()))->elements.size(), 5000u);
    EXPECT_EQ(FakeJni::Object(AdapterNameInv(jni.Env()))->elements.size(), 5000u);
    EXPECT_EQ(jni.OutOfBounds, 0);
    // A JVM guarantees 16 local references to a native method.
    EXPECT_LE(jni.PeakLocalRefs, 16);

    const struct {
        const char* what;
        FakeJni::Call failing;
        int at;
        jobjectArray (*build)(JNIEnv*);
    } cases[] = {
        {"class sample", FakeJni::NewLongArray, 1, SlotNumInv},
        {"result", FakeJni::NewObjectArray, 1, SlotNumInv},
        {"third element", FakeJni::NewLongArray, 4, SlotNumInv},
        {"String class", FakeJni::FindClass, 1, AdapterNameInv},
        {"empty string", FakeJni::NewStringUTF, 1, AdapterNameInv},
        {"string result", FakeJni::NewObjectArray, 1, AdapterNameInv},
        {"second string", FakeJni::NewString, 2, AdapterNameInv},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        FakeJni failing;
        failing.FailAt[c.failing] = c.at;
        EXPECT_EQ(c.build(failing.Env()), nullptr);
        EXPECT_TRUE(failing.ExceptionPending);
        EXPECT_EQ(failing.CallsWithException, 0);
        EXPECT_EQ(failing.LiveLocalRefs, 0);
    }
}

// Java gets at most 100 units of a string, each the low 16 bits of a character; the log gets
// the whole string in UTF-8.
TEST_F(InventoryTest, StringsAndTheJniLogWithItsOpeningAndOneLinePerElement) {
    InstallTree tree;
    EXPECT_FALSE(JniLogOpen());  // The file is the switch.
    tree.Scratch().Write("log/jni.log", "");
    ASSERT_TRUE(JniLogOpen());

    auto* bus = new BusDescriptor{};
    bus->BusID = 5;
    bus->CurBusSpeed = NONE_VALUE;
    bus->SupHotPlug = true;
    BusList.Add(bus);
    auto* system = new SystemDescriptor;
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
    EXPECT_EQ(FakeJni::Object(SystemNameInv(jni.Env()))->elements.at(0)->text,
              u"Chassis %s " + std::u16string(89, u'n'));
    EXPECT_EQ(FakeJni::Object(AdapterPciIdInv(jni.Env()))->elements.at(0)->text,
              (std::u16string{0xE9, 0x20AC, 0xF600, 0xD800, 0}));
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
}

// Bytes that form UTF-8 reach Java decoded, cut after 100 characters without splitting a pair;
// any other text, Latin-1 or almost UTF-8, goes over byte for byte.
TEST(WcharToUnicodeTest, DecodesUtf8AndHandsOverOtherTextAsItIs) {
    const std::wstring a99(99, L'a');
    const std::wstring smile = L"\xF0\x9F\x98\x80";
    const struct {
        std::wstring text;
        std::u16string java;
    } cases[] = {
        {L"f\xC3\xBCr \xE2\x82\xAC", u"f\u00FCr \u20AC"},
        {L"f\xFCr", u"f\u00FCr"},
        {L"\xC3\xBC\xE2\x82", u"\u00C3\u00BC\u00E2\u0082"},  // cut short
        {L"\xC3\xBC\x80", u"\u00C3\u00BC\u0080"},            // a stray continuation
        {L"\xC3\u0180", u"\u00C3\u0180"},                    // a character, not a byte
        {L"\xC0\xAF", u"\u00C0\u00AF"},                      // overlong
        {L"\xED\xA0\x80", u"\u00ED\u00A0\u0080"},            // a surrogate
        {L"\xF4\x90\x80\x80", u"\u00F4\u0090\u0080\u0080"},  // past U+10FFFF
        {a99 + smile, std::u16string(99, u'a') + u"\U0001F600"},
        {a99 + L"a" + smile, std::u16string(100, u'a')},
        {L"\xEF\xBF\xBF", u"\uFFFF"},  // the last character of one unit
        {L"\xFC" + a99 + L"a", u"\u00FC" + std::u16string(99, u'a')},
    };
    for (const auto& c : cases) {
        const int units = WcharToUnicode(c.text.c_str());
        EXPECT_EQ(std::u16string(UTF16Buf, UTF16Buf + units), c.java) << c.java.size();
    }
}

}  // namespace
