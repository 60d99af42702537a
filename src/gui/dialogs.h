// The panel's dialogs: connection (frmLogon), company chooser (frmOpenDir), label appearance
// (frmLabDef), account picker (frmSelectCard) and dispatch settings (frmPostIL).
//
// Each dialog works on the Control it is given, which must outlive it, and talks to the
// person through the Control's UserSeam (message boxes) and a FileChooser (file dialogs).
// The click handlers are public so that a host or a test can drive a dialog without a
// person; ShowModal runs the dialog's own loading and then its modal loop.
#pragma once

#include <QAbstractTableModel>
#include <QCheckBox>
#include <QDialog>
#include <QElapsedTimer>
#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "control/companies.h"

class QComboBox;
class QFileSystemModel;
class QGroupBox;
class QLabel;
class QLineEdit;
class QListWidget;
class QModelIndex;
class QPushButton;
class QTableView;
class QTimer;
class QTreeView;

namespace zdr {
class Control;
}

namespace zdr::gui {

class FileChooser;
class LabelStockBox;

// A check box that holds the panel's three values: 0 off, 1 on, 2 greyed. A click turns
// it on or off; only code sets the greyed state, and a click on a greyed box turns it on.
class PanelCheckBox : public QCheckBox {
 public:
  explicit PanelCheckBox(const QString& text = QString(), QWidget* parent = nullptr);
  int value() const;
  // Values other than 0, 1 and 2 are refused (the box keeps its state); returns false then.
  bool setValue(int value);

 protected:
  void nextCheckState() override;
};

// The common dialog's filter lists, as the dialogs offer them.
inline constexpr std::string_view kImageFilter =
    "GIF Files (*.gif)|*.gif|JPEG Files (*.jpg)|*.jpg|PNG Files (*.png)|*.png|All Files "
    "(*.*)|*.*";
inline constexpr int kImageFilterPreselected = 1;  // JPEG
// The dispatch file is written as .xlsx; .xls stays on offer for older paths.
inline constexpr std::string_view kWorkbookFilter =
    "Excel Files (*.xlsx)|*.xlsx|Excel Files (*.xls)|*.xls|All Files (*.*)|*.*";
inline constexpr int kWorkbookFilterPreselected = 0;

// The company chooser, "בחירת מחיצה ראשית". One instance lives with the panel. Confirm and
// Cancel hide it, so the next showing finds it as it was left; the window's close button
// closes it, and the next showing loads it again from the remembered place.
class frmOpenDir : public QDialog {
 public:
  frmOpenDir(Control& control, QWidget* parent = nullptr);
  ~frmOpenDir() override;

  // Loads when needed, then runs the modal loop. On a confirmation the Control's company
  // path holds the chosen company's folder.
  void ShowModal();
  // The loading of a first showing: drive and folder from the remembered place, then a scan.
  void Load();
  bool IsLoaded() const { return loaded_; }

  // Rescans `pDrive`'s subfolders and refills cmbCompany with the named companies. A scan
  // that fails part way shows the failure ("תקלה") and lists what it found before it.
  void FindTavPaths(const std::string& pDrive);

  // The user's actions.
  void PathDrive_Change(const QString& rootPath);
  void MainDir_Change(const QString& folder);
  // OKButton or a double click: false when no company was chosen (the dialog stays).
  bool OKButton_Click();
  void CancelButton_Click();

  // The remembered place: the drive and folder of the last confirmation.
  std::string PubMainDrive;
  std::string PubMainDir;

  const CompanyScan& Companies() const { return scan_; }
  QComboBox* PathDrive() const { return pathDrive_; }
  QTreeView* MainDir() const { return mainDir_; }
  QListWidget* cmbCompany() const { return cmbCompany_; }
  // The folder MainDir shows (native separators, no trailing one except for the root).
  QString CurrentFolder() const { return currentFolder_; }

 protected:
  void closeEvent(QCloseEvent* event) override;
  void showEvent(QShowEvent* event) override;

 private:
  void FillDrives();
  void ScrollToCurrentFolder();
  void ShowFolder(const QString& folder);
  void OnTreeCurrentChanged(const QModelIndex& current);

  Control& control_;
  bool loaded_ = false;
  bool settingPlace_ = false;  // Load and the drive change set the tree without rescanning
  CompanyScan scan_;
  QString currentFolder_;
  QElapsedTimer placeSet_;  // since the program last set the folder
  QTimer* scrollTimer_;
  QComboBox* pathDrive_;
  QTreeView* mainDir_;
  QFileSystemModel* dirModel_;
  QListWidget* cmbCompany_;
};

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
};

// The rows of tSelectAccount the picker shows, with the tick written to the database as
// soon as it changes. Every statement opens the account-selection database anew; a failure
// leaves the rows as they were.
class PickerModel : public QAbstractTableModel {
 public:
  struct Row {
    std::string key;   // SortByKey
    std::string name;  // SortByName
    bool include = false;
  };

  explicit PickerModel(QObject* parent = nullptr);

  // The database and the statement the rows come from; Refresh reads them.
  void SetSource(const std::string& dbPath, const std::string& recordSource);
  // Reruns the record source. Returns false (rows unchanged) when it fails.
  bool Refresh();
  // Runs a changing statement on the database. Returns false when it fails.
  bool Execute(const std::string& jetSql);
  // Ticks or unticks one row in the database and in the view.
  bool SetInclude(int row, bool include);

  const std::vector<Row>& Rows() const { return rows_; }
  const std::string& RecordSource() const { return recordSource_; }

  int rowCount(const QModelIndex& parent = QModelIndex()) const override;
  int columnCount(const QModelIndex& parent = QModelIndex()) const override;
  QVariant data(const QModelIndex& index, int role) const override;
  bool setData(const QModelIndex& index, const QVariant& value, int role) override;
  Qt::ItemFlags flags(const QModelIndex& index) const override;
  QVariant headerData(int section, Qt::Orientation orientation, int role) const override;

 private:
  std::string dbPath_;
  std::string recordSource_;
  std::vector<Row> rows_;
};

// The account picker, "בחירת כרטיסים להדפסה".
class frmSelectCard : public QDialog {
 public:
  frmSelectCard(Control& control, QWidget* parent = nullptr);

  // Loads the grid from the account-selection database and runs the modal loop.
  void ShowModal();
  void Load();
  // The record source, ordered by the Control's picker sort index.
  std::string BuildPickerSQL(std::string& pFilter, bool pMarkedOnly) const;
  void ArrangeGrid();

  void cmdShowAll_Click();
  void cmdShowMarked_Click();
  void CmdAllItems_Click();
  void cmdNoneItems_Click();
  // The first account whose key begins with the typed text becomes current, is ticked and
  // is scrolled into view.
  void cmdFindKey_Click();
  // Narrows the grid to the accounts whose name holds the typed text, and the ticked ones,
  // and moves to the first named match.
  void cmdFindByDesc_Click();
  void cmdClose_Click();

  PickerModel* model() const { return model_; }
  QTableView* VSSelectItems() const { return grid_; }
  QLineEdit* txtToItemkey;
  QLineEdit* txtToItemName;

 private:
  void SetRecordSource(std::string recordSource);

  Control& control_;
  PickerModel* model_;
  QTableView* grid_;
};

}  // namespace zdr::gui
