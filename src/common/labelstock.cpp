#include "common/labelstock.h"

#include <charconv>
#include <cmath>
#include <cstdio>

namespace zdr {
namespace {

constexpr double kA4W = 210, kA4H = 297;
constexpr double kLetterW = 215.9, kLetterH = 279.4;

LabelStock Stock(const char* id, const char* name, double pageW, double pageH, double top,
                 double side, double w, double h, double pitchX, double pitchY, int rows, int cols,
                 double padding) {
  LabelStock s;
  s.id = id;
  s.name = name;
  s.pageWidth = pageW;
  s.pageHeight = pageH;
  s.top = top;
  s.side = side;
  s.labelWidth = w;
  s.labelHeight = h;
  s.pitchX = pitchX;
  s.pitchY = pitchY;
  s.rows = rows;
  s.cols = cols;
  s.padding = padding;
  return s;
}

bool IdChar(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
         c == '_' || c == '.';
}

}  // namespace

const std::vector<LabelStock>& ShippedLabelStocks() {
  // Names give the label's size in millimetres, embedded left to right for the chooser.
  // Sheets without gaps between labels fill the width and leave the half millimetre the
  // height does not use at the top; the others are centred on the page as sold.
  static const std::vector<LabelStock> stocks = {
      Stock("a4-3x8-70x37", "24 מדבקות \u202A70×37\u202C על A4", kA4W, kA4H, 0.5, 0, 70, 37, 70, 37,
            8, 3, 3),
      Stock("a4-3x7-70x42.3", "21 מדבקות \u202A70×42.3\u202C על A4", kA4W, kA4H, 0.45, 0, 70, 42.3,
            70, 42.3, 7, 3, 3),
      Stock("a4-2x7-99.1x38.1", "14 מדבקות \u202A99.1×38.1\u202C על A4", kA4W, kA4H, 15.15, 4.65,
            99.1, 38.1, 101.6, 38.1, 7, 2, 3),
      Stock("a4-3x11-64x24.3", "33 מדבקות \u202A64×24.3\u202C על A4", kA4W, kA4H, 14.85, 7, 64,
            24.3, 66, 24.3, 11, 3, 2),
      Stock("a4-2x8-105x37", "16 מדבקות \u202A105×37\u202C על A4", kA4W, kA4H, 0.5, 0, 105, 37, 105,
            37, 8, 2, 4),
      Stock("a4-2x4-105x74", "8 מדבקות \u202A105×74\u202C על A4", kA4W, kA4H, 0.5, 0, 105, 74, 105,
            74, 4, 2, 6),
      Stock("a4-3x10-63.5x25.4", "30 מדבקות \u202A63.5×25.4\u202C על A4", kA4W, kA4H, 21.5, 7.25,
            63.5, 25.4, 66, 25.4, 10, 3, 2),
      Stock("a4-1x1-210x297", "דף A4 שלם", kA4W, kA4H, 0, 0, 210, 297, 210, 297, 1, 1, 15),
      Stock("letter-3x10-66.7x25.4", "30 מדבקות \u202A66.7×25.4\u202C על Letter", kLetterW,
            kLetterH, 12.7, 4.75, 66.7, 25.4, 69.85, 25.4, 10, 3, 2),
  };
  return stocks;
}

std::optional<LabelStock> FindShippedStock(std::string_view id) {
  for (const LabelStock& s : ShippedLabelStocks()) {
    if (s.id == id) return s;
  }
  return std::nullopt;
}

std::string LabelStockProblem(const LabelStock& s) {
  if (s.id.empty() || s.id.size() > 40) return "שם התבנית חייב להכיל 1 עד 40 תווים";
  for (char c : s.id) {
    if (!IdChar(c)) return "שם התבנית " + s.id + " יכול להכיל רק אותיות לטיניות, ספרות, - _ ו-.";
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
  return {s.side + col * s.pitchX + offset.x, s.top + row * s.pitchY + offset.y, s.labelWidth,
          s.labelHeight};
}

std::optional<double> CheckedOffsetMm(double mm) {
  if (!std::isfinite(mm)) return std::nullopt;
  const double tenths = std::round(mm * 10);
  if (std::fabs(mm * 10 - tenths) > 1e-6) return std::nullopt;
  if (std::fabs(tenths) > kMaxOffsetMm * 10) return std::nullopt;
  return tenths / 10 + 0.0;  // + 0.0 turns -0 into 0
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

std::optional<StockOffset> ParseStockOffset(std::string_view text) {
  const size_t comma = text.find(',');
  if (comma == std::string_view::npos) return std::nullopt;
  const auto x = ParseMm(text.substr(0, comma));
  const auto y = ParseMm(text.substr(comma + 1));
  if (!x || !y) return std::nullopt;
  const auto cx = CheckedOffsetMm(*x), cy = CheckedOffsetMm(*y);
  if (!cx || !cy) return std::nullopt;
  return StockOffset{*cx, *cy};
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
