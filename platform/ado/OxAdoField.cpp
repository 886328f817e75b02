#include "platform/ado/OxAdoField.h"

#include "platform/ado/OxAdoRecordset.h"

OxAdoField::OxAdoField(std::weak_ptr<OxAdoRecordset> recordset, int index,
                       const OxAdoColumnInfo& info, long attributes)
    : m_recordset(std::move(recordset)),
      m_index(index),
      m_name(info.name),
      m_type(info.type),
      m_definedSize(info.definedSize),
      m_precision(info.precision),
      m_numericScale(info.numericScale),
      m_attributes(attributes) {
    m_properties.add(L"BASECATALOGNAME", OxVariant(info.baseCatalog));
    m_properties.add(L"BASESCHEMANAME", OxVariant(info.baseSchema));
    m_properties.add(L"BASETABLENAME", OxVariant(info.baseTable));
    m_properties.add(L"BASECOLUMNNAME", OxVariant(info.baseColumn));
    m_properties.add(L"KEYCOLUMN", OxVariant(false));
    m_properties.add(L"ISAUTOINCREMENT", OxVariant(info.autoIncrement));
    // Searching the client's rows needs no index: the flag is kept for those who read it.
    m_properties.add(L"Optimize", OxVariant(false));
}

std::shared_ptr<OxAdoRecordset> OxAdoField::recordset() const {
    auto rs = m_recordset.lock();
    if (!rs)
        OxAdo::raise(OxAdo::adErrObjectNotSet);
    rs->requireOpen();
    return rs;
}

OxVariant OxAdoField::value() const {
    return recordset()->valueAt(m_index);
}

void OxAdoField::setValue(const OxVariant& value) {
    recordset()->setValueAt(m_index, value);
}

OxVariant OxAdoField::originalValue() const {
    return recordset()->originalValueAt(m_index);
}

long OxAdoField::actualSize() const {
    const OxVariant v = value();
    if (v.vt() == VT_BSTR)
        return static_cast<long>(v.bstr().size());
    if (v.isByteArray())
        return static_cast<long>(v.bytesSize());
    if (v.isNull() || v.isEmpty())
        return 0;
    return m_definedSize;
}

void OxAdoField::setKeyColumn(bool key) {
    m_properties.add(L"KEYCOLUMN", OxVariant(key));
    if (key)
        m_attributes |= OxAdo::adFldKeyColumn;
    else
        m_attributes &= ~static_cast<long>(OxAdo::adFldKeyColumn);
}
