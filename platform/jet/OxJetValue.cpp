#include "platform/jet/OxJetValue.h"

#include <charconv>
#include <cmath>
#include <cstring>

#include "platform/core/OxDateTime.h"

namespace {
void appendAscii(std::wstring& out, const char* begin, const char* end) {
    for (const char* p = begin; p < end; ++p) out.push_back(static_cast<wchar_t>(*p));
}

template <class T>
void appendNumber(std::wstring& out, T value) {
    char buffer[64];
    const auto r = std::to_chars(buffer, buffer + sizeof buffer, value);
    appendAscii(out, buffer, r.ptr);
}

// Shortest text that reads back to the same value; non-finite values by name.
template <class T>
void appendReal(std::wstring& out, T value) {
    if (std::isnan(value)) {
        out += L"NaN";
        return;
    }
    if (std::isinf(value)) {
        out += value < 0 ? L"-Infinity" : L"Infinity";
        return;
    }
    appendNumber(out, value);
}

void appendTwo(std::wstring& out, int v) {
    out.push_back(static_cast<wchar_t>(L'0' + v / 10));
    out.push_back(static_cast<wchar_t>(L'0' + v % 10));
}
}  // namespace

std::wstring OxJetDecimal::toText() const {
    // Repeated division of the 128-bit magnitude by 10^9.
    uint32_t w[4] = {words[0], words[1], words[2], words[3]};
    std::string digits;
    for (;;) {
        uint64_t rest = 0;
        bool zero = true;
        for (uint32_t& word : w) {
            const uint64_t cur = (rest << 32) | word;
            word = static_cast<uint32_t>(cur / 1000000000u);
            rest = cur % 1000000000u;
            zero = zero && word == 0;
        }
        for (int i = 0; i < 9; ++i) {
            digits.push_back(static_cast<char>('0' + rest % 10));
            rest /= 10;
            if (zero && rest == 0)
                break;
        }
        if (zero)
            break;
    }
    while (digits.size() > 1 && digits.back() == '0') digits.pop_back();
    while (digits.size() <= scale) digits.push_back('0');
    std::wstring out;
    bool allZero = true;
    for (char c : digits) allZero = allZero && c == '0';
    if (negative && !allZero)
        out.push_back(L'-');
    for (size_t i = digits.size(); i-- > 0;) {
        out.push_back(static_cast<wchar_t>(digits[i]));
        if (i == scale && scale > 0)
            out.push_back(L'.');
    }
    return out;
}

bool OxJetDecimal::toOxDecimal(OxDecimal& out) const {
    if (words[0] != 0 || scale > 28)
        return false;
    out.scale = scale;
    out.sign = negative ? OxDecimal::kNegative : 0;
    out.hi32 = words[1];
    out.lo64 = (static_cast<uint64_t>(words[2]) << 32) | words[3];
    return true;
}

OxVariant OxJetValue::toVariant() const {
    switch (kind) {
        case Null:
            return OxVariant::null();
        case Boolean:
            return OxVariant(boolean);
        case Byte:
            return OxVariant(byte);
        case Integer:
            return OxVariant(integer);
        case Long:
            return OxVariant(longValue);
        case BigInt:
            return OxVariant(static_cast<long long>(bigInt));
        case Currency:
            return OxVariant::fromCurrency(bigInt);
        case Single:
            return OxVariant(single);
        case Double:
            return OxVariant(real);
        case DateTime:
            return OxVariant::fromDate(real);
        case Guid:
            return OxVariant(guidText(guid));
        case Decimal: {
            OxDecimal d;
            if (decimal.toOxDecimal(d))
                return OxVariant(d);
            return OxVariant(decimal.toText());
        }
        case Text:
            return OxVariant(text);
        case Binary:
            return OxVariant::fromBytes(bytes);
        case Unsupported:
            break;
    }
    return OxVariant::fromError(OxHr::DISP_E_BADVARTYPE);
}

std::wstring OxJetValue::guidText(const uint8_t* b) {
    // The first three groups are little-endian, the last two are kept in byte order.
    static const int order[16] = {3, 2, 1, 0, 5, 4, 7, 6, 8, 9, 10, 11, 12, 13, 14, 15};
    static const wchar_t hex[] = L"0123456789ABCDEF";
    std::wstring out = L"{";
    for (int i = 0; i < 16; ++i) {
        if (i == 4 || i == 6 || i == 8 || i == 10)
            out.push_back(L'-');
        out.push_back(hex[b[order[i]] >> 4]);
        out.push_back(hex[b[order[i]] & 15]);
    }
    out.push_back(L'}');
    return out;
}

std::wstring OxJetValue::currencyText(int64_t scaled) {
    OxJetDecimal d;
    const uint64_t magnitude =
        scaled < 0 ? 0 - static_cast<uint64_t>(scaled) : static_cast<uint64_t>(scaled);
    d.words[2] = static_cast<uint32_t>(magnitude >> 32);
    d.words[3] = static_cast<uint32_t>(magnitude);
    d.scale = 4;
    d.negative = scaled < 0;
    return d.toText();
}

void OxJetValue::appendDate(std::wstring& out, double serial) {
    const OxDateTime dt(serial);
    if (!std::isfinite(serial) || !OxDateTime::isSerialInRange(serial) ||
        dt.getStatus() != OxDateTime::valid) {
        appendReal(out, serial);  // outside the calendar's range: keep the stored number
        return;
    }
    const int year = dt.getYear();
    appendTwo(out, year / 100);
    appendTwo(out, year % 100);
    out.push_back(L'-');
    appendTwo(out, dt.getMonth());
    out.push_back(L'-');
    appendTwo(out, dt.getDay());
    out.push_back(L'T');
    appendTwo(out, dt.getHour());
    out.push_back(L':');
    appendTwo(out, dt.getMinute());
    out.push_back(L':');
    appendTwo(out, dt.getSecond());
}

void OxJetValue::appendHex(std::wstring& out, const uint8_t* data, size_t size) {
    static const wchar_t hex[] = L"0123456789ABCDEF";
    for (size_t i = 0; i < size; ++i) {
        out.push_back(hex[data[i] >> 4]);
        out.push_back(hex[data[i] & 15]);
    }
}

void OxJetValue::appendText(std::wstring& out) const {
    switch (kind) {
        case Null:
        case Unsupported:
            return;
        case Boolean:
            out += boolean ? L"TRUE" : L"FALSE";
            return;
        case Byte:
            appendNumber(out, static_cast<unsigned>(byte));
            return;
        case Integer:
            appendNumber(out, integer);
            return;
        case Long:
            appendNumber(out, longValue);
            return;
        case BigInt:
            appendNumber(out, bigInt);
            return;
        case Currency:
            out += currencyText(bigInt);
            return;
        case Single:
            appendReal(out, single);
            return;
        case Double:
            appendReal(out, real);
            return;
        case DateTime:
            appendDate(out, real);
            return;
        case Guid:
            out += guidText(guid);
            return;
        case Decimal:
            out += decimal.toText();
            return;
        case Text:
            out += text;
            return;
        case Binary:
            appendHex(out, bytes.data(), bytes.size());
            return;
    }
}

std::wstring OxJetValue::toText() const {
    std::wstring out;
    appendText(out);
    return out;
}
