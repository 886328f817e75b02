#include "OxQelLib/foundation/OxQelQueryText.h"

#include "platform/core/OxText.h"

namespace OxQel {
std::wstring getQueryCharacterBegin(const FieldType& type) {
    switch (type) {
        case String:
        case Memo:
        case Guid:
        case Char:
            return L"]]";
        case WString:
        case WMemo:
        case WChar:
            return L"]]]";
        default:
            return {};
    }
}

std::wstring getQueryCharacterEnd(const FieldType& type) {
    switch (type) {
        case String:
        case Memo:
        case Guid:
        case Char:
            return L"[[";
        case WString:
        case WMemo:
        case WChar:
            return L"[[[";
        default:
            return {};
    }
}

std::wstring formatExprForPostGre(const std::wstring& text) {
    std::wstring s = text;
    OxText::replaceAll(s, L"]]", L"'");
    OxText::replaceAll(s, L"[[", L"'");
    OxText::replaceAll(s, L"[", L"\"");
    OxText::replaceAll(s, L"]", L"\"");
    return s;
}

namespace {
bool matchesNoCase(const std::wstring& s, size_t i, std::wstring_view word) {
    return i + word.size() <= s.size() &&
           OxText::equalsNoCase(std::wstring_view(s).substr(i, word.size()), word);
}
}  // namespace

std::wstring formatExprForMySQL(const std::wstring& text) {
    std::wstring s = text;
    OxText::replaceAll(s, L"]]", L"N'");
    OxText::replaceAll(s, L"[[", L"'");
    OxText::replaceAll(s, L"[", L"`");
    OxText::replaceAll(s, L"]", L"`");

    std::wstring r;
    r.reserve(s.size() + 8);
    bool outsideLiteral = true;
    bool inFrom = false;
    int depth = 0;
    for (size_t i = 0; i < s.size(); ++i) {
        wchar_t c = s[i];
        if (c == L'\'') {
            outsideLiteral = !outsideLiteral;
        } else if (outsideLiteral) {
            c = OxText::toLower(c);
        } else if (c == L'\\') {
            r.push_back(L'\\');
        }
        // Keywords are recognised inside literals too: the rewriter knows no better.
        if (matchesNoCase(s, i, L"FROM ")) {
            inFrom = true;
            depth = 0;
        }
        if (matchesNoCase(s, i, L"WHERE ") || matchesNoCase(s, i, L"GROUP ") ||
            matchesNoCase(s, i, L"ORDER ") || matchesNoCase(s, i, L"UNION ") ||
            matchesNoCase(s, i, L"HAVING ") || matchesNoCase(s, i, L"SELECT "))
            inFrom = false;
        if (!inFrom) {
            r.push_back(c);
            continue;
        }
        if (matchesNoCase(s, i, L" AS "))
            s[i + 1] = s[i + 2] = L' ';
        if (c == L'(') {
            ++depth;
        } else if (c == L')') {
            if (depth >= 1) {
                --depth;
            } else {
                inFrom = false;
                r.push_back(c);
            }
        } else {
            r.push_back(c);
        }
    }
    return r;
}

namespace Util {
bool haveTripleBrace(const std::wstring& text, int p) {
    return p >= 0 && static_cast<size_t>(p) + 2 < text.size() &&
           text[static_cast<size_t>(p) + 2] == L']';
}

void renderMarkers(std::wstring& text, const MarkerRendering& m) {
    size_t p = text.find(L"]]");
    while (p != std::wstring::npos) {
        size_t next = p + 1;  // an unmatched opening marker is skipped, never rescanned
        if (haveTripleBrace(text, static_cast<int>(p))) {
            const size_t q = text.find(L"[[[", p);
            if (q != std::wstring::npos) {
                text.replace(p, 3, m.open3);
                text.replace(q, 3, m.close3);
                next = q;
            }
        } else {
            const size_t q = text.find(L"[[", p);
            if (q != std::wstring::npos) {
                text.replace(p, 2, m.open2);
                text.replace(q, 2, m.close2);
                next = q;
            }
        }
        p = text.find(L"]]", next);
    }
}

std::wstring doubleApostrophes(std::wstring_view text) {
    std::wstring out;
    out.reserve(text.size());
    for (wchar_t c : text) {
        out.push_back(c);
        if (c == L'\'')
            out.push_back(L'\'');
    }
    return out;
}
}  // namespace Util
}  // namespace OxQel
