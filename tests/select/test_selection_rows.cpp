// The rows the recipients statement selects after a real data load: each query-time
// criterion on a generated company checked against the generator's truth, the two column
// variants on hand-made documents, and the order of every sort.

#include <gtest/gtest.h>
#include <stdlib.h>
#include <unicode/coll.h>
#include <unicode/stringpiece.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include "control/control.h"
#include "control/dataload.h"
#include "control/panel.h"
#include "import/codepage.h"
#include "import/doctypes.h"
#include "import/hosttext.h"
#include "import/importers.h"
#include "select/select.h"
#include "support/recordingseam.h"
#include "workdb/schema.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;
using test::RecordingSeam;
using Keys = std::multiset<std::string>;
using zdrgen::HostDate;
using zdrgen::HostField;

// One recipient row; Null text is an empty optional.
struct Row {
  std::string accountKey, accountName, address, zip, detailsLine1;
  std::optional<std::string> city, telephone, categoryCode, sortByKey, sortByName, sortByCity,
      sortByZip;
  double sortByKeyVal = 0, reference1 = 0;
};

std::optional<std::string> TextOf(const db::Value& v) {
  if (db::IsNull(v)) return std::nullopt;
  if (const auto* s = std::get_if<std::string>(&v)) return *s;
  if (const auto* i = std::get_if<int64_t>(&v)) return std::to_string(*i);
  return std::to_string(std::get<double>(v));
}
double NumberOf(const db::Value& v) {
  if (const auto* i = std::get_if<int64_t>(&v)) return static_cast<double>(*i);
  if (const auto* d = std::get_if<double>(&v)) return *d;
  ADD_FAILURE() << "not a number";
  return 0;
}

// Hebrew dictionary order as the engine promises it: ICU "he" at tertiary strength, texts
// it ranks equal by their bytes; Null before any text.
int Collate(const std::optional<std::string>& a, const std::optional<std::string>& b) {
  static const std::unique_ptr<icu::Collator> collator = [] {
    UErrorCode status = U_ZERO_ERROR;
    std::unique_ptr<icu::Collator> c(icu::Collator::createInstance(icu::Locale("he"), status));
    c->setStrength(icu::Collator::TERTIARY);
    return c;
  }();
  if (!a || !b) return static_cast<int>(a.has_value()) - static_cast<int>(b.has_value());
  UErrorCode status = U_ZERO_ERROR;
  int c = collator->compareUTF8(icu::StringPiece(*a), icu::StringPiece(*b), status);
  return c != 0 ? c : a->compare(*b);
}

bool InRange(HostDate d, HostDate from, HostDate to) {
  auto t = [](HostDate x) { return std::tuple(x.yearOffset, x.month, x.day); };
  return t(from) <= t(d) && t(d) <= t(to);
}

// A throw-away Temp folder and company folder for each fixture.
class RowsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    static std::atomic<int> counter{0};
    root_ = fs::temp_directory_path() /
            ("zdr_rows_" + std::to_string(::getpid()) + "_" + std::to_string(counter++));
    fs::remove_all(root_);
    fs::create_directories(root_ / "temp");
    ::setenv("Temp", (root_ / "temp").c_str(), 1);
    state_.companyPath = (root_ / "company").string();
  }
  void TearDown() override {
    std::error_code ec;
    fs::remove_all(root_, ec);
  }

  // The data load, then the statement every output opens.
  std::vector<Row> Select(bool asIs = true) {
    ReadAllData(asIs, panel_, state_, docTypes_, seam_);
    EXPECT_TRUE(seam_.messages.empty()) << seam_.messages.front().text;
    db::Database db = db::Database::Open(state_.workDbPath);
    db::Snapshot s =
        db.OpenSnapshot(BuildRecipientsStatement(panel_, docTypes_, state_.selectDbPath));
    std::vector<Row> rows;
    for (; !s.AtEnd(); s.MoveNext()) {
      Row r;
      r.accountKey = TextOf(s.Field("AccountKey")).value_or("<null>");
      r.accountName = TextOf(s.Field("AccountName")).value_or("<null>");
      r.address = TextOf(s.Field("Address")).value_or("<null>");
      r.city = TextOf(s.Field("City"));
      r.zip = TextOf(s.Field("Zip")).value_or("<null>");
      r.telephone = TextOf(s.Field("Telephone"));
      r.detailsLine1 = TextOf(s.Field("DetailsLine1")).value_or("<null>");
      r.categoryCode = TextOf(s.Field("CategoryCode"));
      r.sortByKey = TextOf(s.Field("SortByKey"));
      r.sortByName = TextOf(s.Field("SortByName"));
      r.sortByCity = TextOf(s.Field("SortByCity"));
      r.sortByZip = TextOf(s.Field("SortByZip"));
      r.sortByKeyVal = NumberOf(s.Field("SortByKeyVal"));
      r.reference1 = NumberOf(s.Field("Reference1"));
      rows.push_back(std::move(r));
    }
    return rows;
  }

  static Keys KeysOf(const std::vector<Row>& rows) {
    Keys keys;
    for (const Row& r : rows) keys.insert(r.accountKey);
    return keys;
  }

  fs::path root_;
  Panel panel_;
  ControlState state_;
  DocTypeTable docTypes_;
  RecordingSeam seam_;
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

  static bool Live(const zdrgen::AccountTruth& a) { return !a.deleted && !a.duplicateKey; }

  // The account key as the import stores it; the conversion itself is the import's concern.
  std::string StoredKey(int accountIndex, bool asIs = true) const {
    return Win1255ToUtf8(ConvertForDisplay(HostField(truth_.accounts[accountIndex].key, 8), asIs));
  }

  // The stored keys of the live accounts for which `keep` holds.
  Keys Expected(const std::function<bool(int)>& keep, bool asIs = true) const {
    Keys keys;
    for (int i = 0; i < static_cast<int>(truth_.accounts.size()); ++i) {
      if (Live(truth_.accounts[i]) && keep(i)) keys.insert(StoredKey(i, asIs));
    }
    return keys;
  }

  Keys Expected(const std::set<int>& accounts) const {
    return Expected([&](int i) { return accounts.count(i) > 0; });
  }

  // Whether a document of row 0 (invoices, IMV.FIX) dated 2005..2008 reaches tStockHead: its
  // type, its date and at least one line with an item of its own type.
  bool IssuedInvoice(const zdrgen::DocumentTruth& d) const {
    if (d.file != docTypes_.FileOfRow(0) || d.type != docTypes_.Row(0).DocCode) return false;
    if (!InRange(d.date, HostDate::Of(2005, 1, 1), HostDate::Of(2008, 12, 31))) return false;
    return std::any_of(d.lines.begin(), d.lines.end(), [&](const auto& l) {
      return l.itemKey != "#" && l.itemKey != "*" && !l.itemKey.empty() && l.type == d.type;
    });
  }
  std::set<int> InvoicedAccounts() const {
    std::set<int> accounts;
    for (const auto& d : truth_.documents) {
      if (IssuedInvoice(d) && d.accountIndex >= 0) accounts.insert(d.accountIndex);
    }
    return accounts;
  }
  void ChooseInvoices(int byDoc) {
    panel_.ChkDates = 1;
    panel_.cmbDocType = 0;
    panel_.cmbByDoc = byDoc;
    panel_.TxtFromDate = "01/01/2005";
    panel_.TxtToDate = "31/12/2008";
  }

  zdrgen::CompanyTruth truth_;
};

TEST_F(GeneratedRows, EveryLiveAccountOnceWhateverTheConversion) {
  const Keys all = Expected([](int) { return true; });
  ASSERT_GT(all.size(), 140u);
  for (bool asIs : {true, false}) {
    std::vector<Row> rows = Select(asIs);
    EXPECT_EQ(KeysOf(rows), Expected([](int) { return true; }, asIs)) << asIs;
    for (const Row& r : rows) {
      EXPECT_EQ(r.reference1, 1000);
      EXPECT_EQ(r.detailsLine1, "0");
    }
  }
}

TEST_F(GeneratedRows, RecipientsAreTheAccountsThatPassTheAccountCriteria) {
  panel_.ChkAgent = 1;
  panel_.txtAgent = "5";
  panel_.txtToAgent = "20";
  panel_.ChkCatCode = 1;
  panel_.txtFromSort = "3";  // "  3"
  panel_.txtToSort = "15";   // " 15"
  const Keys expected = Expected([&](int i) {
    const auto& a = truth_.accounts[i];
    return a.agent >= 5 && a.agent <= 20 && a.sortCode >= "  3" && a.sortCode <= " 15";
  });
  ASSERT_GT(expected.size(), 10u);
  std::vector<Row> rows = Select();
  EXPECT_EQ(rows.size(), expected.size());
  EXPECT_EQ(KeysOf(rows), expected);
}

TEST_F(GeneratedRows, CityPrefixKeepsTheAccountsWhoseCityStartsWithIt) {
  for (std::string prefix : {"חי", "רמת", "ת", "זזז"}) {
    panel_.ChkCity = 1;
    panel_.TxtCity = prefix;
    const Keys expected =
        Expected([&](int i) { return truth_.accounts[i].city.starts_with(prefix); });
    if (prefix != "זזז") {
      ASSERT_FALSE(expected.empty()) << prefix;
    }
    EXPECT_EQ(KeysOf(Select()), expected) << prefix;
  }
}

TEST_F(GeneratedRows, TelephonePrefixKeepsTheAccountsWhoseNumberStartsWithIt) {
  for (std::string prefix : {"05", "03-", "9"}) {
    panel_.ChkPhone = 1;
    panel_.txtPhone = prefix;
    std::vector<Row> rows = Select();
    for (const Row& r : rows) EXPECT_TRUE(r.telephone->starts_with(prefix)) << *r.telephone;
    // A single number reads back as written; with two, the first may be either.
    const Keys single = Expected([&](int i) {
      const std::string& phone = truth_.accounts[i].telephone;
      return phone.find(',') == std::string::npos && phone.starts_with(prefix);
    });
    const Keys twoNumbers = Expected(
        [&](int i) { return truth_.accounts[i].telephone.find(',') != std::string::npos; });
    const Keys got = KeysOf(rows);
    EXPECT_TRUE(std::includes(got.begin(), got.end(), single.begin(), single.end())) << prefix;
    for (const std::string& key : got) {
      EXPECT_TRUE(single.count(key) > 0 || twoNumbers.count(key) > 0) << key;
    }
    if (prefix == "9") {
      EXPECT_TRUE(rows.empty());
    }
  }
}

TEST_F(GeneratedRows, HandPickedAccountsInAndNotIn) {
  state_.selectDbPath = CreateSelectDB(seam_);
  ASSERT_FALSE(state_.selectDbPath.empty());
  Panel scanPanel;
  ASSERT_TRUE(ReadACT(state_.companyPath, state_.selectDbPath, false, false, scanPanel, seam_));
  std::set<std::string> ticked, unticked;
  {
    db::Database select = db::Database::Open(state_.selectDbPath);
    db::Snapshot s = select.OpenSnapshot("SELECT SortByKey FROM tSelectAccount");
    for (int n = 0; !s.AtEnd(); s.MoveNext(), ++n) {
      (n % 3 == 0 ? unticked : ticked).insert(*TextOf(s.Field(0)));
    }
    for (const std::string& key : unticked) {
      ASSERT_EQ(select.Execute("UPDATE tSelectAccount SET Include = False WHERE SortByKey = \"" +
                               key + "\""),
                1);
    }
  }
  ASSERT_FALSE(unticked.empty());
  const size_t live = Expected([](int) { return true; }).size();
  EXPECT_EQ(ticked.size() + unticked.size(), live);

  auto sortKeys = [](const std::vector<Row>& rows) {
    std::set<std::string> keys;
    for (const Row& r : rows) keys.insert(r.sortByKey.value_or("<null>"));
    return keys;
  };
  panel_.ChkSelectAccount = 1;
  panel_.cmbInAccounts = 0;
  std::vector<Row> in = Select();
  EXPECT_EQ(in.size(), ticked.size());
  EXPECT_EQ(sortKeys(in), ticked);
  panel_.cmbInAccounts = 1;
  std::vector<Row> notIn = Select();
  EXPECT_EQ(notIn.size(), unticked.size());
  EXPECT_EQ(sortKeys(notIn), unticked);
}

TEST_F(GeneratedRows, IssuedAndNotIssuedSplitTheAccounts) {
  const std::set<int> invoiced = InvoicedAccounts();
  ASSERT_GT(invoiced.size(), 5u);
  ChooseInvoices(0);
  panel_.cmbAddressFrom = 1;  // the account card: each account once
  std::vector<Row> rows = Select();
  EXPECT_EQ(rows.size(), invoiced.size());
  EXPECT_EQ(KeysOf(rows), Expected(invoiced));
  for (const Row& r : rows) {
    EXPECT_EQ(r.reference1, 1000);
    EXPECT_EQ(r.detailsLine1, "0");
  }
  ChooseInvoices(1);
  rows = Select();
  EXPECT_EQ(KeysOf(rows), Expected([&](int i) { return invoiced.count(i) == 0; }));
  EXPECT_EQ(rows.size() + invoiced.size(), Expected([](int) { return true; }).size());
}

TEST_F(GeneratedRows, IssuedDocumentsFromTheHeaderGiveOneRowPerDocument) {
  ChooseInvoices(0);
  panel_.cmbAddressFrom = 0;
  std::vector<const zdrgen::DocumentTruth*> documents;
  for (const auto& d : truth_.documents) {
    if (IssuedInvoice(d) && d.accountIndex >= 0) documents.push_back(&d);
  }
  std::vector<Row> rows = Select();
  ASSERT_EQ(rows.size(), documents.size());
  for (const Row& r : rows) {
    auto d = std::find_if(documents.begin(), documents.end(),
                          [&](const auto* x) { return x->reference == r.reference1; });
    ASSERT_NE(d, documents.end()) << r.reference1;
    const zdrgen::AccountTruth& account = truth_.accounts[(*d)->accountIndex];
    EXPECT_EQ(r.accountKey, StoredKey((*d)->accountIndex));
    EXPECT_EQ(r.zip, "");
    // The header's second line is the account's city and a number.
    if (!account.city.empty() && static_cast<unsigned char>(account.city[0]) >= 0x80) {
      EXPECT_TRUE(r.city.value_or("").starts_with(account.city + " ")) << *r.city;
    }
  }
}

TEST_F(GeneratedRows, CashReceiptsInTheDateRange) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = kCashReceiptsRow;
  panel_.cmbAddressFrom = 0;  // no header to take an address from: the account card
  panel_.TxtFromDate = "01/01/2006";
  panel_.TxtToDate = "31/12/2009";
  std::set<int> paid;
  for (const auto& c : truth_.receipts) {
    if (c.accountIndex >= 0 &&
        InRange(c.date, HostDate::Of(2006, 1, 1), HostDate::Of(2009, 12, 31))) {
      paid.insert(c.accountIndex);
    }
  }
  ASSERT_GT(paid.size(), 5u);
  std::vector<Row> rows = Select();
  EXPECT_EQ(KeysOf(rows), Expected(paid));
  for (const Row& r : rows) EXPECT_EQ(r.reference1, 1000);
}

TEST_F(GeneratedRows, LedgerTransactionsOfAJournalRange) {
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "50";
  panel_.txtToJournal = "120";
  std::set<int> posted;
  for (const auto& t : truth_.ledger) {
    if (t.journal < 50 || t.journal > 120) continue;
    for (int a : t.accountIndex) {
      if (a >= 0) posted.insert(a);
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
  const Keys labelRows = KeysOf(Select(true));
  ASSERT_FALSE(labelRows.empty());
  EXPECT_EQ(Select(false).size(), labelRows.size());
  panel_.ChkDates = 0;
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "1";
  const Keys posted = KeysOf(Select(true));
  ASSERT_FALSE(posted.empty());
  EXPECT_EQ(Select(false).size(), posted.size());
}

// ---------------------------------------------------------------------------------------
// Order.

using Column = std::function<int(const Row&, const Row&)>;
Column TextColumn(std::optional<std::string> Row::*field) {
  return [field](const Row& a, const Row& b) { return Collate(a.*field, b.*field); };
}
Column NumberColumn(double Row::*field) {
  return
      [field](const Row& a, const Row& b) { return (a.*field > b.*field) - (a.*field < b.*field); };
}

// The first and the second sort column of each CmbSortBy entry (the second may be empty).
std::pair<Column, Column> SortColumns(int sortBy, bool documentCase) {
  const Column name = TextColumn(&Row::sortByName);
  switch (sortBy) {
    case 0:
      return {TextColumn(&Row::sortByKey), nullptr};
    case 1:
      return {name, nullptr};
    case 2:
      return {TextColumn(&Row::sortByCity), name};
    case 3:
      return {TextColumn(&Row::sortByZip), name};
    case 4:
      return {TextColumn(&Row::telephone), name};
    case 5:
      return {TextColumn(&Row::categoryCode), name};
    case 6:
      return {NumberColumn(&Row::sortByKeyVal), nullptr};
    case 7:
      return {documentCase ? NumberColumn(&Row::reference1) : TextColumn(&Row::categoryCode), name};
    default:
      return {name, nullptr};
  }
}

// Checks that neighbouring rows keep the order; the second column always ascends.
void ExpectOrdered(const std::vector<Row>& rows, int sortBy, int sortDir, bool documentCase) {
  auto [first, second] = SortColumns(sortBy, documentCase);
  int ties = 0;
  for (size_t i = 1; i < rows.size(); ++i) {
    const Row& a = rows[i - 1];
    const Row& b = rows[i];
    int c = first(a, b);
    if (sortDir == 1) c = -c;
    ASSERT_LE(c, 0) << "sort " << sortBy << " dir " << sortDir << " row " << i << ": "
                    << a.accountName << " / " << b.accountName;
    if (c == 0 && second) {
      ++ties;
      ASSERT_LE(second(a, b), 0) << "sort " << sortBy << " dir " << sortDir << " row " << i;
    }
  }
  // The second column must have had ties to decide.
  if (second && !documentCase && sortBy != 3) {
    EXPECT_GT(ties, 0) << "sort " << sortBy;
  }
}

TEST_F(GeneratedRows, EverySortInEveryDirectionOnBothVariants) {
  for (bool documentCase : {false, true}) {
    if (documentCase) {
      ChooseInvoices(0);
      panel_.cmbAddressFrom = 0;
    }
    for (int sortBy = 0; sortBy <= 8; ++sortBy) {
      for (int sortDir : {0, 1, -1}) {
        panel_.CmbSortBy = sortBy;
        panel_.CmbSortDir = sortDir;
        std::vector<Row> rows = Select();
        ASSERT_GT(rows.size(), documentCase ? 5u : 140u);
        ExpectOrdered(rows, sortBy, sortDir, documentCase);
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
    marker.key = "HEAD";
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
    marker.key = "TAIL";  // the last record is never read either
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

  std::vector<std::string> Names(const std::vector<Row>& rows) {
    std::vector<std::string> names;
    for (const Row& r : rows) names.push_back(r.accountName);
    return names;
  }
};

TEST_F(HandMadeRows, NamesInHebrewDictionaryOrder) {
  panel_.CmbSortBy = 1;
  // Byte order would put the Latin names first and "Osem" before "intel": the dictionary
  // puts Hebrew first, Latin without regard to case, and the final ך among the כ names.
  const std::vector<std::string> ascending{"אבי כהן", "ברך שמעון",   "ברכה לוי", "ברכט אורי",
                                           "ערב טוב", "intel ישראל", "Osem"};
  panel_.CmbSortDir = 0;
  EXPECT_EQ(Names(Select()), ascending);
  panel_.CmbSortDir = -1;
  EXPECT_EQ(Names(Select()), ascending);
  panel_.CmbSortDir = 1;
  EXPECT_EQ(Names(Select()), std::vector<std::string>(ascending.rbegin(), ascending.rend()));
}

TEST_F(HandMadeRows, CityDescendingThenNameAscending) {
  panel_.CmbSortBy = 2;
  panel_.CmbSortDir = 1;
  EXPECT_EQ(Names(Select()),
            (std::vector<std::string>{"ברך שמעון",                          // עכו
                                      "ברכה לוי", "ברכט אורי", "ערב טוב",   // חיפה
                                      "אבי כהן", "intel ישראל", "Osem"}));  // אילת
}

TEST_F(HandMadeRows, NumericAccountOrderAgainstTheTextOrderOfTheKey) {
  auto sortKeys = [&] {
    std::vector<std::string> keys;
    for (const Row& r : Select()) keys.push_back(r.sortByKey.value_or("<null>"));
    return keys;
  };
  panel_.CmbSortDir = 0;
  panel_.CmbSortBy = 6;
  EXPECT_EQ(sortKeys(), (std::vector<std::string>{"7 ", "9 ", "10 ", "25 ", "31 ", "64 ", "100 "}));
  panel_.CmbSortBy = 0;
  EXPECT_EQ(sortKeys(), (std::vector<std::string>{"10 ", "100 ", "25 ", "31 ", "64 ", "7 ", "9 "}));
  panel_.CmbSortBy = 6;
  panel_.CmbSortDir = 1;
  EXPECT_EQ(sortKeys(), (std::vector<std::string>{"100 ", "64 ", "31 ", "25 ", "10 ", "9 ", "7 "}));
}

TEST_F(HandMadeRows, DocumentVariantTakesNameAndAddressFromEachHeader) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = 0;
  panel_.cmbAddressFrom = 0;
  panel_.CmbSortBy = 7;  // document number
  std::vector<Row> rows = Select();
  ASSERT_EQ(rows.size(), 3u);
  // Keys read back reversed on this road (the label sheet's conversion).
  const std::tuple<std::string, std::string, std::string, std::string, double> expected[] = {
      {"001", "מאפיית ערב", "יפו", "חיפה", 501},
      {"001", "ערב טוב סניף", "הנביאים", "עכו העתיקה", 502},
      {"13", "אבי כהן", "הגפן", "עכו", 504}};
  for (size_t i = 0; i < rows.size(); ++i) {
    const auto& [key, name, address, city, reference] = expected[i];
    EXPECT_EQ(rows[i].accountKey, key);
    EXPECT_EQ(rows[i].accountName, name);
    EXPECT_EQ(rows[i].address, address);
    EXPECT_EQ(rows[i].city, city);
    EXPECT_EQ(rows[i].zip, "");
    EXPECT_EQ(rows[i].reference1, reference);
    EXPECT_EQ(rows[i].detailsLine1, "לידי משה");
  }
}

TEST_F(HandMadeRows, AccountVariantWithDocumentsGivesEachAccountOnce) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = 0;
  panel_.cmbAddressFrom = 1;
  panel_.CmbSortBy = 1;
  std::vector<Row> rows = Select();
  ASSERT_EQ(rows.size(), 2u);
  EXPECT_EQ(rows[0].accountName, "אבי כהן");
  EXPECT_EQ(rows[0].city, "אילת");
  EXPECT_EQ(rows[0].zip, "24101");
  EXPECT_EQ(rows[1].accountName, "ערב טוב");
  EXPECT_EQ(rows[1].city, "חיפה");
  EXPECT_EQ(rows[1].zip, "31001");
  EXPECT_EQ(rows[1].address, "הרצל");
  EXPECT_EQ(rows[1].reference1, 1000);
  EXPECT_EQ(rows[1].detailsLine1, "0");

  panel_.cmbByDoc = 1;  // not issued: the five others, account 9 among them
  EXPECT_EQ(Names(Select()), (std::vector<std::string>{"ברך שמעון", "ברכה לוי", "ברכט אורי",
                                                       "intel ישראל", "Osem"}));
}

}  // namespace
}  // namespace zdr
