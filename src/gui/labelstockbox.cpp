#include "gui/labelstockbox.h"

#include <QCheckBox>
#include <QComboBox>
#include <QDialogButtonBox>
#include <QDoubleSpinBox>
#include <QFormLayout>
#include <QGridLayout>
#include <QHBoxLayout>
#include <QLabel>
#include <QLineEdit>
#include <QMessageBox>
#include <QPushButton>
#include <QSpinBox>
#include <exception>

#include "control/control.h"
#include "control/settings.h"
#include "gui/qtseam.h"
#include "workdb/schema.h"

namespace zdr::gui {
namespace {

QDoubleSpinBox* OffsetBox(const char* name, QWidget* parent) {
  auto* box = new QDoubleSpinBox(parent);
  box->setObjectName(QString::fromLatin1(name));
  box->setRange(-kMaxOffsetMm, kMaxOffsetMm);
  box->setSingleStep(0.1);
  box->setDecimals(1);
  box->setSuffix(QStringLiteral(" מ\"מ"));
  // Figures read left to right, the minus before the digits.
  box->setLayoutDirection(Qt::LeftToRight);
  return box;
}

QDoubleSpinBox* MmBox(const char* name, double value, QWidget* parent) {
  auto* box = new QDoubleSpinBox(parent);
  box->setObjectName(QString::fromLatin1(name));
  box->setRange(0, 2000);
  box->setDecimals(2);
  box->setSingleStep(0.1);
  box->setValue(value);
  box->setLayoutDirection(Qt::LeftToRight);
  return box;
}

QSpinBox* CountBox(const char* name, int value, QWidget* parent) {
  auto* box = new QSpinBox(parent);
  box->setObjectName(QString::fromLatin1(name));
  box->setRange(1, 100);
  box->setValue(value);
  box->setLayoutDirection(Qt::LeftToRight);
  return box;
}

QPushButton* Button(const char* name, const QString& caption, QWidget* parent) {
  auto* b = new QPushButton(caption, parent);
  b->setObjectName(QString::fromLatin1(name));
  b->setAutoDefault(false);
  return b;
}

}  // namespace

LabelStockBox::LabelStockBox(Control& control, QWidget* parent)
    : QGroupBox(QStringLiteral("מדבקות על גיליון (PDF)"), parent), control_(control) {
  setObjectName(QStringLiteral("LabelStockBox"));
  cmbStock = new QComboBox(this);
  cmbStock->setObjectName(QStringLiteral("cmbStock"));
  txtOffsetX = OffsetBox("txtOffsetX", this);
  txtOffsetY = OffsetBox("txtOffsetY", this);
  chkOwnOffset = new QCheckBox(QStringLiteral("היסט לתבנית זו בלבד"), this);
  chkOwnOffset->setObjectName(QStringLiteral("chkOwnOffset"));
  cmbOutput = new QComboBox(this);
  cmbOutput->setObjectName(QStringLiteral("cmbOutput"));
  cmbOutput->addItems({QStringLiteral("דף HTML בדפדפן"), QStringLiteral("PDF על גיליון מדבקות")});
  cmdCalibrate = Button("cmdCalibrate", QStringLiteral("דף כיול"), this);
  cmdNewStock = Button("cmdNewStock", QStringLiteral("תבנית חדשה..."), this);

  auto* grid = new QGridLayout(this);
  grid->addWidget(new QLabel(QStringLiteral("תבנית:"), this), 0, 0);
  grid->addWidget(cmbStock, 0, 1, 1, 3);
  grid->addWidget(cmdNewStock, 0, 4);
  grid->addWidget(new QLabel(QStringLiteral("היסט אופקי (ימינה):"), this), 1, 0);
  grid->addWidget(txtOffsetX, 1, 1);
  grid->addWidget(new QLabel(QStringLiteral("אנכי (למטה):"), this), 1, 2);
  grid->addWidget(txtOffsetY, 1, 3);
  grid->addWidget(cmdCalibrate, 1, 4);
  grid->addWidget(chkOwnOffset, 2, 1, 1, 3);
  grid->addWidget(new QLabel(QStringLiteral("כפתור המדבקות מפיק:"), this), 3, 0);
  grid->addWidget(cmbOutput, 3, 1, 1, 3);
  grid->setColumnStretch(1, 1);
  grid->setColumnStretch(3, 1);

  connect(cmbStock, &QComboBox::currentIndexChanged, this, [this] { ShowOffsetOf(ChosenStock()); });
  connect(cmdCalibrate, &QPushButton::clicked, this, [this] { CmdCalibrate_Click(); });
  connect(cmdNewStock, &QPushButton::clicked, this, [this] { CmdNewStock_Click(); });
}

void LabelStockBox::FillStocks(const std::string& choose) {
  const QSignalBlocker quiet(cmbStock);
  cmbStock->clear();
  std::vector<LabelStock> stocks;
  try {
    stocks = AvailableLabelStocks(control_.store());
  } catch (const std::exception&) {
    stocks = ShippedLabelStocks();
  }
  for (const LabelStock& s : stocks) {
    cmbStock->addItem(ToQ(s.name + "   \u202A" + s.id + "\u202C"), ToQ(s.id));
  }
  const int at = cmbStock->findData(ToQ(choose));
  cmbStock->setCurrentIndex(at >= 0 ? at : 0);
}

void LabelStockBox::ShowOffsetOf(const std::string& id) {
  std::optional<StockOffset> own;
  try {
    own = LoadStockOffset(control_.store(), id);
  } catch (const std::exception&) {
  }
  const StockOffset shown = own ? *own : control_.labelPdfSettings().Offset;
  chkOwnOffset->setChecked(own.has_value());
  txtOffsetX->setValue(shown.x);
  txtOffsetY->setValue(shown.y);
}

void LabelStockBox::Load() {
  LabelPdfSettings& pdf = control_.labelPdfSettings();
  try {
    SetGetRegLabelPdf(kActionLoad, control_.store(), pdf);
  } catch (...) {
  }
  FillStocks(pdf.Template);
  ShowOffsetOf(ChosenStock());
  cmbOutput->setCurrentIndex(pdf.Output == 1 ? 1 : 0);
  // A stock of the user's that fails its check is not offered; the clerk is told why, rather
  // than finding it gone.
  std::string unusable;
  try {
    for (const auto& [id, why] : UnusableUserStocks(control_.store())) {
      unusable += "\nתבנית המדבקות \"" + id + "\" אינה מוצגת ברשימה: " + why;
    }
  } catch (const std::exception&) {
  }
  if (!unusable.empty()) {
    control_.ui().ShowMessage("בהגדרות יש תבניות מדבקות שאינן תקינות:" + unusable, kTitleError,
                              MsgIcon::Exclamation);
  }
}

void LabelStockBox::Save() {
  LabelPdfSettings& pdf = control_.labelPdfSettings();
  const std::string id = ChosenStock();
  if (!id.empty()) pdf.Template = id;
  pdf.Output = static_cast<int16_t>(cmbOutput->currentIndex() == 1 ? 1 : 0);
  try {
    if (chkOwnOffset->isChecked()) {
      SaveStockOffset(control_.store(), id, ShownOffset());
    } else {
      SaveStockOffset(control_.store(), id, std::nullopt);
      pdf.Offset = ShownOffset();
    }
  } catch (...) {
  }
  try {
    SetGetRegLabelPdf(kActionSave, control_.store(), pdf);
  } catch (...) {
  }
}

std::string LabelStockBox::ChosenStock() const {
  return FromQ(cmbStock->currentData().toString());
}

StockOffset LabelStockBox::ShownOffset() const {
  // The boxes hold tenths; rounding drops the binary noise of their doubles.
  return {CheckedOffsetMm(std::round(txtOffsetX->value() * 10) / 10).value_or(0),
          CheckedOffsetMm(std::round(txtOffsetY->value() * 10) / 10).value_or(0)};
}

std::string LabelStockBox::CmdCalibrate_Click() {
  const std::string path = (TempFolder() / "zdrcalib.pdf").string();
  return control_.CmdCalibrate(path, ChosenStock(), ShownOffset());
}

std::string LabelStockBox::AddStock(const LabelStock& stock) {
  try {
    SaveUserStock(control_.store(), stock);
  } catch (const std::exception& e) {
    return e.what();
  }
  FillStocks(stock.id);
  ShowOffsetOf(stock.id);
  return "";
}

void LabelStockBox::CmdNewStock_Click() {
  LabelStock start;
  if (auto chosen = FindLabelStock(control_.store(), ChosenStock())) start = *chosen;
  start.id += "-mine";
  LabelStockDialog dialog(start, this);
  while (dialog.exec() == QDialog::Accepted) {
    const std::string problem = AddStock(dialog.Stock());
    if (problem.empty()) return;
    QMessageBox box(QMessageBox::Warning, QStringLiteral("שגיאה"), ToQ(problem), QMessageBox::Ok,
                    this);
    box.setLayoutDirection(Qt::RightToLeft);
    box.exec();
  }
}

LabelStockDialog::LabelStockDialog(const LabelStock& s, QWidget* parent) : QDialog(parent) {
  setObjectName(QStringLiteral("LabelStockDialog"));
  setWindowTitle(QStringLiteral("תבנית מדבקות חדשה"));
  ApplyHebrewLook(*this);
  txtId = new QLineEdit(ToQ(s.id), this);
  txtId->setObjectName(QStringLiteral("txtId"));
  txtId->setLayoutDirection(Qt::LeftToRight);
  txtName = new QLineEdit(ToQ(s.name), this);
  txtName->setObjectName(QStringLiteral("txtName"));
  txtPageWidth = MmBox("txtPageWidth", s.pageWidth, this);
  txtPageHeight = MmBox("txtPageHeight", s.pageHeight, this);
  txtTop = MmBox("txtTop", s.top, this);
  txtSide = MmBox("txtSide", s.side, this);
  txtLabelWidth = MmBox("txtLabelWidth", s.labelWidth, this);
  txtLabelHeight = MmBox("txtLabelHeight", s.labelHeight, this);
  txtPitchX = MmBox("txtPitchX", s.pitchX, this);
  txtPitchY = MmBox("txtPitchY", s.pitchY, this);
  txtPadding = MmBox("txtPadding", s.padding, this);
  txtRows = CountBox("txtRows", s.rows, this);
  txtCols = CountBox("txtCols", s.cols, this);

  auto* form = new QFormLayout;
  form->addRow(QStringLiteral("שם קצר (אותיות לטיניות, ספרות, -):"), txtId);
  form->addRow(QStringLiteral("תיאור:"), txtName);
  form->addRow(QStringLiteral("רוחב הדף (מ\"מ):"), txtPageWidth);
  form->addRow(QStringLiteral("גובה הדף:"), txtPageHeight);
  form->addRow(QStringLiteral("שוליים עליונים:"), txtTop);
  form->addRow(QStringLiteral("שוליים בצד (משמאל):"), txtSide);
  form->addRow(QStringLiteral("רוחב מדבקה:"), txtLabelWidth);
  form->addRow(QStringLiteral("גובה מדבקה:"), txtLabelHeight);
  form->addRow(QStringLiteral("מרווח אופקי (מתחילת מדבקה לבאה):"), txtPitchX);
  form->addRow(QStringLiteral("מרווח אנכי:"), txtPitchY);
  form->addRow(QStringLiteral("שורות:"), txtRows);
  form->addRow(QStringLiteral("עמודות:"), txtCols);
  form->addRow(QStringLiteral("ריפוד פנימי:"), txtPadding);
  auto* buttons = new QDialogButtonBox(this);
  buttons->addButton(QStringLiteral("אישור"), QDialogButtonBox::AcceptRole);
  buttons->addButton(QStringLiteral("ביטול"), QDialogButtonBox::RejectRole);
  auto* all = new QVBoxLayout(this);
  all->addLayout(form);
  all->addWidget(buttons);
  connect(buttons, &QDialogButtonBox::accepted, this, &QDialog::accept);
  connect(buttons, &QDialogButtonBox::rejected, this, &QDialog::reject);
}

LabelStock LabelStockDialog::Stock() const {
  LabelStock s;
  s.id = FromQ(txtId->text().trimmed());
  s.name = FromQ(txtName->text().trimmed());
  s.pageWidth = txtPageWidth->value();
  s.pageHeight = txtPageHeight->value();
  s.top = txtTop->value();
  s.side = txtSide->value();
  s.labelWidth = txtLabelWidth->value();
  s.labelHeight = txtLabelHeight->value();
  s.pitchX = txtPitchX->value();
  s.pitchY = txtPitchY->value();
  s.padding = txtPadding->value();
  s.rows = txtRows->value();
  s.cols = txtCols->value();
  return s;
}

}  // namespace zdr::gui
