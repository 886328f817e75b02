// The core on real engines through the ODBC provider: the SQLite ODBC driver, and (built
// with OXQEL_ADO_TEST_SERVER) the private PostgreSQL server of the test fixture.
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>

#include "OxQelLib/ado/OxQelPreparedQueryADO.h"
#include "OxQelLib/ado/OxQelRecordsetADOSqlServer.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "TestConnectionADO.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/odbc/OdbcTestEnv.h"
#include "support/TestSupport.h"

using namespace OxAdo;

// The two programs built from this file name their suites apart: CTest needs one name
// per test.
#ifdef OXQEL_ADO_TEST_SERVER
#define EngineTest PostgresEngineTest
#else
#define EngineTest SqliteEngineTest
#endif

namespace {
#ifdef OXQEL_ADO_TEST_SERVER
constexpr bool kServer = true;
#else
constexpr bool kServer = false;
#endif

class EngineTest : public ::testing::Test {
protected:
    void SetUp() override {
        const auto& env = OdbcTest::Env::get();
        if (kServer) {
            ODBC_REQUIRE_POSTGRES();
            conn = std::make_unique<TestConnectionADO>(TestConnectionADO::Dialect::PostgreSQL);
            host = env.postgresHost() + L";DATABASE=" + env.postgresDatabase();
            user = env.postgresUser();
            password = env.postgresPassword();
        } else {
            conn = std::make_unique<TestConnectionADO>();
            host = OdbcTest::sqliteConnect(dir.file("ado.db"));
        }
        ASSERT_TRUE(conn->openConnection(L"", host, user, password));
        // Tables are named after the test, so that suites running at once never meet.
        prefix = OxText::fromUtf8(std::string("ado_") +
                                  ::testing::UnitTest::GetInstance()->current_test_info()->name());
        prefix = OxText::toLower(prefix);
        OxQel::Util::SilentReporting quiet;
        for (const wchar_t* t : {L"", L"_b", L"_new", L"_made", L"_keyless"})
            conn->execute(L"DROP TABLE IF EXISTS " + table(t));
        conn->execute(L"DROP VIEW IF EXISTS " + table(L"_v"));
    }

    void TearDown() override {
        if (!conn || !conn->isOpen())
            return;
        OxQel::Util::SilentReporting quiet;
        conn->execute(L"DROP VIEW IF EXISTS " + table(L"_v"));
        for (const wchar_t* t : {L"", L"_b", L"_new", L"_made", L"_keyless"})
            conn->execute(L"DROP TABLE IF EXISTS " + table(t));
    }

    std::wstring table(const std::wstring& suffix = {}) const { return prefix + suffix; }

    std::unique_ptr<TestConnectionADO> second() {
        auto* c = static_cast<TestConnectionADO*>(conn->createNewConnection());
        EXPECT_TRUE(c->isOpen());
        return std::unique_ptr<TestConnectionADO>(c);
    }

    // The rows of a query on the given connection, every value as text, "NULL" for NULL.
    std::vector<std::wstring> rows(OxQelIConnection& c, const std::wstring& sql) {
        std::vector<std::wstring> out;
        OxQelRecordsetADO rs;
        rs.setServerSideCursor(false);
        rs.setAdoCursorType(adOpenStatic);
        EXPECT_TRUE(rs.openSQL(&c, sql)) << sql;
        while (!rs.getEOF()) {
            std::wstring line;
            for (long i = 0; i < rs.getFieldCount(); ++i) {
                if (i)
                    line += L"|";
                line += rs.isFieldNull(i) ? L"NULL" : rs.getlFieldString(i);
            }
            out.push_back(line);
            rs.moveNext();
        }
        return out;
    }

    long count(OxQelIConnection& c, const std::wstring& tableName) {
        const auto r = rows(c, L"SELECT COUNT(*) FROM " + tableName);
        return r.empty() ? -1 : std::stol(r[0]);
    }

    std::wstring binaryType() const { return kServer ? L"BYTEA" : L"BLOB"; }
    std::wstring doubleType() const { return kServer ? L"DOUBLE PRECISION" : L"DOUBLE"; }

    OxTest::TempDir dir;
    std::unique_ptr<TestConnectionADO> conn;
    std::wstring host, user, password, prefix;
};
}  // namespace

TEST_F(EngineTest, OpenExecuteScriptModeAndTransactions) {
    EXPECT_TRUE(conn->isOpen());
    EXPECT_EQ(conn->getLastError(), OxQel::NoError);
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_FALSE(conn->findTable(table()));
    }
    ASSERT_TRUE(
        conn->execute(L"CREATE TABLE " + table() + L" (id INTEGER PRIMARY KEY, a VARCHAR(20))"));
    EXPECT_TRUE(conn->findTable(table()));
    EXPECT_TRUE(conn->findField(table(), L"a"));
    ASSERT_TRUE(conn->formatAndExecute(L"INSERT INTO [" + table() + L"] VALUES (1, ]]it's[[)"));
    EXPECT_EQ(rows(*conn, L"SELECT a FROM " + table()), std::vector<std::wstring>{L"it's"});

    // Script mode collects and runs nothing.
    conn->startScriptMode();
    EXPECT_TRUE(conn->execute(L"DELETE FROM " + table()));
    EXPECT_NE(conn->endScriptMode(), nullptr);
    EXPECT_EQ(count(*conn, table()), 1);

    auto other = second();
    ASSERT_TRUE(conn->startTransaction());
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table() + L" VALUES (2, 'b')"));
    ASSERT_TRUE(conn->rollbackTransaction(true));
    EXPECT_EQ(count(*other, table()), 1);
    ASSERT_TRUE(conn->startTransaction());
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table() + L" VALUES (3, 'c')"));
    ASSERT_TRUE(conn->closeTransaction());
    EXPECT_EQ(count(*other, table()), 2);

    // The engine's errors are classed.
    OxQel::Util::SilentReporting quiet;
    EXPECT_FALSE(conn->execute(L"SELEC nothing"));
    EXPECT_EQ(conn->getLastError(), OxQel::ErrorStatement);
    EXPECT_FALSE(conn->execute(L"INSERT INTO " + table() + L" VALUES (3, 'again')"));
    EXPECT_EQ(conn->getLastError(), OxQel::ErrorIntegrity);
    EXPECT_TRUE(conn->isOpen());

    EXPECT_TRUE(conn->closeDatabase());
    EXPECT_FALSE(conn->isOpen());
    EXPECT_EQ(conn->getLastError(), OxQel::ErrorUnknown);
}

TEST_F(EngineTest, SchemaIndexesAndRenames) {
    ASSERT_TRUE(conn->execute(L"CREATE TABLE " + table() +
                              L" (id INTEGER PRIMARY KEY, name VARCHAR(30), qty INTEGER)"));
    ASSERT_TRUE(conn->execute(L"CREATE VIEW " + table(L"_v") + L" AS SELECT id FROM " + table()));
    ASSERT_TRUE(conn->createIndex(table(L"_ix"), false, true, false, table(), L"name,qty"));

    std::vector<OxQelTableDef> tables;
    ASSERT_TRUE(conn->getTableDef(tables, OxQelTableDef::Table));
    auto has = [&](const std::wstring& name, OxQelTableDef::TableType type) {
        return std::any_of(tables.begin(), tables.end(), [&](const OxQelTableDef& t) {
            return t.getTableName() == name && t.getTableType() == type;
        });
    };
    EXPECT_TRUE(has(table(), OxQelTableDef::Table));
    EXPECT_FALSE(has(table(L"_v"), OxQelTableDef::View));
    ASSERT_TRUE(conn->getTableDef(tables, OxQelTableDef::View));
    EXPECT_TRUE(has(table(L"_v"), OxQelTableDef::View));

    // Indexes merge into what the array holds.
    std::vector<OxQelIndexDef> indexes(1);
    indexes[0].setIndexName(L"kept");
    ASSERT_TRUE(conn->getIndexDef(table(), indexes));
    ASSERT_GE(indexes.size(), 3u);
    EXPECT_EQ(indexes[0].getIndexName(), L"kept");
    const auto ix = std::find_if(indexes.begin(), indexes.end(), [&](const OxQelIndexDef& d) {
        return d.getIndexName() == table(L"_ix");
    });
    ASSERT_NE(ix, indexes.end());
    EXPECT_EQ(ix->getListFieldInString(), L"name,qty");
    EXPECT_TRUE(ix->isUnique());
    EXPECT_FALSE(ix->isPrimaryKey());
    EXPECT_TRUE(std::any_of(indexes.begin(), indexes.end(), [](const OxQelIndexDef& d) {
        return d.isPrimaryKey() && d.getListFieldInString() == L"id";
    }));

    ASSERT_TRUE(conn->execute(L"DROP VIEW " + table(L"_v")));
    ASSERT_TRUE(conn->renameField(table(), L"qty", L"amount"));
    EXPECT_TRUE(conn->findField(table(), L"amount"));
    ASSERT_TRUE(conn->renameTable(table(), table(L"_new")));
    EXPECT_TRUE(conn->findTable(table(L"_new")));
    OxQel::Util::SilentReporting quiet;
    EXPECT_FALSE(conn->findTable(table()));
    EXPECT_FALSE(conn->renameTable(table(), table(L"_b")));
}

TEST_F(EngineTest, ModifyTableMakesNewTablesThroughTheCatalog) {
    OxQelFieldDefArray fields;
    fields.resize(3);
    fields[0].setFieldName(L"code");
    fields[0].setFieldType(OxQel::Integer);
    fields[1].setFieldName(L"title");
    fields[1].setFieldType(OxQel::WString);
    fields[1].setFieldSize(40);
    fields[1].setDefaultValue(L"'none'");
    fields[2].setFieldName(L"born");
    fields[2].setFieldType(OxQel::Date);
    ASSERT_TRUE(conn->modifyTable(table(L"_made"), fields));
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table(L"_made") + L" (code) VALUES (7)"));
    EXPECT_EQ(rows(*conn, L"SELECT code, title, born FROM " + table(L"_made")),
              std::vector<std::wstring>{L"7|none|NULL"});
    OxQelFieldDefArray read;
    ASSERT_TRUE(conn->getFieldDef(table(L"_made"), L"*", read));
    ASSERT_EQ(read.size(), 3u);
    EXPECT_EQ(read[1].getFieldSize(), 40);
    EXPECT_EQ(read[2].getFieldType(), OxQel::Date);
    EXPECT_TRUE(read[2].getCanBeNull());
    // The default comes back from the catalog in the engine's own words.
    EXPECT_NE(read[1].getDefaultValue().find(L"none"), std::wstring::npos);
    OxQel::Util::SilentReporting quiet;
    EXPECT_FALSE(conn->modifyTable(table(L"_made"), fields));
}

TEST_F(EngineTest, EveryCursorTypeReadsEveryColumnType) {
    ASSERT_TRUE(conn->execute(
        oxFormat(L"CREATE TABLE %s (id INTEGER PRIMARY KEY, i INTEGER, bi BIGINT, d %s, n "
                 L"NUMERIC(10,2), s VARCHAR(40), t TEXT, dt DATE, ts TIMESTAMP, b BOOLEAN, bin %s)",
                 table(), doubleType(), binaryType())));
    ASSERT_TRUE(conn->execute(oxFormat(
        L"INSERT INTO %s VALUES (1, -7, 9007199254740993, 2.5, 12.34, 'Grüße', 'long text', "
        L"'2024-02-29', '2024-02-29 13:14:15', %s, %s)",
        table(), kServer ? L"TRUE" : L"1", kServer ? L"'\\xdeadbeef'" : L"X'DEADBEEF'")));
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table() + L" (id) VALUES (2)"));

    const struct {
        bool server;
        int cursor;
    } kinds[] = {{true, adOpenForwardOnly},
                 {true, adOpenKeyset},
                 {true, adOpenDynamic},
                 {true, adOpenStatic},
                 {false, adOpenStatic}};
    for (const auto& k : kinds) {
        SCOPED_TRACE(oxFormat(L"server %d cursor %d", k.server, k.cursor));
        OxQelRecordsetADO rs;
        rs.setServerSideCursor(k.server);
        rs.setAdoCursorType(k.cursor);
        ASSERT_TRUE(rs.openSQL(conn.get(), L"SELECT * FROM " + table() + L" ORDER BY id"));
        long l = 0;
        EXPECT_TRUE(rs.getField(L"i", l));
        EXPECT_EQ(l, -7);
        EXPECT_EQ(rs.getszFieldValue(L"bi").llVal(), 9007199254740993LL);
        double d = 0;
        EXPECT_TRUE(rs.getField(L"d", d));
        EXPECT_EQ(d, 2.5);
        EXPECT_TRUE(rs.getField(L"n", d));
        EXPECT_DOUBLE_EQ(d, 12.34);
        EXPECT_EQ(rs.getszFieldString(L"s"), L"Grüße");
        EXPECT_EQ(rs.getszFieldString(L"t"), L"long text");
        const OxVariant dt = rs.getszFieldValue(L"ts");
        ASSERT_EQ(dt.vt(), VT_DATE);
        const OxDateTime when(dt.date());
        EXPECT_EQ(when.getDay(), 29);
        EXPECT_EQ(when.getSecond(), 15);
        EXPECT_EQ(OxDateTime(rs.getszFieldValue(L"dt").date()).getMonth(), 2);
        bool b = false;
        EXPECT_TRUE(rs.getField(L"b", b));
        EXPECT_TRUE(b);
        const OxVariant bin = rs.getszFieldValue(L"bin");
        ASSERT_TRUE(bin.isByteArray());
        EXPECT_EQ(bin.bytes(), (std::vector<uint8_t>{0xDE, 0xAD, 0xBE, 0xEF}));
        EXPECT_EQ(rs.getFieldType(L"s"), OxQel::String);
        EXPECT_EQ(rs.getFieldSize(L"s"), 40);
        EXPECT_EQ(rs.getRecordCount(), 2);
        EXPECT_EQ(rs.getszFieldString(L"id"), L"1");  // counting put the cursor back
        ASSERT_TRUE(rs.moveNext());
        for (const wchar_t* c : {L"i", L"bi", L"d", L"n", L"s", L"t", L"dt", L"ts", L"b", L"bin"})
            EXPECT_TRUE(rs.isFieldNull(c)) << c;
        ASSERT_TRUE(rs.moveNext());
        EXPECT_TRUE(rs.getEOF());
    }
}

TEST_F(EngineTest, EditsReachTheDatabase) {
    ASSERT_TRUE(conn->execute(L"CREATE TABLE " + table() +
                              L" (id INTEGER PRIMARY KEY, name VARCHAR(20), qty INTEGER)"));
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table() + L" VALUES (1, 'Ann', 5)"));
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table() + L" VALUES (2, 'Bob', 6)"));
    auto other = second();
    const std::wstring all = L"SELECT id, name, qty FROM " + table() + L" ORDER BY id";
    {
        // Immediate edits on a client cursor.
        std::unique_ptr<OxQelRecordsetADO> rs(
            static_cast<OxQelRecordsetADO*>(conn->createOxQelIRecordset()));
        ASSERT_TRUE(rs->openSQL(conn.get(), L"SELECT * FROM " + table() + L" ORDER BY id"));
        ASSERT_TRUE(rs->moveNext());
        EXPECT_TRUE(rs->setField(L"name", std::wstring(L"Bobby")));
        EXPECT_TRUE(rs->update());
        EXPECT_TRUE(rs->addNew());
        EXPECT_TRUE(rs->setField(L"id", 3));
        EXPECT_TRUE(rs->setField(L"name", std::wstring(L"Cy")));
        EXPECT_TRUE(rs->update());
        EXPECT_TRUE(rs->moveFirst());
        EXPECT_TRUE(rs->remove());
        EXPECT_EQ(rows(*other, all), (std::vector<std::wstring>{L"2|Bobby|6", L"3|Cy|NULL"}));
    }
    {
        // A server-side keyset cursor with pessimistic locking writes at once too.
        OxQelRecordsetADOSqlServer rs;
        ASSERT_TRUE(rs.openSQL(conn.get(), L"SELECT * FROM " + table() + L" WHERE id = 3"));
        EXPECT_TRUE(rs.setField(L"qty", 9L));
        EXPECT_TRUE(rs.update());
        EXPECT_EQ(rows(*other, all).back(), L"3|Cy|9");
    }
    {
        // Batch edits wait for updateBatch.
        OxQelRecordsetADO rs;
        rs.setServerSideCursor(false);
        rs.setAdoCursorType(adOpenStatic);
        rs.setAdoLockType(adLockBatchOptimistic);
        ASSERT_TRUE(rs.openSQL(conn.get(), L"SELECT * FROM " + table() + L" ORDER BY id"));
        EXPECT_TRUE(rs.setField(L"qty", 1L));
        EXPECT_TRUE(rs.moveNext());
        EXPECT_TRUE(rs.remove());
        EXPECT_TRUE(rs.addNew());
        EXPECT_TRUE(rs.setField(L"id", 4));
        EXPECT_TRUE(rs.update());
        EXPECT_EQ(rows(*other, all).size(), 2u);
        EXPECT_TRUE(rs.updateBatch());
        EXPECT_EQ(rows(*other, all), (std::vector<std::wstring>{L"2|Bobby|1", L"4|NULL|NULL"}));
    }
    {
        // A row changed behind the cursor's back is not overwritten.
        OxQelRecordsetADO rs;
        rs.setServerSideCursor(false);
        rs.setAdoCursorType(adOpenStatic);
        rs.setAdoLockType(adLockOptimistic);
        ASSERT_TRUE(rs.openSQL(conn.get(), L"SELECT * FROM " + table() + L" WHERE id = 2"));
        ASSERT_TRUE(other->execute(L"UPDATE " + table() + L" SET qty = 50 WHERE id = 2"));
        EXPECT_TRUE(rs.setField(L"qty", 60L));
        OxQel::Util::SilentReporting quiet;
        EXPECT_FALSE(rs.update());
        EXPECT_EQ(rows(*other, all).front(), L"2|Bobby|50");
    }
}

TEST_F(EngineTest, TablesWithoutKeyNeverChangeTwoRowsAtOnce) {
    ASSERT_TRUE(
        conn->execute(L"CREATE TABLE " + table(L"_keyless") + L" (a INTEGER, b VARCHAR(5))"));
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table(L"_keyless") + L" VALUES (1, 'x')"));
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table(L"_keyless") + L" VALUES (1, 'x')"));
    ASSERT_TRUE(conn->execute(L"INSERT INTO " + table(L"_keyless") + L" VALUES (2, 'y')"));
    OxQelRecordsetADO rs;
    rs.setServerSideCursor(false);
    rs.setAdoCursorType(adOpenStatic);
    rs.setAdoLockType(adLockOptimistic);
    ASSERT_TRUE(rs.openSQL(conn.get(), L"SELECT a, b FROM " + table(L"_keyless") + L" ORDER BY a"));
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_TRUE(rs.setField(L"b", std::wstring(L"z")));
        EXPECT_FALSE(rs.update());
        EXPECT_TRUE(rs.cancelUpdate());
        EXPECT_FALSE(rs.remove());
    }
    ASSERT_TRUE(rs.moveLast());
    EXPECT_TRUE(rs.setField(L"b", std::wstring(L"w")));
    EXPECT_TRUE(rs.update());
    EXPECT_EQ(rows(*conn, L"SELECT a, b FROM " + table(L"_keyless") + L" ORDER BY a, b"),
              (std::vector<std::wstring>{L"1|x", L"1|x", L"2|w"}));
}

TEST_F(EngineTest, FindFilterAndSort) {
    ASSERT_TRUE(conn->execute(L"CREATE TABLE " + table() + L" (id INTEGER, name VARCHAR(20))"));
    for (const wchar_t* v : {L"(1, 'delta')", L"(2, 'Alpha')", L"(3, 'charlie')", L"(4, 'bravo')"})
        ASSERT_TRUE(conn->execute(L"INSERT INTO " + table() + L" VALUES " + v));
    std::unique_ptr<OxQelRecordsetADO> rs(
        static_cast<OxQelRecordsetADO*>(conn->createOxQelIRecordset()));
    ASSERT_TRUE(rs->openSQL(conn.get(), L"SELECT id, name FROM " + table() + L" ORDER BY id"));
    EXPECT_EQ(rs->findFirst(L"name LIKE 'c*'"), 1);
    EXPECT_EQ(rs->getszFieldString(L"id"), L"3");
    EXPECT_EQ(rs->findNext(L"id > 1"), 1);
    EXPECT_EQ(rs->getszFieldString(L"id"), L"4");
    EXPECT_EQ(rs->findNext(L"id > 1"), 0);
    EXPECT_EQ(rs->setFilter(std::wstring(L"id >= 2 AND name <> 'bravo'")), 1);
    EXPECT_EQ(rs->getRecordCount(), 2);
    EXPECT_TRUE(rs->setFilter(OxVariant(L"")));
    EXPECT_TRUE(rs->setSort(L"name DESC"));
    std::wstring order;
    while (!rs->getEOF()) {
        order += rs->getszFieldString(L"id");
        rs->moveNext();
    }
    EXPECT_EQ(order, L"1342");  // without regard to case
}

TEST_F(EngineTest, PreparedInsertsCreateThenRevalueTheirParameters) {
    ASSERT_TRUE(conn->execute(oxFormat(
        L"CREATE TABLE %s (a INTEGER, b VARCHAR(10), c TIMESTAMP, d %s)", table(), binaryType())));
    std::unique_ptr<OxQelIPreparedQuery> q(conn->createOxQelIPrepraredQuery());
    ASSERT_NE(q, nullptr);
    ASSERT_TRUE(q->prepareQuery(L"INSERT INTO " + table() +
                                L" (a, b, c, d) VALUES (]]]1[[[, ]]]2[[[, ]]]3[[[, ]]]4[[[)"));
    EXPECT_TRUE(q->bindParameter(1, 5L));
    EXPECT_TRUE(q->bindParameter(2, std::wstring(L"x")));
    EXPECT_TRUE(q->bindParameter(3, OxDateTime(2024, 5, 6, 7, 8, 9)));
    EXPECT_TRUE(q->bindParameterVariant(4, OxVariant::fromBytes({1, 2, 3}), OxQel::Binary));
    ASSERT_TRUE(q->executePreparedQuery());
    EXPECT_TRUE(q->bindParameter(2, std::wstring(L"y")));
    ASSERT_TRUE(q->executePreparedQuery());
    OxQelRecordsetADO rs;
    rs.setServerSideCursor(false);
    rs.setAdoCursorType(adOpenStatic);
    ASSERT_TRUE(rs.openSQL(conn.get(), L"SELECT a, b, c, d FROM " + table() + L" ORDER BY b"));
    ASSERT_EQ(rs.getRecordCount(), 2);
    EXPECT_EQ(rs.getszFieldString(L"b"), L"x");
    EXPECT_EQ(OxDateTime(rs.getszFieldValue(L"c").date()).getHour(), 7);  // time kept
    EXPECT_EQ(rs.getszFieldValue(L"d").bytes(), (std::vector<uint8_t>{1, 2, 3}));
    rs.moveNext();
    EXPECT_EQ(rs.getszFieldString(L"a"), L"5");
    EXPECT_EQ(rs.getszFieldString(L"b"), L"y");
    rs.close();

    // A gap in the bound indexes stops the walk: the insert fails and writes nothing.
    OxQelPreparedQueryADO gap;
    ASSERT_TRUE(gap.setConnection(conn.get()));
    ASSERT_TRUE(gap.prepareQuery(L"INSERT INTO " + table() + L" (a, b) VALUES (]]]1[[[, ]]]2[[[)"));
    gap.bindParameter(2, std::wstring(L"z"));
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_FALSE(gap.executePreparedQuery());
    }
    EXPECT_EQ(count(*conn, table()), 2);
}

#ifdef OXQEL_ADO_TEST_SERVER
TEST_F(EngineTest, ADroppedConnectionIsNotOpen) {
    const auto pid = rows(*conn, L"SELECT pg_backend_pid()");
    ASSERT_EQ(pid.size(), 1u);
    auto other = second();
    ASSERT_EQ(rows(*other, L"SELECT pg_terminate_backend(" + pid[0] + L")").size(), 1u);
    OxQel::Util::SilentReporting quiet;
    EXPECT_FALSE(conn->execute(L"SELECT 1"));
    EXPECT_FALSE(conn->isOpen());
    EXPECT_FALSE(conn->startTransaction());
    EXPECT_TRUE(conn->closeDatabase());
}
#endif
