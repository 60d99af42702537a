// The label appearance dialog: font, size, weight, underline and slant of each label line,
// the two pictures, and the labels on stock.
#pragma once

#include <QDialog>
#include <array>
#include <cstdint>
#include <string>
#include <string_view>

class QComboBox;
class QLineEdit;

namespace zdr {
class Control;
}

namespace zdr::gui {

class FileChooser;
class LabelStockBox;
class PanelCheckBox;

// The common dialog's filter list of the picture buttons, as the dialog offers it.
inline constexpr std::string_view kImageFilter =
    "GIF Files (*.gif)|*.gif|JPEG Files (*.jpg)|*.jpg|PNG Files (*.png)|*.png|All Files "
    "(*.*)|*.*";
inline constexpr int kImageFilterPreselected = 1;  // JPEG

// The label appearance dialog, "הגדרות צורה וגודל".
class frmLabDef : public QDialog {
 public:
  frmLabDef(Control& control, FileChooser& chooser, QWidget* parent = nullptr);

  void ShowModal();
  // Reads the settings from the store into memory and fills the dialog.
  void Load();
  // Action 1 fills the dialog from memory, 2 reads it into memory. Action 2 takes all or
  // nothing: a size that is not a whole number from 1 to 255, or a list without a choice,
  // throws std::invalid_argument and leaves memory as it was.
  void GetSetFormLabDefs(uint8_t Action);
  // Takes the dialog into memory, saves, and closes. A bad value is named in a message
  // instead and the dialog stays open on it, as typed; returns false then.
  bool cmdOK_Click();
  void cmdCancel_Click();
  // The picture buttons: 0 the top picture, 1 the bottom one.
  void CmdDir_Click(int index);
  // The chosen picture, or empty when the user cancelled.
  QString BrowseImage();

  static constexpr int kLines = 8;
  std::array<QComboBox*, kLines> CmbFont{};
  std::array<QLineEdit*, kLines> txtFontSize{};
  std::array<QComboBox*, kLines> CmbWeight{};
  std::array<PanelCheckBox*, kLines> ChkUL{};
  std::array<PanelCheckBox*, kLines> ChkItalic{};
  QLineEdit* TxtHeaderLogo;
  QLineEdit* txtFooterLogo;
  LabelStockBox* StockBox;  // labels on stock as PDF

 private:
  // The first control whose value cannot be taken, with the reason; null when all can.
  QWidget* FirstBadValue(std::string& why) const;

  Control& control_;
  FileChooser& chooser_;
};

}  // namespace zdr::gui
