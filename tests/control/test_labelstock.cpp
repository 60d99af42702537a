// Label stocks: the shipped ones against the published sheets of the glabels catalogue, the
// catalogue's templates read and refused with their reasons, and the printer's correction
// worked out from the calibration page's readings.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <string>
#include <vector>

#include "common/labelstock.h"
#include "control/settings.h"
#include "control/stockcatalogue.h"
#include "support/scratchtemp.h"

namespace zdr {
namespace {

// The largest distance between a corner of a label of `a` and the same corner of the same
// label of `b`, in millimetres.
double LargestCornerDistance(const LabelStock& a, const LabelStock& b) {
  double most = 0;
  for (int p = 1; p <= a.LabelsPerPage(); ++p) {
    const LabelBox x = StockLabelBox(a, p), y = StockLabelBox(b, p);
    most = std::max({most, std::fabs(x.x - y.x), std::fabs(x.y - y.y),
                     std::fabs(x.x + x.width - y.x - y.width),
                     std::fabs(x.y + x.height - y.y - y.height)});
  }
  return most;
}

std::string Tenth(double mm) {
  return FormatMm(std::round(mm * 10) / 10);
}

// Every shipped stock is the sheet it names: the catalogue's template of that brand and part
// puts every label's corners within 0.05 mm of ours (the catalogue writes some figures in
// points). Its id says its paper, grid and label size.
TEST(LabelStockTest, ShippedStocksFollowTheirPublishedSheets) {
  const StockCatalogue& catalogue = InstalledStockCatalogue();
  ASSERT_FALSE(catalogue.entries.empty())
      << "glabels-data is not installed (scripts/install-deps.sh installs it)";
  const auto& stocks = ShippedLabelStocks();
  EXPECT_EQ(stocks[0].id, kDefaultStockId);
  std::set<std::string> ids;
  for (const LabelStock& s : stocks) {
    SCOPED_TRACE(s.id);
    EXPECT_EQ(LabelStockProblem(s), "");
    EXPECT_TRUE(ids.insert(s.id).second);
    const std::string paper = s.pageWidth == 210 ? "a4" : "letter";
    EXPECT_EQ(s.id, paper + "-" + std::to_string(s.cols) + "x" + std::to_string(s.rows) + "-" +
                        Tenth(s.labelWidth) + "x" + Tenth(s.labelHeight));
    const CatalogueEntry* published = catalogue.Find(s.source);
    ASSERT_NE(published, nullptr) << s.source;
    ASSERT_TRUE(published->stock) << published->problem;
    const LabelStock& sheet = *published->stock;
    EXPECT_NEAR(sheet.pageWidth, s.pageWidth, 0.01);
    EXPECT_NEAR(sheet.pageHeight, s.pageHeight, 0.01);
    ASSERT_EQ(sheet.LabelsPerPage(), s.LabelsPerPage());
    EXPECT_LE(LargestCornerDistance(s, sheet), 0.05) << s.source;
  }
  for (const char* added :
       {"a4-3x7-63.5x38.1", "a4-3x8-63.5x33.9", "a4-3x9-63.5x29.6", "a4-2x8-99.1x33.9"})
    EXPECT_TRUE(ids.count(added)) << added;
  // No sheet backs it: not offered, but settings that name it go on printing with it.
  EXPECT_FALSE(ids.count("a4-3x10-63.5x25.4"));
  EXPECT_TRUE(IsRetiredStock("a4-3x10-63.5x25.4"));
  EXPECT_EQ(FindShippedStock("a4-3x10-63.5x25.4")->LabelsPerPage(), 30);
}

// Position 1 is the top row's rightmost label; the next row starts at the right again. The
// correction scales about the page's corner, then moves.
TEST(LabelStockTest, PositionsCountRightToLeftAndTheCorrectionScalesThenMoves) {
  const LabelStock s = *FindShippedStock("a4-2x7-99.1x38.1");
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 1).x, 4.63 + 101.64);
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 2).x, 4.63);
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 3).y, 15.15 + 38.1);
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 3, {1, -2}).y, 15.15 + 38.1 - 2);
  const LabelBox grown = StockLabelBox(s, 3, {1, -2, 10, -20});
  EXPECT_DOUBLE_EQ(grown.x, (4.63 + 101.64) * 1.01 + 1);
  EXPECT_DOUBLE_EQ(grown.y, (15.15 + 38.1) * 0.98 - 2);
  EXPECT_DOUBLE_EQ(grown.width, 99.1 * 1.01);
  EXPECT_DOUBLE_EQ(grown.height, 38.1 * 0.98);

  const std::vector<std::pair<const char*, std::function<void(LabelStock&)>>> spoilt = {
      {"empty id", [](LabelStock& s) { s.id = ""; }},
      {"control character in the id", [](LabelStock& s) { s.id = "a\tb"; }},
      {"no rows", [](LabelStock& s) { s.rows = 0; }},
      {"label wider than its pitch", [](LabelStock& s) { s.labelWidth = 102; }},
      {"off the page", [](LabelStock& s) { s.top = 40; }},
      {"padding fills the label", [](LabelStock& s) { s.padding = 19.05; }},
      {"negative margin", [](LabelStock& s) { s.side = -1; }},
      {"not a number", [](LabelStock& s) { s.pitchY = std::nan(""); }},
  };
  for (const auto& [name, spoil] : spoilt) {
    LabelStock bad = s;
    spoil(bad);
    EXPECT_NE(LabelStockProblem(bad), "") << name;
  }
  // A catalogue name is a stock's name, but not one of the user's own.
  LabelStock named = s;
  named.id = "Avery L7163";
  EXPECT_EQ(LabelStockProblem(named), "");
  EXPECT_NE(UserStockIdProblem("Avery L7163"), "");
  EXPECT_EQ(UserStockIdProblem("office-2x5"), "");
}

// Offsets and scales as typed, each followed by how it reads back ("-" when refused).
TEST(LabelStockTest, OffsetsAndScalesAreTenthsWithinTheirRanges) {
  const char* offsets[] = {"0,0",    "0,0",   "1.5,-0.3", "1.5,-0.3", " 10 , -10 ", "10,-10",
                           "+0.1,0", "0.1,0", "10.1,0",   "-",        "0.05,0",     "-",
                           "1;2",    "-",     "1,",       "-",        "a,b",        "-",
                           "1,2,3",  "-",     "1e1,0",    "-",        "nan,0",      "-"};
  for (size_t i = 0; i < std::size(offsets); i += 2) {
    const auto o = ParseStockOffset(offsets[i]);
    EXPECT_EQ(o ? FormatMm(o->x) + "," + FormatMm(o->y) : "-", offsets[i + 1]) << offsets[i];
  }
  const char* scales[] = {"15.2,-3", "15.2,-3", "100,-100", "100,-100", "100.1,0",
                          "-",       "0.05,0",  "-",        "1,x",      "-"};
  for (size_t i = 0; i < std::size(scales); i += 2) {
    const auto o = ParseStockScale(scales[i]);
    EXPECT_EQ(o ? FormatMm(o->scaleX) + "," + FormatMm(o->scaleY) : "-", scales[i + 1])
        << scales[i];
  }
  EXPECT_EQ(CheckedOffsetMm(0.1 + 0.2), 0.3);
  EXPECT_EQ(FormatMm(-0.0) + " " + FormatMm(99.1) + " " + FormatMm(70), "0 99.1 70");
}

// A printer that scales by s and shifts by d (per axis) prints the calibration page's
// tick t of the scale at mark p where the page put it; the clerk reads the tick the stock's
// edge falls on, to a tenth. The correction from those readings, read twice, puts every
// label's edges back on the stock. (Two columns without a gap have one printable vertical
// edge: there the scale cannot be told and only a shift is corrected.)
TEST(LabelStockTest, ReadingsGiveTheCorrectionThatPutsTheEdgesBack) {
  struct Printer {
    double sx, dx, sy, dy;
  };
  const Printer printers[] = {{0.985, 2, 0.985, -1}, {1, -3.2, 1, 0.4}, {1.02, 0, 0.97, 5}};
  for (const LabelStock& stock : ShippedLabelStocks()) {
    const CalibrationMarks m = CalibrationMarksOf(stock);
    for (const Printer& pr : printers) {
      SCOPED_TRACE(stock.id + " " + std::to_string(pr.sx) + " " + std::to_string(pr.dx));
      // Where the printer puts stock point p drawn with correction c, and what is read.
      auto printedX = [&](const StockOffset& c, double p) {
        return pr.sx * (p * (1 + c.scaleX / 1000) + c.x) + pr.dx;
      };
      auto printedY = [&](const StockOffset& c, double p) {
        return pr.sy * (p * (1 + c.scaleY / 1000) + c.y) + pr.dy;
      };
      auto read = [](double edge, double zero, double tick) {
        return std::round((edge - zero) / tick * 10) / 10;
      };
      StockOffset c{};
      for (int round = 0; round < 2; ++round) {
        const double tickX = pr.sx * (1 + c.scaleX / 1000), tickY = pr.sy * (1 + c.scaleY / 1000);
        const CalibrationReadings r{
            read(m.x1, printedX(c, m.x1), tickX), read(m.x2, printedX(c, m.x2), tickX),
            read(m.y1, printedY(c, m.y1), tickY), read(m.y2, printedY(c, m.y2), tickY)};
        const auto next = CorrectionFromReadings(stock, c, r);
        ASSERT_TRUE(next);
        c = *next;
      }
      const bool xScale = std::fabs(m.x2 - m.x1) >= 20, yScale = std::fabs(m.y2 - m.y1) >= 20;
      for (int p = 1; p <= stock.LabelsPerPage(); ++p) {
        const LabelBox b = StockLabelBox(stock, p);
        for (double x : {b.x, b.x + b.width})
          if (xScale || pr.sx == 1) {
            EXPECT_NEAR(printedX(c, x), x, 0.3) << p;
          }
        for (double y : {b.y, b.y + b.height})
          if (yScale || pr.sy == 1) {
            EXPECT_NEAR(printedY(c, y), y, 0.3) << p;
          }
      }
    }
  }
  // Readings that ask for more than the ranges give nothing.
  const LabelStock def = *FindShippedStock(kDefaultStockId);
  EXPECT_FALSE(CorrectionFromReadings(def, {9.5, 0}, {1, 1, 0, 0}));
  EXPECT_FALSE(CorrectionFromReadings(def, {}, {0, 10, 0, 0}));  // 10 mm in 70: 14 %
}

// The scales read edges a printer prints: the outer edge of a label unless it lies at the
// paper's edge.
TEST(LabelStockTest, CalibrationMarksStayWhereAPrinterPrints) {
  const struct {
    const char* id;
    double x1, x2, y1, y2;
  } cases[] = {
      {"a4-3x8-70x37", 140, 70, 37.5, 259.5},  // no margins: the inner edges
      {"a4-2x7-99.1x38.1", 4.63 + 101.64 + 99.1, 4.63, 15.15, 15.15 + 7 * 38.1},
      {"a4-1x1-210x297", 0, 210, 297, 0},  // the page is the label
  };
  for (const auto& c : cases) {
    const CalibrationMarks m = CalibrationMarksOf(*FindShippedStock(c.id));
    EXPECT_NEAR(m.x1, c.x1, 1e-9) << c.id;
    EXPECT_NEAR(m.x2, c.x2, 1e-9) << c.id;
    EXPECT_NEAR(m.y1, c.y1, 1e-9) << c.id;
    EXPECT_NEAR(m.y2, c.y2, 1e-9) << c.id;
  }
}

// ---- The catalogue --------------------------------------------------------------------

TEST(StockCatalogueTest, LengthsTakeTheCataloguesUnits) {
  const std::pair<const char*, double> cases[] = {
      {"1in", 25.4}, {"72", 25.4},      {"72pt", 25.4},     {"2.5mm", 2.5},
      {"1cm", 10},   {"1pc", 25.4 / 6}, {" 3 mm ", 3},      {"3.93386e-16pt", 0},
      {"", -1},      {"abc", -1},       {"5 furlongs", -1}, {"nan", -1}};
  for (const auto& [text, mm] : cases) {
    const auto v = CatalogueLengthMm(text);
    EXPECT_NEAR(v.value_or(-1), mm, 1e-9) << text;
  }
}

// A planted catalogue: each template becomes a stock, or says in Hebrew why it cannot; a
// file cut short keeps the templates it completed.
TEST(StockCatalogueTest, TemplatesBecomeStocksOrSayWhyNot) {
  test::ScratchTemp temp;
  const std::filesystem::path dir = temp.dir();
  std::ofstream(dir / "paper-sizes.xml")
      << "<?xml version=\"1.0\"?><Glabels-paper-sizes>"
         "<Paper-size id=\"A4\" _name=\"A4\" pwg_size=\"iso_a4\" width=\"210mm\" "
         "height=\"297mm\"/></Glabels-paper-sizes>";
  auto rect = [](const std::string& part, const std::string& size, const std::string& label,
                 const std::string& layouts) {
    return std::string("<Template brand=\"Test\" part=\"") + part + "\" size=\"" + size +
           "\" _description=\"Labels\"><Meta category=\"label\"/><Label-rectangle id=\"0\" " +
           label + "><Markup-margin size=\"1mm\"/>" + layouts + "</Label-rectangle></Template>";
  };
  const std::string grid =
      "<Layout nx=\"2\" ny=\"3\" x0=\"5mm\" y0=\"10mm\" dx=\"100mm\" dy=\"90mm\"/>";
  std::ofstream(dir / "test-templates.xml")
      << "<?xml version=\"1.0\"?><Glabels-templates>"
      << rect("MM", "A4", "width=\"99mm\" height=\"90mm\" round=\"5mm\"", grid)
      << "<Template brand=\"Test\" part=\"SAME\" equiv=\"MM\"/>"
      << "<Template brand=\"Test\" part=\"LOST\" equiv=\"NONE\"/>"
      << rect("PT", "Other\" width=\"144\" height=\"72", "width=\"72\" height=\"36\"",
              "<Layout nx=\"1\" ny=\"2\" x0=\"36\" y0=\"0\" dx=\"0\" dy=\"36\"/>")
      << "<Template brand=\"Test\" part=\"ROUND\" size=\"A4\"><Label-round id=\"0\" "
         "radius=\"10mm\">"
      << grid << "</Label-round></Template>"
      << "<Template brand=\"Test\" part=\"CD\" size=\"A4\"><Label-cd id=\"0\" radius=\"58mm\" "
         "hole=\"20mm\">"
      << grid << "</Label-cd></Template>"
      << rect("TWO", "A4", "width=\"99mm\" height=\"90mm\"", grid + grid)
      << rect("B9X", "B9X", "width=\"99mm\" height=\"90mm\"", grid)
      << rect("BAD", "A4", "width=\"abc\" height=\"90mm\"", grid)
      << rect("WIDE", "A4", "width=\"120mm\" height=\"90mm\"", grid) << "</Glabels-templates>";
  std::ofstream(dir / "cut-templates.xml")
      << "<?xml version=\"1.0\"?><Glabels-templates>"
      << rect("FIRST", "A4", "width=\"99mm\" height=\"90mm\"", grid)
      << "<Template brand=\"Test\" part=\"HALF\" size=\"A4\"><Label-rectangle id=\"0\" wid";

  const StockCatalogue c = ReadStockCatalogue(dir.string());
  ASSERT_EQ(c.problems.size(), 1u);
  EXPECT_NE(c.problems[0].find("cut-templates.xml"), std::string::npos) << c.problems[0];
  EXPECT_EQ(c.Find("Test HALF"), nullptr);

  const CatalogueEntry* mm = c.Find("Test MM");
  ASSERT_TRUE(mm && mm->stock) << (mm ? mm->problem : "missing");
  EXPECT_EQ(mm->description, "Labels");
  const LabelStock& s = *mm->stock;
  EXPECT_EQ(std::tuple(s.cols, s.rows, s.labelWidth, s.side, s.top, s.pitchX, s.pitchY),
            std::tuple(2, 3, 99.0, 5.0, 10.0, 100.0, 90.0));
  EXPECT_EQ(s.padding, 1.5);  // the margin, but clear of the 5 mm corner
  EXPECT_EQ(s.name, "6 מדבקות \u202A99×90\u202C על A4");
  ASSERT_TRUE(c.Find("Test SAME") && c.Find("Test SAME")->stock);
  EXPECT_EQ(LargestCornerDistance(*c.Find("Test SAME")->stock, s), 0);
  const CatalogueEntry* pt = c.Find("Test PT");
  ASSERT_TRUE(pt && pt->stock) << (pt ? pt->problem : "missing");
  EXPECT_NEAR(pt->stock->pageWidth, 50.8, 1e-9);
  EXPECT_NEAR(pt->stock->pitchX, 25.4, 1e-9);  // one column: the label's own width

  const std::pair<const char*, const char*> refused[] = {
      {"Test LOST", "מפנה לחלק NONE"},    {"Test ROUND", "מדבקות עגולות"},
      {"Test CD", "מדבקות תקליטור"},      {"Test TWO", "ביותר מרשת אחת"},
      {"Test B9X", "גודל הדף \"B9X\""},   {"Test BAD", "width=\"abc\""},
      {"Test WIDE", "מהמרווח בין מדבקות"}};
  for (const auto& [id, why] : refused) {
    const CatalogueEntry* e = c.Find(id);
    ASSERT_NE(e, nullptr) << id;
    EXPECT_FALSE(e->stock) << id;
    EXPECT_NE(e->problem.find(why), std::string::npos) << id << ": " << e->problem;
  }
}

// The installed catalogue through the settings: a part by brand and number prints, a CD
// template says why not.
TEST(StockCatalogueTest, InstalledPartsAreFoundByBrandAndPart) {
  MemorySettingsStore store;
  const auto l7160 = FindLabelStock(store, "Avery L7160");
  ASSERT_TRUE(l7160) << LabelStockChoiceProblem(store, "Avery L7160");
  EXPECT_EQ(std::pair(l7160->cols, l7160->rows), std::pair(3, 7));
  EXPECT_FALSE(FindLabelStock(store, "Avery L6015"));
  EXPECT_EQ(LabelStockChoiceProblem(store, "Avery L6015"),
            "את תבנית המדבקות \"Avery L6015\" לא ניתן להדפיס: מדבקות תקליטור; ניתן להדפיס רק "
            "מדבקות מלבניות");
  EXPECT_TRUE(LabelStockChoiceProblem(store, "Avery L0000")
                  .starts_with("תבנית המדבקות \"Avery L0000\" אינה מוכרת. התבניות המוכרות: "
                               "a4-3x8-70x37, "));
  const auto& entries = InstalledStockCatalogue().entries;
  EXPECT_GT(std::count_if(entries.begin(), entries.end(), [](const auto& e) { return e.stock; }),
            1000);
}

}  // namespace
}  // namespace zdr
