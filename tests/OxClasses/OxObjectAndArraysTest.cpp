#include <gtest/gtest.h>

#include <memory>

#include "OxClasses/OxArray2.h"
#include "OxClasses/OxArraySimple.h"
#include "OxClasses/OxObject2.h"

namespace {
TEST(ObjectTest, RuntimeClassesAndCompare) {
    OxObject2 item({L"a"});
    OxObject plain;
    EXPECT_TRUE(item.IsKindOf(OxObject::GetThisClass()));
    EXPECT_FALSE(plain.IsKindOf(OxObject2::GetThisClass()));
    EXPECT_EQ(OxObject2::cast(&plain), nullptr);
    EXPECT_EQ(OxObject::cast(&item), &item);
    EXPECT_STREQ(OxObject2::desc(), "OxObject2");
    EXPECT_STREQ(item.GetRuntimeClass()->baseClass()->m_lpszClassName, "OxObject");
    EXPECT_EQ(item.compareTo(&plain), OxObject::NotComparable);
    EXPECT_EQ(item.compareTo(&item, 0, true), OxObject::NotComparable);
    std::unique_ptr<OxObject> copy(item.clone());
    ASSERT_NE(OxObject2::cast(copy.get()), nullptr);
    EXPECT_EQ(OxObject2::cast(copy.get())->getStringValue(0), L"a");
}

TEST(ArrayTest, JoinRuleWithChunks) {
    OxObject2Array values;
    for (int i = 0; i < 5; ++i)
        values.add(new OxObject2({L"k" + std::to_wstring(i), L"v" + std::to_wstring(i)}));
    EXPECT_EQ(values.getListValuesInString(1, L",", 2, L";"), L"v0,v1;v2,v3;v4");
    EXPECT_EQ(values.getListValuesInString(0, L",", 0, L";"), L"k0,k1,k2,k3,k4");
    EXPECT_EQ(values.getListValuesInString(7, L",", 0, L";"),
              L",,,,");  // a missing property is empty
    OxObject2Array empty;
    EXPECT_EQ(empty.getListValuesInString(0, L",", 2, L";"), L"");

    OxArraySimple<StringCompare> strings{L"a", L"b", L"c"};
    EXPECT_EQ(strings.getListValuesInString(L",", 1, L"|"), L"a|b|c");
    EXPECT_EQ(strings.getListValuesInString(L"-", 5, L"|"), L"a-b-c");
}

TEST(ArrayTest, CopiesOwnTheirElements) {
    OxObject2Array values;
    values.add(new OxObject2({L"x"}));
    OxObject2Array copy = values;
    copy.getAt(0)->setStringValue(0, L"changed");
    EXPECT_EQ(values.getAt(0)->getStringValue(0), L"x");
    EXPECT_EQ(copy.getAt(0)->getStringValue(0), L"changed");
}

TEST(ArrayTest, SimpleArraySortsAndFinds) {
    OxArraySimple<StringCompare> strings{L"b", L"a", L"c"};
    strings.sort();
    EXPECT_EQ(strings.getAt(0), L"a");
    EXPECT_EQ(strings.find(L"c"), 2);
    EXPECT_EQ(strings.find(L"z"), -1);
    EXPECT_THROW(strings.getAt(3), std::out_of_range);
}
}  // namespace
