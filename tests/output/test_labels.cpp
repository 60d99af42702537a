// The label sheet, its value helpers and the sheet geometry.
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <csignal>

#include "output/outputtest.h"

namespace zdr::test {
namespace {

const std::string kCellEmpty = "    <tr><td nowrap>&nbsp;</td></tr>";
const std::string kPageOpen =
    "<table height='100%' width='100%' border='0' cellpadding='0' cellspacing='0' dir='rtl'>";
const std::string kInnerOpen = "     <table border='0' cellpadding='1' cellspacing='0' dir='rtl'>";

// The printing rules after the line styles, for a sheet of `rows` rows ("12.5" for 8).
std::vector<std::string> PageRules(const std::string& rowHeight = "12.5") {
  return {"       @page {margin:0}", "       body {margin:0}",
          "       body > table {page-break-after:always; height:100vh; table-layout:fixed}",
          "       body > table > tbody > tr > td > table {display:flex; flex-direction:column; "
          "justify-content:safe center; width:90%; height:" +
              rowHeight + "vh; margin:0 auto; overflow:hidden}",
          "       td td {height:1.1em; line-height:1.1; overflow-wrap:anywhere}"};
}

std::vector<std::string> SheetHead(const std::vector<std::string>& styles,
                                   const std::string& rowHeight = "12.5") {
  std::vector<std::string> l = {
      "<HTML>",
      "<!-- saved from url=(0024)http://www.vornak.co.il/ -->",
      "<HEAD>",
      "<TITLE>Vornak מערכות מידע מציגה</TITLE>",
      "<meta http-equiv='Content-Type' content='text/html; charset=windows-1255'>",
      "<style>"};
  l.insert(l.end(), styles.begin(), styles.end());
  const auto rules = PageRules(rowHeight);
  l.insert(l.end(), rules.begin(), rules.end());
  l.insert(l.end(), {"</style>", "</HEAD>", "<BODY BGCOLOR='#FFFFFF'>"});
  return l;
}

std::vector<std::string> DefaultStyles() {
  std::vector<std::string> s;
  for (int i = 0; i < 8; ++i) {
    s.push_back("       .Line" + std::to_string(i) +
                " {font-family:Arial (Hebrew); font-weight:Normal; font-size:9pt; "
                "font-style:Normal; color:black;}");
  }
  return s;
}

// The pages of a sheet, each from its table line on.
std::vector<std::string> Pages(const std::string& sheet) {
  std::vector<std::string> pages;
  size_t at = sheet.find(kPageOpen);
  while (at != std::string::npos) {
    const size_t next = sheet.find(kPageOpen, at + 1);
    pages.push_back(sheet.substr(at, next == std::string::npos ? std::string::npos : next - at));
    at = next;
  }
  return pages;
}

// The cells of a page in order, each the text between its <td ...> line and "    </td>".
std::vector<std::string> Cells(const std::string& page) {
  std::vector<std::string> cells;
  const std::string open = "    <td valign='middle' ";
  for (size_t at = page.find(open); at != std::string::npos; at = page.find(open, at + 1)) {
    const size_t end = page.find("    </td>\r\n", at);
    cells.push_back(page.substr(at, end - at));
  }
  return cells;
}

bool IsEmptyCell(const std::string& cell) {
  return cell.find(kCellEmpty) != std::string::npos;
}

class LabelSheetTest : public OutputTest {
 protected:
  std::string Write(const std::vector<AccountRow>& rows) {
    const std::string db = BuildDb(rows);
    const std::string out = PathOf("zdrlab1.htm");
    CreateLabFile(out, db, panel, docTypes, "", labels, seam);
    return Utf8File(out);
  }
  void NameOnly() {
    panel.ChkTitle = {};
    panel.ChkTitle[1] = 1;
  }
};

// The disk takes only part of the page (here a file size limit): the writer fails, so the
// command never reports the page as done.
TEST_F(LabelSheetTest, PageCutShortByTheDiskIsAnError) {
  const std::string db = BuildDb(NumberedAccounts(300));
  rlimit old{};
  ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &old), 0);
  rlimit small = old;
  small.rlim_cur = 16 * 1024;
  const auto oldHandler = std::signal(SIGXFSZ, SIG_IGN);
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
  EXPECT_THROW(CreateLabFile(PathOf("zdrlab1.htm"), db, panel, docTypes, "", labels, seam),
               OutputError);
  ::setrlimit(RLIMIT_FSIZE, &old);
  std::signal(SIGXFSZ, oldHandler);
  EXPECT_LE(std::filesystem::file_size(PathOf("zdrlab1.htm")), 16u * 1024);
}

TEST_F(LabelSheetTest, NoRecipientsStopsAfterBody) {
  labels.LabelDefs[1] = {0, 12, 2, 0, 0};
  labels.LabelDefs[3] = {1, 10, 1, 1, 1};
  labels.LabelDefs[5] = {2, 255, 0, 1, 0};
  const std::string sheet = Write({});
  std::vector<std::string> styles = DefaultStyles();
  styles[1] =
      "       .Line1 {font-family:Arial (Hebrew); font-weight:Bold; font-size:12pt; "
      "font-style:Normal; color:black;}";
  styles[3] =
      "       .Line3 {font-family:David; font-weight:Bolder; font-size:10pt; font-style:Italic; "
      "text-decoration: underline; color:black;}";
  styles[5] =
      "       .Line5 {font-family:Miriam; font-weight:Normal; font-size:255pt; "
      "font-style:Normal; text-decoration: underline; color:black;}";
  EXPECT_EQ(sheet, Lines(SheetHead(styles)));
}

TEST_F(LabelSheetTest, EveryLineOfOneSheetExact) {
  panel.txtRows = "1";
  panel.txtCols = "2";
  panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
  panel.ChkLogo = {1, 1};
  labels.LabPics = {"/img/top.png", "/img/bottom.png"};
  const std::string sheet =
      Write({{"12 3", "כהן משה", "הרצל 5", "חיפה", "31000", "כרמל", "דנה", "04-8500000"},
             {"7", "לוי", std::nullopt, std::nullopt, "32000", std::nullopt, std::nullopt,
              std::nullopt}});
  auto cell = [](std::vector<std::string> inner) {
    std::vector<std::string> l = {
        "    <td valign='middle' width='50.0%' height='100.0%' align='center'>", kInnerOpen};
    l.insert(l.end(), inner.begin(), inner.end());
    l.insert(l.end(), {"     </table>", "    </td>"});
    return l;
  };
  const std::string top =
      "    <tr valign='middle' align='center'><td><img border='0' src='/img/top.png'></td></tr>";
  const std::string bottom =
      "    <tr valign='middle' align='center'><td><img border='0' src='/img/bottom.png'></td></tr>";
  std::vector<std::string> want = SheetHead(DefaultStyles(), "100.0");
  want.insert(want.end(), {kPageOpen, "  <tr valign='middle' align='right'>"});
  for (const auto& l :
       cell({top, "    <tr class='Line0' align='right'><td>לכבוד</td></tr>",
             "    <tr class='Line1' align='right'><td>כהן משה</td></tr>",
             "    <tr align='right'><td><table class='Line2' cellspacing='0' cellpadding='0' "
             "border='0' align='right' dir='rtl'><tr><td>1</td><td>2</td><td>&nbsp;</td>"
             "<td>3</td></tr></table></td></tr>",
             "    <tr class='Line3' align='right'><td>דנה</td></tr>",
             "    <tr class='Line4' align='right'><td>הרצל 5</td></tr>",
             "    <tr class='Line6' align='right'><td>כרמל</td></tr>",
             "    <tr class='Line5' align='right'><td>חיפה    31000</td></tr>",
             "    <tr class=Line7 align='right'><td>04-8500000</td></tr>", bottom}))
    want.push_back(l);
  for (const auto& l :
       cell({top, "    <tr class='Line0' align='right'><td>לכבוד</td></tr>",
             "    <tr class='Line1' align='right'><td>לוי</td></tr>",
             "    <tr align='right'><td><table class='Line2' cellspacing='0' cellpadding='0' "
             "border='0' align='right' dir='rtl'><tr><td>7</td></tr></table></td></tr>",
             "    <tr class='Line3' align='right'><td>&nbsp;</td></tr>",
             "    <tr class='Line4' align='right'><td>&nbsp;</td></tr>",
             "    <tr class='Line6' align='right'><td>&nbsp;</td></tr>",
             "    <tr class='Line5' align='right'><td>    32000</td></tr>",
             "    <tr class=Line7 align='right'><td>&nbsp;</td></tr>", bottom}))
    want.push_back(l);
  want.insert(want.end(), {"  </tr>", "</table>", "</BODY>", "</HTML>"});
  EXPECT_EQ(sheet, Lines(want));
}

TEST_F(LabelSheetTest, FileIsWindows1255WithCrLf) {
  panel.ChkTitle[0] = 1;
  const std::string db = BuildDb(NumberedAccounts(1));
  const std::string out = PathOf("zdrlab1.htm");
  CreateLabFile(out, db, panel, docTypes, "", labels, seam);
  const std::string bytes = ReadBytes(out);
  EXPECT_NE(bytes.find("<td>\xEC\xEB\xE1\xE5\xE3</td></tr>\r\n"), std::string::npos);
  EXPECT_EQ(Count(bytes, "\n"), Count(bytes, "\r\n"));
}

TEST_F(LabelSheetTest, TwentyFiveOnEightByThreeGivesTwoPages) {
  NameOnly();
  const std::string sheet = Write(NumberedAccounts(25));
  const auto pages = Pages(sheet);
  ASSERT_EQ(pages.size(), 2u);
  const auto first = Cells(pages[0]), second = Cells(pages[1]);
  ASSERT_EQ(first.size(), 24u);
  ASSERT_EQ(second.size(), 24u);
  EXPECT_NE(first[0].find("<td>לקוח 1</td>"), std::string::npos);
  EXPECT_NE(first[23].find("<td>לקוח 24</td>"), std::string::npos);
  EXPECT_NE(second[0].find("<td>לקוח 25</td>"), std::string::npos);
  for (size_t i = 1; i < 24; ++i) EXPECT_TRUE(IsEmptyCell(second[i])) << i;
  EXPECT_NE(first[0].find("width='33.3%' height='12.5%'"), std::string::npos);
  EXPECT_EQ(Count(pages[0], "  <tr valign='middle' align='right'>"), 8u);
  EXPECT_TRUE(sheet.ends_with("</table>\r\n</BODY>\r\n</HTML>\r\n"));
}

// Start-1 empty cells, then `copies` adjacent cells per recipient in order, then empty
// cells to the end of the last page; a start below one counts as one.
TEST_F(LabelSheetTest, StartAndCopiesPlaceEveryRecipient) {
  NameOnly();
  struct Case {
    const char *rows, *cols, *start, *copies;
    int count;
    size_t skipped, perRecipient, pages;
  };
  const Case cases[] = {
      {"8", "3", "5", "1", 25, 4, 1, 2}, {"8", "3", "5", "2", 25, 4, 2, 3},
      {"8", "3", "1", "0", 3, 0, 0, 0},  {"2", "2", "0", "1", 4, 0, 1, 1},
      {"2", "2", "-3", "1", 4, 0, 1, 1},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string("start ") + c.start + ", copies " + c.copies);
    panel.txtRows = c.rows;
    panel.txtCols = c.cols;
    panel.txtStartFrom = c.start;
    panel.txtCopies = c.copies;
    const auto pages = Pages(Write(NumberedAccounts(c.count)));
    ASSERT_EQ(pages.size(), c.pages);
    std::vector<std::string> cells;
    for (const auto& p : pages)
      for (const auto& cell : Cells(p)) cells.push_back(cell);
    for (size_t i = 0; i < cells.size(); ++i) {
      const size_t k = i - c.skipped;
      if (i < c.skipped || k >= c.count * c.perRecipient) {
        EXPECT_TRUE(IsEmptyCell(cells[i])) << i;
      } else {
        const std::string name = "<td>לקוח " + std::to_string(k / c.perRecipient + 1) + "</td>";
        EXPECT_NE(cells[i].find(name), std::string::npos) << i;
      }
    }
  }
}

TEST_F(LabelSheetTest, StartBeyondSheetLeavesFirstPageEmpty) {
  NameOnly();
  panel.txtStartFrom = "30";
  const auto pages = Pages(Write(NumberedAccounts(3)));
  ASSERT_EQ(pages.size(), 2u);  // 30 + 3 - 1 = 32 cells
  for (const auto& c : Cells(pages[0])) EXPECT_TRUE(IsEmptyCell(c));
  EXPECT_NE(Cells(pages[1])[0].find("<td>לקוח 1</td>"), std::string::npos);
}

TEST_F(LabelSheetTest, CityAndZipSwitches) {
  const std::vector<AccountRow> rows = {{"1", "א", "ב", "חיפה", "31000", "ג", "ד", "ה"},
                                        {"2", "א", "ב", std::nullopt, std::nullopt, "ג", "ד", "ה"}};
  panel.ChkTitle = {};
  panel.ChkTitle[5] = 1;
  std::string sheet = Write(rows);
  EXPECT_EQ(Count(sheet, "<tr class='Line5' align='right'><td>חיפה</td></tr>"), 1u);
  EXPECT_EQ(Count(sheet, "<tr class='Line5' align='right'><td>&nbsp;</td></tr>"), 1u);
  panel.ChkTitle[5] = 0;
  panel.ChkTitle[8] = 1;
  sheet = Write(rows);
  EXPECT_EQ(Count(sheet, "<tr class='Line5' align='right'><td>31000</td></tr>"), 1u);
  EXPECT_EQ(Count(sheet, "<tr class='Line5' align='right'><td>&nbsp;</td></tr>"), 1u);
  panel.ChkTitle[5] = 1;
  sheet = Write(rows);
  EXPECT_EQ(Count(sheet, "<tr class='Line5' align='right'><td>חיפה    31000</td></tr>"), 1u);
  EXPECT_EQ(Count(sheet, "<tr class='Line5' align='right'><td>    </td></tr>"), 1u);
}

TEST_F(LabelSheetTest, AllSwitchesOffKeepsCellCount) {
  panel.ChkTitle = {};
  panel.ChkLogo = {};
  panel.txtRows = "2";
  panel.txtCols = "2";
  const std::string sheet = Write(NumberedAccounts(5));
  const auto pages = Pages(sheet);
  ASSERT_EQ(pages.size(), 2u);
  const auto second = Cells(pages[1]);
  EXPECT_EQ(second[0], "    <td valign='middle' width='50.0%' height='50.0%' align='center'>\r\n" +
                           kInnerOpen + "\r\n     </table>\r\n");
  EXPECT_TRUE(IsEmptyCell(second[1]));
  EXPECT_EQ(Count(sheet, kCellEmpty), 3u);
}

TEST_F(LabelSheetTest, TwelveRowsGiveLeadingZeroHeight) {
  NameOnly();
  panel.txtRows = "12";
  panel.txtCols = "1";
  const std::string sheet = Write(NumberedAccounts(1));
  EXPECT_NE(sheet.find("width='100.0%' height='08.3%'"), std::string::npos);
}

TEST_F(LabelSheetTest, ProgressStartsAndEndsAtZero) {
  NameOnly();
  Write(NumberedAccounts(30));
  ASSERT_GE(seam.progress.size(), 2u);
  EXPECT_EQ(seam.progress.front(), 0);
  EXPECT_EQ(seam.progress.back(), 0);
  EXPECT_NE(std::find(seam.progress.begin(), seam.progress.end(), kProgressFrameWidth),
            seam.progress.end());
}

TEST_F(LabelSheetTest, OldFileIsReplaced) {
  const std::string out = PathOf("zdrlab1.htm");
  std::ofstream(out) << std::string(100000, 'x');
  const std::string db = BuildDb({});
  CreateLabFile(out, db, panel, docTypes, "", labels, seam);
  EXPECT_EQ(Utf8File(out), Lines(SheetHead(DefaultStyles())));
}

TEST_F(LabelSheetTest, MissingDatabaseIsAnEngineError) {
  EXPECT_THROW(
      CreateLabFile(PathOf("zdrlab1.htm"), PathOf("none.DB"), panel, docTypes, "", labels, seam),
      db::EngineError);
  EXPECT_EQ(seam.progress.back(), 0);
}

// Faults mended.

// Regression: an empty field of the document header printed the word "Null" on the label.
TEST_F(LabelSheetTest, EmptyHeaderFieldPrintedTheWordNull) {
  UseDocuments();
  panel.ChkTitle = {0, 1, 0, 0, 1, 1, 0, 0, 0};
  const std::string out = PathOf("zdrlab1.htm");
  CreateLabFile(out,
                BuildDb({{"1", "חשבון", "כתובת", "עכו", "24000", "", "", "04"}},
                        {{"1", 501, std::nullopt, std::nullopt, std::nullopt, std::nullopt}}),
                panel, docTypes, "", labels, seam);
  const std::string sheet = Utf8File(out);
  EXPECT_EQ(sheet.find("Null"), std::string::npos);
  for (const char* line : {"Line1", "Line4", "Line5"}) {
    EXPECT_EQ(Count(sheet, "<tr class='" + std::string(line) + "' align='right'><td>&nbsp;</td>"),
              1u)
        << line;
  }
}

TEST_F(LabelSheetTest, ValuesWithMarkupAreEscaped) {
  panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
  panel.ChkLogo = {1, 0};
  labels.LabPics[0] = "/img/it's & <me>.png";
  const std::string sheet =
      Write({{"A<1", "A&B <סניף>", "רח' 5 > 4", "a&b", "<z>", "&d", "<b>x</b>", "<03>"}});
  EXPECT_NE(sheet.find("<td>A&amp;B &lt;סניף&gt;</td>"), std::string::npos);
  EXPECT_NE(sheet.find("<td>רח' 5 &gt; 4</td>"), std::string::npos);
  EXPECT_NE(sheet.find("<td>a&amp;b    &lt;z&gt;</td>"), std::string::npos);
  EXPECT_NE(sheet.find("<td>&amp;d</td>"), std::string::npos);
  EXPECT_NE(sheet.find("<td>&lt;b&gt;x&lt;/b&gt;</td>"), std::string::npos);
  EXPECT_NE(sheet.find("<td>&lt;03&gt;</td>"), std::string::npos);
  EXPECT_NE(sheet.find("<td>A</td><td>&lt;</td><td>1</td>"), std::string::npos);
  EXPECT_NE(sheet.find("src='/img/it&#39;s &amp; &lt;me&gt;.png'>"), std::string::npos);
}

TEST_F(LabelSheetTest, PicturePathOutsideCodePageIsKept) {
  panel.ChkTitle = {};
  panel.ChkLogo = {1, 0};
  labels.LabPics[0] = "/img/Жук.png";
  const std::string out = PathOf("zdrlab1.htm");
  CreateLabFile(out, BuildDb(NumberedAccounts(1)), panel, docTypes, "", labels, seam);
  EXPECT_NE(ReadBytes(out).find("src='/img/&#1046;&#1091;&#1082;.png'"), std::string::npos);
}

TEST_F(LabelSheetTest, WideCountGivesCompleteSheet) {
  NameOnly();
  panel.txtRows = "10";
  panel.txtCols = "10";
  const std::string sheet = Write(NumberedAccounts(100000));
  EXPECT_EQ(Count(sheet, kPageOpen), 1000u);
  EXPECT_EQ(Count(sheet, "<tr class='Line1'"), 100000u);
  EXPECT_NE(sheet.find("<td>לקוח 100000</td>"), std::string::npos);
  EXPECT_EQ(Count(sheet, kCellEmpty), 0u);
}

class GeometryTest : public LabelSheetTest {};

TEST_F(GeometryTest, BadGeometryIsAClearErrorAndKeepsTheOldFile) {
  const std::string db = BuildDb(NumberedAccounts(2));
  const std::string out = PathOf("zdrlab1.htm");
  struct Case {
    const char *rows, *cols, *copies, *start, *words;
  };
  const Case cases[] = {
      {"0", "3", "1", "1", "מספר השורות"},        {"8", "0", "1", "1", "מספר העמודות"},
      {"abc", "3", "1", "1", "מספר השורות"},      {"8", "", "1", "1", "מספר העמודות"},
      {"8", "3", "256", "1", "מספר העותקים"},     {"8", "3", "-1", "1", "מספר העותקים"},
      {"200", "200", "1", "1", "שורות × עמודות"}, {"-8", "3", "1", "1", "מספר השורות"},
      {"8", "3", "1", "x", "מדבקת ההתחלה"},       {"8", "3", "1", "40000", "מדבקת ההתחלה"},
  };
  for (const Case& c : cases) {
    std::ofstream(out) << "old";
    panel.txtRows = c.rows;
    panel.txtCols = c.cols;
    panel.txtCopies = c.copies;
    panel.txtStartFrom = c.start;
    try {
      CreateLabFile(out, db, panel, docTypes, "", labels, seam);
      ADD_FAILURE() << c.rows << "x" << c.cols << " copies " << c.copies;
    } catch (const OutputError& e) {
      EXPECT_NE(std::string(e.what()).find(c.words), std::string::npos) << e.what();
    }
    EXPECT_EQ(ReadBytes(out), "old");
  }
}

TEST_F(GeometryTest, NumbersAreReadLikeTheHost) {
  panel.txtRows = " 8 ";
  panel.txtCols = "2.5";  // halves to even
  panel.txtCopies = "3.5";
  panel.txtStartFrom = "1";
  const SheetGeometry g = ReadSheetGeometry(panel, true);
  EXPECT_EQ(g.rows, 8);
  EXPECT_EQ(g.cols, 2);
  EXPECT_EQ(g.copies, 4);
  panel.txtRows = "32767";
  panel.txtCols = "1";
  EXPECT_EQ(ReadSheetGeometry(panel, true).rows, 32767);
}

TEST(PercentOfOne, PatternZeroZeroPointZero) {
  EXPECT_EQ(PercentOfOne(8), "12.5");
  EXPECT_EQ(PercentOfOne(3), "33.3");
  EXPECT_EQ(PercentOfOne(12), "08.3");
  EXPECT_EQ(PercentOfOne(1), "100.0");
  EXPECT_EQ(PercentOfOne(16), "06.3");  // 6.25, the half away from zero
  EXPECT_EQ(PercentOfOne(1000), "00.1");
  EXPECT_EQ(PercentOfOne(32767), "00.0");
}

TEST(HtmlHelpers, HtmlValue) {
  EXPECT_EQ(HtmlValue(db::Value{}), "&nbsp;");
  EXPECT_EQ(HtmlValue(db::Value{std::string("03-5551234")}), "03-5551234");
  EXPECT_EQ(HtmlValue(db::Value{std::string("a&b<c>")}), "a&amp;b&lt;c&gt;");
  EXPECT_EQ(HtmlValue(db::Value{int64_t{1000}}), "1000");
}

TEST(HtmlHelpers, SpreadInCells) {
  EXPECT_EQ(SpreadInCells(db::Value{std::string("12 3")}, "Line2"),
            "<table class='Line2' cellspacing='0' cellpadding='0' border='0' align='right' "
            "dir='rtl'><tr><td>1</td><td>2</td><td>&nbsp;</td><td>3</td></tr></table>");
  EXPECT_EQ(SpreadInCells(db::Value{std::string("א   ב ")}, ""),
            "<table cellspacing='0' cellpadding='0' border='0' align='right' dir='rtl'><tr>"
            "<td>א</td><td>&nbsp;</td><td>ב</td><td>&nbsp;</td></tr></table>");
  EXPECT_EQ(SpreadInCells(db::Value{}, "Line2"),
            "<table class='Line2' cellspacing='0' cellpadding='0' border='0' align='right' "
            "dir='rtl'><tr></tr></table>");
  EXPECT_EQ(SpreadInCells(db::Value{std::string("&<")}, ""),
            "<table cellspacing='0' cellpadding='0' border='0' align='right' dir='rtl'><tr>"
            "<td>&amp;</td><td>&lt;</td></tr></table>");
}

}  // namespace
}  // namespace zdr::test
