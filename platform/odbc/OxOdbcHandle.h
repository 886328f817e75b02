#pragma once

#include <sql.h>

// One ODBC handle (environment, connection, statement or descriptor), freed with its owner.
class OxOdbcHandle {
public:
    OxOdbcHandle() = default;
    // Allocates a handle of the type under the parent (SQL_NULL_HANDLE for an environment);
    // throws OxDBException with the parent's diagnostics when that fails.
    OxOdbcHandle(SQLSMALLINT type, SQLHANDLE parent);
    ~OxOdbcHandle() { reset(); }

    OxOdbcHandle(const OxOdbcHandle&) = delete;
    OxOdbcHandle& operator=(const OxOdbcHandle&) = delete;
    OxOdbcHandle(OxOdbcHandle&& other) noexcept;
    OxOdbcHandle& operator=(OxOdbcHandle&& other) noexcept;

    SQLHANDLE get() const noexcept { return m_handle; }
    SQLSMALLINT type() const noexcept { return m_type; }
    explicit operator bool() const noexcept { return m_handle != SQL_NULL_HANDLE; }

    // Frees the handle now; the object is then empty.
    void reset() noexcept;

private:
    SQLSMALLINT m_type = 0;
    SQLHANDLE m_handle = SQL_NULL_HANDLE;
};
