#pragma once

#include "OxQelLib/interfaces/OxQelIConnection.h"

// The null backend: a connection for hosts that have no database configured. Every
// request fails quietly with a fixed answer; nothing is reported or logged.
class OX_EXPORT OxQelConnectionDefault : public OxQelIConnection {
    OX_DECLARE_DYNAMIC(OxQelConnectionDefault)
public:
    OxObject* clone() const override;

    bool openConnection(const std::wstring&, const std::wstring&, const std::wstring&,
                        const std::wstring&) override {
        return false;
    }
    bool closeDatabase() override { return false; }
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
    bool isOpen() override { return false; }
    bool execute(const std::wstring&) override { return false; }
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
    bool update() override { return false; }
    bool getTableDef(std::vector<OxQelTableDef>&, OxQelTableDef::TableType) override {
        return false;
    }
    bool getFieldDef(const std::wstring&, const std::wstring&, OxQelFieldDefArray&) override {
        return false;
    }
    std::wstring formatBeforeExecute(const std::wstring&) override { return {}; }
    bool getIndexDef(const std::wstring&, std::vector<OxQelIndexDef>&) override { return false; }
    bool startTransaction() override { return false; }
    bool rollbackTransaction(bool) override { return false; }
    bool closeTransaction() override { return false; }
    bool isInTransaction() override { return false; }
    OxQel::SQLError getLastError() override { return OxQel::ErrorUnknown; }
    OxQelIConnection* createNewConnection() override { return nullptr; }
    OxQelIRecordset* createOxQelIRecordset() override;
    OxQelIPreparedQuery* createOxQelIPrepraredQuery() override { return nullptr; }
    bool canReadMultithread() override { return false; }
    bool canWriteMultiThread() override { return false; }
    bool createFunctionNaturalSort() override { return true; }
    std::wstring getNameFunctionNaturalSort() override { return {}; }
    bool existFunction(const std::wstring&) override { return false; }
    OxConnectionParameter getConnectionParameter() override { return {}; }

    bool attachTable(OxQelIConnection* source, const std::wstring& sourceTable,
                     const std::wstring& targetTable);
};
