// Label sheets as PDF on real label stock, and the calibration page.
//
// Geometry is exact in millimetres: a label's text starts `padding` inside its box (the
// right edge for right-to-left text, the top edge for the first line), wherever the stock
// places the box, corrected for the printer by the StockOffset (scaled, then moved). The
// label holds the lines of the HTML sheet, in the same order and with the same switches,
// each in its line's font, size, weight, italic and underline, with blanks as the sheet's
// browser shows them (none at the ends, runs as one); the account key as the sheet spreads
// it, its kept characters from right to left; the top and bottom pictures (PNG, GIF, JPEG,
// BMP or TIFF) above and below them. Text is shaped and laid out right to left (pango,
// HarfBuzz and fribidi), and the PDF's text reads back in logical order. A line too wide
// for its label shrinks down to kMinLabelPointSize, then ends in an ellipsis where its
// reading ends; lines too tall together shrink alike, and what still does not fit is left
// out (a message says on how many labels). Nothing is drawn outside a label's box.
//
// The file is written through a ReplacingFile (output/targetfile.h), readable by its owner
// only: an existing file (or a link in its place) is replaced when the new one is complete,
// never written through, and a failed run leaves the old file as it was. The caller checks
// the target first (CheckOutputTarget).
//
// Failures throw OutputError (Hebrew description): an unusable stock, no labels to print
// (no recipients, or copies 0), a file that cannot be written; db::EngineError for the
// database or statement.
#pragma once

#include <string>

#include "common/labelstock.h"
#include "common/panel.h"
#include "common/userseam.h"
#include "hostfile/doctypes.h"
#include "output/outputdefs.h"

namespace zdr {

inline constexpr double kMinLabelPointSize = 5.0;

// The label sheet as PDF on `stock`: the recipients of the panel's selection in query
// order, each on `txtCopies` consecutive labels from position `txtStartFrom` of the first
// sheet (positions below 1 mean the first). One page per sheet, and only sheets that hold a
// label: no blank sheet goes through the printer. The panel's rows and columns are not
// used. A picture that cannot be read is named in a message and left out. Progress goes
// through the seam.
void CreateLabPdf(const std::string& pFileName, const std::string& pDBFile, const Panel& panel,
                  const DocTypeTable& docTypes, const std::string& selectDbPath,
                  const LabelSettings& labels, const LabelStock& stock, StockOffset offset,
                  UserSeam& ui);

// One calibration page for `stock`, corrected by `offset` as labels would be: every
// label's outline with a cross on each corner; four named scales from -10 to +10 mm across
// the edges CalibrationMarksOf gives ("אופקי 1" and "אנכי 1" at the first label, "אופקי 2"
// and "אנכי 2" at the last), kept clear of the outlines; and a numbered instruction for
// reading them against a sheet of stock held behind the page and typing the readings into
// the label dialog, which turns them into the correction (CorrectionFromReadings).
void CreateCalibrationPdf(const std::string& pFileName, const LabelStock& stock,
                          StockOffset offset);

}  // namespace zdr
