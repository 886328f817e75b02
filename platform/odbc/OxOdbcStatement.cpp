#include "platform/odbc/OxOdbcStatement.h"

#include <sqlext.h>

#include <algorithm>
#include <cmath>
#include <cstring>

#include "platform/core/OxDateTime.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/core/OxVariant.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxDBVariant.h"
#include "platform/odbc/OxOdbcDatabase.h"

namespace {
__extension__ using UInt128 = unsigned __int128;
__extension__ using Int128 = __int128;

constexpr size_t kFirstBuffer = 1024;
constexpr size_t kLargestPiece = 1 << 20;
// Texts and byte strings longer than this are sent as long data types.
constexpr size_t kLongThreshold = 4000;
}  // namespace

struct OxOdbcStatement::Parameter {
    SQLSMALLINT cType = SQL_C_CHAR;
    SQLSMALLINT sqlType = SQL_VARCHAR;
    SQLULEN columnSize = 1;
    SQLSMALLINT digits = 0;
    SQLLEN indicator = 0;
    union {
        int32_t l;
        int64_t ll;
        double d;
        unsigned char b;
        SQL_TIMESTAMP_STRUCT ts;
    };
    std::string bytes;

    Parameter() : ll(0) {}
    SQLPOINTER data() {
        switch (cType) {
            case SQL_C_CHAR:
            case SQL_C_BINARY:
                return bytes.data();
            case SQL_C_SLONG:
                return &l;
            case SQL_C_SBIGINT:
                return &ll;
            case SQL_C_DOUBLE:
                return &d;
            case SQL_C_BIT:
                return &b;
            default:
                return &ts;
        }
    }
};

OxOdbcStatement::OxOdbcStatement(OxOdbcDatabase* database) : m_db(database) {
    if (m_db)
        m_db->attach(this);
}

OxOdbcStatement::~OxOdbcStatement() {
    free();
    if (m_db)
        m_db->detach(this);
}

void OxOdbcStatement::setDatabase(OxOdbcDatabase* database) {
    if (database == m_db)
        return;
    free();
    if (m_db)
        m_db->detach(this);
    m_db = database;
    if (m_db)
        m_db->attach(this);
}

void OxOdbcStatement::databaseGone() noexcept {
    free();
    m_db = nullptr;
}

void OxOdbcStatement::allocate() {
    if (m_stmt)
        return;
    if (!m_db)
        throw OxDBException(SQL_ERROR, L"The statement has no ODBC database");
    m_db->requireOpen();
    OxOdbcHandle stmt(SQL_HANDLE_STMT, m_db->hdbc());
    if (m_db->getQueryTimeout() > 0) {
        // A driver that cannot honour it says so with a warning; the statement still runs.
        SQLSetStmtAttr(stmt.get(), SQL_ATTR_QUERY_TIMEOUT,
                       reinterpret_cast<SQLPOINTER>(static_cast<SQLULEN>(m_db->getQueryTimeout())),
                       SQL_IS_UINTEGER);
    }
    m_stmt = std::move(stmt);
}

void OxOdbcStatement::free() noexcept {
    m_stmt.reset();
    m_parameters.clear();
}

void OxOdbcStatement::requireAllocated() const {
    if (!m_stmt)
        throw OxDBException(SQL_ERROR, L"The ODBC statement is closed");
}

void OxOdbcStatement::check(SQLRETURN rc) const {
    OxDBException::check(rc, SQL_HANDLE_STMT, m_stmt.get());
}

SQLRETURN OxOdbcStatement::setAttribute(SQLINTEGER attribute, SQLULEN value) {
    allocate();
    const SQLRETURN rc =
        SQLSetStmtAttr(m_stmt.get(), attribute, reinterpret_cast<SQLPOINTER>(value), 0);
    if (rc == SQL_ERROR)
        check(rc);
    return rc;
}

SQLULEN OxOdbcStatement::getAttribute(SQLINTEGER attribute) {
    allocate();
    SQLULEN value = 0;
    check(SQLGetStmtAttr(m_stmt.get(), attribute, &value, sizeof(value), nullptr));
    return value;
}

bool OxOdbcStatement::executeDirect(const std::wstring& statement) {
    allocate();
    closeCursor();
    std::string text = OxText::toUtf8(statement);
    const SQLRETURN rc = SQLExecDirectA(m_stmt.get(), reinterpret_cast<SQLCHAR*>(text.data()),
                                        static_cast<SQLINTEGER>(text.size()));
    if (rc == SQL_NO_DATA)
        return false;
    check(rc);
    return true;
}

void OxOdbcStatement::prepare(const std::wstring& statement) {
    allocate();
    closeCursor();
    std::string text = OxText::toUtf8(statement);
    check(SQLPrepareA(m_stmt.get(), reinterpret_cast<SQLCHAR*>(text.data()),
                      static_cast<SQLINTEGER>(text.size())));
}

bool OxOdbcStatement::execute() {
    requireAllocated();
    closeCursor();
    const SQLRETURN rc = SQLExecute(m_stmt.get());
    if (rc == SQL_NO_DATA)
        return false;
    check(rc);
    return true;
}

namespace {
// The decimal text of value / 10^scale.
std::string scaledText(UInt128 magnitude, bool negative, unsigned scale) {
    std::string digits;
    do {
        digits.insert(digits.begin(), static_cast<char>('0' + static_cast<int>(magnitude % 10)));
        magnitude /= 10;
    } while (magnitude);
    if (scale > 0) {
        if (digits.size() <= scale)
            digits.insert(0, scale + 1 - digits.size(), '0');
        digits.insert(digits.size() - scale, 1, '.');
    }
    return negative ? "-" + digits : digits;
}

void setTimestamp(SQL_TIMESTAMP_STRUCT& ts, double serial) {
    // Rounded to the millisecond first, so that 23:59:59.9996 does not read 24:00.
    const double day = std::trunc(serial);
    long long ms = std::llround(std::fabs(serial - day) * 86400000.0);
    double date = day;
    if (ms >= 86400000LL) {
        ms -= 86400000LL;
        date += serial < 0 ? -1 : 1;
    }
    const OxDateTime d(date);
    ts.year = static_cast<SQLSMALLINT>(d.getYear());
    ts.month = static_cast<SQLUSMALLINT>(d.getMonth());
    ts.day = static_cast<SQLUSMALLINT>(d.getDay());
    ts.hour = static_cast<SQLUSMALLINT>(ms / 3600000);
    ts.minute = static_cast<SQLUSMALLINT>(ms / 60000 % 60);
    ts.second = static_cast<SQLUSMALLINT>(ms / 1000 % 60);
    ts.fraction = static_cast<SQLUINTEGER>(ms % 1000 * 1000000);
}
}  // namespace

void OxOdbcStatement::bindParameter(SQLUSMALLINT index, const OxVariant& value) {
    requireAllocated();
    auto& slot = m_parameters[index];
    if (!slot)
        slot = std::make_unique<Parameter>();
    Parameter& p = *slot;
    p.indicator = 0;
    p.digits = 0;
    p.columnSize = 0;
    auto text = [&p](std::string bytes, SQLSMALLINT sqlType, SQLULEN size, SQLSMALLINT digits) {
        p.cType = SQL_C_CHAR;
        p.sqlType = sqlType;
        p.bytes = std::move(bytes);
        p.indicator = static_cast<SQLLEN>(p.bytes.size());
        p.columnSize = size;
        p.digits = digits;
    };
    switch (value.vt()) {
        case VT_EMPTY:
        case VT_NULL:
            p.cType = SQL_C_CHAR;
            p.sqlType = SQL_VARCHAR;
            p.bytes.assign(1, '\0');
            p.columnSize = 1;
            p.indicator = SQL_NULL_DATA;
            break;
        case VT_BOOL:
            p.cType = SQL_C_BIT;
            p.sqlType = SQL_BIT;
            p.b = value.boolVal() != 0 ? 1 : 0;
            p.columnSize = 1;
            break;
        case VT_I1:
        case VT_UI1:
        case VT_I2:
        case VT_UI2:
        case VT_I4:
        case VT_INT:
            p.cType = SQL_C_SLONG;
            p.sqlType = SQL_INTEGER;
            p.l = value.vt() == VT_I1    ? value.cVal()
                  : value.vt() == VT_UI1 ? value.bVal()
                  : value.vt() == VT_I2  ? value.iVal()
                  : value.vt() == VT_UI2 ? value.uiVal()
                                         : value.lVal();
            p.columnSize = 10;
            break;
        case VT_UI4:
        case VT_UINT:
        case VT_I8:
            p.cType = SQL_C_SBIGINT;
            p.sqlType = SQL_BIGINT;
            p.ll = value.vt() == VT_I8 ? value.llVal() : static_cast<int64_t>(value.ulVal());
            p.columnSize = 19;
            break;
        case VT_UI8:
            if (value.ullVal() <= static_cast<uint64_t>(INT64_MAX)) {
                p.cType = SQL_C_SBIGINT;
                p.sqlType = SQL_BIGINT;
                p.ll = static_cast<int64_t>(value.ullVal());
                p.columnSize = 19;
            } else {
                text(scaledText(value.ullVal(), false, 0), SQL_DECIMAL, 20, 0);
            }
            break;
        case VT_R4:
        case VT_R8:
            p.cType = SQL_C_DOUBLE;
            p.sqlType = SQL_DOUBLE;
            p.d = value.vt() == VT_R4 ? value.fltVal() : value.dblVal();
            p.columnSize = 15;
            break;
        case VT_CY: {
            const int64_t cy = value.cyVal();
            const auto magnitude =
                static_cast<UInt128>(cy < 0 ? -static_cast<Int128>(cy) : static_cast<Int128>(cy));
            text(scaledText(magnitude, cy < 0, 4), SQL_DECIMAL, 19, 4);
            break;
        }
        case VT_DECIMAL: {
            const OxDecimal dec = value.decVal();
            const UInt128 magnitude = (static_cast<UInt128>(dec.hi32) << 64) | dec.lo64;
            text(scaledText(magnitude, dec.sign == OxDecimal::kNegative, dec.scale), SQL_DECIMAL,
                 29, dec.scale);
            break;
        }
        case VT_DATE:
            p.cType = SQL_C_TYPE_TIMESTAMP;
            p.sqlType = SQL_TYPE_TIMESTAMP;
            setTimestamp(p.ts, value.date());
            p.columnSize = p.ts.fraction ? 23 : 19;
            p.digits = p.ts.fraction ? 3 : 0;
            break;
        case VT_BSTR: {
            std::string bytes = OxText::toUtf8(value.bstr());
            const size_t n = bytes.size();
            text(std::move(bytes), n > kLongThreshold ? SQL_LONGVARCHAR : SQL_VARCHAR,
                 std::max<size_t>(n, 1), 0);
            break;
        }
        case VT_ARRAY | VT_UI1:
            p.cType = SQL_C_BINARY;
            p.bytes.assign(reinterpret_cast<const char*>(value.bytesData()), value.bytesSize());
            p.sqlType = p.bytes.size() > kLongThreshold ? SQL_LONGVARBINARY : SQL_VARBINARY;
            p.indicator = static_cast<SQLLEN>(p.bytes.size());
            p.columnSize = std::max<size_t>(p.bytes.size(), 1);
            break;
        default:
            throw OxDBException(SQL_ERROR,
                                oxFormat(L"A value of variant type %d cannot be bound to "
                                         L"parameter %d",
                                         value.vt(), index));
    }
    const SQLLEN bufferLength =
        p.cType == SQL_C_CHAR || p.cType == SQL_C_BINARY ? static_cast<SQLLEN>(p.bytes.size()) : 0;
    check(SQLBindParameter(m_stmt.get(), index, SQL_PARAM_INPUT, p.cType, p.sqlType, p.columnSize,
                           p.digits, p.data(), bufferLength, &p.indicator));
}

void OxOdbcStatement::clearParameters() {
    if (m_stmt)
        SQLFreeStmt(m_stmt.get(), SQL_RESET_PARAMS);
    m_parameters.clear();
}

void OxOdbcStatement::closeCursor() noexcept {
    if (m_stmt)
        SQLFreeStmt(m_stmt.get(), SQL_CLOSE);
}

bool OxOdbcStatement::moreResults() {
    requireAllocated();
    const SQLRETURN rc = SQLMoreResults(m_stmt.get());
    if (rc == SQL_NO_DATA)
        return false;
    check(rc);
    return true;
}

void OxOdbcStatement::cancel() noexcept {
    if (m_stmt)
        SQLCancel(m_stmt.get());
}

SQLSMALLINT OxOdbcStatement::numResultCols() {
    requireAllocated();
    SQLSMALLINT n = 0;
    check(SQLNumResultCols(m_stmt.get(), &n));
    return n;
}

SQLLEN OxOdbcStatement::rowCount() {
    requireAllocated();
    SQLLEN n = 0;
    check(SQLRowCount(m_stmt.get(), &n));
    return n;
}

OxOdbcFieldInfo OxOdbcStatement::describeColumn(SQLUSMALLINT column) {
    requireAllocated();
    OxOdbcFieldInfo info;
    std::string name(256, '\0');
    SQLSMALLINT nameLength = 0;
    auto describe = [&] {
        return SQLDescribeColA(m_stmt.get(), column, reinterpret_cast<SQLCHAR*>(name.data()),
                               static_cast<SQLSMALLINT>(name.size()), &nameLength, &info.m_nSQLType,
                               &info.m_nPrecision, &info.m_nScale, &info.m_nNullability);
    };
    SQLRETURN rc = describe();
    if (rc == SQL_SUCCESS_WITH_INFO && nameLength >= static_cast<SQLSMALLINT>(name.size())) {
        name.resize(static_cast<size_t>(nameLength) + 1);
        rc = describe();
    }
    check(rc);
    info.m_strName = OxText::fromUtf8(name.c_str());
    return info;
}

bool OxOdbcStatement::fetchScroll(SQLSMALLINT orientation, SQLLEN offset) {
    requireAllocated();
    const SQLRETURN rc = orientation == SQL_FETCH_NEXT
                             ? SQLFetch(m_stmt.get())
                             : SQLFetchScroll(m_stmt.get(), orientation, offset);
    if (rc == SQL_NO_DATA)
        return false;
    check(rc);
    return true;
}

bool OxOdbcStatement::readLong(SQLUSMALLINT column, SQLSMALLINT cType, size_t terminator,
                               std::string_view& data) {
    if (m_buffer.size() < kFirstBuffer)
        m_buffer.resize(kFirstBuffer);
    bool pieces = false;
    for (;;) {
        SQLLEN indicator = 0;
        const SQLRETURN rc = SQLGetData(m_stmt.get(), column, cType, m_buffer.data(),
                                        static_cast<SQLLEN>(m_buffer.size()), &indicator);
        if (rc == SQL_NO_DATA)
            break;  // the last piece was read already
        check(rc);
        if (indicator == SQL_NULL_DATA)
            return false;
        const size_t room = m_buffer.size() - terminator;
        const bool whole = rc == SQL_SUCCESS ||
                           (indicator != SQL_NO_TOTAL && static_cast<size_t>(indicator) <= room);
        const size_t got = whole ? std::min(static_cast<size_t>(indicator), room) : room;
        if (whole && !pieces) {
            data = std::string_view(m_buffer.data(), got);
            return true;
        }
        if (!pieces) {
            m_long.clear();
            pieces = true;
        }
        m_long.append(m_buffer.data(), got);
        if (whole)
            break;
        // Truncated: the next piece gets a buffer as large as what remains, when known.
        size_t next = indicator == SQL_NO_TOTAL ? m_buffer.size() * 2
                                                : static_cast<size_t>(indicator) - got + terminator;
        next = std::clamp(next, kFirstBuffer, kLargestPiece);
        if (next > m_buffer.size())
            m_buffer.resize(next + (next & 1));
    }
    data = pieces ? std::string_view(m_long) : std::string_view();
    return true;
}

void OxOdbcStatement::getData(SQLUSMALLINT column, SQLSMALLINT cType, OxDBVariant& out) {
    requireAllocated();
    SQLLEN indicator = 0;
    auto fixed = [&](void* target, OxDBVariant::Kind kind) {
        check(SQLGetData(m_stmt.get(), column, cType, target, 0, &indicator));
        out.m_dwType = indicator == SQL_NULL_DATA ? OxDBVariant::DBVT_NULL : kind;
    };
    switch (cType) {
        case SQL_C_BIT: {
            unsigned char v = 0;
            fixed(&v, OxDBVariant::DBVT_BOOL);
            out.m_boolVal = v > 0;
            return;
        }
        case SQL_C_UTINYINT:
            fixed(&out.m_chVal, OxDBVariant::DBVT_UCHAR);
            return;
        case SQL_C_SSHORT:
            fixed(&out.m_iVal, OxDBVariant::DBVT_SHORT);
            return;
        case SQL_C_SLONG:
            fixed(&out.m_lVal, OxDBVariant::DBVT_LONG);
            return;
        case SQL_C_SBIGINT:
            fixed(&out.m_llVal, OxDBVariant::DBVT_BIGINT);
            return;
        case SQL_C_FLOAT:
            fixed(&out.m_fltVal, OxDBVariant::DBVT_SINGLE);
            return;
        case SQL_C_DOUBLE:
            fixed(&out.m_dblVal, OxDBVariant::DBVT_DOUBLE);
            return;
        case SQL_C_TYPE_TIMESTAMP:
        case SQL_C_TIMESTAMP:
            fixed(&out.m_date, OxDBVariant::DBVT_DATE);
            return;
        case SQL_C_TYPE_TIME:
        case SQL_C_TIME: {
            // A time of day alone stands on the platform's day zero, 1899-12-30.
            SQL_TIME_STRUCT t{};
            fixed(&t, OxDBVariant::DBVT_DATE);
            out.m_date = SQL_TIMESTAMP_STRUCT{1899, 12, 30, t.hour, t.minute, t.second, 0};
            return;
        }
        case SQL_C_CHAR:
        case SQL_C_WCHAR:
        case SQL_C_BINARY: {
            std::string_view data;
            const size_t terminator = cType == SQL_C_CHAR ? 1 : cType == SQL_C_WCHAR ? 2 : 0;
            if (!readLong(column, cType, terminator, data)) {
                out.m_dwType = OxDBVariant::DBVT_NULL;
                return;
            }
            if (cType == SQL_C_BINARY) {
                out.m_binary.assign(data.begin(), data.end());
                out.m_dwType = OxDBVariant::DBVT_BINARY;
                return;
            }
            out.m_str.clear();
            if (cType == SQL_C_CHAR) {
                OxText::appendFromUtf8(out.m_str, data);
            } else {
                std::u16string units(data.size() / 2, u'\0');
                std::memcpy(units.data(), data.data(), units.size() * 2);
                out.m_str = OxText::fromUtf16(units);
            }
            out.m_dwType = OxDBVariant::DBVT_STRING;
            return;
        }
        default:
            throw OxDBException(SQL_ERROR,
                                oxFormat(L"Column %d cannot be read as C type %d", column, cType));
    }
}
