// The marker scan and both rewriters take any statement text a host writes: they must
// end, never crash, and the in-place scan must keep the text's length.
#include <cstddef>
#include <cstdint>

#include "OxQelLib/foundation/OxQelQueryText.h"
#include "platform/core/OxText.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::wstring text =
        OxText::fromUtf8(std::string_view(reinterpret_cast<const char*>(data), size));
    std::wstring scanned = text;
    OxQel::Util::renderMarkers(scanned, {L" '", L"' ", L"  '", L"'  "});
    if (scanned.size() != text.size())
        __builtin_trap();
    (void)OxQel::formatExprForMySQL(text);
    (void)OxQel::formatExprForPostGre(text);
    (void)OxQel::Util::doubleApostrophes(text);
    for (size_t i = 0; i < text.size() && i < 64; ++i)
        (void)OxQel::Util::haveTripleBrace(text, static_cast<int>(i));
    return 0;
}
