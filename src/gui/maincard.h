// MainCard: the whole panel of the system as one widget a host window embeds. It shows the
// criteria, the label layout and the command buttons, owns the Control that does the work,
// and talks to the person through a QtSeam (status line, progress bar, message boxes).
//
// Creating a MainCard runs the start-up (Initialize) at once: the company path, the document
// types, the panel, the label appearance and the dispatch settings come from `store`. The
// panel reaches the store only through CmdDef.
#pragma once

#include <QPointer>
#include <QWidget>
#include <array>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "common/value.h"
#include "control/control.h"
#include "gui/qtseam.h"

class QComboBox;
class QGroupBox;
class QHBoxLayout;
class QLabel;
class QLineEdit;
class QProgressBar;
class QPushButton;

namespace zdr {
class SettingsStore;
}

namespace zdr::gui {

class PanelCheckBox;
class frmLogon;
class frmOpenDir;
class frmLabDef;
class frmSelectCard;
class frmPostIL;

// A label that acts when clicked (the "to" labels that copy a range's start into its end).
class ClickLabel : public QWidget {
 public:
  ClickLabel(const QString& text, QWidget* parent);
  void SetOnClick(std::function<void()> onClick) { onClick_ = std::move(onClick); }
  void Click() {
    if (onClick_) onClick_();
  }
  QLabel* label() const { return label_; }

 protected:
  void mousePressEvent(class QMouseEvent* event) override;

 private:
  QLabel* label_;
  std::function<void()> onClick_;
};

// What the panel talks to besides the store. Null members get the desktop's own: message
// boxes, QDesktopServices and QFileDialog. Whatever is given must outlive the MainCard.
struct MainCardServices {
  Prompter* prompter = nullptr;
  DesktopOpener* opener = nullptr;
  FileChooser* chooser = nullptr;
};

class MainCard : public QWidget {
 public:
  // `store` must outlive the card.
  explicit MainCard(SettingsStore& store, MainCardServices services = {},
                    QWidget* parent = nullptr);
  ~MainCard() override;

  // Start-up: the store part (Control::Initialize), the document-type list, then the panel
  // shown from the Control. Each failing step is passed over. Runs once from the constructor.
  void Initialize();

  // The panel's widgets into the Control's Panel, and back.
  void ReadPanel();
  void WritePanel();

  // The command buttons. The three outputs return the produced file's path (empty on
  // failure); while one runs, every command is refused.
  std::string CmdLabPrev_Click();
  std::string CmdPreview_Click();
  std::string cmdBuildPostIL_Click();
  void CmdDef_Click();
  void CmdConnect_Click();
  void CmdLabDef_Click();
  void cmdPostDef_Click();
  void cmdSelectAccount_Click();

  // The copy labels: each copies its range's "from" box into the "to" box.
  void lblToDate_Click();
  void lblToRef_Click();
  void Label48_Click();
  void Label45_Click();

  // The public methods of the control, on the current panel and company.
  std::string BuildDatesCriteria(Date pFromDate, Date pToDate, int16_t pDocIndex);
  std::string BuildSelect(int16_t pDocIndex, bool& pUseDocs);
  std::string BuildOrderBy(bool& pUseDocs);
  void CreateHTML(const std::string& pFileName, const std::string& pDBFile);
  void CreateLabFile(const std::string& pFileName, const std::string& pDBFile);
  void SetGetRegParams(uint8_t Action);
  bool ReadACT(const std::string& CompPath, const std::string& pDBFile, bool pAllDetails,
               bool pAsIs);
  // Fills cmbDocType with the document types (appending, as the list is filled once) and
  // chooses the first.
  void InitCmbDocType();
  int32_t ReadStock(int16_t pCompID, const std::string& pCompPath, const std::string& pFromDate,
                    const std::string& pToDate, const std::string& pDBFile, uint8_t pDocTypeIndex,
                    bool pWithLines, bool pAsIs);
  int16_t ReadTransactions(const std::string& CompPath, const std::string& pDBFile);
  int16_t ReadTempTransactions(const std::string& CompPath, const std::string& pDBFile,
                               int16_t pJournalNo);
  bool UseTransactions();
  int16_t ReadCash(const std::string& CompPath, const std::string& pDBFile);
  void ReadAllTempTrans(const std::string& CompPath, const std::string& pDBFile);
  void ReadItem(const std::string& CompPath, const std::string& pDBFile);
  void CreateCSV(const std::string& pFileName, const std::string& pDBFile, int16_t pFileFormat);

  Control& control() { return *control_; }
  QtSeam& seam() { return *seam_; }
  bool IsBusy() const { return busy_; }

  // The dialogs, created on first use (null before).
  frmOpenDir* openDirDialog() const { return openDir_.get(); }
  frmSelectCard* selectCardDialog() const { return selectCard_.get(); }
  frmLabDef* labDefDialog();
  frmPostIL* postILDialog();
  frmOpenDir* openDir();
  frmSelectCard* selectCard();

  // The status line and the progress bar.
  QLabel* LblMessage() const { return lblMessage_; }
  QProgressBar* ProgressFill() const { return progress_; }

 private:
  template <typename Widget>
  Widget* Named(const char* name, Widget* w);
  QLineEdit* Text(const char* name, std::string Panel::*field);
  PanelCheckBox* Check(const char* name, const QString& caption, int Panel::*field);
  QComboBox* List(const char* name, int Panel::*field);
  QPushButton* Command(const char* name, const QString& caption);

  // The panel: its four groups of inputs in two columns, the two rows of commands, the
  // status line and the progress bar.
  void BuildLayout();
  QGroupBox* BuildAccounts();
  QGroupBox* BuildDocuments();
  QGroupBox* BuildLedger();
  // The order and the label layout, holding the label's content (BuildLabelContent).
  QGroupBox* BuildLabelLayout();
  QGroupBox* BuildLabelContent();
  // The row of the output commands and the row of the settings commands.
  std::pair<QHBoxLayout*, QHBoxLayout*> BuildCommands();
  void SetTabOrder();
  // Runs an output command with the panel locked meanwhile: its inputs greyed and every
  // command refused.
  std::string RunCommand(const std::function<std::string()>& command);
  // After the dispatch command, when its checks found anything: the counts, and the
  // workbook opened on its findings sheet when the clerk asks for it.
  void OfferPostILFindings();
  void LockPanel(bool locked);
  void CopyBox(const char* from, const char* to);

  SettingsStore& store_;
  std::unique_ptr<MessageBoxPrompter> ownPrompter_;
  std::unique_ptr<SystemDesktopOpener> ownOpener_;
  std::unique_ptr<QtFileChooser> ownChooser_;
  Prompter* prompter_;
  DesktopOpener* opener_;
  FileChooser* chooser_;

  QLabel* lblMessage_;
  QProgressBar* progress_;
  std::unique_ptr<QtSeam> seam_;
  std::unique_ptr<Control> control_;

  std::vector<std::pair<QLineEdit*, std::string Panel::*>> texts_;
  std::vector<std::pair<PanelCheckBox*, int Panel::*>> checks_;
  std::vector<std::pair<QComboBox*, int Panel::*>> lists_;
  std::array<QLineEdit*, 5> cutOff_{};  // 1..4
  std::array<PanelCheckBox*, 9> chkTitle_{};
  std::array<PanelCheckBox*, 2> chkLogo_{};
  QComboBox* cmbDocType_ = nullptr;
  std::vector<QPushButton*> commands_;
  std::vector<QGroupBox*> inputGroups_;  // every input of the panel is in one of them
  QPointer<QWidget> refocus_;
  bool busy_ = false;

  std::unique_ptr<frmOpenDir> openDir_;
  std::unique_ptr<frmLabDef> labDef_;
  std::unique_ptr<frmSelectCard> selectCard_;
  std::unique_ptr<frmPostIL> postIL_;
};

}  // namespace zdr::gui
