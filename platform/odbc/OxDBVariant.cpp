#include "platform/odbc/OxDBVariant.h"

#include <charconv>

static_assert(sizeof(SQL_TIMESTAMP_STRUCT) <= 16, "the date stays in the variant's union");

namespace {
template <class T>
void appendNumber(std::wstring& out, T value) {
    char buffer[64];
    const auto result = std::to_chars(buffer, buffer + sizeof(buffer), value);
    out.append(buffer, result.ptr);
}

void appendDigits(std::wstring& out, unsigned value, int width) {
    wchar_t digits[12];
    for (int i = width - 1; i >= 0; --i) {
        digits[i] = static_cast<wchar_t>(L'0' + value % 10);
        value /= 10;
    }
    out.append(digits, static_cast<size_t>(width));
}
}  // namespace

void OxDBVariant::appendText(std::wstring& out, SQLSMALLINT sqlType) const {
    switch (m_dwType) {
        case DBVT_NULL:
            return;
        case DBVT_BOOL:
            out += m_boolVal ? L'1' : L'0';
            return;
        case DBVT_UCHAR:
            appendNumber(out, static_cast<unsigned>(m_chVal));
            return;
        case DBVT_SHORT:
            appendNumber(out, m_iVal);
            return;
        case DBVT_LONG:
            appendNumber(out, m_lVal);
            return;
        case DBVT_BIGINT:
            appendNumber(out, m_llVal);
            return;
        case DBVT_SINGLE:
            appendNumber(out, m_fltVal);
            return;
        case DBVT_DOUBLE:
            appendNumber(out, m_dblVal);
            return;
        case DBVT_DATE: {
            const bool timeOnly = sqlType == SQL_TYPE_TIME || sqlType == SQL_TIME;
            const bool dateOnly = sqlType == SQL_TYPE_DATE || sqlType == SQL_DATE;
            if (!timeOnly) {
                if (m_date.year < 0)
                    out += L'-';
                appendDigits(
                    out, static_cast<unsigned>(m_date.year < 0 ? -m_date.year : m_date.year), 4);
                out += L'-';
                appendDigits(out, m_date.month, 2);
                out += L'-';
                appendDigits(out, m_date.day, 2);
            }
            if (dateOnly)
                return;
            if (!timeOnly)
                out += L' ';
            appendDigits(out, m_date.hour, 2);
            out += L':';
            appendDigits(out, m_date.minute, 2);
            out += L':';
            appendDigits(out, m_date.second, 2);
            if (m_date.fraction != 0 && !timeOnly) {
                // Nanoseconds, without the trailing zeros.
                unsigned fraction = m_date.fraction;
                int width = 9;
                while (fraction % 10 == 0) {
                    fraction /= 10;
                    --width;
                }
                out += L'.';
                appendDigits(out, fraction, width);
            }
            return;
        }
        case DBVT_STRING:
        case DBVT_ASTRING:
        case DBVT_WSTRING:
            out += m_str;
            return;
        case DBVT_BINARY: {
            static const wchar_t hex[] = L"0123456789ABCDEF";
            out.reserve(out.size() + m_binary.size() * 2);
            for (uint8_t b : m_binary) {
                out += hex[b >> 4];
                out += hex[b & 15];
            }
            return;
        }
    }
}
