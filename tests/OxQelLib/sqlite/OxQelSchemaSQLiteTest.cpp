#include <gtest/gtest.h>

#include <algorithm>

#include "SQLiteTestSupport.h"

using OxSQLiteTest::Database;
using OxSQLiteTest::LogCapture;

namespace {
std::vector<std::wstring> names(const OxQelFieldDefArray& fields) {
    std::vector<std::wstring> out;
    for (const auto& f : fields) out.push_back(f.getFieldName());
    return out;
}

std::vector<std::wstring> tableNames(OxQelConnectionSQLite& c, OxQelTableDef::TableType mask) {
    std::vector<OxQelTableDef> tables;
    EXPECT_TRUE(c.getTableDef(tables, mask));
    std::vector<std::wstring> out;
    for (const auto& t : tables) out.push_back(t.getTableName());
    std::sort(out.begin(), out.end());
    return out;
}
}  // namespace

TEST(SQLiteSchema, TablesAndColumnsWithAwkwardNames) {
    Database db;
    OxQelConnectionSQLite& c = db.connection();
    const std::wstring table = L"it's a \"table\"";
    EXPECT_FALSE(c.createTable(L"", L"f", OxQel::Integer, 0, L"", true));
    EXPECT_FALSE(c.createTable(table, L"", OxQel::Integer, 0, L"", true));
    ASSERT_TRUE(c.createTable(table, L"o'id", OxQel::Integer, 0, L"", false));
    EXPECT_TRUE(c.createTable(table, L"other", OxQel::WString, 0, L"", true))
        << "an existing table is left as it is";
    EXPECT_TRUE(c.findTable(L"IT'S A \"TABLE\""));
    EXPECT_TRUE(c.createField(table, L"na'me", OxQel::WString, 50, L"", true));
    EXPECT_TRUE(c.findField(table, L"NA'ME"));
    EXPECT_FALSE(c.findField(table, L"other"));

    std::vector<std::wstring> all;
    ASSERT_TRUE(c.getAllFieldName(table, all));
    EXPECT_EQ(all, (std::vector<std::wstring>{L"o'id", L"na'me"}));
    ASSERT_TRUE(c.renameField(table, L"na'me", L"it's name"));
    ASSERT_TRUE(c.createIndex(L"idx 'one'", false, false, false, table, L"\"it's name\""));
    std::vector<OxQelIndexDef> indexes;
    ASSERT_TRUE(c.getIndexDef(table, indexes));
    ASSERT_EQ(indexes.size(), 1u);
    EXPECT_EQ(indexes[0].getIndexName(), L"idx 'one'");
    EXPECT_EQ(indexes[0].getFieldNames(), std::vector<std::wstring>{L"it's name"});
    EXPECT_EQ(indexes[0].getTableName(), table);

    ASSERT_TRUE(c.renameTable(table, L"renamed 'x'"));
    EXPECT_FALSE(c.findTable(table));
    EXPECT_TRUE(c.deleteIndex(L"idx 'one'", false, L""));
    EXPECT_TRUE(c.deleteIndex(L"idx 'one'", false, L"")) << "a missing index is no failure";
    EXPECT_TRUE(c.deleteTable(L"renamed 'x'"));
    EXPECT_TRUE(c.deleteTable(L"renamed 'x'"));
    EXPECT_FALSE(c.findTable(L"renamed 'x'"));
}

TEST(SQLiteSchema, NotNullColumnsOnAFilledTableGetATypedDefault) {
    Database db("CREATE TABLE t(id INTEGER); INSERT INTO t VALUES (1), (2);");
    OxQelConnectionSQLite& c = db.connection();
    ASSERT_TRUE(c.createField(L"t", L"n", OxQel::Integer, 0, L"", false));
    ASSERT_TRUE(c.createField(L"t", L"r", OxQel::Double, 0, L"]]\"'[[", false));
    ASSERT_TRUE(c.createField(L"t", L"s", OxQel::WString, 0, L"", false));
    ASSERT_TRUE(c.createField(L"t", L"d", OxQel::WString, 0, L"]]abc[[", true));
    ASSERT_TRUE(c.createField(L"t", L"plain", OxQel::Double, 0, L"", true));
    EXPECT_EQ(db.raw().rows("SELECT typeof(n), n, typeof(r), r, typeof(s), s, d, typeof(plain) "
                            "FROM t WHERE id = 1"),
              std::vector<std::string>{"integer|0|real|0.0|text||abc|null"});

    OxQelFieldDefArray fields;
    ASSERT_TRUE(c.getFieldDef(L"t", L"*", fields));
    ASSERT_EQ(fields.size(), 6u);
    EXPECT_EQ(fields[4].getDefaultValue(), L"abc") << "a text default comes back unquoted";
    EXPECT_FALSE(fields[1].getCanBeNull());
    EXPECT_TRUE(fields[5].getCanBeNull());
    EXPECT_EQ(fields[5].getFieldType(), OxQel::Double);
}

TEST(SQLiteSchema, ADefaultValueCannotSmuggleInAStatement) {
    Database db("CREATE TABLE victim(a); CREATE TABLE t(a);");
    OxQelConnectionSQLite& c = db.connection();
    LogCapture log;
    EXPECT_FALSE(c.createField(L"t", L"b", OxQel::Integer, 0, L"0; DROP TABLE victim", false));
    EXPECT_FALSE(c.createTable(L"u", L"b", OxQel::Integer, 0, L"1) ; DROP TABLE victim; --", true));
    EXPECT_TRUE(c.findTable(L"victim"));
    EXPECT_FALSE(c.findTable(L"u"));
    EXPECT_TRUE(log.contains("DROP TABLE victim"));
}

TEST(SQLiteSchema, FieldDefinitionsReadBackFromTheCatalogue) {
    Database db(
        "CREATE TABLE t(id INTEGER PRIMARY KEY, v VARCHAR(40) NOT NULL, "
        "txt TEXT DEFAULT 'abc', n INT, r REAL, b BLOB, q TEXT DEFAULT '''');");
    OxQelConnectionSQLite& c = db.connection();
    OxQelFieldDefArray fields;
    ASSERT_TRUE(c.getFieldDef(L"t", L"*", fields));
    ASSERT_EQ(names(fields),
              (std::vector<std::wstring>{L"id", L"v", L"txt", L"n", L"r", L"b", L"q"}));
    EXPECT_EQ(fields[0].getFieldType(), OxQel::Integer);
    EXPECT_FALSE(fields[0].getNoAuto()) << "a primary key column is filled by the engine";
    EXPECT_TRUE(fields[1].getNoAuto());
    EXPECT_EQ(fields[1].getFieldType(), OxQel::Unknown);
    EXPECT_EQ(fields[1].getFieldSize(), 0);
    EXPECT_FALSE(fields[1].getCanBeNull());
    EXPECT_EQ(fields[2].getFieldType(), OxQel::WString);
    EXPECT_EQ(fields[2].getDefaultValue(), L"abc");
    EXPECT_EQ(fields[3].getFieldType(), OxQel::Unknown) << "INT is no exact type name";
    EXPECT_EQ(fields[4].getFieldType(), OxQel::Double);
    EXPECT_EQ(fields[5].getFieldType(), OxQel::Binary);
    EXPECT_EQ(fields[6].getDefaultValue(), L"''");

    // A list names the columns wanted; they come in table order.
    ASSERT_TRUE(c.getFieldDef(L"t", L"R,id", fields));
    EXPECT_EQ(names(fields), (std::vector<std::wstring>{L"id", L"r"}));
    ASSERT_TRUE(c.getFieldDef(L"missing", L"*", fields));
    EXPECT_TRUE(fields.empty());

    OxQelFieldDef one;
    EXPECT_TRUE(c.getFieldDefByName(L"t", L"TXT", one));
    EXPECT_EQ(one.getFieldName(), L"txt");
    EXPECT_FALSE(c.getFieldDefByName(L"t", L"nothing", one));

    OxQelConnectionSQLite closed;
    EXPECT_FALSE(closed.getFieldDef(L"t", L"*", fields));
}

TEST(SQLiteSchema, ObjectListsFollowTheMask) {
    Database db(
        "CREATE TABLE t(a UNIQUE, b); CREATE VIEW v AS SELECT a FROM t; "
        "CREATE INDEX ib ON t(b, a); CREATE TRIGGER tr AFTER INSERT ON t BEGIN SELECT 1; END;");
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_EQ(tableNames(c, OxQelTableDef::Table), std::vector<std::wstring>{L"t"});
    EXPECT_EQ(tableNames(c, OxQelTableDef::View), std::vector<std::wstring>{L"v"});
    EXPECT_EQ(tableNames(c, OxQelTableDef::Table | OxQelTableDef::View),
              (std::vector<std::wstring>{L"t", L"v"}));
    EXPECT_EQ(tableNames(c, OxQelTableDef::AllTypes),
              (std::vector<std::wstring>{L"ib", L"sqlite_autoindex_t_1", L"t", L"tr", L"v"}));
    EXPECT_TRUE(tableNames(c, OxQelTableDef::Procedure).empty());
    EXPECT_FALSE(c.findTable(L"v")) << "a view is no table";

    std::vector<OxQelIndexDef> indexes;
    ASSERT_TRUE(c.getIndexDef(L"t", indexes));
    ASSERT_EQ(indexes.size(), 2u);
    for (const auto& index : indexes) {
        if (index.getIndexName() == L"ib") {
            EXPECT_EQ(index.getListFieldInString(), L"b,a");
            EXPECT_FALSE(index.isUnique());
        } else {
            EXPECT_EQ(index.getListFieldInString(), L"a");
            EXPECT_TRUE(index.isUnique());
        }
    }
}

TEST(SQLiteSchema, IndexesAndViews) {
    Database db("CREATE TABLE t(a, b); INSERT INTO t VALUES (1, 'x'), (2, 'it''s');");
    OxQelConnectionSQLite& c = db.connection();
    ASSERT_TRUE(c.createIndex(L"pk", true, false, true, L"t", L"a"));
    EXPECT_FALSE(c.execute(L"INSERT INTO t VALUES (1, 'again')"))
        << "the primary flag alone makes the index unique";
    ASSERT_TRUE(c.createView(L"[v]", L"SELECT a FROM [t] WHERE b = ]]it's[["));
    EXPECT_EQ(db.raw().rows("SELECT a FROM v"), std::vector<std::string>{"2"});
    EXPECT_TRUE(c.deleteView(L"v"));
    EXPECT_EQ(tableNames(c, OxQelTableDef::View), std::vector<std::wstring>{});
    EXPECT_FALSE(c.modifyTable(L"t", OxQelFieldDefArray()));
    EXPECT_FALSE(c.resizeFieldString(L"t", L"b", 10));
}

TEST(SQLiteSchema, DeleteFieldRebuildsAFilledTable) {
    Database db(
        "CREATE TABLE \"o'rders\"(id INTEGER, gone TEXT, price REAL NOT NULL DEFAULT 1.5, "
        "data BLOB, note TEXT DEFAULT 'n/a');"
        "INSERT INTO \"o'rders\" VALUES (1, 'a', 2.25, x'00ff00', NULL), "
        "(9007199254740993, 'b', 0.1, NULL, 'it''s');"
        "CREATE INDEX price_index ON \"o'rders\"(price);"
        "CREATE VIEW expensive AS SELECT id FROM \"o'rders\" WHERE price > 1;");
    OxQelConnectionSQLite& c = db.connection();
    ASSERT_TRUE(c.deleteField(L"o'rders", L"GONE"));
    EXPECT_FALSE(c.isInTransaction());
    OxQelFieldDefArray fields;
    ASSERT_TRUE(c.getFieldDef(L"o'rders", L"*", fields));
    EXPECT_EQ(names(fields), (std::vector<std::wstring>{L"id", L"price", L"data", L"note"}));
    EXPECT_FALSE(fields[1].getCanBeNull());
    EXPECT_EQ(fields[3].getDefaultValue(), L"n/a");
    // Every value of the kept columns survives exactly, NULLs and blobs included.
    EXPECT_EQ(
        db.raw().rows("SELECT id, quote(price), quote(data), quote(note) FROM \"o'rders\" "
                      "ORDER BY id"),
        (std::vector<std::string>{"1|2.25|X'00FF00'|NULL", "9007199254740993|0.1|NULL|'it''s'"}));
    std::vector<OxQelIndexDef> indexes;
    ASSERT_TRUE(c.getIndexDef(L"o'rders", indexes));
    EXPECT_TRUE(indexes.empty()) << "indexes are not carried over";
    EXPECT_FALSE(c.findTable(L"o'rders_tmpTable"));
    // Other objects naming the table find the rebuilt one.
    EXPECT_EQ(db.raw().rows("SELECT id FROM expensive"), std::vector<std::string>{"1"});

    Database single("CREATE TABLE one(a); INSERT INTO one VALUES (5);");
    EXPECT_FALSE(single.connection().deleteField(L"one", L"a"));
    EXPECT_EQ(single.raw().scalar("SELECT a FROM one"), "5");
}

TEST(SQLiteSchema, ModifyFieldTypeRebuildsTheColumn) {
    Database db(
        "CREATE TABLE \"my t\"(id INTEGER, \"the n\" TEXT, keep REAL);"
        "INSERT INTO \"my t\" VALUES (1, '12', 0.5), (2, '7', NULL);");
    OxQelConnectionSQLite& c = db.connection();
    OxQelFieldDef integer;
    integer.setFieldName(L"the n");
    integer.setFieldType(OxQel::Integer);
    integer.setCanBeNull(true);
    ASSERT_TRUE(c.modifyFieldType(L"my t", L"the n", integer));
    EXPECT_FALSE(c.isInTransaction());
    EXPECT_EQ(db.raw().rows("SELECT id, typeof(\"the n\"), \"the n\", quote(keep) FROM \"my t\" "
                            "ORDER BY id"),
              (std::vector<std::string>{"1|integer|12|0.5", "2|integer|7|NULL"}));
    OxQelFieldDef read;
    ASSERT_TRUE(c.getFieldDefByName(L"my t", L"the n", read));
    EXPECT_EQ(read.getFieldType(), OxQel::Integer);
    EXPECT_FALSE(c.findField(L"my t", L"the n_rename"));

    // A failing step rolls the whole change back.
    OxQelFieldDef clash = integer;
    clash.setFieldName(L"id");
    EXPECT_FALSE(c.modifyFieldType(L"my t", L"keep", clash));
    EXPECT_FALSE(c.isInTransaction());
    EXPECT_TRUE(c.findField(L"my t", L"keep"));
    EXPECT_FALSE(c.findField(L"my t", L"keep_rename"));
    EXPECT_FALSE(c.modifyFieldType(L"my t", L"missing", integer));
}

// What a copy of a real database asks of the schema operations.
TEST(SQLiteSchema, EngineObjectsAndExpressionDefaultsSurviveACopy) {
    Database db(
        "CREATE TABLE seq (id INTEGER PRIMARY KEY AUTOINCREMENT, a TEXT UNIQUE);"
        "INSERT INTO seq (a) VALUES ('x');");
    OxQelConnectionSQLite& c = db.connection();
    std::vector<OxQelTableDef> tables;
    ASSERT_TRUE(c.getTableDef(tables, OxQelTableDef::Table));
    ASSERT_EQ(tables.size(), 1u) << "the engine's sqlite_sequence is no user table";
    EXPECT_EQ(tables[0].getTableName(), L"seq");
    ASSERT_TRUE(c.getTableDef(tables, OxQelTableDef::SystemTable));
    ASSERT_EQ(tables.size(), 1u);
    EXPECT_EQ(tables[0].getTableName(), L"sqlite_sequence");

    // An index of a constraint carries a reserved name; made again, it drops the prefix.
    std::vector<OxQelIndexDef> indexes;
    ASSERT_TRUE(c.getIndexDef(L"seq", indexes));
    ASSERT_EQ(indexes.size(), 1u);
    EXPECT_EQ(indexes[0].getIndexName(), L"sqlite_autoindex_seq_1");
    ASSERT_TRUE(c.createTable(L"copy", L"a", OxQel::WString, 10, L"", true));
    EXPECT_TRUE(c.createIndex(indexes[0].getIndexName(), false, true, false, L"copy", L"a"));
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM sqlite_master WHERE name = 'autoindex_seq_1'"),
              "1");

    // Defaults that are expressions keep their quotes, also where ADD COLUMN refuses them.
    ASSERT_TRUE(c.createField(L"seq", L"stamp", OxQel::Unknown, 0, L"strftime('%Y','now')", false));
    ASSERT_TRUE(c.createField(L"seq", L"at", OxQel::Unknown, 0, L"CURRENT_TIMESTAMP", true));
    auto raw = db.raw();
    raw.exec("INSERT INTO seq (a) VALUES ('y');");
    EXPECT_EQ(
        raw.scalar("SELECT stamp = strftime('%Y','now') AND at IS NOT NULL FROM seq WHERE a = 'y'"),
        "1");
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM seq"), "2") << "the rebuild kept the rows";
    EXPECT_EQ(
        raw.scalar("SELECT count(*) FROM sqlite_master WHERE name = 'sqlite_autoindex_seq_1'"), "1")
        << "and the table's own constraints";
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM sqlite_master WHERE name LIKE '%oxrebuild%'"), "0");
}
