// The connection dialog: the company folder, typed or chosen, and its check.
#pragma once

#include <QDialog>

class QLabel;
class QLineEdit;

namespace zdr {
class Control;
}

namespace zdr::gui {

class frmOpenDir;

// The connection dialog, "הגדרות התחברות לTavlor קלאסית". Loaded anew at every showing.
class frmLogon : public QDialog {
 public:
  // `openDir` is the panel's company chooser, shown by cmdOpen; it must outlive the dialog.
  frmLogon(Control& control, frmOpenDir& openDir, QWidget* parent = nullptr);

  void ShowModal();
  // Opening: the text box shows the company path and the result line its advice.
  void Load();
  void cmdOpen_Click();
  // Looks for act.fix (any case) in the typed folder; the result goes to LblMsg.
  void CmdCheck_Click();
  // Makes the typed folder the company path, stores it, and closes.
  void cmdOK_Click();
  void cmdCancel_Click();

  QLineEdit* txtConnDatabase() const { return txtConnDatabase_; }
  QLabel* LblMsg() const { return lblMsg_; }

 private:
  Control& control_;
  frmOpenDir& openDir_;
  QLineEdit* txtConnDatabase_;
  QLabel* lblMsg_;
};

}  // namespace zdr::gui
