// The panel, its dialogs and the picker statements, driven offscreen through their widgets
// (clicks, keys) with scripted message boxes, file choosers and desktop.
#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <QApplication>
#include <QComboBox>
#include <QDialogButtonBox>
#include <QFileDialog>
#include <QFontMetrics>
#include <QGroupBox>
#include <QLabel>
#include <QLineEdit>
#include <QListWidget>
#include <QMenu>
#include <QProgressBar>
#include <QPushButton>
#include <QTableView>
#include <QTest>
#include <QTimer>
#include <deque>
#include <filesystem>
#include <fstream>
#include <set>
#include <string>
#include <vector>

#include "control/companies.h"
#include "control/settings.h"
#include "gui/labeldefdialog.h"
#include "gui/logondialog.h"
#include "gui/maincard.h"
#include "gui/opendirdialog.h"
#include "gui/pickermodel.h"
#include "gui/postdialog.h"
#include "gui/qtseam.h"
#include "gui/selectcarddialog.h"
#include "gui/widgets.h"
#include "output/preflight.h"
#include "select/picker.h"
#include "zdrgen/generator.h"

namespace fs = std::filesystem;
using namespace zdr;
using namespace zdr::gui;

namespace {

// The application as the window sets it up: right to left, Hebrew font and translations.
QApplication& App() {
  static int argc = 1;
  static char name[] = "test_gui";
  static char* argv[] = {name, nullptr};
  static QApplication* app = [] {
    if (qEnvironmentVariableIsEmpty("QT_QPA_PLATFORM")) qputenv("QT_QPA_PLATFORM", "offscreen");
    auto* a = new QApplication(argc, argv);
    a->setLayoutDirection(Qt::RightToLeft);
    a->setFont(HebrewUiFont());
    InstallHebrewTranslations(*a);
    return a;
  }();
  return *app;
}

struct Shown {
  std::string text, title;
  MsgIcon icon;
};

// The person at the desk: answers questions and file choosers as scripted, records what
// was shown and handed over.
class FakeDesk : public Prompter, public DesktopOpener, public FileChooser {
 public:
  void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) override {
    shown.push_back({std::string(text), std::string(title), icon});
  }
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) override {
    asked.push_back({std::string(text), std::string(title), icon});
    if (answers.empty()) ADD_FAILURE() << "unexpected question: " << text;
    const bool yes = !answers.empty() && answers.front();
    if (!answers.empty()) answers.pop_front();
    return yes;
  }
  bool OpenPage(const std::string& path) override { return pages.push_back(path), true; }
  bool OpenWorkbook(const std::string& path) override { return workbooks.push_back(path), true; }
  QString ChooseOpenFile(QWidget*, const QString&, const QStringList& filters, int selected,
                         const QString&) override {
    offered = filters;
    preselected = selected;
    return answer;
  }
  std::vector<Shown> shown, asked;
  std::deque<bool> answers;
  std::vector<std::string> pages, workbooks;
  QString answer;  // of the file chooser
  QStringList offered;
  int preselected = -1;
};

// A scratch folder, also the Temp folder of the databases and outputs.
class TempDir {
 public:
  TempDir() {
    static int n = 0;
    path_ = fs::temp_directory_path() /
            ("zdr_gui_" + std::to_string(::getpid()) + "_" + std::to_string(++n));
    fs::remove_all(path_);
    fs::create_directories(path_);
  }
  ~TempDir() {
    std::error_code ec;
    fs::remove_all(path_, ec);
  }
  const fs::path& path() const { return path_; }

 private:
  fs::path path_;
};

QString Q(const char* utf8) {
  return QString::fromUtf8(utf8);
}

template <typename T>
T* Find(QWidget& w, const char* name) {
  T* found = w.findChild<T*>(QString::fromLatin1(name));
  EXPECT_NE(found, nullptr) << name;
  return found;
}
QLineEdit* Box(QWidget& w, const char* name) {
  return Find<QLineEdit>(w, name);
}
QString Text(QWidget& w, const char* name) {
  return Box(w, name)->text();
}
int Value(QWidget& w, const char* name) {
  return Find<PanelCheckBox>(w, name)->value();
}
int Index(QWidget& w, const char* name) {
  return Find<QComboBox>(w, name)->currentIndex();
}
// A click on a button, as the mouse gives it.
void Press(QWidget& w, const char* name) {
  QTest::mouseClick(Find<QPushButton>(w, name), Qt::LeftButton);
}

class GuiTest : public ::testing::Test {
 protected:
  void SetUp() override {
    App();
    setenv("Temp", temp_.path().c_str(), 1);
  }

  std::unique_ptr<MainCard> MakeCard() {
    auto card = std::make_unique<MainCard>(store_, MainCardServices{&desk_, &desk_, &desk_});
    card->resize(900, 700);
    card->show();
    return card;
  }
  std::string Stored(std::string_view section, std::string_view key) {
    return store_.Get(kSettingsApp, section, key, "<missing>");
  }

  // Runs `act` on the modal dialog once it is shown, then lets the caller's exec() return.
  template <typename Dialog, typename Act>
  static void WhenShown(Act act) {
    QTimer::singleShot(0, [act] {
      auto* d = dynamic_cast<Dialog*>(QApplication::activeModalWidget());
      ASSERT_NE(d, nullptr) << "no modal dialog";
      act(*d);
      if (d->isVisible()) d->reject();
    });
  }

  TempDir temp_;
  MemorySettingsStore store_;
  FakeDesk desk_;
};

// ---------------------------------------------------------------------------------------
// The picker's statements.

TEST(PickerSql, RecordSources) {
  const std::string head =
      "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > ''";
  std::string none;
  EXPECT_EQ(BuildPickerSQL(none, false, 0), head + " Order By SortByKey");
  EXPECT_EQ(BuildPickerSQL(none, true, -1), head + " And Include = True Order By SortByKey");
  EXPECT_EQ(none, "");
  // Finding by name keeps the ticked accounts and changes the caller's filter.
  std::string filter = BuildNameFilter("כהן");
  EXPECT_EQ(BuildPickerSQL(filter, false, 1),
            head + " And SortByName Like '*כהן*' Or Include = True Order By SortByName");
  EXPECT_EQ(filter, " And SortByName Like '*כהן*' Or Include = True");
  // Quotes doubled, pattern characters taken literally.
  EXPECT_EQ(BuildNameFilter("ג'ון"), " And SortByName Like '*ג''ון*'");
  EXPECT_EQ(BuildNameFilter("a*b?#[c"), " And SortByName Like '*a[*]b[?][#][[]c*'");
  EXPECT_EQ(BuildSetIncludeSQL("O'Neil 1", true),
            "Update tSelectAccount Set Include = True Where SortByKey = 'O''Neil 1'");
}

// ---------------------------------------------------------------------------------------
// The company scan.

class CompanyScanTest : public ::testing::Test {
 protected:
  void Company(const std::string& folder, const std::string& hostName,
               const char* descriptor = "ADF.FIX") {
    zdrgen::WriteRecords(dir_.path() / folder / descriptor, {zdrgen::CompanyRecord(hostName)});
  }
  std::string In(const std::string& folder) { return (dir_.path() / folder).string(); }
  TempDir dir_;
};

TEST_F(CompanyScanTest, CompaniesCameInRawDirectoryOrder) {
  for (const char* folder : {"delta", "Beta", "alpha", "gamma10", "gamma9"})
    Company(folder, zdrgen::HostVisual(folder));
  Company("blank", "");
  Company("lower", zdrgen::HostVisual("Lower Ltd"), "adf.fix");
  fs::create_directories(dir_.path() / "notacompany");

  const CompanyScan scan = FindTavPaths(dir_.path().string() + "/");
  ASSERT_TRUE(scan.error.empty()) << scan.error;
  std::vector<std::string> paths;
  for (const auto& e : scan.entries) paths.push_back(e.Path);
  EXPECT_EQ(paths, (std::vector<std::string>{In("alpha"), In("Beta"), In("blank"), In("delta"),
                                             In("gamma10"), In("gamma9"), In("lower")}));
  // The blank name is scanned but not listed.
  EXPECT_EQ(scan.Listed(), (std::vector<size_t>{0, 1, 3, 4, 5, 6}));
  EXPECT_EQ(scan.entries[0].Name, "alpha");
  EXPECT_EQ(scan.entries[6].Name, "Lower Ltd");
}

TEST_F(CompanyScanTest, ShortDescriptorGivesItsNameAndFailuresEndTheScan) {
  fs::create_directories(dir_.path() / "a_short");
  std::ofstream(dir_.path() / "a_short" / "ADF.FIX", std::ios::binary) << "Tiny";
  Company("b_good", zdrgen::HostVisual("Good"));
  fs::create_directories(dir_.path() / "c_broken");
  // Reading this file fails with an input/output error, also for root.
  fs::create_symlink("/proc/self/mem", dir_.path() / "c_broken" / "ADF.FIX");
  Company("d_late", zdrgen::HostVisual("Late"));

  const CompanyScan scan = FindTavPaths(dir_.path().string());
  EXPECT_FALSE(scan.error.empty());
  ASSERT_EQ(scan.entries.size(), 2u);  // what came before the broken folder
  EXPECT_EQ(scan.entries[0].Name, "Tiny");
  EXPECT_EQ(scan.entries[1].Path, In("b_good"));

  const CompanyScan missing = FindTavPaths(In("nowhere"));
  EXPECT_TRUE(missing.entries.empty());
  EXPECT_FALSE(missing.error.empty());
}

// ---------------------------------------------------------------------------------------
// Start-up and the panel's values.

TEST_F(GuiTest, FirstStartWithEmptyStoreShowsTheDefaults) {
  auto card = MakeCard();
  EXPECT_EQ(card->control().state().companyPath, DefaultConnDataBase());
  EXPECT_TRUE(card->control().state().selectDbPath.empty());
  for (const char* check : {"ChkAccKey", "chkCutOff", "ChkDates", "chkReadTempTrans", "ChkTitle8",
                            "ChkLogo1", "ChkSelectAccount"}) {
    EXPECT_EQ(Value(*card, check), 0) << check;
  }
  for (const char* list : {"cmbDocType", "cmbByDoc", "CmbSortBy", "CmbSortDir", "cmbInAccounts"})
    EXPECT_EQ(Index(*card, list), 0) << list;
  EXPECT_EQ(Text(*card, "TxtFromDate"), "01/01/1980");
  EXPECT_EQ(Text(*card, "txtToTransVDate"), "01/01/2025");
  EXPECT_EQ(Text(*card, "txtRows") + Text(*card, "txtCols") + Text(*card, "txtCopies") +
                Text(*card, "txtStartFrom"),
            "8311");
  for (const char* cut : {"CutOff1", "CutOff2", "CutOff3", "CutOff4"})
    EXPECT_EQ(Text(*card, cut), "*") << cut;
  EXPECT_EQ(Find<QComboBox>(*card, "cmbDocType")->itemText(26), Q("קבלות"));
  for (auto [name, max] : {std::pair{"CutOff1", 1},
                           {"txtFromSort", 3},
                           {"txtTransType", 4},
                           {"txtStartFrom", 3},
                           {"TxtToCrd", 15},
                           {"TxtFromCrd", 32767}})
    EXPECT_EQ(Box(*card, name)->maxLength(), max) << name;
  EXPECT_EQ(card->layoutDirection(), Qt::RightToLeft);
  EXPECT_EQ(card->ProgressFill()->maximum(), kProgressFrameWidth);
}

TEST_F(GuiTest, CmdDefSavesThePanelAndItComesBack) {
  store_.Save(kSettingsApp, kParamsSection, "FromSort", "12345");  // longer than its box
  {
    auto card = MakeCard();
    Find<PanelCheckBox>(*card, "ChkAccKey")->setValue(1);
    Find<PanelCheckBox>(*card, "ChkTitle3")->setValue(2);
    Box(*card, "TxtCity")->setText(Q("תל אביב"));
    Box(*card, "CutOff2")->setText(Q("א"));
    Find<QComboBox>(*card, "cmbDocType")->setCurrentIndex(26);
    Find<QComboBox>(*card, "cmbAddressFrom")->setCurrentIndex(-1);
    Box(*card, "txtToTransDate")->setText(Q("31/12/2020"));
    Box(*card, "txtFromRef")->setText(Q("55"));
    EXPECT_EQ(store_.Values().size(), 1u);  // nothing saved before CmdDef
    Press(*card, "CmdDef");
  }
  EXPECT_EQ(Stored(kParamsSection, "FromToDate"), "31/12/2020");
  EXPECT_EQ(Stored(kParamsSection, "AddressFrom"), "-1");
  EXPECT_EQ(Stored(kParamsSection, "FromSort"), "12345");
  for (const auto& [address, value] : store_.Values()) EXPECT_NE(value, "55");  // not kept
  auto card = MakeCard();
  EXPECT_EQ(Value(*card, "ChkAccKey"), 1);
  EXPECT_EQ(Find<PanelCheckBox>(*card, "ChkTitle3")->checkState(), Qt::PartiallyChecked);
  EXPECT_EQ(Text(*card, "TxtCity"), Q("תל אביב"));
  EXPECT_EQ(Text(*card, "CutOff2"), Q("א"));
  EXPECT_EQ(Index(*card, "cmbDocType"), 26);
  EXPECT_EQ(Index(*card, "cmbAddressFrom"), -1);
  EXPECT_EQ(Text(*card, "txtFromRef"), "");
}

TEST_F(GuiTest, CopyLabelsCopyFromIntoTo) {
  auto card = MakeCard();
  struct Copy {
    const char *label, *from, *to, *text;
  };
  for (const Copy& c : {Copy{"lblToDate", "TxtFromDate", "TxtToDate", ""},
                        Copy{"lblToRef", "txtFromRef", "txtToRef", "12345678901234567890"},
                        Copy{"Label48", "txtFromItmKey", "txtToItmKey", "K1"},
                        Copy{"Label45", "txtFromItmSort", "txtToItmSort", "9"}}) {
    Box(*card, c.from)->setText(c.text);
    Box(*card, c.to)->setText("old");
    QTest::mouseClick(Find<ClickLabel>(*card, c.label)->label(), Qt::LeftButton);
    EXPECT_EQ(Text(*card, c.to), c.text) << c.label;
  }
}

TEST(PanelCheckBoxTest, ClicksTurnOnAndOffAndGreyedTurnsOn) {
  App();
  PanelCheckBox box;
  box.click();
  EXPECT_EQ(box.value(), 1);
  box.click();
  EXPECT_EQ(box.value(), 0);
  ASSERT_TRUE(box.setValue(2));
  box.click();
  EXPECT_EQ(box.value(), 1);
  EXPECT_FALSE(box.setValue(3));
  EXPECT_EQ(box.value(), 1);
}

// The panel's inputs and commands that Tab stops at.
std::vector<QWidget*> Focusable(QWidget& card) {
  std::vector<QWidget*> out;
  for (QWidget* w : card.findChildren<QWidget*>())
    if ((w->focusPolicy() & Qt::TabFocus) && w->isVisibleTo(&card)) out.push_back(w);
  return out;
}

QGroupBox* GroupOf(QWidget* w) {
  for (QWidget* p = w->parentWidget(); p; p = p->parentWidget())
    if (auto* g = qobject_cast<QGroupBox*>(p)) return g;
  return nullptr;
}

TEST_F(GuiTest, TabRanBackwardsInEveryRangeRow) {
  auto card = MakeCard();
  QWidget* first = Find<QWidget>(*card, "ChkAccKey");
  first->setFocus();
  std::vector<QWidget*> visited{first};
  for (int i = 0; i < 200; ++i) {
    QTest::keyClick(card->focusWidget(), Qt::Key_Tab);
    if (card->focusWidget() == first) break;
    visited.push_back(card->focusWidget());
  }
  // Once round the whole panel, every stop once.
  std::vector<QWidget*> all = Focusable(*card);
  EXPECT_EQ(std::set<QWidget*>(visited.begin(), visited.end()),
            std::set<QWidget*>(all.begin(), all.end()));
  EXPECT_EQ(visited.size(), all.size());
  EXPECT_EQ(visited.back()->objectName(), "CmdConnect");

  // Reading order: the next stop is on the same line further left, or on a lower line;
  // each group is passed through once, the commands come last.
  std::vector<QGroupBox*> groups;
  for (size_t i = 1; i < visited.size(); ++i) {
    QWidget* a = visited[i - 1];
    QWidget* b = visited[i];
    QGroupBox* g = GroupOf(b);
    if (groups.empty() || groups.back() != g) {
      EXPECT_EQ(std::count(groups.begin(), groups.end(), g), 0) << FromQ(b->objectName());
      groups.push_back(g);
    }
    if (GroupOf(a) != g && g != nullptr) continue;
    const QRect ra(a->mapTo(card.get(), QPoint()), a->size());
    const QRect rb(b->mapTo(card.get(), QPoint()), b->size());
    const bool sameLine = rb.center().y() >= ra.top() && rb.center().y() <= ra.bottom();
    EXPECT_TRUE(sameLine ? rb.center().x() < ra.center().x() : rb.top() > ra.center().y())
        << FromQ(a->objectName()) << " -> " << FromQ(b->objectName());
  }
  EXPECT_EQ(groups.back(), nullptr);
  EXPECT_EQ(visited[1]->objectName(), "TxtFromCrd");
  EXPECT_EQ(visited[2]->objectName(), "TxtToCrd");
}

// ---------------------------------------------------------------------------------------
// Hebrew: Qt's own texts, the font, paths.

TEST_F(GuiTest, StandardDialogsAndMenusWereInEnglish) {
  QLineEdit edit;
  std::unique_ptr<QMenu> menu(edit.createStandardContextMenu());
  QStringList texts;
  for (QAction* a : menu->actions()) texts << a->text().remove('&');
  EXPECT_TRUE(texts.contains(Q("העתק\tCtrl+\u202aC"))) << FromQ(texts.join(' '));

  // The chooser's dialog is Qt's own, in Hebrew, with its paths left to right.
  QtFileChooser chooser;
  bool seen = false;
  WhenShown<QFileDialog>([&](QFileDialog& d) {
    seen = true;
    EXPECT_TRUE(d.testOption(QFileDialog::DontUseNativeDialog));
    EXPECT_EQ(d.layoutDirection(), Qt::RightToLeft);
    EXPECT_EQ(Find<QDialogButtonBox>(d, "buttonBox")->button(QDialogButtonBox::Cancel)->text(),
              Q("ביטול"));
    EXPECT_EQ(Find<QWidget>(d, "lookInCombo")->layoutDirection(), Qt::LeftToRight);
    EXPECT_EQ(Find<QWidget>(d, "fileNameEdit")->layoutDirection(), Qt::LeftToRight);
  });
  EXPECT_EQ(chooser.ChooseOpenFile(nullptr, Q("בחירת תמונה"), {"PNG Files (*.png)"}, 0,
                                   ToQ(temp_.path().string())),
            "");
  EXPECT_TRUE(seen);

  // The dialogs' own path boxes read left to right, also a path of Hebrew folders.
  auto card = MakeCard();
  frmLogon logon(card->control(), *card->openDir(), card.get());
  for (QLineEdit* box : {logon.txtConnDatabase(), card->labDefDialog()->TxtHeaderLogo,
                         card->labDefDialog()->txtFooterLogo, card->postILDialog()->txtFilePath}) {
    box->window()->show();
    box->setText(Q("/משרד/חברה"));
    const auto cursorX = [box](int at) {
      box->setCursorPosition(at);
      return box->inputMethodQuery(Qt::ImCursorRectangle).toRect().center().x();
    };
    EXPECT_LT(cursorX(0), cursorX(box->text().size())) << FromQ(box->objectName());
    box->window()->hide();
  }
  EXPECT_EQ(card->openDir()->PathDrive()->layoutDirection(), Qt::LeftToRight);
}

TEST_F(GuiTest, LatinFellBackToALargerFontNextToHebrew) {
  const QFont font = HebrewUiFont();
  const QFontMetrics metrics(font);
  for (const QString& text : {Q("מסעדת IBM 35"), Q("Osem Group (1995) בע\"מ"), Q("c:\\acc/@&~")})
    for (const QChar c : text)
      EXPECT_TRUE(metrics.inFont(c)) << FromQ(text) << " " << int(c.unicode());
  auto card = MakeCard();
  EXPECT_EQ(card->font(), font);
  EXPECT_EQ(card->selectCard()->font(), font);
}

// ---------------------------------------------------------------------------------------
// The output commands on a generated company.

class OutputCommandTest : public GuiTest {
 protected:
  void SetUp() override {
    GuiTest::SetUp();
    zdrgen::Options options;
    options.accounts = 40;
    options.documents = 20;
    options.ledger = 20;
    options.receipts = 10;
    zdrgen::WriteCompany(company_.path() / "comp", options, "חברת בדיקה");
    card_ = MakeCard();
    card_->control().state().companyPath = (company_.path() / "comp").string();
    card_->seam().SetStatusObserver([this](const QString& s) { statuses_.push_back(s); });
  }
  bool Saw(const char* status) const { return statuses_.contains(Q(status)); }

  TempDir company_;
  std::unique_ptr<MainCard> card_;
  QStringList statuses_;
};

TEST_F(OutputCommandTest, LabelSheetIsWrittenAndOpenedAndASecondCommandRefused) {
  bool tried = false;
  card_->seam().SetStatusObserver([&](const QString& s) {
    statuses_.push_back(s);
    if (tried) return;
    tried = true;
    EXPECT_FALSE(Find<QPushButton>(*card_, "CmdDef")->isEnabled());
    card_->CmdDef_Click();
    EXPECT_TRUE(card_->CmdPreview_Click().empty());
  });
  Press(*card_, "CmdLabPrev");
  const fs::path expected = temp_.path() / "zdrlab1.htm";
  EXPECT_GT(fs::file_size(expected), 0u);
  ASSERT_EQ(desk_.pages.size(), 1u);
  EXPECT_EQ(fs::path(desk_.pages[0]), expected);
  for (const char* s : {"מאתחל בסיס נתונים", "קורא רשימת כרטיסים", "קריאת הנתונים הסתיימה"})
    EXPECT_TRUE(Saw(s)) << s;
  EXPECT_EQ(card_->LblMessage()->text(), Q("הכנת הרשימה הסתיימה"));
  EXPECT_TRUE(store_.Values().empty());
  EXPECT_FALSE(fs::exists(temp_.path() / "zdrlab2.htm"));
  EXPECT_EQ(card_->ProgressFill()->value(), 0);
  EXPECT_TRUE(desk_.shown.empty()) << desk_.shown[0].text;

  Press(*card_, "CmdPreview");
  EXPECT_TRUE(fs::exists(temp_.path() / "zdrlab2.htm"));
  EXPECT_EQ(desk_.pages.size(), 2u);
}

TEST_F(OutputCommandTest, EditsDuringACommandWereThrownAway) {
  auto* from = Box(*card_, "TxtFromCrd");
  auto* city = Box(*card_, "TxtCity");
  auto* chkCity = Find<PanelCheckBox>(*card_, "ChkCity");
  from->setFocus();
  QTest::keyClicks(from, "100");
  bool tried = false;
  card_->seam().SetStatusObserver([&](const QString&) {
    if (tried) return;
    tried = true;
    for (QWidget* w : Focusable(*card_)) EXPECT_FALSE(w->isEnabled()) << FromQ(w->objectName());
    EXPECT_FALSE(Find<ClickLabel>(*card_, "lblToDate")->isEnabled());
    QTest::keyClicks(from, "9");
    QTest::keyClicks(city, "Haifa");
    QTest::mouseClick(chkCity, Qt::LeftButton);
    QTest::mouseClick(Find<ClickLabel>(*card_, "lblToDate")->label(), Qt::LeftButton);
    // Refused at once, in sight of the clerk, not taken and then overwritten.
    EXPECT_EQ(from->text(), "100");
    EXPECT_EQ(city->text(), "");
    EXPECT_EQ(chkCity->value(), 0);
  });
  Press(*card_, "CmdLabPrev");
  EXPECT_TRUE(tried);
  EXPECT_EQ(from->text(), "100");
  EXPECT_EQ(Text(*card_, "TxtToDate"), "01/01/2025");
  for (QWidget* w : Focusable(*card_)) EXPECT_TRUE(w->isEnabled()) << FromQ(w->objectName());
  // The focus is back on the command clicked.
  EXPECT_EQ(card_->focusWidget(), Find<QPushButton>(*card_, "CmdLabPrev"));
  from->setFocus();
  QTest::keyClicks(from, "1");
  EXPECT_EQ(from->text(), "1001");
}

TEST_F(OutputCommandTest, DispatchFileNeedsItsPathAndIsOpenedWhenAsked) {
  Press(*card_, "cmdBuildPostIL");
  ASSERT_EQ(desk_.shown.size(), 1u);
  EXPECT_EQ(desk_.shown[0].text, "לא הוגדר קובץ פלט");
  EXPECT_EQ(desk_.shown[0].title, "שגיאה");
  EXPECT_TRUE(statuses_.isEmpty());
  desk_.shown.clear();

  const fs::path workbook = company_.path() / "out" / "post.xlsx";
  fs::create_directories(workbook.parent_path());
  card_->control().postILSettings().FilePath = workbook.string();
  card_->control().postILSettings().OpenExcel = 1;
  Press(*card_, "cmdBuildPostIL");
  EXPECT_TRUE(fs::exists(temp_.path() / "zdpost1.csv"));
  ASSERT_EQ(desk_.workbooks.size(), 1u);
  EXPECT_EQ(fs::path(desk_.workbooks[0]), workbook);
  // The generated company holds faults on purpose: the workbook is open, so the counts are
  // told and nothing is asked.
  const std::string counts = PreflightCounts(card_->control().lastPreflight());
  EXPECT_EQ(card_->LblMessage()->text(), Q(("הכנת הקובץ הסתיימה. " + counts).c_str()));
  ASSERT_EQ(desk_.shown.size(), 1u);
  EXPECT_EQ(desk_.shown[0].text,
            "בבדיקת הקובץ לדואר נמצאו " + counts + ".\nהממצאים בגיליון \"בדיקה\" של חוברת העבודה.");
  EXPECT_EQ(desk_.shown[0].title, "הודעה");
}

TEST_F(OutputCommandTest, DispatchFindingsOpenTheWorkbookWhenAsked) {
  const fs::path workbook = company_.path() / "post.xlsx";
  card_->control().postILSettings().FilePath = workbook.string();
  for (bool yes : {false, true}) {
    desk_.answers = {yes};
    Press(*card_, "cmdBuildPostIL");
    ASSERT_EQ(desk_.asked.size(), 1u);
    EXPECT_EQ(desk_.asked.back().title, "שימו לב");
    EXPECT_EQ(desk_.workbooks.size(), yes ? 1u : 0u);
    desk_.asked.clear();
  }
  EXPECT_EQ(fs::path(desk_.workbooks[0]), workbook);
  EXPECT_TRUE(desk_.shown.empty());
}

// ---------------------------------------------------------------------------------------
// The account picker.

class PickerTest : public OutputCommandTest {
 protected:
  static int Ticked(frmSelectCard& d) {
    int n = 0;
    for (const auto& r : d.model()->Rows()) n += r.include ? 1 : 0;
    return n;
  }
};

TEST_F(PickerTest, FirstOpenScansWithoutAskingSecondAsks) {
  int rows = 0;
  WhenShown<frmSelectCard>([&](frmSelectCard& d) {
    rows = d.model()->rowCount();
    EXPECT_EQ(d.VSSelectItems()->model()->headerData(2, Qt::Horizontal), Q("להדפיס?"));
    EXPECT_EQ(Ticked(d), rows);  // a fresh scan ticks every account
    Press(d, "cmdNoneItems");
    Press(d, "cmdShowMarked");
    EXPECT_EQ(d.model()->rowCount(), 0);
    Press(d, "cmdShowAll");
    // Enter in the key box finds the account, makes it current and ticks it.
    const std::string key = d.model()->Rows()[3].key;
    QTest::keyClicks(d.txtToItemkey, ToQ(key));
    QTest::keyClick(d.txtToItemkey, Qt::Key_Return);
    EXPECT_EQ(d.VSSelectItems()->currentIndex().row(), 3);
    EXPECT_TRUE(d.model()->Rows()[3].include);
    // The grid's captions are no account: a key search never lands on them.
    Press(d, "cmdNoneItems");
    d.txtToItemkey->setText(Q("מפתח"));
    Press(d, "cmdFindKey");
    EXPECT_EQ(Ticked(d), 0);
    d.txtToItemkey->setText(ToQ(key));
    Press(d, "cmdFindKey");
    Press(d, "cmdClose");
  });
  Press(*card_, "cmdSelectAccount");
  EXPECT_TRUE(desk_.asked.empty());
  EXPECT_GT(rows, 10);
  EXPECT_TRUE(Saw("קורא רשימת כרטיסים"));

  // No keeps the ticks.
  desk_.answers = {false};
  int tickedAfterNo = -1;
  WhenShown<frmSelectCard>([&](frmSelectCard& d) { tickedAfterNo = Ticked(d); });
  Press(*card_, "cmdSelectAccount");
  ASSERT_EQ(desk_.asked.size(), 1u);
  EXPECT_EQ(desk_.asked[0].text, "לסרוק מחדש את רשימת הכרטיסים?");
  EXPECT_EQ(desk_.asked[0].title, "שימו לב");
  EXPECT_EQ(desk_.asked[0].icon, MsgIcon::Question);
  EXPECT_EQ(tickedAfterNo, 1);

  // Yes rescans and ticks everything again.
  desk_.answers = {true};
  int tickedAfterYes = -1;
  WhenShown<frmSelectCard>([&](frmSelectCard& d) { tickedAfterYes = Ticked(d); });
  Press(*card_, "cmdSelectAccount");
  EXPECT_EQ(tickedAfterYes, rows);
}

TEST_F(PickerTest, PickerIsNotShownWhenItsDatabaseCannotBeCreated) {
  const fs::path notAFolder = temp_.path() / "file";
  std::ofstream(notAFolder) << "x";
  setenv("Temp", notAFolder.c_str(), 1);
  bool shown = false;
  QTimer::singleShot(0, [&] {
    if (QWidget* d = QApplication::activeModalWidget()) {
      shown = true;
      d->close();
    }
  });
  Press(*card_, "cmdSelectAccount");
  QCoreApplication::processEvents();
  EXPECT_FALSE(shown);
  ASSERT_FALSE(desk_.shown.empty());
  EXPECT_EQ(desk_.shown[0].title, "תקלה");
  EXPECT_TRUE(Find<QPushButton>(*card_, "cmdSelectAccount")->isEnabled());
}

TEST_F(PickerTest, OrderFollowsTheSortChoiceAndEnterFindsByDescription) {
  Find<QComboBox>(*card_, "CmbSortBy")->setCurrentIndex(1);
  WhenShown<frmSelectCard>([&](frmSelectCard& d) {
    EXPECT_NE(d.model()->RecordSource().find("Order By SortByName"), std::string::npos);
    const auto all = d.model()->Rows();
    ASSERT_GT(all.size(), 2u);
    Press(d, "cmdNoneItems");
    // A part of the second account's name.
    const QString name = ToQ(all[1].name);
    d.txtToItemName->setText(name.left(std::min<qsizetype>(4, name.size())));
    QTest::keyClick(d.txtToItemName, Qt::Key_Enter);
    EXPECT_GE(d.model()->rowCount(), 1);
    EXPECT_LT(d.model()->rowCount(), static_cast<int>(all.size()));
    for (const auto& r : d.model()->Rows())
      EXPECT_TRUE(ToQ(r.name).contains(d.txtToItemName->text(), Qt::CaseInsensitive));
    EXPECT_GE(d.VSSelectItems()->currentIndex().row(), 0);
    // A quote cannot break the statement.
    d.txtToItemName->setText(Q("ג'ון"));
    Press(d, "cmdFindByDesc");
    EXPECT_EQ(d.model()->rowCount(), 0);
    Press(d, "CmdAllItems");
    Press(d, "cmdShowMarked");
    EXPECT_EQ(d.model()->rowCount(), static_cast<int>(all.size()));
  });
  Press(*card_, "cmdSelectAccount");
  EXPECT_EQ(card_->control().state().pickerSortIndex, 1);
}

TEST_F(PickerTest, TickInTheGridIsWrittenAtOnceForAKeyWithAQuote) {
  WhenShown<frmSelectCard>([&](frmSelectCard& d) {
    PickerModel& m = *d.model();
    ASSERT_TRUE(m.Execute("Update tSelectAccount Set SortByKey = 'O''K' Where SortByKey = " +
                          QuoteJetText(m.Rows()[0].key)));
    Press(d, "cmdShowAll");
    int row = -1;
    for (int r = 0; r < m.rowCount(); ++r)
      if (m.Rows()[r].key == "O'K") row = r;
    ASSERT_GE(row, 0);
    EXPECT_TRUE(m.setData(m.index(row, 2), Qt::Unchecked, Qt::CheckStateRole));
    Press(d, "cmdShowMarked");
    for (const auto& r : m.Rows()) EXPECT_NE(r.key, "O'K");
  });
  Press(*card_, "cmdSelectAccount");
}

// ---------------------------------------------------------------------------------------
// The company chooser and the connection dialog.

class ChooserTest : public GuiTest {
 protected:
  void SetUp() override {
    GuiTest::SetUp();
    root_ = (companies_.path() / "acc").string();
    zdrgen::WriteRecords(fs::path(root_) / "c1" / "ADF.FIX",
                         {zdrgen::CompanyRecord(zdrgen::HostVisual("ראשונה"))});
    zdrgen::WriteRecords(fs::path(root_) / "c2" / "ADF.FIX", {zdrgen::CompanyRecord("")});
    zdrgen::WriteRecords(fs::path(root_) / "c3" / "ADF.FIX",
                         {zdrgen::CompanyRecord(zdrgen::HostVisual("Third Co"))});
    card_ = MakeCard();
  }
  TempDir companies_;
  std::string root_;
  std::unique_ptr<MainCard> card_;
};

TEST_F(ChooserTest, ListsNamedCompaniesAndConfirmSetsTheCompanyPath) {
  const std::string before = card_->control().state().companyPath;
  WhenShown<frmOpenDir>([&](frmOpenDir& d) {
    d.MainDir_Change(ToQ(root_));
    d.cmbCompany()->setCurrentRow(0);
    Press(d, "CancelButton");
  });
  card_->openDir()->ShowModal();
  EXPECT_EQ(card_->control().state().companyPath, before);
  EXPECT_TRUE(card_->openDir()->IsLoaded());  // hidden, not closed

  WhenShown<frmOpenDir>([&](frmOpenDir& d) {
    ASSERT_EQ(d.cmbCompany()->count(), 2);  // as it was left
    EXPECT_EQ(d.cmbCompany()->item(0)->text(), Q("ראשונה"));
    d.cmbCompany()->clearSelection();
    EXPECT_TRUE(d.cmbCompany()->isEnabled());
    // No choice: the dialog stays.
    Press(d, "OKButton");
    EXPECT_TRUE(d.isVisible());
    ASSERT_EQ(desk_.shown.size(), 1u);
    EXPECT_EQ(desk_.shown[0].text, "לא בחרת חברה");
    EXPECT_EQ(desk_.shown[0].title, "שגיאה");
    // The second listed name selects its own folder, past the blank one.
    d.cmbCompany()->setCurrentRow(1);
    Press(d, "OKButton");
    EXPECT_FALSE(d.isVisible());
  });
  card_->openDir()->ShowModal();
  EXPECT_EQ(card_->control().state().companyPath, root_ + "/c3");
  EXPECT_EQ(card_->openDir()->PubMainDir, root_);
  EXPECT_FALSE(card_->openDir()->PubMainDrive.empty());
}

TEST_F(ChooserTest, FailedScanListsOnlyItsOwnCompanies) {
  frmOpenDir& d = *card_->openDir();
  d.Load();
  d.MainDir_Change(ToQ(root_));
  ASSERT_EQ(d.cmbCompany()->count(), 2);
  const fs::path other = companies_.path() / "other";
  fs::create_directories(other / "broken");
  fs::create_symlink("/proc/self/mem", other / "broken" / "ADF.FIX");
  d.MainDir_Change(ToQ(other.string()));
  ASSERT_EQ(desk_.shown.size(), 1u);
  EXPECT_EQ(desk_.shown[0].title, "תקלה");
  // The names of the earlier folder are gone: none can select a folder of this scan's list.
  EXPECT_EQ(d.cmbCompany()->count(), 0);
  EXPECT_TRUE(d.cmbCompany()->isEnabled());
  EXPECT_FALSE(d.OKButton_Click());
}

TEST_F(ChooserTest, RemembersThePlaceAfterTheWindowIsClosed) {
  frmOpenDir& d = *card_->openDir();
  d.Load();
  d.MainDir_Change(ToQ(root_));
  d.cmbCompany()->setCurrentRow(0);
  ASSERT_TRUE(d.OKButton_Click());
  d.show();
  d.close();  // the window's close button
  EXPECT_FALSE(d.IsLoaded());
  d.MainDir_Change(ToQ(companies_.path().string()));  // wander off
  d.Load();
  EXPECT_EQ(d.CurrentFolder(), ToQ(root_));
  EXPECT_EQ(d.cmbCompany()->count(), 2);
}

TEST_F(ChooserTest, ConnectionCheckAndConfirm) {
  fs::create_directories(companies_.path() / "lower");
  std::ofstream(companies_.path() / "lower" / "act.fix") << "x";
  WhenShown<frmLogon>([&](frmLogon& logon) {
    EXPECT_EQ(logon.txtConnDatabase()->text(), ToQ(card_->control().state().companyPath));
    EXPECT_EQ(logon.LblMsg()->text(), Q("מומלץ לבצע בדיקה לאחר שינוי ערכי ההתחברות!"));
    // File names are matched without regard to case.
    logon.txtConnDatabase()->setText(ToQ((companies_.path() / "lower").string()));
    Press(logon, "CmdCheck");
    ASSERT_EQ(desk_.shown.size(), 1u);
    EXPECT_EQ(desk_.shown[0].text, "הבדיקה הסתיימה בהצלחה");
    EXPECT_EQ(desk_.shown[0].title, "הודעה");
    EXPECT_EQ(logon.LblMsg()->text(), Q("הבדיקה הסתיימה בהצלחה"));
    logon.txtConnDatabase()->setText(Q("/no/such/folder"));
    Press(logon, "CmdCheck");
    EXPECT_EQ(desk_.shown.size(), 1u);
    EXPECT_EQ(logon.LblMsg()->text(), Q("הבדיקה לא הסתיימה בהצלחה"));
    EXPECT_TRUE(store_.Values().empty());  // a check stores nothing
    // Confirming needs no check and stores the folder as typed.
    Press(logon, "cmdOK");
  });
  Press(*card_, "CmdConnect");
  EXPECT_EQ(card_->control().state().companyPath, "/no/such/folder");
  EXPECT_EQ(Stored(kParamsSection, kConnDataBaseKey), "/no/such/folder");
}

TEST_F(ChooserTest, BrowseThenCancelUsesTheChosenCompanyButStoresNothing) {
  WhenShown<frmLogon>([&](frmLogon& logon) {
    WhenShown<frmOpenDir>([&](frmOpenDir& d) {
      d.MainDir_Change(ToQ(root_));
      d.cmbCompany()->setCurrentRow(1);
      Press(d, "OKButton");
    });
    Press(logon, "cmdOpen");
    EXPECT_EQ(FromQ(logon.txtConnDatabase()->text()), root_ + "/c3");
    Press(logon, "cmdCancel");
  });
  Press(*card_, "CmdConnect");
  EXPECT_EQ(card_->control().state().companyPath, root_ + "/c3");
  EXPECT_FALSE(store_.Has(kSettingsApp, kParamsSection, kConnDataBaseKey));
}

// ---------------------------------------------------------------------------------------
// The label and dispatch settings dialogs.

TEST_F(GuiTest, LabelDialogLoadsConfirmsAndCancels) {
  store_.Save(kSettingsApp, "LabelDef1", "FontSize", "14");
  store_.Save(kSettingsApp, kLabPicsSection, "Pic0", "/pics/top.png");
  auto card = MakeCard();
  WhenShown<frmLabDef>([&](frmLabDef& d) {
    EXPECT_EQ(d.txtFontSize[1]->text(), "14");
    EXPECT_EQ(d.CmbFont[0]->currentText(), "Arial");
    EXPECT_EQ(d.TxtHeaderLogo->text(), "/pics/top.png");
    d.CmbWeight[2]->setCurrentIndex(2);  // "עבה"
    d.CmbWeight[3]->setCurrentIndex(1);  // "מודגש"
    QTest::mouseClick(d.ChkUL[4], Qt::LeftButton);
    // The picture buttons offer the image filters; a cancel keeps the path.
    Press(d, "CmdDir0");
    EXPECT_EQ(d.TxtHeaderLogo->text(), "/pics/top.png");
    EXPECT_EQ(desk_.offered, QStringList({"GIF Files (*.gif)", "JPEG Files (*.jpg)",
                                          "PNG Files (*.png)", "All Files (*.*)"}));
    EXPECT_EQ(desk_.preselected, 1);
    desk_.answer = "/pics/logo.jpg";
    Press(d, "CmdDir1");
    EXPECT_EQ(d.txtFooterLogo->text(), "/pics/logo.jpg");
    Press(d, "cmdOK");
  });
  Press(*card, "CmdLabDef");
  EXPECT_EQ(Stored(kLabPicsSection, "Pic1"), "/pics/logo.jpg");
  EXPECT_EQ(Stored("LabelDef2", "FontWeight"), "2");
  EXPECT_EQ(Stored("LabelDef3", "FontWeight"), "1");
  EXPECT_EQ(Stored("LabelDef4", "FontUL"), "1");
  EXPECT_EQ(card->control().labelSettings().LabelDefs[2].FontWeight, 2);

  WhenShown<frmLabDef>([&](frmLabDef& d) {
    d.txtFontSize[0]->setText("20");
    Press(d, "cmdCancel");
  });
  Press(*card, "CmdLabDef");
  EXPECT_EQ(Stored("LabelDef0", "FontSize"), "9");
  EXPECT_EQ(card->control().labelSettings().LabelDefs[0].FontSize, 9);
}

TEST_F(GuiTest, SizeOf300ClosedTheDialogAndDroppedLaterRows) {
  auto card = MakeCard();
  const LabelSettings before = card->control().labelSettings();
  WhenShown<frmLabDef>([&](frmLabDef& d) {
    d.txtFontSize[2]->setText("11");
    d.CmbWeight[3]->setCurrentIndex(2);
    d.txtFontSize[5]->setText("16");
    d.TxtHeaderLogo->setText("/new/top.png");
    for (const char* bad : {"300", "0", ""}) {
      d.txtFontSize[3]->setText(bad);
      Press(d, "cmdOK");
      EXPECT_TRUE(d.isVisible()) << bad;
      ASSERT_FALSE(desk_.shown.empty());
      EXPECT_EQ(desk_.shown.back().title, "שגיאה");
      EXPECT_NE(desk_.shown.back().text.find("לידי: איש קשר"), std::string::npos);
      EXPECT_EQ(d.focusWidget(), d.txtFontSize[3]);
    }
    // Nothing typed is lost and nothing reached memory or the store.
    EXPECT_EQ(d.txtFontSize[5]->text(), "16");
    EXPECT_EQ(d.TxtHeaderLogo->text(), "/new/top.png");
    EXPECT_EQ(card->control().labelSettings().LabelDefs[2].FontSize, before.LabelDefs[2].FontSize);
    EXPECT_TRUE(store_.Values().empty());
    // The size box takes no letters.
    d.txtFontSize[3]->clear();
    QTest::keyClicks(d.txtFontSize[3], "2a5");
    EXPECT_EQ(d.txtFontSize[3]->text(), "25");
    Press(d, "cmdOK");
    EXPECT_FALSE(d.isVisible());
  });
  Press(*card, "CmdLabDef");
  const auto& defs = card->control().labelSettings().LabelDefs;
  EXPECT_EQ(defs[3].FontSize, 25);
  EXPECT_EQ(defs[3].FontWeight, 2);
  EXPECT_EQ(defs[5].FontSize, 16);
  EXPECT_EQ(Stored("LabelDef5", "FontSize"), "16");
  EXPECT_EQ(Stored(kLabPicsSection, "Pic0"), "/new/top.png");
}

TEST_F(GuiTest, DispatchDialogLoadsConfirmsAndCancels) {
  store_.Save(kSettingsApp, kPostILSection, "Weight", "0.5");
  store_.Save(kSettingsApp, kPostILSection, "FileFormat", "1");
  auto card = MakeCard();
  WhenShown<frmPostIL>([&](frmPostIL& d) {
    EXPECT_EQ(d.txtWeight->text(), "0.5");
    EXPECT_EQ(d.CmbFileFormat->currentIndex(), 1);
    EXPECT_EQ(d.CmbFileFormat->itemText(0), Q("דואר ישראל"));
    EXPECT_EQ(d.ChkOpenExcel->value(), 0);
    d.txtService->setText(Q("רגיל"));
    QTest::mouseClick(d.ChkOpenExcel, Qt::LeftButton);
    // The file chooser offers .xlsx first; a cancel keeps the path.
    d.txtFilePath->setText("/out/post.xls");
    Press(d, "CmdDir");
    EXPECT_EQ(d.txtFilePath->text(), "/out/post.xls");
    EXPECT_EQ(desk_.offered.value(0), "Excel Files (*.xlsx)");
    EXPECT_TRUE(desk_.offered.join('|').contains("*.xls)"));
    desk_.answer = "/out/new.xlsx";
    Press(d, "CmdDir");
    EXPECT_EQ(d.txtFilePath->text(), "/out/new.xlsx");
    Press(d, "cmdOK");
  });
  Press(*card, "cmdPostDef");
  EXPECT_EQ(Stored(kPostILSection, "Service"), "רגיל");
  EXPECT_EQ(Stored(kPostILSection, "OpenExcel"), "1");
  EXPECT_EQ(Stored(kPostILSection, "Weight"), "0.5");
  EXPECT_EQ(Stored(kPostILSection, "FilePath"), "/out/new.xlsx");
  EXPECT_EQ(card->control().postILSettings().OpenExcel, 1);

  WhenShown<frmPostIL>([&](frmPostIL& d) {
    d.txtService->setText(Q("אחר"));
    d.CmbFileFormat->setCurrentIndex(-1);
    Press(d, "cmdCancel");
  });
  Press(*card, "cmdPostDef");
  EXPECT_EQ(Stored(kPostILSection, "Service"), "רגיל");
  EXPECT_EQ(Stored(kPostILSection, "FileFormat"), "1");

  // A list without a choice is stored as -1.
  WhenShown<frmPostIL>([&](frmPostIL& d) {
    d.CmbFileFormat->setCurrentIndex(-1);
    Press(d, "cmdOK");
  });
  Press(*card, "cmdPostDef");
  EXPECT_EQ(Stored(kPostILSection, "FileFormat"), "-1");
  EXPECT_EQ(card->control().postILSettings().FileFormat, -1);
}

}  // namespace
