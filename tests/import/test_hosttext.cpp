#include "import/hosttext.h"

#include <gtest/gtest.h>

#include <cctype>
#include <random>
#include <string>
#include <thread>

#include "import/codepage.h"

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

void ExpectDate(Date d, int year, int month, int day) {
  int y, m, dd;
  d.ToParts(y, m, dd);
  EXPECT_EQ(y, year);
  EXPECT_EQ(m, month);
  EXPECT_EQ(dd, day);
}

// ---- Character-level conversions -------------------------------------------------------

TEST(ConvertChar, MirrorsPairsAndMapsHebrew) {
  EXPECT_EQ(ConvertChar('('), ')');
  EXPECT_EQ(ConvertChar(')'), '(');
  EXPECT_EQ(ConvertChar('<'), '>');
  EXPECT_EQ(ConvertChar('>'), '<');
  EXPECT_EQ(ConvertChar('['), ']');
  EXPECT_EQ(ConvertChar('}'), '{');
  EXPECT_EQ(ConvertChar('='), '=');
  EXPECT_EQ(ConvertChar('\x80'), '\xE0');
  EXPECT_EQ(ConvertChar('\x9A'), '\xFA');
  EXPECT_EQ(ConvertChar('\x9B'), '\x9B');
}

// Over all bytes: the eight mirror characters swap, the 27 host letters move up by 0x60,
// and nothing else changes.
TEST(ConvertChar, ChangesOnlyMirrorsAndHebrewLetters) {
  const std::string mirrors = "()<>[]{}";
  for (int b = 0; b <= 0xFF; ++b) {
    const char c = static_cast<char>(b);
    const size_t m = mirrors.find(c);
    if (m != std::string::npos) {
      EXPECT_EQ(ConvertChar(c), mirrors[m ^ 1]) << b;
    } else if (b >= 0x80 && b <= 0x9A) {
      EXPECT_EQ(ConvertChar(c), static_cast<char>(b + 0x60)) << b;
    } else {
      EXPECT_EQ(ConvertChar(c), c) << b;
    }
  }
}

TEST(ConvertChar, BytesOutsideTheHebrewLettersPassThrough) {
  for (int b = 0x9B; b <= 0xFF; ++b) {
    EXPECT_EQ(ConvertChar(static_cast<char>(b)), static_cast<char>(b)) << b;
  }
  EXPECT_EQ(ConvertChar('\0'), '\0');
  EXPECT_EQ(ConvertChar('A'), 'A');
}

TEST(ReverseAndMirror, ReversesMapsAndMirrors) {
  EXPECT_EQ(ReverseAndMirror("\x82\x81\x80"), "\xE0\xE1\xE2");
  EXPECT_EQ(ReverseAndMirror("(12)"), "(21)");
  EXPECT_EQ(ReverseAndMirror(""), "");
  EXPECT_EQ(U8(ReverseAndMirror(Host("[ןהכ] <1"))), "1> [כהן]");
}

TEST(ReverseAndMirror, ZeroAndHighBytesPassThrough) {
  EXPECT_EQ(ReverseAndMirror(std::string("\x00\x9B\xFF\x80", 4)),
            std::string("\xE0\xFF\x9B\x00", 4));
  // Bytes past the Hebrew letters count as Other in the sort key and are not mapped.
  EXPECT_EQ(ConvertForSort(std::string("\x9B\x80\x00", 3)), std::string("\x00\xE0\x9B", 3));
}

TEST(ReorderHebrewFirst, HebrewThenRest) {
  EXPECT_EQ(ReorderHebrewFirst("12 \x82\x81\x80"), "\xE0\xE1\xE2 12");
  EXPECT_EQ(ReorderHebrewFirst("(12)"), "12");
  EXPECT_EQ(ReorderHebrewFirst(""), "");
  // Quotes and brackets vanish wherever they stand; other punctuation follows its side.
  EXPECT_EQ(U8(ReorderHebrewFirst(Host("מ\"עב ABC-1"))), "בעמ ABC-1");
}

TEST(ConvertForDisplay, TrimsThenPicksTheConversion) {
  EXPECT_EQ(ConvertForDisplay("  12 \x82\x81\x80  ", false), "\xE0\xE1\xE2 12");
  EXPECT_EQ(ConvertForDisplay("  (12)  ", true), "(21)");
  EXPECT_EQ(ConvertForDisplay("     ", true), "");
  EXPECT_EQ(ConvertForDisplay("", false), "");
}

TEST(ConvertForSort, EdgeCases) {
  EXPECT_EQ(ConvertForSort("12 \x82\x81\x80"), "12\xE0\xE1\xE2 ");
  EXPECT_EQ(ConvertForSort("AB\"C"), "AB'C");
  EXPECT_EQ(ConvertForSort("03-1234567"), "03-1234567");
  EXPECT_EQ(ConvertForSort(""), "");
  // Not trimmed: padding after plain Latin text stays where it was.
  EXPECT_EQ(ConvertForSort("AB  "), "AB  ");
}

TEST(ConvertForSort, PunctuationInHebrewAfterLatinIsDropped) {
  // Read from the end, the digits come first, so the "-" inside the Hebrew is dropped.
  EXPECT_EQ(U8(ConvertForSort(Host("בא-ג 12"))), " 12גאב");
  // Here the Hebrew comes first and keeps its "-" and the space after it.
  EXPECT_EQ(U8(ConvertForSort(Host("12 בא-ג"))), "12ג-אב ");
}

TEST(ConvertSpaced, EdgeCases) {
  EXPECT_EQ(ConvertSpaced("12 \x82\x81\x80"), "12 \xE0\xE1\xE2 ");
  EXPECT_EQ(ConvertSpaced("03-1234567"), "03-1234567 ");
  EXPECT_EQ(ConvertSpaced("AB\"C"), "AB\"C ");
  EXPECT_EQ(ConvertSpaced(""), "");
  EXPECT_EQ(ConvertSpaced("   "), "   ");
  // Punctuation inside Hebrew after Latin was met becomes a space.
  EXPECT_EQ(U8(ConvertSpaced(Host("בא-ג 12"))), " 12 ג אב");
}

// ---- Dates ----------------------------------------------------------------------------

TEST(ParseHostDate, CommonForms) {
  ExpectDate(ParseHostDate("5/3/07"), 2007, 3, 5);
  ExpectDate(ParseHostDate("31/12/85"), 1985, 12, 31);
  ExpectDate(ParseHostDate("1/1/2010"), 2010, 1, 1);
  ExpectDate(ParseHostDate("15/6/79"), 2079, 6, 15);
  ExpectDate(ParseHostDate("15/06/80"), 1980, 6, 15);
  ExpectDate(ParseHostDate("1/12/99"), 1999, 12, 1);
  ExpectDate(ParseHostDate("01/02/00"), 2000, 2, 1);
  ExpectDate(ParseHostDate("1/1/100"), 100, 1, 1);
  ExpectDate(ParseHostDate(" 5/ 3/ 07 "), 2007, 3, 5);
}

TEST(ParseHostDate, OutOfRangePartsCarryOver) {
  ExpectDate(ParseHostDate("30/2/05"), 2005, 3, 2);
  ExpectDate(ParseHostDate("29/2/04"), 2004, 2, 29);
  ExpectDate(ParseHostDate("0/3/05"), 2005, 2, 28);
  ExpectDate(ParseHostDate("1/13/05"), 2006, 1, 1);
  ExpectDate(ParseHostDate("32/12/99"), 2000, 1, 1);
  ExpectDate(ParseHostDate("1/0/05"), 2004, 12, 1);
}

TEST(ParseHostDate, FractionalPartsAreRounded) {
  ExpectDate(ParseHostDate("5/3.5/07"), 2007, 4, 5);
  ExpectDate(ParseHostDate("5/2.5/07"), 2007, 2, 5);
  ExpectDate(ParseHostDate("5/3/06.6"), 2007, 3, 5);
}

// "123/4/05" has no month between the slashes; the last two do not fit 16 bits.
TEST(ParseHostDate, BadTextThrows) {
  for (const char* bad : {"", "abc", "5/3", "5-3-07", "x/3/07", "5/3/07x", "5//07", "/3/07", "5/3/",
                          "123/4/05", "5/3/\x80\x81", "1/1/32768", "1/70000/05"}) {
    EXPECT_THROW(ParseHostDate(bad), HostTextError) << bad;
  }
  ExpectDate(ParseHostDate("1/1/9999"), 9999, 1, 1);
}

TEST(ParseHostDate, ErrorMessageNamesTheText) {
  try {
    ParseHostDate("3x/1/05");
    FAIL() << "no error";
  } catch (const HostTextError& e) {
    EXPECT_NE(std::string(e.what()).find("3x/1/05"), std::string::npos);
  }
}

TEST(HostDateFromBytes, YearCountsFrom1900) {
  ExpectDate(HostDateFromBytes(105, 3, 5), 2005, 3, 5);
  ExpectDate(HostDateFromBytes(99, 2, 30), 1999, 3, 2);
}

TEST(DateFromParts, CarriesDaysAndMonths) {
  ExpectDate(Date::FromParts(2005, 2, 30), 2005, 3, 2);
  ExpectDate(Date::FromParts(2005, 3, 0), 2005, 2, 28);
  ExpectDate(Date::FromParts(2004, 3, 0), 2004, 2, 29);
  ExpectDate(Date::FromParts(2005, 3, -1), 2005, 2, 27);
  ExpectDate(Date::FromParts(2004, 13, 1), 2005, 1, 1);
  ExpectDate(Date::FromParts(2004, 25, 1), 2006, 1, 1);
  ExpectDate(Date::FromParts(2005, 0, 1), 2004, 12, 1);
  ExpectDate(Date::FromParts(2005, -1, 1), 2004, 11, 1);
  ExpectDate(Date::FromParts(2005, -12, 1), 2003, 12, 1);
  ExpectDate(Date::FromParts(2005, 1, 366), 2006, 1, 1);
  ExpectDate(Date::FromParts(2000, 2, 29), 2000, 2, 29);
  ExpectDate(Date::FromParts(1900, 2, 29), 1900, 3, 1);
}

TEST(DateFromParts, SerialCountsFrom30December1899) {
  EXPECT_EQ(Date::FromParts(1899, 12, 30).serial, 0);
  EXPECT_EQ(Date::FromParts(1900, 1, 1).serial, 2);
  EXPECT_EQ(Date::FromParts(2000, 1, 1).serial, 36526);
  EXPECT_EQ(Date::FromParts(1899, 12, 29).serial, -1);
  EXPECT_EQ(FormatDate(Date::FromParts(2005, 3, 2)), "02/03/2005");
}

// ---- Numbers --------------------------------------------------------------------------

TEST(HostIntValue, ReadsNumbers) {
  EXPECT_EQ(HostIntValue("12"), 12);
  EXPECT_EQ(HostIntValue("  12  "), 12);
  EXPECT_EQ(HostIntValue("+7"), 7);
  EXPECT_EQ(HostIntValue("-3"), -3);
  EXPECT_EQ(HostIntValue("007"), 7);
  EXPECT_EQ(HostIntValue("5."), 5);
  EXPECT_EQ(HostIntValue(".4"), 0);
  EXPECT_EQ(HostIntValue("9223372036854775807"), INT64_MAX);
}

TEST(HostIntValue, RoundsHalvesToEven) {
  EXPECT_EQ(HostIntValue("2.5"), 2);
  EXPECT_EQ(HostIntValue("3.5"), 4);
  EXPECT_EQ(HostIntValue("0.5"), 0);
  EXPECT_EQ(HostIntValue("2.51"), 3);
  EXPECT_EQ(HostIntValue("2.500"), 2);
  EXPECT_EQ(HostIntValue("2.49"), 2);
  EXPECT_EQ(HostIntValue("-2.5"), -2);
  EXPECT_EQ(HostIntValue("-3.5"), -4);
  EXPECT_EQ(HostIntValue("-2.6"), -3);
}

TEST(HostIntValue, NonNumbersThrow) {
  for (const char* bad : {"", "   ", "abc", "1a", "1 2", "--1", "+-1", "1.2.3", ".", "-", "1e3",
                          "\x80", "9223372036854775808", "99999999999999999999"}) {
    EXPECT_THROW(HostIntValue(bad), HostTextError) << bad;
  }
}

// ---- Bidi -----------------------------------------------------------------------------

TEST(BidiReorder, DisplayOrderToReadingOrder) {
  EXPECT_EQ(U8(BidiReorder(W("ןהכ השמ"))), "משה כהן");
  EXPECT_EQ(U8(BidiReorder(W("0501234567 ןופלט"))), "טלפון 0501234567");
  EXPECT_EQ(U8(BidiReorder(W("ABC Ltd ןהכ"))), "כהן ABC Ltd");
  EXPECT_EQ(U8(BidiReorder(W("(ןהכ) השמ"))), "משה (כהן)");
  EXPECT_EQ(U8(BidiReorder(W("מ\"עב ןהכ"))), "כהן בע\"מ");
}

TEST(BidiReorder, TrimsAndHandlesEmptyText) {
  EXPECT_EQ(BidiReorder(""), "");
  EXPECT_EQ(BidiReorder("    "), "");
  EXPECT_EQ(U8(BidiReorder(W("   ןהכ השמ   "))), "משה כהן");
  EXPECT_EQ(BidiReorder("  ABC Ltd  "), "ABC Ltd");
  EXPECT_EQ(BidiReorder("0501234567"), "0501234567");
}

TEST(BidiReorder, CutsAtTheFirstZeroByte) {
  EXPECT_EQ(BidiReorder(std::string("AB\0C", 4)), "AB");
}

// Regression: a field padded with zero bytes instead of spaces lost the whole name when the
// zero bytes were reordered to the front of the line and the result was cut at the first.
TEST(BidiReorder, ZeroPaddingDoesNotLoseTheName) {
  const std::string padded = W("ןהכ השמ") + std::string(5, '\0');
  EXPECT_EQ(U8(BidiReorder(padded)), "משה כהן");
  const std::string spacedThenZero = W("ןהכ השמ  ") + std::string(3, '\0');
  EXPECT_EQ(U8(BidiReorder(spacedThenZero)), "משה כהן");
}

// Regression: the reordered line was cut at 2000 bytes.
TEST(BidiReorder, LongLineIsNotCutAt2000Bytes) {
  std::string line;
  std::string expected;
  for (int i = 0; i < 600; ++i) {
    line += W("ןהכ ");  // display order: word, then the space to its left
    expected += "כהן ";
  }
  ASSERT_GT(line.size(), 2000u);
  const std::string out = U8(BidiReorder(line));
  expected.pop_back();
  EXPECT_EQ(out, expected);
}

TEST(BidiReorder, UndefinedAndHighBytesSurvive) {
  // Bytes the code page leaves undefined come back as they went in.
  EXPECT_EQ(BidiReorder("A\x81\x9F\xFF Z"), "A\x81\x9F\xFF Z");
  const std::string hebrewWithUndefined = W("ןהכ") + "\xDB";
  EXPECT_EQ(BidiReorder(hebrewWithUndefined).size(), hebrewWithUndefined.size());
}

// What BidiReorder must give: ICU's reordering of the cut and trimmed line, cut and trimmed.
std::string ReorderedByIcu(std::string_view s) {
  return std::string(TrimSpaces(CutAtNull(detail::BidiReorderWithIcu(TrimSpaces(CutAtNull(s))))));
}

TEST(BidiReorder, RightToLeftLinesReadBackwardsWithNumbersKept) {
  EXPECT_EQ(U8(BidiReorder(W("151 םיאנומשחה"))), "החשמונאים 151");
  EXPECT_EQ(U8(BidiReorder(W("ופי-ביבא לת"))), "תל אביב-יפו");
  EXPECT_EQ(U8(BidiReorder(W("מ\"עב (2004) ןמדירפ"))), "פרידמן (2004) בע\"מ");
  // Separators join digits only singly and between two digits; terminators touching a number
  // join it.
  EXPECT_EQ(U8(BidiReorder(W("03-1234567 ןופלט"))), "טלפון 03-1234567");
  EXPECT_EQ(U8(BidiReorder(W("1.5% החנה"))), "הנחה 1.5%");
  EXPECT_EQ(U8(BidiReorder(W("1..2 א"))), "א 2..1");
  EXPECT_EQ(U8(BidiReorder(W("- השמ -"))), "- משה -");
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
      if (kind == 1 && below(2) == 0) {
        s += numeric[below(numeric.size())];
      } else {
        s += inside[below(inside.size())];
      }
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

TEST(BidiReorder, EachThreadHasItsOwnState) {
  std::string a, b;
  std::thread t1([&] {
    for (int i = 0; i < 500; ++i) a = BidiReorder(W("ןהכ השמ"));
  });
  std::thread t2([&] {
    for (int i = 0; i < 500; ++i) b = BidiReorder(W("0501234567 ןופלט"));
  });
  t1.join();
  t2.join();
  EXPECT_EQ(U8(a), "משה כהן");
  EXPECT_EQ(U8(b), "טלפון 0501234567");
}

TEST(ConvertWithBidi, HostFieldToReadingOrder) {
  // The host screen shows the closing parenthesis of right-to-left text as "(".
  EXPECT_EQ(U8(ConvertWithBidi(Host("(ןהכ) השמ      "))), "משה (כהן)");
  EXPECT_EQ(U8(ConvertWithBidi(Host("  ABC Ltd ןהכ"))), "כהן ABC Ltd");
  EXPECT_EQ(U8(ConvertWithBidi(Host("15 לדגמה 'חר"))), "רח' המגדל 15");
}

// Regression: a line without a Hebrew letter was read as right-to-left text, so a number
// after a word moved to the front ("Studio 54" came back "54 Studio").
TEST(ConvertWithBidi, LatinLineWasReadRightToLeft) {
  for (const char* shown : {"Studio 54", "PO Box 123", "Room 5, Floor 2", "12 34", "A4, 500",
                            "Ref 12/07", "03-1234567, 050-7654321"}) {
    EXPECT_EQ(ConvertWithBidi(Host("  "s + shown + "   ")), shown);
  }
}

// Regression: every bracket was mirrored, also those that Latin text shows as typed
// ("Osem (Israel) Ltd" came back "Osem )Israel( Ltd"). Those of Hebrew text still turn.
TEST(ConvertWithBidi, BracketsOfLatinTextWereMirrored) {
  struct Case {
    const char *shown, *reads;
  };
  const Case cases[] = {
      {"Osem (Israel) Ltd", "Osem (Israel) Ltd"},     {"IBM (Israel)", "IBM (Israel)"},
      {"[Tadiran] <1995>", "[Tadiran] <1995>"},       {"IBM (Israel) תרבח", "חברת IBM (Israel)"},
      {"מ\"עב Osem (Israel)", "Osem (Israel) בע\"מ"}, {"(ןהכ) השמ", "משה (כהן)"},
      {"מ\"עב (2004) ןמדירפ", "פרידמן (2004) בע\"מ"}, {"Intel (ןהכ) השמ", "משה (כהן) Intel"},
  };
  for (const Case& c : cases) EXPECT_EQ(U8(ConvertWithBidi(Host(c.shown))), c.reads) << c.shown;
}

TEST(ConvertWithBidi, FieldOfSpacesGivesEmptyText) {
  EXPECT_EQ(ConvertWithBidi("                    "), "");
  EXPECT_EQ(ConvertWithBidi(""), "");
}

// ---- Small helpers --------------------------------------------------------------------

// The buffer-taking forms, fed a buffer that still holds a longer earlier result, must give
// the returning forms' bytes: leftovers of the previous record would corrupt the next one.
TEST(ReusedBuffers, GiveTheSameBytesAsTheReturningForms) {
  std::mt19937 rng(862);
  // Host fields: Hebrew letters, Latin, digits, spaces, quotes, brackets, punctuation, zeros,
  // bytes above the letters.
  const std::string bytes = Host("אבגדהוזחטיכלמנסעפצקרשת") + "AbZz0189 \"'()[]{}<>-./,\0\x9b\xff"s;
  std::string reverse, reorder, displayAsIs, display, sort, spaced, bidi, reorderBidi;
  for (int i = 0; i < 20000; ++i) {
    std::string field;
    for (size_t n = rng() % 32; n > 0; --n) field += bytes[rng() % bytes.size()];
    if (rng() % 8 == 0) field = std::string(rng() % 5, ' ') + field + std::string(rng() % 5, ' ');
    ReverseAndMirror(field, reverse);
    ASSERT_EQ(reverse, ReverseAndMirror(field));
    ReorderHebrewFirst(field, reorder);
    ASSERT_EQ(reorder, ReorderHebrewFirst(field));
    ConvertForDisplay(field, true, displayAsIs);
    ASSERT_EQ(displayAsIs, ConvertForDisplay(field, true));
    ConvertForDisplay(field, false, display);
    ASSERT_EQ(display, ConvertForDisplay(field, false));
    ConvertForSort(field, sort);
    ASSERT_EQ(sort, ConvertForSort(field));
    ConvertSpaced(field, spaced);
    ASSERT_EQ(spaced, ConvertSpaced(field));
    ConvertWithBidi(field, bidi);
    ASSERT_EQ(bidi, ConvertWithBidi(field));
    BidiReorder(ReverseAndMirror(field), reorderBidi);
    ASSERT_EQ(reorderBidi, BidiReorder(ReverseAndMirror(field)));
  }
}

TEST(ReusedBuffers, AFieldOfSpacesEmptiesTheBuffer) {
  std::string out = "earlier result";
  ConvertWithBidi("     ", out);
  EXPECT_EQ(out, "");
  out = "earlier result";
  ConvertForDisplay("   ", true, out);
  EXPECT_EQ(out, "");
  out = "earlier result";
  BidiReorder(std::string("\0abc", 4), out);
  EXPECT_EQ(out, "");
}

TEST(CutAtNull, TextBeforeTheFirstZero) {
  EXPECT_EQ(CutAtNull(std::string_view("AB\0C", 4)), "AB");
  EXPECT_EQ(CutAtNull(std::string_view("\0AB", 3)), "");
  EXPECT_EQ(CutAtNull("ABC"), "ABC");
  EXPECT_EQ(CutAtNull(""), "");
}

TEST(TrimSpaces, OnlySpaces) {
  EXPECT_EQ(TrimSpaces("  a b  "), "a b");
  EXPECT_EQ(TrimSpaces("\ta\t"), "\ta\t");
  EXPECT_EQ(TrimSpaces("    "), "");
  EXPECT_EQ(TrimSpaces(""), "");
}

TEST(ToHostLetter, HebrewLetterBecomesTheHostByte) {
  EXPECT_EQ(ToHostLetter("\xE0"), "\x80");
  EXPECT_EQ(ToHostLetter("\xFA"), "\x9A");
  EXPECT_EQ(ToHostLetter("\xE1\xE2"), "\x81");
  EXPECT_EQ(ToHostLetter("*"), "*");
  EXPECT_EQ(ToHostLetter("AB"), "AB");
  EXPECT_EQ(ToHostLetter(" "), " ");
  EXPECT_EQ(ToHostLetter("\xDF"), "\xDF");
  EXPECT_EQ(ToHostLetter("\xFB"), "\xFB");
}

TEST(ToHostLetter, EmptyTextThrows) {
  EXPECT_THROW(ToHostLetter(""), HostTextError);
}

TEST(ExtractHebrewWords, KeepsHebrewWordsAtTheReadingStart) {
  EXPECT_EQ(ExtractHebrewWords(Host("ןהכ השמ"), 20), Host("ןהכ השמ"));
  // Digits inside words vanish; so does punctuation other than space, "-" and ".".
  EXPECT_EQ(ExtractHebrewWords(Host("ה2ש1מ"), 20), Host("השמ"));
  EXPECT_EQ(ExtractHebrewWords(Host("ןה,כ-ה\"שמ"), 20), Host("ןהכ-השמ"));
  // Padding after the field's reading start is skipped; padding at its end is kept.
  EXPECT_EQ(ExtractHebrewWords(Host("השמ   "), 20), Host("השמ"));
  EXPECT_EQ(ExtractHebrewWords(Host("   השמ"), 20), Host("   השמ"));
}

TEST(ExtractHebrewWords, StopsAtAnAsciiLetter) {
  EXPECT_EQ(ExtractHebrewWords(Host("השמ X"), 20), "");
  EXPECT_EQ(ExtractHebrewWords(Host("X השמ"), 20), Host(" השמ"));
}

TEST(ExtractHebrewWords, WordAndLengthLimit) {
  EXPECT_EQ(ExtractHebrewWords(Host("ד ג ב א"), 3), Host("ב א"));
  const std::string longField = Host("זזזזז ווווו ההההה דדדדד גגגגג בבבבב אאאאא");
  // Seven words fit the word limit, but only the last 20 bytes of them are kept.
  EXPECT_EQ(ExtractHebrewWords(longField, 20), Host("דד גגגגג בבבבב אאאאא"));
}

TEST(ExtractHebrewWords, EmptyAndNonPositiveLimit) {
  EXPECT_EQ(ExtractHebrewWords("", 20), "");
  EXPECT_EQ(ExtractHebrewWords("      ", 20), "");
  EXPECT_EQ(ExtractHebrewWords(Host("השמ"), 0), "");
  EXPECT_EQ(ExtractHebrewWords(Host("השמ"), -1), "");
}

TEST(ExtractHebrewWords, IntoABufferGivesTheSameWords) {
  std::string out = "left over from the last record";
  const std::string fields[] = {Host("ןהכ השמ"),
                                Host("ה2ש1מ"),
                                Host("X השמ"),
                                Host("השמ X"),
                                Host("זזזזז ווווו ההההה דדדדד גגגגג בבבבב אאאאא"),
                                "",
                                "   "};
  for (const std::string& field : fields) {
    for (const int16_t n : {int16_t{-1}, int16_t{0}, int16_t{3}, int16_t{20}}) {
      ExtractHebrewWords(field, n, out);
      EXPECT_EQ(out, ExtractHebrewWords(field, n)) << U8(field) << " n=" << n;
    }
  }
}

TEST(AlignRight, PadsOnTheLeft) {
  EXPECT_EQ(AlignRight(std::string_view("5"), 3), "  5");
  EXPECT_EQ(AlignRight(std::nullopt, 3), "   ");
  EXPECT_EQ(AlignRight(std::string_view("123"), 3), "123");
  EXPECT_EQ(AlignRight(std::string_view(""), 2), "  ");
  EXPECT_EQ(AlignRight(std::nullopt, 0), "");
}

TEST(AlignRight, TooLongOrNegativeWidthThrows) {
  EXPECT_THROW(AlignRight(std::string_view("1234"), 3), HostTextError);
  EXPECT_THROW(AlignRight(std::nullopt, -1), HostTextError);
}

}  // namespace
}  // namespace zdr
