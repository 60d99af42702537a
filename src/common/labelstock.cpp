#include "common/labelstock.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <iterator>
#include <utility>

namespace zdr {
namespace {

// A sheet as its maker publishes it, in millimetres: paper, grid, label size, the top-left
// label's corner and the pitch from one label to the next. `source` names the published
// sheet the figures follow.
struct Paper {
  double width, height;
};
constexpr Paper kA4{210, 297}, kLetter{215.9, 279.4};

struct Sheet {
  const char* id;
  const char* source;
  Paper paper;
  int cols, rows;
  double labelWidth, labelHeight;
  double side, top;  // the top-left label's corner from the paper's left and top edges
  double pitchX, pitchY;
  double padding;  // ours: how far text keeps from the label's edges
};

// Every figure comes from the sheet named in `source`, as Debian's glabels-data catalogue
// gives it (the tests hold them against that catalogue). Sheets without gaps between labels
// fill the width and leave the half millimetre the height does not use at the top.
// clang-format off
constexpr Sheet kShipped[] = {
    {.id = "a4-3x8-70x37", .source = "Igepa EA-700x370", .paper = kA4,
     .cols = 3, .rows = 8, .labelWidth = 70, .labelHeight = 37,
     .side = 0, .top = 0.5, .pitchX = 70, .pitchY = 37, .padding = 3},
    {.id = "a4-3x7-70x42.3", .source = "Igepa EA-700x423", .paper = kA4,
     .cols = 3, .rows = 7, .labelWidth = 70, .labelHeight = 42.3,
     .side = 0, .top = 0.45, .pitchX = 70, .pitchY = 42.3, .padding = 3},
    {.id = "a4-3x7-63.5x38.1", .source = "Endisch 6406338x", .paper = kA4,
     .cols = 3, .rows = 7, .labelWidth = 63.5, .labelHeight = 38.1,
     .side = 7.21, .top = 15.15, .pitchX = 66.04, .pitchY = 38.1, .padding = 3},
    {.id = "a4-3x8-63.5x33.9", .source = "Endisch 6406333x", .paper = kA4,
     .cols = 3, .rows = 8, .labelWidth = 63.5, .labelHeight = 33.9,
     .side = 7.21, .top = 12.9, .pitchX = 66.04, .pitchY = 33.9, .padding = 3},
    {.id = "a4-3x9-63.5x29.6", .source = "Rayfilm 0437", .paper = kA4,
     .cols = 3, .rows = 9, .labelWidth = 63.5, .labelHeight = 29.6,
     .side = 7.25, .top = 15.3, .pitchX = 66, .pitchY = 29.6, .padding = 2.5},
    {.id = "a4-2x7-99.1x38.1", .source = "Endisch 6409938x", .paper = kA4,
     .cols = 2, .rows = 7, .labelWidth = 99.1, .labelHeight = 38.1,
     .side = 4.63, .top = 15.15, .pitchX = 101.64, .pitchY = 38.1, .padding = 3},
    {.id = "a4-2x8-99.1x33.9", .source = "Endisch 6409933x", .paper = kA4,
     .cols = 2, .rows = 8, .labelWidth = 99.1, .labelHeight = 33.9,
     .side = 4.63, .top = 12.9, .pitchX = 101.64, .pitchY = 33.9, .padding = 3},
    {.id = "a4-3x11-64x24.3", .source = "Avery J8157", .paper = kA4,
     .cols = 3, .rows = 11, .labelWidth = 64, .labelHeight = 24.3,
     .side = 6, .top = 14, .pitchX = 66.5, .pitchY = 24.3, .padding = 2},
    {.id = "a4-2x8-105x37", .source = "Igepa EA-1050x370", .paper = kA4,
     .cols = 2, .rows = 8, .labelWidth = 105, .labelHeight = 37,
     .side = 0, .top = 0.5, .pitchX = 105, .pitchY = 37, .padding = 4},
    {.id = "a4-2x4-105x74", .source = "Igepa EA-1050x740", .paper = kA4,
     .cols = 2, .rows = 4, .labelWidth = 105, .labelHeight = 74,
     .side = 0, .top = 0.5, .pitchX = 105, .pitchY = 74, .padding = 6},
    {.id = "a4-1x1-210x297", .source = "Endisch 6521029x", .paper = kA4,
     .cols = 1, .rows = 1, .labelWidth = 210, .labelHeight = 297,
     .side = 0, .top = 0, .pitchX = 210, .pitchY = 297, .padding = 15},
    {.id = "letter-3x10-66.7x25.4", .source = "Worldlabel WL-875", .paper = kLetter,
     .cols = 3, .rows = 10, .labelWidth = 66.675, .labelHeight = 25.4,
     .side = 4.7625, .top = 12.7, .pitchX = 69.85, .pitchY = 25.4, .padding = 2},
};

// No published sheet backs this one; it stays so that settings naming it keep printing as
// before, but it is no longer offered.
constexpr Sheet kRetired[] = {
    {.id = "a4-3x10-63.5x25.4", .source = "", .paper = kA4,
     .cols = 3, .rows = 10, .labelWidth = 63.5, .labelHeight = 25.4,
     .side = 7.25, .top = 21.5, .pitchX = 66, .pitchY = 25.4, .padding = 2},
};
// clang-format on

LabelStock FromSheet(const Sheet& sh) {
  LabelStock s;
  s.id = sh.id;
  s.source = sh.source;
  s.pageWidth = sh.paper.width;
  s.pageHeight = sh.paper.height;
  s.top = sh.top;
  s.side = sh.side;
  s.labelWidth = sh.labelWidth;
  s.labelHeight = sh.labelHeight;
  s.pitchX = sh.pitchX;
  s.pitchY = sh.pitchY;
  s.rows = sh.rows;
  s.cols = sh.cols;
  s.padding = sh.padding;
  s.name = StockCaption(s);
  return s;
}

bool IdChar(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
         c == '_' || c == '.';
}

bool Near(double a, double b) {
  return std::fabs(a - b) < 0.05;
}

// `v` on a step of 0.1 within +-`most` (after rounding away binary noise), or nothing.
std::optional<double> CheckedTenths(double v, double most) {
  if (!std::isfinite(v)) return std::nullopt;
  const double tenths = std::round(v * 10);
  if (std::fabs(v * 10 - tenths) > 1e-6) return std::nullopt;
  if (std::fabs(tenths) > most * 10) return std::nullopt;
  return tenths / 10 + 0.0;  // + 0.0 turns -0 into 0
}

}  // namespace

std::string StockCaption(const LabelStock& s) {
  std::string paper;
  if (Near(s.pageWidth, kA4.width) && Near(s.pageHeight, kA4.height)) {
    paper = "A4";
  } else if (Near(s.pageWidth, kLetter.width) && Near(s.pageHeight, kLetter.height)) {
    paper = "Letter";
  } else {
    paper = "\u202A" + FormatMm(s.pageWidth) + "×" + FormatMm(s.pageHeight) + "\u202C";
  }
  if (s.LabelsPerPage() == 1 && Near(s.labelWidth, s.pageWidth) &&
      Near(s.labelHeight, s.pageHeight))
    return "דף " + paper + " שלם";
  // One decimal, as the sheets are sold: 66.675 is "66.7".
  auto size = [](double mm) { return FormatMm(std::round(mm * 10) / 10); };
  return std::to_string(s.LabelsPerPage()) + " מדבקות \u202A" + size(s.labelWidth) + "×" +
         size(s.labelHeight) + "\u202C על " + paper;
}

const std::vector<LabelStock>& ShippedLabelStocks() {
  static const std::vector<LabelStock> stocks = [] {
    std::vector<LabelStock> all;
    for (const Sheet& sh : kShipped) all.push_back(FromSheet(sh));
    return all;
  }();
  return stocks;
}

std::optional<LabelStock> FindShippedStock(std::string_view id) {
  for (const LabelStock& s : ShippedLabelStocks()) {
    if (s.id == id) return s;
  }
  for (const Sheet& sh : kRetired) {
    if (sh.id == id) return FromSheet(sh);
  }
  return std::nullopt;
}

bool IsRetiredStock(std::string_view id) {
  return std::any_of(std::begin(kRetired), std::end(kRetired),
                     [&](const Sheet& sh) { return sh.id == id; });
}

std::string UserStockIdProblem(std::string_view id) {
  if (id.empty() || id.size() > 40) return "שם התבנית חייב להכיל 1 עד 40 תווים";
  for (char c : id) {
    if (!IdChar(c))
      return "שם התבנית " + std::string(id) + " יכול להכיל רק אותיות לטיניות, ספרות, - _ ו-.";
  }
  return "";
}

std::string LabelStockProblem(const LabelStock& s) {
  // Catalogue ids hold blanks and brackets; none holds a control character.
  if (s.id.empty() || s.id.size() > 80) return "שם התבנית חייב להכיל 1 עד 80 תווים";
  for (char c : s.id) {
    if (static_cast<unsigned char>(c) < 0x20 || c == 0x7F) return "שם התבנית מכיל תו בקרה";
  }
  const double sizes[] = {s.pageWidth,   s.pageHeight, s.labelWidth,
                          s.labelHeight, s.pitchX,     s.pitchY};
  for (double v : sizes) {
    if (!std::isfinite(v) || v <= 0 || v > 2000) return "מידות הדף והמדבקות חייבות להיות חיוביות";
  }
  if (!std::isfinite(s.top) || !std::isfinite(s.side) || s.top < 0 || s.side < 0)
    return "השוליים לא יכולים להיות שליליים";
  if (s.rows < 1 || s.cols < 1 || s.rows > 100 || s.cols > 100)
    return "מספר השורות והעמודות חייב להיות בין 1 ל-100";
  // A thousandth of a millimetre of slack for figures that add up in decimals.
  constexpr double kSlack = 0.001;
  if (s.labelWidth > s.pitchX + kSlack || s.labelHeight > s.pitchY + kSlack)
    return "מדבקה רחבה או גבוהה מהמרווח בין מדבקות: מדבקות סמוכות יחפפו";
  if (!std::isfinite(s.padding) || s.padding < 0 || 2 * s.padding >= s.labelWidth ||
      2 * s.padding >= s.labelHeight)
    return "הריפוד הפנימי לא משאיר מקום לטקסט";
  if (s.side + (s.cols - 1) * s.pitchX + s.labelWidth > s.pageWidth + kSlack ||
      s.top + (s.rows - 1) * s.pitchY + s.labelHeight > s.pageHeight + kSlack)
    return "המדבקות חורגות מגבולות הדף";
  return "";
}

LabelBox StockLabelBox(const LabelStock& s, int position, StockOffset offset) {
  const int index = position - 1;
  const int row = index / s.cols;
  const int fromRight = index % s.cols;
  const int col = s.cols - 1 - fromRight;  // 0 is the leftmost column
  const double kx = 1 + offset.scaleX / 1000, ky = 1 + offset.scaleY / 1000;
  return {(s.side + col * s.pitchX) * kx + offset.x, (s.top + row * s.pitchY) * ky + offset.y,
          s.labelWidth * kx, s.labelHeight * ky};
}

CalibrationMarks CalibrationMarksOf(const LabelStock& s) {
  const LabelBox first = StockLabelBox(s, 1), last = StockLabelBox(s, s.LabelsPerPage());
  auto clear = [&](double edge, double paper) {
    return edge >= kCalibrationEdgeMm && edge <= paper - kCalibrationEdgeMm;
  };
  CalibrationMarks m;
  const double firstRight = first.x + first.width, lastBottom = last.y + last.height;
  m.x1 = clear(firstRight, s.pageWidth) ? firstRight : first.x;
  m.x2 = clear(last.x, s.pageWidth) ? last.x : last.x + last.width;
  m.y1 = clear(first.y, s.pageHeight) ? first.y : first.y + first.height;
  m.y2 = clear(lastBottom, s.pageHeight) ? lastBottom : last.y;
  return m;
}

namespace {

// One axis of CorrectionFromReadings. The page printed with scale k and shift o shows
// tick t of the scale at mark p where the printer puts k * (p + t) + o; the printer's own
// scale s and shift d map that to s * (k * (p + t) + o) + d. The stock's edge at p falls on
// the tick where that equals p. With the readings r1 at p1 and r2 at p2,
// a = (r2 - r1) / (p2 - p1) gives s * k = 1 / (1 + a), so the new scale is k * (1 + a) and
// the new shift o + k * (r1 - a * p1), exactly.
struct Axis {
  double scale, shift;  // per mille, mm
};
std::optional<Axis> SolveAxis(double p1, double p2, double r1, double r2, double perMille,
                              double shift) {
  constexpr double kMinSpanMm = 20;
  const double k = 1 + perMille / 1000;
  double a = 0;
  if (std::fabs(p2 - p1) >= kMinSpanMm) a = (r2 - r1) / (p2 - p1);
  const double newScale = (k * (1 + a) - 1) * 1000;
  const double newShift = shift + k * (r1 - a * p1);
  const auto scale = CheckedScalePerMille(std::round(newScale * 10) / 10);
  const auto mm = CheckedOffsetMm(std::round(newShift * 10) / 10);
  if (!scale || !mm) return std::nullopt;
  return Axis{*scale, *mm};
}

}  // namespace

std::optional<StockOffset> CorrectionFromReadings(const LabelStock& stock, StockOffset current,
                                                  const CalibrationReadings& r) {
  const CalibrationMarks m = CalibrationMarksOf(stock);
  const auto x = SolveAxis(m.x1, m.x2, r.h1, r.h2, current.scaleX, current.x);
  const auto y = SolveAxis(m.y1, m.y2, r.v1, r.v2, current.scaleY, current.y);
  if (!x || !y) return std::nullopt;
  return StockOffset{x->shift, y->shift, x->scale, y->scale};
}

std::optional<double> CheckedScalePerMille(double perMille) {
  return CheckedTenths(perMille, kMaxScalePerMille);
}

std::optional<double> CheckedOffsetMm(double mm) {
  return CheckedTenths(mm, kMaxOffsetMm);
}

std::optional<double> ParseMm(std::string_view text) {
  while (!text.empty() && (text.front() == ' ' || text.front() == '\t')) text.remove_prefix(1);
  while (!text.empty() && (text.back() == ' ' || text.back() == '\t')) text.remove_suffix(1);
  if (!text.empty() && text.front() == '+') text.remove_prefix(1);
  if (text.empty()) return std::nullopt;
  double v = 0;
  const auto [end, ec] =
      std::from_chars(text.data(), text.data() + text.size(), v, std::chars_format::fixed);
  if (ec != std::errc() || end != text.data() + text.size() || !std::isfinite(v))
    return std::nullopt;
  return v;
}

namespace {

// "X,Y", each number passing `check`.
std::optional<std::pair<double, double>> ParsePair(std::string_view text,
                                                   std::optional<double> (*check)(double)) {
  const size_t comma = text.find(',');
  if (comma == std::string_view::npos) return std::nullopt;
  const auto x = ParseMm(text.substr(0, comma));
  const auto y = ParseMm(text.substr(comma + 1));
  if (!x || !y) return std::nullopt;
  const auto cx = check(*x), cy = check(*y);
  if (!cx || !cy) return std::nullopt;
  return std::pair(*cx, *cy);
}

}  // namespace

std::optional<StockOffset> ParseStockOffset(std::string_view text) {
  const auto xy = ParsePair(text, CheckedOffsetMm);
  if (!xy) return std::nullopt;
  return StockOffset{xy->first, xy->second};
}

std::optional<StockOffset> ParseStockScale(std::string_view text) {
  const auto xy = ParsePair(text, CheckedScalePerMille);
  if (!xy) return std::nullopt;
  return StockOffset{0, 0, xy->first, xy->second};
}

std::string FormatMm(double mm) {
  char buf[32];
  std::snprintf(buf, sizeof buf, "%.3f", std::round(mm * 1000) / 1000 + 0.0);
  std::string s = buf;
  while (s.back() == '0') s.pop_back();
  if (s.back() == '.') s.pop_back();
  return s == "-0" ? "0" : s;
}

}  // namespace zdr
