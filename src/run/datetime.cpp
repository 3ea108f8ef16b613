#include "run/datetime.hpp"

#include <cmath>
#include <cstdio>

// Day numbers by the civil-calendar algorithm on 400-year eras, exact for any year.
int32_t DayNumber(int year, int month, int day) {
    const int y = year - (month <= 2 ? 1 : 0);
    const int era = (y >= 0 ? y : y - 399) / 400;
    const int yoe = y - era * 400;
    const int doy = (153 * (month + (month > 2 ? -3 : 9)) + 2) / 5 + day - 1;
    const int doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
    return era * 146097 + doe - 719468;
}

void CalendarDate(int32_t dayNumber, int& year, int& month, int& day) {
    const int z = dayNumber + 719468;
    const int era = (z >= 0 ? z : z - 146096) / 146097;
    const int doe = z - era * 146097;
    const int yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
    const int doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
    const int mp = (5 * doy + 2) / 153;
    day = doy - (153 * mp + 2) / 5 + 1;
    month = mp + (mp < 10 ? 3 : -9);
    year = yoe + era * 400 + (month <= 2 ? 1 : 0);
}

DateTime AddSeconds(DateTime date, double seconds) {
    double s = date.seconds + seconds;
    const double days = std::floor(s / 86400.0);
    date.day += static_cast<int32_t>(days);
    date.seconds = s - days * 86400.0;
    if (date.seconds >= 86400.0) {  // rounding at the edge of a day
        date.seconds -= 86400.0;
        date.day += 1;
    }
    return date;
}

DateTime MakeDateTime(int year, int month, int day, int hour, int minute, double second) {
    DateTime date{DayNumber(year, month, day), 0.0};
    return AddSeconds(date, hour * 3600.0 + minute * 60.0 + second);
}

std::string DateTimeText(DateTime date) {
    int year, month, day;
    CalendarDate(date.day, year, month, day);
    const long whole = static_cast<long>(std::floor(date.seconds));
    char text[64];
    std::snprintf(text, sizeof text, "%04d-%02d-%02d %02ld:%02ld:%02ld", year, month, day,
                  whole / 3600, (whole / 60) % 60, whole % 60);
    return text;
}

bool DateExists(int year, int month, int day, int hour, int minute, int second) {
    if (year < 0 || year > 9999 || month < 1 || month > 12 || day < 1 || hour < 0 || hour > 23 ||
        minute < 0 || minute > 59 || second < 0 || second > 59)
        return false;
    int y, m, d;
    CalendarDate(DayNumber(year, month, day), y, m, d);
    return y == year && m == month && d == day;  // not 2023-02-30 and the like
}

bool ParseDateTime(const std::string& text, DateTime& date) {
    int year, month, day, hour = 0, minute = 0, second = 0;
    char tail = 0;
    int fields = std::sscanf(text.c_str(), "%4d-%2d-%2d %2d:%2d:%2d%c", &year, &month, &day, &hour,
                             &minute, &second, &tail);
    if (fields != 6 && fields != 3) return false;
    if (!DateExists(year, month, day, hour, minute, second)) return false;
    date = MakeDateTime(year, month, day, hour, minute, second);
    return true;
}
