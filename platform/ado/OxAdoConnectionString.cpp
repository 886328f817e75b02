#include "platform/ado/OxAdoConnectionString.h"

#include "platform/core/OxText.h"

namespace {
bool isBlank(wchar_t c) {
    return c == L' ' || c == L'\t' || c == L'\r' || c == L'\n';
}

std::wstring trimBlanks(const std::wstring& s) {
    size_t b = 0, e = s.size();
    while (b < e && isBlank(s[b])) ++b;
    while (e > b && isBlank(s[e - 1])) --e;
    return s.substr(b, e - b);
}

// Where a braced value that starts at pos ends: after its "}" ("}}" stands for one), or
// npos when it never closes.
size_t braceEnd(const std::wstring& text, size_t pos) {
    for (size_t i = pos + 1; i < text.size(); ++i) {
        if (text[i] != L'}')
            continue;
        if (i + 1 < text.size() && text[i + 1] == L'}') {
            ++i;
            continue;
        }
        return i + 1;
    }
    return std::wstring::npos;
}

// Reads a value from pos up to its ";" (or the end); quotes are removed, braces kept.
std::wstring readValue(const std::wstring& text, size_t& pos) {
    while (pos < text.size() && isBlank(text[pos])) ++pos;
    std::wstring value;
    if (pos < text.size() && (text[pos] == L'"' || text[pos] == L'\'')) {
        const wchar_t quote = text[pos++];
        while (pos < text.size()) {
            if (text[pos] == quote) {
                if (pos + 1 < text.size() && text[pos + 1] == quote) {
                    value += quote;
                    pos += 2;
                    continue;
                }
                ++pos;
                break;
            }
            value += text[pos++];
        }
        // Whatever follows the closing quote up to the separator is dropped.
        while (pos < text.size() && text[pos] != L';') ++pos;
        return value;
    }
    if (pos < text.size() && text[pos] == L'{') {
        const size_t start = pos;
        const size_t end = braceEnd(text, pos);
        pos = end == std::wstring::npos ? text.size() : end;
        while (pos < text.size() && text[pos] != L';') ++pos;
        return trimBlanks(text.substr(start, pos - start));
    }
    const size_t start = pos;
    while (pos < text.size() && text[pos] != L';') ++pos;
    return trimBlanks(text.substr(start, pos - start));
}

// Whether a value must be quoted to read back as itself.
bool needsQuotes(const std::wstring& value) {
    if (value.empty())
        return false;
    if (isBlank(value.front()) || isBlank(value.back()) || value.front() == L'"' ||
        value.front() == L'\'')
        return true;
    if (value.front() == L'{') {
        // A braced value reads whole when its brace closes and no ";" follows the close.
        const size_t end = braceEnd(value, 0);
        return end == std::wstring::npos || value.find(L';', end) != std::wstring::npos;
    }
    return value.find(L';') != std::wstring::npos;
}

}  // namespace

OxAdoConnectionString::OxAdoConnectionString(const std::wstring& text) {
    size_t pos = 0;
    while (pos < text.size()) {
        const size_t eq = text.find(L'=', pos);
        const size_t semi = text.find(L';', pos);
        if (eq == std::wstring::npos || (semi != std::wstring::npos && semi < eq)) {
            // A segment without "=" carries nothing.
            if (semi == std::wstring::npos)
                break;
            pos = semi + 1;
            continue;
        }
        std::wstring key = trimBlanks(text.substr(pos, eq - pos));
        pos = eq + 1;
        std::wstring value = readValue(text, pos);
        if (pos < text.size())
            ++pos;  // the ";"
        if (!key.empty())
            set(key, value);
    }
}

bool OxAdoConnectionString::has(const std::wstring& key) const {
    for (const auto& [k, v] : m_pairs)
        if (OxText::equalsNoCase(k, key))
            return true;
    return false;
}

std::wstring OxAdoConnectionString::get(const std::wstring& key) const {
    for (const auto& [k, v] : m_pairs)
        if (OxText::equalsNoCase(k, key))
            return v;
    return {};
}

void OxAdoConnectionString::set(const std::wstring& key, const std::wstring& value) {
    for (auto& [k, v] : m_pairs)
        if (OxText::equalsNoCase(k, key)) {
            v = value;
            return;
        }
    m_pairs.emplace_back(key, value);
}

void OxAdoConnectionString::remove(const std::wstring& key) {
    std::erase_if(m_pairs, [&](const Pair& p) { return OxText::equalsNoCase(p.first, key); });
}

std::wstring OxAdoConnectionString::text() const {
    std::wstring out;
    for (const auto& [k, v] : m_pairs) {
        out += k;
        out += L'=';
        if (needsQuotes(v)) {
            const wchar_t quote = v.find(L'"') == std::wstring::npos ? L'"' : L'\'';
            out += quote;
            for (wchar_t c : v) {
                if (c == quote)
                    out += quote;
                out += c;
            }
            out += quote;
        } else {
            out += v;
        }
        out += L';';
    }
    return out;
}

std::wstring OxAdoConnectionString::baseProviderName(const std::wstring& name) {
    std::wstring n = OxText::trim(name);
    const size_t dot = n.rfind(L'.');
    if (dot != std::wstring::npos && dot + 1 < n.size() &&
        n.find_first_not_of(L"0123456789", dot + 1) == std::wstring::npos)
        n.erase(dot);
    return n;
}
