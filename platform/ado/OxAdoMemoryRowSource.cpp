#include "platform/ado/OxAdoMemoryRowSource.h"

OxAdoMemoryRowSource::OxAdoMemoryRowSource(std::vector<OxAdoColumnInfo> columns,
                                           std::vector<std::vector<OxVariant>> rows)
    : m_columns(std::move(columns)) {
    for (auto& r : rows) addRow(std::move(r));
}

void OxAdoMemoryRowSource::addColumn(const std::wstring& name, int type, long definedSize) {
    OxAdoColumnInfo c;
    c.name = name;
    c.type = type;
    c.definedSize = definedSize;
    m_columns.push_back(std::move(c));
}

void OxAdoMemoryRowSource::addRow(std::vector<OxVariant> values) {
    values.resize(m_columns.size(), OxVariant::null());
    m_rows.push_back(std::move(values));
}

bool OxAdoMemoryRowSource::fetch(std::vector<OxVariant>& values) {
    if (m_next >= m_rows.size())
        return false;
    values = std::move(m_rows[m_next++]);
    return true;
}
