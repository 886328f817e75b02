#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "SQLiteTestSupport.h"

using OxSQLiteTest::Database;
using OxSQLiteTest::LogCapture;
using OxSQLiteTest::RawDb;
using Clock = std::chrono::steady_clock;

TEST(SQLiteBusy, AWaiterGoesOnWhenTheWriterReleasesItsLock) {
    Database db("CREATE TABLE t(a);");
    RawDb writer(db.path());
    writer.exec("BEGIN EXCLUSIVE; INSERT INTO t VALUES (1);");
    std::thread release([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(400));
        writer.exec("COMMIT");
    });
    const auto start = Clock::now();
    EXPECT_TRUE(db.connection().execute(L"INSERT INTO t VALUES (2)"));
    const auto waited = Clock::now() - start;
    release.join();
    EXPECT_GE(waited, std::chrono::milliseconds(300));
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM t"), "2");
}

TEST(SQLiteBusy, AWaiterGivesUpWhenTheLockStays) {
    Database db("CREATE TABLE t(a);");
    RawDb writer(db.path());
    writer.exec("BEGIN EXCLUSIVE;");
    LogCapture log;
    const auto start = Clock::now();
    EXPECT_FALSE(db.connection().execute(L"INSERT INTO t VALUES (2)"));
    const auto waited = Clock::now() - start;
    // 200 tries 50 ms apart.
    EXPECT_GE(waited, std::chrono::seconds(9));
    EXPECT_LT(waited, std::chrono::seconds(60));
    EXPECT_TRUE(log.contains("The database file is locked "));
    EXPECT_EQ(db.connection().getLastError(), OxQel::ErrorConnection);
    writer.exec("ROLLBACK");
    EXPECT_TRUE(db.connection().execute(L"INSERT INTO t VALUES (3)"));
}
