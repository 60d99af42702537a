// zdrshots: renders the panel and each of its dialogs offscreen into PNG files, for the
// pictures of the documentation.
//
//   zdrshots OUT_DIR [--company DIR]
//
// Writes panel.png, frmLogon.png, frmOpenDir.png, frmLabDef.png, frmSelectCard.png (only with
// a company), frmPostIL.png and fileChooser.png (the file chooser of the settings dialogs) into
// OUT_DIR, created when missing. The settings store lives in memory, so the user's settings are
// neither read nor changed. The company given is the one the panel and the picker show; the
// company chooser shows the folder that holds it. Exits with 0 when every file was written.
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
#include <cstdio>
#include <filesystem>
#include <iostream>
#include <string>

#include "control/settings.h"
#include "gui/labeldefdialog.h"
#include "gui/logondialog.h"
#include "gui/maincard.h"
#include "gui/mainwindow.h"
#include "gui/opendirdialog.h"
#include "gui/postdialog.h"
#include "gui/qtseam.h"
#include "gui/selectcarddialog.h"

using namespace zdr;
using namespace zdr::gui;

namespace {

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
  window.setWindowTitle(WindowTitle());
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

}  // namespace

int main(int argc, char** argv) {
  std::string outDir, company;
  for (int i = 1; i < argc; ++i) {
    const std::string arg = argv[i];
    if (arg == "--company" && i + 1 < argc) {
      company = argv[++i];
    } else if (outDir.empty() && !arg.starts_with("-")) {
      outDir = arg;
    } else {
      outDir.clear();
      break;
    }
  }
  if (outDir.empty()) {
    std::fputs("usage: zdrshots OUT_DIR [--company DIR]\n", stderr);
    return 2;
  }
  return RenderScreenshots(argc, argv, outDir, company);
}
