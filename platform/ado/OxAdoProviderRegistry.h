#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

// The providers by name. A connection string picks one with its Provider key; without
// that key it goes to the ODBC provider (which also takes Driver= and DSN= strings), as
// the object model's default provider does. Further providers register their names here.
class OX_EXPORT OxAdoProviderRegistry {
public:
    // Registers (or replaces) a provider; names compare without case.
    static void add(const std::wstring& name, OxAdoSessionFactory factory);
    static void remove(const std::wstring& name);
    static bool has(const std::wstring& name);
    static std::vector<std::wstring> names();

    // The name of the provider a connection string asks for.
    static std::wstring providerOf(const std::wstring& connectionString);
    // A new, unopened session for the string; throws OxAdoProviderError
    // (adErrProviderNotFound) when no provider of that name is registered.
    static std::unique_ptr<OxAdoSession> createSession(const std::wstring& connectionString);

    // The name of the ODBC provider, the default.
    static const wchar_t* const kOdbcProvider;
};
