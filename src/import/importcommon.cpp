#include "import/importcommon.h"

#include <cmath>
#include <cstdlib>
#include <limits>
#include <system_error>
#include <thread>

#include "engine/jetsql.h"
#include "hosttext/codepage.h"
#include "hosttext/hosttext.h"

namespace zdr::importing {

namespace {

bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

// Length of the number at the start of `s` (no leading spaces): sign, digits, point, digits,
// exponent. 0 when there is no digit.
size_t NumberLength(std::string_view s) {
  size_t i = 0;
  if (i < s.size() && (s[i] == '+' || s[i] == '-')) ++i;
  size_t digits = 0;
  while (i < s.size() && IsDigit(s[i])) ++i, ++digits;
  if (i < s.size() && s[i] == '.') {
    ++i;
    while (i < s.size() && IsDigit(s[i])) ++i, ++digits;
  }
  if (digits == 0) return 0;
  if (i < s.size() && (s[i] == 'e' || s[i] == 'E')) {
    size_t j = i + 1;
    if (j < s.size() && (s[j] == '+' || s[j] == '-')) ++j;
    size_t expDigits = 0;
    while (j < s.size() && IsDigit(s[j])) ++j, ++expDigits;
    if (expDigits > 0) i = j;
  }
  return i;
}

std::string_view SkipLeadingSpaces(std::string_view s) {
  size_t i = 0;
  while (i < s.size() && s[i] == ' ') ++i;
  return s.substr(i);
}

double ParseNumber(std::string_view s, size_t len) {
  std::string copy(s.substr(0, len));  // strtod needs a terminated string; numbers are short
  return std::strtod(copy.c_str(), nullptr);
}

std::string Quoted(std::string_view s) {
  std::string out = "\"";
  out += s;
  out += '"';
  return out;
}

}  // namespace

std::string PanelText(std::string_view utf8) {
  try {
    return Utf8ToWin1255(utf8);
  } catch (const CodePageError&) {
    throw ImportError("הטקסט " + Quoted(utf8) + " מכיל תו שאינו קיים בקוד העברי של המערכת");
  }
}

bool IsNumericText(std::string_view s) {
  s = TrimSpaces(s);
  if (s.empty()) return false;
  return NumberLength(s) == s.size();
}

double NumberAtStart(std::string_view s) {
  s = SkipLeadingSpaces(s);
  size_t len = NumberLength(s);
  return len == 0 ? 0.0 : ParseNumber(s, len);
}

int32_t LongAtStart(std::string_view s, std::string_view what) {
  double v = NumberAtStart(s);
  // Round half to even, as the host's conversion to a whole number does.
  double r = std::nearbyint(v);
  if (!(r >= std::numeric_limits<int32_t>::min() && r <= std::numeric_limits<int32_t>::max())) {
    throw ImportError(std::string(what) + ": המספר " + Quoted(s) + " גדול מדי");
  }
  return static_cast<int32_t>(r);
}

int64_t PanelWholeNumber(std::string_view utf8, int64_t lo, int64_t hi, std::string_view what) {
  int64_t v = 0;
  try {
    v = HostIntValue(utf8);
  } catch (const std::exception&) {
    throw ImportError(std::string(what) + ": " + Quoted(utf8) + " אינו מספר שלם בין " +
                      std::to_string(lo) + " ל-" + std::to_string(hi));
  }
  if (v < lo || v > hi) {
    throw ImportError(std::string(what) + ": " + Quoted(utf8) + " אינו מספר שלם בין " +
                      std::to_string(lo) + " ל-" + std::to_string(hi));
  }
  return v;
}

int CompareCodes(std::string_view a, std::string_view b) {
  size_t n = a.size() < b.size() ? a.size() : b.size();
  for (size_t i = 0; i < n; ++i) {
    if (a[i] == b[i]) continue;
    char32_t ca = Win1255ToCodePoint(static_cast<unsigned char>(a[i]));
    char32_t cb = Win1255ToCodePoint(static_cast<unsigned char>(b[i]));
    if (ca != cb) return ca < cb ? -1 : 1;
  }
  if (a.size() == b.size()) return 0;
  return a.size() < b.size() ? -1 : 1;
}

std::string_view RecordOf(const HostRecordFile& file, int64_t n) {
  std::string_view rec = file.Record(n);
  if (rec.size() != file.RecordLength()) {
    throw ImportError("הקובץ " + file.Path().filename().string() + " פגום: רשומה " +
                      std::to_string(n) + " אינה שלמה");
  }
  return rec;
}

Date DateAt(std::string_view rec, size_t offset) {
  return HostDateFromBytes(ByteOf(rec, offset), ByteOf(rec, offset + 1), ByteOf(rec, offset + 2));
}

void UpdatePassingDuplicates(db::TableRecordset& rs) {
  try {
    rs.Update();
  } catch (const db::EngineError& e) {
    if (!IsDuplicateKey(e)) throw;
  }
}

void RowTarget::SetDouble(int field, double v) {
  int64_t bits;
  std::memcpy(&bits, &v, sizeof v);
  Batch().Add(RowBatch::Op::Double, table_, field, bits);
}

void RowTarget::SetText(int field, std::string_view utf8) {
  RowBatch& b = Batch();
  const size_t at = b.text_.size();
  b.text_.append(utf8);
  b.Add(RowBatch::Op::Text, table_, field, static_cast<int64_t>(at),
        static_cast<uint32_t>(utf8.size()));
}

void RowTarget::SetWin1255(int field, std::string_view win1255) {
  RowBatch& b = Batch();
  const size_t at = b.text_.size();
  AppendWin1255AsUtf8(win1255, b.text_);
  b.Add(RowBatch::Op::Text, table_, field, static_cast<int64_t>(at),
        static_cast<uint32_t>(b.text_.size() - at));
}

ImportPipeline::ImportPipeline(ProgressReporter& progress) : progress_(progress) {}

ImportPipeline::~ImportPipeline() = default;

RowTarget& ImportPipeline::Add(db::TableRecordset& rs) {
  tables_.push_back(&rs);
  targets_.push_back(std::unique_ptr<RowTarget>(
      new RowTarget(*this, rs, static_cast<uint8_t>(tables_.size() - 1))));
  return *targets_.back();
}

void ImportPipeline::Write(const RowBatch& batch) {
  for (const RowBatch::Entry& e : batch.entries_) {
    db::TableRecordset& rs = *tables_[e.table];
    switch (e.op) {
      case RowBatch::Op::AddNew:
        rs.AddNew();
        break;
      case RowBatch::Op::Int:
        rs.SetInt(e.field, e.value);
        break;
      case RowBatch::Op::Double: {
        double d;
        std::memcpy(&d, &e.value, sizeof d);
        rs.SetDouble(e.field, d);
        break;
      }
      case RowBatch::Op::Bool:
        rs.SetBool(e.field, e.value != 0);
        break;
      case RowBatch::Op::Date:
        rs.SetDate(e.field, Date{static_cast<int32_t>(e.value)});
        break;
      case RowBatch::Op::Text:
        rs.SetText(e.field,
                   std::string_view(batch.text_).substr(static_cast<size_t>(e.value), e.len));
        break;
      case RowBatch::Op::Update:
        rs.Update();
        break;
      case RowBatch::Op::UpdatePassing:
        UpdatePassingDuplicates(rs);
        break;
      case RowBatch::Op::Progress: {
        double done;
        std::memcpy(&done, &e.value, sizeof done);
        progress_.Update(done);
        break;
      }
    }
  }
}

void ImportPipeline::HandOver(bool last) {
  current_->last_ = last;
  if (!threaded_) {
    // One thread: write the batch at once and fill it again.
    Write(*current_);
    if (current_->failure_) std::rethrow_exception(current_->failure_);
    current_->Clear();
    return;
  }
  std::unique_lock<std::mutex> lock(mutex_);
  full_.push_back(current_);
  changed_.notify_all();
  if (last) return;
  changed_.wait(lock, [this] { return stop_ || !free_.empty(); });
  if (stop_) throw Stopped{};
  current_ = free_.front();
  free_.pop_front();
  current_->Clear();
}

void ImportPipeline::Run(const std::function<void()>& convert) {
  for (RowBatch& b : batches_) b.Clear();
  current_ = &batches_[0];
  full_.clear();
  free_.clear();
  for (size_t i = 1; i < kBatches; ++i) free_.push_back(&batches_[i]);
  stop_ = false;

  auto converting = [this, &convert] {
    try {
      convert();
    } catch (const Stopped&) {
      return;
    } catch (...) {
      current_->failure_ = std::current_exception();
    }
    HandOver(true);
  };

  std::thread thread;
  threaded_ = true;
  try {
    thread = std::thread(converting);
  } catch (const std::system_error&) {
    threaded_ = false;
  }
  if (!threaded_) {
    try {
      convert();
    } catch (...) {
      current_->failure_ = std::current_exception();
    }
    HandOver(true);
    return;
  }

  for (;;) {
    RowBatch* batch;
    {
      std::unique_lock<std::mutex> lock(mutex_);
      changed_.wait(lock, [this] { return !full_.empty(); });
      batch = full_.front();
      full_.pop_front();
    }
    try {
      Write(*batch);
    } catch (...) {
      {
        std::lock_guard<std::mutex> lock(mutex_);
        stop_ = true;
      }
      changed_.notify_all();
      thread.join();
      throw;
    }
    if (batch->last_) {
      thread.join();
      if (batch->failure_) std::rethrow_exception(batch->failure_);
      return;
    }
    {
      std::lock_guard<std::mutex> lock(mutex_);
      free_.push_back(batch);
    }
    changed_.notify_all();
  }
}

LedgerFilter::LedgerFilter(const Panel& panel) {
  if (Panel::On(panel.chkTransType) && !panel.txtTransType.empty()) {
    pattern_ = panel.txtTransType;
    // A pattern of stars alone matches every type: no need to convert each one to test it.
    hasPattern_ = pattern_.find_first_not_of('*') != std::string::npos;
  }
  auto date = [](int box, const std::string& text) -> std::optional<Date> {
    if (!Panel::On(box) || text.empty()) return std::nullopt;
    return ParseHostDate(PanelText(text));
  };
  from_ = date(panel.chkTransDates, panel.txtFromTransDate);
  to_ = date(panel.chkTransDates, panel.txtToTransDate);
  valueFrom_ = date(panel.chkTransVDate, panel.txtFromTransVDate);
  valueTo_ = date(panel.chkTransVDate, panel.txtToTransVDate);
}

bool LedgerFilter::Pass(std::string_view typeField, Date date, Date valueDate) {
  if (hasPattern_) {
    ConvertSpaced(TrimSpaces(typeField), spaced_);
    typeUtf8_.clear();
    AppendWin1255AsUtf8(spaced_, typeUtf8_);
    // The spaced conversion ends a type of Latin letters or digits with a space; a pattern
    // typed as the type reads on screen ("AB", "#") must still match it.
    if (!db::JetLike(pattern_, typeUtf8_, true) &&
        !db::JetLike(pattern_, TrimSpaces(typeUtf8_), true)) {
      return false;
    }
  }
  if (from_ && date < *from_) return false;
  if (to_ && date > *to_) return false;
  if (valueFrom_ && valueDate < *valueFrom_) return false;
  if (valueTo_ && valueDate > *valueTo_) return false;
  return true;
}

JournalRange JournalRange::FromPanel(const Panel& panel) {
  JournalRange r;
  if (!Panel::On(panel.ChkJournal)) return r;
  if (!panel.txtFromJournal.empty()) {
    r.from =
        static_cast<int16_t>(PanelWholeNumber(panel.txtFromJournal, INT16_MIN, INT16_MAX, "ממנה"));
  }
  if (!panel.txtToJournal.empty()) {
    r.to =
        static_cast<int16_t>(PanelWholeNumber(panel.txtToJournal, INT16_MIN, INT16_MAX, "עד מנה"));
  }
  return r;
}

TransactWriter::TransactWriter(RowTarget& rs, bool asIs)
    : rs_(rs),
      fileId_(rs.FieldIndex("FileID")),
      transId_(rs.FieldIndex("TransID")),
      key_(rs, "AccountKey"),
      asIs_(asIs) {}

void TransactWriter::Add(int32_t fileId, int32_t transId, std::string_view keyField) {
  // As-is, this is the key reversed with its brackets mirrored, trimmed.
  ConvertForDisplay(keyField, asIs_, converted_);
  std::string_view trimmed = TrimSpaces(converted_);
  if (trimmed.empty()) return;
  if (fileId != lastFileId_ || transId != lastTransId_) {
    lastFileId_ = fileId;
    lastTransId_ = transId;
    offered_ = 0;
  }
  for (size_t k = 0; k < offered_; ++k) {
    if (offeredKeys_[k] == trimmed) return;
  }
  if (offered_ < kKeysPerTransaction) offeredKeys_[offered_++].assign(trimmed);
  rs_.AddNew();
  rs_.SetInt(fileId_, fileId);
  rs_.SetInt(transId_, transId);
  key_.Set(rs_, trimmed);
  rs_.UpdatePassingDuplicates();
}

}  // namespace zdr::importing
