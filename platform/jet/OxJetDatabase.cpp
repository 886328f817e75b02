#include "platform/jet/OxJetDatabase.h"

#include <algorithm>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/jet/OxJetError.h"
#include "platform/jet/OxJetTableDefReader.h"

namespace {
constexpr uint32_t kCatalogPage = 2;
constexpr uint32_t kSystemFlags = 0x80000002;
constexpr uint32_t kHiddenFlag = 0x8;
constexpr uint32_t kOneToOne = 0x1;
constexpr uint32_t kNotEnforced = 0x2;
constexpr uint32_t kCascadeUpdates = 0x100;
constexpr uint32_t kCascadeDeletes = 0x1000;
constexpr uint32_t kCascadeNulls = 0x2000;

enum RawType : int16_t { kTable = 1, kOdbcLinked = 4, kQuery = 5, kLinked = 6 };

std::wstring textOf(const OxJetValue& v) {
    return v.kind == OxJetValue::Text ? v.text : std::wstring();
}

int64_t integerOf(const OxJetValue& v) {
    switch (v.kind) {
        case OxJetValue::Byte:
            return v.byte;
        case OxJetValue::Integer:
            return v.integer;
        case OxJetValue::Long:
            return v.longValue;
        case OxJetValue::BigInt:
            return v.bigInt;
        default:
            return 0;
    }
}
}  // namespace

std::shared_ptr<OxJetDatabase> OxJetDatabase::open(const std::wstring& path,
                                                   const OxJetOpenOptions& options,
                                                   std::wstring& error) {
    try {
        return finishOpen(OxJetPageFile::openFile(OxText::toUtf8(path)), options);
    } catch (const OxJetError& e) {
        error = oxFormat(L"%s: %s", path, e.message());
    } catch (const std::bad_alloc&) {
        error = oxFormat(L"%s: out of memory while reading the catalog", path);
    }
    return nullptr;
}

std::shared_ptr<OxJetDatabase> OxJetDatabase::openBuffer(std::vector<uint8_t> bytes,
                                                         const OxJetOpenOptions& options,
                                                         std::wstring& error) {
    try {
        return finishOpen(OxJetPageFile::openBuffer(std::move(bytes)), options);
    } catch (const OxJetError& e) {
        error = e.message();
    } catch (const std::bad_alloc&) {
        error = L"out of memory while reading the catalog";
    }
    return nullptr;
}

std::shared_ptr<OxJetDatabase> OxJetDatabase::finishOpen(std::shared_ptr<OxJetPageFile> file,
                                                         const OxJetOpenOptions& options) {
    std::shared_ptr<OxJetDatabase> db(new OxJetDatabase());
    db->m_file = std::move(file);
    db->m_options = options;
    const OxJetHeader& h = db->m_file->header();
    db->m_codePage = options.codePage ? options.codePage : (h.codePage ? h.codePage : 1252);
    if (h.isJet3())
        OxJetText probe(db->m_codePage);  // an unknown code page fails here, not per row
    db->readCatalog();
    return db;
}

void OxJetDatabase::readCatalog() {
    std::shared_ptr<OxJetTableDef> def;
    try {
        def = std::make_shared<OxJetTableDef>(
            OxJetTableDefReader::read(*m_file, kCatalogPage, L"MSysObjects", m_codePage));
    } catch (const OxJetError& e) {
        throw OxJetError(L"the catalog cannot be read (the file is damaged or encrypted): " +
                         e.message());
    }
    const int id = def->columnIndex(L"Id");
    const int parent = def->columnIndex(L"ParentId");
    const int name = def->columnIndex(L"Name");
    const int type = def->columnIndex(L"Type");
    const int flags = def->columnIndex(L"Flags");
    const int database = def->columnIndex(L"Database");
    const int connect = def->columnIndex(L"Connect");
    const int foreign = def->columnIndex(L"ForeignName");
    const int props = def->columnIndex(L"LvProp");
    if (id < 0 || name < 0 || type < 0)
        throw OxJetError(L"the catalog lacks its Id, Name or Type column (damaged file)");
    std::vector<bool> wanted(def->columns.size(), false);
    for (int col : {id, parent, name, type, flags, database, connect, foreign})
        if (col >= 0)
            wanted[static_cast<size_t>(col)] = true;

    // A damaged catalog row hides an object: it fails the open unless the caller skips.
    OxJetRowCursor cursor(m_file, def, m_codePage, m_options.badRows);
    cursor.selectColumns(wanted);
    auto at = [&](int col) -> const OxJetValue& {
        static const OxJetValue null;
        return col < 0 ? null : cursor.value(static_cast<size_t>(col));
    };
    while (cursor.next()) {
        const int16_t raw = static_cast<int16_t>(integerOf(at(type)));
        OxJetCatalogEntry e;
        switch (raw) {
            case kTable:
                e.kind = OxJetObjectKind::Table;
                break;
            case kQuery:
                e.kind = OxJetObjectKind::Query;
                break;
            case kLinked:
                e.kind = OxJetObjectKind::LinkedTable;
                break;
            case kOdbcLinked:
                e.kind = OxJetObjectKind::LinkedOdbcTable;
                break;
            default:
                continue;  // forms, reports, containers, relationships
        }
        e.rawType = raw;
        e.id = static_cast<int32_t>(integerOf(at(id)));
        e.parentId = static_cast<int32_t>(integerOf(at(parent)));
        e.name = textOf(at(name));
        e.flags = static_cast<uint32_t>(integerOf(at(flags)));
        e.hidden = (e.flags & kHiddenFlag) != 0;
        if (e.kind == OxJetObjectKind::Table) {
            e.definitionPage = static_cast<uint32_t>(e.id) & 0x00FFFFFF;
            if (e.flags & kSystemFlags)
                e.kind = OxJetObjectKind::SystemTable;
        }
        e.linkedDatabase = textOf(at(database));
        e.connect = textOf(at(connect));
        e.foreignName = textOf(at(foreign));
        m_catalog.push_back(std::move(e));
    }
    if (cursor.failed())
        throw OxJetError(L"the catalog cannot be read: " + cursor.error());
    m_catalogSkipped = cursor.skippedRows() + cursor.skippedPages();
    m_catalogSkipReason = cursor.firstSkipReason();
    if (props >= 0)
        readProperties(def, id, props);
}

// The stored properties in a pass of their own: a damaged property value costs the
// properties (defaults, Required), not the object.
void OxJetDatabase::readProperties(std::shared_ptr<const OxJetTableDef> def, int id, int props) {
    std::vector<bool> wanted(def->columns.size(), false);
    wanted[static_cast<size_t>(id)] = wanted[static_cast<size_t>(props)] = true;
    OxJetRowCursor cursor(m_file, std::move(def), m_codePage, OxJetBadRows::Skip);
    cursor.selectColumns(wanted);
    while (cursor.next()) {
        const OxJetValue& blob = cursor.value(static_cast<size_t>(props));
        if (blob.kind != OxJetValue::Binary)
            continue;
        const int32_t objectId = static_cast<int32_t>(integerOf(cursor.value(size_t(id))));
        for (OxJetCatalogEntry& e : m_catalog)
            if (e.id == objectId)
                e.propertyBlob = blob.bytes;
    }
    if (cursor.skippedRows() + cursor.skippedPages() == 0 && !cursor.failed())
        return;
    // The pass cannot tell whose properties were lost: every table without any is told.
    const std::wstring why = cursor.failed() ? cursor.error() : cursor.firstSkipReason();
    for (OxJetCatalogEntry& e : m_catalog)
        if (e.propertyBlob.empty())
            e.propertyError = L"its stored properties may be lost: " + why;
}

const OxJetCatalogEntry* OxJetDatabase::find(std::wstring_view name) const {
    const OxJetCatalogEntry* query = nullptr;
    for (const OxJetCatalogEntry& e : m_catalog) {
        if (!OxText::equalsNoCase(e.name, name))
            continue;
        if (e.kind != OxJetObjectKind::Query)
            return &e;
        if (!query)
            query = &e;
    }
    return query;
}

std::shared_ptr<const OxJetTableDef> OxJetDatabase::tableDef(const OxJetCatalogEntry& entry,
                                                             std::wstring& error) const {
    switch (entry.kind) {
        case OxJetObjectKind::Query:
            error = oxFormat(L"%s is a saved query, not a table", entry.name);
            return nullptr;
        case OxJetObjectKind::LinkedTable:
        case OxJetObjectKind::LinkedOdbcTable:
            error = oxFormat(L"%s is a linked table (%s in %s); open its own file to read it",
                             entry.name, entry.foreignName,
                             entry.linkedDatabase.empty() ? entry.connect : entry.linkedDatabase);
            return nullptr;
        default:
            break;
    }
    try {
        auto def = std::make_shared<OxJetTableDef>(
            OxJetTableDefReader::read(*m_file, entry.definitionPage, entry.name, m_codePage));
        def->propertyError = entry.propertyError;
        try {
            OxJetTableDefReader::applyProperties(*def, entry.propertyBlob, header().isJet3(),
                                                 m_codePage);
        } catch (const OxJetError& e) {
            def->propertyError = e.message();  // the data stays readable without them
        }
        return def;
    } catch (const OxJetError& e) {
        error = oxFormat(L"table %s: %s", entry.name, e.message());
    } catch (const std::bad_alloc&) {
        error = oxFormat(L"table %s: out of memory reading its definition", entry.name);
    }
    return nullptr;
}

std::shared_ptr<const OxJetTableDef> OxJetDatabase::tableDef(std::wstring_view name,
                                                             std::wstring& error) const {
    const OxJetCatalogEntry* e = find(name);
    if (!e) {
        error = oxFormat(L"no table or query named %s", std::wstring(name));
        return nullptr;
    }
    return tableDef(*e, error);
}

bool OxJetDatabase::relationships(std::vector<OxJetRelationship>& out, std::wstring& error) const {
    out.clear();
    const OxJetCatalogEntry* entry = find(L"MSysRelationships");
    if (!entry || entry->kind != OxJetObjectKind::SystemTable)
        return true;
    auto def = tableDef(*entry, error);
    if (!def)
        return false;
    const int name = def->columnIndex(L"szRelationship");
    const int flags = def->columnIndex(L"grbit");
    const int position = def->columnIndex(L"icolumn");
    const int table = def->columnIndex(L"szObject");
    const int column = def->columnIndex(L"szColumn");
    const int referenced = def->columnIndex(L"szReferencedObject");
    const int referencedColumn = def->columnIndex(L"szReferencedColumn");
    if (name < 0 || table < 0 || column < 0 || referenced < 0 || referencedColumn < 0) {
        error = L"MSysRelationships lacks the columns of a relationship (damaged file)";
        return false;
    }
    // One row per column pair; a relationship's rows share its name.
    struct Part {
        int64_t position;
        std::wstring column, referenced;
    };
    std::vector<std::vector<Part>> parts;
    auto cursor = openCursor(def);
    auto text = [&](int col) { return textOf(cursor->value(static_cast<size_t>(col))); };
    while (cursor->next()) {
        const std::wstring relName = text(name);
        auto it = std::find_if(out.begin(), out.end(),
                               [&](const OxJetRelationship& r) { return r.name == relName; });
        if (it == out.end()) {
            OxJetRelationship r;
            r.name = relName;
            r.table = text(table);
            r.referencedTable = text(referenced);
            if (flags >= 0)
                r.flags = static_cast<uint32_t>(integerOf(cursor->value(size_t(flags))));
            r.enforced = !(r.flags & kNotEnforced);
            r.oneToOne = (r.flags & kOneToOne) != 0;
            r.cascadeUpdates = (r.flags & kCascadeUpdates) != 0;
            r.cascadeDeletes = (r.flags & kCascadeDeletes) != 0;
            r.cascadeNulls = (r.flags & kCascadeNulls) != 0;
            out.push_back(std::move(r));
            parts.emplace_back();
            it = out.end() - 1;
        }
        parts[size_t(it - out.begin())].push_back(
            {position >= 0 ? integerOf(cursor->value(size_t(position))) : 0, text(column),
             text(referencedColumn)});
    }
    if (cursor->failed()) {
        error = cursor->error();
        out.clear();
        return false;
    }
    for (size_t i = 0; i < out.size(); ++i) {
        std::stable_sort(parts[i].begin(), parts[i].end(),
                         [](const Part& a, const Part& b) { return a.position < b.position; });
        for (auto& p : parts[i])
            out[i].columns.emplace_back(std::move(p.column), std::move(p.referenced));
    }
    return true;
}

std::unique_ptr<OxJetRowCursor> OxJetDatabase::openCursor(
    std::shared_ptr<const OxJetTableDef> table) const {
    if (!table)
        return nullptr;
    return std::make_unique<OxJetRowCursor>(m_file, std::move(table), m_codePage,
                                            m_options.badRows);
}
