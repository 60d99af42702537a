// The rows the recipients statement selects after a real data load: each query-time
// criterion on a generated company checked against the generator's truth, the order of every
// sort, and the two column variants on hand-made documents.

#include <gtest/gtest.h>
#include <unicode/coll.h>
#include <unicode/stringpiece.h>

#include <algorithm>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "control/control.h"
#include "control/dataload.h"
#include "import/codepage.h"
#include "import/hosttext.h"
#include "import/importers.h"
#include "select/select.h"
#include "support/recordingseam.h"
#include "support/scratchtemp.h"
#include "workdb/schema.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;
using Keys = std::multiset<std::string>;
using Row = std::map<std::string, db::Value>;  // by column name
using zdrgen::HostDate;
using zdrgen::HostField;

std::string Text(const Row& r, const std::string& column) {
  const db::Value& v = r.at(column);
  if (db::IsNull(v)) return "<null>";
  if (const auto* s = std::get_if<std::string>(&v)) return *s;
  if (const auto* i = std::get_if<int64_t>(&v)) return std::to_string(*i);
  return std::to_string(std::get<double>(v));
}

// The engine's promised order, computed independently: Null first, numbers by value, texts
// in Hebrew dictionary order (ICU "he", tertiary) with ties broken by their bytes.
int Compare(const Row& a, const Row& b, const std::string& column) {
  static const std::unique_ptr<icu::Collator> collator = [] {
    UErrorCode status = U_ZERO_ERROR;
    std::unique_ptr<icu::Collator> c(icu::Collator::createInstance(icu::Locale("he"), status));
    c->setStrength(icu::Collator::TERTIARY);
    return c;
  }();
  const db::Value &x = a.at(column), &y = b.at(column);
  if (db::IsNull(x) || db::IsNull(y)) return !db::IsNull(x) - !db::IsNull(y);
  if (!std::holds_alternative<std::string>(x)) {
    const double dx = std::stod(Text(a, column)), dy = std::stod(Text(b, column));
    return (dx > dy) - (dx < dy);
  }
  const std::string &sx = std::get<std::string>(x), &sy = std::get<std::string>(y);
  UErrorCode status = U_ZERO_ERROR;
  const int c = collator->compareUTF8(icu::StringPiece(sx), icu::StringPiece(sy), status);
  return c != 0 ? c : sx.compare(sy);
}

bool InRange(HostDate d, HostDate from, HostDate to) {
  auto t = [](HostDate x) { return std::tuple(x.yearOffset, x.month, x.day); };
  return t(from) <= t(d) && t(d) <= t(to);
}

class RowsTest : public ::testing::Test {
 protected:
  void SetUp() override { state_.companyPath = (temp_.dir() / "company").string(); }

  // The data load, then the statement every output opens.
  std::vector<Row> Select(bool asIs = true) {
    ReadAllData(asIs, panel_, state_, docTypes_, seam_);
    EXPECT_TRUE(seam_.messages.empty()) << seam_.messages.front().text;
    db::Database db = db::Database::Open(state_.workDbPath);
    db::Snapshot s =
        db.OpenSnapshot(BuildRecipientsStatement(panel_, docTypes_, state_.selectDbPath));
    std::vector<Row> rows;
    for (; !s.AtEnd(); s.MoveNext()) {
      Row& r = rows.emplace_back();
      for (int i = 0; i < s.FieldCount(); ++i) r[s.FieldName(i)] = s.Field(i);
    }
    return rows;
  }
  static std::vector<std::string> Column(const std::vector<Row>& rows, const char* column) {
    std::vector<std::string> out;
    for (const Row& r : rows) out.push_back(Text(r, column));
    return out;
  }
  static Keys KeysOf(const std::vector<Row>& rows) {
    const std::vector<std::string> keys = Column(rows, "AccountKey");
    return Keys(keys.begin(), keys.end());
  }

  test::ScratchTemp temp_;
  Panel panel_;
  ControlState state_;
  DocTypeTable docTypes_;
  test::RecordingSeam seam_;
};

// ---------------------------------------------------------------------------------------
// A generated company.

class GeneratedRows : public RowsTest {
 protected:
  void SetUp() override {
    RowsTest::SetUp();
    zdrgen::Options o;
    o.seed = 7;
    o.accounts = 160;
    o.documents = 260;
    o.items = 40;
    o.ledger = 300;
    o.batches = 1;
    o.batchSize = 20;
    o.receipts = 120;
    truth_ = zdrgen::WriteCompany(state_.companyPath, o, "מסחר ותעשייה");
  }

  // The stored keys of the live accounts for which `keep` holds; the key conversion itself is
  // the import's concern.
  Keys Expected(const std::function<bool(int)>& keep, bool asIs = true) const {
    Keys keys;
    for (int i = 0; i < static_cast<int>(truth_.accounts.size()); ++i) {
      const zdrgen::AccountTruth& a = truth_.accounts[i];
      if (a.deleted || a.duplicateKey || !keep(i)) continue;
      keys.insert(Win1255ToUtf8(ConvertForDisplay(HostField(a.key, 8), asIs)));
    }
    return keys;
  }
  Keys Expected(const std::set<int>& accounts) const {
    return Expected([&](int i) { return accounts.count(i) > 0; });
  }
  Keys All() const {
    return Expected([](int) { return true; });
  }

  // The invoices (row 0, IMV.FIX) dated 2005..2008 that reach tStockHead: their type, their
  // date and at least one line with an item of their own type.
  std::vector<const zdrgen::DocumentTruth*> IssuedInvoices() const {
    std::vector<const zdrgen::DocumentTruth*> out;
    for (const auto& d : truth_.documents) {
      if (d.file != docTypes_.FileOfRow(0) || d.type != docTypes_.Row(0).DocCode ||
          d.accountIndex < 0 ||
          !InRange(d.date, HostDate::Of(2005, 1, 1), HostDate::Of(2008, 12, 31))) {
        continue;
      }
      if (std::any_of(d.lines.begin(), d.lines.end(), [&](const auto& l) {
            return l.itemKey != "#" && l.itemKey != "*" && !l.itemKey.empty() && l.type == d.type;
          })) {
        out.push_back(&d);
      }
    }
    return out;
  }
  void ChooseInvoices(int byDoc, int addressFrom) {
    panel_.ChkDates = 1;
    panel_.cmbDocType = 0;
    panel_.cmbByDoc = byDoc;
    panel_.cmbAddressFrom = addressFrom;
    panel_.TxtFromDate = "01/01/2005";
    panel_.TxtToDate = "31/12/2008";
  }

  zdrgen::CompanyTruth truth_;
};

TEST_F(GeneratedRows, EveryLiveAccountOnceWhateverTheConversion) {
  ASSERT_GT(All().size(), 140u);
  for (bool asIs : {true, false}) {
    std::vector<Row> rows = Select(asIs);
    EXPECT_EQ(KeysOf(rows), Expected([](int) { return true; }, asIs)) << asIs;
    const std::vector<std::string> references = Column(rows, "Reference1");
    EXPECT_EQ(std::set(references.begin(), references.end()), std::set<std::string>{"1000"});
  }
}

TEST_F(GeneratedRows, CityPrefixKeepsTheAccountsWhoseCityStartsWithIt) {
  for (std::string prefix : {"חי", "ת", "זזז"}) {
    panel_.ChkCity = 1;
    panel_.TxtCity = prefix;
    const Keys expected =
        Expected([&](int i) { return truth_.accounts[i].city.starts_with(prefix); });
    EXPECT_EQ(expected.empty(), prefix == "זזז");
    EXPECT_EQ(KeysOf(Select()), expected) << prefix;
  }
}

TEST_F(GeneratedRows, HandPickedAccountsInAndNotIn) {
  state_.selectDbPath = CreateSelectDB(seam_);
  Panel scanPanel;
  ASSERT_TRUE(ReadACT(state_.companyPath, state_.selectDbPath, false, false, scanPanel, seam_));
  std::set<std::string> ticked, unticked;
  {
    db::Database select = db::Database::Open(state_.selectDbPath);
    db::Snapshot s = select.OpenSnapshot("SELECT SortByKey FROM tSelectAccount");
    for (int n = 0; !s.AtEnd(); s.MoveNext(), ++n) {
      (n % 3 == 0 ? unticked : ticked).insert(std::get<std::string>(s.Field(0)));
    }
    for (const std::string& key : unticked) {
      select.Execute("UPDATE tSelectAccount SET Include = False WHERE SortByKey = '" + key + "'");
    }
  }
  ASSERT_EQ(ticked.size() + unticked.size(), All().size());
  panel_.ChkSelectAccount = 1;
  for (int in : {0, 1}) {
    panel_.cmbInAccounts = in;
    const std::vector<std::string> got = Column(Select(), "SortByKey");
    EXPECT_EQ(std::set(got.begin(), got.end()), in == 0 ? ticked : unticked);
    EXPECT_EQ(got.size(), (in == 0 ? ticked : unticked).size());
  }
}

TEST_F(GeneratedRows, IssuedAndNotIssuedSplitTheAccounts) {
  std::set<int> invoiced;
  for (const auto* d : IssuedInvoices()) invoiced.insert(d->accountIndex);
  ASSERT_GT(invoiced.size(), 5u);
  ChooseInvoices(0, 1);  // the account card: each account once
  std::vector<Row> rows = Select();
  EXPECT_EQ(KeysOf(rows), Expected(invoiced));
  ChooseInvoices(1, 1);
  const Keys notIssued = KeysOf(Select());
  EXPECT_EQ(notIssued, Expected([&](int i) { return invoiced.count(i) == 0; }));
  EXPECT_EQ(notIssued.size() + rows.size(), All().size());
}

TEST_F(GeneratedRows, CashReceiptsInTheDateRangeAndLedgerOfAJournalRange) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = kCashReceiptsRow;
  panel_.TxtFromDate = "01/01/2006";
  panel_.TxtToDate = "31/12/2009";
  std::set<int> paid, posted;
  for (const auto& c : truth_.receipts) {
    if (c.accountIndex >= 0 &&
        InRange(c.date, HostDate::Of(2006, 1, 1), HostDate::Of(2009, 12, 31))) {
      paid.insert(c.accountIndex);
    }
  }
  ASSERT_GT(paid.size(), 5u);
  EXPECT_EQ(KeysOf(Select()), Expected(paid));

  panel_.ChkDates = 0;
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "50";
  panel_.txtToJournal = "120";
  for (const auto& t : truth_.ledger) {
    for (int a : t.accountIndex) {
      if (a >= 0 && t.journal >= 50 && t.journal <= 120) posted.insert(a);
    }
  }
  ASSERT_GT(posted.size(), 5u);
  EXPECT_EQ(KeysOf(Select()), Expected(posted));
}

// The dispatch file loads with the other key conversion: its recipients by receipts or by
// ledger must be the same accounts as the label sheet's. The receipt and ledger imports once
// reversed every key whatever the load, so digit and Latin keys never met tAccount's.
TEST_F(GeneratedRows, ReceiptAndLedgerKeysMissedAccountsInDispatchLoad) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = kCashReceiptsRow;
  const size_t paid = Select(true).size();
  ASSERT_GT(paid, 0u);
  EXPECT_EQ(Select(false).size(), paid);
  panel_.ChkDates = 0;
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "1";
  const size_t posted = Select(true).size();
  ASSERT_GT(posted, 0u);
  EXPECT_EQ(Select(false).size(), posted);
}

// The first and the second sort column of each CmbSortBy entry (the second may be empty).
std::pair<const char*, const char*> SortColumns(int sortBy, bool documentCase) {
  switch (sortBy) {
    case 0:
      return {"SortByKey", nullptr};
    case 2:
      return {"SortByCity", "SortByName"};
    case 3:
      return {"SortByZip", "SortByName"};
    case 4:
      return {"Telephone", "SortByName"};
    case 5:
      return {"CategoryCode", "SortByName"};
    case 6:
      return {"SortByKeyVal", nullptr};
    case 7:
      return {documentCase ? "Reference1" : "CategoryCode", "SortByName"};
    default:
      return {"SortByName", nullptr};
  }
}

TEST_F(GeneratedRows, EverySortInEveryDirectionOnBothVariants) {
  for (bool documentCase : {false, true}) {
    if (documentCase) ChooseInvoices(0, 0);
    for (int sortBy = 0; sortBy <= 8; ++sortBy) {
      for (int sortDir : {0, 1, -1}) {
        panel_.CmbSortBy = sortBy;
        panel_.CmbSortDir = sortDir;
        const std::vector<Row> rows = Select();
        ASSERT_GT(rows.size(), documentCase ? 5u : 140u);
        const auto [first, second] = SortColumns(sortBy, documentCase);
        int ties = 0;
        for (size_t i = 1; i < rows.size(); ++i) {
          const int c = Compare(rows[i - 1], rows[i], first) * (sortDir == 1 ? -1 : 1);
          ASSERT_LE(c, 0) << "sort " << sortBy << " dir " << sortDir << " row " << i;
          if (c == 0 && second) {
            ++ties;
            ASSERT_LE(Compare(rows[i - 1], rows[i], second), 0)
                << "sort " << sortBy << " row " << i;
          }
        }
        // The second column must have had ties to decide.
        if (second && !documentCase && sortBy != 3) {
          EXPECT_GT(ties, 0) << "sort " << sortBy;
        }
      }
    }
  }
}

// ---------------------------------------------------------------------------------------
// Hand-made accounts and documents, where the exact texts matter.

class HandMadeRows : public RowsTest {
 protected:
  void SetUp() override {
    RowsTest::SetUp();
    struct Account {
      const char *key, *name, *city, *zip;
    };
    const Account accounts[] = {
        {"25", "ברכה לוי", "חיפה", "31000"},   {"9", "ברך שמעון", "עכו", "24100"},
        {"100", "ערב טוב", "חיפה", "31001"},   {"10", "Osem", "אילת", "88000"},
        {"31", "אבי כהן", "אילת", "24101"},    {"7", "ברכט אורי", "חיפה", "31002"},
        {"64", "intel ישראל", "אילת", "88001"}};
    zdrgen::AccountFields marker;
    marker.key = "HEAD";  // the first and the last record are never read
    std::vector<std::string> records{zdrgen::AccountRecord(marker)};
    for (const Account& a : accounts) {
      zdrgen::AccountFields f;
      f.key = a.key;
      f.name = HostField(a.name, 30);
      f.city = HostField(a.city, 15);
      f.zip = a.zip;
      f.address = HostField("הרצל", 30);
      records.push_back(zdrgen::AccountRecord(f));
    }
    records.push_back(zdrgen::AccountRecord(marker));
    zdrgen::WriteRecords(fs::path(state_.companyPath) / "ACT.fix", records);

    // Account 100 received two invoices with other names and addresses on their headers;
    // account 9 one invoice whose only line is of another type, which does not count.
    std::vector<std::string> documents;
    auto invoice = [&](const char* key, const char* name, const char* line1, const char* line2,
                       const char* reference, uint8_t lineType) {
      zdrgen::DocHeaderFields h;
      h.type = 1;
      h.accountKey = key;
      h.name = HostField(name, 30);
      h.address1 = HostField(line1, 30);
      h.address2 = HostField(line2, 30);
      h.reference = reference;
      h.details = HostField("לידי משה", 48);
      h.lineCount = 1;
      documents.push_back(zdrgen::DocHeaderRecord(h));
      documents.push_back(
          zdrgen::DocSecondHeaderRecord(HostDate::Of(2010, 5, 1), HostDate::Of(2010, 6, 1)));
      documents.push_back(zdrgen::DocLineRecord({.itemKey = "A1", .type = lineType}));
    };
    invoice("100", "מאפיית ערב", "יפו", "חיפה", "501", 1);
    invoice("100", "ערב טוב סניף", "הנביאים", "עכו העתיקה", "502", 1);
    invoice("9", "ברך שמעון", "הרצל", "עכו", "503", 2);
    invoice("31", "אבי כהן", "הגפן", "עכו", "504", 1);
    zdrgen::WriteRecords(fs::path(state_.companyPath) / "IMV.FIX", documents);
  }
};

TEST_F(HandMadeRows, EachOrderOfTheAccountCards) {
  // Byte order would put the Latin names first and "Osem" before "intel": the dictionary
  // puts Hebrew first, Latin without regard to case, and the final ך among the כ names.
  const std::vector<std::string> byName{"אבי כהן", "ברך שמעון",   "ברכה לוי", "ברכט אורי",
                                        "ערב טוב", "intel ישראל", "Osem"};
  struct Case {
    int sortBy, sortDir;
    const char* column;
    std::vector<std::string> expected;
  };
  const Case cases[] = {
      {1, 0, "AccountName", byName},
      {1, -1, "AccountName", byName},
      {1, 1, "AccountName", std::vector(byName.rbegin(), byName.rend())},
      {2,
       1,
       "AccountName",  // עכו, חיפה, אילת; the names ascending within each
       {"ברך שמעון", "ברכה לוי", "ברכט אורי", "ערב טוב", "אבי כהן", "intel ישראל", "Osem"}},
      {6, 0, "SortByKey", {"7 ", "9 ", "10 ", "25 ", "31 ", "64 ", "100 "}},
      {6, 1, "SortByKey", {"100 ", "64 ", "31 ", "25 ", "10 ", "9 ", "7 "}},
      {0, 0, "SortByKey", {"10 ", "100 ", "25 ", "31 ", "64 ", "7 ", "9 "}},
  };
  for (const Case& c : cases) {
    panel_.CmbSortBy = c.sortBy;
    panel_.CmbSortDir = c.sortDir;
    EXPECT_EQ(Column(Select(), c.column), c.expected) << c.sortBy << " " << c.sortDir;
  }
}

TEST_F(HandMadeRows, DocumentVariantTakesNameAndAddressFromEachHeader) {
  panel_.ChkDates = 1;
  panel_.CmbSortBy = 7;  // document number
  const std::vector<Row> rows = Select();
  // Keys read back reversed on this road (the label sheet's conversion).
  EXPECT_EQ(Column(rows, "AccountKey"), (std::vector<std::string>{"001", "001", "13"}));
  EXPECT_EQ(Column(rows, "AccountName"),
            (std::vector<std::string>{"מאפיית ערב", "ערב טוב סניף", "אבי כהן"}));
  EXPECT_EQ(Column(rows, "Address"), (std::vector<std::string>{"יפו", "הנביאים", "הגפן"}));
  EXPECT_EQ(Column(rows, "City"), (std::vector<std::string>{"חיפה", "עכו העתיקה", "עכו"}));
  EXPECT_EQ(Column(rows, "Zip"), (std::vector<std::string>(3, "")));
  EXPECT_EQ(Column(rows, "Reference1"), (std::vector<std::string>{"501", "502", "504"}));
  EXPECT_EQ(Column(rows, "DetailsLine1"), (std::vector<std::string>(3, "לידי משה")));
}

TEST_F(HandMadeRows, AccountVariantWithDocumentsGivesEachAccountOnce) {
  panel_.ChkDates = 1;
  panel_.cmbAddressFrom = 1;
  panel_.CmbSortBy = 1;
  const std::vector<Row> rows = Select();
  EXPECT_EQ(Column(rows, "AccountName"), (std::vector<std::string>{"אבי כהן", "ערב טוב"}));
  EXPECT_EQ(Column(rows, "City"), (std::vector<std::string>{"אילת", "חיפה"}));
  EXPECT_EQ(Column(rows, "Zip"), (std::vector<std::string>{"24101", "31001"}));
  EXPECT_EQ(Column(rows, "Address"), (std::vector<std::string>(2, "הרצל")));
  EXPECT_EQ(Column(rows, "DetailsLine1"), (std::vector<std::string>(2, "0")));

  panel_.cmbByDoc = 1;  // not issued: the five others, account 9 among them
  EXPECT_EQ(
      Column(Select(), "AccountName"),
      (std::vector<std::string>{"ברך שמעון", "ברכה לוי", "ברכט אורי", "intel ישראל", "Osem"}));
}

}  // namespace
}  // namespace zdr
