// Label sheets on stock as PDF, read back with poppler's pdftotext: where every label's text
// lands, that the offset moves it exactly, the page count, and the text in reading order.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <regex>

#include "common/labelstock.h"
#include "output/outputtest.h"
#include "output/pdflabels.h"

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

// Copies and the start position work as on the HTML sheet: the page count is the sheets
// needed, the first cells of the first sheet stay empty, copies sit side by side.
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

TEST_F(PdfLabelsTest, CalibrationPageShowsTheStockAndItsScales) {
  const LabelStock stock = *FindShippedStock("a4-2x7-99.1x38.1");
  const std::string path = PathOf("calibration.pdf");
  CreateCalibrationPdf(path, stock, {0.5, -1});
  const auto texts = PageTexts(path);
  ASSERT_EQ(texts.size(), 1u);
  EXPECT_NE(texts[0].find("דף כיול לתבנית a4-2x7-99.1x38.1"), std::string::npos) << texts[0];
  EXPECT_NE(texts[0].find("0.5"), std::string::npos) << texts[0];
  // The offset scale across the right column's left edge: its 0 stands on that edge.
  const LabelBox first = StockLabelBox(stock, 1, {0.5, -1});
  const auto words = Words(path)[0];
  EXPECT_TRUE(std::any_of(words.begin(), words.end(), [&](const Word& w) {
    return w.text == "0" && std::fabs((w.xMin + w.xMax) / 2 - first.x) < 0.3;
  }));
}

}  // namespace
}  // namespace zdr::test
