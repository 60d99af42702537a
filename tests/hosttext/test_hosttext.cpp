#include "hosttext/hosttext.h"

#include <gtest/gtest.h>

#include <cctype>
#include <random>
#include <string>

#include "hosttext/codepage.h"

namespace zdr {
namespace {

using namespace std::string_literals;

// Windows-1255 bytes of UTF-8 text.
std::string W(std::string_view utf8) {
  return Utf8ToWin1255(utf8);
}

// Host bytes of UTF-8 text: Hebrew letters moved to code page 862, the rest as it is.
// Written in the order given, which for host fields is display order.
std::string Host(std::string_view utf8) {
  std::string s = Utf8ToWin1255(utf8);
  for (char& c : s) {
    const auto b = static_cast<unsigned char>(c);
    if (b >= 0xE0 && b <= 0xFA) c = static_cast<char>(b - 0x60);
  }
  return s;
}

// Readable form of a Windows-1255 result, for comparing with UTF-8 literals.
std::string U8(std::string_view win1255) {
  return Win1255ToUtf8(win1255);
}

// Over all bytes: the eight mirror characters swap, the 27 host letters move up by 0x60,
// and nothing else changes (bytes past the letters are not letters).
TEST(ConvertChar, ChangesOnlyMirrorsAndHebrewLetters) {
  const std::string mirrors = "()<>[]{}";
  for (int b = 0; b <= 0xFF; ++b) {
    const char c = static_cast<char>(b);
    const size_t m = mirrors.find(c);
    const char expected = m != std::string::npos     ? mirrors[m ^ 1]
                          : (b >= 0x80 && b <= 0x9A) ? static_cast<char>(b + 0x60)
                                                     : c;
    EXPECT_EQ(ConvertChar(c), expected) << b;
  }
}

// The field conversions, each case a host field and the Windows-1255 bytes it gives.
struct ConversionCase {
  const char* what;
  std::string (*convert)(std::string_view);
  std::string field, result;
};

TEST(FieldConversions, GiveTheirBytes) {
  const auto reverse = [](std::string_view s) { return ReverseAndMirror(s); };
  const auto hebrewFirst = [](std::string_view s) { return ReorderHebrewFirst(s); };
  const auto sort = [](std::string_view s) { return ConvertForSort(s); };
  const auto spaced = [](std::string_view s) { return ConvertSpaced(s); };
  const auto Display = [](std::string_view s) { return ConvertForDisplay(s, false); };
  const auto DisplayAsIs = [](std::string_view s) { return ConvertForDisplay(s, true); };
  const ConversionCase cases[] = {
      // clang-format off
      {"reverse", reverse, "\x82\x81\x80", "\xE0\xE1\xE2"}, {"reverse", reverse, "(12)", "(21)"},
      {"reverse", reverse, Host("[ןהכ] <1"), W("1> [כהן]")}, {"reverse", reverse, "\x00\x9B\xFF\x80"s, "\xE0\xFF\x9B\x00"s},
      {"reverse", reverse, "", ""}, {"hebrew first", hebrewFirst, "12 \x82\x81\x80", "\xE0\xE1\xE2 12"},
      {"hebrew first", hebrewFirst, "(12)", "12"},
      // Quotes and brackets vanish wherever they stand; other punctuation follows its side.
      {"hebrew first", hebrewFirst, Host("מ\"עב ABC-1"), W("בעמ ABC-1")}, {"display", Display, "  12 \x82\x81\x80  ", "\xE0\xE1\xE2 12"},
      {"display", Display, "", ""}, {"display as is", DisplayAsIs, "  (12)  ", "(21)"},
      {"display as is", DisplayAsIs, "     ", ""}, {"sort", sort, "12 \x82\x81\x80", "12\xE0\xE1\xE2 "},
      {"sort", sort, "AB\"C", "AB'C"}, {"sort", sort, "03-1234567", "03-1234567"},
      {"sort", sort, "AB  ", "AB  "},  // not trimmed
      {"sort", sort, "\x9B\x80\x00"s, "\x00\xE0\x9B"s},
      // Read from the end the digits come first, so the "-" inside the Hebrew is dropped;
      // with the Hebrew first it keeps its "-" and the space after it.
      {"sort", sort, Host("בא-ג 12"), W(" 12גאב")}, {"sort", sort, Host("12 בא-ג"), W("12ג-אב ")},
      {"sort", sort, "", ""}, {"spaced", spaced, "12 \x82\x81\x80", "12 \xE0\xE1\xE2 "},
      {"spaced", spaced, "03-1234567", "03-1234567 "}, {"spaced", spaced, "AB\"C", "AB\"C "},
      {"spaced", spaced, "   ", "   "}, {"spaced", spaced, Host("בא-ג 12"), W(" 12 ג אב")},
      {"spaced", spaced, "", ""},
      // clang-format on
  };
  for (const ConversionCase& c : cases) {
    EXPECT_EQ(c.convert(c.field), c.result) << c.what << ": " << U8(c.field);
  }
}

TEST(ParseHostDate, ReadsCarriesAndRounds) {
  struct Case {
    const char* text;
    int y, m, d;
  };
  const Case cases[] = {
      {"5/3/07", 2007, 3, 5},   {"31/12/85", 1985, 12, 31}, {"1/1/2010", 2010, 1, 1},
      {"15/6/79", 2079, 6, 15}, {"15/06/80", 1980, 6, 15},  {"01/02/00", 2000, 2, 1},
      {"1/1/100", 100, 1, 1},   {" 5/ 3/ 07 ", 2007, 3, 5}, {"30/2/05", 2005, 3, 2},
      {"29/2/04", 2004, 2, 29}, {"0/3/05", 2005, 2, 28},    {"1/13/05", 2006, 1, 1},
      {"32/12/99", 2000, 1, 1}, {"1/0/05", 2004, 12, 1},    {"5/3.5/07", 2007, 4, 5},
      {"5/2.5/07", 2007, 2, 5}, {"5/3/06.6", 2007, 3, 5},   {"1/1/9999", 9999, 1, 1},
  };
  for (const Case& c : cases) {
    int y, m, d;
    ParseHostDate(c.text).ToParts(y, m, d);
    EXPECT_EQ(std::vector<int>({y, m, d}), std::vector<int>({c.y, c.m, c.d})) << c.text;
  }
  // "123/4/05" has no month between the slashes; the last two do not fit 16 bits.
  for (const char* bad : {"", "abc", "5/3", "5-3-07", "x/3/07", "5/3/07x", "5//07", "/3/07", "5/3/",
                          "123/4/05", "1/1/32768", "1/70000/05", "3x/1/05"}) {
    try {
      ParseHostDate(bad);
      ADD_FAILURE() << "no error for " << bad;
    } catch (const HostTextError& e) {
      EXPECT_NE(std::string(e.what()).find(bad), std::string::npos) << e.what();
    }
  }
  EXPECT_THROW(ParseHostDate("5/3/\x80\x81"), HostTextError);
  // Serial day numbers count from 30 December 1899; 1900 was no leap year.
  EXPECT_EQ(ParseHostDate("30/12/1899").serial, 0);
  EXPECT_EQ(ParseHostDate("1/1/2000").serial, 36526);
  EXPECT_EQ(ParseHostDate("29/2/1900").serial, ParseHostDate("1/3/1900").serial);
}

TEST(HostIntValue, ReadsRoundsHalvesToEvenOrThrows) {
  const std::pair<const char*, int64_t> cases[] = {
      {"  12  ", 12}, {"+7", 7},    {"-3", -3},   {"007", 7},   {"5.", 5},
      {".4", 0},      {"2.5", 2},   {"3.5", 4},   {"0.5", 0},   {"2.51", 3},
      {"2.500", 2},   {"-2.5", -2}, {"-3.5", -4}, {"-2.6", -3}, {"9223372036854775807", INT64_MAX},
  };
  for (const auto& [text, value] : cases) EXPECT_EQ(HostIntValue(text), value) << text;
  for (const char* bad : {"", "   ", "abc", "1a", "1 2", "--1", "+-1", "1.2.3", ".", "-", "1e3",
                          "\x80", "9223372036854775808"}) {
    EXPECT_THROW(HostIntValue(bad), HostTextError) << bad;
  }
}

// Display order (Windows-1255) to reading order (UTF-8).
TEST(BidiReorder, DisplayOrderToReadingOrder) {
  const std::pair<std::string, const char*> cases[] = {
      // clang-format off
      {W("ןהכ השמ"), "משה כהן"}, {W("   ןהכ השמ   "), "משה כהן"},
      {W("ABC Ltd ןהכ"), "כהן ABC Ltd"}, {W("(ןהכ) השמ"), "משה (כהן)"},
      {W("מ\"עב ןהכ"), "כהן בע\"מ"}, {W("151 םיאנומשחה"), "החשמונאים 151"},
      {W("ופי-ביבא לת"), "תל אביב-יפו"}, {W("מ\"עב (2004) ןמדירפ"), "פרידמן (2004) בע\"מ"},
      // Separators join digits only singly and between two digits; terminators join.
      {W("03-1234567 ןופלט"), "טלפון 03-1234567"}, {W("1.5% החנה"), "הנחה 1.5%"},
      {W("1..2 א"), "א 2..1"}, {W("- השמ -"), "- משה -"},
      {"  ABC Ltd  ", "ABC Ltd"}, {"    ", ""},
      {"AB\0C"s, "AB"},
      // Regression: a field padded with zero bytes lost the whole name when the zeros were
      // reordered to the front and the line was cut at the first.
      {W("ןהכ השמ") + std::string(5, '\0'), "משה כהן"}, {W("ןהכ השמ  ") + std::string(3, '\0'), "משה כהן"},
      // clang-format on
  };
  for (const auto& [shown, reads] : cases) EXPECT_EQ(U8(BidiReorder(shown)), reads) << U8(shown);
  // Bytes the code page leaves undefined come back as they went in.
  EXPECT_EQ(BidiReorder("A\x81\x9F\xFF Z"), "A\x81\x9F\xFF Z");
  EXPECT_EQ(BidiReorder(W("ןהכ") + "\xDB").size(), 4u);
}

// Regression: the reordered line was cut at 2000 bytes.
TEST(BidiReorder, LongLineIsNotCutAt2000Bytes) {
  std::string line, expected;
  for (int i = 0; i < 600; ++i) {
    line += W("ןהכ ");  // display order: word, then the space to its left
    expected += "כהן ";
  }
  expected.pop_back();
  EXPECT_EQ(U8(BidiReorder(line)), expected);
}

// What BidiReorder must give: ICU's reordering of the cut and trimmed line, cut and trimmed.
std::string ReorderedByIcu(std::string_view s) {
  return std::string(TrimSpaces(CutAtNull(detail::BidiReorderWithIcu(TrimSpaces(CutAtNull(s))))));
}

// Lines drawn from the alphabet of the right-to-left rule (Hebrew letters, digits, spaces,
// ASCII punctuation) and from just outside it, each with a Hebrew letter: the rule must give
// ICU's result on each, and a byte outside it must send the line to ICU.
TEST(BidiReorder, RightToLeftRuleAgreesWithIcu) {
  const std::string hebrew = W("אבגדהוזחטיךכלםמןנסעףפץצקרשת");
  std::string inside = hebrew + "0123456789      ";
  for (int b = 0x21; b <= 0x7E; ++b) {
    if (!std::isalnum(b)) inside += static_cast<char>(b);
  }
  std::string outside =
      "AZaz\x7F\x01\t\n\r\x1C\x1F\x80\x81\x83\xA0\xA4\xC0\xC4\xCE\xD3\xD4\xD7"
      "\xDF\xFB\xFC\xFD\xFE\xFF";
  // Numbers and their joiners packed close, so that separators and terminators meet digits.
  const std::string numeric = "0123456789+-,./:#$% ";
  std::mt19937 rng(862);
  auto below = [&](size_t n) { return std::uniform_int_distribution<size_t>(0, n - 1)(rng); };
  std::string s;
  for (int round = 0; round < 1500000; ++round) {
    s.clear();
    const size_t n = below(round % 10 == 0 ? 60 : 16) + 1;
    const int kind = round % 4;
    for (size_t i = 0; i < n; ++i) {
      s += kind == 1 && below(2) == 0 ? numeric[below(numeric.size())]
                                      : inside[below(inside.size())];
    }
    if (kind == 2) {
      // One byte from outside, anywhere, the edges included.
      const size_t at = below(3) == 0 ? (below(2) == 0 ? 0 : s.size()) : below(s.size() + 1);
      s.insert(at, 1, outside[below(outside.size())]);
    } else if (kind == 3) {
      // Punctuation and digits at the edges.
      s.insert(0, 1, numeric[below(numeric.size())]);
      s += numeric[below(numeric.size())];
    }
    if (s.find_first_of(hebrew) == std::string::npos) s.insert(below(s.size() + 1), 1, hebrew[0]);
    ASSERT_EQ(BidiReorder(s), ReorderedByIcu(s)) << "input: " << U8(s);
  }
}

// Regressions: a line without a Hebrew letter was read right to left ("Studio 54" came back
// "54 Studio"), and every bracket was mirrored, also those Latin text shows as typed ("Osem
// (Israel) Ltd" came back "Osem )Israel( Ltd"). Those of Hebrew text still turn.
TEST(ConvertWithBidi, LatinLineWasReadRightToLeftAndItsBracketsMirrored) {
  const std::pair<const char*, const char*> cases[] = {
      // clang-format off
      {"Studio 54", "Studio 54"}, {"PO Box 123", "PO Box 123"},
      {"Room 5, Floor 2", "Room 5, Floor 2"}, {"Ref 12/07", "Ref 12/07"},
      {"03-1234567, 050-7654321", "03-1234567, 050-7654321"}, {"Osem (Israel) Ltd", "Osem (Israel) Ltd"},
      {"[Tadiran] <1995>", "[Tadiran] <1995>"}, {"IBM (Israel) תרבח", "חברת IBM (Israel)"},
      {"מ\"עב Osem (Israel)", "Osem (Israel) בע\"מ"}, {"(ןהכ) השמ      ", "משה (כהן)"},
      {"Intel (ןהכ) השמ", "משה (כהן) Intel"}, {"15 לדגמה 'חר", "רח' המגדל 15"},
      {"                    ", ""},
      // clang-format on
  };
  for (const auto& [shown, reads] : cases) {
    EXPECT_EQ(U8(ConvertWithBidi(Host("  "s + shown + " "))), reads) << shown;
  }
}

// The buffer-taking forms, fed a buffer that still holds a longer earlier result, must give
// the returning forms' bytes: leftovers of the previous record would corrupt the next one.
TEST(ReusedBuffers, GiveTheSameBytesAsTheReturningForms) {
  std::mt19937 rng(862);
  const std::string bytes = Host("אבגדהוזחטיכלמנסעפצקרשת") + "AbZz0189 \"'()[]{}<>-./,\0\x9b\xff"s;
  std::string out[9];
  for (int i = 0; i < 20000; ++i) {
    std::string field;
    for (size_t n = rng() % 32; n > 0; --n) field += bytes[rng() % bytes.size()];
    if (rng() % 8 == 0) field = std::string(rng() % 5, ' ') + field + std::string(rng() % 5, ' ');
    const int16_t words = static_cast<int16_t>(rng() % 24) - 2;
    ReverseAndMirror(field, out[0]);
    ReorderHebrewFirst(field, out[1]);
    ConvertForDisplay(field, true, out[2]);
    ConvertForDisplay(field, false, out[3]);
    ConvertForSort(field, out[4]);
    ConvertSpaced(field, out[5]);
    ConvertWithBidi(field, out[6]);
    BidiReorder(ReverseAndMirror(field), out[7]);
    ExtractHebrewWords(field, words, out[8]);
    const std::string fresh[9] = {
        ReverseAndMirror(field),         ReorderHebrewFirst(field),
        ConvertForDisplay(field, true),  ConvertForDisplay(field, false),
        ConvertForSort(field),           ConvertSpaced(field),
        ConvertWithBidi(field),          BidiReorder(ReverseAndMirror(field)),
        ExtractHebrewWords(field, words)};
    for (int k = 0; k < 9; ++k) ASSERT_EQ(out[k], fresh[k]) << "form " << k << ": " << U8(field);
  }
  std::string buffer = "earlier result";
  ConvertWithBidi("     ", buffer);
  EXPECT_EQ(buffer, "");
}

TEST(SmallHelpers, CutTrimHostLetterAndAlignRight) {
  EXPECT_EQ(CutAtNull("AB\0C"s), "AB");
  EXPECT_EQ(CutAtNull("\0AB"s), "");
  EXPECT_EQ(CutAtNull("ABC"), "ABC");
  EXPECT_EQ(TrimSpaces("  a b  "), "a b");
  EXPECT_EQ(TrimSpaces("\ta\t"), "\ta\t");
  EXPECT_EQ(TrimSpaces("    "), "");
  const std::pair<const char*, const char*> letters[] = {
      {"\xE0", "\x80"}, {"\xFA", "\x9A"}, {"\xE1\xE2", "\x81"}, {"*", "*"},
      {"AB", "AB"},     {" ", " "},       {"\xDF", "\xDF"},     {"\xFB", "\xFB"},
  };
  for (const auto& [text, host] : letters) EXPECT_EQ(ToHostLetter(text), host) << text;
  EXPECT_THROW(ToHostLetter(""), HostTextError);
  EXPECT_EQ(AlignRight(std::string_view("5"), 3), "  5");
  EXPECT_EQ(AlignRight(std::nullopt, 3), "   ");
  EXPECT_EQ(AlignRight(std::string_view("123"), 3), "123");
  EXPECT_THROW(AlignRight(std::string_view("1234"), 3), HostTextError);
  EXPECT_THROW(AlignRight(std::nullopt, -1), HostTextError);
}

TEST(ExtractHebrewWords, KeepsHebrewWordsAtTheReadingStart) {
  struct Case {
    std::string field;
    int16_t n;
    std::string words;
  };
  const Case cases[] = {
      // clang-format off
      {Host("ןהכ השמ"), 20, Host("ןהכ השמ")},
      // Digits inside words vanish; so does punctuation other than space, "-" and ".".
      {Host("ה2ש1מ"), 20, Host("השמ")}, {Host("ןה,כ-ה\"שמ"), 20, Host("ןהכ-השמ")},
      // Padding after the field's reading start is skipped; padding at its end is kept.
      {Host("השמ   "), 20, Host("השמ")}, {Host("   השמ"), 20, Host("   השמ")},
      // It stops at an ASCII letter.
      {Host("השמ X"), 20, ""}, {Host("X השמ"), 20, Host(" השמ")},
      {Host("ד ג ב א"), 3, Host("ב א")},
      // Seven words fit the word limit, but only the last 20 bytes of them are kept.
      {Host("זזזזז ווווו ההההה דדדדד גגגגג בבבבב אאאאא"), 20, Host("דד גגגגג בבבבב אאאאא")},
      {"      ", 20, ""}, {Host("השמ"), 0, ""},
      {Host("השמ"), -1, ""},
      // clang-format on
  };
  for (const Case& c : cases) {
    EXPECT_EQ(ExtractHebrewWords(c.field, c.n), c.words) << U8(c.field) << " n=" << c.n;
  }
}

}  // namespace
}  // namespace zdr
