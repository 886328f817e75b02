#include <gtest/gtest.h>

#include "OxQelLib/schema/OxQelIndexDef.h"
#include "OxQelLib/schema/OxQelTableDef.h"

namespace {
OxQelFieldDef field(const std::wstring& name, OxQel::FieldType type = OxQel::Integer) {
    OxQelFieldDef f;
    f.setFieldName(name);
    f.setFieldType(type);
    return f;
}

TEST(FieldDefTest, DefaultsAndMask) {
    OxQelFieldDef f;
    EXPECT_EQ(f.getFieldType(), OxQel::Unknown);
    EXPECT_EQ(f.getFieldSize(), 0);
    EXPECT_FALSE(f.getCanBeNull());
    EXPECT_TRUE(f.getIsPropertyToGet(OxQelFieldDef::DefaultValue));  // no mask: everything
    f.setIsPropertiesToGetPtr(OxQelFieldDef::IsPropertiesToGetNothing);
    EXPECT_FALSE(f.getIsPropertyToGet(OxQelFieldDef::Name));
    const bool custom[6] = {true, false, false, true, false, false};
    f.setIsPropertiesToGetPtr(custom);
    OxQelFieldDef copy = f;  // the copy shares the mask pointer
    EXPECT_TRUE(copy.getIsPropertyToGet(OxQelFieldDef::DefaultValue));
    EXPECT_FALSE(copy.getIsPropertyToGet(OxQelFieldDef::CanBeNull));
}

TEST(FieldDefArrayTest, LookupIgnoresCase) {
    OxQelFieldDefArray fields;
    fields.push_back(field(L"Name"));
    fields.push_back(field(L"name", OxQel::WString));
    fields.push_back(field(L"\u00c9t\u00e9"));
    EXPECT_EQ(fields.getIndex(L"NAME"), 0);
    EXPECT_EQ(fields.getIndex(L"\u00e9T\u00c9"), 2);
    EXPECT_EQ(fields.getIndex(L"missing"), -1);
    EXPECT_EQ(OxQelFieldDefArray().getIndex(L"x"), -1);
    EXPECT_EQ(fields.getByFieldName(L"missing").getFieldType(), OxQel::Unknown);
    EXPECT_EQ(fields.getByFieldName(L"name").getFieldType(), OxQel::Integer);
}

TEST(FieldDefArrayTest, CopiesDropTheMaskPointerButKeepTheOwnMask) {
    OxQelFieldDefArray fields;
    fields.push_back(field(L"a"));
    fields.getOwnMask()[2] = true;
    fields.setIsPropertiesToGetPtr(fields.getOwnMask());
    OxQelFieldDefArray copy(fields);
    EXPECT_EQ(copy.getIsPropertiesToGetPtr(), nullptr);
    EXPECT_TRUE(copy.getOwnMask()[2]);
    EXPECT_EQ(copy.size(), 1u);
    OxQelFieldDefArray assigned;
    assigned.setIsPropertiesToGetPtr(OxQelFieldDef::IsPropertiesToGetAll);
    assigned = fields;
    EXPECT_EQ(assigned.getIsPropertiesToGetPtr(), nullptr);
    EXPECT_TRUE(assigned.getOwnMask()[2]);
}

TEST(IndexDefTest, FieldsInKeyOrder) {
    OxQelIndexDef index;
    EXPECT_EQ(index.getListFieldInString(), L"");
    index.addFieldName(L"b");
    EXPECT_EQ(index.getListFieldInString(), L"b");
    index.addFieldName(L"a");
    index.addFieldName(L"c");
    EXPECT_EQ(index.getListFieldInString(), L"b,a,c");
    std::wstring name = L"unchanged";
    EXPECT_FALSE(index.getFieldNameAt(3, name));
    EXPECT_EQ(name, L"unchanged");
    EXPECT_TRUE(index.getFieldNameAt(1, name));
    EXPECT_EQ(name, L"a");
    OxQelIndexDef copy = index;
    copy.addFieldName(L"d");
    EXPECT_EQ(index.getFieldCount(), 3u);
}

TEST(TableDefTest, CopiesCarryTheColumns) {
    OxQelTableDef table;
    EXPECT_EQ(table.getTableType(), OxQelTableDef::Unknown);
    table.setTableName(L"t");
    table.setTableType(OxQelTableDef::View);
    table.getFields().push_back(field(L"x"));
    std::vector<OxQelTableDef> tables{table};
    tables[0].getFields().push_back(field(L"y"));
    EXPECT_EQ(table.getFields().size(), 1u);
    EXPECT_EQ(tables[0].getFields().size(), 2u);
    EXPECT_EQ(OxQelTableDef::Table | OxQelTableDef::View, 6);
    EXPECT_EQ(OxQelTableDef::AllTypes & OxQelTableDef::Unknown, 0);
}
}  // namespace
