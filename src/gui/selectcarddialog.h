// The account picker: the accounts of the account-selection database with their ticks, and
// the buttons that mark, show and find them.
#pragma once

#include <QDialog>
#include <string>

class QLineEdit;
class QTableView;

namespace zdr {
class Control;
}

namespace zdr::gui {

class PickerModel;

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
