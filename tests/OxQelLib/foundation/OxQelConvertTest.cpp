#include <gtest/gtest.h>

#include "support/TestSupport.h"

#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelUnicodeConvertion.h"
#include "platform/core/OxUserLocale.h"

using namespace OxQel;

namespace {
class ConvertTest : public ::testing::Test {
protected:
    OxTest::ScopedLocale m_locale{"en_US"};
};

OxDecimal decimal(uint64_t mantissa, uint8_t scale, bool negative = false) {
    OxDecimal d;
    d.lo64 = mantissa;
    d.scale = scale;
    d.sign = negative ? OxDecimal::kNegative : 0;
    return d;
}

TEST_F(ConvertTest, ToStringAlwaysWritesAPoint) {
    EXPECT_EQ(_variantToString(OxVariant::null()), L"");
    EXPECT_EQ(_variantToString(OxVariant()), L"");
    EXPECT_EQ(_variantToString(OxVariant(L"a,b")), L"a,b");
    EXPECT_EQ(_variantToString(OxVariant(42)), L"42");
    m_locale.use("de_DE.UTF-8");
    EXPECT_EQ(_variantToString(OxVariant(1.5)), L"1.5");
    EXPECT_EQ(_variantToString(OxVariant(2.25f)), L"2.25");
    std::wstring out = L"old";
    _variantToString(OxVariant(7), out);
    EXPECT_EQ(out, L"7");
    EXPECT_THROW(_variantToString(OxVariant::fromError(5)), OxComError);
}

TEST_F(ConvertTest, ToBoolRules) {
    auto b = [](const OxVariant& v) {
        bool out = false;
        _variantToBool(v, out);
        return out;
    };
    EXPECT_FALSE(b(OxVariant(L"true")));  // text reads as a number
    EXPECT_TRUE(b(OxVariant(L"2")));
    EXPECT_TRUE(b(OxVariant(L"1")));
    EXPECT_FALSE(b(OxVariant(L"")));
    EXPECT_TRUE(b(OxVariant(int16_t{-1})));
    EXPECT_TRUE(b(OxVariant(0.25)));
    EXPECT_FALSE(b(OxVariant(0.0f)));
    EXPECT_TRUE(b(OxVariant(int64_t{1} << 40)));
    EXPECT_FALSE(b(OxVariant()));
    bool out;
    EXPECT_THROW(_variantToBool(OxVariant::null(), out), OxComError);
    EXPECT_FALSE(Util::tryVariantToBool(OxVariant::null(), out));
}

TEST_F(ConvertTest, ToDoubleRules) {
    auto d = [](const OxVariant& v) {
        double out = -99;
        _variantToDouble(v, out);
        return out;
    };
    EXPECT_EQ(d(OxVariant::null()), 0.0);
    EXPECT_EQ(d(OxVariant(true)), -1.0);
    EXPECT_EQ(d(OxVariant(uint8_t{200})), 200.0);
    EXPECT_EQ(d(OxVariant(L"1,5")), 1.5);
    EXPECT_EQ(d(OxVariant(L" -2.5e2xyz")), -250.0);
    EXPECT_EQ(d(OxVariant(L"abc")), 0.0);
    EXPECT_EQ(d(OxVariant::fromDate(44196.25)), 44196.25);
    EXPECT_EQ(d(OxVariant(decimal(12345, 2, true))), -123.45);
    // The whole 96-bit mantissa counts, not only its low 32 bits.
    EXPECT_EQ(d(OxVariant(decimal(10000000000ull, 4))), 1000000.0);
    EXPECT_EQ(d(OxVariant(int64_t{1} << 53)), 9007199254740992.0);
    EXPECT_EQ(d(OxVariant::fromCurrency(12345)), 1.2345);
    EXPECT_EQ(d(OxVariant::fromBytes("ab", 2)), 0.0);
    m_locale.use("fr_FR");
    EXPECT_EQ(d(OxVariant(L"3,25")), 3.25);
}

TEST_F(ConvertTest, ToLongRules) {
    auto l = [](const OxVariant& v) {
        long out = -99;
        _variantToLong(v, out);
        return out;
    };
    EXPECT_EQ(l(OxVariant(2.9)), 2);
    EXPECT_EQ(l(OxVariant(-2.9)), -2);
    EXPECT_EQ(l(OxVariant(L"  42abc")), 42);
    EXPECT_EQ(l(OxVariant(L"x")), 0);
    EXPECT_EQ(l(OxVariant::null()), 0);
    EXPECT_EQ(l(OxVariant(true)), -1);
    EXPECT_EQ(l(OxVariant(decimal(299, 2))), 2);
    EXPECT_EQ(l(OxVariant(decimal(299, 2, true))), -2);
    EXPECT_EQ(l(OxVariant(uint32_t{4000000000u})), 4000000000L);
    EXPECT_EQ(l(OxVariant(int64_t{-1} << 40)), -(1L << 40));
    EXPECT_EQ(l(OxVariant(L"-9000000000")), -9000000000L);
    EXPECT_EQ(l(OxVariant::fromDate(44196.75)), 44196);
    EXPECT_EQ(l(OxVariant::fromCurrency(-25000)), -2);
}

TEST_F(ConvertTest, ToULongReportsFailure) {
    uint32_t out = 7;
    EXPECT_FALSE(_variantToULong(OxVariant(L"12abc"), out));
    EXPECT_EQ(out, 12u);
    EXPECT_TRUE(_variantToULong(OxVariant(L""), out));
    EXPECT_EQ(out, 0u);
    EXPECT_TRUE(_variantToULong(OxVariant::null(), out));
    EXPECT_EQ(out, 0u);
    EXPECT_FALSE(_variantToULong(OxVariant(uint32_t{4000000000u}), out));
    EXPECT_EQ(out, 4000000000u);
    EXPECT_FALSE(_variantToULong(OxVariant(17.4), out));
    EXPECT_EQ(out, 17u);
    EXPECT_TRUE(_variantToULong(OxVariant(-1), out));
    EXPECT_TRUE(
        _variantToULong(OxVariant(L"4294967296"), out));  // too big is a failure, not a wrap
    EXPECT_EQ(out, 0u);
}

TEST_F(ConvertTest, ToDateRules) {
    OxDateTime out;
    _variantToDate(OxVariant(L"20201231"), out);
    EXPECT_EQ(out.getStatus(), OxDateTime::valid);
    EXPECT_EQ(out.format(L"%Y-%m-%d"), L"2020-12-31");
    _variantToDate(OxVariant(20201231), out);  // a number that is no day count
    EXPECT_EQ(out.format(L"%Y-%m-%d"), L"2020-12-31");
    _variantToDate(OxVariant(44196.5), out);
    EXPECT_DOUBLE_EQ(out.serial(), 44196.5);
    OxDateTime kept(100.0);
    _variantToDate(OxVariant::null(), kept);
    EXPECT_DOUBLE_EQ(kept.serial(), 100.0);
    _variantToDate(OxVariant(L"no date"), out);
    EXPECT_EQ(out.getStatus(), OxDateTime::invalid);
    EXPECT_DOUBLE_EQ(out.serial(), 0.0);
    _variantToDate(OxVariant(L"99991231"), out);
    EXPECT_EQ(out.getStatus(), OxDateTime::valid);
    _variantToDate(OxVariant(L"12345678"), out);  // 1234/56/78 is no date
    EXPECT_EQ(out.getStatus(), OxDateTime::invalid);
}

TEST_F(ConvertTest, AdoTypeMaps) {
    EXPECT_EQ(ADODBTypeToQelFieldType(-9999), Integer);
    EXPECT_EQ(ADODBTypeToQelFieldType(6), Unknown);  // currency has no library type
    EXPECT_EQ(ADODBTypeToQelFieldType(205), Integer);
    EXPECT_EQ(ADODBTypeToQelFieldType(131), Integer);
    EXPECT_EQ(ADODBTypeToQelFieldType(135), Date);
    EXPECT_EQ(ADODBTypeToQelFieldType(129), Char);
    EXPECT_EQ(ADODBTypeToQelFieldType(203), WMemo);
    EXPECT_EQ(QelFieldTypeToADODBType(Binary), 72);
    EXPECT_EQ(QelFieldTypeToADODBType(Char), 200);
    EXPECT_EQ(QelFieldTypeToADODBType(WChar), 130);
    EXPECT_EQ(QelFieldTypeToADODBType(Unknown), 0);
    EXPECT_EQ(QelFieldTypeToADODBType(42), 0);
    // Every library type that maps to ADO maps back to itself, but the ones ADO merges.
    for (int t = Integer; t <= WChar; ++t) {
        if (t == Binary || t == Char)
            continue;
        EXPECT_EQ(ADODBTypeToQelFieldType(QelFieldTypeToADODBType(t)), t) << t;
    }
    EXPECT_TRUE(isStringType(Char));
    EXPECT_FALSE(isStringType(WMemo));
}

TEST_F(ConvertTest, SqlTypeTextsAndColumnClauses) {
    EXPECT_EQ(ADO::getStrSQLFieldType(String, 40), L"VARCHAR (40)");
    EXPECT_EQ(ADO::getStrSQLFieldType(WChar, 3), L"NCHAR (3)");
    EXPECT_EQ(ADO::getStrSQLFieldType(Bool, 0), L"");
    EXPECT_EQ(ADO::getStrSQLFieldType(WMemo, 0), L"");
    EXPECT_EQ(Access::getStrSQLFieldType(Bool, 0), L"BYTE");
    EXPECT_EQ(SQLServer::getStrSQLFieldType(Bool, 0), L"BIT");
    EXPECT_EQ(Access::formatStrFieldType(WString, 50, L"x", true), L"NVARCHAR (50) NOT NULL");
    EXPECT_EQ(Access::formatStrFieldType(Date, 0, L"", false), L"DATETIME NULL");
    EXPECT_EQ(Access::formatStrFieldType(Guid, 0, L"", true), L"UNIQUEIDENTIFIER");
    EXPECT_EQ(Access::formatStrFieldType(Binary, 0, L"", false), L"UNIQUEIDENTIFIER NOT NULL");
    EXPECT_EQ(Access::formatStrFieldType(WMemo, 0, L"", false), L"");
    EXPECT_EQ(SQLServer::formatStrFieldType(L"t", L"f", Guid, 0, L"", false),
              L"UNIQUEIDENTIFIER NOT NULL CONSTRAINT DF_t_f DEFAULT NEWID()");
    EXPECT_EQ(SQLServer::formatStrFieldType(L"t", L"f", Guid, 0, L"", true), L"UNIQUEIDENTIFIER");
    EXPECT_EQ(SQLServer::formatStrFieldType(L"t", L"f", String, 10, L"\"\"", true),
              L"VARCHAR (10)  CONSTRAINT DF_t_f DEFAULT '' ");
    EXPECT_EQ(SQLServer::formatStrFieldType(L"t", L"f", Integer, 0, L"0", false),
              L"INT NOT NULL CONSTRAINT DF_t_f DEFAULT 0 ");
    EXPECT_EQ(SQLServer::formatStrFieldType(L"t", L"f", Date, 0, L"GETDATE()", false),
              L"DATETIME NULL");
    EXPECT_EQ(SQLServer::formatStrFieldType(L"t", L"f", WMemo, 0, L"", false), L"");
    EXPECT_FALSE(_checkACEDriverInstalled());
}

TEST_F(ConvertTest, UnicodeConvertionOwnsItsBufferAlone) {
    OxQelUnicodeConvertion a(std::wstring(L"\u00e9t\u00e9"));
    EXPECT_STREQ(static_cast<const char*>(a), "\xC3\xA9t\xC3\xA9");
    OxQelUnicodeConvertion b(std::move(a));
    EXPECT_EQ(static_cast<const char*>(a), nullptr);
    EXPECT_EQ(b.size(), 5u);
    OxQelUnicodeConvertion none(static_cast<const wchar_t*>(nullptr));
    EXPECT_EQ(static_cast<const char*>(none), nullptr);
    static_assert(!std::is_copy_constructible_v<OxQelUnicodeConvertion>);
}
}  // namespace
