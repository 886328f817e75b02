#include "platform/ado/OxAdoRowWriter.h"

#include <algorithm>

#include "platform/ado/OxAdoConnection.h"
#include "platform/core/OxText.h"

namespace {
constexpr OxHResult kInsufficientKey = OxHr::E_FAIL;

[[noreturn]] void fail(OxHResult hr, const std::wstring& text) {
    throw OxComError(hr, text);
}

// Columns a WHERE clause can compare exactly: long values and bytes cannot be compared by
// every source, and reals and times may not survive the round trip to the last digit.
bool comparable(const OxAdoColumnInfo& c) {
    return !OxAdo::isLongType(c.type) && !OxAdo::isBinaryType(c.type);
}
bool exact(const OxAdoColumnInfo& c) {
    const uint16_t vt = OxAdo::variantTypeOf(c.type);
    return comparable(c) && vt != VT_R4 && vt != VT_R8 && vt != VT_DATE;
}
}  // namespace

OxAdoRowWriter::OxAdoRowWriter(OxAdoConnection& connection,
                               const std::vector<OxAdoColumnInfo>& columns,
                               std::map<std::wstring, std::vector<int>>& keyCache, int criteria)
    : m_connection(connection), m_columns(columns), m_keyCache(keyCache), m_criteria(criteria) {}

bool OxAdoRowWriter::isWritable(const OxAdoColumnInfo& column) {
    return !column.baseTable.empty() && !column.autoIncrement && !column.rowVersion;
}

std::wstring OxAdoRowWriter::tableKey(int column) const {
    const OxAdoColumnInfo& c = m_columns[static_cast<size_t>(column)];
    return OxText::toLower(c.baseSchema) + L"." + OxText::toLower(c.baseTable);
}

std::wstring OxAdoRowWriter::tableName(int column) const {
    const OxAdoColumnInfo& c = m_columns[static_cast<size_t>(column)];
    OxAdoSession& s = m_connection.session();
    return c.baseSchema.empty()
               ? s.quoteIdentifier(c.baseTable)
               : s.quoteIdentifier(c.baseSchema) + L"." + s.quoteIdentifier(c.baseTable);
}

// The one base table of the given columns.
std::wstring OxAdoRowWriter::tableOf(const std::vector<bool>& columns) const {
    std::wstring key;
    int first = -1;
    for (size_t i = 0; i < m_columns.size(); ++i) {
        if (i >= columns.size() || !columns[i])
            continue;
        if (!isWritable(m_columns[i]))
            fail(OxAdo::Hr::DB_E_ERRORSOCCURRED,
                 L"Multiple-step operation generated errors. Check each status value. (field " +
                     m_columns[i].name + L" cannot be written)");
        const std::wstring k = tableKey(static_cast<int>(i));
        if (first < 0) {
            first = static_cast<int>(i);
            key = k;
        } else if (k != key) {
            fail(kInsufficientKey,
                 L"Insufficient base table information for updating or "
                 L"refreshing: the changes span several tables.");
        }
    }
    return key;
}

std::vector<int> OxAdoRowWriter::keyColumns(const std::wstring& table, bool quiet) {
    const auto cached = m_keyCache.find(table);
    if (cached != m_keyCache.end())
        return cached->second;
    int sample = -1;
    for (size_t i = 0; i < m_columns.size(); ++i)
        if (!m_columns[i].baseTable.empty() && tableKey(static_cast<int>(i)) == table) {
            sample = static_cast<int>(i);
            break;
        }
    std::vector<int> key;
    if (sample >= 0) {
        const OxAdoColumnInfo& s = m_columns[static_cast<size_t>(sample)];
        std::vector<std::wstring> names;
        if (quiet) {
            try {
                names = m_connection.session().primaryKey(s.baseTable);
            } catch (...) {
                return {};  // asked again, loudly, when a row is written
            }
        } else {
            names =
                m_connection.call([&] { return m_connection.session().primaryKey(s.baseTable); });
        }
        for (const auto& name : names) {
            int found = -1;
            for (size_t i = 0; i < m_columns.size(); ++i)
                if (tableKey(static_cast<int>(i)) == table &&
                    OxText::equalsNoCase(m_columns[i].baseColumn, name)) {
                    found = static_cast<int>(i);
                    break;
                }
            if (found < 0) {
                key.clear();  // part of the key is not in the result
                break;
            }
            key.push_back(found);
        }
    }
    m_keyCache[table] = key;
    return key;
}

void OxAdoRowWriter::where(const std::wstring& table, const std::vector<OxVariant>& original,
                           const std::vector<bool>& changed, Statement& s, bool& keyless) {
    OxAdoSession& session = m_connection.session();
    const std::vector<int> key = keyColumns(table);
    keyless = key.empty();
    std::vector<int> cols = key;
    auto addColumn = [&](int i) {
        for (int k : cols)
            if (k == i)
                return;
        cols.push_back(i);
    };
    for (size_t i = 0; i < m_columns.size(); ++i) {
        const OxAdoColumnInfo& c = m_columns[i];
        if (c.baseTable.empty() || tableKey(static_cast<int>(i)) != table)
            continue;
        const bool isChanged = i < changed.size() && changed[i];
        if (keyless ? exact(c)
                    : (m_criteria == CriteriaAllCols && exact(c)) ||
                          (m_criteria == CriteriaUpdCols && isChanged && exact(c)))
            addColumn(static_cast<int>(i));
    }
    if (cols.empty())
        fail(kInsufficientKey, L"Insufficient key column information for updating or refreshing.");
    s.text += L" WHERE ";
    bool firstTerm = true;
    for (int i : cols) {
        const OxAdoColumnInfo& c = m_columns[static_cast<size_t>(i)];
        if (!firstTerm)
            s.text += L" AND ";
        firstTerm = false;
        s.text += session.quoteIdentifier(c.baseColumn);
        const OxVariant& v = original[static_cast<size_t>(i)];
        if (v.isNull() || v.isEmpty()) {
            s.text += L" IS NULL";
        } else {
            s.text += L" = ?";
            s.params.push_back({c.type, OxAdo::adParamInput, -1, v});
        }
    }
}

long OxAdoRowWriter::run(const Statement& s) {
    long affected = -1;
    OxAdoExecArgs args;
    args.wantRows = false;
    args.timeout = m_connection.commandTimeout();
    m_connection.call([&] { m_connection.session().execute(s.text, s.params, args, affected); });
    return affected;
}

void OxAdoRowWriter::checkSingleRow(const std::wstring& table, const Statement& whereClause) {
    Statement count;
    count.text = L"SELECT COUNT(*) FROM " + table + whereClause.text;
    count.params = whereClause.params;
    long unused = -1;
    OxAdoExecArgs args;
    args.timeout = m_connection.commandTimeout();
    std::vector<OxVariant> row;
    const bool got = m_connection.call([&] {
        auto rows = m_connection.session().execute(count.text, count.params, args, unused);
        return rows && rows->fetch(row);
    });
    OxVariant n;
    if (!got || row.empty() || OxHr::failed(row[0].tryChangeType(VT_I8, n)))
        fail(kInsufficientKey, L"Insufficient key column information for updating or refreshing.");
    if (n.llVal() == 0)
        fail(OxAdo::Hr::DB_E_CONCURRENCYVIOLATION,
             L"Row cannot be located for updating. Some values may have been changed since it "
             L"was last read.");
    if (n.llVal() > 1)
        fail(kInsufficientKey,
             L"Key column information is insufficient or incorrect. Too many rows would be "
             L"affected by the update.");
}

void OxAdoRowWriter::insert(std::vector<OxVariant>& values, const std::vector<bool>& set) {
    OxAdoSession& session = m_connection.session();
    std::wstring table = tableOf(set);
    int anchor = -1;
    for (size_t i = 0; i < m_columns.size(); ++i)
        if (!m_columns[i].baseTable.empty() &&
            (table.empty() || tableKey(static_cast<int>(i)) == table)) {
            anchor = static_cast<int>(i);
            break;
        }
    if (anchor < 0)
        fail(kInsufficientKey, L"Insufficient base table information for updating or refreshing.");
    table = tableKey(anchor);
    Statement s;
    s.text = L"INSERT INTO " + tableName(anchor);
    std::wstring names, marks;
    for (size_t i = 0; i < m_columns.size(); ++i) {
        if (i >= set.size() || !set[i])
            continue;
        if (!names.empty()) {
            names += L", ";
            marks += L", ";
        }
        names += session.quoteIdentifier(m_columns[i].baseColumn);
        marks += L"?";
        s.params.push_back({m_columns[i].type, OxAdo::adParamInput, -1, values[i]});
    }
    s.text += names.empty() ? L" DEFAULT VALUES" : L" (" + names + L") VALUES (" + marks + L")";
    run(s);
    // The values the source generated for the new row: its automatic numbers, and key
    // columns left unset (a row-id key), so that the row can be found again.
    const std::vector<int> key = keyColumns(table, true);
    for (size_t i = 0; i < m_columns.size(); ++i) {
        const OxAdoColumnInfo& c = m_columns[i];
        if (c.baseTable.empty() || tableKey(static_cast<int>(i)) != table)
            continue;
        const bool unsetKey = std::find(key.begin(), key.end(), static_cast<int>(i)) != key.end() &&
                              (i >= set.size() || !set[i]);
        if (!c.autoIncrement && !unsetKey)
            continue;
        OxVariant v = m_connection.call(
            [&] { return m_connection.session().lastInsertedValue(c.baseTable, c.baseColumn); });
        if (!v.isEmpty()) {
            OxVariant typed;
            values[i] =
                OxHr::failed(v.tryChangeType(OxAdo::variantTypeOf(c.type), typed)) ? v : typed;
        }
    }
}

void OxAdoRowWriter::update(const std::vector<OxVariant>& original,
                            const std::vector<OxVariant>& values,
                            const std::vector<bool>& changed) {
    OxAdoSession& session = m_connection.session();
    const std::wstring table = tableOf(changed);
    if (table.empty())
        return;  // nothing changed
    int anchor = -1;
    Statement s;
    std::wstring sets;
    for (size_t i = 0; i < m_columns.size(); ++i) {
        if (i >= changed.size() || !changed[i])
            continue;
        if (anchor < 0)
            anchor = static_cast<int>(i);
        if (!sets.empty())
            sets += L", ";
        sets += session.quoteIdentifier(m_columns[i].baseColumn) + L" = ?";
        s.params.push_back({m_columns[i].type, OxAdo::adParamInput, -1, values[i]});
    }
    const std::wstring name = tableName(anchor);
    s.text = L"UPDATE " + name + L" SET " + sets;
    Statement w;
    bool keyless = false;
    where(table, original, changed, w, keyless);
    if (keyless)
        checkSingleRow(name, w);
    s.text += w.text;
    s.params.insert(s.params.end(), w.params.begin(), w.params.end());
    if (run(s) == 0)
        fail(OxAdo::Hr::DB_E_CONCURRENCYVIOLATION,
             L"Row cannot be located for updating. Some values may have been changed since it "
             L"was last read.");
}

void OxAdoRowWriter::remove(const std::vector<OxVariant>& original) {
    // The row is deleted from the table of the first column that comes from one.
    int anchor = -1;
    for (size_t i = 0; i < m_columns.size(); ++i)
        if (isWritable(m_columns[i]) || !m_columns[i].baseTable.empty()) {
            anchor = static_cast<int>(i);
            break;
        }
    if (anchor < 0)
        fail(kInsufficientKey, L"Insufficient base table information for updating or refreshing.");
    const std::wstring name = tableName(anchor);
    Statement w;
    bool keyless = false;
    where(tableKey(anchor), original, {}, w, keyless);
    if (keyless)
        checkSingleRow(name, w);
    Statement s;
    s.text = L"DELETE FROM " + name + w.text;
    s.params = w.params;
    if (run(s) == 0)
        fail(OxAdo::Hr::DB_E_CONCURRENCYVIOLATION,
             L"Row cannot be located for deleting. Some values may have been changed since it "
             L"was last read.");
}
