// zdrgen: writes sample companies in the host accounting system's record layouts, and the
// record builders that tests use for hand-made exact cases.
//
// Host text is code page 862 with Hebrew in display order (the order in which the host's
// screen shows the characters from left to right). The builders here produce that order
// from logical (reading-order) UTF-8 with ICU's forward reordering, independently of the
// import routines that turn it back, so that a round trip catches a fault on either side.
//
// Field builders that take raw host bytes pad them with spaces (0x20) on the right up to the
// field's width and throw std::length_error when a value is longer than its field: a test
// that asks for an impossible record fails loudly instead of writing a cut one.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace zdrgen {

// Record lengths of the host files.
inline constexpr size_t kAccountRecordLength = 650;   // ACT.fix
inline constexpr size_t kItemRecordLength = 500;      // ITM.fix
inline constexpr size_t kDocumentRecordLength = 170;  // ISHP/IORDR/IMV/IBD.FIX
inline constexpr size_t kLedgerRecordLength = 180;    // amv.fix
inline constexpr size_t kBatchRecordLength = 220;     // a<N>.tmp
inline constexpr size_t kCashRecordLength = 90;       // icash2.fix
inline constexpr size_t kCompanyRecordLength = 7359;  // ADF.FIX

// The deleted-account mark: the key field holds 0x01 followed by blanks.
inline constexpr char kDeletedMark = '\x01';

// Where a field sits in its record: its first byte (from 0) and its width in bytes. Each
// layout below is the generator's own account of the host's records.
struct FieldAt {
  size_t at;
  size_t width;
};

// ACT.fix.
namespace account {
inline constexpr FieldAt kKey{0, 8}, kName{8, 30}, kSortCode{38, 3}, kCutOff{52, 4},
    kTelephone{60, 30}, kAddress{90, 30}, kDistrict{120, 15}, kCity{135, 15}, kZip{150, 5},
    kDetails{167, 50};
inline constexpr size_t kAgentAt = 324;
// Flags, amounts and counters the system does not read, written as zeros.
inline constexpr FieldAt kZeroed[] = {{217, 69}, {325, 3},  {358, 8}, {368, 8},
                                      {558, 16}, {576, 12}, {608, 30}};
}  // namespace account

// ITM.fix.
namespace item {
inline constexpr FieldAt kKey{0, 12}, kName{12, 40}, kSortCode{52, 3};
// Quantities and prices.
inline constexpr FieldAt kZeroed[] = {{162, 9}, {176, 88}, {278, 142}};
}  // namespace item

// The stock-document files: a header record, a second header record, then the lines.
namespace document {
inline constexpr size_t kKindAt = 0, kTypeAt = 1, kLineCountAt = 158;
inline constexpr FieldAt kAccountKey{2, 8}, kName{10, 30}, kAddress1{40, 30}, kAddress2{70, 30},
    kReference{100, 5}, kDetails{110, 48};
// The second header record.
inline constexpr size_t kDocumentDateAt = 102, kDueDateAt = 105;
// A line.
inline constexpr FieldAt kItemKey{1, 12};
inline constexpr size_t kLineTypeAt = 93;
// A line's quantities and prices.
inline constexpr FieldAt kLineZeroed[] = {{53, 40}};
}  // namespace document

// amv.fix: the journal is a 16-bit little-endian number; four account keys follow each other.
namespace ledger {
inline constexpr FieldAt kJournal{0, 2}, kType{2, 3}, kKeys{44, 8};
inline constexpr size_t kDateAt = 76, kValueDateAt = 79;
inline constexpr FieldAt kZeroed[] = {{37, 2}, {82, 88}};
}  // namespace ledger

// a<N>.tmp.
namespace batch {
inline constexpr FieldAt kType{1, 3}, kKeys{57, 8};
inline constexpr size_t kDateAt = 89, kValueDateAt = 92;
inline constexpr FieldAt kZeroed[] = {{0, 1}, {50, 2}, {96, 80}};
}  // namespace batch

// icash2.fix.
namespace cash {
inline constexpr FieldAt kAccountKey{0, 8};
inline constexpr size_t kDateAt = 14;
inline constexpr FieldAt kZeroed[] = {{13, 1}, {17, 3}, {54, 19}};
}  // namespace cash

// ADF.FIX.
namespace company {
inline constexpr FieldAt kName{0, 20};
}  // namespace company

// ---------------------------------------------------------------------------------------
// Host text.

// Encodes logical UTF-8 text as code page 862 in display order: a text with a Hebrew letter
// is a right-to-left paragraph, its runs are reordered for display and brackets in
// right-to-left runs are mirrored; a text without one was typed left to right and is shown
// as typed. Both as the host shows them. Handles Hebrew letters (U+05D0..U+05EA) and printable
// ASCII; throws std::invalid_argument on any other character or on malformed UTF-8.
std::string HostVisual(std::string_view logicalUtf8);

// HostVisual padded with spaces on the right to `width` bytes; throws std::length_error when
// the display text is longer than `width`.
std::string HostField(std::string_view logicalUtf8, size_t width);

// Code page 862 in the given order (no reordering), for single letters and raw codes such as
// cut-off classifications; throws std::invalid_argument like HostVisual.
std::string HostBytes(std::string_view utf8);

// `bytes` padded with spaces on the right to `width`; throws std::length_error when longer.
std::string PadRaw(std::string_view bytes, size_t width);

// ---------------------------------------------------------------------------------------
// Record builders. Text fields hold raw host bytes (already in display order: build them
// with HostField/HostVisual/HostBytes or give exact bytes); each is padded to its width.
// Fields the system never reads are filled with plausible constant bytes.

struct AccountFields {
  std::string key;        // 8
  std::string name;       // 30
  std::string sortCode;   // 3, taken as stored by the importer ("  5")
  std::string cutOff;     // 4 one-byte classifications
  std::string telephone;  // 30
  std::string address;    // 30
  std::string district;   // 15
  std::string city;       // 15
  std::string zip;        // 5
  std::string details;    // 50
  uint8_t agent = 0;
};
// A 650-byte ACT.fix record.
std::string AccountRecord(const AccountFields& f);

struct ItemFields {
  std::string key;       // 12
  std::string name;      // 40 (not read by the system)
  std::string sortCode;  // 3
};
// A 500-byte ITM.fix record.
std::string ItemRecord(const ItemFields& f);

// A date as the host stores it: year - 1900, month, day, one byte each.
struct HostDate {
  uint8_t yearOffset = 0;
  uint8_t month = 1;
  uint8_t day = 1;
  static HostDate Of(int year, int month, int day) {
    return HostDate{static_cast<uint8_t>(year - 1900), static_cast<uint8_t>(month),
                    static_cast<uint8_t>(day)};
  }
};

struct DocHeaderFields {
  uint8_t kind = 1;        // 1 marks a document header
  uint8_t type = 1;        // the document type code
  std::string accountKey;  // 8
  std::string name;        // 30
  std::string address1;    // 30
  std::string address2;    // 30 (the city)
  std::string reference;   // 5, digits as text
  std::string details;     // 48
  uint8_t lineCount = 0;
};
// The first 170-byte record of a document.
std::string DocHeaderRecord(const DocHeaderFields& f);
// The second header record: document date at offset 102, due date at 105.
std::string DocSecondHeaderRecord(HostDate documentDate, HostDate dueDate);

struct DocLineFields {
  uint8_t kind = 2;     // anything but 1: a line is never a header
  std::string itemKey;  // 12, at offset 1
  uint8_t type = 1;     // at offset 93; must equal the header's type to count
};
std::string DocLineRecord(const DocLineFields& f);

struct LedgerFields {
  int16_t journal = 0;
  std::string type;                 // 3
  std::array<std::string, 4> keys;  // 8 each; blank entries stay spaces
  HostDate date;
  HostDate valueDate;
};
// A 180-byte amv.fix record.
std::string LedgerRecord(const LedgerFields& f);

struct BatchFields {
  std::string type;                 // 3
  std::array<std::string, 4> keys;  // 8 each
  HostDate date;
  HostDate valueDate;
};
// A 220-byte a<N>.tmp record.
std::string BatchRecord(const BatchFields& f);

struct CashFields {
  std::string accountKey;  // 8
  HostDate date;
};
// A 90-byte icash2.fix record.
std::string CashRecord(const CashFields& f);

// A 7359-byte ADF.FIX record whose first 20 bytes hold `name` (raw host bytes).
std::string CompanyRecord(std::string_view name);

// Writes the records one after another to `file` (replacing it); creates missing folders.
// Throws std::runtime_error naming the file when it cannot be written.
void WriteRecords(const std::filesystem::path& file, const std::vector<std::string>& records);

// Streams records to a file (replacing it, creating missing folders) through a large buffer,
// for files of hundreds of megabytes. Add and Close throw std::runtime_error naming the file
// when it cannot be written; a writer destroyed without Close flushes what it can, silently.
class RecordWriter {
 public:
  explicit RecordWriter(const std::filesystem::path& file);
  ~RecordWriter();
  RecordWriter(const RecordWriter&) = delete;
  RecordWriter& operator=(const RecordWriter&) = delete;

  void Add(std::string_view record);
  void Close();

 private:
  void Flush();
  [[noreturn]] void Fail();

  std::filesystem::path path_;
  std::FILE* file_ = nullptr;
  std::string buf_;
};

// ---------------------------------------------------------------------------------------
// Sample companies.

struct Options {
  uint64_t seed = 1;
  int accounts = 200;
  int documents = 300;
  int linesMin = 1;
  int linesMax = 4;
  int items = 60;
  int ledger = 500;
  int batches = 3;
  int batchSize = 50;
  int receipts = 100;
  // Keep the logical truth of documents, ledger, batches and receipts (accounts and items
  // are always kept). Off for very large companies.
  bool keepDetail = true;

  // 100,000 accounts, 200,000 documents with 3-5 lines, 1,000,000 ledger transactions,
  // 20 batches of 10,000 and 100,000 receipts.
  static Options Large();
};

// One generated account: the logical texts (UTF-8, reading order) it was written from.
struct AccountTruth {
  int64_t record = 0;  // record number in ACT.fix
  std::string key;     // logical key; for a deleted account the empty text
  // The key is made of letters of one script only (digits and Latin, or Hebrew), so that
  // the sort-key conversion reads it back in reading order.
  bool unambiguousKey = true;
  std::string name;
  std::string address;
  std::string city;
  std::string zip;
  std::string district;
  std::string telephone;
  std::string details;
  std::string sortCode;  // raw host bytes, 3
  std::string cutOff;    // raw host bytes, 4
  uint8_t agent = 0;
  bool deleted = false;
  bool duplicateKey = false;  // an earlier account carries the same key
  // The name and address texts are such that their display order reads back unambiguously
  // (see the generator's notes on mixed text).
  bool unambiguousText = true;
  // A fault planted on purpose for the dispatch checks, "" for none: "address" (no street),
  // "zip" (three digits), "telephone" (not a telephone), "duplicate" (two accounts with the
  // same name, address and city), "character" (a name holding a byte Windows-1255 leaves
  // undefined).
  std::string dispatchFault;
};

struct ItemTruth {
  int64_t record = 0;
  std::string key;       // logical key; empty for a blank-key item
  std::string sortCode;  // raw host bytes, 3
  bool duplicateKey = false;
};

struct DocumentTruth {
  std::string file;  // "IMV.FIX" etc.
  int64_t headerRecord = 0;
  uint8_t type = 0;
  int accountIndex = -1;  // into CompanyTruth::accounts; -1 for a blank key
  int reference = 0;
  HostDate date;
  HostDate dueDate;
  struct Line {
    int64_t record = 0;
    std::string itemKey;  // logical; "#", "*" or empty for lines that are passed over
    uint8_t type = 0;
  };
  std::vector<Line> lines;
};

struct LedgerTruth {
  int64_t record = 0;
  int16_t journal = 0;
  std::string type;                   // logical
  std::array<int, 4> accountIndex{};  // -1 for a blank entry
  HostDate date;
  HostDate valueDate;
};

struct BatchTruth {
  int16_t number = 0;
  std::string fileName;                   // "a12.tmp", or with leading zeros ("a012.tmp")
  std::vector<LedgerTruth> transactions;  // journal unused
};

struct CashTruth {
  int64_t record = 0;
  int accountIndex = -1;  // -1 for a blank key
  HostDate date;
};

struct CompanyTruth {
  std::filesystem::path folder;
  std::string companyName;             // logical; empty for a blank name
  std::vector<AccountTruth> accounts;  // in record order, records 2..n-1
  std::vector<ItemTruth> items;        // in record order, records 2..n-1
  std::vector<DocumentTruth> documents;
  std::vector<LedgerTruth> ledger;
  std::vector<BatchTruth> batches;
  std::vector<CashTruth> receipts;
};

// Writes one company folder (created when missing) with ACT.fix, ITM.fix, ISHP.FIX,
// IORDR.FIX, IMV.FIX, IBD.FIX, amv.fix, the batches a<N>.tmp, icash2.fix and ADF.FIX.
// Deterministic for a given `options` and `companyName`. Throws std::runtime_error when a
// file cannot be written.
CompanyTruth WriteCompany(const std::filesystem::path& folder, const Options& options,
                          std::string_view companyName);

// Writes `count` company folders company1..companyN under `root` for the company chooser;
// company i uses seed + i - 1. When count >= 2 the second company has a blank name.
std::vector<CompanyTruth> WriteCompanies(const std::filesystem::path& root, int count,
                                         const Options& options);

// The deterministic generator behind the sample content (splitmix64).
class Random {
 public:
  explicit Random(uint64_t seed) : state_(seed) {}
  uint64_t Next();
  // Uniform in [lo, hi].
  int Between(int lo, int hi);
  bool Chance(int percent) { return Between(0, 99) < percent; }
  template <typename T, size_t N>
  const T& Pick(const T (&items)[N]) {
    return items[Between(0, static_cast<int>(N) - 1)];
  }

 private:
  uint64_t state_;
};

}  // namespace zdrgen
