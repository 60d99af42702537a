#include "generator.h"

#include <unicode/ubidi.h>
#include <unicode/ustring.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <system_error>

namespace zdrgen {
namespace {

// ---------------------------------------------------------------------------------------
// Code page 862: the 27 Hebrew letters (alef to tav with the final forms, in Unicode order)
// sit at 0x80..0x9A; printable ASCII is itself. Nothing else is ever written.

unsigned char Cp862Byte(char32_t cp) {
  if (cp >= 0x05D0 && cp <= 0x05EA) return static_cast<unsigned char>(0x80 + (cp - 0x05D0));
  if (cp >= 0x20 && cp <= 0x7E) return static_cast<unsigned char>(cp);
  char buf[64];
  std::snprintf(buf, sizeof buf, "character U+%04X has no place in host text",
                static_cast<unsigned>(cp));
  throw std::invalid_argument(buf);
}

std::u16string ToUtf16(std::string_view utf8) {
  std::u16string out(utf8.size() + 1, u'\0');
  int32_t length = 0;
  UErrorCode err = U_ZERO_ERROR;
  u_strFromUTF8(reinterpret_cast<UChar*>(out.data()), static_cast<int32_t>(out.size()), &length,
                utf8.data(), static_cast<int32_t>(utf8.size()), &err);
  if (U_FAILURE(err)) throw std::invalid_argument("malformed UTF-8 in host text");
  out.resize(static_cast<size_t>(length));
  return out;
}

std::string EncodeUtf16(const char16_t* text, size_t length) {
  std::string out;
  out.reserve(length);
  for (size_t i = 0; i < length; ++i) {
    // Hebrew letters and ASCII are all in the basic plane, so a surrogate is refused too.
    out.push_back(static_cast<char>(Cp862Byte(text[i])));
  }
  return out;
}

struct BidiCloser {
  void operator()(UBiDi* b) const { ubidi_close(b); }
};

// ---------------------------------------------------------------------------------------
// Record assembly: fields are copied into a record already filled with its background.

void Put(std::string& rec, FieldAt field, std::string_view bytes) {
  if (bytes.size() > field.width) {
    throw std::length_error("field of " + std::to_string(field.width) + " bytes at offset " +
                            std::to_string(field.at) + " given " + std::to_string(bytes.size()) +
                            " bytes");
  }
  std::memcpy(rec.data() + field.at, bytes.data(), bytes.size());
  std::memset(rec.data() + field.at + bytes.size(), ' ', field.width - bytes.size());
}

// The `index`th of the fields of `field`'s width that follow each other from `field`.
constexpr FieldAt Nth(FieldAt field, size_t index) {
  return {field.at + index * field.width, field.width};
}

void PutByte(std::string& rec, size_t offset, uint8_t b) {
  rec[offset] = static_cast<char>(b);
}

void PutDate(std::string& rec, size_t offset, HostDate d) {
  PutByte(rec, offset, d.yearOffset);
  PutByte(rec, offset + 1, d.month);
  PutByte(rec, offset + 2, d.day);
}

void PutLE(std::string& rec, FieldAt field, uint64_t v) {
  for (size_t i = 0; i < field.width; ++i) {
    rec[field.at + i] = static_cast<char>((v >> (8 * i)) & 0xFF);
  }
}

// Zeros over each of `fields`.
template <size_t N>
void Zero(std::string& rec, const FieldAt (&fields)[N]) {
  for (const FieldAt& f : fields) std::memset(rec.data() + f.at, 0, f.width);
}

}  // namespace

// ---------------------------------------------------------------------------------------
// Host text.

std::string HostVisual(std::string_view logicalUtf8) {
  std::u16string text = ToUtf16(logicalUtf8);
  if (text.empty()) return {};
  for (char16_t c : text) Cp862Byte(c);  // refuse what the host cannot hold before reordering
  thread_local std::unique_ptr<UBiDi, BidiCloser> bidi(ubidi_open());
  UErrorCode err = U_ZERO_ERROR;
  // The host's screen is a right-to-left line, except for text without a Hebrew letter,
  // which the clerk typed left to right.
  const bool hebrew =
      std::any_of(text.begin(), text.end(), [](char16_t c) { return c >= 0x05D0 && c <= 0x05EA; });
  ubidi_setPara(bidi.get(), reinterpret_cast<const UChar*>(text.data()),
                static_cast<int32_t>(text.size()), hebrew ? UBIDI_RTL : UBIDI_LTR, nullptr, &err);
  std::u16string visual(text.size() + 8, u'\0');
  int32_t n = ubidi_writeReordered(bidi.get(), reinterpret_cast<UChar*>(visual.data()),
                                   static_cast<int32_t>(visual.size()), UBIDI_DO_MIRRORING, &err);
  if (U_FAILURE(err)) throw std::invalid_argument("cannot reorder host text");
  return EncodeUtf16(visual.data(), static_cast<size_t>(n));
}

std::string HostField(std::string_view logicalUtf8, size_t width) {
  return PadRaw(HostVisual(logicalUtf8), width);
}

std::string HostBytes(std::string_view utf8) {
  std::u16string text = ToUtf16(utf8);
  return EncodeUtf16(text.data(), text.size());
}

std::string PadRaw(std::string_view bytes, size_t width) {
  if (bytes.size() > width) {
    throw std::length_error("host text of " + std::to_string(bytes.size()) +
                            " bytes does not fit a field of " + std::to_string(width));
  }
  std::string out(bytes);
  out.resize(width, ' ');
  return out;
}

// ---------------------------------------------------------------------------------------
// Record builders. The fields the system does not read get blanks in text fields and zeros
// in numeric ones, as a freshly created host record would hold.

std::string AccountRecord(const AccountFields& f) {
  using namespace account;
  std::string r(kAccountRecordLength, ' ');
  Put(r, kKey, f.key);
  Put(r, kName, f.name);
  Put(r, kSortCode, f.sortCode);
  Put(r, kCutOff, f.cutOff);
  Put(r, kTelephone, f.telephone);
  Put(r, kAddress, f.address);
  Put(r, kDistrict, f.district);
  Put(r, kCity, f.city);
  Put(r, kZip, f.zip);
  Put(r, kDetails, f.details);
  PutByte(r, kAgentAt, f.agent);
  Zero(r, kZeroed);
  return r;
}

std::string ItemRecord(const ItemFields& f) {
  std::string r(kItemRecordLength, ' ');
  Put(r, item::kKey, f.key);
  Put(r, item::kName, f.name);
  Put(r, item::kSortCode, f.sortCode);
  Zero(r, item::kZeroed);
  return r;
}

std::string DocHeaderRecord(const DocHeaderFields& f) {
  using namespace document;
  std::string r(kDocumentRecordLength, ' ');
  PutByte(r, kKindAt, f.kind);
  PutByte(r, kTypeAt, f.type);
  Put(r, kAccountKey, f.accountKey);
  Put(r, kName, f.name);
  Put(r, kAddress1, f.address1);
  Put(r, kAddress2, f.address2);
  Put(r, kReference, f.reference);
  Put(r, kDetails, f.details);
  PutByte(r, kLineCountAt, f.lineCount);
  return r;
}

std::string DocSecondHeaderRecord(HostDate documentDate, HostDate dueDate) {
  using namespace document;
  std::string r(kDocumentRecordLength, ' ');
  PutByte(r, kKindAt, 0);
  PutDate(r, kDocumentDateAt, documentDate);
  PutDate(r, kDueDateAt, dueDate);
  return r;
}

std::string DocLineRecord(const DocLineFields& f) {
  using namespace document;
  std::string r(kDocumentRecordLength, ' ');
  PutByte(r, kKindAt, f.kind);
  Put(r, kItemKey, f.itemKey);
  Zero(r, kLineZeroed);
  PutByte(r, kLineTypeAt, f.type);
  return r;
}

std::string LedgerRecord(const LedgerFields& f) {
  using namespace ledger;
  std::string r(kLedgerRecordLength, ' ');
  PutLE(r, kJournal, static_cast<uint16_t>(f.journal));
  Put(r, kType, f.type);
  for (size_t k = 0; k < f.keys.size(); ++k) Put(r, Nth(kKeys, k), f.keys[k]);
  PutDate(r, kDateAt, f.date);
  PutDate(r, kValueDateAt, f.valueDate);
  Zero(r, kZeroed);
  return r;
}

std::string BatchRecord(const BatchFields& f) {
  using namespace batch;
  std::string r(kBatchRecordLength, ' ');
  Put(r, kType, f.type);
  for (size_t k = 0; k < f.keys.size(); ++k) Put(r, Nth(kKeys, k), f.keys[k]);
  PutDate(r, kDateAt, f.date);
  PutDate(r, kValueDateAt, f.valueDate);
  Zero(r, kZeroed);
  return r;
}

std::string CashRecord(const CashFields& f) {
  std::string r(kCashRecordLength, ' ');
  Put(r, cash::kAccountKey, f.accountKey);
  PutDate(r, cash::kDateAt, f.date);
  Zero(r, cash::kZeroed);
  return r;
}

std::string CompanyRecord(std::string_view name) {
  std::string r(kCompanyRecordLength, ' ');
  Put(r, company::kName, name);
  return r;
}

namespace {
constexpr size_t kWriteBuffer = size_t{4} << 20;
}  // namespace

RecordWriter::RecordWriter(const std::filesystem::path& file) : path_(file) {
  if (file.has_parent_path()) {
    std::error_code ec;
    std::filesystem::create_directories(file.parent_path(), ec);
    if (ec) {
      throw std::runtime_error("cannot create " + file.parent_path().string() + ": " +
                               ec.message());
    }
  }
  file_ = std::fopen(file.c_str(), "wb");
  if (!file_) Fail();
  buf_.reserve(kWriteBuffer);
}

RecordWriter::~RecordWriter() {
  if (!file_) return;
  if (!buf_.empty()) std::fwrite(buf_.data(), 1, buf_.size(), file_);
  std::fclose(file_);
}

void RecordWriter::Add(std::string_view record) {
  buf_.append(record);
  if (buf_.size() >= kWriteBuffer) Flush();
}

void RecordWriter::Flush() {
  if (!file_) throw std::runtime_error("writing to closed file " + path_.string());
  if (!buf_.empty() && std::fwrite(buf_.data(), 1, buf_.size(), file_) != buf_.size()) Fail();
  buf_.clear();
}

void RecordWriter::Close() {
  Flush();
  std::FILE* f = file_;
  file_ = nullptr;
  if (std::fclose(f) != 0) Fail();
}

void RecordWriter::Fail() {
  throw std::runtime_error("cannot write " + path_.string() + ": " +
                           std::generic_category().message(errno));
}

void WriteRecords(const std::filesystem::path& file, const std::vector<std::string>& records) {
  RecordWriter out(file);
  for (const std::string& r : records) out.Add(r);
  out.Close();
}

// ---------------------------------------------------------------------------------------
// Deterministic random numbers.

uint64_t Random::Next() {
  uint64_t z = (state_ += 0x9E3779B97F4A7C15ull);
  z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ull;
  z = (z ^ (z >> 27)) * 0x94D049BB133111EBull;
  return z ^ (z >> 31);
}

int Random::Between(int lo, int hi) {
  if (hi <= lo) return lo;
  uint64_t span = static_cast<uint64_t>(hi - lo) + 1;
  return lo + static_cast<int>(Next() % span);
}

Options Options::Large() {
  Options o;
  o.accounts = 100000;
  o.documents = 200000;
  o.linesMin = 3;
  o.linesMax = 5;
  o.items = 5000;
  o.ledger = 1000000;
  o.batches = 20;
  o.batchSize = 10000;
  o.receipts = 100000;
  o.keepDetail = false;
  return o;
}

}  // namespace zdrgen
