// The document import and the item import with the marking of documents by item.

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "common/panel.h"
#include "common/value.h"
#include "hostfile/doctypes.h"
#include "hosttext/codepage.h"
#include "import/importers.h"
#include "support/importtest.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

using Strings = std::vector<std::string>;
using Records = std::vector<std::string>;
using zdrgen::HostDate;

constexpr int kInvoiceRow = 0;    // code 1, IMV.FIX
constexpr int kDeliveryRow = 13;  // code 20, ISHP.FIX

struct Line {
  std::string item;
  int type;
};

// The records of one document: header, second header, lines.
Records Doc(int type, std::vector<Line> lines, std::string ref = "1",
            HostDate date = HostDate::Of(2020, 6, 15)) {
  zdrgen::DocHeaderFields h;
  h.type = static_cast<uint8_t>(type);
  h.accountKey = "100";
  h.reference = std::move(ref);
  h.name = test::HostText("לקוח", 30);
  h.lineCount = static_cast<uint8_t>(lines.size());
  Records recs{zdrgen::DocHeaderRecord(h),
               zdrgen::DocSecondHeaderRecord(date, HostDate::Of(2020, 7, 1))};
  for (const Line& l : lines) {
    recs.push_back(zdrgen::DocLineRecord({2, l.item, static_cast<uint8_t>(l.type)}));
  }
  return recs;
}

Records Join(std::vector<Records> docs) {
  Records all;
  for (auto& d : docs) all.insert(all.end(), d.begin(), d.end());
  return all;
}

class DocumentImport : public test::ImportTest {
 protected:
  int32_t Run(int row = kInvoiceRow, bool withLines = true, bool asIs = false) {
    if (db_.empty()) db_ = WorkDb();
    return ReadStock(1, company_, from_, to_, db_, static_cast<uint8_t>(row), withLines, asIs,
                     panel_, docTypes_, seam_);
  }
  Strings Column(const char* column) {
    return Rows(db_, std::string("SELECT ") + column + " FROM tStockHead ORDER BY HeadIndx");
  }

  Panel panel_;
  DocTypeTable docTypes_;
  std::string db_, from_ = "01/01/1980", to_ = "01/01/2025";
};

// Regression inside: a header field of quotes only converts to nothing, and the empty text
// the table refused used to end the whole document import.
TEST_F(DocumentImport, HeaderAndLineValues) {
  using test::HostText;
  // clang-format off
  const zdrgen::DocHeaderFields h{1, 1, "AB(1", HostText("משה כהן", 30), HostText("הרצל 5", 30),
                                  HostText("חיפה", 30), "00042", HostText("לכבוד", 48), 1};
  // clang-format on
  const zdrgen::DocHeaderFields blank{1, 1, "", "", "", "", "", "", 1};
  const zdrgen::DocHeaderFields quotes{1, 1, "", "\"\"", "", "()", "", "\"()\"", 1};
  Records recs;
  for (const auto& header : {h, blank, quotes}) {
    recs.push_back(zdrgen::DocHeaderRecord(header));
    recs.push_back(
        zdrgen::DocSecondHeaderRecord(HostDate::Of(2021, 3, 5), HostDate::Of(2021, 4, 5)));
    recs.push_back(zdrgen::DocLineRecord({2, "X-" + std::to_string(recs.size()), 1}));
  }
  Write("IMV.FIX", recs);
  EXPECT_EQ(Run(kInvoiceRow, true, true), 10);
  EXPECT_TRUE(seam_.messages.empty());
  const std::string dates = std::to_string(Date::FromParts(2021, 3, 5).serial) + "|" +
                            std::to_string(Date::FromParts(2021, 4, 5).serial);
  EXPECT_EQ(
      Column("CompID, TavFileID, HeadIndx, DocType2, Reference1, AccountKey, CustomerName, "
             "Address1, Address2, DetailsLine1, SortByName, SortByCity, Include, RefDate, "
             "DueDate, SortByZip"),
      (Strings{"1|3|1|1|42|1)BA|משה כהן|הרצל 5|חיפה|לכבוד|משה כהן|חיפה|-1|" + dates + "|" +
                   Win1255ToUtf8(h.address2.substr(0, 4)),
               "1|3|4|1|0|-|<null>|<null>|<null>|<null>|<null>|<null>|-1|" + dates + "|<null>",
               "1|3|7|1|0|-|\"\"|<null>|()|<null>|''|()|-1|" + dates + "|()"}));
  EXPECT_EQ(Rows(db_,
                 "SELECT CompID, TavFileID, HeadIndx, LineIndx, Agent, ItemKey FROM "
                 "tStockLine ORDER BY LineIndx"),
            (Strings{"1|3|1|3|<null>|X-2", "1|3|4|6|<null>|X-5", "1|3|7|9|<null>|X-8"}));
}

// Which documents are read: the row's type code from the row's file (all sales invoices:
// codes 0 to 4), only with an accepted line, within the dates and references.
TEST_F(DocumentImport, WhichDocumentsAreRead) {
  Records sales;
  for (int t = 0; t <= 5; ++t) sales = Join({sales, Doc(t, {{"I", t}}, std::to_string(t))});
  sales = Join({sales, Doc(20, {{"C", 20}}, "99")});
  const Records lines = Join({Doc(1, {{"#", 1}, {"*", 1}, {"", 1}, {"I1", 2}}, "1"),  // 1-6
                              Doc(1, {}, "2"),                                        // 7-8
                              Doc(1, {{"#", 1}, {"I2", 1}, {"I3", 1}}, "3")});        // 9-13
  Records dates;
  int ref = 1;
  for (const HostDate d : {HostDate::Of(2020, 1, 31), HostDate::Of(2020, 2, 1),
                           HostDate::Of(2020, 2, 29), HostDate::Of(2020, 3, 1)}) {
    dates = Join({dates, Doc(1, {{"A", 1}}, std::to_string(ref++), d)});
  }
  Records refs;
  for (const char* r : {"5", "10", "12", "13", "0"}) refs = Join({refs, Doc(1, {{"A", 1}}, r)});
  // Out of the dates and claiming two lines, which are the next document's header and second
  // header: the scan then finds that one's lines as records.
  Records claims = Doc(1, {}, "1", HostDate::Of(1970, 1, 1));
  zdrgen::DocHeaderFields h;
  h.type = 1;
  h.lineCount = 2;
  claims[0] = zdrgen::DocHeaderRecord(h);
  claims = Join({claims, Doc(1, {{"I1", 1}}, "2")});
  struct Case {
    const Records& records;
    int row;
    const char *from, *to, *fromRef, *toRef;
    Strings refs;
  };
  const Case cases[] = {
      // clang-format off
      {sales, kAllSalesInvoicesRow, "", "", "", "", {"0", "1", "2", "3", "4"}},
      {sales, kDeliveryRow, "", "", "", "", {"20"}},  // from its own file
      {lines, kInvoiceRow, "", "", "", "", {"3"}},
      {dates, kInvoiceRow, "1/2/20", "29/2/2020", "", "", {"2", "3"}},
      {dates, kInvoiceRow, "1/2/2", "29/2/2020", "", "", {"1", "2", "3"}},  // 5 characters: no bound
      {claims, kInvoiceRow, "01/01/2000", "", "", "", {"2"}},
      {refs, kInvoiceRow, "", "", " 10abc", "12.5", {"10", "12"}},  // the number at the start, halves to even
      {refs, kInvoiceRow, "", "", "", "abc", {"0"}},  // not a number: 0
      // clang-format on
  };
  Write("ISHP.FIX", Join({Doc(20, {{"A", 20}}, "20"), Doc(21, {{"B", 21}}, "21")}));
  for (const Case& c : cases) {
    Write("IMV.FIX", c.records);
    from_ = c.from;
    to_ = c.to;
    panel_.txtFromRef = c.fromRef;
    panel_.txtToRef = c.toRef;
    db_.clear();
    Run(c.row);
    EXPECT_TRUE(seam_.messages.empty());
    EXPECT_EQ(Column("Reference1"), c.refs) << "row " << &c - cases;
  }
  Write("IMV.FIX", lines);
  panel_ = Panel{};
  from_ = to_ = "";
  db_.clear();
  EXPECT_EQ(Run(), 14);  // the counter past the last record
  EXPECT_EQ(Rows(db_, "SELECT LineIndx, ItemKey FROM tStockLine ORDER BY LineIndx"),
            (Strings{"12|I2", "13|I3"}));
  db_.clear();
  Run(kInvoiceRow, false);
  EXPECT_EQ(Column("HeadIndx"), Strings{"9"});
  EXPECT_EQ(Count(db_, "tStockLine"), 0);
}

// A missing file (or a row outside the filled table) and a cut file are reported; the rows
// written before a cut stay.
TEST_F(DocumentImport, MissingAndCutFiles) {
  EXPECT_EQ(Run(), 0);
  EXPECT_EQ(Run(30), 0);
  auto recs = Join({Doc(1, {{"A", 1}}), Doc(1, {{"B", 1}, {"C", 1}})});
  recs.pop_back();  // the last line is missing
  Write("IMV.FIX", recs);
  EXPECT_EQ(Run(), 0);
  Write("ISHP.FIX", Doc(20, {{"A", 20}}));
  AppendBytes("ISHP.FIX", std::string(100, ' '));  // over half a record
  EXPECT_EQ(Run(kDeliveryRow), 0);
  ASSERT_EQ(seam_.messages.size(), 4u);
  for (const auto& m : seam_.messages) {
    EXPECT_EQ(m.title, "שגיאה");
    EXPECT_EQ(m.icon, MsgIcon::Critical);
  }
  EXPECT_EQ(seam_.messages[0].text, "קבצי מסמכים לא נמצאו");
  EXPECT_EQ(seam_.messages[1].text, "קבצי מסמכים לא נמצאו");
  EXPECT_EQ(Rows(db_, "SELECT TavFileID, HeadIndx FROM tStockHead ORDER BY HeadIndx, TavFileID"),
            (Strings{"1|1", "3|1", "3|4"}));
  EXPECT_EQ(Count(db_, "tStockLine"), 3);
}

// Items in range mark their documents (a sort bound trimmed and padded, keys compared as
// text, both bounds kept); a sort bound too long, or no ITM.fix, is a fault that leaves every
// document marked.
TEST_F(DocumentImport, ItemsInRangeMarkTheirDocuments) {
  // Headers 1 (items A1, B2), 5 (C3), 8 (Z9 only), 11 (A1 twice).
  Write("IMV.FIX", Join({Doc(1, {{"A1", 1}, {"B2", 1}}), Doc(1, {{"C3", 1}}), Doc(1, {{"Z9", 1}}),
                         Doc(1, {{"A1", 1}, {"A1", 1}})}));
  using Items = std::vector<std::pair<std::string, std::string>>;
  const std::tuple<Items, std::function<void(Panel&)>, const char*> cases[] = {
      // clang-format off
      {{{"A1", "  1"}, {"B2", "  2"}, {"", "  3"}, {"C3", "  4"}, {"A1", "  5"}}, [](Panel&) {}, "A1 B2 C3 / 1 5 11"},
      {{{"A1", "  9"}, {"C3", "  5"}}, [](Panel& p) { p.txtFromItmSort = " 7 "; }, "A1 / 1 11"},
      {{{"A20", "  1"}, {"A1", "  1"}, {"A100", "  1"}, {"B", "  1"}, {"C3", "  1"}},
       [](Panel& p) { p.txtFromItmKey = "A100", p.txtToItmKey = "B"; }, "A100 A20 B /"},
      {{{"A1", "  1"}}, [](Panel& p) { p.txtToItmSort = "1234"; }, "/ 1 5 8 11"},
      {{}, [](Panel&) {}, "/ 1 5 8 11"},
      // clang-format on
  };
  for (const auto& [items, set, marked] : cases) {
    Records recs{zdrgen::ItemRecord({"FIRST", "", "  1"})};
    for (const auto& [key, sort] : items) recs.push_back(zdrgen::ItemRecord({key, "", sort}));
    recs.push_back(zdrgen::ItemRecord({"LAST", "", "  1"}));
    Write("ITM.fix", recs);
    if (items.empty()) std::filesystem::remove(std::filesystem::path(company_) / "ITM.fix");
    panel_ = Panel{};
    set(panel_);
    db_.clear();
    Run();
    ReadItem(company_, db_, panel_, seam_);
    std::string out;
    for (const auto& k : Rows(db_, "SELECT ItemKey FROM tItem ORDER BY ItemKey")) out += k + " ";
    out += "/";
    for (const auto& h :
         Rows(db_, "SELECT HeadIndx FROM tStockHead WHERE Include ORDER BY HeadIndx")) {
      out += " " + h;
    }
    EXPECT_EQ(out, marked);
  }
  ASSERT_EQ(seam_.messages.size(), 2u);
  for (const auto& m : seam_.messages) {
    EXPECT_EQ(m.title, "תקלה");
    EXPECT_EQ(m.icon, MsgIcon::Information);
  }
}

}  // namespace
}  // namespace zdr
