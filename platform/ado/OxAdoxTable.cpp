#include "platform/ado/OxAdoxTable.h"

#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoxCatalog.h"

void OxAdoxColumns::loadIfNeeded() {
    auto table = m_table.lock();
    if (!m_loaded && table && table->isBound())
        refresh();
}

void OxAdoxColumns::refresh() {
    auto table = m_table.lock();
    if (!table || !table->isBound())
        return;
    auto catalog = table->requireCatalog();
    OxAdoConnection& c = catalog->connection();
    const auto descs = c.call([&] { return c.session().columns(table->name()); });
    m_items.clear();
    for (const auto& d : descs) {
        auto column = OxAdoxColumn::fromDesc(d, catalog);
        column->bind(table);
        m_items.push_back(column);
    }
    m_loaded = true;
}

void OxAdoxColumns::append(const std::shared_ptr<OxAdoxColumn>& column) {
    if (!column || column->name().empty() || column->isBound())
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    loadIfNeeded();
    if (indexOf(column->name()) >= 0)
        OxAdo::raise(OxAdo::adErrObjectInCollection);
    auto table = m_table.lock();
    if (table && table->isBound()) {
        OxAdoConnection& c = table->requireCatalog()->connection();
        const OxAdoColumnDesc d = column->desc();
        c.call([&] { c.session().addColumn(table->name(), d); });
        column->bind(table);
    }
    m_items.push_back(column);
}

void OxAdoxColumns::append(const std::wstring& name, int type, long definedSize) {
    auto column = OxAdoxColumn::create();
    column->setName(name);
    column->setType(type);
    column->setDefinedSize(definedSize);
    if (auto table = m_table.lock())
        if (auto catalog = table->parentCatalog(); catalog && catalog->activeConnection())
            column->setParentCatalog(catalog);
    append(column);
}

void OxAdoxColumns::remove(const OxVariant& index) {
    loadIfNeeded();
    const auto column = item(index);
    auto table = m_table.lock();
    if (table && table->isBound()) {
        OxAdoConnection& c = table->requireCatalog()->connection();
        c.call([&] { c.session().dropColumn(table->name(), column->name()); });
    }
    std::erase(m_items, column);
}

std::shared_ptr<OxAdoxTable> OxAdoxTable::create() {
    auto t = std::shared_ptr<OxAdoxTable>(new OxAdoxTable());
    t->m_columns.setOwner(t);
    return t;
}

std::shared_ptr<OxAdoxTable> OxAdoxTable::fromCatalog(
    const std::wstring& name, const std::wstring& type,
    const std::shared_ptr<OxAdoxCatalog>& catalog) {
    auto t = create();
    t->m_name = name;
    t->bind(catalog, type);
    return t;
}

void OxAdoxTable::setName(const std::wstring& name) {
    if (name.empty())
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    if (m_bound && name != m_name) {
        OxAdoConnection& c = requireCatalog()->connection();
        c.call([&] { c.session().renameTable(m_name, name); });
    }
    m_name = name;
}

OxAdoxColumns& OxAdoxTable::columns() {
    m_columns.loadIfNeeded();
    return m_columns;
}

void OxAdoxTable::setParentCatalog(const std::shared_ptr<OxAdoxCatalog>& catalog) {
    m_catalog = catalog;
    if (!catalog || !m_properties.empty() || !catalog->activeConnection())
        return;
    OxAdoConnection& c = catalog->connection();
    const auto defaults = c.call([&] { return c.session().tableProperties(); });
    for (const auto& [name, value] : defaults) m_properties.add(name, value);
}

std::shared_ptr<OxAdoxCatalog> OxAdoxTable::requireCatalog() const {
    auto catalog = m_catalog.lock();
    if (!catalog)
        OxAdo::raise(OxAdo::adErrObjectNotSet);
    return catalog;
}

void OxAdoxTable::bind(const std::shared_ptr<OxAdoxCatalog>& catalog, const std::wstring& type) {
    m_catalog = catalog;
    m_bound = true;
    m_type = type;
    auto self = shared_from_this();
    for (const auto& column : m_columns) column->bind(self);
    m_columns.reset();
    // The appended columns are read back from the source on first use.
}

OxAdoTableDesc OxAdoxTable::desc() {
    OxAdoTableDesc d;
    d.name = m_name;
    for (const auto& column : m_columns) d.columns.push_back(column->desc());
    for (const auto& p : m_properties) d.properties.emplace_back(p->name(), p->value());
    return d;
}
