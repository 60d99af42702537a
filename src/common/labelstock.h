// Label stock: the exact geometry of a sheet of printed labels, in millimetres, and the
// offset that corrects a printer's placement.
//
// A stock is a page of `rows` x `cols` labels. The top-left corner of the top row's
// leftmost label lies `side` from the page's left edge and `top` from its top edge; the
// labels repeat every `pitchX` across and `pitchY` down. Text keeps `padding` from every
// edge of its label. Positions count like the HTML sheet, right to left: position 1 is the
// top row's rightmost label, position `cols` its leftmost, position `cols` + 1 the second
// row's rightmost.
//
// Plain data and pure functions: no I/O, no library beyond the standard one.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zdr {

struct LabelStock {
  std::string id;      // e.g. "a4-3x8-70x37", or brand and part for a catalogue stock
  std::string name;    // what the chooser shows (UTF-8)
  std::string source;  // the published sheet the figures follow, e.g. "Avery J8157"
  double pageWidth = 210, pageHeight = 297;
  double top = 0, side = 0;
  double labelWidth = 70, labelHeight = 37;
  double pitchX = 70, pitchY = 37;
  int rows = 8, cols = 3;
  double padding = 3;

  int LabelsPerPage() const { return rows * cols; }
  bool operator==(const LabelStock&) const = default;
};

// A correction of the printer's placement. The page grows by `scaleX` and `scaleY` per
// mille about its top-left corner, then moves by `x` and `y` millimetres (positive x moves
// everything right, positive y down): a point p of the stock is drawn at
// p * (1 + scale / 1000) + offset. Offsets are within +-kMaxOffsetMm in steps of 0.1, scales
// within +-kMaxScalePerMille in steps of 0.1.
struct StockOffset {
  double x = 0, y = 0;
  double scaleX = 0, scaleY = 0;
  bool operator==(const StockOffset&) const = default;
};
inline constexpr double kMaxOffsetMm = 10.0;
inline constexpr double kMaxScalePerMille = 100.0;

// A label's rectangle on its page, in millimetres from the page's top-left corner.
struct LabelBox {
  double x = 0, y = 0, width = 0, height = 0;
};

inline constexpr std::string_view kDefaultStockId = "a4-3x8-70x37";

// The stocks this program ships, each following a published sheet: common A4 sheets and a
// Letter sheet, the default first.
const std::vector<LabelStock>& ShippedLabelStocks();

// The shipped stock named `id`, or nothing. Also finds a retired stock: one shipped before
// that no published sheet backs, kept so that settings naming it go on printing.
std::optional<LabelStock> FindShippedStock(std::string_view id);
bool IsRetiredStock(std::string_view id);

// What the chooser shows for a stock: "24 מדבקות 70×37 על A4", "דף A4 שלם".
std::string StockCaption(const LabelStock& stock);

// Why `stock` cannot be printed (a Hebrew sentence), or an empty string when it can: an
// empty or overlong id or one with control characters, a size or count that is not
// positive, labels wider or taller than their pitch, padding that leaves no room, or
// labels that fall off the page.
std::string LabelStockProblem(const LabelStock& stock);

// Why `id` cannot name a stock of the user's own (a Hebrew sentence), or an empty string:
// 1 to 40 Latin letters, digits, '-', '_' and '.'.
std::string UserStockIdProblem(std::string_view id);

// The rectangle of label `position` (1 .. LabelsPerPage()) on the stock, as it is drawn
// with `offset` (moved and scaled).
LabelBox StockLabelBox(const LabelStock& stock, int position, StockOffset offset = {});

// Where the calibration page's four scales read the stock, in millimetres on the stock
// (before any correction): `x1` a vertical edge of the first label (top row, rightmost)
// and `x2` one of the last label (bottom row, leftmost), `y1` and `y2` horizontal edges of
// the same labels. Each is the label's outer edge unless that lies within
// kCalibrationEdgeMm of the paper's edge, where printers do not print; then its inner edge.
struct CalibrationMarks {
  double x1 = 0, x2 = 0, y1 = 0, y2 = 0;
};
inline constexpr double kCalibrationEdgeMm = 4.5;
CalibrationMarks CalibrationMarksOf(const LabelStock& stock);

// What the four scales read, in millimetres: where the stock's label edge falls on each,
// plus to the right (the horizontal scales) or down (the vertical ones).
struct CalibrationReadings {
  double h1 = 0, h2 = 0, v1 = 0, v2 = 0;
};

// The correction that puts the stock's edges on the scales' zeros, for a calibration page
// printed with `current`: the readings at two places of each axis give the printer's
// shift and scale. Rounded to the steps of StockOffset; nothing when the result leaves
// their ranges, or when the two places of an axis are too close to tell a scale (then
// that axis keeps its scale and takes the first reading as a shift).
std::optional<StockOffset> CorrectionFromReadings(const LabelStock& stock, StockOffset current,
                                                  const CalibrationReadings& readings);

// A valid offset component: within +-kMaxOffsetMm and on a step of 0.1 (after rounding
// away binary noise, so 0.30000000000000004 counts as 0.3). Returns the value rounded to
// the step, or nothing.
std::optional<double> CheckedOffsetMm(double mm);

// A valid scale correction, per mille: within +-kMaxScalePerMille on a step of 0.1.
std::optional<double> CheckedScalePerMille(double perMille);

// "X,Y" in millimetres (a period for the decimal point), e.g. "1.5,-0.3". Nothing when the
// text is not two numbers or either is not a valid offset.
std::optional<StockOffset> ParseStockOffset(std::string_view text);

// "X,Y" per mille (a period for the decimal point), e.g. "15.2,-3": the scale correction,
// with no offset. Nothing when the text is not two numbers or either is not a valid scale.
std::optional<StockOffset> ParseStockScale(std::string_view text);

// A millimetre figure as the settings keep it: the shortest text that reads back to the
// same value to 0.001, with a period ("0.5", "-1.2", "70", "99.1").
std::string FormatMm(double mm);

// Reads a decimal number written with a period; nothing when it is not one (surrounding
// blanks allowed).
std::optional<double> ParseMm(std::string_view text);

}  // namespace zdr
