#include "platform/workbook/OxWorkbookCodepage.h"

#include <iconv.h>
#include <cstring>
#include <string>

namespace {
std::string iconvName(uint16_t codepage) {
    switch (codepage) {
        case 367:
            return "ASCII";
        case 1200:
        case 0:
            return "";
        case 10000:
        case 32768:
            return "MACINTOSH";
        case 32769:
        case 1252:
            return "CP1252";
        default:
            return "CP" + std::to_string(codepage);
    }
}

const iconv_t kNone = reinterpret_cast<iconv_t>(-1);
}  // namespace

OxWorkbookCodepage::OxWorkbookCodepage(uint16_t codepage) {
    const std::string name = iconvName(codepage);
    iconv_t cd = kNone;
    if (!name.empty())
        cd = iconv_open("UTF-32LE", name.c_str());
    if (cd == kNone)
        cd = iconv_open("UTF-32LE", "CP1252");
    m_iconv = cd == kNone ? nullptr : cd;
}

OxWorkbookCodepage::~OxWorkbookCodepage() {
    if (m_iconv)
        iconv_close(static_cast<iconv_t>(m_iconv));
}

void OxWorkbookCodepage::decode(std::string_view bytes, std::wstring& out) const {
    out.clear();
    if (!m_iconv) {
        for (unsigned char c : bytes) out.push_back(static_cast<wchar_t>(c));
        return;
    }
    iconv_t cd = static_cast<iconv_t>(m_iconv);
    iconv(cd, nullptr, nullptr, nullptr, nullptr);
    std::u32string buf(bytes.size() + 1, U'\0');
    char* in = const_cast<char*>(bytes.data());
    size_t inLeft = bytes.size();
    char* dst = reinterpret_cast<char*>(buf.data());
    size_t outLeft = buf.size() * 4;
    while (inLeft > 0) {
        if (iconv(cd, &in, &inLeft, &dst, &outLeft) != static_cast<size_t>(-1))
            break;
        // A byte the page does not map: U+FFFD, and go on after it.
        if (outLeft < 4)
            break;
        const char32_t r = 0xFFFD;
        std::memcpy(dst, &r, 4);
        dst += 4;
        outLeft -= 4;
        ++in;
        --inLeft;
    }
    const size_t n = (buf.size() * 4 - outLeft) / 4;
    out.reserve(n);
    for (size_t i = 0; i < n; ++i) out.push_back(static_cast<wchar_t>(buf[i]));
}
