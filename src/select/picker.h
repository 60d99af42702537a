// The account picker's statements over tSelectAccount of the account-selection database,
// and the two calls that run them there. The statements are pure functions of their
// arguments; only ReadPickerRows and ExecutePickerSQL touch the database.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace zdr {

// The picker's record source: the accounts with a key, optionally only the ticked ones,
// optionally narrowed by `pFilter` (a clause starting " And ..."), ordered by SortByKey when
// `pickerSortIndex` is 0 or below and by SortByName from 1 up.
// When `pFilter` is not empty, " Or Include = True" is appended to the caller's `pFilter`
// itself before it goes into the statement, so the ticked accounts always stay in view.
std::string BuildPickerSQL(std::string& pFilter, bool pMarkedOnly, int16_t pickerSortIndex);

// The find-by-description filter: " And SortByName Like '*<text>*'" with every quote
// doubled and the pattern characters of LIKE ("*", "?", "#", "[") taken literally.
std::string BuildNameFilter(std::string_view text);

// A Jet string literal in single quotes, every quote inside doubled.
std::string QuoteJetText(std::string_view text);

// The statement that ticks (or unticks) one account of the picker, found by its sort key.
std::string BuildSetIncludeSQL(std::string_view sortByKey, bool include);

// The statements of "mark all" and "unmark all".
inline constexpr std::string_view kMarkAllSQL =
    "Update tSelectAccount Set Include = True Where Include = False";
inline constexpr std::string_view kUnmarkAllSQL =
    "Update tSelectAccount Set Include = False Where Include = True";

// One account of the picker.
struct PickerRow {
  std::string key;   // SortByKey
  std::string name;  // SortByName
  bool include = false;
};

// The rows of `recordSource` (a statement of BuildPickerSQL) in the account-selection
// database at `dbPath`, opened for this call alone. Throws the engine's error when the
// database or the statement fails; an empty path is such a failure.
std::vector<PickerRow> ReadPickerRows(const std::string& dbPath, std::string_view recordSource);

// Runs a statement that changes rows (a tick, mark all) on the account-selection database
// at `dbPath`, opened for this call alone. Throws as ReadPickerRows does.
void ExecutePickerSQL(const std::string& dbPath, std::string_view jetSql);

}  // namespace zdr
