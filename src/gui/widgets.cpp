#include "gui/widgets.h"

#include <QComboBox>
#include <QHBoxLayout>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>

namespace zdr::gui {

PanelCheckBox::PanelCheckBox(const QString& text, QWidget* parent) : QCheckBox(text, parent) {
  setTristate(true);
}

int PanelCheckBox::value() const {
  switch (checkState()) {
    case Qt::Unchecked:
      return 0;
    case Qt::Checked:
      return 1;
    case Qt::PartiallyChecked:
      return 2;
  }
  return 0;
}

bool PanelCheckBox::setValue(int value) {
  switch (value) {
    case 0:
      setCheckState(Qt::Unchecked);
      return true;
    case 1:
      setCheckState(Qt::Checked);
      return true;
    case 2:
      setCheckState(Qt::PartiallyChecked);
      return true;
    default:
      return false;
  }
}

void PanelCheckBox::nextCheckState() {
  setCheckState(checkState() == Qt::Checked ? Qt::Unchecked : Qt::Checked);
}

QPushButton* MakeButton(const char* objectName, const QString& caption, QWidget* parent) {
  auto* b = new QPushButton(caption, parent);
  b->setObjectName(QString::fromLatin1(objectName));
  b->setAutoDefault(false);
  b->setDefault(false);
  return b;
}

QLineEdit* MakeEdit(const QString& objectName, QWidget* parent) {
  auto* e = new QLineEdit(parent);
  e->setObjectName(objectName);
  return e;
}

QLabel* MakeLabel(const QString& caption, QWidget* parent, const char* objectName) {
  auto* l = new QLabel(caption, parent);
  if (objectName) l->setObjectName(QString::fromLatin1(objectName));
  return l;
}

QHBoxLayout* OkCancelRow(QPushButton* ok, QPushButton* cancel) {
  auto* row = new QHBoxLayout;
  row->addStretch(1);
  row->addWidget(ok);
  row->addWidget(cancel);
  ok->setMinimumWidth(90);
  cancel->setMinimumWidth(90);
  return row;
}

void SetListIndex(QComboBox* list, int index) {
  list->setCurrentIndex(index >= 0 && index < list->count() ? index : -1);
}

}  // namespace zdr::gui
