#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelRecordsetSQLite"

#include "OxQelLib/sqlite/OxQelRecordsetSQLite.h"

#include <sqlite3.h>

#include <map>
#include <set>

#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "OxQelLib/sqlite/OxQelSQLiteRowStore.h"
#include "OxQelLib/sqlite/OxQelSQLiteStatement.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

OX_IMPLEMENT_DYNAMIC(OxQelRecordsetSQLite, OxQelIEditRecordset)

using Cell = OxQelSQLiteRowStore::Cell;

struct OxQelRecordsetSQLite::Impl {
    struct Edit {
        long row;
        long column;
        int kind;  // 1: a field change, the only kind there is
        Cell value;
    };

    OxQelSQLiteRowStore rows;
    std::vector<Edit> pending;
    // Per table, the name that reaches its rowid (empty when it has none).
    std::map<std::wstring, std::wstring> rowidNames;
};

namespace {
std::wstring columnName(const char* name) {
    return name ? OxText::fromUtf8(name) : std::wstring();
}
}  // namespace

OxQelRecordsetSQLite::OxQelRecordsetSQLite() : m_impl(std::make_unique<Impl>()) {}

OxQelRecordsetSQLite::~OxQelRecordsetSQLite() {
    close();
}

// ---------------------------------------------------------------- opening

bool OxQelRecordsetSQLite::openSQL(OxQelIConnection* connection, const std::wstring& statement) {
    return OXQEL_SQLITE_GUARDED(L"OxQelRecordsetSQLite::openSQL", [&] {
        if (m_connection)
            close();
        OxQelConnectionSQLite* sqlite = OxQelConnectionSQLite::cast(connection);
        if (!sqlite || !sqlite->isOpen() || !sqlite->getHandle())
            return false;
        m_connection = sqlite;
        if (executeAndLoad(statement))
            return true;
        close();
        return false;
    });
}

bool OxQelRecordsetSQLite::executeAndLoad(const std::wstring& statement) {
    sqlite3* db = m_connection->getHandle();
    auto report = [&](int rc) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc), L"OxQelRecordsetSQLite::executeAndLoad",
                     oxFormat(L"%s\n%s", statement, OxQelSQLiteStatement::errorMessage(db)));
    };
    OxQelSQLiteStatement stmt;
    int rc = stmt.prepare(db, statement);
    if (rc != SQLITE_OK) {
        report(rc);
        return false;
    }
    const int columns = stmt ? sqlite3_column_count(stmt.get()) : 0;
    m_fieldDefs.assign(static_cast<size_t>(columns), OxQelFieldDef());
    m_columnTables.assign(static_cast<size_t>(columns), std::wstring());
    m_columnOrigins.assign(static_cast<size_t>(columns), std::wstring());
    for (int i = 0; i < columns; ++i) {
        const auto c = static_cast<size_t>(i);
        m_fieldDefs[c].setFieldName(columnName(sqlite3_column_name(stmt.get(), i)));
        m_columnTables[c] = columnName(sqlite3_column_table_name(stmt.get(), i));
        m_columnOrigins[c] = columnName(sqlite3_column_origin_name(stmt.get(), i));
    }
    fillFieldDefs();

    OxQelSQLiteRowStore& rows = m_impl->rows;
    rows.reset(columns, m_connection->isUtf16());
    if (stmt) {
        while ((rc = stmt.step()) == SQLITE_ROW) rows.appendRow(stmt.get());
        // A result cut short (a damaged page, a lock never released) is a failure, not a
        // shorter result.
        if (rc != SQLITE_DONE) {
            report(rc);
            return false;
        }
    }
    m_currentRow = 0;
    return true;
}

void OxQelRecordsetSQLite::fillFieldDefs() {
    std::map<std::wstring, std::vector<size_t>> columnsByTable;
    for (size_t i = 0; i < m_columnTables.size(); ++i)
        if (!m_columnTables[i].empty())
            columnsByTable[m_columnTables[i]].push_back(i);
    for (const auto& [table, columns] : columnsByTable) {
        OxQelFieldDefArray fields;
        m_connection->getFieldDef(table, L"*", fields);
        // Matched by the column's name in its table, so aliased columns get their type
        // and a name shared by two tables gets each table's definition.
        for (size_t i : columns) {
            const int found = fields.getIndex(m_columnOrigins[i]);
            if (found < 0)
                continue;
            const std::wstring name = m_fieldDefs[i].getFieldName();
            m_fieldDefs[i] = fields[static_cast<size_t>(found)];
            m_fieldDefs[i].setFieldName(name);
        }
    }
}

void OxQelRecordsetSQLite::close() {
    m_connection = nullptr;
    m_columnTables.clear();
    m_columnOrigins.clear();
    m_fieldDefs.clear();
    m_impl->rows.reset(0, false);
    m_impl->pending.clear();
    m_impl->rowidNames.clear();
    m_currentRow = -1;
}

// ---------------------------------------------------------------- navigation

bool OxQelRecordsetSQLite::getEOF() {
    return m_currentRow == getRecordCount();
}

bool OxQelRecordsetSQLite::getBOF() {
    return m_currentRow < 0;
}

long OxQelRecordsetSQLite::getRecordCount() {
    return static_cast<long>(m_impl->rows.rowCount());
}

bool OxQelRecordsetSQLite::move(long rows) {
    const long target = m_currentRow + rows;
    if (target < 0 || target >= getRecordCount())
        return false;
    m_currentRow = target;
    return true;
}

bool OxQelRecordsetSQLite::moveFirst() {
    m_currentRow = 0;
    return true;
}

bool OxQelRecordsetSQLite::movePrevious() {
    --m_currentRow;
    return m_currentRow >= 0;
}

bool OxQelRecordsetSQLite::moveNext() {
    ++m_currentRow;
    return m_currentRow < getRecordCount();
}

bool OxQelRecordsetSQLite::moveLast() {
    m_currentRow = getRecordCount() - 1;
    return true;
}

// ---------------------------------------------------------------- reading

bool OxQelRecordsetSQLite::inRows(long row) const {
    return row >= 0 && static_cast<size_t>(row) < m_impl->rows.rowCount();
}

bool OxQelRecordsetSQLite::inColumns(long column) const {
    return column >= 0 && static_cast<size_t>(column) < m_fieldDefs.size();
}

long OxQelRecordsetSQLite::findFieldIndex(const std::wstring& name) const {
    return m_fieldDefs.getIndex(name);
}

template <class T, class Convert>
bool OxQelRecordsetSQLite::readField(long index, T& value, Convert convert) {
    if (!inRows(m_currentRow) || !inColumns(index))
        return false;
    return convert(getlFieldValue(index), value);
}

template <class T, class Convert>
bool OxQelRecordsetSQLite::readField(const std::wstring& name, T& value, Convert convert) {
    const long index = findFieldIndex(name);
    if (index < 0)
        return false;
    convert(getlFieldValue(index), value);
    return true;
}

bool OxQelRecordsetSQLite::getField(long index, std::wstring& value) {
    return readField(index, value, OxQel::Util::tryVariantToString);
}
bool OxQelRecordsetSQLite::getField(long index, double& value) {
    return readField(index, value, OxQel::Util::tryVariantToDouble);
}
bool OxQelRecordsetSQLite::getField(long index, long& value) {
    return readField(index, value, OxQel::Util::tryVariantToLong);
}
bool OxQelRecordsetSQLite::getField(long index, bool& value) {
    return readField(index, value, OxQel::Util::tryVariantToBool);
}
bool OxQelRecordsetSQLite::getField(const std::wstring& name, std::wstring& value) {
    return readField(name, value, OxQel::Util::tryVariantToString);
}
bool OxQelRecordsetSQLite::getField(const std::wstring& name, double& value) {
    return readField(name, value, OxQel::Util::tryVariantToDouble);
}
bool OxQelRecordsetSQLite::getField(const std::wstring& name, long& value) {
    return readField(name, value, OxQel::Util::tryVariantToLong);
}
bool OxQelRecordsetSQLite::getField(const std::wstring& name, bool& value) {
    return readField(name, value, OxQel::Util::tryVariantToBool);
}

OxVariant OxQelRecordsetSQLite::getlFieldValue(long index) {
    if (!inRows(m_currentRow) || !inColumns(index))
        return OxVariant();
    return OXQEL_SQLITE_GUARDED(L"OxQelRecordsetSQLite::getlFieldValue", [&] {
        return m_impl->rows.value(static_cast<size_t>(m_currentRow), static_cast<int>(index));
    });
}

OxVariant OxQelRecordsetSQLite::getszFieldValue(const std::wstring& name) {
    return getlFieldValue(findFieldIndex(name));
}

OxVariant OxQelRecordsetSQLite::getvarFieldValue(const OxVariant& column) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return getszFieldValue(name);
}

std::wstring OxQelRecordsetSQLite::getlFieldString(long index) {
    std::wstring value;
    return getField(index, value) ? value : std::wstring();
}

std::wstring OxQelRecordsetSQLite::getszFieldString(const std::wstring& name) {
    std::wstring value;
    return getField(name, value) ? value : std::wstring();
}

std::wstring OxQelRecordsetSQLite::getvarFieldString(const OxVariant& column) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return getszFieldString(name);
}

bool OxQelRecordsetSQLite::getFieldDef(const OxVariant& column, OxQelFieldDef& definition) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return getFieldDef(name, definition);
}

bool OxQelRecordsetSQLite::getFieldDef(const std::wstring& name, OxQelFieldDef& definition) {
    return getFieldDef(findFieldIndex(name), definition);
}

bool OxQelRecordsetSQLite::getFieldDef(long index, OxQelFieldDef& definition) {
    if (!inColumns(index))
        return false;
    definition = m_fieldDefs[static_cast<size_t>(index)];
    return true;
}

bool OxQelRecordsetSQLite::getFieldDef(OxQelFieldDefArray& definitions) {
    definitions = m_fieldDefs;
    return true;
}

long OxQelRecordsetSQLite::getFieldCount() {
    return static_cast<long>(m_fieldDefs.size());
}

std::wstring OxQelRecordsetSQLite::getFieldName(long index) {
    return inColumns(index) ? m_fieldDefs[static_cast<size_t>(index)].getFieldName()
                            : std::wstring();
}

OxQel::FieldType OxQelRecordsetSQLite::getFieldType(long index) {
    return inColumns(index) ? m_fieldDefs[static_cast<size_t>(index)].getFieldType()
                            : OxQel::Unknown;
}

OxQel::FieldType OxQelRecordsetSQLite::getFieldType(const std::wstring& name) {
    return getFieldType(findFieldIndex(name));
}

OxQel::FieldType OxQelRecordsetSQLite::getFieldType(const OxVariant& column) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return getFieldType(name);
}

int OxQelRecordsetSQLite::getFieldSize(long) {
    return -1;
}
int OxQelRecordsetSQLite::getFieldSize(const std::wstring&) {
    return -1;
}
int OxQelRecordsetSQLite::getFieldSize(const OxVariant&) {
    return -1;
}

bool OxQelRecordsetSQLite::isFieldNull(long index) {
    return inRows(m_currentRow) && inColumns(index) &&
           m_impl->rows.cell(static_cast<size_t>(m_currentRow), static_cast<int>(index)).kind ==
               OxQelSQLiteKind::Null;
}

bool OxQelRecordsetSQLite::isFieldNull(const std::wstring& name) {
    return isFieldNull(findFieldIndex(name));
}

bool OxQelRecordsetSQLite::isFieldNull(const OxVariant& column) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return isFieldNull(name);
}

// ---------------------------------------------------------------- editing

bool OxQelRecordsetSQLite::setField(long index, const OxVariant& value) {
    return inColumns(index) && setlFieldValue(index, value);
}
bool OxQelRecordsetSQLite::setField(long index, const std::wstring& value) {
    return inColumns(index) && setlFieldValue(index, OxVariant(value));
}
bool OxQelRecordsetSQLite::setField(long index, double value) {
    return inColumns(index) && setlFieldValue(index, OxVariant(value));
}
bool OxQelRecordsetSQLite::setField(long index, long value) {
    return inColumns(index) && setlFieldValue(index, OxVariant::fromInteger(value));
}
bool OxQelRecordsetSQLite::setField(long index, int value) {
    return inColumns(index) && setlFieldValue(index, OxVariant::fromInt(value));
}
bool OxQelRecordsetSQLite::setField(const std::wstring& name, const OxVariant& value) {
    return setlFieldValue(findFieldIndex(name), value);
}
bool OxQelRecordsetSQLite::setField(const std::wstring& name, const std::wstring& value) {
    return setlFieldValue(findFieldIndex(name), OxVariant(value));
}
bool OxQelRecordsetSQLite::setField(const std::wstring& name, double value) {
    return setlFieldValue(findFieldIndex(name), OxVariant(value));
}
bool OxQelRecordsetSQLite::setField(const std::wstring& name, long value) {
    return setlFieldValue(findFieldIndex(name), OxVariant::fromInteger(value));
}
bool OxQelRecordsetSQLite::setField(const std::wstring& name, int value) {
    return setlFieldValue(findFieldIndex(name), OxVariant::fromInt(value));
}

bool OxQelRecordsetSQLite::setlFieldValue(long index, const OxVariant& value) {
    if (!inColumns(index))
        return false;
    return setszFieldValue(m_fieldDefs[static_cast<size_t>(index)].getFieldName(), value);
}

bool OxQelRecordsetSQLite::setvarFieldValue(const OxVariant& column, const OxVariant& value) {
    std::wstring name;
    OxQel::Util::tryVariantToString(column, name);
    return setszFieldValue(name, value);
}

bool OxQelRecordsetSQLite::setszFieldValue(const std::wstring& name, const OxVariant& value) {
    return OXQEL_SQLITE_GUARDED(L"OxQelRecordsetSQLite::setszFieldValue", [&] {
        const long index = findFieldIndex(name);
        // A change needs a row to change and a table column to write it to.
        if (index < 0 || !inRows(m_currentRow) ||
            m_columnTables[static_cast<size_t>(index)].empty())
            return false;
        OxQelSQLiteRowStore& rows = m_impl->rows;
        Cell cell;
        if (value.isNull()) {
            cell = rows.makeNull();
        } else if (oxSQLiteIsInteger(value.vt())) {
            long v = 0;
            OxQel::_variantToLong(value, v);
            cell = rows.makeInteger(v);
        } else if (oxSQLiteIsReal(value.vt())) {
            cell = rows.makeReal(value.vt() == VT_R4 ? double(value.fltVal()) : value.dblVal());
        } else if (value.isByteArray()) {
            cell = rows.makeBlob(value.bytesData(), value.bytesSize());
        } else {
            // Texts as they are; dates, booleans and the rest as their text.
            std::wstring text;
            if (!OxQel::Util::tryVariantToString(value, text))
                return false;
            cell = rows.makeText(text);
        }
        m_impl->pending.push_back({m_currentRow, index, 1, cell});
        return true;
    });
}

bool OxQelRecordsetSQLite::oneTableInRecordSet() const {
    for (const auto& table : m_columnTables)
        if (table != m_columnTables.front())
            return false;
    return true;
}

namespace {
// Runs one generated change with its values bound; a change that finds no row to change
// has not been made, and says so.
bool runChange(sqlite3* db, const OxQelSQLiteRowStore& rows, const std::wstring& sql,
               const std::vector<Cell>& values, const wchar_t* function) {
    if (!db)
        return false;
    OxQelSQLiteStatement stmt;
    int rc = stmt.prepare(db, sql);
    for (size_t i = 0; rc == SQLITE_OK && i < values.size(); ++i)
        rc = rows.bind(stmt.get(), static_cast<int>(i + 1), values[i]);
    if (rc == SQLITE_OK)
        rc = stmt.step();
    if (rc != SQLITE_DONE) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc), function,
                     oxFormat(L"%s\n%s", sql, OxQelSQLiteStatement::errorMessage(db)));
        return false;
    }
    if (sqlite3_changes(db) == 0) {
        OXQEL_REPORT(L"The row to change was not found ", function, sql);
        return false;
    }
    return true;
}

// The name that reaches the table's rowid, or empty for a table without one.
std::wstring findRowidName(sqlite3* db, const std::wstring& table,
                           const std::vector<std::wstring>& columns) {
    for (const wchar_t* alias : {L"rowid", L"_rowid_", L"oid"}) {
        bool taken = false;
        for (const auto& c : columns) taken = taken || OxText::equalsNoCase(c, alias);
        if (taken)
            continue;
        OxQelSQLiteStatement probe;
        const std::wstring sql =
            oxFormat(L"SELECT %s FROM %s LIMIT 0", alias, oxSQLiteQuoteIdentifier(table));
        return probe.prepare(db, sql) == SQLITE_OK ? std::wstring(alias) : std::wstring();
    }
    return {};
}
}  // namespace

bool OxQelRecordsetSQLite::addNew() {
    return OXQEL_SQLITE_GUARDED(L"OxQelRecordsetSQLite::addNew", [&] {
        if (getFieldCount() < 1 || !oneTableInRecordSet() || !m_connection ||
            m_columnTables.front().empty())
            return false;
        const std::wstring& table = m_columnTables.front();
        const std::wstring quoted = oxSQLiteQuoteIdentifier(table);
        if (!m_connection->execute(oxFormat(L"INSERT INTO %s DEFAULT VALUES", quoted)))
            return false;
        OxQelSQLiteRowStore& rows = m_impl->rows;
        // The new row as the engine stored it (defaults, automatic numbers), so that
        // changes to it find it.
        sqlite3* db = m_connection->getHandle();
        std::vector<std::wstring> columns;
        m_connection->getAllFieldName(table, columns);
        const std::wstring rowid = findRowidName(db, table, columns);
        if (!rowid.empty()) {
            std::wstring list;
            for (const auto& origin : m_columnOrigins)
                list += (list.empty() ? L"" : L",") + oxSQLiteQuoteIdentifier(origin);
            OxQelSQLiteStatement stmt;
            if (stmt.prepare(db, oxFormat(L"SELECT %s FROM %s WHERE %s = ?", list, quoted,
                                          rowid)) == SQLITE_OK &&
                sqlite3_bind_int64(stmt.get(), 1, sqlite3_last_insert_rowid(db)) == SQLITE_OK &&
                stmt.step() == SQLITE_ROW) {
                rows.appendRow(stmt.get());
                return moveLast();
            }
        }
        std::vector<Cell> defaults;
        for (const auto& def : m_fieldDefs)
            defaults.push_back(rows.makeText(def.getDefaultValue()));
        rows.appendRow(defaults);
        return moveLast();
    });
}

bool OxQelRecordsetSQLite::remove() {
    return OXQEL_SQLITE_GUARDED(L"OxQelRecordsetSQLite::remove", [&] {
        if (getFieldCount() < 1 || !oneTableInRecordSet() || !m_connection ||
            !inRows(m_currentRow) || m_columnTables.front().empty())
            return false;
        const std::wstring& table = m_columnTables.front();
        std::vector<Cell> values;
        const std::wstring condition = rowCondition(table, m_currentRow, values);
        return runChange(
            m_connection->getHandle(), m_impl->rows,
            oxFormat(L"DELETE FROM %s WHERE %s", oxSQLiteQuoteIdentifier(table), condition), values,
            L"OxQelRecordsetSQLite::remove");
    });
}

// NULL matches NULL through IS, and a table with a rowid changes one row even when
// others hold the same values.
std::wstring OxQelRecordsetSQLite::rowCondition(const std::wstring& table, long row,
                                                std::vector<Cell>& values) {
    std::wstring condition;
    for (size_t c = 0; c < m_columnTables.size(); ++c) {
        if (!OxText::equalsNoCase(m_columnTables[c], table))
            continue;
        values.push_back(m_impl->rows.cell(static_cast<size_t>(row), static_cast<int>(c)));
        condition += oxFormat(L"%s%s IS ?%d", condition.empty() ? L"" : L" AND ",
                              oxSQLiteQuoteIdentifier(m_columnOrigins[c]), values.size());
    }
    auto& names = m_impl->rowidNames;
    auto found = names.find(table);
    if (found == names.end()) {
        std::vector<std::wstring> columns;
        m_connection->getAllFieldName(table, columns);
        found =
            names.emplace(table, findRowidName(m_connection->getHandle(), table, columns)).first;
    }
    if (found->second.empty())
        return condition;
    return oxFormat(L"%s IN (SELECT %s FROM %s WHERE %s LIMIT 1)", found->second, found->second,
                    oxSQLiteQuoteIdentifier(table), condition);
}

bool OxQelRecordsetSQLite::writePending(bool lastFirst) {
    if (!m_connection)
        return false;
    OxQelSQLiteRowStore& rows = m_impl->rows;
    auto& pending = m_impl->pending;
    m_connection->startTransaction();
    if (pending.empty()) {
        m_connection->closeTransaction();
        return true;
    }
    struct Undo {
        long row;
        int column;
        Cell old;
    };
    std::vector<Undo> undo;
    auto restore = [&] {
        for (auto u = undo.rbegin(); u != undo.rend(); ++u)
            rows.setCell(static_cast<size_t>(u->row), u->column, u->old);
    };
    std::set<std::pair<long, long>> written;
    for (size_t k = 0; k < pending.size(); ++k) {
        const Impl::Edit& edit = pending[lastFirst ? pending.size() - 1 - k : k];
        // Taken from the last queued, an earlier change of the same cell is outdated.
        if (lastFirst && !written.insert({edit.row, edit.column}).second)
            continue;
        const auto column = static_cast<size_t>(edit.column);
        const std::wstring& table = m_columnTables[column];
        std::vector<Cell> values{edit.value};
        bool ok = inRows(edit.row);
        if (ok) {
            const std::wstring sql =
                oxFormat(L"UPDATE %s SET %s = ?1 WHERE %s", oxSQLiteQuoteIdentifier(table),
                         oxSQLiteQuoteIdentifier(m_columnOrigins[column]),
                         rowCondition(table, edit.row, values));
            ok = runChange(m_connection->getHandle(), rows, sql, values,
                           L"OxQelRecordsetSQLite::update");
        }
        if (!ok) {
            // Nothing of this update stays, in the table or in the copy; the changes stay
            // queued.
            m_connection->rollbackTransaction(true);
            m_connection->closeTransaction();
            restore();
            return false;
        }
        // Every column of the result that shows this table column takes the new value.
        for (size_t c = 0; c < m_columnTables.size(); ++c) {
            if (!OxText::equalsNoCase(m_columnTables[c], table) ||
                !OxText::equalsNoCase(m_columnOrigins[c], m_columnOrigins[column]))
                continue;
            undo.push_back({edit.row, static_cast<int>(c),
                            rows.cell(static_cast<size_t>(edit.row), static_cast<int>(c))});
            rows.setCell(static_cast<size_t>(edit.row), static_cast<int>(c), edit.value);
        }
    }
    if (!m_connection->closeTransaction() && m_connection->isInTransaction()) {
        m_connection->rollbackTransaction(true);
        restore();
        return false;
    }
    pending.clear();
    return true;
}

bool OxQelRecordsetSQLite::update() {
    return OXQEL_SQLITE_GUARDED(L"OxQelRecordsetSQLite::update",
                                [&] { return writePending(true); });
}

bool OxQelRecordsetSQLite::updateBatch() {
    return OXQEL_SQLITE_GUARDED(L"OxQelRecordsetSQLite::updateBatch",
                                [&] { return writePending(false); });
}

bool OxQelRecordsetSQLite::cancelUpdate() {
    m_impl->pending.clear();
    return true;
}

bool OxQelRecordsetSQLite::cancelBatch() {
    auto& pending = m_impl->pending;
    std::erase_if(pending, [](const Impl::Edit& e) { return e.kind == 1; });
    return true;
}
