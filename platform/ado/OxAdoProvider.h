#pragma once

#include <exception>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/ado/OxAdoDefs.h"
#include "platform/core/OxExport.h"
#include "platform/core/OxVariant.h"

// The one small interface between the object model and a kind of data source. The object
// model does everything that is the same for every source (cursors, edits, filters,
// collections); a provider runs statements, reads the catalog and writes DDL. Every
// failure is thrown as OxAdoProviderError with the source's diagnostics.

// One diagnostic of a failed provider call, as the Connection's Errors collection shows it.
struct OX_EXPORT OxAdoErrorInfo {
    OxHResult number = OxHr::E_FAIL;
    std::wstring description;
    int32_t nativeError = 0;
    std::wstring sqlState;
    std::wstring source;
};

class OX_EXPORT OxAdoProviderError : public std::exception {
public:
    OxAdoProviderError(OxHResult hr, std::wstring description, int32_t nativeError = 0,
                       std::wstring sqlState = {});
    explicit OxAdoProviderError(std::vector<OxAdoErrorInfo> records);

    // The HRESULT the object model raises: the first record's number.
    OxHResult hresult() const noexcept;
    const std::vector<OxAdoErrorInfo>& records() const noexcept { return m_records; }
    std::wstring description() const;
    const char* what() const noexcept override { return m_what.c_str(); }

private:
    std::vector<OxAdoErrorInfo> m_records;
    std::string m_what;
};

// A result column as the source describes it.
struct OX_EXPORT OxAdoColumnInfo {
    std::wstring name;
    int type = OxAdo::adEmpty;
    long definedSize = 0;
    int precision = 0;
    int numericScale = 0;
    bool mayBeNull = true;  // NULL possible (or not known)
    bool nullable = true;   // NULL may be written
    bool autoIncrement = false;
    bool rowVersion = false;
    // Where the column comes from; an empty base table marks an expression.
    std::wstring baseCatalog;
    std::wstring baseSchema;
    std::wstring baseTable;
    std::wstring baseColumn;
};

// The rows of a result, read forward once.
class OX_EXPORT OxAdoRowSource {
public:
    virtual ~OxAdoRowSource() = default;
    virtual const std::vector<OxAdoColumnInfo>& columns() const = 0;
    // The next row's values, typed after the columns' data types (VT_NULL for NULL);
    // false after the last row.
    virtual bool fetch(std::vector<OxVariant>& values) = 0;
};

// A bound parameter of a statement: its data type, direction, size (-1: as long as the
// value) and value.
struct OX_EXPORT OxAdoParamValue {
    int type = OxAdo::adVariant;
    int direction = OxAdo::adParamInput;
    long size = -1;
    OxVariant value;
};

// How a statement runs.
struct OX_EXPORT OxAdoExecArgs {
    bool wantRows = true;  // false: the result is dropped (no records)
    bool prepared = false;
    long timeout = 0;  // seconds, 0 for none
};

// Catalog records.
struct OX_EXPORT OxAdoTableInfo {
    std::wstring catalog;
    std::wstring schema;
    std::wstring name;
    std::wstring type;  // "TABLE", "VIEW", "SYSTEM TABLE", "LINK", ...
    std::wstring description;
};

struct OX_EXPORT OxAdoIndexInfo {
    std::wstring catalog;
    std::wstring schema;
    std::wstring tableName;
    std::wstring indexName;
    bool primaryKey = false;
    bool unique = false;
    bool clustered = false;
    int ordinal = 1;  // position of the column in the key, from 1
    std::wstring columnName;
    bool descending = false;
};

struct OX_EXPORT OxAdoProcedureInfo {
    std::wstring catalog;
    std::wstring schema;
    std::wstring name;
    int type = 0;  // DB_PT_*: 1 unknown, 2 procedure, 3 function
};

// A column of a table in the catalog, with its properties ("Default", "Nullable",
// "AutoIncrement" and whatever else the provider knows).
struct OX_EXPORT OxAdoColumnDesc {
    std::wstring name;
    int type = OxAdo::adVarWChar;
    long definedSize = 0;
    int precision = 0;
    int numericScale = 0;
    long attributes = OxAdo::adColNullable;
    int ordinal = 0;
    std::vector<std::pair<std::wstring, OxVariant>> properties;

    const OxVariant* property(const std::wstring& name) const;
    void setProperty(const std::wstring& name, const OxVariant& value);
};

struct OX_EXPORT OxAdoTableDesc {
    std::wstring name;
    std::wstring type = L"TABLE";
    std::vector<OxAdoColumnDesc> columns;
    std::vector<std::pair<std::wstring, OxVariant>> properties;
};

// A connection to one data source.
class OX_EXPORT OxAdoSession {
public:
    struct OpenArgs {
        std::wstring connectionString;
        std::wstring userId;
        std::wstring password;
        long connectionTimeout = 0;
        long commandTimeout = 0;
    };

    virtual ~OxAdoSession() = default;

    // The provider's name as the Connection's Provider property shows it.
    virtual std::wstring providerName() const = 0;
    virtual void open(const OpenArgs& args) = 0;
    virtual void close() noexcept = 0;
    // True once the source reported that the link to it is gone.
    virtual bool isBroken() const noexcept { return false; }

    // Runs a statement with "?" placeholders for the parameters. With wantRows, the rows
    // of its result (null when it produced none). rowsAffected: the rows changed, -1 when
    // not known.
    virtual std::unique_ptr<OxAdoRowSource> execute(const std::wstring& text,
                                                    const std::vector<OxAdoParamValue>& params,
                                                    const OxAdoExecArgs& args,
                                                    long& rowsAffected) = 0;

    virtual bool supportsTransactions() const { return true; }
    virtual void beginTrans() = 0;
    virtual void commitTrans() = 0;
    virtual void rollbackTrans() = 0;
    virtual void setIsolationLevel(long level);

    // The catalog. Empty restrictions match everything.
    virtual std::vector<OxAdoTableInfo> tables(const std::wstring& tableName,
                                               const std::wstring& tableType);
    virtual std::vector<OxAdoColumnDesc> columns(const std::wstring& tableName);
    virtual std::vector<OxAdoIndexInfo> indexes(const std::wstring& tableName);
    virtual std::vector<std::wstring> primaryKey(const std::wstring& tableName);
    virtual std::vector<OxAdoProcedureInfo> procedures();

    // Catalog changes.
    virtual void createTable(const OxAdoTableDesc& table);
    virtual void dropTable(const std::wstring& tableName);
    virtual void renameTable(const std::wstring& oldName, const std::wstring& newName);
    virtual void addColumn(const std::wstring& tableName, const OxAdoColumnDesc& column);
    virtual void dropColumn(const std::wstring& tableName, const std::wstring& columnName);
    virtual void renameColumn(const std::wstring& tableName, const std::wstring& oldName,
                              const std::wstring& newName);
    // A column property changed after the column was appended.
    virtual void setColumnProperty(const std::wstring& tableName, const std::wstring& columnName,
                                   const std::wstring& property, const OxVariant& value);
    // The properties a new column and a new table start with, and their defaults.
    virtual std::vector<std::pair<std::wstring, OxVariant>> columnProperties() const;
    virtual std::vector<std::pair<std::wstring, OxVariant>> tableProperties() const;
    // A new database (the catalog's Create); not every source can.
    virtual void createDatabase(const OpenArgs& args);

    // The identifier as the source's SQL writes it.
    virtual std::wstring quoteIdentifier(const std::wstring& name) const;
    // The value the source generated for a column of the row just inserted (its automatic
    // number); empty when it generated none or cannot tell. Never a value of another row.
    virtual OxVariant lastInsertedValue(const std::wstring& tableName,
                                        const std::wstring& columnName);

    // Dynamic properties of the connection and a hook for the ones written.
    virtual std::vector<std::pair<std::wstring, OxVariant>> properties() const;
    virtual void setProperty(const std::wstring& name, const OxVariant& value);

protected:
    // Raises "not capable" for operations a source does not have.
    [[noreturn]] static void notCapable(const std::wstring& what);
};

// Makes the session of a provider for a connection string.
using OxAdoSessionFactory =
    std::function<std::unique_ptr<OxAdoSession>(const std::wstring& connectionString)>;
