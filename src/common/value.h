// Values that cross the working-database layer: field values, dates.
#pragma once

#include <cstdint>
#include <string>
#include <variant>

namespace zdr {

// A calendar date without time, kept as the number of days since 30 December 1899
// (the serial that desktop databases and spreadsheets use), so that dates compare as numbers.
struct Date {
  int32_t serial = 0;

  // Builds a date from year, month and day with carrying: a month above 12 runs on into
  // the following years, a month below 1 back into earlier ones, a day past the end of its
  // month runs on into the following month, and day 0 is the last day of the month before.
  static Date FromParts(int year, int month, int day);
  void ToParts(int& year, int& month, int& day) const;

  friend bool operator==(Date a, Date b) { return a.serial == b.serial; }
  friend bool operator<(Date a, Date b) { return a.serial < b.serial; }
  friend bool operator>(Date a, Date b) { return a.serial > b.serial; }
  friend bool operator<=(Date a, Date b) { return a.serial <= b.serial; }
  friend bool operator>=(Date a, Date b) { return a.serial >= b.serial; }
};

// "dd/mm/yyyy", the form the outputs print.
std::string FormatDate(Date d);

namespace db {

// A field value. Text is UTF-8. Boolean fields hold -1 (True) or 0 (False) as integers;
// Date fields hold the date's serial as a double.
using Value = std::variant<std::monostate, int64_t, double, std::string>;

inline bool IsNull(const Value& v) {
  return std::holds_alternative<std::monostate>(v);
}

}  // namespace db
}  // namespace zdr
