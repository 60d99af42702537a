// Items: ITM.fix into tItem, then the marking of the document headers that hold them.

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

using importing::CompareCodes;
using importing::FieldOf;

constexpr size_t kItemRecord = 500;
constexpr size_t kKeyAt = 0, kKeyLen = 12;
constexpr size_t kSortAt = 52, kSortLen = 3;

constexpr std::string_view kClearMarks = "UPDATE tStockHead SET tStockHead.Include = False";

std::string MarkStatement() {
  std::string s = "UPDATE DISTINCTROW tStockHead INNER JOIN qHeadByItem";
  s += " ON (tStockHead.CompID = qHeadByItem.CompID)";
  s += " AND (tStockHead.TavFileID = qHeadByItem.TavFileID)";
  s += " AND (tStockHead.HeadIndx = qHeadByItem.HeadIndx)";
  s += " SET tStockHead.Include = True";
  return s;
}

// An item sort-code bound: trimmed, then padded with leading spaces to the code's width.
std::string SortBound(const std::string& typed) {
  std::string text = importing::PanelText(TrimSpaces(typed));
  if (text.empty()) return text;
  return AlignRight(std::string_view(text), 3);
}

}  // namespace

bool ReadItem(const std::string& CompPath, const std::string& pDBFile, const Panel& panel,
              UserSeam& ui) {
  try {
    HostRecordFile file(CompPath, "ITM.fix", kItemRecord);
    const double q = file.Count() - 1;
    const int64_t last = RoundHalfEven(q);

    const std::string fromSort = SortBound(panel.txtFromItmSort);
    const std::string toSort = SortBound(panel.txtToItmSort);
    const std::string fromKey = importing::PanelText(TrimSpaces(panel.txtFromItmKey));
    const std::string toKey = importing::PanelText(TrimSpaces(panel.txtToItmKey));

    db::Database db = db::Database::Open(pDBFile);
    {
      ProgressReporter progress(ui, q);
      db::TableRecordset table = db.OpenTable("tItem");
      importing::ImportPipeline pipeline(progress);
      importing::RowTarget& rs = pipeline.Add(table);
      importing::TextColumn itemKey(rs, "ItemKey");
      std::string converted;  // reused from record to record
      pipeline.Run([&] {
        for (int64_t n = 2; n <= last; ++n) {
          std::string_view rec = importing::RecordOf(file, n);
          ConvertForSort(TrimSpaces(FieldOf(rec, kKeyAt, kKeyLen)), converted);
          std::string_view key = TrimSpaces(converted);
          std::string_view sort = FieldOf(rec, kSortAt, kSortLen);
          const bool inRange = !(!fromSort.empty() && CompareCodes(sort, fromSort) < 0) &&
                               !(!toSort.empty() && CompareCodes(sort, toSort) > 0) &&
                               !(!fromKey.empty() && CompareCodes(key, fromKey) < 0) &&
                               !(!toKey.empty() && CompareCodes(key, toKey) > 0);
          if (inRange && !key.empty()) {
            rs.AddNew();
            itemKey.Set(rs, key);
            rs.UpdatePassingDuplicates();
          }
          if (n % 5 == 0) pipeline.Progress(static_cast<double>(n));
          pipeline.RecordDone();
        }
      });
      table.Close();
    }

    db.Execute(kClearMarks);
    db.Execute(MarkStatement());
    db.Close();
    return true;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleFault, MsgIcon::Information);
    return false;
  }
}

}  // namespace zdr
