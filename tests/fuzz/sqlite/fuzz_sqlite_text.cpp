// The SQLite backend's text operations on arbitrary text: the statement rewriter, the
// placeholder rewriter and the natural-sort key. None may crash or hang, and the TOP
// rewriting must agree with the expression that defines it.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <regex>
#include <string>

#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "OxQelLib/sqlite/OxQelPreparedQuerySQLite.h"
#include "platform/core/OxText.h"

namespace {
bool isDigit(wchar_t c) {
    return c >= L'0' && c <= L'9';
}

// The key, rebuilt the slow way from its definition.
std::wstring slowKey(const std::wstring& text) {
    std::wstring key;
    size_t i = 0;
    while (i < text.size()) {
        size_t j = i;
        const bool digits = isDigit(text[i]);
        while (j < text.size() && isDigit(text[j]) == digits) ++j;
        if (digits) {
            wchar_t length[16];
            std::swprintf(length, 16, L"%03d", static_cast<int>(j - i));
            key += length;
        }
        key += text.substr(i, j - i);
        i = j;
    }
    return key;
}
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::wstring text =
        OxText::fromUtf8(std::string_view(reinterpret_cast<const char*>(data), size));
    OxQelConnectionSQLite connection;
    const std::wstring rewritten = connection.formatBeforeExecute(text);

    if (OxQelConnectionSQLite::_getStringForNaturalSort(text) != slowKey(text))
        std::abort();

    OxQelPreparedQuerySQLite query;
    const std::wstring placeholders = query.formatParametersInQuery(text);
    if (placeholders.size() > text.size())
        std::abort();

    // Without markers, TOP or a trailing semicolon, the rewriting only doubles apostrophes.
    if (text.find(L"]]") == std::wstring::npos && (text.empty() || text.back() != L';')) {
        std::wstring doubled;
        for (wchar_t c : text) doubled += c == L'\'' ? std::wstring(L"''") : std::wstring(1, c);
        if (OxText::findNoCase(text, L" TOP") == std::wstring::npos) {
            if (rewritten != doubled)
                std::abort();
        } else if (text.size() < 200) {
            static const std::wregex top(L"(\\s+(TOP)\\s*(\\((\\d+)\\)))|(\\s+(TOP)\\s+(\\d+))",
                                         std::regex::ECMAScript | std::regex::icase);
            std::wsmatch m;
            std::wstring expected = doubled;
            if (std::regex_search(doubled, m, top)) {
                std::wstring digits;
                for (size_t g = m.size(); g-- > 1;)
                    if (m[g].matched) {
                        digits = m[g].str();
                        break;
                    }
                expected = doubled.substr(0, static_cast<size_t>(m.position(0))) + L" " +
                           doubled.substr(static_cast<size_t>(m.position(0) + m.length(0))) +
                           L" LIMIT " + digits;
            }
            if (rewritten != expected)
                std::abort();
        }
    }
    return 0;
}
