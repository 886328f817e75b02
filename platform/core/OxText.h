#pragma once

#include <string>
#include <string_view>

#include "platform/core/OxExport.h"

// Text encodings and case rules that do not depend on the process locale the host set.
// Wide strings are UTF-32 here; invalid input becomes U+FFFD, never an exception.
namespace OxText {
OX_EXPORT std::string toUtf8(std::wstring_view text);
OX_EXPORT std::wstring fromUtf8(std::string_view text);
// Appends instead of returning, for loops that reuse one buffer.
OX_EXPORT void appendUtf8(std::string& out, std::wstring_view text);
OX_EXPORT void appendFromUtf8(std::wstring& out, std::string_view text);

OX_EXPORT std::u16string toUtf16(std::wstring_view text);
OX_EXPORT std::wstring fromUtf16(std::u16string_view text);
OX_EXPORT void appendUtf16(std::u16string& out, std::wstring_view text);
OX_EXPORT void appendFromUtf16(std::wstring& out, std::u16string_view text);
// The same conversions into room the caller made: 4 bytes (UTF-8) or 2 units (UTF-16) per
// character of text, or one character per unit of the source. The units written.
OX_EXPORT size_t encodeUtf8(std::wstring_view text, char* out);
OX_EXPORT size_t encodeUtf16(std::wstring_view text, char16_t* out);
OX_EXPORT size_t decodeUtf8(std::string_view text, wchar_t* out);
OX_EXPORT size_t decodeUtf16(std::u16string_view text, wchar_t* out);

OX_EXPORT wchar_t toUpper(wchar_t c);
OX_EXPORT wchar_t toLower(wchar_t c);
OX_EXPORT std::wstring toUpper(std::wstring_view text);
OX_EXPORT std::wstring toLower(std::wstring_view text);
// Simple (one-to-one) case folding, as the platform's case-insensitive comparison does.
OX_EXPORT int compareNoCase(std::wstring_view a, std::wstring_view b);
OX_EXPORT bool equalsNoCase(std::wstring_view a, std::wstring_view b);
// Position of needle in text ignoring case, or npos.
OX_EXPORT size_t findNoCase(std::wstring_view text, std::wstring_view needle, size_t from = 0);

// Every occurrence of from replaced by to (from must not be empty).
OX_EXPORT void replaceAll(std::wstring& text, std::wstring_view from, std::wstring_view to);
OX_EXPORT std::wstring trim(std::wstring_view text);
}  // namespace OxText
