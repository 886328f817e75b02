#pragma once

#include <unistd.h>

#include <filesystem>
#include <string>
#include <vector>

#include "platform/odbc/OdbcTestEnv.h"
#include "support/TestSupport.h"

// The drivers a suite runs against: the SQLite driver in the suites without a server, the
// PostgreSQL driver in the server suites (OXQEL_ODBC_TEST_SERVER), with the little that
// differs between their dialects.
namespace OdbcTest {
struct DriverCase {
    const char* name;
    bool postgres;

    std::wstring blobType() const { return postgres ? L"BYTEA" : L"BLOB"; }
    std::wstring trueLiteral() const { return postgres ? L"TRUE" : L"1"; }
};

// Names the case in test listings (instead of its bytes).
inline void PrintTo(const DriverCase& c, std::ostream* out) {
    *out << c.name;
}

inline std::vector<DriverCase> driversUnderTest() {
#ifdef OXQEL_ODBC_TEST_SERVER
    return {{"PostgreSQL", true}};
#else
    return {{"SQLite", false}};
#endif
}

inline std::string driverCaseName(const testing::TestParamInfo<DriverCase>& info) {
    return info.param.name;
}

// A table name of this process alone: server suites run side by side in one database.
inline std::wstring uniqueName(const std::wstring& base) {
    return base + L"_" + std::to_wstring(::getpid());
}

// A test on one driver: a scratch database (a file, or the server's database) and its
// connection string; booleans come back as bits on both drivers.
class DriverTest : public testing::TestWithParam<DriverCase> {
protected:
    void SetUp() override {
        Env::get();
        if (GetParam().postgres) {
            ODBC_REQUIRE_POSTGRES();
            m_connect = Env::get().postgresConnect() + L";BoolsAsChar=0";
        } else {
            m_connect = sqliteConnect(m_dir.file("scratch.db"));
        }
    }
    bool postgres() const { return GetParam().postgres; }
    const std::wstring& connectString() const { return m_connect; }
    OxTest::TempDir m_dir;
    std::wstring m_connect;
};
}  // namespace OdbcTest
