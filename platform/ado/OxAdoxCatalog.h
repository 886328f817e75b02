#pragma once

#include <memory>
#include <string>

#include "platform/ado/OxAdoCollection.h"
#include "platform/ado/OxAdoxTable.h"
#include "platform/core/OxExport.h"

class OxAdoConnection;
class OxAdoxCatalog;

class OX_EXPORT OxAdoxTables : public OxAdoCollection<OxAdoxTable> {
public:
    // Reads the source's tables again: earlier Table objects are no longer in the collection.
    void refresh();
    // Creates the table in the source.
    void append(const std::shared_ptr<OxAdoxTable>& table);
    // Drops the table from the source.
    void remove(const OxVariant& index);

    void setOwner(const std::weak_ptr<OxAdoxCatalog>& catalog) { m_catalog = catalog; }
    void loadIfNeeded();
    void reset() {
        m_items.clear();
        m_loaded = false;
    }

private:
    std::weak_ptr<OxAdoxCatalog> m_catalog;
    bool m_loaded = false;
};

class OX_EXPORT OxAdoxProcedure {
public:
    explicit OxAdoxProcedure(std::wstring name) : m_name(std::move(name)) {}
    const std::wstring& name() const { return m_name; }

private:
    std::wstring m_name;
};

class OX_EXPORT OxAdoxProcedures : public OxAdoCollection<OxAdoxProcedure> {
public:
    void refresh();
    void setOwner(const std::weak_ptr<OxAdoxCatalog>& catalog) { m_catalog = catalog; }
    void loadIfNeeded();
    void reset() {
        m_items.clear();
        m_loaded = false;
    }

private:
    std::weak_ptr<OxAdoxCatalog> m_catalog;
    bool m_loaded = false;
};

// The catalog of a connection's source: its tables with their columns, and its
// procedures.
class OX_EXPORT OxAdoxCatalog : public std::enable_shared_from_this<OxAdoxCatalog> {
public:
    static std::shared_ptr<OxAdoxCatalog> create();

    std::shared_ptr<OxAdoConnection> activeConnection() const { return m_connection; }
    // An open connection; null detaches the catalog.
    void setActiveConnection(const std::shared_ptr<OxAdoConnection>& connection);
    OxAdoxTables& tables();
    OxAdoxProcedures& procedures();
    // Creates a new database through the provider of the string and binds to it.
    void create(const std::wstring& connectionString);

    // The open connection, or adErrInvalidConnection.
    OxAdoConnection& connection() const;

private:
    OxAdoxCatalog() = default;

    std::shared_ptr<OxAdoConnection> m_connection;
    OxAdoxTables m_tables;
    OxAdoxProcedures m_procedures;
};
