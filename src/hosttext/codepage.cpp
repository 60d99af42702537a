#include "hosttext/codepage.h"

#include <array>
#include <cstdio>

namespace zdr {
namespace {

// Windows-1255, bytes 0x80 to 0xFF. A zero marks a byte the code page leaves undefined; it
// stands for the code point of the same value.
constexpr char16_t kWin1255High[128] = {
    // 0x80
    0x20AC, 0, 0x201A, 0x0192, 0x201E, 0x2026, 0x2020, 0x2021,  //
    0x02C6, 0x2030, 0, 0x2039, 0, 0, 0, 0,                      //
    // 0x90
    0, 0x2018, 0x2019, 0x201C, 0x201D, 0x2022, 0x2013, 0x2014,  //
    0x02DC, 0x2122, 0, 0x203A, 0, 0, 0, 0,                      //
    // 0xA0
    0x00A0, 0x00A1, 0x00A2, 0x00A3, 0x20AA, 0x00A5, 0x00A6, 0x00A7,  //
    0x00A8, 0x00A9, 0x00D7, 0x00AB, 0x00AC, 0x00AD, 0x00AE, 0x00AF,  //
    // 0xB0
    0x00B0, 0x00B1, 0x00B2, 0x00B3, 0x00B4, 0x00B5, 0x00B6, 0x00B7,  //
    0x00B8, 0x00B9, 0x00F7, 0x00BB, 0x00BC, 0x00BD, 0x00BE, 0x00BF,  //
    // 0xC0: Hebrew points
    0x05B0, 0x05B1, 0x05B2, 0x05B3, 0x05B4, 0x05B5, 0x05B6, 0x05B7,  //
    0x05B8, 0x05B9, 0, 0x05BB, 0x05BC, 0x05BD, 0x05BE, 0x05BF,       //
    // 0xD0
    0x05C0, 0x05C1, 0x05C2, 0x05C3, 0x05F0, 0x05F1, 0x05F2, 0x05F3,  //
    0x05F4, 0, 0, 0, 0, 0, 0, 0,                                     //
    // 0xE0: Hebrew letters
    0x05D0, 0x05D1, 0x05D2, 0x05D3, 0x05D4, 0x05D5, 0x05D6, 0x05D7,  //
    0x05D8, 0x05D9, 0x05DA, 0x05DB, 0x05DC, 0x05DD, 0x05DE, 0x05DF,  //
    // 0xF0
    0x05E0, 0x05E1, 0x05E2, 0x05E3, 0x05E4, 0x05E5, 0x05E6, 0x05E7,  //
    0x05E8, 0x05E9, 0x05EA, 0, 0, 0x200E, 0x200F, 0,                 //
};

// Code page 862, bytes 0x80 to 0xFF: the Hebrew letters, then as code page 437.
constexpr char16_t kCp862High[128] = {
    0x05D0, 0x05D1, 0x05D2, 0x05D3, 0x05D4, 0x05D5, 0x05D6, 0x05D7,  //
    0x05D8, 0x05D9, 0x05DA, 0x05DB, 0x05DC, 0x05DD, 0x05DE, 0x05DF,  //
    0x05E0, 0x05E1, 0x05E2, 0x05E3, 0x05E4, 0x05E5, 0x05E6, 0x05E7,  //
    0x05E8, 0x05E9, 0x05EA, 0x00A2, 0x00A3, 0x00A5, 0x20A7, 0x0192,  //
    0x00E1, 0x00ED, 0x00F3, 0x00FA, 0x00F1, 0x00D1, 0x00AA, 0x00BA,  //
    0x00BF, 0x2310, 0x00AC, 0x00BD, 0x00BC, 0x00A1, 0x00AB, 0x00BB,  //
    0x2591, 0x2592, 0x2593, 0x2502, 0x2524, 0x2561, 0x2562, 0x2556,  //
    0x2555, 0x2563, 0x2551, 0x2557, 0x255D, 0x255C, 0x255B, 0x2510,  //
    0x2514, 0x2534, 0x252C, 0x251C, 0x2500, 0x253C, 0x255E, 0x255F,  //
    0x255A, 0x2554, 0x2569, 0x2566, 0x2560, 0x2550, 0x256C, 0x2567,  //
    0x2568, 0x2564, 0x2565, 0x2559, 0x2558, 0x2552, 0x2553, 0x256B,  //
    0x256A, 0x2518, 0x250C, 0x2588, 0x2584, 0x258C, 0x2590, 0x2580,  //
    0x03B1, 0x00DF, 0x0393, 0x03C0, 0x03A3, 0x03C3, 0x00B5, 0x03C4,  //
    0x03A6, 0x0398, 0x03A9, 0x03B4, 0x221E, 0x03C6, 0x03B5, 0x2229,  //
    0x2261, 0x00B1, 0x2265, 0x2264, 0x2320, 0x2321, 0x00F7, 0x2248,  //
    0x00B0, 0x2219, 0x00B7, 0x221A, 0x207F, 0x00B2, 0x25A0, 0x00A0,  //
};

constexpr char32_t Win1255At(unsigned b) {
  if (b < 0x80) return b;
  const char16_t cp = kWin1255High[b - 0x80];
  return cp == 0 ? b : cp;
}

// Each byte's code point, and its UTF-8 form (length in the first byte), for the hot
// conversion loop.
struct Win1255Utf8Table {
  std::array<std::array<char, 4>, 256> bytes{};
  std::array<unsigned char, 256> length{};
};

void EncodeUtf8(char32_t cp, char* buf, unsigned char& len) {
  if (cp < 0x80) {
    buf[0] = static_cast<char>(cp);
    len = 1;
  } else if (cp < 0x800) {
    buf[0] = static_cast<char>(0xC0 | (cp >> 6));
    buf[1] = static_cast<char>(0x80 | (cp & 0x3F));
    len = 2;
  } else if (cp < 0x10000) {
    buf[0] = static_cast<char>(0xE0 | (cp >> 12));
    buf[1] = static_cast<char>(0x80 | ((cp >> 6) & 0x3F));
    buf[2] = static_cast<char>(0x80 | (cp & 0x3F));
    len = 3;
  } else {
    buf[0] = static_cast<char>(0xF0 | (cp >> 18));
    buf[1] = static_cast<char>(0x80 | ((cp >> 12) & 0x3F));
    buf[2] = static_cast<char>(0x80 | ((cp >> 6) & 0x3F));
    buf[3] = static_cast<char>(0x80 | (cp & 0x3F));
    len = 4;
  }
}

const Win1255Utf8Table& Utf8Table() {
  static const Win1255Utf8Table table = [] {
    Win1255Utf8Table t;
    for (unsigned b = 0; b < 256; ++b) EncodeUtf8(Win1255At(b), t.bytes[b].data(), t.length[b]);
    return t;
  }();
  return table;
}

// Decodes one UTF-8 sequence; false on a malformed one (then `pos` has moved one byte).
bool DecodeUtf8(std::string_view s, size_t& pos, char32_t& cp) {
  const auto b0 = static_cast<unsigned char>(s[pos++]);
  if (b0 < 0x80) {
    cp = b0;
    return true;
  }
  int extra;
  char32_t min;
  if (b0 >= 0xC2 && b0 <= 0xDF) {
    extra = 1;
    cp = b0 & 0x1F;
    min = 0x80;
  } else if (b0 >= 0xE0 && b0 <= 0xEF) {
    extra = 2;
    cp = b0 & 0x0F;
    min = 0x800;
  } else if (b0 >= 0xF0 && b0 <= 0xF4) {
    extra = 3;
    cp = b0 & 0x07;
    min = 0x10000;
  } else {
    return false;
  }
  if (pos + extra > s.size()) return false;
  for (int i = 0; i < extra; ++i) {
    const auto b = static_cast<unsigned char>(s[pos + i]);
    if ((b & 0xC0) != 0x80) return false;
    cp = (cp << 6) | (b & 0x3F);
  }
  if (cp < min || cp > 0x10FFFF || (cp >= 0xD800 && cp <= 0xDFFF)) return false;
  pos += extra;
  return true;
}

}  // namespace

char32_t Win1255ToCodePoint(unsigned char b) {
  return Win1255At(b);
}

bool IsWin1255Defined(unsigned char b) {
  return b < 0x80 || kWin1255High[b - 0x80] != 0;
}

int CodePointToWin1255(char32_t cp) {
  if (cp < 0x80) return static_cast<int>(cp);
  // Bytes whose code point is the byte's own value: the undefined ones and most of
  // 0xA0-0xBF.
  if (cp < 0x100 && Win1255At(cp) == cp) return static_cast<int>(cp);
  if (cp >= 0x05D0 && cp <= 0x05EA) return static_cast<int>(cp - 0x05D0 + 0xE0);
  for (unsigned i = 0; i < 128; ++i) {
    if (kWin1255High[i] == cp) return static_cast<int>(0x80 + i);
  }
  return -1;
}

void AppendWin1255AsUtf8(std::string_view bytes, std::string& out) {
  const Win1255Utf8Table& t = Utf8Table();
  for (const char c : bytes) {
    const auto b = static_cast<unsigned char>(c);
    if (b < 0x80) {
      out.push_back(c);
    } else {
      out.append(t.bytes[b].data(), t.length[b]);
    }
  }
}

std::string Win1255ToUtf8(std::string_view bytes) {
  std::string out;
  out.reserve(bytes.size() * 2);
  AppendWin1255AsUtf8(bytes, out);
  return out;
}

std::string Utf8ToWin1255(std::string_view utf8,
                          const std::function<std::string(char32_t)>& fallback) {
  std::string out;
  out.reserve(utf8.size());
  size_t pos = 0;
  while (pos < utf8.size()) {
    const auto b0 = static_cast<unsigned char>(utf8[pos]);
    if (b0 < 0x80) {
      out.push_back(static_cast<char>(b0));
      ++pos;
      continue;
    }
    const size_t at = pos;
    char32_t cp;
    if (!DecodeUtf8(utf8, pos, cp)) {
      throw CodePageError("malformed UTF-8 at byte " + std::to_string(at));
    }
    const int b = CodePointToWin1255(cp);
    if (b >= 0) {
      out.push_back(static_cast<char>(b));
    } else if (fallback) {
      out += fallback(cp);
    } else {
      char hex[16];
      std::snprintf(hex, sizeof hex, "U+%04X", static_cast<unsigned>(cp));
      throw CodePageError(std::string("character ") + hex + " has no Windows-1255 form");
    }
  }
  return out;
}

char32_t Cp862ToCodePoint(unsigned char b) {
  return b < 0x80 ? static_cast<char32_t>(b) : static_cast<char32_t>(kCp862High[b - 0x80]);
}

int CodePointToCp862(char32_t cp) {
  if (cp < 0x80) return static_cast<int>(cp);
  if (cp >= 0x05D0 && cp <= 0x05EA) return static_cast<int>(cp - 0x05D0 + 0x80);
  for (unsigned i = 0; i < 128; ++i) {
    if (kCp862High[i] == cp) return static_cast<int>(0x80 + i);
  }
  return -1;
}

char32_t NextCodePoint(std::string_view utf8, size_t& pos) {
  char32_t cp;
  return DecodeUtf8(utf8, pos, cp) ? cp : char32_t{0xFFFD};
}

void AppendUtf8(char32_t cp, std::string& out) {
  if (cp > 0x10FFFF || (cp >= 0xD800 && cp <= 0xDFFF)) cp = 0xFFFD;
  char buf[4];
  unsigned char len;
  EncodeUtf8(cp, buf, len);
  out.append(buf, len);
}

size_t Utf8Length(std::string_view utf8) {
  size_t n = 0;
  size_t pos = 0;
  while (pos < utf8.size()) {
    NextCodePoint(utf8, pos);
    ++n;
  }
  return n;
}

}  // namespace zdr
