#include "OxClasses/OxConnectionString.h"

#include "platform/core/OxText.h"

namespace {
constexpr size_t kBuckets = 17;
}

OxConnectionString::OxConnectionString() {
    m_map.rehash(kBuckets);
}

OxConnectionString::OxConnectionString(const std::wstring& text) : std::wstring(text) {
    m_map.rehash(kBuckets);
}

OxConnectionString& OxConnectionString::operator=(const std::wstring& text) {
    std::wstring::operator=(text);
    return *this;
}

// Nothing is trimmed and neither braces nor quotes are recognised: the first ";" after
// a "=" ends the value. A segment without "=" becomes part of the next key, and the scan
// ends where no "=" follows.
void OxConnectionString::explode() {
    m_map.clear();
    const std::wstring& text = *this;
    size_t p = 0;
    while (p < text.size()) {
        const size_t e = text.find(L'=', p);
        if (e == std::wstring::npos)
            break;
        const bool hasKey = e > p;
        const size_t valueStart = e + 1;
        size_t s = text.find(L';', valueStart);
        if (s == std::wstring::npos)
            s = text.size();
        if (s > valueStart && hasKey)
            m_map[OxText::toUpper(text.substr(p, e - p))] = text.substr(valueStart, s - valueStart);
        p = s + 1;
    }
}

void OxConnectionString::compose() {
    std::wstring text;
    for (const auto& [key, value] : m_map) {
        if (!text.empty())
            text += L"; ";
        text += OxText::toUpper(key);
        text += L'=';
        text += value;
    }
    std::wstring::operator=(text);
}

std::wstring OxConnectionString::getAt(const std::wstring& key) const {
    const auto it = m_map.find(OxText::toUpper(key));
    return it == m_map.end() ? std::wstring() : it->second;
}

void OxConnectionString::setAt(const std::wstring& key, const std::wstring& value) {
    m_map[OxText::toUpper(key)] = value;
}

void OxConnectionString::removeAt(const std::wstring& key) {
    m_map.erase(OxText::toUpper(key));
}

void OxConnectionString::reset() {
    clear();
    m_map.clear();
}

namespace {
bool isCredentialKey(const std::wstring& key) {
    const std::wstring k = OxText::toUpper(OxText::trim(key));
    return k.find(L"PWD") != std::wstring::npos || k.find(L"PASSWORD") != std::wstring::npos ||
           k.find(L"PASSPHRASE") != std::wstring::npos || k == L"PASS" ||
           k.find(L"SECRET") != std::wstring::npos || k.find(L"TOKEN") != std::wstring::npos;
}

// End of a value that starts at pos: a braced value ends after its "}" ("}}" stands
// for one brace), a quoted one after its closing quote, any other at the next ";".
size_t valueEnd(const std::wstring& text, size_t pos) {
    size_t i = pos;
    while (i < text.size() && text[i] == L' ') ++i;
    if (i < text.size() && (text[i] == L'{' || text[i] == L'"' || text[i] == L'\'')) {
        const wchar_t close = text[i] == L'{' ? L'}' : text[i];
        for (++i; i < text.size(); ++i) {
            if (text[i] != close)
                continue;
            if (i + 1 < text.size() && text[i + 1] == close) {
                ++i;
                continue;
            }
            ++i;
            break;
        }
    }
    const size_t semi = text.find(L';', i);
    return semi == std::wstring::npos ? text.size() : semi;
}
}  // namespace

std::wstring OxConnectionString::_maskPasswords(const std::wstring& text) {
    std::wstring out;
    size_t p = 0;
    while (p < text.size()) {
        const size_t eq = text.find(L'=', p);
        const size_t semi = text.find(L';', p);
        if (eq == std::wstring::npos || (semi != std::wstring::npos && semi < eq)) {
            // A segment without a value: copy it and its separator.
            const size_t end = semi == std::wstring::npos ? text.size() : semi + 1;
            out.append(text, p, end - p);
            p = end;
            continue;
        }
        const size_t end = valueEnd(text, eq + 1);
        out.append(text, p, eq + 1 - p);
        if (isCredentialKey(text.substr(p, eq - p)) && end > eq + 1)
            out += L"***";
        else
            out.append(text, eq + 1, end - eq - 1);
        if (end < text.size())
            out.push_back(L';');
        p = end + 1;
    }
    return out;
}
