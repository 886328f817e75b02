#include <gtest/gtest.h>

#include "support/TestSupport.h"

#include <cstring>
#include <limits>

#include "platform/core/OxUserLocale.h"
#include "platform/core/OxVariant.h"

namespace {
// Every test runs under a known locale and restores the one it found.
class VariantTest : public ::testing::Test {
protected:
    void useDecimalComma() { m_locale.use("de_DE.UTF-8"); }

    static OxHResult changeFails(const OxVariant& v, uint16_t vt) {
        OxVariant out;
        return v.tryChangeType(vt, out);
    }
    OxTest::ScopedLocale m_locale{"en_US"};
};

TEST_F(VariantTest, StorageCopiesAndMovesOwnedValues) {
    OxVariant text(L"abc\u00e9\U0001F600");
    OxVariant copy = text;
    EXPECT_EQ(copy.bstr(), L"abc\u00e9\U0001F600");
    OxVariant moved = std::move(copy);
    EXPECT_EQ(moved, text);
    EXPECT_TRUE(copy.isEmpty());

    const uint8_t raw[] = {0, 1, 0, 255};
    OxVariant bytes = OxVariant::fromBytes(raw, sizeof raw);
    OxVariant bytesCopy(bytes);
    ASSERT_EQ(bytesCopy.bytesSize(), 4u);
    EXPECT_EQ(std::memcmp(bytesCopy.bytesData(), raw, 4), 0);
    EXPECT_EQ(bytesCopy.vt(), VT_ARRAY | VT_UI1);

    bytes = text;  // a byte array replaced by a text frees the array
    EXPECT_EQ(bytes.vt(), VT_BSTR);
    EXPECT_TRUE(OxVariant(static_cast<const wchar_t*>(nullptr)).isNull());
}

TEST_F(VariantTest, IntegersKeepTheirWidth) {
    EXPECT_EQ(OxVariant::fromInteger(7).vt(), VT_I4);
    EXPECT_EQ(OxVariant::fromInteger(int64_t{1} << 40).vt(), VT_I8);
    EXPECT_EQ(OxVariant::fromInteger(int64_t{1} << 40).llVal(), int64_t{1} << 40);
    EXPECT_EQ(OxVariant(int16_t{-3}).iVal(), -3);
    EXPECT_EQ(OxVariant(true).boolVal(), VARIANT_TRUE);
}

TEST_F(VariantTest, NumbersToTextUseTheLocaleSeparator) {
    EXPECT_EQ(OxVariant(1.5).changedType(VT_BSTR).bstr(), L"1.5");
    EXPECT_EQ(OxVariant(0.1).changedType(VT_BSTR).bstr(), L"0.1");
    EXPECT_EQ(OxVariant(1e20).changedType(VT_BSTR).bstr(), L"1E+20");
    EXPECT_EQ(OxVariant(123456789012345678.0).changedType(VT_BSTR).bstr(), L"1.23456789012346E+17");
    EXPECT_EQ(OxVariant(1.1f).changedType(VT_BSTR).bstr(), L"1.1");
    EXPECT_EQ(OxVariant(-42).changedType(VT_BSTR).bstr(), L"-42");
    EXPECT_EQ(OxVariant(true).changedType(VT_BSTR).bstr(), L"-1");
    EXPECT_EQ(OxVariant::fromCurrency(-12345).changedType(VT_BSTR).bstr(), L"-1.2345");
    useDecimalComma();
    EXPECT_EQ(OxVariant(1.5).changedType(VT_BSTR).bstr(), L"1,5");
    EXPECT_EQ(OxVariant::fromCurrency(25000).changedType(VT_BSTR).bstr(), L"2,5");
}

TEST_F(VariantTest, TextToNumbersFollowsTheLocale) {
    EXPECT_DOUBLE_EQ(OxVariant(L" 1,234.5 ").changedType(VT_R8).dblVal(), 1234.5);
    EXPECT_EQ(OxVariant(L"-17").changedType(VT_I4).lVal(), -17);
    EXPECT_EQ(OxVariant(L"2.5").changedType(VT_I4).lVal(), 2);  // ties go to even
    EXPECT_EQ(OxVariant(L"3.5").changedType(VT_I4).lVal(), 4);
    EXPECT_EQ(changeFails(OxVariant(L"12abc"), VT_I4), OxHr::DISP_E_TYPEMISMATCH);
    EXPECT_EQ(changeFails(OxVariant(L""), VT_R8), OxHr::DISP_E_TYPEMISMATCH);
    EXPECT_EQ(changeFails(OxVariant(L"99999999999"), VT_I4), OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(OxVariant(L"9223372036854775807").changedType(VT_I8).llVal(), INT64_MAX);
    useDecimalComma();
    EXPECT_DOUBLE_EQ(OxVariant(L"1.234,5").changedType(VT_R8).dblVal(), 1234.5);
    EXPECT_DOUBLE_EQ(OxVariant(L"1,5").changedType(VT_R8).dblVal(), 1.5);
}

TEST_F(VariantTest, BooleansAndEmptyAndNull) {
    EXPECT_EQ(OxVariant(L"True").changedType(VT_BOOL).boolVal(), VARIANT_TRUE);
    EXPECT_EQ(OxVariant(L"false").changedType(VT_BOOL).boolVal(), VARIANT_FALSE);
    EXPECT_EQ(OxVariant(L"2").changedType(VT_BOOL).boolVal(), VARIANT_TRUE);
    EXPECT_EQ(OxVariant(0.0).changedType(VT_BOOL).boolVal(), VARIANT_FALSE);
    EXPECT_EQ(OxVariant(true).changedType(VT_I4).lVal(), -1);
    EXPECT_EQ(OxVariant().changedType(VT_I4).lVal(), 0);
    EXPECT_EQ(OxVariant().changedType(VT_BSTR).bstr(), L"");
    EXPECT_EQ(changeFails(OxVariant::null(), VT_I4), OxHr::DISP_E_TYPEMISMATCH);
    EXPECT_EQ(changeFails(OxVariant::null(), VT_BSTR), OxHr::DISP_E_TYPEMISMATCH);
    EXPECT_THROW(OxVariant::null().changedType(VT_BOOL), OxComError);
}

TEST_F(VariantTest, RangesAreChecked) {
    EXPECT_EQ(changeFails(OxVariant(int32_t{-1}), VT_UI4), OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(changeFails(OxVariant(300), VT_UI1), OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(changeFails(OxVariant(1e300), VT_R4), OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(changeFails(OxVariant(1e300), VT_DATE), OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(changeFails(OxVariant(std::numeric_limits<double>::quiet_NaN()), VT_I8),
              OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(OxVariant(65535).changedType(VT_UI2).uiVal(), 65535);
    EXPECT_EQ(changeFails(OxVariant(65536), VT_UI2), OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(changeFails(OxVariant(1), 99), OxHr::DISP_E_BADVARTYPE);
}

TEST_F(VariantTest, DecimalsAndCurrencyStayExact) {
    // 1000000.0000 needs more than the low 32 bits of the mantissa.
    OxDecimal d;
    d.scale = 4;
    d.lo64 = 10000000000ull;
    EXPECT_EQ(OxVariant(d).changedType(VT_BSTR).bstr(), L"1000000");
    EXPECT_EQ(OxVariant(d).changedType(VT_I4).lVal(), 1000000);
    OxDecimal big;
    big.hi32 = 1;
    big.lo64 = 0;
    big.sign = OxDecimal::kNegative;
    EXPECT_EQ(OxVariant(big).changedType(VT_BSTR).bstr(), L"-18446744073709551616");
    EXPECT_EQ(changeFails(OxVariant(big), VT_I8), OxHr::DISP_E_OVERFLOW);
    EXPECT_EQ(OxVariant(L"12.3456").changedType(VT_CY).cyVal(), 123456);
    const OxDecimal fromDouble = OxVariant(0.1).changedType(VT_DECIMAL).decVal();
    EXPECT_EQ(fromDouble.scale, 1);
    EXPECT_EQ(fromDouble.lo64, 1u);
    EXPECT_EQ(OxVariant::fromCurrency(15000).changedType(VT_I4).lVal(), 2);  // 1.5 rounds to even
}

TEST_F(VariantTest, DatesConvertBothWays) {
    const OxVariant date = OxVariant::fromDate(44196.5);  // 2020-12-31 12:00
    EXPECT_EQ(date.changedType(VT_BSTR).bstr(), L"12/31/2020 12:00:00");
    EXPECT_DOUBLE_EQ(OxVariant(L"2020/12/31").changedType(VT_DATE).date(), 44196.0);
    EXPECT_DOUBLE_EQ(OxVariant(L"12/31/2020 12:00").changedType(VT_DATE).date(), 44196.5);
    EXPECT_DOUBLE_EQ(date.changedType(VT_R8).dblVal(), 44196.5);
    EXPECT_EQ(changeFails(OxVariant(L"not a date"), VT_DATE), OxHr::DISP_E_TYPEMISMATCH);
    m_locale.use("en_GB");
    EXPECT_EQ(date.changedType(VT_BSTR).bstr(), L"31/12/2020 12:00:00");
    EXPECT_DOUBLE_EQ(OxVariant(L"31/12/2020").changedType(VT_DATE).date(), 44196.0);
}

TEST_F(VariantTest, BytesAndTextInterchangeAsUtf16) {
    const OxVariant bytes = OxVariant(L"A\U0001F600").changedType(VT_ARRAY | VT_UI1);
    EXPECT_EQ(bytes.bytesSize(), 6u);
    EXPECT_EQ(bytes.changedType(VT_BSTR).bstr(), L"A\U0001F600");
    EXPECT_EQ(changeFails(bytes, VT_I4), OxHr::DISP_E_TYPEMISMATCH);
}

TEST_F(VariantTest, FailedChangeLeavesTheVariantAlone) {
    OxVariant v(L"abc");
    EXPECT_THROW(v.changeType(VT_R8), OxComError);
    EXPECT_EQ(v.bstr(), L"abc");
    try {
        v.changeType(VT_I4);
    } catch (const OxComError& e) {
        EXPECT_EQ(e.Error(), OxHr::DISP_E_TYPEMISMATCH);
        EXPECT_EQ(e.Description(), L"Type mismatch.");
    }
}
}  // namespace
