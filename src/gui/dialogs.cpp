#include "gui/dialogs.h"

#include <QCloseEvent>
#include <QComboBox>
#include <QDialogButtonBox>
#include <QDir>
#include <QFileSystemModel>
#include <QGridLayout>
#include <QGroupBox>
#include <QHBoxLayout>
#include <QHeaderView>
#include <QIntValidator>
#include <QLabel>
#include <QLineEdit>
#include <QListWidget>
#include <QPushButton>
#include <QStorageInfo>
#include <QTableView>
#include <QTimer>
#include <QTreeView>
#include <QVBoxLayout>
#include <algorithm>
#include <exception>
#include <optional>
#include <stdexcept>

#include "control/control.h"
#include "control/settings.h"
#include "gui/labelstockbox.h"
#include "gui/qtseam.h"
#include "import/hostfile.h"
#include "import/hosttext.h"
#include "select/picker.h"
#include "workdb/engine.h"

namespace zdr::gui {

namespace {

QPushButton* MakeButton(const char* objectName, const QString& caption, QWidget* parent) {
  auto* b = new QPushButton(caption, parent);
  b->setObjectName(QString::fromLatin1(objectName));
  // Enter belongs to the text boxes; no button is the dialog's default.
  b->setAutoDefault(false);
  b->setDefault(false);
  return b;
}

QLineEdit* MakeEdit(const QString& objectName, QWidget* parent) {
  auto* e = new QLineEdit(parent);
  e->setObjectName(objectName);
  return e;
}

QLabel* MakeLabel(const QString& caption, QWidget* parent, const char* objectName = nullptr) {
  auto* l = new QLabel(caption, parent);
  if (objectName) l->setObjectName(QString::fromLatin1(objectName));
  return l;
}

// The confirm and cancel buttons at the bottom of a dialog, confirm on the reading side.
QHBoxLayout* OkCancelRow(QPushButton* ok, QPushButton* cancel) {
  auto* row = new QHBoxLayout;
  row->addStretch(1);
  row->addWidget(ok);
  row->addWidget(cancel);
  ok->setMinimumWidth(90);
  cancel->setMinimumWidth(90);
  return row;
}

// A path without its trailing separator, except for the root folder itself.
QString WithoutTrailingSlash(QString path) {
  while (path.size() > 1 && path.endsWith(QLatin1Char('/'))) path.chop(1);
  return path;
}

}  // namespace

// ---------------------------------------------------------------------------------------
// PanelCheckBox

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

// ---------------------------------------------------------------------------------------
// frmOpenDir

frmOpenDir::frmOpenDir(Control& control, QWidget* parent) : QDialog(parent), control_(control) {
  setObjectName(QStringLiteral("frmOpenDir"));
  setWindowTitle(QStringLiteral("בחירת מחיצה ראשית"));
  ApplyHebrewLook(*this);
  setModal(true);

  pathDrive_ = new QComboBox(this);
  pathDrive_->setObjectName(QStringLiteral("PathDrive"));
  ShowAsPath(*pathDrive_);
  dirModel_ = new QFileSystemModel(this);
  dirModel_->setFilter(QDir::AllDirs | QDir::NoDotAndDotDot | QDir::Drives);
  dirModel_->setReadOnly(true);
  mainDir_ = new QTreeView(this);
  mainDir_->setObjectName(QStringLiteral("MainDir"));
  mainDir_->setModel(dirModel_);
  for (int c = 1; c < dirModel_->columnCount(); ++c) mainDir_->hideColumn(c);
  mainDir_->setHeaderHidden(true);
  mainDir_->setMinimumHeight(220);
  cmbCompany_ = new QListWidget(this);
  cmbCompany_->setObjectName(QStringLiteral("cmbCompany"));
  cmbCompany_->setMinimumHeight(220);
  auto* ok = MakeButton("OKButton", QStringLiteral("אישור"), this);
  auto* cancel = MakeButton("CancelButton", QStringLiteral("ביטול"), this);

  auto* places = new QVBoxLayout;
  places->addWidget(MakeLabel(QStringLiteral("בחירת מחיצה/כונן ראשי:"), this));
  places->addWidget(pathDrive_);
  places->addWidget(mainDir_, 1);
  auto* companies = new QVBoxLayout;
  companies->addWidget(MakeLabel(QStringLiteral("בחירת חברה:"), this));
  companies->addWidget(cmbCompany_, 1);
  auto* columns = new QHBoxLayout;
  columns->addLayout(places, 1);
  columns->addLayout(companies, 1);
  auto* all = new QVBoxLayout(this);
  all->addLayout(columns, 1);
  all->addLayout(OkCancelRow(ok, cancel));
  resize(620, 400);

  FillDrives();

  connect(pathDrive_, &QComboBox::activated, this,
          [this](int i) { PathDrive_Change(pathDrive_->itemData(i).toString()); });
  connect(mainDir_->selectionModel(), &QItemSelectionModel::currentChanged, this,
          [this](const QModelIndex& current) { OnTreeCurrentChanged(current); });
  // The folders are listed in the background and their rows arrive in batches; for a
  // moment after the place is set, bring the current folder into view once they settle.
  scrollTimer_ = new QTimer(this);
  scrollTimer_->setSingleShot(true);
  scrollTimer_->setInterval(150);
  connect(scrollTimer_, &QTimer::timeout, this, [this] { ScrollToCurrentFolder(); });
  connect(dirModel_, &QAbstractItemModel::rowsInserted, this, [this] {
    if (placeSet_.isValid() && placeSet_.elapsed() < 3000) scrollTimer_->start();
  });
  connect(cmbCompany_, &QListWidget::itemDoubleClicked, this, [this] { OKButton_Click(); });
  connect(ok, &QPushButton::clicked, this, [this] { OKButton_Click(); });
  connect(cancel, &QPushButton::clicked, this, [this] { CancelButton_Click(); });
}

frmOpenDir::~frmOpenDir() = default;

void frmOpenDir::FillDrives() {
  pathDrive_->clear();
  QStringList roots;
  roots << QDir::rootPath();
  for (const QStorageInfo& v : QStorageInfo::mountedVolumes()) {
    if (!v.isValid() || !v.isReady()) continue;
    const QString root = v.rootPath();
    // Volumes that are system folders or single files are no place for company folders.
    if (!QFileInfo(root).isDir()) continue;
    if (root.startsWith(QLatin1String("/proc")) || root.startsWith(QLatin1String("/sys")) ||
        root.startsWith(QLatin1String("/dev")) || root.startsWith(QLatin1String("/run"))) {
      continue;
    }
    if (!roots.contains(root)) roots << root;
  }
  for (const QString& root : roots) pathDrive_->addItem(QDir::toNativeSeparators(root), root);
}

void frmOpenDir::ShowModal() {
  if (!loaded_) Load();
  exec();
}

void frmOpenDir::Load() {
  loaded_ = true;
  QString drive = ToQ(PubMainDrive);
  if (drive.isEmpty()) drive = QDir::rootPath();
  int driveIndex = pathDrive_->findData(drive);
  if (driveIndex < 0) {
    pathDrive_->addItem(QDir::toNativeSeparators(drive), drive);
    driveIndex = pathDrive_->count() - 1;
  }
  pathDrive_->setCurrentIndex(driveIndex);

  QString dir = ToQ(PubMainDir);
  if (!dir.endsWith(QLatin1Char('/'))) dir += QLatin1Char('/');
  ShowFolder(dir);
  FindTavPaths(FromQ(dir));
  cmbCompany_->setEnabled(true);
}

void frmOpenDir::ShowFolder(const QString& folder) {
  settingPlace_ = true;
  const QString shown = WithoutTrailingSlash(folder);
  const QString root = pathDrive_->currentData().toString();
  mainDir_->setRootIndex(dirModel_->index(root.isEmpty() ? QDir::rootPath() : root));
  dirModel_->setRootPath(root.isEmpty() ? QDir::rootPath() : root);
  const QModelIndex at = dirModel_->index(shown);
  if (at.isValid()) {
    for (QModelIndex up = at.parent(); up.isValid(); up = up.parent()) mainDir_->expand(up);
    mainDir_->setCurrentIndex(at);
    mainDir_->expand(at);
    mainDir_->scrollTo(at, QAbstractItemView::PositionAtCenter);
  }
  currentFolder_ = shown;
  settingPlace_ = false;
  placeSet_.start();
}

void frmOpenDir::ScrollToCurrentFolder() {
  const QModelIndex at = mainDir_->currentIndex();
  if (at.isValid()) mainDir_->scrollTo(at, QAbstractItemView::PositionAtCenter);
}

void frmOpenDir::showEvent(QShowEvent* event) {
  QDialog::showEvent(event);
  // Once the tree has its size.
  scrollTimer_->start();
}

void frmOpenDir::OnTreeCurrentChanged(const QModelIndex& current) {
  if (settingPlace_ || !current.isValid()) return;
  MainDir_Change(dirModel_->filePath(current));
}

void frmOpenDir::PathDrive_Change(const QString& rootPath) {
  if (rootPath.isEmpty()) return;
  int i = pathDrive_->findData(rootPath);
  if (i < 0) {
    pathDrive_->addItem(QDir::toNativeSeparators(rootPath), rootPath);
    i = pathDrive_->count() - 1;
  }
  pathDrive_->setCurrentIndex(i);
  ShowFolder(rootPath);
  MainDir_Change(rootPath);
}

void frmOpenDir::MainDir_Change(const QString& folder) {
  if (folder.isEmpty()) return;
  if (WithoutTrailingSlash(folder) != currentFolder_) ShowFolder(folder);
  cmbCompany_->setEnabled(false);
  QString scanned = folder;
  if (!scanned.endsWith(QLatin1Char('/'))) scanned += QLatin1Char('/');
  FindTavPaths(FromQ(scanned));
  cmbCompany_->setEnabled(true);
}

void frmOpenDir::FindTavPaths(const std::string& pDrive) {
  scan_ = zdr::FindTavPaths(pDrive);
  // The list always shows the entries of this scan, also of one that failed part way, so a
  // name never selects another scan's folder.
  cmbCompany_->clear();
  for (size_t i : scan_.Listed()) {
    auto* item = new QListWidgetItem(ToQ(scan_.entries[i].Name), cmbCompany_);
    item->setData(Qt::UserRole, static_cast<qulonglong>(i));
  }
  if (!scan_.error.empty()) control_.ui().ShowMessage(scan_.error, kTitleFault, MsgIcon::Critical);
}

bool frmOpenDir::OKButton_Click() {
  QListWidgetItem* chosen = cmbCompany_->currentItem();
  if (chosen == nullptr || !chosen->isSelected()) {
    control_.ui().ShowMessage("לא בחרת חברה", kTitleError, MsgIcon::Critical);
    return false;
  }
  const auto entry = static_cast<size_t>(chosen->data(Qt::UserRole).toULongLong());
  if (entry < scan_.entries.size()) {
    control_.state().companyPath = std::string(TrimSpaces(scan_.entries[entry].Path));
  }
  PubMainDrive = FromQ(pathDrive_->currentData().toString());
  PubMainDir = FromQ(currentFolder_);
  accept();
  return true;
}

void frmOpenDir::CancelButton_Click() {
  reject();
}

void frmOpenDir::closeEvent(QCloseEvent* event) {
  // The window's close button unloads the dialog: the next showing starts anew.
  loaded_ = false;
  QDialog::closeEvent(event);
}

// ---------------------------------------------------------------------------------------
// frmLogon

namespace {
constexpr const char* kCheckAdvice = "מומלץ לבצע בדיקה לאחר שינוי ערכי ההתחברות!";
constexpr const char* kCheckPassed = "הבדיקה הסתיימה בהצלחה";
constexpr const char* kCheckFailed = "הבדיקה לא הסתיימה בהצלחה";
}  // namespace

frmLogon::frmLogon(Control& control, frmOpenDir& openDir, QWidget* parent)
    : QDialog(parent), control_(control), openDir_(openDir) {
  setObjectName(QStringLiteral("frmLogon"));
  setWindowTitle(QStringLiteral("הגדרות התחברות לTavlor קלאסית"));
  ApplyHebrewLook(*this);
  setModal(true);

  auto* frame = new QGroupBox(QStringLiteral("ערכי התחברות"), this);
  frame->setObjectName(QStringLiteral("fraStep3"));
  txtConnDatabase_ = MakeEdit(QStringLiteral("txtConnDatabase"), frame);
  txtConnDatabase_->setMinimumWidth(460);
  ShowAsPath(*txtConnDatabase_);
  auto* open = MakeButton("cmdOpen", QStringLiteral("עיון..."), frame);
  auto* row = new QHBoxLayout(frame);
  row->addWidget(MakeLabel(QStringLiteral("מחיצה:"), frame, "lblStep3"));
  row->addWidget(txtConnDatabase_, 1);
  row->addWidget(open);

  lblMsg_ = MakeLabel(ToQ(kCheckAdvice), this, "LblMsg");
  lblMsg_->setWordWrap(true);
  auto* check = MakeButton("CmdCheck", QStringLiteral("בדיקה"), this);
  auto* ok = MakeButton("cmdOK", QStringLiteral("אישור"), this);
  auto* cancel = MakeButton("cmdCancel", QStringLiteral("ביטול"), this);
  check->setMinimumWidth(90);

  auto* buttons = OkCancelRow(ok, cancel);
  buttons->insertWidget(0, check);
  auto* all = new QVBoxLayout(this);
  all->addWidget(frame);
  all->addWidget(lblMsg_);
  all->addLayout(buttons);

  connect(open, &QPushButton::clicked, this, [this] { cmdOpen_Click(); });
  connect(check, &QPushButton::clicked, this, [this] { CmdCheck_Click(); });
  connect(ok, &QPushButton::clicked, this, [this] { cmdOK_Click(); });
  connect(cancel, &QPushButton::clicked, this, [this] { cmdCancel_Click(); });
}

void frmLogon::ShowModal() {
  Load();
  exec();
}

void frmLogon::Load() {
  txtConnDatabase_->setText(ToQ(control_.state().companyPath));
  lblMsg_->setText(ToQ(kCheckAdvice));
}

void frmLogon::cmdOpen_Click() {
  openDir_.ShowModal();
  txtConnDatabase_->setText(ToQ(control_.state().companyPath));
}

void frmLogon::CmdCheck_Click() {
  try {
    std::string folder = FromQ(txtConnDatabase_->text());
    // An empty box looks in the root folder, as "\act.fix" does.
    if (folder.empty()) folder.assign(1, '/');
    if (folder.find('\0') != std::string::npos) {
      throw std::invalid_argument("שם המחיצה אינו תקין");
    }
    const auto found = FindFileNoCase(std::filesystem::path(folder), "act.fix");
    if (found) {
      control_.ui().ShowMessage(kCheckPassed, kTitleMessage, MsgIcon::Information);
      lblMsg_->setText(ToQ(kCheckPassed));
    } else {
      lblMsg_->setText(ToQ(kCheckFailed));
    }
  } catch (const std::exception& e) {
    control_.ui().ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
  }
}

void frmLogon::cmdOK_Click() {
  std::string typed = FromQ(txtConnDatabase_->text());
  control_.state().companyPath = typed;
  try {
    SetGetRegConnParams(kActionSave, control_.store(), typed);
  } catch (...) {
    // Confirming never fails: the folder is in use until the panel is created again.
  }
  accept();
}

void frmLogon::cmdCancel_Click() {
  reject();
}

// ---------------------------------------------------------------------------------------
// frmLabDef

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

void SetListIndex(QComboBox* list, int index) {
  list->setCurrentIndex(index >= 0 && index < list->count() ? index : -1);
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

// ---------------------------------------------------------------------------------------
// frmPostIL

frmPostIL::frmPostIL(Control& control, FileChooser& chooser, QWidget* parent)
    : QDialog(parent), control_(control), chooser_(chooser) {
  setObjectName(QStringLiteral("frmPostIL"));
  setWindowTitle(QStringLiteral("הגדרות לקובץ לדואר שליחים"));
  ApplyHebrewLook(*this);
  setModal(true);

  txtService = MakeEdit(QStringLiteral("txtService"), this);
  txtWeight = MakeEdit(QStringLiteral("txtWeight"), this);
  txtConfirm = MakeEdit(QStringLiteral("txtConfirm"), this);
  txtFilePath = MakeEdit(QStringLiteral("txtFilePath"), this);
  txtFilePath->setMinimumWidth(320);
  ShowAsPath(*txtFilePath);
  auto* dir = MakeButton("CmdDir", QStringLiteral("עיון..."), this);
  ChkOpenExcel = new PanelCheckBox(QStringLiteral("לפתוח את הקובץ אוטומטית באקסל?"), this);
  ChkOpenExcel->setObjectName(QStringLiteral("ChkOpenExcel"));
  CmbFileFormat = new QComboBox(this);
  CmbFileFormat->setObjectName(QStringLiteral("CmbFileFormat"));
  for (const char* entry : kFileFormatEntries) CmbFileFormat->addItem(ToQ(entry));

  auto* grid = new QGridLayout;
  grid->addWidget(MakeLabel(QStringLiteral("סוג שירות:"), this), 0, 0);
  grid->addWidget(txtService, 0, 1, 1, 2);
  grid->addWidget(MakeLabel(QStringLiteral("משקל:"), this), 1, 0);
  grid->addWidget(txtWeight, 1, 1, 1, 2);
  grid->addWidget(MakeLabel(QStringLiteral("אישור מסירה:"), this), 2, 0);
  grid->addWidget(txtConfirm, 2, 1, 1, 2);
  grid->addWidget(MakeLabel(QStringLiteral("קובץ הפלט:"), this), 3, 0);
  grid->addWidget(txtFilePath, 3, 1);
  grid->addWidget(dir, 3, 2);
  grid->addWidget(ChkOpenExcel, 4, 1, 1, 2);
  grid->addWidget(MakeLabel(QStringLiteral("תבנית הקובץ:"), this), 5, 0);
  grid->addWidget(CmbFileFormat, 5, 1, 1, 2);
  grid->setColumnStretch(1, 1);

  auto* ok = MakeButton("cmdOK", QStringLiteral("אישור"), this);
  auto* cancel = MakeButton("cmdCancel", QStringLiteral("ביטול"), this);
  auto* all = new QVBoxLayout(this);
  all->addLayout(grid);
  all->addSpacing(8);
  all->addLayout(OkCancelRow(ok, cancel));

  connect(dir, &QPushButton::clicked, this, [this] { CmdDir_Click(); });
  connect(ok, &QPushButton::clicked, this, [this] { cmdOK_Click(); });
  connect(cancel, &QPushButton::clicked, this, [this] { cmdCancel_Click(); });
}

void frmPostIL::ShowModal() {
  Load();
  exec();
}

void frmPostIL::Load() {
  try {
    SetGetRegPostILDefs(kActionLoad, control_.store(), control_.postILSettings());
  } catch (...) {
  }
  GetSetFormPostILDefs(1);
}

void frmPostIL::GetSetFormPostILDefs(uint8_t Action) {
  PostILSettings& s = control_.postILSettings();
  if (Action == 1) {
    txtConfirm->setText(ToQ(s.Confirm));
    txtFilePath->setText(ToQ(s.FilePath));
    txtService->setText(ToQ(s.Service));
    txtWeight->setText(ToQ(s.Weight));
    if (!ChkOpenExcel->setValue(s.OpenExcel)) ChkOpenExcel->setValue(0);
    SetListIndex(CmbFileFormat, s.FileFormat);
  } else if (Action == 2) {
    s.Confirm = FromQ(txtConfirm->text());
    s.FilePath = FromQ(txtFilePath->text());
    s.Service = FromQ(txtService->text());
    s.Weight = FromQ(txtWeight->text());
    s.OpenExcel = static_cast<int16_t>(ChkOpenExcel->value());
    s.FileFormat = static_cast<int16_t>(CmbFileFormat->currentIndex());
  }
}

void frmPostIL::cmdOK_Click() {
  GetSetFormPostILDefs(2);
  try {
    SetGetRegPostILDefs(kActionSave, control_.store(), control_.postILSettings());
  } catch (...) {
  }
  accept();
}

void frmPostIL::cmdCancel_Click() {
  reject();
}

void frmPostIL::CmdDir_Click() {
  const QString chosen =
      chooser_.ChooseOpenFile(this, QStringLiteral("קובץ הפלט"), FilterListToQt(kWorkbookFilter),
                              kWorkbookFilterPreselected, txtFilePath->text());
  if (!chosen.isEmpty()) txtFilePath->setText(chosen);
}

// ---------------------------------------------------------------------------------------
// PickerModel

namespace {
constexpr std::array<const char*, 3> kPickerCaptions{"מפתח חשבון", "שם חשבון", "להדפיס?"};
constexpr int kIncludeColumn = 2;

std::string TextOf(const db::Value& v) {
  if (const auto* s = std::get_if<std::string>(&v)) return *s;
  return {};
}

bool TrueOf(const db::Value& v) {
  if (const auto* i = std::get_if<int64_t>(&v)) return *i != 0;
  if (const auto* d = std::get_if<double>(&v)) return *d != 0;
  return false;
}
}  // namespace

PickerModel::PickerModel(QObject* parent) : QAbstractTableModel(parent) {}

void PickerModel::SetSource(const std::string& dbPath, const std::string& recordSource) {
  dbPath_ = dbPath;
  recordSource_ = recordSource;
}

bool PickerModel::Refresh() {
  std::vector<Row> rows;
  try {
    if (dbPath_.empty()) return false;
    db::Database database = db::Database::Open(dbPath_);
    db::Snapshot snap = database.OpenSnapshot(recordSource_);
    const int key = snap.FieldIndex("SortByKey");
    const int name = snap.FieldIndex("SortByName");
    const int include = snap.FieldIndex("Include");
    if (!snap.AtEnd()) snap.MoveFirst();
    while (!snap.AtEnd()) {
      rows.push_back(
          {TextOf(snap.Field(key)), TextOf(snap.Field(name)), TrueOf(snap.Field(include))});
      snap.MoveNext();
    }
  } catch (const std::exception&) {
    return false;
  }
  beginResetModel();
  rows_ = std::move(rows);
  endResetModel();
  return true;
}

bool PickerModel::Execute(const std::string& jetSql) {
  try {
    if (dbPath_.empty()) return false;
    db::Database database = db::Database::Open(dbPath_);
    database.Execute(jetSql);
    return true;
  } catch (const std::exception&) {
    return false;
  }
}

bool PickerModel::SetInclude(int row, bool include) {
  if (row < 0 || row >= static_cast<int>(rows_.size())) return false;
  if (!Execute(BuildSetIncludeSQL(rows_[row].key, include))) return false;
  rows_[row].include = include;
  const QModelIndex at = index(row, kIncludeColumn);
  emit dataChanged(at, at, {Qt::CheckStateRole});
  return true;
}

int PickerModel::rowCount(const QModelIndex& parent) const {
  return parent.isValid() ? 0 : static_cast<int>(rows_.size());
}

int PickerModel::columnCount(const QModelIndex& parent) const {
  return parent.isValid() ? 0 : 3;
}

QVariant PickerModel::data(const QModelIndex& index, int role) const {
  if (!index.isValid() || index.row() >= static_cast<int>(rows_.size())) return {};
  const Row& r = rows_[index.row()];
  switch (index.column()) {
    case 0:
      if (role == Qt::DisplayRole) return ToQ(r.key);
      break;
    case 1:
      if (role == Qt::DisplayRole) return ToQ(r.name);
      break;
    case kIncludeColumn:
      if (role == Qt::CheckStateRole) return r.include ? Qt::Checked : Qt::Unchecked;
      break;
  }
  return {};
}

bool PickerModel::setData(const QModelIndex& index, const QVariant& value, int role) {
  if (!index.isValid() || index.column() != kIncludeColumn || role != Qt::CheckStateRole) {
    return false;
  }
  return SetInclude(index.row(), value.toInt() == Qt::Checked);
}

Qt::ItemFlags PickerModel::flags(const QModelIndex& index) const {
  Qt::ItemFlags f = Qt::ItemIsEnabled | Qt::ItemIsSelectable;
  if (index.column() == kIncludeColumn) f |= Qt::ItemIsUserCheckable;
  return f;
}

QVariant PickerModel::headerData(int section, Qt::Orientation orientation, int role) const {
  if (role != Qt::DisplayRole) return {};
  if (orientation == Qt::Vertical) return section + 1;
  if (section >= 0 && section < 3) return ToQ(kPickerCaptions[section]);
  return {};
}

// ---------------------------------------------------------------------------------------
// frmSelectCard

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
