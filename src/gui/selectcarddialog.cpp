#include "gui/selectcarddialog.h"

#include <QGridLayout>
#include <QHBoxLayout>
#include <QHeaderView>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QTableView>
#include <QVBoxLayout>

#include "control/control.h"
#include "gui/pickermodel.h"
#include "gui/qtseam.h"
#include "gui/widgets.h"
#include "select/picker.h"

namespace zdr::gui {

frmSelectCard::frmSelectCard(Control& control, QWidget* parent)
    : QDialog(parent), control_(control) {
  setObjectName(QStringLiteral("frmSelectCard"));
  setWindowTitle(QStringLiteral("בחירת כרטיסים להדפסה"));
  ApplyHebrewLook(*this);
  setModal(true);

  model_ = new PickerModel(this);
  grid_ = new QTableView(this);
  grid_->setObjectName(QStringLiteral("VSSelectItems"));
  grid_->setModel(model_);
  grid_->setSelectionBehavior(QAbstractItemView::SelectRows);
  grid_->setSelectionMode(QAbstractItemView::SingleSelection);
  grid_->setAlternatingRowColors(true);
  grid_->verticalHeader()->setDefaultSectionSize(22);
  grid_->setMinimumSize(460, 320);

  txtToItemkey = MakeEdit(QStringLiteral("txtToItemkey"), this);
  txtToItemName = MakeEdit(QStringLiteral("txtToItemName"), this);
  auto* findKey = MakeButton("cmdFindKey", QStringLiteral("איתור"), this);
  auto* findDesc = MakeButton("cmdFindByDesc", QStringLiteral("איתור"), this);
  auto* allItems = MakeButton("CmdAllItems", QStringLiteral("סמן את כולם"), this);
  auto* noneItems = MakeButton("cmdNoneItems", QStringLiteral("בטל את כולם"), this);
  auto* showMarked = MakeButton("cmdShowMarked", QStringLiteral("הצג רק מסומנים"), this);
  auto* showAll = MakeButton("cmdShowAll", QStringLiteral("הצג את כולם"), this);
  auto* close = MakeButton("cmdClose", QStringLiteral("סגור"), this);

  auto* find = new QGridLayout;
  find->addWidget(MakeLabel(QStringLiteral("איתור כרטיס לפי מפתח:"), this), 0, 0);
  find->addWidget(txtToItemkey, 0, 1);
  find->addWidget(findKey, 0, 2);
  find->addWidget(MakeLabel(QStringLiteral("איתור כרטיס לפי תאור:"), this), 1, 0);
  find->addWidget(txtToItemName, 1, 1);
  find->addWidget(findDesc, 1, 2);
  find->setColumnStretch(1, 1);

  auto* side = new QVBoxLayout;
  for (QPushButton* b : {allItems, noneItems, showMarked, showAll}) {
    b->setMinimumWidth(130);
    side->addWidget(b);
  }
  side->addStretch(1);
  close->setMinimumWidth(130);
  side->addWidget(close);

  auto* body = new QHBoxLayout;
  body->addWidget(grid_, 1);
  body->addLayout(side);
  auto* all = new QVBoxLayout(this);
  all->addLayout(find);
  all->addLayout(body, 1);
  resize(680, 520);

  connect(findKey, &QPushButton::clicked, this, [this] { cmdFindKey_Click(); });
  connect(txtToItemkey, &QLineEdit::returnPressed, this, [this] { cmdFindKey_Click(); });
  connect(findDesc, &QPushButton::clicked, this, [this] { cmdFindByDesc_Click(); });
  connect(txtToItemName, &QLineEdit::returnPressed, this, [this] { cmdFindByDesc_Click(); });
  connect(allItems, &QPushButton::clicked, this, [this] { CmdAllItems_Click(); });
  connect(noneItems, &QPushButton::clicked, this, [this] { cmdNoneItems_Click(); });
  connect(showMarked, &QPushButton::clicked, this, [this] { cmdShowMarked_Click(); });
  connect(showAll, &QPushButton::clicked, this, [this] { cmdShowAll_Click(); });
  connect(close, &QPushButton::clicked, this, [this] { cmdClose_Click(); });
}

std::string frmSelectCard::BuildPickerSQL(std::string& pFilter, bool pMarkedOnly) const {
  return zdr::BuildPickerSQL(pFilter, pMarkedOnly, control_.state().pickerSortIndex);
}

void frmSelectCard::ShowModal() {
  Load();
  exec();
}

void frmSelectCard::Load() {
  txtToItemkey->clear();
  txtToItemName->clear();
  std::string none;
  model_->SetSource(control_.state().selectDbPath, BuildPickerSQL(none, false));
  model_->Refresh();
  ArrangeGrid();
}

void frmSelectCard::SetRecordSource(std::string recordSource) {
  model_->SetSource(control_.state().selectDbPath, recordSource);
  model_->Refresh();
  ArrangeGrid();
}

void frmSelectCard::ArrangeGrid() {
  QHeaderView* h = grid_->horizontalHeader();
  h->setDefaultAlignment(Qt::AlignCenter);
  h->setSectionResizeMode(0, QHeaderView::ResizeToContents);
  h->setSectionResizeMode(1, QHeaderView::Stretch);
  h->setSectionResizeMode(2, QHeaderView::ResizeToContents);
}

void frmSelectCard::cmdShowAll_Click() {
  std::string none;
  SetRecordSource(BuildPickerSQL(none, false));
}

void frmSelectCard::cmdShowMarked_Click() {
  std::string none;
  SetRecordSource(BuildPickerSQL(none, true));
}

void frmSelectCard::CmdAllItems_Click() {
  model_->Execute(std::string(kMarkAllSQL));
  model_->Refresh();
}

void frmSelectCard::cmdNoneItems_Click() {
  model_->Execute(std::string(kUnmarkAllSQL));
  model_->Refresh();
}

void frmSelectCard::cmdFindKey_Click() {
  const QString wanted = txtToItemkey->text();
  if (wanted.isEmpty()) return;
  const auto& rows = model_->Rows();
  for (int r = 0; r < static_cast<int>(rows.size()); ++r) {
    if (!ToQ(rows[r].key).startsWith(wanted, Qt::CaseInsensitive)) continue;
    const QModelIndex at = model_->index(r, 0);
    grid_->setCurrentIndex(at);
    model_->SetInclude(r, true);
    grid_->scrollTo(at);
    return;
  }
}

void frmSelectCard::cmdFindByDesc_Click() {
  const QString wanted = txtToItemName->text();
  if (wanted.isEmpty()) return;
  std::string filter = BuildNameFilter(FromQ(wanted));
  SetRecordSource(BuildPickerSQL(filter, false));
  const auto& rows = model_->Rows();
  for (int r = 0; r < static_cast<int>(rows.size()); ++r) {
    if (!ToQ(rows[r].name).contains(wanted, Qt::CaseInsensitive)) continue;
    const QModelIndex at = model_->index(r, 1);
    grid_->setCurrentIndex(at);
    grid_->scrollTo(at);
    return;
  }
}

void frmSelectCard::cmdClose_Click() {
  accept();
}

}  // namespace zdr::gui
