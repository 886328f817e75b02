#pragma once

#include <memory>
#include <string>

#include "OxQelLib/interfaces/OxQelIRecordset.h"
#include "platform/core/OxComError.h"

class OxAdoField;
class OxAdoFields;
class OxAdoRecordset;

// The editable recordset of the backends on the data-access object model: one Recordset
// opened on the Connection of an OxQelConnectionADO. Cursor type, lock type and cursor
// location take effect at the next openSQL; a plain recordset reads forward only, read
// only, on a server-side cursor.
class OX_EXPORT OxQelRecordsetADO : public OxQelIEditRecordset {
    OX_DECLARE_DYNAMIC(OxQelRecordsetADO)
public:
    OxQelRecordsetADO();
    ~OxQelRecordsetADO() override;

    CompareResult compareTo(const OxObject* other, int property = 0,
                            bool descending = false) const override;
    // Shares the other recordset's Recordset and takes its settings.
    void copyFrom(const OxObject& other) override;
    OxObject* clone() const override;

    bool openSQL(OxQelIConnection* connection, const std::wstring& statement) override;
    void close() override;
    bool getEOF() override;
    bool getBOF() override;
    // Counts by walking the rows where the cursor cannot tell, and puts the cursor back
    // where it was; -1 when the rows cannot be counted.
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
    bool setOptimize(const OxVariant& column, bool optimize) override;
    bool setFilter(const OxVariant& filter) override;
    bool setSort(const std::wstring& sort) override;

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
    bool setszFieldValue(const std::wstring& name, const OxVariant& value) override;
    bool setvarFieldValue(const OxVariant& column, const OxVariant& value) override;
    bool addNew() override;
    bool remove() override;
    bool update() override;
    bool cancelUpdate() override;
    bool updateBatch() override;
    bool cancelBatch() override;

    // Criteria "field op value" from the current row on; 1 when a row was found, else 0.
    int find(const std::wstring& criteria);
    int findFirst(const std::wstring& criteria);
    int findNext(const std::wstring& criteria);
    // 1 when the filter text was accepted, else 0.
    int setFilter(const std::wstring& filter);

    // Settings for the next openSQL (cursor and lock types by their published values).
    void setAdoCursorType(int cursorType) { m_cursorType = cursorType; }
    void setAdoLockType(int lockType) { m_lockType = lockType; }
    void setServerSideCursor(bool serverSide) { m_serverSide = serverSide; }
    int getAdoCursorType() const { return m_cursorType; }
    int getAdoLockType() const { return m_lockType; }
    bool isServerSideCursor() const { return m_serverSide; }

    // The objects of the model, for the subclasses and the connection classes.
    OxAdoFields* getFields();
    std::shared_ptr<OxAdoField> getFieldPtr(const std::wstring& name);
    std::shared_ptr<OxAdoRecordset> getRecordsetPtr() const { return m_recordset; }

    void getProviderError(std::wstring& message);
    static void getComError(std::wstring& message, const OxComError& error);

    // The most rows getRecordCount walks before it gives up on a source that never ends.
    static long _mlMaxCountedRows;

protected:
    bool createInstance();
    void releaseInstance();
    bool initQelFieldFrom(OxQelFieldDef& definition, OxAdoField& field);
    OxQel::FieldType getFieldType(const OxAdoField& field);
    // The default text as the catalog gives it, stripped of the outer parentheses and
    // literal quotes that servers add: (N'abc') and ('abc') give abc, ((0)) gives (0).
    static std::wstring stripDefaultText(const std::wstring& text);

    OxQelIConnection* m_connection = nullptr;

private:
    OxAdoRecordset& recordset() const;
    bool readValue(long index, OxVariant& value);
    bool readValue(const std::wstring& name, OxVariant& value);

    std::shared_ptr<OxAdoRecordset> m_recordset;
    int m_cursorType = 0;  // forward only
    int m_lockType = 1;    // read only
    bool m_serverSide = true;
};
