#pragma once

#include <string>

// Reporting of a failure caught inside an ODBC operation. Not a public header.
namespace OxQel::ODBC {
// Call inside a catch block: an ODBC exception is reported with its error text unless its
// return code is 100 (no data); any other exception as "Unknown error".
void reportCaught(const wchar_t* function, const wchar_t* file, int line,
                  const std::wstring& param);
}  // namespace OxQel::ODBC

#define OXQEL_ODBC_REPORT(function, param) \
    ::OxQel::ODBC::reportCaught((function), OXQEL_SOURCE_FILE, __LINE__, (param))
