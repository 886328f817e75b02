#pragma once

#include <string>

#include "OxQelLib/ado/OxQelConnectionADO.h"
#include "OxQelLib/ado/OxQelRecordsetADO.h"

// The smallest concrete connection on the core, as a backend would write it: the host
// argument is the whole connection string, and the dialect decides how the library's
// markers and brackets are written.
class TestConnectionADO : public OxQelConnectionADO {
public:
    enum class Dialect { Brackets, PostgreSQL };

    explicit TestConnectionADO(Dialect dialect = Dialect::Brackets) : m_dialect(dialect) {}

    bool openConnection(const std::wstring& database, const std::wstring& host,
                        const std::wstring& userId, const std::wstring& password) override;
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
    bool createTable(const std::wstring& table, const std::wstring& field, OxQel::FieldType type,
                     int size, const std::wstring& defaultValue, bool canBeNull) override;
    bool createView(std::wstring viewName, std::wstring selectText) override;
    bool deleteView(std::wstring viewName) override;
    bool createField(const std::wstring& table, const std::wstring& field, OxQel::FieldType type,
                     int size, const std::wstring& defaultValue, bool canBeNull) override;
    bool createIndex(const std::wstring& indexName, bool isPrimaryKey, bool isUnique,
                     bool isClustered, const std::wstring& table,
                     const std::wstring& fieldList) override;
    bool deleteIndex(const std::wstring& indexName, bool isPrimaryKey,
                     const std::wstring& table) override;
    bool getFieldDef(const std::wstring& table, const std::wstring& fieldList,
                     OxQelFieldDefArray& fields) override;
    std::wstring formatBeforeExecute(const std::wstring& statement) override;
    OxQelIConnection* createNewConnection() override;
    OxQelIRecordset* createOxQelIRecordset() override;
    bool createFunctionNaturalSort() override { return true; }
    std::wstring getNameFunctionNaturalSort() override { return {}; }
    bool existFunction(const std::wstring&) override { return false; }

    // The protected core, for the tests.
    using OxQelConnectionADO::addQueryToScript;
    using OxQelConnectionADO::openADOConn;

private:
    std::wstring columnType(OxQel::FieldType type, int size) const;

    Dialect m_dialect;
};

// A recordset that opens its statements on a client-side static cursor, and shows the
// protected helpers.
class TestRecordsetADO : public OxQelRecordsetADO {
public:
    using OxQelRecordsetADO::stripDefaultText;
};
