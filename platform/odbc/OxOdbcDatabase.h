#pragma once

#include <sql.h>
#include <sqlext.h>

#include <memory>
#include <string>
#include <vector>

#include "platform/odbc/OxOdbcHandle.h"

class OxOdbcEnvironment;
class OxOdbcStatement;

// A connection to an ODBC data source, opened with a connection string. Statements made on
// it register here: closing frees their handles first, and destroying the database leaves
// them detached (they then fail cleanly instead of touching freed handles).
//
// Text crosses the ODBC interface as UTF-8 through the ANSI calls: the driver manager's
// conversion of wide calls for drivers without wide entry points garbles non-ASCII text.
class OxOdbcDatabase {
public:
    explicit OxOdbcDatabase(std::shared_ptr<OxOdbcEnvironment> environment = nullptr);
    virtual ~OxOdbcDatabase();

    OxOdbcDatabase(const OxOdbcDatabase&) = delete;
    OxOdbcDatabase& operator=(const OxOdbcDatabase&) = delete;

    // Connects without prompting (there is no dialog to complete a string on this platform);
    // throws OxDBException on failure. An open database is closed first.
    void open(const std::wstring& connectString);
    // Rolls back an open transaction, frees the statements and disconnects.
    void close() noexcept;
    bool isOpen() const noexcept { return m_connected; }
    SQLHDBC hdbc() const noexcept { return m_dbc.get(); }
    const std::shared_ptr<OxOdbcEnvironment>& environment() const noexcept { return m_env; }
    // The completed connection string the driver returned.
    const std::wstring& getConnect() const noexcept { return m_connect; }

    // Seconds; 0 leaves the driver's default. The login time-out applies to the next open,
    // the query time-out to statements allocated from then on.
    void setLoginTimeout(long seconds) noexcept { m_loginTimeout = seconds; }
    long getLoginTimeout() const noexcept { return m_loginTimeout; }
    void setQueryTimeout(long seconds) noexcept { m_queryTimeout = seconds; }
    long getQueryTimeout() const noexcept { return m_queryTimeout; }

    // Runs a statement that returns no rows; throws OxDBException on failure.
    void executeSQL(const std::wstring& statement);

    // Transactions: manual commit until the transaction ends, autocommit again afterwards.
    bool canTransact() const noexcept { return m_canTransact; }
    bool isInTransaction() const noexcept { return m_inTransaction; }
    void beginTrans();
    void commitTrans();
    void rollback();

    // What the driver says about the connection (SQLGetInfo).
    std::wstring getDatabaseName() const;
    std::wstring getInfoString(SQLUSMALLINT infoType) const;
    SQLUINTEGER getInfoUInt(SQLUSMALLINT infoType) const;
    SQLUSMALLINT getInfoUShort(SQLUSMALLINT infoType) const;
    std::wstring getDriverName() const { return getInfoString(SQL_DRIVER_NAME); }
    std::wstring getDbmsName() const { return getInfoString(SQL_DBMS_NAME); }
    // Whether columns may be read in any order with SQLGetData.
    bool canGetDataAnyOrder() const noexcept { return m_getDataAnyOrder; }

    // Throws OxDBException when the database is not open.
    void requireOpen() const;

private:
    friend class OxOdbcStatement;
    void attach(OxOdbcStatement* statement);
    void detach(OxOdbcStatement* statement) noexcept;
    void setAutocommit(bool on);
    template <class T>
    T getInfoNumber(SQLUSMALLINT infoType) const;

    std::shared_ptr<OxOdbcEnvironment> m_env;
    OxOdbcHandle m_dbc;
    bool m_connected = false;
    bool m_canTransact = false;
    bool m_inTransaction = false;
    bool m_getDataAnyOrder = true;
    long m_loginTimeout = 0;
    long m_queryTimeout = 0;
    std::wstring m_connect;
    std::vector<OxOdbcStatement*> m_statements;
};
