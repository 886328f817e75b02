// "oxqel dump" for Access files: the table list, one table's schema, or its rows as CSV
// or JSON.
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "OxqelCommand.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/jet/OxJetDatabase.h"

namespace {
class Out {
public:
    ~Out() { flush(); }
    void add(std::wstring_view text) { OxText::appendUtf8(m_buffer, text); }
    void add(const std::string& text) { m_buffer += text; }
    void add(char c) { m_buffer.push_back(c); }
    void line(std::wstring_view text) {
        add(text);
        add('\n');
    }
    void maybeFlush() {
        if (m_buffer.size() > (1u << 16))
            flush();
    }
    void flush() {
        std::fwrite(m_buffer.data(), 1, m_buffer.size(), stdout);
        m_buffer.clear();
    }

private:
    std::string m_buffer;
};

int fail(const std::wstring& message) {
    return oxqelFail(OxText::toUtf8(message));
}

std::wstring columnType(const OxJetColumn& c) {
    std::wstring t = oxJetTypeName(c.type);
    if (c.type == uint8_t(OxJetType::Text))
        t += oxFormat(L"(%u)", c.size);
    else if (c.type == uint8_t(OxJetType::Numeric))
        t += oxFormat(L"(%u,%u)", c.precision, c.scale);
    return t;
}

int listTables(const OxJetDatabase& db, bool system) {
    Out out;
    out.line(L"name\tkind\trows\tcolumns\ttarget");
    for (const OxJetCatalogEntry& e : db.catalog()) {
        if (e.kind == OxJetObjectKind::SystemTable && !system)
            continue;
        std::wstring rows = L"-", columns = L"-", target;
        if (e.kind == OxJetObjectKind::Table || e.kind == OxJetObjectKind::SystemTable) {
            std::wstring error;
            if (auto def = db.tableDef(e, error)) {
                // Counted, not the stored counter, which files not closed cleanly leave stale.
                auto cursor = db.openCursor(def);
                cursor->selectColumns(std::vector<bool>(def->columns.size(), false));
                while (cursor->next()) {
                }
                rows = cursor->failed() ? L"?" : std::to_wstring(cursor->rowsRead());
                if (cursor->failed())
                    std::fprintf(stderr, "oxqel: %s\n", OxText::toUtf8(cursor->error()).c_str());
                columns = std::to_wstring(def->columns.size());
            } else {
                std::fprintf(stderr, "oxqel: %s\n", OxText::toUtf8(error).c_str());
                rows = columns = L"?";
            }
        } else if (e.kind == OxJetObjectKind::LinkedTable) {
            target = e.foreignName + L" in " + e.linkedDatabase;
        } else if (e.kind == OxJetObjectKind::LinkedOdbcTable) {
            target = e.foreignName + L" via " + e.connect;
        }
        out.line(oxFormat(L"%s\t%s\t%s\t%s\t%s", e.name, oxJetObjectKindName(e.kind), rows, columns,
                          target));
    }
    return 0;
}

std::wstring columnList(const std::vector<std::pair<std::wstring, std::wstring>>& pairs,
                        bool referenced) {
    std::wstring out;
    for (const auto& p : pairs)
        out += (out.empty() ? L"" : L", ") + (referenced ? p.second : p.first);
    return out;
}

int printSchema(const OxJetDatabase& db, const OxJetTableDef& def) {
    Out out;
    out.line(L"table " + def.name);
    out.line(L"columns:");
    for (const OxJetColumn& c : def.columns) {
        std::wstring line = L"  " + c.name + L"\t" + columnType(c);
        if (c.required)
            line += L" NOT NULL";
        if (c.autoNumber || c.autoGuid)
            line += L" AUTONUMBER";
        if (c.defaultValue)
            line += L" DEFAULT " + *c.defaultValue;
        if (!c.supported)
            line += L" (unsupported: " + c.unsupportedReason + L")";
        out.line(line);
    }
    out.line(L"indexes:");
    for (const OxJetIndex& ix : def.indexes) {
        std::wstring line = L"  " + ix.name + L" (";
        for (size_t k = 0; k < ix.columns.size(); ++k) {
            if (k)
                line += L", ";
            line += def.columns[ix.columns[k].column].name;
            if (ix.columns[k].descending)
                line += L" DESC";
        }
        line += L")";
        if (ix.primary)
            line += L" PRIMARY KEY";
        else if (ix.unique)
            line += L" UNIQUE";
        if (ix.foreignKey)
            line += L" FOREIGN KEY";
        out.line(line);
    }
    std::vector<OxJetRelationship> relationships;
    std::wstring error;
    if (!db.relationships(relationships, error))
        std::fprintf(stderr, "oxqel: relationships not read: %s\n", OxText::toUtf8(error).c_str());
    bool header = false;
    for (const auto& r : relationships) {
        if (!OxText::equalsNoCase(r.table, def.name))
            continue;
        if (!header)
            out.line(L"foreign keys:");
        header = true;
        std::wstring line =
            oxFormat(L"  %s (%s) REFERENCES %s (%s)", r.name, columnList(r.columns, false),
                     r.referencedTable, columnList(r.columns, true));
        if (r.cascadeUpdates)
            line += L" ON UPDATE CASCADE";
        if (r.cascadeDeletes)
            line += L" ON DELETE CASCADE";
        if (r.cascadeNulls)
            line += L" ON DELETE SET NULL";
        if (!r.enforced)
            line += L" NOT ENFORCED";
        out.line(line);
    }
    if (!def.propertyError.empty())
        std::fprintf(stderr, "oxqel: properties of %s not read: %s\n",
                     OxText::toUtf8(def.name).c_str(), OxText::toUtf8(def.propertyError).c_str());
    return 0;
}

void csvField(std::wstring& line, const std::wstring& text, bool quote) {
    if (!quote && text.find_first_of(L",\"\r\n") == std::wstring::npos) {
        line += text;
        return;
    }
    line.push_back(L'"');
    for (wchar_t c : text) {
        if (c == L'"')
            line.push_back(L'"');
        line.push_back(c);
    }
    line.push_back(L'"');
}

void jsonString(std::wstring& line, const std::wstring& text) {
    line.push_back(L'"');
    for (wchar_t c : text) {
        switch (c) {
            case L'"':
                line += L"\\\"";
                break;
            case L'\\':
                line += L"\\\\";
                break;
            case L'\n':
                line += L"\\n";
                break;
            case L'\r':
                line += L"\\r";
                break;
            case L'\t':
                line += L"\\t";
                break;
            default:
                if (c < 0x20)
                    line += oxFormat(L"\\u%04x", static_cast<unsigned>(c));
                else
                    line.push_back(c);
        }
    }
    line.push_back(L'"');
}

bool isNumber(const OxJetValue& v) {
    switch (v.kind) {
        case OxJetValue::Byte:
        case OxJetValue::Integer:
        case OxJetValue::Long:
        case OxJetValue::BigInt:
        case OxJetValue::Currency:
        case OxJetValue::Decimal:
            return true;
        case OxJetValue::Single:
            return std::isfinite(v.single);
        case OxJetValue::Double:
            return std::isfinite(v.real);
        default:
            return false;
    }
}

int printRows(const OxJetDatabase& db, std::shared_ptr<const OxJetTableDef> def, bool json) {
    for (const OxJetColumn& c : def->columns)
        if (!c.supported)
            std::fprintf(stderr,
                         "oxqel: column %s has an unsupported type (%s); its values are "
                         "left empty\n",
                         OxText::toUtf8(c.name).c_str(),
                         OxText::toUtf8(c.unsupportedReason).c_str());
    auto cursor = db.openCursor(def);
    Out out;
    std::wstring line, text;
    if (!json) {
        for (size_t i = 0; i < def->columns.size(); ++i) {
            if (i)
                line.push_back(L',');
            csvField(line, def->columns[i].name, false);
        }
        out.line(line);
    } else {
        out.add('[');
    }
    bool first = true;
    while (cursor->next()) {
        line.clear();
        if (json)
            line += first ? L"\n{" : L",\n{";
        first = false;
        for (size_t i = 0; i < def->columns.size(); ++i) {
            const OxJetValue& v = cursor->value(i);
            if (json) {
                if (i)
                    line.push_back(L',');
                jsonString(line, def->columns[i].name);
                line.push_back(L':');
                if (v.isNull() || v.kind == OxJetValue::Unsupported) {
                    line += L"null";
                } else if (v.kind == OxJetValue::Boolean) {
                    line += v.boolean ? L"true" : L"false";
                } else if (isNumber(v)) {
                    v.appendText(line);
                } else {
                    text.clear();
                    v.appendText(text);
                    jsonString(line, text);
                }
            } else {
                if (i)
                    line.push_back(L',');
                if (v.isNull() || v.kind == OxJetValue::Unsupported)
                    continue;
                text.clear();
                v.appendText(text);
                // Text is always quoted, so that an empty text differs from NULL.
                csvField(line, text, v.kind == OxJetValue::Text);
            }
        }
        if (json)
            line.push_back(L'}');
        else
            line.push_back(L'\n');
        out.add(line);
        out.maybeFlush();
    }
    if (json)
        out.add(first ? "]\n" : "\n]\n");
    out.flush();
    if (cursor->failed())
        return fail(cursor->error());
    if (cursor->strayPages())
        std::fprintf(stderr,
                     "oxqel: warning: %llu pages marked as %s's hold none of its rows (stale "
                     "map or damaged file)\n",
                     static_cast<unsigned long long>(cursor->strayPages()),
                     OxText::toUtf8(def->name).c_str());
    if (cursor->skippedRows() || cursor->skippedPages()) {
        fail(oxFormat(
            L"%u rows and %u pages of %s could not be read and were skipped (first: "
            L"%s)",
            cursor->skippedRows(), cursor->skippedPages(), def->name, cursor->firstSkipReason()));
        return 2;
    }
    return 0;
}

int runDumpAccess(const OxqelArgs& input) {
    OxqelArgs args = input;
    const std::string path = args[0];
    args.erase(args.begin());
    const bool schema = oxqelTakeFlag(args, "--schema");
    const bool json = oxqelTakeFlag(args, "--json");
    const bool csv = oxqelTakeFlag(args, "--csv");
    const bool system = oxqelTakeFlag(args, "--system");
    OxJetOpenOptions options;
    if (oxqelTakeFlag(args, "--skip-bad-rows"))
        options.badRows = OxJetBadRows::Skip;
    const std::string codePage = oxqelTakeOption(args, "--codepage");
    if (!codePage.empty()) {
        char* end = nullptr;
        const unsigned long cp = std::strtoul(codePage.c_str(), &end, 10);
        if (!end || *end || cp == 0 || cp > 65535)
            return oxqelFail("dump: --codepage takes a Windows code page number (936, 1252, ...)");
        options.codePage = static_cast<uint16_t>(cp);
    }
    if (args.size() > 1 || (!args.empty() && args[0].rfind("--", 0) == 0))
        return oxqelFail("dump: unexpected argument " + args.back());
    if ((schema ? 1 : 0) + (json ? 1 : 0) + (csv ? 1 : 0) > 1)
        return oxqelFail("dump: choose one of --schema, --csv and --json");

    std::wstring error;
    auto db = OxJetDatabase::open(OxText::fromUtf8(path), options, error);
    if (!db)
        return fail(error);
    if (db->catalogSkipped())
        std::fprintf(stderr, "oxqel: warning: %llu damaged catalog entries skipped (first: %s)\n",
                     static_cast<unsigned long long>(db->catalogSkipped()),
                     OxText::toUtf8(db->catalogSkipReason()).c_str());
    if (args.empty()) {
        if (schema || json || csv)
            return oxqelFail("dump: name a table to print");
        return listTables(*db, system);
    }
    auto def = db->tableDef(OxText::fromUtf8(args[0]), error);
    if (!def)
        return fail(error);
    if (schema)
        return printSchema(*db, *def);
    return printRows(*db, def, json);
}

bool handlesAccess(OxFileInfo::OxFileType type, const std::string&) {
    return type == OxFileInfo::FileAccessJet || type == OxFileInfo::FileAccessAce;
}

const OxqelRegisterDump registerAccess({"access", handlesAccess, runDumpAccess});
}  // namespace
