// The three outputs of a selection: the label sheet (zdrlab1.htm), the address list
// (zdrlab2.htm) and the dispatch file (zdpost1.csv) with its workbook copy.
//
// Every writer reads the recipients through BuildRecipientsStatement over the working
// database at `pDBFile`, deletes an old file at `pFileName` first, writes Windows-1255 text
// with CR LF line ends through one buffered stream, and reports progress through the seam:
// 0 at the start, the share done while writing, 0 again at the end (also on failure).
//
// Failures throw: OutputError (a std::runtime_error with a Hebrew description) for wrong
// sheet geometry, a file that cannot be written or a character the dispatch file cannot
// hold; db::EngineError for a database or statement the engine rejects;
// std::out_of_range for a document-type row outside the table. The command handler shows
// what() under the title "תקלה".
#pragma once

#include <cstdint>
#include <cstdio>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "control/panel.h"
#include "control/userseam.h"
#include "import/doctypes.h"
#include "output/outputdefs.h"
#include "output/preflight.h"
#include "workdb/value.h"

namespace zdr {
namespace db {
class Snapshot;
}  // namespace db

class OutputError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Today's date on this machine's clock (local time).
Date Today();

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

// The label sheet. Uses the panel's geometry, copies, start position, line and image
// switches, and the line styles and picture paths of `labels`.
void CreateLabFile(const std::string& pFileName, const std::string& pDBFile, const Panel& panel,
                   const DocTypeTable& docTypes, const std::string& selectDbPath,
                   const LabelSettings& labels, UserSeam& ui);

// The address list, dated `today`.
void CreateHTML(const std::string& pFileName, const std::string& pDBFile, const Panel& panel,
                const DocTypeTable& docTypes, const std::string& selectDbPath, UserSeam& ui,
                Date today = Today());

// The dispatch file in layout `pFileFormat` (0 national post, 1 courier; any other value
// writes an empty file), with the fixed columns of `settings`; `today` fills the courier
// layout's date column. No recipients give an empty (0-byte) file.
void CreateCSV(const std::string& pFileName, const std::string& pDBFile, int16_t pFileFormat,
               const Panel& panel, const DocTypeTable& docTypes, const std::string& selectDbPath,
               const PostILSettings& settings, UserSeam& ui, Date today = Today());
// The same file from `recipients`, the rows of the recipients statement (BuildRecipientsStatement),
// read from the first row to the end: for a caller that has the rows open already, e.g. for
// the dispatch checks.
void CreateCSV(const std::string& pFileName, db::Snapshot& recipients, int16_t pFileFormat,
               const PostILSettings& settings, UserSeam& ui, Date today = Today());

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

// Checks, before anything is loaded or written, that a workbook can be saved at `pXlsFile`:
// it is not a folder, not inside the company folder `companyPath` (links resolved), not named
// as a host file (*.fix, a*.tmp), its extension is .xlsx, or .xls or .ods with LibreOffice
// installed, and its folder exists. Throws OutputError saying what is wrong.
void CheckWorkbookTarget(const std::string& pXlsFile, const std::string& companyPath);

// Saves the dispatch file `pCsvFile` as a workbook at `pXlsFile`: ".xlsx" directly, ".xls"
// and ".ods" through LibreOffice. The header row and every value are text except the
// reference column, which is a number. The target is checked as CheckWorkbookTarget does;
// the workbook is written to a new file beside it and renamed over it only when complete,
// so on any failure the old file stays as it was. With `pOpenExcel` the sheet reads right
// to left and the workbook is handed to ui.OpenInSpreadsheet. Throws OutputError.
//
// When there are `findings`, the workbook gains a second sheet, "בדיקה", listing them under
// kFindingHeadings, right to left, every cell text; the dispatch sheet is the same with or
// without it. With `showFindings` the workbook opens on the findings sheet.
void ConvertToExcel(const std::string& pCsvFile, const std::string& pXlsFile, bool pOpenExcel,
                    UserSeam& ui, const std::string& companyPath = {},
                    const std::vector<Finding>& findings = {}, bool showFindings = false);

// The findings sheet's name.
inline constexpr std::string_view kFindingsSheetName = "בדיקה";

// Pieces the writers share.
namespace output_internal {

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

// An output file in Windows-1255. The constructor deletes an old file at `path` and creates
// the new one; text is gathered in a buffer and written in large blocks. Close() flushes and
// reports a failed write; the destructor closes without reporting.
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
