#include "platform/ado/OxAdoCommand.h"

#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoRecordset.h"

std::shared_ptr<OxAdoCommand> OxAdoCommand::create() {
    return std::shared_ptr<OxAdoCommand>(new OxAdoCommand());
}

void OxAdoCommand::setActiveConnection(const std::shared_ptr<OxAdoConnection>& connection) {
    m_connection = connection;
    if (connection)
        m_timeout = connection->commandTimeout();
}

void OxAdoCommand::setCommandType(int type) {
    if (type != OxAdo::adCmdText && type != OxAdo::adCmdTable && type != OxAdo::adCmdStoredProc &&
        type != OxAdo::adCmdUnknown && type != OxAdo::adCmdTableDirect &&
        type != OxAdo::adCmdUnspecified)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_type = type;
}

void OxAdoCommand::setCommandTimeout(long seconds) {
    if (seconds < 0)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    m_timeout = seconds;
}

std::shared_ptr<OxAdoParameter> OxAdoCommand::createParameter(const std::wstring& name, int type,
                                                              int direction, long size,
                                                              const OxVariant& value) {
    return std::make_shared<OxAdoParameter>(name, type, direction, size, value);
}

std::shared_ptr<OxAdoRecordset> OxAdoCommand::execute(long* recordsAffected, long options) {
    if (!m_connection || m_connection->state() != OxAdo::adStateOpen)
        OxAdo::raise(OxAdo::adErrInvalidConnection);
    if (m_text.empty())
        OxAdo::raise(OxAdo::adErrInvalidArgument,
                     L"Command text was not set for the command object.");
    long type = m_type == OxAdo::adCmdUnspecified ? OxAdo::adCmdText : m_type;
    if (options != OxAdo::adOptionUnspecified &&
        (options &
         (OxAdo::adCmdTable | OxAdo::adCmdStoredProc | OxAdo::adCmdTableDirect | OxAdo::adCmdText)))
        type = OxAdo::commandTypeOf(options);
    if (type == OxAdo::adCmdUnknown)
        type = OxAdo::adCmdText;
    if (type == OxAdo::adCmdStoredProc)
        OxAdo::raise(OxAdo::adErrFeatureNotAvailable);
    std::wstring text = m_text;
    if (type == OxAdo::adCmdTable || type == OxAdo::adCmdTableDirect)
        text = L"SELECT * FROM " + m_connection->session().quoteIdentifier(m_text);
    std::vector<OxAdoParamValue> params;
    for (const auto& p : m_parameters) {
        OxAdoParamValue v;
        v.type = p->type();
        v.direction = p->direction();
        v.size = p->size();
        try {
            v.value = OxAdo::coerceToType(p->value(), p->type());
        } catch (const OxComError&) {
            OxAdo::raise(OxAdo::Hr::DB_E_ERRORSOCCURRED,
                         L"Multiple-step operation generated errors. Check each status value. "
                         L"(the value of parameter " +
                             p->name() + L" does not convert to its type)");
        }
        params.push_back(std::move(v));
    }
    const bool noRecords =
        options != OxAdo::adOptionUnspecified && (options & OxAdo::adExecuteNoRecords) != 0;
    OxAdoExecArgs args;
    args.wantRows = !noRecords;
    args.prepared = m_prepared;
    args.timeout = m_timeout;
    long affected = -1;
    std::unique_ptr<OxAdoRowSource> rows = m_connection->call(
        [&] { return m_connection->session().execute(text, params, args, affected); });
    if (recordsAffected)
        *recordsAffected = affected;
    if (noRecords || !rows)
        return nullptr;
    auto rs = OxAdoRecordset::create();
    rs->openRows(std::move(rows), m_connection, OxAdo::adOpenForwardOnly, OxAdo::adLockReadOnly,
                 text, std::move(params));
    return rs;
}
