#include "platform/ado/OxAdoxColumn.h"

#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoxCatalog.h"
#include "platform/ado/OxAdoxTable.h"

std::shared_ptr<OxAdoxColumn> OxAdoxColumn::create() {
    return std::shared_ptr<OxAdoxColumn>(new OxAdoxColumn());
}

void OxAdoxColumn::requireUnbound() const {
    if (isBound())
        OxAdo::raise(OxAdo::adErrIllegalOperation);
}

void OxAdoxColumn::setName(const std::wstring& name) {
    if (name.empty())
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    if (auto table = m_table.lock()) {
        if (name == m_name)
            return;
        OxAdoConnection& c = table->requireCatalog()->connection();
        c.call([&] { c.session().renameColumn(table->name(), m_name, name); });
    }
    m_name = name;
}

void OxAdoxColumn::setType(int type) {
    requireUnbound();
    m_type = type;
}

void OxAdoxColumn::setDefinedSize(long size) {
    requireUnbound();
    if (size < 0)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_definedSize = size;
}

void OxAdoxColumn::setAttributes(long attributes) {
    requireUnbound();
    m_attributes = attributes;
}

void OxAdoxColumn::setPrecision(int precision) {
    requireUnbound();
    m_precision = precision;
}

void OxAdoxColumn::setNumericScale(int scale) {
    requireUnbound();
    m_numericScale = scale;
}

void OxAdoxColumn::setParentCatalog(const std::shared_ptr<OxAdoxCatalog>& catalog) {
    m_catalog = catalog;
    if (!catalog || !m_properties.empty())
        return;
    OxAdoConnection& c = catalog->connection();
    const auto defaults = c.call([&] { return c.session().columnProperties(); });
    for (const auto& [name, value] : defaults) m_properties.add(name, value);
    hookProperties();
}

// Once the column is in the source, a property written is written there first.
void OxAdoxColumn::hookProperties() {
    std::weak_ptr<OxAdoxColumn> weak = weak_from_this();
    for (const auto& p : m_properties)
        p->setHook([weak](const std::wstring& property, const OxVariant& value) {
            auto self = weak.lock();
            if (!self)
                return;
            auto table = self->m_table.lock();
            if (!table)
                return;
            OxAdoConnection& c = table->requireCatalog()->connection();
            c.call([&] {
                c.session().setColumnProperty(table->name(), self->m_name, property, value);
            });
        });
}

OxAdoColumnDesc OxAdoxColumn::desc() const {
    OxAdoColumnDesc d;
    d.name = m_name;
    d.type = m_type;
    d.definedSize = m_definedSize;
    d.precision = m_precision;
    d.numericScale = m_numericScale;
    d.attributes = m_attributes;
    for (const auto& p : m_properties) d.properties.emplace_back(p->name(), p->value());
    return d;
}

std::shared_ptr<OxAdoxColumn> OxAdoxColumn::fromDesc(
    const OxAdoColumnDesc& d, const std::shared_ptr<OxAdoxCatalog>& catalog) {
    auto c = create();
    c->m_name = d.name;
    c->m_type = d.type;
    c->m_definedSize = d.definedSize;
    c->m_precision = d.precision;
    c->m_numericScale = d.numericScale;
    c->m_attributes = d.attributes;
    c->m_catalog = catalog;
    for (const auto& [name, value] : d.properties) c->m_properties.add(name, value);
    c->hookProperties();
    return c;
}

void OxAdoxColumn::bind(const std::shared_ptr<OxAdoxTable>& table) {
    m_table = table;
    if (m_catalog.expired() && table)
        m_catalog = table->parentCatalog();
}
