#pragma once

#include <string>
#include <vector>

#include "OxQelLib/interfaces/OxQelIConnection.h"

struct sqlite3;
struct sqlite3_context;
struct sqlite3_value;

// A SQLite database file held open through the SQLite 3 library: runs statement texts,
// keeps one flat transaction, reads and changes the schema, turns value lists into
// temporary tables, and makes the recordsets and prepared queries of the backend.
// One thread uses a connection at a time; threads that work in parallel take a
// connection each from createNewConnection.
class OX_EXPORT OxQelConnectionSQLite : public OxQelIConnection {
    OX_DECLARE_DYNAMIC(OxQelConnectionSQLite)
public:
    // The 16 bytes every SQLite 3 database file begins with.
    static const unsigned char _mSQLite3FileSignature[16];

    OxQelConnectionSQLite() = default;
    ~OxQelConnectionSQLite() override;
    // A connection owns its engine handle alone.
    OxQelConnectionSQLite(const OxQelConnectionSQLite&) = delete;
    OxQelConnectionSQLite& operator=(const OxQelConnectionSQLite&) = delete;

    bool openConnection(const std::wstring& database, const std::wstring& host,
                        const std::wstring& userId, const std::wstring& password) override;
    bool closeDatabase() override;
    bool findDatabase(const std::wstring& database, const std::wstring& host,
                      const std::wstring& userId, const std::wstring& password) override;
    bool createDatabase(const std::wstring& database, const std::wstring& host,
                        const std::wstring& userId, const std::wstring& password) override;
    bool dropDatabase(const std::wstring& database, const std::wstring& host,
                      const std::wstring& userId, const std::wstring& password) override;
    bool isOpen() override { return m_isOpen; }
    bool execute(const std::wstring& statement) override;

    bool createTable(const std::wstring& table, const std::wstring& field, OxQel::FieldType type,
                     int size, const std::wstring& defaultValue, bool canBeNull) override;
    bool deleteTable(const std::wstring& table) override;
    bool renameTable(const std::wstring& oldName, const std::wstring& newName) override;
    bool modifyTable(const std::wstring& table, const OxQelFieldDefArray& fields) override;
    bool findTable(const std::wstring& table) override;
    bool createView(std::wstring viewName, std::wstring selectText) override;
    bool deleteView(std::wstring viewName) override;
    bool createField(const std::wstring& table, const std::wstring& field, OxQel::FieldType type,
                     int size, const std::wstring& defaultValue, bool canBeNull) override;
    // SQLite cannot drop a column in every case: the table is rebuilt without it.
    bool deleteField(const std::wstring& table, const std::wstring& field) override;
    bool renameField(const std::wstring& table, const std::wstring& oldName,
                     const std::wstring& newName) override;
    bool resizeFieldString(const std::wstring& table, const std::wstring& field,
                           long newSize) override;
    // The column is renamed aside, recreated with the new definition, filled and the
    // old one dropped.
    bool modifyFieldType(const std::wstring& table, const std::wstring& field,
                         const OxQelFieldDef& definition) override;
    bool createIndex(const std::wstring& indexName, bool isPrimaryKey, bool isUnique,
                     bool isClustered, const std::wstring& table,
                     const std::wstring& fieldList) override;
    bool deleteIndex(const std::wstring& indexName, bool isPrimaryKey,
                     const std::wstring& table) override;
    bool findField(const std::wstring& table, const std::wstring& field) override;
    bool update() override { return true; }
    bool getTableDef(std::vector<OxQelTableDef>& tables, OxQelTableDef::TableType mask) override;
    bool getFieldDef(const std::wstring& table, const std::wstring& fieldList,
                     OxQelFieldDefArray& fields) override;
    // Markers to quotes (apostrophes doubled first) and TOP n to LIMIT n.
    std::wstring formatBeforeExecute(const std::wstring& statement) override;
    bool getIndexDef(const std::wstring& table, std::vector<OxQelIndexDef>& indexes) override;

    bool startTransaction() override;
    bool rollbackTransaction(bool unused) override;
    bool closeTransaction() override;
    bool isInTransaction() override { return m_inTransaction; }
    OxQel::SQLError getLastError() override;

    OxQelIConnection* createNewConnection() override;
    OxQelIRecordset* createOxQelIRecordset() override;
    OxQelIPreparedQuery* createOxQelIPrepraredQuery() override;

    bool executeIn(const wchar_t* head, OxObject2Array& values, short propertyIndex,
                   OxQel::FieldType type, int unused) override;
    bool createTemporaryTableFromObjectArray(std::wstring& tableName, OxObject2Array& values,
                                             short propertyIndex, OxQel::FieldType type,
                                             int unused) override;
    bool createTemporaryTableFromStringArray(std::wstring& tableName,
                                             OxArraySimple<StringCompare>& values,
                                             OxQel::FieldType type, int unused) override;
    bool deleteTemporaryTable(const std::wstring& tableName) override;
    long getMaxInsertsAtOnce() override { return 500; }

    bool canReadMultithread() override { return true; }
    bool canWriteMultiThread() override { return false; }
    bool createFunctionNaturalSort() override { return true; }
    std::wstring getNameFunctionNaturalSort() override { return L"fn_OxNaturalSort"; }
    bool existFunction(const std::wstring&) override { return true; }
    OxConnectionParameter getConnectionParameter() override { return m_parameters; }

    // The text that creates the temporary table and fills it from values joined in the
    // library's literal markers; to be run through formatAndExecute.
    std::wstring formatTemporaryTable(const std::wstring& tableName, OxQel::FieldType type,
                                      const std::wstring& joinedValues);
    // Every apostrophe doubled, for names placed between apostrophes.
    std::wstring escapeQuote(const std::wstring& text) const;
    // The column names of the table, in table order.
    bool getAllFieldName(const std::wstring& table, std::vector<std::wstring>& names);
    // The definition of one column; false unless exactly that column was found.
    bool getFieldDefByName(const std::wstring& table, const std::wstring& field,
                           OxQelFieldDef& definition);

    // The engine handle (null while closed) and the text encoding of the database, for
    // the backend's recordset and prepared query.
    sqlite3* getHandle() const { return m_handle; }
    bool isUtf16() const { return m_utf16; }

    // Writes a consistent copy of the open database (committed pages in a write-ahead
    // log included) to path, through a temporary file beside it that replaces path only
    // when complete; the stale journal files of an earlier database there are removed.
    bool backupDatabaseTo(const std::wstring& path);

    static bool _isSQLiteFile(const std::wstring& path);
    static std::wstring _convertSQLiteErrorEnumToStringMessage(int code);

    // The natural-sort SQL function and its key: every run of ASCII digits is written
    // with its length in front ("%03d"), so that the keys' binary order is the natural
    // order (file9 before file12). Integers are their own key; other values give NULL.
    static void _fn_OxNaturalSort(sqlite3_context* context, int count, sqlite3_value** values);
    static std::wstring _getStringForNaturalSort(const std::wstring& text);

private:
    static constexpr int _miMaxRetryCount = 200;
    static constexpr int _miMaxRetryTimeout = 50;  // milliseconds

    static int busyHandler(void* unused, int tries);
    static bool _replaceTopByLimit(std::wstring& text);

    // Opens the file, or fails with the engine's message logged as function.
    bool openHandle(const std::wstring& database, const wchar_t* function);
    void closeHandle();
    void optimizeSQLite();
    void registerFunctions();

    std::wstring convertEnumFieldType(OxQel::FieldType type) const;
    OxQel::FieldType convertStrFieldType(const std::wstring& type) const;
    std::wstring convertEnumTableType(OxQelTableDef::TableType type) const;
    OxQelTableDef::TableType convertEnumTableType(const std::wstring& type) const;
    std::wstring manageDefaultValue(const std::wstring& defaultValue, OxQel::FieldType type,
                                    bool canBeNull) const;
    void normalizeDefaultValue(std::wstring& value, OxQel::FieldType type) const;
    std::vector<std::wstring> split(const std::wstring& text, const std::wstring& separators) const;
    bool isInVector(const std::vector<std::wstring>& names, const std::wstring& name) const;
    std::wstring fieldClause(const std::wstring& type, const std::wstring& defaultValue,
                             OxQel::FieldType fieldType, bool canBeNull) const;

    // Runs a catalogue query, calling onRow for every row; logs a failure as function.
    template <class OnRow>
    bool readCatalogue(const std::wstring& sql, const wchar_t* function, OnRow&& onRow);
    // The temporary table's creation and its INSERTs of at most getMaxInsertsAtOnce rows,
    // every value an escaped text literal.
    template <class TextAt>
    std::wstring temporaryTableStatement(const std::wstring& tableName, OxQel::FieldType type,
                                         size_t count, TextAt textAt);
    bool rebuildTableWithout(const std::wstring& table, const std::wstring& field);
    // Adds a column whose default the engine's ADD COLUMN refuses (an expression, the
    // current time) by rebuilding the table from its own definition with the column in it.
    bool addFieldByRebuild(const std::wstring& table, const std::wstring& columnDefinition);

    sqlite3* m_handle = nullptr;
    bool m_isOpen = false;
    bool m_inTransaction = false;
    OxConnectionParameter m_parameters;
    bool m_utf16 = false;
};
