#pragma once

#include <string>

#include "platform/core/OxExport.h"

namespace OxQel::ODBC {
// Lets the user choose an ODBC data source and returns its completed connection string.
// There is no driver manager dialog on this platform: the choice is made on the controlling
// terminal, which lists the data sources and asks for the user id, the password and any
// further keys, before the connection is made without prompting. False when the user chose
// nothing, the connection failed (its diagnostics go through the message sink) or there is
// no terminal. The parent window is not used here.
OX_EXPORT bool selectODBCDataSource(std::wstring& connectionString, void* parentWindow = nullptr);
}  // namespace OxQel::ODBC
