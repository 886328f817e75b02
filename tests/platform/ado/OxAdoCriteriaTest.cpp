#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "platform/ado/OxAdoCriteria.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoSortOrder.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxText.h"

using namespace OxAdo;

namespace {
// A row of named, typed columns to run criteria against.
struct Row {
    std::vector<std::wstring> names;
    std::vector<int> types;
    std::vector<OxVariant> values;

    int columnOf(const std::wstring& n) const {
        for (size_t i = 0; i < names.size(); ++i)
            if (OxText::equalsNoCase(names[i], n))
                return static_cast<int>(i);
        return -1;
    }
};

Row sample() {
    return {{L"Name", L"Qty", L"Price", L"Born", L"Flag", L"Note", L"Big Id"},
            {adVarWChar, adInteger, adDouble, adDBTimeStamp, adBoolean, adVarWChar, adBigInt},
            {OxVariant(L"O'Brien"), OxVariant(int32_t{12}), OxVariant(2.5),
             OxVariant(OxDateTime(2020, 12, 31, 10, 0, 0)), OxVariant(true), OxVariant::null(),
             OxVariant(9007199254740993LL)}};
}

bool matches(const std::wstring& criteria, const Row& row = sample()) {
    OxAdoCriteria c = OxAdoCriteria::parse(criteria);
    c.bind([&](const std::wstring& n) { return row.columnOf(n); },
           [&](int i) { return row.types[static_cast<size_t>(i)]; });
    return c.matches([&](int i) -> const OxVariant& { return row.values[static_cast<size_t>(i)]; });
}

OxHResult errorOf(const std::wstring& criteria) {
    try {
        matches(criteria);
    } catch (const OxComError& e) {
        return e.Error();
    }
    return OxHr::S_OK;
}
}  // namespace

TEST(AdoCriteriaTest, ComparesByTheColumnsType) {
    // Texts without case, with the quote doubled inside the literal.
    EXPECT_TRUE(matches(L"Name = 'o''brien'"));
    EXPECT_FALSE(matches(L"Name <> 'O''Brien'"));
    EXPECT_TRUE(matches(L"Name > 'N'"));
    // Numbers by value, whatever the user's locale.
    EXPECT_TRUE(matches(L"Qty = 12"));
    EXPECT_TRUE(matches(L"Qty >= 12.0 AND Qty < 13"));
    EXPECT_TRUE(matches(L"Qty = '12'"));
    EXPECT_TRUE(matches(L"Price > 2.25"));
    // Big integers keep their last digit.
    EXPECT_TRUE(matches(L"[Big Id] = 9007199254740993"));
    EXPECT_FALSE(matches(L"[Big Id] = 9007199254740992"));
    // Dates in #...# and quotes; times count.
    EXPECT_TRUE(matches(L"Born > #2020-12-31#"));
    EXPECT_TRUE(matches(L"Born = '2020-12-31 10:00:00'"));
    EXPECT_TRUE(matches(L"Flag = TRUE"));
    EXPECT_TRUE(matches(L"Flag <> 0"));
}

TEST(AdoCriteriaTest, NullsAndLike) {
    EXPECT_TRUE(matches(L"Note = NULL"));
    EXPECT_TRUE(matches(L"Note IS NULL"));
    EXPECT_FALSE(matches(L"Note IS NOT NULL"));
    EXPECT_TRUE(matches(L"Name IS NOT NULL"));
    // A NULL value matches no comparison but the NULL tests.
    EXPECT_FALSE(matches(L"Note <> 'x'"));
    EXPECT_FALSE(matches(L"Note LIKE '*'"));

    EXPECT_TRUE(matches(L"Name LIKE 'o*'"));
    EXPECT_TRUE(matches(L"Name LIKE '%BRIEN'"));
    EXPECT_TRUE(matches(L"Name LIKE '*''b*'"));
    EXPECT_FALSE(matches(L"Name LIKE 'Bri*'"));
    EXPECT_TRUE(OxAdoCriteria::likeMatch(L"", L"*"));
    EXPECT_FALSE(OxAdoCriteria::likeMatch(L"abc", L"ab"));
    // Many wildcards against a long text end quickly.
    EXPECT_FALSE(OxAdoCriteria::likeMatch(std::wstring(3000, L'a'), L"*a*a*a*a*a*a*a*a*b"));
}

TEST(AdoCriteriaTest, GroupsWithAndOrAndParentheses) {
    EXPECT_TRUE(matches(L"(Qty = 1 OR Qty = 12) AND Name LIKE 'O*'"));
    EXPECT_FALSE(matches(L"Qty = 1 OR Qty = 2 OR Qty = 3"));
    // AND binds before OR.
    EXPECT_TRUE(matches(L"Qty = 12 OR Qty = 1 AND Name = 'x'"));
    EXPECT_FALSE(matches(L"(Qty = 12 OR Qty = 1) AND Name = 'x'"));

    // A long chain is not nested: no deep recursion.
    std::wstring chain = L"Qty = 0";
    for (int i = 1; i < 20000; ++i) chain += L" OR Qty = " + std::to_wstring(i);
    EXPECT_TRUE(matches(chain));
}

TEST(AdoCriteriaTest, BadCriteriaRaiseArgumentErrors) {
    const OxHResult invalid = hresultOf(adErrInvalidArgument);
    EXPECT_EQ(errorOf(L"Name = 'open"), invalid);
    EXPECT_EQ(errorOf(L"Name ="), invalid);
    EXPECT_EQ(errorOf(L"= 3"), invalid);
    EXPECT_EQ(errorOf(L"Name 'x'"), invalid);
    EXPECT_EQ(errorOf(L"(Qty = 1"), invalid);
    EXPECT_EQ(errorOf(L"Qty = 1)"), invalid);
    EXPECT_EQ(errorOf(L"Qty = abc"), invalid);
    EXPECT_EQ(errorOf(L"Born = #not a date#"), invalid);
    EXPECT_EQ(errorOf(L"Qty < NULL"), invalid);
    EXPECT_EQ(errorOf(L"Missing = 1"), hresultOf(adErrItemNotFound));
    // Parentheses nested beyond reason are refused, not followed into a stack overflow.
    EXPECT_EQ(errorOf(std::wstring(100000, L'(') + L"Qty = 1"), invalid);

    EXPECT_TRUE(OxAdoCriteria::parse(L"  ").empty());
    EXPECT_TRUE(OxAdoCriteria::parse(L"Qty = 1").isSingleComparison());
    EXPECT_FALSE(OxAdoCriteria::parse(L"Qty = 1 AND Qty = 2").isSingleComparison());
}

TEST(AdoCriteriaTest, ValuesOrderNullsFirstThenByKind) {
    EXPECT_LT(OxAdoCriteria::compareValues(OxVariant::null(), OxVariant(int32_t{-5})), 0);
    EXPECT_EQ(OxAdoCriteria::compareValues(OxVariant::null(), OxVariant()), 0);
    EXPECT_LT(OxAdoCriteria::compareValues(OxVariant(int32_t{2}), OxVariant(10.5)), 0);
    EXPECT_EQ(OxAdoCriteria::compareValues(OxVariant(L"abc"), OxVariant(L"ABC")), 0);
    EXPECT_LT(OxAdoCriteria::compareValues(OxVariant(false), OxVariant(true)), 0);
    EXPECT_LT(
        OxAdoCriteria::compareValues(OxVariant::fromBytes({1, 2}), OxVariant::fromBytes({1, 2, 0})),
        0);
}

TEST(AdoSortOrderTest, ParsesKeysAndDirections) {
    const OxAdoSortOrder s = OxAdoSortOrder::parse(L"a ASC, [b, c] DESC ,d,[e]desc");
    ASSERT_EQ(s.keys().size(), 4u);
    EXPECT_EQ(s.keys()[0].field, L"a");
    EXPECT_FALSE(s.keys()[0].descending);
    EXPECT_EQ(s.keys()[1].field, L"b, c");
    EXPECT_TRUE(s.keys()[1].descending);
    EXPECT_EQ(s.keys()[2].field, L"d");
    EXPECT_EQ(s.keys()[3].field, L"e");
    EXPECT_TRUE(s.keys()[3].descending);
    EXPECT_TRUE(OxAdoSortOrder::parse(L"").empty());
    for (const wchar_t* bad : {L"a,,b", L"[a", L"a]b", L"[]"})
        EXPECT_THROW(OxAdoSortOrder::parse(bad), OxComError) << bad;
}
