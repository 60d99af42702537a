// The output library's own pieces: what its writers share and the helpers the tests check
// one by one. Only the output library's sources and the tests include this header; the
// rest of the program uses output/output.h.
#pragma once

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <string>
#include <string_view>

#include "common/panel.h"
#include "common/value.h"
#include "output/output.h"

namespace zdr {
namespace db {
class Snapshot;
}  // namespace db

// The sheet geometry read from the panel like the host's integer conversions (surrounding
// spaces ignored, halves rounded to even). Counts are 64-bit so that no selection size
// overflows them.
struct SheetGeometry {
  int64_t rows = 0;    // 1..32767
  int64_t cols = 0;    // 1..32767, rows x cols at most 32767
  int64_t start = 1;   // -32768..32767; positions below 1 mean the first cell
  int64_t copies = 1;  // 0..255
};

// Reads txtRows, txtCols, txtCopies and, when `withStart`, txtStartFrom. Throws OutputError
// with a Hebrew description naming the box when a text is not a number or out of range.
SheetGeometry ReadSheetGeometry(const Panel& panel, bool withStart);

// "00.0" form of 100 / n (n > 0): at least two integer digits, one decimal, halves rounded
// away from zero. 8 gives "12.5", 12 gives "08.3", 1 gives "100.0".
std::string PercentOfOne(int64_t n);

// The lengths, in characters, the dispatch file cuts its text fields to; 0: not cut.
struct DispatchLengths {
  int name, address, city, telephone, remarks;
};
inline constexpr DispatchLengths kPostLengths{25, 40, 15, 11, 100};  // layout 0
inline constexpr DispatchLengths kCourierLengths{0, 0, 0, 0, 100};   // layout 1

// The dispatch file's two header lines (UTF-8).
inline constexpr std::string_view kPostILHeader0 =
    "מספר,שם משפחה,שם פרטי,כתובת,יישוב,טלפון 1,טלפון 2,סוג שירות,משקל,כפולה,אישור מסירה,"
    "חיוב נוסף,גוביינא,הערות,מספר משלוחים";
inline constexpr std::string_view kPostILHeader1 =
    "קוד לקוח,שם לקוח,רחוב,מספר,עיר,טלפון,נייד,איש קשר,תאריך,שעה,אסמכתא,סעיף,כמות מארזים,"
    "סכום גבייה,תשלום,איסוף,הערות לקוח";

// A value for a page (UTF-8): "&nbsp;" for Null, else its text with &, < and > escaped.
std::string HtmlValue(const db::Value& v);

// A one-row inner table holding the value's characters one per cell; a run of blanks gives
// one "&nbsp;" cell. `pClass` (when not empty) becomes the table's class.
std::string SpreadInCells(const db::Value& v, std::string_view pClass);

// A dispatch-file field (UTF-8): "" for Null, else the text with every comma, carriage
// return and line feed turned into a blank, cut to `pMaxLen` characters when pMaxLen > 0.
std::string CsvField(const db::Value& v, int pMaxLen);

// The findings sheet's name.
inline constexpr std::string_view kFindingsSheetName = "בדיקה";

// Pieces the writers share.
namespace output_internal {

// True when LibreOffice, which writes the .xls and .ods workbooks, is installed.
bool OfficeConverterInstalled();

// ASCII letters in lower case, other bytes as they are.
std::string LowerAscii(std::string s);
// A path from UTF-8 text.
std::filesystem::path PathFromUtf8(const std::string& s);
// The path with every symbolic link resolved, as far as it exists.
std::filesystem::path ResolvedPath(const std::filesystem::path& p);

// Column indexes of the fields a label prints, in a recipients snapshot (the label sheet and
// the label PDF print the same fields).
struct LabelFields {
  int name, key, details, address, district, city, zip, telephone;
  explicit LabelFields(const db::Snapshot& rs);
};

// How a character outside Windows-1255 is written.
enum class Unmappable {
  kCharRef,  // as "&#NNNN;" (pages)
  kFail,     // OutputError (the dispatch file)
};

// An output file in Windows-1255, readable by its owner only. The constructor deletes an old
// file at `path` and creates the new one; text is gathered in a buffer and written in large
// blocks. Close() flushes and reports a failed write (a full disk in DiskFullMessage's words)
// and then leaves no file; so does the destructor of a file never closed, which is how a
// failed writer ends.
class CodePageFile {
 public:
  CodePageFile(const std::string& path, Unmappable mode);
  ~CodePageFile();
  CodePageFile(const CodePageFile&) = delete;
  CodePageFile& operator=(const CodePageFile&) = delete;

  // Appends UTF-8 text, encoded.
  void Put(std::string_view utf8);
  // Ends the line with CR LF.
  void EndLine();
  void Line(std::string_view utf8) {
    Put(utf8);
    EndLine();
  }
  void Close();

 private:
  void Flush();
  [[noreturn]] void FailChar(char32_t cp);
  [[noreturn]] void FailWrite(int err);

  std::string path_;
  Unmappable mode_;
  std::FILE* file_ = nullptr;
  std::string buf_;
  int64_t line_ = 1;
};

// The value as text (UTF-8) appended to `out`; Null appends nothing.
void AppendValueText(const db::Value& v, std::string& out);
// `text` with &, < and > escaped (and ' when `inAttribute`) appended to `out`.
void AppendHtmlEscaped(std::string_view text, std::string& out, bool inAttribute = false);
void AppendHtmlValue(const db::Value& v, std::string& out);
void AppendSpreadInCells(const db::Value& v, std::string_view pClass, std::string& out);
void AppendCsvField(const db::Value& v, int pMaxLen, std::string& out);

// The head lines both pages start with: "<HTML>", the saved-from comment, "<HEAD>", the
// title and the code-page meta line.
void WritePageHead(CodePageFile& f);
// The saved-from comment line, its length in four digits.
std::string SavedFromLine();

}  // namespace output_internal
}  // namespace zdr
