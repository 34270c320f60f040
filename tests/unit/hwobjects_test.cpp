#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "hwobjects.h"

namespace {

std::vector<int*> Drain(ObjListTemp<int>& list) {
    std::vector<int*> seen;
    list.BeginEnumeration();
    while (int* object = list.Next()) {
        seen.push_back(object);
    }
    return seen;
}

}  // namespace

TEST(ObjListTemp, EnumeratesInReverseOrderOfAdding) {
    ObjListTemp<int> list;
    int a = 1, b = 2, c = 3;
    EXPECT_EQ(Drain(list), std::vector<int*>{});
    EXPECT_EQ(list.Next(), nullptr);
    list.Add(&a);
    list.Add(&b);
    list.Add(&c);
    EXPECT_EQ(Drain(list), (std::vector<int*>{&c, &b, &a}));
    // After the end, Next keeps answering null.
    EXPECT_EQ(list.Next(), nullptr);
    EXPECT_EQ(list.Next(), nullptr);
}

TEST(ObjListTemp, DeleteDuringEnumerationContinuesWithTheFollowingObject) {
    ObjListTemp<int> list;
    int a = 1, b = 2, c = 3, stranger = 4;
    list.Add(&a);
    list.Add(&b);
    list.Add(&c);
    list.BeginEnumeration();
    EXPECT_EQ(list.Next(), &c);
    EXPECT_EQ(list.Next(), &b);
    list.Delete(&b);
    list.Delete(&stranger);  // not listed: list and cursor unchanged
    EXPECT_EQ(list.Next(), &a);
    list.Delete(&a);  // the last object: the enumeration ends
    EXPECT_EQ(list.Next(), nullptr);
    EXPECT_EQ(Drain(list), (std::vector<int*>{&c}));

    // Deleting the head while the cursor rests on the head link.
    list.Add(&b);
    list.BeginEnumeration();
    list.Delete(&b);
    EXPECT_EQ(list.Next(), &c);
    EXPECT_EQ(list.Next(), nullptr);
}

// The copy owns its own module name: freeing one never frees the other's.
TEST(AdapterDescriptor, CopyAssignmentDuplicatesTheModuleName) {
    AdapterDescriptor source;
    source.AdapterID = 7;
    source.Name = L"Ethernet";
    source.ModuleName = DupHeapCString("e1000");
    source.ConfigSpace[0] = 0x86;
    source.OnBoard = false;
    AdapterDescriptor target;
    target.ModuleName = DupHeapCString("old");
    target = source;
    EXPECT_EQ(target.AdapterID, 7u);
    EXPECT_EQ(target.Name, L"Ethernet");
    EXPECT_FALSE(target.OnBoard);
    EXPECT_EQ(target.ConfigSpace[0], 0x86);
    ASSERT_NE(target.ModuleName, nullptr);
    EXPECT_STREQ(target.ModuleName.get(), "e1000");
    EXPECT_NE(target.ModuleName.get(), source.ModuleName.get());

    AdapterDescriptor none;
    target = none;
    EXPECT_EQ(target.ModuleName, nullptr);
}
