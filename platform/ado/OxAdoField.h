#pragma once

#include <memory>
#include <string>

#include "platform/ado/OxAdoCollection.h"
#include "platform/ado/OxAdoProperty.h"
#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"
#include "platform/core/OxVariant.h"

class OxAdoRecordset;

// A column of an open recordset; its value is the current record's. A field outlives
// neither the recordset's open state nor the recordset: it then raises
// adErrObjectClosed / adErrObjectNotSet.
class OX_EXPORT OxAdoField {
public:
    OxAdoField(std::weak_ptr<OxAdoRecordset> recordset, int index, const OxAdoColumnInfo& info,
               long attributes);

    const std::wstring& name() const { return m_name; }
    int type() const { return m_type; }
    long definedSize() const { return m_definedSize; }
    int precision() const { return m_precision; }
    int numericScale() const { return m_numericScale; }
    long attributes() const { return m_attributes; }
    int index() const { return m_index; }

    // The current record's value (the edited one while an edit is pending).
    OxVariant value() const;
    // Sets the value, converted to the field's type; starts an edit.
    void setValue(const OxVariant& value);
    // The value as the source last gave it.
    OxVariant originalValue() const;
    // The length of the current value: characters for texts, bytes for binaries.
    long actualSize() const;

    // BASETABLENAME, BASECOLUMNNAME, BASESCHEMANAME, BASECATALOGNAME, KEYCOLUMN,
    // ISAUTOINCREMENT and "Optimize".
    OxAdoProperties& properties() { return m_properties; }

    void setKeyColumn(bool key);

private:
    std::shared_ptr<OxAdoRecordset> recordset() const;

    std::weak_ptr<OxAdoRecordset> m_recordset;
    int m_index;
    std::wstring m_name;
    int m_type;
    long m_definedSize;
    int m_precision;
    int m_numericScale;
    long m_attributes;
    OxAdoProperties m_properties;
};

class OX_EXPORT OxAdoFields : public OxAdoCollection<OxAdoField> {
public:
    void clear() { m_items.clear(); }
    void add(std::shared_ptr<OxAdoField> field) { m_items.push_back(std::move(field)); }
};
