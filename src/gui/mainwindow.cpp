#include "gui/mainwindow.h"

#include <QApplication>
#include <QComboBox>
#include <QDir>
#include <QElapsedTimer>
#include <QFileDialog>
#include <QLabel>
#include <QLineEdit>
#include <QListWidget>
#include <QMainWindow>
#include <QPixmap>
#include <QThread>
#include <filesystem>
#include <iostream>

#include "control/qtsettings.h"
#include "control/settings.h"
#include "gui/labeldefdialog.h"
#include "gui/logondialog.h"
#include "gui/opendirdialog.h"
#include "gui/postdialog.h"
#include "gui/selectcarddialog.h"
#include "gui/maincard.h"
#include "gui/qtseam.h"

namespace zdr::gui {

namespace {

const QString kWindowTitle = QStringLiteral("ZDRLab - מדבקות וקובצי דיוור");

void SetUpApplication(QApplication& app) {
  QApplication::setOrganizationName(QStringLiteral("ZDRLab"));
  QApplication::setApplicationName(QStringLiteral("ZDRLab"));
  app.setLayoutDirection(Qt::RightToLeft);
  app.setFont(HebrewUiFont());
  InstallHebrewTranslations(app);
}

// Answers every question with Yes and shows nothing: the pictures need no person.
class SilentPrompter : public Prompter {
 public:
  void ShowMessage(std::string_view, std::string_view, MsgIcon) override {}
  bool AskYesNo(std::string_view, std::string_view, MsgIcon) override { return true; }
};

class NoDesktop : public DesktopOpener {
 public:
  bool OpenPage(const std::string&) override { return true; }
  bool OpenWorkbook(const std::string&) override { return true; }
};

class NoChooser : public FileChooser {
 public:
  QString ChooseOpenFile(QWidget*, const QString&, const QStringList&, int,
                         const QString&) override {
    return {};
  }
};

// Lets queued work (folder listings, layouts) finish before a picture is taken.
void Settle(int milliseconds) {
  QElapsedTimer t;
  t.start();
  while (t.elapsed() < milliseconds) {
    QCoreApplication::processEvents(QEventLoop::AllEvents, 20);
    QThread::msleep(10);
  }
}

bool Save(QWidget& w, const QString& dir, const QString& name, int settleMs = 300) {
  w.show();
  Settle(settleMs);
  const QString path = QDir(dir).filePath(name + QStringLiteral(".png"));
  const bool ok = w.grab().save(path, "PNG");
  if (!ok) std::cerr << "cannot write " << path.toStdString() << "\n";
  w.hide();
  return ok;
}

}  // namespace

int RunMainWindow(int& argc, char** argv, const std::string& companyOverride) {
  QApplication app(argc, argv);
  SetUpApplication(app);
  QtSettingsStore store;
  QMainWindow window;
  window.setLayoutDirection(Qt::RightToLeft);
  window.setWindowTitle(kWindowTitle);
  auto* card = new MainCard(store);
  if (!companyOverride.empty()) card->control().state().companyPath = companyOverride;
  window.setCentralWidget(card);
  window.show();
  return app.exec();
}

int RenderScreenshots(int& argc, char** argv, const std::string& outDir,
                      const std::string& companyOverride) {
  QApplication app(argc, argv);
  SetUpApplication(app);
  QDir().mkpath(ToQ(outDir));
  const QString dir = ToQ(outDir);

  MemorySettingsStore store;
  SilentPrompter prompter;
  NoDesktop desktop;
  NoChooser chooser;
  QMainWindow window;
  window.setWindowTitle(kWindowTitle);
  auto* card = new MainCard(store, MainCardServices{&prompter, &desktop, &chooser});
  if (!companyOverride.empty()) card->control().state().companyPath = companyOverride;
  window.setCentralWidget(card);
  card->LblMessage()->setText(QStringLiteral("קריאת הנתונים הסתיימה"));

  bool ok = Save(window, dir, QStringLiteral("panel"));

  frmOpenDir* openDir = card->openDir();
  frmLogon logon(card->control(), *openDir, card);
  logon.Load();
  ok = Save(logon, dir, QStringLiteral("frmLogon")) && ok;

  openDir->Load();
  if (!companyOverride.empty()) {
    const std::filesystem::path parent = std::filesystem::path(companyOverride).parent_path();
    openDir->MainDir_Change(ToQ(parent.string()));
    if (openDir->cmbCompany()->count() > 0) openDir->cmbCompany()->setCurrentRow(0);
  }
  // The folder tree lists its folders in the background.
  ok = Save(*openDir, dir, QStringLiteral("frmOpenDir"), 2000) && ok;

  frmLabDef* labDef = card->labDefDialog();
  labDef->Load();
  labDef->CmbWeight[1]->setCurrentIndex(2);
  labDef->txtFontSize[1]->setText(QStringLiteral("12"));
  labDef->TxtHeaderLogo->setText(QStringLiteral("/home/משרד/logo.png"));
  ok = Save(*labDef, dir, QStringLiteral("frmLabDef")) && ok;

  if (!companyOverride.empty()) {
    card->control().PrepareAccountPicker();
    frmSelectCard* picker = card->selectCard();
    picker->Load();
    ok = Save(*picker, dir, QStringLiteral("frmSelectCard")) && ok;
  }

  frmPostIL* postIL = card->postILDialog();
  postIL->Load();
  ok = Save(*postIL, dir, QStringLiteral("frmPostIL")) && ok;

  // The file chooser of the picture buttons, over the sample companies.
  const QString start = companyOverride.empty()
                            ? QDir::homePath()
                            : ToQ(std::filesystem::path(companyOverride).parent_path().string());
  QFileDialog files(labDef, QStringLiteral("בחירת תמונה"), start);
  PrepareFileDialog(files, FilterListToQt(kImageFilter), kImageFilterPreselected);
  files.selectFile(QStringLiteral("לוגו.jpg"));
  files.resize(720, 440);
  ok = Save(files, dir, QStringLiteral("fileChooser"), 1500) && ok;
  return ok ? 0 : 1;
}

}  // namespace zdr::gui
