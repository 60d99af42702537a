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

#include "common/value.h"

namespace zdr {

// Raised by ParseHostDate on a part that is not a number (or a year, month or day outside
// -32768..32767), AlignRight on a value longer than its width, ToHostLetter on the empty
// text, HostIntValue on a text that is not a number, and BidiReorder when reordering fails.
// what() is a Hebrew message in UTF-8, ready to show.
class HostTextError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Character classes of host bytes.
inline bool IsHostHebrew(unsigned char b) {
  return b >= 0x80 && b <= 0x9A;
}
inline bool IsLatinOrDigit(unsigned char b) {
  return (b >= '0' && b <= '9') || (b >= 'A' && b <= 'Z') || (b >= 'a' && b <= 'z');
}

// Removes leading and trailing spaces (0x20) only.
std::string_view TrimSpaces(std::string_view s);

// Day/month/year with one or two digits for day and month and two or four for the year;
// two-digit years 80..99 are 19xx, below 80 are 20xx. Out-of-range parts carry over
// (30/2/05 is 2 March 2005). The first "/" ends the day, the first "/" from the fourth
// character on ends the month; without both it throws HostTextError.
Date ParseHostDate(std::string_view s);

// A date from the host's three bytes: year - 1900, month, day (carrying, as above).
inline Date HostDateFromBytes(unsigned char y, unsigned char m, unsigned char d) {
  return Date::FromParts(1900 + y, m, d);
}

// Mirror pairs ( ) < > [ ] { } swap; a host Hebrew letter becomes its Windows-1255 letter;
// any other byte stays.
char ConvertChar(char c);
// The bytes from last to first, each through ConvertChar.
std::string ReverseAndMirror(std::string_view s);
// All Hebrew first in reading order, then the Latin letters and digits (with what stands
// among them) in stored order; quotes and brackets are dropped.
std::string ReorderHebrewFirst(std::string_view s);
// Trimmed, then ReverseAndMirror when `asIs`, else ReorderHebrewFirst.
std::string ConvertForDisplay(std::string_view s, bool asIs);
// The sort key of a field: Latin/digit runs in stored order in front, Hebrew in reading
// order after them; a double quote counts as an apostrophe. Not trimmed.
std::string ConvertForSort(std::string_view s);
// As ConvertForSort, but the Latin/digit part is followed by one space, punctuation within
// Hebrew after Latin becomes a space, and the double quote stays.
std::string ConvertSpaced(std::string_view s);
// Trimmed, Hebrew letters mapped in place, then BidiReorder (which mirrors the brackets
// that need it). A field of spaces gives the empty text without reordering.
std::string ConvertWithBidi(std::string_view s);
// Display order to reading order, Windows-1255 in and out: the line as the host's screen
// showed it, read back. A line with a Hebrew letter is a right-to-left line; its brackets
// that resolve right to left were shown mirrored and are turned back, those inside Latin
// text stay. A line without a Hebrew letter was typed left to right and comes back as
// shown. The line ends at its first zero byte; the result is trimmed and as long as the
// line needs (no length cap). Safe to call from several threads (each keeps its own
// reordering state).
std::string BidiReorder(std::string_view s);
// The text before the first zero byte (a view into `s`).
std::string_view CutAtNull(std::string_view s);
// A Windows-1255 Hebrew letter first gives the one host byte of that letter; anything
// else comes back unchanged. Throws HostTextError on the empty text.
std::string ToHostLetter(std::string_view s);
// The Hebrew words at the reading start of a host field (up to `n` word breaks and at most
// `n` bytes), without digits or punctuation; still host bytes. Stops at an ASCII letter.
// `n` <= 0 gives the empty text.
std::string ExtractHebrewWords(std::string_view s, int16_t n);
// `v` padded on the left with spaces to `n` bytes; an empty optional (null) gives `n`
// spaces. Throws HostTextError when `v` is longer than `n` or `n` is negative.
std::string AlignRight(const std::optional<std::string_view>& v, int16_t n);

// Forms of the conversions above for loops that convert every record: the result replaces
// the contents of `out`, whose capacity is kept from call to call, so a warm buffer converts
// without allocating. The results are those of the returning forms, byte for byte. `out` must
// not share storage with `s`.
void ReverseAndMirror(std::string_view s, std::string& out);
void ReorderHebrewFirst(std::string_view s, std::string& out);
void ConvertForDisplay(std::string_view s, bool asIs, std::string& out);
void ConvertForSort(std::string_view s, std::string& out);
void ConvertSpaced(std::string_view s, std::string& out);
void ConvertWithBidi(std::string_view s, std::string& out);
void BidiReorder(std::string_view s, std::string& out);
void ExtractHebrewWords(std::string_view s, int16_t n, std::string& out);

// The integer value of a text as the host's routines read it: surrounding spaces ignored,
// a fractional number rounded (halves to even); throws HostTextError when not a number.
int64_t HostIntValue(std::string_view s);

namespace detail {
// BidiReorder's ICU reordering of a right-to-left line (brackets mirrored as BidiReorder
// mirrors them) alone, without cutting, trimming, the left-to-right rule or the shortcut
// that reorders common lines without ICU; for tests that check the shortcut against it.
std::string BidiReorderWithIcu(std::string_view s);
}  // namespace detail

}  // namespace zdr
