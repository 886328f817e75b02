#pragma once

#include <memory>
#include <string>

#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoProperty.h"
#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

class OxAdoxCatalog;
class OxAdoxTable;

// A column of a catalog table. A new column has no properties until its ParentCatalog is
// set; then it has the provider's ("Default", "Nullable", "AutoIncrement", ...). Once the
// column belongs to a table of the catalog, renaming it or writing a property changes
// the source; its type and size are fixed from then on.
class OX_EXPORT OxAdoxColumn : public std::enable_shared_from_this<OxAdoxColumn> {
public:
    static std::shared_ptr<OxAdoxColumn> create();

    const std::wstring& name() const { return m_name; }
    void setName(const std::wstring& name);
    int type() const { return m_type; }
    void setType(int type);
    long definedSize() const { return m_definedSize; }
    void setDefinedSize(long size);
    long attributes() const { return m_attributes; }
    void setAttributes(long attributes);
    int precision() const { return m_precision; }
    void setPrecision(int precision);
    int numericScale() const { return m_numericScale; }
    void setNumericScale(int scale);
    std::shared_ptr<OxAdoxCatalog> parentCatalog() const { return m_catalog.lock(); }
    void setParentCatalog(const std::shared_ptr<OxAdoxCatalog>& catalog);
    OxAdoProperties& properties() { return m_properties; }

    // For the catalog objects.
    OxAdoColumnDesc desc() const;
    static std::shared_ptr<OxAdoxColumn> fromDesc(const OxAdoColumnDesc& desc,
                                                  const std::shared_ptr<OxAdoxCatalog>& catalog);
    void bind(const std::shared_ptr<OxAdoxTable>& table);
    bool isBound() const { return !m_table.expired(); }

private:
    OxAdoxColumn() = default;
    void requireUnbound() const;
    void hookProperties();

    std::wstring m_name;
    int m_type = OxAdo::adVarWChar;
    long m_definedSize = 0;
    long m_attributes = 0;
    int m_precision = 0;
    int m_numericScale = 0;
    std::weak_ptr<OxAdoxCatalog> m_catalog;
    std::weak_ptr<OxAdoxTable> m_table;
    OxAdoProperties m_properties;
};
