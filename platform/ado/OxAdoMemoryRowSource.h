#pragma once

#include <vector>

#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

// Rows held in memory: the schema rowsets, and providers that have their rows at hand.
class OX_EXPORT OxAdoMemoryRowSource : public OxAdoRowSource {
public:
    OxAdoMemoryRowSource() = default;
    OxAdoMemoryRowSource(std::vector<OxAdoColumnInfo> columns,
                         std::vector<std::vector<OxVariant>> rows);

    // A column of the given name and type that may hold NULL.
    void addColumn(const std::wstring& name, int type, long definedSize = 0);
    // A row; missing trailing values are NULL.
    void addRow(std::vector<OxVariant> values);

    const std::vector<OxAdoColumnInfo>& columns() const override { return m_columns; }
    bool fetch(std::vector<OxVariant>& values) override;

private:
    std::vector<OxAdoColumnInfo> m_columns;
    std::vector<std::vector<OxVariant>> m_rows;
    size_t m_next = 0;
};
