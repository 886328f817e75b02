#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>

#include "OxQelLib/foundation/OxQelQueryText.h"
#include "OxQelLib/odbc/OdbcConnectionTest.h"
#include "platform/core/OxText.h"

namespace {
using Tables = std::vector<std::pair<std::wstring, OxQelTableDef::TableType>>;

Tables listed(OxQelConnectionODBC& c, OxQelTableDef::TableType mask) {
    std::vector<OxQelTableDef> defs;
    EXPECT_TRUE(c.getTableDef(defs, mask));
    Tables result;
    for (const auto& d : defs) result.emplace_back(d.getTableName(), d.getTableType());
    std::sort(result.begin(), result.end());
    return result;
}

[[maybe_unused]] bool has(const Tables& tables, const std::wstring& name,
                          OxQelTableDef::TableType type) {
    return std::find(tables.begin(), tables.end(), std::make_pair(name, type)) != tables.end();
}

#ifndef OXQEL_ODBC_TEST_SERVER
// The SQLite driver has no INFORMATION_SCHEMA: the standard query fails cleanly there, and
// runs on a catalogue the test attaches under that name. The database folder holds an
// apostrophe, which the query's literal must survive.
TEST(OdbcCatalogue, StandardQueryOnACatalogueOfTheTestsOwn) {
    OdbcTest::Env::get();
    OxTest::TempDir dir;
    const std::filesystem::path folder = dir.path() / "o'brien";
    std::filesystem::create_directories(folder);
    const std::wstring file = (folder / "cat.db").wstring();
    OxQelConnectionODBC c;
    ASSERT_TRUE(c.openConnection(file, L"DRIVER={SQLite3}", L"", L""));
    std::vector<OxQelTableDef> defs(1);
    {
        OdbcTest::Reports reports;
        EXPECT_FALSE(c.getTableDef(defs, OxQelTableDef::AllTypes));
        EXPECT_NE(reports.text().find(L"INFORMATION_SCHEMA"), std::wstring::npos);
    }
    EXPECT_TRUE(defs.empty());

    ASSERT_TRUE(c.execute(L"ATTACH DATABASE '" +
                          OxQel::Util::doubleApostrophes((folder / "is.db").wstring()) +
                          L"' AS INFORMATION_SCHEMA"));
    ASSERT_TRUE(
        c.execute(L"CREATE TABLE INFORMATION_SCHEMA.TABLES (TABLE_CATALOG TEXT, "
                  L"TABLE_SCHEMA TEXT, TABLE_NAME TEXT, TABLE_TYPE TEXT)"));
    const std::wstring db = OxQel::Util::doubleApostrophes(file);
    for (const std::wstring& row : std::vector<std::wstring>{
             L"'" + db + L"', 'main', 'T1', 'BASE TABLE'", L"'" + db + L"', 'main', 'V1', 'VIEW'",
             L"'x', '" + db + L"', 't3', 'base table'",
             L"'x', '" + db + L"', 'L1', 'LOCAL TEMPORARY'",
             L"'" + db + L"', 'main', NULL, 'BASE TABLE'", L"'other', 'x', 'T2', 'BASE TABLE'"})
        ASSERT_TRUE(c.execute(L"INSERT INTO INFORMATION_SCHEMA.TABLES VALUES (" + row + L")"));

    EXPECT_EQ(listed(c, OxQelTableDef::Table | OxQelTableDef::View | OxQelTableDef::Unknown),
              (Tables{{L"L1", OxQelTableDef::Unknown},
                      {L"T1", OxQelTableDef::Table},
                      {L"V1", OxQelTableDef::View},
                      {L"t3", OxQelTableDef::Table}}));
    EXPECT_EQ(listed(c, OxQelTableDef::View), (Tables{{L"V1", OxQelTableDef::View}}));
    EXPECT_EQ(listed(c, OxQelTableDef::Table),
              (Tables{{L"T1", OxQelTableDef::Table}, {L"t3", OxQelTableDef::Table}}));
}

// Debian has no Firebird ODBC driver: the SQLite driver, registered under a Firebird name,
// stands in for one, with a database that holds the catalogue columns the query reads.
class OdbcFirebird : public testing::Test {
protected:
    void SetUp() override {
        OdbcTest::Env::get();
        ASSERT_TRUE(m_c.openConnection(m_dir.wfile("firebird.db"),
                                       L"DRIVER={Firebird Stand-in};SERVER=localhost", L"", L""));
        ASSERT_TRUE(m_c.IsFireBirdDriver());
        ASSERT_TRUE(
            m_c.execute(L"CREATE TABLE RDB$RELATIONS (RDB$RELATION_NAME CHAR(31), "
                        L"RDB$RELATION_TYPE SMALLINT, RDB$SYSTEM_FLAG SMALLINT)"));
        for (const wchar_t* row :
             {L"'CUSTOMERS', 0, 0", L"'ORDERS_VIEW', 1, 0", L"'EXTERNAL_T', 2, 0",
              L"'RDB$PAGES', 0, 1", L"'NO_TYPE', NULL, 0"})
            ASSERT_TRUE(
                m_c.execute(std::wstring(L"INSERT INTO RDB$RELATIONS VALUES (") + row + L")"));
    }
    OxTest::TempDir m_dir;
    OxQelConnectionODBC m_c;
};

TEST_F(OdbcFirebird, ListsUserRelationsByTheirType) {
    EXPECT_EQ(listed(m_c, OxQelTableDef::View), (Tables{{L"ORDERS_VIEW", OxQelTableDef::View}}));
    EXPECT_EQ(listed(m_c, OxQelTableDef::Table), (Tables{{L"CUSTOMERS", OxQelTableDef::Table}}));
    // System relations and rows without a type stay out.
    EXPECT_EQ(listed(m_c, OxQelTableDef::AllTypes | OxQelTableDef::Unknown),
              (Tables{{L"CUSTOMERS", OxQelTableDef::Table},
                      {L"EXTERNAL_T", OxQelTableDef::Unknown},
                      {L"ORDERS_VIEW", OxQelTableDef::View}}));
    // The catalogue's columns as the recordset describes them.
    OxQelFieldDefArray fields;
    ASSERT_TRUE(m_c.getFieldDef(L"RDB$RELATIONS", L"*", fields));
    EXPECT_EQ(fields.getByFieldName(L"RDB$RELATION_TYPE").getFieldType(), OxQel::Integer);
    // The stand-in's driver reports CHAR columns as variable text.
    EXPECT_EQ(fields.getByFieldName(L"RDB$RELATION_NAME").getFieldType(), OxQel::String);
}

TEST_F(OdbcFirebird, LiteralsAreWrittenWithoutTheNationalPrefix) {
    ASSERT_TRUE(m_c.execute(L"CREATE TABLE NOTES (S VARCHAR(20), W VARCHAR(20))"));
    EXPECT_TRUE(m_c.formatAndExecute(L"INSERT INTO NOTES VALUES (]]plain[[, ]]]wide[[[)"));
    std::unique_ptr<OxQelIRecordset> rs(m_c.createOxQelIRecordset());
    ASSERT_TRUE(rs->openSQL(&m_c, L"SELECT S, W FROM NOTES"));
    EXPECT_EQ(rs->getlFieldString(0), L"plain");
    EXPECT_EQ(rs->getlFieldString(1), L"wide");
}
#else

class OdbcCatalogue : public OdbcTest::ConnectionTest {
protected:
    OdbcCatalogue() : ConnectionTest(L"oxqel_cat") {}
};

TEST_P(OdbcCatalogue, ListsTablesAndViewsByTheMask) {
    const std::wstring view = OdbcTest::uniqueName(L"oxqel_catview");
    run(L"CREATE TABLE " + m_table + L" (n INTEGER)");
    run(L"CREATE OR REPLACE VIEW " + view + L" AS SELECT n FROM " + m_table);
    const Tables all = listed(m_connection, OxQelTableDef::Table | OxQelTableDef::View);
    EXPECT_TRUE(has(all, m_table, OxQelTableDef::Table));
    EXPECT_TRUE(has(all, view, OxQelTableDef::View));
    const Tables views = listed(m_connection, OxQelTableDef::View);
    EXPECT_TRUE(has(views, view, OxQelTableDef::View));
    EXPECT_FALSE(has(views, m_table, OxQelTableDef::Table));
    EXPECT_TRUE(std::all_of(views.begin(), views.end(),
                            [](const auto& t) { return t.second == OxQelTableDef::View; }));
    const Tables tables = listed(m_connection, OxQelTableDef::Table);
    EXPECT_FALSE(has(tables, view, OxQelTableDef::View));
    run(L"DROP VIEW " + view);
}

INSTANTIATE_TEST_SUITE_P(Drivers, OdbcCatalogue, testing::ValuesIn(OdbcTest::driversUnderTest()),
                         OdbcTest::driverCaseName);
#endif
}  // namespace
