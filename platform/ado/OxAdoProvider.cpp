#include "platform/ado/OxAdoProvider.h"

#include "platform/core/OxText.h"

OxAdoProviderError::OxAdoProviderError(OxHResult hr, std::wstring description, int32_t nativeError,
                                       std::wstring sqlState)
    : OxAdoProviderError(std::vector<OxAdoErrorInfo>{
          {hr, std::move(description), nativeError, std::move(sqlState), {}}}) {}

OxAdoProviderError::OxAdoProviderError(std::vector<OxAdoErrorInfo> records)
    : m_records(std::move(records)) {
    if (m_records.empty())
        m_records.push_back({OxHr::E_FAIL, OxHr::messageOf(OxHr::E_FAIL), 0, {}, {}});
    m_what = OxText::toUtf8(description());
}

OxHResult OxAdoProviderError::hresult() const noexcept {
    return OxAdo::asHResult(m_records.front().number);
}

std::wstring OxAdoProviderError::description() const {
    return m_records.front().description;
}

const OxVariant* OxAdoColumnDesc::property(const std::wstring& name) const {
    for (const auto& [key, value] : properties)
        if (OxText::equalsNoCase(key, name))
            return &value;
    return nullptr;
}

void OxAdoColumnDesc::setProperty(const std::wstring& name, const OxVariant& value) {
    for (auto& [key, current] : properties)
        if (OxText::equalsNoCase(key, name)) {
            current = value;
            return;
        }
    properties.emplace_back(name, value);
}

void OxAdoSession::notCapable(const std::wstring& what) {
    throw OxAdoProviderError(
        OxAdo::hresultOf(OxAdo::adErrFeatureNotAvailable),
        OxAdo::descriptionOf(OxAdo::adErrFeatureNotAvailable) + L" (" + what + L")");
}

void OxAdoSession::setIsolationLevel(long) {}

std::vector<OxAdoTableInfo> OxAdoSession::tables(const std::wstring&, const std::wstring&) {
    notCapable(L"tables");
}
std::vector<OxAdoColumnDesc> OxAdoSession::columns(const std::wstring&) {
    notCapable(L"columns");
}
std::vector<OxAdoIndexInfo> OxAdoSession::indexes(const std::wstring&) {
    notCapable(L"indexes");
}
std::vector<std::wstring> OxAdoSession::primaryKey(const std::wstring&) {
    return {};
}
std::vector<OxAdoProcedureInfo> OxAdoSession::procedures() {
    return {};
}
void OxAdoSession::createTable(const OxAdoTableDesc&) {
    notCapable(L"create table");
}
void OxAdoSession::dropTable(const std::wstring&) {
    notCapable(L"drop table");
}
void OxAdoSession::renameTable(const std::wstring&, const std::wstring&) {
    notCapable(L"rename table");
}
void OxAdoSession::addColumn(const std::wstring&, const OxAdoColumnDesc&) {
    notCapable(L"add column");
}
void OxAdoSession::dropColumn(const std::wstring&, const std::wstring&) {
    notCapable(L"drop column");
}
void OxAdoSession::renameColumn(const std::wstring&, const std::wstring&, const std::wstring&) {
    notCapable(L"rename column");
}
void OxAdoSession::setColumnProperty(const std::wstring&, const std::wstring&,
                                     const std::wstring& property, const OxVariant&) {
    notCapable(L"column property " + property);
}
std::vector<std::pair<std::wstring, OxVariant>> OxAdoSession::columnProperties() const {
    return {{L"Default", OxVariant()},
            {L"Nullable", OxVariant(true)},
            {L"AutoIncrement", OxVariant(false)},
            {L"Description", OxVariant()}};
}
std::vector<std::pair<std::wstring, OxVariant>> OxAdoSession::tableProperties() const {
    return {};
}
void OxAdoSession::createDatabase(const OpenArgs&) {
    notCapable(L"create database");
}

std::wstring OxAdoSession::quoteIdentifier(const std::wstring& name) const {
    std::wstring out = L"\"";
    for (wchar_t c : name) {
        if (c == L'"')
            out += L'"';
        out += c;
    }
    return out + L"\"";
}

OxVariant OxAdoSession::lastInsertedValue(const std::wstring&, const std::wstring&) {
    return {};
}

std::vector<std::pair<std::wstring, OxVariant>> OxAdoSession::properties() const {
    return {};
}

void OxAdoSession::setProperty(const std::wstring& name, const OxVariant&) {
    notCapable(L"property " + name);
}
