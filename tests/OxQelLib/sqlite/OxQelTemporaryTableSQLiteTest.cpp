#include <gtest/gtest.h>

#include "OxQelLib/sqlite/OxQelRecordsetSQLite.h"
#include "SQLiteTestSupport.h"
#include "platform/core/OxText.h"

using OxSQLiteTest::Database;

namespace {
OxObject2Array objects(const std::vector<std::wstring>& values) {
    OxObject2Array array;
    for (const auto& v : values) array.add(new OxObject2({L"unused", v}));
    return array;
}

std::vector<std::wstring> numbers(int count) {
    std::vector<std::wstring> values;
    for (int i = 0; i < count; ++i) values.push_back(std::to_wstring(i));
    return values;
}

// Counts the INSERT statements the engine runs on the connection, and their rows.
class InsertCounter {
public:
    explicit InsertCounter(OxQelConnectionSQLite& c) : m_db(c.getHandle()) {
        sqlite3_trace_v2(m_db, SQLITE_TRACE_STMT, &InsertCounter::trace, this);
    }
    ~InsertCounter() { sqlite3_trace_v2(m_db, 0, nullptr, nullptr); }
    std::vector<size_t> rowsPerInsert;

private:
    static int trace(unsigned, void* self, void*, void* text) {
        const std::string sql = static_cast<const char*>(text);
        if (sql.find("INSERT INTO") != std::string::npos) {
            size_t rows = 1;
            for (size_t p = 0; (p = sql.find("),(", p)) != std::string::npos; ++p) ++rows;
            static_cast<InsertCounter*>(self)->rowsPerInsert.push_back(rows);
        }
        return 0;
    }
    sqlite3* m_db;
};
}  // namespace

TEST(SQLiteTemporaryTable, ValuesGoInChunksOfFiveHundredRows) {
    Database db;
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_EQ(c.getMaxInsertsAtOnce(), 500);
    const std::vector<std::pair<int, std::vector<size_t>>> cases = {
        {1200, {500, 500, 200}}, {500, {500}}, {501, {500, 1}}, {0, {}}};
    for (const auto& [count, chunks] : cases) {
        OxObject2Array values = objects(numbers(count));
        std::wstring name = L"chunked";
        InsertCounter counter(c);
        ASSERT_TRUE(c.createTemporaryTableFromObjectArray(name, values, 1, OxQel::Integer, 0));
        EXPECT_EQ(counter.rowsPerInsert, chunks) << count << " values";
        EXPECT_EQ(name, L"chunked");
        OxQelRecordsetSQLite rs;
        ASSERT_TRUE(rs.openSQL(&c, L"SELECT count(*), sum(val), typeof(max(val)) FROM chunked"));
        EXPECT_EQ(rs.getlFieldString(0), std::to_wstring(count));
        if (count > 0) {
            EXPECT_EQ(rs.getlFieldString(2), L"integer") << "the column's type decides";
        }
    }
}

TEST(SQLiteTemporaryTable, ValuesAreStoredAsTheyAre) {
    Database db;
    OxQelConnectionSQLite& c = db.connection();
    const std::vector<std::wstring> awkward = {L"it's",     L"]]x[[", L"a TOP 5",
                                               L"[[);DROP", L"ü😀",    L""};
    OxArraySimple<StringCompare> strings;
    for (const auto& v : awkward) strings.add(v);
    std::wstring name = L"strings";
    ASSERT_TRUE(c.createTemporaryTableFromStringArray(name, strings, OxQel::WString, 0));
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&c, L"SELECT val FROM strings ORDER BY rowid"));
    std::vector<std::wstring> stored;
    for (; !rs.getEOF(); rs.moveNext()) stored.push_back(rs.getlFieldString(0));
    EXPECT_EQ(stored, awkward);

    // Temporary tables belong to their connection.
    std::unique_ptr<OxQelIConnection> other(c.createNewConnection());
    EXPECT_FALSE(other->execute(L"DELETE FROM strings"));

    // Made again, the table is replaced; dropped, it is gone, and dropping again is fine.
    OxArraySimple<StringCompare> one{L"1"};
    ASSERT_TRUE(c.createTemporaryTableFromStringArray(name, one, OxQel::WString, 0));
    ASSERT_TRUE(rs.openSQL(&c, L"SELECT count(*) FROM strings"));
    EXPECT_EQ(rs.getlFieldString(0), L"1");
    EXPECT_TRUE(c.deleteTemporaryTable(L"strings"));
    EXPECT_TRUE(c.deleteTemporaryTable(L"strings"));
    EXPECT_FALSE(c.execute(L"DELETE FROM strings"));
}

TEST(SQLiteTemporaryTable, PermanentTablesOfTheSameNameAreNeverDropped) {
    Database db(
        "CREATE TABLE ids(x); INSERT INTO ids VALUES (1);"
        "CREATE TABLE keep(x); INSERT INTO keep VALUES (1);"
        "CREATE TABLE t(id); INSERT INTO t VALUES (1), (2);");
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_TRUE(c.deleteTemporaryTable(L"keep"));
    std::wstring name = L"keep";
    OxObject2Array values = objects({L"5"});
    ASSERT_TRUE(c.createTemporaryTableFromObjectArray(name, values, 1, OxQel::Integer, 0));
    EXPECT_TRUE(c.deleteTemporaryTable(L"keep"));
    ASSERT_TRUE(c.executeIn(L"DELETE FROM t WHERE id", values, 1, OxQel::Integer, 0));
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM keep"), "1");
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM ids"), "1");
    EXPECT_TRUE(c.findTable(L"ids"));
}

TEST(SQLiteTemporaryTable, ExecuteInRunsTheHeadAgainstTheList) {
    Database db(
        "CREATE TABLE t(id INTEGER, name TEXT);"
        "INSERT INTO t VALUES (1, 'a'), (2, 'b'), (3, 'c'), (4, 'it''s'), (5, 'e');");
    OxQelConnectionSQLite& c = db.connection();
    OxObject2Array ids = objects({L"2", L"4", L"5"});
    ASSERT_TRUE(c.executeIn(L"DELETE FROM [t] WHERE [id]", ids, 1, OxQel::Integer, 0));
    EXPECT_EQ(db.raw().rows("SELECT id FROM t ORDER BY id"), (std::vector<std::string>{"1", "3"}));
    EXPECT_FALSE(c.execute(L"SELECT 1 FROM temp.ids")) << "the list table is dropped";

    OxObject2Array names = objects({L"c", L"it's"});
    ASSERT_TRUE(c.executeIn(L"UPDATE t SET id = 0 WHERE name", names, 1, OxQel::WString, 0));
    EXPECT_EQ(db.raw().rows("SELECT id, name FROM t ORDER BY name"),
              (std::vector<std::string>{"1|a", "0|c"}));

    // A failing head leaves no list table behind.
    OxSQLiteTest::LogCapture log;
    EXPECT_FALSE(c.executeIn(L"DELETE FROM missing WHERE id", ids, 1, OxQel::Integer, 0));
    EXPECT_FALSE(c.execute(L"SELECT 1 FROM temp.ids"));
}

TEST(SQLiteTemporaryTable, MarkerFormRunsThroughTheRewriter) {
    Database db;
    OxQelConnectionSQLite& c = db.connection();
    const std::wstring sql = c.formatTemporaryTable(L"m", OxQel::WString, L"a[[),(]]b'c");
    EXPECT_EQ(sql,
              L"DROP TABLE IF EXISTS temp.m; CREATE TEMPORARY TABLE m ( val TEXT );"
              L"\nINSERT INTO m VALUES (]]a[[),(]]b'c[[);");
    ASSERT_TRUE(c.formatAndExecute(sql));
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&c, L"SELECT group_concat(val, '|') FROM m"));
    EXPECT_EQ(rs.getlFieldString(0), L"a|b'c");
}
