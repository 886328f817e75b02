#pragma once

#include <map>
#include <string>
#include <vector>

#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

class OxAdoConnection;

// Writes the edits of a recordset back to its base table with generated statements.
// A row is found again by its key columns; where the result holds no whole key, by its
// comparable columns, and then only when exactly one row matches, so that a table
// without a key never has two rows changed or deleted by one edit.
class OX_EXPORT OxAdoRowWriter {
public:
    enum UpdateCriteria { CriteriaKey = 0, CriteriaAllCols = 1, CriteriaUpdCols = 2 };

    OxAdoRowWriter(OxAdoConnection& connection, const std::vector<OxAdoColumnInfo>& columns,
                   std::map<std::wstring, std::vector<int>>& keyCache, int criteria);

    // Inserts the columns set; values receive what the source generated (auto-increment).
    void insert(std::vector<OxVariant>& values, const std::vector<bool>& set);
    void update(const std::vector<OxVariant>& original, const std::vector<OxVariant>& values,
                const std::vector<bool>& changed);
    void remove(const std::vector<OxVariant>& original);

    // Whether the column can be written: it comes from a table and the source does not
    // fill it itself.
    static bool isWritable(const OxAdoColumnInfo& column);
    // The key columns of a base table (its tableKey) among the result's columns, empty
    // without a key. Quiet: a source that cannot tell leaves no error behind.
    std::vector<int> keyColumns(const std::wstring& table, bool quiet = false);
    std::wstring tableKey(int column) const;

private:
    struct Statement {
        std::wstring text;
        std::vector<OxAdoParamValue> params;
    };

    std::wstring tableName(int column) const;
    std::wstring tableOf(const std::vector<bool>& columns) const;
    // The WHERE clause that finds the row; keyless is set when no key identifies it.
    void where(const std::wstring& table, const std::vector<OxVariant>& original,
               const std::vector<bool>& changed, Statement& s, bool& keyless);
    long run(const Statement& s);
    void checkSingleRow(const std::wstring& table, const Statement& where);

    OxAdoConnection& m_connection;
    const std::vector<OxAdoColumnInfo>& m_columns;
    std::map<std::wstring, std::vector<int>>& m_keyCache;
    int m_criteria;
};
