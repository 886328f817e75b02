#include <gtest/gtest.h>

#include <clocale>

#include "platform/core/OxFormat.h"
#include "platform/core/OxMessageSink.h"
#include "platform/core/OxText.h"
#include "platform/core/OxUserLocale.h"

namespace {
TEST(TextTest, Utf8RoundTripsEveryPlane) {
    const std::wstring text = L"a\u00e9\u4e2d\U0001F600";
    EXPECT_EQ(OxText::toUtf8(text), "a\xC3\xA9\xE4\xB8\xAD\xF0\x9F\x98\x80");
    EXPECT_EQ(OxText::fromUtf8(OxText::toUtf8(text)), text);
    EXPECT_EQ(OxText::fromUtf16(OxText::toUtf16(text)), text);
    EXPECT_EQ(OxText::toUtf16(L"\U0001F600").size(), 2u);
}

TEST(TextTest, BrokenInputBecomesReplacementCharacters) {
    EXPECT_EQ(OxText::fromUtf8("a\xFF"
                               "b"),
              L"a\uFFFDb");
    EXPECT_EQ(OxText::fromUtf8("\xE4\xB8"), L"\uFFFD");      // cut short
    EXPECT_EQ(OxText::fromUtf8("\xC0\x80"), L"\uFFFD");      // overlong
    EXPECT_EQ(OxText::fromUtf8("\xED\xA0\x80"), L"\uFFFD");  // a surrogate
    EXPECT_EQ(OxText::fromUtf16(u"\xD800x"), L"\uFFFDx");    // lone surrogate
    EXPECT_EQ(OxText::toUtf8(std::wstring(1, static_cast<wchar_t>(0x110000))), "\xEF\xBF\xBD");
}

TEST(TextTest, CaseRulesIgnoreTheProcessLocale) {
    std::setlocale(LC_ALL, "C");
    EXPECT_EQ(OxText::toUpper(L"stra\u00dfe \u00e9\u0430"), L"STRA\u00dfE \u00c9\u0410");
    EXPECT_TRUE(OxText::equalsNoCase(L"\u00c9T\u00c9", L"\u00e9t\u00e9"));
    EXPECT_FALSE(OxText::equalsNoCase(L"abc", L"abcd"));
    EXPECT_LT(OxText::compareNoCase(L"apple", L"Banana"), 0);
    EXPECT_EQ(OxText::findNoCase(L"select * FROM t", L"from"), 9u);
    EXPECT_EQ(OxText::findNoCase(L"ab", L"abc"), std::wstring::npos);
}

TEST(TextTest, ReplaceAllAndTrim) {
    std::wstring s = L"a''b''";
    OxText::replaceAll(s, L"''", L"'");
    EXPECT_EQ(s, L"a'b'");
    OxText::replaceAll(s, L"x", L"yy");
    EXPECT_EQ(s, L"a'b'");
    EXPECT_EQ(OxText::trim(L" \t x y \n"), L"x y");
}

TEST(FormatTest, WideTemplatesTakeAnyText) {
    EXPECT_EQ(oxFormat(L"DROP TABLE %s; -- %s", std::wstring(L"t\u00e9"), "utf8 \xC3\xA9"),
              L"DROP TABLE t\u00e9; -- utf8 \u00e9");
    EXPECT_EQ(oxFormat(L"%d|%5d|%-3d|%02d|%ld|%u", 7, 42, 1, 5, 1L << 40, 3u),
              L"7|   42|1  |05|1099511627776|3");
    EXPECT_EQ(oxFormat(L"%.2f %g %08X %%", 3.14159, 0.5, 0xBEEFu), L"3.14 0.5 0000BEEF %");
    EXPECT_EQ(oxFormat(L"%c%c", L'x', 'y'), L"xy");
}

TEST(FormatTest, MismatchesNeverMisbehave) {
    EXPECT_EQ(oxFormat(L"%d", L"text"), L"text");
    EXPECT_EQ(oxFormat(L"%s", 12), L"12");
    EXPECT_EQ(oxFormat(L"%s and %s", L"one"), L"one and ");
    EXPECT_EQ(oxFormat(L"100%"), L"100%");
    EXPECT_EQ(oxFormat(L"%q %s", L"a"), L"%q a");
    EXPECT_EQ(oxFormat(L"%99999999d", 1).size(), 256u);
}

TEST(LocaleTest, NamesGiveSeparatorsAndOrder) {
    const auto fr = OxUserLocale::fromName("fr_FR.UTF-8");
    EXPECT_EQ(fr.decimalSeparator, L',');
    EXPECT_EQ(fr.dateOrder, OxUserLocale::DateOrder::DMY);
    const auto us = OxUserLocale::fromName("en_US.UTF-8");
    EXPECT_EQ(us.decimalSeparator, L'.');
    EXPECT_EQ(us.dateOrder, OxUserLocale::DateOrder::MDY);
    EXPECT_EQ(OxUserLocale::fromName("ja_JP").dateOrder, OxUserLocale::DateOrder::YMD);
    EXPECT_EQ(OxUserLocale::fromName("C"), OxUserLocale());
}

TEST(LocaleTest, EnvironmentOverrides) {
    const OxUserLocale saved = OxUserLocale::current();
    setenv("OXQEL_LOCALE", "de_DE.UTF-8", 1);
    setenv("OXQEL_DATE_ORDER", "YMD", 1);
    OxUserLocale::resetFromEnvironment();
    EXPECT_EQ(OxUserLocale::current().decimalSeparator, L',');
    EXPECT_EQ(OxUserLocale::current().dateOrder, OxUserLocale::DateOrder::YMD);
    unsetenv("OXQEL_LOCALE");
    unsetenv("OXQEL_DATE_ORDER");
    OxUserLocale::setCurrent(saved);
}

TEST(MessageSinkTest, HostHandlerReceivesTextAndThrowingHandlersAreContained) {
    std::wstring seen;
    auto previous = OxMessageSink::setHandler([&](const std::wstring& t) { seen = t; });
    OxMessageSink::show(L"hello");
    EXPECT_EQ(seen, L"hello");
    OxMessageSink::setHandler([](const std::wstring&) { throw 1; });
    EXPECT_NO_THROW(OxMessageSink::show(L"lost"));
    OxMessageSink::setHandler(previous);
}
}  // namespace
