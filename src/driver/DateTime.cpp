#include "driver/DateTime.h"

#include <cmath>
#include <cstdio>

bool IsLeapYear(int year) { return (year % 4 == 0 && year % 100 != 0) || year % 400 == 0; }

int DaysInMonth(int year, int month) {
  static const int days[12] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  if (month < 1 || month > 12) return 0;
  return month == 2 && IsLeapYear(year) ? 29 : days[month - 1];
}

// Days from civil: exact for every proleptic Gregorian date.
std::int32_t DayNumber(int year, int month, int day) {
  const int y = year - (month <= 2 ? 1 : 0);
  const int era = (y >= 0 ? y : y - 399) / 400;
  const int yoe = y - era * 400;
  const int mp = (month + 9) % 12;
  const int doy = (153 * mp + 2) / 5 + day - 1;
  const int doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
  return era * 146097 + doe - 719468;
}

static void CivilFromDays(std::int32_t z, int& year, int& month, int& day) {
  z += 719468;
  const int era = (z >= 0 ? z : z - 146096) / 146097;
  const int doe = z - era * 146097;
  const int yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
  const int doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
  const int mp = (5 * doy + 2) / 153;
  day = doy - (153 * mp + 2) / 5 + 1;
  month = mp < 10 ? mp + 3 : mp - 9;
  year = yoe + era * 400 + (month <= 2 ? 1 : 0);
}

bool IsValidCalendarDate(const CalendarDate& d) {
  if (d.year < 1 || d.year > 9999) return false;
  if (d.month < 1 || d.month > 12) return false;
  if (d.day < 1 || d.day > DaysInMonth(d.year, d.month)) return false;
  if (d.hour < 0 || d.hour > 23 || d.minute < 0 || d.minute > 59) return false;
  return std::isfinite(d.second) && d.second >= 0.0 && d.second < 60.0;
}

DateTime MakeDateTime(const CalendarDate& d) {
  DateTime t;
  t.day = DayNumber(d.year, d.month, d.day);
  t.seconds = d.hour * 3600.0 + d.minute * 60.0 + d.second;
  return t;
}

CalendarDate ToCalendar(const DateTime& t) {
  CalendarDate d;
  CivilFromDays(t.day, d.year, d.month, d.day);
  const int whole = static_cast<int>(std::floor(t.seconds));
  d.hour = whole / 3600;
  d.minute = (whole % 3600) / 60;
  d.second = t.seconds - (d.hour * 3600 + d.minute * 60);
  return d;
}

DateTime AddSeconds(const DateTime& t, double seconds) {
  DateTime r = t;
  const double days = std::floor(seconds / 86400.0);
  r.day += static_cast<std::int32_t>(days);
  r.seconds += seconds - days * 86400.0;
  // r.seconds is now in [0, 2 * 86400); carry once more, and guard rounding at the edge.
  if (r.seconds >= 86400.0) {
    r.seconds -= 86400.0;
    r.day += 1;
  }
  if (r.seconds < 0.0) {
    r.seconds += 86400.0;
    r.day -= 1;
  }
  if (r.seconds >= 86400.0) r.seconds = 0.0, r.day += 1;
  return r;
}

double DiffSeconds(const DateTime& a, const DateTime& b) {
  return static_cast<double>(a.day - b.day) * 86400.0 + (a.seconds - b.seconds);
}

bool operator<(const DateTime& a, const DateTime& b) {
  return a.day < b.day || (a.day == b.day && a.seconds < b.seconds);
}

std::string FormatDateTime(const DateTime& t) {
  DateTime r = t;
  const double rounded = std::floor(t.seconds + 0.5);
  r.seconds = 0.0;
  r = AddSeconds(r, rounded);
  const CalendarDate d = ToCalendar(r);
  char buf[64];
  std::snprintf(buf, sizeof buf, "%04d-%02d-%02d %02d:%02d:%02d", d.year, d.month, d.day, d.hour,
                d.minute, static_cast<int>(d.second));
  return buf;
}
