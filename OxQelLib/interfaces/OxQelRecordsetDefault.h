#pragma once

#include "OxQelLib/interfaces/OxQelIRecordset.h"

// The null backend's recordset: always empty, refuses every change.
class OX_EXPORT OxQelRecordsetDefault : public OxQelIEditRecordset {
    OX_DECLARE_DYNAMIC(OxQelRecordsetDefault)
public:
    OxObject* clone() const override;

    bool openSQL(OxQelIConnection*, const std::wstring&) override { return false; }
    void close() override {}
    bool getEOF() override { return true; }
    bool getBOF() override { return false; }
    long getRecordCount() override { return -1; }
    bool move(long) override { return false; }
    bool moveFirst() override { return false; }
    bool movePrevious() override { return false; }
    bool moveNext() override { return false; }
    bool moveLast() override { return false; }
    bool getField(long, std::wstring&) override { return false; }
    bool getField(long, double&) override { return false; }
    bool getField(long, long&) override { return false; }
    bool getField(long, bool&) override { return false; }
    bool getField(const std::wstring&, std::wstring&) override { return false; }
    bool getField(const std::wstring&, double&) override { return false; }
    bool getField(const std::wstring&, long&) override { return false; }
    bool getField(const std::wstring&, bool&) override { return false; }
    OxVariant getlFieldValue(long) override { return {}; }
    OxVariant getszFieldValue(const std::wstring&) override { return {}; }
    OxVariant getvarFieldValue(const OxVariant&) override { return {}; }
    std::wstring getlFieldString(long) override { return {}; }
    std::wstring getszFieldString(const std::wstring&) override { return {}; }
    std::wstring getvarFieldString(const OxVariant&) override { return {}; }
    bool getFieldDef(const OxVariant&, OxQelFieldDef&) override { return false; }
    bool getFieldDef(const std::wstring&, OxQelFieldDef&) override { return false; }
    bool getFieldDef(long, OxQelFieldDef&) override { return false; }
    bool getFieldDef(OxQelFieldDefArray&) override { return false; }
    long getFieldCount() override { return -1; }
    std::wstring getFieldName(long) override { return {}; }
    OxQel::FieldType getFieldType(long) override { return OxQel::Unknown; }
    OxQel::FieldType getFieldType(const std::wstring&) override { return OxQel::Unknown; }
    OxQel::FieldType getFieldType(const OxVariant&) override { return OxQel::Unknown; }
    int getFieldSize(long) override { return -1; }
    int getFieldSize(const std::wstring&) override { return -1; }
    int getFieldSize(const OxVariant&) override { return -1; }
    bool isFieldNull(long) override { return false; }
    bool isFieldNull(const std::wstring&) override { return false; }
    bool isFieldNull(const OxVariant&) override { return false; }
    bool setOptimize(const OxVariant&, bool) override { return false; }
    bool setFilter(const OxVariant&) override { return false; }
    bool setSort(const std::wstring&) override { return true; }

    bool setField(long, const OxVariant&) override { return false; }
    bool setField(long, const std::wstring&) override { return false; }
    bool setField(long, double) override { return false; }
    bool setField(long, long) override { return false; }
    bool setField(long, int) override { return false; }
    bool setField(const std::wstring&, const OxVariant&) override { return false; }
    bool setField(const std::wstring&, const std::wstring&) override { return false; }
    bool setField(const std::wstring&, double) override { return false; }
    bool setField(const std::wstring&, long) override { return false; }
    bool setField(const std::wstring&, int) override { return false; }
    bool setlFieldValue(long, const OxVariant&) override { return false; }
    bool setszFieldValue(const std::wstring&, const OxVariant&) override { return false; }
    bool setvarFieldValue(const OxVariant&, const OxVariant&) override { return false; }
    bool addNew() override { return false; }
    bool remove() override { return false; }
    bool update() override { return false; }
    bool cancelUpdate() override { return false; }
    bool updateBatch() override { return false; }
    bool cancelBatch() override { return false; }
};
