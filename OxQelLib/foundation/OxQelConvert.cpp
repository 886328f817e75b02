#include "OxQelLib/foundation/OxQelConvert.h"

#include <charconv>
#include <cmath>
#include <cwctype>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

namespace OxQel {
int32_t _lConnectionTimeout = 0;
int32_t _lCommandTimeout = 0;

bool isStringType(FieldType type) {
    return type == String || type == WString || type == Memo || type == Char || type == WChar;
}

int QelFieldTypeToADODBType(int qelType) {
    switch (qelType) {
        case Integer:
            return 3;
        case String:
        case Char:
            return 200;
        case WString:
            return 202;
        case Memo:
            return 201;
        case WMemo:
            return 203;
        case Double:
            return 5;
        case Date:
            return 7;
        case Bool:
            return 11;
        case Binary:
        case Guid:
            return 72;
        case WChar:
            return 130;
        default:
            return 0;
    }
}

int ADODBTypeToQelFieldType(int adoType) {
    switch (adoType) {
        case 2:
        case 3:
        case 16:
        case 17:
        case 18:
        case 19:
        case 20:
        case 21:
        case 128:
        case 131:
        case 139:
        case 204:
        case 205:
        case -9999:
            return Integer;
        case 4:
        case 5:
        case 14:
            return Double;
        case 7:
        case 133:
        case 134:
        case 135:
            return Date;
        case 8:
        case 200:
            return String;
        case 11:
            return Bool;
        case 72:
            return Guid;
        case 129:
            return Char;
        case 130:
            return WChar;
        case 201:
            return Memo;
        case 202:
            return WString;
        case 203:
            return WMemo;
        default:
            return Unknown;
    }
}

namespace {
// The leading base-10 integer of a text (blanks and a sign allowed before it), 0 when
// there are no digits; saturates instead of overflowing.
long leadingInteger(std::wstring_view text) {
    size_t i = 0;
    while (i < text.size() && std::iswspace(static_cast<wint_t>(text[i]))) ++i;
    bool negative = false;
    if (i < text.size() && (text[i] == L'+' || text[i] == L'-'))
        negative = text[i++] == L'-';
    unsigned long long v = 0;
    bool saturated = false;
    for (; i < text.size() && text[i] >= L'0' && text[i] <= L'9'; ++i) {
        v = v * 10 + static_cast<unsigned>(text[i] - L'0');
        if (v > static_cast<unsigned long long>(INT64_MAX))
            saturated = true, v = static_cast<unsigned long long>(INT64_MAX);
    }
    if (saturated)
        return negative ? INT64_MIN : INT64_MAX;
    return negative ? -static_cast<long>(v) : static_cast<long>(v);
}

// The leading decimal number of a text with a point (strtod's reading without its
// locale or its hexadecimal and infinity forms); 0.0 when there is none.
double leadingReal(std::wstring_view text) {
    std::string ascii;
    size_t i = 0;
    while (i < text.size() && std::iswspace(static_cast<wint_t>(text[i]))) ++i;
    if (i < text.size() && (text[i] == L'+' || text[i] == L'-'))
        ascii.push_back(static_cast<char>(text[i++]));
    bool digits = false;
    for (; i < text.size() && text[i] >= L'0' && text[i] <= L'9'; ++i, digits = true)
        ascii.push_back(static_cast<char>(text[i]));
    if (i < text.size() && text[i] == L'.') {
        ascii.push_back('.');
        for (++i; i < text.size() && text[i] >= L'0' && text[i] <= L'9'; ++i, digits = true)
            ascii.push_back(static_cast<char>(text[i]));
    }
    if (!digits)
        return 0.0;
    if (i < text.size() && (text[i] == L'e' || text[i] == L'E')) {
        std::string exp = "e";
        size_t j = i + 1;
        if (j < text.size() && (text[j] == L'+' || text[j] == L'-'))
            exp.push_back(static_cast<char>(text[j++]));
        const size_t start = j;
        for (; j < text.size() && text[j] >= L'0' && text[j] <= L'9'; ++j)
            exp.push_back(static_cast<char>(text[j]));
        if (j > start)
            ascii += exp;
    }
    double v = 0.0;
    const auto res = std::from_chars(ascii.data(), ascii.data() + ascii.size(), v);
    if (res.ec == std::errc::result_out_of_range)
        return ascii[0] == '-' ? -HUGE_VAL : HUGE_VAL;
    return v;
}

// The decimal's full 96-bit mantissa (not only its low 32 bits), scaled.
double decimalToDouble(const OxDecimal& d) {
    const double mantissa =
        static_cast<double>(d.hi32) * 18446744073709551616.0 + static_cast<double>(d.lo64);
    const double v = mantissa / std::pow(10.0, d.scale);
    return d.sign == OxDecimal::kNegative ? -v : v;
}
}  // namespace

void _variantToString(const OxVariant& value, std::wstring& out) {
    switch (value.vt()) {
        case VT_NULL:
        case VT_EMPTY:
            out.clear();
            return;
        case VT_BSTR:
            out.assign(value.bstr());
            return;
        case VT_R4:
        case VT_R8:
            out = value.changedType(VT_BSTR).str();
            for (auto& c : out)
                if (c == L',')
                    c = L'.';
            return;
        default:
            out = value.changedType(VT_BSTR).str();
            return;
    }
}

std::wstring _variantToString(const OxVariant& value) {
    std::wstring out;
    _variantToString(value, out);
    return out;
}

void _variantToBool(const OxVariant& value, bool& out) {
    switch (value.vt()) {
        case VT_I2:
            out = value.iVal() != 0;
            return;
        case VT_BOOL:
            out = value.boolVal() != 0;
            return;
        case VT_I4:
            out = value.lVal() != 0;
            return;
        case VT_R4:
            out = value.fltVal() != 0.0f;
            return;
        case VT_R8:
            out = value.dblVal() != 0.0;
            return;
        case VT_BSTR:
            out = leadingInteger(value.bstr()) != 0;
            return;
        default:
            out = value.changedType(VT_BOOL).boolVal() == VARIANT_TRUE;
            return;
    }
}

void _variantToDouble(const OxVariant& value, double& out) {
    switch (value.vt()) {
        case VT_EMPTY:
        case VT_NULL:
            out = 0.0;
            return;
        case VT_I2:
            out = value.iVal();
            return;
        case VT_BOOL:
            out = value.boolVal();
            return;
        case VT_UI1:
            out = value.bVal();
            return;
        case VT_I4:
        case VT_INT:
            out = value.lVal();
            return;
        case VT_R4:
            out = value.fltVal();
            return;
        case VT_BSTR: {
            std::wstring text(value.bstr());
            for (auto& c : text)
                if (c == L',')
                    c = L'.';
            out = leadingReal(text);
            return;
        }
        case VT_DECIMAL:
            out = decimalToDouble(value.decVal());
            return;
        case VT_R8:
        case VT_DATE:
            out = value.dblVal();
            return;
        default: {
            // Other numbers by value (the raw eight bytes would be garbage for them).
            OxVariant r;
            out = OxHr::failed(value.tryChangeType(VT_R8, r)) ? 0.0 : r.dblVal();
            return;
        }
    }
}

void _variantToLong(const OxVariant& value, long& out) {
    switch (value.vt()) {
        case VT_EMPTY:
        case VT_NULL:
            out = 0;
            return;
        case VT_I2:
            out = value.iVal();
            return;
        case VT_BOOL:
            out = value.boolVal();
            return;
        case VT_R4:
            out = static_cast<long>(std::trunc(static_cast<double>(value.fltVal())));
            return;
        case VT_R8:
        case VT_DATE: {
            const double d = std::trunc(value.dblVal());
            out = std::isfinite(d) && std::fabs(d) < 9.2e18 ? static_cast<long>(d) : 0;
            return;
        }
        case VT_BSTR:
            out = leadingInteger(value.bstr());
            return;
        case VT_DECIMAL: {
            const OxDecimal d = value.decVal();
            const double v = std::trunc(decimalToDouble(d));
            out = std::fabs(v) < 9.2e18 ? static_cast<long>(v) : 0;
            return;
        }
        case VT_I4:
        case VT_INT:
            out = value.lVal();
            return;
        case VT_UI4:
        case VT_UINT:
            out = value.ulVal();
            return;
        case VT_I8:
            out = value.llVal();
            return;
        case VT_UI8:
            out = static_cast<long>(value.ullVal());
            return;
        case VT_I1:
            out = value.cVal();
            return;
        case VT_UI1:
            out = value.bVal();
            return;
        case VT_UI2:
            out = value.uiVal();
            return;
        case VT_CY:
            out = value.cyVal() / 10000;
            return;
        default:
            out = 0;
            return;
    }
}

bool _variantToULong(const OxVariant& value, uint32_t& out) {
    out = 0;
    if (value.vt() == VT_BSTR) {
        const std::wstring_view text = value.bstr();
        size_t i = 0;
        while (i < text.size() && std::iswspace(static_cast<wint_t>(text[i]))) ++i;
        if (i < text.size() && text[i] == L'+')
            ++i;
        const size_t start = i;
        uint64_t v = 0;
        for (; i < text.size() && text[i] >= L'0' && text[i] <= L'9'; ++i) {
            v = v * 10 + static_cast<unsigned>(text[i] - L'0');
            if (v > UINT32_MAX)
                return true;  // does not fit: a failure, not a wrapped value
        }
        if (i == start)
            return true;
        out = static_cast<uint32_t>(v);
        return false;
    }
    if (value.vt() == VT_UI4) {
        out = value.ulVal();
        return false;
    }
    OxVariant r;
    if (OxHr::failed(value.tryChangeType(VT_UI4, r)))
        return true;
    out = r.ulVal();
    return false;
}

void _variantToDate(const OxVariant& value, OxDateTime& out) {
    if (value.vt() == VT_NULL)
        return;
    if (value.vt() == VT_DATE) {
        out = OxDateTime(value.date());
        out.setStatus(OxDateTime::valid);
    } else {
        OxVariant r;
        if (OxHr::failed(value.tryChangeType(VT_DATE, r))) {
            out.setStatus(OxDateTime::invalid);
        } else {
            out = OxDateTime(r.date());
            out.setStatus(OxDateTime::valid);
        }
    }
    if (out.getStatus() == OxDateTime::valid)
        return;
    // 20201231 reads as 2020/12/31.
    std::wstring text = _variantToString(value);
    text.insert(std::min<size_t>(6, text.size()), L"/");
    text.insert(std::min<size_t>(4, text.size()), L"/");
    out.parseDateTime(text);
}

bool _checkACEDriverInstalled() {
    return false;
}

namespace ADO {
std::wstring getStrSQLFieldType(FieldType type, int size) {
    switch (type) {
        case Integer:
            return L"INT";
        case String:
            return oxFormat(L"VARCHAR (%d)", size);
        case WString:
            return oxFormat(L"NVARCHAR (%d)", size);
        case Memo:
            return L"MEMO";
        case Double:
            return L"FLOAT";
        case Date:
            return L"DATETIME";
        case Binary:
        case Guid:
            return L"UNIQUEIDENTIFIER";
        case Char:
            return oxFormat(L"CHAR (%d)", size);
        case WChar:
            return oxFormat(L"NCHAR (%d)", size);
        default:
            return {};
    }
}
}  // namespace ADO

namespace Access {
std::wstring getStrSQLFieldType(FieldType type, int size) {
    return type == Bool ? L"BYTE" : ADO::getStrSQLFieldType(type, size);
}

std::wstring formatStrFieldType(FieldType type, int size, const std::wstring&, bool canBeNull) {
    std::wstring text = getStrSQLFieldType(type, size);
    switch (type) {
        case Integer:
        case String:
        case WString:
        case Memo:
        case Double:
        case Bool:
        case Char:
        case WChar:
            return text + L" NOT NULL";
        case Date:
            return text + L" NULL";
        case Binary:
        case Guid:
            return canBeNull ? text : text + L" NOT NULL";
        default:
            return text;
    }
}
}  // namespace Access

namespace SQLServer {
std::wstring getStrSQLFieldType(FieldType type, int size) {
    return type == Bool ? L"BIT" : ADO::getStrSQLFieldType(type, size);
}

std::wstring formatStrFieldConstraint(const std::wstring& table, const std::wstring& field) {
    return oxFormat(L"CONSTRAINT DF_%s_%s", table, field);
}

std::wstring formatStrFieldType(const std::wstring& table, const std::wstring& field,
                                FieldType type, int size, const std::wstring& defaultValue,
                                bool canBeNull) {
    const std::wstring nullText = canBeNull ? L"" : L"NOT NULL";
    std::wstring defaultText = defaultValue;
    OxText::replaceAll(defaultText, L"\"\"", L"''");
    const std::wstring typeText = getStrSQLFieldType(type, size);
    switch (type) {
        case Integer:
        case String:
        case WString:
        case Memo:
        case Double:
        case Bool:
        case Char:
        case WChar:
            return oxFormat(L"%s %s %s DEFAULT %s ", typeText, nullText,
                            formatStrFieldConstraint(table, field), defaultText);
        case Date:
            return oxFormat(L"%s NULL", typeText);
        case Binary:
        case Guid:
            if (canBeNull)
                return typeText;
            return oxFormat(L"%s %s %s DEFAULT %s", typeText, L"NOT NULL",
                            formatStrFieldConstraint(table, field), L"NEWID()");
        default:
            return {};
    }
}
}  // namespace SQLServer

namespace Util {
namespace {
template <class F>
bool guarded(F&& f) noexcept {
    try {
        f();
        return true;
    } catch (...) {
        return false;
    }
}
}  // namespace

bool tryVariantToString(const OxVariant& v, std::wstring& out) noexcept {
    out.clear();
    return guarded([&] { _variantToString(v, out); });
}
bool tryVariantToBool(const OxVariant& v, bool& out) noexcept {
    out = false;
    return guarded([&] { _variantToBool(v, out); });
}
bool tryVariantToDate(const OxVariant& v, OxDateTime& out) noexcept {
    return guarded([&] { _variantToDate(v, out); });
}
bool tryVariantToDouble(const OxVariant& v, double& out) noexcept {
    out = 0.0;
    return guarded([&] { _variantToDouble(v, out); });
}
bool tryVariantToLong(const OxVariant& v, long& out) noexcept {
    out = 0;
    return guarded([&] { _variantToLong(v, out); });
}
}  // namespace Util
}  // namespace OxQel
