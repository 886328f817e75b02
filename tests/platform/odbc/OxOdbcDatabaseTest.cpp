#include <gtest/gtest.h>

#include "platform/core/OxVariant.h"
#include "platform/odbc/OdbcTableTest.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxOdbcDatabase.h"
#include "platform/odbc/OxOdbcRecordset.h"
#include "platform/odbc/OxOdbcStatement.h"

namespace {
class OdbcDatabase : public OdbcTest::TableTest {
protected:
    OdbcDatabase() : TableTest(L"odbc_values") {}
    long count() {
        OxOdbcRecordset rs(&m_db);
        rs.open(L"SELECT COUNT(*) FROM " + m_table);
        const OxDBVariant& v = rs.getFieldValue(0);
        return v.m_dwType == OxDBVariant::DBVT_BIGINT ? static_cast<long>(v.m_llVal) : v.m_lVal;
    }
};

TEST_P(OdbcDatabase, BoundParametersComeBackUnchanged) {
    m_db.executeSQL(L"CREATE TABLE " + m_table +
                    L" (n INTEGER, big BIGINT, d DOUBLE PRECISION, s VARCHAR(50), t TEXT, "
                    L"ts TIMESTAMP, b " +
                    GetParam().blobType() + L", flag BOOLEAN, money NUMERIC(19,4))");
    const std::wstring astral = L"a\u00e9\u20ac\U0001F600z";
    std::wstring longText;
    for (int i = 0; i < 20000; ++i) longText += L"x\u00e9\U0001F600";
    std::vector<uint8_t> blob(300000);
    for (size_t i = 0; i < blob.size(); ++i) blob[i] = static_cast<uint8_t>(i * 7);

    OxOdbcStatement insert(&m_db);
    insert.prepare(L"INSERT INTO " + m_table + L" VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?)");
    insert.bindParameter(1, OxVariant(int32_t{-7}));
    insert.bindParameter(2, OxVariant(static_cast<long long>(INT64_MAX)));
    insert.bindParameter(3, OxVariant(2.5));
    insert.bindParameter(4, OxVariant(astral));
    insert.bindParameter(5, OxVariant(longText));
    insert.bindParameter(6, OxVariant(OxDateTime(2024, 2, 29, 23, 59, 58)));
    insert.bindParameter(7, OxVariant::fromBytes(blob));
    insert.bindParameter(8, OxVariant(true));
    insert.bindParameter(9, OxVariant::fromCurrency(-12345678));  // -1234.5678
    insert.execute();
    // The statement stays prepared: a second row with other values and NULLs.
    insert.bindParameter(1, OxVariant(int32_t{8}));
    for (SQLUSMALLINT i = 2; i <= 9; ++i) insert.bindParameter(i, OxVariant::null());
    insert.execute();
    EXPECT_EQ(count(), 2);

    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT n, big, d, s, t, ts, b, flag, money FROM " + m_table + L" ORDER BY n");
    EXPECT_EQ(rs.getFieldValue(0).m_lVal, -7);
    ASSERT_EQ(rs.getFieldValue(1).m_dwType, OxDBVariant::DBVT_BIGINT);
    EXPECT_EQ(rs.getFieldValue(1).m_llVal, INT64_MAX);
    EXPECT_EQ(rs.getFieldValue(2).m_dblVal, 2.5);
    EXPECT_EQ(rs.getFieldValue(3).m_str, astral);
    EXPECT_EQ(rs.getFieldValue(4).m_str, longText);
    const SQL_TIMESTAMP_STRUCT& ts = rs.getFieldValue(5).m_date;
    EXPECT_EQ(ts.year, 2024);
    EXPECT_EQ(ts.month, 2);
    EXPECT_EQ(ts.day, 29);
    EXPECT_EQ(ts.hour, 23);
    EXPECT_EQ(ts.second, 58);
    ASSERT_EQ(rs.getFieldValue(6).m_dwType, OxDBVariant::DBVT_BINARY);
    EXPECT_EQ(rs.getFieldValue(6).m_binary, blob);
    std::wstring text;
    rs.getFieldValue(7, text);
    EXPECT_EQ(text, L"1");
    rs.getFieldValue(8, text);
    EXPECT_EQ(std::stod(text), -1234.5678);

    rs.moveNext();
    EXPECT_EQ(rs.getFieldValue(0).m_lVal, 8);
    for (long i = 1; i <= 8; ++i) EXPECT_TRUE(rs.getFieldValue(i).isNull()) << "column " << i;
    rs.getFieldValue(3, text);
    EXPECT_EQ(text, L"");
}

TEST_P(OdbcDatabase, ValuesReadAsText) {
    m_db.executeSQL(L"CREATE TABLE " + m_table +
                    L" (d DATE, tm TIME, ts TIMESTAMP, r DOUBLE "
                    L"PRECISION, b " +
                    GetParam().blobType() + L")");
    OxOdbcStatement insert(&m_db);
    insert.prepare(L"INSERT INTO " + m_table + L" (d, tm, ts, r, b) VALUES (?, ?, ?, ?, ?)");
    insert.bindParameter(1, OxVariant(OxDateTime(2021, 3, 4)));
    insert.bindParameter(2, OxVariant(OxDateTime(1899, 12, 30, 13, 14, 15)));
    insert.bindParameter(
        3, OxVariant::fromDate(OxDateTime(2021, 3, 4, 5, 6, 7).serial() + 0.25 / 86400.0));
    insert.bindParameter(4, OxVariant(0.1));
    const uint8_t bytes[] = {0xDE, 0xAD, 0x00, 0x0F};
    insert.bindParameter(5, OxVariant::fromBytes(bytes, sizeof(bytes)));
    insert.execute();

    OxOdbcRecordset rs(&m_db);
    rs.open(L"SELECT d, tm, ts, r, b FROM " + m_table);
    std::wstring text;
    rs.getFieldValue(0, text);
    EXPECT_EQ(text, L"2021-03-04");
    rs.getFieldValue(1, text);
    EXPECT_EQ(text, L"13:14:15");
    const SQL_TIMESTAMP_STRUCT& time = rs.getFieldValue(1).m_date;
    EXPECT_EQ(time.year, 1899);  // a time of day stands on day zero
    EXPECT_EQ(time.day, 30);
    rs.getFieldValue(2, text);
    EXPECT_EQ(text, L"2021-03-04 05:06:07.25");
    rs.getFieldValue(3, text);
    EXPECT_EQ(text, L"0.1");
    rs.getFieldValue(4, text);
    EXPECT_EQ(text, L"DEAD000F");  // the same on every driver
}

TEST_P(OdbcDatabase, TransactionsCommitAndRollBack) {
    ASSERT_TRUE(m_db.canTransact());
    m_db.executeSQL(L"CREATE TABLE " + m_table + L" (n INTEGER)");
    m_db.beginTrans();
    m_db.executeSQL(L"INSERT INTO " + m_table + L" VALUES (1)");
    m_db.rollback();
    EXPECT_EQ(count(), 0);
    EXPECT_FALSE(m_db.isInTransaction());
    m_db.beginTrans();
    m_db.executeSQL(L"INSERT INTO " + m_table + L" VALUES (2)");
    m_db.commitTrans();
    EXPECT_EQ(count(), 1);
    // Autocommit is back: a statement outside a transaction stays.
    m_db.executeSQL(L"INSERT INTO " + m_table + L" VALUES (3)");
    m_db.beginTrans();
    m_db.executeSQL(L"INSERT INTO " + m_table + L" VALUES (4)");
    m_db.close();  // an open transaction dies with the connection
    m_db.open(connectString());
    EXPECT_EQ(count(), 2);
}

TEST_P(OdbcDatabase, FailuresCarryTheDriversDiagnostics) {
    try {
        m_db.executeSQL(L"SELEC nonsense");
        FAIL() << "a syntax error passed";
    } catch (const OxDBException& e) {
        EXPECT_EQ(e.retCode(), SQL_ERROR);
        EXPECT_EQ(e.sqlState().size(), 5u);
        EXPECT_NE(e.errorText().find(L"[" + e.sqlState() + L"]"), std::wstring::npos);
    }
    OxOdbcDatabase other;
    try {
        other.open(L"DRIVER={No Such Driver};DATABASE=x");
        FAIL() << "opened with a driver that does not exist";
    } catch (const OxDBException& e) {
        EXPECT_EQ(e.sqlState(), L"01000") << e.what();  // the manager cannot load it
    }
    EXPECT_FALSE(other.isOpen());
    EXPECT_THROW(other.executeSQL(L"SELECT 1"), OxDBException);
    EXPECT_THROW(other.getDatabaseName(), OxDBException);
    EXPECT_THROW(other.beginTrans(), OxDBException);
}

TEST_P(OdbcDatabase, ReportsWhatTheDriverSays) {
    EXPECT_FALSE(m_db.getDatabaseName().empty());
    EXPECT_EQ(m_db.getDbmsName(), postgres() ? L"PostgreSQL" : L"SQLite");
    EXPECT_FALSE(m_db.getConnect().empty());
    EXPECT_NE(m_db.hdbc(), nullptr);
}

INSTANTIATE_TEST_SUITE_P(Drivers, OdbcDatabase, testing::ValuesIn(OdbcTest::driversUnderTest()),
                         OdbcTest::driverCaseName);
}  // namespace
