// The rows the recipients statement selects after a real data load: each query-time
// criterion on a generated company checked against the generator's truth, the order of every
// sort, and the two column variants on hand-made documents. The hand-picked accounts are
// checked through the link in test_statements.

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <functional>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "control/control.h"
#include "control/dataload.h"
#include "engine/collation.h"
#include "engine/engine.h"
#include "hosttext/codepage.h"
#include "hosttext/hosttext.h"
#include "select/select.h"
#include "support/recordingseam.h"
#include "support/scratchtemp.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;
using Keys = std::multiset<std::string>;
using Texts = std::vector<std::string>;
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

// The engine's promised order: Null first, numbers by value, texts in Hebrew dictionary
// order with ties broken by their bytes.
int Compare(const Row& a, const Row& b, const std::string& column) {
  const db::Value &x = a.at(column), &y = b.at(column);
  if (db::IsNull(x) || db::IsNull(y)) return !db::IsNull(x) - !db::IsNull(y);
  if (!std::holds_alternative<std::string>(x)) {
    const double dx = std::stod(Text(a, column)), dy = std::stod(Text(b, column));
    return (dx > dy) - (dx < dy);
  }
  return db::CompareHebrewWithIcu(std::get<std::string>(x), std::get<std::string>(y));
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
    o.seed = 7, o.accounts = 160, o.documents = 260, o.items = 40, o.ledger = 300;
    o.batches = 1, o.batchSize = 20, o.receipts = 120;
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

  // The accounts of the invoices (row 0, IMV.FIX) dated 2005..2008 that reach tStockHead:
  // their type, their date and at least one line with an item of their own type.
  std::set<int> Invoiced() const {
    std::set<int> out;
    for (const auto& d : truth_.documents) {
      if (d.file == docTypes_.FileOfRow(0) && d.type == docTypes_.Row(0).DocCode &&
          d.accountIndex >= 0 &&
          InRange(d.date, HostDate::Of(2005, 1, 1), HostDate::Of(2008, 12, 31)) &&
          std::any_of(d.lines.begin(), d.lines.end(), [&](const auto& l) {
            return l.itemKey != "#" && l.itemKey != "*" && !l.itemKey.empty() && l.type == d.type;
          })) {
        out.insert(d.accountIndex);
      }
    }
    return out;
  }
  void ChooseInvoices(int byDoc, int addressFrom) {
    panel_.ChkDates = 1, panel_.cmbDocType = 0, panel_.cmbByDoc = byDoc;
    panel_.cmbAddressFrom = addressFrom;
    panel_.TxtFromDate = "01/01/2005", panel_.TxtToDate = "31/12/2008";
  }

  zdrgen::CompanyTruth truth_;
};

// Each criterion keeps the accounts the generator says it should, under both key conversions
// (the label sheet's and the dispatch file's). ReceiptAndLedgerKeysMissedAccountsInDispatchLoad:
// the receipt and ledger imports once reversed every key whatever the load, so by receipts or
// by ledger the dispatch file found no digit or Latin key in tAccount.
TEST_F(GeneratedRows, EachCriterionKeepsTheAccountsItMeans) {
  std::set<int> paid, posted;
  for (const auto& c : truth_.receipts) {
    if (InRange(c.date, HostDate::Of(2006, 1, 1), HostDate::Of(2009, 12, 31))) {
      paid.insert(c.accountIndex);
    }
  }
  for (const auto& t : truth_.ledger) {
    if (t.journal >= 50 && t.journal <= 120) {
      posted.insert(t.accountIndex.begin(), t.accountIndex.end());
    }
  }
  paid.erase(-1), posted.erase(-1);
  const std::set<int> invoiced = Invoiced();
  ASSERT_GT(paid.size() + posted.size() + invoiced.size(), 15u);
  auto in = [](const std::set<int>& s) { return [&s](int i) { return s.count(i) > 0; }; };
  auto city = [&](const char* prefix) {
    return [this, prefix](int i) { return truth_.accounts[i].city.starts_with(prefix); };
  };
  const std::tuple<const char*, std::function<void(Panel&)>, std::function<bool(int)>> cases[] = {
      {"every live account once", [](Panel&) {}, [](int) { return true; }},
      {"city חי", [](Panel& p) { p.ChkCity = 1, p.TxtCity = "חי"; }, city("חי")},
      {"city ת", [](Panel& p) { p.ChkCity = 1, p.TxtCity = "ת"; }, city("ת")},
      {"invoiced", [&](Panel&) { ChooseInvoices(0, 1); }, in(invoiced)},
      {"not invoiced", [&](Panel&) { ChooseInvoices(1, 1); },
       [&](int i) { return invoiced.count(i) == 0; }},
      {"paid",
       [](Panel& p) {
         p.ChkDates = 1, p.cmbDocType = kCashReceiptsRow;
         p.TxtFromDate = "01/01/2006", p.TxtToDate = "31/12/2009";
       },
       in(paid)},
      {"posted",
       [](Panel& p) { p.ChkJournal = 1, p.txtFromJournal = "50", p.txtToJournal = "120"; },
       in(posted)}};
  for (const auto& [name, set, keep] : cases) {
    panel_ = Panel();
    set(panel_);
    EXPECT_FALSE(Expected(keep).empty()) << name;
    for (bool asIs : {true, false}) {
      Keys keys, references;
      for (const Row& r : Select(asIs)) {
        keys.insert(Text(r, "AccountKey")), references.insert(Text(r, "Reference1"));
      }
      EXPECT_EQ(keys, Expected(keep, asIs)) << name << asIs;
      EXPECT_EQ(std::set(references.begin(), references.end()), std::set<std::string>{"1000"});
    }
  }
}

// Every CmbSortBy entry in every direction: the first column in the chosen direction, ties
// broken by the second column (if any) ascending. The document number sorts only documents.
TEST_F(GeneratedRows, EverySortInEveryDirectionOnBothVariants) {
  const std::pair<const char*, const char*> columns[] = {
      {"SortByKey", nullptr},      {"SortByName", nullptr},        {"SortByCity", "SortByName"},
      {"SortByZip", "SortByName"}, {"Telephone", "SortByName"},    {"CategoryCode", "SortByName"},
      {"SortByKeyVal", nullptr},   {"CategoryCode", "SortByName"}, {"SortByName", nullptr}};
  for (bool documentCase : {false, true}) {
    if (documentCase) ChooseInvoices(0, 0);
    for (int sortBy = 0; sortBy <= 8; ++sortBy) {
      for (int sortDir : {0, 1, -1}) {
        panel_.CmbSortBy = sortBy;
        panel_.CmbSortDir = sortDir;
        const std::vector<Row> rows = Select();
        ASSERT_GT(rows.size(), documentCase ? 5u : 140u);
        auto [first, second] = columns[sortBy];
        if (documentCase && sortBy == 7) first = "Reference1";
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
// Hand-made invoices, where the exact texts matter: account 100 received two with other names
// and addresses on their headers.

class HandMadeRows : public RowsTest {
 protected:
  void SetUp() override {
    RowsTest::SetUp();
    const char* accounts[][4] = {{"100", "ערב טוב", "חיפה", "31001"},
                                 {"31", "אבי כהן", "אילת", "24101"}};
    zdrgen::AccountFields marker;
    marker.key = "HEAD";  // the first and the last record are never read
    std::vector<std::string> records{zdrgen::AccountRecord(marker)};
    for (const auto& [key, name, city, zip] : accounts) {
      zdrgen::AccountFields f = marker;
      f.key = key, f.name = HostField(name, 30), f.address = HostField("הרצל", 30);
      f.city = HostField(city, 15), f.zip = zip;
      records.push_back(zdrgen::AccountRecord(f));
    }
    records.push_back(zdrgen::AccountRecord(marker));
    zdrgen::WriteRecords(fs::path(state_.companyPath) / "ACT.fix", records);
    std::vector<std::string> documents;
    const char* invoices[][5] = {{"100", "מאפיית ערב", "יפו", "חיפה", "501"},
                                 {"100", "ערב טוב סניף", "הנביאים", "עכו העתיקה", "502"},
                                 {"31", "אבי כהן", "הגפן", "עכו", "504"}};
    for (const auto& [key, name, line1, line2, reference] : invoices) {
      zdrgen::DocHeaderFields h;
      h.accountKey = key, h.name = HostField(name, 30), h.address1 = HostField(line1, 30);
      h.address2 = HostField(line2, 30), h.reference = reference, h.lineCount = 1;
      h.details = HostField("לידי משה", 48);
      documents.push_back(zdrgen::DocHeaderRecord(h));
      documents.push_back(
          zdrgen::DocSecondHeaderRecord(HostDate::Of(2010, 5, 1), HostDate::Of(2010, 6, 1)));
      documents.push_back(zdrgen::DocLineRecord({.itemKey = "A1", .type = 1}));
    }
    zdrgen::WriteRecords(fs::path(state_.companyPath) / "IMV.FIX", documents);
  }

  // Each row's address columns, joined.
  Texts Lines() {
    Texts out;
    for (const Row& r : Select()) {
      std::string& line = out.emplace_back();
      for (const char* c :
           {"AccountKey", "AccountName", "Address", "City", "Zip", "Reference1", "DetailsLine1"}) {
        line += Text(r, c) + "|";
      }
    }
    return out;
  }
};

// Keys read back reversed on this road (the label sheet's conversion).
TEST_F(HandMadeRows, NameAndAddressFromEachHeaderOrOnceFromTheCard) {
  panel_.ChkDates = 1;
  panel_.CmbSortBy = 7;  // document number
  EXPECT_EQ(Lines(), (Texts{"001|מאפיית ערב|יפו|חיפה||501|לידי משה|",
                            "001|ערב טוב סניף|הנביאים|עכו העתיקה||502|לידי משה|",
                            "13|אבי כהן|הגפן|עכו||504|לידי משה|"}));
  panel_.cmbAddressFrom = -1;  // no entry chosen: from the card, each account once
  panel_.CmbSortBy = 1;
  EXPECT_EQ(Lines(),
            (Texts{"13|אבי כהן|הרצל|אילת|24101|1000|0|", "001|ערב טוב|הרצל|חיפה|31001|1000|0|"}));
}

}  // namespace
}  // namespace zdr
