#include "platform/odbc/OxOdbcEnvironment.h"

#include <odbcinst.h>
#include <sqlext.h>

#include "platform/core/OxText.h"
#include "platform/odbc/OxDBException.h"

OxOdbcEnvironment::OxOdbcEnvironment() : m_env(SQL_HANDLE_ENV, SQL_NULL_HANDLE) {
    const SQLRETURN rc = SQLSetEnvAttr(m_env.get(), SQL_ATTR_ODBC_VERSION,
                                       reinterpret_cast<SQLPOINTER>(SQL_OV_ODBC3), 0);
    OxDBException::check(rc, SQL_HANDLE_ENV, m_env.get());
}

std::shared_ptr<OxOdbcEnvironment> OxOdbcEnvironment::create() {
    return std::make_shared<OxOdbcEnvironment>();
}

std::vector<OxOdbcEnvironment::DataSource> OxOdbcEnvironment::dataSources(SQLHENV env,
                                                                          Scope scope) {
    std::vector<DataSource> result;
    SQLUSMALLINT direction = scope == Scope::user     ? SQL_FETCH_FIRST_USER
                             : scope == Scope::system ? SQL_FETCH_FIRST_SYSTEM
                                                      : SQL_FETCH_FIRST;
    for (;;) {
        SQLCHAR name[SQL_MAX_DSN_LENGTH * 4 + 1] = {};
        SQLCHAR driver[1024] = {};
        SQLSMALLINT nameLength = 0;
        SQLSMALLINT driverLength = 0;
        const SQLRETURN rc = SQLDataSourcesA(env, direction, name, sizeof(name), &nameLength,
                                             driver, sizeof(driver), &driverLength);
        if (rc == SQL_NO_DATA)
            break;
        OxDBException::check(rc, SQL_HANDLE_ENV, env);
        result.push_back({OxText::fromUtf8(reinterpret_cast<const char*>(name)),
                          OxText::fromUtf8(reinterpret_cast<const char*>(driver))});
        direction = SQL_FETCH_NEXT;
    }
    return result;
}

std::vector<std::wstring> OxOdbcEnvironment::drivers() const {
    std::vector<std::wstring> result;
    SQLUSMALLINT direction = SQL_FETCH_FIRST;
    for (;;) {
        SQLCHAR name[1024] = {};
        SQLCHAR attributes[4096] = {};
        SQLSMALLINT nameLength = 0;
        SQLSMALLINT attributesLength = 0;
        const SQLRETURN rc = SQLDriversA(m_env.get(), direction, name, sizeof(name), &nameLength,
                                         attributes, sizeof(attributes), &attributesLength);
        if (rc == SQL_NO_DATA)
            break;
        OxDBException::check(rc, SQL_HANDLE_ENV, m_env.get());
        result.push_back(OxText::fromUtf8(reinterpret_cast<const char*>(name)));
        direction = SQL_FETCH_NEXT;
    }
    return result;
}

std::vector<std::pair<std::wstring, std::wstring>> OxOdbcEnvironment::dataSourceAttributes(
    const std::wstring& dataSource) {
    std::vector<std::pair<std::wstring, std::wstring>> result;
    const std::string section = OxText::toUtf8(dataSource);
    // Without a key the installer lists the section's keys, each ended by a NUL.
    std::string keys(8192, '\0');
    const int n = SQLGetPrivateProfileString(section.c_str(), nullptr, "", keys.data(),
                                             static_cast<int>(keys.size()), "odbc.ini");
    if (n <= 0)
        return result;
    keys.resize(static_cast<size_t>(n));
    size_t p = 0;
    while (p < keys.size()) {
        const size_t end = keys.find('\0', p);
        const std::string key = keys.substr(p, end == std::string::npos ? end : end - p);
        p = end == std::string::npos ? keys.size() : end + 1;
        if (key.empty())
            continue;
        std::string value(4096, '\0');
        const int m = SQLGetPrivateProfileString(section.c_str(), key.c_str(), "", value.data(),
                                                 static_cast<int>(value.size()), "odbc.ini");
        value.resize(m > 0 ? static_cast<size_t>(m) : 0);
        result.emplace_back(OxText::fromUtf8(key), OxText::fromUtf8(value));
    }
    return result;
}
