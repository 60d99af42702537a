// Pieces the importers share: reading panel bounds, numbers as the host's routines read them,
// record access that refuses incomplete records, and columns that take converted host text.
// Internal to the importers.
#pragma once

#include <condition_variable>
#include <cstdint>
#include <cstring>
#include <deque>
#include <exception>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "common/panel.h"
#include "common/userseam.h"
#include "common/value.h"
#include "engine/engine.h"
#include "hostfile/hostfile.h"

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

// ---- The import pipeline.
//
// An import runs on two threads: the one it is called on owns the database connection and
// the seam, and binds and writes the rows; a second one reads the host records and converts
// them (text conversions, bidi, criteria), recording the rows into batches. The batches pass
// through a small ring of buffers that keep their capacity, so nothing is allocated per
// record. The rows are written in the order they were recorded, with the progress points and
// any failure of the conversion in their places among them, so what the database holds and
// what the user is shown are the same as if one thread did both.

class ImportPipeline;

// Rows recorded for the recordsets of one import, written in order by the writing thread.
class RowBatch {
 public:
  enum class Op : uint8_t {
    AddNew,
    Int,
    Double,
    Bool,
    Date,
    Text,
    Update,
    UpdatePassing,
    Progress
  };
  struct Entry {
    Op op;
    uint8_t table;
    int16_t field;
    uint32_t len;   // text: its length in bytes
    int64_t value;  // a whole number, a Boolean, a date's serial, a text's offset, the bits of
                    // a double
  };

  void Clear() {
    entries_.clear();
    text_.clear();
    last_ = false;
    failure_ = nullptr;
  }
  bool Full() const { return entries_.size() >= kEntries || text_.size() >= kTextBytes; }

 private:
  friend class ImportPipeline;
  friend class RowTarget;
  static constexpr size_t kEntries = 16384;
  static constexpr size_t kTextBytes = 512 * 1024;

  void Add(Op op, uint8_t table, int field, int64_t value, uint32_t len = 0) {
    entries_.push_back({op, table, static_cast<int16_t>(field), len, value});
  }

  std::vector<Entry> entries_;
  std::string text_;  // the texts of the batch, UTF-8, one after the other
  bool last_ = false;
  std::exception_ptr failure_;  // raised after the batch's rows are written
};

// One recordset of a pipeline as the converting thread sees it: the recordset's own calls,
// recorded into the current batch.
class RowTarget {
 public:
  // Index of a field by name (kErrNoSuchField when the table has none).
  int FieldIndex(std::string_view name) const { return rs_.FieldIndex(name); }
  void AddNew() { Batch().Add(RowBatch::Op::AddNew, table_, 0, 0); }
  void SetInt(int field, int64_t v) { Batch().Add(RowBatch::Op::Int, table_, field, v); }
  void SetDouble(int field, double v);
  void SetBool(int field, bool v) { Batch().Add(RowBatch::Op::Bool, table_, field, v ? 1 : 0); }
  void SetDate(int field, Date d) { Batch().Add(RowBatch::Op::Date, table_, field, d.serial); }
  void SetText(int field, std::string_view utf8);
  // Windows-1255 text, converted to UTF-8 straight into the batch.
  void SetWin1255(int field, std::string_view win1255);
  // Saves the new row; a refusal ends the import.
  void Update() { Batch().Add(RowBatch::Op::Update, table_, 0, 0); }
  // Saves the new row; a row repeating a unique key is passed over.
  void UpdatePassingDuplicates() { Batch().Add(RowBatch::Op::UpdatePassing, table_, 0, 0); }

 private:
  friend class ImportPipeline;
  RowTarget(ImportPipeline& pipeline, db::TableRecordset& rs, uint8_t table)
      : pipeline_(pipeline), rs_(rs), table_(table) {}
  RowBatch& Batch();

  ImportPipeline& pipeline_;
  db::TableRecordset& rs_;
  uint8_t table_;
};

class ImportPipeline {
 public:
  explicit ImportPipeline(ProgressReporter& progress);
  ~ImportPipeline();
  ImportPipeline(const ImportPipeline&) = delete;
  ImportPipeline& operator=(const ImportPipeline&) = delete;

  // A recordset the rows may go to. Add every one before Run.
  RowTarget& Add(db::TableRecordset& rs);

  // Runs `convert` on the converting thread while this thread writes what it records, and
  // returns when both are done. What `convert` throws is raised here once the rows recorded
  // before it are written; what writing a row throws (a refusal other than a passed-over
  // duplicate, a full disk) stops the conversion at its next batch and is raised here.
  // Without a second thread (none could be started) both run here, batch by batch.
  void Run(const std::function<void()>& convert);

  // For the converting thread: the share done, reported when the rows before it are written.
  void Progress(double done) {
    current_->Add(RowBatch::Op::Progress, 0, 0, 0);
    std::memcpy(&current_->entries_.back().value, &done, sizeof done);
  }
  // For the converting thread, between records: hands the batch over when it is full.
  void RecordDone() {
    if (current_->Full()) HandOver(false);
  }

 private:
  friend class RowTarget;
  static constexpr size_t kBatches = 4;
  struct Stopped {};  // the writing side failed: the conversion ends quietly

  void HandOver(bool last);
  void Write(const RowBatch& batch);

  ProgressReporter& progress_;
  std::vector<db::TableRecordset*> tables_;
  std::vector<std::unique_ptr<RowTarget>> targets_;
  RowBatch batches_[kBatches];
  RowBatch* current_ = &batches_[0];  // being filled by the converting thread

  bool threaded_ = false;
  std::mutex mutex_;
  std::condition_variable changed_;
  std::deque<RowBatch*> full_, free_;
  bool stop_ = false;
};

inline RowBatch& RowTarget::Batch() {
  return *pipeline_.current_;
}

// One text column of a pipeline's table, taking converted host text (Windows-1255).
class TextColumn {
 public:
  TextColumn(RowTarget& rs, std::string_view name) : index_(rs.FieldIndex(name)) {}
  // Sets Windows-1255 text, which must not be empty.
  void Set(RowTarget& rs, std::string_view win1255) { rs.SetWin1255(index_, win1255); }
  // Sets the text, or `fallback` when it is empty.
  void SetOr(RowTarget& rs, std::string_view win1255, std::string_view fallback) {
    Set(rs, win1255.empty() ? fallback : win1255);
  }
  // Sets the text, or leaves the field Null when it is empty.
  void SetOrNull(RowTarget& rs, std::string_view win1255) {
    if (!win1255.empty()) Set(rs, win1255);
  }
  int index() const { return index_; }

 private:
  int index_;
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
  TransactWriter(RowTarget& rs, bool asIs);
  void Add(int32_t fileId, int32_t transId, std::string_view keyField);

 private:
  static constexpr size_t kKeysPerTransaction = 4;

  RowTarget& rs_;
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
  ImportPipeline pipeline(progress);
  TransactWriter writer(pipeline.Add(rs), asIs);
  pipeline.Run([&] {
    for (int64_t i = 1; i <= n; ++i) {
      std::string_view rec = RecordOf(file, i);
      if (accept(rec) && filter.Pass(FieldOf(rec, layout.typeAt, layout.typeLen),
                                     DateAt(rec, layout.dateAt), DateAt(rec, layout.valueDateAt))) {
        for (size_t k = 0; k < 4; ++k) {
          writer.Add(fileId, static_cast<int32_t>(i),
                     FieldOf(rec, layout.keysAt + k * layout.keyLen, layout.keyLen));
        }
      }
      if (i % 5 == 0) pipeline.Progress(static_cast<double>(i));
      pipeline.RecordDone();
    }
  });
  rs.Close();
  db.Close();
}

}  // namespace zdr::importing
