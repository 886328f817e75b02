#include "platform/odbc/OxDBException.h"

#include <sqlext.h>

#include <algorithm>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

OxDBException::OxDBException(SQLRETURN retCode, std::wstring message) : m_retCode(retCode) {
    m_records.push_back({L"", 0, std::move(message)});
    build();
}

OxDBException::OxDBException(SQLRETURN retCode, std::vector<Record> records)
    : m_retCode(retCode), m_records(std::move(records)) {
    build();
}

OxDBException OxDBException::fromHandle(SQLRETURN retCode, SQLSMALLINT handleType,
                                        SQLHANDLE handle) {
    if (retCode == SQL_INVALID_HANDLE)
        return OxDBException(retCode, L"Invalid handle");
    std::vector<Record> records = readDiagnostics(handleType, handle);
    if (records.empty())
        records.push_back({L"", 0, oxFormat(L"ODBC call failed with return code %d", retCode)});
    return OxDBException(retCode, std::move(records));
}

void OxDBException::check(SQLRETURN retCode, SQLSMALLINT handleType, SQLHANDLE handle) {
    if (!SQL_SUCCEEDED(retCode))
        throw fromHandle(retCode, handleType, handle);
}

std::vector<OxDBException::Record> OxDBException::readDiagnostics(SQLSMALLINT handleType,
                                                                  SQLHANDLE handle) {
    std::vector<Record> records;
    if (!handle)
        return records;
    std::string message(1024, '\0');
    for (SQLSMALLINT i = 1;; ++i) {
        SQLCHAR state[6] = {};
        SQLINTEGER native = 0;
        SQLSMALLINT length = 0;
        SQLRETURN rc = SQLGetDiagRecA(handleType, handle, i, state, &native,
                                      reinterpret_cast<SQLCHAR*>(message.data()),
                                      static_cast<SQLSMALLINT>(message.size()), &length);
        if (rc == SQL_SUCCESS_WITH_INFO && length >= static_cast<SQLSMALLINT>(message.size())) {
            // A message longer than the buffer: ask again with room for all of it.
            message.resize(static_cast<size_t>(length) + 1);
            rc = SQLGetDiagRecA(handleType, handle, i, state, &native,
                                reinterpret_cast<SQLCHAR*>(message.data()),
                                static_cast<SQLSMALLINT>(message.size()), &length);
        }
        if (!SQL_SUCCEEDED(rc))
            break;
        const size_t n =
            std::min(static_cast<size_t>(std::max<SQLSMALLINT>(length, 0)), message.size() - 1);
        // Drivers end some messages with a line feed; the report adds its own layout.
        std::wstring text = OxText::trim(OxText::fromUtf8(std::string_view(message.data(), n)));
        records.push_back(
            {OxText::fromUtf8(reinterpret_cast<const char*>(state)), native, std::move(text)});
    }
    return records;
}

std::wstring OxDBException::sqlState() const {
    return m_records.empty() ? std::wstring() : m_records.front().state;
}

void OxDBException::build() {
    m_errorText.clear();
    for (const Record& r : m_records) {
        if (!m_errorText.empty())
            m_errorText += L'\n';
        if (r.state.empty())
            m_errorText += r.message;
        else
            m_errorText += oxFormat(L"[%s] %s (%d)", r.state, r.message, r.native);
    }
    m_what = OxText::toUtf8(m_errorText);
}
