#include "gui/opendirdialog.h"

#include <QCloseEvent>
#include <QComboBox>
#include <QDir>
#include <QFileSystemModel>
#include <QHBoxLayout>
#include <QLabel>
#include <QListWidget>
#include <QPushButton>
#include <QStorageInfo>
#include <QTimer>
#include <QTreeView>
#include <QVBoxLayout>

#include "control/control.h"
#include "gui/qtseam.h"
#include "gui/widgets.h"
#include "hosttext/hosttext.h"

namespace zdr::gui {

namespace {

// A path without its trailing separator, except for the root folder itself.
QString WithoutTrailingSlash(QString path) {
  while (path.size() > 1 && path.endsWith(QLatin1Char('/'))) path.chop(1);
  return path;
}

}  // namespace

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

}  // namespace zdr::gui
