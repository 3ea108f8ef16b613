#include "run/datetime.hpp"

#include <gtest/gtest.h>

namespace {

TEST(Dates, DayNumbersRoundTripAcrossCenturiesAndLeapDays) {
    EXPECT_EQ(DayNumber(1970, 1, 1), 0);
    EXPECT_EQ(DayNumber(2000, 3, 1) - DayNumber(2000, 2, 28), 2);  // 2000 is a leap year
    EXPECT_EQ(DayNumber(1900, 3, 1) - DayNumber(1900, 2, 28), 1);  // 1900 is not
    for (int32_t day = DayNumber(1600, 1, 1); day < DayNumber(2400, 1, 1); day += 37) {
        int y, m, d;
        CalendarDate(day, y, m, d);
        EXPECT_EQ(DayNumber(y, m, d), day);
    }
}

TEST(Dates, SecondsRollTheDayBothWays) {
    DateTime t = MakeDateTime(2004, 12, 31, 23, 59, 30.0);
    EXPECT_EQ(DateTimeText(AddSeconds(t, 45.0)), "2005-01-01 00:00:15");
    EXPECT_EQ(DateTimeText(AddSeconds(t, -86400.0 * 366)), "2003-12-31 23:59:30");
    EXPECT_EQ(DateTimeText(MakeDateTime(2004, 1, 1, 0, 90, 0)), "2004-01-01 01:30:00");
}

TEST(Dates, ParsingAcceptsOnlyRealDates) {
    DateTime t;
    ASSERT_TRUE(ParseDateTime("2024-02-29 12:00:01", t));
    EXPECT_EQ(DateTimeText(t), "2024-02-29 12:00:01");
    ASSERT_TRUE(ParseDateTime("2024-03-01", t));
    EXPECT_EQ(t.seconds, 0.0);
    EXPECT_FALSE(ParseDateTime("2023-02-29 00:00:00", t));
    EXPECT_FALSE(ParseDateTime("2023-13-01 00:00:00", t));
    EXPECT_FALSE(ParseDateTime("2023-01-01 24:00:00", t));
    EXPECT_FALSE(ParseDateTime("yesterday", t));
}

}  // namespace
