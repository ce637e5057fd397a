// Date arithmetic of the simulation clock: validation, day numbers across months and leap years,
// exact carrying of seconds into days.
#include <gtest/gtest.h>

#include "driver/DateTime.h"

namespace {

DateTime At(int y, int mo, int d, int h = 0, int mi = 0, double s = 0) {
  return MakeDateTime(CalendarDate{y, mo, d, h, mi, s});
}

TEST(DateTime, ValidatesCalendarFields) {
  struct Case { CalendarDate date; bool valid; };
  const Case cases[] = {
      {{2004, 1, 1, 0, 0, 0}, true},    {{2004, 13, 1, 0, 0, 0}, false},
      {{2004, 0, 1, 0, 0, 0}, false},   {{2004, 4, 31, 0, 0, 0}, false},
      {{2004, 4, 30, 23, 59, 59}, true}, {{2004, 1, 1, 25, 0, 0}, false},
      {{2004, 1, 1, 24, 0, 0}, false},  {{2004, 1, 1, 0, 60, 0}, false},
      {{2004, 1, 1, 0, 0, 60}, false},  {{2004, 1, 1, 0, 0, -1}, false},
      {{2004, 2, 29, 0, 0, 0}, true},   {{2003, 2, 29, 0, 0, 0}, false},
      {{1900, 2, 29, 0, 0, 0}, false},  {{2000, 2, 29, 0, 0, 0}, true},
      {{0, 1, 1, 0, 0, 0}, false},      {{10000, 1, 1, 0, 0, 0}, false},
      {{2004, 1, 0, 0, 0, 0}, false}};
  for (const Case& c : cases)
    EXPECT_EQ(IsValidCalendarDate(c.date), c.valid)
        << c.date.year << "-" << c.date.month << "-" << c.date.day << " " << c.date.hour;
}

TEST(DateTime, DayNumbersAreContinuousAcrossMonthsAndLeapYears) {
  EXPECT_EQ(DayNumber(1970, 1, 1), 0);
  EXPECT_EQ(DayNumber(2000, 3, 1) - DayNumber(2000, 2, 28), 2);  // 2000 is a leap year
  EXPECT_EQ(DayNumber(1900, 3, 1) - DayNumber(1900, 2, 28), 1);  // 1900 is not
  EXPECT_EQ(DayNumber(2005, 1, 1) - DayNumber(2004, 1, 1), 366);
  EXPECT_EQ(DayNumber(2004, 1, 1) - DayNumber(2003, 1, 1), 365);
  // Round trip over several centuries, day by day.
  int y = 1890, m = 1, d = 1;
  for (std::int32_t n = DayNumber(1890, 1, 1); n < DayNumber(2110, 1, 1); ++n) {
    const CalendarDate c = ToCalendar(DateTime{n, 0.0});
    ASSERT_EQ(c.year, y);
    ASSERT_EQ(c.month, m);
    ASSERT_EQ(c.day, d);
    if (++d > DaysInMonth(y, m)) {
      d = 1;
      if (++m > 12) m = 1, ++y;
    }
  }
}

TEST(DateTime, AddingSecondsCarriesWholeDays) {
  const DateTime start = At(2004, 2, 28, 23, 0, 0);
  EXPECT_EQ(FormatDateTime(AddSeconds(start, 3600.0)), "2004-02-29 00:00:00");
  EXPECT_EQ(FormatDateTime(AddSeconds(start, 3600.0 + 86400.0)), "2004-03-01 00:00:00");
  EXPECT_EQ(FormatDateTime(AddSeconds(At(2003, 12, 31, 23, 59, 30), 30.0)), "2004-01-01 00:00:00");
  EXPECT_EQ(FormatDateTime(AddSeconds(At(2004, 3, 1), -1.0)), "2004-02-29 23:59:59");
  EXPECT_EQ(FormatDateTime(AddSeconds(At(2004, 1, 1), 1000 * 30.0)), "2004-01-01 08:20:00");
  // Seconds stay within the day, and a long run adds its steps without drift.
  DateTime t = At(2004, 1, 1);
  for (int i = 0; i < 100000; ++i) t = AddSeconds(t, 0.5);
  EXPECT_GE(t.seconds, 0.0);
  EXPECT_LT(t.seconds, 86400.0);
  EXPECT_DOUBLE_EQ(DiffSeconds(t, At(2004, 1, 1)), 50000.0);
  const DateTime far = AddSeconds(At(2004, 1, 1), 100.0 * 365.0 * 86400.0 + 0.25);
  EXPECT_DOUBLE_EQ(far.seconds, 0.25);
  EXPECT_TRUE(At(2004, 1, 1) < far);
}

TEST(DateTime, FormatRoundsToTheNearestSecond) {
  EXPECT_EQ(FormatDateTime(At(2004, 1, 1, 0, 0, 59.6)), "2004-01-01 00:01:00");
  EXPECT_EQ(FormatDateTime(At(2004, 12, 31, 23, 59, 59.7)), "2005-01-01 00:00:00");
  EXPECT_EQ(FormatDateTime(At(2004, 6, 15, 12, 30, 0.2)), "2004-06-15 12:30:00");
}

}  // namespace
