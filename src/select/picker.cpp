#include "select/picker.h"

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

}  // namespace zdr
