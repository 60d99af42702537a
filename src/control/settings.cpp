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
#include "output/preflight.h"

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

using Ref = std::variant<std::string*, int*, int16_t*>;

// Where a value lives, as a function the table can hold.
#define ZDR_AT(expr) [](SettingTargets& t, [[maybe_unused]] int i) -> Ref { return &(expr); }

std::vector<SettingDef> BuildSettingsTable() {
  constexpr std::string_view kNone = "";
  constexpr std::string_view kZero = "0";
  constexpr std::string_view kFirstDate = "01/01/1980";
  constexpr std::string_view kLastDate = "01/01/2025";
  constexpr auto kText = ValueRule::kText;
  constexpr auto kCheck = ValueRule::kCheck;
  constexpr auto kList = ValueRule::kList;
  constexpr auto kParams = Stored::kByParams;

  std::vector<SettingDef> t;
  const auto text = [&t](std::string name, std::string_view def, auto at, int i = 0) {
    t.push_back({std::move(name), kParams, kText, 0, def, at, i});
  };
  const auto check = [&t](std::string name, auto at, int i = 0) {
    t.push_back({std::move(name), kParams, kCheck, 0, "0", at, i});
  };
  const auto list = [&t](std::string name, int size, auto at) {
    t.push_back({std::move(name), kParams, kList, size, "0", at, 0});
  };

  // Section Params, in the order SetGetRegParams moves it.
  check("UseCatCode", ZDR_AT(t.panel.ChkCatCode));
  text("FromSort", kNone, ZDR_AT(t.panel.txtFromSort));
  text("ToSort", kNone, ZDR_AT(t.panel.txtToSort));
  check("UseAccKey", ZDR_AT(t.panel.ChkAccKey));
  for (int i = 1; i <= 4; ++i)
    text("CutOff" + std::to_string(i), "*", ZDR_AT(t.panel.CutOff[i]), i);
  check("UseCutOff", ZDR_AT(t.panel.chkCutOff));
  text("FromCrd", kNone, ZDR_AT(t.panel.TxtFromCrd));
  text("ToCrd", kNone, ZDR_AT(t.panel.TxtToCrd));
  check("UseCity", ZDR_AT(t.panel.ChkCity));
  text("City", kNone, ZDR_AT(t.panel.TxtCity));
  check("UsePhone", ZDR_AT(t.panel.ChkPhone));
  text("Phone", kNone, ZDR_AT(t.panel.txtPhone));
  check("UseAgent", ZDR_AT(t.panel.ChkAgent));
  text("FromAgent", kNone, ZDR_AT(t.panel.txtAgent));
  text("ToAgent", kNone, ZDR_AT(t.panel.txtToAgent));
  check("UseDates", ZDR_AT(t.panel.ChkDates));
  text("FromDate", kFirstDate, ZDR_AT(t.panel.TxtFromDate));
  text("ToDate", kLastDate, ZDR_AT(t.panel.TxtToDate));
  list("DocType", kDocTypeListSize, ZDR_AT(t.panel.cmbDocType));
  list("ByDoc", kByDocListSize, ZDR_AT(t.panel.cmbByDoc));
  check("UseJournal", ZDR_AT(t.panel.ChkJournal));
  text("FromJournal", kNone, ZDR_AT(t.panel.txtFromJournal));
  text("ToJournal", kNone, ZDR_AT(t.panel.txtToJournal));
  check("UseTransType", ZDR_AT(t.panel.chkTransType));
  text("TransType", kNone, ZDR_AT(t.panel.txtTransType));
  check("UseTransDates", ZDR_AT(t.panel.chkTransDates));
  text("FromTransDate", kFirstDate, ZDR_AT(t.panel.txtFromTransDate));
  // The ledger "to" dates are stored under FromToDate and FromToVDate.
  text("FromToDate", kLastDate, ZDR_AT(t.panel.txtToTransDate));
  check("UseTransVDate", ZDR_AT(t.panel.chkTransVDate));
  text("FromTransVDate", kFirstDate, ZDR_AT(t.panel.txtFromTransVDate));
  text("FromToVDate", kLastDate, ZDR_AT(t.panel.txtToTransVDate));
  text("Rows", "8", ZDR_AT(t.panel.txtRows));
  text("Cols", "3", ZDR_AT(t.panel.txtCols));
  text("Copies", "1", ZDR_AT(t.panel.txtCopies));
  list("SortBy", kSortByListSize, ZDR_AT(t.panel.CmbSortBy));
  list("SortDir", kSortDirListSize, ZDR_AT(t.panel.CmbSortDir));
  check("ReadTempTrans", ZDR_AT(t.panel.chkReadTempTrans));
  list("InAccounts", kInAccountsListSize, ZDR_AT(t.panel.cmbInAccounts));
  list("AddressFrom", kAddressFromListSize, ZDR_AT(t.panel.cmbAddressFrom));
  for (int i = 0; i <= 8; ++i)
    check("UseTitle" + std::to_string(i), ZDR_AT(t.panel.ChkTitle[i]), i);
  for (int i = 0; i <= 1; ++i) check("UseLogo" + std::to_string(i), ZDR_AT(t.panel.ChkLogo[i]), i);

  // Section PostIL, in the order SetGetRegPostILDefs moves it.
  constexpr auto kPost = Stored::kByPostIL;
  t.push_back({"Service", kPost, kText, 0, kNone, ZDR_AT(t.postIL.Service), 0});
  t.push_back({"Weight", kPost, ValueRule::kWeight, 0, kNone, ZDR_AT(t.postIL.Weight), 0});
  t.push_back({"Confirm", kPost, kText, 0, kNone, ZDR_AT(t.postIL.Confirm), 0});
  t.push_back({"FilePath", kPost, kText, 0, kNone, ZDR_AT(t.postIL.FilePath), 0});
  t.push_back({"OpenExcel", kPost, kCheck, 0, kZero, ZDR_AT(t.postIL.OpenExcel), 0});
  t.push_back({"FileFormat", kPost, kList, static_cast<int>(kFileFormatEntries.size()), kZero,
               ZDR_AT(t.postIL.FileFormat), 0});

  t.push_back({std::string(kConnDataBaseKey), Stored::kConnection, kText, 0, kNone,
               ZDR_AT(t.companyPath), 0});

  // Panel controls the store does not keep.
  constexpr auto kNot = Stored::kNot;
  t.push_back({"txtFromRef", kNot, kText, 0, kNone, ZDR_AT(t.panel.txtFromRef), 0});
  t.push_back({"txtToRef", kNot, kText, 0, kNone, ZDR_AT(t.panel.txtToRef), 0});
  t.push_back({"ChkByItems", kNot, kCheck, 0, kZero, ZDR_AT(t.panel.ChkByItems), 0});
  t.push_back({"txtFromItmKey", kNot, kText, 0, kNone, ZDR_AT(t.panel.txtFromItmKey), 0});
  t.push_back({"txtToItmKey", kNot, kText, 0, kNone, ZDR_AT(t.panel.txtToItmKey), 0});
  t.push_back({"txtFromItmSort", kNot, kText, 0, kNone, ZDR_AT(t.panel.txtFromItmSort), 0});
  t.push_back({"txtToItmSort", kNot, kText, 0, kNone, ZDR_AT(t.panel.txtToItmSort), 0});
  t.push_back({"txtStartFrom", kNot, kText, 0, "1", ZDR_AT(t.panel.txtStartFrom), 0});
  return t;
}

#undef ZDR_AT

// The number `text` stands for under a number rule, or nothing when the rule refuses it.
std::optional<long> RuleNumber(ValueRule rule, int listSize, std::string_view text) {
  return rule == ValueRule::kList ? ParseInRange(text, -1, listSize - 1) : ParseInRange(text, 0, 2);
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

void LoadText(SettingsStore& store, std::string_view section, std::string_view key,
              std::string& field) {
  IgnoringErrors([&] { field = store.Get(kSettingsApp, section, key, ""); });
}

void SaveValue(SettingsStore& store, std::string_view section, std::string_view key,
               std::string_view value) {
  IgnoringErrors([&] { store.Save(kSettingsApp, section, key, value); });
}

}  // namespace

SettingsValueError::SettingsValueError(std::string section, std::string key, std::string value)
    : std::runtime_error("הערך \"" + value + "\" של ההגדרה " + key + " אינו תקין" +
                         [&key] {
                           const SettingDef* def = FindSetting(key);
                           return def == nullptr ? std::string() : " (" + AllowedValues(*def) + ")";
                         }()),
      section_(std::move(section)),
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
  const auto number = kind == kKindList ? RuleNumber(ValueRule::kList, value.listSize(), stored)
                                        : RuleNumber(ValueRule::kCheck, 0, stored);
  if (!number) throw SettingsValueError(std::string(section), std::string(key), std::move(stored));
  *value.number() = static_cast<int>(*number);
}

const std::vector<SettingDef>& SettingsTable() {
  static const std::vector<SettingDef> table = BuildSettingsTable();
  return table;
}

const SettingDef* FindSetting(std::string_view name) {
  for (const SettingDef& def : SettingsTable()) {
    if (def.name == name) return &def;
  }
  return nullptr;
}

std::string_view SectionOf(const SettingDef& def) {
  switch (def.stored) {
    case Stored::kByParams:
    case Stored::kConnection:
      return kParamsSection;
    case Stored::kByPostIL:
      return kPostILSection;
    case Stored::kNot:
      break;
  }
  return "";
}

std::string AllowedValues(const SettingDef& def) {
  switch (def.rule) {
    case ValueRule::kText:
      return "כל טקסט";
    case ValueRule::kCheck:
      return "0, 1 או 2";
    case ValueRule::kList:
      return "0 עד " + std::to_string(def.listSize - 1) + ", או -1 ללא בחירה";
    case ValueRule::kWeight:
      return "ריק, או מספר חיובי עם נקודה עשרונית, למשל 0.5";
  }
  return "";
}

void ApplySetting(const SettingDef& def, std::string_view text, SettingTargets targets) {
  const Ref at = def.at(targets, def.index);
  const auto refuse = [&] {
    return SettingsValueError(std::string(SectionOf(def)), def.name, std::string(text));
  };
  if (def.rule == ValueRule::kText || def.rule == ValueRule::kWeight) {
    if (def.rule == ValueRule::kWeight && !IsDispatchWeight(text)) throw refuse();
    *std::get<std::string*>(at) = std::string(text);
    return;
  }
  const std::optional<long> number = RuleNumber(def.rule, def.listSize, text);
  if (!number) throw refuse();
  if (int* const* i = std::get_if<int*>(&at)) {
    **i = static_cast<int>(*number);
  } else {
    *std::get<int16_t*>(at) = static_cast<int16_t>(*number);
  }
}

std::vector<std::string> ParamsKeys() {
  std::vector<std::string> keys;
  for (const SettingDef& def : SettingsTable()) {
    if (def.stored == Stored::kByParams) keys.push_back(def.name);
  }
  return keys;
}

void SetGetRegParams(uint8_t action, SettingsStore& store, Panel& panel) {
  PostILSettings unused;
  std::string noPath;
  SettingTargets targets{panel, unused, noPath};
  for (const SettingDef& def : SettingsTable()) {
    if (def.stored != Stored::kByParams) continue;
    const Ref at = def.at(targets, def.index);
    const ControlValueRef value =
        def.rule == ValueRule::kText ? ControlValueRef::Text(*std::get<std::string*>(at))
        : def.rule == ValueRule::kList
            ? ControlValueRef::ListIndex(*std::get<int*>(at), def.listSize)
            : ControlValueRef::CheckValue(*std::get<int*>(at));
    const uint8_t kind = def.rule == ValueRule::kText   ? kKindText
                         : def.rule == ValueRule::kList ? kKindList
                                                        : kKindCheck;
    SetGetRegValue(action, store, kSettingsApp, kParamsSection, def.name, value, kind,
                   def.defaultValue);
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

std::vector<SettingsValueError> SetGetRegPostILDefs(uint8_t action, SettingsStore& store,
                                                    PostILSettings& postIL) {
  std::vector<SettingsValueError> refused;
  if (action != kActionSave && action != kActionLoad) return refused;
  Panel unused;
  std::string noPath;
  SettingTargets targets{unused, postIL, noPath};
  for (const SettingDef& def : SettingsTable()) {
    if (def.stored != Stored::kByPostIL) continue;
    if (action == kActionSave) {
      const Ref at = def.at(targets, def.index);
      const std::string text = std::holds_alternative<std::string*>(at)
                                   ? *std::get<std::string*>(at)
                                   : std::to_string(*std::get<int16_t*>(at));
      SaveValue(store, kPostILSection, def.name, text);
      continue;
    }
    // Statement by statement: a value that cannot be read or is refused leaves the old one.
    try {
      ApplySetting(def, store.Get(kSettingsApp, kPostILSection, def.name, def.defaultValue),
                   targets);
    } catch (const SettingsValueError& e) {
      refused.push_back(e);
    } catch (const std::exception&) {
    }
  }
  return refused;
}

std::string RefusedSettingsMessage(const std::vector<SettingsValueError>& refused,
                                   std::string_view where) {
  std::string text;
  for (const SettingsValueError& e : refused) {
    if (!text.empty()) text += "\n";
    text += where.empty() ? std::string("בהגדרות השמורות: ")
                          : "בקובץ ההגדרות " + std::string(where) + ": ";
    text += e.what();
    text += ". ";
    const SettingDef* def = FindSetting(e.key());
    if (def != nullptr && def->stored == Stored::kByParams) {
      text += "ההגדרה הזאת וההגדרות שאחריה בחלון הראשי לא נטענו, ומוצגים בהן ערכי ברירת המחדל";
    } else {
      text += "ההגדרה הזאת לא נטענה";
    }
  }
  return text;
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

// The user's stock `id` from the store, or nothing with the reason in `why` (Hebrew).
std::optional<LabelStock> LoadUserStock(SettingsStore& store, const std::string& id,
                                        std::string& why) {
  const std::string section = StockSection(id);
  LabelStock s;
  s.id = id;
  s.name = store.Get(kSettingsApp, section, "Name", id);
  const std::pair<const char*, double*> sizes[] = {
      {"PageWidth", &s.pageWidth}, {"PageHeight", &s.pageHeight}, {"Top", &s.top},
      {"Side", &s.side},           {"LabelWidth", &s.labelWidth}, {"LabelHeight", &s.labelHeight},
      {"PitchX", &s.pitchX},       {"PitchY", &s.pitchY},         {"Padding", &s.padding}};
  const auto missing = [&](const char* key) {
    why = "הערך " + std::string(key) + " של התבנית חסר או אינו מספר";
    return std::nullopt;
  };
  for (const auto& [key, field] : sizes) {
    const auto v = ParseMm(store.Get(kSettingsApp, section, key, ""));
    if (!v) return missing(key);
    *field = *v;
  }
  const auto rows = ParseInRange(store.Get(kSettingsApp, section, "Rows", ""), 1, 100);
  if (!rows) return missing("Rows");
  const auto cols = ParseInRange(store.Get(kSettingsApp, section, "Cols", ""), 1, 100);
  if (!cols) return missing("Cols");
  s.rows = static_cast<int>(*rows);
  s.cols = static_cast<int>(*cols);
  why = UserStockIdProblem(s.id);
  if (!why.empty()) return std::nullopt;
  if (FindShippedStock(s.id)) {
    why = "השם " + s.id + " שמור לתבנית מובנית";
    return std::nullopt;
  }
  why = LabelStockProblem(s);
  if (!why.empty()) return std::nullopt;
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
  std::string why;
  for (const std::string& id : UserStockIds(store)) {
    if (auto s = LoadUserStock(store, id, why)) stocks.push_back(std::move(*s));
  }
  return stocks;
}

std::vector<std::pair<std::string, std::string>> UnusableUserStocks(SettingsStore& store) {
  std::vector<std::pair<std::string, std::string>> unusable;
  std::string why;
  for (const std::string& id : UserStockIds(store)) {
    if (!LoadUserStock(store, id, why)) unusable.emplace_back(id, why);
  }
  return unusable;
}

std::string LabelStockChoiceProblem(SettingsStore& store, std::string_view id) {
  if (FindShippedStock(id)) return "";
  std::string why;
  for (const std::string& user : UserStockIds(store)) {
    if (user != id) continue;
    if (LoadUserStock(store, user, why)) return "";
    return "תבנית המדבקות \"" + user + "\" שבהגדרות אינה תקינה: " + why;
  }
  if (const CatalogueEntry* e = InstalledStockCatalogue().Find(id)) {
    if (e->stock) return "";
    return "את תבנית המדבקות \"" + std::string(id) + "\" לא ניתן להדפיס: " + e->problem;
  }
  std::string known;
  for (const LabelStock& s : AvailableLabelStocks(store))
    known += (known.empty() ? "" : ", ") + s.id;
  // The catalogue's are too many to list.
  if (!InstalledStockCatalogue().entries.empty())
    known += ", ותבניות הקטלוג לפי יצרן ומק\"ט (כמו \"Avery L7160\")";
  return "תבנית המדבקות \"" + std::string(id) + "\" אינה מוכרת. התבניות המוכרות: " + known;
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
  std::string why;
  for (const std::string& user : UserStockIds(store)) {
    if (user == id) return LoadUserStock(store, user, why);
  }
  if (const CatalogueEntry* e = InstalledStockCatalogue().Find(id)) return e->stock;
  return std::nullopt;
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
