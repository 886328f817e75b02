#include "platform/jet/OxJetText.h"

#include <iconv.h>

#include <cerrno>
#include <string_view>

#include "platform/core/OxFormat.h"
#include "platform/jet/OxJetError.h"

namespace {
constexpr wchar_t kReplacement = 0xFFFD;

std::string iconvName(uint16_t codePage) {
    switch (codePage) {
        case 936:
            return "GBK";
        case 950:
            return "BIG5";
        case 20127:
            return "ASCII";
        case 28591:
            return "ISO-8859-1";
        case 65001:
            return "UTF-8";
        default:
            return "CP" + std::to_string(codePage);
    }
}

bool isMultiByte(uint16_t codePage) {
    return codePage == 932 || codePage == 936 || codePage == 949 || codePage == 950 ||
           codePage == 65001;
}

// Appends UTF-16 code units, joining surrogate pairs; a lone half becomes U+FFFD.
template <class Unit>
void appendUtf16(std::wstring& out, Unit unit, char32_t& pendingHigh) {
    const char32_t c = unit;
    if (pendingHigh) {
        if (c >= 0xDC00 && c <= 0xDFFF) {
            out.push_back(
                static_cast<wchar_t>(0x10000 + ((pendingHigh - 0xD800) << 10) + (c - 0xDC00)));
            pendingHigh = 0;
            return;
        }
        out.push_back(kReplacement);
        pendingHigh = 0;
    }
    if (c >= 0xD800 && c <= 0xDBFF)
        pendingHigh = c;
    else if (c >= 0xDC00 && c <= 0xDFFF)
        out.push_back(kReplacement);
    else
        out.push_back(static_cast<wchar_t>(c));
}
}  // namespace

OxJetText::OxJetText(uint16_t codePage) : m_codePage(codePage) {
    if (codePage == 0)
        return;
    iconv_t cd = iconv_open("UTF-32LE", iconvName(codePage).c_str());
    if (cd == reinterpret_cast<iconv_t>(-1))
        throw OxJetError(oxFormat(L"code page %u cannot be converted on this system", codePage));
    if (isMultiByte(codePage)) {
        m_iconv = cd;
        return;
    }
    m_singleByte = true;
    for (int b = 0; b < 256; ++b) {
        char in = static_cast<char>(b);
        char32_t result = 0;
        char* inp = &in;
        size_t inLeft = 1;
        char* outp = reinterpret_cast<char*>(&result);
        size_t outLeft = sizeof result;
        iconv(cd, nullptr, nullptr, nullptr, nullptr);
        const size_t rc = iconv(cd, &inp, &inLeft, &outp, &outLeft);
        m_table[b] = rc == static_cast<size_t>(-1) || outLeft != 0 ? kReplacement
                                                                   : static_cast<wchar_t>(result);
    }
    iconv_close(cd);
}

OxJetText::~OxJetText() {
    if (m_iconv)
        iconv_close(static_cast<iconv_t>(m_iconv));
}

void OxJetText::decodeUtf16(const uint8_t* data, size_t size, std::wstring& out) {
    out.clear();
    char32_t high = 0;
    for (size_t i = 0; i + 1 < size; i += 2)
        appendUtf16(out, static_cast<char16_t>(data[i] | (data[i + 1] << 8)), high);
    if (high)
        out.push_back(kReplacement);
}

void OxJetText::decode(const uint8_t* data, size_t size, std::wstring& out) {
    if (m_codePage != 0) {
        decodeCodePage(data, size, out);
        return;
    }
    if (size < 2 || data[0] != 0xFF || data[1] != 0xFE) {
        decodeUtf16(data, size, out);
        return;
    }
    // Compressed: runs of one byte per character (high byte zero) and runs of plain
    // UTF-16, each switch marked by a zero byte.
    out.clear();
    out.reserve(size);
    char32_t high = 0;
    bool compressed = true;
    for (size_t i = 2; i < size;) {
        if (data[i] == 0) {
            compressed = !compressed;
            ++i;
        } else if (compressed) {
            appendUtf16(out, static_cast<char16_t>(data[i]), high);
            ++i;
        } else if (i + 1 < size) {
            appendUtf16(out, static_cast<char16_t>(data[i] | (data[i + 1] << 8)), high);
            i += 2;
        } else {
            break;  // an odd byte at the end carries no character
        }
    }
    if (high)
        out.push_back(kReplacement);
}

void OxJetText::decodeCodePage(const uint8_t* data, size_t size, std::wstring& out) {
    out.clear();
    if (m_singleByte) {
        out.resize(size);
        for (size_t i = 0; i < size; ++i) out[i] = m_table[data[i]];
        return;
    }
    iconv_t cd = static_cast<iconv_t>(m_iconv);
    iconv(cd, nullptr, nullptr, nullptr, nullptr);
    std::u32string buffer(size + 1, U'\0');
    char* inp = reinterpret_cast<char*>(const_cast<uint8_t*>(data));
    size_t inLeft = size;
    while (inLeft > 0) {
        char* outp = reinterpret_cast<char*>(buffer.data());
        size_t outLeft = buffer.size() * sizeof(char32_t);
        const size_t rc = iconv(cd, &inp, &inLeft, &outp, &outLeft);
        const size_t produced = (buffer.size() * sizeof(char32_t) - outLeft) / sizeof(char32_t);
        for (size_t i = 0; i < produced; ++i) out.push_back(static_cast<wchar_t>(buffer[i]));
        if (rc != static_cast<size_t>(-1))
            break;
        if (errno == E2BIG)
            continue;
        // An invalid or cut-off sequence: one replacement, then go on after the byte.
        out.push_back(kReplacement);
        ++inp;
        --inLeft;
        iconv(cd, nullptr, nullptr, nullptr, nullptr);
    }
}
