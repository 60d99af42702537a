// The permanent ledger: amv.fix into tTransact.

#include <exception>
#include <string>
#include <string_view>

#include "import/hostfile.h"
#include "import/hosttext.h"
#include "import/importcommon.h"
#include "import/importers.h"
#include "workdb/engine.h"

namespace zdr {

namespace {

using importing::FieldOf;

constexpr size_t kLedgerRecord = 180;
constexpr size_t kJournalAt = 0;
constexpr size_t kTypeAt = 2, kTypeLen = 3;
constexpr size_t kKeysAt = 44, kKeyLen = 8;
constexpr size_t kDateAt = 76, kValueDateAt = 79;

// Rows of the permanent ledger carry this file number; batches carry their own number.
constexpr int32_t kLedgerFileId = -1;

int16_t JournalOf(std::string_view rec) {
  const auto lo = static_cast<unsigned char>(rec[kJournalAt]);
  const auto hi = static_cast<unsigned char>(rec[kJournalAt + 1]);
  return static_cast<int16_t>(static_cast<uint16_t>(lo | (hi << 8)));
}

}  // namespace

int16_t ReadTransactions(const std::string& CompPath, const std::string& pDBFile,
                         const Panel& panel, UserSeam& ui, bool pAsIs) {
  try {
    const importing::JournalRange journals = importing::JournalRange::FromPanel(panel);
    importing::LedgerFilter filter(panel);

    HostRecordFile file(CompPath, "amv.fix", kLedgerRecord);
    const int64_t n = RoundHalfEven(file.Count());

    ProgressReporter progress(ui, static_cast<double>(n));
    db::Database db = db::Database::Open(pDBFile);
    db::TableRecordset rs = db.OpenTable("tTransact");
    importing::TransactWriter writer(rs, pAsIs);

    for (int64_t i = 1; i <= n; ++i) {
      std::string_view rec = importing::RecordOf(file, i);
      if (journals.Contains(JournalOf(rec)) &&
          filter.Pass(FieldOf(rec, kTypeAt, kTypeLen), importing::DateAt(rec, kDateAt),
                      importing::DateAt(rec, kValueDateAt))) {
        for (size_t k = 0; k < 4; ++k) {
          writer.Add(kLedgerFileId, static_cast<int32_t>(i),
                     FieldOf(rec, kKeysAt + k * kKeyLen, kKeyLen));
        }
      }
      if (i % 5 == 0) progress.Update(static_cast<double>(i));
    }
    rs.Close();
    db.Close();
    return -1;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleFault, MsgIcon::Information);
    return 0;
  }
}

}  // namespace zdr
