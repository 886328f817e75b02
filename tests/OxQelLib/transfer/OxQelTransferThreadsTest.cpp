#include <gtest/gtest.h>

#include "OxQelLib/transfer/OxQelImportExportDatabase.h"
#include "OxQelLib/transfer/OxQelImportExportMultiDatabase.h"
#include "OxQelLib/transfer/OxQelWorkerPool.h"
#include "TransferTestSupport.h"

using namespace OxTransferTest;

namespace {
// A source of many tables and a destination whose connections write from several threads.
class MultiThreadCopyTest : public ::testing::Test {
protected:
    void open(int tables, int rows) {
        source = std::make_unique<DbFile>(tablesSql(tables, rows));
        destination.raw().exec("PRAGMA journal_mode=WAL;");
        script->writeMultiThread = true;
        ASSERT_TRUE(from.openConnection(source->path().wstring(), L"", L"", L""));
        ASSERT_TRUE(to.open(destination.path()));
    }
    OxQel::SQLError copy() { return OxQelImportExportDatabase(from, to, &reactor).run(); }
    std::string count(const std::string& table) {
        return destination.raw().scalar("SELECT count(*) FROM sqlite_master WHERE name = '" +
                                        table + "'") == "0"
                   ? "missing"
                   : destination.raw().scalar("SELECT count(*) FROM " + table);
    }

    std::unique_ptr<DbFile> source;
    DbFile destination;
    std::shared_ptr<Script> script = std::make_shared<Script>();
    OxQelConnectionSQLite from;
    ScriptedSQLite to{script};
    RecordingReactor reactor;
};

TEST_F(MultiThreadCopyTest, EveryTableArrivesWithItsRowsAndIndexes) {
    open(20, 300);
    EXPECT_EQ(copy(), OxQel::NoError);
    EXPECT_EQ(reactor.stepCounts, std::vector<int>{20});
    EXPECT_EQ(reactor.advances, 20);
    EXPECT_TRUE(reactor.onlyFromCaller);
    EXPECT_EQ(script->newConnections, 20);  // one new destination connection per table
    auto src = source->raw();
    auto dst = destination.raw();
    for (int t = 0; t < 20; ++t) {
        const std::string name = "t" + std::to_string(t);
        const std::string rows =
            "SELECT id, name, qty, price, hex(data) FROM " + name + " ORDER BY id";
        EXPECT_EQ(dst.rows(rows), src.rows(rows)) << name;
        EXPECT_EQ(dst.scalar("SELECT count(*) FROM sqlite_master WHERE name = 'ix_" + name + "'"),
                  "1");
    }
    EXPECT_EQ(dst.scalar("PRAGMA integrity_check"), "ok");
    // With more than one hardware thread the copies overlapped.
    if (OxQelWorkerPool::hardwareThreads() > 1) {
        EXPECT_GE(script->writerThreads.size(), 2u);
        EXPECT_GE(script->mostInFlight.load(), 2);
    }
}

TEST_F(MultiThreadCopyTest, EveryTableIsAttemptedAndTheEarliestFailureReturned) {
    open(6, 20);
    script->refuseCreateTable = {L"t1", L"t4"};
    EXPECT_EQ(copy(), OxQel::ErrorStatement);
    EXPECT_EQ(reactor.advances, 2);  // after t0 and after the failing t1
    EXPECT_EQ(count("t0"), "20");
    EXPECT_EQ(count("t1"), "missing");
    EXPECT_EQ(count("t2"), "20");  // attempted although t1 had failed
    EXPECT_EQ(count("t5"), "20");
    EXPECT_EQ(script->inFlight.load(), 0);
}

TEST_F(MultiThreadCopyTest, AMissingConnectionOrAThrowingStepFailsOnlyItsTable) {
    open(4, 10);
    script->nullConnectionAt = 2;        // t1 gets no destination connection
    script->throwOnIndexesOf = {L"t2"};  // t2 throws inside the worker
    EXPECT_EQ(copy(), OxQel::ErrorConnection);
    EXPECT_EQ(count("t0"), "10");
    EXPECT_EQ(count("t1"), "missing");
    EXPECT_EQ(count("t2"), "missing");  // rolled back
    EXPECT_EQ(count("t3"), "10");
}

TEST(MultiDatabaseCopyTest, CouplesAreKeptOnceAndOnlyWhenOpen) {
    DbFile a(tablesSql(1, 1)), b;
    OxQelConnectionSQLite from, to, closed;
    ASSERT_TRUE(from.openConnection(a.path().wstring(), L"", L"", L""));
    ASSERT_TRUE(to.openConnection(b.path().wstring(), L"", L"", L""));
    OxQelImportExportMultiDatabase multi;
    EXPECT_TRUE(multi.addCoupleOfConnection(&from, &to));
    EXPECT_FALSE(multi.addCoupleOfConnection(&from, &to));
    EXPECT_TRUE(multi.addCoupleOfConnection(&to, &from));
    EXPECT_FALSE(multi.addCoupleOfConnection(&from, &closed));
    EXPECT_FALSE(multi.addCoupleOfConnection(nullptr, &to));
    multi.clearAll();
    EXPECT_EQ(multi.run(), OxQel::NoError);
}

TEST(MultiDatabaseCopyTest, AllCopiesRunAndTheEarliestFailureInSetOrderWins) {
    auto script = std::make_shared<Script>();
    script->refuseCreateTable.insert(L"t0");
    std::vector<std::unique_ptr<DbFile>> files;
    for (int i = 0; i < 6; ++i)
        files.push_back(std::make_unique<DbFile>(i % 2 == 0 ? tablesSql(2, 30) : ""));
    OxQelConnectionSQLite sources[3];
    std::unique_ptr<ScriptedSQLite> refusing = std::make_unique<ScriptedSQLite>(script);
    std::unique_ptr<ScriptedSQLite> plain[2] = {
        std::make_unique<ScriptedSQLite>(std::make_shared<Script>()),
        std::make_unique<ScriptedSQLite>(std::make_shared<Script>())};
    OxQelIConnection* destinations[3] = {plain[0].get(), plain[1].get(), refusing.get()};
    OxQelImportExportMultiDatabase multi;
    for (int i = 0; i < 3; ++i) {
        ASSERT_TRUE(sources[i].openConnection(files[2 * i]->path().wstring(), L"", L"", L""));
        ASSERT_TRUE(static_cast<ScriptedSQLite*>(destinations[i])->open(files[2 * i + 1]->path()));
        ASSERT_TRUE(multi.addCoupleOfConnection(&sources[i], destinations[i]));
    }
    // The second couple's destination is closed after it was added: it fails as not open.
    destinations[1]->closeDatabase();
    // Of the failing couples (1: not open, 2: a refused table) the one first by address wins.
    const bool connectionFirst = &sources[1] < &sources[2];
    EXPECT_EQ(multi.run(), connectionFirst ? OxQel::ErrorConnection : OxQel::ErrorStatement);
    // Every couple ran to its end: the good copy is complete, the refusing one attempted.
    EXPECT_EQ(files[1]->raw().scalar("SELECT count(*) FROM t1"), "30");
    EXPECT_EQ(files[5]->raw().scalar("SELECT count(*) FROM sqlite_master WHERE name = 't0'"), "0");
    EXPECT_EQ(multi.run(),
              connectionFirst ? OxQel::ErrorConnection : OxQel::ErrorStatement);  // the set is kept
}
}  // namespace
