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

void Put(std::string& rec, size_t offset, std::string_view bytes, size_t width) {
  if (bytes.size() > width) {
    throw std::length_error("field of " + std::to_string(width) + " bytes at offset " +
                            std::to_string(offset) + " given " + std::to_string(bytes.size()) +
                            " bytes");
  }
  std::memcpy(rec.data() + offset, bytes.data(), bytes.size());
  std::memset(rec.data() + offset + bytes.size(), ' ', width - bytes.size());
}

void PutByte(std::string& rec, size_t offset, uint8_t b) {
  rec[offset] = static_cast<char>(b);
}

void PutDate(std::string& rec, size_t offset, HostDate d) {
  PutByte(rec, offset, d.yearOffset);
  PutByte(rec, offset + 1, d.month);
  PutByte(rec, offset + 2, d.day);
}

void PutLE(std::string& rec, size_t offset, uint64_t v, size_t width) {
  for (size_t i = 0; i < width; ++i) rec[offset + i] = static_cast<char>((v >> (8 * i)) & 0xFF);
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
  std::string r(kAccountRecordLength, ' ');
  Put(r, 0, f.key, 8);
  Put(r, 8, f.name, 30);
  Put(r, 38, f.sortCode, 3);
  Put(r, 52, f.cutOff, 4);
  Put(r, 60, f.telephone, 30);
  Put(r, 90, f.address, 30);
  Put(r, 120, f.district, 15);
  Put(r, 135, f.city, 15);
  Put(r, 150, f.zip, 5);
  Put(r, 167, f.details, 50);
  // Binary fields from 217 to 316 (flags, amounts, counters) are zero.
  std::memset(r.data() + 217, 0, 286 - 217);
  PutByte(r, 324, f.agent);
  PutByte(r, 325, 0);
  PutLE(r, 326, 0, 2);
  PutLE(r, 358, 0, 8);
  PutLE(r, 368, 0, 8);
  PutLE(r, 558, 0, 8);
  PutLE(r, 566, 0, 8);
  PutLE(r, 576, 0, 4);
  PutLE(r, 580, 0, 8);
  std::memset(r.data() + 608, 0, 638 - 608);
  return r;
}

std::string ItemRecord(const ItemFields& f) {
  std::string r(kItemRecordLength, ' ');
  Put(r, 0, f.key, 12);
  Put(r, 12, f.name, 40);
  Put(r, 52, f.sortCode, 3);
  std::memset(r.data() + 162, 0, 9);
  std::memset(r.data() + 176, 0, 264 - 176);
  std::memset(r.data() + 278, 0, 420 - 278);
  return r;
}

std::string DocHeaderRecord(const DocHeaderFields& f) {
  std::string r(kDocumentRecordLength, ' ');
  PutByte(r, 0, f.kind);
  PutByte(r, 1, f.type);
  Put(r, 2, f.accountKey, 8);
  Put(r, 10, f.name, 30);
  Put(r, 40, f.address1, 30);
  Put(r, 70, f.address2, 30);
  Put(r, 100, f.reference, 5);
  Put(r, 110, f.details, 48);
  PutByte(r, 158, f.lineCount);
  return r;
}

std::string DocSecondHeaderRecord(HostDate documentDate, HostDate dueDate) {
  std::string r(kDocumentRecordLength, ' ');
  PutByte(r, 0, 0);
  PutDate(r, 102, documentDate);
  PutDate(r, 105, dueDate);
  return r;
}

std::string DocLineRecord(const DocLineFields& f) {
  std::string r(kDocumentRecordLength, ' ');
  PutByte(r, 0, f.kind);
  Put(r, 1, f.itemKey, 12);
  std::memset(r.data() + 53, 0, 40);  // quantities and prices
  PutByte(r, 93, f.type);
  return r;
}

std::string LedgerRecord(const LedgerFields& f) {
  std::string r(kLedgerRecordLength, ' ');
  PutLE(r, 0, static_cast<uint16_t>(f.journal), 2);
  Put(r, 2, f.type, 3);
  PutByte(r, 37, 0);
  PutByte(r, 38, 0);
  for (int k = 0; k < 4; ++k) Put(r, 44 + 8 * k, f.keys[k], 8);
  PutDate(r, 76, f.date);
  PutDate(r, 79, f.valueDate);
  std::memset(r.data() + 82, 0, 170 - 82);
  return r;
}

std::string BatchRecord(const BatchFields& f) {
  std::string r(kBatchRecordLength, ' ');
  PutByte(r, 0, 0);
  Put(r, 1, f.type, 3);
  PutByte(r, 50, 0);
  PutByte(r, 51, 0);
  for (int k = 0; k < 4; ++k) Put(r, 57 + 8 * k, f.keys[k], 8);
  PutDate(r, 89, f.date);
  PutDate(r, 92, f.valueDate);
  std::memset(r.data() + 96, 0, 176 - 96);
  return r;
}

std::string CashRecord(const CashFields& f) {
  std::string r(kCashRecordLength, ' ');
  Put(r, 0, f.accountKey, 8);
  PutByte(r, 13, 0);
  PutDate(r, 14, f.date);
  std::memset(r.data() + 17, 0, 3);
  std::memset(r.data() + 54, 0, 19);
  return r;
}

std::string CompanyRecord(std::string_view name) {
  std::string r(kCompanyRecordLength, ' ');
  Put(r, 0, name, 20);
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
