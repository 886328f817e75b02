#pragma once

#include <memory>

#include "OxQelLib/odbc/OxQelConnectionODBC.h"
#include "OxQelLib/odbc/OxQelRecordsetODBC.h"
#include "platform/core/OxMessageSink.h"
#include "platform/odbc/OdbcTestDrivers.h"

namespace OdbcTest {
// Catches what the library reports through the message sink while it lives.
class Reports {
public:
    Reports();
    ~Reports();
    Reports(const Reports&) = delete;
    Reports& operator=(const Reports&) = delete;
    const std::wstring& text() const { return m_text; }

private:
    int m_flags;
    OxMessageSink::Handler m_previous;
    std::wstring m_text;
};

// A library test on one driver: an open OxQelConnectionODBC, opened the way a host opens it
// (database, host, user id, password), and a scratch table name dropped before and after.
class ConnectionTest : public DriverTest {
protected:
    explicit ConnectionTest(const wchar_t* table) : m_table(uniqueName(table)) {}
    void SetUp() override;
    void TearDown() override;

    // The four strings of openConnection for the scratch database.
    struct OpenArgs {
        std::wstring database, host, userId, password;
    };
    OpenArgs openArgs() const;
    bool reopen(OxQelConnectionODBC& c) const;
    // Runs the statement, failing the test when it fails.
    void run(const std::wstring& statement);
    long count(const std::wstring& table);

    OxQelConnectionODBC m_connection;
    std::wstring m_table;
};
}  // namespace OdbcTest
