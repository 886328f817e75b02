#include <gtest/gtest.h>

#include <memory>

#include "OxQelLib/ado/OxQelPreparedQueryADO.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/interfaces/OxQelConnectionDefault.h"
#include "TestConnectionADO.h"
#include "platform/ado/OxAdoDefs.h"
#include "support/TestSupport.h"
#include "testprovider/OxAdoTestProvider.h"

using OxAdoTest::Result;

namespace {
// Captures what the library reports while it lives.
class LogCapture {
public:
    LogCapture() : m_flags(OxQel::getDebugInfoType()), m_path(OxQel::getDebugLogFilePath()) {
        OxQel::setDebugLogFilePath(m_dir.wfile("log.txt"));
        OxQel::setDebugInfoType(8);
    }
    ~LogCapture() {
        OxQel::setDebugInfoType(m_flags);
        OxQel::setDebugLogFilePath(m_path);
    }
    std::string text() const { return OxTest::readFile(m_dir.file("log.txt")); }

private:
    OxTest::TempDir m_dir;
    int m_flags;
    std::wstring m_path;
};

class ConnectionADOTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(conn.openConnection(L"", OxAdoTest::kConnectionString, L"", L""));
        script->statements.clear();
    }

    // The next statement fails with this provider error.
    void failNext(OxHResult number, int32_t native = 1, const std::wstring& text = L"failed") {
        script->results.push_back(Result::failure(number, text, native));
    }

    std::shared_ptr<OxAdoTest::Script> script = std::make_shared<OxAdoTest::Script>();
    OxAdoTest::Install install{script};
    TestConnectionADO conn;
};
}  // namespace

TEST(ConnectionADOMessagesTest, ComErrorTexts) {
    std::wstring m;
    OxQelConnectionADO::getComError(m, OxComError(OxAdo::Hr::DB_E_ERRORSINCOMMAND, L"Bad SQL"));
    EXPECT_EQ(m, L"Bad SQL (HRESULT: 0x80040e14)");
    // Without a description: the system's text, or its stand-ins for codes it has none for.
    OxQelConnectionADO::getComError(m, OxComError(OxHr::E_POINTER));
    EXPECT_EQ(m, L"Invalid pointer (HRESULT: 0x80004003)");
    OxQelConnectionADO::getComError(m, OxComError(OxAdo::Hr::DB_E_ERRORSINCOMMAND));
    EXPECT_EQ(m, L"IDispatch error #3092 (HRESULT: 0x80040e14)");
    OxQelConnectionADO::getComError(m, OxComError(static_cast<OxHResult>(0x80040200)));
    EXPECT_EQ(m, L"Unknown error 0x80040200 (HRESULT: 0x80040200)");
    OxQelConnectionADO::getComError(m, OxComError(static_cast<OxHResult>(0x8007001F)));
    EXPECT_EQ(m, L"Unknown error 0x8007001F (HRESULT: 0x8007001f)");
    OxQelConnectionADO::getComError(m, OxComError(OxHr::E_FAIL, L"line\r\n"));
    EXPECT_EQ(m, L"line (HRESULT: 0x80004005)");

    // Without a connection there are no provider errors.
    TestConnectionADO closed;
    closed.getProviderError(m);
    EXPECT_TRUE(m.empty());
    EXPECT_EQ(closed.getLastError(), OxQel::ErrorUnknown);
}

TEST_F(ConnectionADOTest, ProviderErrorTextsAndTheirReport) {
    script->results.push_back(Result());
    script->results.back().error =
        OxAdoProviderError({{OxAdo::Hr::DB_E_ERRORSINCOMMAND, L"first", 102, L"42000", {}},
                            {static_cast<OxHResult>(0x80004005), L"", 0, L"01000", {}}});
    LogCapture log;
    EXPECT_FALSE(conn.execute(L"SELEC 1"));
    std::wstring m;
    conn.getProviderError(m);
    EXPECT_EQ(m, L"first (Number : -2147217900)Unknow connection error (Number : -2147467259)");
    const std::string line = log.text();
    EXPECT_NE(line.find("MESSAGE: first (Number : -2147217900)"), std::string::npos) << line;
    EXPECT_NE(line.find("PARAM: SELEC 1 FUNCTION: OxQelConnectionADO::execute FILE: "
                        "OxQelLib/OxQelConnectionADO"),
              std::string::npos)
        << line;

    // A later failure of the object model itself is reported with its own text, not with
    // the provider's old errors.
    EXPECT_FALSE(conn.renameField(L"nowhere", L"a", L"b"));
    EXPECT_NE(log.text().find("Item cannot be found in the collection"), std::string::npos);
}

TEST_F(ConnectionADOTest, LastErrorClassesTheFirstErrorNumber) {
    EXPECT_EQ(conn.getLastError(), OxQel::NoError);
    const struct {
        uint32_t number;
        OxQel::SQLError expected;
    } cases[] = {
        {0, OxQel::NoError},
        {3002, OxQel::ErrorConnection},
        {3706, OxQel::ErrorConnection},
        {3709, OxQel::ErrorConnection},
        {3730, OxQel::ErrorConnection},
        {0x80040E14, OxQel::ErrorStatement},
        {3421, OxQel::ErrorStatement},
        {3721, OxQel::ErrorStatement},
        {3725, OxQel::ErrorStatement},
        {3726, OxQel::ErrorStatement},
        {3749, OxQel::ErrorStatement},
        {3246, OxQel::ErrorTransaction},
        {3714, OxQel::ErrorTransaction},
        {0x80040E31, OxQel::ErrorTimeout},
        {3719, OxQel::ErrorIntegrity},
        {0x80004005, OxQel::ErrorUnspecified},
        {0x80040E2F, OxQel::ErrorUnknown},
        {42, OxQel::ErrorUnknown},
    };
    OxQel::Util::SilentReporting quiet;
    for (const auto& c : cases) {
        failNext(static_cast<OxHResult>(c.number));
        EXPECT_FALSE(conn.execute(L"X"));
        EXPECT_EQ(conn.getLastError(), c.expected) << std::hex << c.number;
    }
}

TEST_F(ConnectionADOTest, DroppedConnectionsAreNotOpen) {
    EXPECT_TRUE(conn.isOpen());
    OxQel::Util::SilentReporting quiet;
    for (int32_t native : {10054, 10053, 232, 233, 109, 0}) {
        script->results.push_back(Result::failure(OxHr::E_FAIL, L"link", native, L"08S01"));
        EXPECT_FALSE(conn.execute(L"SELECT 1"));
        EXPECT_FALSE(conn.isOpen()) << native;
        // Another kind of error and the connection is usable again.
        failNext(OxHr::E_FAIL, 4060);
        EXPECT_FALSE(conn.execute(L"SELECT 1"));
        EXPECT_TRUE(conn.isOpen()) << native;
    }
    // Native error 0 without a state also marks a dropped connection; with the state of
    // an ordinary statement error it does not.
    script->results.push_back(Result::failure(OxHr::E_FAIL, L"gone", 0, L""));
    EXPECT_FALSE(conn.execute(L"SELECT 1"));
    EXPECT_FALSE(conn.isOpen());
    script->results.push_back(
        Result::failure(OxAdo::Hr::DB_E_ERRORSINCOMMAND, L"syntax", 0, L"42000"));
    EXPECT_FALSE(conn.execute(L"SELECT 1"));
    EXPECT_TRUE(conn.isOpen());
    EXPECT_TRUE(conn.startTransaction());
    EXPECT_TRUE(conn.rollbackTransaction(true));
    // A source that lost its link.
    script->broken = true;
    EXPECT_FALSE(conn.isOpen());
    EXPECT_FALSE(conn.startTransaction());
    script->broken = false;
    EXPECT_TRUE(conn.closeDatabase());
    EXPECT_FALSE(conn.isOpen());
    // Closing twice is reported as the invalid pointer it is.
    LogCapture log;
    OxQel::setDebugInfoType(8);
    EXPECT_FALSE(conn.closeDatabase());
    EXPECT_NE(log.text().find("(HRESULT: 0x80004003)"), std::string::npos);
}

TEST_F(ConnectionADOTest, OpenFailureReportMasksThePassword) {
    LogCapture log;
    script->failOnce.emplace(L"open",
                             OxAdoTest::error(OxAdo::Hr::DB_SEC_E_AUTH_FAILED, L"login failed"));
    TestConnectionADO other;
    EXPECT_FALSE(other.openConnection(L"", OxAdoTest::kConnectionString, L"sa", L"s3cr3t!"));
    EXPECT_FALSE(other.isOpen());
    const std::string text = log.text();
    EXPECT_NE(text.find("login failed"), std::string::npos) << text;
    EXPECT_NE(text.find("OxQelConnectionADO::openADOConn"), std::string::npos);
    EXPECT_EQ(text.find("s3cr3t!"), std::string::npos) << text;
    EXPECT_NE(text.find("PWD=***"), std::string::npos) << text;
    // The provider saw the real password.
    ASSERT_FALSE(script->opens.empty());
    EXPECT_NE(script->opens.back().connectionString.find(L"PWD=s3cr3t!"), std::wstring::npos);
    // The timeouts of the library reach the connection.
    EXPECT_EQ(script->opens.front().connectionTimeout, OxQel::_lConnectionTimeout);
}

TEST_F(ConnectionADOTest, TheLibrarysTimeoutsReachTheConnection) {
    const int32_t connection = OxQel::_lConnectionTimeout;
    const int32_t command = OxQel::_lCommandTimeout;
    OxQel::_lConnectionTimeout = 11;
    OxQel::_lCommandTimeout = 7;
    TestConnectionADO other;
    const bool opened = other.openConnection(L"", OxAdoTest::kConnectionString, L"", L"");
    OxQel::_lConnectionTimeout = connection;
    OxQel::_lCommandTimeout = command;
    ASSERT_TRUE(opened);
    EXPECT_EQ(script->opens.back().connectionTimeout, 11);
    EXPECT_EQ(script->opens.back().commandTimeout, 7);
    EXPECT_TRUE(other.execute(L"DELETE FROM t"));
    EXPECT_EQ(script->timeouts.back(), 7);
}

TEST_F(ConnectionADOTest, ScriptModeCollectsInsteadOfRunning) {
    conn.startScriptMode();
    EXPECT_EQ(conn.endScriptMode(), nullptr);
    conn.startScriptMode();
    EXPECT_TRUE(conn.execute(L"UPDATE t SET a = 'it''s'"));
    EXPECT_TRUE(conn.deleteTable(L"t"));
    const auto script_ = conn.endScriptMode();
    ASSERT_NE(script_, nullptr);
    EXPECT_EQ(*script_, L"EXEC(N'UPDATE t SET a = ''it''''s''');\n\rEXEC(N'DROP TABLE [t]');\n\r");
    EXPECT_TRUE(script->statements.empty());
    EXPECT_FALSE(conn.addQueryToScript(L"x"));
    EXPECT_TRUE(conn.execute(L"DELETE FROM t"));
    EXPECT_EQ(script->log(), L"DELETE FROM t");
}

TEST_F(ConnectionADOTest, Transactions) {
    EXPECT_FALSE(conn.closeTransaction());
    EXPECT_FALSE(conn.rollbackTransaction(true));
    EXPECT_FALSE(script->sawCall(L"commitTrans"));
    EXPECT_TRUE(conn.startTransaction());
    EXPECT_TRUE(conn.isInTransaction());
    EXPECT_FALSE(conn.startTransaction());
    EXPECT_TRUE(conn.closeTransaction());
    EXPECT_FALSE(conn.isInTransaction());
    EXPECT_TRUE(script->sawCall(L"commitTrans"));

    // A commit that fails leaves the transaction open, to be rolled back.
    OxQel::Util::SilentReporting quiet;
    ASSERT_TRUE(conn.startTransaction());
    script->failOnce.emplace(L"commitTrans", OxAdoTest::error(OxHr::E_FAIL, L"no", 1));
    EXPECT_FALSE(conn.closeTransaction());
    EXPECT_TRUE(conn.isInTransaction());
    // A rollback that fails has ended it all the same: a new one can start.
    script->failOnce.emplace(L"rollbackTrans", OxAdoTest::error(OxHr::E_FAIL, L"no", 1));
    EXPECT_FALSE(conn.rollbackTransaction(false));
    EXPECT_FALSE(conn.isInTransaction());
    EXPECT_TRUE(conn.startTransaction());
}

TEST_F(ConnectionADOTest, ProbesAndPlainDdl) {
    {
        LogCapture log;
        failNext(OxHr::E_FAIL);
        EXPECT_FALSE(conn.findTable(L"missing"));
        EXPECT_TRUE(conn.findField(L"t", L"a"));
        EXPECT_TRUE(log.text().empty());
    }
    EXPECT_EQ(script->statements[0], L"SELECT * FROM missing WHERE 1 = 0;");
    EXPECT_EQ(script->statements[1], L"SELECT a FROM t WHERE 1 = 0;");
    EXPECT_TRUE(conn.deleteField(L"t", L"a"));
    EXPECT_EQ(script->statements.back(), L"ALTER TABLE [t] DROP COLUMN [a];");
    EXPECT_FALSE(conn.modifyFieldType(L"t", L"a", OxQelFieldDef()));
    EXPECT_TRUE(conn.update());
    EXPECT_FALSE(conn.canReadMultithread());
    EXPECT_FALSE(conn.canWriteMultiThread());
    EXPECT_EQ(conn.getMaxInsertsAtOnce(), 1);

    // Resizing asks for the column first and writes the type of its kind.
    script->results.push_back(
        Result::rowsOf({OxAdoTest::column(L"name", OxAdo::adVarWChar, 20, L"t")}, {}));
    EXPECT_TRUE(conn.resizeFieldString(L"t", L"name", 80));
    EXPECT_EQ(script->statements.back(), L"ALTER TABLE [t] ALTER COLUMN [name] NVARCHAR (80);");
    script->results.push_back(
        Result::rowsOf({OxAdoTest::column(L"n", OxAdo::adInteger, 4, L"t")}, {}));
    const size_t before = script->statements.size();
    EXPECT_FALSE(conn.resizeFieldString(L"t", L"n", 80));
    EXPECT_EQ(script->statements.size(), before + 1);
}

TEST_F(ConnectionADOTest, RenamesGoThroughTheCatalog) {
    script->addTable(L"people");
    script->addTable(L"v", L"VIEW");
    OxAdoColumnDesc c;
    c.name = L"name";
    script->columns[L"people"] = {c};
    script->calls.clear();
    EXPECT_TRUE(conn.renameTable(L"people", L"people"));
    EXPECT_TRUE(script->calls.empty());
    EXPECT_TRUE(conn.renameTable(L"people", L"persons"));
    EXPECT_TRUE(script->sawCall(L"renameTable people persons"));
    EXPECT_TRUE(conn.renameField(L"persons", L"name", L"full"));
    EXPECT_TRUE(script->sawCall(L"renameColumn persons name full"));
    {
        LogCapture log;
        EXPECT_FALSE(conn.renameField(L"v", L"a", L"b"));
        EXPECT_TRUE(log.text().empty());
    }
    // The catalog lookup is exact: another case is another name.
    EXPECT_NE(conn.findADOXTable(L"persons"), nullptr);
    EXPECT_EQ(conn.findADOXTable(L"PERSONS"), nullptr);
    EXPECT_NE(conn.findADOXField(L"persons", L"full"), nullptr);
    EXPECT_EQ(conn.findADOXField(L"persons", L"name"), nullptr);
}

TEST_F(ConnectionADOTest, TableListWithViewsAddsProcedures) {
    script->addTable(L"t1");
    script->addTable(L"v1", L"VIEW");
    script->addTable(L"s1", L"SYSTEM TABLE");
    script->addTable(L"odd", L"GLOBAL TEMPORARY");
    script->procedures.push_back({{}, {}, L"p1", 2});
    std::vector<OxQelTableDef> tables(3);
    LogCapture log;
    EXPECT_TRUE(conn.getTableDef(tables, OxQelTableDef::View));
    ASSERT_EQ(tables.size(), 2u);
    EXPECT_EQ(tables[0].getTableName(), L"v1");
    EXPECT_EQ(tables[1].getTableName(), L"p1");
    EXPECT_EQ(tables[1].getTableType(), OxQelTableDef::View);
    EXPECT_NE(log.text().find("Unknown table's type: GLOBAL TEMPORARY"), std::string::npos);

    EXPECT_TRUE(conn.getTableDef(tables, OxQelTableDef::Table | OxQelTableDef::Unknown));
    ASSERT_EQ(tables.size(), 2u);
    EXPECT_EQ(tables[0].getTableName(), L"t1");
    EXPECT_EQ(tables[1].getTableName(), L"odd");
    // A failing catalog still answers true with what it gathered.
    OxQel::Util::SilentReporting quiet;
    script->failOnce.emplace(L"tables", OxAdoTest::error(OxHr::E_FAIL, L"no"));
    EXPECT_TRUE(conn.getTableDef(tables, OxQelTableDef::AllTypes));
    EXPECT_TRUE(tables.empty());
}

TEST_F(ConnectionADOTest, IndexListMergesIntoTheArray) {
    script->indexes = {{{}, {}, L"t", L"pk", true, true, false, 1, L"a", false},
                       {{}, {}, L"T", L"pk", true, true, false, 2, L"b", false},
                       {{}, {}, L"other", L"x", false, false, false, 1, L"z", false},
                       {{}, {}, L"t", L"ix", false, false, false, 1, L"c", false}};
    std::vector<OxQelIndexDef> indexes;
    EXPECT_TRUE(conn.getIndexDef(L"t", indexes));
    ASSERT_EQ(indexes.size(), 2u);
    EXPECT_EQ(indexes[0].getListFieldInString(), L"a,b");
    EXPECT_TRUE(indexes[0].isPrimaryKey());
    EXPECT_EQ(indexes[1].getIndexName(), L"ix");
    EXPECT_FALSE(indexes[1].isUnique());
    // Asked again with the same array, each index gets its columns a second time.
    EXPECT_TRUE(conn.getIndexDef(L"t", indexes));
    ASSERT_EQ(indexes.size(), 2u);
    EXPECT_EQ(indexes[0].getListFieldInString(), L"a,b,a,b");
}

TEST_F(ConnectionADOTest, ModifyTableCreatesOnlyNewTables) {
    script->addTable(L"plain");
    script->addTable(L"aview", L"VIEW");
    OxQelFieldDefArray fields;
    fields.resize(2);
    fields[0].setFieldName(L"id");
    fields[0].setFieldType(OxQel::Integer);
    fields[0].setNoAuto(true);
    fields[1].setFieldName(L"title");
    fields[1].setFieldType(OxQel::WString);
    fields[1].setFieldSize(50);
    fields[1].setDefaultValue(L"'none'");
    {
        LogCapture log;
        EXPECT_FALSE(conn.modifyTable(L"plain", fields));
        EXPECT_NE(log.text().find("MESSAGE: Not yet implemented function when the table exists "
                                  "PARAM: plain"),
                  std::string::npos)
            << log.text();
        EXPECT_FALSE(conn.modifyTable(L"aview", fields));
        EXPECT_NE(log.text().find("Update failed: aview it's not a TABLE"), std::string::npos);
    }
    EXPECT_FALSE(script->sawCall(L"createTable plain"));

    script->calls.clear();
    EXPECT_TRUE(conn.modifyTable(L"fresh", fields));
    EXPECT_TRUE(script->sawCall(
        L"createTable fresh id:3:0[Nullable=-1][AutoIncrement=-1][Jet OLEDB:Allow Zero "
        L"Length=0][Jet OLEDB:Compressed UNICODE Strings=0] title:202:50[Default='none']"
        L"[Nullable=-1][AutoIncrement=0][Jet OLEDB:Allow Zero Length=0][Jet "
        L"OLEDB:Compressed UNICODE Strings=-1]"))
        << script->calls[0];
    EXPECT_TRUE(script->sawCall(L"setColumnProperty fresh id Jet OLEDB:Allow Zero Length=-1"));
    EXPECT_TRUE(script->sawCall(L"setColumnProperty fresh title Jet OLEDB:Allow Zero Length=-1"));
}

TEST_F(ConnectionADOTest, FactoriesAndCopies) {
    std::unique_ptr<OxQelIPreparedQuery> q(conn.createOxQelIPrepraredQuery());
    ASSERT_NE(q, nullptr);
    EXPECT_NE(OxQelPreparedQueryADO::cast(q.get()), nullptr);
    // A prepared query wants an open connection of its own kind.
    OxQelPreparedQueryADO direct;
    OxQelConnectionDefault other;
    EXPECT_FALSE(direct.setConnection(&other));
    EXPECT_FALSE(direct.setConnection(nullptr));
    TestConnectionADO closed;
    EXPECT_FALSE(direct.setConnection(&closed));
    EXPECT_EQ(closed.createOxQelIPrepraredQuery(), nullptr);

    // A copy shares the live connection.
    TestConnectionADO copy;
    copy.copyFrom(conn);
    EXPECT_TRUE(copy.isOpen());
    EXPECT_EQ(copy.getConnection(), conn.getConnection());
    EXPECT_EQ(conn.clone(), nullptr);
    EXPECT_EQ(conn.compareTo(&copy), OxObject::NotComparable);
    EXPECT_EQ(std::string(OxQelConnectionADO::desc()), "OxQelConnectionADO");
    EXPECT_EQ(conn.getConnectionParameter().getHost(), OxAdoTest::kConnectionString);
}
