#include <gtest/gtest.h>

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <thread>

#include "OxQelLib/foundation/OxQelGlobal.h"
#include "OxQelLib/odbc/OdbcConnectionTest.h"
#include "platform/core/OxText.h"

namespace {
using Clock = std::chrono::steady_clock;

// Sets the process-wide time-outs for one test.
class TimeOuts {
public:
    TimeOuts(int32_t login, int32_t command)
        : m_login(OxQel::_lConnectionTimeout), m_command(OxQel::_lCommandTimeout) {
        OxQel::_lConnectionTimeout = login;
        OxQel::_lCommandTimeout = command;
    }
    ~TimeOuts() {
        OxQel::_lConnectionTimeout = m_login;
        OxQel::_lCommandTimeout = m_command;
    }

private:
    int32_t m_login, m_command;
};

// A port on loopback where the kernel accepts connections and nobody ever answers. It
// closes after a while, so that a time-out that does not work ends the test all the same.
class SilentServer {
public:
    SilentServer() : m_fd(::socket(AF_INET, SOCK_STREAM, 0)) {
        sockaddr_in a{};
        a.sin_family = AF_INET;
        a.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t length = sizeof(a);
        if (::bind(m_fd, reinterpret_cast<sockaddr*>(&a), sizeof(a)) != 0 ||
            ::listen(m_fd, 8) != 0 ||
            ::getsockname(m_fd, reinterpret_cast<sockaddr*>(&a), &length) != 0)
            ADD_FAILURE() << "no silent listener";
        m_port = ntohs(a.sin_port);
        m_guard = std::thread([this] {
            std::unique_lock lock(m_mutex);
            m_done.wait_for(lock, std::chrono::seconds(30), [this] { return m_stop; });
            ::shutdown(m_fd, SHUT_RDWR);
        });
    }
    ~SilentServer() {
        {
            std::lock_guard lock(m_mutex);
            m_stop = true;
        }
        m_done.notify_all();
        m_guard.join();
        ::close(m_fd);
    }
    int port() const { return m_port; }

private:
    int m_fd;
    int m_port = 0;
    std::mutex m_mutex;
    std::condition_variable m_done;
    bool m_stop = false;
    std::thread m_guard;
};

double secondsSince(Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
}

class OdbcPostgres : public testing::Test {
protected:
    void SetUp() override { ODBC_REQUIRE_POSTGRES(); }
    const OdbcTest::Env& env() const { return OdbcTest::Env::get(); }
};

TEST_F(OdbcPostgres, DatabaseUserAndPasswordReplaceTheKeysOfTheHost) {
    OxQelConnectionODBC c;
    ASSERT_TRUE(c.openConnection(env().postgresDatabase(),
                                 env().postgresHost() + L";DATABASE=postgres;uid=nobody;Pwd=wrong",
                                 env().postgresUser(), env().postgresPassword()));
    std::unique_ptr<OxQelIRecordset> rs(c.createOxQelIRecordset());
    ASSERT_TRUE(rs->openSQL(&c, L"SELECT current_database(), current_user"));
    EXPECT_EQ(rs->getlFieldString(0), env().postgresDatabase());
    EXPECT_EQ(rs->getlFieldString(1), env().postgresUser());
    rs.reset();

    // Empty arguments leave the host's own keys alone.
    EXPECT_TRUE(c.openConnection(L"", env().postgresConnect(), L"", L""));
    EXPECT_TRUE(c.isOpen());
    OdbcTest::Reports reports;
    EXPECT_FALSE(c.openConnection(env().postgresDatabase(), env().postgresHost(),
                                  env().postgresUser(), L"not-the-password"));
    EXPECT_FALSE(c.isOpen());
    EXPECT_EQ(reports.text().find(L"not-the-password"), std::wstring::npos);
    EXPECT_NE(reports.text().find(L"PWD=***"), std::wstring::npos);
}

TEST_F(OdbcPostgres, PasswordsWithSeparatorsAndBracesStillConnect) {
    OxQelConnectionODBC admin;
    ASSERT_TRUE(admin.openConnection(L"", env().postgresConnect(), L"", L""));
    const std::wstring role = OdbcTest::uniqueName(L"oxqel_role");
    const std::wstring password = L"p;w}d={x";
    admin.execute(L"DROP ROLE IF EXISTS " + role);
    ASSERT_TRUE(admin.execute(L"CREATE ROLE " + role + L" LOGIN PASSWORD '" + password + L"'"));
    OxQelConnectionODBC c;
    EXPECT_TRUE(c.openConnection(env().postgresDatabase(), env().postgresHost(), role, password));
    c.closeDatabase();
    admin.execute(L"DROP ROLE " + role);
}

TEST_F(OdbcPostgres, BooleansAsTextAndUuidsAreDescribedAsTheDriverReportsThem) {
    OxQelConnectionODBC c;  // the driver's default: booleans as text
    ASSERT_TRUE(c.openConnection(L"", env().postgresConnect(), L"", L""));
    std::unique_ptr<OxQelIRecordset> rs(c.createOxQelIRecordset());
    ASSERT_TRUE(
        rs->openSQL(&c,
                    L"SELECT TRUE AS flag, '6ba7b810-9dad-11d1-80b4-00c04fd430c8'::uuid AS id, "
                    L"12.50::numeric(6,2) AS amount"));
    EXPECT_EQ(rs->getFieldType(L"flag"), OxQel::String);
    EXPECT_EQ(rs->getFieldType(L"id"), OxQel::Guid);
    EXPECT_TRUE(
        OxText::equalsNoCase(rs->getlFieldString(1), L"6ba7b810-9dad-11d1-80b4-00c04fd430c8"));
    EXPECT_EQ(rs->getFieldType(L"amount"), OxQel::Unknown);
    EXPECT_EQ(rs->getlFieldValue(2).bstr(), L"12.50");  // decimals keep every digit
}

TEST_F(OdbcPostgres, LoginTimeOutExpiresOnAServerThatNeverAnswers) {
    SilentServer silent;
    const TimeOuts timeOuts(1, 0);
    OxQelConnectionODBC c;
    const auto start = Clock::now();
    EXPECT_FALSE(c.openConnection(
        env().postgresDatabase(),
        L"DRIVER={PostgreSQL Unicode};SERVER=127.0.0.1;PORT=" + std::to_wstring(silent.port()),
        env().postgresUser(), env().postgresPassword()));
    // The driver rounds a time-out of one second up to two; the listener closes after 30.
    EXPECT_LT(secondsSince(start), 15.0);
    EXPECT_FALSE(c.isOpen());
}

TEST_F(OdbcPostgres, QueryTimeOutStopsALongStatement) {
    const TimeOuts timeOuts(0, 1);
    OxQelConnectionODBC c;
    ASSERT_TRUE(c.openConnection(L"", env().postgresConnect(), L"", L""));
    OdbcTest::Reports reports;
    auto start = Clock::now();
    EXPECT_FALSE(c.execute(L"SELECT pg_sleep(10)"));
    EXPECT_LT(secondsSince(start), 8.0);
    EXPECT_NE(reports.text().find(L"57014"), std::wstring::npos) << OxText::toUtf8(reports.text());
    std::unique_ptr<OxQelIRecordset> rs(c.createOxQelIRecordset());
    start = Clock::now();
    EXPECT_FALSE(rs->openSQL(&c, L"SELECT pg_sleep(10)"));
    EXPECT_LT(secondsSince(start), 8.0);
    // The connection goes on working.
    EXPECT_TRUE(rs->openSQL(&c, L"SELECT 1"));
}

TEST_F(OdbcPostgres, ANewConnectionOfAGoneDataSourceIsClosed) {
    OxQelConnectionODBC c;
    ASSERT_TRUE(c.openConnection(env().postgresDatabase(), env().postgresHost(),
                                 env().postgresUser(), env().postgresPassword()));
    std::unique_ptr<OxQelIConnection> same(c.createNewConnection());
    EXPECT_TRUE(same->isOpen());
    SilentServer gone;
    const TimeOuts timeOuts(1, 0);
    OdbcTest::Reports reports;
    c.openConnection(
        L"", L"DRIVER={PostgreSQL Unicode};SERVER=127.0.0.1;PORT=" + std::to_wstring(gone.port()),
        L"", L"");
    std::unique_ptr<OxQelIConnection> other(c.createNewConnection());
    ASSERT_NE(other, nullptr);
    EXPECT_FALSE(other->isOpen());
}
}  // namespace
