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
#include <stdexcept>
#include <string>
#include <vector>

#include "common/panel.h"
#include "common/userseam.h"
#include "common/value.h"
#include "hostfile/doctypes.h"
#include "output/outputdefs.h"
#include "output/preflight.h"
#include "output/targetfile.h"

namespace zdr {

class OutputError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Today's date on this machine's clock (local time).
Date Today();

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

// Saves the dispatch file `pCsvFile` as a workbook at `pXlsFile`: ".xlsx" directly, ".xls"
// and ".ods" through LibreOffice. The header row and every value are text except the
// reference column, which is a number. The target is checked by CheckOutputTarget (kind
// kWorkbook, `companyFolders`); the workbook is written through a ReplacingFile beside the
// file a link at the target points to, so on any failure the old file stays as it was. With
// `pOpenExcel` the sheet reads right to left and the workbook is handed to ui.OpenInSpreadsheet.
// Throws OutputError.
//
// When there are `findings`, the workbook gains a second sheet, "בדיקה", listing them under
// kFindingHeadings, right to left, every cell text; the dispatch sheet is the same with or
// without it. With `showFindings` the workbook opens on the findings sheet.
void ConvertToExcel(const std::string& pCsvFile, const std::string& pXlsFile, bool pOpenExcel,
                    UserSeam& ui, const std::vector<std::string>& companyFolders = {},
                    const std::vector<Finding>& findings = {}, bool showFindings = false);

}  // namespace zdr
