#include "control/settings.h"

#include <charconv>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>

#include "import/doctypes.h"

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

}  // namespace zdr
