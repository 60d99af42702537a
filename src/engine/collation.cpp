#include "engine/collation.h"

#include <sqlite3.h>
#include <unicode/ucol.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "engine/jetsql.h"

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

// Hebrew order for texts of printable ASCII alone (0x20-0x7E: digits, Latin letters, space
// and punctuation, which most keys are), without ICU. Each such character is one collation
// element of its own, so the collator's order is: the characters' primary weights compared in
// turn (a text that runs out first is smaller), then their secondary weights, then their
// tertiary weights (case). The weights are the characters' ranks at each strength, taken
// from the collator itself; the model is checked against it once before it is used, and
// when the two disagree on any text of one or two characters it is not used at all.
class AsciiOrder {
 public:
  static constexpr unsigned char kFirst = 0x20, kLast = 0x7E;

  // The model for the "he" collator at tertiary strength; usable() is false when ICU has no
  // data, or the check against the collator failed.
  static const AsciiOrder& Get() {
    static const AsciiOrder order;
    return order;
  }

  bool usable() const { return usable_; }

  static bool Covers(const char* s, size_t n) {
    for (size_t i = 0; i < n; ++i) {
      const auto c = static_cast<unsigned char>(s[i]);
      if (c < kFirst || c > kLast) return false;
    }
    return true;
  }

  // The collator's order (before the byte tie-break) of two texts that Covers; <0, 0 or >0.
  int Compare(const char* a, size_t na, const char* b, size_t nb) const {
    const size_t n = std::min(na, nb);
    for (const auto* level : {&primary_, &secondary_, &tertiary_}) {
      for (size_t i = 0; i < n; ++i) {
        const uint8_t wa = (*level)[static_cast<unsigned char>(a[i])];
        const uint8_t wb = (*level)[static_cast<unsigned char>(b[i])];
        if (wa != wb) return wa < wb ? -1 : 1;
      }
      if (na != nb) return na < nb ? -1 : 1;
    }
    return 0;
  }

 private:
  using Weights = std::array<uint8_t, 256>;

  AsciiOrder() {
    UCollator* coll = OpenHebrewCollator();
    if (coll == nullptr) return;
    Rank(coll, UCOL_PRIMARY, primary_);
    Rank(coll, UCOL_SECONDARY, secondary_);
    Rank(coll, UCOL_TERTIARY, tertiary_);
    ucol_setStrength(coll, UCOL_TERTIARY);
    usable_ = AgreesOnShortTexts(coll);
    ucol_close(coll);
  }

  // Each character's rank among the printable ASCII characters at `strength`; characters the
  // collator ranks equal share a rank.
  static void Rank(UCollator* coll, UCollationStrength strength, Weights& weights) {
    ucol_setStrength(coll, strength);
    std::vector<char> chars;
    for (int c = kFirst; c <= kLast; ++c) chars.push_back(static_cast<char>(c));
    auto cmp = [coll](char x, char y) {
      UErrorCode status = U_ZERO_ERROR;
      return ucol_strcollUTF8(coll, &x, 1, &y, 1, &status);
    };
    std::stable_sort(chars.begin(), chars.end(),
                     [&](char x, char y) { return cmp(x, y) == UCOL_LESS; });
    weights.fill(0);
    uint8_t rank = 0;
    for (size_t i = 0; i < chars.size(); ++i) {
      if (i > 0 && cmp(chars[i - 1], chars[i]) != UCOL_EQUAL) ++rank;
      weights[static_cast<unsigned char>(chars[i])] = rank;
    }
  }

  // Every text of up to two printable characters, in the model's order, must be in the
  // collator's order too (both orders are total once bytes break ties, so agreeing on
  // neighbours is agreeing on every pair).
  bool AgreesOnShortTexts(const UCollator* coll) const {
    std::vector<std::string> texts(1);
    for (int c = kFirst; c <= kLast; ++c) {
      texts.emplace_back(1, static_cast<char>(c));
      for (int d = kFirst; d <= kLast; ++d) {
        texts.push_back({static_cast<char>(c), static_cast<char>(d)});
      }
    }
    auto modelOrder = [this](const std::string& x, const std::string& y) {
      const int r = Compare(x.data(), x.size(), y.data(), y.size());
      return r != 0 ? r < 0 : x < y;
    };
    std::sort(texts.begin(), texts.end(), modelOrder);
    for (size_t i = 1; i < texts.size(); ++i) {
      const std::string& x = texts[i - 1];
      const std::string& y = texts[i];
      UErrorCode status = U_ZERO_ERROR;
      const UCollationResult r =
          ucol_strcollUTF8(coll, x.data(), static_cast<int32_t>(x.size()), y.data(),
                           static_cast<int32_t>(y.size()), &status);
      if (U_FAILURE(status)) return false;
      if (r == UCOL_GREATER || (r == UCOL_EQUAL && !(x < y))) return false;
    }
    return true;
  }

  Weights primary_{}, secondary_{}, tertiary_{};
  bool usable_ = false;
};

int CompareWith(const UCollator* coll, const char* a, size_t na, const char* b, size_t nb) {
  if (na == nb && std::memcmp(a, b, na) == 0) return 0;
  if (coll != nullptr) {
    const AsciiOrder& ascii = AsciiOrder::Get();
    if (ascii.usable() && AsciiOrder::Covers(a, na) && AsciiOrder::Covers(b, nb)) {
      const int r = ascii.Compare(a, na, b, nb);
      if (r != 0) return r;
      return CompareBytes(a, na, b, nb);
    }
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

int CompareHebrewWithIcu(std::string_view a, std::string_view b) {
  static const CollatorPtr collator(OpenHebrewCollator());
  if (a.size() == b.size() && std::memcmp(a.data(), b.data(), a.size()) == 0) return 0;
  if (collator != nullptr) {
    UErrorCode status = U_ZERO_ERROR;
    const UCollationResult r =
        ucol_strcollUTF8(collator.get(), a.data(), static_cast<int32_t>(a.size()), b.data(),
                         static_cast<int32_t>(b.size()), &status);
    if (U_SUCCESS(status) && r != UCOL_EQUAL) return r == UCOL_LESS ? -1 : 1;
  }
  return CompareBytes(a.data(), a.size(), b.data(), b.size());
}

bool HasAsciiShortcut() {
  return AsciiOrder::Get().usable();
}

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
