#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelPreparedQueryADO"
#include "OxQelLib/ado/OxQelPreparedQueryADO.h"

#include <cstdint>
#include <limits>

#include "OxQelLib/ado/OxQelConnectionADO.h"
#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "platform/ado/OxAdoCommand.h"
#include "platform/ado/OxAdoConnection.h"
#include "platform/core/OxFormat.h"

OX_IMPLEMENT_DYNAMIC(OxQelPreparedQueryADO, OxQelIPreparedQuery)

namespace {
bool fitsInt32(long long value) {
    return value >= std::numeric_limits<int32_t>::min() &&
           value <= std::numeric_limits<int32_t>::max();
}
}  // namespace

OxQelPreparedQueryADO::OxQelPreparedQueryADO() = default;

OxQelPreparedQueryADO::~OxQelPreparedQueryADO() {
    deletePreparedQuery();
}

void OxQelPreparedQueryADO::getProviderError(std::wstring& message) {
    message.clear();
    if (auto* ado = OxQelConnectionADO::cast(m_connection))
        ado->getProviderError(message);
}

void OxQelPreparedQueryADO::getComError(std::wstring& message, const OxComError& error) {
    OxQelConnectionADO::getComError(message, error);
}

bool OxQelPreparedQueryADO::setConnection(OxQelIConnection* connection) {
    if (!connection || !connection->isOpen() || !OxQelConnectionADO::cast(connection))
        return false;
    m_connection = connection;
    return true;
}

bool OxQelPreparedQueryADO::isValid() {
    return m_connection && m_connection->isOpen() && m_command;
}

std::wstring OxQelPreparedQueryADO::placeholders(const std::wstring& text,
                                                 std::vector<int>* markers) {
    std::wstring out;
    out.reserve(text.size());
    size_t i = 0;
    while (i < text.size()) {
        if (text.compare(i, 3, L"]]]") == 0) {
            size_t d = i + 3;
            while (d < text.size() && text[d] >= L'0' && text[d] <= L'9') ++d;
            if (d > i + 3 && text.compare(d, 3, L"[[[") == 0) {
                if (markers) {
                    // Numbers too long for an int never match a bound index.
                    const std::wstring digits = text.substr(i + 3, d - i - 3);
                    markers->push_back(digits.size() > 9 ? -1 : std::stoi(digits));
                }
                out += L'?';
                i = d + 3;
                continue;
            }
        }
        out += text[i++];
    }
    return out;
}

std::wstring OxQelPreparedQueryADO::formatParametersInQuery(const std::wstring& statement) {
    return placeholders(statement, nullptr);
}

bool OxQelPreparedQueryADO::prepareQuery(const std::wstring& statement) {
    if (!m_connection || !m_connection->isOpen())
        return false;
    try {
        m_parameters.clear();
        m_repeats.clear();
        m_markers.clear();
        m_command.reset();
        m_command = OxAdoCommand::create();
        m_command->setActiveConnection(OxQelConnectionADO::cast(m_connection)->getConnection());
        m_command->setCommandText(placeholders(statement, &m_markers));
        m_command->setCommandType(OxAdo::adCmdText);
        m_command->setPrepared(true);
        m_notPrepared = false;
        return true;
    } catch (...) {
        OXQEL_REPORT(OxQelConnectionADO::currentErrorMessage(m_connection),
                     L"OxQelPreparedQueryADO::prepareQuery", statement);
        return false;
    }
}

bool OxQelPreparedQueryADO::bindParameter(int index, const OxVariant& value, int adoType) {
    if (index < 1)
        return false;
    try {
        if (!m_command)
            throw OxComError(OxHr::E_POINTER);
        const std::wstring name = oxFormat(L"@P%d", index);
        if (m_parametersPending) {
            m_parameters[index] =
                m_command->createParameter(name, adoType, OxAdo::adParamInput, -1, value);
        } else {
            m_command->parameters().item(name)->setValue(value);
            auto it = m_repeats.find(index);
            if (it != m_repeats.end())
                for (const auto& p : it->second) p->setValue(value);
        }
        return true;
    } catch (...) {
        std::wstring text;
        OxQel::Util::tryVariantToString(value, text);
        OXQEL_REPORT(OxQelConnectionADO::currentErrorMessage(m_connection),
                     L"OxQelPreparedQueryADO::bindParameter",
                     oxFormat(L"Index: %d Value: %s", index, text));
        return false;
    }
}

bool OxQelPreparedQueryADO::bindParameter(int index, bool value) {
    return bindParameter(index, OxVariant(value), OxAdo::adBoolean);
}

// A long keeps its 64 bits: it binds as a big integer when it does not fit in 32.
bool OxQelPreparedQueryADO::bindParameter(int index, long value) {
    if (fitsInt32(value))
        return bindParameter(index, OxVariant(static_cast<int32_t>(value)), OxAdo::adInteger);
    return bindParameter(index, OxVariant(static_cast<long long>(value)), OxAdo::adBigInt);
}

bool OxQelPreparedQueryADO::bindParameter(int index, double value) {
    return bindParameter(index, OxVariant(value), OxAdo::adDouble);
}

// A date binds with its time of day (a date-only type would drop it), and a date that is
// not valid binds as NULL rather than as the day zero of the calendar.
bool OxQelPreparedQueryADO::bindParameter(int index, const OxDateTime& value) {
    const OxVariant v =
        value.getStatus() == OxDateTime::valid ? OxVariant(value.serial()) : OxVariant::null();
    return bindParameter(index, v, OxAdo::adDBTimeStamp);
}

bool OxQelPreparedQueryADO::bindParameter(int index, const std::wstring& value) {
    return bindParameter(index, OxVariant(value), OxAdo::adBSTR);
}

bool OxQelPreparedQueryADO::bindParameterVariant(int index, const OxVariant& value,
                                                 OxQel::FieldType type) {
    int adoType = OxQel::QelFieldTypeToADODBType(type);
    // Bytes bind as bytes (the type map gives binary columns the GUID type), and whole
    // numbers beyond 32 bits as big integers.
    if (value.isByteArray())
        adoType = OxAdo::adLongVarBinary;
    else if (adoType == OxAdo::adInteger &&
             (value.vt() == VT_I8 || value.vt() == VT_UI8 || value.vt() == VT_UI4))
        adoType = OxAdo::adBigInt;
    return bindParameter(index, value, adoType);
}

bool OxQelPreparedQueryADO::executePreparedQuery() {
    if (!isValid())
        return false;
    try {
        if (m_parametersPending) {
            OxAdoParameters& parameters = m_command->parameters();
            // A first execution that failed is tried again from scratch.
            parameters.clear();
            m_repeats.clear();
            if (!m_markers.empty()) {
                // The n-th placeholder takes the value bound to the n-th marker's number; a
                // marker that was never bound ends the walk.
                std::map<int, int> uses;
                for (int number : m_markers) {
                    auto it = m_parameters.find(number);
                    if (it == m_parameters.end())
                        break;
                    if (++uses[number] == 1) {
                        parameters.append(it->second);
                        continue;
                    }
                    const auto& p = it->second;
                    auto again = m_command->createParameter(
                        oxFormat(L"@P%d#%d", number, uses[number]), p->type(), p->direction(),
                        p->size(), p->value());
                    parameters.append(again);
                    m_repeats[number].push_back(again);
                }
            } else {
                for (int i = 1; i <= static_cast<int>(m_parameters.size()); ++i) {
                    auto it = m_parameters.find(i);
                    if (it != m_parameters.end())
                        parameters.append(it->second);
                }
            }
        }
        m_command->execute(nullptr, long{OxAdo::adCmdText} | OxAdo::adExecuteNoRecords);
        m_parametersPending = false;
        return true;
    } catch (...) {
        OXQEL_REPORT(OxQelConnectionADO::currentErrorMessage(m_connection),
                     L"OxQelPreparedQueryADO::executePreparedQuery",
                     m_command ? m_command->commandText() : std::wstring());
        return false;
    }
}

bool OxQelPreparedQueryADO::deletePreparedQuery() {
    if (m_notPrepared)
        return true;
    try {
        m_parameters.clear();
        m_repeats.clear();
        m_markers.clear();
        m_command.reset();
        m_notPrepared = true;
        m_parametersPending = true;
        return true;
    } catch (...) {
        OXQEL_REPORT(OxQelConnectionADO::currentErrorMessage(m_connection),
                     L"OxQelPreparedQueryADO::deletePreparedQuery", L"");
        return false;
    }
}
