#include <gtest/gtest.h>

#include <vector>

#include "model/hwobjects.h"

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

// Newest first; deleting the object just handed out (or the head under the cursor, or one not
// listed) lets the enumeration go on with the following one.
TEST(ObjListTemp, EnumerationOrderAndDeletingDuringIt) {
    ObjListTemp<int> list;
    int a = 1, b = 2, c = 3, stranger = 4;
    EXPECT_EQ(Drain(list), std::vector<int*>{});
    for (int* object : {&a, &b, &c}) {
        list.Add(object);
    }
    EXPECT_EQ(Drain(list), (std::vector<int*>{&c, &b, &a}));
    EXPECT_EQ(list.Next(), nullptr);  // and stays so after the end
    list.BeginEnumeration();
    EXPECT_EQ(list.Next(), &c);
    EXPECT_EQ(list.Next(), &b);
    list.Delete(&b);
    list.Delete(&stranger);
    EXPECT_EQ(list.Next(), &a);
    list.Delete(&a);
    EXPECT_EQ(list.Next(), nullptr);
    EXPECT_EQ(Drain(list), (std::vector<int*>{&c}));
    list.Add(&b);
    list.BeginEnumeration();
    list.Delete(&b);
    EXPECT_EQ(list.Next(), &c);
    EXPECT_EQ(list.Next(), nullptr);
}

// The copy owns its own module name: freeing one never frees the other's.
TEST(AdapterDescriptor, CopyAssignmentDuplicatesTheModuleName) {
    AdapterDescriptor source;
    source.ModuleName = DupHeapCString("e1000");
    AdapterDescriptor target;
    target.ModuleName = DupHeapCString("old");
    target = source;
    ASSERT_NE(target.ModuleName, nullptr);
    EXPECT_STREQ(target.ModuleName.get(), "e1000");
    EXPECT_NE(target.ModuleName.get(), source.ModuleName.get());
    target = AdapterDescriptor();
    EXPECT_EQ(target.ModuleName, nullptr);
}
