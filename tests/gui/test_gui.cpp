// The panel, its dialogs and the picker statements, driven offscreen with scripted
// message boxes, file choosers and desktop.
#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <QApplication>
#include <QComboBox>
#include <QGroupBox>
#include <QLabel>
#include <QLineEdit>
#include <QListWidget>
#include <QProgressBar>
#include <QPushButton>
#include <QTableView>
#include <QTest>
#include <QTimer>
#include <QTreeView>
#include <deque>
#include <filesystem>
#include <fstream>
#include <set>
#include <string>
#include <vector>

#include "control/companies.h"
#include "control/settings.h"
#include "gui/dialogs.h"
#include "gui/maincard.h"
#include "gui/qtseam.h"
#include "output/preflight.h"
#include "select/picker.h"
#include "zdrgen/generator.h"

namespace fs = std::filesystem;
using namespace zdr;
using namespace zdr::gui;

namespace {

QApplication& App() {
  static int argc = 1;
  static char name[] = "test_gui";
  static char* argv[] = {name, nullptr};
  static QApplication* app = [] {
    if (qEnvironmentVariableIsEmpty("QT_QPA_PLATFORM")) qputenv("QT_QPA_PLATFORM", "offscreen");
    return new QApplication(argc, argv);
  }();
  return *app;
}

struct Shown {
  std::string text, title;
  MsgIcon icon;
};

class ScriptedPrompter : public Prompter {
 public:
  void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) override {
    shown.push_back({std::string(text), std::string(title), icon});
  }
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) override {
    asked.push_back({std::string(text), std::string(title), icon});
    if (answers.empty()) {
      ADD_FAILURE() << "unexpected question: " << text;
      return false;
    }
    bool a = answers.front();
    answers.pop_front();
    return a;
  }
  bool WasShown(std::string_view text) const {
    for (const auto& s : shown)
      if (s.text == text) return true;
    return false;
  }
  std::vector<Shown> shown, asked;
  std::deque<bool> answers;
};

class FakeOpener : public DesktopOpener {
 public:
  bool OpenPage(const std::string& path) override {
    pages.push_back(path);
    return true;
  }
  bool OpenWorkbook(const std::string& path) override {
    workbooks.push_back(path);
    return true;
  }
  std::vector<std::string> pages, workbooks;
};

class FakeChooser : public FileChooser {
 public:
  QString ChooseOpenFile(QWidget*, const QString&, const QStringList& filters, int selected,
                         const QString&) override {
    offered = filters;
    preselected = selected;
    ++calls;
    return answer;
  }
  QString answer;
  QStringList offered;
  int preselected = -1;
  int calls = 0;
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

class GuiTest : public ::testing::Test {
 protected:
  void SetUp() override {
    App();
    setenv("Temp", temp_.path().c_str(), 1);
  }

  std::unique_ptr<MainCard> MakeCard() {
    return std::make_unique<MainCard>(store_, MainCardServices{&prompter_, &opener_, &chooser_});
  }

  template <typename T>
  static T* Find(QWidget& w, const char* name) {
    T* found = w.findChild<T*>(QString::fromLatin1(name));
    EXPECT_NE(found, nullptr) << name;
    return found;
  }
  static QString Text(QWidget& w, const char* name) { return Find<QLineEdit>(w, name)->text(); }
  static int Value(QWidget& w, const char* name) { return Find<PanelCheckBox>(w, name)->value(); }
  static int Index(QWidget& w, const char* name) {
    return Find<QComboBox>(w, name)->currentIndex();
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
  ScriptedPrompter prompter_;
  FakeOpener opener_;
  FakeChooser chooser_;
};

QString Q(const char* utf8) {
  return QString::fromUtf8(utf8);
}

// ---------------------------------------------------------------------------------------
// The picker's statements.

TEST(PickerSql, ShowAllAndMarkedOrderByKey) {
  std::string none;
  EXPECT_EQ(BuildPickerSQL(none, false, 0),
            "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > '' "
            "Order By SortByKey");
  EXPECT_EQ(BuildPickerSQL(none, true, -1),
            "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > '' "
            "And Include = True Order By SortByKey");
  EXPECT_EQ(none, "");
}

TEST(PickerSql, FindByDescriptionKeepsTickedAndChangesCallersFilter) {
  std::string filter = BuildNameFilter("כהן");
  EXPECT_EQ(filter, " And SortByName Like '*כהן*'");
  EXPECT_EQ(BuildPickerSQL(filter, false, 1),
            "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > '' "
            "And SortByName Like '*כהן*' Or Include = True Order By SortByName");
  EXPECT_EQ(filter, " And SortByName Like '*כהן*' Or Include = True");
}

TEST(PickerSql, QuotesAreDoubledAndPatternCharactersTakenLiterally) {
  EXPECT_EQ(BuildNameFilter("ג'ון"), " And SortByName Like '*ג''ון*'");
  EXPECT_EQ(BuildNameFilter("a*b?#[c"), " And SortByName Like '*a[*]b[?][#][[]c*'");
  EXPECT_EQ(BuildSetIncludeSQL("O'Neil 1", true),
            "Update tSelectAccount Set Include = True Where SortByKey = 'O''Neil 1'");
  EXPECT_EQ(BuildSetIncludeSQL("", false),
            "Update tSelectAccount Set Include = False Where SortByKey = ''");
}

// ---------------------------------------------------------------------------------------
// The company scan.

class CompanyScanTest : public ::testing::Test {
 protected:
  void Company(const std::string& folder, const std::string& hostName,
               const char* descriptor = "ADF.FIX") {
    zdrgen::WriteRecords(dir_.path() / folder / descriptor, {zdrgen::CompanyRecord(hostName)});
  }
  std::vector<std::string> ListingOrder() {
    std::vector<std::string> names;
    for (const auto& e : fs::directory_iterator(dir_.path()))
      if (e.is_directory()) names.push_back(e.path().filename().string());
    return names;
  }
  TempDir dir_;
};

TEST_F(CompanyScanTest, ThreeCompaniesOneBlankInListingOrder) {
  Company("alpha", zdrgen::HostVisual("חברה א"));
  Company("beta", "");
  Company("gamma", zdrgen::HostVisual("Gamma Ltd"), "adf.fix");
  fs::create_directories(dir_.path() / "notacompany");

  const CompanyScan scan = FindTavPaths(dir_.path().string() + "/");
  ASSERT_TRUE(scan.error.empty()) << scan.error;
  ASSERT_EQ(scan.entries.size(), 3u);
  std::vector<std::string> expected;
  for (const auto& name : ListingOrder())
    if (name != "notacompany") expected.push_back(dir_.path().string() + "/" + name);
  for (size_t i = 0; i < 3; ++i) EXPECT_EQ(scan.entries[i].Path, expected[i]);
  const auto listed = scan.Listed();
  ASSERT_EQ(listed.size(), 2u);
  for (size_t i : listed) {
    const std::string folder = fs::path(scan.entries[i].Path).filename().string();
    EXPECT_EQ(scan.entries[i].Name, folder == "alpha" ? "חברה א" : "Gamma Ltd");
  }
}

TEST_F(CompanyScanTest, LongPathIsKeptWhole) {
  const std::string longName(60, 'x');
  Company(longName, zdrgen::HostVisual("Long"));
  const CompanyScan scan = FindTavPaths(dir_.path().string());
  ASSERT_EQ(scan.entries.size(), 1u);
  EXPECT_EQ(scan.entries[0].Path, dir_.path().string() + "/" + longName);
  EXPECT_TRUE(fs::is_directory(scan.entries[0].Path));
}

TEST_F(CompanyScanTest, TruncatedDescriptorStillGivesItsName) {
  std::ofstream(dir_.path() / "short" / "ADF.FIX", std::ios::binary);
  fs::create_directories(dir_.path() / "short");
  std::ofstream(dir_.path() / "short" / "ADF.FIX", std::ios::binary) << "Tiny";
  fs::create_directories(dir_.path() / "empty");
  std::ofstream(dir_.path() / "empty" / "ADF.FIX", std::ios::binary);
  const CompanyScan scan = FindTavPaths(dir_.path().string());
  ASSERT_TRUE(scan.error.empty());
  ASSERT_EQ(scan.entries.size(), 2u);
  ASSERT_EQ(scan.Listed().size(), 1u);
  EXPECT_EQ(scan.entries[scan.Listed()[0]].Name, "Tiny");
}

TEST_F(CompanyScanTest, MissingFolderEndsTheScanWithAnError) {
  const CompanyScan scan = FindTavPaths((dir_.path() / "nowhere").string());
  EXPECT_TRUE(scan.entries.empty());
  EXPECT_FALSE(scan.error.empty());
}

TEST_F(CompanyScanTest, UnreadableDescriptorEndsTheScanKeepingEarlierEntries) {
  Company("good1", zdrgen::HostVisual("One"));
  Company("good2", zdrgen::HostVisual("Two"));
  fs::create_directories(dir_.path() / "broken");
  // Reading this file fails with an input/output error, also for root.
  fs::create_symlink("/proc/self/mem", dir_.path() / "broken" / "ADF.FIX");
  const CompanyScan scan = FindTavPaths(dir_.path().string());
  EXPECT_FALSE(scan.error.empty());
  size_t before = 0;
  for (const auto& name : ListingOrder()) {
    if (name == "broken") break;
    ++before;
  }
  ASSERT_EQ(scan.entries.size(), before);
}

// ---------------------------------------------------------------------------------------
// Start-up and the panel's values.

TEST_F(GuiTest, FirstStartWithEmptyStoreShowsTheDefaults) {
  auto card = MakeCard();
  EXPECT_EQ(card->control().state().companyPath, DefaultConnDataBase());
  EXPECT_TRUE(card->control().state().selectDbPath.empty());
  for (const char* check :
       {"ChkAccKey", "ChkCatCode", "chkCutOff", "ChkAgent", "ChkCity", "ChkPhone", "ChkDates",
        "ChkJournal", "chkTransType", "chkTransDates", "chkTransVDate", "chkReadTempTrans",
        "ChkTitle0", "ChkTitle8", "ChkLogo0", "ChkLogo1", "ChkSelectAccount"}) {
    EXPECT_EQ(Value(*card, check), 0) << check;
  }
  for (const char* list :
       {"cmbDocType", "cmbByDoc", "CmbSortBy", "CmbSortDir", "cmbInAccounts", "cmbAddressFrom"}) {
    EXPECT_EQ(Index(*card, list), 0) << list;
  }
  EXPECT_EQ(Text(*card, "TxtFromDate"), "01/01/1980");
  EXPECT_EQ(Text(*card, "TxtToDate"), "01/01/2025");
  EXPECT_EQ(Text(*card, "txtToTransVDate"), "01/01/2025");
  EXPECT_EQ(Text(*card, "txtRows"), "8");
  EXPECT_EQ(Text(*card, "txtCols"), "3");
  EXPECT_EQ(Text(*card, "txtCopies"), "1");
  EXPECT_EQ(Text(*card, "txtStartFrom"), "1");
  for (const char* cut : {"CutOff1", "CutOff2", "CutOff3", "CutOff4"})
    EXPECT_EQ(Text(*card, cut), "*") << cut;
  auto* docType = Find<QComboBox>(*card, "cmbDocType");
  ASSERT_EQ(docType->count(), 28);
  EXPECT_EQ(docType->currentText(), Q("חשבונית מס"));
  EXPECT_EQ(docType->itemText(2), Q("חשבונית  סוכן"));
  EXPECT_EQ(docType->itemText(26), Q("קבלות"));
  EXPECT_EQ(Find<QComboBox>(*card, "CmbSortBy")->itemText(7), Q("מספר מסמך"));
  EXPECT_TRUE(card->LblMessage()->text().isEmpty());
  EXPECT_EQ(card->ProgressFill()->value(), 0);
  EXPECT_EQ(card->ProgressFill()->maximum(), kProgressFrameWidth);
}

TEST_F(GuiTest, ControlsCarryTheirCaptionsAndLimits) {
  auto card = MakeCard();
  EXPECT_EQ(Find<QPushButton>(*card, "CmdLabPrev")->text(), Q("הצג מדבקות"));
  EXPECT_EQ(Find<QPushButton>(*card, "CmdPreview")->text(), Q("הצג רשימה"));
  EXPECT_EQ(Find<QPushButton>(*card, "cmdBuildPostIL")->text(), Q("הכן קובץ לדואר"));
  EXPECT_EQ(Find<QPushButton>(*card, "cmdPostDef")->text(), Q("הגדרות קובץ לדואר"));
  EXPECT_EQ(Find<QPushButton>(*card, "CmdLabDef")->text(), Q("הגדרות מדבקה"));
  EXPECT_EQ(Find<QPushButton>(*card, "CmdDef")->text(), Q("שמור הגדרות"));
  EXPECT_EQ(Find<QPushButton>(*card, "CmdConnect")->text(), Q("התחברות לTavlor"));
  EXPECT_EQ(Find<QPushButton>(*card, "cmdSelectAccount")->text(), Q("בחירה..."));
  EXPECT_EQ(Find<QLineEdit>(*card, "CutOff1")->maxLength(), 1);
  EXPECT_EQ(Find<QLineEdit>(*card, "txtFromSort")->maxLength(), 3);
  EXPECT_EQ(Find<QLineEdit>(*card, "txtTransType")->maxLength(), 4);
  EXPECT_EQ(Find<QLineEdit>(*card, "txtStartFrom")->maxLength(), 3);
  EXPECT_EQ(Find<QLineEdit>(*card, "TxtToCrd")->maxLength(), 15);
  EXPECT_EQ(card->layoutDirection(), Qt::RightToLeft);
}

TEST_F(GuiTest, StoredPanelComesBack) {
  {
    auto card = MakeCard();
    Find<PanelCheckBox>(*card, "ChkAccKey")->setValue(1);
    Find<PanelCheckBox>(*card, "ChkTitle3")->setValue(2);
    Find<QLineEdit>(*card, "TxtFromCrd")->setText(Q("100"));
    Find<QLineEdit>(*card, "TxtCity")->setText(Q("תל אביב"));
    Find<QLineEdit>(*card, "CutOff2")->setText(Q("א"));
    Find<QComboBox>(*card, "CmbSortBy")->setCurrentIndex(5);
    Find<QComboBox>(*card, "cmbDocType")->setCurrentIndex(26);
    Find<QComboBox>(*card, "cmbAddressFrom")->setCurrentIndex(-1);
    Find<QLineEdit>(*card, "txtRows")->setText(Q("10"));
    card->CmdDef_Click();
  }
  auto card = MakeCard();
  EXPECT_EQ(Value(*card, "ChkAccKey"), 1);
  EXPECT_EQ(Value(*card, "ChkTitle3"), 2);
  EXPECT_EQ(Find<PanelCheckBox>(*card, "ChkTitle3")->checkState(), Qt::PartiallyChecked);
  EXPECT_EQ(Text(*card, "TxtFromCrd"), "100");
  EXPECT_EQ(Text(*card, "TxtCity"), Q("תל אביב"));
  EXPECT_EQ(Text(*card, "CutOff2"), Q("א"));
  EXPECT_EQ(Index(*card, "CmbSortBy"), 5);
  EXPECT_EQ(Index(*card, "cmbDocType"), 26);
  EXPECT_EQ(Index(*card, "cmbAddressFrom"), -1);
  EXPECT_EQ(Text(*card, "txtRows"), "10");
  EXPECT_EQ(Stored(kParamsSection, "AddressFrom"), "-1");
}

TEST_F(GuiTest, SortByTwelveStopsTheRestoreAtThatKey) {
  store_.Save(kSettingsApp, kParamsSection, "Copies", "4");
  store_.Save(kSettingsApp, kParamsSection, "SortBy", "12");
  store_.Save(kSettingsApp, kParamsSection, "SortDir", "1");
  store_.Save(kSettingsApp, kParamsSection, "ReadTempTrans", "1");
  store_.Save(kSettingsApp, kParamsSection, "UseTitle0", "1");
  store_.Save(kSettingsApp, kParamsSection, "UseLogo1", "1");
  auto card = MakeCard();
  EXPECT_EQ(Text(*card, "txtCopies"), "4");
  EXPECT_EQ(Index(*card, "CmbSortBy"), 0);
  EXPECT_EQ(Index(*card, "CmbSortDir"), 0);
  EXPECT_EQ(Value(*card, "chkReadTempTrans"), 0);
  EXPECT_EQ(Value(*card, "ChkTitle0"), 0);
  EXPECT_EQ(Value(*card, "ChkLogo1"), 0);
}

TEST_F(GuiTest, CmdDefSavesThePanel) {
  auto card = MakeCard();
  Find<PanelCheckBox>(*card, "chkTransDates")->setValue(1);
  Find<QLineEdit>(*card, "txtToTransDate")->setText(Q("31/12/2020"));
  Find<QComboBox>(*card, "CmbSortDir")->setCurrentIndex(1);
  Find<QLineEdit>(*card, "txtFromRef")->setText(Q("55"));
  EXPECT_TRUE(store_.Values().empty());
  Find<QPushButton>(*card, "CmdDef")->click();
  EXPECT_EQ(Stored(kParamsSection, "UseTransDates"), "1");
  EXPECT_EQ(Stored(kParamsSection, "FromToDate"), "31/12/2020");
  EXPECT_EQ(Stored(kParamsSection, "SortDir"), "1");
  EXPECT_EQ(Stored(kParamsSection, "CutOff4"), "*");
  // The document numbers are not kept.
  for (const auto& [address, value] : store_.Values()) EXPECT_NE(value, "55");
}

TEST_F(GuiTest, StoredTextLongerThanItsBoxIsShownWhole) {
  store_.Save(kSettingsApp, kParamsSection, "FromSort", "12345");
  auto card = MakeCard();
  EXPECT_EQ(Text(*card, "txtFromSort"), "12345");
  card->CmdDef_Click();
  EXPECT_EQ(Stored(kParamsSection, "FromSort"), "12345");
}

TEST_F(GuiTest, CopyLabelsCopyFromIntoTo) {
  auto card = MakeCard();
  Find<QLineEdit>(*card, "TxtFromDate")->setText("");
  card->lblToDate_Click();
  EXPECT_EQ(Text(*card, "TxtToDate"), "");
  Find<QLineEdit>(*card, "txtFromRef")->setText("12345678901234567890");
  Find<ClickLabel>(*card, "lblToRef")->Click();
  EXPECT_EQ(Text(*card, "txtToRef"), "12345678901234567890");
  Find<QLineEdit>(*card, "txtFromItmKey")->setText("K1");
  Find<ClickLabel>(*card, "Label48")->Click();
  EXPECT_EQ(Text(*card, "txtToItmKey"), "K1");
  Find<QLineEdit>(*card, "txtFromItmSort")->setText("9");
  Find<ClickLabel>(*card, "Label45")->Click();
  EXPECT_EQ(Text(*card, "txtToItmSort"), "9");
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
  card->resize(900, 700);
  card->show();
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
    truth_ = zdrgen::WriteCompany(company_.path() / "comp", options, "חברת בדיקה");
    card_ = MakeCard();
    card_->control().state().companyPath = (company_.path() / "comp").string();
    card_->seam().SetStatusObserver([this](const QString& s) {
      statuses_.push_back(s);
      busyWhileRunning_ = busyWhileRunning_ && !Find<QPushButton>(*card_, "CmdDef")->isEnabled() &&
                          !Find<QPushButton>(*card_, "CmdLabPrev")->isEnabled();
    });
  }
  bool Saw(const char* status) const { return statuses_.contains(Q(status)); }

  TempDir company_;
  zdrgen::CompanyTruth truth_;
  std::unique_ptr<MainCard> card_;
  QStringList statuses_;
  bool busyWhileRunning_ = true;
};

TEST_F(OutputCommandTest, LabelSheetIsWrittenAndOpened) {
  // A command clicked while another runs is refused.
  bool triedSave = false;
  card_->seam().SetStatusObserver([this, &triedSave](const QString& s) {
    statuses_.push_back(s);
    busyWhileRunning_ = busyWhileRunning_ && !Find<QPushButton>(*card_, "CmdDef")->isEnabled();
    if (!triedSave) {
      triedSave = true;
      card_->CmdDef_Click();
      EXPECT_TRUE(card_->CmdPreview_Click().empty());
    }
  });
  const std::string produced = card_->CmdLabPrev_Click();
  const fs::path expected = temp_.path() / "zdrlab1.htm";
  EXPECT_EQ(fs::path(produced), expected);
  EXPECT_TRUE(fs::exists(expected));
  EXPECT_GT(fs::file_size(expected), 0u);
  ASSERT_EQ(opener_.pages.size(), 1u);
  EXPECT_EQ(fs::path(opener_.pages[0]), expected);
  for (const char* s :
       {"מאתחל בסיס נתונים", "קורא רשימת כרטיסים", "קריאת הנתונים הסתיימה", "מכין רשימה"})
    EXPECT_TRUE(Saw(s)) << s;
  EXPECT_EQ(card_->LblMessage()->text(), Q("הכנת הרשימה הסתיימה"));
  EXPECT_TRUE(busyWhileRunning_);
  EXPECT_TRUE(store_.Values().empty());
  EXPECT_FALSE(fs::exists(temp_.path() / "zdrlab2.htm"));
  EXPECT_TRUE(Find<QPushButton>(*card_, "CmdLabPrev")->isEnabled());
  EXPECT_EQ(card_->ProgressFill()->value(), 0);
  EXPECT_TRUE(prompter_.shown.empty()) << prompter_.shown[0].text;
}

TEST_F(OutputCommandTest, EditsDuringACommandWereThrownAway) {
  card_->show();
  auto* from = Find<QLineEdit>(*card_, "TxtFromCrd");
  auto* city = Find<QLineEdit>(*card_, "TxtCity");
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
  Find<QPushButton>(*card_, "CmdLabPrev")->click();
  EXPECT_TRUE(tried);
  EXPECT_EQ(from->text(), "100");
  EXPECT_EQ(Text(*card_, "TxtToDate"), "01/01/2025");
  for (QWidget* w : Focusable(*card_)) EXPECT_TRUE(w->isEnabled()) << FromQ(w->objectName());
  EXPECT_EQ(card_->focusWidget(), from);
  QTest::keyClicks(from, "1");
  EXPECT_EQ(from->text(), "1001");
}

TEST_F(OutputCommandTest, AddressListIsWrittenAndOpened) {
  Find<QPushButton>(*card_, "CmdPreview")->click();
  const fs::path expected = temp_.path() / "zdrlab2.htm";
  EXPECT_TRUE(fs::exists(expected));
  ASSERT_EQ(opener_.pages.size(), 1u);
  EXPECT_EQ(fs::path(opener_.pages[0]), expected);
  EXPECT_TRUE(Saw("מכין רשימה"));
  EXPECT_EQ(card_->LblMessage()->text(), Q("הכנת הרשימה הסתיימה"));
}

TEST_F(OutputCommandTest, DispatchFileWithoutPathIsRefused) {
  Find<QPushButton>(*card_, "cmdBuildPostIL")->click();
  ASSERT_EQ(prompter_.shown.size(), 1u);
  EXPECT_EQ(prompter_.shown[0].text, "לא הוגדר קובץ פלט");
  EXPECT_EQ(prompter_.shown[0].title, "שגיאה");
  EXPECT_TRUE(statuses_.isEmpty());
  EXPECT_FALSE(fs::exists(temp_.path() / "zdpost1.csv"));
  EXPECT_TRUE(Find<QPushButton>(*card_, "cmdBuildPostIL")->isEnabled());
}

TEST_F(OutputCommandTest, DispatchFileIsWrittenAndOpenedWhenAsked) {
  const fs::path workbook = company_.path() / "out" / "post.xlsx";
  fs::create_directories(workbook.parent_path());
  card_->control().postILSettings().FilePath = workbook.string();
  card_->control().postILSettings().OpenExcel = 1;
  card_->cmdBuildPostIL_Click();
  EXPECT_TRUE(fs::exists(temp_.path() / "zdpost1.csv"));
  EXPECT_TRUE(fs::exists(workbook));
  ASSERT_EQ(opener_.workbooks.size(), 1u);
  EXPECT_EQ(fs::path(opener_.workbooks[0]), workbook);
  EXPECT_TRUE(Saw("מכין קובץ"));
  // The generated company holds faults on purpose: the workbook is open, so the counts are
  // told and nothing is asked.
  const std::string counts = PreflightCounts(card_->control().lastPreflight());
  EXPECT_EQ(card_->LblMessage()->text(), Q(("הכנת הקובץ הסתיימה. " + counts).c_str()));
  ASSERT_EQ(prompter_.shown.size(), 1u);
  EXPECT_EQ(prompter_.shown[0].text,
            "בבדיקת הקובץ לדואר נמצאו " + counts + ".\nהממצאים בגיליון \"בדיקה\" של חוברת העבודה.");
  EXPECT_EQ(prompter_.shown[0].title, "הודעה");
}

TEST_F(OutputCommandTest, DispatchFindingsOpenTheWorkbookWhenAsked) {
  const fs::path workbook = company_.path() / "post.xlsx";
  card_->control().postILSettings().FilePath = workbook.string();
  for (bool yes : {false, true}) {
    prompter_.answers = {yes};
    card_->cmdBuildPostIL_Click();
    ASSERT_EQ(prompter_.asked.size(), 1u);
    EXPECT_EQ(prompter_.asked.back().title, "שימו לב");
    EXPECT_EQ(opener_.workbooks.size(), yes ? 1u : 0u);
    prompter_.asked.clear();
  }
  EXPECT_EQ(fs::path(opener_.workbooks[0]), workbook);
  EXPECT_TRUE(prompter_.shown.empty());
}

// ---------------------------------------------------------------------------------------
// The account picker.

class PickerTest : public OutputCommandTest {
 protected:
  int Ticked(frmSelectCard& d) {
    int n = 0;
    for (const auto& r : d.model()->Rows()) n += r.include ? 1 : 0;
    return n;
  }
};

TEST_F(PickerTest, FirstOpenScansWithoutAskingSecondAsks) {
  int rows = 0;
  WhenShown<frmSelectCard>([&](frmSelectCard& d) {
    rows = d.model()->rowCount();
    EXPECT_EQ(d.VSSelectItems()->model()->headerData(0, Qt::Horizontal), Q("מפתח חשבון"));
    EXPECT_EQ(d.VSSelectItems()->model()->headerData(1, Qt::Horizontal), Q("שם חשבון"));
    EXPECT_EQ(d.VSSelectItems()->model()->headerData(2, Qt::Horizontal), Q("להדפיס?"));
    EXPECT_EQ(Ticked(d), rows);  // a fresh scan ticks every account
    d.cmdNoneItems_Click();
    EXPECT_EQ(Ticked(d), 0);
    d.cmdShowMarked_Click();
    EXPECT_EQ(d.model()->rowCount(), 0);
    d.txtToItemkey->setText(QString());
    d.cmdShowAll_Click();
    // Find by key: the row becomes current and is ticked.
    const std::string key = d.model()->Rows()[3].key;
    d.txtToItemkey->setText(ToQ(key));
    d.cmdFindKey_Click();
    EXPECT_EQ(d.VSSelectItems()->currentIndex().row(), 3);
    EXPECT_TRUE(d.model()->Rows()[3].include);
    d.cmdShowMarked_Click();
    EXPECT_EQ(d.model()->rowCount(), 1);
    // The grid's captions are no account: a key search never lands on them.
    d.cmdShowAll_Click();
    d.cmdNoneItems_Click();
    d.VSSelectItems()->setCurrentIndex(d.model()->index(0, 0));
    d.txtToItemkey->setText(Q("מפתח"));
    d.cmdFindKey_Click();
    EXPECT_EQ(Ticked(d), 0);
    EXPECT_EQ(d.VSSelectItems()->currentIndex().row(), 0);
    d.txtToItemkey->setText(ToQ(key));
    d.cmdFindKey_Click();
    d.cmdClose_Click();
  });
  card_->cmdSelectAccount_Click();
  EXPECT_TRUE(prompter_.asked.empty());
  EXPECT_GT(rows, 10);
  EXPECT_TRUE(Saw("קורא רשימת כרטיסים"));
  EXPECT_FALSE(card_->control().state().selectDbPath.empty());

  // No keeps the ticks.
  prompter_.answers = {false};
  int tickedAfterNo = -1;
  WhenShown<frmSelectCard>([&](frmSelectCard& d) { tickedAfterNo = Ticked(d); });
  card_->cmdSelectAccount_Click();
  ASSERT_EQ(prompter_.asked.size(), 1u);
  EXPECT_EQ(prompter_.asked[0].text, "לסרוק מחדש את רשימת הכרטיסים?");
  EXPECT_EQ(prompter_.asked[0].title, "שימו לב");
  EXPECT_EQ(prompter_.asked[0].icon, MsgIcon::Question);
  EXPECT_EQ(tickedAfterNo, 1);

  // Yes rescans and ticks everything again.
  prompter_.answers = {true};
  int tickedAfterYes = -1;
  WhenShown<frmSelectCard>([&](frmSelectCard& d) { tickedAfterYes = Ticked(d); });
  card_->cmdSelectAccount_Click();
  EXPECT_EQ(prompter_.asked.size(), 2u);
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
  card_->cmdSelectAccount_Click();
  QCoreApplication::processEvents();
  EXPECT_FALSE(shown);
  ASSERT_FALSE(prompter_.shown.empty());
  EXPECT_EQ(prompter_.shown[0].title, "תקלה");
  EXPECT_TRUE(card_->control().state().selectDbPath.empty());
  EXPECT_TRUE(Find<QPushButton>(*card_, "cmdSelectAccount")->isEnabled());
}

TEST_F(PickerTest, OrderFollowsTheSortChoiceAndFindByDescriptionNarrows) {
  Find<QComboBox>(*card_, "CmbSortBy")->setCurrentIndex(1);
  WhenShown<frmSelectCard>([&](frmSelectCard& d) {
    EXPECT_NE(d.model()->RecordSource().find("Order By SortByName"), std::string::npos);
    const auto all = d.model()->Rows();
    ASSERT_GT(all.size(), 2u);
    d.cmdNoneItems_Click();
    // A part of the second account's name.
    const QString name = ToQ(all[1].name);
    d.txtToItemName->setText(name.left(std::min<qsizetype>(4, name.size())));
    d.cmdFindByDesc_Click();
    EXPECT_GE(d.model()->rowCount(), 1);
    EXPECT_LT(d.model()->rowCount(), static_cast<int>(all.size()));
    for (const auto& r : d.model()->Rows())
      EXPECT_TRUE(ToQ(r.name).contains(d.txtToItemName->text(), Qt::CaseInsensitive));
    EXPECT_GE(d.VSSelectItems()->currentIndex().row(), 0);
    // A quote cannot break the statement.
    d.txtToItemName->setText(Q("ג'ון"));
    d.cmdFindByDesc_Click();
    EXPECT_EQ(d.model()->rowCount(), 0);
    d.CmdAllItems_Click();
    d.cmdShowMarked_Click();
    EXPECT_EQ(d.model()->rowCount(), static_cast<int>(all.size()));
  });
  card_->cmdSelectAccount_Click();
  EXPECT_EQ(card_->control().state().pickerSortIndex, 1);
}

TEST_F(PickerTest, TickInTheGridIsWrittenAtOnceForAKeyWithAQuote) {
  WhenShown<frmSelectCard>([&](frmSelectCard& d) {
    PickerModel& m = *d.model();
    ASSERT_TRUE(m.Execute("Update tSelectAccount Set SortByKey = 'O''K' Where SortByKey = " +
                          QuoteJetText(m.Rows()[0].key)));
    d.cmdShowAll_Click();
    int row = -1;
    for (int r = 0; r < m.rowCount(); ++r)
      if (m.Rows()[r].key == "O'K") row = r;
    ASSERT_GE(row, 0);
    EXPECT_TRUE(m.setData(m.index(row, 2), Qt::Unchecked, Qt::CheckStateRole));
    d.cmdShowAll_Click();
    for (const auto& r : m.Rows()) {
      if (r.key == "O'K") {
        EXPECT_FALSE(r.include);
      }
    }
    d.cmdShowMarked_Click();
    EXPECT_EQ(m.rowCount(), static_cast<int>(d.model()->rowCount()));
    for (const auto& r : m.Rows()) EXPECT_NE(r.key, "O'K");
  });
  card_->cmdSelectAccount_Click();
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
  frmOpenDir& d = *card_->openDir();
  d.Load();
  d.MainDir_Change(ToQ(root_));
  ASSERT_EQ(d.cmbCompany()->count(), 2);
  EXPECT_EQ(d.Companies().entries.size(), 3u);
  EXPECT_TRUE(d.cmbCompany()->isEnabled());

  // No choice: the dialog stays.
  EXPECT_FALSE(d.OKButton_Click());
  ASSERT_EQ(prompter_.shown.size(), 1u);
  EXPECT_EQ(prompter_.shown[0].text, "לא בחרת חברה");
  EXPECT_EQ(prompter_.shown[0].title, "שגיאה");

  // The second listed name selects its own folder, past the blank one.
  d.cmbCompany()->setCurrentRow(1);
  const std::string expected =
      d.Companies().entries[d.cmbCompany()->item(1)->data(Qt::UserRole).toULongLong()].Path;
  EXPECT_TRUE(d.OKButton_Click());
  EXPECT_EQ(card_->control().state().companyPath, expected);
  EXPECT_NE(expected.back(), '/');
  EXPECT_EQ(d.PubMainDir, root_);
  EXPECT_FALSE(d.PubMainDrive.empty());
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
  ASSERT_EQ(prompter_.shown.size(), 1u);
  EXPECT_EQ(prompter_.shown[0].title, "תקלה");
  EXPECT_EQ(prompter_.shown[0].icon, MsgIcon::Critical);
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

TEST_F(ChooserTest, CancelLeavesTheCompanyPath) {
  const std::string before = card_->control().state().companyPath;
  WhenShown<frmOpenDir>([&](frmOpenDir& d) {
    d.MainDir_Change(ToQ(root_));
    d.cmbCompany()->setCurrentRow(0);
    d.CancelButton_Click();
  });
  card_->openDir()->ShowModal();
  EXPECT_EQ(card_->control().state().companyPath, before);
  EXPECT_TRUE(card_->openDir()->IsLoaded());  // hidden, not closed
}

TEST_F(ChooserTest, ConnectionCheckFindsLowerCaseAccountFile) {
  fs::create_directories(companies_.path() / "lower");
  std::ofstream(companies_.path() / "lower" / "act.fix") << "x";
  frmLogon logon(card_->control(), *card_->openDir(), card_.get());
  logon.Load();
  EXPECT_EQ(logon.txtConnDatabase()->text(), ToQ(card_->control().state().companyPath));
  EXPECT_EQ(logon.LblMsg()->text(), Q("מומלץ לבצע בדיקה לאחר שינוי ערכי ההתחברות!"));

  logon.txtConnDatabase()->setText(ToQ((companies_.path() / "lower").string()));
  logon.CmdCheck_Click();
  ASSERT_EQ(prompter_.shown.size(), 1u);
  EXPECT_EQ(prompter_.shown[0].text, "הבדיקה הסתיימה בהצלחה");
  EXPECT_EQ(prompter_.shown[0].title, "הודעה");
  EXPECT_EQ(prompter_.shown[0].icon, MsgIcon::Information);
  EXPECT_EQ(logon.LblMsg()->text(), Q("הבדיקה הסתיימה בהצלחה"));

  logon.txtConnDatabase()->setText(ToQ((companies_.path() / "nothing").string()));
  logon.CmdCheck_Click();
  EXPECT_EQ(prompter_.shown.size(), 1u);
  EXPECT_EQ(logon.LblMsg()->text(), Q("הבדיקה לא הסתיימה בהצלחה"));
  EXPECT_TRUE(store_.Values().empty());  // a check stores nothing
}

TEST_F(ChooserTest, ConfirmStoresTheFolderAsTyped) {
  frmLogon logon(card_->control(), *card_->openDir(), card_.get());
  logon.Load();
  logon.txtConnDatabase()->setText(Q("/no/such/folder"));
  logon.cmdOK_Click();
  EXPECT_EQ(card_->control().state().companyPath, "/no/such/folder");
  EXPECT_EQ(Stored(kParamsSection, kConnDataBaseKey), "/no/such/folder");
}

TEST_F(ChooserTest, BrowseThenCancelUsesTheChosenCompanyButStoresNothing) {
  WhenShown<frmLogon>([&](frmLogon& logon) {
    WhenShown<frmOpenDir>([&](frmOpenDir& d) {
      d.MainDir_Change(ToQ(root_));
      d.cmbCompany()->setCurrentRow(1);
      d.OKButton_Click();
    });
    logon.cmdOpen_Click();
    EXPECT_EQ(FromQ(logon.txtConnDatabase()->text()), card_->control().state().companyPath);
    logon.cmdCancel_Click();
  });
  card_->CmdConnect_Click();
  EXPECT_EQ(fs::path(card_->control().state().companyPath).parent_path(), fs::path(root_));
  EXPECT_FALSE(store_.Has(kSettingsApp, kParamsSection, kConnDataBaseKey));
}

// ---------------------------------------------------------------------------------------
// The label and dispatch settings dialogs.

TEST_F(GuiTest, LabelDialogLoadsConfirmsAndCancels) {
  store_.Save(kSettingsApp, "LabelDef1", "FontSize", "14");
  store_.Save(kSettingsApp, kLabPicsSection, "Pic0", "/pics/top.png");
  auto card = MakeCard();
  frmLabDef& d = *card->labDefDialog();
  d.Load();
  EXPECT_EQ(d.txtFontSize[1]->text(), "14");
  EXPECT_EQ(d.txtFontSize[0]->text(), "9");
  EXPECT_EQ(d.CmbFont[0]->currentText(), "Arial");
  EXPECT_EQ(d.CmbWeight[0]->currentText(), Q("רגיל"));
  EXPECT_EQ(d.TxtHeaderLogo->text(), "/pics/top.png");

  d.CmbWeight[2]->setCurrentIndex(2);  // "עבה"
  d.CmbWeight[3]->setCurrentIndex(1);  // "מודגש"
  d.ChkUL[4]->setValue(1);
  d.cmdOK_Click();
  EXPECT_EQ(Stored("LabelDef2", "FontWeight"), "2");
  EXPECT_EQ(Stored("LabelDef3", "FontWeight"), "1");
  EXPECT_EQ(Stored("LabelDef4", "FontUL"), "1");
  EXPECT_EQ(card->control().labelSettings().LabelDefs[2].FontWeight, 2);

  d.Load();
  d.txtFontSize[0]->setText("20");
  d.cmdCancel_Click();
  EXPECT_EQ(Stored("LabelDef0", "FontSize"), "9");
  EXPECT_EQ(card->control().labelSettings().LabelDefs[0].FontSize, 9);
}

TEST_F(GuiTest, SizeOf300ClosedTheDialogAndDroppedLaterRows) {
  auto card = MakeCard();
  const LabelSettings before = card->control().labelSettings();
  WhenShown<frmLabDef>([&](frmLabDef& d) {
    d.txtFontSize[2]->setText("11");
    d.txtFontSize[3]->setText("300");
    d.CmbWeight[3]->setCurrentIndex(2);
    d.txtFontSize[5]->setText("16");
    d.TxtHeaderLogo->setText("/new/top.png");
    auto* ok = Find<QPushButton>(d, "cmdOK");
    for (const char* bad : {"300", "0", ""}) {
      d.txtFontSize[3]->setText(bad);
      QTest::mouseClick(ok, Qt::LeftButton);
      EXPECT_TRUE(d.isVisible()) << bad;
      ASSERT_FALSE(prompter_.shown.empty());
      EXPECT_EQ(prompter_.shown.back().title, "שגיאה");
      EXPECT_NE(prompter_.shown.back().text.find("לידי: איש קשר"), std::string::npos);
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
    QTest::mouseClick(ok, Qt::LeftButton);
    EXPECT_FALSE(d.isVisible());
  });
  Find<QPushButton>(*card, "CmdLabDef")->click();
  const auto& defs = card->control().labelSettings().LabelDefs;
  EXPECT_EQ(defs[3].FontSize, 25);
  EXPECT_EQ(defs[3].FontWeight, 2);
  EXPECT_EQ(defs[5].FontSize, 16);
  EXPECT_EQ(card->control().labelSettings().LabPics[0], "/new/top.png");
  EXPECT_EQ(Stored("LabelDef5", "FontSize"), "16");
  EXPECT_EQ(Stored(kLabPicsSection, "Pic0"), "/new/top.png");
}

TEST_F(GuiTest, LabelPictureChooserOffersTheImageFiltersAndCancelKeepsThePath) {
  auto card = MakeCard();
  frmLabDef& d = *card->labDefDialog();
  d.Load();
  d.txtFooterLogo->setText("/old/bottom.gif");
  chooser_.answer = QString();
  d.CmdDir_Click(1);
  EXPECT_EQ(d.txtFooterLogo->text(), "/old/bottom.gif");
  EXPECT_EQ(chooser_.offered, QStringList({"GIF Files (*.gif)", "JPEG Files (*.jpg)",
                                           "PNG Files (*.png)", "All Files (*.*)"}));
  EXPECT_EQ(chooser_.preselected, 1);
  chooser_.answer = "/pics/logo.jpg";
  d.CmdDir_Click(0);
  EXPECT_EQ(d.TxtHeaderLogo->text(), "/pics/logo.jpg");
}

TEST_F(GuiTest, DispatchDialogLoadsConfirmsAndCancels) {
  store_.Save(kSettingsApp, kPostILSection, "Weight", "0.5");
  store_.Save(kSettingsApp, kPostILSection, "FileFormat", "1");
  auto card = MakeCard();
  frmPostIL& d = *card->postILDialog();
  d.Load();
  EXPECT_EQ(d.txtWeight->text(), "0.5");
  EXPECT_EQ(d.CmbFileFormat->currentIndex(), 1);
  EXPECT_EQ(d.CmbFileFormat->itemText(0), Q("דואר ישראל"));
  EXPECT_EQ(d.ChkOpenExcel->value(), 0);
  EXPECT_EQ(d.txtFilePath->text(), "");

  d.txtService->setText(Q("רגיל"));
  d.ChkOpenExcel->setValue(1);
  d.cmdOK_Click();
  EXPECT_EQ(Stored(kPostILSection, "Service"), "רגיל");
  EXPECT_EQ(Stored(kPostILSection, "OpenExcel"), "1");
  EXPECT_EQ(Stored(kPostILSection, "Weight"), "0.5");
  EXPECT_EQ(card->control().postILSettings().OpenExcel, 1);

  d.Load();
  d.txtService->setText(Q("אחר"));
  d.cmdCancel_Click();
  EXPECT_EQ(Stored(kPostILSection, "Service"), "רגיל");
}

TEST_F(GuiTest, DispatchListWithoutSelectionStoresMinusOne) {
  auto card = MakeCard();
  frmPostIL& d = *card->postILDialog();
  d.Load();
  d.CmbFileFormat->setCurrentIndex(-1);
  d.cmdOK_Click();
  EXPECT_EQ(Stored(kPostILSection, "FileFormat"), "-1");
  EXPECT_EQ(card->control().postILSettings().FileFormat, -1);
  d.Load();
  EXPECT_EQ(d.CmbFileFormat->currentIndex(), -1);
}

TEST_F(GuiTest, DispatchFileChooserOffersXlsxFirstAndCancelKeepsThePath) {
  auto card = MakeCard();
  frmPostIL& d = *card->postILDialog();
  d.Load();
  d.txtFilePath->setText("/out/post.xls");
  chooser_.answer = QString();
  d.CmdDir_Click();
  EXPECT_EQ(d.txtFilePath->text(), "/out/post.xls");
  ASSERT_GE(chooser_.offered.size(), 2);
  EXPECT_EQ(chooser_.offered[0], "Excel Files (*.xlsx)");
  EXPECT_TRUE(chooser_.offered.join('|').contains("*.xls)"));
  EXPECT_EQ(chooser_.preselected, 0);
  chooser_.answer = "/out/new.xlsx";
  d.CmdDir_Click();
  EXPECT_EQ(d.txtFilePath->text(), "/out/new.xlsx");
}

TEST_F(GuiTest, DialogsCarryTheirCaptions) {
  auto card = MakeCard();
  EXPECT_EQ(card->labDefDialog()->windowTitle(), Q("הגדרות צורה וגודל"));
  EXPECT_EQ(card->postILDialog()->windowTitle(), Q("הגדרות לקובץ לדואר שליחים"));
  EXPECT_EQ(card->openDir()->windowTitle(), Q("בחירת מחיצה ראשית"));
  EXPECT_EQ(card->selectCard()->windowTitle(), Q("בחירת כרטיסים להדפסה"));
  frmLogon logon(card->control(), *card->openDir(), card.get());
  EXPECT_EQ(logon.windowTitle(), Q("הגדרות התחברות לTavlor קלאסית"));
  EXPECT_EQ(Find<QPushButton>(*card->selectCard(), "cmdShowMarked")->text(), Q("הצג רק מסומנים"));
  EXPECT_EQ(Find<QPushButton>(*card->labDefDialog(), "CmdDir0")->text(), Q("בחירת תמונה"));
}

}  // namespace
