#include "run/datetime.hpp"

#include <gtest/gtest.h>

#include <tuple>

namespace {

// Day numbers keep the Gregorian leap rules and turn back into the same
// calendar date over eight centuries; seconds that run over roll the day and
// the year, both ways; the text of a date comes back from parsing, and
// impossible dates are refused.
TEST(Dates, DayNumbersRollOverAndParsing) {
    EXPECT_EQ(DayNumber(2000, 3, 1) - DayNumber(2000, 2, 28), 2);  // 2000 is a leap year
    EXPECT_EQ(DayNumber(1900, 3, 1) - DayNumber(1900, 2, 28), 1);  // 1900 is not
    for (int32_t day = DayNumber(1600, 1, 1); day < DayNumber(2400, 1, 1); day += 37) {
        int y, m, d;
        CalendarDate(day, y, m, d);
        EXPECT_EQ(DayNumber(y, m, d), day);
    }
    const DateTime t = MakeDateTime(2004, 12, 31, 23, 59, 30.0);
    EXPECT_EQ(DateTimeText(AddSeconds(t, 45.0)), "2005-01-01 00:00:15");
    EXPECT_EQ(DateTimeText(AddSeconds(t, -86400.0 * 366)), "2003-12-31 23:59:30");
    DateTime p;
    ASSERT_TRUE(ParseDateTime("2024-02-29 12:00:01", p));
    EXPECT_EQ(DateTimeText(p), "2024-02-29 12:00:01");
    for (const char* bad : {"2023-02-29 00:00:00", "2023-01-01 24:00:00", "yesterday"})
        EXPECT_FALSE(ParseDateTime(bad, p)) << bad;
    // Each part at its bounds: the first that falls outside is refused.
    EXPECT_TRUE(DateExists(2000, 2, 29, 23, 59, 59));
    EXPECT_TRUE(DateExists(0, 1, 1, 0, 0, 0));
    for (const auto& [y, mo, d, h, mi, s] : {std::tuple{1900, 2, 29, 0, 0, 0},
                                             {2004, 13, 1, 0, 0, 0},
                                             {2004, 4, 31, 0, 0, 0},
                                             {2004, 1, 0, 0, 0, 0},
                                             {2004, 1, 1, 0, 60, 0},
                                             {2004, 1, 1, 0, 0, -1},
                                             {10000, 1, 1, 0, 0, 0}})
        EXPECT_FALSE(DateExists(y, mo, d, h, mi, s))
            << y << "-" << mo << "-" << d << " " << h << ":" << mi;
}

}  // namespace
