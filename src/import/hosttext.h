// Host text: fields of the host's record files hold single bytes of code page 862 with
// Hebrew in display order (a word's first letter is its last stored byte). These routines
// turn such a field into Windows-1255 text in reading order, into a sort key, or into a
// date. All take and return byte strings; the results are Windows-1255 bytes.
#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

#include "workdb/value.h"

namespace zdr {

// Raised by ParseHostDate on a part that is not a number, AlignRight on a value longer than
// its width, ToHostLetter on the empty text, and BidiReorder when reordering fails.
class HostTextError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Character classes of host bytes.
inline bool IsHostHebrew(unsigned char b) { return b >= 0x80 && b <= 0x9A; }
inline bool IsLatinOrDigit(unsigned char b) {
  return (b >= '0' && b <= '9') || (b >= 'A' && b <= 'Z') || (b >= 'a' && b <= 'z');
}

// Removes leading and trailing spaces (0x20) only.
std::string_view TrimSpaces(std::string_view s);

// Day/month/year with one or two digits for day and month and two or four for the year;
// two-digit years 80..99 are 19xx, below 80 are 20xx. Out-of-range parts carry over.
Date ParseHostDate(std::string_view s);

// A date from the host's three bytes: year - 1900, month, day (carrying, as above).
inline Date HostDateFromBytes(unsigned char y, unsigned char m, unsigned char d) {
  return Date::FromParts(1900 + y, m, d);
}

char ConvertChar(char c);
std::string ReverseAndMirror(std::string_view s);
std::string ReorderHebrewFirst(std::string_view s);
std::string ConvertForDisplay(std::string_view s, bool asIs);
std::string ConvertForSort(std::string_view s);
std::string ConvertSpaced(std::string_view s);
std::string ConvertWithBidi(std::string_view s);
// Display order to reading order (Windows-1255 in and out), trimmed.
std::string BidiReorder(std::string_view s);
std::string_view CutAtNull(std::string_view s);
std::string ToHostLetter(std::string_view s);
std::string ExtractHebrewWords(std::string_view s, int16_t n);
// `v` empty optional is null.
std::string AlignRight(const std::optional<std::string_view>& v, int16_t n);

// The integer value of a text as the host's routines read it: surrounding spaces ignored,
// a fractional number rounded (halves to even); throws HostTextError when not a number.
int64_t HostIntValue(std::string_view s);

}  // namespace zdr
