#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <string>

// What the ODBC tests run against: a private unixODBC configuration (ODBCSYSINI, ODBCINI)
// and, under the server fixture, the private PostgreSQL server. The fixture's file is named
// by OXQEL_ODBC_ENV; a test started by hand without it writes a configuration of its own
// (and has no server).
namespace OdbcTest {
class Env {
public:
    // Sets ODBCSYSINI and ODBCINI on the first call: call it before any ODBC call.
    static const Env& get();

    bool hasPostgres() const { return m_values.count("PG_PORT") != 0; }
    // True when a fixture was meant to provide the values (its failure is then a failure).
    bool fromFixture() const { return m_fromFixture; }
    std::string value(const std::string& key) const;
    const std::filesystem::path& configDir() const { return m_configDir; }

    // DRIVER={PostgreSQL Unicode};SERVER=127.0.0.1;PORT=n
    std::wstring postgresHost() const;
    std::wstring postgresDatabase() const;
    std::wstring postgresUser() const;
    std::wstring postgresPassword() const;
    // The host with the database and credentials.
    std::wstring postgresConnect() const;

private:
    Env();
    std::map<std::string, std::string> m_values;
    std::filesystem::path m_configDir;
    bool m_fromFixture = false;
};

// DRIVER={driver};DATABASE=file
std::wstring sqliteConnect(const std::filesystem::path& file,
                           const std::wstring& driver = L"SQLite3");
}  // namespace OdbcTest

// In a test that needs the server: skipped when started by hand, failed when the fixture
// should have started it and did not.
#define ODBC_REQUIRE_POSTGRES()                                                            \
    do {                                                                                   \
        const auto& odbcEnv_ = ::OdbcTest::Env::get();                                     \
        if (!odbcEnv_.hasPostgres()) {                                                     \
            if (odbcEnv_.fromFixture())                                                    \
                FAIL() << "the PostgreSQL fixture gave no server";                         \
            GTEST_SKIP() << "no PostgreSQL test server: run through ctest (label server)"; \
        }                                                                                  \
    } while (0)
