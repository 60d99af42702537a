// Cash receipts: icash2.fix into tCash.

#include <exception>
#include <optional>
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

constexpr size_t kCashRecord = 90;
constexpr size_t kKeyAt = 0, kKeyLen = 8;
constexpr size_t kDateAt = 14;

// A bound of the document dates: in force when ChkDates is on and the text is not empty.
std::optional<Date> DateBound(const Panel& panel, const std::string& typed) {
  if (!Panel::On(panel.ChkDates) || typed.empty()) return std::nullopt;
  return ParseHostDate(importing::PanelText(typed));
}

}  // namespace

int16_t ReadCash(const std::string& CompPath, const std::string& pDBFile, bool pAsIs,
                 const Panel& panel, UserSeam& ui) {
  try {
    const std::optional<Date> from = DateBound(panel, panel.TxtFromDate);
    const std::optional<Date> to = DateBound(panel, panel.TxtToDate);

    HostRecordFile file(CompPath, "icash2.fix", kCashRecord);
    const int64_t n = RoundHalfEven(file.Count());

    ProgressReporter progress(ui, static_cast<double>(n));
    db::Database db = db::Database::Open(pDBFile);
    db::TableRecordset table = db.OpenTable("tCash");
    importing::ImportPipeline pipeline(progress);
    importing::RowTarget& rs = pipeline.Add(table);
    const int transId = rs.FieldIndex("TransID");
    importing::TextColumn account(rs, "AccountKey");
    std::string key;  // reused from record to record

    pipeline.Run([&] {
      for (int64_t i = 1; i <= n; ++i) {
        std::string_view rec = importing::RecordOf(file, i);
        const Date date = importing::DateAt(rec, kDateAt);
        if (!(from && date < *from) && !(to && date > *to)) {
          // Keys match tAccount's: converted as the account import of this load converts them.
          ConvertForDisplay(FieldOf(rec, kKeyAt, kKeyLen), pAsIs, key);
          std::string_view trimmed = TrimSpaces(key);
          if (!trimmed.empty()) {
            rs.AddNew();
            rs.SetInt(transId, i);
            account.Set(rs, trimmed);
            rs.UpdatePassingDuplicates();
          }
        }
        if (i % 5 == 0) pipeline.Progress(static_cast<double>(i));
        pipeline.RecordDone();
      }
    });
    table.Close();
    db.Close();
    return -1;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleFault, MsgIcon::Information);
    return 0;
  }
}

}  // namespace zdr
