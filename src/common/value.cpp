#include "common/value.h"

#include <cstdio>

namespace zdr {
namespace {

// Days from 1970-01-01 to the given proleptic Gregorian date (H. Hinnant's algorithm).
int64_t DaysFromCivil(int64_t y, int64_t m, int64_t d) {
  y -= m <= 2;
  const int64_t era = (y >= 0 ? y : y - 399) / 400;
  const int64_t yoe = y - era * 400;
  const int64_t doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;
  const int64_t doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
  return era * 146097 + doe - 719468;
}

void CivilFromDays(int64_t z, int& y, int& m, int& d) {
  z += 719468;
  const int64_t era = (z >= 0 ? z : z - 146096) / 146097;
  const int64_t doe = z - era * 146097;
  const int64_t yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
  const int64_t yy = yoe + era * 400;
  const int64_t doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
  const int64_t mp = (5 * doy + 2) / 153;
  d = static_cast<int>(doy - (153 * mp + 2) / 5 + 1);
  m = static_cast<int>(mp < 10 ? mp + 3 : mp - 9);
  y = static_cast<int>(yy + (m <= 2));
}

// 1899-12-30 counted from 1970-01-01.
constexpr int64_t kSerialEpoch = -25569;

}  // namespace

Date Date::FromParts(int year, int month, int day) {
  // Normalise the month into 1..12, carrying whole years.
  int64_t m0 = static_cast<int64_t>(month) - 1;
  int64_t y = year + (m0 >= 0 ? m0 / 12 : -((11 - m0) / 12));
  m0 -= (y - year) * 12;
  // Day 1 of the month, then add the days (day 0 is the last day of the month before).
  const int64_t first = DaysFromCivil(y, m0 + 1, 1);
  return Date{static_cast<int32_t>(first + (day - 1) - kSerialEpoch)};
}

void Date::ToParts(int& year, int& month, int& day) const {
  CivilFromDays(static_cast<int64_t>(serial) + kSerialEpoch, year, month, day);
}

std::string FormatDate(Date d) {
  int y, m, dd;
  d.ToParts(y, m, dd);
  char buf[32];
  std::snprintf(buf, sizeof buf, "%02d/%02d/%04d", dd, m, y);
  return buf;
}

}  // namespace zdr
