#pragma once

#include <memory>
#include <string>

#include "OxQelLib/interfaces/OxQelIRecordset.h"

class OxDatabase;
class OxDBVariant;
class OxOdbcRecordset;
struct OxOdbcFieldInfo;

// The read-only recordset of the ODBC backend, on the database object of an
// OxQelConnectionODBC. Filter and sort apply from the next openSQL on.
class OX_EXPORT OxQelRecordsetODBC : public OxQelIRecordset {
    OX_DECLARE_DYNAMIC(OxQelRecordsetODBC)
public:
    using OxQelIRecordset::getFieldDef;
    using OxQelIRecordset::getFieldSize;
    using OxQelIRecordset::getFieldType;
    using OxQelIRecordset::isFieldNull;

    // The database object may be null: openSQL then takes the connection's.
    explicit OxQelRecordsetODBC(OxDatabase* database = nullptr);
    ~OxQelRecordsetODBC() override;
    OxQelRecordsetODBC(const OxQelRecordsetODBC&) = delete;
    OxQelRecordsetODBC& operator=(const OxQelRecordsetODBC&) = delete;

    // A new recordset without a database object.
    OxObject* clone() const override;

    bool openSQL(OxQelIConnection* connection, const std::wstring& statement) override;
    void close() override;
    bool getEOF() override;
    bool getBOF() override;
    long getRecordCount() override;
    bool move(long rows) override;
    bool moveFirst() override;
    bool movePrevious() override;
    bool moveNext() override;
    bool moveLast() override;

    bool getField(long index, std::wstring& value) override;
    bool getField(long index, double& value) override;
    bool getField(long index, long& value) override;
    bool getField(long index, bool& value) override;
    bool getField(const std::wstring& name, std::wstring& value) override;
    bool getField(const std::wstring& name, double& value) override;
    bool getField(const std::wstring& name, long& value) override;
    bool getField(const std::wstring& name, bool& value) override;

    OxVariant getlFieldValue(long index) override;
    OxVariant getszFieldValue(const std::wstring& name) override;
    OxVariant getvarFieldValue(const OxVariant& column) override;
    std::wstring getlFieldString(long index) override;
    std::wstring getszFieldString(const std::wstring& name) override;
    std::wstring getvarFieldString(const OxVariant& column) override;

    bool getFieldDef(const OxVariant& column, OxQelFieldDef& definition) override;
    bool getFieldDef(const std::wstring& name, OxQelFieldDef& definition) override;
    bool getFieldDef(long index, OxQelFieldDef& definition) override;
    bool getFieldDef(OxQelFieldDefArray& definitions) override;
    long getFieldCount() override;
    std::wstring getFieldName(long index) override;
    OxQel::FieldType getFieldType(long index) override;
    OxQel::FieldType getFieldType(const std::wstring& name) override;
    OxQel::FieldType getFieldType(const OxVariant& column) override;
    int getFieldSize(long index) override;
    int getFieldSize(const std::wstring& name) override;
    int getFieldSize(const OxVariant& column) override;
    // True when the current value is SQL NULL.
    bool isFieldNull(long index) override;
    bool isFieldNull(const std::wstring& name) override;
    bool isFieldNull(const OxVariant& column) override;

    bool setOptimize(const OxVariant&, bool) override { return false; }
    bool setFilter(const OxVariant& filter) override;
    bool setSort(const std::wstring& sort) override;

private:
    static OxVariant _getVariant(const OxDBVariant& value);
    static bool _getValue(const OxDBVariant& value, std::wstring& out);
    static bool _getValue(const OxDBVariant& value, long& out);
    static bool _getValue(const OxDBVariant& value, double& out);
    static bool _getValue(const OxDBVariant& value, bool& out);
    static void _getFieldDef(const OxOdbcFieldInfo& info, OxQelFieldDef& definition);

    long indexOf(const std::wstring& name) const;
    template <class T>
    bool readValue(long index, T& out, const wchar_t* function);
    template <class T>
    bool readNamedValue(const std::wstring& name, T& out);
    template <class F>
    bool moveBy(F&& step, const wchar_t* function, const wchar_t* param);

    std::unique_ptr<OxOdbcRecordset> m_recordset;
};
