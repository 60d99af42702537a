// The settings store and the routines that move the panel, the company path, the label
// appearance and the dispatch settings through it.

#include <gtest/gtest.h>

#include <QSettings>
#include <array>
#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <tuple>
#include <vector>

#include "control/qtsettings.h"
#include "control/settings.h"
#include "support/scratchtemp.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;

// Everything SetGetRegParams saves for a panel, key to stored text.
std::map<std::string, std::string> SavedParams(Panel panel) {
  MemorySettingsStore store;
  SetGetRegParams(kActionSave, store, panel);
  std::map<std::string, std::string> out;
  for (const auto& saved : store.SaveLog()) out[saved.key] = saved.value;
  return out;
}

// A panel with a value other than the designed one in every saved control.
Panel ChangedPanel() {
  Panel p;
  p.ChkCatCode = 1;
  p.txtFromSort = "100";
  p.txtToSort = "199";
  p.ChkAccKey = 2;
  p.CutOff = {"", "1", "*", "ב", "9"};
  p.chkCutOff = 1;
  p.TxtFromCrd = "1000";
  p.TxtToCrd = "1999";
  p.ChkCity = 1;
  p.TxtCity = "חיפה";
  p.ChkPhone = 1;
  p.txtPhone = "04-8";
  p.ChkAgent = 1;
  p.txtAgent = "3";
  p.txtToAgent = "7";
  p.ChkDates = 1;
  p.TxtFromDate = "01/02/2003";
  p.TxtToDate = "31/12/2003";
  p.cmbDocType = 27;
  p.cmbByDoc = 1;
  p.ChkJournal = 1;
  p.txtFromJournal = "10";
  p.txtToJournal = "20";
  p.chkTransType = 1;
  p.txtTransType = "חש";
  p.chkTransDates = 1;
  p.txtFromTransDate = "01/01/2001";
  p.txtToTransDate = "02/02/2002";
  p.chkTransVDate = 2;
  p.txtFromTransVDate = "03/03/2003";
  p.txtToTransVDate = "04/04/2004";
  p.txtRows = "10";
  p.txtCols = "2";
  p.txtCopies = "3";
  p.CmbSortBy = 7;
  p.CmbSortDir = 1;
  p.chkReadTempTrans = 1;
  p.cmbInAccounts = 1;
  p.cmbAddressFrom = -1;
  p.ChkTitle = {1, 0, 1, 2, 1, 0, 1, 1, 1};
  p.ChkLogo = {1, 2};
  return p;
}

void Put(MemorySettingsStore& store, const std::string& key, const std::string& value) {
  store.Save(kSettingsApp, kParamsSection, key, value);
}

TEST(ParamsTest, KeysInTheirFixedOrder) {
  const std::vector<std::string> expected = {
      "UseCatCode", "FromSort",      "ToSort",         "UseAccKey",     "CutOff1",
      "CutOff2",    "CutOff3",       "CutOff4",        "UseCutOff",     "FromCrd",
      "ToCrd",      "UseCity",       "City",           "UsePhone",      "Phone",
      "UseAgent",   "FromAgent",     "ToAgent",        "UseDates",      "FromDate",
      "ToDate",     "DocType",       "ByDoc",          "UseJournal",    "FromJournal",
      "ToJournal",  "UseTransType",  "TransType",      "UseTransDates", "FromTransDate",
      "FromToDate", "UseTransVDate", "FromTransVDate", "FromToVDate",   "Rows",
      "Cols",       "Copies",        "SortBy",         "SortDir",       "ReadTempTrans",
      "InAccounts", "AddressFrom",   "UseTitle0",      "UseTitle1",     "UseTitle2",
      "UseTitle3",  "UseTitle4",     "UseTitle5",      "UseTitle6",     "UseTitle7",
      "UseTitle8",  "UseLogo0",      "UseLogo1"};
  EXPECT_EQ(ParamsKeys(), expected);

  MemorySettingsStore store;
  Panel panel;
  SetGetRegParams(kActionSave, store, panel);
  std::vector<std::string> saved;
  for (const auto& s : store.SaveLog()) saved.push_back(s.app + "/" + s.section + "/" + s.key);
  ASSERT_EQ(saved.size(), expected.size());
  EXPECT_EQ(saved.back(), "ZDRLab/Params/UseLogo1");
}

TEST(ParamsTest, EmptyStoreGivesTheDesignedValues) {
  MemorySettingsStore store;
  Panel panel = ChangedPanel();
  SetGetRegParams(kActionLoad, store, panel);
  EXPECT_EQ(SavedParams(panel), SavedParams(Panel{}));
  EXPECT_EQ(panel.CutOff[1], "*");
  EXPECT_EQ(panel.TxtFromDate, "01/01/1980");
  EXPECT_EQ(panel.txtToTransVDate, "01/01/2025");
  EXPECT_EQ(panel.txtRows, "8");
  EXPECT_EQ(panel.txtCols, "3");
  EXPECT_EQ(panel.txtCopies, "1");
  EXPECT_EQ(panel.cmbAddressFrom, 0);
  EXPECT_EQ(panel.ChkLogo[1], 0);
  EXPECT_TRUE(store.Values().empty()) << "a load writes nothing";
}

TEST(ParamsTest, SaveAndLoadRoundTrip) {
  MemorySettingsStore store;
  Panel saved = ChangedPanel();
  SetGetRegParams(kActionSave, store, saved);

  const auto texts = SavedParams(saved);
  EXPECT_EQ(texts.at("AddressFrom"), "-1");
  EXPECT_EQ(texts.at("UseAccKey"), "2");
  EXPECT_EQ(texts.at("UseTitle3"), "2");
  EXPECT_EQ(texts.at("DocType"), "27");
  EXPECT_EQ(texts.at("City"), "חיפה");
  EXPECT_EQ(texts.at("FromToDate"), "02/02/2002");
  EXPECT_EQ(texts.at("FromToVDate"), "04/04/2004");

  Panel loaded;
  SetGetRegParams(kActionLoad, store, loaded);
  EXPECT_EQ(SavedParams(loaded), texts);
  EXPECT_EQ(loaded.cmbAddressFrom, -1);
  EXPECT_EQ(loaded.chkTransVDate, 2);
  EXPECT_EQ(loaded.CutOff[3], "ב");
}

TEST(ParamsTest, SortByBeyondItsListStopsTheLoadAtThatKey) {
  MemorySettingsStore store;
  Panel stored = ChangedPanel();
  SetGetRegParams(kActionSave, store, stored);
  Put(store, "SortBy", "12");

  Panel panel;
  try {
    SetGetRegParams(kActionLoad, store, panel);
    FAIL() << "expected SettingsValueError";
  } catch (const SettingsValueError& e) {
    EXPECT_EQ(e.key(), "SortBy");
    EXPECT_EQ(e.value(), "12");
    EXPECT_NE(std::string(e.what()).find("SortBy"), std::string::npos);
  }
  // Loaded up to the key before it.
  EXPECT_EQ(panel.ChkCatCode, 1);
  EXPECT_EQ(panel.TxtCity, "חיפה");
  EXPECT_EQ(panel.cmbDocType, 27);
  EXPECT_EQ(panel.txtCopies, "3");
  // The refused key and every key after it keep the designed values.
  const auto loaded = SavedParams(panel), designed = SavedParams(Panel{});
  for (const char* key : {"SortBy", "SortDir", "AddressFrom", "UseTitle0", "UseLogo1"}) {
    EXPECT_EQ(loaded.at(key), designed.at(key)) << key;
  }
}

TEST(ParamsTest, NonNumberCheckValueStopsTheLoad) {
  MemorySettingsStore store;
  Put(store, "UseCity", "yes");
  Put(store, "City", "חיפה");
  Panel panel;
  panel.ChkCity = 1;
  EXPECT_THROW(SetGetRegParams(kActionLoad, store, panel), SettingsValueError);
  EXPECT_EQ(panel.ChkCity, 1) << "the refused value leaves the control as it was";
  EXPECT_EQ(panel.TxtCity, "") << "keys after the refused one are not loaded";
}

TEST(ParamsTest, StoredValuesTheControlsRefuse) {
  const std::vector<std::pair<std::string, std::string>> refused = {
      {"UseCatCode", "3"},   {"UseCatCode", "-1"}, {"UseCatCode", ""},
      {"UseCatCode", "1.5"}, {"DocType", "28"},    {"DocType", "-2"},
      {"ByDoc", "2"},        {"SortDir", "2"},     {"InAccounts", "2"},
      {"AddressFrom", "2"},  {"SortBy", "8"},      {"SortBy", "x"},
      {"SortBy", ""},        {"UseLogo1", "1e0"},  {"SortBy", "99999999999999999999"},
      {"ByDoc", "+-1"},      {"ByDoc", "+"}};
  for (const auto& [key, value] : refused) {
    MemorySettingsStore store;
    Put(store, key, value);
    Panel panel;
    try {
      SetGetRegParams(kActionLoad, store, panel);
      ADD_FAILURE() << key << "=" << value << " was accepted";
    } catch (const SettingsValueError& e) {
      EXPECT_EQ(e.key(), key);
    }
  }
}

TEST(ParamsTest, StoredValuesTheControlsAccept) {
  MemorySettingsStore store;
  Put(store, "DocType", "-1");
  Put(store, "ByDoc", "1");
  Put(store, "SortBy", " 7 ");
  Put(store, "UseLogo1", "2");
  Panel panel;
  SetGetRegParams(kActionLoad, store, panel);
  EXPECT_EQ(panel.cmbDocType, -1);
  EXPECT_EQ(panel.cmbByDoc, 1);
  EXPECT_EQ(panel.CmbSortBy, 7);
  EXPECT_EQ(panel.ChkLogo[1], 2);
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
  Put(store, "SortDir", "0");
  Panel panel = ChangedPanel();
  EXPECT_THROW(SetGetRegParams(kActionSave, store, panel), SettingsStoreError);
  EXPECT_EQ(store.Get(kSettingsApp, kParamsSection, "Copies", ""), "3");
  EXPECT_EQ(store.Get(kSettingsApp, kParamsSection, "SortDir", ""), "0");
  EXPECT_FALSE(store.Has(kSettingsApp, kParamsSection, "UseLogo1"));
}

TEST(SetGetRegValueTest, MissingKeyTakesTheDefault) {
  MemorySettingsStore store;
  std::string text = "old";
  int index = 1;
  SetGetRegValue(kActionLoad, store, "App", "Sec", "T", ControlValueRef::Text(text), kKindText,
                 "def");
  SetGetRegValue(kActionLoad, store, "App", "Sec", "L", ControlValueRef::ListIndex(index, 3),
                 kKindList, "0");
  EXPECT_EQ(text, "def");
  EXPECT_EQ(index, 0);
}

TEST(SetGetRegValueTest, ValueOfTheWrongSortIsRefused) {
  MemorySettingsStore store;
  std::string text;
  int check = 0;
  EXPECT_THROW(SetGetRegValue(kActionLoad, store, "A", "S", "K", ControlValueRef::Text(text),
                              kKindCheck, "0"),
               std::invalid_argument);
  EXPECT_THROW(SetGetRegValue(kActionSave, store, "A", "S", "K", ControlValueRef::CheckValue(check),
                              kKindList, "0"),
               std::invalid_argument);
}

TEST(ConnParamsTest, DefaultAndRoundTrip) {
  MemorySettingsStore store;
  std::string path = "stale";
  SetGetRegConnParams(kActionLoad, store, path);
  EXPECT_EQ(path, DefaultConnDataBase());
#ifdef _WIN32
  EXPECT_EQ(DefaultConnDataBase(), "c:\\ztest");
#else
  if (const char* home = std::getenv("HOME"); home != nullptr && *home != '\0') {
    EXPECT_EQ(DefaultConnDataBase(), (fs::path(home) / "ztest").string());
  }
#endif

  path = "/srv/חברה 1";
  SetGetRegConnParams(kActionSave, store, path);
  EXPECT_EQ(store.Get("ZDRLab", "Params", "ConnDataBase", ""), "/srv/חברה 1");
  std::string loaded;
  SetGetRegConnParams(kActionLoad, store, loaded);
  EXPECT_EQ(loaded, "/srv/חברה 1");
}

TEST(ConnParamsTest, SaveFailureIsIgnored) {
  FailingStore store("ConnDataBase");
  std::string path = "/x";
  EXPECT_NO_THROW(SetGetRegConnParams(kActionSave, store, path));
}

auto Fields(const LabelLineDef& l) {
  return std::tuple(l.Font, l.FontSize, l.FontWeight, l.FontUL, l.FontItalic);
}
auto Fields(const PostILSettings& p) {
  return std::tuple(p.Service, p.Weight, p.Confirm, p.FilePath, p.OpenExcel, p.FileFormat);
}

TEST(LabelDefsTest, FreshStoreGivesArialNinePointPlain) {
  MemorySettingsStore store;
  LabelSettings labels;
  for (auto& line : labels.LabelDefs) line = LabelLineDef{2, 20, 2, 1, 1};
  labels.LabPics = {"top.gif", "bottom.gif"};
  SetGetRegLabelDefs(kActionLoad, store, labels);
  for (int i = 0; i <= 7; ++i) EXPECT_EQ(Fields(labels.LabelDefs[i]), Fields({0, 9, 0, 0, 0}));
  EXPECT_EQ(labels.LabelDefs[8].FontSize, 20) << "line 8 is not moved";
  EXPECT_EQ(labels.LabPics, (std::array<std::string, 2>{}));
}

TEST(LabelDefsTest, SaveAndLoadRoundTrip) {
  MemorySettingsStore store;
  LabelSettings saved;
  for (int i = 0; i < 9; ++i) {
    saved.LabelDefs[i] =
        LabelLineDef{static_cast<uint8_t>(i % 3), static_cast<uint8_t>(250 + i % 6), 2,
                     static_cast<uint8_t>(i % 2), 1};
  }
  saved.LabPics = {"/home/u/לוגו.png", "C:\\pics\\תחתית.jpg"};
  SetGetRegLabelDefs(kActionSave, store, saved);
  EXPECT_EQ(store.SaveLog().size(), 8u * 5 + 2);
  EXPECT_FALSE(store.Has("ZDRLab", "LabelDef8", "Font"));
  EXPECT_EQ(store.Get("ZDRLab", "LabelDef3", "FontSize", ""), "253");
  EXPECT_EQ(store.Get("ZDRLab", "LabelDef3", "FontWeight", ""), "2");
  EXPECT_EQ(store.Get("ZDRLab", "LabPics", "Pic1", ""), "C:\\pics\\תחתית.jpg");

  LabelSettings loaded;
  SetGetRegLabelDefs(kActionLoad, store, loaded);
  for (int i = 0; i <= 7; ++i) EXPECT_EQ(Fields(loaded.LabelDefs[i]), Fields(saved.LabelDefs[i]));
  EXPECT_EQ(loaded.LabPics, saved.LabPics);
}

TEST(LabelDefsTest, UnreadableValueKeepsTheOldOneAndTheRestLoads) {
  MemorySettingsStore store;
  store.Save("ZDRLab", "LabelDef3", "FontSize", "300");
  store.Save("ZDRLab", "LabelDef3", "Font", "abc");
  store.Save("ZDRLab", "LabelDef3", "FontWeight", "-1");
  store.Save("ZDRLab", "LabelDef3", "FontItalic", "1");
  store.Save("ZDRLab", "LabPics", "Pic0", "a.gif");
  LabelSettings labels;
  labels.LabelDefs[3] = LabelLineDef{1, 12, 2, 0, 0};
  SetGetRegLabelDefs(kActionLoad, store, labels);
  EXPECT_EQ(labels.LabelDefs[3].Font, 1);
  EXPECT_EQ(labels.LabelDefs[3].FontSize, 12);
  EXPECT_EQ(labels.LabelDefs[3].FontWeight, 2);
  EXPECT_EQ(labels.LabelDefs[3].FontItalic, 1);
  EXPECT_EQ(labels.LabelDefs[4].FontSize, 9);
  EXPECT_EQ(labels.LabPics[0], "a.gif");
}

TEST(PostILDefsTest, FreshStoreGivesEmptyTextsAndZeros) {
  MemorySettingsStore store;
  PostILSettings postIL{"a", "b", "c", "d", 1, 1};
  SetGetRegPostILDefs(kActionLoad, store, postIL);
  EXPECT_EQ(Fields(postIL), Fields(PostILSettings{"", "", "", "", 0, 0}));
}

TEST(PostILDefsTest, SaveOrderAndRoundTripKeepTextsExactly) {
  MemorySettingsStore store;
  PostILSettings saved{"שליח", "0.5", " 1 ", "/tmp/דואר.xlsx", 1, -1};
  SetGetRegPostILDefs(kActionSave, store, saved);
  std::vector<std::string> keys;
  for (const auto& s : store.SaveLog()) {
    EXPECT_EQ(s.section, "PostIL");
    keys.push_back(s.key);
  }
  EXPECT_EQ(keys, (std::vector<std::string>{"Service", "Weight", "Confirm", "FilePath", "OpenExcel",
                                            "FileFormat"}));
  EXPECT_EQ(store.Get("ZDRLab", "PostIL", "Weight", ""), "0.5");
  EXPECT_EQ(store.Get("ZDRLab", "PostIL", "FileFormat", ""), "-1");

  PostILSettings loaded;
  SetGetRegPostILDefs(kActionLoad, store, loaded);
  EXPECT_EQ(Fields(loaded), Fields(saved));
}

TEST(PostILDefsTest, UnreadableIntegerKeepsTheOldOneAndTheRestLoads) {
  MemorySettingsStore store;
  store.Save("ZDRLab", "PostIL", "OpenExcel", "40000");
  store.Save("ZDRLab", "PostIL", "FileFormat", "1");
  PostILSettings postIL;
  postIL.OpenExcel = 1;
  SetGetRegPostILDefs(kActionLoad, store, postIL);
  EXPECT_EQ(postIL.OpenExcel, 1);
  EXPECT_EQ(postIL.FileFormat, 1);

  store.Save("ZDRLab", "PostIL", "FileFormat", "דואר");
  SetGetRegPostILDefs(kActionLoad, store, postIL);
  EXPECT_EQ(postIL.FileFormat, 1);
}

TEST(PostILDefsTest, SaveFailureOnOneKeyDoesNotStopTheOthers) {
  FailingStore store("Weight");
  PostILSettings postIL{"s", "w", "c", "f", 0, 1};
  SetGetRegPostILDefs(kActionSave, store, postIL);
  EXPECT_FALSE(store.Has("ZDRLab", "PostIL", "Weight"));
  EXPECT_EQ(store.Get("ZDRLab", "PostIL", "FileFormat", ""), "1");
}

class QtStoreTest : public ::testing::Test {
 protected:
  test::ScratchTemp scratch_;
  const fs::path dir_ = scratch_.dir();
  const std::string ini_ = (dir_ / "הגדרות.ini").string();
};

TEST_F(QtStoreTest, HebrewValuesSurviveANewInstance) {
  const std::vector<std::string> values = {"חיפה",      "a, b, c", "@Variant(x)", "\"quoted\"",
                                           "trailing ", "",        "C:\\ztest",   "שורה;=[x]"};
  {
    QtSettingsStore store(ini_);
    for (size_t i = 0; i < values.size(); ++i) {
      store.Save("ZDRLab", "Params", "K" + std::to_string(i), values[i]);
    }
    store.Save("ZDRLab", "LabPics", "Pic0", "/home/u/לוגו.png");
  }
  ASSERT_TRUE(fs::exists(fs::u8path(ini_)));
  QtSettingsStore again(ini_);
  for (size_t i = 0; i < values.size(); ++i) {
    EXPECT_EQ(again.Get("ZDRLab", "Params", "K" + std::to_string(i), "missing"), values[i]) << i;
  }
  EXPECT_EQ(again.Get("ZDRLab", "LabPics", "Pic0", ""), "/home/u/לוגו.png");
  EXPECT_EQ(again.Get("ZDRLab", "Params", "Nope", "ברירת מחדל"), "ברירת מחדל");
  EXPECT_EQ(again.Get("Other", "Params", "K0", "d"), "d")
      << "the application is part of the address";
}

TEST_F(QtStoreTest, FileIsUtf8Text) {
  {
    QtSettingsStore store(ini_);
    store.Save("ZDRLab", "Params", "City", "חיפה");
  }
  std::ifstream in(fs::u8path(ini_), std::ios::binary);
  const std::string content((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  EXPECT_NE(content.find("חיפה"), std::string::npos) << content;
}

TEST_F(QtStoreTest, WholePanelThroughTheFile) {
  Panel saved = ChangedPanel();
  {
    QtSettingsStore store(ini_);
    SetGetRegParams(kActionSave, store, saved);
  }
  QtSettingsStore store(ini_);
  Panel loaded;
  SetGetRegParams(kActionLoad, store, loaded);
  EXPECT_EQ(SavedParams(loaded), SavedParams(saved));
}

TEST_F(QtStoreTest, TwoInstancesOnOneFileSeeEachOthersSaves) {
  QtSettingsStore writer(ini_);
  QtSettingsStore reader(ini_);
  writer.Save("ZDRLab", "PostIL", "Weight", "0.5");
  EXPECT_EQ(reader.Get("ZDRLab", "PostIL", "Weight", ""), "0.5");
}

TEST_F(QtStoreTest, UnwritableFileThrowsOnSave) {
  const fs::path blocker = dir_ / "file";
  std::ofstream(blocker) << "x";
  QtSettingsStore store((blocker / "settings.ini").string());
  EXPECT_THROW(store.Save("ZDRLab", "Params", "City", "x"), SettingsStoreError);
}

TEST_F(QtStoreTest, NativeStoreUsesTheApplicationName) {
  QSettings::setPath(QSettings::NativeFormat, QSettings::UserScope,
                     QString::fromStdString(dir_.string()));
  {
    QtSettingsStore store;
    store.Save("ZDRLab", "Params", "ConnDataBase", "/srv/חברה");
#ifndef _WIN32
    EXPECT_EQ(fs::path(store.Location()).parent_path().filename(), "ZDRLab");
    EXPECT_EQ(store.Location().rfind(dir_.string(), 0), 0u) << store.Location();
#endif
  }
  QtSettingsStore again;
  EXPECT_EQ(again.Get("ZDRLab", "Params", "ConnDataBase", ""), "/srv/חברה");
}

// ---- Label stock, the PDF's settings and the user's stocks ---------------------------

TEST(LabelStockTest, ShippedStocksAreSoundAndTheDefaultComesFirst) {
  const auto& stocks = ShippedLabelStocks();
  ASSERT_GE(stocks.size(), 8u);
  EXPECT_EQ(stocks[0].id, kDefaultStockId);
  std::set<std::string> ids;
  for (const LabelStock& s : stocks) {
    EXPECT_EQ(LabelStockProblem(s), "") << s.id;
    EXPECT_TRUE(ids.insert(s.id).second) << s.id;
  }
  // Position 1 is the top row's rightmost label; the next row starts at the right again.
  const LabelStock s = *FindShippedStock("a4-2x7-99.1x38.1");
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 1).x, 4.65 + 101.6);
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 2).x, 4.65);
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 3).y, 15.15 + 38.1);
  EXPECT_DOUBLE_EQ(StockLabelBox(s, 3, {1, -2}).y, 15.15 + 38.1 - 2);
}

TEST(LabelStockTest, UnusableStocksAreRefused) {
  const LabelStock good = *FindShippedStock(kDefaultStockId);
  const std::vector<std::pair<const char*, std::function<void(LabelStock&)>>> cases = {
      {"empty id", [](LabelStock& s) { s.id = ""; }},
      {"id with a blank", [](LabelStock& s) { s.id = "my stock"; }},
      {"no rows", [](LabelStock& s) { s.rows = 0; }},
      {"label wider than its pitch", [](LabelStock& s) { s.labelWidth = 71; }},
      {"off the page", [](LabelStock& s) { s.top = 2; }},
      {"padding fills the label", [](LabelStock& s) { s.padding = 18.5; }},
      {"negative margin", [](LabelStock& s) { s.side = -1; }},
      {"not a number", [](LabelStock& s) { s.pitchY = std::nan(""); }},
  };
  for (const auto& [name, spoil] : cases) {
    LabelStock s = good;
    spoil(s);
    EXPECT_NE(LabelStockProblem(s), "") << name;
  }
}

TEST(LabelStockTest, OffsetsAreTenthsWithinTenMillimetres) {
  const std::vector<std::pair<const char*, std::optional<StockOffset>>> cases = {
      {"0,0", StockOffset{0, 0}},
      {"1.5,-0.3", StockOffset{1.5, -0.3}},
      {" 10 , -10 ", StockOffset{10, -10}},
      {"+0.1,0", StockOffset{0.1, 0}},
      {"10.1,0", std::nullopt},
      {"0.05,0", std::nullopt},
      {"1;2", std::nullopt},
      {"1,", std::nullopt},
      {"a,b", std::nullopt},
      {"1,2,3", std::nullopt},
      {"1e1,0", std::nullopt},
      {"nan,0", std::nullopt}};
  for (const auto& [text, expected] : cases) EXPECT_EQ(ParseStockOffset(text), expected) << text;
  EXPECT_EQ(CheckedOffsetMm(0.1 + 0.2), 0.3);
  EXPECT_EQ(FormatMm(-0.0), "0");
  EXPECT_EQ(FormatMm(99.1), "99.1");
  EXPECT_EQ(FormatMm(70), "70");
}

TEST(LabelPdfTest, FreshStoreGivesTheDefaultStockNoOffsetAndTheHtmlSheet) {
  MemorySettingsStore store;
  LabelPdfSettings pdf;
  pdf.Template = "x";
  pdf.Offset = {1, 1};
  pdf.Output = 1;
  SetGetRegLabelPdf(kActionLoad, store, pdf);
  EXPECT_EQ(pdf.Template, kDefaultStockId);
  EXPECT_EQ(pdf.Offset, (StockOffset{0, 0}));
  EXPECT_EQ(pdf.Output, 0);
}

TEST(LabelPdfTest, RoundTripAndUnreadableValuesKeepTheOldOnes) {
  MemorySettingsStore store;
  LabelPdfSettings saved;
  saved.Template = "a4-2x4-105x74";
  saved.Offset = {-1.2, 0.7};
  saved.Output = 1;
  SetGetRegLabelPdf(kActionSave, store, saved);
  LabelPdfSettings loaded;
  SetGetRegLabelPdf(kActionLoad, store, loaded);
  EXPECT_EQ(loaded.Template, saved.Template);
  EXPECT_EQ(loaded.Offset, saved.Offset);
  EXPECT_EQ(loaded.Output, 1);

  store.Save(kSettingsApp, kLabelPdfSection, "OffsetX", "12");
  store.Save(kSettingsApp, kLabelPdfSection, "OffsetY", "0,5");
  store.Save(kSettingsApp, kLabelPdfSection, "Output", "2");
  SetGetRegLabelPdf(kActionLoad, store, loaded);
  EXPECT_EQ(loaded.Offset, saved.Offset);
  EXPECT_EQ(loaded.Output, 1);
}

TEST(UserStockTest, SavedStockComesBackAndAnOwnOffsetWinsOverTheUsers) {
  MemorySettingsStore store;
  LabelStock mine = *FindShippedStock("a4-3x8-70x37");
  mine.id = "office-2x5";
  mine.name = "מדבקות המשרד";
  mine.rows = 5;
  mine.cols = 2;
  mine.labelWidth = mine.pitchX = 100;
  mine.labelHeight = mine.pitchY = 55.5;
  mine.side = 5;
  mine.top = 10;
  SaveUserStock(store, mine);
  SaveUserStock(store, mine);  // again: listed once
  ASSERT_EQ(LoadUserStocks(store).size(), 1u);
  EXPECT_EQ(LoadUserStocks(store)[0], mine);
  EXPECT_EQ(*FindLabelStock(store, "office-2x5"), mine);
  EXPECT_EQ(AvailableLabelStocks(store).size(), ShippedLabelStocks().size() + 1);

  LabelPdfSettings pdf;
  pdf.Offset = {0.5, 0.5};
  EXPECT_EQ(EffectiveStockOffset(store, pdf, mine.id), pdf.Offset);
  SaveStockOffset(store, mine.id, StockOffset{-2, 1.1});
  EXPECT_EQ(EffectiveStockOffset(store, pdf, mine.id), (StockOffset{-2, 1.1}));
  EXPECT_EQ(EffectiveStockOffset(store, pdf, kDefaultStockId), pdf.Offset);
  SaveStockOffset(store, mine.id, std::nullopt);
  EXPECT_EQ(EffectiveStockOffset(store, pdf, mine.id), pdf.Offset);
  EXPECT_THROW(SaveStockOffset(store, mine.id, StockOffset{11, 0}), std::invalid_argument);

  RemoveUserStock(store, mine.id);
  EXPECT_TRUE(LoadUserStocks(store).empty());
  EXPECT_FALSE(FindLabelStock(store, mine.id));
}

TEST(UserStockTest, BadOrReservedStocksAreRefusedAndSpoiledOnesLeftOut) {
  MemorySettingsStore store;
  LabelStock shipped = *FindShippedStock(kDefaultStockId);
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
}

}  // namespace
}  // namespace zdr
