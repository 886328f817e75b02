#pragma once

#include <string>
#include <string_view>

#include "platform/core/OxComError.h"
#include "platform/core/OxExport.h"

// The platform's date-time value: days since 1899-12-30 as a double (the fraction is the
// time of day, taken as positive even for negative day counts), with a status.
// Valid values lie between the years 100 and 9999, as on Windows.
class OX_EXPORT OxDateTime {
public:
    enum DateTimeStatus { valid = 0, invalid = 1, null = 2 };

    static constexpr double kMinSerial = -657434.0;         // 0100-01-01
    static constexpr double kMaxSerial = 2958465.99999999;  // 9999-12-31 23:59:59

    OxDateTime() = default;  // valid, 1899-12-30 00:00:00
    explicit OxDateTime(double serial);
    OxDateTime(int year, int month, int day, int hour = 0, int minute = 0, int second = 0);

    static OxDateTime now();  // local time
    static bool isSerialInRange(double serial);

    // Sets the value from its parts; invalid (value 0) when a part is out of range.
    bool setDateTime(int year, int month, int day, int hour, int minute, int second);
    bool setDate(int year, int month, int day) { return setDateTime(year, month, day, 0, 0, 0); }

    double serial() const { return m_dt; }
    operator double() const { return m_dt; }
    DateTimeStatus getStatus() const { return m_status; }
    void setStatus(DateTimeStatus status) { m_status = status; }
    void setSerial(double serial);

    // Parts of the value, -1 (as the platform's "error") when it is not valid.
    int getYear() const;
    int getMonth() const;
    int getDay() const;
    int getHour() const;
    int getMinute() const;
    int getSecond() const;
    int getDayOfWeek() const;  // 1 = Sunday
    int getDayOfYear() const;  // 1 = January 1st

    // strftime-like codes: %Y %y %m %d %H %I %M %S %p %j %a %A %b %B %w %c %x %X %%, and
    // the '#' flag (%#d) that drops leading zeros. Names are English, independent of the
    // process locale. An invalid value formats as "Invalid DateTime", a null as "".
    std::wstring format(std::wstring_view codes) const;
    // The user locale's default text (the platform's date to text change): the date in
    // the locale's order with a 4-digit year, then the time when it is not midnight;
    // the time alone when the day is 1899-12-30.
    std::wstring format() const;

    // Parses a date and/or time written for the user locale (also ISO 8601 and year-first
    // forms such as 2020/12/31, and English month names). On failure the status is invalid
    // and the value is 0.0 for text that is no date, -1.0 for a date out of range.
    bool parseDateTime(std::wstring_view text);
    // The HRESULT of the last parse: S_OK, DISP_E_TYPEMISMATCH or DISP_E_OVERFLOW.
    static OxHResult parse(std::wstring_view text, double& serial);

    bool operator==(const OxDateTime& o) const { return m_status == o.m_status && m_dt == o.m_dt; }
    bool operator<(const OxDateTime& o) const { return m_dt < o.m_dt; }

private:
    struct Parts {
        int year, month, day, hour, minute, second, dayOfWeek, dayOfYear;
    };
    bool toParts(Parts& parts) const;

    double m_dt = 0.0;
    DateTimeStatus m_status = valid;
};
