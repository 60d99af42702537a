// Documents: the stock-document file of a document type into tStockHead and tStockLine.

#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

#include "engine/engine.h"
#include "hostfile/hostfile.h"
#include "hosttext/codepage.h"
#include "hosttext/hosttext.h"
#include "import/importcommon.h"
#include "import/importers.h"

namespace zdr {

namespace {

using importing::ByteOf;
using importing::FieldOf;
using importing::TextColumn;

constexpr size_t kDocRecord = 170;

// Header record.
constexpr unsigned char kHeaderKind = 1;
constexpr size_t kKindAt = 0, kTypeAt = 1;
constexpr size_t kAccountAt = 2, kAccountLen = 8;
constexpr size_t kNameAt = 10, kNameLen = 30;
constexpr size_t kAddress1At = 40, kAddress2At = 70, kAddressLen = 30;
constexpr size_t kRefAt = 100, kRefLen = 5;
constexpr size_t kDetailsAt = 110, kDetailsLen = 48;
constexpr size_t kLineCountAt = 158;
// Second header record.
constexpr size_t kDocDateAt = 102, kDueDateAt = 105;
// Line record.
constexpr size_t kItemAt = 1, kItemLen = 12;
constexpr size_t kLineTypeAt = 93;

// The "all sales invoices" row has no code of its own: it takes the codes of the invoice rows.
constexpr int16_t kAllSalesInvoicesCode = 102;
constexpr unsigned char kHighestSalesInvoiceCode = 4;

std::optional<Date> DateBound(const std::string& typed) {
  // A text too short to be a date is no bound.
  if (Utf8Length(typed) < 6) return std::nullopt;
  return ParseHostDate(importing::PanelText(typed));
}

std::optional<int32_t> RefBound(const std::string& typed) {
  if (typed.empty()) return std::nullopt;
  return importing::LongAtStart(importing::PanelText(typed), "מספר מסמך");
}

class HeadWriter {
 public:
  HeadWriter(importing::RowTarget& rs, bool asIs)
      : rs_(rs),
        asIs_(asIs),
        compId_(rs.FieldIndex("CompID")),
        fileId_(rs.FieldIndex("TavFileID")),
        headIndx_(rs.FieldIndex("HeadIndx")),
        docType_(rs.FieldIndex("DocType2")),
        refDate_(rs.FieldIndex("RefDate")),
        dueDate_(rs.FieldIndex("DueDate")),
        reference_(rs.FieldIndex("Reference1")),
        include_(rs.FieldIndex("Include")),
        account_(rs, "AccountKey"),
        name_(rs, "CustomerName"),
        address1_(rs, "Address1"),
        address2_(rs, "Address2"),
        details_(rs, "DetailsLine1"),
        sortByName_(rs, "SortByName"),
        sortByCity_(rs, "SortByCity"),
        sortByZip_(rs, "SortByZip") {}

  void Write(std::string_view head, int16_t compId, int16_t fileIndex, int32_t headIndx,
             Date refDate, Date dueDate, int32_t reference) {
    rs_.AddNew();
    rs_.SetInt(compId_, compId);
    rs_.SetInt(fileId_, fileIndex);
    rs_.SetInt(headIndx_, headIndx);
    rs_.SetInt(docType_, ByteOf(head, kTypeAt));
    rs_.SetDate(refDate_, refDate);
    rs_.SetDate(dueDate_, dueDate);
    rs_.SetInt(reference_, reference);

    ConvertForDisplay(FieldOf(head, kAccountAt, kAccountLen), asIs_, scratch_);
    account_.SetOr(rs_, TrimSpaces(scratch_), "-");

    std::string_view name = TrimSpaces(FieldOf(head, kNameAt, kNameLen));
    std::string_view address1 = TrimSpaces(FieldOf(head, kAddress1At, kAddressLen));
    std::string_view address2 = TrimSpaces(FieldOf(head, kAddress2At, kAddressLen));
    std::string_view details = TrimSpaces(FieldOf(head, kDetailsAt, kDetailsLen));
    // Name and address are read like the account's own (in reading order, whatever the
    // load): the sheet and the dispatch file print the same recipient. Only the key, spread
    // one character per cell, is reversed for the as-is load. A field that converts to
    // nothing stays Null: the table refuses an empty text, and refusing it would end the
    // whole import.
    if (!name.empty()) {
      ConvertWithBidi(name, scratch_);
      name_.SetOrNull(rs_, scratch_);
    }
    if (!address1.empty()) {
      ConvertWithBidi(address1, scratch_);
      address1_.SetOrNull(rs_, scratch_);
    }
    if (!address2.empty()) {
      ConvertWithBidi(address2, scratch_);
      address2_.SetOrNull(rs_, scratch_);
      sortByCity_.SetOrNull(rs_, scratch_);
    }
    if (!details.empty()) {
      ConvertForDisplay(details, false, scratch_);
      details_.SetOrNull(rs_, scratch_);
    }
    if (!name.empty()) {
      ConvertForSort(name, scratch_);
      sortByName_.SetOrNull(rs_, scratch_);
    }
    sortByZip_.SetOrNull(rs_, address2.substr(0, 5));
    rs_.SetBool(include_, true);
    rs_.Update();
  }

 private:
  importing::RowTarget& rs_;
  bool asIs_;
  int compId_, fileId_, headIndx_, docType_, refDate_, dueDate_, reference_, include_;
  TextColumn account_, name_, address1_, address2_, details_, sortByName_, sortByCity_, sortByZip_;
  std::string scratch_;  // conversions, reused (each column copies what it is given)
};

class LineWriter {
 public:
  explicit LineWriter(importing::RowTarget& rs)
      : rs_(rs),
        compId_(rs.FieldIndex("CompID")),
        fileId_(rs.FieldIndex("TavFileID")),
        headIndx_(rs.FieldIndex("HeadIndx")),
        lineIndx_(rs.FieldIndex("LineIndx")),
        item_(rs, "ItemKey") {}

  void Write(int16_t compId, int16_t fileIndex, int32_t headIndx, int32_t lineIndx,
             std::string_view rawItem) {
    ConvertForSort(rawItem, converted_);
    rs_.AddNew();
    rs_.SetInt(compId_, compId);
    rs_.SetInt(fileId_, fileIndex);
    rs_.SetInt(headIndx_, headIndx);
    rs_.SetInt(lineIndx_, lineIndx);
    item_.Set(rs_, TrimSpaces(converted_));
    rs_.Update();
  }

 private:
  importing::RowTarget& rs_;
  int compId_, fileId_, headIndx_, lineIndx_;
  TextColumn item_;
  std::string converted_;
};

}  // namespace

int32_t ReadStock(int16_t pCompID, const std::string& pCompPath, const std::string& pFromDate,
                  const std::string& pToDate, const std::string& pDBFile, uint8_t pDocTypeIndex,
                  bool pWithLines, bool pAsIs, const Panel& panel, const DocTypeTable& docTypes,
                  UserSeam& ui) {
  try {
    const DocTypeDef& row = docTypes.Row(pDocTypeIndex);
    const std::string& fileName = docTypes.FileName(row.FileIndex);
    std::optional<std::filesystem::path> path;
    if (!fileName.empty()) path = FindFileNoCase(pCompPath, fileName);
    if (!path) {
      ui.ShowMessage(kMsgNoDocumentFiles, kTitleError, MsgIcon::Critical);
      return 0;
    }

    HostRecordFile file(*path, kDocRecord);
    const int64_t n = RoundHalfEven(file.Count());

    const std::optional<Date> fromDate = DateBound(pFromDate);
    const std::optional<Date> toDate = DateBound(pToDate);
    const std::optional<int32_t> fromRef = RefBound(panel.txtFromRef);
    const std::optional<int32_t> toRef = RefBound(panel.txtToRef);

    auto typeMatches = [&row](unsigned char type) {
      if (row.DocCode == kAllSalesInvoicesCode) return type <= kHighestSalesInvoiceCode;
      return type == row.DocCode;
    };

    ProgressReporter progress(ui, static_cast<double>(n));
    db::Database db = db::Database::Open(pDBFile);
    db::TableRecordset heads = db.OpenTable("tStockHead");
    db::TableRecordset lines = db.OpenTable("tStockLine");
    importing::ImportPipeline pipeline(progress);
    HeadWriter headWriter(pipeline.Add(heads), pAsIs);
    LineWriter lineWriter(pipeline.Add(lines));
    int64_t lastWritten = 0;

    int64_t i = 1;
    pipeline.Run([&] {
      for (; i <= n; ++i) {
        std::string_view head = importing::RecordOf(file, i);
        if (ByteOf(head, kKindAt) == kHeaderKind && typeMatches(ByteOf(head, kTypeAt))) {
          const int64_t h = i;
          const unsigned char docType = ByteOf(head, kTypeAt);
          const int lineCount = ByteOf(head, kLineCountAt);

          ++i;
          std::string_view second = importing::RecordOf(file, i);
          const Date refDate = importing::DateAt(second, kDocDateAt);
          const int32_t reference =
              importing::LongAtStart(TrimSpaces(FieldOf(head, kRefAt, kRefLen)), "מספר מסמך");

          // An excluded document's lines are not skipped: the loop visits them as records.
          const bool included =
              !(fromDate && refDate < *fromDate) && !(toDate && refDate > *toDate) &&
              !(fromRef && reference < *fromRef) && !(toRef && reference > *toRef);
          if (included) {
            const Date dueDate = importing::DateAt(second, kDueDateAt);
            for (int j = 1; j <= lineCount; ++j) {
              ++i;
              std::string_view line = importing::RecordOf(file, i);
              std::string_view item = TrimSpaces(FieldOf(line, kItemAt, kItemLen));
              if (item.empty() || item == "#" || item == "*") continue;
              if (ByteOf(line, kLineTypeAt) != docType) continue;
              // The header is written once, with its first accepted line.
              if (h > lastWritten) {
                headWriter.Write(head, pCompID, row.FileIndex, static_cast<int32_t>(h), refDate,
                                 dueDate, reference);
                lastWritten = h;
              }
              if (pWithLines) {
                lineWriter.Write(pCompID, row.FileIndex, static_cast<int32_t>(h),
                                 static_cast<int32_t>(i), item);
              }
            }
          }
        }
        if (i % 5 == 0) pipeline.Progress(static_cast<double>(i));
        pipeline.RecordDone();
      }
    });
    heads.Close();
    lines.Close();
    db.Close();
    return static_cast<int32_t>(i);
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleError, MsgIcon::Critical);
    return 0;
  }
}

}  // namespace zdr
