#pragma once

#include <sql.h>
#include <sqlext.h>

#include <cstdint>
#include <string>
#include <vector>

// A value read from an ODBC column: its kind and the value. Text is decoded (the kinds
// string, 8-bit string and wide string all hold it in m_str as wide text); binary data
// keeps its bytes. clear() keeps the buffers, so one variant serves many rows cheaply.
class OxDBVariant {
public:
    enum Kind : uint8_t {
        DBVT_NULL,
        DBVT_BOOL,
        DBVT_UCHAR,
        DBVT_SHORT,
        DBVT_LONG,
        DBVT_SINGLE,
        DBVT_DOUBLE,
        DBVT_DATE,
        DBVT_STRING,
        DBVT_BINARY,
        DBVT_ASTRING,
        DBVT_WSTRING,
        DBVT_BIGINT,  // 64-bit integers keep their value (no text detour)
    };

    void clear() noexcept { m_dwType = DBVT_NULL; }
    bool isNull() const noexcept { return m_dwType == DBVT_NULL; }
    bool isText() const noexcept {
        return m_dwType == DBVT_STRING || m_dwType == DBVT_ASTRING || m_dwType == DBVT_WSTRING;
    }

    // The value as text, as the standard conversion to characters writes it: integers in
    // decimal, reals in their shortest exact form, booleans 1 or 0, dates as YYYY-MM-DD,
    // times as HH:MM:SS and timestamps as both (sqlType tells which), binary data as
    // upper-case hexadecimal digits. NULL appends nothing.
    void appendText(std::wstring& out, SQLSMALLINT sqlType) const;

    Kind m_dwType = DBVT_NULL;
    union {
        bool m_boolVal;
        unsigned char m_chVal;
        short m_iVal;
        int32_t m_lVal;
        int64_t m_llVal;
        float m_fltVal;
        double m_dblVal;
        SQL_TIMESTAMP_STRUCT m_date;
    };
    std::wstring m_str;
    std::vector<uint8_t> m_binary;

    OxDBVariant() : m_llVal(0) {}
};
