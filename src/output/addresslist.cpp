// The address list: a dated table of the recipients with their count and the number of
// label pages that printing them would take.
#include "output/outputinternal.h"
#include "select/select.h"

#include "engine/engine.h"

namespace zdr {
namespace {

using output_internal::AppendHtmlEscaped;
using output_internal::AppendValueText;
using output_internal::CodePageFile;

void WriteListHead(CodePageFile& f, Date today) {
  output_internal::WritePageHead(f);
  f.Line("<style>.MyClass1{font-size : 10pt; color: blue;}");
  f.Line("       .Title1 {font-size : 12pt; color: blue; font-weight : bold;}");
  f.Line("       TD {font-family: Arial; font-size : 8pt;}");
  f.Line("       TABLE {font-family: Arial; font-size : 8pt; color: black;}");
  f.Line("</style>");
  f.Line("</HEAD>");
  f.Line("<BODY class=MyClass1 BGCOLOR='#FFFFFF' TEXT='#000000' LINK='#0000FF' VLINK='#800080'>");
  f.Line("<p class=Title1 align='left'>" + FormatDate(today) + "</p>");
  f.Line("<p class=Title1 align='right'>Mirdal לTavlor קלאסית</p>");
  f.Line("<table width='100%' border='0' cellpadding='1' cellspacing='0'>");
  f.Line("  <tr><td colspan='5'><hr noshade size='2'></td></tr>");
  f.Line("  <tr valign='middle' bgcolor='white' align='right'>");
  f.Line("    <td width='10%' valign='middle'>מיקוד</td>");
  f.Line("    <td width='10%' valign='middle'>עיר</td>");
  f.Line("    <td width='30%' valign='middle'>כתובת</td>");
  f.Line("    <td width='20%' valign='middle'>איש קשר</td>");
  f.Line("    <td width='30%' valign='middle'>שם</td>");
  f.Line("  </tr>");
  f.Line("  <tr><td colspan='5'><hr noshade size='2'></td></tr>");
}

// "<prefix>" + the value as text (an empty cell, "&nbsp;", for a null value) + "</td>".
void CellLine(CodePageFile& f, std::string& line, const char* prefix, const db::Value& v) {
  line = prefix;
  if (db::IsNull(v)) {
    line += "&nbsp;";
  } else if (const auto* s = std::get_if<std::string>(&v)) {
    AppendHtmlEscaped(*s, line);
  } else {
    AppendValueText(v, line);
  }
  line += "</td>";
  f.Line(line);
}

}  // namespace

void CreateHTML(const std::string& pFileName, const std::string& pDBFile, const Panel& panel,
                const DocTypeTable& docTypes, const std::string& selectDbPath, UserSeam& ui,
                Date today) {
  CodePageFile f(pFileName, output_internal::Unmappable::kCharRef);
  ProgressReporter started(ui, 1);
  WriteListHead(f, today);

  db::Database database = db::Database::Open(pDBFile);
  db::Snapshot rs = database.OpenSnapshot(BuildRecipientsStatement(panel, docTypes, selectDbPath),
                                          db::SnapshotKind::Forward);
  if (rs.AtStart() || rs.AtEnd()) {  // either, right after opening: no rows
    // No recipients: the page stops after the column headings.
    f.Close();
    return;
  }
  // The geometry is needed only for the totals; reading it before the rows keeps a wrong
  // value from leaving half a list behind.
  const SheetGeometry g = ReadSheetGeometry(panel, false);

  const int64_t count = rs.TotalRows();
  const int zip = rs.FieldIndex("Zip");
  const int city = rs.FieldIndex("City");
  const int address = rs.FieldIndex("Address");
  const int details = rs.FieldIndex("Details");
  const int name = rs.FieldIndex("AccountName");

  ProgressReporter progress(ui, static_cast<double>(count));
  int64_t rows = 0;
  std::string line;
  while (!rs.AtEnd()) {
    ++rows;
    f.Line("  <tr valign='middle' bgcolor='#FFFFFF' align='right'>");
    CellLine(f, line, "    <td>", rs.Field(zip));
    CellLine(f, line, "    <td dir=rtl>", rs.Field(city));
    CellLine(f, line, "    <td dir=rtl>", rs.Field(address));
    CellLine(f, line, "    <td dir=rtl>", rs.Field(details));
    CellLine(f, line, "    <td dir=rtl dir=rtl>", rs.Field(name));
    f.Line("  </tr>");
    rs.MoveNext();
    if (rows % 5 == 0) progress.Update(static_cast<double>(rows));
  }

  f.Line("</table>");
  f.Line("<hr noshade width='100%' size='2'>");
  f.Line("<p class=Title1 align='right'>מספר הכרטיסים ברשימה: " + std::to_string(rows) + "</p>");
  const int64_t labelsPerPage = g.rows * g.cols;
  const int64_t labels = g.copies * rows;
  const int64_t pages = (labels + labelsPerPage - 1) / labelsPerPage;
  f.Line("<p class=Title1 align='right'>מספר הדפים הנדרשים: " + std::to_string(pages) + "</p>");
  f.Line("<br>");
  f.Line("<p class=Title1 align='center'>Vornak מערכות מידע</p>");
  f.Line("</BODY>");
  f.Line("</HTML>");
  f.Close();
}

}  // namespace zdr
