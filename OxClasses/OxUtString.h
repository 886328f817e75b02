#pragma once

#include <string>
#include <vector>

#include "platform/core/OxExport.h"

class OX_EXPORT OxUtString {
public:
    // 8-bit text (UTF-8) as a wide string; a null pointer gives the empty string.
    static std::wstring LPCSTR_TO_LPCTSTR(const char* text);
    static std::wstring cStringToStdString(const std::wstring& text) { return text; }

    // Writes the strings as UTF-8 text, each ending with a line feed (one is added where
    // a string has none), appended to the file or into a new file. The whole array goes
    // out in one write, so lines of concurrent writers do not interleave. False when the
    // file cannot be written.
    static bool writeStringArrayToUnicodeFile(const std::wstring& path,
                                              const std::vector<std::wstring>& lines, bool append);
};
