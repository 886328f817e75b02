#include "platform/odbc/OxOdbcDatabase.h"

#include <sqlext.h>

#include <algorithm>

#include "platform/core/OxText.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxOdbcEnvironment.h"
#include "platform/odbc/OxOdbcStatement.h"

OxOdbcDatabase::OxOdbcDatabase(std::shared_ptr<OxOdbcEnvironment> environment)
    : m_env(std::move(environment)) {}

OxOdbcDatabase::~OxOdbcDatabase() {
    close();
    for (OxOdbcStatement* s : std::vector<OxOdbcStatement*>(m_statements)) s->databaseGone();
    m_statements.clear();
}

void OxOdbcDatabase::open(const std::wstring& connectString) {
    close();
    if (!m_env)
        m_env = OxOdbcEnvironment::create();
    OxOdbcHandle dbc(SQL_HANDLE_DBC, m_env->henv());
    if (m_loginTimeout > 0)
        SQLSetConnectAttr(dbc.get(), SQL_ATTR_LOGIN_TIMEOUT,
                          reinterpret_cast<SQLPOINTER>(static_cast<SQLULEN>(m_loginTimeout)), 0);
    std::string in = OxText::toUtf8(connectString);
    std::string out(4096, '\0');
    SQLSMALLINT outLength = 0;
    const SQLRETURN rc = SQLDriverConnectA(
        dbc.get(), nullptr, reinterpret_cast<SQLCHAR*>(in.data()),
        static_cast<SQLSMALLINT>(in.size()), reinterpret_cast<SQLCHAR*>(out.data()),
        static_cast<SQLSMALLINT>(out.size()), &outLength, SQL_DRIVER_NOPROMPT);
    OxDBException::check(rc, SQL_HANDLE_DBC, dbc.get());
    out.resize(std::min(static_cast<size_t>(std::max<SQLSMALLINT>(outLength, 0)), out.size() - 1));
    m_dbc = std::move(dbc);
    m_connected = true;
    m_inTransaction = false;
    m_connect = OxText::fromUtf8(out.c_str());
    // A driver that does not answer is taken at its least: no transactions, reads in order.
    try {
        m_canTransact = getInfoUShort(SQL_TXN_CAPABLE) != SQL_TC_NONE;
    } catch (const OxDBException&) {
        m_canTransact = false;
    }
    try {
        m_getDataAnyOrder = (getInfoUInt(SQL_GETDATA_EXTENSIONS) & SQL_GD_ANY_ORDER) != 0;
    } catch (const OxDBException&) {
        m_getDataAnyOrder = false;
    }
}

void OxOdbcDatabase::close() noexcept {
    for (OxOdbcStatement* s : m_statements) s->free();
    if (m_connected) {
        // Work that was never committed is discarded, as a dropped connection would.
        if (m_inTransaction)
            SQLEndTran(SQL_HANDLE_DBC, m_dbc.get(), SQL_ROLLBACK);
        SQLDisconnect(m_dbc.get());
    }
    m_dbc.reset();
    m_connected = false;
    m_inTransaction = false;
    m_canTransact = false;
}

void OxOdbcDatabase::requireOpen() const {
    if (!m_connected)
        throw OxDBException(SQL_ERROR, L"The ODBC database is not open");
}

void OxOdbcDatabase::executeSQL(const std::wstring& statement) {
    OxOdbcStatement s(this);
    s.executeDirect(statement);
}

void OxOdbcDatabase::setAutocommit(bool on) {
    const SQLRETURN rc = SQLSetConnectAttr(
        m_dbc.get(), SQL_ATTR_AUTOCOMMIT,
        reinterpret_cast<SQLPOINTER>(on ? SQL_AUTOCOMMIT_ON : SQL_AUTOCOMMIT_OFF), SQL_IS_UINTEGER);
    OxDBException::check(rc, SQL_HANDLE_DBC, m_dbc.get());
}

void OxOdbcDatabase::beginTrans() {
    requireOpen();
    if (!m_canTransact)
        throw OxDBException(SQL_ERROR, L"The ODBC driver does not support transactions");
    setAutocommit(false);
    m_inTransaction = true;
}

void OxOdbcDatabase::commitTrans() {
    requireOpen();
    OxDBException::check(SQLEndTran(SQL_HANDLE_DBC, m_dbc.get(), SQL_COMMIT), SQL_HANDLE_DBC,
                         m_dbc.get());
    m_inTransaction = false;
    setAutocommit(true);
}

void OxOdbcDatabase::rollback() {
    requireOpen();
    OxDBException::check(SQLEndTran(SQL_HANDLE_DBC, m_dbc.get(), SQL_ROLLBACK), SQL_HANDLE_DBC,
                         m_dbc.get());
    m_inTransaction = false;
    setAutocommit(true);
}

std::wstring OxOdbcDatabase::getDatabaseName() const {
    return getInfoString(SQL_DATABASE_NAME);
}

std::wstring OxOdbcDatabase::getInfoString(SQLUSMALLINT infoType) const {
    requireOpen();
    std::string buffer(1024, '\0');
    SQLSMALLINT length = 0;
    SQLRETURN rc = SQLGetInfoA(m_dbc.get(), infoType, buffer.data(),
                               static_cast<SQLSMALLINT>(buffer.size()), &length);
    if (rc == SQL_SUCCESS_WITH_INFO && length >= static_cast<SQLSMALLINT>(buffer.size())) {
        buffer.resize(static_cast<size_t>(length) + 1);
        rc = SQLGetInfoA(m_dbc.get(), infoType, buffer.data(),
                         static_cast<SQLSMALLINT>(buffer.size()), &length);
    }
    OxDBException::check(rc, SQL_HANDLE_DBC, m_dbc.get());
    return OxText::fromUtf8(buffer.c_str());
}

template <class T>
T OxOdbcDatabase::getInfoNumber(SQLUSMALLINT infoType) const {
    requireOpen();
    T value = 0;
    OxDBException::check(SQLGetInfoA(m_dbc.get(), infoType, &value, sizeof(value), nullptr),
                         SQL_HANDLE_DBC, m_dbc.get());
    return value;
}

SQLUINTEGER OxOdbcDatabase::getInfoUInt(SQLUSMALLINT infoType) const {
    return getInfoNumber<SQLUINTEGER>(infoType);
}

SQLUSMALLINT OxOdbcDatabase::getInfoUShort(SQLUSMALLINT infoType) const {
    return getInfoNumber<SQLUSMALLINT>(infoType);
}

void OxOdbcDatabase::attach(OxOdbcStatement* statement) {
    m_statements.push_back(statement);
}

void OxOdbcDatabase::detach(OxOdbcStatement* statement) noexcept {
    std::erase(m_statements, statement);
}
