#pragma once

#include <memory>
#include <string>
#include <vector>

#include "OxQelLib/interfaces/OxQelIConnection.h"

class OxDatabase;

// The connection to any ODBC data source, Firebird included. The host string is an ODBC
// connection string; a non-empty database, user id and password replace its DATABASE, UID
// and PWD keys. It runs statements, lists tables and views and describes columns; schema
// changes, prepared queries and natural sort are not offered.
class OX_EXPORT OxQelConnectionODBC : public OxQelIConnection {
    OX_DECLARE_DYNAMIC(OxQelConnectionODBC)
public:
    OxQelConnectionODBC();
    ~OxQelConnectionODBC() override;
    // One owner per database object: a copy would be a second one.
    OxQelConnectionODBC(const OxQelConnectionODBC&) = delete;
    OxQelConnectionODBC& operator=(const OxQelConnectionODBC&) = delete;

    // A fresh, closed connection.
    OxObject* clone() const override;

    bool openConnection(const std::wstring& database, const std::wstring& host,
                        const std::wstring& userId, const std::wstring& password) override;
    bool closeDatabase() override;
    bool findDatabase(const std::wstring&, const std::wstring&, const std::wstring&,
                      const std::wstring&) override {
        return false;
    }
    bool createDatabase(const std::wstring&, const std::wstring&, const std::wstring&,
                        const std::wstring&) override {
        return false;
    }
    bool dropDatabase(const std::wstring&, const std::wstring&, const std::wstring&,
                      const std::wstring&) override {
        return false;
    }
    bool isOpen() override;
    bool execute(const std::wstring& statement) override;
    bool formatAndExecute(const std::wstring& statement) override;

    bool createTable(const std::wstring&, const std::wstring&, OxQel::FieldType, int,
                     const std::wstring&, bool) override {
        return false;
    }
    bool deleteTable(const std::wstring&) override { return false; }
    bool renameTable(const std::wstring&, const std::wstring&) override { return false; }
    bool modifyTable(const std::wstring&, const OxQelFieldDefArray&) override { return false; }
    bool findTable(const std::wstring&) override { return false; }
    bool createView(std::wstring, std::wstring) override { return false; }
    bool deleteView(std::wstring) override { return false; }
    bool createField(const std::wstring&, const std::wstring&, OxQel::FieldType, int,
                     const std::wstring&, bool) override {
        return false;
    }
    bool deleteField(const std::wstring&, const std::wstring&) override { return false; }
    bool renameField(const std::wstring&, const std::wstring&, const std::wstring&) override {
        return false;
    }
    bool resizeFieldString(const std::wstring&, const std::wstring&, long) override {
        return false;
    }
    bool modifyFieldType(const std::wstring&, const std::wstring&, const OxQelFieldDef&) override {
        return false;
    }
    bool createIndex(const std::wstring&, bool, bool, bool, const std::wstring&,
                     const std::wstring&) override {
        return false;
    }
    bool deleteIndex(const std::wstring&, bool, const std::wstring&) override { return false; }
    bool findField(const std::wstring&, const std::wstring&) override { return false; }
    bool update() override { return true; }
    bool getTableDef(std::vector<OxQelTableDef>& tables, OxQelTableDef::TableType mask) override;
    bool getFieldDef(const std::wstring& table, const std::wstring& fieldList,
                     OxQelFieldDefArray& fields) override;
    std::wstring formatBeforeExecute(const std::wstring& statement) override;
    bool getIndexDef(const std::wstring&, std::vector<OxQelIndexDef>&) override { return false; }

    bool startTransaction() override;
    bool rollbackTransaction(bool unused) override;
    bool closeTransaction() override;
    bool isInTransaction() override { return m_inTransaction; }
    OxQel::SQLError getLastError() override { return OxQel::ErrorUnknown; }

    // Returned whether its open succeeded or not.
    OxQelIConnection* createNewConnection() override;
    OxQelIRecordset* createOxQelIRecordset() override;
    OxQelIPreparedQuery* createOxQelIPrepraredQuery() override { return nullptr; }

    bool canReadMultithread() override { return false; }
    bool canWriteMultiThread() override { return false; }
    bool createFunctionNaturalSort() override { return true; }
    std::wstring getNameFunctionNaturalSort() override { return {}; }
    bool existFunction(const std::wstring&) override { return false; }
    OxConnectionParameter getConnectionParameter() override { return m_parameters; }

    // The driver named in the host string is a Firebird one.
    bool IsFireBirdDriver() const;
    // The database object (null until first needed); it stays owned by the connection.
    OxDatabase* getDatabaseObject() const { return m_database.get(); }

    // The connection string openConnection composes: the host's pairs with DATABASE, UID
    // and PWD set from the non-empty arguments, joined by ";" (drivers here read no key
    // after "; "). Values that would end early, or open a brace they do not close, are braced.
    static std::wstring _composeConnectString(const std::wstring& database,
                                              const std::wstring& host, const std::wstring& userId,
                                              const std::wstring& password);

private:
    OxDatabase* ensureDatabase();
    bool fillTableDefFirebird(std::vector<OxQelTableDef>& tables, OxQelTableDef::TableType mask);
    bool fillTableDefSQL2003Standard(std::vector<OxQelTableDef>& tables,
                                     OxQelTableDef::TableType mask);
    bool endTransaction(bool commit, const wchar_t* function);

    std::unique_ptr<OxDatabase> m_database;
    bool m_inTransaction = false;
    OxConnectionParameter m_parameters;
};
