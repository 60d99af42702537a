// The pages in a real browser: headless Chromium reads the Windows-1255 pages, shows the
// Hebrew names as held, and prints the label sheet on as many pages as it has grids.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "output/outputtest.h"

namespace zdr::test {
namespace {

constexpr const char* kChromium = "/usr/bin/chromium";

class BrowserTest : public OutputTest {
 protected:
  void SetUp() override {
    OutputTest::SetUp();
    if (!std::filesystem::exists(kChromium)) GTEST_SKIP() << "chromium is not installed";
  }

  // Runs headless Chromium on a local page with `what` ("--dump-dom" or
  // "--print-to-pdf=..."), bounded to 60 seconds; returns its standard output.
  std::string Chromium(const std::string& page, const std::string& what) {
    const std::string profile = PathOf("profile" + std::to_string(++runs_));
    std::filesystem::create_directories(profile);
    const std::string out = PathOf("chromium.out");
    const std::string cmd = std::string("timeout 60 ") + kChromium +
                            " --headless --no-sandbox --disable-gpu"
                            " --disable-background-networking --disable-component-update"
                            " --disable-sync --no-first-run --user-data-dir=" +
                            profile + " " + what + " file://" + page + " > " + out + " 2>/dev/null";
    const int rc = std::system(cmd.c_str());
    EXPECT_EQ(rc, 0) << cmd;
    return ReadBytes(out);
  }

  int runs_ = 0;
};

// Both pages as the browser reads them: Hebrew as held, markup as text, the list's totals.
TEST_F(BrowserTest, PagesShowHebrewNames) {
  panel.ChkTitle = {1, 1, 1, 0, 1, 1, 0, 1, 1};
  const std::string db =
      BuildDb({{"12 3", "כהן & בניו <סניף>", "הרצל 5", "חיפה", "31000", "", "", "04"},
               {"7", "לוי", "", "", "", "", "", ""}});
  CreateLabFile(PathOf("zdrlab1.htm"), db, panel, docTypes, "", labels, seam);
  CreateHTML(PathOf("zdrlab2.htm"), db, panel, docTypes, "", seam, Date::FromParts(2024, 3, 5));
  const std::string sheet = Chromium(PathOf("zdrlab1.htm"), "--dump-dom");
  for (const char* text : {"כהן &amp; בניו &lt;סניף&gt;", "לכבוד", "חיפה    31000", "<td>לוי</td>"})
    EXPECT_NE(sheet.find(text), std::string::npos) << text << "\n" << sheet;
  const std::string list = Chromium(PathOf("zdrlab2.htm"), "--dump-dom");
  for (const char* text : {"כהן &amp; בניו &lt;סניף&gt;", "מספר הכרטיסים ברשימה: 2", "05/03/2024"})
    EXPECT_NE(list.find(text), std::string::npos) << text << "\n" << list;
}

// Where each label's first line ("לכבוד") starts on each printed page: its right edge and
// top, in points, read from the PDF's word boxes. pdftotext gives the word in display order.
using Starts = std::vector<std::vector<std::pair<double, double>>>;
Starts LabelStarts(const std::string& bboxHtml) {
  Starts pages;
  const std::string word = "<word ";
  for (size_t at = 0; (at = bboxHtml.find('<', at)) != std::string::npos; ++at) {
    if (bboxHtml.compare(at, 6, "<page ") == 0) pages.emplace_back();
    if (bboxHtml.compare(at, word.size(), word) != 0 || pages.empty()) continue;
    double xMin, yMin, xMax, yMax;
    char text[64] = {};
    if (std::sscanf(bboxHtml.c_str() + at,
                    "<word xMin=\"%lf\" yMin=\"%lf\" xMax=\"%lf\" yMax=\"%lf\">%63[^<]", &xMin,
                    &yMin, &xMax, &yMax, text) == 5 &&
        (std::string(text) == "דובכל" || std::string(text) == "לכבוד")) {
      pages.back().emplace_back(xMax, yMin);
    }
  }
  return pages;
}

// Regression: the page tables after the first shrank to their content, so two or three
// sheets shared a printed page; a long word widened its column and moved the labels beside
// it; nine lines at 9 pt made a label taller than its row. Each sheet now prints on a page of
// its own, and every label's first line starts at its grid place on every page.
TEST_F(BrowserTest, SheetsAfterTheFirstShrankOntoSharedPages) {
  struct Case {
    const char *rows, *cols, *start;
    int recipients;
    bool allLines;
    int pages;
  };
  const Case cases[] = {
      {"8", "3", "1", 200, false, 9}, {"8", "3", "1", 50, true, 3}, {"3", "2", "3", 13, true, 3}};
  const double kMillimetre = 72 / 25.4;
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string(c.rows) + "x" + c.cols + ", " + std::to_string(c.recipients));
    panel.txtRows = c.rows;
    panel.txtCols = c.cols;
    panel.txtStartFrom = c.start;
    panel.ChkTitle = {1, 1, 0, 0, 0, 0, 0, 0, 0};
    if (c.allLines) panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
    std::vector<AccountRow> rows = NumberedAccounts(c.recipients);
    // On the last page: a name of one 30-letter word and an address long enough to wrap.
    const size_t perPage = std::stoul(c.rows) * std::stoul(c.cols);
    rows.back().name = "";
    for (int i = 0; i < 30; ++i) *rows.back().name += "ש";
    rows.back().address = "רחוב הנביאים הארוך מאוד 125 דירה 17 כניסה ב קומה 4";
    const std::string page = PathOf("zdrlab1.htm");
    CreateLabFile(page, BuildDb(rows), panel, docTypes, "", labels, seam);
    const std::string pdf = PathOf("sheet.pdf");
    std::filesystem::remove(pdf);
    Chromium(page, "--no-pdf-header-footer --print-to-pdf=" + pdf);
    const std::string bbox = PathOf("bbox.html");
    ASSERT_EQ(std::system(("pdftotext -bbox " + pdf + " " + bbox).c_str()), 0);
    const Starts starts = LabelStarts(ReadBytes(bbox));
    ASSERT_EQ(starts.size(), static_cast<size_t>(c.pages));

    // The grid: the places of the second page, a full one, rows x columns apart.
    const auto& grid = starts[1];
    ASSERT_EQ(grid.size(), perPage);
    auto distinct = [&](auto coordinate) {
      std::vector<double> values;
      for (const auto& p : grid) values.push_back(coordinate(p));
      std::sort(values.begin(), values.end());
      size_t n = values.empty() ? 0 : 1;
      for (size_t i = 1; i < values.size(); ++i) n += values[i] - values[i - 1] > kMillimetre;
      return n;
    };
    EXPECT_EQ(distinct([](const auto& p) { return p.first; }), std::stoul(c.cols));
    EXPECT_EQ(distinct([](const auto& p) { return p.second; }), std::stoul(c.rows));

    // Every label's first line at its grid place; on the last page the label holding the
    // long values centres its own taller block, and only it may move.
    for (size_t n = 0; n < starts.size(); ++n) {
      size_t offPlace = 0;
      for (const auto& [x, y] : starts[n]) {
        offPlace += std::none_of(grid.begin(), grid.end(), [&](const auto& g) {
          return std::abs(g.first - x) <= kMillimetre && std::abs(g.second - y) <= kMillimetre;
        });
      }
      EXPECT_LE(offPlace, n + 1 == starts.size() ? 1u : 0u) << "page " << n + 1;
    }
  }
}

}  // namespace
}  // namespace zdr::test
