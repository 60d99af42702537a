// The label settings dialog's part for labels on stock: which stock (shipped, the user's
// own, or from the installed catalogue by brand and part), the printer's correction (the
// user's, or the stock's own: an offset and a scale), the calibration page and the four
// readings that turn into the correction, and what the label button gives (the HTML sheet
// or the PDF).
#pragma once

#include <QDialog>
#include <QGroupBox>
#include <optional>
#include <string>

#include "common/labelstock.h"

class QCheckBox;
class QComboBox;
class QDoubleSpinBox;
class QLineEdit;
class QPushButton;
class QSpinBox;

namespace zdr {
class Control;
}

namespace zdr::gui {

class LabelStockBox : public QGroupBox {
 public:
  LabelStockBox(Control& control, QWidget* parent = nullptr);

  // Fills the box from the store (the stock list, the kept choice and offsets).
  void Load();
  // Keeps the box's choices in the store and in the control's memory. Errors are ignored,
  // as the dialog's confirm ignores them.
  void Save();

  // The stock chosen and the correction shown.
  std::string ChosenStock() const;
  StockOffset ShownOffset() const;

  // Writes the chosen stock's calibration page, with the offset shown, in the temporary
  // folder and opens it. Returns its path, or empty when it failed (shown through the seam).
  std::string CmdCalibrate_Click();
  // Turns the four readings of the calibration page into the correction shown (the page
  // was printed with the correction shown) and clears them. Returns an empty string, or
  // the reason it could not (also shown through the seam).
  std::string CmdApplyReadings_Click();
  // Asks for a new stock (starting from the chosen one) and adds it.
  void CmdNewStock_Click();
  // Adds `stock` to the user's stocks and chooses it. Returns the reason it was refused,
  // or an empty string.
  std::string AddStock(const LabelStock& stock);

  QComboBox* cmbStock;
  QDoubleSpinBox* txtOffsetX;
  QDoubleSpinBox* txtOffsetY;
  QDoubleSpinBox* txtScaleX;  // per mille
  QDoubleSpinBox* txtScaleY;
  QCheckBox* chkOwnOffset;  // the correction belongs to the chosen stock only
  // The readings of the calibration page's scales "אופקי 1", "אופקי 2", "אנכי 1", "אנכי 2".
  QDoubleSpinBox *txtReadH1, *txtReadH2, *txtReadV1, *txtReadV2;
  QPushButton* cmdApplyReadings;
  QComboBox* cmbOutput;  // 0 the HTML sheet, 1 the PDF
  QPushButton* cmdCalibrate;
  QPushButton* cmdNewStock;

 private:
  void FillStocks(const std::string& choose);
  void ShowOffsetOf(const std::string& id);

  Control& control_;
};

// Asks for the figures of a label stock.
class LabelStockDialog : public QDialog {
 public:
  LabelStockDialog(const LabelStock& start, QWidget* parent = nullptr);
  LabelStock Stock() const;

  QLineEdit* txtId;
  QLineEdit* txtName;
  QDoubleSpinBox *txtPageWidth, *txtPageHeight, *txtTop, *txtSide, *txtLabelWidth, *txtLabelHeight,
      *txtPitchX, *txtPitchY, *txtPadding;
  QSpinBox *txtRows, *txtCols;
};

}  // namespace zdr::gui
