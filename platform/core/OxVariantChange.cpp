// The platform's variant type change: which source converts to which target, and how.
#include <charconv>
#include <cmath>
#include <cstring>
#include <limits>

#include "platform/core/OxText.h"
#include "platform/core/OxUserLocale.h"
#include "platform/core/OxVariant.h"

namespace {
__extension__ typedef unsigned __int128 u128;

// A number read from a variant: exact integers stay integers, the rest is a double,
// decimals keep their 96-bit mantissa.
struct Number {
    enum Kind { Int, UInt, Real, Dec } kind = Int;
    int64_t i = 0;
    uint64_t u = 0;
    double r = 0;
    u128 mant = 0;
    int scale = 0;
    bool negative = false;

    double toDouble() const {
        switch (kind) {
            case Int:
                return static_cast<double>(i);
            case UInt:
                return static_cast<double>(u);
            case Real:
                return r;
            case Dec: {
                double v = static_cast<double>(mant) / std::pow(10.0, scale);
                return negative ? -v : v;
            }
        }
        return 0;
    }
};

const u128 kMax96 = (static_cast<u128>(1) << 96) - 1;

struct Failure {
    OxHResult hr;
};

[[noreturn]] void fail(OxHResult hr) {
    throw Failure{hr};
}

u128 pow10(int n) {
    u128 v = 1;
    while (n-- > 0) v *= 10;
    return v;
}

Number fromDecimal(const OxDecimal& d) {
    Number n;
    n.kind = Number::Dec;
    n.mant = (static_cast<u128>(d.hi32) << 64) | d.lo64;
    n.scale = d.scale;
    n.negative = d.sign == OxDecimal::kNegative;
    if (n.scale > 28)
        fail(OxHr::DISP_E_OVERFLOW);
    return n;
}

// Parses text the way the platform reads numbers for the user locale: blanks around,
// a sign, group separators in the integer part, the locale's decimal separator, an
// exponent. Anything else is a type mismatch.
Number parseNumber(std::wstring_view text) {
    const OxUserLocale loc = OxUserLocale::current();
    std::wstring t = OxText::trim(text);
    std::string ascii;
    size_t i = 0;
    bool negative = false;
    if (i < t.size() && (t[i] == L'+' || t[i] == L'-'))
        negative = t[i++] == L'-';
    bool digits = false;
    bool point = false;
    for (; i < t.size(); ++i) {
        const wchar_t c = t[i];
        if (c >= L'0' && c <= L'9') {
            ascii.push_back(static_cast<char>(c));
            digits = true;
        } else if (c == loc.decimalSeparator && !point) {
            ascii.push_back('.');
            point = true;
        } else if (c == loc.groupSeparator && !point && digits) {
            continue;
        } else {
            break;
        }
    }
    if (!digits)
        fail(OxHr::DISP_E_TYPEMISMATCH);
    bool exponent = false;
    if (i < t.size() && (t[i] == L'e' || t[i] == L'E')) {
        std::string e = "e";
        size_t j = i + 1;
        if (j < t.size() && (t[j] == L'+' || t[j] == L'-'))
            e.push_back(static_cast<char>(t[j++]));
        size_t start = j;
        while (j < t.size() && t[j] >= L'0' && t[j] <= L'9') e.push_back(static_cast<char>(t[j++]));
        if (j == start)
            fail(OxHr::DISP_E_TYPEMISMATCH);
        ascii += e;
        exponent = true;
        i = j;
    }
    if (i != t.size())
        fail(OxHr::DISP_E_TYPEMISMATCH);

    Number n;
    if (!point && !exponent) {
        // Whole numbers stay exact as far as 64 bits reach.
        uint64_t u = 0;
        const auto r = std::from_chars(ascii.data(), ascii.data() + ascii.size(), u);
        if (r.ec == std::errc() && r.ptr == ascii.data() + ascii.size()) {
            if (!negative) {
                n.kind = u > static_cast<uint64_t>(INT64_MAX) ? Number::UInt : Number::Int;
                n.u = u;
                n.i = static_cast<int64_t>(u);
                return n;
            }
            if (u <= static_cast<uint64_t>(INT64_MAX) + 1) {
                n.kind = Number::Int;
                n.i = static_cast<int64_t>(0 - u);
                return n;
            }
        }
    }
    double v = 0;
    auto [end, ec] = std::from_chars(ascii.data(), ascii.data() + ascii.size(), v);
    if (ec == std::errc::result_out_of_range || !std::isfinite(v))
        fail(OxHr::DISP_E_OVERFLOW);
    if (ec != std::errc() || end != ascii.data() + ascii.size())
        fail(OxHr::DISP_E_TYPEMISMATCH);
    n.kind = Number::Real;
    n.r = negative ? -v : v;
    return n;
}

Number numberOf(const OxVariant& v) {
    Number n;
    switch (v.vt()) {
        case VT_EMPTY:
            return n;
        case VT_I1:
            n.i = v.cVal();
            return n;
        case VT_I2:
            n.i = v.iVal();
            return n;
        case VT_BOOL:
            n.i = v.boolVal();
            return n;
        case VT_I4:
        case VT_INT:
            n.i = v.lVal();
            return n;
        case VT_I8:
            n.i = v.llVal();
            return n;
        case VT_UI1:
            n.i = v.bVal();
            return n;
        case VT_UI2:
            n.i = v.uiVal();
            return n;
        case VT_UI4:
        case VT_UINT:
            n.i = v.ulVal();
            return n;
        case VT_UI8:
            n.kind = Number::UInt, n.u = v.ullVal();
            return n;
        case VT_R4:
            n.kind = Number::Real, n.r = v.fltVal();
            return n;
        case VT_R8:
        case VT_DATE:
            n.kind = Number::Real, n.r = v.dblVal();
            return n;
        case VT_CY: {
            OxDecimal d;
            const int64_t cy = v.cyVal();
            d.scale = 4;
            d.sign = cy < 0 ? OxDecimal::kNegative : 0;
            d.lo64 = cy < 0 ? static_cast<uint64_t>(0) - static_cast<uint64_t>(cy)
                            : static_cast<uint64_t>(cy);
            return fromDecimal(d);
        }
        case VT_DECIMAL:
            return fromDecimal(v.decVal());
        case VT_BSTR:
            return parseNumber(v.bstr());
        default:
            fail(OxHr::DISP_E_TYPEMISMATCH);
    }
}

// Rounds to a whole number with ties to even, as the platform does, and checks range.
template <class T>
T toInteger(const Number& n) {
    using L = std::numeric_limits<T>;
    switch (n.kind) {
        case Number::Int:
            if (n.i < static_cast<int64_t>(L::min()) ||
                (n.i > 0 && static_cast<uint64_t>(n.i) > static_cast<uint64_t>(L::max())))
                fail(OxHr::DISP_E_OVERFLOW);
            return static_cast<T>(n.i);
        case Number::UInt:
            if (n.u > static_cast<uint64_t>(L::max()))
                fail(OxHr::DISP_E_OVERFLOW);
            return static_cast<T>(n.u);
        case Number::Dec: {
            const u128 div = pow10(n.scale);
            u128 q = n.mant / div;
            const u128 r = n.mant % div;
            if (r * 2 > div || (r * 2 == div && (q & 1)))
                ++q;
            if (n.negative) {
                if (q > static_cast<u128>(static_cast<uint64_t>(L::max())) + 1 ||
                    (!L::is_signed && q != 0))
                    fail(OxHr::DISP_E_OVERFLOW);
                if (q > static_cast<u128>(static_cast<uint64_t>(L::max())))
                    return L::min();
                return static_cast<T>(-static_cast<int64_t>(q));
            }
            if (q > static_cast<u128>(static_cast<uint64_t>(L::max())))
                fail(OxHr::DISP_E_OVERFLOW);
            return static_cast<T>(q);
        }
        case Number::Real: {
            if (!std::isfinite(n.r))
                fail(OxHr::DISP_E_OVERFLOW);
            const double r = std::nearbyint(n.r);
            if (r < static_cast<double>(L::min()) || r >= static_cast<double>(L::max()) + 1.0)
                fail(OxHr::DISP_E_OVERFLOW);
            return static_cast<T>(r);
        }
    }
    return 0;
}

OxDecimal toDecimal(const Number& n) {
    OxDecimal d;
    u128 mant = 0;
    switch (n.kind) {
        case Number::Int:
            d.sign = n.i < 0 ? OxDecimal::kNegative : 0;
            mant = n.i < 0 ? static_cast<u128>(-(n.i + 1)) + 1 : static_cast<u128>(n.i);
            break;
        case Number::UInt:
            mant = n.u;
            break;
        case Number::Dec:
            mant = n.mant;
            d.scale = static_cast<uint8_t>(n.scale);
            d.sign = n.negative ? OxDecimal::kNegative : 0;
            break;
        case Number::Real: {
            // Through the shortest text that reads back as the same double, as exact as
            // the double allows without inventing digits.
            if (!std::isfinite(n.r))
                fail(OxHr::DISP_E_OVERFLOW);
            char buf[64];
            auto res =
                std::to_chars(buf, buf + sizeof buf, std::fabs(n.r), std::chars_format::fixed);
            if (res.ec != std::errc())
                fail(OxHr::DISP_E_OVERFLOW);
            int scale = -1;
            for (char* p = buf; p < res.ptr; ++p) {
                if (*p == '.') {
                    scale = 0;
                    continue;
                }
                if (mant > kMax96 / 10) {
                    if (scale < 0)
                        fail(OxHr::DISP_E_OVERFLOW);
                    break;  // digits beyond 96 bits are below the precision kept
                }
                mant = mant * 10 + static_cast<unsigned>(*p - '0');
                if (scale >= 0)
                    ++scale;
                if (scale == 28)
                    break;
            }
            d.scale = static_cast<uint8_t>(scale < 0 ? 0 : scale);
            d.sign = n.r < 0 && mant != 0 ? OxDecimal::kNegative : 0;
            break;
        }
    }
    if (mant > kMax96)
        fail(OxHr::DISP_E_OVERFLOW);
    d.hi32 = static_cast<uint32_t>(mant >> 64);
    d.lo64 = static_cast<uint64_t>(mant);
    return d;
}

std::wstring withLocaleSeparator(std::string ascii) {
    const wchar_t sep = OxUserLocale::current().decimalSeparator;
    std::wstring out;
    out.reserve(ascii.size());
    for (char c : ascii) out.push_back(c == '.' ? sep : static_cast<wchar_t>(c == 'e' ? 'E' : c));
    return out;
}

// The platform writes doubles with 15 significant digits and floats with 7, as "%G".
std::wstring realToText(double v, int digits) {
    if (std::isnan(v))
        return L"NaN";
    if (std::isinf(v))
        return v < 0 ? L"-Infinity" : L"Infinity";
    char buf[64];
    auto res = std::to_chars(buf, buf + sizeof buf, v, std::chars_format::general, digits);
    return withLocaleSeparator(std::string(buf, res.ptr));
}

std::wstring decimalToText(const Number& n) {
    std::string digits;
    u128 m = n.mant;
    do {
        digits.insert(digits.begin(), static_cast<char>('0' + static_cast<int>(m % 10)));
        m /= 10;
    } while (m);
    if (static_cast<int>(digits.size()) <= n.scale)
        digits.insert(0, static_cast<size_t>(n.scale) - digits.size() + 1, '0');
    if (n.scale > 0) {
        digits.insert(digits.size() - static_cast<size_t>(n.scale), 1, '.');
        while (digits.back() == '0') digits.pop_back();
        if (digits.back() == '.')
            digits.pop_back();
    }
    if (n.negative && digits != "0")
        digits.insert(0, 1, '-');
    return withLocaleSeparator(digits);
}

std::wstring toText(const OxVariant& v) {
    switch (v.vt()) {
        case VT_EMPTY:
            return {};
        case VT_BSTR:
            return v.str();
        case VT_BOOL:
            return v.boolVal() ? L"-1" : L"0";
        case VT_R4:
            return realToText(v.fltVal(), 7);
        case VT_R8:
            return realToText(v.dblVal(), 15);
        case VT_DATE: {
            OxDateTime d(v.date());
            if (d.getStatus() != OxDateTime::valid)
                fail(OxHr::DISP_E_OVERFLOW);
            return d.format();
        }
        case VT_CY:
        case VT_DECIMAL:
            return decimalToText(numberOf(v));
        case VT_UI8:
            return std::to_wstring(v.ullVal());
        case VT_ARRAY | VT_UI1: {
            // The platform hands the bytes over as the text's UTF-16 code units.
            std::u16string units(v.bytesSize() / 2, u'\0');
            if (!units.empty())
                std::memcpy(units.data(), v.bytesData(), units.size() * 2);
            return OxText::fromUtf16(units);
        }
        case VT_NULL:
        case VT_ERROR:
            fail(OxHr::DISP_E_TYPEMISMATCH);
        default:
            return std::to_wstring(toInteger<int64_t>(numberOf(v)));
    }
}

bool textToBool(std::wstring_view text) {
    const std::wstring t = OxText::trim(text);
    if (OxText::equalsNoCase(t, L"true") || OxText::equalsNoCase(t, L"#true#"))
        return true;
    if (OxText::equalsNoCase(t, L"false") || OxText::equalsNoCase(t, L"#false#"))
        return false;
    return parseNumber(t).toDouble() != 0.0;
}

double toDate(const OxVariant& v) {
    if (v.vt() == VT_BSTR) {
        double serial;
        const OxHResult hr = OxDateTime::parse(v.bstr(), serial);
        if (OxHr::failed(hr))
            fail(hr);
        return serial;
    }
    const double d = numberOf(v).toDouble();
    if (!OxDateTime::isSerialInRange(d))
        fail(OxHr::DISP_E_OVERFLOW);
    return d;
}

OxVariant convert(const OxVariant& v, uint16_t vt) {
    const uint16_t src = v.vt();
    if (vt == src)
        return v;
    if (vt == VT_EMPTY)
        return OxVariant();
    if (vt == VT_NULL) {
        if (src == VT_EMPTY)
            return OxVariant::null();
        fail(OxHr::DISP_E_TYPEMISMATCH);
    }
    if (src == VT_NULL || src == VT_ERROR || vt == VT_ERROR)
        fail(OxHr::DISP_E_TYPEMISMATCH);
    if (src == (VT_ARRAY | VT_UI1) && vt != VT_BSTR)
        fail(OxHr::DISP_E_TYPEMISMATCH);
    switch (vt) {
        case VT_BSTR:
            return OxVariant(toText(v));
        case VT_BOOL:
            if (src == VT_BSTR)
                return OxVariant(textToBool(v.bstr()));
            return OxVariant(numberOf(v).toDouble() != 0.0);
        // I1, INT, UI2 and UINT travel in their wider neighbour's form; the caller sets the tag.
        case VT_I1:
            return OxVariant(static_cast<int32_t>(toInteger<int8_t>(numberOf(v))));
        case VT_I2:
            return OxVariant(toInteger<int16_t>(numberOf(v)));
        case VT_I4:
        case VT_INT:
            return OxVariant(toInteger<int32_t>(numberOf(v)));
        case VT_I8:
            return OxVariant(static_cast<long long>(toInteger<int64_t>(numberOf(v))));
        case VT_UI1:
            return OxVariant(toInteger<uint8_t>(numberOf(v)));
        case VT_UI2:
            return OxVariant(static_cast<uint32_t>(toInteger<uint16_t>(numberOf(v))));
        case VT_UI4:
        case VT_UINT:
            return OxVariant(toInteger<uint32_t>(numberOf(v)));
        case VT_UI8:
            return OxVariant(static_cast<unsigned long>(toInteger<uint64_t>(numberOf(v))));
        case VT_R4: {
            const double d = numberOf(v).toDouble();
            if (std::fabs(d) > std::numeric_limits<float>::max())
                fail(OxHr::DISP_E_OVERFLOW);
            return OxVariant(static_cast<float>(d));
        }
        case VT_R8:
            return OxVariant(numberOf(v).toDouble());
        case VT_DATE:
            return OxVariant::fromDate(toDate(v));
        case VT_CY: {
            Number n = numberOf(v);
            if (n.kind == Number::Dec) {
                // Rescale to four places exactly.
                Number scaled = n;
                if (n.scale < 4) {
                    scaled.mant = n.mant * pow10(4 - n.scale);
                    scaled.scale = 0;
                } else {
                    scaled.scale = n.scale - 4;
                }
                return OxVariant::fromCurrency(toInteger<int64_t>(scaled));
            }
            Number x;
            x.kind = Number::Real;
            x.r = n.toDouble() * 10000.0;
            if (n.kind == Number::Int && n.i < INT64_MAX / 10000 && n.i > INT64_MIN / 10000)
                return OxVariant::fromCurrency(n.i * 10000);
            return OxVariant::fromCurrency(toInteger<int64_t>(x));
        }
        case VT_DECIMAL:
            return OxVariant(toDecimal(numberOf(v)));
        case VT_ARRAY | VT_UI1: {
            if (src != VT_BSTR)
                fail(OxHr::DISP_E_TYPEMISMATCH);
            const std::u16string units = OxText::toUtf16(v.bstr());
            return OxVariant::fromBytes(units.data(), units.size() * 2);
        }
        default:
            fail(OxHr::DISP_E_BADVARTYPE);
    }
}
}  // namespace

OxHResult OxVariant::tryChangeType(uint16_t vt, OxVariant& out) const noexcept {
    try {
        OxVariant r = convert(*this, vt);
        if ((vt == VT_UI2 || vt == VT_UINT) && r.m_vt == VT_UI4)
            r.m_vt = vt;
        if ((vt == VT_I1 || vt == VT_INT) && r.m_vt == VT_I4)
            r.m_vt = vt;
        out = std::move(r);
        return OxHr::S_OK;
    } catch (const Failure& f) {
        return f.hr;
    } catch (const std::bad_alloc&) {
        return OxHr::E_OUTOFMEMORY;
    }
}

OxVariant OxVariant::changedType(uint16_t vt) const {
    OxVariant out;
    const OxHResult hr = tryChangeType(vt, out);
    if (OxHr::failed(hr))
        throw OxComError(hr);
    return out;
}

void OxVariant::changeType(uint16_t vt) {
    *this = changedType(vt);
}
