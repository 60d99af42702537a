// The account picker's statements over tSelectAccount of the account-selection database.
// Pure functions: they build Jet SQL text and touch no database.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

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

}  // namespace zdr
