#include "control/settings.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>

#include "control/stockcatalogue.h"
#include "hostfile/doctypes.h"

namespace zdr {

static_assert(kDocTypeListSize == kDocTypesFilled, "cmbDocType lists the filled rows");

namespace {

std::optional<long> ParseWholeNumber(std::string_view text) {
  // Blanks around the number are accepted, as the controls accept them.
  const auto blank = [](char c) { return c == ' ' || c == '\t'; };
  while (!text.empty() && blank(text.front())) text.remove_prefix(1);
  while (!text.empty() && blank(text.back())) text.remove_suffix(1);
  if (text.size() > 1 && text.front() == '+' && text[1] != '-') text.remove_prefix(1);
  if (text.empty()) return std::nullopt;
  long value = 0;
  const auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (ec != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return value;
}

std::optional<long> ParseInRange(std::string_view text, long low, long high) {
  const auto value = ParseWholeNumber(text);
  if (!value || *value < low || *value > high) return std::nullopt;
  return value;
}

struct ParamEntry {
  std::string key;
  ControlValueRef value;
  uint8_t kind;
  std::string_view defaultValue;
};

// The key table of section Params, in order, bound to one panel.
std::vector<ParamEntry> ParamsTable(Panel& p) {
  const auto text = [](std::string& t) { return ControlValueRef::Text(t); };
  const auto check = [](int& v) { return ControlValueRef::CheckValue(v); };
  const auto list = [](int& i, int size) { return ControlValueRef::ListIndex(i, size); };
  constexpr std::string_view kNone = "";
  constexpr std::string_view kZero = "0";
  constexpr std::string_view kStar = "*";
  constexpr std::string_view kFirstDate = "01/01/1980";
  constexpr std::string_view kLastDate = "01/01/2025";

  std::vector<ParamEntry> t;
  t.reserve(53);
  t.push_back({"UseCatCode", check(p.ChkCatCode), kKindCheck, kZero});
  t.push_back({"FromSort", text(p.txtFromSort), kKindText, kNone});
  t.push_back({"ToSort", text(p.txtToSort), kKindText, kNone});
  t.push_back({"UseAccKey", check(p.ChkAccKey), kKindCheck, kZero});
  for (int i = 1; i <= 4; ++i) {
    t.push_back({"CutOff" + std::to_string(i), text(p.CutOff[i]), kKindText, kStar});
  }
  t.push_back({"UseCutOff", check(p.chkCutOff), kKindCheck, kZero});
  t.push_back({"FromCrd", text(p.TxtFromCrd), kKindText, kNone});
  t.push_back({"ToCrd", text(p.TxtToCrd), kKindText, kNone});
  t.push_back({"UseCity", check(p.ChkCity), kKindCheck, kZero});
  t.push_back({"City", text(p.TxtCity), kKindText, kNone});
  t.push_back({"UsePhone", check(p.ChkPhone), kKindCheck, kZero});
  t.push_back({"Phone", text(p.txtPhone), kKindText, kNone});
  t.push_back({"UseAgent", check(p.ChkAgent), kKindCheck, kZero});
  t.push_back({"FromAgent", text(p.txtAgent), kKindText, kNone});
  t.push_back({"ToAgent", text(p.txtToAgent), kKindText, kNone});
  t.push_back({"UseDates", check(p.ChkDates), kKindCheck, kZero});
  t.push_back({"FromDate", text(p.TxtFromDate), kKindText, kFirstDate});
  t.push_back({"ToDate", text(p.TxtToDate), kKindText, kLastDate});
  t.push_back({"DocType", list(p.cmbDocType, kDocTypeListSize), kKindList, kZero});
  t.push_back({"ByDoc", list(p.cmbByDoc, kByDocListSize), kKindList, kZero});
  t.push_back({"UseJournal", check(p.ChkJournal), kKindCheck, kZero});
  t.push_back({"FromJournal", text(p.txtFromJournal), kKindText, kNone});
  t.push_back({"ToJournal", text(p.txtToJournal), kKindText, kNone});
  t.push_back({"UseTransType", check(p.chkTransType), kKindCheck, kZero});
  t.push_back({"TransType", text(p.txtTransType), kKindText, kNone});
  t.push_back({"UseTransDates", check(p.chkTransDates), kKindCheck, kZero});
  t.push_back({"FromTransDate", text(p.txtFromTransDate), kKindText, kFirstDate});
  // The ledger "to" dates are stored under FromToDate and FromToVDate.
  t.push_back({"FromToDate", text(p.txtToTransDate), kKindText, kLastDate});
  t.push_back({"UseTransVDate", check(p.chkTransVDate), kKindCheck, kZero});
  t.push_back({"FromTransVDate", text(p.txtFromTransVDate), kKindText, kFirstDate});
  t.push_back({"FromToVDate", text(p.txtToTransVDate), kKindText, kLastDate});
  t.push_back({"Rows", text(p.txtRows), kKindText, "8"});
  t.push_back({"Cols", text(p.txtCols), kKindText, "3"});
  t.push_back({"Copies", text(p.txtCopies), kKindText, "1"});
  t.push_back({"SortBy", list(p.CmbSortBy, kSortByListSize), kKindList, kZero});
  t.push_back({"SortDir", list(p.CmbSortDir, kSortDirListSize), kKindList, kZero});
  t.push_back({"ReadTempTrans", check(p.chkReadTempTrans), kKindCheck, kZero});
  t.push_back({"InAccounts", list(p.cmbInAccounts, kInAccountsListSize), kKindList, kZero});
  t.push_back({"AddressFrom", list(p.cmbAddressFrom, kAddressFromListSize), kKindList, kZero});
  for (int i = 0; i <= 8; ++i) {
    t.push_back({"UseTitle" + std::to_string(i), check(p.ChkTitle[i]), kKindCheck, kZero});
  }
  for (int i = 0; i <= 1; ++i) {
    t.push_back({"UseLogo" + std::to_string(i), check(p.ChkLogo[i]), kKindCheck, kZero});
  }
  return t;
}

std::string LabelDefSection(int line) {
  return "LabelDef" + std::to_string(line);
}

// Runs one statement of a routine that ignores errors statement by statement.
template <typename F>
void IgnoringErrors(F&& statement) {
  try {
    statement();
  } catch (const std::exception&) {
  }
}

void LoadByte(SettingsStore& store, std::string_view section, std::string_view key,
              std::string_view defaultValue, uint8_t& field) {
  IgnoringErrors([&] {
    const auto value = ParseInRange(store.Get(kSettingsApp, section, key, defaultValue), 0, 255);
    if (value) field = static_cast<uint8_t>(*value);
  });
}

void LoadInt16(SettingsStore& store, std::string_view section, std::string_view key,
               int16_t& field) {
  IgnoringErrors([&] {
    const auto value = ParseInRange(store.Get(kSettingsApp, section, key, "0"), -32768, 32767);
    if (value) field = static_cast<int16_t>(*value);
  });
}

void LoadText(SettingsStore& store, std::string_view section, std::string_view key,
              std::string& field) {
  IgnoringErrors([&] { field = store.Get(kSettingsApp, section, key, ""); });
}

void SaveValue(SettingsStore& store, std::string_view section, std::string_view key,
               std::string_view value) {
  IgnoringErrors([&] { store.Save(kSettingsApp, section, key, value); });
}

}  // namespace

SettingsValueError::SettingsValueError(std::string key, std::string value)
    : std::runtime_error("הערך השמור \"" + value + "\" של ההגדרה " + key + " אינו תקין"),
      key_(std::move(key)),
      value_(std::move(value)) {}

std::string MemorySettingsStore::Get(std::string_view app, std::string_view section,
                                     std::string_view key, std::string_view defaultValue) {
  const auto it = values_.find(Address(app, section, key));
  return it == values_.end() ? std::string(defaultValue) : it->second;
}

void MemorySettingsStore::Save(std::string_view app, std::string_view section, std::string_view key,
                               std::string_view value) {
  values_[Address(app, section, key)] = std::string(value);
  log_.push_back({std::string(app), std::string(section), std::string(key), std::string(value)});
}

bool MemorySettingsStore::Has(std::string_view app, std::string_view section,
                              std::string_view key) const {
  return values_.count(Address(app, section, key)) != 0;
}

void MemorySettingsStore::Remove(std::string_view app, std::string_view section,
                                 std::string_view key) {
  values_.erase(Address(app, section, key));
}

void SetGetRegValue(uint8_t action, SettingsStore& store, std::string_view app,
                    std::string_view section, std::string_view key, ControlValueRef value,
                    uint8_t kind, std::string_view defaultValue) {
  if (action != kActionSave && action != kActionLoad) return;
  if (kind != kKindText && kind != kKindList && kind != kKindCheck) return;

  const bool fits = kind == kKindText   ? value.text() != nullptr
                    : kind == kKindList ? value.isList()
                                        : value.number() != nullptr && !value.isList();
  if (!fits) {
    throw std::invalid_argument("SetGetRegValue: the value of " + std::string(key) +
                                " is not of kind " + std::to_string(kind));
  }

  if (action == kActionSave) {
    if (kind == kKindText) {
      store.Save(app, section, key, *value.text());
    } else {
      store.Save(app, section, key, std::to_string(*value.number()));
    }
    return;
  }

  std::string stored = store.Get(app, section, key, defaultValue);
  if (kind == kKindText) {
    *value.text() = std::move(stored);
    return;
  }
  // A combo box takes -1 (no entry) or an index of its list; a check box 0, 1 or 2.
  const auto number = kind == kKindList ? ParseInRange(stored, -1, value.listSize() - 1)
                                        : ParseInRange(stored, 0, 2);
  if (!number) throw SettingsValueError(std::string(key), std::move(stored));
  *value.number() = static_cast<int>(*number);
}

std::vector<std::string> ParamsKeys() {
  Panel scratch;
  std::vector<std::string> keys;
  for (auto& entry : ParamsTable(scratch)) keys.push_back(std::move(entry.key));
  return keys;
}

void SetGetRegParams(uint8_t action, SettingsStore& store, Panel& panel) {
  for (const auto& entry : ParamsTable(panel)) {
    SetGetRegValue(action, store, kSettingsApp, kParamsSection, entry.key, entry.value, entry.kind,
                   entry.defaultValue);
  }
}

std::string DefaultConnDataBase() {
#ifdef _WIN32
  return "c:\\ztest";
#else
  const char* home = std::getenv("HOME");
  if (home == nullptr || *home == '\0') return "ztest";
  return (std::filesystem::path(home) / "ztest").string();
#endif
}

void SetGetRegConnParams(uint8_t action, SettingsStore& store, std::string& connDataBase) {
  IgnoringErrors([&] {
    SetGetRegValue(action, store, kSettingsApp, kParamsSection, kConnDataBaseKey,
                   ControlValueRef::Text(connDataBase), kKindText, DefaultConnDataBase());
  });
}

void SetGetRegLabelDefs(uint8_t action, SettingsStore& store, LabelSettings& labels) {
  if (action == kActionSave) {
    for (int i = 0; i <= 7; ++i) {
      const std::string section = LabelDefSection(i);
      const LabelLineDef& line = labels.LabelDefs[i];
      SaveValue(store, section, "Font", std::to_string(line.Font));
      SaveValue(store, section, "FontSize", std::to_string(line.FontSize));
      SaveValue(store, section, "FontWeight", std::to_string(line.FontWeight));
      SaveValue(store, section, "FontUL", std::to_string(line.FontUL));
      SaveValue(store, section, "FontItalic", std::to_string(line.FontItalic));
    }
    SaveValue(store, kLabPicsSection, "Pic0", labels.LabPics[0]);
    SaveValue(store, kLabPicsSection, "Pic1", labels.LabPics[1]);
  } else if (action == kActionLoad) {
    for (int i = 0; i <= 7; ++i) {
      const std::string section = LabelDefSection(i);
      LabelLineDef& line = labels.LabelDefs[i];
      LoadByte(store, section, "Font", "0", line.Font);
      LoadByte(store, section, "FontSize", "9", line.FontSize);
      LoadByte(store, section, "FontWeight", "0", line.FontWeight);
      LoadByte(store, section, "FontUL", "0", line.FontUL);
      LoadByte(store, section, "FontItalic", "0", line.FontItalic);
    }
    LoadText(store, kLabPicsSection, "Pic0", labels.LabPics[0]);
    LoadText(store, kLabPicsSection, "Pic1", labels.LabPics[1]);
  }
}

void SetGetRegPostILDefs(uint8_t action, SettingsStore& store, PostILSettings& postIL) {
  if (action == kActionSave) {
    SaveValue(store, kPostILSection, "Service", postIL.Service);
    SaveValue(store, kPostILSection, "Weight", postIL.Weight);
    SaveValue(store, kPostILSection, "Confirm", postIL.Confirm);
    SaveValue(store, kPostILSection, "FilePath", postIL.FilePath);
    SaveValue(store, kPostILSection, "OpenExcel", std::to_string(postIL.OpenExcel));
    SaveValue(store, kPostILSection, "FileFormat", std::to_string(postIL.FileFormat));
  } else if (action == kActionLoad) {
    LoadText(store, kPostILSection, "Service", postIL.Service);
    LoadText(store, kPostILSection, "Weight", postIL.Weight);
    LoadText(store, kPostILSection, "Confirm", postIL.Confirm);
    LoadText(store, kPostILSection, "FilePath", postIL.FilePath);
    LoadInt16(store, kPostILSection, "OpenExcel", postIL.OpenExcel);
    LoadInt16(store, kPostILSection, "FileFormat", postIL.FileFormat);
  }
}

namespace {

std::string StockSection(std::string_view id) {
  return "LabelStock." + std::string(id);
}

std::vector<std::string> UserStockIds(SettingsStore& store) {
  std::vector<std::string> ids;
  const std::string list = store.Get(kSettingsApp, kLabelStocksSection, "Ids", "");
  size_t from = 0;
  while (from <= list.size()) {
    const size_t semi = std::min(list.find(';', from), list.size());
    if (semi > from) {
      std::string id = list.substr(from, semi - from);
      if (std::find(ids.begin(), ids.end(), id) == ids.end()) ids.push_back(std::move(id));
    }
    from = semi + 1;
  }
  return ids;
}

void SaveUserStockIds(SettingsStore& store, const std::vector<std::string>& ids) {
  std::string list;
  for (const auto& id : ids) list += (list.empty() ? "" : ";") + id;
  store.Save(kSettingsApp, kLabelStocksSection, "Ids", list);
}

std::optional<LabelStock> LoadUserStock(SettingsStore& store, const std::string& id) {
  const std::string section = StockSection(id);
  LabelStock s;
  s.id = id;
  s.name = store.Get(kSettingsApp, section, "Name", id);
  const std::pair<const char*, double*> sizes[] = {
      {"PageWidth", &s.pageWidth}, {"PageHeight", &s.pageHeight}, {"Top", &s.top},
      {"Side", &s.side},           {"LabelWidth", &s.labelWidth}, {"LabelHeight", &s.labelHeight},
      {"PitchX", &s.pitchX},       {"PitchY", &s.pitchY},         {"Padding", &s.padding}};
  for (const auto& [key, field] : sizes) {
    const auto v = ParseMm(store.Get(kSettingsApp, section, key, ""));
    if (!v) return std::nullopt;
    *field = *v;
  }
  const auto rows = ParseInRange(store.Get(kSettingsApp, section, "Rows", ""), 1, 100);
  const auto cols = ParseInRange(store.Get(kSettingsApp, section, "Cols", ""), 1, 100);
  if (!rows || !cols) return std::nullopt;
  s.rows = static_cast<int>(*rows);
  s.cols = static_cast<int>(*cols);
  if (!UserStockIdProblem(s.id).empty() || !LabelStockProblem(s).empty() || FindShippedStock(s.id))
    return std::nullopt;
  return s;
}

std::optional<double> LoadOffsetMm(SettingsStore& store, std::string_view section,
                                   std::string_view key, std::string_view defaultValue) {
  const auto v = ParseMm(store.Get(kSettingsApp, section, key, defaultValue));
  return v ? CheckedOffsetMm(*v) : std::nullopt;
}

std::optional<double> LoadScalePerMille(SettingsStore& store, std::string_view section,
                                        std::string_view key) {
  const auto v = ParseMm(store.Get(kSettingsApp, section, key, "0"));
  return v ? CheckedScalePerMille(*v) : std::nullopt;
}

}  // namespace

void SetGetRegLabelPdf(uint8_t action, SettingsStore& store, LabelPdfSettings& pdf) {
  if (action == kActionSave) {
    SaveValue(store, kLabelPdfSection, "Template", pdf.Template);
    SaveValue(store, kLabelPdfSection, "OffsetX", FormatMm(pdf.Offset.x));
    SaveValue(store, kLabelPdfSection, "OffsetY", FormatMm(pdf.Offset.y));
    SaveValue(store, kLabelPdfSection, "ScaleX", FormatMm(pdf.Offset.scaleX));
    SaveValue(store, kLabelPdfSection, "ScaleY", FormatMm(pdf.Offset.scaleY));
    SaveValue(store, kLabelPdfSection, "Output", std::to_string(pdf.Output));
  } else if (action == kActionLoad) {
    IgnoringErrors([&] {
      std::string id = store.Get(kSettingsApp, kLabelPdfSection, "Template", kDefaultStockId);
      if (!id.empty()) pdf.Template = std::move(id);
    });
    IgnoringErrors([&] {
      if (const auto x = LoadOffsetMm(store, kLabelPdfSection, "OffsetX", "0")) pdf.Offset.x = *x;
    });
    IgnoringErrors([&] {
      if (const auto y = LoadOffsetMm(store, kLabelPdfSection, "OffsetY", "0")) pdf.Offset.y = *y;
    });
    IgnoringErrors([&] {
      if (const auto v = LoadScalePerMille(store, kLabelPdfSection, "ScaleX"))
        pdf.Offset.scaleX = *v;
    });
    IgnoringErrors([&] {
      if (const auto v = LoadScalePerMille(store, kLabelPdfSection, "ScaleY"))
        pdf.Offset.scaleY = *v;
    });
    IgnoringErrors([&] {
      const auto v = ParseInRange(store.Get(kSettingsApp, kLabelPdfSection, "Output", "0"), 0, 1);
      if (v) pdf.Output = static_cast<int16_t>(*v);
    });
  }
}

std::vector<LabelStock> LoadUserStocks(SettingsStore& store) {
  std::vector<LabelStock> stocks;
  for (const std::string& id : UserStockIds(store)) {
    if (auto s = LoadUserStock(store, id)) stocks.push_back(std::move(*s));
  }
  return stocks;
}

void SaveUserStock(SettingsStore& store, const LabelStock& stock) {
  std::string problem = UserStockIdProblem(stock.id);
  if (problem.empty()) problem = LabelStockProblem(stock);
  if (!problem.empty()) throw std::invalid_argument(problem);
  if (FindShippedStock(stock.id))
    throw std::invalid_argument("השם " + stock.id + " שמור לתבנית מובנית; בחרו שם אחר");
  const std::string section = StockSection(stock.id);
  store.Save(kSettingsApp, section, "Name", stock.name.empty() ? stock.id : stock.name);
  const std::pair<const char*, double> sizes[] = {{"PageWidth", stock.pageWidth},
                                                  {"PageHeight", stock.pageHeight},
                                                  {"Top", stock.top},
                                                  {"Side", stock.side},
                                                  {"LabelWidth", stock.labelWidth},
                                                  {"LabelHeight", stock.labelHeight},
                                                  {"PitchX", stock.pitchX},
                                                  {"PitchY", stock.pitchY},
                                                  {"Padding", stock.padding}};
  for (const auto& [key, value] : sizes) store.Save(kSettingsApp, section, key, FormatMm(value));
  store.Save(kSettingsApp, section, "Rows", std::to_string(stock.rows));
  store.Save(kSettingsApp, section, "Cols", std::to_string(stock.cols));
  std::vector<std::string> ids = UserStockIds(store);
  if (std::find(ids.begin(), ids.end(), stock.id) == ids.end()) {
    ids.push_back(stock.id);
    SaveUserStockIds(store, ids);
  }
}

void RemoveUserStock(SettingsStore& store, std::string_view id) {
  std::vector<std::string> ids = UserStockIds(store);
  const auto it = std::find(ids.begin(), ids.end(), id);
  if (it == ids.end()) return;
  ids.erase(it);
  SaveUserStockIds(store, ids);
}

std::vector<LabelStock> AvailableLabelStocks(SettingsStore& store) {
  std::vector<LabelStock> all = ShippedLabelStocks();
  for (auto& s : LoadUserStocks(store)) all.push_back(std::move(s));
  return all;
}

std::optional<LabelStock> FindLabelStock(SettingsStore& store, std::string_view id) {
  if (auto shipped = FindShippedStock(id)) return shipped;
  for (const std::string& user : UserStockIds(store)) {
    if (user == id) return LoadUserStock(store, user);
  }
  if (const CatalogueEntry* e = InstalledStockCatalogue().Find(id)) return e->stock;
  return std::nullopt;
}

std::string LabelStockLookupProblem(SettingsStore& store, std::string_view id) {
  if (FindLabelStock(store, id)) return "";
  if (const CatalogueEntry* e = InstalledStockCatalogue().Find(id)) {
    return "את תבנית המדבקות \"" + std::string(id) + "\" לא ניתן להדפיס: " + e->problem;
  }
  for (const std::string& user : UserStockIds(store)) {
    if (user != id) continue;
    // A stock of the user's own whose stored figures are spoilt: say which check fails.
    std::string problem = UserStockIdProblem(id);
    if (problem.empty()) problem = "הערכים השמורים שלה חסרים או אינם תקינים";
    return "את תבנית המדבקות \"" + std::string(id) + "\" לא ניתן להדפיס: " + problem;
  }
  return "תבנית המדבקות \"" + std::string(id) + "\" אינה מוכרת";
}

std::optional<StockOffset> LoadStockOffset(SettingsStore& store, std::string_view id) {
  const std::string section = StockSection(id);
  const auto x = LoadOffsetMm(store, section, "OffsetX", "");
  const auto y = LoadOffsetMm(store, section, "OffsetY", "");
  if (!x || !y) return std::nullopt;
  // Kept before the scales were: no scale.
  const auto scaleX = LoadScalePerMille(store, section, "ScaleX");
  const auto scaleY = LoadScalePerMille(store, section, "ScaleY");
  return StockOffset{*x, *y, scaleX.value_or(0), scaleY.value_or(0)};
}

void SaveStockOffset(SettingsStore& store, std::string_view id,
                     const std::optional<StockOffset>& offset) {
  const std::string section = StockSection(id);
  if (!offset) {
    store.Save(kSettingsApp, section, "OffsetX", "");
    store.Save(kSettingsApp, section, "OffsetY", "");
    store.Save(kSettingsApp, section, "ScaleX", "");
    store.Save(kSettingsApp, section, "ScaleY", "");
    return;
  }
  if (!CheckedOffsetMm(offset->x) || !CheckedOffsetMm(offset->y))
    throw std::invalid_argument("ההיסט חייב להיות בין -10 ל-10 מ\"מ, בצעדים של 0.1");
  if (!CheckedScalePerMille(offset->scaleX) || !CheckedScalePerMille(offset->scaleY))
    throw std::invalid_argument("תיקון קנה המידה חייב להיות בין -100 ל-100 פרומיל, בצעדים של 0.1");
  store.Save(kSettingsApp, section, "OffsetX", FormatMm(offset->x));
  store.Save(kSettingsApp, section, "OffsetY", FormatMm(offset->y));
  store.Save(kSettingsApp, section, "ScaleX", FormatMm(offset->scaleX));
  store.Save(kSettingsApp, section, "ScaleY", FormatMm(offset->scaleY));
}

StockOffset EffectiveStockOffset(SettingsStore& store, const LabelPdfSettings& pdf,
                                 std::string_view id) {
  try {
    if (auto own = LoadStockOffset(store, id)) return *own;
  } catch (const std::exception&) {
  }
  return pdf.Offset;
}

}  // namespace zdr
