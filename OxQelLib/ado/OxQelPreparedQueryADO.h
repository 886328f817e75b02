#pragma once

#include <map>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "OxQelLib/interfaces/OxQelIPreparedQuery.h"
#include "platform/core/OxComError.h"

class OxAdoCommand;
class OxAdoParameter;

// The prepared statement of the backends on the data-access object model: a Command
// prepared once, whose parameters are created at the first execution and only given new
// values afterwards. The markers "]]]n[[[" become positional placeholders; each takes the
// value bound to its own number.
class OX_EXPORT OxQelPreparedQueryADO : public OxQelIPreparedQuery {
    OX_DECLARE_DYNAMIC(OxQelPreparedQueryADO)
public:
    OxQelPreparedQueryADO();
    ~OxQelPreparedQueryADO() override;

    using OxQelIPreparedQuery::bindParameter;

    bool setConnection(OxQelIConnection* connection) override;
    bool prepareQuery(const std::wstring& statement) override;
    bool bindParameter(int index, bool value) override;
    bool bindParameter(int index, long value) override;
    bool bindParameter(int index, double value) override;
    bool bindParameter(int index, const OxDateTime& value) override;
    bool bindParameter(int index, const std::wstring& value) override;
    bool bindParameterVariant(int index, const OxVariant& value, OxQel::FieldType type) override;
    bool executePreparedQuery() override;
    bool deletePreparedQuery() override;
    // Every "]]]n[[[" replaced by "?"; nothing else changes.
    std::wstring formatParametersInQuery(const std::wstring& statement) override;

    void getProviderError(std::wstring& message);
    static void getComError(std::wstring& message, const OxComError& error);

private:
    bool bindParameter(int index, const OxVariant& value, int adoType);
    bool isValid();
    // The statement with placeholders, and the marker numbers in text order.
    static std::wstring placeholders(const std::wstring& statement, std::vector<int>* markers);

    OxQelIConnection* m_connection = nullptr;
    std::shared_ptr<OxAdoCommand> m_command;
    bool m_notPrepared = true;
    bool m_parametersPending = true;
    std::unordered_map<int, std::shared_ptr<OxAdoParameter>> m_parameters{10};
    std::vector<int> m_markers;
    // Markers used more than once get one parameter per place, all re-valued together.
    std::map<int, std::vector<std::shared_ptr<OxAdoParameter>>> m_repeats;
};
