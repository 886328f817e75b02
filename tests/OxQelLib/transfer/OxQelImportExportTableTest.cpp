#include <gtest/gtest.h>

#include "OxQelLib/transfer/OxQelImportExportTable.h"
#include "TransferTestSupport.h"

using namespace OxTransferTest;

namespace {
// A source database with one table as the copy reads it, and an empty destination.
class TableCopyTest : public ::testing::Test {
protected:
    void SetUp() override {
        source.reset(
            new DbFile("CREATE TABLE items (id INTEGER PRIMARY KEY, name VARCHAR(40) DEFAULT "
                       "'none', qty INT, note TEXT);"
                       "CREATE UNIQUE INDEX ux_name ON items (name);"
                       "CREATE INDEX ix_qty_note ON items (qty, note);"
                       "INSERT INTO items VALUES (1, 'it''s', 5, NULL), (2, 'b', "
                       "9223372036854775807, 'x'), (3, 'c', -1, '');"));
        ASSERT_TRUE(from.open(source->path()));
        ASSERT_TRUE(to.open(destination.path()));
        table = definition(L"items");
    }
    OxQelTableDef definition(const std::wstring& name) {
        OxQelTableDef def;
        def.setTableName(name);
        EXPECT_TRUE(from.getFieldDef(name, L"*", def.getFields()));
        return def;
    }

    std::unique_ptr<DbFile> source;
    DbFile destination;
    std::shared_ptr<Script> script = std::make_shared<Script>();
    ScriptedSQLite from{script};
    ScriptedSQLite to{script};
    OxQelTableDef table;
};

TEST_F(TableCopyTest, CopiesStructureRowsAndIndexes) {
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::NoError);
    auto raw = destination.raw();
    EXPECT_EQ(
        raw.rows("SELECT id, name, qty, quote(note) FROM items ORDER BY id"),
        (std::vector<std::string>{"1|it's|5|NULL", "2|b|9223372036854775807|'x'", "3|c|-1|''"}));
    EXPECT_EQ(
        raw.scalar(
            "SELECT group_concat(name) FROM (SELECT name FROM sqlite_master WHERE type = 'index' "
            "AND name NOT LIKE 'sqlite_%' ORDER BY name)"),
        "ix_qty_note,ux_name");
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM pragma_index_list('items') WHERE name = 'ux_name' "
                         "AND \"unique\""),
              "1");
    EXPECT_FALSE(to.isInTransaction());
}

TEST_F(TableCopyTest, AnExistingTableKeepsItsStructureAndGetsTheRowsAgain) {
    destination.raw().exec(
        "CREATE TABLE items (id INTEGER, name TEXT, qty INT, note TEXT, extra INT DEFAULT 7);");
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::NoError);
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(),
              OxQel::ErrorExecute);  // ux_name now refuses the rows
    auto raw = destination.raw();
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM items"), "3");
    EXPECT_EQ(raw.scalar("SELECT sum(extra) FROM items"),
              "21");  // the column the source lacks stayed
}

TEST_F(TableCopyTest, AFailingInsertRollsTheWholeTableBack) {
    // The destination's own constraint refuses the third row.
    destination.raw().exec(
        "CREATE TABLE items (id INTEGER, name TEXT, qty INT CHECK (qty >= 0), note TEXT);");
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::ErrorExecute);
    EXPECT_EQ(destination.raw().scalar("SELECT count(*) FROM items"), "0");
    EXPECT_FALSE(to.isInTransaction());
}

TEST_F(TableCopyTest, ARefusedStructureIsRolledBack) {
    script->refuseCreateTable.insert(L"items");
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::ErrorStatement);
    EXPECT_EQ(destination.raw().scalar("SELECT count(*) FROM sqlite_master"), "0");
}

TEST_F(TableCopyTest, AThrowingStepFailsTheTableNotTheCaller) {
    script->throwOnIndexesOf.insert(L"items");
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::ErrorUnknown);
    EXPECT_EQ(destination.raw().scalar("SELECT count(*) FROM sqlite_master WHERE name = 'items'"),
              "0");
}

TEST_F(TableCopyTest, IndexNamesCompareWithoutCase) {
    destination.raw().exec(
        "CREATE TABLE items (id INTEGER, name TEXT, qty INT, note TEXT);"
        "CREATE INDEX UX_NAME ON items (qty);");
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::NoError);
    EXPECT_EQ(
        destination.raw().scalar(
            "SELECT count(*) FROM sqlite_master WHERE type = 'index' AND name LIKE 'ux_name'"),
        "1");
}

TEST_F(TableCopyTest, EmptyTablesAndEmptyDefinitions) {
    source->raw().exec("CREATE TABLE vacant (a TEXT, b INT);");
    const OxQelTableDef empty = definition(L"vacant");
    EXPECT_EQ(OxQelImportExportTable(from, to, empty).run(), OxQel::NoError);
    EXPECT_EQ(destination.raw().scalar("SELECT count(*) FROM vacant"), "0");

    OxQelTableDef noFields;
    noFields.setTableName(L"ghost");
    // Nothing is created; the rows have nowhere to go, so the insert cannot be prepared.
    EXPECT_EQ(OxQelImportExportTable(from, to, noFields).run(), OxQel::ErrorStatement);
    EXPECT_EQ(destination.raw().scalar("SELECT count(*) FROM sqlite_master WHERE name = 'ghost'"),
              "0");
}

TEST_F(TableCopyTest, ClosedConnectionsStartNothing) {
    to.closeDatabase();
    EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::ErrorConnection);
    EXPECT_FALSE(from.isInTransaction());
}
}  // namespace
