// Pieces the importers share: reading panel bounds, numbers as the host's routines read them,
// record access that refuses incomplete records, and columns that take converted host text.
// Internal to the importers.
#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

#include "control/panel.h"
#include "control/userseam.h"
#include "import/hostfile.h"
#include "workdb/engine.h"
#include "workdb/value.h"

namespace zdr::importing {

// A failure an importer finds itself (a bound that is not a number, an incomplete record).
// Its text is the Hebrew message shown to the user.
class ImportError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Text typed into the panel (UTF-8) as Windows-1255, the form converted host text takes.
// Throws ImportError when the text holds a character the code page cannot hold.
std::string PanelText(std::string_view utf8);

// Whether `s`, spaces around it aside, is a number: an optional sign, digits with at most one
// decimal point (at least one digit), an optional exponent.
bool IsNumericText(std::string_view s);
// The number at the start of `s` after leading spaces, 0 when it does not start with one.
double NumberAtStart(std::string_view s);
// NumberAtStart rounded half to even as a 32-bit integer; throws ImportError (naming `what`)
// when it does not fit.
int32_t LongAtStart(std::string_view s, std::string_view what);

// A panel text as a whole number within [lo, hi] (CInt rules: surrounding spaces ignored,
// halves to even). Throws ImportError naming `what` otherwise.
int64_t PanelWholeNumber(std::string_view utf8, int64_t lo, int64_t hi, std::string_view what);

// Compares Windows-1255 texts character by character on the characters' code points.
int CompareCodes(std::string_view a, std::string_view b);

// Record n of `file`; throws ImportError when it is not wholly in the file.
std::string_view RecordOf(const HostRecordFile& file, int64_t n);

inline std::string_view FieldOf(std::string_view rec, size_t offset, size_t width) {
  return rec.substr(offset, width);
}
inline unsigned char ByteOf(std::string_view rec, size_t offset) {
  return static_cast<unsigned char>(rec[offset]);
}
// The host's three date bytes at `offset`: year - 1900, month, day.
Date DateAt(std::string_view rec, size_t offset);

inline bool IsDuplicateKey(const db::EngineError& e) {
  return e.number() == db::kErrDuplicateKey;
}

// Saves the new row of `rs`; a row repeating a unique key is passed over.
void UpdatePassingDuplicates(db::TableRecordset& rs);

// One text column of a table recordset, with its own reused UTF-8 buffer (the buffer must stay
// unchanged until the row is saved, so each column keeps its own).
class TextColumn {
 public:
  TextColumn(db::TableRecordset& rs, std::string_view name) : index_(rs.FieldIndex(name)) {}
  // Sets Windows-1255 text, which must not be empty.
  void Set(db::TableRecordset& rs, std::string_view win1255);
  // Sets the text, or `fallback` when it is empty.
  void SetOr(db::TableRecordset& rs, std::string_view win1255, std::string_view fallback) {
    Set(rs, win1255.empty() ? fallback : win1255);
  }
  // Sets the text, or leaves the field Null when it is empty.
  void SetOrNull(db::TableRecordset& rs, std::string_view win1255) {
    if (!win1255.empty()) Set(rs, win1255);
  }
  int index() const { return index_; }

 private:
  int index_;
  std::string buf_;
};

// The ledger criteria that both the permanent ledger and the temporary batches apply: the type
// pattern and the transaction-date and value-date ranges. Each is in force only when its box is
// on and its text is not empty.
class LedgerFilter {
 public:
  // Throws (HostTextError, ImportError) when a date text cannot be read.
  explicit LedgerFilter(const Panel& panel);

  // Whether a transaction with this type field (host text, untrimmed) and these dates passes.
  bool Pass(std::string_view typeField, Date date, Date valueDate);

 private:
  bool hasPattern_ = false;
  std::string pattern_;  // UTF-8, as typed
  std::optional<Date> from_, to_, valueFrom_, valueTo_;
  std::string spaced_, typeUtf8_;  // reused from record to record
};

// The journal range of the panel; a bound is in force when ChkJournal is on and its text is
// not empty. Throws ImportError when a bound is not a 16-bit whole number.
struct JournalRange {
  std::optional<int16_t> from, to;
  static JournalRange FromPanel(const Panel& panel);
  bool Contains(int64_t journal) const {
    return !(from && journal < *from) && !(to && journal > *to);
  }
};

// Appends the account entries of one transaction to tTransact: each key converted by
// ReverseAndMirror and trimmed, blank ones passed over, repeated ones passed over.
class TransactWriter {
 public:
  // `asIs` converts the account keys as the account import of the same load does.
  TransactWriter(db::TableRecordset& rs, bool asIs);
  void Add(int32_t fileId, int32_t transId, std::string_view keyField);

 private:
  static constexpr size_t kKeysPerTransaction = 4;

  db::TableRecordset& rs_;
  int fileId_, transId_;
  TextColumn key_;
  bool asIs_;
  std::string converted_;
  // The keys already offered for the transaction of the last call: a key repeated within one
  // transaction is a duplicate row for certain, and is passed over without asking the table
  // (whose refusal costs far more than the comparison).
  int32_t lastFileId_ = 0, lastTransId_ = 0;
  size_t offered_ = 0;
  std::string offeredKeys_[kKeysPerTransaction];
};

// Where a transaction record keeps what the ledger criteria and tTransact read: the permanent
// ledger and the temporary batches differ only in these offsets.
struct TransactLayout {
  size_t typeAt, typeLen, keysAt, keyLen, dateAt, valueDateAt;
};

// Reads every record of `file`, keeps those `accept(record)` lets through and `filter`
// passes, and offers their four account keys to tTransact of `dbFile` under `fileId` (keys
// converted as `asIs` says), with progress every fifth record. Throws what fails; the rows
// appended before a failure stay.
template <typename Accept>
void ImportTransactions(const HostRecordFile& file, const TransactLayout& layout,
                        const std::string& dbFile, int32_t fileId, LedgerFilter& filter, bool asIs,
                        UserSeam& ui, Accept accept) {
  const int64_t n = RoundHalfEven(file.Count());
  ProgressReporter progress(ui, static_cast<double>(n));
  db::Database db = db::Database::Open(dbFile);
  db::TableRecordset rs = db.OpenTable("tTransact");
  TransactWriter writer(rs, asIs);
  for (int64_t i = 1; i <= n; ++i) {
    std::string_view rec = RecordOf(file, i);
    if (accept(rec) && filter.Pass(FieldOf(rec, layout.typeAt, layout.typeLen),
                                   DateAt(rec, layout.dateAt), DateAt(rec, layout.valueDateAt))) {
      for (size_t k = 0; k < 4; ++k) {
        writer.Add(fileId, static_cast<int32_t>(i),
                   FieldOf(rec, layout.keysAt + k * layout.keyLen, layout.keyLen));
      }
    }
    if (i % 5 == 0) progress.Update(static_cast<double>(i));
  }
  rs.Close();
  db.Close();
}

}  // namespace zdr::importing
