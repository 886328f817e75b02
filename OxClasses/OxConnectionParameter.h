#pragma once

#include <string>

#include "platform/core/OxExport.h"

// The four strings a connection was opened with, and the ODBC driver named in the host.
class OX_EXPORT OxConnectionParameter {
public:
    const std::wstring& getDatabase() const { return m_database; }
    void setDatabase(const std::wstring& database) { m_database = database; }
    const std::wstring& getHost() const { return m_host; }
    // Stores the host and takes the driver name from it.
    void setHost(const std::wstring& host);
    const std::wstring& getDriverName() const { return m_driverName; }
    // The text after "DRIVER=" in the host up to the next ";"; kept when absent.
    void setDriverName();
    const std::wstring& getUserId() const { return m_userId; }
    void setUserId(const std::wstring& userId) { m_userId = userId; }
    const std::wstring& getPassword() const { return m_password; }
    void setPassword(const std::wstring& password) { m_password = password; }

    // Empties database, host, user id and password; the driver name stays.
    void clear();

private:
    std::wstring m_database;
    std::wstring m_host;
    std::wstring m_driverName;
    std::wstring m_userId;
    std::wstring m_password;
};
