#include "platform/odbc/OxOdbcRecordset.h"

#include <sqlext.h>

#include <algorithm>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxOdbcDatabase.h"

OxOdbcRecordset::OxOdbcRecordset(OxOdbcDatabase* database) : m_stmt(database) {}

OxOdbcRecordset::~OxOdbcRecordset() {
    close();
}

void OxOdbcRecordset::setDatabase(OxOdbcDatabase* database) {
    close();
    m_stmt.setDatabase(database);
}

SQLSMALLINT OxOdbcRecordset::defaultCType(SQLSMALLINT sqlType, bool isUnsigned) {
    switch (sqlType) {
        case SQL_BIT:
            return SQL_C_BIT;
        case SQL_TINYINT:
            // A signed tiny integer may be negative: it is read as a short.
            return isUnsigned ? SQL_C_UTINYINT : SQL_C_SSHORT;
        case SQL_SMALLINT:
            return isUnsigned ? SQL_C_SLONG : SQL_C_SSHORT;
        case SQL_INTEGER:
            return isUnsigned ? SQL_C_SBIGINT : SQL_C_SLONG;
        case SQL_BIGINT:
            // Unsigned values above the signed range keep every digit as text.
            return isUnsigned ? SQL_C_CHAR : SQL_C_SBIGINT;
        case SQL_REAL:
            return SQL_C_FLOAT;
        case SQL_FLOAT:
        case SQL_DOUBLE:
            return SQL_C_DOUBLE;
        case SQL_DATE:
        case SQL_TIMESTAMP:
        case SQL_TYPE_DATE:
        case SQL_TYPE_TIMESTAMP:
            return SQL_C_TYPE_TIMESTAMP;
        case SQL_TIME:
        case SQL_TYPE_TIME:
            return SQL_C_TYPE_TIME;
        case SQL_WCHAR:
        case SQL_WVARCHAR:
        case SQL_WLONGVARCHAR:
            return SQL_C_WCHAR;
        case SQL_BINARY:
        case SQL_VARBINARY:
        case SQL_LONGVARBINARY:
            return SQL_C_BINARY;
        default:
            // Text, decimals, GUIDs and whatever else a driver reports.
            return SQL_C_CHAR;
    }
}

void OxOdbcRecordset::open(const std::wstring& statement, OpenType type, unsigned options) {
    close();
    std::wstring sql = statement;
    if (!m_filter.empty() || !m_sort.empty()) {
        size_t end = sql.size();
        while (end > 0 && (sql[end - 1] == L';' || iswspace(static_cast<wint_t>(sql[end - 1]))))
            --end;
        sql = L"SELECT * FROM (" + sql.substr(0, end) + L") OxQelFiltered";
        if (!m_filter.empty())
            sql += L" WHERE " + m_filter;
        if (!m_sort.empty())
            sql += L" ORDER BY " + m_sort;
    }
    m_sql = sql;
    m_stmt.allocate();
    const SQLULEN wanted = type == snapshot  ? SQL_CURSOR_STATIC
                           : type == dynaset ? SQL_CURSOR_KEYSET_DRIVEN
                           : type == dynamic ? SQL_CURSOR_DYNAMIC
                                             : SQL_CURSOR_FORWARD_ONLY;
    try {
        m_stmt.setAttribute(SQL_ATTR_CURSOR_TYPE, wanted);
        if (options & readOnly)
            m_stmt.setAttribute(SQL_ATTR_CONCURRENCY, SQL_CONCUR_READ_ONLY);
    } catch (const OxDBException&) {
        // A driver that refuses the cursor keeps its own; canScroll tells.
    }
    m_stmt.executeDirect(sql);
    m_canScroll = m_stmt.getAttribute(SQL_ATTR_CURSOR_TYPE) != SQL_CURSOR_FORWARD_ONLY;
    m_anyOrder = m_stmt.database()->canGetDataAnyOrder();

    const SQLSMALLINT count = m_stmt.numResultCols();
    m_columns.resize(static_cast<size_t>(count));
    for (SQLSMALLINT i = 0; i < count; ++i) {
        Column& c = m_columns[static_cast<size_t>(i)];
        c.info = m_stmt.describeColumn(static_cast<SQLUSMALLINT>(i + 1));
        SQLLEN isUnsigned = SQL_FALSE;
        if (c.info.m_nSQLType == SQL_TINYINT || c.info.m_nSQLType == SQL_SMALLINT ||
            c.info.m_nSQLType == SQL_INTEGER || c.info.m_nSQLType == SQL_BIGINT)
            SQLColAttribute(m_stmt.hstmt(), static_cast<SQLUSMALLINT>(i + 1), SQL_DESC_UNSIGNED,
                            nullptr, 0, nullptr, &isUnsigned);
        c.cType = defaultCType(c.info.m_nSQLType, isUnsigned == SQL_TRUE);
        c.generation = 0;
    }
    m_open = true;
    m_row = 0;
    m_total = -1;
    m_maxRow = 0;
    m_bof = m_eof = true;
    if (count == 0) {
        m_total = 0;
        return;
    }
    afterFetch(m_stmt.fetchScroll(SQL_FETCH_NEXT), SQL_FETCH_NEXT, 1);
}

void OxOdbcRecordset::close() noexcept {
    m_stmt.closeCursor();
    m_columns.clear();
    m_open = false;
    m_canScroll = false;
    m_bof = m_eof = true;
    m_row = 0;
    m_total = -1;
    m_maxRow = 0;
}

void OxOdbcRecordset::requireOpen() const {
    if (!m_open || !m_stmt.isAllocated())
        throw OxDBException(SQL_ERROR, L"The ODBC recordset is not open");
}

void OxOdbcRecordset::requireScroll() const {
    if (!m_canScroll)
        throw OxDBException(SQL_ERROR,
                            L"The ODBC driver gives only a forward-only cursor for this result: "
                            L"it cannot move backwards or jump");
}

long OxOdbcRecordset::driverRowNumber() {
    // Some drivers answer nonsense here (a "row number unknown" marker or a huge value).
    try {
        const SQLULEN n = m_stmt.getAttribute(SQL_ATTR_ROW_NUMBER);
        return n > 0 && n < (SQLULEN(1) << 48) ? static_cast<long>(n) : -1;
    } catch (const OxDBException&) {
        return -1;
    }
}

void OxOdbcRecordset::move(long rows, SQLSMALLINT fetchType) {
    requireOpen();
    if (fetchType == SQL_FETCH_RELATIVE && rows > 0 && !m_canScroll) {
        // Forward-only cursors still move forward by any number of rows.
        if (m_eof)
            throw OxDBException(SQL_ERROR, L"Attempt to move past the end of the result");
        for (long i = 0; i < rows && !m_eof; ++i) move(1, SQL_FETCH_NEXT);
        return;
    }
    const bool empty = m_total == 0;
    switch (fetchType) {
        case SQL_FETCH_NEXT:
            if (m_eof)
                throw OxDBException(SQL_ERROR, L"Attempt to move past the end of the result");
            break;
        case SQL_FETCH_PRIOR:
            if (m_bof)
                throw OxDBException(SQL_ERROR, L"Attempt to move before the start of the result");
            requireScroll();
            break;
        case SQL_FETCH_FIRST:
            if (empty || (m_row == 1 && !m_bof && !m_eof && !m_canScroll))
                return;  // already there
            requireScroll();
            break;
        case SQL_FETCH_LAST:
            if (empty)
                return;
            requireScroll();
            break;
        case SQL_FETCH_RELATIVE:
            if (rows == 0 && !m_canScroll)
                return;
            if (empty)
                return;
            requireScroll();
            break;
        case SQL_FETCH_ABSOLUTE:
            if (empty)
                return;
            requireScroll();
            break;
        default:
            throw OxDBException(SQL_ERROR, oxFormat(L"Unknown fetch type %d", fetchType));
    }
    const SQLLEN offset = fetchType == SQL_FETCH_RELATIVE || fetchType == SQL_FETCH_ABSOLUTE
                              ? static_cast<SQLLEN>(rows)
                              : 0;
    afterFetch(m_stmt.fetchScroll(fetchType, offset), fetchType, rows);
}

void OxOdbcRecordset::afterFetch(bool found, SQLSMALLINT fetchType, long rows) {
    ++m_generation;
    m_nextUnread = 0;
    const long before = m_bof ? 0 : m_eof ? (m_total >= 0 ? m_total + 1 : -1) : m_row;
    if (!found) {
        const bool forward =
            fetchType == SQL_FETCH_NEXT || fetchType == SQL_FETCH_LAST ||
            ((fetchType == SQL_FETCH_RELATIVE || fetchType == SQL_FETCH_ABSOLUTE) && rows > 0);
        if (fetchType == SQL_FETCH_FIRST || fetchType == SQL_FETCH_LAST) {
            m_total = 0;  // no first or last row: the result is empty
            m_bof = m_eof = true;
            m_row = 0;
        } else if (forward) {
            if (fetchType == SQL_FETCH_NEXT && before >= 0)
                m_total = before;
            m_eof = true;
            m_bof = m_total == 0;
            m_row = -1;
        } else {
            m_bof = true;
            m_eof = m_total == 0;
            m_row = 0;
        }
        if (m_total == 0)
            m_bof = m_eof = true;
        m_maxRow = std::max(m_maxRow, m_total);
        return;
    }
    long row = -1;
    switch (fetchType) {
        case SQL_FETCH_NEXT:
            row = before >= 0 ? before + 1 : -1;
            break;
        case SQL_FETCH_PRIOR:
            row = before > 0 ? before - 1 : -1;
            break;
        case SQL_FETCH_FIRST:
            row = 1;
            break;
        case SQL_FETCH_LAST:
            row = m_total;
            break;
        case SQL_FETCH_RELATIVE:
            row = before >= 0 ? before + rows : -1;
            break;
        case SQL_FETCH_ABSOLUTE:
            row = rows > 0 ? rows : m_total >= 0 ? m_total + 1 + rows : -1;
            break;
        default:
            break;
    }
    if (row <= 0)
        row = driverRowNumber();
    m_row = row;
    m_bof = m_eof = false;
    m_maxRow = std::max(m_maxRow, m_row);
}

const OxOdbcFieldInfo& OxOdbcRecordset::getODBCFieldInfo(long index) const {
    requireOpen();
    if (index < 0 || static_cast<size_t>(index) >= m_columns.size())
        throw OxDBException(SQL_ERROR, oxFormat(L"There is no column %d in the result", index));
    return m_columns[static_cast<size_t>(index)].info;
}

long OxOdbcRecordset::getFieldIndexByName(const std::wstring& name) const {
    for (size_t i = 0; i < m_columns.size(); ++i)
        if (m_columns[i].info.m_strName == name)
            return static_cast<long>(i);
    // Unquoted names are folded by the engine (table_name on one, TABLE_NAME on another).
    for (size_t i = 0; i < m_columns.size(); ++i)
        if (OxText::equalsNoCase(m_columns[i].info.m_strName, name))
            return static_cast<long>(i);
    return -1;
}

void OxOdbcRecordset::readColumn(size_t index) {
    Column& c = m_columns[index];
    m_stmt.getData(static_cast<SQLUSMALLINT>(index + 1), c.cType, c.value);
    c.generation = m_generation;
    m_nextUnread = std::max(m_nextUnread, index + 1);
}

const OxDBVariant& OxOdbcRecordset::getFieldValue(long index) {
    getODBCFieldInfo(index);
    if (m_bof || m_eof)
        throw OxDBException(SQL_ERROR, L"There is no current row");
    const auto i = static_cast<size_t>(index);
    if (m_columns[i].generation != m_generation) {
        // Drivers that read columns in order only get the skipped ones read (and kept) first.
        if (!m_anyOrder)
            for (size_t k = m_nextUnread; k < i; ++k)
                if (m_columns[k].generation != m_generation)
                    readColumn(k);
        readColumn(i);
    }
    return m_columns[i].value;
}

void OxOdbcRecordset::getFieldValue(long index, std::wstring& text) {
    const OxDBVariant& v = getFieldValue(index);
    text.clear();
    v.appendText(text, m_columns[static_cast<size_t>(index)].info.m_nSQLType);
}
