#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/ado/OxAdoOdbcDialect.h"
#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

class OxDBException;
class OxOdbcDatabase;

// The ODBC provider: the model's default provider, also for any string that names a
// Driver or a DSN. Statements run through the platform's ODBC classes; the catalog reads
// the ODBC catalog functions and writes DDL in the dialect of the source's engine.
// Providers whose connection strings map onto an ODBC driver open it with openOdbc.
class OX_EXPORT OxAdoOdbcSession : public OxAdoSession {
public:
    OxAdoOdbcSession();
    ~OxAdoOdbcSession() override;

    std::wstring providerName() const override { return L"MSDASQL"; }
    void open(const OpenArgs& args) override;
    // Opens with an ODBC connection string as it is.
    void openOdbc(const std::wstring& odbcConnectionString, long loginTimeout, long queryTimeout);
    void close() noexcept override;
    bool isBroken() const noexcept override { return m_broken; }

    std::unique_ptr<OxAdoRowSource> execute(const std::wstring& text,
                                            const std::vector<OxAdoParamValue>& params,
                                            const OxAdoExecArgs& args, long& rowsAffected) override;

    bool supportsTransactions() const override;
    void beginTrans() override;
    void commitTrans() override;
    void rollbackTrans() override;
    void setIsolationLevel(long level) override;

    std::vector<OxAdoTableInfo> tables(const std::wstring& tableName,
                                       const std::wstring& tableType) override;
    std::vector<OxAdoColumnDesc> columns(const std::wstring& tableName) override;
    std::vector<OxAdoIndexInfo> indexes(const std::wstring& tableName) override;
    std::vector<std::wstring> primaryKey(const std::wstring& tableName) override;
    std::vector<OxAdoProcedureInfo> procedures() override;

    void createTable(const OxAdoTableDesc& table) override;
    void dropTable(const std::wstring& tableName) override;
    void renameTable(const std::wstring& oldName, const std::wstring& newName) override;
    void addColumn(const std::wstring& tableName, const OxAdoColumnDesc& column) override;
    void dropColumn(const std::wstring& tableName, const std::wstring& columnName) override;
    void renameColumn(const std::wstring& tableName, const std::wstring& oldName,
                      const std::wstring& newName) override;
    void setColumnProperty(const std::wstring& tableName, const std::wstring& columnName,
                           const std::wstring& property, const OxVariant& value) override;
    std::vector<std::pair<std::wstring, OxVariant>> columnProperties() const override;

    std::wstring quoteIdentifier(const std::wstring& name) const override;
    OxVariant lastInsertedValue(const std::wstring& tableName,
                                const std::wstring& columnName) override;
    std::vector<std::pair<std::wstring, OxVariant>> properties() const override;
    void setProperty(const std::wstring& name, const OxVariant& value) override;

    // The ODBC connection string of a string of the model: without its Provider, with the
    // Extended Properties unpacked, the driver's alias applied and the user and password of
    // Open added.
    static std::wstring odbcConnectionString(const OpenArgs& args);
    // Strings that name the driver (with or without braces, without case) reach the driver
    // manager with the replacement instead: drivers of other platforms map onto installed
    // ones. An empty replacement removes the alias.
    static void setDriverAlias(const std::wstring& driver, const std::wstring& replacement);
    // The provider error of an ODBC failure: one record per diagnostic, numbered by the
    // class of its SQLSTATE.
    static OxAdoProviderError translate(const OxDBException& e);
    // The number a diagnostic's SQLSTATE gives (0x80040E14 for syntax errors, ...).
    static OxHResult hresultOfState(const std::wstring& sqlState);

    const OxAdoOdbcDialect& dialect() const { return m_dialect; }
    OxOdbcDatabase& database();
    // Raises the provider error of an ODBC failure, and notes a lost link.
    [[noreturn]] void fail(const OxDBException& e);

private:
    void runDdl(const std::wstring& statement);
    std::wstring schemaOf(const std::wstring& tableName);

    std::unique_ptr<OxOdbcDatabase> m_db;
    OxAdoOdbcDialect m_dialect;
    std::wstring m_quote = L"\"";
    std::wstring m_dbmsName;
    std::wstring m_dbmsVersion;
    std::wstring m_driverName;
    bool m_broken = false;
};
