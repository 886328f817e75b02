#pragma once

#include <string>

#include "OxQelLib/schema/OxQelFieldDefArray.h"

// A table or other schema object, with its columns.
class OX_EXPORT OxQelTableDef {
public:
    // Bit flags: a request passes an OR of them, an object is taken when its type shares
    // a bit with the request.
    enum TableType : int32_t {
        Unknown = 1,
        Table = 2,
        View = 4,
        SystemTable = 8,
        SystemView = 16,
        AccessTable = 32,
        Link = 64,
        PassThrough = 128,
        Procedure = 256,
        Synonym = 512,
        Trigger = 1024,
        Index = 2048,
        AllTypes = 0xFFE,  // every kind but Unknown
    };

    OxQelTableDef() = default;
    OxQelTableDef(const OxQelTableDef&) = default;
    OxQelTableDef& operator=(const OxQelTableDef&) = default;
    virtual ~OxQelTableDef() = default;

    const std::wstring& getTableName() const { return m_tableName; }
    void setTableName(const std::wstring& name) { m_tableName = name; }
    TableType getTableType() const { return m_tableType; }
    void setTableType(TableType type) { m_tableType = type; }
    OxQelFieldDefArray& getFields() { return m_fields; }
    const OxQelFieldDefArray& getFields() const { return m_fields; }

private:
    OxQelFieldDefArray m_fields;
    std::wstring m_tableName;
    TableType m_tableType = Unknown;
};

constexpr OxQelTableDef::TableType operator|(OxQelTableDef::TableType a,
                                             OxQelTableDef::TableType b) {
    return static_cast<OxQelTableDef::TableType>(static_cast<int32_t>(a) | static_cast<int32_t>(b));
}
