// The settings store and the routines that move the panel, the company path, the label
// appearance, the dispatch settings and the label stocks through it.
#include <gtest/gtest.h>

#include <QSettings>
#include <cmath>
#include <filesystem>
#include <functional>
#include <optional>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "control/settings.h"
#include "qtstore/qtsettings.h"
#include "support/files.h"
#include "support/scratchtemp.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;
using KeyValues = std::vector<std::pair<std::string, std::string>>;

// "key=value" words split at blanks.
KeyValues Pairs(const std::string& text) {
  KeyValues out;
  std::stringstream in(text);
  for (std::string word; in >> word;)
    out.emplace_back(word.substr(0, word.find('=')), word.substr(word.find('=') + 1));
  return out;
}

// Every saved key in its fixed order, each with a value other than the designed one.
const KeyValues kChanged = Pairs(
    "UseCatCode=1 FromSort=100 ToSort=199 UseAccKey=2 CutOff1=1 CutOff2=א CutOff3=ב "
    "CutOff4=9 UseCutOff=1 FromCrd=1000 ToCrd=1999 UseCity=1 City=חיפה UsePhone=1 "
    "Phone=04-8 UseAgent=1 FromAgent=3 ToAgent=7 UseDates=1 FromDate=01/02/2003 "
    "ToDate=31/12/2003 DocType=27 ByDoc=1 UseJournal=1 FromJournal=10 ToJournal=20 "
    "UseTransType=1 TransType=חש UseTransDates=1 FromTransDate=01/01/2001 "
    "FromToDate=02/02/2002 UseTransVDate=2 FromTransVDate=03/03/2003 "
    "FromToVDate=04/04/2004 Rows=10 Cols=2 Copies=3 SortBy=7 SortDir=1 ReadTempTrans=1 "
    "InAccounts=1 AddressFrom=-1 UseTitle0=1 UseTitle1=2 UseTitle2=1 UseTitle3=2 "
    "UseTitle4=1 UseTitle5=2 UseTitle6=1 UseTitle7=1 UseTitle8=1 UseLogo0=1 UseLogo1=2");

void Put(SettingsStore& store, const KeyValues& values) {
  for (const auto& [key, value] : values) store.Save(kSettingsApp, kParamsSection, key, value);
}

// What SetGetRegParams saves for a panel, in save order.
KeyValues Saved(Panel panel) {
  MemorySettingsStore store;
  SetGetRegParams(kActionSave, store, panel);
  KeyValues out;
  for (const auto& s : store.SaveLog()) {
    EXPECT_EQ(s.app + "/" + s.section, "ZDRLab/Params");
    out.emplace_back(s.key, s.value);
  }
  return out;
}

Panel Loaded(const KeyValues& values, Panel panel = {}) {
  MemorySettingsStore store;
  Put(store, values);
  SetGetRegParams(kActionLoad, store, panel);
  return panel;
}

TEST(ParamsTest, EveryKeyLoadsAndSavesInItsFixedOrder) {
  std::vector<std::string> keys;
  for (const auto& kv : kChanged) keys.push_back(kv.first);
  EXPECT_EQ(ParamsKeys(), keys);
  const Panel panel = Loaded(kChanged);
  EXPECT_EQ(Saved(panel), kChanged);
  EXPECT_EQ(panel.cmbAddressFrom, -1);
  EXPECT_EQ(panel.CutOff[3], "ב");
  EXPECT_EQ(panel.ChkTitle[3], 2);
  // The designed values: every changed value differs from them, and an empty store gives them.
  const KeyValues designed = Saved(Panel{});
  for (size_t i = 0; i < designed.size(); ++i) EXPECT_NE(designed[i], kChanged[i]);
  MemorySettingsStore empty;
  Panel fromEmpty = panel;
  SetGetRegParams(kActionLoad, empty, fromEmpty);
  EXPECT_EQ(Saved(fromEmpty), designed);
  EXPECT_TRUE(empty.Values().empty()) << "a load writes nothing";
  EXPECT_EQ(fromEmpty.CutOff, (std::array<std::string, 5>{"", "*", "*", "*", "*"}));
  EXPECT_EQ(std::tuple(fromEmpty.TxtFromDate, fromEmpty.txtToTransVDate, fromEmpty.txtRows,
                       fromEmpty.txtCols, fromEmpty.txtCopies),
            std::tuple("01/01/1980", "01/01/2025", "8", "3", "1"));
}

// A value the control refuses stops the load at its key: the keys before it are loaded, it
// and the keys after it keep what the panel had.
TEST(ParamsTest, RefusedValueStopsTheLoadAtItsKey) {
  const KeyValues refused = Pairs(
      "UseCatCode=3 UseCatCode=-1 UseCatCode= UseCatCode=1.5 DocType=28 DocType=-2 "
      "ByDoc=2 SortDir=2 InAccounts=2 AddressFrom=2 SortBy=8 SortBy=x SortBy= "
      "UseLogo1=1e0 ByDoc=+-1 ByDoc=+ UseCity=yes SortBy=12 SortBy=99999999999999999999");
  const KeyValues designed = Saved(Panel{});
  for (const auto& [key, value] : refused) {
    SCOPED_TRACE(key + "=" + value);
    KeyValues stored = kChanged;
    size_t at = 0;
    while (stored[at].first != key) ++at;
    stored[at].second = value;
    MemorySettingsStore store;
    Put(store, stored);
    Panel panel;
    try {
      SetGetRegParams(kActionLoad, store, panel);
      ADD_FAILURE() << "accepted";
    } catch (const SettingsValueError& e) {
      EXPECT_EQ(std::pair(e.key(), e.value()), std::pair(key, value));
      EXPECT_NE(std::string(e.what()).find(key), std::string::npos);
    }
    const KeyValues got = Saved(panel);
    for (size_t i = 0; i < got.size(); ++i) EXPECT_EQ(got[i], i < at ? kChanged[i] : designed[i]);
  }
  EXPECT_EQ(Loaded({{"SortBy", " 7 "}}).CmbSortBy, 7) << "blanks around a number are taken";
}

class FailingStore : public MemorySettingsStore {
 public:
  explicit FailingStore(std::string failKey) : failKey_(std::move(failKey)) {}
  void Save(std::string_view app, std::string_view section, std::string_view key,
            std::string_view value) override {
    if (key == failKey_) throw SettingsStoreError("cannot write");
    MemorySettingsStore::Save(app, section, key, value);
  }

 private:
  std::string failKey_;
};

TEST(ParamsTest, FailedSaveEndsThePassAndKeepsOlderValues) {
  FailingStore store("SortBy");
  store.Save(kSettingsApp, kParamsSection, "SortDir", "0");
  Panel panel = Loaded(kChanged);
  EXPECT_THROW(SetGetRegParams(kActionSave, store, panel), SettingsStoreError);
  EXPECT_EQ(store.Get(kSettingsApp, kParamsSection, "Copies", ""), "3");
  EXPECT_EQ(store.Get(kSettingsApp, kParamsSection, "SortDir", ""), "0");
  EXPECT_FALSE(store.Has(kSettingsApp, kParamsSection, "UseLogo1"));
}

TEST(ConnParamsTest, DefaultRoundTripAndIgnoredSaveFailure) {
  MemorySettingsStore store;
  std::string path = "stale";
  SetGetRegConnParams(kActionLoad, store, path);
  EXPECT_EQ(path, DefaultConnDataBase());
  store.Save("ZDRLab", "Params", "ConnDataBase", "/srv/חברה 1");
  SetGetRegConnParams(kActionLoad, store, path);
  EXPECT_EQ(path, "/srv/חברה 1");
  FailingStore failing("ConnDataBase");
  EXPECT_NO_THROW(SetGetRegConnParams(kActionSave, failing, path));
}

auto Fields(const LabelLineDef& l) {
  return std::tuple(l.Font, l.FontSize, l.FontWeight, l.FontUL, l.FontItalic);
}
auto Fields(const PostILSettings& p) {
  return std::tuple(p.Service, p.Weight, p.Confirm, p.FilePath, p.OpenExcel, p.FileFormat);
}
auto Fields(const LabelPdfSettings& p) {
  return std::tuple(p.Template, p.Offset, p.Output);
}

TEST(LabelDefsTest, FreshStoreRoundTripAndUnreadableValues) {
  MemorySettingsStore store;
  LabelSettings labels;
  for (auto& line : labels.LabelDefs) line = LabelLineDef{2, 20, 2, 1, 1};
  labels.LabPics = {"top.gif", "bottom.gif"};
  SetGetRegLabelDefs(kActionLoad, store, labels);
  for (int i = 0; i <= 7; ++i)
    EXPECT_EQ(Fields(labels.LabelDefs[i]), Fields(LabelLineDef{0, 9, 0, 0, 0}));
  EXPECT_EQ(labels.LabelDefs[8].FontSize, 20) << "line 8 is not moved";
  EXPECT_EQ(labels.LabPics, (std::array<std::string, 2>{}));

  LabelSettings saved;
  for (uint8_t i = 0; i < 9; ++i)
    saved.LabelDefs[i] = {uint8_t(i % 3), uint8_t(250 + i % 6), 2, uint8_t(i % 2), 1};
  saved.LabPics = {"/home/u/לוגו.png", "C:\\pics\\תחתית.jpg"};
  SetGetRegLabelDefs(kActionSave, store, saved);
  EXPECT_FALSE(store.Has("ZDRLab", "LabelDef8", "Font"));
  LabelSettings loaded;
  SetGetRegLabelDefs(kActionLoad, store, loaded);
  for (int i = 0; i <= 7; ++i) EXPECT_EQ(Fields(loaded.LabelDefs[i]), Fields(saved.LabelDefs[i]));
  EXPECT_EQ(loaded.LabPics, saved.LabPics);

  // An unreadable value keeps the old one; the rest loads.
  for (const auto& [key, value] : Pairs("FontSize=300 Font=abc FontWeight=-1 FontItalic=0"))
    store.Save("ZDRLab", "LabelDef3", key, value);
  loaded.LabelDefs[3] = LabelLineDef{1, 12, 2, 1, 1};
  SetGetRegLabelDefs(kActionLoad, store, loaded);
  EXPECT_EQ(Fields(loaded.LabelDefs[3]), Fields({1, 12, 2, 1, 0}));
}

TEST(PostILDefsTest, FreshStoreRoundTripAndUnreadableValues) {
  MemorySettingsStore store;
  PostILSettings postIL{"a", "b", "c", "d", 1, 1};
  SetGetRegPostILDefs(kActionLoad, store, postIL);
  EXPECT_EQ(Fields(postIL), Fields(PostILSettings{"", "", "", "", 0, 0}));

  PostILSettings saved{"שליח", "0.5", " 1 ", "/tmp/דואר.xlsx", 1, -1};
  SetGetRegPostILDefs(kActionSave, store, saved);
  SetGetRegPostILDefs(kActionLoad, store, postIL);
  EXPECT_EQ(Fields(postIL), Fields(saved));

  // A refused value keeps the old one, and the load says which.
  for (const auto& [key, value] : Pairs("OpenExcel=40000 FileFormat=דואר Weight=abc"))
    store.Save("ZDRLab", "PostIL", key, value);
  postIL.FileFormat = 0;
  std::vector<std::string> refused;
  for (const SettingsValueError& e : SetGetRegPostILDefs(kActionLoad, store, postIL))
    refused.push_back(e.section() + "/" + e.key() + "=" + e.value());
  EXPECT_EQ(refused, (std::vector<std::string>{"PostIL/Weight=abc", "PostIL/OpenExcel=40000",
                                               "PostIL/FileFormat=דואר"}));
  EXPECT_EQ(Fields(postIL), Fields(PostILSettings{"שליח", "0.5", " 1 ", "/tmp/דואר.xlsx", 1, 0}));

  // A failed save of one key does not stop the others.
  FailingStore failing("Weight");
  SetGetRegPostILDefs(kActionSave, failing, postIL);
  EXPECT_FALSE(failing.Has("ZDRLab", "PostIL", "Weight"));
  EXPECT_EQ(failing.Get("ZDRLab", "PostIL", "OpenExcel", ""), "1");
}

// Text of any kind and the whole panel come back from the file in a new instance; two
// instances share the file; an unwritable file is an error; without a file name the store
// lives in the user's settings folder.
TEST(QtStoreTest, ValuesAndThePanelComeBackFromTheFile) {
  test::ScratchTemp scratch;
  const fs::path dir = scratch.dir();
  const std::string ini = (dir / "הגדרות.ini").string();
  const std::vector<std::string> values = {"חיפה",      "a, b, c", "@Variant(x)", "\"quoted\"",
                                           "trailing ", "",        "C:\\ztest",   "שורה;=[x]"};
  QtSettingsStore store(ini), again(ini);
  for (size_t i = 0; i < values.size(); ++i)
    store.Save("ZDRLab", "Params", "K" + std::to_string(i), values[i]);
  Panel panel = Loaded(kChanged), loaded;
  SetGetRegParams(kActionSave, store, panel);
  EXPECT_NE(test::ReadBytes(fs::u8path(ini)).find("חיפה"), std::string::npos) << "UTF-8 text";
  for (size_t i = 0; i < values.size(); ++i)
    EXPECT_EQ(again.Get("ZDRLab", "Params", "K" + std::to_string(i), "missing"), values[i]) << i;
  EXPECT_EQ(again.Get("Other", "Params", "K0", "d"), "d") << "the application is in the address";
  SetGetRegParams(kActionLoad, again, loaded);
  EXPECT_EQ(Saved(loaded), kChanged);

  std::ofstream(dir / "file") << "x";
  QtSettingsStore blocked((dir / "file" / "settings.ini").string());
  EXPECT_THROW(blocked.Save("ZDRLab", "Params", "City", "x"), SettingsStoreError);
  QSettings::setPath(QSettings::NativeFormat, QSettings::UserScope,
                     QString::fromStdString(dir.string()));
  QtSettingsStore().Save("ZDRLab", "Params", "ConnDataBase", "/srv/חברה");
  EXPECT_EQ(QtSettingsStore().Get("ZDRLab", "Params", "ConnDataBase", ""), "/srv/חברה");
  EXPECT_EQ(fs::path(QtSettingsStore().Location()).parent_path(), dir / "ZDRLab");
}

// ---- The PDF's settings and the user's stocks (the stocks themselves: test_labelstock) ---

TEST(LabelPdfTest, FreshStoreRoundTripAndUnreadableValues) {
  MemorySettingsStore store;
  LabelPdfSettings pdf{"x", {1, 1}, 1};
  SetGetRegLabelPdf(kActionLoad, store, pdf);
  EXPECT_EQ(Fields(pdf), Fields(LabelPdfSettings{}));  // the default stock, no offset, HTML
  LabelPdfSettings saved{"Avery L7160", {-1.2, 0.7, 15.2, -0.4}, 1}, loaded;
  SetGetRegLabelPdf(kActionSave, store, saved);
  SetGetRegLabelPdf(kActionLoad, store, loaded);
  EXPECT_EQ(Fields(loaded), Fields(saved));
  for (const auto& [key, value] : Pairs("OffsetX=12 OffsetY=0,5 ScaleX=100.1 ScaleY=0.05 Output=2"))
    store.Save(kSettingsApp, kLabelPdfSection, key, value);
  SetGetRegLabelPdf(kActionLoad, store, loaded);
  EXPECT_EQ(Fields(loaded), Fields(saved));
}

TEST(UserStockTest, SavedStocksComeBackAndAnOwnOffsetWinsOverTheUsers) {
  MemorySettingsStore store;
  LabelStock mine = *FindShippedStock("a4-2x7-99.1x38.1");  // no size at its default
  mine.id = "office-1x7";
  mine.name = "מדבקות המשרד";
  mine.source.clear();  // the user's own follows no published sheet
  mine.cols = 1;
  SaveUserStock(store, mine);
  SaveUserStock(store, mine);  // again: listed once
  EXPECT_EQ(LoadUserStocks(store), std::vector<LabelStock>{mine});
  EXPECT_EQ(*FindLabelStock(store, "office-1x7"), mine);
  EXPECT_EQ(AvailableLabelStocks(store).size(), ShippedLabelStocks().size() + 1);

  LabelPdfSettings pdf;
  pdf.Offset = {0.5, 0.5};
  EXPECT_EQ(EffectiveStockOffset(store, pdf, mine.id), pdf.Offset);
  SaveStockOffset(store, mine.id, StockOffset{-2, 1.1, -15.2, 3});
  EXPECT_EQ(EffectiveStockOffset(store, pdf, mine.id), (StockOffset{-2, 1.1, -15.2, 3}));
  // Kept before there were scales: no scale.
  store.Save(kSettingsApp, "LabelStock.office-1x7", "ScaleX", "");
  EXPECT_EQ(EffectiveStockOffset(store, pdf, mine.id), (StockOffset{-2, 1.1, 0, 3}));
  EXPECT_EQ(EffectiveStockOffset(store, pdf, kDefaultStockId), pdf.Offset);
  SaveStockOffset(store, mine.id, std::nullopt);
  EXPECT_EQ(EffectiveStockOffset(store, pdf, mine.id), pdf.Offset);
  EXPECT_THROW(SaveStockOffset(store, mine.id, StockOffset{11, 0}), std::invalid_argument);
  EXPECT_THROW(SaveStockOffset(store, mine.id, StockOffset{0, 0, 0, 100.5}), std::invalid_argument);
  RemoveUserStock(store, mine.id);
  EXPECT_TRUE(LoadUserStocks(store).empty());

  // Shipped ids and unsound stocks are refused; a spoilt stored stock is left out.
  store.ClearLog();
  LabelStock shipped = *FindShippedStock(kDefaultStockId);
  EXPECT_THROW(SaveUserStock(store, shipped), std::invalid_argument);
  shipped.id = "my stock";  // a catalogue's kind of name, not one of the user's
  EXPECT_THROW(SaveUserStock(store, shipped), std::invalid_argument);
  shipped.id = "wide";
  shipped.labelWidth = 80;
  EXPECT_THROW(SaveUserStock(store, shipped), std::invalid_argument);
  EXPECT_TRUE(store.SaveLog().empty());
  shipped.labelWidth = 70;
  SaveUserStock(store, shipped);
  store.Save(kSettingsApp, "LabelStock.wide", "Rows", "many");
  EXPECT_TRUE(LoadUserStocks(store).empty());
  EXPECT_FALSE(FindLabelStock(store, "wide"));
  EXPECT_EQ(LabelStockChoiceProblem(store, "wide"),
            "תבנית המדבקות \"wide\" שבהגדרות אינה תקינה: הערך Rows של התבנית חסר או אינו מספר");
}

}  // namespace
}  // namespace zdr
