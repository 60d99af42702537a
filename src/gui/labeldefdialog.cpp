#include "gui/labeldefdialog.h"

#include <QComboBox>
#include <QGridLayout>
#include <QGroupBox>
#include <QIntValidator>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QVBoxLayout>
#include <exception>
#include <optional>
#include <stdexcept>

#include "control/control.h"
#include "control/settings.h"
#include "gui/labelstockbox.h"
#include "gui/qtseam.h"
#include "gui/widgets.h"
#include "hosttext/hosttext.h"

namespace zdr::gui {

namespace {

constexpr std::array<const char*, frmLabDef::kLines> kLineCaptions{
    "לכבוד", "שם כרטיס", "קוד כרטיס:", "לידי: איש קשר", "כתובת", "עיר ומיקוד", "שכונה", "טלפון"};

constexpr int kMinFontSize = 1;
constexpr int kMaxFontSize = 255;

// The font size a box holds: a whole number from 1 to 255, or nothing.
std::optional<uint8_t> FontSizeOf(const QString& text) {
  int64_t v = 0;
  try {
    v = HostIntValue(FromQ(text.trimmed()));
  } catch (const std::exception&) {
    return std::nullopt;
  }
  if (text.trimmed().isEmpty() || v < kMinFontSize || v > kMaxFontSize) return std::nullopt;
  return static_cast<uint8_t>(v);
}

}  // namespace

frmLabDef::frmLabDef(Control& control, FileChooser& chooser, QWidget* parent)
    : QDialog(parent), control_(control), chooser_(chooser) {
  setObjectName(QStringLiteral("frmLabDef"));
  setWindowTitle(QStringLiteral("הגדרות צורה וגודל"));
  ApplyHebrewLook(*this);
  setModal(true);

  auto* lines = new QGroupBox(QStringLiteral("שורות המדבקה"), this);
  auto* grid = new QGridLayout(lines);
  grid->setHorizontalSpacing(12);
  const std::array<const char*, 5> heads{"גופן", "גודל", "משקל", "קו תחתון", "נטוי"};
  for (int c = 0; c < 5; ++c) {
    auto* head = MakeLabel(ToQ(heads[c]), lines);
    head->setStyleSheet(QStringLiteral("font-weight: bold"));
    grid->addWidget(head, 0, c + 1, Qt::AlignHCenter);
  }
  for (int i = 0; i < kLines; ++i) {
    const QString n = QString::number(i);
    grid->addWidget(MakeLabel(ToQ(kLineCaptions[i]), lines), i + 1, 0);
    CmbFont[i] = new QComboBox(lines);
    CmbFont[i]->setObjectName(QStringLiteral("CmbFont") + n);
    CmbFont[i]->addItems(
        {QStringLiteral("Arial"), QStringLiteral("David"), QStringLiteral("Miriam")});
    txtFontSize[i] = MakeEdit(QStringLiteral("txtFontSize") + n, lines);
    txtFontSize[i]->setMaxLength(3);
    txtFontSize[i]->setValidator(new QIntValidator(kMinFontSize, kMaxFontSize, txtFontSize[i]));
    txtFontSize[i]->setFixedWidth(50);
    txtFontSize[i]->setAlignment(Qt::AlignCenter);
    CmbWeight[i] = new QComboBox(lines);
    CmbWeight[i]->setObjectName(QStringLiteral("CmbWeight") + n);
    CmbWeight[i]->addItems(
        {QStringLiteral("רגיל"), QStringLiteral("מודגש"), QStringLiteral("עבה")});
    ChkUL[i] = new PanelCheckBox(QString(), lines);
    ChkUL[i]->setObjectName(QStringLiteral("ChkUL") + n);
    ChkItalic[i] = new PanelCheckBox(QString(), lines);
    ChkItalic[i]->setObjectName(QStringLiteral("ChkItalic") + n);
    grid->addWidget(CmbFont[i], i + 1, 1);
    grid->addWidget(txtFontSize[i], i + 1, 2, Qt::AlignHCenter);
    grid->addWidget(CmbWeight[i], i + 1, 3);
    grid->addWidget(ChkUL[i], i + 1, 4, Qt::AlignHCenter);
    grid->addWidget(ChkItalic[i], i + 1, 5, Qt::AlignHCenter);
  }

  auto* pictures = new QGroupBox(QStringLiteral("תמונות"), this);
  auto* pgrid = new QGridLayout(pictures);
  TxtHeaderLogo = MakeEdit(QStringLiteral("TxtHeaderLogo"), pictures);
  txtFooterLogo = MakeEdit(QStringLiteral("txtFooterLogo"), pictures);
  ShowAsPath(*TxtHeaderLogo);
  ShowAsPath(*txtFooterLogo);
  auto* dir0 = MakeButton("CmdDir0", QStringLiteral("בחירת תמונה"), pictures);
  auto* dir1 = MakeButton("CmdDir1", QStringLiteral("בחירת תמונה"), pictures);
  pgrid->addWidget(MakeLabel(QStringLiteral("תמונה עליונה:"), pictures), 0, 0);
  pgrid->addWidget(TxtHeaderLogo, 0, 1);
  pgrid->addWidget(dir0, 0, 2);
  pgrid->addWidget(MakeLabel(QStringLiteral("תמונה תחתונה:"), pictures), 1, 0);
  pgrid->addWidget(txtFooterLogo, 1, 1);
  pgrid->addWidget(dir1, 1, 2);
  pgrid->setColumnStretch(1, 1);

  auto* ok = MakeButton("cmdOK", QStringLiteral("אישור"), this);
  auto* cancel = MakeButton("cmdCancel", QStringLiteral("ביטול"), this);
  auto* all = new QVBoxLayout(this);
  StockBox = new LabelStockBox(control_, this);
  all->addWidget(lines);
  all->addWidget(pictures);
  all->addWidget(StockBox);
  all->addLayout(OkCancelRow(ok, cancel));

  connect(dir0, &QPushButton::clicked, this, [this] { CmdDir_Click(0); });
  connect(dir1, &QPushButton::clicked, this, [this] { CmdDir_Click(1); });
  connect(ok, &QPushButton::clicked, this, [this] { cmdOK_Click(); });
  connect(cancel, &QPushButton::clicked, this, [this] { cmdCancel_Click(); });
}

void frmLabDef::ShowModal() {
  Load();
  exec();
}

void frmLabDef::Load() {
  try {
    SetGetRegLabelDefs(kActionLoad, control_.store(), control_.labelSettings());
  } catch (...) {
  }
  try {
    GetSetFormLabDefs(1);
  } catch (...) {
  }
  StockBox->Load();
}

QWidget* frmLabDef::FirstBadValue(std::string& why) const {
  for (int i = 0; i < kLines; ++i) {
    const std::string line = std::string("בשורה \"") + kLineCaptions[i] + "\"";
    if (CmbFont[i]->currentIndex() < 0) {
      why = "לא נבחר גופן " + line;
      return CmbFont[i];
    }
    if (!FontSizeOf(txtFontSize[i]->text())) {
      why = "גודל הגופן " + line + " צריך להיות מספר שלם מ-" + std::to_string(kMinFontSize) +
            " עד " + std::to_string(kMaxFontSize);
      return txtFontSize[i];
    }
    if (CmbWeight[i]->currentIndex() < 0) {
      why = "לא נבחר משקל " + line;
      return CmbWeight[i];
    }
  }
  return nullptr;
}

void frmLabDef::GetSetFormLabDefs(uint8_t Action) {
  LabelSettings& s = control_.labelSettings();
  if (Action == 1) {
    for (int i = 0; i < kLines; ++i) {
      const LabelLineDef& d = s.LabelDefs[i];
      SetListIndex(CmbFont[i], d.Font);
      txtFontSize[i]->setText(QString::number(d.FontSize));
      SetListIndex(CmbWeight[i], d.FontWeight);
      ChkUL[i]->setValue(d.FontUL);
      ChkItalic[i]->setValue(d.FontItalic);
    }
    TxtHeaderLogo->setText(ToQ(s.LabPics[0]));
    txtFooterLogo->setText(ToQ(s.LabPics[1]));
  } else if (Action == 2) {
    std::string why;
    if (FirstBadValue(why)) throw std::invalid_argument(why);
    for (int i = 0; i < kLines; ++i) {
      LabelLineDef& d = s.LabelDefs[i];
      d.Font = static_cast<uint8_t>(CmbFont[i]->currentIndex());
      d.FontSize = *FontSizeOf(txtFontSize[i]->text());
      d.FontWeight = static_cast<uint8_t>(CmbWeight[i]->currentIndex());
      d.FontUL = static_cast<uint8_t>(ChkUL[i]->value());
      d.FontItalic = static_cast<uint8_t>(ChkItalic[i]->value());
    }
    s.LabPics[0] = FromQ(TxtHeaderLogo->text());
    s.LabPics[1] = FromQ(txtFooterLogo->text());
  }
}

bool frmLabDef::cmdOK_Click() {
  // A bad value keeps the dialog open on that value, with everything typed still in it.
  std::string why;
  if (QWidget* bad = FirstBadValue(why)) {
    control_.ui().ShowMessage(why, kTitleError, MsgIcon::Critical);
    bad->setFocus(Qt::OtherFocusReason);
    if (auto* edit = qobject_cast<QLineEdit*>(bad)) edit->selectAll();
    return false;
  }
  GetSetFormLabDefs(2);
  try {
    SetGetRegLabelDefs(kActionSave, control_.store(), control_.labelSettings());
  } catch (...) {
  }
  StockBox->Save();
  accept();
  return true;
}

void frmLabDef::cmdCancel_Click() {
  reject();
}

void frmLabDef::CmdDir_Click(int index) {
  const QString chosen = BrowseImage();
  if (chosen.isEmpty()) return;
  (index == 0 ? TxtHeaderLogo : txtFooterLogo)->setText(chosen);
}

QString frmLabDef::BrowseImage() {
  return chooser_.ChooseOpenFile(this, QStringLiteral("בחירת תמונה"), FilterListToQt(kImageFilter),
                                 kImageFilterPreselected, QString());
}

}  // namespace zdr::gui
