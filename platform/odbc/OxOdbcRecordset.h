#pragma once

#include <sql.h>

#include <cstdint>
#include <string>
#include <vector>

#include "platform/odbc/OxDBVariant.h"
#include "platform/odbc/OxOdbcFieldInfo.h"
#include "platform/odbc/OxOdbcStatement.h"

class OxOdbcDatabase;

// The rows of a query on a database: opened on its first row, moved in every direction the
// cursor allows, read column by column. Each column of the current row is read from the
// driver once and kept, so reading it again, as another kind or out of order is safe on
// drivers that allow one read per column. Failures throw OxDBException.
class OxOdbcRecordset {
public:
    enum OpenType { dynaset = 0, snapshot = 1, dynamic = 2, forwardOnly = 3 };
    enum OpenOptions : unsigned { none = 0, readOnly = 4 };

    explicit OxOdbcRecordset(OxOdbcDatabase* database = nullptr);
    ~OxOdbcRecordset();

    OxOdbcRecordset(const OxOdbcRecordset&) = delete;
    OxOdbcRecordset& operator=(const OxOdbcRecordset&) = delete;

    OxOdbcDatabase* database() const noexcept { return m_stmt.database(); }
    // Binds the recordset to another database; an open result is closed.
    void setDatabase(OxOdbcDatabase* database);

    // A condition and an order for the next open; the statement then runs as a derived
    // table ("SELECT * FROM (statement) ... WHERE filter ORDER BY sort"), so statements
    // that have a WHERE or ORDER BY of their own keep their meaning.
    void setFilter(const std::wstring& filter) { m_filter = filter; }
    const std::wstring& getFilter() const noexcept { return m_filter; }
    void setSort(const std::wstring& sort) { m_sort = sort; }
    const std::wstring& getSort() const noexcept { return m_sort; }

    // Runs the statement and stands on the first row (BOF and EOF both true for no rows).
    // A snapshot asks for a static cursor, which scrolls on drivers whose default cursor
    // moves forward only.
    void open(const std::wstring& statement, OpenType type = snapshot, unsigned options = readOnly);
    void close() noexcept;
    bool isOpen() const noexcept { return m_open; }
    // The statement as it was run (with the filter and sort).
    const std::wstring& getSQL() const noexcept { return m_sql; }
    bool canScroll() const noexcept { return m_canScroll; }

    bool isBOF() const noexcept { return m_bof; }
    bool isEOF() const noexcept { return m_eof; }
    // The rows visited so far (the highest row number reached); the total once the end
    // has been reached moving forward.
    long getRecordCount() const noexcept { return m_maxRow; }

    // fetchType: SQL_FETCH_NEXT, SQL_FETCH_PRIOR, SQL_FETCH_FIRST, SQL_FETCH_LAST,
    // SQL_FETCH_RELATIVE (rows from the current one) or SQL_FETCH_ABSOLUTE.
    void move(long rows, SQLSMALLINT fetchType = SQL_FETCH_RELATIVE);
    void moveNext() { move(1, SQL_FETCH_NEXT); }
    void movePrev() { move(-1, SQL_FETCH_PRIOR); }
    void moveFirst() { move(1, SQL_FETCH_FIRST); }
    void moveLast() { move(-1, SQL_FETCH_LAST); }

    short getODBCFieldCount() const noexcept { return static_cast<short>(m_columns.size()); }
    const OxOdbcFieldInfo& getODBCFieldInfo(long index) const;
    // The column of that name (exact match first, then ignoring case), or -1.
    long getFieldIndexByName(const std::wstring& name) const;

    // The value of the column in the current row, read as the column's default C type.
    const OxDBVariant& getFieldValue(long index);
    // The value as text (empty for NULL).
    void getFieldValue(long index, std::wstring& text);

    // The C type a column of the SQL type is read as.
    static SQLSMALLINT defaultCType(SQLSMALLINT sqlType, bool isUnsigned = false);

    OxOdbcStatement& statement() noexcept { return m_stmt; }

private:
    struct Column {
        OxOdbcFieldInfo info;
        SQLSMALLINT cType = SQL_C_CHAR;
        OxDBVariant value;
        uint64_t generation = 0;
    };

    void requireOpen() const;
    void requireScroll() const;
    void readColumn(size_t index);
    void afterFetch(bool found, SQLSMALLINT fetchType, long rows);
    long driverRowNumber();

    OxOdbcStatement m_stmt;
    std::wstring m_filter;
    std::wstring m_sort;
    std::wstring m_sql;
    std::vector<Column> m_columns;
    bool m_open = false;
    bool m_canScroll = false;
    bool m_anyOrder = true;
    bool m_bof = true;
    bool m_eof = true;
    long m_row = 0;     // 1-based; 0 before the first row, -1 unknown
    long m_total = -1;  // known once the end was met
    long m_maxRow = 0;
    uint64_t m_generation = 1;
    size_t m_nextUnread = 0;
};
