#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <memory>

#include "OxClasses/OxConnectionString.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/odbc/OdbcConnectionTest.h"
#include "platform/core/OxMessageSink.h"
#include "platform/core/OxText.h"

namespace {
using OdbcTest::Reports;

#ifndef OXQEL_ODBC_TEST_SERVER
std::map<std::wstring, std::wstring> pairsOf(const std::wstring& connect) {
    OxConnectionString s(connect);
    s.explode();
    return {s.map().begin(), s.map().end()};
}

TEST(OdbcConnectString, ArgumentsReplaceTheirKeysAndPairsAreJoinedWithoutBlanks) {
    const std::wstring text =
        OxQelConnectionODBC::_composeConnectString(L"db1", L"DSN=Sales;uid=old", L"bob", L"");
    EXPECT_EQ(pairsOf(text), (std::map<std::wstring, std::wstring>{
                                 {L"DSN", L"Sales"}, {L"UID", L"bob"}, {L"DATABASE", L"db1"}}));
    // Drivers read no key after "; ": the pairs are joined by ";" alone.
    EXPECT_EQ(text.find(L"; "), std::wstring::npos);
    EXPECT_EQ(std::count(text.begin(), text.end(), L';'), 2);

    // A value that would end early or read as braced is braced; the host stays as given.
    const std::wstring braced =
        OxQelConnectionODBC::_composeConnectString(L"", L"DRIVER={X};PWD=keep", L"", L"a;b}c");
    EXPECT_NE(braced.find(L"PWD={a;b}}c}"), std::wstring::npos) << OxText::toUtf8(braced);
    EXPECT_NE(OxQelConnectionODBC::_composeConnectString(L"{x", L"", L"", L"").find(L"{{x}"),
              std::wstring::npos);
    EXPECT_TRUE(OxQelConnectionODBC::_composeConnectString(L"", L"", L"", L"").empty());
    // A host value that opens a brace without closing it would swallow the pairs after it.
    const std::wstring unclosed =
        OxQelConnectionODBC::_composeConnectString(L"", L"A={x;B={y}}z}", L"", L"pw");
    EXPECT_NE(unclosed.find(L"A={{x}"), std::wstring::npos) << OxText::toUtf8(unclosed);
    EXPECT_NE(unclosed.find(L"B={y}}z}"), std::wstring::npos) << OxText::toUtf8(unclosed);
}

TEST(OdbcConnection, FailedOpenIsReportedWithoutThePassword) {
    OdbcTest::Env::get();
    Reports reports;
    OxQelConnectionODBC c;
    // Neither a quote nor an unclosed brace in another value may hide the password (enough
    // of them that some come before the password, whatever the order of the pairs).
    const std::wstring host = L"DRIVER={No Such Driver};A=\"a;B={b;C='c;D={d;E=\"e;F={f;G={g";
    EXPECT_FALSE(c.openConnection(L"db", host, L"u", L"s3cret"));
    EXPECT_FALSE(c.isOpen());
    EXPECT_NE(reports.text().find(L"OxQelConnectionODBC::openConnection"), std::wstring::npos);
    EXPECT_NE(reports.text().find(L"PWD=***"), std::wstring::npos)
        << OxText::toUtf8(reports.text());
    EXPECT_EQ(reports.text().find(L"s3cret"), std::wstring::npos);
    // The four strings are kept whatever the outcome.
    const OxConnectionParameter p = c.getConnectionParameter();
    EXPECT_EQ(p.getDatabase(), L"db");
    EXPECT_EQ(p.getPassword(), L"s3cret");
    EXPECT_EQ(p.getDriverName(), L"{No Such Driver}");
    EXPECT_EQ(p.getHost(), host);
}

TEST(OdbcConnection, WithoutADatabaseObjectEverythingFailsQuietly) {
    OxQelConnectionODBC c;
    std::vector<OxQelTableDef> tables;
    OxQelFieldDefArray fields;
    EXPECT_FALSE(c.isOpen());
    EXPECT_FALSE(c.execute(L"SELECT 1"));
    EXPECT_FALSE(c.startTransaction());
    EXPECT_FALSE(c.closeTransaction());
    EXPECT_FALSE(c.rollbackTransaction(true));
    EXPECT_FALSE(c.getTableDef(tables, OxQelTableDef::AllTypes));
    EXPECT_FALSE(c.getFieldDef(L"t", L"*", fields));
    EXPECT_TRUE(c.closeDatabase());
    EXPECT_EQ(c.getLastError(), OxQel::ErrorUnknown);
    EXPECT_EQ(c.createOxQelIPrepraredQuery(), nullptr);
    // Never opened: the new connection is returned closed.
    std::unique_ptr<OxQelIConnection> other(c.createNewConnection());
    ASSERT_NE(other, nullptr);
    EXPECT_FALSE(other->isOpen());
    std::unique_ptr<OxObject> copy(c.clone());
    EXPECT_NE(OxQelConnectionODBC::cast(copy.get()), nullptr);
    std::unique_ptr<OxQelIRecordset> rs(c.createOxQelIRecordset());
    EXPECT_EQ(OxQelConnectionODBC::cast(rs.get()), nullptr);
    EXPECT_FALSE(rs->openSQL(&c, L"SELECT 1"));
}

TEST(OdbcConnection, LiteralMarkersBecomeTheDriversQuotes) {
    OxQelConnectionODBC c;
    EXPECT_EQ(c.formatBeforeExecute(L"SELECT * FROM T WHERE A = ]]x[["),
              L"SELECT * FROM T WHERE A = N'x' ");
    EXPECT_EQ(c.formatBeforeExecute(L"V = ]]]w[[[ AND U = ]]it's[["),
              L"V =   'w'   AND U = N'it's' ");
    // An opening marker of wide text without its own closing one closes at "[[".
    EXPECT_EQ(c.formatBeforeExecute(L"A = ]]]x[["), L"A = N']x' ");
    EXPECT_EQ(c.formatBeforeExecute(L"A = ]]x"), L"A = ]]x");
    EXPECT_EQ(c.formatBeforeExecute(L"[[ ]] ]]"), L"[[ ]] ]]");

    OdbcTest::Env::get();
    c.openConnection(L"", L"DRIVER={Firebird Stand-in};DATABASE=/nonexistent/dir/x.fdb", L"", L"");
    ASSERT_TRUE(c.IsFireBirdDriver());
    EXPECT_EQ(c.formatBeforeExecute(L"SELECT * FROM T WHERE A = ]]x[["),
              L"SELECT * FROM T WHERE A =  'x' ");
    EXPECT_EQ(c.formatBeforeExecute(L"]]]w[[["), L"  'w'  ");
}

#endif

// The same behaviour on every driver.
class OdbcBackend : public OdbcTest::ConnectionTest {
protected:
    OdbcBackend() : ConnectionTest(L"oxqel_backend") {}
};

TEST_P(OdbcBackend, TransactionsRollBackCommitAndNeedAStart) {
    run(L"CREATE TABLE " + m_table + L" (n INTEGER)");
    EXPECT_FALSE(m_connection.closeTransaction());  // nothing started: nothing to commit
    EXPECT_FALSE(m_connection.rollbackTransaction(true));

    ASSERT_TRUE(m_connection.startTransaction());
    EXPECT_TRUE(m_connection.isInTransaction());
    run(L"INSERT INTO " + m_table + L" VALUES (1)");
    EXPECT_TRUE(m_connection.rollbackTransaction(true));
    EXPECT_FALSE(m_connection.isInTransaction());
    EXPECT_EQ(count(m_table), 0);
    EXPECT_FALSE(m_connection.closeTransaction());

    ASSERT_TRUE(m_connection.startTransaction());
    run(L"INSERT INTO " + m_table + L" VALUES (2)");
    EXPECT_TRUE(m_connection.closeTransaction());
    EXPECT_EQ(count(m_table), 1);
    // A second connection sees the committed row.
    std::unique_ptr<OxQelIConnection> other(m_connection.createNewConnection());
    ASSERT_TRUE(other->isOpen());
    std::unique_ptr<OxQelIRecordset> rs(other->createOxQelIRecordset());
    long n = 0;
    ASSERT_TRUE(rs->openSQL(other.get(), L"SELECT n FROM " + m_table));
    EXPECT_TRUE(rs->getField(0L, n));
    EXPECT_EQ(n, 2);
    rs.reset();
    other.reset();

    // Closing ends the transaction; its work is gone.
    ASSERT_TRUE(m_connection.startTransaction());
    run(L"INSERT INTO " + m_table + L" VALUES (3)");
    EXPECT_TRUE(m_connection.closeDatabase());
    EXPECT_FALSE(m_connection.isInTransaction());
    ASSERT_TRUE(reopen(m_connection));
    EXPECT_EQ(count(m_table), 1);
}

TEST_P(OdbcBackend, ExecuteReportsTheStatementThatFailed) {
    Reports reports;
    EXPECT_FALSE(m_connection.execute(L"SELEC broken"));
    EXPECT_NE(reports.text().find(L"FUNCTION: OxQelConnectionODBC::execute"), std::wstring::npos);
    EXPECT_NE(reports.text().find(L"PARAM: SELEC broken"), std::wstring::npos);
    EXPECT_TRUE(m_connection.execute(L"CREATE TABLE " + m_table + L" (n INTEGER)"));
    EXPECT_TRUE(m_connection.execute(L"DELETE FROM " + m_table));  // no rows: still success
}

TEST_P(OdbcBackend, DescribesTheColumnsOfATable) {
    run(L"CREATE TABLE " + m_table + L" (i INTEGER, big BIGINT, num NUMERIC(12,3), r REAL, " +
        L"dbl DOUBLE PRECISION, t TEXT, vc VARCHAR(40), ch CHAR(5), d DATE, ts TIMESTAMP, b " +
        GetParam().blobType() + L", flag BOOLEAN, req INTEGER NOT NULL)");
    OxQelFieldDefArray fields;
    ASSERT_TRUE(m_connection.getFieldDef(m_table, L"*", fields));
    ASSERT_EQ(fields.size(), 13u);
    const auto type = [&](const wchar_t* name) {
        return fields.getByFieldName(name).getFieldType();
    };
    EXPECT_EQ(type(L"i"), OxQel::Integer);
    EXPECT_EQ(type(L"big"), OxQel::Integer);
    // The SQLite driver reports a NUMERIC column as a double; a real numeric one is unknown.
    EXPECT_EQ(type(L"num"), postgres() ? OxQel::Unknown : OxQel::Double);
    EXPECT_EQ(type(L"r"), OxQel::Double);
    EXPECT_EQ(type(L"dbl"), OxQel::Double);
    EXPECT_EQ(type(L"t"), OxQel::Memo);
    EXPECT_EQ(type(L"vc"), OxQel::String);
    EXPECT_EQ(fields.getByFieldName(L"vc").getFieldSize(), 40);
    EXPECT_EQ(type(L"d"), OxQel::Date);
    EXPECT_EQ(type(L"ts"), OxQel::Date);
    EXPECT_EQ(type(L"b"), OxQel::Binary);
    EXPECT_EQ(type(L"flag"), OxQel::Bool);
    EXPECT_EQ(fields[0].getFieldName(), L"i");
    if (postgres()) {
        EXPECT_EQ(type(L"ch"), OxQel::Char);
        EXPECT_EQ(fields.getByFieldName(L"ch").getFieldSize(), 5);
        EXPECT_TRUE(fields.getByFieldName(L"i").getCanBeNull());
        EXPECT_FALSE(fields.getByFieldName(L"req").getCanBeNull());
    }

    ASSERT_TRUE(m_connection.getFieldDef(m_table, L"vc,i", fields));
    ASSERT_EQ(fields.size(), 2u);
    EXPECT_EQ(fields[0].getFieldName(), L"vc");
    EXPECT_EQ(fields[1].getFieldType(), OxQel::Integer);

    Reports reports;
    EXPECT_FALSE(m_connection.getFieldDef(OdbcTest::uniqueName(L"no_such_table"), L"*", fields));
    EXPECT_NE(reports.text().find(L"OxQelRecordsetODBC::openSQL"), std::wstring::npos);
}

TEST_P(OdbcBackend, ReadsTypedValuesNullsWideIntegersAndAllOfUnicode) {
    run(L"CREATE TABLE " + m_table + L" (id INTEGER, big BIGINT, d DOUBLE PRECISION, s " +
        L"VARCHAR(50), flag BOOLEAN, ts TIMESTAMP, b " + GetParam().blobType() +
        L", num NUMERIC(10,2))");
    const std::wstring astral = L"a\u00e9\u20ac\U0001F600\U00010348z";
    const std::wstring blob = postgres() ? L"'\\x00ff10'" : L"X'00FF10'";
    run(L"INSERT INTO " + m_table + L" VALUES (1, 1099511627781, 2.5, '" + astral + L"', " +
        GetParam().trueLiteral() + L", '2024-05-06 07:08:09', " + blob + L", 12.34)");
    run(L"INSERT INTO " + m_table + L" VALUES (2, -4611686018427387904, NULL, NULL, NULL, " +
        L"NULL, NULL, NULL)");
    std::unique_ptr<OxQelIRecordset> rs(m_connection.createOxQelIRecordset());
    ASSERT_TRUE(rs->openSQL(&m_connection, L"SELECT id, big, d, s, flag, ts, b, num FROM " +
                                               m_table + L" ORDER BY id"));
    long n = 0;
    double x = 0;
    bool flag = false;
    std::wstring text;
    EXPECT_TRUE(rs->getField(0L, n));
    EXPECT_EQ(n, 1);
    EXPECT_TRUE(rs->getField(L"big", n));
    EXPECT_EQ(n, 1099511627781L);  // beyond 32 bits
    EXPECT_EQ(rs->getlFieldValue(1).vt(), VT_I8);
    EXPECT_EQ(rs->getlFieldValue(0).vt(), VT_I4);
    EXPECT_TRUE(rs->getField(2L, x));
    EXPECT_EQ(x, 2.5);
    EXPECT_FALSE(rs->getField(2L, n));  // a double is no integer
    EXPECT_TRUE(rs->getField(L"s", text));
    EXPECT_EQ(text, astral);
    EXPECT_EQ(rs->getszFieldString(L"S"), astral);
    EXPECT_EQ(rs->getvarFieldValue(OxVariant(L"s")).bstr(), astral);
    EXPECT_TRUE(rs->getField(4L, flag));
    EXPECT_TRUE(flag);
    EXPECT_TRUE(rs->getField(4L, n));
    EXPECT_EQ(n, 1);
    EXPECT_FALSE(rs->getField(4L, x));  // bits are no doubles
    const OxVariant when = rs->getlFieldValue(5);
    ASSERT_EQ(when.vt(), VT_DATE);
    EXPECT_EQ(OxDateTime(when.date()).format(L"%Y-%m-%d %H:%M:%S"), L"2024-05-06 07:08:09");
    EXPECT_EQ(rs->getlFieldString(5), L"2024-05-06 07:08:09");
    const OxVariant bytes = rs->getlFieldValue(6);
    ASSERT_TRUE(bytes.isByteArray());
    EXPECT_EQ(bytes.bytes(), (std::vector<uint8_t>{0x00, 0xFF, 0x10}));
    EXPECT_EQ(rs->getlFieldString(6), L"00FF10");
    EXPECT_FALSE(rs->isFieldNull(2L));
    EXPECT_FALSE(rs->isFieldNull(L"s"));

    ASSERT_TRUE(rs->moveNext());
    EXPECT_TRUE(rs->getField(L"big", n));
    EXPECT_EQ(n, -4611686018427387904L);
    for (long i = 2; i < 8; ++i) {
        EXPECT_TRUE(rs->getlFieldValue(i).isEmpty()) << "column " << i;
        EXPECT_TRUE(rs->isFieldNull(i)) << "column " << i;
        EXPECT_TRUE(rs->getField(i, text));  // as text a NULL reads empty
        EXPECT_EQ(text, L"");
    }
    EXPECT_FALSE(rs->getField(2L, x));
    EXPECT_FALSE(rs->getField(4L, flag));
    EXPECT_FALSE(rs->getField(L"s", text));
    EXPECT_TRUE(rs->isFieldNull(OxVariant(L"flag")));
    EXPECT_FALSE(rs->getField(L"missing", text));
}

TEST_P(OdbcBackend, RecordsetMovesAndCountsLikeThePlatformRecordset) {
    run(L"CREATE TABLE " + m_table + L" (n INTEGER)");
    for (int i = 1; i <= 5; ++i)
        run(L"INSERT INTO " + m_table + L" VALUES (" + std::to_wstring(i) + L")");
    std::unique_ptr<OxQelIRecordset> rs(m_connection.createOxQelIRecordset());
    ASSERT_TRUE(rs->openSQL(&m_connection, L"SELECT n FROM " + m_table + L" ORDER BY n"));
    const auto at = [&] {
        long n = -1;
        rs->getField(0L, n);
        return n;
    };
    EXPECT_EQ(at(), 1);
    EXPECT_TRUE(rs->moveLast());
    EXPECT_EQ(at(), 5);
    EXPECT_TRUE(rs->movePrevious());
    EXPECT_EQ(at(), 4);
    EXPECT_TRUE(rs->move(-2));
    EXPECT_EQ(at(), 2);
    EXPECT_TRUE(rs->moveFirst());
    EXPECT_TRUE(rs->movePrevious());
    EXPECT_TRUE(rs->getBOF());
    EXPECT_FALSE(rs->movePrevious());  // already before the start
    EXPECT_TRUE(rs->moveNext());
    int rows = 0;
    while (!rs->getEOF()) {
        ++rows;
        rs->moveNext();
    }
    EXPECT_EQ(rows, 5);
    EXPECT_EQ(rs->getRecordCount(), 5);
    Reports reports;
    EXPECT_FALSE(rs->moveNext());
    EXPECT_NE(reports.text().find(L"OxQelRecordsetODBC::moveNext"), std::wstring::npos);

    // Filter and sort wait for the next open.
    rs->setFilter(OxVariant(L"n > 3"));
    rs->setSort(L"n DESC");
    EXPECT_TRUE(rs->getEOF());
    ASSERT_TRUE(rs->openSQL(&m_connection, L"SELECT n FROM " + m_table));
    EXPECT_EQ(at(), 5);
    EXPECT_TRUE(rs->moveNext());
    EXPECT_EQ(at(), 4);
    EXPECT_TRUE(rs->moveNext());
    EXPECT_TRUE(rs->getEOF());

    // A statement without a result: no columns, nothing to describe, nothing failed.
    rs->setFilter(OxVariant(L""));
    rs->setSort(L"");
    ASSERT_TRUE(rs->openSQL(&m_connection, L"UPDATE " + m_table + L" SET n = n WHERE n < 0"));
    OxQelFieldDefArray fields;
    fields.resize(3);
    EXPECT_TRUE(rs->getFieldDef(fields));
    EXPECT_TRUE(fields.empty());
    EXPECT_EQ(rs->getFieldCount(), 0);
    rs->close();
    EXPECT_FALSE(rs->getFieldDef(fields));
    EXPECT_TRUE(rs->getEOF());
}

INSTANTIATE_TEST_SUITE_P(Drivers, OdbcBackend, testing::ValuesIn(OdbcTest::driversUnderTest()),
                         OdbcTest::driverCaseName);
}  // namespace
