#pragma once

#include <sql.h>

#include <map>
#include <memory>
#include <string>
#include <string_view>

#include "platform/odbc/OxOdbcFieldInfo.h"
#include "platform/odbc/OxOdbcHandle.h"

class OxDBVariant;
class OxOdbcDatabase;
class OxVariant;

// A statement on a database: direct or prepared execution with bound parameters, result
// description, scrolling fetches and typed column reads. The handle is allocated on first
// use (with the database's query time-out) and freed by free(), by the database's close, or
// with the object. Every failure throws OxDBException.
class OxOdbcStatement {
public:
    explicit OxOdbcStatement(OxOdbcDatabase* database = nullptr);
    ~OxOdbcStatement();

    OxOdbcStatement(const OxOdbcStatement&) = delete;
    OxOdbcStatement& operator=(const OxOdbcStatement&) = delete;

    OxOdbcDatabase* database() const noexcept { return m_db; }
    // Moves the statement to another database (its handle is freed first).
    void setDatabase(OxOdbcDatabase* database);

    void allocate();
    void free() noexcept;
    bool isAllocated() const noexcept { return static_cast<bool>(m_stmt); }
    SQLHSTMT hstmt() const noexcept { return m_stmt.get(); }

    // Statement attributes; setAttribute answers the driver's return code, so that a
    // caller can tell an accepted value from a changed one (SQL_SUCCESS_WITH_INFO, 01S02).
    SQLRETURN setAttribute(SQLINTEGER attribute, SQLULEN value);
    SQLULEN getAttribute(SQLINTEGER attribute);

    // Runs the text; false when it ran but touched no rows (SQL_NO_DATA).
    bool executeDirect(const std::wstring& statement);
    void prepare(const std::wstring& statement);
    bool execute();
    // Parameters count from 1; the value is copied, so the caller's variant may go.
    // Binds integers, reals, booleans, texts, dates, currency, decimals, byte arrays and NULL.
    void bindParameter(SQLUSMALLINT index, const OxVariant& value);
    void clearParameters();
    // Ends the current result (the statement and its parameters stay).
    void closeCursor() noexcept;
    bool moreResults();
    void cancel() noexcept;

    SQLSMALLINT numResultCols();
    SQLLEN rowCount();
    OxOdbcFieldInfo describeColumn(SQLUSMALLINT column);

    // False when the move left the result (SQL_NO_DATA).
    bool fetchScroll(SQLSMALLINT orientation, SQLLEN offset = 0);
    // Reads a column of the current row as the C type (SQL_C_BIT, SQL_C_UTINYINT,
    // SQL_C_SSHORT, SQL_C_SLONG, SQL_C_SBIGINT, SQL_C_FLOAT, SQL_C_DOUBLE,
    // SQL_C_TYPE_TIMESTAMP, SQL_C_TYPE_TIME (on day zero), SQL_C_CHAR as UTF-8, SQL_C_WCHAR,
    // SQL_C_BINARY); long values are
    // read piece by piece. Most drivers allow one read of a column per row.
    void getData(SQLUSMALLINT column, SQLSMALLINT cType, OxDBVariant& out);

private:
    friend class OxOdbcDatabase;
    struct Parameter;

    void requireAllocated() const;
    void check(SQLRETURN rc) const;
    void databaseGone() noexcept;
    // Reads a character or binary column whole; false for NULL. The view lives until the
    // next read.
    bool readLong(SQLUSMALLINT column, SQLSMALLINT cType, size_t terminator,
                  std::string_view& data);

    OxOdbcDatabase* m_db = nullptr;
    OxOdbcHandle m_stmt;
    std::map<SQLUSMALLINT, std::unique_ptr<Parameter>> m_parameters;
    std::string m_buffer;
    std::string m_long;
};
