#pragma once

#include <memory>
#include <string>
#include <vector>

#include "OxClasses/OxConnectionParameter.h"
#include "OxQelLib/interfaces/OxQelIConnection.h"
#include "platform/core/OxComError.h"

class OxAdoConnection;
class OxAdoxCatalog;
class OxAdoxTable;
class OxAdoxColumn;

// The base of the backends that run on the data-access object model: one Connection and
// one Catalog bound to it. It opens and closes, executes, collects scripts, runs
// transactions, classifies errors and does the schema work that the catalog or plain SQL
// does alike on every provider; the subclasses build the connection string and supply
// their dialect.
class OX_EXPORT OxQelConnectionADO : public OxQelIConnection {
    OX_DECLARE_DYNAMIC(OxQelConnectionADO)
public:
    OxQelConnectionADO();
    ~OxQelConnectionADO() override;

    CompareResult compareTo(const OxObject* other, int property = 0,
                            bool descending = false) const override;
    // Shares the other connection's live Connection and Catalog.
    void copyFrom(const OxObject& other) override;
    OxObject* clone() const override;  // null: the class is abstract

    bool closeDatabase() override;
    bool isOpen() override;
    bool execute(const std::wstring& statement) override;
    bool deleteTable(const std::wstring& table) override;
    bool renameTable(const std::wstring& oldName, const std::wstring& newName) override;
    bool modifyTable(const std::wstring& table, const OxQelFieldDefArray& fields) override;
    bool findTable(const std::wstring& table) override;
    bool deleteField(const std::wstring& table, const std::wstring& field) override;
    bool renameField(const std::wstring& table, const std::wstring& oldName,
                     const std::wstring& newName) override;
    bool resizeFieldString(const std::wstring& table, const std::wstring& field,
                           long newSize) override;
    bool modifyFieldType(const std::wstring& table, const std::wstring& field,
                         const OxQelFieldDef& definition) override;
    bool findField(const std::wstring& table, const std::wstring& field) override;
    bool update() override;
    bool getTableDef(std::vector<OxQelTableDef>& tables, OxQelTableDef::TableType mask) override;
    bool getIndexDef(const std::wstring& table, std::vector<OxQelIndexDef>& indexes) override;
    bool startTransaction() override;
    bool rollbackTransaction(bool unused) override;
    bool closeTransaction() override;
    bool isInTransaction() override;
    OxQel::SQLError getLastError() override;
    OxQelIPreparedQuery* createOxQelIPrepraredQuery() override;
    bool canReadMultithread() override;
    bool canWriteMultiThread() override;
    OxConnectionParameter getConnectionParameter() override;
    // The default of a column as the catalog holds it, as text; empty when not found.
    virtual std::wstring getStrDefaultValue(const std::wstring& table, const std::wstring& field);

    std::shared_ptr<OxAdoConnection> getConnection() const { return m_connection; }
    std::shared_ptr<OxAdoxCatalog> getCatalogPtr() const { return m_catalog; }
    // The catalog's table or column of exactly that name, or null.
    std::shared_ptr<OxAdoxTable> findADOXTable(const std::wstring& table);
    std::shared_ptr<OxAdoxColumn> findADOXField(const std::wstring& table,
                                                const std::wstring& field);

    // Script mode: statements given to execute are collected as EXEC(N'...') lines
    // instead of run. endScriptMode answers null when the script is empty.
    void startScriptMode();
    std::shared_ptr<std::wstring> endScriptMode();

    // The message builders of the reports.
    static void getComError(std::wstring& message, const OxComError& error);
    void getProviderError(std::wstring& message);
    // Inside a catch block: the message of the failure being handled, from the provider's
    // errors when they belong to it, else from the COM error, else "Unknown error".
    static std::wstring currentErrorMessage(OxQelIConnection* connection);

protected:
    bool createInstance();
    bool openADOConn(const std::wstring& connectionString);
    bool addQueryToScript(const std::wstring& query);

    OxConnectionParameter m_connectionParameter;

private:
    OxAdoConnection& connection() const;
    OxAdoxCatalog& catalog() const;
    std::wstring maskedConnectionString() const;

    std::shared_ptr<OxAdoConnection> m_connection;
    std::shared_ptr<OxAdoxCatalog> m_catalog;
    std::shared_ptr<std::wstring> m_script;
    bool m_inTransaction = false;
};
