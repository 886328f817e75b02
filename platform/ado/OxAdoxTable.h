#pragma once

#include <memory>
#include <string>

#include "platform/ado/OxAdoCollection.h"
#include "platform/ado/OxAdoProperty.h"
#include "platform/ado/OxAdoxColumn.h"
#include "platform/core/OxExport.h"

class OxAdoxCatalog;
class OxAdoxTable;

// The columns of a catalog table: loaded from the source on first use once the table is
// in the catalog, appended to the source from then on.
class OX_EXPORT OxAdoxColumns : public OxAdoCollection<OxAdoxColumn> {
public:
    void refresh();
    void append(const std::shared_ptr<OxAdoxColumn>& column);
    void append(const std::wstring& name, int type = OxAdo::adVarWChar, long definedSize = 0);
    void remove(const OxVariant& index);

    // For the table.
    void setOwner(const std::weak_ptr<OxAdoxTable>& table) { m_table = table; }
    void loadIfNeeded();
    void reset() {
        m_items.clear();
        m_loaded = false;
    }

private:
    std::weak_ptr<OxAdoxTable> m_table;
    bool m_loaded = false;
};

// A table (or view, or other object) of the catalog. A new table reaches the source when
// it is appended to the catalog's Tables; renaming an appended table renames it there.
class OX_EXPORT OxAdoxTable : public std::enable_shared_from_this<OxAdoxTable> {
public:
    static std::shared_ptr<OxAdoxTable> create();
    // A table the source already has.
    static std::shared_ptr<OxAdoxTable> fromCatalog(const std::wstring& name,
                                                    const std::wstring& type,
                                                    const std::shared_ptr<OxAdoxCatalog>& catalog);

    const std::wstring& name() const { return m_name; }
    void setName(const std::wstring& name);
    // "TABLE", "VIEW", "SYSTEM TABLE", ...; empty for a table not yet appended.
    const std::wstring& type() const { return m_type; }
    OxAdoxColumns& columns();
    std::shared_ptr<OxAdoxCatalog> parentCatalog() const { return m_catalog.lock(); }
    void setParentCatalog(const std::shared_ptr<OxAdoxCatalog>& catalog);
    OxAdoProperties& properties() { return m_properties; }

    // For the catalog objects.
    bool isBound() const { return m_bound; }
    void bind(const std::shared_ptr<OxAdoxCatalog>& catalog, const std::wstring& type);
    std::shared_ptr<OxAdoxCatalog> requireCatalog() const;
    OxAdoTableDesc desc();

private:
    OxAdoxTable() = default;

    std::wstring m_name;
    std::wstring m_type;
    std::weak_ptr<OxAdoxCatalog> m_catalog;
    bool m_bound = false;
    OxAdoxColumns m_columns;
    OxAdoProperties m_properties;
};
