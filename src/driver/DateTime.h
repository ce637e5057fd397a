// Simulation dates: a day number and the seconds within that day, kept in [0, 86400) by
// carrying whole days, so long runs add time steps without losing the seconds' precision.
#pragma once

#include <cstdint>
#include <string>

struct DateTime {
  std::int32_t day = 0;   // days since 1970-01-01 (proleptic Gregorian calendar)
  double seconds = 0.0;   // seconds within the day, 0 <= seconds < 86400
};

struct CalendarDate {
  int year = 1970, month = 1, day = 1, hour = 0, minute = 0;
  double second = 0.0;
};

bool IsLeapYear(int year);
int DaysInMonth(int year, int month);
// Day number of a calendar day (no validation).
std::int32_t DayNumber(int year, int month, int day);

// True when the fields form a real date and time: year 1 .. 9999, month 1 .. 12, the day within
// its month, hour 0 .. 23, minute 0 .. 59, second in [0, 60).
bool IsValidCalendarDate(const CalendarDate& date);
// Date from calendar fields; the fields must be valid (IsValidCalendarDate).
DateTime MakeDateTime(const CalendarDate& date);
CalendarDate ToCalendar(const DateTime& time);

// time + seconds, carrying whole days.
DateTime AddSeconds(const DateTime& time, double seconds);
// a - b in seconds.
double DiffSeconds(const DateTime& a, const DateTime& b);
bool operator<(const DateTime& a, const DateTime& b);

// "YYYY-MM-DD hh:mm:ss", seconds rounded to the nearest whole second.
std::string FormatDateTime(const DateTime& time);
