#include "import/codepage.h"

#include <gtest/gtest.h>

#include <string>

namespace zdr {
namespace {

std::string AllBytes() {
  std::string s;
  for (int b = 0; b < 256; ++b) s.push_back(static_cast<char>(b));
  return s;
}

TEST(Win1255, EveryByteSurvivesTheRoundTripThroughUtf8) {
  const std::string bytes = AllBytes();
  const std::string utf8 = Win1255ToUtf8(bytes);
  EXPECT_EQ(Utf8Length(utf8), 256u);
  EXPECT_EQ(Utf8ToWin1255(utf8), bytes);
  for (int b = 0; b < 256; ++b) {
    const auto u = static_cast<unsigned char>(b);
    EXPECT_EQ(CodePointToWin1255(Win1255ToCodePoint(u)), b) << "byte " << b;
  }
}

TEST(Win1255, DefinedBytesGiveTheirCodePoints) {
  struct Pair {
    unsigned char byte;
    char32_t cp;
  };
  const Pair pairs[] = {
      {0x41, U'A'},   {0x80, 0x20AC}, {0x82, 0x201A}, {0x85, 0x2026}, {0x8B, 0x2039},
      {0x91, 0x2018}, {0x96, 0x2013}, {0x99, 0x2122}, {0x9B, 0x203A}, {0xA0, 0x00A0},
      {0xA4, 0x20AA}, {0xAA, 0x00D7}, {0xBA, 0x00F7}, {0xBF, 0x00BF}, {0xC0, 0x05B0},
      {0xC9, 0x05B9}, {0xCB, 0x05BB}, {0xD3, 0x05C3}, {0xD4, 0x05F0}, {0xD8, 0x05F4},
      {0xE0, 0x05D0}, {0xEA, 0x05DA}, {0xFA, 0x05EA}, {0xFD, 0x200E}, {0xFE, 0x200F},
  };
  for (const Pair& p : pairs) {
    EXPECT_EQ(Win1255ToCodePoint(p.byte), p.cp) << "byte " << int{p.byte};
    EXPECT_EQ(CodePointToWin1255(p.cp), p.byte) << "byte " << int{p.byte};
  }
}

TEST(Win1255, UndefinedBytesStandForTheirOwnValue) {
  const unsigned char undefined[] = {0x81, 0x8A, 0x8C, 0x8D, 0x8E, 0x8F, 0x90, 0x9A,
                                     0x9C, 0x9D, 0x9E, 0x9F, 0xCA, 0xD9, 0xDA, 0xDB,
                                     0xDC, 0xDD, 0xDE, 0xDF, 0xFB, 0xFC, 0xFF};
  for (const unsigned char b : undefined) {
    EXPECT_EQ(Win1255ToCodePoint(b), char32_t{b}) << "byte " << int{b};
  }
  // No two bytes share a code point, so the reverse map is a true inverse.
  for (int a = 0; a < 256; ++a) {
    for (int b = a + 1; b < 256; ++b) {
      ASSERT_NE(Win1255ToCodePoint(static_cast<unsigned char>(a)),
                Win1255ToCodePoint(static_cast<unsigned char>(b)));
    }
  }
}

TEST(Win1255, HebrewTextToUtf8) {
  // Shalom: shin, lamed, vav, final mem.
  EXPECT_EQ(Win1255ToUtf8("\xF9\xEC\xE5\xED"), "שלום");
  EXPECT_EQ(Utf8ToWin1255("שלום 12"), "\xF9\xEC\xE5\xED 12");
  EXPECT_EQ(Win1255ToUtf8("\xA4"), "₪");
  EXPECT_EQ(Win1255ToUtf8(""), "");
}

TEST(Win1255, AppendKeepsWhatIsThere) {
  std::string out = "x";
  AppendWin1255AsUtf8("\xE0", out);
  EXPECT_EQ(out, "xא");
}

TEST(Utf8ToWin1255, UnmappableGoesToTheFallback) {
  const auto entity = [](char32_t cp) { return "&#" + std::to_string(cp) + ";"; };
  EXPECT_EQ(Utf8ToWin1255("a☺b", entity), "a&#9786;b");
  // U+00A4 is not the sheqel sign the code page holds at 0xA4.
  EXPECT_EQ(Utf8ToWin1255("¤", entity), "&#164;");
  EXPECT_EQ(Utf8ToWin1255("😀", entity), "&#128512;");
}

TEST(Utf8ToWin1255, UnmappableWithoutFallbackThrows) {
  EXPECT_THROW(Utf8ToWin1255("a☺b"), CodePageError);
  EXPECT_THROW(Utf8ToWin1255("\xC2\x80"), CodePageError);  // U+0080: 0x80 is the euro sign
}

TEST(Utf8ToWin1255, MalformedInputThrows) {
  EXPECT_THROW(Utf8ToWin1255("\xE0"), CodePageError);              // lone Windows-1255 alef
  EXPECT_THROW(Utf8ToWin1255("\xD7"), CodePageError);              // truncated sequence
  EXPECT_THROW(Utf8ToWin1255("\xC0\xAF"), CodePageError);          // overlong "/"
  EXPECT_THROW(Utf8ToWin1255("\xED\xA0\x80"), CodePageError);      // surrogate
  EXPECT_THROW(Utf8ToWin1255("\xF4\x90\x80\x80"), CodePageError);  // above U+10FFFF
}

TEST(Utf8Decoding, NextCodePointAdvancesAndReplacesMalformed) {
  const std::string s = "aש\xFF€";
  size_t pos = 0;
  EXPECT_EQ(NextCodePoint(s, pos), U'a');
  EXPECT_EQ(pos, 1u);
  EXPECT_EQ(NextCodePoint(s, pos), U'ש');
  EXPECT_EQ(pos, 3u);
  EXPECT_EQ(NextCodePoint(s, pos), char32_t{0xFFFD});
  EXPECT_EQ(pos, 4u);
  EXPECT_EQ(NextCodePoint(s, pos), U'€');
  EXPECT_EQ(pos, s.size());
}

TEST(Utf8Decoding, LengthCountsCodePoints) {
  EXPECT_EQ(Utf8Length(""), 0u);
  EXPECT_EQ(Utf8Length("abc"), 3u);
  EXPECT_EQ(Utf8Length("משה כהן"), 7u);
  EXPECT_EQ(Utf8Length("😀x"), 2u);
  EXPECT_EQ(Utf8Length("\xD7"), 1u);  // a truncated sequence counts as one replacement
}

TEST(Utf8Encoding, AppendUtf8AllLengths) {
  std::string out;
  AppendUtf8(U'A', out);
  AppendUtf8(0x05D0, out);
  AppendUtf8(0x20AA, out);
  AppendUtf8(0x1F600, out);
  EXPECT_EQ(out, "Aא₪😀");
  out.clear();
  AppendUtf8(0xD800, out);  // a lone surrogate is not text
  EXPECT_EQ(out, "\xEF\xBF\xBD");
}

TEST(Cp862, HebrewLettersAndAscii) {
  EXPECT_EQ(Cp862ToCodePoint(0x80), char32_t{0x05D0});
  EXPECT_EQ(Cp862ToCodePoint(0x9A), char32_t{0x05EA});
  EXPECT_EQ(Cp862ToCodePoint('Z'), U'Z');
  EXPECT_EQ(Cp862ToCodePoint(0x00), U'\0');
  EXPECT_EQ(CodePointToCp862(0x05D0), 0x80);
  EXPECT_EQ(CodePointToCp862(0x05EA), 0x9A);
  EXPECT_EQ(CodePointToCp862(U'€'), -1);
}

TEST(Cp862, RestOfTheCodePage) {
  EXPECT_EQ(Cp862ToCodePoint(0x9B), char32_t{0x00A2});
  EXPECT_EQ(Cp862ToCodePoint(0x9E), char32_t{0x20A7});
  EXPECT_EQ(Cp862ToCodePoint(0xB3), char32_t{0x2502});
  EXPECT_EQ(Cp862ToCodePoint(0xC9), char32_t{0x2554});
  EXPECT_EQ(Cp862ToCodePoint(0xDB), char32_t{0x2588});
  EXPECT_EQ(Cp862ToCodePoint(0xE1), char32_t{0x00DF});
  EXPECT_EQ(Cp862ToCodePoint(0xFF), char32_t{0x00A0});
  for (int b = 0; b < 256; ++b) {
    EXPECT_EQ(CodePointToCp862(Cp862ToCodePoint(static_cast<unsigned char>(b))), b);
  }
}

}  // namespace
}  // namespace zdr
