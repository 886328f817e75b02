#pragma once

#include <string>
#include <string_view>

#include "OxQelLib/foundation/OxQelGlobal.h"

// The library's neutral statement text: identifiers in [brackets], string literals
// between "]]" and "[[" (wide-text columns: "]]]" and "[[["), and prepared-statement
// parameters written "]]]n[[[".
namespace OxQel {
OX_EXPORT std::wstring getQueryCharacterBegin(const FieldType& type);
OX_EXPORT std::wstring getQueryCharacterEnd(const FieldType& type);

// For MySQL: backquoted identifiers, N'' literals, lower case outside literals,
// backslashes in literals doubled, and the parentheses of a FROM clause (the nesting of
// joins) removed. Written for join nesting: a sub-select inside a FROM clause loses its
// opening parenthesis.
OX_EXPORT std::wstring formatExprForMySQL(const std::wstring& text);
// For PostgreSQL: "identifiers" and 'literals' (apostrophes inside are not doubled).
OX_EXPORT std::wstring formatExprForPostGre(const std::wstring& text);

namespace Util {
// True when the "]]" found at position p is the start of "]]]".
OX_EXPORT bool haveTripleBrace(const std::wstring& text, int p);

// The characters that replace the markers; each has the length of its marker, so the
// statement keeps its length.
struct MarkerRendering {
    std::wstring_view open2;   // replaces "]]"
    std::wstring_view close2;  // replaces "[["
    std::wstring_view open3;   // replaces "]]]"
    std::wstring_view close3;  // replaces "[[["
};

// The shared in-place marker scan of every backend's rewriting.
OX_EXPORT void renderMarkers(std::wstring& text, const MarkerRendering& rendering);
// Every apostrophe doubled: the literal text between markers is written unescaped.
OX_EXPORT std::wstring doubleApostrophes(std::wstring_view text);
}  // namespace Util
}  // namespace OxQel
