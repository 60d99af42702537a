// Windows-1255 <-> UTF-8, lossless for all 256 byte values: every byte maps to one code
// point and back. The bytes the code page leaves undefined map to the C1 control or Latin-1
// code point of the same value (U+0081, U+00D9, ...), none of which a defined byte uses.
// Also code page 862 (the host's DOS Hebrew) to Unicode, for tools and tests.
#pragma once

#include <functional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace zdr {

class CodePageError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// The code point of one Windows-1255 byte.
char32_t Win1255ToCodePoint(unsigned char b);
// The byte of a code point, or -1 when Windows-1255 cannot hold it.
int CodePointToWin1255(char32_t cp);

// False for the bytes Windows-1255 leaves undefined (0x81, 0x8A, 0xD9, ...): a file can
// hold them, but no reader of the code page shows them as a character.
bool IsWin1255Defined(unsigned char b);

// Appends the UTF-8 form of Windows-1255 bytes to `out` (no allocation when `out` has room).
void AppendWin1255AsUtf8(std::string_view bytes, std::string& out);
std::string Win1255ToUtf8(std::string_view bytes);

// Encodes UTF-8 as Windows-1255. A code point the code page cannot hold goes to `fallback`,
// whose result is appended as it is; with no fallback it raises CodePageError. Malformed
// UTF-8 raises CodePageError.
std::string Utf8ToWin1255(std::string_view utf8,
                          const std::function<std::string(char32_t)>& fallback = {});

// Code page 862 (DOS Hebrew) byte to code point, and back (-1 when it cannot hold it).
char32_t Cp862ToCodePoint(unsigned char b);
int CodePointToCp862(char32_t cp);

// Decodes one UTF-8 sequence at `pos`, advancing it; returns U+FFFD on malformed input.
char32_t NextCodePoint(std::string_view utf8, size_t& pos);
void AppendUtf8(char32_t cp, std::string& out);
// Number of code points in UTF-8 text.
size_t Utf8Length(std::string_view utf8);

}  // namespace zdr
