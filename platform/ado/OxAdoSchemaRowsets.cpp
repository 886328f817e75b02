#include "platform/ado/OxAdoSchemaRowsets.h"

#include "platform/core/OxText.h"

namespace {
using namespace OxAdo;

// The restriction at a position as text, empty when absent or empty.
std::wstring restriction(const std::vector<OxVariant>& r, size_t i) {
    if (i >= r.size() || r[i].isEmpty() || r[i].isNull())
        return {};
    OxVariant t;
    if (OxHr::failed(r[i].tryChangeType(VT_BSTR, t)))
        return {};
    return t.str();
}

bool passes(const std::wstring& wanted, const std::wstring& value) {
    return wanted.empty() || OxText::equalsNoCase(wanted, value);
}

OxVariant textOrNull(const std::wstring& s) {
    return s.empty() ? OxVariant::null() : OxVariant(s);
}

std::unique_ptr<OxAdoRowSource> tables(OxAdoSession& session, const std::vector<OxVariant>& r) {
    auto rows = std::make_unique<OxAdoMemoryRowSource>();
    for (const wchar_t* c : {L"TABLE_CATALOG", L"TABLE_SCHEMA", L"TABLE_NAME", L"TABLE_TYPE"})
        rows->addColumn(c, adVarWChar, 128);
    rows->addColumn(L"TABLE_GUID", adGUID, 16);
    rows->addColumn(L"DESCRIPTION", adVarWChar, 255);
    rows->addColumn(L"TABLE_PROPID", adUnsignedInt, 4);
    rows->addColumn(L"DATE_CREATED", adDate, 8);
    rows->addColumn(L"DATE_MODIFIED", adDate, 8);
    for (const auto& t : session.tables(restriction(r, 2), restriction(r, 3))) {
        if (!passes(restriction(r, 0), t.catalog) || !passes(restriction(r, 1), t.schema) ||
            !passes(restriction(r, 2), t.name) || !passes(restriction(r, 3), t.type))
            continue;
        rows->addRow({textOrNull(t.catalog), textOrNull(t.schema), OxVariant(t.name),
                      OxVariant(t.type), OxVariant::null(), textOrNull(t.description)});
    }
    return rows;
}

std::unique_ptr<OxAdoRowSource> indexes(OxAdoSession& session, const std::vector<OxVariant>& r) {
    auto rows = std::make_unique<OxAdoMemoryRowSource>();
    for (const wchar_t* c : {L"TABLE_CATALOG", L"TABLE_SCHEMA", L"TABLE_NAME", L"INDEX_CATALOG",
                             L"INDEX_SCHEMA", L"INDEX_NAME"})
        rows->addColumn(c, adVarWChar, 128);
    rows->addColumn(L"PRIMARY_KEY", adBoolean, 2);
    rows->addColumn(L"UNIQUE", adBoolean, 2);
    rows->addColumn(L"CLUSTERED", adBoolean, 2);
    rows->addColumn(L"TYPE", adUnsignedSmallInt, 2);
    rows->addColumn(L"FILL_FACTOR", adInteger, 4);
    rows->addColumn(L"INITIAL_SIZE", adInteger, 4);
    rows->addColumn(L"NULLS", adInteger, 4);
    rows->addColumn(L"SORT_BOOKMARKS", adBoolean, 2);
    rows->addColumn(L"AUTO_UPDATE", adBoolean, 2);
    rows->addColumn(L"NULL_COLLATION", adInteger, 4);
    rows->addColumn(L"ORDINAL_POSITION", adUnsignedInt, 4);
    rows->addColumn(L"COLUMN_NAME", adVarWChar, 128);
    rows->addColumn(L"COLUMN_GUID", adGUID, 16);
    rows->addColumn(L"COLUMN_PROPID", adUnsignedInt, 4);
    rows->addColumn(L"COLLATION", adSmallInt, 2);
    rows->addColumn(L"CARDINALITY", adUnsignedBigInt, 8);
    rows->addColumn(L"PAGES", adInteger, 4);
    rows->addColumn(L"FILTER_CONDITION", adVarWChar, 255);
    rows->addColumn(L"INTEGRATED", adBoolean, 2);
    const std::wstring table = restriction(r, 4);
    for (const auto& i : session.indexes(table)) {
        if (!passes(restriction(r, 0), i.catalog) || !passes(restriction(r, 1), i.schema) ||
            !passes(restriction(r, 2), i.indexName) || !passes(table, i.tableName))
            continue;
        std::vector<OxVariant> v = {
            textOrNull(i.catalog),   textOrNull(i.schema), OxVariant(i.tableName),
            textOrNull(i.catalog),   textOrNull(i.schema), OxVariant(i.indexName),
            OxVariant(i.primaryKey), OxVariant(i.unique),  OxVariant(i.clustered)};
        v.resize(16, OxVariant::null());  // TYPE to NULL_COLLATION are not known
        v.push_back(OxVariant(static_cast<uint32_t>(i.ordinal)));
        v.push_back(OxVariant(i.columnName));
        v.push_back(OxVariant::null());
        v.push_back(OxVariant::null());
        v.push_back(OxVariant(static_cast<int16_t>(i.descending ? 2 : 1)));
        rows->addRow(std::move(v));
    }
    return rows;
}

std::unique_ptr<OxAdoRowSource> columns(OxAdoSession& session, const std::vector<OxVariant>& r) {
    auto rows = std::make_unique<OxAdoMemoryRowSource>();
    for (const wchar_t* c : {L"TABLE_CATALOG", L"TABLE_SCHEMA", L"TABLE_NAME", L"COLUMN_NAME"})
        rows->addColumn(c, adVarWChar, 128);
    rows->addColumn(L"COLUMN_GUID", adGUID, 16);
    rows->addColumn(L"COLUMN_PROPID", adUnsignedInt, 4);
    rows->addColumn(L"ORDINAL_POSITION", adUnsignedInt, 4);
    rows->addColumn(L"COLUMN_HASDEFAULT", adBoolean, 2);
    rows->addColumn(L"COLUMN_DEFAULT", adVarWChar, 255);
    rows->addColumn(L"COLUMN_FLAGS", adUnsignedInt, 4);
    rows->addColumn(L"IS_NULLABLE", adBoolean, 2);
    rows->addColumn(L"DATA_TYPE", adUnsignedSmallInt, 2);
    rows->addColumn(L"TYPE_GUID", adGUID, 16);
    rows->addColumn(L"CHARACTER_MAXIMUM_LENGTH", adUnsignedInt, 4);
    rows->addColumn(L"CHARACTER_OCTET_LENGTH", adUnsignedInt, 4);
    rows->addColumn(L"NUMERIC_PRECISION", adUnsignedSmallInt, 2);
    rows->addColumn(L"NUMERIC_SCALE", adSmallInt, 2);
    std::vector<OxAdoTableInfo> tablesToList;
    const std::wstring table = restriction(r, 2);
    if (!table.empty())
        tablesToList.push_back({{}, {}, table, {}, {}});
    else
        tablesToList = session.tables({}, {});
    for (const auto& t : tablesToList) {
        if (!passes(restriction(r, 0), t.catalog) || !passes(restriction(r, 1), t.schema))
            continue;
        for (const auto& c : session.columns(t.name)) {
            if (!passes(restriction(r, 3), c.name))
                continue;
            const OxVariant* def = c.property(L"Default");
            const bool hasDefault = def && !def->isEmpty() && !def->isNull();
            OxVariant defText;
            if (hasDefault)
                (void)def->tryChangeType(VT_BSTR, defText);
            const bool text = isTextType(c.type) || isBinaryType(c.type);
            rows->addRow(
                {textOrNull(t.catalog), textOrNull(t.schema), OxVariant(t.name), OxVariant(c.name),
                 OxVariant::null(), OxVariant::null(), OxVariant(static_cast<uint32_t>(c.ordinal)),
                 OxVariant(hasDefault), hasDefault ? defText : OxVariant::null(),
                 OxVariant(uint32_t{0}), OxVariant((c.attributes & adColNullable) != 0),
                 OxVariant(static_cast<uint32_t>(c.type)).changedType(VT_UI2), OxVariant::null(),
                 text ? OxVariant(static_cast<uint32_t>(c.definedSize)) : OxVariant::null(),
                 text ? OxVariant(static_cast<uint32_t>(c.definedSize * 2)) : OxVariant::null(),
                 OxVariant(static_cast<uint32_t>(c.precision)).changedType(VT_UI2),
                 OxVariant(static_cast<int16_t>(c.numericScale))});
        }
    }
    return rows;
}

std::unique_ptr<OxAdoRowSource> primaryKeys(OxAdoSession& session,
                                            const std::vector<OxVariant>& r) {
    auto rows = std::make_unique<OxAdoMemoryRowSource>();
    for (const wchar_t* c : {L"TABLE_CATALOG", L"TABLE_SCHEMA", L"TABLE_NAME", L"COLUMN_NAME"})
        rows->addColumn(c, adVarWChar, 128);
    rows->addColumn(L"COLUMN_GUID", adGUID, 16);
    rows->addColumn(L"COLUMN_PROPID", adUnsignedInt, 4);
    rows->addColumn(L"ORDINAL", adUnsignedInt, 4);
    rows->addColumn(L"PK_NAME", adVarWChar, 128);
    const std::wstring table = restriction(r, 2);
    std::vector<std::wstring> names;
    if (!table.empty())
        names.push_back(table);
    else
        for (const auto& t : session.tables({}, L"TABLE")) names.push_back(t.name);
    for (const auto& name : names) {
        uint32_t ordinal = 0;
        for (const auto& column : session.primaryKey(name))
            rows->addRow({OxVariant::null(), OxVariant::null(), OxVariant(name), OxVariant(column),
                          OxVariant::null(), OxVariant::null(), OxVariant(++ordinal)});
    }
    return rows;
}

std::unique_ptr<OxAdoRowSource> procedures(OxAdoSession& session, const std::vector<OxVariant>& r) {
    auto rows = std::make_unique<OxAdoMemoryRowSource>();
    for (const wchar_t* c : {L"PROCEDURE_CATALOG", L"PROCEDURE_SCHEMA", L"PROCEDURE_NAME"})
        rows->addColumn(c, adVarWChar, 128);
    rows->addColumn(L"PROCEDURE_TYPE", adSmallInt, 2);
    rows->addColumn(L"PROCEDURE_DEFINITION", adLongVarWChar, 0);
    rows->addColumn(L"DESCRIPTION", adVarWChar, 255);
    rows->addColumn(L"DATE_CREATED", adDate, 8);
    rows->addColumn(L"DATE_MODIFIED", adDate, 8);
    for (const auto& p : session.procedures()) {
        if (!passes(restriction(r, 0), p.catalog) || !passes(restriction(r, 1), p.schema) ||
            !passes(restriction(r, 2), p.name))
            continue;
        rows->addRow({textOrNull(p.catalog), textOrNull(p.schema), OxVariant(p.name),
                      OxVariant(static_cast<int16_t>(p.type))});
    }
    return rows;
}
}  // namespace

std::unique_ptr<OxAdoRowSource> OxAdoSchemaRowsets::build(OxAdoSession& session, int schema,
                                                          const std::vector<OxVariant>& r) {
    switch (schema) {
        case adSchemaTables:
            return tables(session, r);
        case adSchemaIndexes:
            return indexes(session, r);
        case adSchemaColumns:
            return columns(session, r);
        case adSchemaPrimaryKeys:
            return primaryKeys(session, r);
        case adSchemaProcedures:
            return procedures(session, r);
        default:
            throw OxAdoProviderError(hresultOf(adErrFeatureNotAvailable),
                                     descriptionOf(adErrFeatureNotAvailable));
    }
}
