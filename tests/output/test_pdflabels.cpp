// Label sheets on stock as PDF, read back with poppler's pdftotext: where every label's text
// lands, that the offset moves it exactly, the page count, and the text in reading order.
#include <cairo.h>
#include <gtest/gtest.h>

#include <sys/stat.h>
#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <regex>

#include "common/labelstock.h"
#include "control/dataload.h"
#include "output/outputtest.h"
#include "output/pdflabels.h"
#include "zdrgen/generator.h"

namespace zdr::test {
namespace {

struct Word {
  double xMin, yMin, xMax, yMax;  // millimetres from the page's top-left corner
  std::string text;
};
using Page = std::vector<Word>;

std::string Capture(const std::string& command) {
  std::string out;
  FILE* pipe = ::popen(command.c_str(), "r");
  std::array<char, 65536> buf;
  for (size_t n; pipe && (n = std::fread(buf.data(), 1, buf.size(), pipe)) > 0;)
    out.append(buf.data(), n);
  if (pipe) ::pclose(pipe);
  return out;
}

// Every page of the PDF with its words, as pdftotext -bbox finds them.
std::vector<Page> Words(const std::string& pdf) {
  const std::string html = Capture("pdftotext -bbox '" + pdf + "' - 2>/dev/null");
  static const std::regex word(
      "<word xMin=\"([-0-9.]+)\" yMin=\"([-0-9.]+)\" xMax=\"([-0-9.]+)\" yMax=\"([-0-9.]+)\">"
      "([^<]*)</word>");
  constexpr double kMm = 72.0 / 25.4;
  std::vector<Page> pages;
  for (size_t at = html.find("<page "), next; at != std::string::npos; at = next) {
    next = html.find("<page ", at + 1);
    const std::string page = html.substr(at, next == std::string::npos ? next : next - at);
    pages.emplace_back();
    for (std::sregex_iterator it(page.begin(), page.end(), word), end; it != end; ++it) {
      const auto& m = *it;
      pages.back().push_back({std::stod(m[1]) / kMm, std::stod(m[2]) / kMm, std::stod(m[3]) / kMm,
                              std::stod(m[4]) / kMm, m[5]});
    }
  }
  return pages;
}

// The text of each page in reading order, its lines joined by line feeds, without blank
// lines and the direction marks pdftotext adds.
std::vector<std::string> PageTexts(const std::string& pdf) {
  std::string text = Capture("pdftotext -enc UTF-8 '" + pdf + "' - 2>/dev/null");
  for (const char* mark : {"\u202A", "\u202B", "\u202C", "\u202D", "\u202E"}) {
    for (size_t at = text.find(mark); at != std::string::npos; at = text.find(mark))
      text.erase(at, std::strlen(mark));
  }
  std::vector<std::string> pages(1);
  for (size_t from = 0, end; from < text.size(); from = end + 1) {
    end = std::min(text.find_first_of("\n\f", from), text.size());
    if (end > from)
      pages.back() += (pages.back().empty() ? "" : "\n") + text.substr(from, end - from);
    if (end < text.size() && text[end] == '\f') pages.emplace_back();
  }
  pages.pop_back();  // after the last form feed
  return pages;
}

// The words whose centre lies in `b`; each must lie wholly inside it.
std::vector<Word> WordsIn(const Page& page, const LabelBox& b) {
  std::vector<Word> in;
  for (const Word& w : page) {
    const double cx = (w.xMin + w.xMax) / 2, cy = (w.yMin + w.yMax) / 2;
    if (cx <= b.x || cx >= b.x + b.width || cy <= b.y || cy >= b.y + b.height) continue;
    in.push_back(w);
    EXPECT_TRUE(w.xMin >= b.x - 0.01 && w.xMax <= b.x + b.width + 0.01 && w.yMin >= b.y - 0.01 &&
                w.yMax <= b.y + b.height + 0.01)
        << w.text << " leaves its label";
  }
  return in;
}

class PdfLabelsTest : public OutputTest {
 protected:
  void SetUp() override {
    OutputTest::SetUp();
    panel.ChkTitle = {1, 1, 0, 0, 1, 1, 0, 0, 1};  // "לכבוד" first: every label starts alike
  }
  std::string Write(const std::string& db, const LabelStock& stock, StockOffset offset = {},
                    const std::string& name = "labels.pdf") {
    CreateLabPdf(PathOf(name), db, panel, docTypes, "", labels, stock, offset, seam);
    return PathOf(name);
  }
};

// Every shipped stock, on every page: the first line of each label starts at the padding
// from its box's right and top edges, no word leaves its box, and the offset moves every
// word by exactly its amount.
TEST_F(PdfLabelsTest, FirstLineStartsAtThePaddingOnEveryStockAndPage) {
  for (const LabelStock& stock : ShippedLabelStocks()) {
    SCOPED_TRACE(stock.id);
    const int perPage = stock.LabelsPerPage(), count = perPage + 2;  // two labels more
    const size_t sheets = (count + perPage - 1) / perPage;
    const std::string db = BuildDb(NumberedAccounts(count));
    const StockOffset offset{1.5, -2.3};
    const auto plain = Words(Write(db, stock, {}, "plain.pdf"));
    const auto moved = Words(Write(db, stock, offset, "moved.pdf"));
    ASSERT_EQ(plain.size(), sheets);
    ASSERT_EQ(moved.size(), sheets);
    for (int label = 0; label < count; ++label) {
      const LabelBox box = StockLabelBox(stock, label % perPage + 1, offset);
      const auto words = WordsIn(moved[label / perPage], box);
      ASSERT_FALSE(words.empty()) << "label " << label;
      double top = 1e9, start = -1e9;
      for (const Word& w : words) top = std::min(top, w.yMin);
      for (const Word& w : words)
        if (w.yMin < top + 0.5) start = std::max(start, w.xMax);
      EXPECT_NEAR(start, box.x + box.width - stock.padding, 0.2) << "label " << label;
      EXPECT_NEAR(top, box.y + stock.padding, 0.2) << "label " << label;
    }
    for (size_t page = 0; page < sheets; ++page) {
      ASSERT_EQ(plain[page].size(), moved[page].size());
      for (size_t i = 0; i < plain[page].size(); ++i) {
        EXPECT_NEAR(moved[page][i].xMin - plain[page][i].xMin, offset.x, 0.01);
        EXPECT_NEAR(moved[page][i].yMin - plain[page][i].yMin, offset.y, 0.01);
      }
    }
  }
}

// Only sheets that hold a label go through the printer. Regression: the page count was the
// HTML sheet's, copies x (start + recipients - 1) labels, so start 7 with 2 copies of one
// recipient gave a second, blank page, and a start beyond the first sheet a blank first one.
TEST_F(PdfLabelsTest, OnlySheetsThatHoldALabelArePrinted) {
  const LabelStock stock = *FindShippedStock("a4-2x4-105x74");  // 8 a sheet
  const struct {
    const char *start, *copies;
    int recipients;
    size_t pages;
    int firstPosition;  // of the first label, on the first page printed
  } cases[] = {{"7", "2", 1, 1, 7}, {"9", "1", 2, 1, 1}, {"1", "3", 3, 2, 1}, {"8", "1", 1, 1, 8}};
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.start) + " x" + c.copies);
    panel.txtStartFrom = c.start;
    panel.txtCopies = c.copies;
    const auto pages = Words(Write(BuildDb(NumberedAccounts(c.recipients)), stock));
    ASSERT_EQ(pages.size(), c.pages);
    for (int position = 1; position < c.firstPosition; ++position)
      EXPECT_TRUE(WordsIn(pages[0], StockLabelBox(stock, position)).empty()) << position;
    EXPECT_FALSE(WordsIn(pages[0], StockLabelBox(stock, c.firstPosition)).empty());
  }
}

// Copies and the start position work as on the HTML sheet: the first cells of the first
// sheet stay empty, copies sit side by side.
TEST_F(PdfLabelsTest, StartAndCopiesGiveTheSheetsOfTheHtmlSheet) {
  const LabelStock stock = *FindShippedStock("a4-2x4-105x74");  // 8 a sheet
  panel.txtStartFrom = "5";
  panel.txtCopies = "2";
  const auto pages = Words(Write(BuildDb(NumberedAccounts(3)), stock));
  ASSERT_EQ(pages.size(), 2u);  // 2 x (5 + 3 - 1) = 14 labels
  std::vector<std::string> texts;
  for (const Page& page : pages) {
    for (int position = 1; position <= 8; ++position) {
      std::string text = " ";
      for (const Word& w : WordsIn(page, StockLabelBox(stock, position))) text += w.text + " ";
      texts.push_back(text);
    }
  }
  for (int i : {0, 1, 2, 3, 10, 11}) EXPECT_EQ(texts[i], " ") << i;
  for (int i : {4, 6, 8}) {
    EXPECT_NE(texts[i].find(" " + std::to_string(i / 2 - 1) + " "), std::string::npos) << i;
    EXPECT_EQ(texts[i], texts[i + 1]);
  }
}

// Mixed Hebrew, Latin and digits read back in reading order in every font. (A reader takes
// a page's direction from the most of its letters; the first line keeps it Hebrew.)
TEST_F(PdfLabelsTest, TextReadsBackInReadingOrder) {
  const std::vector<std::string> names = {"משה כהן",   "טלפון 0501234567", "כהן ABC Ltd",
                                          "משה (כהן)", "כהן בע\"מ",        "רח' המגדל 15"};
  std::vector<AccountRow> rows;
  for (size_t i = 0; i < names.size(); ++i) rows.push_back({std::to_string(i + 1), names[i]});
  panel.ChkTitle = {1, 1, 0, 0, 0, 0, 0, 0, 0};
  for (int font = 0; font <= 2; ++font) {
    SCOPED_TRACE(font);
    labels.LabelDefs[1] = {static_cast<uint8_t>(font), 14, static_cast<uint8_t>(font == 1 ? 2 : 0),
                           0, 0};
    const auto pages = PageTexts(Write(BuildDb(rows), *FindShippedStock("a4-1x1-210x297")));
    ASSERT_EQ(pages.size(), names.size());
    for (size_t i = 0; i < names.size(); ++i) EXPECT_EQ(pages[i], "לכבוד\n" + names[i]);
  }
}

// Lines that differ only in their digits share one shaping, the digits swapped; each such
// line lands exactly where it lands shaped alone, in every font.
TEST_F(PdfLabelsTest, LinesSharingAShapeLandWhereTheyLandAlone) {
  const std::vector<AccountRow> rows = {
      {"1", "כהן 1111", {}, "חיפה", "31000", {}, {}, "03-1111111"},
      {"2", "כהן 9870", {}, "חיפה", "99999", {}, {}, "09-8765432"},
      {"3", "ABC 1234 בע\"מ", {}, "תל אביב", "10001", {}, {}, "+972 4 1111111"},
      {"40", "ABC 7777 בע\"מ", {}, "תל אביב", "47474", {}, {}, "+972 9 7070707"}};
  panel.ChkTitle = {0, 1, 1, 0, 0, 1, 0, 1, 1};
  const LabelStock stock = *FindShippedStock("a4-1x1-210x297");  // a page for each label
  for (uint8_t font = 0; font <= 2; ++font) {
    for (LabelLineDef& d : labels.LabelDefs) d = {font, 11, static_cast<uint8_t>(font), 0, 0};
    const auto together = Words(Write(BuildDb(rows), stock, {}, "together.pdf"));
    ASSERT_EQ(together.size(), rows.size());
    for (size_t i = 0; i < rows.size(); ++i) {
      SCOPED_TRACE(std::to_string(font) + " " + *rows[i].name);
      const auto alone = Words(Write(BuildDb({rows[i]}), stock, {}, "alone.pdf"))[0];
      ASSERT_EQ(alone.size(), together[i].size());
      for (size_t w = 0; w < alone.size(); ++w) {
        EXPECT_EQ(together[i][w].text, alone[w].text);
        EXPECT_NEAR(together[i][w].xMin, alone[w].xMin, 0.005) << alone[w].text;
        EXPECT_NEAR(together[i][w].xMax, alone[w].xMax, 0.005) << alone[w].text;
      }
    }
  }
}

// A line too wide shrinks; at the smallest size it ends in an ellipsis; nothing leaves the
// label, and lines too many for the label are left out with a message.
TEST_F(PdfLabelsTest, LongLinesShrinkThenEndInAnEllipsis) {
  const LabelStock stock = *FindShippedStock("a4-3x11-64x24.3");
  const std::string shrinks = "חברת השקעות ופיתוח הגליל המערבי";
  const std::string tooLong = std::string("שם ארוך מאוד ") + std::string(80, 'x');
  panel.ChkTitle = {0, 1, 0, 0, 0, 0, 0, 0, 0};
  labels.LabelDefs[1].FontSize = 16;
  const std::string pdf = Write(BuildDb({{"1", shrinks}, {"2", tooLong}}), stock);
  const auto pages = Words(pdf);
  ASSERT_EQ(pages.size(), 1u);
  for (int position = 1; position <= 2; ++position)
    WordsIn(pages[0], StockLabelBox(stock, position));
  const std::string text = PageTexts(pdf)[0];
  EXPECT_NE(text.find(shrinks), std::string::npos) << text;
  EXPECT_NE(text.find("…"), std::string::npos) << text;
  EXPECT_EQ(text.find(tooLong), std::string::npos);
  // Regression: a Latin line cut short got its ellipsis on its left, where its reading
  // starts. It ends the Latin word now, on its right.
  const auto latin = std::find_if(pages[0].begin(), pages[0].end(),
                                  [](const Word& w) { return w.text.starts_with("xxx"); });
  const auto ellipsis = std::find_if(pages[0].begin(), pages[0].end(),
                                     [](const Word& w) { return w.text.ends_with("…"); });
  ASSERT_TRUE(latin != pages[0].end() && ellipsis != pages[0].end());
  EXPECT_NEAR(ellipsis->xMin, latin->xMax, 0.2);

  // Eight lines do not fit 11 mm even at the smallest size.
  LabelStock narrow = stock;
  narrow.id = "narrow";
  narrow.labelHeight = narrow.pitchY = 15;
  narrow.padding = 2;
  panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
  seam.messages.clear();
  const auto crowded = Words(Write(BuildDb(NumberedAccounts(3)), narrow, {}, "crowded.pdf"));
  for (int position = 1; position <= 3; ++position)
    WordsIn(crowded[0], StockLabelBox(narrow, position));
  ASSERT_EQ(seam.messages.size(), 1u);
  EXPECT_NE(seam.messages[0].text.find("ב-3 מדבקות"), std::string::npos);
}

// The file is replaced, never written through a link in its place; a failed run keeps the
// old file; no labels is an error, not an empty document.
TEST_F(PdfLabelsTest, FileIsReplacedNotWrittenThrough) {
  const LabelStock stock = *FindShippedStock(kDefaultStockId);
  std::ofstream(PathOf("victim.txt")) << "keep";
  std::filesystem::create_symlink(PathOf("victim.txt"), PathOf("labels.pdf"));
  Write(BuildDb(NumberedAccounts(1)), stock);
  EXPECT_FALSE(std::filesystem::is_symlink(PathOf("labels.pdf")));
  EXPECT_EQ(ReadBytes(PathOf("victim.txt")), "keep");
  const std::string before = ReadBytes(PathOf("labels.pdf"));
  EXPECT_TRUE(before.starts_with("%PDF-"));
  EXPECT_THROW(Write(BuildDb({}), stock), OutputError);
  panel.txtCopies = "0";
  EXPECT_THROW(Write(BuildDb(NumberedAccounts(2)), stock), OutputError);
  EXPECT_EQ(ReadBytes(PathOf("labels.pdf")), before);
  for (const auto& entry : std::filesystem::directory_iterator(dir_)) {
    EXPECT_EQ(entry.path().filename().string().find("labels.pdf."), std::string::npos)
        << "temporary file left: " << entry.path();
  }
}

// The calibration page names its four scales and says step by step what to read and where
// to type it; each scale's 0 stands on its mark, corrected as labels are; its figures are of
// at least 7 points and stay on the page.
TEST_F(PdfLabelsTest, CalibrationPageNamesItsScalesAndPutsTheirZerosOnTheMarks) {
  for (const char* id : {"a4-2x7-99.1x38.1", "a4-3x8-70x37", "a4-2x4-105x74"}) {
    SCOPED_TRACE(id);
    const LabelStock stock = *FindShippedStock(id);
    const StockOffset c{0.5, -1, 12, -8};
    const std::string path = PathOf("calibration.pdf");
    CreateCalibrationPdf(path, stock, c);
    const auto texts = PageTexts(path);
    ASSERT_EQ(texts.size(), 1u);
    for (const char* part :
         {"דף כיול לתבנית", "הדפיסו דף זה על נייר רגיל", "אופקי 1", "אופקי 2", "אנכי 1", "אנכי 2",
          "הגדרות צורה וגודל", "\"חשב תיקון\"", "מספר חיובי", "כל הקריאות צריכות להיות"})
      EXPECT_NE(texts[0].find(part), std::string::npos) << part << "\n" << texts[0];
    const CalibrationMarks m = CalibrationMarksOf(stock);
    const double kx = 1 + c.scaleX / 1000, ky = 1 + c.scaleY / 1000;
    const auto words = Words(path)[0];
    auto zeroAt = [&](double x, double y) {
      return std::count_if(words.begin(), words.end(), [&](const Word& w) {
        return w.text == "0" && (x < 0 || std::fabs((w.xMin + w.xMax) / 2 - x) < 0.2) &&
               (y < 0 || std::fabs((w.yMin + w.yMax) / 2 - y) < 0.2);
      });
    };
    EXPECT_GE(zeroAt(m.x1 * kx + c.x, -1), 1);
    EXPECT_GE(zeroAt(m.x2 * kx + c.x, -1), 1);
    EXPECT_GE(zeroAt(-1, m.y1 * ky + c.y), 1);
    EXPECT_GE(zeroAt(-1, m.y2 * ky + c.y), 1);
    for (const Word& w : words) {
      if (w.text.find_first_not_of("-0123456789") != std::string::npos) continue;
      EXPECT_GE((w.yMax - w.yMin) * 72 / 25.4, 7) << w.text;
      if (w.text == "0") {
        EXPECT_TRUE(w.xMin > 0 && w.xMax < stock.pageWidth && w.yMin > 0 &&
                    w.yMax < stock.pageHeight);
      }
    }
    for (const Word& w : words) {
      if (w.text != "אופקי" && w.text != "יקפוא") continue;
      EXPECT_TRUE(w.xMin >= kCalibrationEdgeMm - 0.5 && w.xMax <= stock.pageWidth) << w.xMax;
    }
  }
}

// The goal of the calibration: for a printer that shrinks by 1.5 % and shifts by (2, -1) mm,
// the correction from the calibration page's readings puts every label's first line within
// 0.3 mm of its place on the stock; uncorrected, the bottom row is mm off.
TEST_F(PdfLabelsTest, CorrectedPdfKeepsFirstLinesOnTheStockThroughADriftingPrinter) {
  const LabelStock stock = *FindShippedStock(kDefaultStockId);
  const std::string db = BuildDb(NumberedAccounts(stock.LabelsPerPage()));
  const double s = 0.985, dx = 2, dy = -1;
  // What the clerk reads, to a tenth, on the page printed without correction.
  const CalibrationMarks m = CalibrationMarksOf(stock);
  auto read = [&](double p, double d) { return std::round((p - (s * p + d)) / s * 10) / 10; };
  const auto c = CorrectionFromReadings(
      stock, {}, {read(m.x1, dx), read(m.x2, dx), read(m.y1, dy), read(m.y2, dy)});
  ASSERT_TRUE(c);
  // Each label's first line: the right and top edges of its top words.
  auto firstLines = [&](const Page& page, StockOffset placed) {
    std::vector<std::pair<double, double>> out;
    for (int p = 1; p <= stock.LabelsPerPage(); ++p) {
      double top = 1e9, right = -1e9;
      const auto in = WordsIn(page, StockLabelBox(stock, p, placed));
      for (const Word& w : in) top = std::min(top, w.yMin);
      for (const Word& w : in)
        if (w.yMin < top + 0.5) right = std::max(right, w.xMax);
      out.emplace_back(right, top);
    }
    return out;
  };
  const auto ideal = firstLines(Words(Write(db, stock, {}, "ideal.pdf"))[0], {});
  const auto corrected = firstLines(Words(Write(db, stock, *c, "corrected.pdf"))[0], *c);
  double worst = 0, uncorrected = 0;
  for (size_t i = 0; i < ideal.size(); ++i) {
    worst = std::max({worst, std::fabs(s * corrected[i].first + dx - ideal[i].first),
                      std::fabs(s * corrected[i].second + dy - ideal[i].second)});
    uncorrected = std::max({uncorrected, std::fabs(s * ideal[i].first + dx - ideal[i].first),
                            std::fabs(s * ideal[i].second + dy - ideal[i].second)});
  }
  EXPECT_LE(worst, 0.3);
  EXPECT_GT(uncorrected, 4);
  std::printf("first lines through the printer: %.2f mm off uncorrected, %.2f mm corrected\n",
              uncorrected, worst);
}

// Regression: the key line printed the key as the load keeps it, reversed, so 10007 read
// 70001 and only all-Hebrew keys came out right. Every label of the sample company shows its
// key as the sheet's right-to-left cells do.
TEST_F(PdfLabelsTest, KeyLineShowsTheKeyAsTheSheetDoes) {
  zdrgen::WriteCompanies(dir_, 1, {.seed = 7});  // the sample company of the demo
  ControlState state;
  state.companyPath = (dir_ / "company1").string();
  panel.ChkTitle = {0, 0, 1, 0, 0, 0, 0, 0, 0};
  ReadAllData(true, panel, state, docTypes, seam);
  CreateLabFile(PathOf("zdrlab1.htm"), state.workDbPath, panel, docTypes, "", labels, seam);
  // The sheet's keys as shown: each spread table's cells, the first on the right.
  std::vector<std::string> shown;
  const std::string sheet = Utf8File(PathOf("zdrlab1.htm"));
  static const std::regex table("<table class='Line2'[^>]*><tr>(.*?)</tr></table>");
  static const std::regex cell("<td>(.*?)</td>");
  for (std::sregex_iterator t(sheet.begin(), sheet.end(), table), end; t != end; ++t) {
    const std::string cells = (*t)[1];
    std::vector<std::string> chars;
    for (std::sregex_iterator c(cells.begin(), cells.end(), cell); c != end; ++c)
      chars.push_back((*c)[1] == "&nbsp;" ? " " : std::string((*c)[1]));
    std::string visual;
    for (auto it = chars.rbegin(); it != chars.rend(); ++it) visual += *it;
    shown.push_back(visual);
  }
  ASSERT_GT(shown.size(), 150u);
  const LabelStock stock = *FindShippedStock(kDefaultStockId);
  const auto pages = Words(Write(state.workDbPath, stock));
  size_t label = 0, mixed = 0;
  for (const Page& page : pages) {
    for (int p = 1; p <= stock.LabelsPerPage() && label < shown.size(); ++p, ++label) {
      auto words = WordsIn(page, StockLabelBox(stock, p));
      std::sort(words.begin(), words.end(),
                [](const Word& a, const Word& b) { return a.xMin < b.xMin; });
      std::string printed;
      for (const Word& w : words) printed += (printed.empty() ? "" : " ") + w.text;
      EXPECT_EQ(printed, shown[label]) << "label " << label + 1;
      mixed += shown[label].find_first_of("0123456789") != std::string::npos &&
               shown[label].find_first_of("\xD7") != std::string::npos;
    }
  }
  EXPECT_EQ(label, shown.size());
  EXPECT_GT(mixed, 0u) << "no key mixes Hebrew and digits";
}

// Blanks as the sheet's browser shows them. Regression: with the city empty, the blanks
// between city and zip indented the zip by 4.4 mm where the sheet puts it flush right.
TEST_F(PdfLabelsTest, LinesKeepTheBlanksTheSheetShows) {
  const LabelStock stock = *FindShippedStock("a4-2x4-105x74");
  panel.ChkTitle = {0, 1, 0, 0, 0, 1, 0, 0, 1};  // name, city and zip
  const std::string pdf = Write(
      BuildDb({{"1", "כהן   ובניו ", {}, {}, "31000"}, {"2", "לוי", {}, "חיפה", "32000"}}), stock);
  const auto page = Words(pdf)[0];
  for (int p = 1; p <= 2; ++p) {
    const LabelBox box = StockLabelBox(stock, p);
    double right = -1e9;
    for (const Word& w : WordsIn(page, box))
      if (w.text == "31000" || w.text == "חיפה" || w.text == "הפיח")
        right = std::max(right, w.xMax);
    EXPECT_NEAR(right, box.x + box.width - stock.padding, 0.2) << p;
  }
  const std::string text = PageTexts(pdf)[0];
  EXPECT_NE(text.find("כהן ובניו\n31000"), std::string::npos) << text;
  EXPECT_NE(text.find("חיפה 32000"), std::string::npos) << text;
}

// A picture is a regular file of a known kind, within a size and a pixel count; any other
// is named in a message and the labels print without it. Regression: a FIFO hung the run,
// /dev/zero read until memory ran out, a folder gave an English message, GIF was refused.
TEST_F(PdfLabelsTest, PicturesThatCannotBeReadAreNamedAndLeftOut) {
  namespace fs = std::filesystem;
  auto bytes = [](std::initializer_list<int> b) { return std::string(b.begin(), b.end()); };
  // A 1 x 1 GIF, the same claiming 20000 x 20000, and a 1 x 1 BMP.
  const std::string gif =
      bytes({'G', 'I', 'F', '8', '9', 'a', 1, 0, 1, 0, 0x80, 0, 0, 0xFF, 0xFF, 0xFF, 0,  0,
             0,   ',', 0,   0,   0,   0,   1, 0, 1, 0, 0,    2, 2, 'D',  1,    0,    ';'});
  std::string huge = gif;
  for (size_t at : {6u, 8u, 24u, 26u}) huge.replace(at, 2, bytes({0x20, 0x4E}));
  // A PNG whose header says 20000 x 20000, its pixels never reached.
  auto chunk = [](const std::string& type, const std::string& data) {
    uint32_t crc = 0xFFFFFFFF;
    for (unsigned char b : type + data) {
      crc ^= b;
      for (int k = 0; k < 8; ++k) crc = crc >> 1 ^ (0xEDB88320u & (0u - (crc & 1)));
    }
    crc = ~crc;
    auto be = [](uint32_t v) {
      return std::string{char(v >> 24), char(v >> 16), char(v >> 8), char(v)};
    };
    return be(static_cast<uint32_t>(data.size())) + type + data + be(crc);
  };
  const std::string hugePng =
      "\x89PNG\r\n\x1a\n" +
      chunk("IHDR", bytes({0, 0, 0x4E, 0x20, 0, 0, 0x4E, 0x20, 8, 6, 0, 0, 0})) +
      chunk("IDAT", "") + chunk("IEND", "");
  const std::string bmp =
      bytes({'B', 'M', 58,   0,    0, 0, 0, 0, 0,  0, 54, 0, 0, 0, 40, 0, 0,    0, 1,    0,
             0,   0,   1,    0,    0, 0, 1, 0, 24, 0, 0,  0, 0, 0, 4,  0, 0,    0, 0x13, 0x0B,
             0,   0,   0x13, 0x0B, 0, 0, 0, 0, 0,  0, 0,  0, 0, 0, 0,  0, 0xFF, 0});
  std::ofstream(PathOf("logo.gif"), std::ios::binary) << gif;
  std::ofstream(PathOf("huge.gif"), std::ios::binary) << huge;
  std::ofstream(PathOf("huge.png"), std::ios::binary) << hugePng;
  std::ofstream(PathOf("logo.bmp"), std::ios::binary) << bmp;
  std::ofstream(PathOf("notes.txt")) << "not a picture";
  {
    cairo_surface_t* png = cairo_image_surface_create(CAIRO_FORMAT_ARGB32, 3, 2);
    cairo_surface_write_to_png(png, PathOf("logo.png").c_str());
    cairo_surface_destroy(png);
  }
  ASSERT_EQ(::mkfifo(PathOf("fifo").c_str(), 0600), 0);
  std::ofstream(PathOf("big.png")).close();
  fs::resize_file(PathOf("big.png"), 40 << 20);  // a hole: nothing is written
  const struct {
    std::string path;
    const char* why;  // in the message; empty when the picture is drawn
  } cases[] = {{PathOf("logo.gif"), ""},          {PathOf("logo.png"), ""},
               {PathOf("logo.bmp"), ""},          {PathOf("none.png"), "לא נמצאה"},
               {dir_.string(), "היא תיקייה"},     {PathOf("fifo"), "אינה קובץ רגיל"},
               {"/dev/zero", "אינה קובץ רגיל"},   {PathOf("notes.txt"), "אינה קובץ PNG, GIF"},
               {PathOf("huge.gif"), "גדולה מדי"}, {PathOf("huge.png"), "20000×20000"},
               {PathOf("big.png"), "גדולה מדי"}};
  const LabelStock stock = *FindShippedStock("a4-2x4-105x74");
  panel.ChkLogo = {1, 0};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.path);
    labels.LabPics[0] = c.path;
    seam.messages.clear();
    const std::string pdf = Write(BuildDb(NumberedAccounts(2)), stock);
    EXPECT_EQ(PageTexts(pdf).size(), 1u);
    const std::string images = Capture("pdfimages -list '" + pdf + "' 2>/dev/null");
    const bool drawn = std::count(images.begin(), images.end(), '\n') > 2;
    if (*c.why == '\0') {
      EXPECT_TRUE(drawn) << images;
      EXPECT_TRUE(seam.messages.empty());
    } else {
      EXPECT_FALSE(drawn) << images;
      ASSERT_EQ(seam.messages.size(), 1u);
      EXPECT_NE(seam.messages[0].text.find(c.why), std::string::npos) << seam.messages[0].text;
      EXPECT_NE(seam.messages[0].text.find(c.path), std::string::npos);
    }
  }
}

}  // namespace
}  // namespace zdr::test
