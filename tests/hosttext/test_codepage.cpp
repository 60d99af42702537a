#include "hosttext/codepage.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

namespace zdr {
namespace {

// Every byte maps to its own code point and back, through UTF-8 too; the bytes the code page
// leaves undefined stand for the code point of their own value.
TEST(Win1255, EveryByteRoundTripsToItsOwnCodePoint) {
  std::string bytes;
  std::set<char32_t> seen;
  for (int b = 0; b < 256; ++b) {
    const auto u = static_cast<unsigned char>(b);
    bytes.push_back(static_cast<char>(b));
    EXPECT_TRUE(seen.insert(Win1255ToCodePoint(u)).second) << "byte " << b;
    EXPECT_EQ(CodePointToWin1255(Win1255ToCodePoint(u)), b) << "byte " << b;
    if (b < 0x80 || !IsWin1255Defined(u)) {
      EXPECT_EQ(Win1255ToCodePoint(u), char32_t{u}) << b;
    }
  }
  EXPECT_EQ(Utf8ToWin1255(Win1255ToUtf8(bytes)), bytes);
  EXPECT_EQ(Utf8Length(Win1255ToUtf8(bytes)), 256u);
}

TEST(Win1255, DefinedBytesGiveTheirCodePoints) {
  const std::pair<unsigned char, char32_t> pairs[] = {
      {0x80, 0x20AC}, {0x91, 0x2018}, {0x92, 0x2019}, {0xA4, 0x20AA}, {0xAA, 0x00D7},
      {0xC0, 0x05B0}, {0xD4, 0x05F0}, {0xE0, 0x05D0}, {0xFA, 0x05EA}, {0xFE, 0x200F}};
  for (const auto& [byte, cp] : pairs) EXPECT_EQ(Win1255ToCodePoint(byte), cp) << int{byte};
  for (const unsigned char b : {0x81, 0x8A, 0x90, 0x9A, 0x9F, 0xCA, 0xD9, 0xDF, 0xFB, 0xFF}) {
    EXPECT_FALSE(IsWin1255Defined(b)) << int{b};
  }
  EXPECT_EQ(Win1255ToUtf8("\xF9\xEC\xE5\xED \xA4"), "שלום ₪");
  std::string out = "x";
  AppendWin1255AsUtf8("\xE0", out);
  EXPECT_EQ(out, "xא");
}

TEST(Utf8ToWin1255, UnmappableGoesToTheFallbackOrThrows) {
  const auto entity = [](char32_t cp) { return "&#" + std::to_string(cp) + ";"; };
  EXPECT_EQ(Utf8ToWin1255("a☺b", entity), "a&#9786;b");
  // U+00A4 is not the sheqel sign the code page holds at 0xA4.
  EXPECT_EQ(Utf8ToWin1255("¤😀", entity), "&#164;&#128512;");
  // U+0080: 0x80 is the euro sign. Then malformed input: a lone Windows-1255 alef, a cut
  // sequence, an overlong "/", a surrogate, a code point above U+10FFFF.
  for (const char* bad :
       {"a☺b", "\xC2\x80", "\xE0", "\xD7", "\xC0\xAF", "\xED\xA0\x80", "\xF4\x90\x80\x80"}) {
    EXPECT_THROW(Utf8ToWin1255(bad), CodePageError) << bad;
  }
}

TEST(Utf8, DecodesEncodesAndCounts) {
  const std::string s = "aש\xFF€";
  size_t pos = 0;
  for (const auto& [cp, after] :
       {std::pair<char32_t, size_t>{U'a', 1}, {U'ש', 3}, {0xFFFD, 4}, {U'€', s.size()}}) {
    EXPECT_EQ(NextCodePoint(s, pos), cp);
    EXPECT_EQ(pos, after);
  }
  EXPECT_EQ(Utf8Length("משה כהן"), 7u);
  EXPECT_EQ(Utf8Length("😀x\xD7"), 3u);  // a cut sequence counts as one replacement
  std::string out;
  for (const char32_t cp :
       {char32_t{'A'}, char32_t{0x05D0}, char32_t{0x20AA}, char32_t{0x1F600}, char32_t{0xD800}}) {
    AppendUtf8(cp, out);
  }
  EXPECT_EQ(out, "Aא₪😀\xEF\xBF\xBD");  // a lone surrogate is not text
}

TEST(Cp862, HebrewLettersThenCodePage437) {
  const std::pair<unsigned char, char32_t> pairs[] = {
      {'Z', U'Z'}, {0x80, 0x05D0}, {0x9A, 0x05EA}, {0x9B, 0x00A2}, {0xB3, 0x2502}, {0xFF, 0x00A0}};
  for (const auto& [byte, cp] : pairs) EXPECT_EQ(Cp862ToCodePoint(byte), cp) << int{byte};
  for (int b = 0; b < 256; ++b) {
    EXPECT_EQ(CodePointToCp862(Cp862ToCodePoint(static_cast<unsigned char>(b))), b);
  }
  EXPECT_EQ(CodePointToCp862(U'€'), -1);
}

}  // namespace
}  // namespace zdr
