#pragma once

#include <sql.h>

#include <exception>
#include <string>
#include <vector>

// The exception of the ODBC classes: the return code of the failed call and the
// diagnostic records of its handle (SQLGetDiagRec), or a text of our own for failures that
// no driver reported (a closed recordset, a move past the end).
class OxDBException : public std::exception {
public:
    struct Record {
        std::wstring state;  // five characters, empty for our own failures
        SQLINTEGER native = 0;
        std::wstring message;
    };

    OxDBException(SQLRETURN retCode, std::wstring message);
    OxDBException(SQLRETURN retCode, std::vector<Record> records);

    // The diagnostics that the call left on the handle.
    static OxDBException fromHandle(SQLRETURN retCode, SQLSMALLINT handleType, SQLHANDLE handle);
    // Throws fromHandle unless the call succeeded (SQL_SUCCESS, SQL_SUCCESS_WITH_INFO).
    static void check(SQLRETURN retCode, SQLSMALLINT handleType, SQLHANDLE handle);
    // Every diagnostic record of the handle (none for an invalid handle).
    static std::vector<Record> readDiagnostics(SQLSMALLINT handleType, SQLHANDLE handle);

    SQLRETURN retCode() const noexcept { return m_retCode; }
    // One line per record, "[STATE] message (native)", or our own message alone.
    const std::wstring& errorText() const noexcept { return m_errorText; }
    // The state of the first record ("HYT00"), empty when there is none.
    std::wstring sqlState() const;
    const std::vector<Record>& records() const noexcept { return m_records; }
    const char* what() const noexcept override { return m_what.c_str(); }

private:
    void build();

    SQLRETURN m_retCode;
    std::vector<Record> m_records;
    std::wstring m_errorText;
    std::string m_what;
};
