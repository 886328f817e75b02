#pragma once

#include <cstdint>
#include <string_view>

// Whether a number format shows its number as a date or time: the only place a workbook
// says that a number is a date.
class OxWorkbookNumberFormat {
public:
    // Built-in format ids (no format string stored in the file).
    static bool isBuiltinDate(uint32_t id);
    // A format code such as "yyyy-mm-dd" or "[h]:mm"; quoted text, escapes and colour or
    // condition brackets do not count.
    static bool isDateCode(std::wstring_view code);
};
