#include "hosttext/hosttext.h"

#include <unicode/ubidi.h>
#include <unicode/utypes.h>

#include <algorithm>
#include <array>
#include <limits>
#include <vector>

#include "hosttext/codepage.h"

namespace zdr {
namespace {

constexpr unsigned char kWinAlef = 0xE0;
constexpr unsigned char kWinTav = 0xFA;
constexpr unsigned char kHostToWinLetter = 0x60;

inline unsigned char Byte(char c) {
  return static_cast<unsigned char>(c);
}

inline char MapHebrew(unsigned char b) {
  return static_cast<char>(b + kHostToWinLetter);
}

inline bool IsAsciiLetter(unsigned char b) {
  return (b >= 'A' && b <= 'Z') || (b >= 'a' && b <= 'z');
}

// Text shown to the user inside an error message: Windows-1255 bytes made readable.
std::string Quoted(std::string_view s) {
  return "\"" + Win1255ToUtf8(s) + "\"";
}

// A result built from both ends: `front` holds, reversed, what was put in front; `back`
// what was appended. Keeps each step O(1). One per thread, reused, so a conversion
// allocates only its result.
struct TwoEnded {
  std::string front;
  std::string back;

  static TwoEnded& Scratch() {
    thread_local TwoEnded scratch;
    scratch.front.clear();
    scratch.back.clear();
    return scratch;
  }
  void PutInFront(char c) { front.push_back(c); }
  void Append(char c) { back.push_back(c); }
  void TakeInto(std::string& out) const {
    out.clear();
    out.reserve(front.size() + back.size());
    out.append(front.rbegin(), front.rend());
    out += back;
  }
};

// The 16-bit integer value of one part of a date.
int16_t DatePart(std::string_view part, std::string_view whole) {
  int64_t v;
  try {
    v = HostIntValue(part);
  } catch (const HostTextError&) {
    throw HostTextError("תאריך לא תקין: " + Quoted(whole));
  }
  if (v < std::numeric_limits<int16_t>::min() || v > std::numeric_limits<int16_t>::max()) {
    throw HostTextError("מספר גדול מדי בתאריך: " + Quoted(whole));
  }
  return static_cast<int16_t>(v);
}

// The mirror image of a bracket or angle (the four pairs the host's screen mirrors), or 0.
constexpr char MirroredBracket(char c) {
  switch (c) {
    case '(':
      return ')';
    case ')':
      return '(';
    case '<':
      return '>';
    case '>':
      return '<';
    case '[':
      return ']';
    case ']':
      return '[';
    case '{':
      return '}';
    case '}':
      return '{';
    default:
      return 0;
  }
}

// True for the brackets the bidirectional algorithm pairs.
constexpr bool IsPairedBracket(char c) {
  return c == '(' || c == ')' || c == '[' || c == ']' || c == '{' || c == '}';
}

// Display order to reading order through ICU's inverse reordering. The UBiDi objects and
// the buffers live as long as the thread and are reused from call to call.
class InverseBidi {
 public:
  InverseBidi() : inverse_(ubidi_open()), direct_(ubidi_open()) {
    if (inverse_ != nullptr) ubidi_setReorderingMode(inverse_, UBIDI_REORDER_INVERSE_LIKE_DIRECT);
  }
  ~InverseBidi() {
    if (inverse_ != nullptr) ubidi_close(inverse_);
    if (direct_ != nullptr) ubidi_close(direct_);
  }
  InverseBidi(const InverseBidi&) = delete;
  InverseBidi& operator=(const InverseBidi&) = delete;

  // Windows-1255 in display order to Windows-1255 in reading order, same length, into
  // `result`. A bracket that ends in right-to-left text is mirrored (the screen showed it
  // turned round); one that resolves left to right, inside Latin text, stays as shown.
  void Reorder(std::string_view s, std::string& result) {
    if (inverse_ == nullptr || direct_ == nullptr) {
      throw HostTextError("סידור הטקסט הדו-כיווני נכשל (ICU)");
    }
    in_.resize(s.size());
    for (size_t i = 0; i < s.size(); ++i) {
      in_[i] = static_cast<UChar>(Win1255ToCodePoint(Byte(s[i])));
    }
    const auto n = static_cast<int32_t>(in_.size());
    UErrorCode err = U_ZERO_ERROR;
    ubidi_setPara(inverse_, in_.data(), n, UBIDI_RTL, nullptr, &err);
    const UBiDiLevel* levels = U_SUCCESS(err) ? ubidi_getLevels(inverse_, &err) : nullptr;
    if (U_SUCCESS(err)) levels_.assign(levels, levels + n);
    // The inverse reordering leaves brackets to the neutral rules, so a pair around Latin
    // text at the end of a line went to the line's direction. The direct reordering pairs
    // them: a bracket takes the level it gives, on the text as shown, where a pair of either
    // direction still opens before it closes.
    if (U_SUCCESS(err) && std::any_of(s.begin(), s.end(), IsPairedBracket)) {
      ubidi_setPara(direct_, in_.data(), n, UBIDI_RTL, nullptr, &err);
      const UBiDiLevel* paired = U_SUCCESS(err) ? ubidi_getLevels(direct_, &err) : nullptr;
      if (U_SUCCESS(err)) {
        for (int32_t i = 0; i < n; ++i) {
          if (IsPairedBracket(s[static_cast<size_t>(i)])) levels_[i] = paired[i];
        }
      }
    }
    if (U_FAILURE(err)) {
      throw HostTextError(std::string("סידור הטקסט הדו-כיווני נכשל: ") + u_errorName(err));
    }
    map_.resize(in_.size());
    ubidi_reorderVisual(levels_.data(), n, map_.data());
    result.resize(s.size());
    for (size_t i = 0; i < s.size(); ++i) {
      const auto from = static_cast<size_t>(map_[i]);
      const char c = s[from];
      const char mirrored = (levels_[from] & 1) != 0 ? MirroredBracket(c) : 0;
      result[i] = mirrored != 0 ? mirrored : c;
    }
  }

 private:
  UBiDi* inverse_ = nullptr;
  UBiDi* direct_ = nullptr;
  std::vector<UChar> in_;
  std::vector<UBiDiLevel> levels_;
  std::vector<int32_t> map_;
};

// True when the line holds a Hebrew letter (Windows-1255). A line without one was typed
// left to right and is shown as typed.
bool HasHebrewLetter(std::string_view t) {
  return std::any_of(t.begin(), t.end(), [](char c) {
    const unsigned char b = Byte(c);
    return b >= kWinAlef && b <= kWinTav;
  });
}

// Bidirectional classes of the bytes a right-to-left line is reordered by without ICU.
// kOther marks every byte the rule below does not cover (Latin letters, controls, and the
// code page's upper half apart from the Hebrew letters), which sends the line to ICU.
enum class RtlClass : uint8_t {
  kOther,
  kLetter,
  kDigit,
  kSeparator,
  kCommonSeparator,
  kTerminator,
  kNeutral
};

constexpr std::array<RtlClass, 256> MakeRtlClasses() {
  std::array<RtlClass, 256> table{};
  for (int b = 0x20; b <= 0x7E; ++b) table[b] = RtlClass::kNeutral;
  for (int b = 'A'; b <= 'Z'; ++b) table[b] = RtlClass::kOther;
  for (int b = 'a'; b <= 'z'; ++b) table[b] = RtlClass::kOther;
  for (int b = '0'; b <= '9'; ++b) table[b] = RtlClass::kDigit;
  table['+'] = table['-'] = RtlClass::kSeparator;
  table[','] = table['.'] = table['/'] = table[':'] = RtlClass::kCommonSeparator;
  table['#'] = table['$'] = table['%'] = RtlClass::kTerminator;
  for (int b = kWinAlef; b <= kWinTav; ++b) table[b] = RtlClass::kLetter;
  return table;
}
constexpr std::array<RtlClass, 256> kRtlClasses = MakeRtlClasses();

// A line without left-to-right letters, in a right-to-left paragraph: every letter, space
// and neutral resolves to right-to-left and only numbers rise a level, so the line reads
// backwards with each number kept in its stored order, and every bracket, being right to
// left, is mirrored. A number is a run of digits joined by a single "+ - , . / :" between
// two digits, with any "# $ %" touching it. Returns false, leaving `out` undefined, when the
// line holds a byte outside that shape; `t` is trimmed and free of zero bytes. Agrees with
// ICU byte for byte (the tests compare them).
bool ReorderRightToLeftLine(std::string_view t, std::string& out) {
  const size_t n = t.size();
  bool anyDigit = false;
  for (const char c : t) {
    const RtlClass k = kRtlClasses[Byte(c)];
    if (k == RtlClass::kOther) return false;
    anyDigit |= k == RtlClass::kDigit;
  }
  out.resize(n);
  auto mirrored = [](char c) {
    const char m = MirroredBracket(c);
    return m != 0 ? m : c;
  };
  if (!anyDigit) {
    std::transform(t.rbegin(), t.rend(), out.begin(), mirrored);
    return true;
  }
  // inNumber[i]: byte i belongs to a number.
  thread_local std::vector<uint8_t> inNumber;
  inNumber.assign(n, 0);
  auto classAt = [&](size_t i) { return kRtlClasses[Byte(t[i])]; };
  for (size_t i = 0; i < n; ++i) {
    const RtlClass k = classAt(i);
    if (k == RtlClass::kDigit) {
      inNumber[i] = 1;
    } else if ((k == RtlClass::kSeparator || k == RtlClass::kCommonSeparator) && i > 0 &&
               i + 1 < n && classAt(i - 1) == RtlClass::kDigit &&
               classAt(i + 1) == RtlClass::kDigit) {
      inNumber[i] = 1;
    }
  }
  // Terminators join after the separators have: "1.5%" is one number.
  for (size_t i = 0; i < n;) {
    if (classAt(i) != RtlClass::kTerminator) {
      ++i;
      continue;
    }
    size_t end = i;
    while (end < n && classAt(end) == RtlClass::kTerminator) ++end;
    if ((i > 0 && inNumber[i - 1]) || (end < n && inNumber[end])) {
      std::fill(inNumber.begin() + static_cast<std::ptrdiff_t>(i),
                inNumber.begin() + static_cast<std::ptrdiff_t>(end), 1);
    }
    i = end;
  }
  char* o = out.data();
  for (size_t i = n; i > 0;) {
    --i;
    if (!inNumber[i]) {
      *o++ = mirrored(t[i]);
      continue;
    }
    size_t start = i;
    while (start > 0 && inNumber[start - 1]) --start;
    o = std::copy(t.begin() + static_cast<std::ptrdiff_t>(start),
                  t.begin() + static_cast<std::ptrdiff_t>(i) + 1, o);
    i = start;
  }
  return true;
}

// ICU's reordering into `out`; one reordering state per thread.
void ReorderWithIcu(std::string_view s, std::string& out) {
  thread_local InverseBidi bidi;
  bidi.Reorder(s, out);
}

}  // namespace

namespace detail {

std::string BidiReorderWithIcu(std::string_view s) {
  std::string out;
  ReorderWithIcu(s, out);
  return out;
}

}  // namespace detail

std::string_view TrimSpaces(std::string_view s) {
  const size_t first = s.find_first_not_of(' ');
  if (first == std::string_view::npos) return {};
  const size_t last = s.find_last_not_of(' ');
  return s.substr(first, last - first + 1);
}

int64_t HostIntValue(std::string_view s) {
  const std::string_view t = TrimSpaces(s);
  size_t i = 0;
  bool negative = false;
  if (i < t.size() && (t[i] == '+' || t[i] == '-')) {
    negative = t[i] == '-';
    ++i;
  }
  uint64_t whole = 0;
  size_t digits = 0;
  constexpr uint64_t kLimit = static_cast<uint64_t>(std::numeric_limits<int64_t>::max());
  for (; i < t.size() && t[i] >= '0' && t[i] <= '9'; ++i, ++digits) {
    whole = whole * 10 + static_cast<uint64_t>(t[i] - '0');
    if (whole > kLimit) throw HostTextError("מספר גדול מדי: " + Quoted(t));
  }
  // Fraction: only the first digit and whether any other is non-zero decide the rounding.
  int firstFraction = 0;
  bool restNonZero = false;
  if (i < t.size() && t[i] == '.') {
    ++i;
    for (size_t k = 0; i < t.size() && t[i] >= '0' && t[i] <= '9'; ++i, ++k, ++digits) {
      if (k == 0) {
        firstFraction = t[i] - '0';
      } else if (t[i] != '0') {
        restNonZero = true;
      }
    }
  }
  if (digits == 0 || i != t.size()) throw HostTextError("ערך לא מספרי: " + Quoted(s));
  // Halves go to the even neighbour, as the host's integer conversion does.
  if (firstFraction > 5 || (firstFraction == 5 && (restNonZero || whole % 2 == 1))) {
    ++whole;
    if (whole > kLimit) throw HostTextError("מספר גדול מדי: " + Quoted(t));
  }
  const auto v = static_cast<int64_t>(whole);
  return negative ? -v : v;
}

Date ParseHostDate(std::string_view s) {
  const size_t slash1 = s.find('/');
  const size_t slash2 = s.size() > 3 ? s.find('/', 3) : std::string_view::npos;
  // slash2 is at or after the fourth character, slash1 the first one, so slash1 <= slash2;
  // they must differ for a month to stand between them.
  if (slash1 == std::string_view::npos || slash2 == std::string_view::npos || slash1 == slash2) {
    throw HostTextError("תאריך לא תקין: " + Quoted(s));
  }
  int year = DatePart(s.substr(slash2 + 1), s);
  const int month = DatePart(s.substr(slash1 + 1, slash2 - slash1 - 1), s);
  const int day = DatePart(s.substr(0, slash1), s);
  if (year >= 80 && year <= 99) year += 1900;
  if (year < 80) year += 2000;
  return Date::FromParts(year, month, day);
}

namespace {

// ConvertChar for every byte, looked up rather than decided, as it runs on every byte of
// every converted field.
constexpr std::array<char, 256> MakeConvertedChars() {
  std::array<char, 256> table{};
  for (int b = 0; b < 256; ++b) {
    // The host's letters 0x80..0x9A sit 0x60 below their Windows-1255 places.
    table[b] = static_cast<char>(b >= 0x80 && b <= 0x9A ? b + kHostToWinLetter : b);
  }
  constexpr const char* kMirrorPairs[] = {"()", "<>", "[]", "{}"};
  for (const char* pair : kMirrorPairs) {
    table[static_cast<unsigned char>(pair[0])] = pair[1];
    table[static_cast<unsigned char>(pair[1])] = pair[0];
  }
  return table;
}
constexpr std::array<char, 256> kConvertedChars = MakeConvertedChars();

}  // namespace

char ConvertChar(char c) {
  return kConvertedChars[Byte(c)];
}

void ReverseAndMirror(std::string_view s, std::string& out) {
  out.resize(s.size());
  char* o = out.data();
  for (auto it = s.rbegin(); it != s.rend(); ++it) *o++ = kConvertedChars[Byte(*it)];
}

std::string ReverseAndMirror(std::string_view s) {
  std::string out;
  ReverseAndMirror(s, out);
  return out;
}

void ReorderHebrewFirst(std::string_view s, std::string& hebrew) {
  thread_local std::string restReversed;
  hebrew.clear();
  restReversed.clear();
  hebrew.reserve(s.size());
  restReversed.reserve(s.size());
  bool inHebrew = false;
  for (auto it = s.rbegin(); it != s.rend(); ++it) {
    const unsigned char b = Byte(*it);
    if (IsHostHebrew(b)) {
      hebrew.push_back(MapHebrew(b));
      inHebrew = true;
    } else if (IsLatinOrDigit(b)) {
      restReversed.push_back(*it);
      inHebrew = false;
    } else {
      switch (b) {
        case '"':
        case '\'':
        case '(':
        case ')':
        case '[':
        case ']':
        case '{':
        case '}':
          break;
        default:
          if (inHebrew) {
            hebrew.push_back(*it);
          } else {
            restReversed.push_back(*it);
          }
      }
    }
  }
  hebrew.append(restReversed.rbegin(), restReversed.rend());
}

std::string ReorderHebrewFirst(std::string_view s) {
  std::string out;
  ReorderHebrewFirst(s, out);
  return out;
}

void ConvertForDisplay(std::string_view s, bool asIs, std::string& out) {
  const std::string_view t = TrimSpaces(s);
  if (asIs) {
    ReverseAndMirror(t, out);
  } else {
    ReorderHebrewFirst(t, out);
  }
}

std::string ConvertForDisplay(std::string_view s, bool asIs) {
  std::string out;
  ConvertForDisplay(s, asIs, out);
  return out;
}

void ConvertForSort(std::string_view s, std::string& out) {
  TwoEnded& res = TwoEnded::Scratch();
  bool inHebrew = false;
  bool seenLatin = false;
  for (auto it = s.rbegin(); it != s.rend(); ++it) {
    char c = *it;
    if (c == '"') c = '\'';
    const unsigned char b = Byte(c);
    if (IsHostHebrew(b)) {
      res.Append(MapHebrew(b));
      inHebrew = true;
    } else if (IsLatinOrDigit(b)) {
      res.PutInFront(c);
      inHebrew = false;
      seenLatin = true;
    } else if (!inHebrew) {
      res.PutInFront(c);
    } else if (!seenLatin) {
      res.Append(c);
    }
  }
  res.TakeInto(out);
}

std::string ConvertForSort(std::string_view s) {
  std::string out;
  ConvertForSort(s, out);
  return out;
}

void ConvertSpaced(std::string_view s, std::string& out) {
  TwoEnded& res = TwoEnded::Scratch();
  bool inHebrew = false;
  bool seenLatin = false;
  for (auto it = s.rbegin(); it != s.rend(); ++it) {
    const char c = *it;
    const unsigned char b = Byte(c);
    if (IsHostHebrew(b)) {
      res.Append(MapHebrew(b));
      inHebrew = true;
    } else if (IsLatinOrDigit(b)) {
      if (!seenLatin) res.PutInFront(' ');
      res.PutInFront(c);
      inHebrew = false;
      seenLatin = true;
    } else if (!inHebrew) {
      res.PutInFront(c);
    } else if (!seenLatin) {
      res.Append(c);
    } else {
      res.Append(' ');
    }
  }
  res.TakeInto(out);
}

std::string ConvertSpaced(std::string_view s) {
  std::string out;
  ConvertSpaced(s, out);
  return out;
}

void ConvertWithBidi(std::string_view s, std::string& out) {
  const std::string_view t = TrimSpaces(s);
  if (t.empty()) {
    out.clear();
    return;
  }
  // Letters only: which brackets to mirror is decided by the reordering, which knows the
  // direction each one ends in.
  thread_local std::string letters;
  letters.assign(t);
  for (char& c : letters) {
    if (IsHostHebrew(Byte(c))) c = MapHebrew(Byte(c));
  }
  BidiReorder(letters, out);
}

std::string ConvertWithBidi(std::string_view s) {
  std::string out;
  ConvertWithBidi(s, out);
  return out;
}

void BidiReorder(std::string_view s, std::string& reordered) {
  // The field ends at its first zero byte; reordering past it would carry the padding
  // into the middle of the line.
  const std::string_view t = TrimSpaces(CutAtNull(s));
  if (!HasHebrewLetter(t)) {
    reordered.assign(t);
    return;
  }
  if (ReorderRightToLeftLine(t, reordered)) return;
  ReorderWithIcu(t, reordered);
  const std::string_view kept = TrimSpaces(CutAtNull(reordered));
  if (kept.size() != reordered.size()) {
    const size_t from = static_cast<size_t>(kept.data() - reordered.data());
    reordered.erase(from + kept.size()).erase(0, from);
  }
}

std::string BidiReorder(std::string_view s) {
  std::string out;
  BidiReorder(s, out);
  return out;
}

std::string_view CutAtNull(std::string_view s) {
  const size_t zero = s.find('\0');
  return zero == std::string_view::npos ? s : s.substr(0, zero);
}

std::string ToHostLetter(std::string_view s) {
  if (s.empty()) throw HostTextError("אין תו להמרה");
  const unsigned char b = Byte(s.front());
  if (b >= kWinAlef && b <= kWinTav) return std::string(1, static_cast<char>(b - kHostToWinLetter));
  return std::string(s);
}

void ExtractHebrewWords(std::string_view s, int16_t n, std::string& out) {
  out.clear();
  if (n <= 0) return;
  // Gathered from the reading start (the field's end) backwards, then turned round.
  bool seenHebrew = false;
  int counter = 0;
  for (auto it = s.rbegin(); it != s.rend(); ++it) {
    const char c = *it;
    const unsigned char b = Byte(c);
    if (c == ' ' || c == '-' || c == '.') {
      if (seenHebrew) {
        out.push_back(c);
        if (++counter == n) break;
      }
    } else if (IsHostHebrew(b)) {
      out.push_back(c);
      seenHebrew = true;
    } else if (IsAsciiLetter(b)) {
      break;
    }
  }
  // The last n characters of the result are the first n gathered.
  if (out.size() > static_cast<size_t>(n)) out.resize(static_cast<size_t>(n));
  std::reverse(out.begin(), out.end());
}

std::string ExtractHebrewWords(std::string_view s, int16_t n) {
  std::string out;
  ExtractHebrewWords(s, n, out);
  return out;
}

std::string AlignRight(const std::optional<std::string_view>& v, int16_t n) {
  if (n < 0) throw HostTextError("רוחב שלילי: " + std::to_string(n));
  if (!v) return std::string(static_cast<size_t>(n), ' ');
  if (v->size() > static_cast<size_t>(n)) {
    throw HostTextError("הערך " + Quoted(*v) + " ארוך מ-" + std::to_string(n) + " תווים");
  }
  std::string out(static_cast<size_t>(n) - v->size(), ' ');
  out += *v;
  return out;
}

}  // namespace zdr
