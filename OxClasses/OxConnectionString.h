#pragma once

#include <string>
#include <unordered_map>

#include "platform/core/OxExport.h"

// A connection string of key=value pairs separated by ";", with a map of its pairs
// under upper-cased keys. The text and the map are kept apart: construction and
// assignment set the text only, explode() fills the map from it, compose() rebuilds it.
class OX_EXPORT OxConnectionString : public std::wstring {
public:
    using Map = std::unordered_map<std::wstring, std::wstring>;

    OxConnectionString();
    OxConnectionString(const std::wstring& text);
    OxConnectionString(const wchar_t* text) : OxConnectionString(std::wstring(text ? text : L"")) {}
    OxConnectionString& operator=(const std::wstring& text);

    // Splits the text into the map (see the source for the exact rules).
    void explode();
    // Rebuilds the text from the map: "KEY=value" pairs joined by "; ".
    void compose();
    std::wstring getAt(const std::wstring& key) const;
    void setAt(const std::wstring& key, const std::wstring& value);
    void removeAt(const std::wstring& key);
    void reset();

    const Map& map() const { return m_map; }

    // The text with the value of every credential key (PWD, PASSWORD, and keys holding
    // those words, such as "Jet OLEDB:Database Password") replaced by "***", for logs and
    // messages. Braced and quoted values are masked whole.
    static std::wstring _maskPasswords(const std::wstring& text);

private:
    Map m_map;
};
