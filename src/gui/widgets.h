// What the panel and its dialogs share: the panel's three-valued check box, and the named
// buttons, boxes and captions the dialogs are built of.
//
// Each dialog works on the Control it is given, which must outlive it, and talks to the
// person through the Control's UserSeam (message boxes) and a FileChooser (file dialogs).
// The click handlers are public so that a host or a test can drive a dialog without a
// person; ShowModal runs the dialog's own loading and then its modal loop.
#pragma once

#include <QCheckBox>
#include <QString>

class QComboBox;
class QHBoxLayout;
class QLabel;
class QLineEdit;
class QPushButton;

namespace zdr::gui {

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

// A dialog's button. Enter belongs to the text boxes: no button is the dialog's default.
QPushButton* MakeButton(const char* objectName, const QString& caption, QWidget* parent);
QLineEdit* MakeEdit(const QString& objectName, QWidget* parent);
QLabel* MakeLabel(const QString& caption, QWidget* parent, const char* objectName = nullptr);
// The confirm and cancel buttons at the bottom of a dialog, confirm on the reading side.
QHBoxLayout* OkCancelRow(QPushButton* ok, QPushButton* cancel);
// Chooses entry `index` of `list`, or none when there is no such entry.
void SetListIndex(QComboBox* list, int index);

}  // namespace zdr::gui
