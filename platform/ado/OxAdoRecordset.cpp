#include "platform/ado/OxAdoRecordset.h"

#include <algorithm>

#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoRowWriter.h"
#include "platform/core/OxText.h"

namespace {
[[noreturn]] void notUpdatable() {
    OxAdo::raise(OxAdo::hresultOf(OxAdo::adErrFeatureNotAvailable),
                 L"Current Recordset does not support updating. This may be a limitation of the "
                 L"provider, or of the selected locktype.");
}

[[noreturn]] void cannotFetchBackwards() {
    OxAdo::raise(OxAdo::Hr::DB_E_CANTFETCHBACKWARDS, L"Rowset does not support fetching backward.");
}

[[noreturn]] void notCapable() {
    OxAdo::raise(OxAdo::adErrFeatureNotAvailable);
}

[[noreturn]] void multipleStep(const std::wstring& detail) {
    OxAdo::raise(
        OxAdo::Hr::DB_E_ERRORSOCCURRED,
        L"Multiple-step operation generated errors. Check each status value. (" + detail + L")");
}

size_t textLength(const OxVariant& v) {
    return v.vt() == VT_BSTR ? v.bstr().size() : 0;
}
}  // namespace

std::shared_ptr<OxAdoRecordset> OxAdoRecordset::create() {
    return std::shared_ptr<OxAdoRecordset>(new OxAdoRecordset());
}

OxAdoRecordset::OxAdoRecordset() {
    m_properties.add(L"Update Criteria", OxVariant(int32_t{OxAdoRowWriter::CriteriaUpdCols}));
    m_filterValue = OxVariant(int32_t{OxAdo::adFilterNone});
}

OxAdoRecordset::~OxAdoRecordset() {
    releaseSource();
}

void OxAdoRecordset::setCacheSize(long rows) {
    if (rows < 1)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_cacheSize = rows;
}

void OxAdoRecordset::setCursorLocation(int location) {
    if (m_open)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    if (location != OxAdo::adUseServer && location != OxAdo::adUseClient &&
        location != OxAdo::adUseNone)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_cursorLocation = location == OxAdo::adUseNone ? OxAdo::adUseServer : location;
    m_locationSet = true;
}

void OxAdoRecordset::setCursorType(int type) {
    if (m_open)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    if (type < OxAdo::adOpenUnspecified || type > OxAdo::adOpenStatic)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_cursorType = type == OxAdo::adOpenUnspecified ? OxAdo::adOpenForwardOnly : type;
}

void OxAdoRecordset::setLockType(int type) {
    if (m_open)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    if (type != OxAdo::adLockUnspecified &&
        (type < OxAdo::adLockReadOnly || type > OxAdo::adLockBatchOptimistic))
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_lockType = type == OxAdo::adLockUnspecified ? OxAdo::adLockReadOnly : type;
}

void OxAdoRecordset::requireOpen() const {
    if (!m_open)
        OxAdo::raise(OxAdo::adErrObjectClosed);
}

// ---------------------------------------------------------------- opening and closing

void OxAdoRecordset::open(const std::wstring& source,
                          const std::shared_ptr<OxAdoConnection>& connection, int cursorType,
                          int lockType, long options) {
    if (m_open)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    if (!connection || connection->state() != OxAdo::adStateOpen)
        OxAdo::raise(OxAdo::adErrInvalidConnection);
    if (cursorType != OxAdo::adOpenUnspecified)
        setCursorType(cursorType);
    if (lockType != OxAdo::adLockUnspecified)
        setLockType(lockType);
    if (!m_locationSet)
        m_cursorLocation = connection->cursorLocation();
    const long commandType = OxAdo::commandTypeOf(options);
    m_source = source;
    if (commandType == OxAdo::adCmdTable || commandType == OxAdo::adCmdTableDirect) {
        const bool plain = source.find_first_of(L"\"`[].") == std::wstring::npos;
        m_commandText =
            L"SELECT * FROM " + (plain ? connection->session().quoteIdentifier(source) : source);
    } else if (commandType == OxAdo::adCmdStoredProc) {
        notCapable();
    } else {
        m_commandText = source;
    }
    m_parameters.clear();
    m_connection = connection;
    std::unique_ptr<OxAdoRowSource> rows;
    try {
        rows = run();
    } catch (...) {
        m_connection.reset();
        throw;
    }
    if (!rows) {
        // A statement without rows leaves the recordset closed, as the model does.
        m_connection.reset();
        return;
    }
    start(std::move(rows));
}

void OxAdoRecordset::openRows(std::unique_ptr<OxAdoRowSource> rows,
                              const std::shared_ptr<OxAdoConnection>& connection, int cursorType,
                              int lockType, const std::wstring& source,
                              std::vector<OxAdoParamValue> parameters) {
    if (m_open)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    if (!rows)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    setCursorType(cursorType);
    setLockType(lockType);
    if (!m_locationSet && connection)
        m_cursorLocation = connection->cursorLocation();
    m_connection = connection;
    m_source = source;
    m_commandText = source;
    m_parameters = std::move(parameters);
    start(std::move(rows));
}

std::unique_ptr<OxAdoRowSource> OxAdoRecordset::run() {
    if (!m_connection || m_connection->state() != OxAdo::adStateOpen)
        OxAdo::raise(OxAdo::adErrInvalidConnection);
    OxAdoExecArgs args;
    args.timeout = m_connection->commandTimeout();
    long affected = -1;
    return m_connection->call([&] {
        return m_connection->session().execute(m_commandText, m_parameters, args, affected);
    });
}

void OxAdoRecordset::start(std::unique_ptr<OxAdoRowSource> rows) {
    if (m_cursorLocation == OxAdo::adUseClient) {
        // The client cursor engine offers one kind of cursor, and no locks on the source.
        m_cursorType = OxAdo::adOpenStatic;
        if (m_lockType == OxAdo::adLockPessimistic)
            m_lockType = OxAdo::adLockOptimistic;
    }
    m_columns = rows->columns();
    m_rowsSource = std::move(rows);
    m_sourceDone = false;
    m_rows.clear();
    m_view.clear();
    m_pos = 0;
    m_passed = 0;
    m_nextId = 1;
    m_currentDeleted = false;
    m_keyCache.clear();
    resetEdit();
    m_open = true;
    try {
        buildFields();
        if (m_cursorLocation == OxAdo::adUseClient)
            fetchAll();
        if (forwardOnly())
            fetchOne();
        else
            ensure(0);
        if (!m_criteria.empty() || m_filterGroup != OxAdo::adFilterNone || !m_sortOrder.empty()) {
            if (forwardOnly()) {
                m_criteria = {};
                m_sortOrder = {};
                m_filterGroup = OxAdo::adFilterNone;
            } else {
                fetchAll();
                rebuildView();
            }
        }
    } catch (...) {
        reset();
        throw;
    }
    if (m_connection)
        m_connection->attach(shared_from_this());
}

void OxAdoRecordset::buildFields() {
    m_fields.clear();
    for (size_t i = 0; i < m_columns.size(); ++i) {
        const OxAdoColumnInfo& c = m_columns[i];
        long a = 0;
        if (OxAdo::isFixedLengthType(c.type))
            a |= OxAdo::adFldFixed;
        if (OxAdo::isLongType(c.type))
            a |= OxAdo::adFldLong | OxAdo::adFldMayDefer;
        if (c.mayBeNull)
            a |= OxAdo::adFldMayBeNull;
        if (c.nullable)
            a |= OxAdo::adFldIsNullable;
        if (c.autoIncrement)
            a |= OxAdo::adFldRowID;
        if (c.rowVersion)
            a |= OxAdo::adFldRowVersion;
        if (updatable())
            a |= OxAdoRowWriter::isWritable(c) ? OxAdo::adFldUpdatable
                                               : OxAdo::adFldUnknownUpdatable;
        m_fields.add(std::make_shared<OxAdoField>(weak_from_this(), static_cast<int>(i), c, a));
    }
    if (updatable() && m_connection)
        markKeyColumns();
}

void OxAdoRecordset::markKeyColumns() {
    OxAdoRowWriter writer(*m_connection, m_columns, m_keyCache, 0);
    for (size_t i = 0; i < m_columns.size(); ++i) {
        if (m_columns[i].baseTable.empty())
            continue;
        for (int k : writer.keyColumns(writer.tableKey(static_cast<int>(i)), true))
            if (k == static_cast<int>(i))
                m_fields.item(static_cast<long>(i))->setKeyColumn(true);
    }
}

void OxAdoRecordset::close() {
    requireOpen();
    reset();
}

void OxAdoRecordset::reset() noexcept {
    releaseSource();
    resetEdit();
    m_rows.clear();
    m_view.clear();
    m_fields.clear();
    m_columns.clear();
    m_keyCache.clear();
    m_pos = -1;
    m_passed = 0;
    m_currentDeleted = false;
    m_open = false;
    m_connection.reset();
    m_filterValue = OxVariant(int32_t{OxAdo::adFilterNone});
    m_criteria = {};
    m_filterGroup = OxAdo::adFilterNone;
    m_sortText.clear();
    m_sortOrder = {};
}

void OxAdoRecordset::releaseSource() noexcept {
    m_rowsSource.reset();
    m_sourceDone = true;
}

void OxAdoRecordset::requery() {
    requireOpen();
    if (!m_connection)
        notCapable();
    resetEdit();
    releaseSource();
    std::unique_ptr<OxAdoRowSource> rows = run();
    if (!rows) {
        reset();
        return;
    }
    start(std::move(rows));
}

// ---------------------------------------------------------------- fetching

bool OxAdoRecordset::fetchOne() {
    if (m_sourceDone || !m_rowsSource)
        return false;
    std::vector<OxVariant> values;
    bool got = false;
    if (m_connection) {
        got = m_connection->call([&] { return m_rowsSource->fetch(values); });
    } else {
        try {
            got = m_rowsSource->fetch(values);
        } catch (const OxAdoProviderError& e) {
            throw OxComError(e.hresult(), e.description());
        }
    }
    if (!got) {
        releaseSource();
        return false;
    }
    values.resize(m_columns.size(), OxVariant::null());
    auto row = std::make_unique<Row>();
    row->values = std::move(values);
    row->changed.assign(m_columns.size(), false);
    row->id = m_nextId++;
    if (forwardOnly()) {
        m_rows.clear();
        m_view.clear();
    }
    m_view.push_back(row.get());
    m_rows.push_back(std::move(row));
    return true;
}

void OxAdoRecordset::fetchAll() {
    while (fetchOne()) {
    }
}

bool OxAdoRecordset::ensure(long position) {
    if (position < 0)
        return false;
    if (forwardOnly())
        return position < static_cast<long>(m_view.size());
    while (position >= static_cast<long>(m_view.size()) && fetchOne()) {
    }
    return position < static_cast<long>(m_view.size());
}

OxAdoRecordset::Row* OxAdoRecordset::current() const {
    if (m_pos < 0 || m_pos >= static_cast<long>(m_view.size()))
        return nullptr;
    return m_view[static_cast<size_t>(m_pos)];
}

void OxAdoRecordset::requireCurrent() const {
    requireOpen();
    if (!current() || m_currentDeleted)
        OxAdo::raise(OxAdo::adErrNoCurrentRecord);
}

// ---------------------------------------------------------------- position

bool OxAdoRecordset::bof() const {
    requireOpen();
    if (m_pos < 0)
        return true;
    return m_view.empty() && (!forwardOnly() || m_passed == 0);
}

bool OxAdoRecordset::eof() const {
    requireOpen();
    return m_pos >= static_cast<long>(m_view.size());
}

// Leaves a deleted current row behind: it stays current until the cursor moves.
void OxAdoRecordset::dropGhost() {
    if (!m_currentDeleted)
        return;
    m_currentDeleted = false;
    Row* r = current();
    if (!r)
        return;
    m_view.erase(m_view.begin() + m_pos);
    // A deletion still to be sent keeps its row; any other deleted row is gone.
    const bool pendingDelete = batch() && !(r->status & (OxAdo::adRecNew | OxAdo::adRecDBDeleted));
    if (!pendingDelete)
        std::erase_if(m_rows, [r](const std::unique_ptr<Row>& p) { return p.get() == r; });
}

void OxAdoRecordset::moveTo(long position) {
    if (position < 0) {
        m_pos = -1;
        return;
    }
    m_pos = ensure(position) ? position : static_cast<long>(m_view.size());
}

// Moving off a record commits its pending edit, as the model does.
void OxAdoRecordset::commitPendingEdit() {
    if (m_editMode != OxAdo::adEditNone)
        update();
}

void OxAdoRecordset::moveNext() {
    requireOpen();
    commitPendingEdit();
    if (eof())
        OxAdo::raise(OxAdo::adErrNoCurrentRecord);
    if (forwardOnly()) {
        m_currentDeleted = false;
        if (!m_view.empty())
            ++m_passed;
        m_rows.clear();
        m_view.clear();
        m_pos = 0;
        fetchOne();
        return;
    }
    long target = m_pos + 1;
    if (m_currentDeleted) {
        dropGhost();
        target = m_pos;
    }
    moveTo(target);
}

void OxAdoRecordset::movePrevious() {
    requireOpen();
    if (forwardOnly())
        cannotFetchBackwards();
    commitPendingEdit();
    if (bof())
        OxAdo::raise(OxAdo::adErrNoCurrentRecord);
    dropGhost();
    moveTo(std::min<long>(m_pos, static_cast<long>(m_view.size())) - 1);
}

void OxAdoRecordset::moveFirst() {
    requireOpen();
    commitPendingEdit();
    if (bof() && eof())
        OxAdo::raise(OxAdo::adErrNoCurrentRecord);
    if (forwardOnly()) {
        // Back to the first row means running the query again.
        if (m_passed == 0 && m_pos == 0 && !m_currentDeleted)
            return;
        requery();
        return;
    }
    dropGhost();
    moveTo(0);
}

void OxAdoRecordset::moveLast() {
    requireOpen();
    if (forwardOnly())
        cannotFetchBackwards();
    commitPendingEdit();
    if (bof() && eof())
        OxAdo::raise(OxAdo::adErrNoCurrentRecord);
    dropGhost();
    fetchAll();
    moveTo(static_cast<long>(m_view.size()) - 1);
}

void OxAdoRecordset::move(long rows, const OxVariant& start) {
    requireOpen();
    commitPendingEdit();
    if (forwardOnly()) {
        if (rows < 0 || !start.isEmpty())
            cannotFetchBackwards();
        if (rows > 0 && eof())
            OxAdo::raise(OxAdo::adErrNoCurrentRecord);
        for (long i = 0; i < rows && !eof(); ++i) moveNext();
        return;
    }
    long base = m_pos;
    if (!start.isEmpty()) {
        dropGhost();
        base = positionOf(rowById(static_cast<long>(start.changedType(VT_I8).llVal())));
        if (base < 0)
            OxAdo::raise(OxAdo::adErrInvalidArgument);
    } else {
        if ((rows > 0 && eof()) || (rows < 0 && bof()) || (rows == 0 && !current()))
            OxAdo::raise(OxAdo::adErrNoCurrentRecord);
        if (m_currentDeleted) {
            dropGhost();
            if (rows > 0)
                --rows;
            base = m_pos;
        }
    }
    if (base >= static_cast<long>(m_view.size()) && rows < 0) {
        fetchAll();
        base = static_cast<long>(m_view.size());
    }
    moveTo(base + rows);
}

long OxAdoRecordset::absolutePosition() const {
    requireOpen();
    if (m_pos < 0)
        return OxAdo::adPosBOF;
    if (m_pos >= static_cast<long>(m_view.size()))
        return bof() ? OxAdo::adPosUnknown : OxAdo::adPosEOF;
    return (forwardOnly() ? m_passed : 0) + m_pos + 1;
}

void OxAdoRecordset::setAbsolutePosition(long position) {
    requireOpen();
    if (forwardOnly())
        notCapable();
    if (position < 1)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    commitPendingEdit();
    dropGhost();
    moveTo(position - 1);
}

OxVariant OxAdoRecordset::bookmark() const {
    requireCurrent();
    if (forwardOnly())
        notCapable();
    return OxVariant(static_cast<double>(current()->id));
}

void OxAdoRecordset::setBookmark(const OxVariant& bookmark) {
    requireOpen();
    if (forwardOnly())
        notCapable();
    OxVariant id;
    if (OxHr::failed(bookmark.tryChangeType(VT_I8, id)))
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    commitPendingEdit();
    dropGhost();
    const long p = positionOf(rowById(static_cast<long>(id.llVal())));
    if (p < 0)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_pos = p;
}

OxAdoRecordset::Row* OxAdoRecordset::rowById(long id) const {
    for (const auto& r : m_rows)
        if (r->id == id)
            return r.get();
    return nullptr;
}

long OxAdoRecordset::positionOf(const Row* row) const {
    if (!row)
        return -1;
    for (size_t i = 0; i < m_view.size(); ++i)
        if (m_view[i] == row)
            return static_cast<long>(i);
    return -1;
}

long OxAdoRecordset::recordCount() {
    requireOpen();
    if (forwardOnly() ||
        (m_cursorLocation == OxAdo::adUseServer && m_cursorType == OxAdo::adOpenDynamic))
        return -1;
    fetchAll();
    return static_cast<long>(m_view.size()) - (m_currentDeleted ? 1 : 0);
}

bool OxAdoRecordset::supports(long options) const {
    long mask = OxAdo::adFind | OxAdo::adHoldRecords;
    if (!forwardOnly())
        mask |= OxAdo::adMovePrevious | OxAdo::adBookmark | OxAdo::adApproxPosition;
    if (updatable()) {
        mask |= OxAdo::adAddNew | OxAdo::adDelete | OxAdo::adUpdate;
        if (batch())
            mask |= OxAdo::adUpdateBatch;
    }
    if (m_connection && !forwardOnly())
        mask |= OxAdo::adResync;
    return (mask & options) == options;
}

// ---------------------------------------------------------------- find, filter, sort

int OxAdoRecordset::columnOf(const std::wstring& name) const {
    return static_cast<int>(m_fields.indexOf(name));
}

void OxAdoRecordset::find(const std::wstring& criteria, long skipRecords, int direction,
                          const OxVariant& start) {
    requireOpen();
    OxAdoCriteria c = OxAdoCriteria::parse(criteria);
    if (!c.isSingleComparison())
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    c.bind([this](const std::wstring& n) { return columnOf(n); },
           [this](int i) { return m_columns[static_cast<size_t>(i)].type; });
    if (skipRecords < 0)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    const bool backward = direction == OxAdo::adSearchBackward;
    commitPendingEdit();
    auto matches = [&](const Row* r) {
        return c.matches(
            [r](int i) -> const OxVariant& { return r->values[static_cast<size_t>(i)]; });
    };
    if (forwardOnly()) {
        if (backward || !start.isEmpty())
            cannotFetchBackwards();
        for (long i = 0; i < skipRecords && !eof(); ++i) moveNext();
        while (!eof()) {
            if (!m_currentDeleted && current() && matches(current()))
                return;
            moveNext();
        }
        return;
    }
    long p = m_pos;
    if (!start.isEmpty()) {
        dropGhost();
        OxVariant id;
        if (OxHr::failed(start.tryChangeType(VT_I8, id)))
            OxAdo::raise(OxAdo::adErrInvalidArgument);
        p = positionOf(rowById(static_cast<long>(id.llVal())));
        if (p < 0)
            OxAdo::raise(OxAdo::adErrInvalidArgument);
    } else if (m_currentDeleted) {
        dropGhost();
        p = m_pos;
        if (backward)
            --p;
    }
    if (!backward) {
        for (long i = std::max<long>(p, 0) + skipRecords; ensure(i); ++i)
            if (matches(m_view[static_cast<size_t>(i)])) {
                m_pos = i;
                return;
            }
        m_pos = static_cast<long>(m_view.size());
        return;
    }
    if (p >= static_cast<long>(m_view.size())) {
        fetchAll();
        p = static_cast<long>(m_view.size()) - 1;
    }
    for (long i = p - skipRecords; i >= 0; --i)
        if (matches(m_view[static_cast<size_t>(i)])) {
            m_pos = i;
            return;
        }
    m_pos = -1;
}

void OxAdoRecordset::setFilter(const OxVariant& filter) {
    requireOpen();
    if (forwardOnly())
        notCapable();
    OxAdoCriteria criteria;
    int group = OxAdo::adFilterNone;
    OxVariant stored = OxVariant(int32_t{OxAdo::adFilterNone});
    if (filter.vt() == VT_BSTR) {
        criteria = OxAdoCriteria::parse(filter.str());
        criteria.bind([this](const std::wstring& n) { return columnOf(n); },
                      [this](int i) { return m_columns[static_cast<size_t>(i)].type; });
        if (!criteria.empty())
            stored = filter;
    } else if (!filter.isEmpty() && !filter.isNull()) {
        OxVariant n;
        if (OxHr::failed(filter.tryChangeType(VT_I4, n)))
            OxAdo::raise(OxAdo::adErrInvalidArgument);
        group = n.lVal();
        if (group != OxAdo::adFilterNone && group != OxAdo::adFilterPendingRecords &&
            group != OxAdo::adFilterAffectedRecords && group != OxAdo::adFilterFetchedRecords &&
            group != OxAdo::adFilterConflictingRecords)
            OxAdo::raise(OxAdo::adErrInvalidArgument);
        stored = n;
    }
    commitPendingEdit();
    fetchAll();
    dropGhost();
    m_criteria = std::move(criteria);
    m_filterGroup = group;
    m_filterValue = stored;
    rebuildView();
    moveTo(0);
}

void OxAdoRecordset::setSort(const std::wstring& sort) {
    requireOpen();
    if (forwardOnly())
        notCapable();
    OxAdoSortOrder order = OxAdoSortOrder::parse(sort);
    order.bind([this](const std::wstring& n) { return columnOf(n); });
    commitPendingEdit();
    fetchAll();
    dropGhost();
    m_sortOrder = std::move(order);
    m_sortText = m_sortOrder.empty() ? std::wstring() : sort;
    rebuildView();
    moveTo(0);
}

void OxAdoRecordset::rebuildView() {
    m_view.clear();
    for (const auto& p : m_rows) {
        Row* r = p.get();
        if (r->status & OxAdo::adRecDeleted)
            continue;
        switch (m_filterGroup) {
            case OxAdo::adFilterPendingRecords:
                if (!(r->status & (OxAdo::adRecNew | OxAdo::adRecModified)))
                    continue;
                break;
            case OxAdo::adFilterAffectedRecords:
                if (!r->affected)
                    continue;
                break;
            case OxAdo::adFilterConflictingRecords:
                if (!(r->status &
                      (OxAdo::adRecConcurrencyViolation | OxAdo::adRecIntegrityViolation)))
                    continue;
                break;
            default:
                break;
        }
        if (!m_criteria.empty() && !m_criteria.matches([r](int i) -> const OxVariant& {
                return r->values[static_cast<size_t>(i)];
            }))
            continue;
        m_view.push_back(r);
    }
    if (!m_sortOrder.empty())
        std::stable_sort(m_view.begin(), m_view.end(), [this](const Row* a, const Row* b) {
            return m_sortOrder.compare(
                       [a](int i) -> const OxVariant& { return a->values[static_cast<size_t>(i)]; },
                       [b](int i) -> const OxVariant& {
                           return b->values[static_cast<size_t>(i)];
                       }) < 0;
        });
}

// ---------------------------------------------------------------- values

const OxVariant& OxAdoRecordset::valueAt(int column) const {
    requireCurrent();
    if (column < 0 || column >= static_cast<int>(m_columns.size()))
        OxAdo::raise(OxAdo::adErrItemNotFound);
    const Row* r = current();
    if (m_editMode != OxAdo::adEditNone && m_editRow == r)
        return m_edit[static_cast<size_t>(column)];
    return r->values[static_cast<size_t>(column)];
}

OxVariant OxAdoRecordset::originalValueAt(int column) const {
    requireCurrent();
    if (column < 0 || column >= static_cast<int>(m_columns.size()))
        OxAdo::raise(OxAdo::adErrItemNotFound);
    const Row* r = current();
    if (r->status & OxAdo::adRecNew)
        return OxVariant::null();
    return r->original.empty() ? r->values[static_cast<size_t>(column)]
                               : r->original[static_cast<size_t>(column)];
}

void OxAdoRecordset::setValueAt(int column, const OxVariant& value) {
    requireOpen();
    if (!updatable())
        notUpdatable();
    requireCurrent();
    if (column < 0 || column >= static_cast<int>(m_columns.size()))
        OxAdo::raise(OxAdo::adErrItemNotFound);
    const OxAdoColumnInfo& c = m_columns[static_cast<size_t>(column)];
    if (!OxAdoRowWriter::isWritable(c))
        multipleStep(L"field " + c.name + L" cannot be written");
    OxVariant typed;
    try {
        typed = OxAdo::coerceToType(value, c.type);
    } catch (const OxComError&) {
        multipleStep(L"the value does not convert to the type of field " + c.name);
    }
    if ((OxAdo::isTextType(c.type) && !OxAdo::isLongType(c.type) && c.definedSize > 0 &&
         textLength(typed) > static_cast<size_t>(c.definedSize)) ||
        ((c.type == OxAdo::adBinary || c.type == OxAdo::adVarBinary) && c.definedSize > 0 &&
         typed.bytesSize() > static_cast<size_t>(c.definedSize)))
        multipleStep(L"the value is longer than field " + c.name);
    Row* r = current();
    if (m_editMode == OxAdo::adEditNone) {
        m_editMode = OxAdo::adEditInProgress;
        m_editRow = r;
        m_edit = r->values;
        m_editChanged.assign(m_columns.size(), false);
    }
    m_edit[static_cast<size_t>(column)] = std::move(typed);
    m_editChanged[static_cast<size_t>(column)] = true;
}

long OxAdoRecordset::status() const {
    requireOpen();
    const Row* r = current();
    if (!r)
        OxAdo::raise(OxAdo::adErrNoCurrentRecord);
    return r->status;
}

// ---------------------------------------------------------------- edits

void OxAdoRecordset::resetEdit() {
    m_editMode = OxAdo::adEditNone;
    m_editRow = nullptr;
    m_edit.clear();
    m_editChanged.clear();
}

void OxAdoRecordset::addNew() {
    requireOpen();
    if (!updatable())
        notUpdatable();
    commitPendingEdit();
    if (!forwardOnly())
        fetchAll();
    dropGhost();
    const Row* before = current();
    m_idBeforeAdd = before ? before->id : 0;
    m_posBeforeAdd = m_pos;
    auto row = std::make_unique<Row>();
    row->values.assign(m_columns.size(), OxVariant::null());
    row->changed.assign(m_columns.size(), false);
    row->status = OxAdo::adRecNew;
    row->id = m_nextId++;
    Row* r = row.get();
    m_rows.push_back(std::move(row));
    m_view.push_back(r);
    m_pos = static_cast<long>(m_view.size()) - 1;
    m_editMode = OxAdo::adEditAdd;
    m_editRow = r;
    m_edit = r->values;
    m_editChanged.assign(m_columns.size(), false);
}

void OxAdoRecordset::update() {
    requireOpen();
    if (m_editMode == OxAdo::adEditNone)
        return;
    Row& r = *m_editRow;
    if (batch()) {
        if (m_editMode == OxAdo::adEditInProgress && !(r.status & OxAdo::adRecNew)) {
            if (r.original.empty())
                r.original = r.values;
            r.status = OxAdo::adRecModified;
        }
        for (size_t i = 0; i < m_editChanged.size(); ++i)
            if (m_editChanged[i])
                r.changed[i] = true;
        r.values = m_edit;
    } else {
        if (!m_connection)
            OxAdo::raise(OxAdo::adErrInvalidConnection);
        OxAdoRowWriter writer(
            *m_connection, m_columns, m_keyCache,
            static_cast<int>(m_properties.valueOf(L"Update Criteria").changedType(VT_I4).lVal()));
        std::vector<OxVariant> values = m_edit;
        if (m_editMode == OxAdo::adEditAdd)
            writer.insert(values, m_editChanged);
        else
            writer.update(r.values, values, m_editChanged);
        r.values = std::move(values);
        r.status = OxAdo::adRecUnmodified;
    }
    resetEdit();
}

void OxAdoRecordset::cancelUpdate() {
    requireOpen();
    if (m_editMode == OxAdo::adEditAdd) {
        Row* r = m_editRow;
        resetEdit();
        std::erase(m_view, r);
        std::erase_if(m_rows, [r](const std::unique_ptr<Row>& p) { return p.get() == r; });
        const long p = positionOf(rowById(m_idBeforeAdd));
        m_pos = p >= 0 ? p : std::min<long>(m_posBeforeAdd, static_cast<long>(m_view.size()));
        return;
    }
    resetEdit();
}

void OxAdoRecordset::remove(int affect) {
    requireOpen();
    if (!updatable())
        notUpdatable();
    if (affect != OxAdo::adAffectCurrent) {
        if (forwardOnly())
            notCapable();
        commitPendingEdit();
        dropGhost();
        const std::vector<Row*> rows = m_view;
        for (size_t i = 0; i < rows.size(); ++i) {
            m_pos = positionOf(rows[i]);
            remove(OxAdo::adAffectCurrent);
            dropGhost();
        }
        moveTo(0);
        return;
    }
    if (m_editMode == OxAdo::adEditAdd) {
        cancelUpdate();
        return;
    }
    resetEdit();
    requireCurrent();
    Row* r = current();
    if (!batch() && !(r->status & OxAdo::adRecNew)) {
        if (!m_connection)
            OxAdo::raise(OxAdo::adErrInvalidConnection);
        OxAdoRowWriter writer(*m_connection, m_columns, m_keyCache, OxAdoRowWriter::CriteriaKey);
        writer.remove(r->original.empty() ? r->values : r->original);
        r->status |= OxAdo::adRecDBDeleted;
    }
    r->status |= OxAdo::adRecDeleted;
    m_currentDeleted = true;
}

void OxAdoRecordset::writeRow(Row& r) {
    OxAdoRowWriter writer(
        *m_connection, m_columns, m_keyCache,
        static_cast<int>(m_properties.valueOf(L"Update Criteria").changedType(VT_I4).lVal()));
    const std::vector<OxVariant>& original = r.original.empty() ? r.values : r.original;
    if (r.status & OxAdo::adRecDeleted) {
        if (!(r.status & OxAdo::adRecNew))
            writer.remove(original);
    } else if (r.status & OxAdo::adRecNew) {
        writer.insert(r.values, r.changed);
    } else if (r.status & OxAdo::adRecModified) {
        writer.update(original, r.values, r.changed);
    }
}

std::vector<OxAdoRecordset::Row*> OxAdoRecordset::rowsFor(int affect) const {
    std::vector<Row*> rows;
    if (affect == OxAdo::adAffectCurrent) {
        if (Row* r = current())
            rows.push_back(r);
    } else if (affect == OxAdo::adAffectGroup) {
        rows = m_view;
    } else {
        for (const auto& p : m_rows) rows.push_back(p.get());
    }
    return rows;
}

void OxAdoRecordset::updateBatch(int affect) {
    requireOpen();
    if (!updatable())
        notUpdatable();
    commitPendingEdit();
    if (!batch())
        return;  // immediate updates leave nothing pending
    if (!m_connection)
        OxAdo::raise(OxAdo::adErrInvalidConnection);
    const long keepId = current() ? current()->id : 0;
    const bool ghost = m_currentDeleted;
    std::vector<Row*> rows = rowsFor(affect);
    for (const auto& p : m_rows) p->affected = false;
    std::exception_ptr first;
    for (Row* r : rows) {
        const bool pending =
            (r->status & (OxAdo::adRecNew | OxAdo::adRecModified | OxAdo::adRecDeleted)) != 0;
        if (!pending)
            continue;
        try {
            writeRow(*r);
            r->affected = true;
            r->status = (r->status & OxAdo::adRecDeleted)
                            ? OxAdo::adRecDeleted | OxAdo::adRecDBDeleted
                            : OxAdo::adRecUnmodified;
            r->original.clear();
            r->changed.assign(m_columns.size(), false);
        } catch (const OxComError& e) {
            r->status |= e.Error() == OxAdo::Hr::DB_E_CONCURRENCYVIOLATION
                             ? OxAdo::adRecConcurrencyViolation
                             : OxAdo::adRecIntegrityViolation;
            if (!first)
                first = std::current_exception();
        }
    }
    // Rows whose deletion reached the source are gone.
    Row* cur = current();
    for (auto it = m_rows.begin(); it != m_rows.end();) {
        Row* r = it->get();
        if ((r->status & OxAdo::adRecDBDeleted) && !(ghost && r == cur)) {
            std::erase(m_view, r);
            it = m_rows.erase(it);
        } else {
            ++it;
        }
    }
    const long p = positionOf(rowById(keepId));
    if (p >= 0)
        m_pos = p;
    else if (m_pos > static_cast<long>(m_view.size()))
        m_pos = static_cast<long>(m_view.size());
    if (first)
        std::rethrow_exception(first);
}

void OxAdoRecordset::cancelBatch(int affect) {
    requireOpen();
    if (m_editMode != OxAdo::adEditNone)
        cancelUpdate();
    const long keepId = current() ? current()->id : 0;
    const std::vector<Row*> rows = rowsFor(affect);
    std::vector<Row*> gone;
    for (Row* r : rows) {
        if (r->status & (OxAdo::adRecNew | OxAdo::adRecDBDeleted)) {
            gone.push_back(r);
            continue;
        }
        if (!r->original.empty())
            r->values = r->original;
        r->original.clear();
        r->changed.assign(m_columns.size(), false);
        r->status = OxAdo::adRecUnmodified;
    }
    m_currentDeleted = false;
    for (Row* r : gone)
        std::erase_if(m_rows, [r](const std::unique_ptr<Row>& p) { return p.get() == r; });
    rebuildView();
    const long p = positionOf(rowById(keepId));
    moveTo(p >= 0 ? p : 0);
}
