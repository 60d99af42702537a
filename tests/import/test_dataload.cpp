// The data load: which importers run under which panel conditions, in which order, with
// which status messages, and what ends it.

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <iterator>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "common/panel.h"
#include "control/control.h"
#include "control/dataload.h"
#include "control/settings.h"
#include "hostfile/doctypes.h"
#include "hosttext/codepage.h"
#include "output/output.h"
#include "support/importtest.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

using Strings = std::vector<std::string>;
using zdrgen::HostDate;

const std::string kInit = "מאתחל בסיס נתונים";
const std::string kAccounts = "קורא רשימת כרטיסים";
const std::string kCash = "קורא תנועות קופה...";
const std::string kDocs = "קורא מסמכים...";
const std::string kItems = "קורא פריטים...";
const std::string kLedger = "קורא תנועות הנהלת חשבונות...";
const std::string kBatches = "קורא מנות ממאגר זמני...";
const std::string kDone = "קריאת הנתונים הסתיימה";

class DataLoad : public test::ImportTest {
 protected:
  void SetUp() override {
    ImportTest::SetUp();
    state_.companyPath = company_;
    // Accounts 12 and 34 between the two records that are never read.
    std::vector<std::string> accounts;
    for (const char* key : {"FIRST", "12", "34", "LAST"}) {
      accounts.push_back(zdrgen::AccountRecord({key, "", "", "", "", "", "", "", "", ""}));
    }
    Write("ACT.fix", accounts);
    const HostDate day = HostDate::Of(2020, 1, 1);
    Write("IMV.FIX",
          {zdrgen::DocHeaderRecord({1, 1, "12", "", "", "", "", "", 1}),
           zdrgen::DocSecondHeaderRecord(day, day), zdrgen::DocLineRecord({2, "I1", 1})});
    Write("ITM.fix", std::vector<std::string>(3, zdrgen::ItemRecord({"I1", "", ""})));
    Write("icash2.fix", {zdrgen::CashRecord({"43", day})});
    Write("amv.fix", {zdrgen::LedgerRecord({3, "A", {"21", "", "", ""}, day, day})});
    Write("a7.tmp", {zdrgen::BatchRecord({"A", {"43", "", "", ""}, day, day})});
  }

  LoadResult Load(bool asIs = true) { return ReadAllData(asIs, panel_, state_, docTypes_, seam_); }
  Strings Query(const std::string& sql) { return Rows(state_.workDbPath, sql); }
  Panel panel_;
  ControlState state_;
  DocTypeTable docTypes_;
};

// Each case: the criteria set, the status lines shown, and the row counts of tAccount,
// tStockHead, tStockLine, tItem, tCash and tTransact.
TEST_F(DataLoad, WhichImportersRunInWhichOrder) {
  const std::tuple<std::function<void(Panel&)>, Strings, const char*> cases[] = {
      // clang-format off
      // Batches and items need another criterion.
      {[](Panel& p) { p.chkReadTempTrans = 1, p.ChkByItems = 1; }, {kInit, kAccounts, kDone}, "200000"},
      // Cash receipts instead of documents, even with items.
      {[](Panel& p) { p.ChkDates = 1, p.cmbDocType = kCashReceiptsRow, p.ChkByItems = 1; },
       {kInit, kAccounts, kCash, kDone}, "200010"},
      {[](Panel& p) { p.ChkDates = 1, p.cmbDocType = 0, p.ChkByItems = 1; },
       {kInit, kAccounts, kDocs, kItems, kDone}, "211100"},
      {[](Panel& p) { p.ChkDates = 1; }, {kInit, kAccounts, kDocs, kDone}, "210000"},
      {[](Panel& p) { p.ChkDates = 1, p.cmbDocType = -1; }, {kInit, kAccounts, kDone}, "200000"},
      {[](Panel& p) { p.ChkJournal = 1, p.txtFromJournal = "1", p.chkReadTempTrans = 1; },
       {kInit, kAccounts, kLedger, kBatches, kDone}, "200002"},
      {[](Panel& p) { p.chkTransType = 1, p.txtTransType = "*"; }, {kInit, kAccounts, kLedger, kDone}, "200001"},
      // clang-format on
  };
  for (const auto& [set, statuses, counts] : cases) {
    panel_ = Panel{};
    set(panel_);
    seam_.statuses.clear();
    Load();
    EXPECT_EQ(seam_.statuses, statuses);
    EXPECT_TRUE(seam_.messages.empty());
    std::string rows;
    for (const char* t : {"tAccount", "tStockHead", "tStockLine", "tItem", "tCash", "tTransact"}) {
      rows += std::to_string(Count(state_.workDbPath, t));
    }
    EXPECT_EQ(rows, counts);
  }
}

TEST_F(DataLoad, BadJournalBoundEndsTheLoadAtTheBatches) {
  panel_.ChkJournal = 1;
  panel_.txtToJournal = "many";
  panel_.chkReadTempTrans = 1;
  EXPECT_ANY_THROW(Load());
  // The ledger import reported the bound itself; the batch listing let it escape.
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kLedger, kBatches}));
  EXPECT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(Count(state_.workDbPath, "tAccount"), 2);
}

// Regression: a database that could not be created (a full temporary folder) was followed by
// every importer's "database file not found", which hid the cause.
TEST_F(DataLoad, FailedDatabaseCreationIsTheOnlyMessage) {
  test::ScopedEnv temp("Temp", (root_ / "missing" / "folder").c_str());
  state_.workDbPath = "old";
  const LoadResult r = Load();
  EXPECT_EQ(state_.workDbPath, "");
  EXPECT_EQ(std::pair(r.databaseUsable, r.failures), std::pair(false, 1));
  EXPECT_EQ(seam_.statuses, (Strings{kInit}));
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה");
}

// Regression: a FIFO under a batch's name was passed over in silence. It is reported as any
// unreadable batch, without waiting on it, and the load goes on with the other batches.
TEST_F(DataLoad, FifoInPlaceOfABatchIsReported) {
  ASSERT_EQ(::mkfifo((std::filesystem::path(company_) / "a11.tmp").c_str(), 0600), 0);
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "1";
  panel_.chkReadTempTrans = 1;
  const LoadResult r = Load();
  EXPECT_EQ(std::pair(r.databaseUsable, r.failures), std::pair(true, 1));
  EXPECT_EQ(seam_.statuses.back(), kDone);
  ASSERT_EQ(seam_.messages.size(), 1u);
  EXPECT_NE(seam_.messages[0].text.find("a11.tmp"), std::string::npos);
  EXPECT_NE(seam_.messages[0].text.find("אינו קובץ רגיל"), std::string::npos);
  EXPECT_EQ(Count(state_.workDbPath, "tTransact"), 2) << "the ledger row and batch 7's";
}

// Shows every message under a neutral title and icon, as a message retitled one day would be.
class NeutralSeam : public test::RecordingSeam {
 public:
  void ShowMessage(std::string_view text, std::string_view, MsgIcon) override {
    RecordingSeam::ShowMessage(text, kTitleMessage, MsgIcon::Information);
  }
};

// Regression: whether the load failed was guessed from the title and icon of the message it
// showed, so a failing importer under a neutral title let a partial load replace the clerk's
// workbook. The importer's result decides.
TEST_F(DataLoad, WorkbookIsKeptWhenAnImporterFailsWhateverItsMessageSays) {
  std::filesystem::remove(std::filesystem::path(company_) / "amv.fix");
  const std::filesystem::path book = root_ / "book.xlsx";
  std::ofstream(book) << "last week's workbook";
  NeutralSeam seam;
  MemorySettingsStore store;
  Control control(store, seam);
  control.Initialize();
  control.state().companyPath = company_;
  control.panel().chkTransType = 1;
  control.panel().txtTransType = "*";
  control.postILSettings().FilePath = book.string();
  EXPECT_EQ(control.CmdBuildPostIL(), "");
  EXPECT_EQ(std::pair(control.lastLoad().databaseUsable, control.lastLoad().failures),
            std::pair(true, 1));
  std::ifstream in(book);
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(in), {}), "last week's workbook");
  ASSERT_EQ(seam.messages.size(), 2u);
  EXPECT_NE(seam.messages[0].text.find("amv.fix"), std::string::npos);
  EXPECT_NE(seam.messages[1].text.find("לא נכתב מחדש"), std::string::npos);
}

TEST_F(DataLoad, AsIsReachesTheAccountImportAndCutOffBoxIsWrittenBack) {
  panel_.chkCutOff = 1;
  panel_.CutOff[4] = "";
  state_.selectDbPath = CreateSelectDB(seam_);  // the picker was used: its table is linked
  Load(true);
  EXPECT_EQ(panel_.CutOff[4], " ");
  EXPECT_EQ(Query("SELECT AccountKey FROM tAccount ORDER BY SortByKeyVal"), (Strings{"21", "43"}));
  EXPECT_EQ(Count(state_.workDbPath, "tSelectAccount"), 0);
  Load(false);
  EXPECT_EQ(Query("SELECT AccountKey FROM tAccount ORDER BY SortByKeyVal"), (Strings{"12", "34"}));
}

// A generated company loaded as the dispatch load does (not as-is). The keys of the ledger,
// the batches and the cash receipts are converted as the account keys: were they converted
// otherwise, digit keys would miss their accounts and the payers would drop out of the
// dispatch file.
TEST_F(DataLoad, DispatchLoadLostPayersWhoseKeysConvertDifferently) {
  state_.companyPath =
      zdrgen::WriteCompany(root_ / "generated", zdrgen::Options(), "חברה לדוגמה").folder.string();
  panel_.chkTransType = 1;
  panel_.txtTransType = "*";
  panel_.chkReadTempTrans = 1;
  Load(false);
  for (const char* table : {"tTransact", "tCash"}) {
    SCOPED_TRACE(table);
    if (std::string(table) == "tCash") {
      panel_ = Panel();
      panel_.ChkDates = 1;
      panel_.cmbDocType = kCashReceiptsRow;
      Load(false);
    }
    ASSERT_TRUE(seam_.messages.empty()) << seam_.messages[0].text;
    const Strings payers = Query(std::string("SELECT DISTINCT AccountKey FROM ") + table);
    ASSERT_GT(payers.size(), 10u);
    EXPECT_EQ(Query(std::string("SELECT AccountKey FROM ") + table +
                    " WHERE AccountKey Not In (SELECT AccountKey FROM tAccount)"),
              Strings{});
    // The courier layout starts each line with the account key.
    const std::string csv = (root_ / "zdpost1.csv").string();
    CreateCSV(csv, state_.workDbPath, 1, panel_, docTypes_, "", PostILSettings(), seam_);
    std::ifstream in(csv, std::ios::binary);
    const std::string text = Win1255ToUtf8(std::string(std::istreambuf_iterator<char>(in), {}));
    std::set<std::string> listed;
    for (size_t at = text.find("\r\n"); at != std::string::npos && at + 2 < text.size();
         at = text.find("\r\n", at + 2)) {
      listed.insert(text.substr(at + 2, text.find(',', at + 2) - at - 2));
    }
    for (std::string key : payers) {
      std::replace(key.begin(), key.end(), ',', ' ');
      EXPECT_TRUE(listed.count(key)) << key;
    }
  }
}

}  // namespace
}  // namespace zdr
