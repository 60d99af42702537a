// The account import: which records of ACT.fix become rows, under which criteria, with
// which converted values; its failures and its progress.

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <tuple>
#include <vector>

#include "common/panel.h"
#include "import/importers.h"
#include "support/importtest.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

using Strings = std::vector<std::string>;
using Accounts = std::vector<zdrgen::AccountFields>;

zdrgen::AccountFields Acc(std::string key, uint8_t agent = 0, std::string sortCode = "   ",
                          std::string cutOff = "    ") {
  zdrgen::AccountFields f;
  f.key = std::move(key);
  f.agent = agent;
  f.sortCode = std::move(sortCode);
  f.cutOff = std::move(cutOff);
  f.name = test::HostText("לקוח", 30);
  return f;
}

class AccountImport : public test::ImportTest {
 protected:
  // Writes ACT.fix with a filler record before and after `accounts` (neither is read).
  void WriteAccounts(const Accounts& accounts) {
    std::vector<std::string> recs{zdrgen::AccountRecord(Acc("FIRST"))};
    for (const auto& a : accounts) recs.push_back(zdrgen::AccountRecord(a));
    recs.push_back(zdrgen::AccountRecord(Acc("LAST")));
    Write("ACT.fix", recs);
  }
  bool Run(bool allDetails = true, bool asIs = false) {
    if (db_.empty()) db_ = WorkDb();
    return ReadACT(company_, db_, allDetails, asIs, panel_, seam_);
  }
  Strings Keys() {
    return Rows(db_, "SELECT AccountKey FROM tAccount ORDER BY SortByKeyVal, AccountKey");
  }

  Panel panel_;
  std::string db_;
};

// Records 2 to count - 1 of the file, found without regard to case, are read; a blank key or
// the deleted mark alone is passed over (regression: a blank key used to end the import,
// losing the rest), and a ragged tail is not read.
TEST_F(AccountImport, WhichRecordsAreRead) {
  const std::string marks(8, '\x01');
  const std::pair<Accounts, Strings> cases[] = {
      {{Acc("F"), Acc("2"), Acc("3"), Acc("L")}, {"2", "3"}},
      {{}, {}},
      {{Acc("1")}, {}},
      {{Acc("F"), Acc("1"), Acc(""), Acc("2"), Acc("L")}, {"1", "2"}},
      {{Acc("F"), Acc("1"), Acc("\x01"), Acc(marks), Acc("L")}, {marks, "1"}},
  };
  for (const auto& [accounts, keys] : cases) {
    std::vector<std::string> recs;
    for (const auto& a : accounts) recs.push_back(zdrgen::AccountRecord(a));
    Write("act.FIX", recs);
    AppendBytes("act.FIX", std::string(100, 'Z'));
    db_.clear();
    EXPECT_TRUE(Run());
    EXPECT_EQ(Keys(), keys);
  }
  EXPECT_TRUE(seam_.messages.empty());
}

// Each row sets some of the account criteria on a fresh panel and names the keys that pass;
// a bound that is not a byte ends the import with a fault before any row.
TEST_F(AccountImport, CriteriaBoundsAreInclusive) {
  const Accounts agents = {Acc("1", 0), Acc("2", 2), Acc("3", 3), Acc("4", 255)};
  const Accounts numbers = {Acc("50"), Acc("100"), Acc("150"), Acc("1500"), Acc("200"), Acc("201")};
  const Accounts texts = {Acc("A1"), Acc("B2"), Acc("C3"), Acc(test::HostText("אב", 8))};
  const Accounts sorts = {Acc("1", 0, "  3"), Acc("2", 0, "  5"), Acc("3", 0, "  7"),
                          Acc("4", 0, " 10")};
  const std::string alef = zdrgen::HostBytes("א");
  const Accounts mixed = {Acc("10", 5, "  5", "A   "),       Acc("20", 5, "  5", "B   "),
                          Acc("30", 1, "  5", "A   "),       Acc("40", 5, "  9", "A   "),
                          Acc("50", 5, "  5", "A   "),       Acc("60", 5, "  5", "ABCD"),
                          Acc("70", 5, "  5", alef + "   "), Acc("80", 5, "  5", "A BC")};
  // A fault ends the import before any row.
  const Strings fault = {"fault"};
  const std::tuple<const Accounts&, std::function<void(Panel&)>, Strings> cases[] = {
      // clang-format off
      {agents, [](Panel& p) { p.ChkAgent = 1, p.txtAgent = "3"; }, {"3", "4"}},
      {agents, [](Panel& p) { p.ChkAgent = 1, p.txtAgent = "2", p.txtToAgent = "3"; }, {"2", "3"}},
      {agents, [](Panel& p) { p.ChkAgent = 2, p.txtAgent = "2", p.txtToAgent = "3"; }, {"1", "2", "3", "4"}},
      {agents, [](Panel& p) { p.ChkAgent = 1, p.txtToAgent = "abc"; }, fault},
      {agents, [](Panel& p) { p.ChkAgent = 1, p.txtAgent = "256"; }, fault},
      {numbers, [](Panel& p) { p.ChkAccKey = 1, p.TxtFromCrd = "100", p.TxtToCrd = "200"; }, {"100", "150", "200"}},
      // One bound empty: compared as text, where 1500 and 50 are not below 100.
      {numbers, [](Panel& p) { p.ChkAccKey = 1, p.TxtFromCrd = "100"; }, {"50", "100", "150", "200", "201", "1500"}},
      {texts, [](Panel& p) { p.ChkAccKey = 1, p.TxtFromCrd = "B", p.TxtToCrd = "ת"; }, {"אב", "B2", "C3"}},
      // A short sort bound is padded to "  5", which keeps "  3" out and lets " 10" in.
      {sorts, [](Panel& p) { p.ChkCatCode = 1, p.txtFromSort = "5"; }, {"2", "3", "4"}},
      {sorts, [](Panel& p) { p.ChkCatCode = 1, p.txtFromSort = "5", p.txtToSort = "5"; }, {"2"}},
      {mixed, [](Panel& p) { p.chkCutOff = 1; }, {"10", "20", "30", "40", "50", "60", "70", "80"}},
      // The first classification is the field's first byte; an empty box matches a space.
      {mixed, [](Panel& p) { p.chkCutOff = 1, p.CutOff[1] = "א"; }, {"70"}},
      {mixed, [](Panel& p) { p.chkCutOff = 1, p.CutOff[2] = ""; }, {"10", "20", "30", "40", "50", "70", "80"}},
      {mixed, [](Panel& p) { p.ChkAgent = 1, p.txtAgent = "2", p.ChkAccKey = 1, p.TxtFromCrd = "10";
                             p.TxtToCrd = "50", p.ChkCatCode = 1, p.txtFromSort = "5", p.txtToSort = "5";
                             p.chkCutOff = 1, p.CutOff[1] = "A"; }, {"10", "50"}},
      // clang-format on
  };
  int row = 0;
  for (const auto& [accounts, set, keys] : cases) {
    WriteAccounts(accounts);
    panel_ = Panel{};
    set(panel_);
    db_.clear();
    seam_.messages.clear();
    const bool faulted = !Run();
    EXPECT_EQ(faulted ? fault : Keys(), keys) << "row " << row++;
    ASSERT_EQ(seam_.messages.size(), faulted ? 1u : 0u);
    for (const auto& m : seam_.messages) EXPECT_EQ(m.title, "תקלה בקריאת החשבונות");
  }
  // With the criterion on, an empty box is written back as a space; with it off, left alone.
  panel_ = Panel{};
  panel_.CutOff[2] = "";
  Run();
  EXPECT_EQ(panel_.CutOff[2], "");
  panel_.chkCutOff = 1;
  Run();
  EXPECT_EQ(panel_.CutOff[2], " ");
}

TEST_F(AccountImport, RowValues) {
  zdrgen::AccountFields f = Acc("123", 7, "  5", "ABCD");
  f.name = test::HostText("משה כהן", 30);
  f.address = test::HostText("הרצל 12", 30);
  f.city = test::HostText("חיפה", 15);
  f.zip = "34567";
  f.district = test::HostText("צפון", 15);
  f.telephone = "04-1234567";
  f.details = test::HostText("דוד לוי", 50);
  zdrgen::AccountFields empty = Acc("9");
  empty.name = "";
  WriteAccounts({f, empty, Acc("AB(1"), Acc("12AB")});
  EXPECT_TRUE(Run());
  const char* all =
      "SELECT AccountKey, AccountName, CategoryCode, CutOff, Address, City, Zip, District, "
      "Details, Telephone, Include, SortByName, SortByKey, SortByCity, SortByZip, SortByKeyVal "
      "FROM tAccount ORDER BY SortByKey";
  EXPECT_EQ(Rows(db_, all),
            (Strings{"123|משה כהן|  5|DCBA|הרצל 12|חיפה|34567|צפון|דוד לוי|04-1234567|-1|משה "
                     "כהן|123 |חיפה|34567|123",
                     "12AB|לקוח|   |    | | | | | | |-1|לקוח|12AB | | |12",
                     "9|.|   |    | | | | | | |-1| |9 | | |9",
                     "AB1|לקוח|   |    | | | | | | |-1|לקוח|AB(1 | | |0"}));
  // As-is changes only the key: reversed and mirrored.
  db_.clear();
  EXPECT_TRUE(Run(true, true));
  EXPECT_EQ(Rows(db_, "SELECT AccountKey FROM tAccount WHERE SortByKey = 'AB(1 '"),
            Strings{"1)BA"});
}

TEST_F(AccountImport, DuplicateKeyOrSortKeyKeepsTheFirstAlsoInShortRows) {
  zdrgen::AccountFields a = Acc("5"), b = Acc("5");
  a.city = test::HostText("עכו", 15);
  b.city = test::HostText("לוד", 15);
  // "-א1" and ".א1" show as different keys but share the sort key "1 א ".
  WriteAccounts({a, b, Acc(std::string("-\x80") + "1"), Acc(std::string(".\x80") + "1"), Acc("6")});
  EXPECT_TRUE(Run());
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Rows(db_, "SELECT AccountKey, City FROM tAccount ORDER BY SortByKey"),
            (Strings{"א-1| ", "5|עכו", "6| "}));
  // The short rows of the selection database keep the first too.
  db_ = CreateSelectDB(seam_);
  EXPECT_TRUE(Run(false, false));
  EXPECT_EQ(Rows(db_,
                 "SELECT AccountKey, SortByKey, SortByName, Include FROM tSelectAccount "
                 "ORDER BY SortByKey"),
            (Strings{"א-1|1 א |לקוח|-1", "5|5 |לקוח|-1", "6|6 |לקוח|-1"}));
}

// Progress every fifth record over the count less one; a missing file or database is a fault.
TEST_F(AccountImport, ProgressAndFaults) {
  Accounts ten;
  for (int i = 2; i <= 11; ++i) ten.push_back(Acc(std::to_string(i)));
  WriteAccounts(ten);
  EXPECT_TRUE(Run());
  // q = 11: 3000 x 5 / 11 and 3000 x 10 / 11, rounded.
  EXPECT_EQ(seam_.progress, (std::vector<int>{0, 1364, 2727, 0}));
  db_ = (root_ / "nowhere" / "zdrlab.DB").string();
  EXPECT_FALSE(Run());
  std::filesystem::remove(std::filesystem::path(company_) / "ACT.fix");
  EXPECT_FALSE(Run());
  ASSERT_EQ(seam_.messages.size(), 2u);
  for (const auto& m : seam_.messages) {
    EXPECT_EQ(m.title, "תקלה בקריאת החשבונות");
    EXPECT_EQ(m.icon, MsgIcon::Critical);
    EXPECT_FALSE(m.text.empty());
  }
}

}  // namespace
}  // namespace zdr
