#pragma once

#include <memory>
#include <string>
#include <vector>

#include "OxQelLib/interfaces/OxQelIRecordset.h"

class OxQelConnectionSQLite;
struct OxQelSQLiteCell;

// The editable recordset of the SQLite backend. openSQL runs the statement to its end
// and keeps every row in memory; reads and navigation work on that copy. Changes become
// UPDATE, INSERT and DELETE statements on the one table the recordset reads, the row
// found by the values of its columns, with the values bound as parameters.
class OX_EXPORT OxQelRecordsetSQLite : public OxQelIEditRecordset {
    OX_DECLARE_DYNAMIC(OxQelRecordsetSQLite)
public:
    using OxQelIRecordset::getFieldDef;
    using OxQelIRecordset::getFieldSize;
    using OxQelIRecordset::getFieldType;
    using OxQelIRecordset::isFieldNull;

    OxQelRecordsetSQLite();
    ~OxQelRecordsetSQLite() override;
    OxQelRecordsetSQLite(const OxQelRecordsetSQLite&) = delete;
    OxQelRecordsetSQLite& operator=(const OxQelRecordsetSQLite&) = delete;

    // The statement is compiled as given: text in the library's dialect goes through the
    // connection's formatBeforeExecute first.
    bool openSQL(OxQelIConnection* connection, const std::wstring& statement) override;
    void close() override;
    bool getEOF() override;
    bool getBOF() override;
    long getRecordCount() override;
    bool move(long rows) override;
    bool moveFirst() override;
    bool movePrevious() override;
    bool moveNext() override;
    bool moveLast() override;

    bool getField(long index, std::wstring& value) override;
    bool getField(long index, double& value) override;
    bool getField(long index, long& value) override;
    bool getField(long index, bool& value) override;
    bool getField(const std::wstring& name, std::wstring& value) override;
    bool getField(const std::wstring& name, double& value) override;
    bool getField(const std::wstring& name, long& value) override;
    bool getField(const std::wstring& name, bool& value) override;

    // Integers come as VT_INT when they fit in 32 bits, else VT_I8; reals as VT_R8,
    // texts as VT_BSTR, blobs as byte arrays, NULL as VT_NULL; VT_EMPTY off the rows.
    OxVariant getlFieldValue(long index) override;
    OxVariant getszFieldValue(const std::wstring& name) override;
    OxVariant getvarFieldValue(const OxVariant& column) override;
    std::wstring getlFieldString(long index) override;
    std::wstring getszFieldString(const std::wstring& name) override;
    std::wstring getvarFieldString(const OxVariant& column) override;

    bool getFieldDef(const OxVariant& column, OxQelFieldDef& definition) override;
    bool getFieldDef(const std::wstring& name, OxQelFieldDef& definition) override;
    bool getFieldDef(long index, OxQelFieldDef& definition) override;
    bool getFieldDef(OxQelFieldDefArray& definitions) override;
    long getFieldCount() override;
    std::wstring getFieldName(long index) override;
    OxQel::FieldType getFieldType(long index) override;
    OxQel::FieldType getFieldType(const std::wstring& name) override;
    OxQel::FieldType getFieldType(const OxVariant& column) override;
    int getFieldSize(long index) override;
    int getFieldSize(const std::wstring& name) override;
    int getFieldSize(const OxVariant& column) override;
    bool isFieldNull(long index) override;
    bool isFieldNull(const std::wstring& name) override;
    bool isFieldNull(const OxVariant& column) override;

    bool setOptimize(const OxVariant&, bool) override { return false; }
    bool setFilter(const OxVariant&) override { return false; }
    bool setSort(const std::wstring&) override { return false; }

    bool setField(long index, const OxVariant& value) override;
    bool setField(long index, const std::wstring& value) override;
    bool setField(long index, double value) override;
    bool setField(long index, long value) override;
    bool setField(long index, int value) override;
    bool setField(const std::wstring& name, const OxVariant& value) override;
    bool setField(const std::wstring& name, const std::wstring& value) override;
    bool setField(const std::wstring& name, double value) override;
    bool setField(const std::wstring& name, long value) override;
    bool setField(const std::wstring& name, int value) override;
    bool setlFieldValue(long index, const OxVariant& value) override;
    // Queues the change of the current row's column; update writes it.
    bool setszFieldValue(const std::wstring& name, const OxVariant& value) override;
    bool setvarFieldValue(const OxVariant& column, const OxVariant& value) override;

    // Inserts a row of default values at once and moves to it.
    bool addNew() override;
    // Deletes the current row from the table at once; the copy keeps it.
    bool remove() override;
    // Writes the queued changes in one transaction, the last queued first.
    bool update() override;
    bool cancelUpdate() override;
    // Writes the queued changes, the first queued first.
    bool updateBatch() override;
    bool cancelBatch() override;

private:
    struct Impl;

    bool executeAndLoad(const std::wstring& statement);
    void fillFieldDefs();
    long findFieldIndex(const std::wstring& name) const;
    bool inRows(long row) const;
    bool inColumns(long column) const;
    bool oneTableInRecordSet() const;
    template <class T, class Convert>
    bool readField(long index, T& value, Convert convert);
    template <class T, class Convert>
    bool readField(const std::wstring& name, T& value, Convert convert);
    bool writePending(bool lastFirst);
    // The condition that finds the row's stored values in the table; the values to bind
    // are appended.
    std::wstring rowCondition(const std::wstring& table, long row,
                              std::vector<OxQelSQLiteCell>& values);

    OxQelConnectionSQLite* m_connection = nullptr;
    std::vector<std::wstring> m_columnTables;
    std::vector<std::wstring> m_columnOrigins;  // the table's name of each column
    OxQelFieldDefArray m_fieldDefs;
    long m_currentRow = -1;
    std::unique_ptr<Impl> m_impl;
};
