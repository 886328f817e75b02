#include "platform/core/OxText.h"

#include <locale.h>
#include <wctype.h>

namespace {
constexpr char32_t kReplacement = 0xFFFD;

bool isScalar(char32_t c) {
    return c < 0xD800 || (c > 0xDFFF && c <= 0x10FFFF);
}

// C.UTF-8 is built into glibc and maps case for all of Unicode; it is opened once and
// used explicitly, so the host's setlocale never changes our results.
locale_t caseLocale() {
    static const locale_t loc = [] {
        locale_t l = newlocale(LC_CTYPE_MASK, "C.UTF-8", static_cast<locale_t>(nullptr));
        return l ? l : newlocale(LC_CTYPE_MASK, "C", static_cast<locale_t>(nullptr));
    }();
    return loc;
}
}  // namespace

namespace OxText {
// The conversions write through a pointer into room made first: pushing one unit at a
// time cost more than the conversion itself. Buffers that are reused keep their room, so
// a conversion per row allocates nothing.
size_t encodeUtf8(std::wstring_view text, char* out) {
    char* o = out;
    for (wchar_t wc : text) {
        auto c = static_cast<char32_t>(wc);
        if (c < 0x80) {
            *o++ = static_cast<char>(c);
            continue;
        }
        if (!isScalar(c))
            c = kReplacement;
        if (c < 0x800) {
            *o++ = static_cast<char>(0xC0 | (c >> 6));
        } else if (c < 0x10000) {
            *o++ = static_cast<char>(0xE0 | (c >> 12));
            *o++ = static_cast<char>(0x80 | ((c >> 6) & 0x3F));
        } else {
            *o++ = static_cast<char>(0xF0 | (c >> 18));
            *o++ = static_cast<char>(0x80 | ((c >> 12) & 0x3F));
            *o++ = static_cast<char>(0x80 | ((c >> 6) & 0x3F));
        }
        *o++ = static_cast<char>(0x80 | (c & 0x3F));
    }
    return static_cast<size_t>(o - out);
}

size_t decodeUtf8(std::string_view text, wchar_t* out) {
    const auto* p = reinterpret_cast<const unsigned char*>(text.data());
    const auto* end = p + text.size();
    wchar_t* o = out;
    while (p < end) {
        unsigned char b = *p;
        if (b < 0x80) {
            *o++ = static_cast<wchar_t>(b);
            ++p;
            continue;
        }
        int extra;
        char32_t c;
        char32_t min;
        if ((b & 0xE0) == 0xC0) {
            extra = 1, c = b & 0x1F, min = 0x80;
        } else if ((b & 0xF0) == 0xE0) {
            extra = 2, c = b & 0x0F, min = 0x800;
        } else if ((b & 0xF8) == 0xF0) {
            extra = 3, c = b & 0x07, min = 0x10000;
        } else {
            *o++ = static_cast<wchar_t>(kReplacement);
            ++p;
            continue;
        }
        const unsigned char* q = p + 1;
        int i = 0;
        for (; i < extra && q < end && (*q & 0xC0) == 0x80; ++i, ++q) c = (c << 6) | (*q & 0x3F);
        if (i < extra || c < min || !isScalar(c)) {
            // A broken sequence costs one replacement character and resumes at the next
            // byte that could start a character.
            *o++ = static_cast<wchar_t>(kReplacement);
            p = (i == 0) ? p + 1 : q;
            continue;
        }
        *o++ = static_cast<wchar_t>(c);
        p = q;
    }
    return static_cast<size_t>(o - out);
}

size_t encodeUtf16(std::wstring_view text, char16_t* out) {
    char16_t* o = out;
    for (wchar_t wc : text) {
        auto c = static_cast<char32_t>(wc);
        if (!isScalar(c))
            c = kReplacement;
        if (c < 0x10000) {
            *o++ = static_cast<char16_t>(c);
        } else {
            c -= 0x10000;
            *o++ = static_cast<char16_t>(0xD800 + (c >> 10));
            *o++ = static_cast<char16_t>(0xDC00 + (c & 0x3FF));
        }
    }
    return static_cast<size_t>(o - out);
}

size_t decodeUtf16(std::u16string_view text, wchar_t* out) {
    wchar_t* o = out;
    for (size_t i = 0; i < text.size(); ++i) {
        char32_t c = text[i];
        if (c >= 0xD800 && c <= 0xDBFF && i + 1 < text.size() && text[i + 1] >= 0xDC00 &&
            text[i + 1] <= 0xDFFF) {
            c = 0x10000 + ((c - 0xD800) << 10) + (text[i + 1] - 0xDC00);
            ++i;
        } else if (c >= 0xD800 && c <= 0xDFFF) {
            c = kReplacement;
        }
        *o++ = static_cast<wchar_t>(c);
    }
    return static_cast<size_t>(o - out);
}

namespace {
// Appends through one of the conversions above: room for the longest result, then the
// string trimmed to what was written.
template <class Out, class In, class Convert>
void appendConverted(Out& out, In text, size_t unitsPerUnit, Convert convert) {
    const size_t start = out.size();
    out.resize(start + text.size() * unitsPerUnit);
    out.resize(start + convert(text, out.data() + start));
}

// A string returned to keep gives back the room its conversion did not use.
template <class S>
S trimmed(S s) {
    if (s.capacity() > 2 * s.size() + 64)
        s.shrink_to_fit();
    return s;
}
}  // namespace

void appendUtf8(std::string& out, std::wstring_view text) {
    appendConverted(out, text, 4, encodeUtf8);
}

std::string toUtf8(std::wstring_view text) {
    std::string out;
    appendUtf8(out, text);
    return trimmed(std::move(out));
}

void appendFromUtf8(std::wstring& out, std::string_view text) {
    appendConverted(out, text, 1, decodeUtf8);
}

std::wstring fromUtf8(std::string_view text) {
    std::wstring out;
    appendFromUtf8(out, text);
    return trimmed(std::move(out));
}

void appendUtf16(std::u16string& out, std::wstring_view text) {
    appendConverted(out, text, 2, encodeUtf16);
}

std::u16string toUtf16(std::wstring_view text) {
    std::u16string out;
    appendUtf16(out, text);
    return trimmed(std::move(out));
}

void appendFromUtf16(std::wstring& out, std::u16string_view text) {
    appendConverted(out, text, 1, decodeUtf16);
}

std::wstring fromUtf16(std::u16string_view text) {
    std::wstring out;
    appendFromUtf16(out, text);
    return trimmed(std::move(out));
}

wchar_t toUpper(wchar_t c) {
    if (c < 0x80)
        return (c >= L'a' && c <= L'z') ? c - 32 : c;
    return static_cast<wchar_t>(towupper_l(static_cast<wint_t>(c), caseLocale()));
}

wchar_t toLower(wchar_t c) {
    if (c < 0x80)
        return (c >= L'A' && c <= L'Z') ? c + 32 : c;
    return static_cast<wchar_t>(towlower_l(static_cast<wint_t>(c), caseLocale()));
}

std::wstring toUpper(std::wstring_view text) {
    std::wstring out(text);
    for (auto& c : out) c = toUpper(c);
    return out;
}

std::wstring toLower(std::wstring_view text) {
    std::wstring out(text);
    for (auto& c : out) c = toLower(c);
    return out;
}

int compareNoCase(std::wstring_view a, std::wstring_view b) {
    const size_t n = std::min(a.size(), b.size());
    for (size_t i = 0; i < n; ++i) {
        const wchar_t x = toLower(a[i]);
        const wchar_t y = toLower(b[i]);
        if (x != y)
            return x < y ? -1 : 1;
    }
    return a.size() == b.size() ? 0 : (a.size() < b.size() ? -1 : 1);
}

bool equalsNoCase(std::wstring_view a, std::wstring_view b) {
    return a.size() == b.size() && compareNoCase(a, b) == 0;
}

size_t findNoCase(std::wstring_view text, std::wstring_view needle, size_t from) {
    if (needle.size() > text.size())
        return std::wstring_view::npos;
    for (size_t i = from; i + needle.size() <= text.size(); ++i) {
        size_t k = 0;
        while (k < needle.size() && toLower(text[i + k]) == toLower(needle[k])) ++k;
        if (k == needle.size())
            return i;
    }
    return std::wstring_view::npos;
}

void replaceAll(std::wstring& text, std::wstring_view from, std::wstring_view to) {
    if (from.empty())
        return;
    std::wstring out;
    size_t pos = 0;
    for (size_t hit; (hit = text.find(from, pos)) != std::wstring::npos; pos = hit + from.size()) {
        out.append(text, pos, hit - pos);
        out.append(to);
    }
    if (pos == 0)
        return;
    out.append(text, pos, std::wstring::npos);
    text = std::move(out);
}

std::wstring trim(std::wstring_view text) {
    size_t b = 0;
    size_t e = text.size();
    while (b < e && iswspace_l(static_cast<wint_t>(text[b]), caseLocale())) ++b;
    while (e > b && iswspace_l(static_cast<wint_t>(text[e - 1]), caseLocale())) --e;
    return std::wstring(text.substr(b, e - b));
}
}  // namespace OxText
