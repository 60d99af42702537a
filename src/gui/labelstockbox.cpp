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
#include <QStandardItemModel>
#include <cctype>
#include <cmath>
#include <exception>

#include "control/control.h"
#include "control/settings.h"
#include "control/stockcatalogue.h"
#include "gui/qtseam.h"
#include "workdb/schema.h"

namespace zdr::gui {
namespace {

QDoubleSpinBox* TenthsBox(const char* name, double range, const QString& unit, QWidget* parent) {
  auto* box = new QDoubleSpinBox(parent);
  box->setObjectName(QString::fromLatin1(name));
  box->setRange(-range, range);
  box->setSingleStep(0.1);
  box->setDecimals(1);
  box->setSuffix(unit);
  // Figures read left to right, the minus before the digits.
  box->setLayoutDirection(Qt::LeftToRight);
  return box;
}

QDoubleSpinBox* OffsetBox(const char* name, QWidget* parent) {
  return TenthsBox(name, kMaxOffsetMm, QStringLiteral(" מ\"מ"), parent);
}

QDoubleSpinBox* ScaleBox(const char* name, QWidget* parent) {
  return TenthsBox(name, kMaxScalePerMille, QStringLiteral(" ‰"), parent);
}

// The value of a box of tenths, without the binary noise of its double.
double Tenths(const QDoubleSpinBox* box) {
  return std::round(box->value() * 10) / 10 + 0.0;
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
  txtScaleX = ScaleBox("txtScaleX", this);
  txtScaleY = ScaleBox("txtScaleY", this);
  txtReadH1 = OffsetBox("txtReadH1", this);
  txtReadH2 = OffsetBox("txtReadH2", this);
  txtReadV1 = OffsetBox("txtReadV1", this);
  txtReadV2 = OffsetBox("txtReadV2", this);
  cmdApplyReadings = Button("cmdApplyReadings", QStringLiteral("חשב תיקון"), this);
  chkOwnOffset = new QCheckBox(QStringLiteral("תיקון לתבנית זו בלבד"), this);
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
  grid->addWidget(new QLabel(QStringLiteral("קנה מידה אופקי:"), this), 2, 0);
  grid->addWidget(txtScaleX, 2, 1);
  grid->addWidget(new QLabel(QStringLiteral("אנכי:"), this), 2, 2);
  grid->addWidget(txtScaleY, 2, 3);
  grid->addWidget(chkOwnOffset, 3, 1, 1, 3);
  // The calibration page's readings, each in the box named as its scale.
  grid->addWidget(new QLabel(QStringLiteral("קריאות דף הכיול:"), this), 4, 0);
  const std::pair<const char*, QDoubleSpinBox*> readings[] = {
      {"אופקי 1", txtReadH1}, {"אופקי 2", txtReadH2}, {"אנכי 1", txtReadV1}, {"אנכי 2", txtReadV2}};
  for (int i = 0; i < 4; ++i) {
    grid->addWidget(new QLabel(QString::fromUtf8(readings[i].first), this), 5 + i / 2, i % 2 * 2);
    grid->addWidget(readings[i].second, 5 + i / 2, i % 2 * 2 + 1);
  }
  grid->addWidget(cmdApplyReadings, 6, 4);
  grid->addWidget(new QLabel(QStringLiteral("כפתור המדבקות מפיק:"), this), 7, 0);
  grid->addWidget(cmbOutput, 7, 1, 1, 3);
  grid->setColumnStretch(1, 1);
  grid->setColumnStretch(3, 1);

  connect(cmbStock, &QComboBox::currentIndexChanged, this, [this] { ShowOffsetOf(ChosenStock()); });
  connect(cmdCalibrate, &QPushButton::clicked, this, [this] { CmdCalibrate_Click(); });
  connect(cmdNewStock, &QPushButton::clicked, this, [this] { CmdNewStock_Click(); });
  connect(cmdApplyReadings, &QPushButton::clicked, this, [this] { CmdApplyReadings_Click(); });
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
  // A retired stock the settings still name stays chosen, and says so.
  if (cmbStock->findData(ToQ(choose)) < 0 && IsRetiredStock(choose)) {
    if (auto retired = FindShippedStock(choose)) {
      cmbStock->addItem(ToQ(retired->name + "   \u202A" + retired->id +
                            "\u202C (לא מוצעת עוד: אין גיליון מפורסם כזה)"),
                        ToQ(retired->id));
    }
  }
  // The catalogue's stocks by brand and part; those that cannot be printed are shown
  // greyed, with the reason.
  const StockCatalogue& catalogue = InstalledStockCatalogue();
  if (!catalogue.entries.empty()) cmbStock->insertSeparator(cmbStock->count());
  auto* model = qobject_cast<QStandardItemModel*>(cmbStock->model());
  for (const CatalogueEntry& e : catalogue.entries) {
    const std::string caption = e.stock ? e.stock->name : e.problem;
    cmbStock->addItem(ToQ("\u202A" + e.id + "\u202C   " + caption), ToQ(e.id));
    if (!e.stock && model != nullptr) {
      QStandardItem* item = model->item(cmbStock->count() - 1);
      item->setEnabled(false);
      item->setToolTip(ToQ(e.problem));
    }
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
  txtScaleX->setValue(shown.scaleX);
  txtScaleY->setValue(shown.scaleY);
  for (QDoubleSpinBox* r : {txtReadH1, txtReadH2, txtReadV1, txtReadV2}) r->setValue(0);
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
  return {CheckedOffsetMm(Tenths(txtOffsetX)).value_or(0),
          CheckedOffsetMm(Tenths(txtOffsetY)).value_or(0),
          CheckedScalePerMille(Tenths(txtScaleX)).value_or(0),
          CheckedScalePerMille(Tenths(txtScaleY)).value_or(0)};
}

std::string LabelStockBox::CmdApplyReadings_Click() {
  std::string problem;
  const std::optional<LabelStock> stock = FindLabelStock(control_.store(), ChosenStock());
  std::optional<StockOffset> corrected;
  if (stock) {
    corrected = CorrectionFromReadings(
        *stock, ShownOffset(),
        {Tenths(txtReadH1), Tenths(txtReadH2), Tenths(txtReadV1), Tenths(txtReadV2)});
  }
  if (!stock) {
    problem = LabelStockChoiceProblem(control_.store(), ChosenStock());
  } else if (!corrected) {
    problem =
        "הקריאות נותנות תיקון מעבר לתחום (היסט עד 10 מ\"מ, קנה מידה עד 100 פרומיל): בדקו את "
        "הקריאות ואת הדפסת דף הכיול בגודל מלא";
  }
  if (!problem.empty()) {
    control_.ui().ShowMessage(problem, kTitleError, MsgIcon::Exclamation);
    return problem;
  }
  txtOffsetX->setValue(corrected->x);
  txtOffsetY->setValue(corrected->y);
  txtScaleX->setValue(corrected->scaleX);
  txtScaleY->setValue(corrected->scaleY);
  for (QDoubleSpinBox* r : {txtReadH1, txtReadH2, txtReadV1, txtReadV2}) r->setValue(0);
  return "";
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
  // A catalogue id ("Avery L7160") as a name of the user's own: blanks and the like as '-'.
  for (char& c : start.id) {
    if (!std::isalnum(static_cast<unsigned char>(c)) && c != '.' && c != '_') c = '-';
  }
  start.id += "-mine";
  start.source.clear();
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
