#include <gtest/gtest.h>

#include <memory>

#include "platform/core/OxVariant.h"
#include "platform/odbc/OdbcTableTest.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxOdbcDatabase.h"
#include "platform/odbc/OxOdbcRecordset.h"
#include "platform/odbc/OxOdbcStatement.h"

namespace {
class OdbcRecordset : public OdbcTest::TableTest {
protected:
    OdbcRecordset() : TableTest(L"odbc_numbers") {}
    void SetUp() override {
        TableTest::SetUp();
        if (IsSkipped() || HasFatalFailure())
            return;
        m_db.executeSQL(L"CREATE TABLE " + m_table + L" (i INTEGER, s VARCHAR(20))");
        for (int i = 1; i <= 10; ++i)
            m_db.executeSQL(L"INSERT INTO " + m_table + L" VALUES (" + std::to_wstring(i) +
                            L", 'n" + std::to_wstring(i) + L"')");
    }
    long current(OxOdbcRecordset& rs) {
        const OxDBVariant& v = rs.getFieldValue(0);
        EXPECT_EQ(v.m_dwType, OxDBVariant::DBVT_LONG);
        return v.m_lVal;
    }
};

TEST_P(OdbcRecordset, MovesInEveryDirectionOnAStaticCursor) {
    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT i FROM " + m_table + L" ORDER BY i");
    ASSERT_TRUE(rs.canScroll());
    EXPECT_FALSE(rs.isBOF());
    EXPECT_EQ(current(rs), 1);
    rs.moveNext();
    EXPECT_EQ(current(rs), 2);
    rs.moveLast();
    EXPECT_EQ(current(rs), 10);
    rs.moveNext();
    EXPECT_TRUE(rs.isEOF());
    EXPECT_FALSE(rs.isBOF());
    EXPECT_THROW(rs.getFieldValue(0), OxDBException);
    rs.movePrev();  // from after the end back onto the last row
    EXPECT_EQ(current(rs), 10);
    rs.move(-3);
    EXPECT_EQ(current(rs), 7);
    rs.move(0);
    EXPECT_EQ(current(rs), 7);
    rs.move(20);
    EXPECT_TRUE(rs.isEOF());
    rs.move(-2);
    EXPECT_EQ(current(rs), 9);
    rs.move(4, SQL_FETCH_ABSOLUTE);
    EXPECT_EQ(current(rs), 4);
    rs.moveFirst();
    EXPECT_EQ(current(rs), 1);
    rs.movePrev();
    EXPECT_TRUE(rs.isBOF());
    EXPECT_FALSE(rs.isEOF());
    EXPECT_THROW(rs.movePrev(), OxDBException);
    rs.move(3);
    EXPECT_EQ(current(rs), 3);
}

TEST_P(OdbcRecordset, CountsTheRowsVisited) {
    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT i FROM " + m_table + L" ORDER BY i");
    EXPECT_EQ(rs.getRecordCount(), 1);
    rs.move(4);
    EXPECT_EQ(rs.getRecordCount(), 5);
    rs.moveFirst();
    EXPECT_EQ(rs.getRecordCount(), 5);
    while (!rs.isEOF()) rs.moveNext();
    EXPECT_EQ(rs.getRecordCount(), 10);
    EXPECT_THROW(rs.moveNext(), OxDBException);
    rs.movePrev();
    EXPECT_EQ(current(rs), 10);
}

TEST_P(OdbcRecordset, EmptyResultsAndResultsWithoutColumns) {
    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT i FROM " + m_table + L" WHERE i > 100");
    EXPECT_TRUE(rs.isBOF());
    EXPECT_TRUE(rs.isEOF());
    EXPECT_EQ(rs.getODBCFieldCount(), 1);
    rs.moveFirst();
    rs.moveLast();
    EXPECT_TRUE(rs.isBOF() && rs.isEOF());
    EXPECT_THROW(rs.moveNext(), OxDBException);
    EXPECT_THROW(rs.getFieldValue(0), OxDBException);
    EXPECT_EQ(rs.getRecordCount(), 0);

    rs.open(L"UPDATE " + m_table + L" SET i = i WHERE i > 100");
    EXPECT_TRUE(rs.isOpen());
    EXPECT_EQ(rs.getODBCFieldCount(), 0);
    EXPECT_TRUE(rs.isBOF() && rs.isEOF());
}

TEST_P(OdbcRecordset, ForwardOnlyCursorsRefuseToScrollWithAClearFailure) {
    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT i FROM " + m_table + L" ORDER BY i", OxOdbcRecordset::forwardOnly);
    ASSERT_FALSE(rs.canScroll());
    rs.moveFirst();  // already there
    rs.move(3);
    EXPECT_EQ(current(rs), 4);
    try {
        rs.movePrev();
        FAIL() << "moved backwards on a forward-only cursor";
    } catch (const OxDBException& e) {
        EXPECT_NE(e.errorText().find(L"forward-only"), std::wstring::npos) << e.what();
    }
    EXPECT_THROW(rs.moveLast(), OxDBException);
    EXPECT_EQ(current(rs), 4);  // the failed moves left the row alone
    rs.moveNext();
    EXPECT_EQ(current(rs), 5);
}

TEST_P(OdbcRecordset, ReadsAColumnAgainAndOutOfOrder) {
    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT i, s, i * 2 AS twice FROM " + m_table + L" WHERE i = 3");
    EXPECT_EQ(rs.getFieldValue(2).m_lVal, 6);
    std::wstring text;
    rs.getFieldValue(1, text);
    EXPECT_EQ(text, L"n3");
    EXPECT_EQ(rs.getFieldValue(0).m_lVal, 3);
    rs.getFieldValue(0, text);
    EXPECT_EQ(text, L"3");
    EXPECT_EQ(rs.getFieldValue(2).m_lVal, 6);
    EXPECT_EQ(rs.getFieldIndexByName(L"TWICE"), 2);
    EXPECT_EQ(rs.getFieldIndexByName(L"missing"), -1);
    EXPECT_THROW(rs.getFieldValue(3), OxDBException);
    EXPECT_THROW(rs.getFieldValue(-1), OxDBException);
}

TEST_P(OdbcRecordset, FilterAndSortApplyFromTheNextOpen) {
    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT i FROM " + m_table + L" WHERE i > 2 ORDER BY i;");
    rs.setFilter(L"i < 6");
    rs.setSort(L"i DESC");
    EXPECT_EQ(current(rs), 3);  // the open result is left alone
    rs.open(L"SELECT i FROM " + m_table + L" WHERE i > 2 ORDER BY i;");
    std::vector<long> seen;
    for (; !rs.isEOF(); rs.moveNext()) seen.push_back(current(rs));
    EXPECT_EQ(seen, (std::vector<long>{5, 4, 3}));
}

TEST_P(OdbcRecordset, DatabaseGoneLeavesTheRecordsetFailingCleanly) {
    auto db = std::make_unique<OxOdbcDatabase>();
    db->open(connectString());
    OxOdbcRecordset rs(db.get());
    rs.open(L"SELECT i FROM " + m_table + L" ORDER BY i");
    db->close();
    EXPECT_THROW(rs.moveNext(), OxDBException);
    db->open(connectString());
    rs.open(L"SELECT i FROM " + m_table + L" ORDER BY i");
    EXPECT_EQ(current(rs), 1);
    db.reset();
    EXPECT_EQ(rs.database(), nullptr);
    EXPECT_THROW(rs.moveNext(), OxDBException);
    EXPECT_THROW(rs.open(L"SELECT 1"), OxDBException);
}

INSTANTIATE_TEST_SUITE_P(Drivers, OdbcRecordset, testing::ValuesIn(OdbcTest::driversUnderTest()),
                         OdbcTest::driverCaseName);
}  // namespace
