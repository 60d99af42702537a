// The permanent ledger: amv.fix into tTransact.

#include <exception>
#include <string>
#include <string_view>

#include "engine/engine.h"
#include "hostfile/hostfile.h"
#include "hosttext/hosttext.h"
#include "import/importcommon.h"
#include "import/importers.h"

namespace zdr {

namespace {

using importing::FieldOf;

constexpr size_t kLedgerRecord = 180;
constexpr size_t kJournalAt = 0;
// Type at 2 (3 bytes), four keys of 8 bytes at 44, the date at 76, the value date at 79.
constexpr importing::TransactLayout kLayout{2, 3, 44, 8, 76, 79};

// Rows of the permanent ledger carry this file number; batches carry their own number.
constexpr int32_t kLedgerFileId = -1;

int16_t JournalOf(std::string_view rec) {
  const auto lo = static_cast<unsigned char>(rec[kJournalAt]);
  const auto hi = static_cast<unsigned char>(rec[kJournalAt + 1]);
  return static_cast<int16_t>(static_cast<uint16_t>(lo | (hi << 8)));
}

}  // namespace

int16_t ReadTransactions(const std::string& CompPath, const std::string& pDBFile, bool pAsIs,
                         const Panel& panel, UserSeam& ui) {
  try {
    const importing::JournalRange journals = importing::JournalRange::FromPanel(panel);
    importing::LedgerFilter filter(panel);

    const HostRecordFile file(CompPath, "amv.fix", kLedgerRecord);
    importing::ImportTransactions(
        file, kLayout, pDBFile, kLedgerFileId, filter, pAsIs, ui,
        [&journals](std::string_view rec) { return journals.Contains(JournalOf(rec)); });
    return -1;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleFault, MsgIcon::Information);
    return 0;
  }
}

}  // namespace zdr
