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
  std::string id;    // short name: letters, digits, '-', '_' and '.', e.g. "a4-3x8-70x37"
  std::string name;  // what the chooser shows (UTF-8)
  double pageWidth = 210, pageHeight = 297;
  double top = 0, side = 0;
  double labelWidth = 70, labelHeight = 37;
  double pitchX = 70, pitchY = 37;
  int rows = 8, cols = 3;
  double padding = 3;

  int LabelsPerPage() const { return rows * cols; }
  bool operator==(const LabelStock&) const = default;
};

// A correction of the printer's placement: positive x moves everything right, positive y
// down. Millimetres, each within +-kMaxOffsetMm, in steps of 0.1.
struct StockOffset {
  double x = 0, y = 0;
  bool operator==(const StockOffset&) const = default;
};
inline constexpr double kMaxOffsetMm = 10.0;

// A label's rectangle on its page, in millimetres from the page's top-left corner.
struct LabelBox {
  double x = 0, y = 0, width = 0, height = 0;
};

inline constexpr std::string_view kDefaultStockId = "a4-3x8-70x37";

// The stocks this program ships: common A4 sheets and a Letter sheet, the default first.
const std::vector<LabelStock>& ShippedLabelStocks();

// The shipped stock named `id`, or nothing.
std::optional<LabelStock> FindShippedStock(std::string_view id);

// Why `stock` cannot be printed (a Hebrew sentence), or an empty string when it can: a bad
// id, a size or count that is not positive, labels wider or taller than their pitch,
// padding that leaves no room, or labels that fall off the page.
std::string LabelStockProblem(const LabelStock& stock);

// The rectangle of label `position` (1 .. LabelsPerPage()), moved by `offset`.
LabelBox StockLabelBox(const LabelStock& stock, int position, StockOffset offset = {});

// A valid offset component: within +-kMaxOffsetMm and on a step of 0.1 (after rounding
// away binary noise, so 0.30000000000000004 counts as 0.3). Returns the value rounded to
// the step, or nothing.
std::optional<double> CheckedOffsetMm(double mm);

// "X,Y" in millimetres (a period for the decimal point), e.g. "1.5,-0.3". Nothing when the
// text is not two numbers or either is not a valid offset.
std::optional<StockOffset> ParseStockOffset(std::string_view text);

// A millimetre figure as the settings keep it: the shortest text that reads back to the
// same value to 0.001, with a period ("0.5", "-1.2", "70", "99.1").
std::string FormatMm(double mm);

// Reads a decimal number written with a period; nothing when it is not one (surrounding
// blanks allowed).
std::optional<double> ParseMm(std::string_view text);

}  // namespace zdr
