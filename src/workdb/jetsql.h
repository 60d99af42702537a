// The Jet dialect of SQL, translated for SQLite.
//
// The translation works on tokens (string literals in single or double quotes with doubled
// quotes inside, bracketed and plain identifiers, numbers, keywords, operators), never by
// text substitution over the raw statement, so a literal that holds `*`, `True` or `Select`
// stays a literal.
#pragma once

#include <string>
#include <string_view>

namespace zdr::db {

// Translates one Jet statement (SELECT, UPDATE, including UPDATE ... INNER JOIN ... SET)
// into SQLite SQL. `LIKE` is kept as LIKE: the engine replaces SQLite's like() with
// JetLike. Throws EngineError(kErrSyntax) for what it cannot translate.
std::string TranslateJetSql(std::string_view jet);

// Jet's LIKE over UTF-8 text: `*` any run, `?` one character, `#` one digit, `[abc]`,
// `[a-z]` and `[!abc]` one character of (or not of) the list; every other character,
// `%` and `_` included, stands for itself. Covers the whole text. Latin letters match
// without regard to case unless `caseSensitive`.
bool JetLike(std::string_view pattern, std::string_view text, bool caseSensitive = false);

}  // namespace zdr::db
