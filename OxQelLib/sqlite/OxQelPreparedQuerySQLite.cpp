#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelPreparedQuerySQLite"

#include "OxQelLib/sqlite/OxQelPreparedQuerySQLite.h"

#include <sqlite3.h>

#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "OxQelLib/sqlite/OxQelSQLiteStatement.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

OX_IMPLEMENT_DYNAMIC(OxQelPreparedQuerySQLite, OxQelIPreparedQuery)

OxQelPreparedQuerySQLite::~OxQelPreparedQuerySQLite() {
    if (m_statement)
        deletePreparedQuery();
}

bool OxQelPreparedQuerySQLite::setConnection(OxQelIConnection* connection) {
    OxQelConnectionSQLite* sqlite = OxQelConnectionSQLite::cast(connection);
    if (!sqlite || !sqlite->isOpen())
        return false;
    m_connection = sqlite;
    return true;
}

std::wstring OxQelPreparedQuerySQLite::formatParametersInQuery(const std::wstring& statement) {
    return OXQEL_SQLITE_GUARDED(L"OxQelPreparedQuerySQLite::formatParametersInQuery", [&] {
        std::wstring text = statement;
        OxText::replaceAll(text, L"]]]", L"?");
        OxText::replaceAll(text, L"[[[", L"");
        return text;
    });
}

bool OxQelPreparedQuerySQLite::prepareQuery(const std::wstring& statement) {
    if (m_statement && !deletePreparedQuery())
        return false;
    if (!m_connection || !m_connection->getHandle())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelPreparedQuerySQLite::prepareQuery", [&] {
        sqlite3* db = m_connection->getHandle();
        const std::string sql = OxText::toUtf8(formatParametersInQuery(statement));
        const int rc = sqlite3_prepare_v2(db, sql.c_str(), static_cast<int>(sql.size() + 1),
                                          &m_statement, nullptr);
        if (rc != SQLITE_OK) {
            OXQEL_REPORT(OxQelSQLiteStatement::message(rc),
                         L"OxQelPreparedQuerySQLite::prepareQuery",
                         oxFormat(L"%s\n%s", statement, OxQelSQLiteStatement::errorMessage(db)));
            m_statement = nullptr;
            return false;
        }
        m_notPrepared = 0;
        m_compiledOn = db;
        m_parameterCount = getNumberOfParamInPreparedStatement();
        m_utf16 = m_connection->isUtf16();
        const size_t count =
            static_cast<size_t>(std::max(0, getNumberOfParamInPreparedStatement()));
        m_bytes.assign(count + 1, std::string());
        m_units.assign(count + 1, std::u16string());
        return true;
    });
}

bool OxQelPreparedQuerySQLite::isValid() const {
    return m_connection && m_connection->isOpen() && m_statement && m_notPrepared != 1 &&
           m_connection->getHandle() == m_compiledOn;
}

int OxQelPreparedQuerySQLite::getNumberOfParamInPreparedStatement() const {
    return m_statement ? sqlite3_bind_parameter_count(m_statement) : -1;
}

bool OxQelPreparedQuerySQLite::verifyBindIndex(int index) const {
    return index >= 1 && index <= m_parameterCount;
}

std::wstring OxQelPreparedQuerySQLite::convertDateToString(const OxDateTime& date) const {
    return date.getStatus() == OxDateTime::valid ? date.format(L"%Y%m%d %H:%M:%S ")
                                                 : std::wstring();
}

template <class T>
bool OxQelPreparedQuerySQLite::checkBind(int rc, const wchar_t* format, int index, const T& value) {
    if (rc == SQLITE_OK)
        return true;
    // The value is formatted only for the report: binding stays cheap.
    OXQEL_REPORT(OxQelSQLiteStatement::message(rc), L"OxQelPreparedQuerySQLite::bindParameter",
                 oxFormat(L"%s\n%s", oxFormat(format, index, value),
                          OxQelSQLiteStatement::errorMessage(m_compiledOn)));
    return false;
}

bool OxQelPreparedQuerySQLite::bindText(int index, std::wstring_view text) {
    if (!isValid() || !verifyBindIndex(index))
        return false;
    const auto slot = static_cast<size_t>(index);
    int rc;
    // In the database's own encoding the engine stores the text without converting it.
    if (m_utf16) {
        // The buffers only grow: a text bound row after row costs no allocation.
        std::u16string& units = m_units[slot];
        if (units.size() < text.size() * 2)
            units.resize(text.size() * 2);
        const size_t length = OxText::encodeUtf16(text, units.data());
        rc = sqlite3_bind_text16(m_statement, index, units.data(), static_cast<int>(length * 2),
                                 SQLITE_STATIC);
    } else {
        std::string& bytes = m_bytes[slot];
        if (bytes.size() < text.size() * 4)
            bytes.resize(text.size() * 4);
        const size_t length = OxText::encodeUtf8(text, bytes.data());
        rc = sqlite3_bind_text(m_statement, index, bytes.data(), static_cast<int>(length),
                               SQLITE_STATIC);
    }
    return checkBind(rc, L"index: %d val: %s", index, text);
}

bool OxQelPreparedQuerySQLite::bindBytes(int index, const void* data, size_t size) {
    if (!isValid() || !verifyBindIndex(index))
        return false;
    std::string& bytes = m_bytes[static_cast<size_t>(index)];
    bytes.assign(static_cast<const char*>(data), size);
    return checkBind(
        sqlite3_bind_blob64(m_statement, index, bytes.data(), bytes.size(), SQLITE_STATIC),
        L"index: %d val: %d bytes", index, size);
}

bool OxQelPreparedQuerySQLite::bindNull(int index) {
    if (!isValid() || !verifyBindIndex(index))
        return false;
    return checkBind(sqlite3_bind_null(m_statement, index), L"index: %d val: %s", index, L"NULL");
}

bool OxQelPreparedQuerySQLite::bindParameter(int index, const std::wstring& value) {
    return OXQEL_SQLITE_GUARDED(L"OxQelPreparedQuerySQLite::bindParameter",
                                [&] { return bindText(index, value); });
}

bool OxQelPreparedQuerySQLite::bindParameter(int index, long value) {
    return bindInteger(index, value);
}

bool OxQelPreparedQuerySQLite::bindInteger(int index, long value) {
    if (!isValid() || !verifyBindIndex(index))
        return false;
    return checkBind(sqlite3_bind_int64(m_statement, index, value), L"index: %d val: %d", index,
                     value);
}

bool OxQelPreparedQuerySQLite::bindParameter(int index, double value) {
    return bindReal(index, value);
}

bool OxQelPreparedQuerySQLite::bindReal(int index, double value) {
    if (!isValid() || !verifyBindIndex(index))
        return false;
    return checkBind(sqlite3_bind_double(m_statement, index, value), L"index: %d val: %f", index,
                     value);
}

bool OxQelPreparedQuerySQLite::bindParameter(int index, bool value) {
    return bindParameter(index, static_cast<long>(value ? 1 : 0));
}

bool OxQelPreparedQuerySQLite::bindParameter(int index, const OxDateTime& value) {
    return OXQEL_SQLITE_GUARDED(L"OxQelPreparedQuerySQLite::bindParameter",
                                [&] { return bindParameter(index, convertDateToString(value)); });
}

bool OxQelPreparedQuerySQLite::bindByOwnType(int index, const OxVariant& value) {
    if (oxSQLiteIsInteger(value.vt())) {
        long v = 0;
        OxQel::_variantToLong(value, v);
        return bindInteger(index, v);
    }
    if (oxSQLiteIsReal(value.vt()))
        return bindReal(index, value.vt() == VT_R4 ? double(value.fltVal()) : value.dblVal());
    switch (value.vt()) {
        case VT_EMPTY:
        case VT_NULL:
        case VT_ERROR:
            return bindNull(index);
        case VT_BOOL:
            return bindParameter(index, value.boolVal() != 0);
        case VT_CY:
        case VT_DECIMAL: {
            double v = 0;
            OxQel::_variantToDouble(value, v);
            return bindParameter(index, v);
        }
        case VT_DATE:
            return bindParameter(index, OxDateTime(value.date()));
        case VT_BSTR:
            return bindText(index, value.bstr());
        default:
            return bindText(index, OxQel::_variantToString(value));
    }
}

bool OxQelPreparedQuerySQLite::bindParameterVariant(int index, const OxVariant& value,
                                                    OxQel::FieldType type) {
    return OXQEL_SQLITE_GUARDED(L"OxQelPreparedQuerySQLite::bindParameterVariant", [&] {
        if (type < OxQel::Unknown || type > OxQel::WChar)
            return false;
        // A missing value stays missing and binary data stays binary, whatever the type.
        if (value.isNull())
            return bindNull(index);
        if (value.isByteArray())
            return bindBytes(index, value.bytesData(), value.bytesSize());
        switch (type) {
            case OxQel::Unknown:
                return bindByOwnType(index, value);
            case OxQel::Integer: {
                long v = 0;
                OxQel::_variantToLong(value, v);
                return bindInteger(index, v);
            }
            case OxQel::Double: {
                double v = 0;
                OxQel::_variantToDouble(value, v);
                return bindReal(index, v);
            }
            case OxQel::Date: {
                OxDateTime v;
                OxQel::_variantToDate(value, v);
                return bindParameter(index, v);
            }
            case OxQel::Bool: {
                bool v = false;
                OxQel::_variantToBool(value, v);
                return bindParameter(index, v);
            }
            default:
                if (value.vt() == VT_BSTR)
                    return bindText(index, value.bstr());
                return bindText(index, OxQel::_variantToString(value));
        }
    });
}

bool OxQelPreparedQuerySQLite::executePreparedQuery() {
    if (!m_statement || m_notPrepared == 1 || !isValid())
        return false;
    int rc = sqlite3_step(m_statement);
    if (rc != SQLITE_DONE && rc != SQLITE_OK) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc),
                     L"OxQelPreparedQuerySQLite::executePreparedQuery",
                     oxFormat(L"%s\n%s", L"Impossible to execute query",
                              OxQelSQLiteStatement::errorMessage(m_compiledOn)));
        // Back to its base state, so that it holds no lock and can run again.
        sqlite3_reset(m_statement);
        return false;
    }
    rc = sqlite3_reset(m_statement);
    if (rc != SQLITE_OK) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc),
                     L"OxQelPreparedQuerySQLite::executePreparedQuery",
                     oxFormat(L"%s\n%s", L"Impossible to reset prepared statement to base state",
                              OxQelSQLiteStatement::errorMessage(m_compiledOn)));
        return false;
    }
    return true;
}

bool OxQelPreparedQuerySQLite::deletePreparedQuery() {
    int rc = SQLITE_OK;
    if (m_statement && m_notPrepared == 0)
        rc = sqlite3_finalize(m_statement);
    m_statement = nullptr;
    m_notPrepared = 1;
    m_parameterCount = -1;
    if (rc != SQLITE_OK) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc),
                     L"OxQelPreparedQuerySQLite::deletePreparedQuery",
                     oxFormat(L"%s\n%s", L"Error during delete prepared statement",
                              OxQelSQLiteStatement::errorMessage(m_compiledOn)));
        return false;
    }
    return true;
}
