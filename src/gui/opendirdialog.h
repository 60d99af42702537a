// The company chooser: a folder tree, and the companies found in the folder chosen in it.
#pragma once

#include <QDialog>
#include <QElapsedTimer>
#include <string>

#include "control/companies.h"

class QComboBox;
class QFileSystemModel;
class QListWidget;
class QModelIndex;
class QTimer;
class QTreeView;

namespace zdr {
class Control;
}

namespace zdr::gui {

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

}  // namespace zdr::gui
