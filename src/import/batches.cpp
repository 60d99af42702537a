// Temporary batches: the company's a<number>.tmp files into tTransact.

#include <cctype>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>

#include "engine/engine.h"
#include "hostfile/hostfile.h"
#include "hosttext/hosttext.h"
#include "import/importcommon.h"
#include "import/importers.h"

namespace zdr {

namespace {

using importing::FieldOf;

constexpr size_t kBatchRecord = 220;
// Type at 1 (3 bytes), four keys of 8 bytes at 57, the date at 89, the value date at 92.
constexpr importing::TransactLayout kLayout{1, 3, 57, 8, 89, 92};

bool EqualsNoCase(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return false;
  for (size_t i = 0; i < a.size(); ++i) {
    if (std::tolower(static_cast<unsigned char>(a[i])) !=
        std::tolower(static_cast<unsigned char>(b[i]))) {
      return false;
    }
  }
  return true;
}

// The batch number of a file name of the form a<number>.tmp (any case), or nothing when the
// name has another form, its middle is not a number, or the number does not fit 16 bits.
std::optional<int16_t> BatchNumberOf(std::string_view name) {
  if (name.size() < 5 || !EqualsNoCase(name.substr(0, 1), "a") ||
      !EqualsNoCase(name.substr(name.size() - 4), ".tmp")) {
    return std::nullopt;
  }
  std::string_view middle = name.substr(1, name.size() - 5);
  if (!importing::IsNumericText(middle)) return std::nullopt;
  try {
    const int64_t v = HostIntValue(middle);
    if (v < INT16_MIN || v > INT16_MAX) return std::nullopt;
    return static_cast<int16_t>(v);
  } catch (const std::exception&) {
    return std::nullopt;
  }
}

// Reads one batch file, opened by `open`, into tTransact with FileID pJournalNo; -1 when it
// was read to its end, 0 after showing a failure.
template <typename OpenFile>
int16_t ReadBatch(OpenFile open, const std::string& pDBFile, int16_t pJournalNo, bool pAsIs,
                  const Panel& panel, UserSeam& ui) {
  try {
    importing::LedgerFilter filter(panel);

    const HostRecordFile file = open();
    importing::ImportTransactions(file, kLayout, pDBFile, pJournalNo, filter, pAsIs, ui,
                                  [](std::string_view) { return true; });
    return -1;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleFault, MsgIcon::Information);
    return 0;
  }
}

}  // namespace

int ReadAllTempTrans(const std::string& CompPath, const std::string& pDBFile, bool pAsIs,
                     const Panel& panel, UserSeam& ui) {
  const importing::JournalRange journals = importing::JournalRange::FromPanel(panel);

  // Listed in the order the folder gives them. A folder that cannot be listed has no batches.
  int failed = 0;
  std::error_code ec;
  std::filesystem::directory_iterator it(CompPath, ec);
  if (ec) return failed;
  for (const std::filesystem::directory_entry& entry : it) {
    std::error_code typeEc;
    if (entry.is_directory(typeEc)) continue;
    const std::string name = entry.path().filename().string();
    const std::optional<int16_t> batch = BatchNumberOf(name);
    if (!batch || *batch == 0 || !journals.Contains(*batch)) continue;
    // The file the listing found is read: a012.tmp is batch 12 but is not the file a12.tmp.
    // A FIFO or a device in a batch's place is opened without waiting and refused there.
    const std::filesystem::path path = entry.path();
    if (ReadBatch([&path] { return HostRecordFile(path, kBatchRecord); }, pDBFile, *batch, pAsIs,
                  panel, ui) == 0) {
      ++failed;
    }
  }
  return failed;
}

int16_t ReadTempTransactions(const std::string& CompPath, const std::string& pDBFile,
                             int16_t pJournalNo, bool pAsIs, const Panel& panel, UserSeam& ui) {
  std::string name = "a";
  name += std::to_string(pJournalNo);
  name += ".tmp";
  return ReadTempTransactions(CompPath, pDBFile, pJournalNo, name, pAsIs, panel, ui);
}

int16_t ReadTempTransactions(const std::string& CompPath, const std::string& pDBFile,
                             int16_t pJournalNo, const std::string& pFileName, bool pAsIs,
                             const Panel& panel, UserSeam& ui) {
  return ReadBatch([&] { return HostRecordFile(CompPath, pFileName, kBatchRecord); }, pDBFile,
                   pJournalNo, pAsIs, panel, ui);
}

}  // namespace zdr
