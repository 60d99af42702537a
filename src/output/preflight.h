// Dispatch preflight: the checks a bulk-mail or courier upload makes, run over the recipient
// rows of the dispatch file before it is sent, so that the clerk gets every row the post
// would refuse or misroute in one list instead of one at a time after the upload.
//
// The rules are one table, kPreflightRules (below): the field each reads, what it checks,
// how bad a failure is and the Hebrew message of its findings. A rule never depends on
// another row except the duplicate rule, which compares each row with the rows before it.
//
// What a rule reads. The checks see a row as the dispatch file carries it: each text field
// cleaned and cut by the layout exactly as CreateCSV writes it (commas and line breaks
// become blanks, layout 0 cuts the name to 25, the address to 40, the city to 15, the
// telephone to 11 characters, both layouts cut the remarks to 100). Surrounding blanks do
// not count as content. The zip is not a column of either layout; its rules read the
// recipient's zip from the selection, and do not apply when the address comes from the
// document header, which carries no zip. A finding's value is the field as the books hold
// it, before cleaning and cutting, so that the clerk recognises it.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "common/panel.h"
#include "common/userseam.h"
#include "hostfile/doctypes.h"
#include "output/outputdefs.h"

namespace zdr::db {
class Snapshot;
}

namespace zdr {

// error: the post refuses the row (or the file cannot be written); warning: the row goes
// but may be misrouted or arrive other than the books say.
enum class Severity { kError, kWarning };

// The fields of a recipient row the rules read.
enum class DispatchField { kName, kAddress, kCity, kZip, kTelephone, kRemarks, kAccountKey };

enum class RuleId {
  kNameMissing,
  kAddressMissing,
  kCityMissing,
  kZipEmpty,
  kZipMalformed,
  kTelephoneMalformed,
  kNameCut,
  kAddressCut,
  kCityCut,
  kTelephoneCut,
  kRemarksCut,
  kDuplicate,
  kCharacter,
  kWeightMalformed,
  kFixedTooLong,
};

struct PreflightRule {
  RuleId id;
  std::string_view field;  // the field's caption, as the finding shows it
  std::string_view check;  // what the rule checks
  Severity severity;
  std::string_view message;  // the finding's message; details are appended after ": "
};

// The rules, in the order a row's findings are listed. Field captions, checks and messages
// are Hebrew (UTF-8).
inline constexpr std::array<PreflightRule, 15> kPreflightRules{{
    {RuleId::kNameMissing, "שם", "קיים", Severity::kError, "חסר שם הנמען"},
    {RuleId::kAddressMissing, "כתובת", "קיימת", Severity::kError, "חסרה כתובת (רחוב)"},
    {RuleId::kCityMissing, "יישוב", "קיים", Severity::kError, "חסר יישוב"},
    {RuleId::kZipEmpty, "מיקוד", "קיים", Severity::kWarning, "חסר מיקוד"},
    {RuleId::kZipMalformed, "מיקוד", "5 או 7 ספרות", Severity::kError,
     "המיקוד אינו בן 5 או 7 ספרות"},
    {RuleId::kTelephoneMalformed, "טלפון",
     "ריק, או 9 או 10 ספרות המתחילות ב-0, או מספר 1-700 או 1-800 בן 10 ספרות; +972 נקרא כ-0 "
     "(מקפים ורווחים אינם נספרים)",
     Severity::kError, "הטלפון אינו מספר ישראלי"},
    {RuleId::kNameCut, "שם", "עד 25 תווים (דואר ישראל)", Severity::kWarning, "השם נחתך ל-25 תווים"},
    {RuleId::kAddressCut, "כתובת", "עד 40 תווים (דואר ישראל)", Severity::kWarning,
     "הכתובת נחתכה ל-40 תווים"},
    {RuleId::kCityCut, "יישוב", "עד 15 תווים (דואר ישראל)", Severity::kWarning,
     "היישוב נחתך ל-15 תווים"},
    {RuleId::kTelephoneCut, "טלפון", "עד 11 תווים (דואר ישראל)", Severity::kWarning,
     "הטלפון נחתך ל-11 תווים"},
    {RuleId::kRemarksCut, "הערות", "עד 100 תווים", Severity::kWarning, "ההערות נחתכו ל-100 תווים"},
    {RuleId::kDuplicate, "שם וכתובת", "אינם חוזרים בשורה אחרת (שם, כתובת ויישוב)",
     Severity::kWarning, "אותו שם וכתובת כבר מופיעים בקובץ"},
    {RuleId::kCharacter, "כל שדה", "רק תווים שקובץ בקידוד Windows-1255 נושא", Severity::kError,
     "תווים שהקובץ אינו יכול לשאת"},
    {RuleId::kWeightMalformed, "משקל", "ריק, או מספר חיובי עם נקודה עשרונית (דואר ישראל)",
     Severity::kError, "המשקל אינו מספר חיובי"},
    {RuleId::kFixedTooLong, "סוג שירות, משקל, אישור מסירה",
     "עד 32767 תווים, שתא בגיליון העבודה מכיל (דואר ישראל)", Severity::kError,
     "הערך ארוך מכפי שתא בגיליון העבודה מכיל"},
}};

// True for a weight the dispatch file may carry: empty, or a positive number written with
// digits and at most one decimal point between digits ("0.5", "2").
bool IsDispatchWeight(std::string_view s);

// The longest text a cell of the workbook holds.
inline constexpr size_t kWorkbookCellLength = 32767;

const PreflightRule& RuleOf(RuleId id);
// "שגיאה" or "אזהרה".
std::string_view SeverityText(Severity s);

struct Finding {
  RuleId rule;
  Severity severity;
  // The row of the dispatch file, and of its workbook sheet: the header is row 1, the first
  // recipient row 2. 0: every row (a fixed column of the dispatch settings).
  int64_t row = 0;
  std::string accountKey;  // UTF-8
  std::string field;       // the field's caption; for the character rule, the field it found
  std::string value;       // the field as the books hold it (UTF-8)
  std::string message;     // the rule's message with its details (UTF-8)
};

struct PreflightResult {
  std::vector<Finding> findings;  // by row, then in the order of kPreflightRules
  int64_t rows = 0;               // recipient rows checked
  int64_t errors = 0;
  int64_t warnings = 0;
};

// Checks the rows CreateCSV writes for the same arguments, in the same order: no rows when
// there are no recipients or `pFileFormat` is neither 0 nor 1. With rows in layout 0, the
// fixed columns every row carries (`fixed`: Service, Weight, Confirm) are checked first,
// once, as findings of row 0. Reads the working database at `pDBFile`; writes nothing. Reports
// progress through `ui` (0 at the start and the end). Throws db::EngineError for a database or
// statement the engine rejects and std::out_of_range for a document-type row outside the table.
PreflightResult RunPreflight(const std::string& pDBFile, int16_t pFileFormat, const Panel& panel,
                             const DocTypeTable& docTypes, const std::string& selectDbPath,
                             UserSeam& ui, const PostILSettings& fixed = {});
// The same checks over `recipients`, the rows of the recipients statement, read from the
// first row to the end; the caller may read them again (MoveFirst) for the dispatch file.
PreflightResult RunPreflight(db::Snapshot& recipients, int16_t pFileFormat, const Panel& panel,
                             const DocTypeTable& docTypes, UserSeam& ui,
                             const PostILSettings& fixed = {});

// The findings sheet's and the findings CSV's column headings, in order.
inline constexpr std::array<std::string_view, 6> kFindingHeadings{"חומרה", "שורה", "מפתח חשבון",
                                                                  "שדה",   "ערך",  "הודעה"};

// A finding's six cells, in the order of kFindingHeadings; row 0 reads "כל השורות".
std::array<std::string, 6> FindingCells(const Finding& f);

// The findings as CSV: UTF-8, the heading line first, LF line ends, a cell holding a comma,
// a double quote or a line break quoted with its quotes doubled.
std::string FindingsCsv(const PreflightResult& result);

// "שגיאות: E, אזהרות: W" for the status line and the panel's message.
std::string PreflightCounts(const PreflightResult& result);

}  // namespace zdr
