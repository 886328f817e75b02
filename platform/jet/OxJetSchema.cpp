#include "platform/jet/OxJetSchema.h"

#include "platform/core/OxText.h"

const OxJetColumn* OxJetTableDef::column(std::wstring_view name) const {
    const int at = columnIndex(name);
    return at < 0 ? nullptr : &columns[static_cast<size_t>(at)];
}

int OxJetTableDef::columnIndex(std::wstring_view name) const {
    for (size_t i = 0; i < columns.size(); ++i)
        if (OxText::equalsNoCase(columns[i].name, name))
            return static_cast<int>(i);
    return -1;
}

const wchar_t* oxJetTypeName(uint8_t type) {
    switch (static_cast<OxJetType>(type)) {
        case OxJetType::Boolean:
            return L"Yes/No";
        case OxJetType::Byte:
            return L"Byte";
        case OxJetType::Integer:
            return L"Integer";
        case OxJetType::Long:
            return L"Long Integer";
        case OxJetType::Currency:
            return L"Currency";
        case OxJetType::Single:
            return L"Single";
        case OxJetType::Double:
            return L"Double";
        case OxJetType::DateTime:
            return L"Date/Time";
        case OxJetType::Binary:
            return L"Binary";
        case OxJetType::Text:
            return L"Text";
        case OxJetType::OleObject:
            return L"OLE Object";
        case OxJetType::Memo:
            return L"Memo";
        case OxJetType::ReplicationId:
            return L"Replication ID";
        case OxJetType::Numeric:
            return L"Decimal";
        case OxJetType::Complex:
            return L"Complex";
        case OxJetType::BigInt:
            return L"Large Number";
        case OxJetType::DateTimeExtended:
            return L"Date/Time Extended";
    }
    return L"Unknown";
}

const wchar_t* oxJetObjectKindName(OxJetObjectKind kind) {
    switch (kind) {
        case OxJetObjectKind::Table:
            return L"table";
        case OxJetObjectKind::SystemTable:
            return L"system table";
        case OxJetObjectKind::Query:
            return L"query";
        case OxJetObjectKind::LinkedTable:
            return L"linked table";
        case OxJetObjectKind::LinkedOdbcTable:
            return L"linked ODBC table";
    }
    return L"object";
}
