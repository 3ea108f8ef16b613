// Dates of the simulation: a day number and the seconds of the day, the day
// rolling over at 86400 seconds. Texts have the form "YYYY-MM-DD hh:mm:ss".
#pragma once

#include <cstdint>
#include <string>

struct DateTime {
    int32_t day = 0;       // days since 1970-01-01 in the proleptic Gregorian calendar
    double seconds = 0.0;  // seconds of the day, 0 <= seconds < 86400
};

int32_t DayNumber(int year, int month, int day);
void CalendarDate(int32_t dayNumber, int& year, int& month, int& day);
// A date from year, month, day, hour, minute and second; the parts may run
// over (a minute of 90 rolls into the next hour).
DateTime MakeDateTime(int year, int month, int day, int hour, int minute, double second);
DateTime AddSeconds(DateTime date, double seconds);
// "YYYY-MM-DD hh:mm:ss", seconds cut to whole ones.
std::string DateTimeText(DateTime date);
// True for a date of the years 0 to 9999 that the calendar has, at a time
// of the day from 00:00:00 to 23:59:59.
bool DateExists(int year, int month, int day, int hour, int minute, int second);
// Reads "YYYY-MM-DD hh:mm:ss" (or "YYYY-MM-DD"); false on any other form or an impossible date.
bool ParseDateTime(const std::string& text, DateTime& date);
