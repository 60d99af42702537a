// The Jet dialect of SQL, translated for SQLite.
//
// The translation works on tokens (string literals in single or double quotes with doubled
// quotes inside, bracketed and plain identifiers, numbers, keywords, operators), never by
// text substitution over the raw statement, so a literal that holds `*`, `True` or `Select`
// stays a literal.
#pragma once

#include <functional>
#include <string>
#include <string_view>

namespace zdr::db {

// Translates one Jet statement (SELECT, UPDATE, including UPDATE ... INNER JOIN ... SET)
// into SQLite SQL. `LIKE` is kept as LIKE: the engine replaces SQLite's like() with
// JetLike. Throws EngineError(kErrSyntax) for what it cannot translate.
//
// `distinctValues`, when given, names for a table and a field (as the statement spells them)
// a table that holds exactly that field's distinct values, or returns "" when there is none.
// In a SELECT, a subquery "(Select Distinct F From T)" then reads that table instead of every
// row of T: the same values, without a pass over T.
using DistinctValuesTable =
    std::function<std::string(std::string_view table, std::string_view field)>;
std::string TranslateJetSql(std::string_view jet, const DistinctValuesTable& distinctValues = {});

// Jet's LIKE over UTF-8 text: `*` any run, `?` one character, `#` one digit, `[abc]`,
// `[a-z]` and `[!abc]` one character of (or not of) the list; every other character,
// `%` and `_` included, stands for itself. Covers the whole text. Latin letters match
// without regard to case unless `caseSensitive`.
bool JetLike(std::string_view pattern, std::string_view text, bool caseSensitive = false);

}  // namespace zdr::db
