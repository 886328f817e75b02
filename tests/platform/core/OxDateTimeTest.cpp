#include <gtest/gtest.h>

#include "support/TestSupport.h"

#include "platform/core/OxDateTime.h"
#include "platform/core/OxUserLocale.h"

namespace {
class DateTimeTest : public ::testing::Test {
protected:
    OxTest::ScopedLocale m_locale{"en_US"};
};

TEST_F(DateTimeTest, SerialsMatchThePlatformEpoch) {
    EXPECT_DOUBLE_EQ(OxDateTime(1899, 12, 30).serial(), 0.0);
    EXPECT_DOUBLE_EQ(OxDateTime(1900, 1, 1).serial(), 2.0);
    EXPECT_DOUBLE_EQ(OxDateTime(2020, 12, 31, 18).serial(), 44196.75);
    // Before the epoch the fraction is still a positive time of day.
    const OxDateTime before(1899, 12, 29, 6, 0, 0);
    EXPECT_DOUBLE_EQ(before.serial(), -1.25);
    EXPECT_EQ(before.getDay(), 29);
    EXPECT_EQ(before.getHour(), 6);
    const OxDateTime early(1601, 3, 1, 23, 59, 59);
    EXPECT_EQ(early.getYear(), 1601);
    EXPECT_EQ(early.getSecond(), 59);
    EXPECT_EQ(OxDateTime(2026, 12, 4).getDayOfWeek(), 6);  // a Friday
}

TEST_F(DateTimeTest, OutOfRangeIsInvalid) {
    EXPECT_EQ(OxDateTime(99, 1, 1).getStatus(), OxDateTime::invalid);
    EXPECT_EQ(OxDateTime(2021, 2, 29).getStatus(), OxDateTime::invalid);
    EXPECT_EQ(OxDateTime(2020, 2, 29).getStatus(), OxDateTime::valid);
    EXPECT_EQ(OxDateTime(3e6).getStatus(), OxDateTime::invalid);
    EXPECT_EQ(OxDateTime(3e6).getYear(), -1);
}

TEST_F(DateTimeTest, FormatCodes) {
    const OxDateTime d(2026, 12, 4, 9, 5, 0);
    EXPECT_EQ(d.format(L"%d/%m/%Y %H:%M:%S"), L"04/12/2026 09:05:00");
    EXPECT_EQ(d.format(L"%Y%m%d %I%p %j %a %B %#d %%"), L"20261204 09AM 338 Fri December 4 %");
    EXPECT_EQ(d.format(), L"12/4/2026 09:05:00");
    EXPECT_EQ(OxDateTime(0.5).format(), L"12:00:00");
    EXPECT_EQ(OxDateTime(2020, 1, 2).format(), L"1/2/2020");
    OxDateTime invalid(5e6);
    EXPECT_EQ(invalid.format(L"%Y"), L"Invalid DateTime");
    OxDateTime null;
    null.setStatus(OxDateTime::null);
    EXPECT_EQ(null.format(L"%Y"), L"");
    // Rounding to the second may carry into the next day.
    EXPECT_EQ(OxDateTime(0.9999999).format(L"%Y-%m-%d %H:%M:%S"), L"1899-12-31 00:00:00");
}

TEST_F(DateTimeTest, ParsesWhatTheLibraryAndUsersWrite) {
    OxDateTime d;
    ASSERT_TRUE(d.parseDateTime(L"2020/12/31"));
    EXPECT_DOUBLE_EQ(d.serial(), 44196.0);
    ASSERT_TRUE(d.parseDateTime(L"2020-12-31T13:45:30"));
    EXPECT_EQ(d.format(L"%H:%M:%S"), L"13:45:30");
    ASSERT_TRUE(d.parseDateTime(L"12/31/2020 1:45 PM"));
    EXPECT_EQ(d.format(L"%Y-%m-%d %H:%M"), L"2020-12-31 13:45");
    ASSERT_TRUE(d.parseDateTime(L"31/12/2020"));  // a month above 12 swaps day and month
    EXPECT_EQ(d.getMonth(), 12);
    ASSERT_TRUE(d.parseDateTime(L"December 31, 2020"));
    EXPECT_EQ(d.getDay(), 31);
    ASSERT_TRUE(d.parseDateTime(L"1 Feb 29"));
    EXPECT_EQ(d.getYear(), 2029);
    ASSERT_TRUE(d.parseDateTime(L"13:05"));
    EXPECT_DOUBLE_EQ(d.serial(), (13 * 60 + 5) / 1440.0);
    ASSERT_TRUE(d.parseDateTime(L"2020-12-31 23:59:59.7"));
    EXPECT_EQ(d.format(L"%H:%M:%S"), L"23:59:59");  // a 60th second is clamped, never a new day
}

TEST_F(DateTimeTest, RejectsNonDatesWithTheRightValue) {
    OxDateTime d(5.0);
    EXPECT_FALSE(d.parseDateTime(L"20201231"));
    EXPECT_EQ(d.getStatus(), OxDateTime::invalid);
    EXPECT_DOUBLE_EQ(d.serial(), 0.0);
    EXPECT_FALSE(d.parseDateTime(L"2020/13/45"));
    EXPECT_FALSE(d.parseDateTime(L"2021/02/29"));
    EXPECT_FALSE(d.parseDateTime(L"hello"));
    EXPECT_FALSE(d.parseDateTime(L""));
    EXPECT_FALSE(d.parseDateTime(L"25:00"));
    EXPECT_FALSE(d.parseDateTime(L"1/2/3/4"));
    EXPECT_FALSE(d.parseDateTime(L"10000/1/1"));
    EXPECT_DOUBLE_EQ(d.serial(), -1.0);  // out of range is not a type mismatch
}

TEST_F(DateTimeTest, DayFirstLocales) {
    m_locale.use("de_DE.UTF-8");
    OxDateTime d;
    ASSERT_TRUE(d.parseDateTime(L"04.12.2026"));
    EXPECT_EQ(d.getMonth(), 12);
    EXPECT_EQ(d.format(), L"4.12.2026");
    ASSERT_TRUE(d.parseDateTime(L"2020/12/31"));  // year-first text reads in every locale
    EXPECT_EQ(d.getDay(), 31);
}
}  // namespace
