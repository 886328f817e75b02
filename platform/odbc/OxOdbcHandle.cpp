#include "platform/odbc/OxOdbcHandle.h"

#include <utility>

#include "platform/odbc/OxDBException.h"

OxOdbcHandle::OxOdbcHandle(SQLSMALLINT type, SQLHANDLE parent) : m_type(type) {
    const SQLRETURN rc = SQLAllocHandle(type, parent, &m_handle);
    if (SQL_SUCCEEDED(rc))
        return;
    m_handle = SQL_NULL_HANDLE;
    if (type == SQL_HANDLE_ENV || parent == SQL_NULL_HANDLE)
        throw OxDBException(rc, L"Unable to allocate an environment handle");
    const SQLSMALLINT parentType = type == SQL_HANDLE_DBC ? SQL_HANDLE_ENV : SQL_HANDLE_DBC;
    throw OxDBException::fromHandle(rc, parentType, parent);
}

OxOdbcHandle::OxOdbcHandle(OxOdbcHandle&& other) noexcept
    : m_type(other.m_type), m_handle(std::exchange(other.m_handle, nullptr)) {}

OxOdbcHandle& OxOdbcHandle::operator=(OxOdbcHandle&& other) noexcept {
    if (this != &other) {
        reset();
        m_type = other.m_type;
        m_handle = std::exchange(other.m_handle, nullptr);
    }
    return *this;
}

void OxOdbcHandle::reset() noexcept {
    if (m_handle != SQL_NULL_HANDLE)
        SQLFreeHandle(m_type, m_handle);
    m_handle = SQL_NULL_HANDLE;
}
