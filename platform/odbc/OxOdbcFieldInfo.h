#pragma once

#include <sql.h>

#include <string>

// The description of one result column (SQLDescribeCol).
struct OxOdbcFieldInfo {
    std::wstring m_strName;
    SQLSMALLINT m_nSQLType = SQL_UNKNOWN_TYPE;
    SQLULEN m_nPrecision = 0;  // the column size
    SQLSMALLINT m_nScale = 0;  // decimal digits
    SQLSMALLINT m_nNullability = SQL_NULLABLE_UNKNOWN;
};
