// The label sheet: one full-height table of rows x columns label cells per printed page,
// each recipient filling `copies` consecutive cells from the start position on.
#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

#include "output/outputinternal.h"
#include "output/picture.h"
#include "select/select.h"

#include "engine/engine.h"

namespace zdr {

output_internal::LabelFields::LabelFields(const db::Snapshot& rs)
    : name(rs.FieldIndex("AccountName")),
      key(rs.FieldIndex("AccountKey")),
      details(rs.FieldIndex("Details")),
      address(rs.FieldIndex("Address")),
      district(rs.FieldIndex("District")),
      city(rs.FieldIndex("City")),
      zip(rs.FieldIndex("Zip")),
      telephone(rs.FieldIndex("Telephone")) {}

namespace {

using output_internal::AppendHtmlEscaped;
using output_internal::AppendHtmlValue;
using output_internal::AppendSpreadInCells;
using output_internal::AppendValueText;
using output_internal::CodePageFile;
using output_internal::LabelFields;

const char* FontName(uint8_t font) {
  switch (font) {
    case 1:
      return "David";
    case 2:
      return "Miriam";
    default:
      return "Arial (Hebrew)";
  }
}

const char* WeightName(uint8_t weight) {
  switch (weight) {
    case 1:
      return "Bolder";
    case 2:
      return "Bold";
    default:
      return "Normal";
  }
}

void WriteStyles(CodePageFile& f, const LabelSettings& labels) {
  std::string line;
  for (int i = 0; i <= 7; ++i) {
    const LabelLineDef& d = labels.LabelDefs[i];
    line = "       .Line" + std::to_string(i) + " {font-family:" + FontName(d.Font) +
           "; font-weight:" + WeightName(d.FontWeight) +
           "; font-size:" + std::to_string(d.FontSize) + "pt" +
           "; font-style:" + (d.FontItalic == 1 ? "Italic" : "Normal") +
           (d.FontUL == 1 ? "; text-decoration: underline" : "") + "; color:black;}";
    f.Line(line);
  }
}

// Printing rules: each page table fills one printed page and breaks after it, so every
// sheet lands on a page of its own with the same grid; the paper's own margins are the
// label stock's. The cells keep their sizes whatever a label holds: a label is a block of
// the cell's height, centred, whose long words wrap and whose overflow is cut off, so it
// neither widens its column nor pushes the rows below it. A blank line keeps its height, so
// the labels of a sheet are as tall as each other and their first lines stand in line.
void WritePageRules(CodePageFile& f, const SheetGeometry& g) {
  f.Line("       @page {margin:0}");
  f.Line("       body {margin:0}");
  f.Line("       body > table {page-break-after:always; height:100vh; table-layout:fixed}");
  f.Line(
      "       body > table > tbody > tr > td > table {display:flex; flex-direction:column; "
      "justify-content:safe center; width:90%; height:" +
      PercentOfOne(g.rows) + "vh; margin:0 auto; overflow:hidden}");
  f.Line("       td td {height:1.1em; line-height:1.1; overflow-wrap:anywhere}");
}

void AppendEscapedText(const db::Value& v, std::string& out) {
  if (const auto* s = std::get_if<std::string>(&v)) {
    AppendHtmlEscaped(*s, out);
  } else {
    AppendValueText(v, out);
  }
}

// The field's text for a label line: an empty line for a null value (an empty field of a
// document header), as for the telephone.
void AppendLineText(const db::Value& v, std::string& out) {
  if (db::IsNull(v)) {
    out += "&nbsp;";
  } else {
    AppendEscapedText(v, out);
  }
}

// ---- Whether the chosen lines fit a row of the sheet --------------------------------------
//
// The page rules give every label its row's height and cut what overflows it; once a label
// is taller than its row, a browser lays it from the top, so its last lines are lost. A
// text line takes 1.1 times its font size and the cell padding, a pixel above and below;
// the key line's outer cell is at least the page's own 12 points; a picture its height in
// pixels. A line counts as cut when more than its leading and padding is lost (its glyphs
// stand in the middle of its height). The sheet's bytes stay as they are: the command says
// which lines are cut before the page opens.

// What decides whether a line holds anything on a label.
enum class LineContent { kAlways, kName, kKey, kDetails, kAddress, kDistrict, kCityZip, kPhone };

struct FitLine {
  std::string caption;
  double heightPt;
  LineContent content;
  double slackPt;  // how much of its bottom may be lost with nothing visible
};

struct Paper {
  const char* name;
  double heightMm;
};
constexpr Paper kPapers[] = {{"A4", 297}, {"Letter", 279.4}};

std::vector<FitLine> ChosenLines(const Panel& panel, const LabelSettings& labels) {
  auto on = [&](int i) { return Panel::On(panel.ChkTitle[i]); };
  auto text = [&](int style) { return 1.1 * labels.LabelDefs[style].FontSize + 1.5; };
  auto slack = [&](int style) { return 0.15 * labels.LabelDefs[style].FontSize + 0.75; };
  auto picture = [&](int i) {
    int w = 0, h = 0;
    std::string problem;
    // A picture that cannot be read shows as a small broken-picture mark.
    if (!output_internal::ReadLabelPictureSize(labels.LabPics[i], w, h, problem)) h = 16;
    return std::max(h + 2, 16) * 0.75;
  };
  std::vector<FitLine> lines;
  if (Panel::On(panel.ChkLogo[0]))
    lines.push_back({"התמונה העליונה", picture(0), LineContent::kAlways, 0.75});
  if (on(0)) lines.push_back({"לכבוד", text(0), LineContent::kAlways, slack(0)});
  if (on(1)) lines.push_back({"שם כרטיס", text(1), LineContent::kName, slack(1)});
  if (on(2)) {
    const double key = std::max(1.1 * 12, 1.1 * labels.LabelDefs[2].FontSize) + 1.5;
    lines.push_back({"קוד כרטיס", key, LineContent::kKey, slack(2)});
  }
  if (on(3)) lines.push_back({"איש קשר", text(3), LineContent::kDetails, slack(3)});
  if (on(4)) lines.push_back({"כתובת", text(4), LineContent::kAddress, slack(4)});
  if (on(6)) lines.push_back({"שכונה", text(6), LineContent::kDistrict, slack(6)});
  if (on(5) || on(8)) {
    lines.push_back({on(5) && on(8) ? "עיר ומיקוד"
                     : on(5)        ? "עיר"
                                    : "מיקוד",
                     text(5), LineContent::kCityZip, slack(5)});
  }
  if (on(7)) lines.push_back({"טלפון", text(7), LineContent::kPhone, slack(7)});
  if (Panel::On(panel.ChkLogo[1]))
    lines.push_back({"התמונה התחתונה", picture(1), LineContent::kAlways, 0.75});
  return lines;
}

// Counts, for each paper, the labels that lose a line holding something.
class FitCounter {
 public:
  FitCounter(const Panel& panel, const LabelSettings& labels, const SheetGeometry& g)
      : lines_(ChosenLines(panel, labels)), rows_(g.rows) {
    const double percent = std::stod(PercentOfOne(g.rows));
    for (size_t p = 0; p < std::size(kPapers); ++p) {
      const double rowPt = kPapers[p].heightMm * percent / 100 * 72 / 25.4;
      double bottom = 0;
      for (size_t i = 0; i < lines_.size(); ++i) {
        bottom += lines_[i].heightPt;
        if (bottom > rowPt + lines_[i].slackPt) cut_[p].push_back(i);
      }
    }
  }

  bool AnyCut() const { return !cut_[0].empty() || !cut_[1].empty(); }

  void Count(const db::Snapshot& rs, const LabelFields& f) {
    for (size_t p = 0; p < std::size(kPapers); ++p) {
      for (size_t i : cut_[p]) {
        if (Holds(rs, f, lines_[i].content)) {
          ++labels_[p];
          break;
        }
      }
    }
  }

  // The message for the clerk, or an empty string when no label loses a line.
  std::string Message() const {
    std::string out;
    for (size_t p = 0; p < std::size(kPapers); ++p) {
      if (labels_[p] == 0) continue;
      out += out.empty() ? "" : "; ";
      out += std::string("בדף ") + kPapers[p].name +
             (cut_[p].size() == 1 ? " נחתכת השורה " : " נחתכות השורות ");
      for (size_t k = 0; k < cut_[p].size(); ++k)
        out += (k == 0 ? "\"" : ", \"") + lines_[cut_[p][k]].caption + "\"";
      out += " ב-" + std::to_string(labels_[p]) + " מדבקות";
    }
    if (out.empty()) return out;
    return "שורות המדבקה בגדלים שנבחרו גבוהות משורה של הגיליון (" + std::to_string(rows_) +
           " שורות בעמוד), והדפדפן יחתוך אותן: " + out +
           ". הקטינו את גודל הגופן או את מספר השורות, או הפיקו את המדבקות כ-PDF על גיליון "
           "מדבקות (בהגדרות המדבקה), שמקטין את הגופן עד שכל השורות נכנסות.";
  }

 private:
  static bool Filled(const db::Value& v) {
    if (db::IsNull(v)) return false;
    const auto* s = std::get_if<std::string>(&v);
    return s == nullptr || s->find_first_not_of(' ') != std::string::npos;
  }
  static bool Holds(const db::Snapshot& rs, const LabelFields& f, LineContent c) {
    switch (c) {
      case LineContent::kAlways:
        return true;
      case LineContent::kName:
        return Filled(rs.Field(f.name));
      case LineContent::kKey:
        return Filled(rs.Field(f.key));
      case LineContent::kDetails:
        return Filled(rs.Field(f.details));
      case LineContent::kAddress:
        return Filled(rs.Field(f.address));
      case LineContent::kDistrict:
        return Filled(rs.Field(f.district));
      case LineContent::kCityZip:
        return Filled(rs.Field(f.city)) || Filled(rs.Field(f.zip));
      case LineContent::kPhone:
        return Filled(rs.Field(f.telephone));
    }
    return false;
  }

  std::vector<FitLine> lines_;
  int64_t rows_;
  std::vector<size_t> cut_[std::size(kPapers)];
  int64_t labels_[std::size(kPapers)] = {};
};

class SheetWriter {
 public:
  SheetWriter(CodePageFile& f, db::Snapshot& rs, const SheetGeometry& g, const Panel& panel,
              const LabelSettings& labels)
      : f_(f), rs_(rs), g_(g), fields_(rs), fit_(panel, labels, g) {
    for (int i = 0; i < 9; ++i) title_[i] = Panel::On(panel.ChkTitle[i]);
    for (int i = 0; i < 2; ++i) {
      logo_[i] = Panel::On(panel.ChkLogo[i]);
      pic_[i] = "    <tr valign='middle' align='center'><td><img border='0' src='";
      AppendHtmlEscaped(labels.LabPics[i], pic_[i], true);
      pic_[i] += "'></td></tr>";
    }
    cellOpen_ = "    <td valign='middle' width='" + PercentOfOne(g.cols) + "%' height='" +
                PercentOfOne(g.rows) + "%' align='center'>";
  }

  // Which labels lose lines to the row's height.
  const FitCounter& fit() const { return fit_; }

  void WritePage(int64_t page) {
    f_.Line(
        "<table height='100%' width='100%' border='0' cellpadding='0' cellspacing='0' "
        "dir='rtl'>");
    for (int64_t row = 1; row <= g_.rows; ++row) {
      f_.Line("  <tr valign='middle' align='right'>");
      for (int64_t col = 1; col <= g_.cols; ++col) {
        const int64_t position = (row - 1) * g_.cols + col;
        WriteCell(page == 1 && position < g_.start);
      }
      f_.Line("  </tr>");
    }
    f_.Line("</table>");
  }

 private:
  void WriteCell(bool skipped) {
    f_.Line(cellOpen_);
    f_.Line("     <table border='0' cellpadding='1' cellspacing='0' dir='rtl'>");
    if (!rs_.AtEnd() && !skipped) {
      WriteLabel();
      if (fit_.AnyCut()) fit_.Count(rs_, fields_);
      if (++copy_ == g_.copies) {
        copy_ = 0;
        rs_.MoveNext();
      }
    } else {
      f_.Line("    <tr><td nowrap>&nbsp;</td></tr>");
    }
    f_.Line("     </table>");
    f_.Line("    </td>");
  }

  void TextLine(const char* cls, int field) {
    line_ = "    <tr class='";
    line_ += cls;
    line_ += "' align='right'><td>";
    AppendLineText(rs_.Field(field), line_);
    line_ += "</td></tr>";
    f_.Line(line_);
  }

  void WriteLabel() {
    if (logo_[0]) f_.Line(pic_[0]);
    if (title_[0]) f_.Line("    <tr class='Line0' align='right'><td>לכבוד</td></tr>");
    if (title_[1]) TextLine("Line1", fields_.name);
    if (title_[2]) {
      line_ = "    <tr align='right'><td>";
      AppendSpreadInCells(rs_.Field(fields_.key), "Line2", line_);
      line_ += "</td></tr>";
      f_.Line(line_);
    }
    if (title_[3]) TextLine("Line3", fields_.details);
    if (title_[4]) TextLine("Line4", fields_.address);
    if (title_[6]) TextLine("Line6", fields_.district);
    if (title_[5] && title_[8]) {
      // Joined on one line, a null part counts as empty.
      line_ = "    <tr class='Line5' align='right'><td>";
      AppendEscapedText(rs_.Field(fields_.city), line_);
      line_ += "    ";
      AppendEscapedText(rs_.Field(fields_.zip), line_);
      line_ += "</td></tr>";
      f_.Line(line_);
    } else if (title_[8]) {
      TextLine("Line5", fields_.zip);
    } else if (title_[5]) {
      TextLine("Line5", fields_.city);
    }
    if (title_[7]) {
      line_ = "    <tr class=Line7 align='right'><td>";
      AppendHtmlValue(rs_.Field(fields_.telephone), line_);
      line_ += "</td></tr>";
      f_.Line(line_);
    }
    if (logo_[1]) f_.Line(pic_[1]);
  }

  CodePageFile& f_;
  db::Snapshot& rs_;
  const SheetGeometry& g_;
  LabelFields fields_;
  bool title_[9] = {};
  bool logo_[2] = {};
  std::string pic_[2];
  std::string cellOpen_;
  std::string line_;
  int64_t copy_ = 0;
  FitCounter fit_;
};

}  // namespace

void CreateLabFile(const std::string& pFileName, const std::string& pDBFile, const Panel& panel,
                   const DocTypeTable& docTypes, const std::string& selectDbPath,
                   const LabelSettings& labels, UserSeam& ui) {
  const SheetGeometry g = ReadSheetGeometry(panel, true);
  const int64_t labelsPerPage = g.rows * g.cols;

  CodePageFile f(pFileName, output_internal::Unmappable::kCharRef);
  ProgressReporter progress(ui, 1);
  output_internal::WritePageHead(f);
  f.Line("<style>");
  WriteStyles(f, labels);
  WritePageRules(f, g);
  f.Line("</style>");
  f.Line("</HEAD>");
  f.Line("<BODY BGCOLOR='#FFFFFF'>");

  db::Database database = db::Database::Open(pDBFile);
  // The rows are read as the sheet is written; their number, which fixes the pages, is known
  // when the snapshot opens.
  db::Snapshot rs = database.OpenSnapshot(BuildRecipientsStatement(panel, docTypes, selectDbPath),
                                          db::SnapshotKind::Forward);
  if (rs.AtStart() || rs.AtEnd()) {  // either, right after opening: no rows
    // No recipients: the page stops after the BODY line.
    f.Close();
    return;
  }
  const int64_t count = rs.TotalRows();

  // A start position below 1 means the first cell; counting it as such keeps the last
  // recipients from falling off the sheet.
  const int64_t start = std::max<int64_t>(g.start, 1);
  const int64_t total = g.copies * (start + count - 1);
  const int64_t pages = (total + labelsPerPage - 1) / labelsPerPage;

  SheetWriter sheet(f, rs, g, panel, labels);
  ProgressReporter pageProgress(ui, static_cast<double>(pages));
  for (int64_t page = 1; page <= pages; ++page) {
    sheet.WritePage(page);
    pageProgress.Update(static_cast<double>(page));
  }
  f.Line("</BODY>");
  f.Line("</HTML>");
  f.Close();
  if (const std::string cut = sheet.fit().Message(); !cut.empty())
    ui.ShowMessage(cut, kTitleAttention, MsgIcon::Exclamation);
}

}  // namespace zdr
