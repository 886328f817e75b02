#include "platform/ado/OxAdoSortOrder.h"

#include "platform/ado/OxAdoCriteria.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/core/OxText.h"

namespace {
[[noreturn]] void bad(const std::wstring& why) {
    OxAdo::raise(OxAdo::adErrInvalidArgument,
                 OxAdo::descriptionOf(OxAdo::adErrInvalidArgument) + L" (" + why + L")");
}

bool endsWithWord(const std::wstring& text, const wchar_t* word, std::wstring& rest) {
    const std::wstring w = word;
    if (text.size() <= w.size() || !OxText::equalsNoCase(text.substr(text.size() - w.size()), w))
        return false;
    const wchar_t before = text[text.size() - w.size() - 1];
    if (before != L' ' && before != L'\t' && before != L']')
        return false;
    rest = OxText::trim(text.substr(0, text.size() - w.size()));
    return true;
}
}  // namespace

OxAdoSortOrder OxAdoSortOrder::parse(const std::wstring& text) {
    OxAdoSortOrder order;
    // Split on the commas outside brackets.
    std::vector<std::wstring> parts;
    std::wstring current;
    bool inBrackets = false;
    for (wchar_t c : text) {
        if (c == L'[')
            inBrackets = true;
        else if (c == L']')
            inBrackets = false;
        if (c == L',' && !inBrackets) {
            parts.push_back(current);
            current.clear();
        } else {
            current += c;
        }
    }
    if (inBrackets)
        bad(L"unterminated field name");
    parts.push_back(current);
    if (parts.size() == 1 && OxText::trim(parts[0]).empty())
        return order;
    for (const auto& raw : parts) {
        std::wstring part = OxText::trim(raw);
        Key key;
        std::wstring rest;
        if (endsWithWord(part, L"DESC", rest)) {
            key.descending = true;
            part = rest;
        } else if (endsWithWord(part, L"ASC", rest)) {
            part = rest;
        }
        if (part.size() >= 2 && part.front() == L'[' && part.back() == L']')
            part = part.substr(1, part.size() - 2);
        else if (part.find_first_of(L"[]") != std::wstring::npos)
            bad(L"bad field name " + part);
        if (part.empty())
            bad(L"field name expected");
        key.field = part;
        order.m_keys.push_back(std::move(key));
    }
    return order;
}

void OxAdoSortOrder::bind(const std::function<int(const std::wstring&)>& columnOf) {
    for (auto& key : m_keys) {
        key.column = columnOf(key.field);
        if (key.column < 0)
            OxAdo::raise(OxAdo::adErrItemNotFound);
    }
}

int OxAdoSortOrder::compare(const std::function<const OxVariant&(int)>& a,
                            const std::function<const OxVariant&(int)>& b) const {
    for (const auto& key : m_keys) {
        const int c = OxAdoCriteria::compareValues(a(key.column), b(key.column));
        if (c != 0)
            return key.descending ? -c : c;
    }
    return 0;
}
