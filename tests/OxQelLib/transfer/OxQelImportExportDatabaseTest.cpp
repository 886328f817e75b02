#include <gtest/gtest.h>

#include <filesystem>

#include "OxQelLib/transfer/OxQelImportExportDatabase.h"
#include "TransferTestSupport.h"

using namespace OxTransferTest;

namespace {
TEST(DatabaseFileCopyTest, TwoSQLiteFilesCopyAsAFileWithTheLogIncluded) {
    DbFile source(tablesSql(2, 50));
    // Committed rows that live only in the write-ahead log, held there by a reader that
    // keeps the log from being folded back.
    OxSQLiteTest::RawDb writer(source.path());
    writer.exec(
        "PRAGMA wal_autocheckpoint=0; INSERT INTO t0 (id, name) VALUES (1000, 'in the log');");
    DbFile destination("CREATE TABLE old (x);");
    OxQelConnectionSQLite from, to;
    ASSERT_TRUE(from.openConnection(source.path().wstring(), L"", L"", L""));
    ASSERT_TRUE(to.openConnection(destination.path().wstring(), L"", L"", L""));
    RecordingReactor reactor;
    EXPECT_EQ(OxQelImportExportDatabase(from, to, &reactor).run(), OxQel::NoError);
    EXPECT_FALSE(to.isOpen());
    EXPECT_TRUE(from.isOpen());
    EXPECT_TRUE(reactor.stepCounts.empty());
    EXPECT_EQ(reactor.advances, 0);
    auto copy = destination.raw();
    EXPECT_EQ(copy.scalar("SELECT name FROM t0 WHERE id = 1000"), "in the log");
    EXPECT_EQ(copy.scalar("SELECT count(*) FROM t1"), "50");
    EXPECT_EQ(copy.scalar("SELECT count(*) FROM sqlite_master WHERE name = 'old'"), "0");
    EXPECT_EQ(copy.scalar("PRAGMA integrity_check"), "ok");
    for (const auto& entry : std::filesystem::directory_iterator(destination.dir.path()))
        EXPECT_EQ(entry.path().filename().string().find(".oxtmp"), std::string::npos);
}

TEST(DatabaseFileCopyTest, ACopyOntoItselfIsRefusedAndTouchesNothing) {
    DbFile source(tablesSql(1, 10));
    std::filesystem::create_symlink(source.path(), source.dir.file("alias.sqlite"));
    for (const auto& other : {source.path(), source.dir.file("alias.sqlite")}) {
        OxQelConnectionSQLite from, to;
        ASSERT_TRUE(from.openConnection(source.path().wstring(), L"", L"", L""));
        ASSERT_TRUE(to.openConnection(other.wstring(), L"", L"", L""));
        EXPECT_EQ(OxQelImportExportDatabase(from, to, nullptr).run(), OxQel::ErrorUnknown);
        EXPECT_TRUE(to.isOpen());
        EXPECT_EQ(source.raw().scalar("SELECT count(*) FROM t0"), "10");
    }
}

TEST(DatabaseCopyTest, DifferentClassesCopyTableByTableOnTheCallingThread) {
    DbFile source(tablesSql(3, 20) + "CREATE VIEW v AS SELECT * FROM t0;");
    DbFile destination;
    auto script = std::make_shared<Script>();
    OxQelConnectionSQLite from;
    ScriptedSQLite to(script);
    ASSERT_TRUE(from.openConnection(source.path().wstring(), L"", L"", L""));
    ASSERT_TRUE(to.open(destination.path()));
    RecordingReactor reactor;
    EXPECT_EQ(OxQelImportExportDatabase(from, to, &reactor).run(), OxQel::NoError);
    EXPECT_EQ(reactor.stepCounts, std::vector<int>{3});
    EXPECT_EQ(reactor.advances, 3);
    EXPECT_EQ(script->newConnections, 0);
    auto raw = destination.raw();
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM t2"), "20");
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM sqlite_master WHERE name = 'v'"),
              "0");  // views are not copied
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM sqlite_master WHERE name = 'ix_t1'"), "1");
}

TEST(DatabaseCopyTest, SingleThreadStopsAtTheFirstFailingTable) {
    DbFile source(tablesSql(3, 5));
    DbFile destination;
    auto script = std::make_shared<Script>();
    script->refuseCreateTable.insert(L"t1");
    OxQelConnectionSQLite from;
    ScriptedSQLite to(script);
    ASSERT_TRUE(from.openConnection(source.path().wstring(), L"", L"", L""));
    ASSERT_TRUE(to.open(destination.path()));
    RecordingReactor reactor;
    EXPECT_EQ(OxQelImportExportDatabase(from, to, &reactor).run(), OxQel::ErrorStatement);
    EXPECT_EQ(reactor.advances, 1);
    auto raw = destination.raw();
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM t0"), "5");
    EXPECT_EQ(raw.scalar("SELECT count(*) FROM sqlite_master WHERE name IN ('t1', 't2')"), "0");
}

TEST(DatabaseCopyTest, NoTablesAndClosedConnections) {
    DbFile source("CREATE VIEW v AS SELECT 1;");
    DbFile destination;
    OxQelConnectionSQLite from;
    ScriptedSQLite to(std::make_shared<Script>());
    ASSERT_TRUE(from.openConnection(source.path().wstring(), L"", L"", L""));
    ASSERT_TRUE(to.open(destination.path()));
    RecordingReactor reactor;
    EXPECT_EQ(OxQelImportExportDatabase(from, to, &reactor).run(), OxQel::NoError);
    EXPECT_EQ(reactor.stepCounts, std::vector<int>{0});
    EXPECT_EQ(reactor.advances, 0);
    to.closeDatabase();
    EXPECT_EQ(OxQelImportExportDatabase(from, to, &reactor).run(), OxQel::ErrorConnection);
}
}  // namespace
