#include "platform/ado/OxAdoxCatalog.h"

#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoProviderRegistry.h"

void OxAdoxTables::loadIfNeeded() {
    if (!m_loaded)
        refresh();
}

void OxAdoxTables::refresh() {
    auto catalog = m_catalog.lock();
    if (!catalog)
        OxAdo::raise(OxAdo::adErrObjectNotSet);
    OxAdoConnection& c = catalog->connection();
    const auto infos = c.call([&] { return c.session().tables({}, {}); });
    m_items.clear();
    for (const auto& info : infos)
        m_items.push_back(OxAdoxTable::fromCatalog(info.name, info.type, catalog));
    m_loaded = true;
}

void OxAdoxTables::append(const std::shared_ptr<OxAdoxTable>& table) {
    if (!table || table->name().empty())
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    loadIfNeeded();
    if (table->isBound() || indexOf(table->name()) >= 0)
        OxAdo::raise(OxAdo::adErrObjectInCollection);
    auto catalog = m_catalog.lock();
    if (!catalog)
        OxAdo::raise(OxAdo::adErrObjectNotSet);
    OxAdoConnection& c = catalog->connection();
    const OxAdoTableDesc d = table->desc();
    c.call([&] { c.session().createTable(d); });
    table->bind(catalog, d.type);
    m_items.push_back(table);
}

void OxAdoxTables::remove(const OxVariant& index) {
    loadIfNeeded();
    const auto table = item(index);
    auto catalog = m_catalog.lock();
    if (!catalog)
        OxAdo::raise(OxAdo::adErrObjectNotSet);
    OxAdoConnection& c = catalog->connection();
    c.call([&] { c.session().dropTable(table->name()); });
    std::erase(m_items, table);
}

void OxAdoxProcedures::loadIfNeeded() {
    if (!m_loaded)
        refresh();
}

void OxAdoxProcedures::refresh() {
    auto catalog = m_catalog.lock();
    if (!catalog)
        OxAdo::raise(OxAdo::adErrObjectNotSet);
    OxAdoConnection& c = catalog->connection();
    const auto infos = c.call([&] { return c.session().procedures(); });
    m_items.clear();
    for (const auto& info : infos) m_items.push_back(std::make_shared<OxAdoxProcedure>(info.name));
    m_loaded = true;
}

std::shared_ptr<OxAdoxCatalog> OxAdoxCatalog::create() {
    auto c = std::shared_ptr<OxAdoxCatalog>(new OxAdoxCatalog());
    c->m_tables.setOwner(c);
    c->m_procedures.setOwner(c);
    return c;
}

void OxAdoxCatalog::setActiveConnection(const std::shared_ptr<OxAdoConnection>& connection) {
    if (connection && connection->state() != OxAdo::adStateOpen)
        OxAdo::raise(OxAdo::adErrInvalidConnection);
    m_connection = connection;
    m_tables.reset();
    m_procedures.reset();
}

OxAdoConnection& OxAdoxCatalog::connection() const {
    if (!m_connection || m_connection->state() != OxAdo::adStateOpen)
        OxAdo::raise(OxAdo::adErrInvalidConnection);
    return *m_connection;
}

OxAdoxTables& OxAdoxCatalog::tables() {
    if (m_connection)
        m_tables.loadIfNeeded();
    return m_tables;
}

OxAdoxProcedures& OxAdoxCatalog::procedures() {
    if (m_connection)
        m_procedures.loadIfNeeded();
    return m_procedures;
}

void OxAdoxCatalog::create(const std::wstring& connectionString) {
    try {
        std::unique_ptr<OxAdoSession> session =
            OxAdoProviderRegistry::createSession(connectionString);
        OxAdoSession::OpenArgs args;
        args.connectionString = connectionString;
        session->createDatabase(args);
    } catch (const OxAdoProviderError& e) {
        throw OxComError(e.hresult(), e.description());
    }
    auto c = OxAdoConnection::create();
    c->open(connectionString);
    setActiveConnection(c);
}
