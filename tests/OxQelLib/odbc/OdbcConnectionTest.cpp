#include "OxQelLib/odbc/OdbcConnectionTest.h"

#include "OxQelLib/foundation/OxQelLog.h"
#include "platform/core/OxText.h"

namespace OdbcTest {
Reports::Reports() : m_flags(OxQel::getDebugInfoType()) {
    OxQel::setDebugInfoType(4);
    m_previous = OxMessageSink::setHandler([this](const std::wstring& t) { m_text += t; });
}

Reports::~Reports() {
    OxMessageSink::setHandler(m_previous);
    OxQel::setDebugInfoType(m_flags);
}

ConnectionTest::OpenArgs ConnectionTest::openArgs() const {
    if (GetParam().postgres) {
        const Env& env = Env::get();
        return {env.postgresDatabase(), env.postgresHost() + L";BoolsAsChar=0", env.postgresUser(),
                env.postgresPassword()};
    }
    return {m_dir.wfile("scratch.db"), L"DRIVER={SQLite3}", L"", L""};
}

bool ConnectionTest::reopen(OxQelConnectionODBC& c) const {
    const OpenArgs a = openArgs();
    return c.openConnection(a.database, a.host, a.userId, a.password);
}

void ConnectionTest::SetUp() {
    DriverTest::SetUp();
    if (IsSkipped() || HasFatalFailure())
        return;
    ASSERT_TRUE(reopen(m_connection));
    run(L"DROP TABLE IF EXISTS " + m_table);
}

void ConnectionTest::TearDown() {
    if (m_connection.isOpen())
        m_connection.execute(L"DROP TABLE IF EXISTS " + m_table);
}

void ConnectionTest::run(const std::wstring& statement) {
    ASSERT_TRUE(m_connection.execute(statement)) << OxText::toUtf8(statement);
}

long ConnectionTest::count(const std::wstring& table) {
    std::unique_ptr<OxQelIRecordset> rs(m_connection.createOxQelIRecordset());
    long n = -1;
    if (!rs->openSQL(&m_connection, L"SELECT COUNT(*) FROM " + table) || !rs->getField(0L, n))
        ADD_FAILURE() << "could not count the rows of " << OxText::toUtf8(table);
    return n;
}
}  // namespace OdbcTest
