// Pieces the three outputs share: the Windows-1255 output file, value texts, page escaping,
// the sheet geometry and the head of both pages.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cmath>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <memory>

#include "common/diskfull.h"
#include "hosttext/codepage.h"
#include "hosttext/hosttext.h"
#include "output/outputinternal.h"

namespace zdr {
namespace output_internal {
namespace {

constexpr size_t kFlushAt = 1 << 18;

// Code point -> Windows-1255 byte for the Basic Multilingual Plane, -1 where the code page
// has no byte. Built once from the code page's own table.
const std::array<int16_t, 0x10000>& BmpToWin1255() {
  static const auto table = [] {
    auto t = std::make_unique<std::array<int16_t, 0x10000>>();
    t->fill(-1);
    for (int b = 0; b < 256; ++b) {
      const char32_t cp = Win1255ToCodePoint(static_cast<unsigned char>(b));
      if (cp < 0x10000) (*t)[cp] = static_cast<int16_t>(b);
    }
    return t;
  }();
  return *table;
}

// The address in the saved-from comment; the comment carries its length.
constexpr std::string_view kSavedFromUrl = "http://www.vornak.co.il/";

}  // namespace

CodePageFile::CodePageFile(const std::string& path, Unmappable mode) : path_(path), mode_(mode) {
  // The temporary folder may be shared: a link planted at the path is removed, never
  // followed, and the new file is created exclusively, so no link put there meanwhile is
  // followed either.
  struct stat st {};
  if (::lstat(path.c_str(), &st) == 0) {
    if (S_ISDIR(st.st_mode)) {
      throw OutputError("לא ניתן ליצור את הקובץ " + path + ": קיימת תיקייה בשם זה");
    }
    if (::unlink(path.c_str()) != 0) {
      throw OutputError("לא ניתן למחוק את הקובץ הקודם " + path + ": " + std::strerror(errno));
    }
  }
  // Readable by its owner only, like the working database: it holds the same names.
  const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
  if (fd >= 0) file_ = ::fdopen(fd, "wb");
  if (file_ == nullptr) {
    const int err = errno;
    if (fd >= 0) ::close(fd);
    throw OutputError("לא ניתן ליצור את הקובץ " + path + ": " + std::strerror(err));
  }
  buf_.reserve(kFlushAt + 4096);
  BmpToWin1255();
}

CodePageFile::~CodePageFile() {
  // Not closed: the writer failed. Half a page or file is worse than none.
  if (file_ != nullptr) {
    std::fclose(file_);
    ::unlink(path_.c_str());
  }
}

void CodePageFile::Put(std::string_view utf8) {
  const auto& table = BmpToWin1255();
  size_t i = 0;
  while (i < utf8.size()) {
    const unsigned char b = static_cast<unsigned char>(utf8[i]);
    if (b < 0x80) {
      buf_.push_back(static_cast<char>(b));
      ++i;
      continue;
    }
    const char32_t cp = NextCodePoint(utf8, i);
    const int byte = cp < 0x10000 ? table[cp] : -1;
    if (byte >= 0) {
      buf_.push_back(static_cast<char>(byte));
    } else if (mode_ == Unmappable::kCharRef) {
      buf_ += "&#";
      buf_ += std::to_string(static_cast<uint32_t>(cp));
      buf_ += ';';
    } else {
      FailChar(cp);
    }
  }
}

void CodePageFile::FailChar(char32_t cp) {
  char hex[16];
  std::snprintf(hex, sizeof hex, "U+%04X", static_cast<unsigned>(cp));
  throw OutputError(std::string("התו ") + hex + " בשורה " + std::to_string(line_) + " של הקובץ " +
                    path_ + " אינו קיים בקידוד העברי של חלונות (1255) ולא ניתן לכתוב אותו בקובץ");
}

void CodePageFile::EndLine() {
  buf_ += "\r\n";
  ++line_;
  if (buf_.size() >= kFlushAt) Flush();
}

void CodePageFile::Flush() {
  if (file_ == nullptr || buf_.empty()) return;
  if (std::fwrite(buf_.data(), 1, buf_.size(), file_) != buf_.size()) {
    const int err = errno;
    buf_.clear();
    FailWrite(err);
  }
  buf_.clear();
}

void CodePageFile::FailWrite(int err) {
  if (err == ENOSPC || err == EDQUOT) throw OutputError(DiskFullMessage(path_));
  throw OutputError("כתיבת הקובץ " + path_ + " נכשלה: " + std::strerror(err));
}

void CodePageFile::Close() {
  if (file_ == nullptr) return;
  Flush();
  std::FILE* f = file_;
  file_ = nullptr;
  if (std::fclose(f) != 0) {
    const int err = errno;
    ::unlink(path_.c_str());
    FailWrite(err);
  }
}

void AppendValueText(const db::Value& v, std::string& out) {
  if (const auto* s = std::get_if<std::string>(&v)) {
    out += *s;
  } else if (const auto* i = std::get_if<int64_t>(&v)) {
    out += std::to_string(*i);
  } else if (const auto* d = std::get_if<double>(&v)) {
    if (std::isfinite(*d) && *d == std::trunc(*d) && std::fabs(*d) < 1e15) {
      out += std::to_string(static_cast<int64_t>(*d));
    } else {
      char buf[40];
      std::snprintf(buf, sizeof buf, "%.15G", *d);
      out += buf;
    }
  }
}

void AppendHtmlEscaped(std::string_view text, std::string& out, bool inAttribute) {
  for (char c : text) {
    switch (c) {
      case '&':
        out += "&amp;";
        break;
      case '<':
        out += "&lt;";
        break;
      case '>':
        out += "&gt;";
        break;
      case '\'':
        if (inAttribute) {
          out += "&#39;";
        } else {
          out += c;
        }
        break;
      default:
        out += c;
    }
  }
}

void AppendHtmlValue(const db::Value& v, std::string& out) {
  if (db::IsNull(v)) {
    out += "&nbsp;";
    return;
  }
  if (const auto* s = std::get_if<std::string>(&v)) {
    AppendHtmlEscaped(*s, out);
    return;
  }
  AppendValueText(v, out);
}

void AppendSpreadInCells(const db::Value& v, std::string_view pClass, std::string& out) {
  thread_local std::string text;
  text.clear();
  AppendValueText(v, text);
  out += "<table";
  if (!pClass.empty()) {
    out += " class='";
    AppendHtmlEscaped(pClass, out, true);
    out += '\'';
  }
  out += " cellspacing='0' cellpadding='0' border='0' align='right' dir='rtl'><tr>";
  bool prevBlank = false;
  size_t i = 0;
  while (i < text.size()) {
    const size_t from = i;
    NextCodePoint(text, i);
    const std::string_view c(text.data() + from, i - from);
    if (c == " ") {
      if (!prevBlank) out += "<td>&nbsp;</td>";
      prevBlank = true;
    } else {
      out += "<td>";
      AppendHtmlEscaped(c, out);
      out += "</td>";
      prevBlank = false;
    }
  }
  out += "</tr></table>";
}

std::string SavedFromLine() {
  char digits[8];
  std::snprintf(digits, sizeof digits, "%04zu", kSavedFromUrl.size());
  return std::string("<!-- saved from url=(") + digits + ")" + std::string(kSavedFromUrl) + " -->";
}

void WritePageHead(CodePageFile& f) {
  f.Line("<HTML>");
  f.Line(SavedFromLine());
  f.Line("<HEAD>");
  f.Line("<TITLE>Vornak מערכות מידע מציגה</TITLE>");
  f.Line("<meta http-equiv='Content-Type' content='text/html; charset=windows-1255'>");
}

}  // namespace output_internal

Date Today() {
  const std::time_t now = std::time(nullptr);
  std::tm local{};
  localtime_r(&now, &local);
  return Date::FromParts(local.tm_year + 1900, local.tm_mon + 1, local.tm_mday);
}

namespace {

// A panel number read like the host's CInt: throws OutputError(message) when it is not a
// number or falls outside [lo, hi].
int64_t PanelInt(const std::string& text, int64_t lo, int64_t hi, const std::string& message) {
  int64_t v = 0;
  try {
    v = HostIntValue(text);
  } catch (const std::exception&) {
    throw OutputError(message + " (\"" + text + "\")");
  }
  if (v < lo || v > hi) throw OutputError(message + " (\"" + text + "\")");
  return v;
}

}  // namespace

SheetGeometry ReadSheetGeometry(const Panel& panel, bool withStart) {
  SheetGeometry g;
  g.rows = PanelInt(panel.txtRows, 1, 32767, "מספר השורות חייב להיות מספר שלם בין 1 ל-32767");
  g.cols = PanelInt(panel.txtCols, 1, 32767, "מספר העמודות חייב להיות מספר שלם בין 1 ל-32767");
  if (withStart) {
    g.start =
        PanelInt(panel.txtStartFrom, -32768, 32767, "מדבקת ההתחלה חייבת להיות מספר שלם עד 32767");
  }
  g.copies = PanelInt(panel.txtCopies, 0, 255, "מספר העותקים חייב להיות מספר שלם בין 0 ל-255");
  if (g.rows * g.cols > 32767) {
    throw OutputError("מספר המדבקות בדף (שורות × עמודות) לא יכול לעלות על 32767 (" +
                      std::to_string(g.rows) + " × " + std::to_string(g.cols) + ")");
  }
  return g;
}

std::string PercentOfOne(int64_t n) {
  if (n <= 0) throw OutputError("חלוקה באפס");
  // Tenths of 100 / n, rounded half up, in whole numbers so that 6.25 gives 6.3.
  const int64_t tenths = (2000 + n) / (2 * n);
  char buf[32];
  std::snprintf(buf, sizeof buf, "%02lld.%lld", static_cast<long long>(tenths / 10),
                static_cast<long long>(tenths % 10));
  return buf;
}

std::string HtmlValue(const db::Value& v) {
  std::string out;
  output_internal::AppendHtmlValue(v, out);
  return out;
}

std::string SpreadInCells(const db::Value& v, std::string_view pClass) {
  std::string out;
  output_internal::AppendSpreadInCells(v, pClass, out);
  return out;
}

}  // namespace zdr
