#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelRecordsetODBC"

#include "OxQelLib/odbc/OxQelRecordsetODBC.h"

#include <sqlext.h>

#include <climits>
#include <utility>

#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/odbc/OxDatabase.h"
#include "OxQelLib/odbc/OxQelConnectionODBC.h"
#include "OxQelLib/odbc/OxQelODBCReport.h"
#include "platform/core/OxFormat.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxOdbcRecordset.h"

OX_IMPLEMENT_DYNAMIC(OxQelRecordsetODBC, OxQelIRecordset)

OxQelRecordsetODBC::OxQelRecordsetODBC(OxDatabase* database)
    : m_recordset(std::make_unique<OxOdbcRecordset>(database)) {}

OxQelRecordsetODBC::~OxQelRecordsetODBC() = default;

OxObject* OxQelRecordsetODBC::clone() const {
    return new OxQelRecordsetODBC();
}

// Conversions of the values read.

OxVariant OxQelRecordsetODBC::_getVariant(const OxDBVariant& value) {
    switch (value.m_dwType) {
        case OxDBVariant::DBVT_NULL:
            return {};
        case OxDBVariant::DBVT_BOOL:
            return OxVariant(value.m_boolVal);
        case OxDBVariant::DBVT_UCHAR:
            return OxVariant(static_cast<uint8_t>(value.m_chVal));
        case OxDBVariant::DBVT_SHORT:
            return OxVariant(static_cast<int16_t>(value.m_iVal));
        case OxDBVariant::DBVT_LONG:
            return OxVariant(value.m_lVal);
        case OxDBVariant::DBVT_BIGINT:
            return OxVariant(static_cast<long long>(value.m_llVal));
        case OxDBVariant::DBVT_SINGLE:
            return OxVariant(value.m_fltVal);
        case OxDBVariant::DBVT_DOUBLE:
            return OxVariant(value.m_dblVal);
        case OxDBVariant::DBVT_DATE: {
            // The fraction of a second is dropped.
            const SQL_TIMESTAMP_STRUCT& d = value.m_date;
            OxDateTime date;
            if (date.setDateTime(d.year, d.month, d.day, d.hour, d.minute, d.second))
                return OxVariant(date);
            // A date the platform's value cannot hold (before the year 100) keeps its text.
            std::wstring text;
            value.appendText(text, SQL_TYPE_TIMESTAMP);
            return OxVariant(text);
        }
        case OxDBVariant::DBVT_STRING:
        case OxDBVariant::DBVT_ASTRING:
        case OxDBVariant::DBVT_WSTRING:
            return OxVariant(value.m_str);
        case OxDBVariant::DBVT_BINARY:
            return OxVariant::fromBytes(value.m_binary);
    }
    return {};
}

bool OxQelRecordsetODBC::_getValue(const OxDBVariant& value, std::wstring& out) {
    if (!value.isText())
        return false;
    out = value.m_str;
    return true;
}

namespace {
// The value of the integer kinds (64-bit ones included: the interface's long holds them).
bool integerOf(const OxDBVariant& value, int64_t& out) {
    switch (value.m_dwType) {
        case OxDBVariant::DBVT_UCHAR:
            out = value.m_chVal;
            return true;
        case OxDBVariant::DBVT_SHORT:
            out = value.m_iVal;
            return true;
        case OxDBVariant::DBVT_LONG:
            out = value.m_lVal;
            return true;
        case OxDBVariant::DBVT_BIGINT:
            out = value.m_llVal;
            return true;
        default:
            return false;
    }
}
}  // namespace

bool OxQelRecordsetODBC::_getValue(const OxDBVariant& value, long& out) {
    int64_t n = 0;
    if (value.m_dwType == OxDBVariant::DBVT_BOOL)
        n = value.m_boolVal ? 1 : 0;
    else if (!integerOf(value, n))
        return false;
    out = static_cast<long>(n);
    return true;
}

bool OxQelRecordsetODBC::_getValue(const OxDBVariant& value, double& out) {
    int64_t n = 0;
    if (value.m_dwType == OxDBVariant::DBVT_SINGLE)
        out = value.m_fltVal;
    else if (value.m_dwType == OxDBVariant::DBVT_DOUBLE)
        out = value.m_dblVal;
    else if (integerOf(value, n))
        out = static_cast<double>(n);
    else
        return false;  // booleans are no numbers here
    return true;
}

bool OxQelRecordsetODBC::_getValue(const OxDBVariant& value, bool& out) {
    if (value.m_dwType != OxDBVariant::DBVT_BOOL)
        return false;
    out = value.m_boolVal;
    return true;
}

namespace {
// The library's type of an ODBC SQL type; numeric, decimal and the rest are Unknown.
OxQel::FieldType fieldTypeOf(SQLSMALLINT sqlType) {
    using namespace OxQel;
    static const std::pair<SQLSMALLINT, FieldType> types[] = {
        {SQL_GUID, Guid},
        {SQL_WLONGVARCHAR, WMemo},
        {SQL_WVARCHAR, WString},
        {SQL_WCHAR, WChar},
        {SQL_BIT, Bool},
        {SQL_TINYINT, Integer},
        {SQL_BIGINT, Integer},
        {SQL_INTEGER, Integer},
        {SQL_SMALLINT, Integer},
        {SQL_LONGVARBINARY, Binary},
        {SQL_VARBINARY, Binary},
        {SQL_BINARY, Binary},
        {SQL_LONGVARCHAR, Memo},
        {SQL_CHAR, Char},
        {SQL_FLOAT, Double},
        {SQL_REAL, Double},
        {SQL_DOUBLE, Double},
        {SQL_DATE, Date},
        {SQL_TIME, Date},
        {SQL_TYPE_DATE, Date},
        {SQL_TYPE_TIME, Date},
        {SQL_VARCHAR, String},
        // Date-and-time columns are dates too: their values read as dates.
        {SQL_TIMESTAMP, Date},
        {SQL_TYPE_TIMESTAMP, Date},
    };
    for (const auto& [odbc, type] : types)
        if (odbc == sqlType)
            return type;
    return Unknown;
}
}  // namespace

void OxQelRecordsetODBC::_getFieldDef(const OxOdbcFieldInfo& info, OxQelFieldDef& definition) {
    definition.setFieldName(info.m_strName);
    definition.setFieldSize(info.m_nPrecision > static_cast<SQLULEN>(INT_MAX)
                                ? INT_MAX
                                : static_cast<int>(info.m_nPrecision));
    definition.setCanBeNull(info.m_nNullability == SQL_NULLABLE);
    definition.setFieldType(fieldTypeOf(info.m_nSQLType));
}

// Opening and moving.

bool OxQelRecordsetODBC::openSQL(OxQelIConnection* connection, const std::wstring& statement) {
    try {
        if (!m_recordset->database())
            if (auto* odbc = OxQelConnectionODBC::cast(connection))
                m_recordset->setDatabase(odbc->getDatabaseObject());
        m_recordset->open(statement, OxOdbcRecordset::snapshot, OxOdbcRecordset::readOnly);
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::openSQL", statement);
        m_recordset->close();
        return false;
    }
}

void OxQelRecordsetODBC::close() {
    m_recordset->close();
}

bool OxQelRecordsetODBC::getEOF() {
    return m_recordset->isEOF();
}

bool OxQelRecordsetODBC::getBOF() {
    return m_recordset->isBOF();
}

long OxQelRecordsetODBC::getRecordCount() {
    return m_recordset->getRecordCount();
}

template <class F>
bool OxQelRecordsetODBC::moveBy(F&& step, const wchar_t* function, const wchar_t* param) {
    try {
        step(*m_recordset);
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(function, param);
        return false;
    }
}

bool OxQelRecordsetODBC::move(long rows) {
    return moveBy([rows](OxOdbcRecordset& rs) { rs.move(rows, SQL_FETCH_RELATIVE); },
                  L"OxQelRecordsetODBC::move", L"Move");
}

bool OxQelRecordsetODBC::moveFirst() {
    return moveBy([](OxOdbcRecordset& rs) { rs.moveFirst(); }, L"OxQelRecordsetODBC::moveFirst",
                  L"MoveFirst");
}

bool OxQelRecordsetODBC::movePrevious() {
    return moveBy([](OxOdbcRecordset& rs) { rs.movePrev(); }, L"OxQelRecordsetODBC::movePrevious",
                  L"MovePrevious");
}

bool OxQelRecordsetODBC::moveNext() {
    return moveBy([](OxOdbcRecordset& rs) { rs.moveNext(); }, L"OxQelRecordsetODBC::moveNext",
                  L"MoveNext");
}

bool OxQelRecordsetODBC::moveLast() {
    return moveBy([](OxOdbcRecordset& rs) { rs.moveLast(); }, L"OxQelRecordsetODBC::moveLast",
                  L"MoveLast");
}

// Reading.

long OxQelRecordsetODBC::indexOf(const std::wstring& name) const {
    const long index = m_recordset->getFieldIndexByName(name);
    if (index < 0)
        throw OxDBException(SQL_ERROR,
                            oxFormat(L"There is no column named %s in the result", name));
    return index;
}

template <class T>
bool OxQelRecordsetODBC::readValue(long index, T& out, const wchar_t* function) {
    try {
        return _getValue(m_recordset->getFieldValue(index), out);
    } catch (...) {
        OXQEL_ODBC_REPORT(function, L"");
        return false;
    }
}

bool OxQelRecordsetODBC::getField(long index, std::wstring& value) {
    try {
        m_recordset->getFieldValue(index, value);
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::getField", L"");
        return false;
    }
}

bool OxQelRecordsetODBC::getField(long index, double& value) {
    return readValue(index, value, L"OxQelRecordsetODBC::getField");
}

bool OxQelRecordsetODBC::getField(long index, long& value) {
    return readValue(index, value, L"OxQelRecordsetODBC::getField");
}

bool OxQelRecordsetODBC::getField(long index, bool& value) {
    return readValue(index, value, L"OxQelRecordsetODBC::getField");
}

template <class T>
bool OxQelRecordsetODBC::readNamedValue(const std::wstring& name, T& out) {
    try {
        return _getValue(m_recordset->getFieldValue(indexOf(name)), out);
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::getField", name);
        return false;
    }
}

bool OxQelRecordsetODBC::getField(const std::wstring& name, std::wstring& value) {
    return readNamedValue(name, value);
}

bool OxQelRecordsetODBC::getField(const std::wstring& name, double& value) {
    return readNamedValue(name, value);
}

bool OxQelRecordsetODBC::getField(const std::wstring& name, long& value) {
    return readNamedValue(name, value);
}

bool OxQelRecordsetODBC::getField(const std::wstring& name, bool& value) {
    return readNamedValue(name, value);
}

OxVariant OxQelRecordsetODBC::getlFieldValue(long index) {
    try {
        return _getVariant(m_recordset->getFieldValue(index));
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::getFieldValue", L"");
        return {};
    }
}

OxVariant OxQelRecordsetODBC::getszFieldValue(const std::wstring& name) {
    try {
        return _getVariant(m_recordset->getFieldValue(indexOf(name)));
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::getFieldValue", name);
        return {};
    }
}

OxVariant OxQelRecordsetODBC::getvarFieldValue(const OxVariant& column) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return getszFieldValue(name);
}

std::wstring OxQelRecordsetODBC::getlFieldString(long index) {
    std::wstring text;
    if (!getField(index, text))
        text.clear();
    return text;
}

std::wstring OxQelRecordsetODBC::getszFieldString(const std::wstring& name) {
    std::wstring text;
    if (!getField(name, text))
        text.clear();
    return text;
}

std::wstring OxQelRecordsetODBC::getvarFieldString(const OxVariant& column) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return getszFieldString(name);
}

// Columns.

bool OxQelRecordsetODBC::getFieldDef(const OxVariant& column, OxQelFieldDef& definition) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return getFieldDef(name, definition);
}

bool OxQelRecordsetODBC::getFieldDef(const std::wstring& name, OxQelFieldDef& definition) {
    try {
        _getFieldDef(m_recordset->getODBCFieldInfo(indexOf(name)), definition);
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::getFieldDef", name);
        return false;
    }
}

bool OxQelRecordsetODBC::getFieldDef(long index, OxQelFieldDef& definition) {
    try {
        _getFieldDef(m_recordset->getODBCFieldInfo(index), definition);
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::getFieldDef", L"");
        return false;
    }
}

bool OxQelRecordsetODBC::getFieldDef(OxQelFieldDefArray& definitions) {
    if (!m_recordset->isOpen()) {
        // A closed recordset has no columns to describe: that is no success.
        definitions.clear();
        return false;
    }
    const long count = getFieldCount();
    definitions.resize(static_cast<size_t>(count));
    bool result = true;
    for (long i = 0; i < count && result; ++i) {
        OxQelFieldDef& d = definitions[static_cast<size_t>(i)];
        d.setIsPropertiesToGetPtr(definitions.getIsPropertiesToGetPtr());
        result = getFieldDef(i, d);
    }
    return result;
}

long OxQelRecordsetODBC::getFieldCount() {
    return m_recordset->isOpen() ? m_recordset->getODBCFieldCount() : 0;
}

std::wstring OxQelRecordsetODBC::getFieldName(long index) {
    try {
        return m_recordset->getODBCFieldInfo(index).m_strName;
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::getFieldName", L"");
        return {};
    }
}

OxQel::FieldType OxQelRecordsetODBC::getFieldType(long index) {
    OxQelFieldDef d;
    getFieldDef(index, d);
    return d.getFieldType();
}

OxQel::FieldType OxQelRecordsetODBC::getFieldType(const std::wstring& name) {
    OxQelFieldDef d;
    getFieldDef(name, d);
    return d.getFieldType();
}

OxQel::FieldType OxQelRecordsetODBC::getFieldType(const OxVariant& column) {
    OxQelFieldDef d;
    getFieldDef(column, d);
    return d.getFieldType();
}

int OxQelRecordsetODBC::getFieldSize(long index) {
    OxQelFieldDef d;
    getFieldDef(index, d);
    return d.getFieldSize();
}

int OxQelRecordsetODBC::getFieldSize(const std::wstring& name) {
    OxQelFieldDef d;
    getFieldDef(name, d);
    return d.getFieldSize();
}

int OxQelRecordsetODBC::getFieldSize(const OxVariant& column) {
    OxQelFieldDef d;
    getFieldDef(column, d);
    return d.getFieldSize();
}

bool OxQelRecordsetODBC::isFieldNull(long index) {
    try {
        return m_recordset->getFieldValue(index).isNull();
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::isFieldNull", L"");
        return false;
    }
}

bool OxQelRecordsetODBC::isFieldNull(const std::wstring& name) {
    try {
        return m_recordset->getFieldValue(indexOf(name)).isNull();
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelRecordsetODBC::isFieldNull", name);
        return false;
    }
}

bool OxQelRecordsetODBC::isFieldNull(const OxVariant& column) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return isFieldNull(name);
}

bool OxQelRecordsetODBC::setFilter(const OxVariant& filter) {
    std::wstring text;
    OxQel::Util::tryVariantToString(filter, text);
    m_recordset->setFilter(text);
    return true;
}

bool OxQelRecordsetODBC::setSort(const std::wstring& sort) {
    m_recordset->setSort(sort);
    return true;
}
