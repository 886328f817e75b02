#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/ado/OxAdoCriteria.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoField.h"
#include "platform/ado/OxAdoProperty.h"
#include "platform/ado/OxAdoProvider.h"
#include "platform/ado/OxAdoSortOrder.h"
#include "platform/core/OxExport.h"

class OxAdoConnection;

// The rows of a query with a cursor over them.
//
// A client-side cursor (adUseClient) reads every row at open and is static. A server-side
// cursor streams them: forward-only keeps one row at a time (MoveFirst runs the query
// again), the other types keep the rows read so far. Edits are written back with
// generated statements against the base table: at once with pessimistic and optimistic
// locking, at UpdateBatch with batch locking. Every method raises OxComError on failure.
class OX_EXPORT OxAdoRecordset : public std::enable_shared_from_this<OxAdoRecordset> {
public:
    static std::shared_ptr<OxAdoRecordset> create();
    ~OxAdoRecordset();
    OxAdoRecordset(const OxAdoRecordset&) = delete;
    OxAdoRecordset& operator=(const OxAdoRecordset&) = delete;

    long cacheSize() const { return m_cacheSize; }
    void setCacheSize(long rows);
    int cursorLocation() const { return m_cursorLocation; }
    void setCursorLocation(int location);
    int cursorType() const { return m_cursorType; }
    void setCursorType(int type);
    int lockType() const { return m_lockType; }
    void setLockType(int type);
    std::shared_ptr<OxAdoConnection> activeConnection() const { return m_connection; }
    const std::wstring& source() const { return m_source; }
    long state() const { return m_open ? OxAdo::adStateOpen : OxAdo::adStateClosed; }

    // Runs the source (options: adCmdText, adCmdTable or adCmdTableDirect) on the
    // connection. A statement that gives no rows leaves the recordset closed.
    void open(const std::wstring& source, const std::shared_ptr<OxAdoConnection>& connection,
              int cursorType = OxAdo::adOpenUnspecified, int lockType = OxAdo::adLockUnspecified,
              long options = OxAdo::adCmdUnspecified);
    // Opens on rows already produced (command results, schema rowsets).
    void openRows(std::unique_ptr<OxAdoRowSource> rows,
                  const std::shared_ptr<OxAdoConnection>& connection, int cursorType, int lockType,
                  const std::wstring& source = {}, std::vector<OxAdoParamValue> parameters = {});
    void close();
    // Runs the source again (pending batch changes are dropped).
    void requery();

    bool bof() const;
    bool eof() const;
    // -1 where the cursor cannot count (forward-only, dynamic).
    long recordCount();
    void move(long rows, const OxVariant& start = OxVariant());
    void moveFirst();
    void moveLast();
    void moveNext();
    void movePrevious();
    long absolutePosition() const;
    void setAbsolutePosition(long position);
    OxVariant bookmark() const;
    void setBookmark(const OxVariant& bookmark);
    bool supports(long options) const;

    // One comparison "field op value"; not found leaves the cursor at EOF (forward) or
    // BOF (backward).
    void find(const std::wstring& criteria, long skipRecords = 0,
              int direction = OxAdo::adSearchForward, const OxVariant& start = OxVariant());
    const OxVariant& filter() const { return m_filterValue; }
    // Criteria text, a FilterGroup value, or adFilterNone / "" for every row.
    void setFilter(const OxVariant& filter);
    const std::wstring& sort() const { return m_sortText; }
    void setSort(const std::wstring& sort);

    void addNew();
    void remove(int affect = OxAdo::adAffectCurrent);
    void update();
    void cancelUpdate();
    void updateBatch(int affect = OxAdo::adAffectAll);
    void cancelBatch(int affect = OxAdo::adAffectAll);
    // Stops an asynchronous operation: there are none, so nothing happens.
    void cancel() {}
    int editMode() const { return m_editMode; }
    // The RecordStatus of the current record.
    long status() const;

    OxAdoFields& fields() { return m_fields; }
    // "Update Criteria" (adCriteriaKey 0, adCriteriaAllCols 1, adCriteriaUpdCols 2).
    OxAdoProperties& properties() { return m_properties; }

    // For the fields.
    const OxVariant& valueAt(int column) const;
    void setValueAt(int column, const OxVariant& value);
    OxVariant originalValueAt(int column) const;
    const std::vector<OxAdoColumnInfo>& columnInfo() const { return m_columns; }
    void requireOpen() const;

private:
    struct Row {
        std::vector<OxVariant> values;    // as written locally
        std::vector<OxVariant> original;  // as the source has them, once modified
        std::vector<bool> changed;        // columns changed since the source's values
        long status = OxAdo::adRecUnmodified;
        long id = 0;
        bool affected = false;
    };

    OxAdoRecordset();
    bool forwardOnly() const { return m_cursorType == OxAdo::adOpenForwardOnly; }
    bool updatable() const { return m_lockType != OxAdo::adLockReadOnly; }
    bool batch() const { return m_lockType == OxAdo::adLockBatchOptimistic; }
    void start(std::unique_ptr<OxAdoRowSource> rows);
    std::unique_ptr<OxAdoRowSource> run();
    void reset() noexcept;
    int columnOf(const std::wstring& name) const;
    void buildFields();
    void markKeyColumns();
    bool fetchOne();
    void fetchAll();
    // Makes the row at a view position available; false when the rows end before it.
    bool ensure(long position);
    Row* current() const;
    void requireCurrent() const;
    void commitPendingEdit();
    void dropGhost();
    void moveTo(long position);
    void rebuildView();
    void resetEdit();
    void writeRow(Row& row);
    std::vector<Row*> rowsFor(int affect) const;
    Row* rowById(long id) const;
    long positionOf(const Row* row) const;
    void releaseSource() noexcept;

    long m_cacheSize = 1;
    int m_cursorLocation = OxAdo::adUseServer;
    bool m_locationSet = false;
    int m_cursorType = OxAdo::adOpenForwardOnly;
    int m_lockType = OxAdo::adLockReadOnly;
    std::shared_ptr<OxAdoConnection> m_connection;
    std::wstring m_source;
    std::wstring m_commandText;  // what was run: the source, or the SELECT of a table
    std::vector<OxAdoParamValue> m_parameters;
    bool m_open = false;

    std::vector<OxAdoColumnInfo> m_columns;
    OxAdoFields m_fields;
    OxAdoProperties m_properties;
    std::unique_ptr<OxAdoRowSource> m_rowsSource;
    bool m_sourceDone = true;
    std::vector<std::unique_ptr<Row>> m_rows;  // in the source's order, new rows last
    std::vector<Row*> m_view;                  // the visible rows, filtered and sorted
    long m_pos = -1;                           // -1: BOF; m_view.size(): EOF
    long m_passed = 0;                         // forward-only: rows left behind
    long m_nextId = 1;
    bool m_currentDeleted = false;  // the current row is deleted and leaves the view on a move

    int m_editMode = OxAdo::adEditNone;
    Row* m_editRow = nullptr;
    std::vector<OxVariant> m_edit;
    std::vector<bool> m_editChanged;
    long m_idBeforeAdd = 0;
    long m_posBeforeAdd = -1;

    OxVariant m_filterValue;
    OxAdoCriteria m_criteria;
    int m_filterGroup = OxAdo::adFilterNone;
    std::wstring m_sortText;
    OxAdoSortOrder m_sortOrder;
    std::map<std::wstring, std::vector<int>> m_keyCache;
};
