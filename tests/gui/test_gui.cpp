// The panel, its dialogs and the picker statements, driven offscreen through their widgets
// (clicks, keys) with scripted message boxes, file choosers and desktop.
#include <gtest/gtest.h>

#include <QtTest>
#include <QtWidgets>
#include <deque>
#include <filesystem>
#include <fstream>

#include "control/settings.h"
#include "gui/labeldefdialog.h"
#include "gui/labelstockbox.h"
#include "gui/logondialog.h"
#include "gui/maincard.h"
#include "gui/opendirdialog.h"
#include "gui/pickermodel.h"
#include "gui/postdialog.h"
#include "gui/selectcarddialog.h"
#include "gui/widgets.h"
#include "output/preflight.h"
#include "support/scratchtemp.h"
#include "zdrgen/generator.h"

namespace fs = std::filesystem;
using namespace zdr;
using namespace zdr::gui;

namespace {

using Shown = std::pair<std::string, std::string>;  // a message's text and title

// The person at the desk: answers questions and file choosers as scripted, records what
// was shown and handed over.
class FakeDesk : public Prompter, public DesktopOpener, public FileChooser {
 public:
  void ShowMessage(std::string_view text, std::string_view title, MsgIcon) override {
    shown.emplace_back(text, title);
  }
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon) override {
    asked.emplace_back(text, title);
    if (answers.empty()) ADD_FAILURE() << "unexpected question: " << text;
    const bool yes = !answers.empty() && answers.front();
    if (!answers.empty()) answers.pop_front();
    return yes;
  }
  bool OpenPage(const std::string& path) override { return pages.push_back(path), true; }
  bool OpenWorkbook(const std::string& path) override { return workbooks.push_back(path), true; }
  QString ChooseOpenFile(QWidget*, const QString&, const QStringList&, int,
                         const QString&) override {
    return answer;
  }
  std::vector<Shown> shown, asked;
  std::deque<bool> answers;
  std::vector<std::string> pages, workbooks;
  QString answer;  // of the file chooser
};

class GuiTest : public ::testing::Test {
 protected:
  // The application as the window sets it up: right to left, Hebrew font and translations.
  static void SetUpTestSuite() {
    static int argc = 1;
    static char name[] = "test_gui", *argv[] = {name, nullptr};
    if (QApplication::instance()) return;
    auto* app = new QApplication(argc, argv);
    app->setLayoutDirection(Qt::RightToLeft);
    app->setFont(HebrewUiFont());
    InstallHebrewTranslations(*app);
  }
  void SetUp() override { card_ = MakeCard(); }

  static QString Q(const char* utf8) { return QString::fromUtf8(utf8); }
  template <typename T = QWidget>
  static T* Find(QWidget& w, const char* name) {
    T* found = w.findChild<T*>(QString::fromLatin1(name));
    EXPECT_NE(found, nullptr) << name;
    return found;
  }
  static QLineEdit* Box(QWidget& w, const char* name) { return Find<QLineEdit>(w, name); }
  // A click on a button, as the mouse gives it.
  static void Press(QWidget& w, const char* name) {
    QTest::mouseClick(Find<QPushButton>(w, name), Qt::LeftButton);
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
  // The panel's inputs and commands that Tab stops at.
  std::vector<QWidget*> Focusable() {
    std::vector<QWidget*> out;
    for (QWidget* w : card_->findChildren<QWidget*>())
      if ((w->focusPolicy() & Qt::TabFocus) && w->isVisibleTo(card_.get())) out.push_back(w);
    return out;
  }

  test::ScratchTemp temp_;  // also the Temp folder of the databases and outputs
  MemorySettingsStore store_;
  FakeDesk desk_;
  std::unique_ptr<MainCard> card_;
};

// ---------------------------------------------------------------------------------------
// The panel: its values, its keyboard order, its languages.

TEST_F(GuiTest, PanelCheckBoxClicksTurnOnAndOffAndGreyedTurnsOn) {
  PanelCheckBox box;
  std::vector<int> seen;
  for (int set : {-1, -1, 2, 3}) {
    EXPECT_EQ(set < 0 || box.setValue(set), set <= 2) << set;  // 3 is refused
    box.click();
    seen.push_back(box.value());
  }
  EXPECT_EQ(seen, (std::vector<int>{1, 0, 1, 0}));
}

// The panel's keys and their order are the settings tests'; here the boxes reach them.
TEST_F(GuiTest, CmdDefSavesThePanelAndAValueLongerThanItsBoxIsNotCut) {
  store_.Save(kSettingsApp, kParamsSection, "FromSort", "12345");
  card_ = MakeCard();
  Find<PanelCheckBox>(*card_, "ChkTitle3")->setValue(2);
  Box(*card_, "CutOff2")->setText(Q("א"));
  EXPECT_EQ(store_.Values().size(), 1u);  // nothing saved before CmdDef
  Press(*card_, "CmdDef");
  card_ = MakeCard();
  EXPECT_EQ(Find<PanelCheckBox>(*card_, "ChkTitle3")->value(), 2);
  EXPECT_EQ(Box(*card_, "CutOff2")->text(), Q("א"));
  EXPECT_EQ(Box(*card_, "txtFromSort")->text(), "12345");
}

TEST_F(GuiTest, CopyLabelsCopyFromIntoTo) {
  for (auto [label, from, to, text] :
       {std::tuple{"lblToRef", "txtFromRef", "txtToRef", "12345678901234567890"},
        {"Label48", "txtFromItmKey", "txtToItmKey", "K1"}}) {
    Box(*card_, from)->setText(text);
    Box(*card_, to)->setText("old");
    QTest::mouseClick(Find<ClickLabel>(*card_, label)->label(), Qt::LeftButton);
    EXPECT_EQ(Box(*card_, to)->text(), text) << label;
  }
}

TEST_F(GuiTest, TabRanBackwardsInEveryRangeRow) {
  const auto groupOf = [](QWidget* w) -> QGroupBox* {
    for (QWidget* p = w->parentWidget(); p; p = p->parentWidget())
      if (auto* g = qobject_cast<QGroupBox*>(p)) return g;
    return nullptr;
  };
  QWidget* first = Find(*card_, "ChkAccKey");
  first->setFocus();
  std::vector<QWidget*> visited{first};
  for (int i = 0; i < 200; ++i) {
    QTest::keyClick(card_->focusWidget(), Qt::Key_Tab);
    if (card_->focusWidget() == first) break;
    visited.push_back(card_->focusWidget());
  }
  // Once round the whole panel, every stop once, the commands last.
  std::vector<QWidget*> all = Focusable(), once = visited;
  std::ranges::sort(all);
  std::ranges::sort(once);
  EXPECT_EQ(once, all);
  EXPECT_EQ(visited.back()->objectName(), "CmdConnect");
  // Reading order within a group: the next stop is on the same line further left, or lower.
  for (size_t i = 1; i < visited.size(); ++i) {
    QWidget *a = visited[i - 1], *b = visited[i];
    if (groupOf(a) != groupOf(b) && groupOf(b) != nullptr) continue;
    const QRect ra(a->mapTo(card_.get(), QPoint()), a->size());
    const QRect rb(b->mapTo(card_.get(), QPoint()), b->size());
    const bool sameLine = rb.center().y() >= ra.top() && rb.center().y() <= ra.bottom();
    EXPECT_TRUE(sameLine ? rb.center().x() < ra.center().x() : rb.top() > ra.center().y())
        << FromQ(a->objectName()) << " -> " << FromQ(b->objectName());
  }
  EXPECT_EQ(visited[1]->objectName(), "TxtFromCrd");
}

TEST_F(GuiTest, StandardDialogsAndMenusWereInEnglish) {
  // Qt's own texts come from one Hebrew catalog, the menus' as the file chooser's: the
  // chooser is Qt's own dialog, in Hebrew, with its paths left to right.
  QStringList texts;
  WhenShown<QFileDialog>([&](QFileDialog& d) {
    texts = {Find<QDialogButtonBox>(d, "buttonBox")->button(QDialogButtonBox::Cancel)->text()};
    EXPECT_EQ(Find(d, "lookInCombo")->layoutDirection(), Qt::LeftToRight);
  });
  QtFileChooser().ChooseOpenFile(nullptr, "", {"PNG Files (*.png)"}, 0, "");
  EXPECT_EQ(texts, QStringList{Q("ביטול")});
  // The dialogs' own path boxes read left to right, also a path of Hebrew folders.
  QLineEdit* box = card_->postILDialog()->txtFilePath;
  box->window()->show();
  box->setText(Q("/משרד/חברה"));
  const auto cursorX = [box](int at) {
    box->setCursorPosition(at);
    return box->inputMethodQuery(Qt::ImCursorRectangle).toRect().center().x();
  };
  EXPECT_LT(cursorX(0), cursorX(box->text().size()));
  box->window()->hide();
  EXPECT_EQ(card_->openDir()->PathDrive()->layoutDirection(), Qt::LeftToRight);
}

TEST_F(GuiTest, LatinFellBackToALargerFontNextToHebrew) {
  const QFontMetrics metrics(HebrewUiFont());
  for (const QChar c : Q("מסעדת IBM 35 Osem (1995) בע\"מ c:\\acc/@&~"))
    EXPECT_TRUE(metrics.inFont(c)) << int(c.unicode());
  EXPECT_EQ(card_->selectCard()->font(), HebrewUiFont());
}

// ---------------------------------------------------------------------------------------
// The commands on a generated company.

class CompanyTest : public GuiTest {
 protected:
  void SetUp() override {
    GuiTest::SetUp();
    const fs::path company = temp_.dir() / "comp";
    zdrgen::WriteCompany(company, {.accounts = 40, .documents = 20, .ledger = 20, .receipts = 10},
                         "חברת בדיקה");
    card_->control().state().companyPath = company.string();
  }
  static int Ticked(frmSelectCard& d) {
    return static_cast<int>(std::ranges::count_if(d.model()->Rows(), &PickerRow::include));
  }
};

TEST_F(CompanyTest, EditsDuringACommandWereThrownAwayAndASecondCommandRefused) {
  auto* from = Box(*card_, "TxtFromCrd");
  from->setFocus();
  QTest::keyClicks(from, "100");
  bool tried = false;
  card_->seam().SetStatusObserver([&](const QString&) {
    if (std::exchange(tried, true)) return;
    for (QWidget* w : Focusable()) EXPECT_FALSE(w->isEnabled()) << FromQ(w->objectName());
    EXPECT_TRUE(card_->CmdPreview_Click().empty());
    QTest::keyClicks(from, "9");
    QTest::mouseClick(Find<ClickLabel>(*card_, "lblToDate")->label(), Qt::LeftButton);
    // Refused at once, in sight of the clerk, not taken and then overwritten.
    EXPECT_EQ(from->text(), "100");
  });
  Press(*card_, "CmdLabPrev");
  EXPECT_TRUE(tried);
  EXPECT_EQ(Box(*card_, "TxtToDate")->text(), "01/01/2025");
  for (QWidget* w : Focusable()) EXPECT_TRUE(w->isEnabled()) << FromQ(w->objectName());
  EXPECT_EQ(card_->focusWidget(), Find(*card_, "CmdLabPrev"));  // the focus is back
}

TEST_F(CompanyTest, DispatchFindingsAreToldOrOffered) {
  PostILSettings& post = card_->control().postILSettings();
  post.FilePath = (temp_.dir() / "post.xlsx").string();
  // The generated company holds faults on purpose. The open workbook shows them; else the
  // clerk is asked whether to open it.
  for (auto [open, yes, opened] : {std::tuple{1, false, 1u}, {0, false, 1u}, {0, true, 2u}}) {
    post.OpenExcel = open;
    desk_.shown.clear();
    desk_.asked.clear();
    desk_.answers.assign(open ? 0 : 1, yes);
    Press(*card_, "cmdBuildPostIL");
    EXPECT_EQ(desk_.workbooks.size(), opened);
    const auto& told = open ? desk_.shown : desk_.asked;
    ASSERT_EQ(desk_.shown.size() + desk_.asked.size(), 1u);
    ASSERT_EQ(told.size(), 1u);
    const std::string counts = PreflightCounts(card_->control().lastPreflight());
    EXPECT_EQ(told[0].first.rfind("בבדיקת הקובץ לדואר נמצאו " + counts + ".\n", 0), 0u);
  }
}

TEST_F(CompanyTest, PickerFindsTicksAndWritesTicksAtOnceAndRescansWhenAsked) {
  Find<QComboBox>(*card_, "CmbSortBy")->setCurrentIndex(1);
  int rows = 0;
  WhenShown<frmSelectCard>([&](frmSelectCard& d) {
    PickerModel& m = *d.model();
    EXPECT_NE(m.RecordSource().find("Order By SortByName"), std::string::npos);
    const auto all = m.Rows();
    rows = m.rowCount();
    EXPECT_EQ(Ticked(d), rows);  // a fresh scan ticks every account
    Press(d, "cmdNoneItems");
    Press(d, "cmdShowMarked");
    EXPECT_EQ(m.rowCount(), 0);
    // Enter in the name box: the accounts holding a part of the second one's name.
    d.txtToItemName->setText(ToQ(all[1].name).left(4));
    QTest::keyClick(d.txtToItemName, Qt::Key_Enter);
    EXPECT_LT(m.rowCount(), static_cast<int>(all.size()));
    for (const auto& r : m.Rows())
      EXPECT_TRUE(ToQ(r.name).contains(d.txtToItemName->text(), Qt::CaseInsensitive));
    // A quote cannot break the statement; patterns are taken literally.
    EXPECT_EQ(BuildNameFilter("ג'a*b?#[c"), " And SortByName Like '*ג''a[*]b[?][#][[]c*'");
    // Enter in the key box finds the account and ticks it; the captions are no account.
    Press(d, "cmdShowAll");
    for (QString key : {Q("מפתח"), ToQ(all[3].key)}) {
      d.txtToItemkey->setText(key);
      QTest::keyClick(d.txtToItemkey, Qt::Key_Return);
    }
    EXPECT_EQ(d.VSSelectItems()->currentIndex().row(), 3);
    EXPECT_EQ(Ticked(d), 1);
    // A tick taken off in the grid, of a key with a quote, is in the database at once.
    Press(d, "CmdAllItems");
    ASSERT_TRUE(m.Execute("Update tSelectAccount Set SortByKey = 'O''K' Where SortByKey = " +
                          QuoteJetText(all[0].key)));
    Press(d, "cmdShowAll");
    EXPECT_TRUE(m.setData(m.index(0, 2), 0, Qt::CheckStateRole)) << m.Rows()[0].key;
    Press(d, "cmdShowMarked");
    EXPECT_EQ(m.rowCount(), rows - 1);
  });
  Press(*card_, "cmdSelectAccount");
  EXPECT_GT(rows, 10);
  EXPECT_EQ(card_->control().state().pickerSortIndex, 1);
  // No keeps the ticks, Yes scans again and ticks everything.
  for (auto [yes, ticked] : {std::pair{false, rows - 1}, {true, rows}}) {
    desk_.answers = {yes};
    int seen = -1;
    WhenShown<frmSelectCard>([&](frmSelectCard& d) { seen = Ticked(d); });
    Press(*card_, "cmdSelectAccount");
    EXPECT_EQ(seen, ticked);
  }
  EXPECT_EQ(desk_.asked.at(0), Shown("לסרוק מחדש את רשימת הכרטיסים?", "שימו לב"));
}

TEST_F(CompanyTest, PickerIsNotShownWhenItsDatabaseCannotBeCreated) {
  const fs::path notAFolder = temp_.dir() / "file";
  std::ofstream(notAFolder) << "x";
  test::ScopedEnv temp("Temp", notAFolder.c_str());
  QWidget* shown = nullptr;
  QTimer::singleShot(0, [&] {
    if ((shown = QApplication::activeModalWidget())) shown->close();
  });
  Press(*card_, "cmdSelectAccount");
  QCoreApplication::processEvents();
  EXPECT_EQ(shown, nullptr);
  EXPECT_EQ(desk_.shown.at(0).second, "תקלה");
  EXPECT_TRUE(Find(*card_, "cmdSelectAccount")->isEnabled());
}

// ---------------------------------------------------------------------------------------
// The company chooser and the connection dialog.

class ChooserTest : public GuiTest {
 protected:
  // Folders made in no order, a blank name, a descriptor named in small letters.
  void SetUp() override {
    GuiTest::SetUp();
    // clang-format off
    for (auto [folder, name, file] : {std::tuple{"d", "Third Co", "ADF.FIX"}, {"a", "ראשונה", "ADF.FIX"},
                                      {"c", "", "ADF.FIX"}, {"B", "Beta", "adf.fix"}})
      zdrgen::WriteRecords(fs::path(root_) / folder / file,
                           {zdrgen::CompanyRecord(zdrgen::HostVisual(name))});
    // clang-format on
    fs::create_directories(fs::path(root_) / "e");  // no company
  }
  const std::string root_ = (temp_.dir() / "acc").string();
};

TEST_F(ChooserTest, CompaniesCameInRawDirectoryOrderAndAFailedScanListsOnlyItsOwn) {
  frmOpenDir& d = *card_->openDir();
  d.Load();
  d.MainDir_Change(ToQ(root_));
  QStringList names;
  for (int i = 0; i < d.cmbCompany()->count(); ++i) names << d.cmbCompany()->item(i)->text();
  EXPECT_EQ(names, QStringList({Q("ראשונה"), "Beta", "Third Co"}));
  d.cmbCompany()->clearSelection();
  EXPECT_FALSE(d.OKButton_Click());
  EXPECT_EQ(desk_.shown, std::vector{Shown("לא בחרת חברה", "שגיאה")});
  d.cmbCompany()->setCurrentRow(2);  // its own folder, past the blank name
  ASSERT_TRUE(d.OKButton_Click());
  EXPECT_EQ(card_->control().state().companyPath, root_ + "/d");
  // A short descriptor gives what it holds; reading /proc/self/mem fails, also for root.
  const fs::path other = temp_.dir() / "other";
  for (const char* folder : {"a", "b"}) fs::create_directories(other / folder);
  std::ofstream(other / "a" / "ADF.FIX") << "Tiny";
  fs::create_symlink("/proc/self/mem", other / "b" / "ADF.FIX");
  d.MainDir_Change(ToQ(other.string()));
  EXPECT_EQ(desk_.shown.at(1).second, "תקלה");
  // Only what came before the broken folder: no earlier name selects a folder of this scan.
  ASSERT_EQ(d.cmbCompany()->count(), 1);
  EXPECT_EQ(d.cmbCompany()->item(0)->text(), "Tiny");
  d.Load();  // back at the place confirmed last
  EXPECT_EQ(d.CurrentFolder(), ToQ(root_));
  EXPECT_EQ(d.cmbCompany()->count(), 3);
}

TEST_F(ChooserTest, ConnectionCheckBrowseAndConfirm) {
  fs::create_directories(temp_.dir() / "lower");
  std::ofstream(temp_.dir() / "lower" / "act.fix") << "x";
  WhenShown<frmLogon>([&](frmLogon& logon) {
    EXPECT_EQ(logon.txtConnDatabase()->text(), ToQ(card_->control().state().companyPath));
    for (auto [folder, result] :
         {std::pair{(temp_.dir() / "lower").string(), "הבדיקה הסתיימה בהצלחה"},
          {"/no/such/folder", "הבדיקה לא הסתיימה בהצלחה"}}) {
      logon.txtConnDatabase()->setText(ToQ(folder));
      Press(logon, "CmdCheck");
      EXPECT_EQ(logon.LblMsg()->text(), Q(result));
    }
    EXPECT_EQ(desk_.shown.size(), 1u);
    EXPECT_TRUE(store_.Values().empty());  // a check stores nothing
    WhenShown<frmOpenDir>([&](frmOpenDir& d) {
      d.MainDir_Change(ToQ(root_));
      d.cmbCompany()->setCurrentRow(2);
      Press(d, "OKButton");
    });
    Press(logon, "cmdOpen");
    EXPECT_EQ(FromQ(logon.txtConnDatabase()->text()), root_ + "/d");
    Press(logon, "cmdOK");  // needs no check
  });
  Press(*card_, "CmdConnect");
  EXPECT_EQ(Stored(kParamsSection, kConnDataBaseKey), root_ + "/d");
}

// ---------------------------------------------------------------------------------------
// The label and dispatch settings dialogs.

TEST_F(GuiTest, SizeOf300ClosedTheLabelDialogAndDroppedLaterRows) {
  store_.Save(kSettingsApp, "LabelDef1", "FontSize", "14");
  WhenShown<frmLabDef>([&](frmLabDef& d) {
    EXPECT_EQ(d.txtFontSize[1]->text(), "14");
    d.txtFontSize[5]->setText("16");
    for (const char* bad : {"300", "0", ""}) {
      d.txtFontSize[3]->setText(bad);
      Press(d, "cmdOK");
      EXPECT_TRUE(d.isVisible()) << bad;
      EXPECT_NE(desk_.shown.back().first.find("לידי: איש קשר"), std::string::npos);
      EXPECT_EQ(d.focusWidget(), d.txtFontSize[3]);
    }
    EXPECT_EQ(store_.Values().size(), 1u);  // nothing stored yet; row 5 keeps its 16 (below)
    d.txtFontSize[3]->clear();
    QTest::keyClicks(d.txtFontSize[3], "2a5");  // the size box takes no letters
    d.TxtHeaderLogo->setText("/pics/top.png");
    Press(d, "CmdDir0");  // a cancel keeps the path
    desk_.answer = "/pics/logo.jpg";
    Press(d, "CmdDir1");
    Press(d, "cmdOK");
  });
  Press(*card_, "CmdLabDef");
  // clang-format off
  for (auto [section, key, value] : {std::tuple<std::string_view, const char*, const char*>{"LabelDef3", "FontSize", "25"},
       {"LabelDef5", "FontSize", "16"}, {kLabPicsSection, "Pic0", "/pics/top.png"}, {kLabPicsSection, "Pic1", "/pics/logo.jpg"}})
    EXPECT_EQ(Stored(section, key), value) << section << " " << key;
  // clang-format on
}

// Regression: the dispatch dialog took "abc" as the weight, and a stored value the panel
// refused stopped its load with nothing shown, so the criteria after it looked chosen. The
// dialog names the box and keeps what was typed; the start-up names the key and the value.
TEST_F(GuiTest, RefusedValuesAreToldAndNothingTypedIsLost) {
  WhenShown<frmPostIL>([&](frmPostIL& d) {
    d.txtService->setText(Q("רשום"));
    for (const char* bad : {"abc", "-1", "0", "0,5", " 2"}) {
      d.txtWeight->setText(Q(bad));
      Press(d, "cmdOK");
      EXPECT_TRUE(d.isVisible()) << bad;
      EXPECT_NE(desk_.shown.back().first.find(std::string("בתיבה \"משקל\" הוקלד \"") + bad),
                std::string::npos)
          << desk_.shown.back().first;
      EXPECT_EQ(d.focusWidget(), d.txtWeight);
      EXPECT_EQ(FromQ(d.txtWeight->text()) + FromQ(d.txtService->text()),
                bad + std::string("רשום"));
    }
    EXPECT_TRUE(store_.Values().empty()) << "nothing saved";
    d.txtWeight->setText(Q("0.75"));
    Press(d, "cmdOK");
  });
  Press(*card_, "cmdPostDef");
  EXPECT_EQ(Stored(kPostILSection, "Weight"), "0.75");

  const std::tuple<const char*, const char*, const char*, bool> stored[] = {
      {"Params", "UseCatCode", "7", true},
      {"Params", "SortBy", "99", true},
      {"PostIL", "Weight", "abc", false},
      {"PostIL", "FileFormat", "2", false}};
  for (const auto& [section, key, value, stopsThePanel] : stored) {
    SCOPED_TRACE(key);
    store_ = MemorySettingsStore();
    store_.Save(kSettingsApp, section, key, value);
    store_.Save(kSettingsApp, kParamsSection, "UseLogo1", "1");  // after both Params keys
    desk_.shown.clear();
    card_ = MakeCard();
    ASSERT_EQ(desk_.shown.size(), 1u);
    const std::string& text = desk_.shown[0].first;
    EXPECT_NE(text.find(std::string("\"") + value + "\" של ההגדרה " + key), std::string::npos)
        << text;
    EXPECT_EQ(desk_.shown[0].second, "שגיאה");
    EXPECT_EQ(card_->control().panel().ChkLogo[1], stopsThePanel ? 0 : 1);
    EXPECT_EQ(card_->control().postILSettings().Weight, "");
  }
}

TEST_F(GuiTest, StockChoicesAreKeptAndAStocksOwnOffsetStaysWithIt) {
  LabelStockBox& box = *card_->labDefDialog()->StockBox;
  // Regression: a stock of the user's that fails its check vanished from the list unexplained.
  store_.Save(kSettingsApp, kLabelStocksSection, "Ids", "narrow");
  for (auto [key, value] : {std::pair{"PageWidth", "210"},
                            {"PageHeight", "297"},
                            {"Top", "0"},
                            {"Side", "0"},
                            {"LabelWidth", "80"},
                            {"LabelHeight", "30"},
                            {"PitchX", "70"},
                            {"PitchY", "30"},
                            {"Padding", "1"},
                            {"Rows", "2"},
                            {"Cols", "2"}})
    store_.Save(kSettingsApp, "LabelStock.narrow", key, value);
  box.Load();
  ASSERT_FALSE(desk_.shown.empty());
  EXPECT_NE(desk_.shown.back().first.find("\"narrow\" אינה מוצגת ברשימה"), std::string::npos)
      << desk_.shown.back().first;
  EXPECT_EQ(box.cmbStock->findData(QStringLiteral("narrow")), -1);
  box.cmbStock->setCurrentIndex(box.cmbStock->findData(QStringLiteral("a4-2x4-105x74")));
  box.txtOffsetX->setValue(1.3);
  box.cmbOutput->setCurrentIndex(1);
  box.Save();
  box.chkOwnOffset->setChecked(true);  // the stock's own offset leaves the user's as it was
  box.txtOffsetX->setValue(-2.0);
  box.Save();
  // clang-format off
  for (auto [section, key, value] : {std::tuple{"LabelPdf", "Template", "a4-2x4-105x74"},
       {"LabelPdf", "OffsetX", "1.3"}, {"LabelPdf", "Output", "1"}, {"LabelStock.a4-2x4-105x74", "OffsetX", "-2"}})
    EXPECT_EQ(Stored(section, key), value) << section << " " << key;
  // clang-format on
  box.cmbStock->setCurrentIndex(0);  // another stock shows the user's offset
  EXPECT_FALSE(box.chkOwnOffset->isChecked());
  EXPECT_DOUBLE_EQ(box.txtOffsetX->value(), 1.3);
  box.CmdCalibrate_Click();  // the calibration page is written and opened
  EXPECT_EQ(desk_.pages, std::vector<std::string>{(temp_.dir() / "zdrcalib.pdf").string()});
}

// The calibration page's four readings become the chosen stock's correction, kept with it;
// readings beyond the ranges are told and change nothing. The catalogue's stocks are offered
// by brand and part, those that cannot be printed greyed with the reason.
TEST_F(GuiTest, CalibrationReadingsBecomeTheCorrection) {
  LabelStockBox& box = *card_->labDefDialog()->StockBox;
  box.Load();
  box.cmbStock->setCurrentIndex(box.cmbStock->findData(QStringLiteral("a4-3x8-70x37")));
  // A printer 1.5 % small, shifted by (2, -1) mm, read to a tenth.
  const std::pair<QDoubleSpinBox*, double> readings[] = {
      {box.txtReadH1, 0.1}, {box.txtReadH2, -1.0}, {box.txtReadV1, 1.6}, {box.txtReadV2, 5.0}};
  for (const auto& [field, value] : readings) field->setValue(value);
  Press(box, "cmdApplyReadings");
  EXPECT_TRUE(desk_.shown.empty());
  EXPECT_DOUBLE_EQ(box.txtOffsetX->value(), -2.1);
  EXPECT_DOUBLE_EQ(box.txtOffsetY->value(), 1.0);
  EXPECT_DOUBLE_EQ(box.txtScaleX->value(), 15.7);
  EXPECT_DOUBLE_EQ(box.txtScaleY->value(), 15.3);
  for (const auto& [field, value] : readings) EXPECT_EQ(field->value(), 0);
  box.chkOwnOffset->setChecked(true);
  box.Save();
  EXPECT_EQ(Stored("LabelStock.a4-3x8-70x37", "ScaleX"), "15.7");
  EXPECT_EQ(Stored("LabelStock.a4-3x8-70x37", "OffsetY"), "1");

  box.txtReadH2->setValue(10);  // 10 mm over 70: far beyond any printer
  EXPECT_NE(box.CmdApplyReadings_Click(), "");
  ASSERT_EQ(desk_.shown.size(), 1u);
  EXPECT_NE(desk_.shown[0].first.find("מעבר לתחום"), std::string::npos);
  EXPECT_DOUBLE_EQ(box.txtScaleX->value(), 15.7);

  EXPECT_GE(box.cmbStock->findData(QStringLiteral("Avery L7160")), 0);
  const int cd = box.cmbStock->findData(QStringLiteral("Avery L6015"));
  ASSERT_GE(cd, 0);
  QStandardItem* item = qobject_cast<QStandardItemModel*>(box.cmbStock->model())->item(cd);
  EXPECT_FALSE(item->isEnabled());
  EXPECT_TRUE(item->toolTip().contains(QStringLiteral("תקליטור")));
}

}  // namespace
