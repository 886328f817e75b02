#pragma once

#include <string>
#include <vector>

#include "OxClasses/OxArray2.h"
#include "OxClasses/OxArraySimple.h"
#include "OxClasses/OxConnectionParameter.h"
#include "OxClasses/OxObject.h"
#include "OxQelLib/foundation/OxQelGlobal.h"
#include "OxQelLib/schema/OxQelIndexDef.h"
#include "OxQelLib/schema/OxQelTableDef.h"

class OxQelIRecordset;
class OxQelIPreparedQuery;

// The one interface through which the host and the copy engines speak to a database.
// No operation lets an exception escape: failures are reported and answered as false,
// an empty text or a null pointer. Objects returned by the factories belong to the
// caller; recordsets and prepared queries must be deleted before their connection.
class OX_EXPORT OxQelIConnection : public OxObject {
    OX_DECLARE_DYNAMIC(OxQelIConnection)
public:
    ~OxQelIConnection() override = default;

    // compareTo and copyFrom are OxObject's: no order, no state of its own.
    OxObject* clone() const override;  // null: the interface has no instances

    // The four strings are always database, host, user id, password; each backend gives
    // them its meaning (a file, a server, a connection string).
    virtual bool openConnection(const std::wstring& database, const std::wstring& host,
                                const std::wstring& userId, const std::wstring& password) = 0;
    virtual bool closeDatabase() = 0;
    virtual bool findDatabase(const std::wstring& database, const std::wstring& host,
                              const std::wstring& userId, const std::wstring& password) = 0;
    virtual bool createDatabase(const std::wstring& database, const std::wstring& host,
                                const std::wstring& userId, const std::wstring& password) = 0;
    virtual bool dropDatabase(const std::wstring& database, const std::wstring& host,
                              const std::wstring& userId, const std::wstring& password) = 0;
    virtual bool isOpen() = 0;
    // Runs the text unchanged (no rewriting).
    virtual bool execute(const std::wstring& statement) = 0;
    // execute(formatBeforeExecute(statement)).
    virtual bool formatAndExecute(const std::wstring& statement);

    virtual bool createTable(const std::wstring& table, const std::wstring& field,
                             OxQel::FieldType type, int size, const std::wstring& defaultValue,
                             bool canBeNull) = 0;
    virtual bool deleteTable(const std::wstring& table) = 0;
    virtual bool renameTable(const std::wstring& oldName, const std::wstring& newName) = 0;
    virtual bool modifyTable(const std::wstring& table, const OxQelFieldDefArray& fields) = 0;
    virtual bool findTable(const std::wstring& table) = 0;
    virtual bool createView(std::wstring viewName, std::wstring selectText) = 0;
    virtual bool deleteView(std::wstring viewName) = 0;
    virtual bool createField(const std::wstring& table, const std::wstring& field,
                             OxQel::FieldType type, int size, const std::wstring& defaultValue,
                             bool canBeNull) = 0;
    virtual bool deleteField(const std::wstring& table, const std::wstring& field) = 0;
    virtual bool renameField(const std::wstring& table, const std::wstring& oldName,
                             const std::wstring& newName) = 0;
    virtual bool resizeFieldString(const std::wstring& table, const std::wstring& field,
                                   long newSize) = 0;
    virtual bool modifyFieldType(const std::wstring& table, const std::wstring& field,
                                 const OxQelFieldDef& definition) = 0;
    // fieldList: column names joined by ",".
    virtual bool createIndex(const std::wstring& indexName, bool isPrimaryKey, bool isUnique,
                             bool isClustered, const std::wstring& table,
                             const std::wstring& fieldList) = 0;
    virtual bool deleteIndex(const std::wstring& indexName, bool isPrimaryKey,
                             const std::wstring& table) = 0;
    virtual bool findField(const std::wstring& table, const std::wstring& field) = 0;
    // Brings the backend's cached schema up to date.
    virtual bool update() = 0;
    // One definition per schema object whose type shares a bit with the mask.
    virtual bool getTableDef(std::vector<OxQelTableDef>& tables, OxQelTableDef::TableType mask) = 0;
    // fieldList: names joined by ",", or "*" for every column.
    virtual bool getFieldDef(const std::wstring& table, const std::wstring& fieldList,
                             OxQelFieldDefArray& fields) = 0;
    // The statement rewritten from the library's neutral text for this engine.
    virtual std::wstring formatBeforeExecute(const std::wstring& statement) = 0;
    virtual bool getIndexDef(const std::wstring& table, std::vector<OxQelIndexDef>& indexes) = 0;

    virtual bool startTransaction() = 0;
    virtual bool rollbackTransaction(bool unused) = 0;
    virtual bool closeTransaction() = 0;
    virtual bool isInTransaction() = 0;
    // The class of the engine's last error; ErrorUnknown without an open connection.
    virtual OxQel::SQLError getLastError() = 0;

    // A new connection of the same class, opened with this one's four strings.
    virtual OxQelIConnection* createNewConnection() = 0;
    // A new recordset of the backend, bound to this connection, not yet open.
    virtual OxQelIRecordset* createOxQelIRecordset() = 0;
    // A new prepared query of the backend, given this connection.
    virtual OxQelIPreparedQuery* createOxQelIPrepraredQuery() = 0;

    // Runs head + " IN (values)" through a temporary table; false where the backend has
    // no temporary tables.
    virtual bool executeIn(const wchar_t* head, OxObject2Array& values, short propertyIndex,
                           OxQel::FieldType type, int unused);
    virtual bool createTemporaryTableFromObjectArray(std::wstring& tableName,
                                                     OxObject2Array& values, short propertyIndex,
                                                     OxQel::FieldType type, int unused);
    virtual bool createTemporaryTableFromStringArray(std::wstring& tableName,
                                                     OxArraySimple<StringCompare>& values,
                                                     OxQel::FieldType type, int unused);
    virtual bool deleteTemporaryTable(const std::wstring& tableName);
    // How many rows one generated INSERT may carry.
    virtual long getMaxInsertsAtOnce();

    virtual bool canReadMultithread() = 0;
    virtual bool canWriteMultiThread() = 0;
    virtual bool createFunctionNaturalSort() = 0;
    virtual std::wstring getNameFunctionNaturalSort() = 0;
    virtual bool existFunction(const std::wstring& functionName) = 0;
    virtual OxConnectionParameter getConnectionParameter() = 0;
};
