// The label sheet, its value helpers and the sheet geometry.
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <algorithm>
#include <csignal>

#include "output/outputtest.h"

namespace zdr::test {
namespace {

const std::string kCellEmpty = "    <tr><td nowrap>&nbsp;</td></tr>";
const std::string kPageOpen =
    "<table height='100%' width='100%' border='0' cellpadding='0' cellspacing='0' dir='rtl'>";

class LabelSheetTest : public OutputTest {
 protected:
  std::string Write(const std::vector<AccountRow>& rows) {
    CreateLabFile(PathOf("zdrlab1.htm"), BuildDb(rows), panel, docTypes, "", labels, seam);
    return Utf8File(PathOf("zdrlab1.htm"));
  }
};

// The whole file, byte for byte, with two recipients on a sheet of one row and two
// columns, line styles set on three lines, every line and both pictures on; without
// recipients it stops after the BODY line. The old file, longer than the new one, is
// replaced.
TEST_F(LabelSheetTest, WholeSheetByteForByte) {
  labels.LabelDefs[1] = {0, 12, 2, 0, 0};
  labels.LabelDefs[3] = {1, 10, 1, 1, 1};
  labels.LabelDefs[5] = {2, 255, 0, 1, 0};
  labels.LabPics = {"/img/top.png", "/img/bottom.png"};
  panel.txtRows = "1";
  panel.txtCols = "2";
  panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
  panel.ChkLogo = {1, 1};
  std::ofstream(PathOf("zdrlab1.htm")) << std::string(100000, 'x');
  Write({});
  const std::string empty = ReadBytes(PathOf("zdrlab1.htm"));
  Write({{"12 3", "כהן משה", "הרצל 5", "חיפה", "31000", "כרמל", "דנה", "04-8500000"},
         {"7", "לוי", std::nullopt, std::nullopt, "32000", std::nullopt, std::nullopt,
          std::nullopt}});
  const std::string sheet = ReadBytes(PathOf("zdrlab1.htm"));
  EXPECT_EQ(sheet, Golden("label-sheet.htm"));
  EXPECT_TRUE(empty.ends_with("<BODY BGCOLOR='#FFFFFF'>\r\n") && sheet.starts_with(empty));
}

// Start-1 empty cells of the first page (a start below one counts as one), then `copies`
// adjacent cells per recipient in order, then empty cells to the end of the last page.
TEST_F(LabelSheetTest, StartAndCopiesPlaceEveryRecipient) {
  panel.ChkTitle = {};
  panel.ChkTitle[1] = 1;
  struct Case {
    const char *rows, *cols, *start, *copies;
    int count;
    size_t skipped, perRecipient, pages;
  };
  const Case cases[] = {
      {"8", "3", "1", "1", 25, 0, 1, 2},  {"8", "3", "5", "1", 25, 4, 1, 2},
      {"8", "3", "5", "2", 25, 4, 2, 3},  {"8", "3", "1", "0", 3, 0, 0, 0},
      {"2", "2", "0", "1", 4, 0, 1, 1},   {"2", "2", "-3", "1", 4, 0, 1, 1},
      {"8", "3", "30", "1", 3, 24, 1, 2}, {"10", "10", "1", "1", 100000, 0, 1, 1000},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string("start ") + c.start + ", copies " + c.copies);
    panel.txtRows = c.rows;
    panel.txtCols = c.cols;
    panel.txtStartFrom = c.start;
    panel.txtCopies = c.copies;
    const std::string sheet = Write(NumberedAccounts(c.count));
    EXPECT_EQ(Count(sheet, kPageOpen), c.pages);
    size_t i = 0, cellsPerPage = std::stoul(c.rows) * std::stoul(c.cols);
    for (size_t at = sheet.find("    <td valign='middle' "); at != std::string::npos;
         at = sheet.find("    <td valign='middle' ", at + 1), ++i) {
      const std::string cell = sheet.substr(at, sheet.find("    </td>\r\n", at) - at);
      const size_t k = i - c.skipped;
      if (i < c.skipped || k >= c.count * c.perRecipient) {
        ASSERT_NE(cell.find(kCellEmpty), std::string::npos) << i;
      } else {
        const std::string name = "<td>לקוח " + std::to_string(k / c.perRecipient + 1) + "</td>";
        ASSERT_NE(cell.find(name), std::string::npos) << i;
      }
    }
    EXPECT_EQ(i, c.pages * cellsPerPage);
    EXPECT_EQ(c.pages > 0, sheet.ends_with("</table>\r\n</BODY>\r\n</HTML>\r\n"));
  }
}

TEST_F(LabelSheetTest, CityAndZipSwitches) {
  const std::vector<AccountRow> rows = {{"1", "א", "ב", "חיפה", "31000", "ג", "ד", "ה"},
                                        {"2", "א", "ב", std::nullopt, std::nullopt, "ג", "ד", "ה"}};
  const std::string line = "<tr class='Line5' align='right'><td>";
  const std::tuple<int, int, std::string, std::string> cases[] = {
      {1, 0, "חיפה", "&nbsp;"}, {0, 1, "31000", "&nbsp;"}, {1, 1, "חיפה    31000", "    "}};
  for (const auto& [city, zip, first, second] : cases) {
    panel.ChkTitle = {0, 0, 0, 0, 0, city, 0, 0, zip};
    const std::string sheet = Write(rows);
    EXPECT_EQ(Count(sheet, line + first + "</td></tr>"), 1u) << first;
    EXPECT_EQ(Count(sheet, line + second + "</td></tr>"), 1u) << second;
  }
}

// Regression: an empty field of the document header printed the word "Null" on the label.
TEST_F(LabelSheetTest, EmptyHeaderFieldPrintedTheWordNull) {
  UseDocuments();
  panel.ChkTitle = {0, 1, 0, 0, 1, 1, 0, 0, 0};
  CreateLabFile(PathOf("zdrlab1.htm"),
                BuildDb({{"1", "חשבון", "כתובת", "עכו", "24000", "", "", "04"}},
                        {{"1", 501, std::nullopt, std::nullopt, std::nullopt, std::nullopt}}),
                panel, docTypes, "", labels, seam);
  const std::string sheet = Utf8File(PathOf("zdrlab1.htm"));
  EXPECT_EQ(sheet.find("Null"), std::string::npos);
  for (const char* line : {"Line1", "Line4", "Line5"}) {
    EXPECT_EQ(Count(sheet, "<tr class='" + std::string(line) + "' align='right'><td>&nbsp;</td>"),
              1u)
        << line;
  }
}

// Markup in a value is escaped; a picture path keeps characters outside the code page as
// character references.
TEST_F(LabelSheetTest, ValuesWithMarkupAreEscaped) {
  panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
  panel.ChkLogo = {1, 0};
  labels.LabPics[0] = "/img/it's & <me>Жук.png";
  const std::string sheet =
      Write({{"A<1", "A&B <סניף>", "רח' 5 > 4", "a&b", "<z>", "&d", "<b>x</b>", "<03>"}});
  for (const char* cell :
       {"<td>A&amp;B &lt;סניף&gt;</td>", "<td>רח' 5 &gt; 4</td>", "<td>a&amp;b    &lt;z&gt;</td>",
        "<td>&amp;d</td>", "<td>&lt;b&gt;x&lt;/b&gt;</td>", "<td>&lt;03&gt;</td>",
        "<td>A</td><td>&lt;</td><td>1</td>",
        "src='/img/it&#39;s &amp; &lt;me&gt;&#1046;&#1091;&#1082;.png'>"}) {
    EXPECT_NE(sheet.find(cell), std::string::npos) << cell;
  }
}

// The disk takes only part of the page (here a file size limit): the writer fails, so the
// command never reports the page as done. A missing database fails the same way.
// A failed page is removed: it was left behind cut short, or empty when the database could not
// be read.
TEST_F(LabelSheetTest, PageCutShortByTheDiskIsAnErrorAndLeavesNoPage) {
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
  EXPECT_FALSE(std::filesystem::exists(PathOf("zdrlab1.htm")));
  EXPECT_THROW(CreateLabFile(PathOf("a.htm"), PathOf("none.DB"), panel, docTypes, "", labels, seam),
               db::EngineError);
  EXPECT_FALSE(std::filesystem::exists(PathOf("a.htm")));
  EXPECT_EQ(seam.progress.back(), 0);
}

TEST_F(LabelSheetTest, BadGeometryIsAClearErrorAndKeepsTheOldFile) {
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
  // Numbers read like the host's: blanks ignored, halves to even.
  panel = Panel{};
  panel.txtRows = " 8 ";
  panel.txtCols = "2.5";
  panel.txtCopies = "3.5";
  const SheetGeometry g = ReadSheetGeometry(panel, true);
  EXPECT_EQ(std::tuple(g.rows, g.cols, g.copies, g.start), std::tuple(8, 2, 4, 1));
  panel.txtRows = "32767";
  panel.txtCols = "1";
  EXPECT_EQ(ReadSheetGeometry(panel, true).rows, 32767);
}

// A cell's share of the sheet in tenths of a per cent, rounded half up.
// Lines too tall for the row are cut by the browser; the command says which, on which paper
// and on how many labels, before the page opens (the sheet's bytes stay as they are).
// Regression: all nine lines at 12 pt on 8 rows lost the telephone on every label, silently.
TEST_F(LabelSheetTest, LinesTallerThanTheRowAreToldBeforeThePageOpens) {
  panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
  std::vector<AccountRow> rows = NumberedAccounts(3);
  rows[1].telephone = std::nullopt;  // nothing to lose on this label
  const struct {
    int size;
    const char* rows;
    const char* told;  // "" for nothing
  } cases[] = {
      {9, "8", ""},
      {10, "8", "בדף Letter נחתכת השורה \"טלפון\" ב-2 מדבקות. "},
      {12, "8",
       "בדף A4 נחתכת השורה \"טלפון\" ב-2 מדבקות; בדף Letter נחתכות השורות \"עיר ומיקוד\", "
       "\"טלפון\" ב-3 מדבקות. "},
      {12, "4", ""},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::to_string(c.size) + " pt, " + c.rows + " rows");
    for (LabelLineDef& d : labels.LabelDefs) d.FontSize = static_cast<uint8_t>(c.size);
    panel.txtRows = c.rows;
    seam.messages.clear();
    Write(rows);
    if (*c.told == '\0') {
      EXPECT_TRUE(seam.messages.empty()) << seam.messages[0].text;
      continue;
    }
    ASSERT_EQ(seam.messages.size(), 1u);
    EXPECT_EQ(seam.messages[0].title, kTitleAttention);
    EXPECT_NE(seam.messages[0].text.find(c.told), std::string::npos) << seam.messages[0].text;
    EXPECT_NE(seam.messages[0].text.find("PDF"), std::string::npos);
  }
}

TEST(HtmlHelpers, PercentOfOneRoundsToTenths) {
  for (const auto& [n, text] : {std::pair<int64_t, const char*>{8, "12.5"},
                                {3, "33.3"},
                                {12, "08.3"},
                                {16, "06.3"},
                                {1000, "00.1"},
                                {32767, "00.0"}})
    EXPECT_EQ(PercentOfOne(n), text) << n;
}

}  // namespace
}  // namespace zdr::test
