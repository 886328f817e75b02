#pragma once

#include <memory>
#include <vector>

#include "OxQelLib/interfaces/OxQelIConnection.h"
#include "OxQelLib/interfaces/OxQelIPreparedQuery.h"
#include "OxQelLib/interfaces/OxQelIRecordset.h"
#include "OxQelLib/schema/OxQelTableDef.h"

// Copies one table between any two connections: its structure (when the destination
// lacks the table), every row through one prepared insert, then the indexes the
// destination lacks, all in one transaction on the destination. The connections and the
// definition are referenced, not owned, and must outlive the copier.
class OX_EXPORT OxQelImportExportTable {
public:
    OxQelImportExportTable(OxQelIConnection& source, OxQelIConnection& destination,
                           const OxQelTableDef& table);

    bool isValid();
    OxQel::SQLError run();

private:
    OxQel::SQLError copyTableStructure();
    OxQel::SQLError copyAllRows();
    OxQel::SQLError recreateIndexes();
    std::shared_ptr<OxQelIPreparedQuery> createInsertPreparedQuery();
    bool bindPreparedQueryParameter(OxQelIRecordset& recordset, OxQelIPreparedQuery& query);

    OxQelIConnection& m_source;
    OxQelIConnection& m_destination;
    const OxQelTableDef& m_table;
    // The column types by result position, looked up by name once per copy: the columns
    // of a result do not change from row to row.
    std::vector<OxQel::FieldType> m_bindTypes;
};
