// Connection strings come from hosts and users: splitting, composing and masking must
// never crash, and masking must never leave a credential value in place.
#include <cstddef>
#include <cstdint>

#include "OxClasses/OxConnectionParameter.h"
#include "OxClasses/OxConnectionString.h"
#include "platform/core/OxText.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::wstring text =
        OxText::fromUtf8(std::string_view(reinterpret_cast<const char*>(data), size));
    OxConnectionString cs(text);
    cs.explode();
    for (const auto& [key, value] : cs.map()) (void)cs.getAt(key);
    cs.compose();
    cs.explode();
    OxConnectionParameter p;
    p.setHost(text);
    const std::wstring masked = OxConnectionString::_maskPasswords(text);
    if (masked.size() > text.size() + 3 * (text.size() / 2 + 1))
        __builtin_trap();
    // A simple PWD=value pair can never survive masking.
    const std::wstring probe = L"X;PWD=" + std::to_wstring(size) + L"zz;" + text;
    if (OxConnectionString::_maskPasswords(probe).find(std::to_wstring(size) + L"zz") !=
        std::wstring::npos)
        __builtin_trap();
    return 0;
}
