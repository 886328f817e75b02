// Value decoding and formatting on hand-made bytes: the edges the shared files do not reach.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>

#include "platform/jet/OxJetError.h"
#include "platform/jet/OxJetPropertyBlob.h"
#include "platform/jet/OxJetText.h"
#include "platform/jet/OxJetValue.h"

namespace {
OxJetDecimal decimal(uint32_t w0, uint32_t w1, uint32_t w2, uint32_t w3, uint8_t scale,
                     bool negative = false) {
    OxJetDecimal d;
    d.words[0] = w0;
    d.words[1] = w1;
    d.words[2] = w2;
    d.words[3] = w3;
    d.scale = scale;
    d.negative = negative;
    return d;
}

TEST(OxJetValueText, DecimalsKeepEveryDigit) {
    const uint32_t m = 0xFFFFFFFF;
    EXPECT_EQ(decimal(m, m, m, m, 0).toText(), L"340282366920938463463374607431768211455");
    EXPECT_EQ(decimal(m, m, m, m, 38, true).toText(), L"-3.40282366920938463463374607431768211455");
    EXPECT_EQ(decimal(0, 0, 0, 1, 28).toText(), L"0.0000000000000000000000000001");
    EXPECT_EQ(decimal(0, 0, 0, 0, 4, true).toText(), L"0.0000");  // no negative zero
    EXPECT_EQ(decimal(0, 0, 1, 0, 0).toText(), L"4294967296");
    EXPECT_EQ(decimal(0, 0, 0, 1000000000, 9).toText(), L"1.000000000");

    OxDecimal d;
    EXPECT_TRUE(decimal(0, 7, 0, 5, 2, true).toOxDecimal(d));
    EXPECT_EQ(d.hi32, 7u);
    EXPECT_EQ(d.lo64, 5u);
    EXPECT_EQ(d.sign, OxDecimal::kNegative);
    EXPECT_FALSE(decimal(1, 0, 0, 0, 0).toOxDecimal(d));   // beyond 96 bits
    EXPECT_FALSE(decimal(0, 0, 0, 1, 29).toOxDecimal(d));  // beyond the platform's scale
    OxJetValue big;
    big.kind = OxJetValue::Decimal;
    big.decimal = decimal(1, 0, 0, 0, 0);
    EXPECT_EQ(big.toVariant().vt(), VT_BSTR);  // exact text rather than a rounded number
    EXPECT_EQ(big.toVariant().str(), L"79228162514264337593543950336");
}

TEST(OxJetValueText, CurrencyGuidAndNumbers) {
    EXPECT_EQ(OxJetValue::currencyText(std::numeric_limits<int64_t>::min()),
              L"-922337203685477.5808");
    EXPECT_EQ(OxJetValue::currencyText(-1), L"-0.0001");
    EXPECT_EQ(OxJetValue::currencyText(0), L"0.0000");
    EXPECT_EQ(OxJetValue::currencyText(123456789), L"12345.6789");

    const uint8_t guid[16] = {0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08,
                              0x09, 0x0A, 0x0B, 0x0C, 0x0D, 0x0E, 0x0F, 0x10};
    EXPECT_EQ(OxJetValue::guidText(guid), L"{04030201-0605-0807-090A-0B0C0D0E0F10}");

    OxJetValue v;
    v.kind = OxJetValue::Double;
    v.real = 0.1;
    EXPECT_EQ(v.toText(), L"0.1");  // shortest text that reads back the same
    v.real = 0.35191477764630685;
    EXPECT_EQ(v.toText(), L"0.35191477764630685");
    v.real = std::numeric_limits<double>::quiet_NaN();
    EXPECT_EQ(v.toText(), L"NaN");
    v.kind = OxJetValue::Single;
    v.single = 0.1f;
    EXPECT_EQ(v.toText(), L"0.1");
    v.kind = OxJetValue::Binary;
    v.bytes = {0x00, 0xAB, 0xFF};
    EXPECT_EQ(v.toText(), L"00ABFF");
    EXPECT_EQ(v.toVariant().bytes(), v.bytes);
    v.kind = OxJetValue::Null;
    EXPECT_EQ(v.toText(), L"");
    EXPECT_TRUE(v.toVariant().isNull());
}

TEST(OxJetValueText, DatesAcrossTheRange) {
    auto text = [](double serial) {
        std::wstring out;
        OxJetValue::appendDate(out, serial);
        return out;
    };
    EXPECT_EQ(text(0), L"1899-12-30T00:00:00");
    EXPECT_EQ(text(-1.25), L"1899-12-29T06:00:00");  // the time stays positive before 1900
    EXPECT_EQ(text(-657434.0), L"0100-01-01T00:00:00");
    EXPECT_EQ(text(2958465.5), L"9999-12-31T12:00:00");
    EXPECT_EQ(text(1.0 - 1e-9), L"1899-12-31T00:00:00");  // rounding carries into the next day
    EXPECT_EQ(text(3.5e6), L"3500000");                   // outside the calendar: the stored number
    EXPECT_EQ(text(std::nan("")), L"NaN");
}

std::wstring decode(uint16_t codePage, std::initializer_list<uint8_t> bytes) {
    OxJetText text(codePage);
    const std::vector<uint8_t> v(bytes);
    return text.decode(v.data(), v.size());
}

TEST(OxJetTextDecode, Utf16AndCompressedRuns) {
    EXPECT_EQ(decode(0, {'a', 0, 'b', 0}), L"ab");
    EXPECT_EQ(decode(0, {0x3D, 0xD8, 0x00, 0xDE}), L"\U0001F600");
    EXPECT_EQ(decode(0, {0x3D, 0xD8, 'a', 0}), L"\uFFFDa");  // a high half alone
    EXPECT_EQ(decode(0, {0x00, 0xDE}), L"\uFFFD");           // a low half alone
    EXPECT_EQ(decode(0, {'a', 0, 'b'}), L"a");               // an odd last byte
    EXPECT_EQ(decode(0, {}), L"");
    // Compressed: one byte per character, a zero switches to UTF-16 and back.
    EXPECT_EQ(decode(0, {0xFF, 0xFE, 'a', 0x00, 0x3D, 0xD8, 0x01, 0xDE, 0x00, 'b'}),
              L"a\U0001F601b");
    EXPECT_EQ(decode(0, {0xFF, 0xFE, 0xE4, 0xE4}), L"\u00E4\u00E4");
    EXPECT_EQ(decode(0, {0xFF, 0xFE}), L"");
    EXPECT_EQ(decode(0, {0xFF, 0xFE, 0x00, 'x'}), L"");  // an odd byte in a UTF-16 run
}

TEST(OxJetTextDecode, CodePages) {
    EXPECT_EQ(decode(1252, {'A', 0x80, 0xE9}), L"A\u20AC\u00E9");
    EXPECT_EQ(decode(1251, {0xCC, 0xE8, 0xF0}), L"\u041C\u0438\u0440");
    EXPECT_EQ(decode(936, {'G', 0xB1, 0xE0, 0xC2, 0xEB}), L"G\u7F16\u7801");
    EXPECT_EQ(decode(936, {0xB1, 0xE0, 0xC2}), L"\u7F16\uFFFD");  // cut inside a character
    EXPECT_THROW(OxJetText(12345), OxJetError);
}

// A property blob: the names, then a block per object with (length, flag, type, name
// index, size, value) entries.
struct Blob {
    std::vector<uint8_t> bytes{'M', 'R', '2', 0};
    void u16(size_t v) {
        bytes.push_back(uint8_t(v));
        bytes.push_back(uint8_t(v >> 8));
    }
    void u32(size_t v) {
        u16(v & 0xFFFF);
        u16(v >> 16);
    }
    static std::vector<uint8_t> utf16(const std::string& s) {
        std::vector<uint8_t> out;
        for (char c : s) {
            out.push_back(uint8_t(c));
            out.push_back(0);
        }
        return out;
    }
    void names(const std::vector<std::string>& list) {
        std::vector<uint8_t> body;
        for (const auto& n : list) {
            auto t = utf16(n);
            body.push_back(uint8_t(t.size()));
            body.push_back(0);
            body.insert(body.end(), t.begin(), t.end());
        }
        u32(body.size() + 6);
        u16(0x80);
        bytes.insert(bytes.end(), body.begin(), body.end());
    }
    void column(const std::string& name, uint16_t nameIndex, uint8_t type,
                const std::vector<uint8_t>& value) {
        auto t = utf16(name);
        const size_t nameBlock = 4 + 2 + t.size();
        const size_t entry = 8 + value.size();
        u32(6 + nameBlock + entry);
        u16(1);
        u32(nameBlock);
        u16(t.size());
        bytes.insert(bytes.end(), t.begin(), t.end());
        u16(entry);
        bytes.push_back(0);
        bytes.push_back(type);
        u16(nameIndex);
        u16(value.size());
        bytes.insert(bytes.end(), value.begin(), value.end());
    }
};

TEST(OxJetProperties, ReadsBlocksAndRejectsBadLengths) {
    Blob b;
    b.names({"Required", "DefaultValue"});
    b.column("Col", 0, 0x01, {1});
    b.column("Col", 1, 0x0A, Blob::utf16("=Now()"));
    const auto blocks = OxJetPropertyBlob::parse(b.bytes, false, 0);
    ASSERT_EQ(blocks.size(), 2u);
    EXPECT_EQ(blocks[0].objectName, L"Col");
    EXPECT_TRUE(blocks[0].isColumn);
    EXPECT_EQ(blocks[0].values, (OxJetProperties{{L"Required", L"True"}}));
    EXPECT_EQ(blocks[1].values, (OxJetProperties{{L"DefaultValue", L"=Now()"}}));

    EXPECT_TRUE(OxJetPropertyBlob::parse({}, false, 0).empty());
    EXPECT_THROW(OxJetPropertyBlob::parse({'X', 'Y', 'Z', 0}, false, 0), OxJetError);
    auto tooLong = b.bytes;
    tooLong[4] = 0xFF;  // the names block claims more than the blob holds
    EXPECT_THROW(OxJetPropertyBlob::parse(tooLong, false, 0), OxJetError);
    Blob unknownName;
    unknownName.names({"Required"});
    unknownName.column("Col", 5, 0x01, {1});
    EXPECT_THROW(OxJetPropertyBlob::parse(unknownName.bytes, false, 0), OxJetError);
    auto cut = b.bytes;
    cut.resize(cut.size() - 3);
    EXPECT_THROW(OxJetPropertyBlob::parse(cut, false, 0), OxJetError);
}
}  // namespace
