#include "select/picker.h"

#include <variant>

#include "engine/engine.h"

namespace zdr {

std::string BuildPickerSQL(std::string& pFilter, bool pMarkedOnly, int16_t pickerSortIndex) {
  std::string sql = "Select SortByKey, SortByName, Include";
  sql += " From tSelectAccount";
  sql += " Where SortByKey > ''";
  if (pMarkedOnly) sql += " And Include = True";
  if (!pFilter.empty()) {
    pFilter += " Or Include = True";
    sql += pFilter;
  }
  sql += " Order By ";
  sql += pickerSortIndex >= 1 ? "SortByName" : "SortByKey";
  return sql;
}

std::string QuoteJetText(std::string_view text) {
  std::string out = "'";
  for (char c : text) {
    if (c == '\'') out += '\'';
    out += c;
  }
  out += '\'';
  return out;
}

std::string BuildNameFilter(std::string_view text) {
  std::string pattern = "*";
  for (char c : text) {
    switch (c) {
      case '\'':
        pattern += "''";
        break;
      case '*':
      case '?':
      case '#':
      case '[':
        // A bracketed character matches itself only.
        pattern += '[';
        pattern += c;
        pattern += ']';
        break;
      default:
        pattern += c;
    }
  }
  pattern += '*';
  return " And SortByName Like '" + pattern + "'";
}

std::string BuildSetIncludeSQL(std::string_view sortByKey, bool include) {
  std::string sql = "Update tSelectAccount Set Include = ";
  sql += include ? "True" : "False";
  sql += " Where SortByKey = ";
  sql += QuoteJetText(sortByKey);
  return sql;
}

namespace {

std::string TextOf(const db::Value& v) {
  if (const auto* s = std::get_if<std::string>(&v)) return *s;
  return {};
}

bool TrueOf(const db::Value& v) {
  if (const auto* i = std::get_if<int64_t>(&v)) return *i != 0;
  if (const auto* d = std::get_if<double>(&v)) return *d != 0;
  return false;
}

db::Database OpenSelection(const std::string& dbPath) {
  // Before the first scan there is no database to open.
  if (dbPath.empty()) throw db::EngineError(db::kErrCannotOpen, "לא נוצר בסיס נתוני הבחירה");
  return db::Database::Open(dbPath);
}

}  // namespace

std::vector<PickerRow> ReadPickerRows(const std::string& dbPath, std::string_view recordSource) {
  db::Database database = OpenSelection(dbPath);
  db::Snapshot snap = database.OpenSnapshot(recordSource);
  const int key = snap.FieldIndex("SortByKey");
  const int name = snap.FieldIndex("SortByName");
  const int include = snap.FieldIndex("Include");
  std::vector<PickerRow> rows;
  if (!snap.AtEnd()) snap.MoveFirst();
  while (!snap.AtEnd()) {
    rows.push_back(
        {TextOf(snap.Field(key)), TextOf(snap.Field(name)), TrueOf(snap.Field(include))});
    snap.MoveNext();
  }
  return rows;
}

void ExecutePickerSQL(const std::string& dbPath, std::string_view jetSql) {
  OpenSelection(dbPath).Execute(jetSql);
}

}  // namespace zdr
