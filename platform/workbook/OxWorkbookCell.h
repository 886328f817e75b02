#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/core/OxDateTime.h"

// One cell value as workbooks hold it. Dates are numbers whose number format shows them
// as dates: `number` keeps the serial in the workbook's own date system (1900 or 1904)
// and the type says Date, so callers build an OxDateTime with toDateTime(date1904).
class OxWorkbookCell {
public:
    enum Type : uint8_t { Empty = 0, Number, Text, Boolean, Error, Date };

    // Error codes as the binary format stores them.
    enum ErrorCode : uint8_t {
        ErrNull = 0x00,
        ErrDiv0 = 0x07,
        ErrValue = 0x0F,
        ErrRef = 0x17,
        ErrName = 0x1D,
        ErrNum = 0x24,
        ErrNA = 0x2A,
        ErrGettingData = 0x2B,
    };

    uint32_t column = 0;
    Type type = Empty;
    double number = 0;  // Number, Date (serial), Boolean (0 or 1), Error (its code)
    std::wstring text;  // Text

    OxWorkbookCell() = default;
    static OxWorkbookCell makeNumber(uint32_t column, double value);
    static OxWorkbookCell makeText(uint32_t column, std::wstring value);
    static OxWorkbookCell makeBoolean(uint32_t column, bool value);
    static OxWorkbookCell makeError(uint32_t column, uint8_t code);
    // A date from its serial in the 1900 date system (what the writers store).
    static OxWorkbookCell makeDate(uint32_t column, double serial1900);
    // A date from the platform's value; a date the 1900 system cannot show (before
    // 1900-01-01 or invalid) becomes a plain number holding the platform serial.
    static OxWorkbookCell fromDateTime(uint32_t column, const OxDateTime& value);

    bool boolean() const { return number != 0; }
    uint8_t errorCode() const { return static_cast<uint8_t>(number); }
    // The platform date of a Date cell; invalid when the serial is no date there.
    OxDateTime toDateTime(bool date1904) const;

    // "#DIV/0!" for ErrDiv0; "#N/A" for unknown codes.
    static const wchar_t* errorText(uint8_t code);
    // The code of an error text; false when the text names no error.
    static bool errorFromText(std::wstring_view text, uint8_t& code);

    // Serial conversions between a workbook's date system and the platform's serial
    // (days since 1899-12-30). The 1900 system counts a 29 February 1900 that never was,
    // so its serials below 60 are one day behind. False when no platform date matches.
    static bool workbookToPlatformSerial(double serial, bool date1904, double& platform);
    static bool platformToWorkbookSerial(double platform, bool date1904, double& serial);

    // ISO 8601 text ("2021-01-01", "2021-01-01T10:10:10.5", "10:10:10", a trailing "Z")
    // into a platform serial; false when it is no such date.
    static bool parseIsoDate(std::string_view text, double& platform);
    // A platform serial as ISO 8601: the date alone at midnight, the time alone when asked,
    // milliseconds only when there are some.
    static std::string formatIsoDate(double platform, bool timeOnly);

    bool operator==(const OxWorkbookCell& o) const;
};
