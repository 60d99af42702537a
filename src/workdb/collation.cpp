#include "workdb/collation.h"

#include <sqlite3.h>
#include <unicode/ucol.h>

#include <algorithm>
#include <cstring>
#include <memory>

#include "workdb/jetsql.h"

namespace zdr::db {
namespace {

struct CollatorCloser {
  void operator()(UCollator* c) const { ucol_close(c); }
};
using CollatorPtr = std::unique_ptr<UCollator, CollatorCloser>;

// Null when ICU has no collation data; callers then fall back to byte order, which keeps
// every comparison total and consistent.
UCollator* OpenHebrewCollator() {
  UErrorCode status = U_ZERO_ERROR;
  UCollator* c = ucol_open("he", &status);
  if (U_FAILURE(status)) {
    if (c != nullptr) ucol_close(c);
    return nullptr;
  }
  ucol_setStrength(c, UCOL_TERTIARY);
  return c;
}

int CompareBytes(const char* a, size_t na, const char* b, size_t nb) {
  const int m = std::memcmp(a, b, std::min(na, nb));
  if (m != 0) return m < 0 ? -1 : 1;
  return na < nb ? -1 : (na > nb ? 1 : 0);
}

int CompareWith(const UCollator* coll, const char* a, size_t na, const char* b, size_t nb) {
  if (na == nb && std::memcmp(a, b, na) == 0) return 0;
  if (coll != nullptr) {
    UErrorCode status = U_ZERO_ERROR;
    const UCollationResult r =
        ucol_strcollUTF8(coll, a, static_cast<int32_t>(na), b, static_cast<int32_t>(nb), &status);
    if (U_SUCCESS(status) && r != UCOL_EQUAL) return r == UCOL_LESS ? -1 : 1;
  }
  // Texts the collator cannot tell apart still differ: order them by their bytes.
  return CompareBytes(a, na, b, nb);
}

int CollateHebrew(void* arg, int na, const void* a, int nb, const void* b) {
  return CompareWith(static_cast<const UCollator*>(arg), static_cast<const char*>(a),
                     static_cast<size_t>(na), static_cast<const char*>(b), static_cast<size_t>(nb));
}

void DestroyCollator(void* arg) {
  ucol_close(static_cast<UCollator*>(arg));
}

void LikeFunction(sqlite3_context* ctx, int argc, sqlite3_value** argv) {
  if (argc != 2) {
    sqlite3_result_error(ctx, "LIKE ... ESCAPE is not supported; use [ ] around a wildcard", -1);
    return;
  }
  if (sqlite3_value_type(argv[0]) == SQLITE_NULL || sqlite3_value_type(argv[1]) == SQLITE_NULL) {
    sqlite3_result_null(ctx);
    return;
  }
  // sqlite3_value_text before sqlite3_value_bytes: the length is of the UTF-8 form.
  const auto* pattern = reinterpret_cast<const char*>(sqlite3_value_text(argv[0]));
  const int patternLen = sqlite3_value_bytes(argv[0]);
  const auto* text = reinterpret_cast<const char*>(sqlite3_value_text(argv[1]));
  const int textLen = sqlite3_value_bytes(argv[1]);
  if (pattern == nullptr || text == nullptr) {
    sqlite3_result_error_nomem(ctx);
    return;
  }
  const bool match =
      JetLike(std::string_view(pattern, static_cast<size_t>(patternLen)),
              std::string_view(text, static_cast<size_t>(textLen)), /*caseSensitive=*/false);
  sqlite3_result_int(ctx, match ? 1 : 0);
}

}  // namespace

int CompareHebrew(std::string_view a, std::string_view b) {
  static const CollatorPtr collator(OpenHebrewCollator());
  return CompareWith(collator.get(), a.data(), a.size(), b.data(), b.size());
}

int RegisterHebrewCollation(sqlite3* db) {
  UCollator* coll = OpenHebrewCollator();
  // With no collator the collation still works (byte order) rather than leaving the tables
  // unreadable.
  return sqlite3_create_collation_v2(db, kHebrewCollation, SQLITE_UTF8, coll, &CollateHebrew,
                                     coll != nullptr ? &DestroyCollator : nullptr);
}

int RegisterJetLike(sqlite3* db) {
  const int flags = SQLITE_UTF8 | SQLITE_DETERMINISTIC | SQLITE_INNOCUOUS;
  int rc = sqlite3_create_function(db, "like", 2, flags, nullptr, &LikeFunction, nullptr, nullptr);
  if (rc != SQLITE_OK) return rc;
  return sqlite3_create_function(db, "like", 3, flags, nullptr, &LikeFunction, nullptr, nullptr);
}

}  // namespace zdr::db
