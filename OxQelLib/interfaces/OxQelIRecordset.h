#pragma once

#include <string>

#include "OxClasses/OxObject.h"
#include "OxQelLib/foundation/OxQelGlobal.h"
#include "OxQelLib/schema/OxQelFieldDefArray.h"
#include "platform/core/OxVariant.h"

class OxQelIConnection;

// Reads the rows of a query. Columns are counted from 0 and addressed by index, by name,
// or by a variant (whose text is taken as the name). No operation throws.
//
// Derived classes that override some overloads of a name should bring the rest into
// scope ("using OxQelIRecordset::getFieldDef;") so that calls on the concrete class
// resolve as they do on the interface.
class OX_EXPORT OxQelIRecordset : public OxObject {
    OX_DECLARE_DYNAMIC(OxQelIRecordset)
public:
    ~OxQelIRecordset() override = default;

    // Runs the statement on the connection and opens the result on its first row.
    virtual bool openSQL(OxQelIConnection* connection, const std::wstring& statement) = 0;
    virtual void close() = 0;
    virtual bool getEOF() = 0;
    virtual bool getBOF() = 0;
    virtual long getRecordCount() = 0;
    virtual bool move(long rows) = 0;
    virtual bool moveFirst() = 0;
    virtual bool movePrevious() = 0;
    virtual bool moveNext() = 0;
    virtual bool moveLast() = 0;

    // True when the column exists and its value converted; a NULL gives the empty or
    // zero value.
    virtual bool getField(long index, std::wstring& value) = 0;
    virtual bool getField(long index, double& value) = 0;
    virtual bool getField(long index, long& value) = 0;
    virtual bool getField(long index, bool& value) = 0;
    virtual bool getField(const std::wstring& name, std::wstring& value) = 0;
    virtual bool getField(const std::wstring& name, double& value) = 0;
    virtual bool getField(const std::wstring& name, long& value) = 0;
    virtual bool getField(const std::wstring& name, bool& value) = 0;

    virtual OxVariant getlFieldValue(long index) = 0;
    virtual OxVariant getszFieldValue(const std::wstring& name) = 0;
    virtual OxVariant getvarFieldValue(const OxVariant& column) = 0;
    virtual std::wstring getlFieldString(long index) = 0;
    virtual std::wstring getszFieldString(const std::wstring& name) = 0;
    virtual std::wstring getvarFieldString(const OxVariant& column) = 0;

    virtual bool getFieldDef(const OxVariant& column, OxQelFieldDef& definition) = 0;
    virtual bool getFieldDef(const std::wstring& name, OxQelFieldDef& definition) = 0;
    virtual bool getFieldDef(long index, OxQelFieldDef& definition) = 0;
    // One definition per column, in result order, replacing the array's content.
    virtual bool getFieldDef(OxQelFieldDefArray& definitions) = 0;
    virtual long getFieldCount() = 0;
    virtual std::wstring getFieldName(long index) = 0;
    virtual OxQel::FieldType getFieldType(long index) = 0;
    virtual OxQel::FieldType getFieldType(const std::wstring& name) = 0;
    virtual OxQel::FieldType getFieldType(const OxVariant& column) = 0;
    virtual int getFieldSize(long index) = 0;
    virtual int getFieldSize(const std::wstring& name) = 0;
    virtual int getFieldSize(const OxVariant& column) = 0;
    virtual bool isFieldNull(long index) = 0;
    virtual bool isFieldNull(const std::wstring& name) = 0;
    virtual bool isFieldNull(const OxVariant& column) = 0;

    virtual bool setOptimize(const OxVariant& column, bool optimize) = 0;
    virtual bool setFilter(const OxVariant& filter) = 0;
    virtual bool setSort(const std::wstring& sort) = 0;

protected:
    OxQelIRecordset() = default;
};

// A recordset whose rows can also be changed.
class OX_EXPORT OxQelIEditRecordset : public OxQelIRecordset {
    OX_DECLARE_DYNAMIC(OxQelIEditRecordset)
public:
    virtual bool setField(long index, const OxVariant& value) = 0;
    virtual bool setField(long index, const std::wstring& value) = 0;
    virtual bool setField(long index, double value) = 0;
    virtual bool setField(long index, long value) = 0;
    virtual bool setField(long index, int value) = 0;
    virtual bool setField(const std::wstring& name, const OxVariant& value) = 0;
    virtual bool setField(const std::wstring& name, const std::wstring& value) = 0;
    virtual bool setField(const std::wstring& name, double value) = 0;
    virtual bool setField(const std::wstring& name, long value) = 0;
    virtual bool setField(const std::wstring& name, int value) = 0;
    virtual bool setlFieldValue(long index, const OxVariant& value) = 0;
    virtual bool setszFieldValue(const std::wstring& name, const OxVariant& value) = 0;
    virtual bool setvarFieldValue(const OxVariant& column, const OxVariant& value) = 0;

    virtual bool addNew() = 0;
    virtual bool remove() = 0;
    virtual bool update() = 0;
    virtual bool cancelUpdate() = 0;
    virtual bool updateBatch() = 0;
    virtual bool cancelBatch() = 0;

protected:
    OxQelIEditRecordset() = default;
};
