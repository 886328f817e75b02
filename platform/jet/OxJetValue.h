#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/core/OxVariant.h"

// An exact scaled decimal as the file keeps it: a 128-bit magnitude (four 32-bit words,
// most significant first), a scale and a sign.
struct OxJetDecimal {
    uint32_t words[4] = {};
    uint8_t scale = 0;
    bool negative = false;

    bool operator==(const OxJetDecimal&) const = default;
    // The digits with a point ("-12.3400"): always exact.
    std::wstring toText() const;
    // The platform decimal, when the magnitude fits its 96 bits and scale 28.
    bool toOxDecimal(OxDecimal& out) const;
};

// One value of a row. Text and bytes keep their buffers from row to row, so a cursor that
// reuses its values allocates little.
class OxJetValue {
public:
    enum Kind : uint8_t {
        Null,
        Boolean,
        Byte,
        Integer,   // 16-bit
        Long,      // 32-bit
        BigInt,    // 64-bit
        Currency,  // int64 scaled by 10,000
        Single,
        Double,
        DateTime,  // days since 1899-12-30 (the time of day is positive before it)
        Guid,      // 16 bytes as stored
        Decimal,
        Text,
        Binary,
        Unsupported,  // a column type this reader does not decode
    };

    Kind kind = Null;
    union {
        bool boolean;
        uint8_t byte;
        int16_t integer;
        int32_t longValue;
        int64_t bigInt;  // also the currency's scaled value
        float single;
        double real;  // also the date's serial
    };
    OxJetDecimal decimal;
    uint8_t guid[16] = {};
    std::wstring text;
    std::vector<uint8_t> bytes;

    OxJetValue() : bigInt(0) {}
    bool isNull() const { return kind == Null; }

    // The automation variant: VT_NULL, VT_BOOL, VT_UI1, VT_I2, VT_I4, VT_I8, VT_CY, VT_R4,
    // VT_R8, VT_DATE, VT_DECIMAL (VT_BSTR with the exact digits when it does not fit), VT_BSTR
    // (also GUIDs, "{...}"), byte arrays; an unsupported value is VT_ERROR DISP_E_BADVARTYPE.
    OxVariant toVariant() const;

    // Text for people and exports: dates in ISO 8601 ("2001-02-03T04:05:06"), currency and
    // decimals exact with a point, TRUE/FALSE, binary as hex, GUIDs in braces; empty for
    // NULL and unsupported values.
    std::wstring toText() const;
    void appendText(std::wstring& out) const;

    static std::wstring guidText(const uint8_t* bytes);
    static std::wstring currencyText(int64_t scaled);
    static void appendDate(std::wstring& out, double serial);
    static void appendHex(std::wstring& out, const uint8_t* data, size_t size);
};
