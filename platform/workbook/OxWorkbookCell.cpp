#include "platform/workbook/OxWorkbookCell.h"

#include <charconv>
#include <cmath>
#include <cstdio>

namespace {
struct ErrorName {
    uint8_t code;
    const wchar_t* text;
};
const ErrorName kErrors[] = {
    {OxWorkbookCell::ErrNull, L"#NULL!"},   {OxWorkbookCell::ErrDiv0, L"#DIV/0!"},
    {OxWorkbookCell::ErrValue, L"#VALUE!"}, {OxWorkbookCell::ErrRef, L"#REF!"},
    {OxWorkbookCell::ErrName, L"#NAME?"},   {OxWorkbookCell::ErrNum, L"#NUM!"},
    {OxWorkbookCell::ErrNA, L"#N/A"},       {OxWorkbookCell::ErrGettingData, L"#GETTING_DATA"},
};

// Days between the two systems' day zero (1899-12-30 and 1904-01-01).
constexpr double k1904Offset = 1462.0;
}  // namespace

OxWorkbookCell OxWorkbookCell::makeNumber(uint32_t column, double value) {
    OxWorkbookCell c;
    c.column = column;
    c.type = Number;
    c.number = value;
    return c;
}

OxWorkbookCell OxWorkbookCell::makeText(uint32_t column, std::wstring value) {
    OxWorkbookCell c;
    c.column = column;
    c.type = Text;
    c.text = std::move(value);
    return c;
}

OxWorkbookCell OxWorkbookCell::makeBoolean(uint32_t column, bool value) {
    OxWorkbookCell c;
    c.column = column;
    c.type = Boolean;
    c.number = value ? 1 : 0;
    return c;
}

OxWorkbookCell OxWorkbookCell::makeError(uint32_t column, uint8_t code) {
    OxWorkbookCell c;
    c.column = column;
    c.type = Error;
    c.number = code;
    return c;
}

OxWorkbookCell OxWorkbookCell::makeDate(uint32_t column, double serial1900) {
    OxWorkbookCell c;
    c.column = column;
    c.type = Date;
    c.number = serial1900;
    return c;
}

OxWorkbookCell OxWorkbookCell::fromDateTime(uint32_t column, const OxDateTime& value) {
    double serial = 0;
    if (value.getStatus() == OxDateTime::valid &&
        platformToWorkbookSerial(value.serial(), false, serial))
        return makeDate(column, serial);
    return makeNumber(column, value.serial());
}

OxDateTime OxWorkbookCell::toDateTime(bool date1904) const {
    double platform = 0;
    OxDateTime dt;
    if ((type == Date || type == Number) && workbookToPlatformSerial(number, date1904, platform))
        dt.setSerial(platform);
    else
        dt.setStatus(OxDateTime::invalid);
    return dt;
}

const wchar_t* OxWorkbookCell::errorText(uint8_t code) {
    for (const auto& e : kErrors)
        if (e.code == code)
            return e.text;
    return L"#N/A";
}

bool OxWorkbookCell::errorFromText(std::wstring_view text, uint8_t& code) {
    for (const auto& e : kErrors)
        if (text == e.text) {
            code = e.code;
            return true;
        }
    return false;
}

bool OxWorkbookCell::workbookToPlatformSerial(double serial, bool date1904, double& platform) {
    if (!std::isfinite(serial) || serial < 0)
        return false;
    if (date1904)
        platform = serial + k1904Offset;
    else if (serial >= 1 && serial < 60)
        platform = serial + 1;  // before the phantom 29 February 1900
    else
        platform = serial;  // below 1: a time of day alone
    return platform <= OxDateTime::kMaxSerial;
}

bool OxWorkbookCell::platformToWorkbookSerial(double platform, bool date1904, double& serial) {
    if (!std::isfinite(platform) || platform > OxDateTime::kMaxSerial)
        return false;
    if (date1904) {
        serial = platform - k1904Offset;
        return serial >= 0;
    }
    if (platform >= 0 && platform < 1) {
        serial = platform;  // a time of day alone
        return true;
    }
    if (platform < 2)
        return false;  // 1899-12-31 and earlier: no 1900-system date
    serial = platform < 61 ? platform - 1 : platform;
    return true;
}

bool OxWorkbookCell::operator==(const OxWorkbookCell& o) const {
    if (column != o.column || type != o.type)
        return false;
    if (type == Text)
        return text == o.text;
    if (type == Empty)
        return true;
    // Bitwise-equal numbers (so -0 and 0 differ, as a round trip must keep them).
    return std::signbit(number) == std::signbit(o.number) && number == o.number;
}

bool OxWorkbookCell::parseIsoDate(std::string_view s, double& serial) {
    int y = 1899, mo = 12, d = 30, h = 0, mi = 0;
    double sec = 0;
    auto num = [&](size_t& p, size_t n, int& out) {
        if (p + n > s.size())
            return false;
        out = 0;
        for (size_t k = 0; k < n; ++k) {
            const char c = s[p + k];
            if (c < '0' || c > '9')
                return false;
            out = out * 10 + (c - '0');
        }
        p += n;
        return true;
    };
    size_t p = 0;
    const bool hasDate = s.size() >= 10 && s[4] == '-';
    if (hasDate) {
        if (!num(p, 4, y) || s[p++] != '-' || !num(p, 2, mo) || p >= s.size() || s[p++] != '-' ||
            !num(p, 2, d))
            return false;
        if (p < s.size() && (s[p] == 'T' || s[p] == ' '))
            ++p;
    }
    if (p < s.size() && s[p] >= '0' && s[p] <= '9') {
        if (!num(p, 2, h) || p >= s.size() || s[p++] != ':' || !num(p, 2, mi))
            return false;
        if (p < s.size() && s[p] == ':') {
            ++p;
            size_t e = p;
            while (e < s.size() && ((s[e] >= '0' && s[e] <= '9') || s[e] == '.')) ++e;
            auto r = std::from_chars(s.data() + p, s.data() + e, sec);
            if (r.ec != std::errc())
                return false;
            p = e;
        }
    }
    if (p < s.size() && s[p] == 'Z')
        ++p;
    if (p != s.size() || h > 23 || mi > 59 || sec >= 61)
        return false;
    OxDateTime dt;
    if (hasDate) {
        if (!dt.setDate(y, mo, d))
            return false;
    }
    serial = dt.serial() + (h * 3600.0 + mi * 60.0 + sec) / 86400.0;
    return true;
}

std::string OxWorkbookCell::formatIsoDate(double platform, bool timeOnly) {
    double days = std::floor(platform);
    long long ms = std::llround((platform - days) * 86400000.0);
    if (ms >= 86400000) {
        days += 1;
        ms -= 86400000;
    }
    const OxDateTime day(days);
    char buf[64];
    const int h = static_cast<int>(ms / 3600000), mi = static_cast<int>(ms / 60000 % 60),
              sec = static_cast<int>(ms / 1000 % 60), milli = static_cast<int>(ms % 1000);
    std::string out;
    if (!timeOnly) {
        std::snprintf(buf, sizeof buf, "%04d-%02d-%02d", day.getYear(), day.getMonth(),
                      day.getDay());
        out = buf;
        if (ms == 0)
            return out;
        out += 'T';
    }
    std::snprintf(buf, sizeof buf, "%02d:%02d:%02d", h, mi, sec);
    out += buf;
    if (milli) {
        std::snprintf(buf, sizeof buf, ".%03d", milli);
        out += buf;
    }
    return out;
}
