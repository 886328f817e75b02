#include "OxClasses/OxConnectionParameter.h"

void OxConnectionParameter::setHost(const std::wstring& host) {
    m_host = host;
    setDriverName();
}

void OxConnectionParameter::setDriverName() {
    if (m_host.empty())
        return;
    const std::wstring key = L"DRIVER=";
    const size_t at = m_host.find(key);
    if (at == std::wstring::npos)
        return;
    const size_t start = at + key.size();
    const size_t end = m_host.find(L';', start);
    m_driverName =
        m_host.substr(start, end == std::wstring::npos ? std::wstring::npos : end - start);
}

void OxConnectionParameter::clear() {
    m_database.clear();
    m_host.clear();
    m_userId.clear();
    m_password.clear();
}
