#pragma once

#include <string>
#include <vector>

#include "platform/core/OxExport.h"

// An index or primary key: its table, name, uniqueness and columns in key order.
class OX_EXPORT OxQelIndexDef {
public:
    const std::wstring& getTableName() const { return m_tableName; }
    void setTableName(const std::wstring& name) { m_tableName = name; }
    const std::wstring& getIndexName() const { return m_indexName; }
    void setIndexName(const std::wstring& name) { m_indexName = name; }
    bool isUnique() const { return m_isUnique; }
    void setIsUnique(bool unique) { m_isUnique = unique; }
    bool isPrimaryKey() const { return m_isPrimaryKey; }
    void setIsPrimaryKey(bool primaryKey) { m_isPrimaryKey = primaryKey; }

    void addFieldName(const std::wstring& name) { m_fieldNames.push_back(name); }
    unsigned getFieldCount() const { return static_cast<unsigned>(m_fieldNames.size()); }
    // False (out unchanged) when index is not below the field count.
    bool getFieldNameAt(unsigned index, std::wstring& name) const;
    const std::vector<std::wstring>& getFieldNames() const { return m_fieldNames; }
    // The columns joined by "," ("a,b,c").
    std::wstring getListFieldInString() const;

private:
    bool m_isUnique = false;
    bool m_isPrimaryKey = false;
    std::wstring m_tableName;
    std::wstring m_indexName;
    std::vector<std::wstring> m_fieldNames;
};
