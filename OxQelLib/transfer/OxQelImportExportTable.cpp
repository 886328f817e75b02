#include "OxQelLib/transfer/OxQelImportExportTable.h"

#include "OxQelLib/foundation/OxQelConvert.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

using OxQel::SQLError;

OxQelImportExportTable::OxQelImportExportTable(OxQelIConnection& source,
                                               OxQelIConnection& destination,
                                               const OxQelTableDef& table)
    : m_source(source), m_destination(destination), m_table(table) {}

bool OxQelImportExportTable::isValid() {
    return m_source.isOpen() && m_destination.isOpen();
}

SQLError OxQelImportExportTable::run() {
    if (!isValid())
        return OxQel::ErrorConnection;
    m_destination.startTransaction();
    SQLError result;
    try {
        result = copyTableStructure();
        if (result == OxQel::NoError)
            result = copyAllRows();
        if (result == OxQel::NoError)
            result = recreateIndexes();
    } catch (...) {
        // Backends do not throw; what still can (memory) fails the table, not the caller.
        result = OxQel::ErrorUnknown;
    }
    if (result != OxQel::NoError) {
        m_destination.rollbackTransaction(true);
        return result;
    }
    m_destination.closeTransaction();
    return OxQel::NoError;
}

SQLError OxQelImportExportTable::copyTableStructure() {
    if (!isValid())
        return OxQel::ErrorConnection;
    const OxQelFieldDefArray& fields = m_table.getFields();
    if (fields.empty())
        return OxQel::NoError;
    // An existing table is kept as it is; the rows are added to it.
    if (m_destination.findTable(m_table.getTableName()))
        return OxQel::NoError;
    for (size_t i = 0; i < fields.size(); ++i) {
        const OxQelFieldDef& f = fields[i];
        const int size = f.getFieldSize() == 0 ? 255 : f.getFieldSize();
        std::wstring defaultValue = f.getDefaultValue();
        if (OxQel::isStringType(f.getFieldType()))
            defaultValue = L"]]" + defaultValue + L"[[";
        const bool created =
            i == 0
                ? m_destination.createTable(m_table.getTableName(), f.getRefFieldName(),
                                            f.getFieldType(), size, defaultValue, f.getCanBeNull())
                : m_destination.createField(m_table.getTableName(), f.getRefFieldName(),
                                            f.getFieldType(), size, defaultValue, f.getCanBeNull());
        if (!created)
            return OxQel::ErrorStatement;
    }
    m_destination.update();
    return OxQel::NoError;
}

SQLError OxQelImportExportTable::copyAllRows() {
    if (!isValid())
        return OxQel::ErrorConnection;
    std::shared_ptr<OxQelIRecordset> recordset(m_source.createOxQelIRecordset());
    if (!recordset)
        return OxQel::ErrorConnection;
    const std::wstring select =
        m_source.formatBeforeExecute(oxFormat(L"SELECT * from %s", m_table.getTableName()));
    recordset->openSQL(&m_source, select);
    std::shared_ptr<OxQelIPreparedQuery> insert = createInsertPreparedQuery();
    if (!insert)
        return OxQel::ErrorStatement;
    m_bindTypes.clear();
    while (!recordset->getEOF()) {
        if (!bindPreparedQueryParameter(*recordset, *insert))
            return OxQel::ErrorBind;
        if (!insert->executePreparedQuery())
            return OxQel::ErrorExecute;
        recordset->moveNext();
    }
    return OxQel::NoError;
}

std::shared_ptr<OxQelIPreparedQuery> OxQelImportExportTable::createInsertPreparedQuery() {
    std::shared_ptr<OxQelIPreparedQuery> query(m_destination.createOxQelIPrepraredQuery());
    if (!query)
        return {};
    std::wstring columns;
    std::wstring values;
    int k = 1;
    for (const OxQelFieldDef& f : m_table.getFields()) {
        if (k > 1) {
            columns += L", ";
            values += L", ";
        }
        columns += f.getRefFieldName();
        values += query->formatParametersInQuery(oxFormat(L"]]]%d[[[", k));
        ++k;
    }
    const std::wstring statement =
        oxFormat(L"INSERT INTO %s (%s) VALUES (%s)", m_table.getTableName(), columns, values);
    if (!query->prepareQuery(statement))
        return {};
    return query;
}

bool OxQelImportExportTable::bindPreparedQueryParameter(OxQelIRecordset& recordset,
                                                        OxQelIPreparedQuery& query) {
    if (recordset.getFieldCount() < 1)
        return true;
    for (long i = 0; i < recordset.getFieldCount(); ++i) {
        const size_t at = static_cast<size_t>(i);
        if (at >= m_bindTypes.size()) {
            m_bindTypes.resize(at + 1, OxQel::Unknown);
            m_bindTypes[at] =
                m_table.getFields().getByFieldName(recordset.getFieldName(i)).getFieldType();
        }
        if (!query.bindParameterVariant(static_cast<int>(i) + 1, recordset.getlFieldValue(i),
                                        m_bindTypes[at]))
            return false;
    }
    return true;
}

SQLError OxQelImportExportTable::recreateIndexes() {
    if (!isValid())
        return OxQel::ErrorConnection;
    std::vector<OxQelIndexDef> sourceIndexes;
    std::vector<OxQelIndexDef> destinationIndexes;
    m_source.getIndexDef(m_table.getTableName(), sourceIndexes);
    m_destination.getIndexDef(m_table.getTableName(), destinationIndexes);
    for (const OxQelIndexDef& index : sourceIndexes) {
        bool present = false;
        for (const OxQelIndexDef& existing : destinationIndexes)
            present =
                present || OxText::equalsNoCase(existing.getIndexName(), index.getIndexName());
        if (present)
            continue;
        if (!m_destination.createIndex(index.getIndexName(), index.isPrimaryKey(), index.isUnique(),
                                       false, index.getTableName(), index.getListFieldInString()))
            return OxQel::ErrorStatement;
    }
    return OxQel::NoError;
}
