// The ledger, the temporary batches and the cash receipts: rows of tTransact and tCash.
// Keys are stored in display order, so a stored "K1" reads back as "1K".

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
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
using Strings = std::vector<std::string>;
using zdrgen::HostDate;

zdrgen::LedgerFields Tx(int16_t journal, std::string type, std::array<std::string, 4> keys,
                        HostDate date = HostDate::Of(2020, 6, 15),
                        HostDate valueDate = HostDate::Of(2020, 6, 15)) {
  zdrgen::LedgerFields f;
  f.journal = journal;
  f.type = std::move(type);
  f.keys = std::move(keys);
  f.date = date;
  f.valueDate = valueDate;
  return f;
}

zdrgen::BatchFields Bx(std::string type, std::array<std::string, 4> keys,
                       HostDate date = HostDate::Of(2020, 6, 15)) {
  zdrgen::BatchFields f;
  f.type = std::move(type);
  f.keys = std::move(keys);
  f.date = date;
  f.valueDate = date;
  return f;
}

class LedgerImport : public ImportTest {
 protected:
  void SetUp() override {
    ImportTest::SetUp();
    db_ = WorkDb();
  }
  void WriteLedger(const std::vector<zdrgen::LedgerFields>& txs) {
    std::vector<std::string> recs;
    for (const auto& t : txs) recs.push_back(zdrgen::LedgerRecord(t));
    Write("amv.fix", recs);
  }
  void WriteBatch(const std::string& name, const std::vector<zdrgen::BatchFields>& txs) {
    std::vector<std::string> recs;
    for (const auto& t : txs) recs.push_back(zdrgen::BatchRecord(t));
    Write(name, recs);
  }
  int16_t Run() { return ReadTransactions(company_, db_, panel_, seam_); }
  // "FileID|TransID|AccountKey", sorted.
  Strings Transacts() {
    Strings rows = Rows(db_, "SELECT FileID, TransID, AccountKey FROM tTransact");
    std::sort(rows.begin(), rows.end());
    return rows;
  }
  Strings TransIds() {
    return Rows(db_, "SELECT DISTINCT TransID FROM tTransact ORDER BY TransID");
  }

  Panel panel_;
  std::string db_;
};

TEST_F(LedgerImport, EveryEntryWithoutCriteria) {
  WriteLedger({Tx(1, "AB", {"K1", "", "K2", ""}), Tx(2, "AB", {"", "", "", ""}),
               Tx(3, "AB", {"", "", "", "K3"}), Tx(4, "AB", {"K4", "K4", "K5", "K4"})});
  EXPECT_EQ(Run(), -1);
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Transacts(), (Strings{"-1|1|1K", "-1|1|2K", "-1|3|3K", "-1|4|4K", "-1|4|5K"}));
}

TEST_F(LedgerImport, KeyIsReversedMirroredAndTrimmed) {
  WriteLedger({Tx(1, "AB", {"(12", test::HostText("אבג", 8), "", ""})});
  Run();
  EXPECT_EQ(Transacts(), (Strings{"-1|1|21)", "-1|1|אבג"}));
}

TEST_F(LedgerImport, JournalBoundsInclusive) {
  WriteLedger({Tx(4, "A", {"K", "", "", ""}), Tx(5, "A", {"K", "", "", ""}),
               Tx(7, "A", {"K", "", "", ""}), Tx(8, "A", {"K", "", "", ""}),
               Tx(-3, "A", {"K", "", "", ""})});
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "5";
  panel_.txtToJournal = "7";
  Run();
  EXPECT_EQ(TransIds(), (Strings{"2", "3"}));
}

TEST_F(LedgerImport, JournalFromBoundOnlyAndBoxOff) {
  WriteLedger({Tx(4, "A", {"K", "", "", ""}), Tx(5, "A", {"K", "", "", ""})});
  panel_.txtFromJournal = "5";
  Run();
  EXPECT_EQ(TransIds(), (Strings{"1", "2"}));
  db_ = WorkDb();
  panel_.ChkJournal = 1;
  Run();
  EXPECT_EQ(TransIds(), (Strings{"2"}));
}

// A bound that is not a number, not 16 bits or not a date stops the import before any row.
TEST_F(LedgerImport, BadBoundIsFault) {
  WriteLedger({Tx(4, "A", {"K", "", "", ""})});
  const std::vector<std::function<void(Panel&)>> bad = {
      [](Panel& p) { p.ChkJournal = 1, p.txtToJournal = "x1"; },
      [](Panel& p) { p.ChkJournal = 1, p.txtFromJournal = "40000"; },
      [](Panel& p) { p.chkTransVDate = 1, p.txtFromTransVDate = "yesterday"; }};
  for (size_t i = 0; i < bad.size(); ++i) {
    panel_ = Panel{};
    bad[i](panel_);
    seam_.messages.clear();
    EXPECT_EQ(Run(), 0) << i;
    ASSERT_EQ(seam_.messages.size(), 1u) << i;
    EXPECT_EQ(seam_.messages[0].title, "תקלה");
    EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Information);
    EXPECT_EQ(Count(db_, "tTransact"), 0);
  }
}

struct PatternCase {
  std::string pattern;
  Strings transIds;
};

class LedgerTypePattern : public LedgerImport, public ::testing::WithParamInterface<PatternCase> {};

TEST_P(LedgerTypePattern, MatchesTheWholeConvertedType) {
  // Types 1..6: "AB", "A", "B", "7", "ab", "אב" (Hebrew in display order).
  WriteLedger({Tx(1, "AB", {"K", "", "", ""}), Tx(1, "A", {"K", "", "", ""}),
               Tx(1, "B", {"K", "", "", ""}), Tx(1, "7", {"K", "", "", ""}),
               Tx(1, "ab", {"K", "", "", ""}), Tx(1, test::HostText("אב", 3), {"K", "", "", ""})});
  panel_.chkTransType = 1;
  panel_.txtTransType = GetParam().pattern;
  Run();
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(TransIds(), GetParam().transIds);
}

INSTANTIATE_TEST_SUITE_P(Patterns, LedgerTypePattern,
                         ::testing::Values(PatternCase{"*", {"1", "2", "3", "4", "5", "6"}},
                                           PatternCase{"?", {"2", "3", "4"}},
                                           PatternCase{"#", {"4"}},
                                           PatternCase{"[A-C]", {"2", "3"}},
                                           PatternCase{"[!A]", {"3", "4"}},
                                           PatternCase{"AB", {"1"}}, PatternCase{"A*", {"1", "2"}},
                                           PatternCase{"אב", {"6"}}, PatternCase{"א?", {"6"}}));

// Regression: the spaced conversion ends a Latin or digit type with a space, so a pattern typed
// as the type reads ("AB", "#") never matched it.
TEST_F(LedgerImport, PatternMatchesLatinTypeWithoutItsTrailingSpace) {
  WriteLedger({Tx(1, "AB", {"K", "", "", ""}), Tx(1, "7", {"K", "", "", ""})});
  panel_.chkTransType = 1;
  panel_.txtTransType = "AB";
  Run();
  EXPECT_EQ(TransIds(), Strings{"1"});
  db_ = WorkDb();
  panel_.txtTransType = "# ";  // the converted form with its space still matches
  Run();
  EXPECT_EQ(TransIds(), Strings{"2"});
}

TEST_F(LedgerImport, DateAndValueDateRangesInclusive) {
  WriteLedger({Tx(1, "A", {"K", "", "", ""}, HostDate::Of(2020, 1, 1), HostDate::Of(2020, 5, 1)),
               Tx(1, "A", {"K", "", "", ""}, HostDate::Of(2020, 1, 31), HostDate::Of(2020, 5, 1)),
               Tx(1, "A", {"K", "", "", ""}, HostDate::Of(2020, 2, 1), HostDate::Of(2020, 5, 1)),
               Tx(1, "A", {"K", "", "", ""}, HostDate::Of(2020, 1, 15), HostDate::Of(2020, 4, 30)),
               Tx(1, "A", {"K", "", "", ""}, HostDate::Of(2020, 1, 15), HostDate::Of(2020, 6, 1))});
  panel_.chkTransDates = 1;
  panel_.txtFromTransDate = "1/1/20";
  panel_.txtToTransDate = "31/01/2020";
  panel_.chkTransVDate = 1;
  panel_.txtFromTransVDate = "01/05/2020";
  panel_.txtToTransVDate = "31/5/20";
  Run();
  EXPECT_EQ(TransIds(), (Strings{"1", "2"}));
}

TEST_F(LedgerImport, EmptyDateTextsAreNoBound) {
  WriteLedger({Tx(1, "A", {"K", "", "", ""}, HostDate::Of(1999, 1, 1))});
  panel_.chkTransDates = 1;
  panel_.txtFromTransDate = "";
  panel_.txtToTransDate = "";
  Run();
  EXPECT_EQ(TransIds(), Strings{"1"});
}

TEST_F(LedgerImport, MissingFileIsFault) {
  EXPECT_EQ(Run(), 0);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Information);
}

TEST_F(LedgerImport, RaggedFileReportsAndKeepsEarlierRows) {
  WriteLedger({Tx(1, "A", {"K1", "", "", ""}), Tx(1, "A", {"K2", "", "", ""})});
  AppendBytes("amv.fix", std::string(120, ' '));
  EXPECT_EQ(Run(), 0);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה");
  EXPECT_EQ(Transacts(), (Strings{"-1|1|1K", "-1|2|2K"}));
}

TEST_F(LedgerImport, ProgressEveryFifthRecord) {
  std::vector<zdrgen::LedgerFields> txs(10, Tx(1, "A", {"K", "", "", ""}));
  WriteLedger(txs);
  seam_.progress.clear();
  Run();
  EXPECT_EQ(seam_.progress, (std::vector<int>{0, 1500, 3000, 0}));
}

// ---- Temporary batches.

TEST_F(LedgerImport, BatchInRangeCarriesItsNumber) {
  WriteBatch("a12.tmp", {Bx("A", {"K1", "", "K2", ""}), Bx("A", {"", "", "", ""})});
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "10";
  panel_.txtToJournal = "20";
  ReadAllTempTrans(company_, db_, panel_, seam_);
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Transacts(), (Strings{"12|1|1K", "12|1|2K"}));
  db_ = WorkDb();
  panel_.txtFromJournal = "13";
  ReadAllTempTrans(company_, db_, panel_, seam_);
  EXPECT_EQ(Count(db_, "tTransact"), 0);
}

TEST_F(LedgerImport, BatchFromBoundOnlyReadsEveryBatchUpFromIt) {
  WriteBatch("a3.tmp", {Bx("A", {"K3", "", "", ""})});
  WriteBatch("a5.tmp", {Bx("A", {"K5", "", "", ""})});
  WriteBatch("A900.TMP", {Bx("A", {"K9", "", "", ""})});
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "5";
  ReadAllTempTrans(company_, db_, panel_, seam_);
  EXPECT_EQ(Transacts(), (Strings{"5|1|5K", "900|1|9K"}));
}

TEST_F(LedgerImport, NamesWithoutANumberAndBatchZeroAreNeverRead) {
  for (const char* name : {"a0.tmp", "a.tmp", "abc.tmp", "b7.tmp", "a7.tmpx"}) {
    WriteBatch(name, {Bx("A", {"K", "", "", ""})});
  }
  std::filesystem::create_directory(std::filesystem::path(company_) / "a8.tmp");
  ReadAllTempTrans(company_, db_, panel_, seam_);
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Count(db_, "tTransact"), 0);
}

// Regression: a012.tmp used to be read as the file a12.tmp.
TEST_F(LedgerImport, BatchWithLeadingZerosReadsTheListedFile) {
  WriteBatch("a012.tmp", {Bx("A", {"K1", "", "", ""})});
  ReadAllTempTrans(company_, db_, panel_, seam_);
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Transacts(), Strings{"12|1|1K"});
}

// Regression: a batch number past 16 bits used to end the whole data load.
TEST_F(LedgerImport, BatchNumberBeyond16BitsIsPassedOver) {
  WriteBatch("a99999.tmp", {Bx("A", {"K9", "", "", ""})});
  WriteBatch("a4.tmp", {Bx("A", {"K4", "", "", ""})});
  EXPECT_NO_THROW(ReadAllTempTrans(company_, db_, panel_, seam_));
  EXPECT_EQ(Transacts(), Strings{"4|1|4K"});
}

TEST_F(LedgerImport, BatchAppliesTypeAndDatesButNotTheJournalRangeInside) {
  WriteBatch("a6.tmp", {Bx("AB", {"K1", "", "", ""}), Bx("CD", {"K2", "", "", ""}),
                        Bx("AB", {"K3", "", "", ""}, HostDate::Of(2019, 1, 1))});
  panel_.chkTransType = 1;
  panel_.txtTransType = "A*";
  panel_.chkTransDates = 1;
  panel_.txtFromTransDate = "1/1/2020";
  panel_.txtToTransDate = "";
  EXPECT_EQ(ReadTempTransactions(company_, db_, 6, panel_, seam_), -1);
  EXPECT_EQ(Transacts(), Strings{"6|1|1K"});
}

TEST_F(LedgerImport, MissingBatchIsFaultAndListingGoesOn) {
  EXPECT_EQ(ReadTempTransactions(company_, db_, 44, panel_, seam_), 0);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה");
  EXPECT_EQ(seam_.messages[0].icon, MsgIcon::Information);
}

TEST_F(LedgerImport, RaggedBatchIsReportedAndOthersStillRead) {
  WriteBatch("a1.tmp", {Bx("A", {"K1", "", "", ""})});
  AppendBytes("a1.tmp", std::string(200, ' '));
  WriteBatch("a2.tmp", {Bx("A", {"K2", "", "", ""})});
  ReadAllTempTrans(company_, db_, panel_, seam_);
  EXPECT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(Transacts(), (Strings{"1|1|1K", "2|1|2K"}));
}

TEST_F(LedgerImport, NonNumericJournalBoundEscapesTheBatchListing) {
  WriteBatch("a1.tmp", {Bx("A", {"K1", "", "", ""})});
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "x";
  EXPECT_ANY_THROW(ReadAllTempTrans(company_, db_, panel_, seam_));
}

// ---- Cash receipts.

class CashImport : public LedgerImport {
 protected:
  void WriteCash(const std::vector<std::pair<std::string, HostDate>>& receipts) {
    std::vector<std::string> recs;
    for (const auto& [key, date] : receipts) {
      zdrgen::CashFields f;
      f.accountKey = key;
      f.date = date;
      recs.push_back(zdrgen::CashRecord(f));
    }
    Write("icash2.fix", recs);
  }
  int16_t RunCash() { return ReadCash(company_, db_, panel_, seam_); }
  Strings Cash() {
    Strings rows = Rows(db_, "SELECT TransID, AccountKey FROM tCash");
    std::sort(rows.begin(), rows.end());
    return rows;
  }
};

TEST_F(CashImport, WithoutBoundsEveryKeyedReceipt) {
  WriteCash({{"K1", HostDate::Of(1990, 1, 1)},
             {"", HostDate::Of(2020, 1, 1)},
             {"(K3", HostDate::Of(2030, 1, 1)}});
  EXPECT_EQ(RunCash(), -1);
  EXPECT_EQ(Cash(), (Strings{"1|1K", "3|3K)"}));
}

TEST_F(CashImport, DateBoundsInclusiveAnyTextCounts) {
  WriteCash({{"A", HostDate::Of(2008, 12, 31)},
             {"B", HostDate::Of(2009, 1, 1)},
             {"C", HostDate::Of(2009, 1, 2)},
             {"D", HostDate::Of(2009, 1, 3)}});
  panel_.ChkDates = 1;
  panel_.TxtFromDate = "1/1/9";  // five characters: no bound for documents, a bound here
  panel_.TxtToDate = "2/1/09";
  RunCash();
  EXPECT_EQ(Cash(), (Strings{"2|B", "3|C"}));
}

TEST_F(CashImport, DateBoxOffOrEmptyTextsAreNoBound) {
  WriteCash({{"A", HostDate::Of(1950, 1, 1)}});
  panel_.TxtFromDate = "1/1/2000";
  RunCash();
  EXPECT_EQ(Count(db_, "tCash"), 1);
  db_ = WorkDb();
  panel_.ChkDates = 1;
  panel_.TxtFromDate = "";
  panel_.TxtToDate = "";
  RunCash();
  EXPECT_EQ(Count(db_, "tCash"), 1);
}

TEST_F(CashImport, MissingFileAndBadDateAreFaults) {
  EXPECT_EQ(RunCash(), 0);
  WriteCash({{"A", HostDate::Of(2020, 1, 1)}});
  panel_.ChkDates = 1;
  panel_.TxtToDate = "12-12";
  EXPECT_EQ(RunCash(), 0);
  ASSERT_EQ(seam_.messages.size(), 2u);
  for (const auto& m : seam_.messages) {
    EXPECT_EQ(m.title, "תקלה");
    EXPECT_EQ(m.icon, MsgIcon::Information);
  }
  EXPECT_EQ(Count(db_, "tCash"), 0);
}

TEST_F(CashImport, RaggedFileKeepsEarlierRows) {
  WriteCash({{"A", HostDate::Of(2020, 1, 1)}});
  AppendBytes("icash2.fix", std::string(60, ' '));
  EXPECT_EQ(RunCash(), 0);
  EXPECT_EQ(Cash(), Strings{"1|A"});
}

}  // namespace
}  // namespace zdr
