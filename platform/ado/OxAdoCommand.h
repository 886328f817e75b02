#pragma once

#include <memory>
#include <string>

#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoParameter.h"
#include "platform/core/OxExport.h"

class OxAdoConnection;
class OxAdoRecordset;

// A statement with parameters, run on a connection any number of times.
class OX_EXPORT OxAdoCommand {
public:
    static std::shared_ptr<OxAdoCommand> create();

    std::shared_ptr<OxAdoConnection> activeConnection() const { return m_connection; }
    void setActiveConnection(const std::shared_ptr<OxAdoConnection>& connection);
    const std::wstring& commandText() const { return m_text; }
    void setCommandText(const std::wstring& text) { m_text = text; }
    int commandType() const { return m_type; }
    void setCommandType(int type);
    bool prepared() const { return m_prepared; }
    void setPrepared(bool prepared) { m_prepared = prepared; }
    long commandTimeout() const { return m_timeout; }
    void setCommandTimeout(long seconds);

    // A new parameter, not yet appended.
    std::shared_ptr<OxAdoParameter> createParameter(const std::wstring& name = {},
                                                    int type = OxAdo::adEmpty,
                                                    int direction = OxAdo::adParamInput,
                                                    long size = 0, const OxVariant& value = {});
    OxAdoParameters& parameters() { return m_parameters; }

    // Runs with the parameters' values; the rows as a forward-only, read-only recordset,
    // or null with adExecuteNoRecords (or when the statement gives none).
    std::shared_ptr<OxAdoRecordset> execute(long* recordsAffected = nullptr,
                                            long options = OxAdo::adOptionUnspecified);

private:
    OxAdoCommand() = default;

    std::shared_ptr<OxAdoConnection> m_connection;
    std::wstring m_text;
    int m_type = OxAdo::adCmdUnknown;
    bool m_prepared = false;
    long m_timeout = 30;
    OxAdoParameters m_parameters;
};
