#pragma once

#include "platform/odbc/OdbcTestDrivers.h"
#include "platform/odbc/OxOdbcDatabase.h"

namespace OdbcTest {
// A platform test with an open database and a scratch table name of its own, dropped
// before and after the test.
class TableTest : public DriverTest {
protected:
    explicit TableTest(const wchar_t* table) : m_table(uniqueName(table)) {}
    void SetUp() override {
        DriverTest::SetUp();
        if (IsSkipped() || HasFatalFailure())
            return;
        m_db.open(connectString());
        m_db.executeSQL(L"DROP TABLE IF EXISTS " + m_table);
    }
    void TearDown() override {
        if (m_db.isOpen())
            m_db.executeSQL(L"DROP TABLE IF EXISTS " + m_table);
    }

    OxOdbcDatabase m_db;
    std::wstring m_table;
};
}  // namespace OdbcTest
