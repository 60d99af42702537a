// The dispatch settings dialog: the service, weight and delivery confirmation the dispatch
// file carries, its path and layout, and whether the spreadsheet opens it.
#pragma once

#include <QDialog>
#include <QHash>
#include <cstdint>
#include <string_view>

class QComboBox;
class QLabel;
class QLineEdit;

namespace zdr {
class Control;
}

namespace zdr::gui {

class FileChooser;
class PanelCheckBox;

// The common dialog's filter list of the output file. The dispatch file is written as
// .xlsx; .xls stays on offer for older paths.
inline constexpr std::string_view kWorkbookFilter =
    "Excel Files (*.xlsx)|*.xlsx|Excel Files (*.xls)|*.xls|All Files (*.*)|*.*";
inline constexpr int kWorkbookFilterPreselected = 0;

// The dispatch settings dialog, "הגדרות לקובץ לדואר שליחים".
class frmPostIL : public QDialog {
 public:
  frmPostIL(Control& control, FileChooser& chooser, QWidget* parent = nullptr);

  void ShowModal();
  void Load();
  // Action 1 fills the dialog from memory, 2 reads it into memory.
  void GetSetFormPostILDefs(uint8_t Action);
  void cmdOK_Click();
  void cmdCancel_Click();
  void CmdDir_Click();

  QLineEdit* txtService;
  QLineEdit* txtWeight;
  QLineEdit* txtConfirm;
  QLineEdit* txtFilePath;
  PanelCheckBox* ChkOpenExcel;
  QComboBox* CmbFileFormat;

 private:
  Control& control_;
  FileChooser& chooser_;
  QHash<QLineEdit*, QLabel*> captionOf_;  // each text box's caption label
};

}  // namespace zdr::gui
