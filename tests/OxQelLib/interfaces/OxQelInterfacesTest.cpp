#include <gtest/gtest.h>

#include <memory>

#include "OxQelLib/interfaces/OxQelConnectionDefault.h"
#include "OxQelLib/interfaces/OxQelIPreparedQuery.h"
#include "OxQelLib/interfaces/OxQelRecordsetDefault.h"

namespace {
// A backend that answers only formatBeforeExecute and execute, to watch the shared bodies.
class RecordingConnection : public OxQelConnectionDefault {
public:
    std::wstring formatBeforeExecute(const std::wstring& s) override { return L"<" + s + L">"; }
    bool execute(const std::wstring& s) override {
        executed.push_back(s);
        return true;
    }
    std::vector<std::wstring> executed;
};

TEST(InterfaceTest, SharedBodies) {
    RecordingConnection c;
    EXPECT_TRUE(c.formatAndExecute(L"SELECT 1"));
    ASSERT_EQ(c.executed.size(), 1u);
    EXPECT_EQ(c.executed[0], L"<SELECT 1>");

    OxObject2Array values;
    values.add(new OxObject2({L"1"}));
    OxArraySimple<StringCompare> strings{L"a"};
    std::wstring name = L"tmp";
    OxQelIConnection& base = c;
    EXPECT_FALSE(base.executeIn(L"DELETE FROM t WHERE id", values, 0, OxQel::Integer, 0));
    EXPECT_FALSE(base.createTemporaryTableFromObjectArray(name, values, 0, OxQel::Integer, 0));
    EXPECT_FALSE(base.createTemporaryTableFromStringArray(name, strings, OxQel::String, 0));
    EXPECT_FALSE(base.deleteTemporaryTable(name));
    EXPECT_EQ(base.getMaxInsertsAtOnce(), 1);
    EXPECT_EQ(c.executed.size(), 1u);  // none of them ran anything
}

TEST(InterfaceTest, RuntimeClassesAndCast) {
    OxQelConnectionDefault connection;
    std::unique_ptr<OxQelIRecordset> recordset(connection.createOxQelIRecordset());
    ASSERT_NE(recordset, nullptr);
    EXPECT_EQ(OxQelIConnection::cast(recordset.get()), nullptr);
    EXPECT_EQ(OxQelIConnection::cast(&connection), &connection);
    EXPECT_EQ(OxQelConnectionDefault::cast(&connection), &connection);
    EXPECT_EQ(OxQelIPreparedQuery::cast(&connection), nullptr);
    EXPECT_EQ(OxQelIConnection::cast(static_cast<OxRuntimeObject*>(nullptr)), nullptr);
    EXPECT_STREQ(OxQelIConnection::desc(), "OxQelIConnection");
    EXPECT_STREQ(OxQelConnectionDefault::desc(), "OxQelConnectionDefault");
    EXPECT_STREQ(connection.GetRuntimeClass()->baseClass()->m_lpszClassName, "OxQelIConnection");
    // The null recordset's record has the base object class for its base.
    EXPECT_STREQ(recordset->GetRuntimeClass()->baseClass()->m_lpszClassName, "OxRuntimeObject");
    EXPECT_EQ(OxQelRecordsetDefault::cast(recordset.get()), recordset.get());
    EXPECT_EQ(connection.compareTo(&connection), OxObject::NotComparable);
    EXPECT_EQ(connection.compareTo(recordset.get()), OxObject::NotComparable);
}

TEST(NullBackendTest, ConnectionAnswers) {
    OxQelConnectionDefault c;
    OxQelFieldDefArray fields;
    std::vector<OxQelTableDef> tables;
    std::vector<OxQelIndexDef> indexes;
    EXPECT_FALSE(c.openConnection(L"db", L"", L"", L""));
    EXPECT_FALSE(c.isOpen());
    EXPECT_FALSE(c.execute(L"SELECT 1"));
    EXPECT_FALSE(c.formatAndExecute(L"SELECT 1"));
    EXPECT_EQ(c.formatBeforeExecute(L"SELECT ]]x[["), L"");
    EXPECT_FALSE(c.getTableDef(tables, OxQelTableDef::AllTypes));
    EXPECT_FALSE(c.getFieldDef(L"t", L"*", fields));
    EXPECT_FALSE(c.getIndexDef(L"t", indexes));
    EXPECT_FALSE(c.startTransaction());
    EXPECT_EQ(c.getLastError(), OxQel::ErrorUnknown);
    EXPECT_EQ(c.createNewConnection(), nullptr);
    EXPECT_EQ(c.createOxQelIPrepraredQuery(), nullptr);
    EXPECT_TRUE(c.createFunctionNaturalSort());
    EXPECT_EQ(c.getNameFunctionNaturalSort(), L"");
    EXPECT_FALSE(c.canReadMultithread());
    EXPECT_FALSE(c.canWriteMultiThread());
    EXPECT_EQ(c.getMaxInsertsAtOnce(), 1);
    EXPECT_FALSE(c.attachTable(&c, L"a", L"b"));
    EXPECT_TRUE(c.getConnectionParameter().getDatabase().empty());
    std::unique_ptr<OxObject> clone(c.clone());
    EXPECT_NE(OxQelConnectionDefault::cast(clone.get()), nullptr);
}

TEST(NullBackendTest, RecordsetIsEmptyAndRefusesChanges) {
    OxQelConnectionDefault c;
    std::unique_ptr<OxQelIRecordset> rs(c.createOxQelIRecordset());
    EXPECT_FALSE(rs->openSQL(&c, L"SELECT 1"));
    int rows = 0;
    for (rs->moveFirst(); !rs->getEOF(); rs->moveNext()) ++rows;
    EXPECT_EQ(rows, 0);
    EXPECT_FALSE(rs->getBOF());
    EXPECT_EQ(rs->getRecordCount(), -1);
    EXPECT_EQ(rs->getFieldCount(), -1);
    EXPECT_EQ(rs->getFieldType(L"x"), OxQel::Unknown);
    EXPECT_EQ(rs->getFieldSize(0), -1);
    EXPECT_TRUE(rs->getlFieldValue(0).isEmpty());
    EXPECT_EQ(rs->getszFieldString(L"x"), L"");
    EXPECT_TRUE(rs->setSort(L"a DESC"));
    EXPECT_FALSE(rs->setFilter(OxVariant(L"a = 1")));
    auto* edit = dynamic_cast<OxQelIEditRecordset*>(rs.get());
    ASSERT_NE(edit, nullptr);
    EXPECT_FALSE(edit->addNew());
    EXPECT_FALSE(edit->setField(0, L"x"));
    EXPECT_FALSE(edit->setField(L"col", 5));
    EXPECT_FALSE(edit->update());
    EXPECT_NO_THROW(rs->close());
}
}  // namespace
