#include "platform/core/OxDateTime.h"

#include <cmath>
#include <ctime>
#include <vector>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/core/OxUserLocale.h"

namespace {
// Days from 1970-01-01 to a civil date (proleptic Gregorian), after H. Hinnant.
long long daysFromCivil(long long y, unsigned m, unsigned d) {
    y -= m <= 2;
    const long long era = (y >= 0 ? y : y - 399) / 400;
    const unsigned yoe = static_cast<unsigned>(y - era * 400);
    const unsigned doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;
    const unsigned doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
    return era * 146097 + static_cast<long long>(doe) - 719468;
}

void civilFromDays(long long z, int& y, int& m, int& d) {
    z += 719468;
    const long long era = (z >= 0 ? z : z - 146096) / 146097;
    const unsigned doe = static_cast<unsigned>(z - era * 146097);
    const unsigned yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
    const unsigned doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
    const unsigned mp = (5 * doy + 2) / 153;
    d = static_cast<int>(doy - (153 * mp + 2) / 5 + 1);
    m = static_cast<int>(mp < 10 ? mp + 3 : mp - 9);
    y = static_cast<int>(static_cast<long long>(yoe) + era * 400 + (m <= 2));
}

const long long kEpoch = daysFromCivil(1899, 12, 30);

bool isLeap(int y) {
    return (y % 4 == 0 && y % 100 != 0) || y % 400 == 0;
}

int daysInMonth(int y, int m) {
    static const int days[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    return m == 2 && isLeap(y) ? 29 : days[m - 1];
}

// The serial of a date and time: negative day counts keep a positive time of day.
double toSerial(int y, int mo, int d, int h, int mi, int s) {
    const double days = static_cast<double>(
        daysFromCivil(y, static_cast<unsigned>(mo), static_cast<unsigned>(d)) - kEpoch);
    const double time = (h * 3600.0 + mi * 60.0 + s) / 86400.0;
    return days >= 0 ? days + time : days - time;
}

const wchar_t* const kMonths[] = {L"January",   L"February", L"March",    L"April",
                                  L"May",       L"June",     L"July",     L"August",
                                  L"September", L"October",  L"November", L"December"};
const wchar_t* const kDays[] = {L"Sunday",   L"Monday", L"Tuesday", L"Wednesday",
                                L"Thursday", L"Friday", L"Saturday"};
}  // namespace

OxDateTime::OxDateTime(double serial) {
    setSerial(serial);
}

OxDateTime::OxDateTime(int year, int month, int day, int hour, int minute, int second) {
    setDateTime(year, month, day, hour, minute, second);
}

void OxDateTime::setSerial(double serial) {
    m_dt = serial;
    m_status = isSerialInRange(serial) ? valid : invalid;
}

bool OxDateTime::isSerialInRange(double serial) {
    return std::isfinite(serial) && serial >= kMinSerial && serial <= kMaxSerial;
}

bool OxDateTime::setDateTime(int year, int month, int day, int hour, int minute, int second) {
    if (year < 100 || year > 9999 || month < 1 || month > 12 || day < 1 ||
        day > daysInMonth(year, month) || hour < 0 || hour > 23 || minute < 0 || minute > 59 ||
        second < 0 || second > 59) {
        m_dt = 0;
        m_status = invalid;
        return false;
    }
    m_dt = toSerial(year, month, day, hour, minute, second);
    m_status = valid;
    return true;
}

OxDateTime OxDateTime::now() {
    const std::time_t t = std::time(nullptr);
    std::tm tm{};
    if (!localtime_r(&t, &tm)) {
        OxDateTime bad;
        bad.setStatus(invalid);
        return bad;
    }
    return OxDateTime(tm.tm_year + 1900, tm.tm_mon + 1, tm.tm_mday, tm.tm_hour, tm.tm_min,
                      tm.tm_sec);
}

bool OxDateTime::toParts(Parts& p) const {
    if (m_status != valid || !isSerialInRange(m_dt))
        return false;
    long long days = static_cast<long long>(m_dt);  // toward zero: -1.25 is day -1, 06:00
    long long seconds = std::llround(std::fabs(m_dt - static_cast<double>(days)) * 86400.0);
    if (seconds >= 86400) {  // rounding reached the next midnight
        seconds -= 86400;
        days += m_dt >= 0 ? 1 : -1;
    }
    civilFromDays(days + kEpoch, p.year, p.month, p.day);
    p.hour = static_cast<int>(seconds / 3600);
    p.minute = static_cast<int>(seconds / 60 % 60);
    p.second = static_cast<int>(seconds % 60);
    const long long z = days + kEpoch;  // 1970-01-01 was a Thursday
    p.dayOfWeek = static_cast<int>(((z % 7) + 7 + 4) % 7) + 1;
    p.dayOfYear = static_cast<int>(z - daysFromCivil(p.year, 1, 1)) + 1;
    return true;
}

#define OX_PART(name, field)              \
    int OxDateTime::name() const {        \
        Parts p;                          \
        return toParts(p) ? p.field : -1; \
    }
OX_PART(getYear, year)
OX_PART(getMonth, month)
OX_PART(getDay, day)
OX_PART(getHour, hour)
OX_PART(getMinute, minute)
OX_PART(getSecond, second)
OX_PART(getDayOfWeek, dayOfWeek)
OX_PART(getDayOfYear, dayOfYear)
#undef OX_PART

std::wstring OxDateTime::format(std::wstring_view codes) const {
    if (m_status == null)
        return {};
    Parts p;
    if (!toParts(p))
        return L"Invalid DateTime";
    std::wstring out;
    for (size_t i = 0; i < codes.size(); ++i) {
        if (codes[i] != L'%' || i + 1 >= codes.size()) {
            out.push_back(codes[i]);
            continue;
        }
        bool noPad = false;
        wchar_t c = codes[++i];
        if (c == L'#' && i + 1 < codes.size()) {
            noPad = true;
            c = codes[++i];
        }
        auto num = [&](int v, int width) {
            out += oxFormat(
                noPad ? L"%d" : (width == 4 ? L"%04d" : (width == 3 ? L"%03d" : L"%02d")), v);
        };
        switch (c) {
            case L'Y':
                num(p.year, 4);
                break;
            case L'y':
                num(p.year % 100, 2);
                break;
            case L'm':
                num(p.month, 2);
                break;
            case L'd':
                num(p.day, 2);
                break;
            case L'H':
                num(p.hour, 2);
                break;
            case L'I':
                num(p.hour % 12 == 0 ? 12 : p.hour % 12, 2);
                break;
            case L'M':
                num(p.minute, 2);
                break;
            case L'S':
                num(p.second, 2);
                break;
            case L'p':
                out += p.hour < 12 ? L"AM" : L"PM";
                break;
            case L'j':
                num(p.dayOfYear, 3);
                break;
            case L'w':
                out += std::to_wstring(p.dayOfWeek - 1);
                break;
            case L'a':
                out.append(kDays[p.dayOfWeek - 1], 3);
                break;
            case L'A':
                out += kDays[p.dayOfWeek - 1];
                break;
            case L'b':
                out.append(kMonths[p.month - 1], 3);
                break;
            case L'B':
                out += kMonths[p.month - 1];
                break;
            case L'c':
                out += format(L"%m/%d/%y %H:%M:%S");
                break;
            case L'x':
                out += format(L"%m/%d/%y");
                break;
            case L'X':
                out += format(L"%H:%M:%S");
                break;
            case L'%':
                out.push_back(L'%');
                break;
            default:
                out.push_back(L'%');
                out.push_back(c);
                break;
        }
    }
    return out;
}

std::wstring OxDateTime::format() const {
    if (m_status == null)
        return {};
    Parts p;
    if (!toParts(p))
        return L"Invalid DateTime";
    const OxUserLocale loc = OxUserLocale::current();
    const wchar_t sep = loc.dateSeparator;
    std::wstring date;
    switch (loc.dateOrder) {
        case OxUserLocale::DateOrder::MDY:
            date = oxFormat(L"%d%c%d%c%04d", p.month, sep, p.day, sep, p.year);
            break;
        case OxUserLocale::DateOrder::DMY:
            date = oxFormat(L"%d%c%d%c%04d", p.day, sep, p.month, sep, p.year);
            break;
        case OxUserLocale::DateOrder::YMD:
            date = oxFormat(L"%04d%c%02d%c%02d", p.year, sep, p.month, sep, p.day);
            break;
    }
    const std::wstring time = oxFormat(L"%02d:%02d:%02d", p.hour, p.minute, p.second);
    const bool midnight = p.hour == 0 && p.minute == 0 && p.second == 0;
    const bool firstDay = p.year == 1899 && p.month == 12 && p.day == 30;
    if (firstDay && !midnight)
        return time;
    return midnight ? date : date + L" " + time;
}

namespace {
struct Token {
    enum Kind { Number, Month, AmPm, Sep } kind;
    int value;
    int digits;
    wchar_t sep;
};

int monthFromName(std::wstring_view word) {
    if (word.size() < 3)
        return 0;
    for (int m = 0; m < 12; ++m) {
        std::wstring_view full(kMonths[m]);
        if (word.size() <= full.size() && OxText::equalsNoCase(word, full.substr(0, word.size())))
            return m + 1;
    }
    if (OxText::equalsNoCase(word, L"sept"))
        return 9;
    return 0;
}

int expandYear(int year, int digits) {
    if (digits > 2)
        return year;
    return year < 30 ? 2000 + year : 1900 + year;  // the platform's two-digit year window
}
}  // namespace

OxHResult OxDateTime::parse(std::wstring_view text, double& serial) {
    serial = 0;
    std::vector<Token> tokens;
    for (size_t i = 0; i < text.size();) {
        const wchar_t c = text[i];
        if (c >= L'0' && c <= L'9') {
            long long v = 0;
            int digits = 0;
            while (i < text.size() && text[i] >= L'0' && text[i] <= L'9') {
                if (digits < 9)
                    v = v * 10 + (text[i] - L'0');
                ++digits, ++i;
            }
            tokens.push_back({Token::Number, static_cast<int>(v), digits, 0});
        } else if (OxText::toLower(c) != OxText::toUpper(c)) {
            size_t j = i;
            while (j < text.size() && OxText::toLower(text[j]) != OxText::toUpper(text[j])) ++j;
            std::wstring_view word = text.substr(i, j - i);
            if (OxText::equalsNoCase(word, L"am") || OxText::equalsNoCase(word, L"a"))
                tokens.push_back({Token::AmPm, 0, 0, 0});
            else if (OxText::equalsNoCase(word, L"pm") || OxText::equalsNoCase(word, L"p"))
                tokens.push_back({Token::AmPm, 12, 0, 0});
            else if (OxText::equalsNoCase(word, L"t") && !tokens.empty())
                tokens.push_back({Token::Sep, 0, 0, L' '});
            else if (int m = monthFromName(word))
                tokens.push_back({Token::Month, m, 0, 0});
            else if (word.size() >= 3 && [&] {
                         for (auto d : kDays)
                             if (OxText::equalsNoCase(
                                     word,
                                     std::wstring_view(d).substr(
                                         0, std::min(word.size(), std::wstring_view(d).size()))))
                                 return true;
                         return false;
                     }())
                ;  // a weekday name carries no information
            else
                return OxHr::DISP_E_TYPEMISMATCH;
            i = j;
        } else if (c == L'/' || c == L'-' || c == L'.' || c == L':' || c == L',' || c == L' ' ||
                   c == L'\t') {
            tokens.push_back({Token::Sep, 0, 0, c});
            ++i;
        } else if (c == L'Z' || c == L'+') {
            return OxHr::DISP_E_TYPEMISMATCH;
        } else {
            return OxHr::DISP_E_TYPEMISMATCH;
        }
    }

    // A time is a number followed by ':' and more numbers; everything else is the date.
    std::vector<int> dateNumbers;
    std::vector<int> dateDigits;
    int month = 0;
    int hour = -1, minute = 0, second = 0;
    int ampm = -1;
    for (size_t i = 0; i < tokens.size(); ++i) {
        const Token& t = tokens[i];
        if (t.kind == Token::Number && i + 1 < tokens.size() && tokens[i + 1].kind == Token::Sep &&
            tokens[i + 1].sep == L':') {
            if (hour >= 0)
                return OxHr::DISP_E_TYPEMISMATCH;
            hour = t.value;
            size_t j = i + 2;
            if (j >= tokens.size() || tokens[j].kind != Token::Number)
                return OxHr::DISP_E_TYPEMISMATCH;
            minute = tokens[j].value;
            if (j + 2 < tokens.size() && tokens[j + 1].kind == Token::Sep &&
                tokens[j + 1].sep == L':' && tokens[j + 2].kind == Token::Number) {
                second = tokens[j + 2].value;
                j += 2;
                // Fractions of a second are read and rounded away.
                if (j + 2 < tokens.size() && tokens[j + 1].kind == Token::Sep &&
                    tokens[j + 1].sep == L'.' && tokens[j + 2].kind == Token::Number) {
                    if (tokens[j + 2].digits >= 1 &&
                        tokens[j + 2].value / static_cast<int>(std::pow(
                                                  10, std::min(tokens[j + 2].digits, 9) - 1)) >=
                            5)
                        ++second;
                    j += 2;
                }
            }
            i = j;
        } else if (t.kind == Token::Number) {
            if (hour >= 0 && ampm < 0 && dateNumbers.size() >= 3)
                return OxHr::DISP_E_TYPEMISMATCH;
            dateNumbers.push_back(t.value);
            dateDigits.push_back(t.digits);
        } else if (t.kind == Token::Month) {
            if (month)
                return OxHr::DISP_E_TYPEMISMATCH;
            month = t.value;
            // Month names take the place of a number so that order rules still apply.
        } else if (t.kind == Token::AmPm) {
            if (hour < 0 && !dateNumbers.empty() && !month) {
                // "5 PM": the last number is an hour.
                hour = dateNumbers.back();
                dateNumbers.pop_back();
                dateDigits.pop_back();
            }
            if (hour < 0)
                return OxHr::DISP_E_TYPEMISMATCH;
            ampm = t.value;
        }
    }

    if (ampm >= 0) {
        if (hour < 1 || hour > 12)
            return OxHr::DISP_E_TYPEMISMATCH;
        hour = hour % 12 + ampm;
    }
    if (hour > 23 || minute > 59 || second > 60)
        return OxHr::DISP_E_TYPEMISMATCH;
    if (second == 60)
        second = 59;

    int year = 1899, mon = 12, day = 30;
    const OxUserLocale loc = OxUserLocale::current();
    const size_t n = dateNumbers.size();
    auto valid = [](int y, int m, int d) {
        return m >= 1 && m <= 12 && d >= 1 && d <= 31 && y >= 0;
    };
    if (month) {
        // A named month with a day and a year (in either order), or a day alone.
        if (n == 0 || n > 2)
            return OxHr::DISP_E_TYPEMISMATCH;
        mon = month;
        if (n == 1) {
            day = dateNumbers[0];
            year = OxDateTime::now().getYear();
        } else if (dateDigits[0] > 2 || dateNumbers[0] > 31) {
            year = expandYear(dateNumbers[0], dateDigits[0]), day = dateNumbers[1];
        } else {
            day = dateNumbers[0], year = expandYear(dateNumbers[1], dateDigits[1]);
        }
    } else if (n == 3) {
        const int a = dateNumbers[0], b = dateNumbers[1], c = dateNumbers[2];
        if (dateDigits[0] > 2 || a > 31) {
            year = expandYear(a, dateDigits[0]), mon = b, day = c;
        } else if (loc.dateOrder == OxUserLocale::DateOrder::YMD) {
            year = expandYear(a, dateDigits[0]), mon = b, day = c;
        } else if (loc.dateOrder == OxUserLocale::DateOrder::MDY) {
            mon = a, day = b, year = expandYear(c, dateDigits[2]);
            if (mon > 12 && day <= 12)
                std::swap(mon, day);
        } else {
            day = a, mon = b, year = expandYear(c, dateDigits[2]);
            if (mon > 12 && day <= 12)
                std::swap(mon, day);
        }
    } else if (n == 2) {
        int a = dateNumbers[0], b = dateNumbers[1];
        if (dateDigits[0] > 2 || a > 31) {  // year and month
            year = expandYear(a, dateDigits[0]), mon = b, day = 1;
        } else if (dateDigits[1] > 2 || b > 31) {  // month and year
            mon = a, year = expandYear(b, dateDigits[1]), day = 1;
        } else {
            year = OxDateTime::now().getYear();
            if (loc.dateOrder == OxUserLocale::DateOrder::DMY)
                std::swap(a, b);
            mon = a, day = b;
            if (mon > 12 && day <= 12)
                std::swap(mon, day);
        }
    } else if (n == 1 || (n == 0 && hour < 0)) {
        return OxHr::DISP_E_TYPEMISMATCH;
    } else if (n > 3) {
        return OxHr::DISP_E_TYPEMISMATCH;
    }
    if (hour < 0)
        hour = 0;
    if (!valid(year, mon, day))
        return OxHr::DISP_E_TYPEMISMATCH;
    if (year < 100 || year > 9999)
        return OxHr::DISP_E_OVERFLOW;
    if (day > daysInMonth(year, mon))
        return OxHr::DISP_E_TYPEMISMATCH;
    serial = toSerial(year, mon, day, hour, minute, second);
    return OxHr::S_OK;
}

bool OxDateTime::parseDateTime(std::wstring_view text) {
    double value;
    const OxHResult hr = parse(text, value);
    if (hr == OxHr::S_OK) {
        m_dt = value;
        m_status = valid;
        return true;
    }
    m_dt = hr == OxHr::DISP_E_TYPEMISMATCH ? 0.0 : -1.0;
    m_status = invalid;
    return false;
}
