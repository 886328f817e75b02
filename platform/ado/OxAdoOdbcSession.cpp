#include "platform/ado/OxAdoOdbcSession.h"

#include <sql.h>
#include <sqlext.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <cwctype>
#include <mutex>

#include "platform/ado/OxAdoConnectionString.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxDBVariant.h"
#include "platform/odbc/OxOdbcDatabase.h"
#include "platform/odbc/OxOdbcStatement.h"

using namespace OxAdo;

namespace {
const wchar_t* const kSource = L"MSDASQL";
__extension__ using UInt128 = unsigned __int128;

int adoTypeOf(SQLSMALLINT sqlType) {
    switch (sqlType) {
        case SQL_CHAR:
            return adChar;
        case SQL_VARCHAR:
            return adVarChar;
        case SQL_LONGVARCHAR:
            return adLongVarChar;
        case SQL_WCHAR:
            return adWChar;
        case SQL_WVARCHAR:
            return adVarWChar;
        case SQL_WLONGVARCHAR:
            return adLongVarWChar;
        case SQL_DECIMAL:
        case SQL_NUMERIC:
            return adNumeric;
        case SQL_SMALLINT:
            return adSmallInt;
        case SQL_INTEGER:
            return adInteger;
        case SQL_REAL:
            return adSingle;
        case SQL_FLOAT:
        case SQL_DOUBLE:
            return adDouble;
        case SQL_BIT:
            return adBoolean;
        case SQL_TINYINT:
            return adUnsignedTinyInt;
        case SQL_BIGINT:
            return adBigInt;
        case SQL_BINARY:
            return adBinary;
        case SQL_VARBINARY:
            return adVarBinary;
        case SQL_LONGVARBINARY:
            return adLongVarBinary;
        case SQL_TYPE_DATE:
        case SQL_DATE:
            return adDBDate;
        case SQL_TYPE_TIME:
        case SQL_TIME:
            return adDBTime;
        case SQL_TYPE_TIMESTAMP:
        case SQL_TIMESTAMP:
            return adDBTimeStamp;
        case SQL_GUID:
            return adGUID;
        default:
            // A type of the driver's own is read as its text.
            return adVarChar;
    }
}

// The defined size as the model gives it: characters for texts and bytes for binaries,
// the size of the value's storage for the rest.
long definedSizeOf(int type, SQLULEN columnSize) {
    switch (type) {
        case adSmallInt:
            return 2;
        case adInteger:
        case adSingle:
            return 4;
        case adBigInt:
        case adDouble:
        case adCurrency:
        case adDate:
            return 8;
        case adUnsignedTinyInt:
            return 1;
        case adBoolean:
            return 2;
        case adNumeric:
            return 19;
        case adDBDate:
            return 6;
        case adDBTime:
            return 6;
        case adDBTimeStamp:
            return 16;
        case adGUID:
            return 16;
        default:
            break;
    }
    if (columnSize == 0 || columnSize > 0x7FFFFFFF)
        return 0x7FFFFFFF;  // a long value without a known bound
    return static_cast<long>(columnSize);
}

SQLSMALLINT cTypeOf(int type) {
    switch (type) {
        case adSmallInt:
            return SQL_C_SSHORT;
        case adInteger:
            return SQL_C_SLONG;
        case adBigInt:
            return SQL_C_SBIGINT;
        case adUnsignedTinyInt:
            return SQL_C_UTINYINT;
        case adSingle:
            return SQL_C_FLOAT;
        case adDouble:
            return SQL_C_DOUBLE;
        case adBoolean:
            return SQL_C_BIT;
        case adDBDate:
        case adDBTimeStamp:
            return SQL_C_TYPE_TIMESTAMP;
        case adDBTime:
            return SQL_C_TYPE_TIME;
        case adBinary:
        case adVarBinary:
        case adLongVarBinary:
            return SQL_C_BINARY;
        default:
            return SQL_C_CHAR;  // texts, numerics and GUIDs travel as (UTF-8) text
    }
}

// A decimal number written by a driver, read whatever the user's locale.
OxVariant decimalOf(const std::wstring& text) {
    const std::wstring t = OxText::trim(text);
    OxDecimal d;
    size_t i = 0;
    if (i < t.size() && (t[i] == L'-' || t[i] == L'+'))
        d.sign = t[i++] == L'-' ? OxDecimal::kNegative : 0;
    const UInt128 largest = (static_cast<UInt128>(1) << 96) - 1;
    UInt128 mantissa = 0;
    int scale = 0;
    bool point = false, digits = false;
    for (; i < t.size(); ++i) {
        const wchar_t c = t[i];
        if (c == L'.' && !point) {
            point = true;
            continue;
        }
        if (c < L'0' || c > L'9')
            break;
        digits = true;
        // Beyond 28 places or 96 bits the rest rounds away, as the platform's decimal does.
        if (mantissa > (largest - 9) / 10 || scale >= 28) {
            if (!point)
                return OxVariant(text);  // too large for a decimal: kept as text
            continue;
        }
        mantissa = mantissa * 10 + static_cast<unsigned>(c - L'0');
        if (point)
            ++scale;
    }
    if (!digits || i != t.size())
        return OxVariant(text);
    d.scale = static_cast<uint8_t>(scale);
    d.hi32 = static_cast<uint32_t>(mantissa >> 64);
    d.lo64 = static_cast<uint64_t>(mantissa);
    return OxVariant(d);
}

OxVariant guidOf(const std::wstring& text) {
    std::wstring g = OxText::toUpper(OxText::trim(text));
    if (!g.empty() && g.front() != L'{')
        g = L"{" + g + L"}";
    return OxVariant(g);
}

OxVariant valueOf(const OxDBVariant& v, int type) {
    switch (v.m_dwType) {
        case OxDBVariant::DBVT_NULL:
            return OxVariant::null();
        case OxDBVariant::DBVT_BOOL:
            return OxVariant(v.m_boolVal);
        case OxDBVariant::DBVT_UCHAR:
            return OxVariant(static_cast<uint8_t>(v.m_chVal));
        case OxDBVariant::DBVT_SHORT:
            return OxVariant(static_cast<int16_t>(v.m_iVal));
        case OxDBVariant::DBVT_LONG:
            return OxVariant(static_cast<int32_t>(v.m_lVal));
        case OxDBVariant::DBVT_BIGINT:
            return OxVariant(static_cast<long long>(v.m_llVal));
        case OxDBVariant::DBVT_SINGLE:
            return OxVariant(v.m_fltVal);
        case OxDBVariant::DBVT_DOUBLE:
            return OxVariant(v.m_dblVal);
        case OxDBVariant::DBVT_DATE: {
            const SQL_TIMESTAMP_STRUCT& ts = v.m_date;
            OxDateTime d(ts.year, ts.month, ts.day, ts.hour, ts.minute, ts.second);
            if (d.getStatus() != OxDateTime::valid)
                return OxVariant::null();
            return OxVariant::fromDate(d.serial() + ts.fraction / 1e9 / 86400.0);
        }
        case OxDBVariant::DBVT_BINARY:
            return OxVariant::fromBytes(v.m_binary);
        default:
            if (type == adNumeric)
                return decimalOf(v.m_str);
            if (type == adGUID)
                return guidOf(v.m_str);
            return OxVariant(v.m_str);
    }
}

std::wstring colText(SQLHSTMT h, SQLUSMALLINT column, SQLUSMALLINT field) {
    char buffer[1024] = {};
    SQLSMALLINT length = 0;
    const SQLRETURN rc =
        SQLColAttributeA(h, column, field, buffer, sizeof(buffer) - 1, &length, nullptr);
    if (!SQL_SUCCEEDED(rc))
        return {};
    return OxText::fromUtf8(buffer);
}

SQLLEN colNumber(SQLHSTMT h, SQLUSMALLINT column, SQLUSMALLINT field, SQLLEN otherwise) {
    SQLLEN n = 0;
    if (!SQL_SUCCEEDED(SQLColAttributeA(h, column, field, nullptr, 0, nullptr, &n)))
        return otherwise;
    return n;
}

// The one table a simple SELECT reads ("SELECT ... FROM t [WHERE|ORDER|...]"), for
// drivers that do not name the base table of their columns; empty for anything else.
std::wstring singleTableOf(const std::wstring& text) {
    const size_t from = OxText::findNoCase(text, L" FROM ");
    if (from == std::wstring::npos ||
        OxText::findNoCase(text, L" FROM ", from + 1) != std::wstring::npos)
        return {};
    size_t i = from + 6;
    while (i < text.size() && text[i] == L' ') ++i;
    std::wstring name;
    if (i < text.size() && (text[i] == L'"' || text[i] == L'[' || text[i] == L'`')) {
        const wchar_t close = text[i] == L'[' ? L']' : text[i];
        const size_t end = text.find(close, i + 1);
        if (end == std::wstring::npos)
            return {};
        name = text.substr(i + 1, end - i - 1);
        i = end + 1;
    } else {
        const size_t start = i;
        while (i < text.size() && (std::iswalnum(text[i]) || text[i] == L'_' || text[i] > 0x7F))
            ++i;
        name = text.substr(start, i - start);
    }
    while (i < text.size() && text[i] == L' ') ++i;
    if (i < text.size()) {
        // Nothing but the end, a clause or ";" may follow: no joins, lists or aliases.
        static const wchar_t* const next[] = {L"WHERE", L"ORDER", L"GROUP", L"LIMIT", L";"};
        bool ok = false;
        for (const wchar_t* n : next)
            if (OxText::findNoCase(text, n, i) == i)
                ok = true;
        if (!ok)
            return {};
    }
    return name;
}

class OdbcRows : public OxAdoRowSource {
public:
    OdbcRows(OxAdoOdbcSession& session, std::unique_ptr<OxOdbcStatement> statement,
             std::vector<OxAdoColumnInfo> columns)
        : m_session(session), m_statement(std::move(statement)), m_columns(std::move(columns)) {
        for (const auto& c : m_columns) m_cTypes.push_back(cTypeOf(c.type));
    }

    const std::vector<OxAdoColumnInfo>& columns() const override { return m_columns; }

    bool fetch(std::vector<OxVariant>& values) override {
        try {
            if (!m_statement->fetchScroll(SQL_FETCH_NEXT)) {
                m_statement->closeCursor();
                return false;
            }
            values.resize(m_columns.size());
            for (size_t i = 0; i < m_columns.size(); ++i) {
                m_statement->getData(static_cast<SQLUSMALLINT>(i + 1), m_cTypes[i], m_value);
                values[i] = valueOf(m_value, m_columns[i].type);
            }
            return true;
        } catch (const OxDBException& e) {
            m_session.fail(e);
        }
    }

private:
    OxAdoOdbcSession& m_session;
    std::unique_ptr<OxOdbcStatement> m_statement;
    std::vector<OxAdoColumnInfo> m_columns;
    std::vector<SQLSMALLINT> m_cTypes;
    OxDBVariant m_value;
};

// Reads the rows a catalog function left on a statement, every column as text.
std::vector<std::vector<std::wstring>> readAll(OxOdbcStatement& st) {
    std::vector<std::vector<std::wstring>> rows;
    const SQLSMALLINT n = st.numResultCols();
    OxDBVariant v;
    while (st.fetchScroll(SQL_FETCH_NEXT)) {
        std::vector<std::wstring> row;
        for (SQLSMALLINT c = 1; c <= n; ++c) {
            st.getData(static_cast<SQLUSMALLINT>(c), SQL_C_CHAR, v);
            row.push_back(v.isNull() ? std::wstring() : v.m_str);
        }
        rows.push_back(std::move(row));
    }
    return rows;
}

std::wstring at(const std::vector<std::wstring>& row, size_t i) {
    return i < row.size() ? row[i] : std::wstring();
}

long numberAt(const std::vector<std::wstring>& row, size_t i, long otherwise = 0) {
    const std::wstring s = at(row, i);
    try {
        return s.empty() ? otherwise : std::stol(s);
    } catch (...) {
        return otherwise;
    }
}

// A catalog argument: null for an empty text (no restriction).
struct Arg {
    explicit Arg(const std::wstring& s) : text(OxText::toUtf8(s)), empty(s.empty()) {}
    SQLCHAR* ptr() { return empty ? nullptr : reinterpret_cast<SQLCHAR*>(text.data()); }
    SQLSMALLINT len() const { return empty ? 0 : static_cast<SQLSMALLINT>(text.size()); }
    std::string text;
    bool empty;
};
}  // namespace

OxAdoOdbcSession::OxAdoOdbcSession() = default;

OxAdoOdbcSession::~OxAdoOdbcSession() {
    close();
}

OxOdbcDatabase& OxAdoOdbcSession::database() {
    if (!m_db || !m_db->isOpen())
        throw OxAdoProviderError(hresultOf(adErrInvalidConnection),
                                 descriptionOf(adErrInvalidConnection));
    return *m_db;
}

// ---------------------------------------------------------------- errors

OxHResult OxAdoOdbcSession::hresultOfState(const std::wstring& s) {
    auto is = [&](const wchar_t* prefix) { return s.rfind(prefix, 0) == 0; };
    if (is(L"42") || is(L"37"))
        return Hr::DB_E_ERRORSINCOMMAND;
    if (is(L"23"))
        return adErrIntegrityViolation;
    if (is(L"22003") || is(L"22001"))
        return adErrDataOverflow;
    if (is(L"22"))
        return adErrDataConversion;
    if (is(L"HYT") || is(L"57014"))
        return Hr::DB_E_ABORTLIMITREACHED;
    if (is(L"25") || is(L"40"))
        return adErrInvalidTransaction;
    if (is(L"08") || is(L"28") || is(L"57P") || is(L"3D"))
        return adErrInvalidConnection;
    if (is(L"IM"))
        return adErrProviderNotFound;
    if (is(L"07"))
        return Hr::DB_E_PARAMNOTOPTIONAL;
    if (is(L"HYC00") || is(L"0A"))
        return Hr::DB_E_NOTSUPPORTED;
    return OxHr::E_FAIL;
}

OxAdoProviderError OxAdoOdbcSession::translate(const OxDBException& e) {
    std::vector<OxAdoErrorInfo> records;
    for (const auto& r : e.records()) {
        OxAdoErrorInfo info;
        info.number = r.state.empty() ? OxHr::E_FAIL : hresultOfState(r.state);
        info.description = r.message;
        info.nativeError = r.native;
        info.sqlState = r.state;
        info.source = kSource;
        records.push_back(std::move(info));
    }
    return OxAdoProviderError(std::move(records));
}

void OxAdoOdbcSession::fail(const OxDBException& e) {
    OxAdoProviderError error = translate(e);
    // The SQLite driver says HY000 for almost everything; its native code tells more.
    if (m_dialect.engine() == OxAdoOdbcDialect::Engine::SQLite) {
        std::vector<OxAdoErrorInfo> records = error.records();
        for (auto& r : records)
            if (r.sqlState == L"HY000" || r.sqlState.empty()) {
                switch (r.nativeError) {
                    case 1:  // SQLITE_ERROR: syntax, unknown table or column
                        r.number = Hr::DB_E_ERRORSINCOMMAND;
                        break;
                    case 5:  // SQLITE_BUSY
                    case 6:  // SQLITE_LOCKED
                        r.number = adErrResourceLocked;
                        break;
                    case 19:  // SQLITE_CONSTRAINT
                        r.number = adErrIntegrityViolation;
                        break;
                    case 20:  // SQLITE_MISMATCH
                        r.number = adErrDataConversion;
                        break;
                    default:
                        break;
                }
            }
        error = OxAdoProviderError(std::move(records));
    }
    for (const auto& r : error.records()) {
        const std::wstring& s = r.sqlState;
        if (s.rfind(L"08", 0) == 0 || s.rfind(L"57P", 0) == 0 ||
            OxText::findNoCase(r.description, L"server closed the connection") !=
                std::wstring::npos ||
            OxText::findNoCase(r.description, L"no connection to the server") != std::wstring::npos)
            m_broken = m_db != nullptr;
    }
    throw error;
}

// ---------------------------------------------------------------- connecting

namespace {
struct Aliases {
    std::mutex mutex;
    std::vector<std::pair<std::wstring, std::wstring>> entries;
};

Aliases& aliases() {
    static Aliases a;
    return a;
}

std::wstring unbraced(const std::wstring& driver) {
    std::wstring d = OxText::trim(driver);
    if (d.size() >= 2 && d.front() == L'{' && d.back() == L'}')
        d = d.substr(1, d.size() - 2);
    return d;
}
}  // namespace

void OxAdoOdbcSession::setDriverAlias(const std::wstring& driver, const std::wstring& replacement) {
    Aliases& a = aliases();
    std::lock_guard lock(a.mutex);
    const std::wstring name = unbraced(driver);
    std::erase_if(a.entries, [&](const auto& e) { return OxText::equalsNoCase(e.first, name); });
    if (!replacement.empty())
        a.entries.emplace_back(name, replacement);
}

std::wstring OxAdoOdbcSession::odbcConnectionString(const OpenArgs& args) {
    OxAdoConnectionString cs(args.connectionString);
    cs.remove(L"Provider");
    const std::wstring extended = cs.get(L"Extended Properties");
    cs.remove(L"Extended Properties");
    OxAdoConnectionString odbc(extended);
    for (const auto& [k, v] : cs.pairs()) odbc.set(k, v);
    if (odbc.has(L"Driver")) {
        Aliases& a = aliases();
        std::lock_guard lock(a.mutex);
        const std::wstring driver = unbraced(odbc.get(L"Driver"));
        for (const auto& [name, replacement] : a.entries)
            if (OxText::equalsNoCase(name, driver))
                odbc.set(L"Driver", replacement);
    }
    if (!args.userId.empty())
        odbc.set(L"UID", args.userId);
    if (!args.password.empty())
        odbc.set(L"PWD", args.password);
    // ODBC values need braces, not quotes, to hold a ";".
    std::wstring out;
    for (const auto& [k, v] : odbc.pairs()) {
        out += k + L"=";
        const bool braced = !v.empty() && v.front() == L'{';
        if (!braced && v.find_first_of(L";{}") != std::wstring::npos) {
            std::wstring escaped;
            for (wchar_t c : v) {
                escaped += c;
                if (c == L'}')
                    escaped += L'}';
            }
            out += L"{" + escaped + L"}";
        } else {
            out += v;
        }
        out += L";";
    }
    return out;
}

void OxAdoOdbcSession::open(const OpenArgs& args) {
    openOdbc(odbcConnectionString(args), args.connectionTimeout, args.commandTimeout);
}

void OxAdoOdbcSession::openOdbc(const std::wstring& odbcConnectionString, long loginTimeout,
                                long queryTimeout) {
    close();
    auto db = std::make_unique<OxOdbcDatabase>();
    db->setLoginTimeout(loginTimeout);
    db->setQueryTimeout(queryTimeout);
    try {
        db->open(odbcConnectionString);
        m_dbmsName = db->getDbmsName();
        try {
            m_dbmsVersion = db->getInfoString(SQL_DBMS_VER);
            m_driverName = db->getDriverName();
            const std::wstring quote = OxText::trim(db->getInfoString(SQL_IDENTIFIER_QUOTE_CHAR));
            m_quote = quote.empty() ? L"\"" : quote;
        } catch (const OxDBException&) {
            // What the driver does not say keeps its standard value.
        }
    } catch (const OxDBException& e) {
        throw translate(e);
    }
    m_db = std::move(db);
    m_broken = false;
    m_dialect = OxAdoOdbcDialect(OxAdoOdbcDialect::engineOf(m_dbmsName),
                                 [this](const std::wstring& n) { return quoteIdentifier(n); });
}

void OxAdoOdbcSession::close() noexcept {
    if (m_db)
        m_db->close();
    m_db.reset();
}

std::wstring OxAdoOdbcSession::quoteIdentifier(const std::wstring& name) const {
    if (m_quote == L" " || m_quote.empty())
        return name;
    const wchar_t open = m_quote.front();
    const wchar_t close = open == L'[' ? L']' : open;
    std::wstring out(1, open);
    for (wchar_t c : name) {
        if (c == close)
            out += close;
        out += c;
    }
    return out + close;
}

// ---------------------------------------------------------------- statements

std::unique_ptr<OxAdoRowSource> OxAdoOdbcSession::execute(
    const std::wstring& text, const std::vector<OxAdoParamValue>& params, const OxAdoExecArgs& args,
    long& rowsAffected) {
    OxOdbcDatabase& db = database();
    auto st = std::make_unique<OxOdbcStatement>(&db);
    try {
        st->allocate();
        if (args.timeout > 0)
            st->setAttribute(SQL_ATTR_QUERY_TIMEOUT, static_cast<SQLULEN>(args.timeout));
        bool produced = false;
        if (params.empty()) {
            produced = st->executeDirect(text);
        } else {
            st->prepare(text);
            for (size_t i = 0; i < params.size(); ++i)
                st->bindParameter(static_cast<SQLUSMALLINT>(i + 1), params[i].value);
            produced = st->execute();
        }
        const SQLSMALLINT n = produced ? st->numResultCols() : 0;
        if (n == 0) {
            rowsAffected = produced ? static_cast<long>(st->rowCount()) : 0;
            return nullptr;
        }
        rowsAffected = -1;
        if (!args.wantRows) {
            st->closeCursor();
            return nullptr;
        }
        std::vector<OxAdoColumnInfo> columns;
        const std::wstring table = singleTableOf(text);
        for (SQLSMALLINT c = 1; c <= n; ++c) {
            const OxOdbcFieldInfo f = st->describeColumn(static_cast<SQLUSMALLINT>(c));
            OxAdoColumnInfo info;
            info.name = f.m_strName;
            info.type = adoTypeOf(f.m_nSQLType);
            info.definedSize = definedSizeOf(info.type, f.m_nPrecision);
            info.precision = static_cast<int>(f.m_nPrecision);
            info.numericScale = f.m_nScale;
            info.mayBeNull = f.m_nNullability != SQL_NO_NULLS;
            info.nullable = f.m_nNullability != SQL_NO_NULLS;
            const SQLHSTMT h = st->hstmt();
            info.autoIncrement = colNumber(h, c, SQL_DESC_AUTO_UNIQUE_VALUE, SQL_FALSE) == SQL_TRUE;
            info.baseTable = colText(h, c, SQL_DESC_BASE_TABLE_NAME);
            if (info.baseTable.empty())
                info.baseTable = colText(h, c, SQL_DESC_TABLE_NAME);
            info.baseColumn = colText(h, c, SQL_DESC_BASE_COLUMN_NAME);
            info.baseSchema = colText(h, c, SQL_DESC_SCHEMA_NAME);
            info.baseCatalog = colText(h, c, SQL_DESC_CATALOG_NAME);
            if (info.baseTable.empty() && !table.empty()) {
                // The driver does not say: a plain SELECT of one table reads that table's
                // columns under their own names.
                info.baseTable = table;
                info.baseColumn = info.name;
            }
            if (!info.baseTable.empty() && info.baseColumn.empty())
                info.baseColumn = info.name;
            columns.push_back(std::move(info));
        }
        return std::make_unique<OdbcRows>(*this, std::move(st), std::move(columns));
    } catch (const OxDBException& e) {
        fail(e);
    }
}

bool OxAdoOdbcSession::supportsTransactions() const {
    return m_db && m_db->canTransact();
}

void OxAdoOdbcSession::beginTrans() {
    try {
        database().beginTrans();
    } catch (const OxDBException& e) {
        fail(e);
    }
}

void OxAdoOdbcSession::commitTrans() {
    try {
        database().commitTrans();
    } catch (const OxDBException& e) {
        fail(e);
    }
}

void OxAdoOdbcSession::rollbackTrans() {
    try {
        database().rollback();
    } catch (const OxDBException& e) {
        fail(e);
    }
}

void OxAdoOdbcSession::setIsolationLevel(long level) {
    SQLULEN odbc = SQL_TXN_READ_COMMITTED;
    if (level == adXactReadUncommitted || level == adXactChaos)
        odbc = SQL_TXN_READ_UNCOMMITTED;
    else if (level == adXactRepeatableRead)
        odbc = SQL_TXN_REPEATABLE_READ;
    else if (level == adXactSerializable)
        odbc = SQL_TXN_SERIALIZABLE;
    OxOdbcDatabase& db = database();
    const SQLRETURN rc = SQLSetConnectAttr(db.hdbc(), SQL_ATTR_TXN_ISOLATION,
                                           reinterpret_cast<SQLPOINTER>(odbc), SQL_IS_UINTEGER);
    try {
        OxDBException::check(rc, SQL_HANDLE_DBC, db.hdbc());
    } catch (const OxDBException& e) {
        fail(e);
    }
}

// ---------------------------------------------------------------- catalog

std::vector<OxAdoTableInfo> OxAdoOdbcSession::tables(const std::wstring& tableName,
                                                     const std::wstring& tableType) {
    std::vector<OxAdoTableInfo> out;
    try {
        OxOdbcStatement st(&database());
        st.allocate();
        Arg name(tableName), type(tableType);
        OxDBException::check(SQLTablesA(st.hstmt(), nullptr, 0, nullptr, 0, name.ptr(), name.len(),
                                        type.ptr(), type.len()),
                             SQL_HANDLE_STMT, st.hstmt());
        for (const auto& row : readAll(st)) {
            OxAdoTableInfo t;
            t.catalog = at(row, 0);
            t.schema = at(row, 1);
            t.name = at(row, 2);
            t.type = at(row, 3);
            t.description = at(row, 4);
            // A restriction by name is a pattern to the driver: "_" would match anything.
            if (!tableName.empty() && !OxText::equalsNoCase(t.name, tableName))
                continue;
            out.push_back(std::move(t));
        }
    } catch (const OxDBException& e) {
        fail(e);
    }
    return out;
}

// The schema of a table the caller names without one: the first that holds it.
std::wstring OxAdoOdbcSession::schemaOf(const std::wstring& tableName) {
    const auto found = tables(tableName, {});
    for (const auto& t : found)
        if (t.name == tableName)
            return t.schema;
    return found.empty() ? std::wstring() : found.front().schema;
}

std::vector<OxAdoColumnDesc> OxAdoOdbcSession::columns(const std::wstring& tableName) {
    std::vector<OxAdoColumnDesc> out;
    try {
        const std::wstring schema = schemaOf(tableName);
        OxOdbcStatement st(&database());
        st.allocate();
        Arg sch(schema), name(tableName);
        OxDBException::check(SQLColumnsA(st.hstmt(), nullptr, 0, sch.ptr(), sch.len(), name.ptr(),
                                         name.len(), nullptr, 0),
                             SQL_HANDLE_STMT, st.hstmt());
        for (const auto& row : readAll(st)) {
            if (!OxText::equalsNoCase(at(row, 2), tableName))
                continue;
            OxAdoColumnDesc c;
            c.name = at(row, 3);
            c.type = adoTypeOf(static_cast<SQLSMALLINT>(numberAt(row, 4)));
            const long size = numberAt(row, 6);
            c.definedSize = isTextType(c.type) || isBinaryType(c.type)
                                ? definedSizeOf(c.type, static_cast<SQLULEN>(size))
                                : 0;
            c.precision = static_cast<int>(size);
            c.numericScale = static_cast<int>(numberAt(row, 8));
            const bool nullable = numberAt(row, 10, SQL_NULLABLE) != SQL_NO_NULLS;
            c.attributes = nullable ? adColNullable : 0;
            c.ordinal = static_cast<int>(numberAt(row, 16));
            const std::wstring def = at(row, 12);
            c.setProperty(L"Default", def.empty() ? OxVariant() : OxVariant(def));
            c.setProperty(L"Nullable", OxVariant(nullable));
            c.setProperty(L"AutoIncrement", OxVariant(false));
            c.setProperty(L"Description",
                          at(row, 11).empty() ? OxVariant() : OxVariant(at(row, 11)));
            for (const auto& [n, v] : columnProperties())
                if (!c.property(n))
                    c.setProperty(n, v);
            out.push_back(std::move(c));
        }
    } catch (const OxDBException& e) {
        fail(e);
    }
    return out;
}

std::vector<std::wstring> OxAdoOdbcSession::primaryKey(const std::wstring& tableName) {
    std::vector<std::pair<long, std::wstring>> keys;
    try {
        const std::wstring schema = schemaOf(tableName);
        OxOdbcStatement st(&database());
        st.allocate();
        Arg sch(schema), name(tableName);
        OxDBException::check(
            SQLPrimaryKeysA(st.hstmt(), nullptr, 0, sch.ptr(), sch.len(), name.ptr(), name.len()),
            SQL_HANDLE_STMT, st.hstmt());
        for (const auto& row : readAll(st)) keys.emplace_back(numberAt(row, 4), at(row, 3));
    } catch (const OxDBException& e) {
        fail(e);
    }
    std::sort(keys.begin(), keys.end());
    std::vector<std::wstring> out;
    for (auto& k : keys) out.push_back(std::move(k.second));
    return out;
}

std::vector<OxAdoIndexInfo> OxAdoOdbcSession::indexes(const std::wstring& tableName) {
    std::vector<OxAdoTableInfo> tablesToList;
    if (tableName.empty())
        tablesToList = tables({}, L"TABLE");
    else
        tablesToList.push_back({{}, schemaOf(tableName), tableName, {}, {}});
    std::vector<OxAdoIndexInfo> out;
    for (const auto& t : tablesToList) {
        const std::vector<std::wstring> key = primaryKey(t.name);
        std::vector<OxAdoIndexInfo> found;
        try {
            OxOdbcStatement st(&database());
            st.allocate();
            Arg sch(t.schema), name(t.name);
            OxDBException::check(SQLStatisticsA(st.hstmt(), nullptr, 0, sch.ptr(), sch.len(),
                                                name.ptr(), name.len(), SQL_INDEX_ALL, SQL_QUICK),
                                 SQL_HANDLE_STMT, st.hstmt());
            for (const auto& row : readAll(st)) {
                if (numberAt(row, 6) == SQL_TABLE_STAT || at(row, 5).empty())
                    continue;
                OxAdoIndexInfo i;
                i.catalog = at(row, 0);
                i.schema = at(row, 1);
                i.tableName = t.name;
                i.indexName = at(row, 5);
                i.unique = numberAt(row, 3, 1) == SQL_FALSE;
                i.clustered = numberAt(row, 6) == SQL_INDEX_CLUSTERED;
                i.ordinal = static_cast<int>(numberAt(row, 7, 1));
                i.columnName = at(row, 8);
                i.descending = at(row, 9) == L"D";
                found.push_back(std::move(i));
            }
        } catch (const OxDBException& e) {
            fail(e);
        }
        // The primary key is the unique index over exactly the key's columns.
        bool keyFound = false;
        for (size_t a = 0; a < found.size();) {
            size_t b = a;
            std::vector<std::wstring> cols;
            while (b < found.size() && found[b].indexName == found[a].indexName)
                cols.push_back(found[b++].columnName);
            const bool isKey = !keyFound && found[a].unique && !key.empty() && cols == key;
            for (size_t k = a; k < b; ++k) found[k].primaryKey = isKey;
            keyFound = keyFound || isKey;
            a = b;
        }
        // A key without an index of its own (a row-id key) is listed under its name.
        if (!keyFound && !key.empty())
            for (size_t k = 0; k < key.size(); ++k)
                found.push_back({{},
                                 t.schema,
                                 t.name,
                                 L"PRIMARY KEY",
                                 true,
                                 true,
                                 false,
                                 static_cast<int>(k + 1),
                                 key[k],
                                 false});
        out.insert(out.end(), found.begin(), found.end());
    }
    return out;
}

std::vector<OxAdoProcedureInfo> OxAdoOdbcSession::procedures() {
    std::vector<OxAdoProcedureInfo> out;
    try {
        OxOdbcStatement st(&database());
        st.allocate();
        const SQLRETURN rc = SQLProceduresA(st.hstmt(), nullptr, 0, nullptr, 0, nullptr, 0);
        // A driver without procedures says so: the list is then empty.
        if (!SQL_SUCCEEDED(rc))
            return out;
        for (const auto& row : readAll(st)) {
            OxAdoProcedureInfo p;
            p.catalog = at(row, 0);
            p.schema = at(row, 1);
            p.name = at(row, 2);
            const size_t semi = p.name.find(L';');
            if (semi != std::wstring::npos)
                p.name.erase(semi);  // the version number some drivers add
            p.type = static_cast<int>(numberAt(row, 7, 1));
            // The engine's own routines are not the database's.
            if (OxText::equalsNoCase(p.schema, L"pg_catalog") ||
                OxText::equalsNoCase(p.schema, L"information_schema") ||
                OxText::equalsNoCase(p.schema, L"sys"))
                continue;
            out.push_back(std::move(p));
        }
    } catch (const OxDBException& e) {
        fail(e);
    }
    return out;
}

// ---------------------------------------------------------------- catalog changes

void OxAdoOdbcSession::runDdl(const std::wstring& statement) {
    long unused = 0;
    OxAdoExecArgs args;
    args.wantRows = false;
    execute(statement, {}, args, unused);
}

void OxAdoOdbcSession::createTable(const OxAdoTableDesc& table) {
    if (table.columns.empty())
        throw OxAdoProviderError(hresultOf(adErrInvalidArgument),
                                 L"A table needs at least one column.");
    runDdl(m_dialect.createTable(table));
}

void OxAdoOdbcSession::dropTable(const std::wstring& tableName) {
    runDdl(L"DROP TABLE " + quoteIdentifier(tableName));
}

void OxAdoOdbcSession::renameTable(const std::wstring& oldName, const std::wstring& newName) {
    runDdl(m_dialect.renameTable(oldName, newName));
}

void OxAdoOdbcSession::addColumn(const std::wstring& tableName, const OxAdoColumnDesc& column) {
    runDdl(m_dialect.addColumn(tableName, column));
}

void OxAdoOdbcSession::dropColumn(const std::wstring& tableName, const std::wstring& columnName) {
    runDdl(m_dialect.dropColumn(tableName, columnName));
}

void OxAdoOdbcSession::renameColumn(const std::wstring& tableName, const std::wstring& oldName,
                                    const std::wstring& newName) {
    runDdl(m_dialect.renameColumn(tableName, oldName, newName));
}

void OxAdoOdbcSession::setColumnProperty(const std::wstring& tableName,
                                         const std::wstring& columnName,
                                         const std::wstring& property, const OxVariant& value) {
    // Properties of other engines' providers are taken and have no effect here.
    if (property.rfind(L"Jet OLEDB:", 0) == 0 || OxText::equalsNoCase(property, L"Description"))
        return;
    std::wstring statement;
    if (OxText::equalsNoCase(property, L"Default")) {
        OxAdoColumnDesc c;
        c.setProperty(L"Default", value);
        statement = m_dialect.setDefault(tableName, columnName, OxAdoOdbcDialect::defaultText(c));
    } else if (OxText::equalsNoCase(property, L"Nullable")) {
        OxAdoColumnDesc c;
        c.setProperty(L"Nullable", value);
        statement = m_dialect.setNullable(tableName, columnName, OxAdoOdbcDialect::isNullable(c));
    }
    if (statement.empty())
        notCapable(L"the " + property + L" of an existing column");
    runDdl(statement);
}

std::vector<std::pair<std::wstring, OxVariant>> OxAdoOdbcSession::columnProperties() const {
    auto props = OxAdoSession::columnProperties();
    // Accepted for the callers that set them for every provider; ODBC sources store
    // empty texts and wide texts anyway.
    props.emplace_back(L"Jet OLEDB:Allow Zero Length", OxVariant(true));
    props.emplace_back(L"Jet OLEDB:Compressed UNICODE Strings", OxVariant(false));
    return props;
}

OxVariant OxAdoOdbcSession::lastInsertedValue(const std::wstring& tableName,
                                              const std::wstring& columnName) {
    // Each engine's own way, and only where it cannot give the number of another row.
    std::wstring query;
    std::vector<OxAdoParamValue> params;
    switch (m_dialect.engine()) {
        case OxAdoOdbcDialect::Engine::SQLite:
            // The row id of the insert just made on this connection.
            query = L"SELECT last_insert_rowid()";
            break;
        case OxAdoOdbcDialect::Engine::PostgreSQL:
            // The column's own sequence, when it has one (serial and identity columns).
            query =
                L"SELECT CASE WHEN pg_get_serial_sequence(?, ?) IS NULL THEN NULL ELSE "
                L"currval(pg_get_serial_sequence(?, ?)) END";
            params.assign(2, OxAdoParamValue{adVarWChar, adParamInput, -1,
                                             OxVariant(quoteIdentifier(tableName))});
            params[1].value = OxVariant(columnName);
            params.push_back(params[0]);
            params.push_back(params[1]);
            break;
        case OxAdoOdbcDialect::Engine::SqlServer:
            query =
                L"SELECT CASE WHEN COLUMNPROPERTY(OBJECT_ID(?), ?, 'IsIdentity') = 1 THEN "
                L"@@IDENTITY END";
            params = {{adVarWChar, adParamInput, -1, OxVariant(tableName)},
                      {adVarWChar, adParamInput, -1, OxVariant(columnName)}};
            break;
        default:
            return {};
    }
    long unused = 0;
    auto rows = execute(query, params, OxAdoExecArgs{}, unused);
    std::vector<OxVariant> values;
    if (!rows || !rows->fetch(values) || values.empty() || values[0].isNull())
        return {};
    return values[0];
}

std::vector<std::pair<std::wstring, OxVariant>> OxAdoOdbcSession::properties() const {
    return {{L"Provider Name", OxVariant(kSource)},
            {L"DBMS Name", OxVariant(m_dbmsName)},
            {L"DBMS Version", OxVariant(m_dbmsVersion)},
            {L"Driver Name", OxVariant(m_driverName)}};
}

void OxAdoOdbcSession::setProperty(const std::wstring& name, const OxVariant&) {
    notCapable(L"property " + name);
}
