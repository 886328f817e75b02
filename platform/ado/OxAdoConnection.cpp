#include "platform/ado/OxAdoConnection.h"

#include "platform/ado/OxAdoProviderRegistry.h"
#include "platform/ado/OxAdoRecordset.h"
#include "platform/ado/OxAdoSchemaRowsets.h"
#include "platform/core/OxText.h"

std::shared_ptr<OxAdoConnection> OxAdoConnection::create() {
    return std::shared_ptr<OxAdoConnection>(new OxAdoConnection());
}

OxAdoConnection::~OxAdoConnection() {
    // Released while open: what a transaction did is rolled back, as the model does.
    closeRecordsets();
    if (m_session && m_inTransaction) {
        try {
            m_session->rollbackTrans();
        } catch (...) {
        }
    }
    releaseSession();
}

void OxAdoConnection::setConnectionString(const std::wstring& text) {
    if (m_session)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    m_connectionString = text;
}

void OxAdoConnection::setConnectionTimeout(long seconds) {
    if (m_session)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    if (seconds < 0)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_connectionTimeout = seconds;
}

void OxAdoConnection::setCommandTimeout(long seconds) {
    if (seconds < 0)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_commandTimeout = seconds;
}

void OxAdoConnection::setCursorLocation(int location) {
    if (location != OxAdo::adUseServer && location != OxAdo::adUseClient &&
        location != OxAdo::adUseNone)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_cursorLocation = location == OxAdo::adUseNone ? OxAdo::adUseServer : location;
}

void OxAdoConnection::setIsolationLevel(long level) {
    m_isolationLevel = level;
    if (m_session)
        call([&] { m_session->setIsolationLevel(level); });
}

std::wstring OxAdoConnection::provider() const {
    if (m_session)
        return m_session->providerName();
    return OxAdoProviderRegistry::providerOf(m_connectionString);
}

long OxAdoConnection::state() const {
    if (!m_session || m_session->isBroken())
        return OxAdo::adStateClosed;
    return OxAdo::adStateOpen;
}

void OxAdoConnection::requireOpen() const {
    if (state() != OxAdo::adStateOpen)
        OxAdo::raise(m_session ? OxAdo::adErrInvalidConnection : OxAdo::adErrObjectClosed);
}

OxAdoSession& OxAdoConnection::session() {
    if (!m_session || m_session->isBroken())
        OxAdo::raise(OxAdo::adErrInvalidConnection);
    return *m_session;
}

void OxAdoConnection::providerFailed(const OxAdoProviderError& e) {
    m_errors.assign(e.records());
    throw OxComError(e.hresult(), e.description());
}

void OxAdoConnection::unexpectedFailure(const std::exception& e) {
    const std::wstring text = OxText::fromUtf8(e.what());
    m_errors.assign({{OxHr::E_FAIL, text, 0, {}, {}}});
    throw OxComError(OxHr::E_FAIL, text);
}

void OxAdoConnection::open(const std::wstring& connectionString, const std::wstring& userId,
                           const std::wstring& password, long) {
    if (m_session)
        OxAdo::raise(OxAdo::adErrObjectOpen);
    if (!connectionString.empty())
        m_connectionString = connectionString;
    std::unique_ptr<OxAdoSession> opened =
        call([&] { return OxAdoProviderRegistry::createSession(m_connectionString); });
    OxAdoSession::OpenArgs args;
    args.connectionString = m_connectionString;
    args.userId = userId;
    args.password = password;
    args.connectionTimeout = m_connectionTimeout;
    args.commandTimeout = m_commandTimeout;
    call([&] { opened->open(args); });
    m_session = std::move(opened);
    m_inTransaction = false;
    m_properties.clear();
    for (const auto& [name, value] : m_session->properties())
        m_properties.add(name, value, [this](const std::wstring& n, const OxVariant& v) {
            call([&] { session().setProperty(n, v); });
        });
    // The isolation level of work outside transactions, as the providers name it.
    if (!m_properties.find(L"Autocommit Isolation Levels"))
        m_properties.add(L"Autocommit Isolation Levels",
                         OxVariant(int32_t{OxAdo::adXactCursorStability}),
                         [this](const std::wstring&, const OxVariant& v) {
                             const long level = v.changedType(VT_I4).lVal();
                             call([&] { session().setIsolationLevel(level); });
                         });
    if (m_isolationLevel != OxAdo::adXactCursorStability) {
        try {
            call([&] { m_session->setIsolationLevel(m_isolationLevel); });
        } catch (...) {
            releaseSession();
            throw;
        }
    }
}

void OxAdoConnection::closeRecordsets() noexcept {
    std::vector<std::weak_ptr<OxAdoRecordset>> recordsets;
    recordsets.swap(m_recordsets);
    for (auto& weak : recordsets)
        if (auto rs = weak.lock()) {
            try {
                if (rs->state() == OxAdo::adStateOpen && rs->activeConnection().get() == this)
                    rs->close();
            } catch (...) {
            }
        }
}

void OxAdoConnection::releaseSession() noexcept {
    if (m_session)
        m_session->close();
    m_session.reset();
    m_inTransaction = false;
}

void OxAdoConnection::close() {
    if (!m_session)
        OxAdo::raise(OxAdo::adErrObjectClosed);
    if (m_inTransaction && !m_session->isBroken())
        OxAdo::raise(OxAdo::adErrInTransaction);
    closeRecordsets();
    releaseSession();
}

void OxAdoConnection::attach(const std::shared_ptr<OxAdoRecordset>& recordset) {
    std::erase_if(m_recordsets, [](const std::weak_ptr<OxAdoRecordset>& w) { return w.expired(); });
    m_recordsets.push_back(recordset);
}

std::shared_ptr<OxAdoRecordset> OxAdoConnection::execute(const std::wstring& commandText,
                                                         long* recordsAffected, long options) {
    requireOpen();
    const bool noRecords =
        options != OxAdo::adOptionUnspecified && (options & OxAdo::adExecuteNoRecords) != 0;
    const long commandType = OxAdo::commandTypeOf(options);
    std::wstring text = commandText;
    if (commandType == OxAdo::adCmdTable || commandType == OxAdo::adCmdTableDirect)
        text = L"SELECT * FROM " + session().quoteIdentifier(commandText);
    else if (commandType == OxAdo::adCmdStoredProc)
        OxAdo::raise(OxAdo::adErrFeatureNotAvailable);
    OxAdoExecArgs args;
    args.wantRows = !noRecords;
    args.timeout = m_commandTimeout;
    long affected = -1;
    std::unique_ptr<OxAdoRowSource> rows =
        call([&] { return session().execute(text, {}, args, affected); });
    if (recordsAffected)
        *recordsAffected = affected;
    if (noRecords)
        return nullptr;
    auto rs = OxAdoRecordset::create();
    if (rows)
        rs->openRows(std::move(rows), shared_from_this(), OxAdo::adOpenForwardOnly,
                     OxAdo::adLockReadOnly, commandText);
    return rs;
}

long OxAdoConnection::beginTrans() {
    requireOpen();
    if (!session().supportsTransactions())
        OxAdo::raise(OxAdo::adErrFeatureNotAvailable);
    if (m_inTransaction)
        OxAdo::raise(OxAdo::Hr::XACT_E_XTIONEXISTS,
                     L"Only one transaction can be active on this session.");
    call([&] { session().beginTrans(); });
    m_inTransaction = true;
    return 1;
}

void OxAdoConnection::commitTrans() {
    requireOpen();
    if (!m_inTransaction)
        OxAdo::raise(OxAdo::Hr::XACT_E_NOTRANSACTION, L"No transaction is active.");
    call([&] { session().commitTrans(); });
    m_inTransaction = false;
}

void OxAdoConnection::rollbackTrans() {
    requireOpen();
    if (!m_inTransaction)
        OxAdo::raise(OxAdo::Hr::XACT_E_NOTRANSACTION, L"No transaction is active.");
    // Whatever the source answers, the transaction is over.
    m_inTransaction = false;
    call([&] { session().rollbackTrans(); });
}

std::shared_ptr<OxAdoRecordset> OxAdoConnection::openSchema(
    int schema, const std::vector<OxVariant>& restrictions) {
    requireOpen();
    std::unique_ptr<OxAdoRowSource> rows =
        call([&] { return OxAdoSchemaRowsets::build(session(), schema, restrictions); });
    auto rs = OxAdoRecordset::create();
    rs->setCursorLocation(OxAdo::adUseClient);
    rs->openRows(std::move(rows), shared_from_this(), OxAdo::adOpenStatic, OxAdo::adLockReadOnly);
    return rs;
}
