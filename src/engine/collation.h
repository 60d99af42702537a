// The text functions every connection to a ZDRLab database carries: the HEBREW collation
// that text fields are declared with, and the Jet form of LIKE in place of SQLite's.
#pragma once

#include <string_view>

struct sqlite3;

namespace zdr::db {

// The name text columns are declared with: `COLLATE HEBREW`.
inline constexpr const char* kHebrewCollation = "HEBREW";

// Compares two UTF-8 texts in Hebrew dictionary order (ICU, locale "he", tertiary strength).
// Texts the collator ranks equal are ordered byte by byte, so the result is 0 only for
// byte-identical texts: DISTINCT and unique indexes never merge two different names.
// Returns <0, 0 or >0.
int CompareHebrew(std::string_view a, std::string_view b);

// CompareHebrew always through ICU, without the shortcut that texts of printable ASCII alone
// take; for tests that check the shortcut against it.
int CompareHebrewWithIcu(std::string_view a, std::string_view b);
// Whether texts of printable ASCII alone are compared without ICU: false when ICU has no
// collation data or the shortcut's model of the collator failed its check at first use.
bool HasAsciiShortcut();

// Registers the HEBREW collation on `db`. The collator belongs to the connection and is
// released when it closes. Returns an SQLite result code (SQLITE_OK on success).
int RegisterHebrewCollation(sqlite3* db);

// Replaces SQLite's like(X, Y) on `db` with JetLike(X, Y): SQLite evaluates `A LIKE B` as
// like(B, A), so the operator follows Jet's wildcards (`*`, `?`, `#`, `[...]`) and `%` and
// `_` match only themselves. NULL in either argument gives NULL. The three-argument form
// (LIKE ... ESCAPE) raises an error. Returns an SQLite result code.
int RegisterJetLike(sqlite3* db);

}  // namespace zdr::db
