#pragma once

#include <string>
#include <utility>
#include <vector>

#include "platform/core/OxExport.h"

// A connection string of the object model: "key=value" pairs separated by ";", where a
// value may be quoted ('...' or "...", the quote doubled inside) or braced ({...}) to hold
// ";" and "=". Keys are compared without case; the last of repeated keys wins.
class OX_EXPORT OxAdoConnectionString {
public:
    using Pair = std::pair<std::wstring, std::wstring>;

    OxAdoConnectionString() = default;
    explicit OxAdoConnectionString(const std::wstring& text);

    const std::vector<Pair>& pairs() const { return m_pairs; }
    bool has(const std::wstring& key) const;
    // The value without its quotes (braces are kept: ODBC needs them), or empty.
    std::wstring get(const std::wstring& key) const;
    void set(const std::wstring& key, const std::wstring& value);
    void remove(const std::wstring& key);
    // The pairs written back, values quoted where they need it.
    std::wstring text() const;

    // The provider's name without a version suffix ("MSDASQL.1" gives "MSDASQL").
    static std::wstring baseProviderName(const std::wstring& name);

private:
    std::vector<Pair> m_pairs;
};
