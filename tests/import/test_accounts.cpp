// The account import: which records of ACT.fix become rows, under which criteria, with
// which converted values; its failures and its progress.

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <string>
#include <vector>

#include "control/panel.h"
#include "import/importers.h"
#include "importtest.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

using test::ImportTest;

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

class AccountImport : public ImportTest {
 protected:
  // Writes ACT.fix with a filler record before and after `accounts` (neither is read).
  void WriteAccounts(const std::vector<zdrgen::AccountFields>& accounts) {
    std::vector<std::string> recs;
    recs.push_back(zdrgen::AccountRecord(Acc("FIRST")));
    for (const auto& a : accounts) recs.push_back(zdrgen::AccountRecord(a));
    recs.push_back(zdrgen::AccountRecord(Acc("LAST")));
    Write("ACT.fix", recs);
  }
  bool Run(bool allDetails = true, bool asIs = false) {
    if (db_.empty()) db_ = WorkDb();
    return ReadACT(company_, db_, allDetails, asIs, panel_, seam_);
  }
  std::vector<std::string> Keys() {
    return Rows(db_, "SELECT AccountKey FROM tAccount ORDER BY SortByKeyVal, AccountKey");
  }

  Panel panel_;
  std::string db_;
};

using Strings = std::vector<std::string>;

// ---- Which records are read.

TEST_F(AccountImport, TenRecordFileImportsRecordsTwoToNine) {
  std::vector<std::string> recs;
  for (int i = 1; i <= 10; ++i) recs.push_back(zdrgen::AccountRecord(Acc(std::to_string(i))));
  Write("ACT.fix", recs);
  EXPECT_TRUE(Run());
  EXPECT_EQ(Keys(), (Strings{"2", "3", "4", "5", "6", "7", "8", "9"}));
  EXPECT_TRUE(seam_.messages.empty());
}

TEST_F(AccountImport, EmptyFileAndSingleRecordImportNothing) {
  Write("ACT.fix", {});
  EXPECT_TRUE(Run());
  Write("ACT.fix", {zdrgen::AccountRecord(Acc("1"))});
  EXPECT_TRUE(Run());
  EXPECT_EQ(Count(db_, "tAccount"), 0);
}

TEST_F(AccountImport, FileNameMatchedWithoutRegardToCase) {
  std::vector<std::string> recs(3, zdrgen::AccountRecord(Acc("7")));
  zdrgen::WriteRecords(std::filesystem::path(company_) / "act.FIX", recs);
  EXPECT_TRUE(Run());
  EXPECT_EQ(Keys(), (Strings{"7"}));
}

TEST_F(AccountImport, DeletedMarkAloneIsSkippedEightMarksAreNot) {
  WriteAccounts({Acc("1"), Acc(std::string("\x01", 1)), Acc(std::string(8, '\x01')), Acc("2")});
  EXPECT_TRUE(Run());
  EXPECT_EQ(Count(db_, "tAccount"), 3);
  EXPECT_EQ(Rows(db_, "SELECT Count(*) FROM tAccount WHERE AccountKey = '1'"), Strings{"1"});
}

// Regression: a blank key used to end the import through the error path, losing the rest.
TEST_F(AccountImport, BlankKeyRecordIsSkippedAndImportGoesOn) {
  WriteAccounts({Acc("1"), Acc(""), Acc("2")});
  EXPECT_TRUE(Run());
  EXPECT_EQ(Keys(), (Strings{"1", "2"}));
  EXPECT_TRUE(seam_.messages.empty());
}

// ---- Criteria.

TEST_F(AccountImport, AgentBoundOfLettersEndsImportWithFault) {
  WriteAccounts({Acc("1", 1)});
  panel_.ChkAgent = 1;
  panel_.txtToAgent = "abc";
  EXPECT_FALSE(Run());
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה בקריאת החשבונות");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Critical);
  EXPECT_EQ(Count(db_, "tAccount"), 0);
}

TEST_F(AccountImport, AgentBoundAboveByteIsFault) {
  WriteAccounts({Acc("1", 1)});
  panel_.ChkAgent = 1;
  panel_.txtAgent = "256";
  EXPECT_FALSE(Run());
  EXPECT_EQ(seam_.messages.size(), 1u);
}

TEST_F(AccountImport, TextKeyRangeWithLettersAndHebrew) {
  WriteAccounts({Acc("A1"), Acc("B2"), Acc("C3"), Acc(test::HostText("אב", 8))});
  panel_.ChkAccKey = 1;
  panel_.TxtFromCrd = "B";
  panel_.TxtToCrd = "ת";
  EXPECT_TRUE(Run());
  Strings keys = Rows(db_, "SELECT AccountKey FROM tAccount");
  std::sort(keys.begin(), keys.end());
  EXPECT_EQ(keys, (Strings{"B2", "C3", "אב"}));
}

// Each row sets some of the account criteria on a fresh panel and names the keys that pass.
TEST_F(AccountImport, CriteriaBoundsAreInclusive) {
  using Acc4 = std::vector<zdrgen::AccountFields>;
  const Acc4 agents = {Acc("1", 0), Acc("2", 2), Acc("3", 3), Acc("4", 255)};
  const Acc4 numbers = {Acc("50"), Acc("100"), Acc("150"), Acc("1500"), Acc("200"), Acc("201")};
  const Acc4 sorts = {Acc("1", 0, "  3"), Acc("2", 0, "  5"), Acc("3", 0, "  7"),
                      Acc("4", 0, " 10")};
  const Acc4 mixed = {Acc("10", 5, "  5", "A   "), Acc("20", 5, "  5", "B   "),
                      Acc("30", 1, "  5", "A   "), Acc("40", 5, "  9", "A   "),
                      Acc("50", 5, "  5", "A   "), Acc("60", 5, "  5", "ABCD")};
  struct Case {
    const char* what;
    const Acc4& accounts;
    std::function<void(Panel&)> set;
    Strings keys;
  };
  const Case cases[] = {
      {"agent from only", agents, [](Panel& p) { p.ChkAgent = 1, p.txtAgent = "3"; }, {"3", "4"}},
      {"agent both",
       agents,
       [](Panel& p) { p.ChkAgent = 1, p.txtAgent = "2", p.txtToAgent = "3"; },
       {"2", "3"}},
      {"agent greyed is off",
       agents,
       [](Panel& p) { p.ChkAgent = 2, p.txtAgent = "2", p.txtToAgent = "3"; },
       {"1", "2", "3", "4"}},
      {"numeric keys",
       numbers,
       [](Panel& p) { p.ChkAccKey = 1, p.TxtFromCrd = "100", p.TxtToCrd = "200"; },
       {"100", "150", "200"}},
      // One bound empty: compared as text, where 1500 and 50 are not below 100.
      {"text keys",
       numbers,
       [](Panel& p) { p.ChkAccKey = 1, p.TxtFromCrd = "100"; },
       {"50", "100", "150", "200", "201", "1500"}},
      // A short sort bound is padded to "  5", which keeps "  3" out and lets " 10" in.
      {"sort from",
       sorts,
       [](Panel& p) { p.ChkCatCode = 1, p.txtFromSort = "5"; },
       {"2", "3", "4"}},
      {"sort both",
       sorts,
       [](Panel& p) { p.ChkCatCode = 1, p.txtFromSort = "5", p.txtToSort = "5"; },
       {"2"}},
      {"cut-off all stars",
       mixed,
       [](Panel& p) { p.chkCutOff = 1; },
       {"10", "20", "30", "40", "50", "60"}},
      {"all together",
       mixed,
       [](Panel& p) {
         p.ChkAgent = 1, p.txtAgent = "2", p.ChkAccKey = 1, p.TxtFromCrd = "10";
         p.TxtToCrd = "50", p.ChkCatCode = 1, p.txtFromSort = "5", p.txtToSort = "5";
         p.chkCutOff = 1, p.CutOff[1] = "A";
       },
       {"10", "50"}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    WriteAccounts(c.accounts);
    panel_ = Panel{};
    c.set(panel_);
    db_.clear();
    EXPECT_TRUE(Run());
    EXPECT_EQ(Keys(), c.keys);
  }
}

TEST_F(AccountImport, EmptyCutOffBoxBecomesSpaceAndMatchesSpace) {
  WriteAccounts({Acc("1", 0, "   ", "A BC"), Acc("2", 0, "   ", "AXBC")});
  panel_.chkCutOff = 1;
  panel_.CutOff[2] = "";
  EXPECT_TRUE(Run());
  EXPECT_EQ(panel_.CutOff[2], " ");
  EXPECT_EQ(Keys(), (Strings{"1"}));
}

TEST_F(AccountImport, CutOffHebrewLetterMatchesHostLetter) {
  const std::string alef = zdrgen::HostBytes("א");
  WriteAccounts({Acc("1", 0, "   ", alef + "   "), Acc("2", 0, "   ", "B   ")});
  panel_.chkCutOff = 1;
  panel_.CutOff[1] = "א";
  EXPECT_TRUE(Run());
  EXPECT_EQ(Keys(), (Strings{"1"}));
  // The stored cut-off is the field reversed: the first classification is the last character.
  EXPECT_EQ(Rows(db_, "SELECT CutOff FROM tAccount"), Strings{"   א"});
}

TEST_F(AccountImport, CutOffBoxOffLeavesEmptyBoxAlone) {
  WriteAccounts({Acc("1")});
  panel_.CutOff[3] = "";
  EXPECT_TRUE(Run());
  EXPECT_EQ(panel_.CutOff[3], "");
}

// ---- Values written.

TEST_F(AccountImport, FullRowValues) {
  zdrgen::AccountFields f = Acc("123", 7, "  5", "ABCD");
  f.name = test::HostText("משה כהן", 30);
  f.address = test::HostText("הרצל 12", 30);
  f.city = test::HostText("חיפה", 15);
  f.zip = "34567";
  f.district = test::HostText("צפון", 15);
  f.telephone = "04-1234567";
  f.details = test::HostText("דוד לוי", 50);
  WriteAccounts({f});
  EXPECT_TRUE(Run());
  EXPECT_EQ(Rows(db_,
                 "SELECT AccountKey, AccountName, CategoryCode, CutOff, Address, City, Zip, "
                 "District, Details, Telephone, Include, SortByName, SortByKey, SortByCity, "
                 "SortByZip, SortByKeyVal FROM tAccount"),
            Strings{"123|משה כהן|  5|DCBA|הרצל 12|חיפה|34567|צפון|דוד לוי|04-1234567|-1|משה "
                    "כהן|123 |חיפה|34567|123"});
}

TEST_F(AccountImport, EmptyFieldsGetPointOrSpace) {
  zdrgen::AccountFields f = Acc("9");
  f.name = "";
  WriteAccounts({f});
  EXPECT_TRUE(Run());
  EXPECT_EQ(Rows(db_,
                 "SELECT AccountName, Address, City, Zip, District, Details, Telephone, "
                 "SortByName, SortByCity, SortByZip FROM tAccount"),
            Strings{".| | | | | | | | | "});
}

TEST_F(AccountImport, KeyWithLettersHasNoNumericValue) {
  WriteAccounts({Acc("AB1"), Acc("12AB")});
  EXPECT_TRUE(Run());
  EXPECT_EQ(Rows(db_,
                 "SELECT AccountKey, SortByKey, SortByKeyVal FROM tAccount ORDER BY "
                 "AccountKey"),
            (Strings{"12AB|12AB |12", "AB1|AB1 |0"}));
}

TEST_F(AccountImport, AsIsChangesOnlyTheKey) {
  WriteAccounts({Acc("AB(1")});
  EXPECT_TRUE(Run(true, true));
  EXPECT_EQ(Rows(db_, "SELECT AccountKey, SortByKey FROM tAccount"), Strings{"1)BA|AB(1 "});
  db_.clear();
  EXPECT_TRUE(Run(true, false));
  EXPECT_EQ(Rows(db_, "SELECT AccountKey, SortByKey FROM tAccount"), Strings{"AB1|AB(1 "});
}

TEST_F(AccountImport, DuplicateKeyOrSortKeyKeepsTheFirst) {
  zdrgen::AccountFields a = Acc("5");
  a.city = test::HostText("עכו", 15);
  zdrgen::AccountFields b = Acc("5");
  b.city = test::HostText("לוד", 15);
  // "-א1" and ".א1" show as different keys but share the sort key "1 א ".
  WriteAccounts({a, b,
                 Acc("-\x80"
                     "1"),
                 Acc(".\x80"
                     "1"),
                 Acc("6")});
  EXPECT_TRUE(Run(true, false));
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Rows(db_, "SELECT AccountKey, City FROM tAccount WHERE AccountKey = '5'"),
            Strings{"5|עכו"});
  EXPECT_EQ(Rows(db_, "SELECT AccountKey FROM tAccount WHERE SortByKey = '1 א '"), Strings{"א-1"});
  EXPECT_EQ(Count(db_, "tAccount"), 3);
}

TEST_F(AccountImport, ShortRowsIntoSelectionDatabase) {
  WriteAccounts({Acc("1"), Acc("2")});
  db_ = CreateSelectDB(seam_);
  ASSERT_FALSE(db_.empty());
  EXPECT_TRUE(Run(false, false));
  EXPECT_EQ(Rows(db_,
                 "SELECT AccountKey, SortByKey, SortByName, Include FROM tSelectAccount "
                 "ORDER BY AccountKey"),
            (Strings{"1|1 |לקוח|-1", "2|2 |לקוח|-1"}));
}

// ---- Failures and progress.

TEST_F(AccountImport, MissingFileIsFault) {
  EXPECT_FALSE(Run());
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה בקריאת החשבונות");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Critical);
  EXPECT_FALSE(seam_.messages[0].text.empty());
}

TEST_F(AccountImport, DatabaseThatCannotOpenIsFault) {
  WriteAccounts({Acc("1")});
  db_ = (root_ / "nowhere" / "zdrlab.DB").string();
  EXPECT_FALSE(ReadACT(company_, db_, true, false, panel_, seam_));
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה בקריאת החשבונות");
}

TEST_F(AccountImport, RaggedTailIsNotRead) {
  WriteAccounts({Acc("1"), Acc("2")});
  AppendBytes("ACT.fix", std::string(100, 'Z'));
  EXPECT_TRUE(Run());
  EXPECT_EQ(Keys(), (Strings{"1", "2"}));
}

TEST_F(AccountImport, ProgressEveryFifthRecordOverCountLessOne) {
  std::vector<std::string> recs;
  for (int i = 1; i <= 12; ++i) recs.push_back(zdrgen::AccountRecord(Acc(std::to_string(i))));
  Write("ACT.fix", recs);
  db_ = WorkDb();
  seam_.progress.clear();
  EXPECT_TRUE(Run());
  // q = 11: 3000 x 5 / 11 and 3000 x 10 / 11, rounded.
  EXPECT_EQ(seam_.progress, (std::vector<int>{0, 1364, 2727, 0}));
}

}  // namespace
}  // namespace zdr
