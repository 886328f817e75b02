#include "platform/workbook/OxWorkbookNumberFormat.h"

#include <cwctype>

bool OxWorkbookNumberFormat::isBuiltinDate(uint32_t id) {
    // 14-22 and 45-47 everywhere; 27-36 and 50-58 in East Asian locales.
    return (id >= 14 && id <= 22) || (id >= 45 && id <= 47) || (id >= 27 && id <= 36) ||
           (id >= 50 && id <= 58);
}

bool OxWorkbookNumberFormat::isDateCode(std::wstring_view code) {
    for (size_t i = 0; i < code.size(); ++i) {
        const wchar_t c = code[i];
        switch (c) {
            case L'"': {
                const size_t end = code.find(L'"', i + 1);
                if (end == std::wstring_view::npos)
                    return false;
                i = end;
                break;
            }
            case L'\\':
            case L'_':
            case L'*':
                ++i;  // the next character is literal, padding or fill
                break;
            case L'[': {
                const size_t end = code.find(L']', i + 1);
                if (end == std::wstring_view::npos)
                    return false;
                // [h], [mm], [ss]: elapsed time; anything else is a colour or condition.
                const std::wstring_view inner = code.substr(i + 1, end - i - 1);
                bool elapsed = !inner.empty();
                for (wchar_t k : inner) {
                    const wchar_t l = static_cast<wchar_t>(std::towlower(static_cast<wint_t>(k)));
                    if (l != L'h' && l != L'm' && l != L's')
                        elapsed = false;
                }
                if (elapsed)
                    return true;
                i = end;
                break;
            }
            case L';':
                return false;  // only the first section decides
            default: {
                const wchar_t l = static_cast<wchar_t>(std::towlower(static_cast<wint_t>(c)));
                if (l == L'y' || l == L'm' || l == L'd' || l == L'h' || l == L's')
                    return true;
                if (l == L'0' || l == L'#' || l == L'?')
                    return false;  // a digit placeholder first: a number format
            }
        }
    }
    return false;
}
