#include <gtest/gtest.h>

#include "OxQelLib/interfaces/OxQelConnectionDefault.h"
#include "OxQelLib/sqlite/OxQelRecordsetSQLite.h"
#include "SQLiteTestSupport.h"
#include "platform/core/OxText.h"

using OxSQLiteTest::Database;
using OxSQLiteTest::LogCapture;

namespace {
const char* kValues =
    "CREATE TABLE v(id INTEGER PRIMARY KEY, i INTEGER, r REAL, s TEXT, b BLOB, n);"
    "INSERT INTO v VALUES (1, 2147483647, 0.1, 'héllo 😀', x'00410042', NULL);"
    "INSERT INTO v VALUES (2, 6000000000, -2.5, '', x'', 'x');"
    "INSERT INTO v VALUES (3, -9223372036854775808, 1e300, 'it''s', NULL, 7);";

// Both encodings a database file may have: the library's new files are UTF-16.
class SQLiteRecordsetEncodings : public testing::TestWithParam<bool> {
protected:
    SQLiteRecordsetEncodings() {
        if (GetParam()) {
            m_db = std::make_unique<Database>();
            EXPECT_TRUE(m_db->connection().execute(OxText::fromUtf8(kValues)));
        } else {
            m_db = std::make_unique<Database>(kValues);
        }
        EXPECT_EQ(m_db->connection().isUtf16(), GetParam());
    }
    std::unique_ptr<Database> m_db;
};
}  // namespace

TEST_P(SQLiteRecordsetEncodings, ValuesComeBackWhole) {
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&m_db->connection(), L"SELECT i, r, s, b, n FROM v ORDER BY id"));
    ASSERT_EQ(rs.getRecordCount(), 3);

    EXPECT_EQ(rs.getlFieldValue(0), OxVariant::fromInt(2147483647));
    EXPECT_EQ(rs.getlFieldValue(0).vt(), VT_INT) << "values that fit keep the 32-bit form";
    EXPECT_EQ(rs.getlFieldValue(1), OxVariant(0.1));
    EXPECT_EQ(rs.getlFieldValue(2), OxVariant(L"héllo 😀"));
    // A blob comes as its bytes, zeros and all.
    EXPECT_EQ(rs.getlFieldValue(3), OxVariant::fromBytes(std::vector<uint8_t>{0, 0x41, 0, 0x42}));
    EXPECT_TRUE(rs.getlFieldValue(4).isNull());
    EXPECT_TRUE(rs.isFieldNull(4L));
    EXPECT_TRUE(rs.isFieldNull(L"N"));
    std::wstring text;
    EXPECT_TRUE(rs.getField(3L, text)) << "a blob still reads as text";
    EXPECT_TRUE(rs.getField(4L, text));
    EXPECT_EQ(text, L"");

    ASSERT_TRUE(rs.moveNext());
    // Integers beyond 32 bits survive.
    EXPECT_EQ(rs.getlFieldValue(0), OxVariant(6000000000LL));
    long number = 0;
    EXPECT_TRUE(rs.getField(0L, number));
    EXPECT_EQ(number, 6000000000L);
    EXPECT_EQ(rs.getlFieldValue(2), OxVariant(L""));
    EXPECT_FALSE(rs.isFieldNull(2L)) << "an empty text is no NULL";
    EXPECT_EQ(rs.getlFieldValue(3), OxVariant::fromBytes(nullptr, 0));

    ASSERT_TRUE(rs.moveNext());
    EXPECT_EQ(rs.getlFieldValue(0), OxVariant(static_cast<long long>(INT64_MIN)));
    EXPECT_EQ(rs.getlFieldString(0), L"-9223372036854775808");
    double real = 0;
    EXPECT_TRUE(rs.getField(L"r", real));
    EXPECT_EQ(real, 1e300);
    EXPECT_EQ(rs.getszFieldString(L"S"), L"it's");
    EXPECT_EQ(rs.getvarFieldValue(OxVariant(L"n")), OxVariant::fromInt(7));
    bool flag = false;
    EXPECT_TRUE(rs.getField(L"n", flag));
    EXPECT_TRUE(flag);
}

TEST_P(SQLiteRecordsetEncodings, EditsKeepEveryKindOfValue) {
    OxQelConnectionSQLite& c = m_db->connection();
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&c, L"SELECT * FROM v ORDER BY id"));
    ASSERT_TRUE(rs.move(2));
    EXPECT_TRUE(rs.setField(L"i", 5000000000L));
    EXPECT_TRUE(rs.setField(L"b", OxVariant::fromBytes(std::vector<uint8_t>{1, 0, 2})));
    EXPECT_TRUE(rs.setField(L"s", std::wstring(L"O'Neil 😀")));
    EXPECT_TRUE(rs.setField(L"r", OxVariant::null()));
    ASSERT_TRUE(rs.update());
    EXPECT_EQ(m_db->raw().rows("SELECT i, quote(b), s, quote(r) FROM v WHERE id = 3"),
              std::vector<std::string>{"5000000000|X'010002'|O'Neil 😀|NULL"});
    EXPECT_EQ(rs.getlFieldValue(1), OxVariant(5000000000LL));
    EXPECT_TRUE(rs.isFieldNull(L"r"));
}

INSTANTIATE_TEST_SUITE_P(Utf8AndUtf16, SQLiteRecordsetEncodings, testing::Values(false, true));

TEST(SQLiteRecordset, NavigationOverRowsAndOverNone) {
    Database db("CREATE TABLE t(a); INSERT INTO t VALUES (1), (2), (3);");
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&db.connection(), L"SELECT a FROM t WHERE a > 5"));
    EXPECT_TRUE(rs.getEOF());
    EXPECT_FALSE(rs.getBOF());
    EXPECT_EQ(rs.getRecordCount(), 0);
    EXPECT_TRUE(rs.moveFirst());
    EXPECT_TRUE(rs.moveLast());
    EXPECT_TRUE(rs.getBOF());
    long value = 0;
    EXPECT_FALSE(rs.getField(0L, value)) << "no current row";
    EXPECT_TRUE(rs.getField(L"a", value)) << "the column exists";
    EXPECT_EQ(value, 0);
    EXPECT_FALSE(rs.getField(L"zz", value));

    ASSERT_TRUE(rs.openSQL(&db.connection(), L"SELECT a FROM t ORDER BY a"));
    EXPECT_FALSE(rs.getBOF());
    EXPECT_FALSE(rs.move(-1));
    EXPECT_FALSE(rs.move(3));
    EXPECT_EQ(rs.getlFieldString(0), L"1") << "a refused move keeps the position";
    EXPECT_TRUE(rs.move(2));
    EXPECT_FALSE(rs.moveNext());
    EXPECT_TRUE(rs.getEOF());
    EXPECT_FALSE(rs.moveNext());
    EXPECT_FALSE(rs.getEOF()) << "one further than the end is no longer the end";
    EXPECT_TRUE(rs.getlFieldValue(0).isEmpty());
    EXPECT_FALSE(rs.isFieldNull(0L));
    EXPECT_TRUE(rs.moveLast());
    EXPECT_TRUE(rs.movePrevious());
    EXPECT_EQ(rs.getlFieldString(0), L"2");
    EXPECT_TRUE(rs.getlFieldValue(9).isEmpty());
    EXPECT_EQ(rs.getFieldName(9), L"");
}

TEST(SQLiteRecordset, FieldDefinitionsComeFromTheTables) {
    Database db(
        "CREATE TABLE a(id INTEGER PRIMARY KEY, name TEXT NOT NULL DEFAULT 'x');"
        "CREATE TABLE b(id REAL, name BLOB);");
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&db.connection(),
                           L"SELECT a.id, b.id, a.name AS label, b.name, 1 + 1 AS two FROM a, b"));
    ASSERT_EQ(rs.getFieldCount(), 5);
    EXPECT_EQ(rs.getFieldType(0L), OxQel::Integer);
    EXPECT_EQ(rs.getFieldType(1L), OxQel::Double) << "each column its own table's definition";
    EXPECT_EQ(rs.getFieldName(2), L"label");
    EXPECT_EQ(rs.getFieldType(L"LABEL"), OxQel::WString) << "an alias keeps the column's type";
    OxQelFieldDef def;
    ASSERT_TRUE(rs.getFieldDef(L"label", def));
    EXPECT_EQ(def.getDefaultValue(), L"x");
    EXPECT_FALSE(def.getCanBeNull());
    EXPECT_EQ(rs.getFieldType(3L), OxQel::Binary);
    EXPECT_EQ(rs.getFieldType(OxVariant(L"two")), OxQel::Unknown);
    EXPECT_EQ(rs.getFieldType(L"nothing"), OxQel::Unknown);
    EXPECT_EQ(rs.getFieldSize(0L), -1);
    OxQelFieldDefArray all;
    ASSERT_TRUE(rs.getFieldDef(all));
    EXPECT_EQ(all.size(), 5u);
    EXPECT_FALSE(rs.setSort(L"a"));
    EXPECT_FALSE(rs.setFilter(OxVariant(L"a = 1")));
}

TEST(SQLiteRecordset, OpeningFailuresLeaveItClosed) {
    Database db("CREATE TABLE t(x); INSERT INTO t VALUES (1), (2), (3);");
    LogCapture log;
    OxQelRecordsetSQLite rs;
    EXPECT_FALSE(rs.openSQL(nullptr, L"SELECT 1"));
    OxQelConnectionDefault other;
    EXPECT_FALSE(rs.openSQL(&other, L"SELECT 1"));
    OxQelConnectionSQLite closed;
    EXPECT_FALSE(rs.openSQL(&closed, L"SELECT 1"));

    EXPECT_FALSE(rs.openSQL(&db.connection(), L"SELECT nonsense FROM t"));
    EXPECT_TRUE(log.contains("FUNCTION: OxQelRecordsetSQLite::executeAndLoad"));
    EXPECT_EQ(rs.getFieldCount(), 0);

    // A result that breaks off part-way is a failure, not a shorter result.
    log.clear();
    EXPECT_FALSE(rs.openSQL(&db.connection(),
                            L"SELECT CASE WHEN x = 3 THEN abs(-9223372036854775808) ELSE x END "
                            L"FROM t ORDER BY x"));
    EXPECT_TRUE(log.contains("integer overflow"));
    EXPECT_EQ(rs.getRecordCount(), 0);
    EXPECT_EQ(rs.getFieldCount(), 0);
}

TEST(SQLiteRecordset, ChangesFindTheirRowWhateverItHolds) {
    Database db(
        "CREATE TABLE \"the t\"(\"a b\" TEXT, \"q\"\"x\" INTEGER, r REAL, n);"
        "INSERT INTO \"the t\" VALUES ('it''s', 1, 0.30000000000000004, NULL);"
        "INSERT INTO \"the t\" VALUES ('same', 2, NULL, NULL);"
        "INSERT INTO \"the t\" VALUES ('same', 2, NULL, NULL);");
    OxQelConnectionSQLite& c = db.connection();
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&c, L"SELECT * FROM \"the t\" ORDER BY rowid"));

    // Several changes of one row, with apostrophes, exact reals and NULLs in the row.
    EXPECT_TRUE(rs.setField(L"a b", std::wstring(L"x'); DROP TABLE \"the t\"; --")));
    EXPECT_TRUE(rs.setField(L"q\"x", 10));
    EXPECT_TRUE(rs.setField(L"n", std::wstring(L"was null")));
    ASSERT_TRUE(rs.update());
    EXPECT_EQ(db.raw().rows("SELECT \"a b\", \"q\"\"x\", r = 0.1 + 0.2, n FROM \"the t\" "
                            "WHERE rowid = 1"),
              std::vector<std::string>{"x'); DROP TABLE \"the t\"; --|10|1|was null"});
    EXPECT_EQ(rs.getlFieldString(0), L"x'); DROP TABLE \"the t\"; --");

    // Of two equal rows, the current one changes alone.
    ASSERT_TRUE(rs.moveNext());
    EXPECT_TRUE(rs.setField(L"r", 1.5));
    ASSERT_TRUE(rs.update());
    EXPECT_EQ(db.raw().rows("SELECT quote(r) FROM \"the t\" WHERE rowid > 1 ORDER BY rowid"),
              (std::vector<std::string>{"1.5", "NULL"}));

    // A row that holds NULLs can be deleted, and only that row goes.
    ASSERT_TRUE(rs.moveNext());
    EXPECT_TRUE(rs.remove());
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM \"the t\""), "2");
    EXPECT_EQ(rs.getRecordCount(), 3) << "the copy keeps the row";
    // Its values are gone from the table: a change of it changes nothing and says so.
    EXPECT_TRUE(rs.setField(L"n", 1));
    EXPECT_FALSE(rs.update());
    EXPECT_TRUE(rs.cancelUpdate());
    EXPECT_FALSE(rs.remove());
}

TEST(SQLiteRecordset, UpdateOrderFailureAndTransactions) {
    Database db(
        "CREATE TABLE t(id INTEGER PRIMARY KEY, u UNIQUE, v);"
        "INSERT INTO t VALUES (1, 'a', 0), (2, 'b', 0);");
    OxQelConnectionSQLite& c = db.connection();
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&c, L"SELECT * FROM t ORDER BY id"));

    // The later change of a cell is the one that stays.
    EXPECT_TRUE(rs.setField(L"v", 1));
    EXPECT_TRUE(rs.setField(L"v", 2));
    ASSERT_TRUE(rs.update());
    EXPECT_EQ(db.raw().scalar("SELECT v FROM t WHERE id = 1"), "2");
    EXPECT_EQ(rs.getlFieldString(2), L"2");

    // One failing change undoes them all, in the table and in the copy.
    EXPECT_TRUE(rs.setField(L"v", 3));
    EXPECT_TRUE(rs.setField(L"u", std::wstring(L"b")));
    EXPECT_FALSE(rs.update());
    EXPECT_FALSE(c.isInTransaction());
    EXPECT_EQ(db.raw().rows("SELECT u, v FROM t WHERE id = 1"), std::vector<std::string>{"a|2"});
    EXPECT_EQ(rs.getlFieldString(2), L"2");
    EXPECT_TRUE(rs.cancelBatch());
    EXPECT_TRUE(rs.update()) << "nothing left to write";

    // updateBatch writes in queue order; a caller's transaction is used and committed.
    ASSERT_TRUE(c.startTransaction());
    EXPECT_TRUE(rs.setField(L"v", 7));
    ASSERT_TRUE(rs.moveNext());
    EXPECT_TRUE(rs.setField(L"v", 8));
    ASSERT_TRUE(rs.updateBatch());
    EXPECT_FALSE(c.isInTransaction());
    EXPECT_EQ(db.raw().rows("SELECT v FROM t ORDER BY id"), (std::vector<std::string>{"7", "8"}));

    OxQelRecordsetSQLite expression;
    ASSERT_TRUE(expression.openSQL(&c, L"SELECT v + 1 AS w FROM t"));
    EXPECT_FALSE(expression.setField(L"w", 1)) << "an expression has no column to write";
    EXPECT_FALSE(expression.setField(L"nothing", 1));
}

TEST(SQLiteRecordset, AddNewGivesTheStoredRow) {
    Database db(
        "CREATE TABLE t(id INTEGER PRIMARY KEY AUTOINCREMENT, s TEXT DEFAULT 'new', n);"
        "CREATE TABLE other(x); INSERT INTO t(s) VALUES ('first');");
    OxQelConnectionSQLite& c = db.connection();
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&c, L"SELECT id, s, n FROM t"));
    ASSERT_TRUE(rs.addNew());
    EXPECT_EQ(rs.getRecordCount(), 2);
    EXPECT_EQ(rs.getlFieldValue(0), OxVariant::fromInt(2));
    EXPECT_EQ(rs.getlFieldString(1), L"new");
    EXPECT_TRUE(rs.isFieldNull(2L));
    // The new row can be changed at once.
    EXPECT_TRUE(rs.setField(L"n", std::wstring(L"filled")));
    ASSERT_TRUE(rs.update());
    EXPECT_EQ(db.raw().rows("SELECT id, s, n FROM t ORDER BY id"),
              (std::vector<std::string>{"1|first|NULL", "2|new|filled"}));

    OxQelRecordsetSQLite joined;
    ASSERT_TRUE(joined.openSQL(&c, L"SELECT t.id, other.x FROM t, other"));
    EXPECT_FALSE(joined.addNew());
    EXPECT_FALSE(joined.remove());
}

TEST(SQLiteRecordset, BrokenTextsReadWithReplacementCharacters) {
    // The engine keeps whatever bytes a text was given: each broken sequence reads as one
    // U+FFFD and reading goes on where a character can start.
    const std::vector<std::pair<std::string, std::wstring>> utf8 = {
        {"C3", L"\uFFFD"},        {"61E282", L"a\uFFFD"},      {"F09F98", L"\uFFFD"},
        {"EDA0807A", L"\uFFFDz"}, {"C080", L"\uFFFD"},         {"6F6BFF", L"ok\uFFFD"},
        {"F4908080", L"\uFFFD"},  {"C3BC80", L"\u00fc\uFFFD"}, {"F09F9880", L"\U0001F600"}};
    Database db8("CREATE TABLE t(v);");
    std::string inserts;
    for (const auto& [hex, text] : utf8)
        inserts += "INSERT INTO t VALUES (CAST(x'" + hex + "' AS TEXT));";
    db8.raw().exec(inserts);
    OxQelRecordsetSQLite rs;
    ASSERT_TRUE(rs.openSQL(&db8.connection(), L"SELECT v FROM t ORDER BY rowid"));
    for (const auto& [hex, text] : utf8) {
        EXPECT_EQ(rs.getlFieldValue(0), OxVariant(text)) << hex;
        rs.moveNext();
    }

    Database db16;
    ASSERT_TRUE(db16.connection().execute(
        L"CREATE TABLE t(v); INSERT INTO t VALUES (CAST(x'3DD800D8' AS TEXT)), "
        L"(CAST(x'00DC4100' AS TEXT)), (CAST(x'3DD800DE' AS TEXT))"));
    ASSERT_TRUE(rs.openSQL(&db16.connection(), L"SELECT v FROM t ORDER BY rowid"));
    for (const wchar_t* text : {L"\uFFFD\uFFFD", L"\uFFFDA", L"\U0001F600"}) {
        EXPECT_EQ(rs.getlFieldValue(0), OxVariant(text));
        rs.moveNext();
    }
}
