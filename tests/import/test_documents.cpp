// The document import and the item import with the marking of documents by item.

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "control/panel.h"
#include "import/codepage.h"
#include "import/doctypes.h"
#include "import/importers.h"
#include "importtest.h"
#include "workdb/value.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

using test::ImportTest;
using Strings = std::vector<std::string>;
using zdrgen::HostDate;

constexpr int kInvoiceRow = 0;    // code 1, IMV.FIX
constexpr int kDeliveryRow = 13;  // code 20, ISHP.FIX

struct Line {
  std::string item;
  int type;
};

// The records of one document: header, second header, lines.
std::vector<std::string> Doc(int type, std::vector<Line> lines, std::string ref = "1",
                             HostDate date = HostDate::Of(2020, 6, 15), std::string key = "100") {
  zdrgen::DocHeaderFields h;
  h.type = static_cast<uint8_t>(type);
  h.accountKey = std::move(key);
  h.reference = std::move(ref);
  h.name = test::HostText("לקוח", 30);
  h.lineCount = static_cast<uint8_t>(lines.size());
  std::vector<std::string> recs{zdrgen::DocHeaderRecord(h),
                                zdrgen::DocSecondHeaderRecord(date, HostDate::Of(2020, 7, 1))};
  for (const Line& l : lines) {
    zdrgen::DocLineFields f;
    f.itemKey = l.item;
    f.type = static_cast<uint8_t>(l.type);
    recs.push_back(zdrgen::DocLineRecord(f));
  }
  return recs;
}

std::vector<std::string> Join(std::vector<std::vector<std::string>> docs) {
  std::vector<std::string> all;
  for (auto& d : docs) all.insert(all.end(), d.begin(), d.end());
  return all;
}

class DocumentImport : public ImportTest {
 protected:
  int32_t Run(int row = kInvoiceRow, bool withLines = true, bool asIs = false) {
    if (db_.empty()) db_ = WorkDb();
    return ReadStock(1, company_, from_, to_, db_, static_cast<uint8_t>(row), withLines, asIs,
                     panel_, docTypes_, seam_);
  }
  Strings Heads() { return Rows(db_, "SELECT HeadIndx FROM tStockHead ORDER BY HeadIndx"); }

  Panel panel_;
  DocTypeTable docTypes_;
  std::string db_, from_ = "01/01/1980", to_ = "01/01/2025";
};

TEST_F(DocumentImport, HeaderAndLineValues) {
  zdrgen::DocHeaderFields h;
  h.type = 1;
  h.accountKey = "AB(1";
  h.name = test::HostText("משה כהן", 30);
  h.address1 = test::HostText("הרצל 5", 30);
  h.address2 = test::HostText("חיפה", 30);
  h.reference = "00042";
  h.details = test::HostText("לכבוד", 48);
  h.lineCount = 1;
  zdrgen::DocLineFields l;
  l.itemKey = "X-1";
  l.type = 1;
  Write("IMV.FIX",
        {zdrgen::DocHeaderRecord(h),
         zdrgen::DocSecondHeaderRecord(HostDate::Of(2021, 3, 5), HostDate::Of(2021, 4, 5)),
         zdrgen::DocLineRecord(l)});
  EXPECT_EQ(Run(kInvoiceRow, true, true), 4);
  EXPECT_TRUE(seam_.messages.empty());
  const std::string ref = std::to_string(Date::FromParts(2021, 3, 5).serial);
  const std::string due = std::to_string(Date::FromParts(2021, 4, 5).serial);
  EXPECT_EQ(Rows(db_,
                 "SELECT CompID, TavFileID, HeadIndx, DocType2, Reference1, AccountKey, "
                 "CustomerName, Address1, Address2, DetailsLine1, SortByName, SortByCity, "
                 "Include, RefDate, DueDate, SortByZip FROM tStockHead"),
            Strings{"1|3|1|1|42|1)BA|משה כהן|הרצל 5|חיפה|לכבוד|משה כהן|חיפה|-1|" + ref + "|" + due +
                    "|" + Win1255ToUtf8(h.address2.substr(0, 4))});
  EXPECT_EQ(Rows(db_,
                 "SELECT CompID, TavFileID, HeadIndx, LineIndx, Agent, ItemKey FROM "
                 "tStockLine"),
            Strings{"1|3|1|3|<null>|X-1"});
}

TEST_F(DocumentImport, BlankHeaderFieldsStayNullAndBlankKeyIsDash) {
  zdrgen::DocHeaderFields h;
  h.lineCount = 1;
  zdrgen::DocLineFields l;
  l.itemKey = "I1";
  Write("IMV.FIX",
        {zdrgen::DocHeaderRecord(h),
         zdrgen::DocSecondHeaderRecord(HostDate::Of(2020, 1, 1), HostDate::Of(2020, 1, 1)),
         zdrgen::DocLineRecord(l)});
  Run();
  EXPECT_EQ(Rows(db_,
                 "SELECT AccountKey, CustomerName, Address1, Address2, DetailsLine1, "
                 "SortByName, SortByCity, SortByZip, Reference1 FROM tStockHead"),
            Strings{"-|<null>|<null>|<null>|<null>|<null>|<null>|<null>|0"});
}

// Regression: a header field of quotes only converts to nothing, and the empty text refused by
// the table used to end the whole document import.
TEST_F(DocumentImport, HeaderFieldOfQuotesOnlyStaysNullInsteadOfEndingImport) {
  zdrgen::DocHeaderFields h;
  h.name = "\"\"";
  h.address2 = "()";
  h.details = "\"()\"";
  h.lineCount = 1;
  zdrgen::DocLineFields l;
  l.itemKey = "I1";
  auto first = std::vector<std::string>{
      zdrgen::DocHeaderRecord(h),
      zdrgen::DocSecondHeaderRecord(HostDate::Of(2020, 1, 1), HostDate::Of(2020, 1, 1)),
      zdrgen::DocLineRecord(l)};
  Write("IMV.FIX", Join({first, Doc(1, {{"I2", 1}})}));
  EXPECT_EQ(Run(kInvoiceRow, true, false), 7);
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Heads(), (Strings{"1", "4"}));
  EXPECT_EQ(Rows(db_,
                 "SELECT CustomerName, Address2, DetailsLine1, SortByName, SortByZip FROM "
                 "tStockHead WHERE HeadIndx = 1"),
            Strings{"\"\"|()|<null>|''|()"});
}

TEST_F(DocumentImport, AllSalesInvoicesTakesCodesZeroToFour) {
  std::vector<std::vector<std::string>> docs;
  for (int t = 0; t <= 5; ++t) docs.push_back(Doc(t, {{"I" + std::to_string(t), t}}));
  Write("IMV.FIX", Join(docs));
  Run(kAllSalesInvoicesRow);
  EXPECT_EQ(Rows(db_, "SELECT DocType2 FROM tStockHead ORDER BY HeadIndx"),
            (Strings{"0", "1", "2", "3", "4"}));
}

TEST_F(DocumentImport, OtherRowsTakeTheirOwnCodeFromTheirFile) {
  Write("ISHP.FIX", Join({Doc(20, {{"A", 20}}), Doc(21, {{"B", 21}})}));
  Write("IMV.FIX", Doc(20, {{"C", 20}}));
  Run(kDeliveryRow);
  EXPECT_EQ(Rows(db_, "SELECT TavFileID, HeadIndx, DocType2 FROM tStockHead"), Strings{"1|1|20"});
}

TEST_F(DocumentImport, DocumentWithoutAcceptedLineLeavesNoHeader) {
  Write("IMV.FIX", Join({Doc(1, {{"#", 1}, {"*", 1}, {"", 1}, {"I1", 2}}),  // records 1-6
                         Doc(1, {}),                                        // 7-8
                         Doc(1, {{"#", 1}, {"I2", 1}, {"I3", 1}})}));       // 9-13
  Run();
  EXPECT_EQ(Heads(), Strings{"9"});
  EXPECT_EQ(Rows(db_, "SELECT LineIndx, ItemKey FROM tStockLine ORDER BY LineIndx"),
            (Strings{"12|I2", "13|I3"}));
}

TEST_F(DocumentImport, WithoutLinesHeadersStillNeedAnAcceptedLine) {
  Write("IMV.FIX", Join({Doc(1, {{"*", 1}}), Doc(1, {{"I1", 1}})}));
  Run(kInvoiceRow, false);
  EXPECT_EQ(Heads(), Strings{"4"});
  EXPECT_EQ(Count(db_, "tStockLine"), 0);
}

TEST_F(DocumentImport, ExcludedDocumentsLinesAreReadAsRecords) {
  // The first document is out of the date range and claims two lines; they are the next
  // document's header and second header, which the scan then finds.
  auto out = Doc(1, {}, "1", HostDate::Of(1970, 1, 1));
  zdrgen::DocHeaderFields h;
  h.type = 1;
  h.lineCount = 2;
  out[0] = zdrgen::DocHeaderRecord(h);
  Write("IMV.FIX", Join({out, Doc(1, {{"I1", 1}})}));
  from_ = "01/01/2000";
  Run();
  EXPECT_EQ(Heads(), Strings{"3"});
}

TEST_F(DocumentImport, DateRangeInclusiveAndShortTextIsNoBound) {
  Write("IMV.FIX", Join({Doc(1, {{"A", 1}}, "1", HostDate::Of(2020, 1, 31)),
                         Doc(1, {{"A", 1}}, "2", HostDate::Of(2020, 2, 1)),
                         Doc(1, {{"A", 1}}, "3", HostDate::Of(2020, 2, 29)),
                         Doc(1, {{"A", 1}}, "4", HostDate::Of(2020, 3, 1))}));
  from_ = "1/2/20";
  to_ = "29/2/2020";
  Run();
  EXPECT_EQ(Rows(db_, "SELECT Reference1 FROM tStockHead ORDER BY HeadIndx"), (Strings{"2", "3"}));
  db_.clear();
  from_ = "1/2/2";  // five characters: no bound
  Run();
  EXPECT_EQ(Rows(db_, "SELECT Reference1 FROM tStockHead ORDER BY HeadIndx"),
            (Strings{"1", "2", "3"}));
}

TEST_F(DocumentImport, ReferenceRangeReadsTheNumberAtTheStart) {
  Write("IMV.FIX",
        Join({Doc(1, {{"A", 1}}, "5"), Doc(1, {{"A", 1}}, "10"), Doc(1, {{"A", 1}}, "12"),
              Doc(1, {{"A", 1}}, "13"), Doc(1, {{"A", 1}}, "0")}));
  panel_.txtFromRef = " 10abc";
  panel_.txtToRef = "12.5";  // halves to even: 12
  Run();
  EXPECT_EQ(Rows(db_, "SELECT Reference1 FROM tStockHead ORDER BY HeadIndx"),
            (Strings{"10", "12"}));
  db_.clear();
  panel_.txtFromRef = "";
  panel_.txtToRef = "abc";  // not a number: 0
  Run();
  EXPECT_EQ(Rows(db_, "SELECT Reference1 FROM tStockHead"), Strings{"0"});
}

TEST_F(DocumentImport, MissingFileShowsDocumentFilesNotFound) {
  EXPECT_EQ(Run(), 0);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].text, "קבצי מסמכים לא נמצאו");
  EXPECT_EQ(seam_.messages[0].title, "שגיאה");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Critical);
}

TEST_F(DocumentImport, RowOutsideTheFilledTableIsMissingFile) {
  EXPECT_EQ(Run(30), 0);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].text, "קבצי מסמכים לא נמצאו");
}

TEST_F(DocumentImport, TruncatedFileReportsAndKeepsEarlierRows) {
  auto recs = Join({Doc(1, {{"A", 1}}), Doc(1, {{"B", 1}, {"C", 1}})});
  recs.pop_back();  // the last line is missing
  Write("IMV.FIX", recs);
  EXPECT_EQ(Run(), 0);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "שגיאה");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Critical);
  EXPECT_EQ(Heads(), (Strings{"1", "4"}));
  EXPECT_EQ(Count(db_, "tStockLine"), 2);
}

TEST_F(DocumentImport, RaggedTailOverHalfARecordIsReported) {
  Write("IMV.FIX", Doc(1, {{"A", 1}}));
  AppendBytes("IMV.FIX", std::string(100, ' '));
  EXPECT_EQ(Run(), 0);
  EXPECT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(Heads(), Strings{"1"});
}

TEST_F(DocumentImport, ReturnsTheCounterPastTheLastRecord) {
  Write("IMV.FIX", Join({Doc(2, {{"A", 2}}), Doc(1, {{"A", 1}})}));
  EXPECT_EQ(Run(), 7);  // six records
}

// ---- Items and the marking.

class ItemImport : public DocumentImport {
 protected:
  void SetUp() override {
    DocumentImport::SetUp();
    // Headers 1 (items A1, B2), 5 (C3), 8 (Z9 only), 11 (A1 twice).
    Write("IMV.FIX", Join({Doc(1, {{"A1", 1}, {"B2", 1}}), Doc(1, {{"C3", 1}}), Doc(1, {{"Z9", 1}}),
                           Doc(1, {{"A1", 1}, {"A1", 1}})}));
    Run();
  }
  void WriteItems(const std::vector<std::pair<std::string, std::string>>& items) {
    std::vector<std::string> recs;
    zdrgen::ItemFields filler;
    filler.key = "FIRST";
    recs.push_back(zdrgen::ItemRecord(filler));
    for (const auto& [key, sort] : items) {
      zdrgen::ItemFields f;
      f.key = key;
      f.sortCode = sort;
      recs.push_back(zdrgen::ItemRecord(f));
    }
    filler.key = "LAST";
    recs.push_back(zdrgen::ItemRecord(filler));
    Write("ITM.fix", recs);
  }
  Strings Marked() {
    return Rows(db_, "SELECT HeadIndx FROM tStockHead WHERE Include = True ORDER BY HeadIndx");
  }
  Strings Items() { return Rows(db_, "SELECT ItemKey FROM tItem ORDER BY ItemKey"); }
};

TEST_F(ItemImport, NoRangeStoresEveryKeyedItemAndMarksTheirDocuments) {
  WriteItems({{"A1", "  1"}, {"B2", "  2"}, {"", "  3"}, {"C3", "  4"}, {"A1", "  5"}});
  ReadItem(company_, db_, panel_, seam_);
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Items(), (Strings{"A1", "B2", "C3"}));
  EXPECT_EQ(Marked(), (Strings{"1", "5", "11"}));
}

TEST_F(ItemImport, FirstAndLastRecordAreNotRead) {
  WriteItems({{"B2", "  1"}});
  ReadItem(company_, db_, panel_, seam_);
  EXPECT_EQ(Items(), Strings{"B2"});
}

TEST_F(ItemImport, SortBoundIsTrimmedAndPadded) {
  WriteItems({{"A1", "  9"}, {"C3", "  5"}});
  panel_.txtFromItmSort = " 7 ";
  ReadItem(company_, db_, panel_, seam_);
  EXPECT_EQ(Items(), Strings{"A1"});
  EXPECT_EQ(Marked(), (Strings{"1", "11"}));
}

TEST_F(ItemImport, KeysComparedAsText) {
  WriteItems({{"A20", "  1"}, {"A1", "  1"}, {"C3", "  1"}});
  panel_.txtFromItmKey = "A100";
  panel_.txtToItmKey = "B";
  ReadItem(company_, db_, panel_, seam_);
  EXPECT_EQ(Items(), Strings{"A20"});
  EXPECT_TRUE(Marked().empty());
}

TEST_F(ItemImport, NoItemInRangeClearsEveryMark) {
  WriteItems({{"A1", "  1"}});
  panel_.txtFromItmKey = "X";
  ReadItem(company_, db_, panel_, seam_);
  EXPECT_TRUE(Items().empty());
  EXPECT_TRUE(Marked().empty());
  EXPECT_EQ(Count(db_, "tStockHead"), 4);
}

TEST_F(ItemImport, SortBoundTooLongIsFaultAndLeavesMarks) {
  WriteItems({{"A1", "  1"}});
  panel_.txtToItmSort = "1234";
  ReadItem(company_, db_, panel_, seam_);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Information);
  EXPECT_EQ(Marked().size(), 4u);
}

TEST_F(ItemImport, MissingFileIsFault) {
  ReadItem(company_, db_, panel_, seam_);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Information);
  EXPECT_EQ(Marked().size(), 4u);
}

}  // namespace
}  // namespace zdr
