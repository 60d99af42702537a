// The data load: which importers run under which panel conditions, in which order, with
// which status messages, and what ends it.

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <set>
#include <string>
#include <vector>

#include "control/control.h"
#include "control/dataload.h"
#include "control/panel.h"
#include "import/doctypes.h"
#include "importtest.h"
#include "output/output.h"
#include "zdrgen/generator.h"

namespace zdr {
namespace {

using test::ImportTest;
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

class DataLoad : public ImportTest {
 protected:
  void SetUp() override {
    ImportTest::SetUp();
    state_.companyPath = company_;
    // Accounts 12 and 34 between the two records that are never read.
    std::vector<std::string> accounts;
    for (const char* key : {"FIRST", "12", "34", "LAST"}) {
      zdrgen::AccountFields f;
      f.key = key;
      accounts.push_back(zdrgen::AccountRecord(f));
    }
    Write("ACT.fix", accounts);

    zdrgen::DocHeaderFields h;
    h.type = 1;
    h.accountKey = "12";
    h.lineCount = 1;
    zdrgen::DocLineFields l;
    l.itemKey = "I1";
    l.type = 1;
    Write("IMV.FIX",
          {zdrgen::DocHeaderRecord(h),
           zdrgen::DocSecondHeaderRecord(HostDate::Of(2020, 1, 1), HostDate::Of(2020, 1, 1)),
           zdrgen::DocLineRecord(l)});
    zdrgen::ItemFields item;
    item.key = "I1";
    Write("ITM.fix",
          {zdrgen::ItemRecord(item), zdrgen::ItemRecord(item), zdrgen::ItemRecord(item)});
    zdrgen::CashFields c;
    c.accountKey = "43";
    c.date = HostDate::Of(2020, 1, 1);
    Write("icash2.fix", {zdrgen::CashRecord(c)});
    zdrgen::LedgerFields t;
    t.journal = 3;
    t.type = "A";
    t.keys = {"21", "", "", ""};
    Write("amv.fix", {zdrgen::LedgerRecord(t)});
    zdrgen::BatchFields b;
    b.type = "A";
    b.keys = {"43", "", "", ""};
    Write("a7.tmp", {zdrgen::BatchRecord(b)});
  }

  void Load(bool asIs = true) { ReadAllData(asIs, panel_, state_, docTypes_, seam_); }
  int64_t Rows(const std::string& table) { return Count(state_.workDbPath, table); }

  Panel panel_;
  ControlState state_;
  DocTypeTable docTypes_;
};

TEST_F(DataLoad, EveryCriterionOffReadsOnlyTheAccounts) {
  panel_.chkReadTempTrans = 1;  // no effect without a ledger criterion
  panel_.ChkByItems = 1;        // no effect with ChkDates off
  Load();
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kDone}));
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_FALSE(state_.workDbPath.empty());
  EXPECT_EQ(Rows("tAccount"), 2);
  for (const char* t : {"tStockHead", "tStockLine", "tItem", "tCash", "tTransact"}) {
    EXPECT_EQ(Rows(t), 0) << t;
  }
}

TEST_F(DataLoad, CashReceiptsInsteadOfDocumentsEvenWithItems) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = kCashReceiptsRow;
  panel_.ChkByItems = 1;
  Load();
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kCash, kDone}));
  EXPECT_EQ(Rows("tCash"), 1);
  EXPECT_EQ(Rows("tStockHead"), 0);
  EXPECT_EQ(Rows("tItem"), 0);
}

TEST_F(DataLoad, DocumentsWithLinesThenItems) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = 0;
  panel_.ChkByItems = 1;
  Load();
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kDocs, kItems, kDone}));
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Rows("tStockHead"), 1);
  EXPECT_EQ(Rows("tStockLine"), 1);
  EXPECT_EQ(Rows("tItem"), 1);
}

TEST_F(DataLoad, DocumentsWithoutItemsKeepNoLines) {
  panel_.ChkDates = 1;
  Load();
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kDocs, kDone}));
  EXPECT_EQ(Rows("tStockHead"), 1);
  EXPECT_EQ(Rows("tStockLine"), 0);
}

TEST_F(DataLoad, NoDocumentTypeChosenReadsNoDocuments) {
  panel_.ChkDates = 1;
  panel_.cmbDocType = -1;
  Load();
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kDone}));
}

TEST_F(DataLoad, LedgerThenBatches) {
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "1";
  panel_.chkReadTempTrans = 1;
  Load();
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kLedger, kBatches, kDone}));
  EXPECT_TRUE(seam_.messages.empty());
  EXPECT_EQ(Count(state_.workDbPath, "tTransact"), 2);
}

TEST_F(DataLoad, LedgerWithoutBatches) {
  panel_.chkTransType = 1;
  panel_.txtTransType = "*";
  Load();
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kLedger, kDone}));
  EXPECT_EQ(Count(state_.workDbPath, "tTransact"), 1);
}

TEST_F(DataLoad, BadJournalBoundEndsTheLoadAtTheBatches) {
  panel_.ChkJournal = 1;
  panel_.txtToJournal = "many";
  panel_.chkReadTempTrans = 1;
  EXPECT_ANY_THROW(Load());
  // The ledger import reported the bound itself; the batch listing let it escape.
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kLedger, kBatches}));
  EXPECT_EQ(seam_.messages.size(), 1u);
  EXPECT_EQ(Rows("tAccount"), 2);
}

TEST_F(DataLoad, FailedDatabaseCreationStoresEmptyPathAndGoesOn) {
  ::setenv("Temp", (root_ / "missing" / "folder").c_str(), 1);
  state_.workDbPath = "old";
  Load();
  EXPECT_EQ(state_.workDbPath, "");
  EXPECT_EQ(seam_.statuses, (Strings{kInit, kAccounts, kDone}));
  ASSERT_EQ(seam_.messages.size(), 2u);
  EXPECT_EQ(seam_.messages[0].title, "תקלה");
  EXPECT_EQ(seam_.messages[1].title, "תקלה בקריאת החשבונות");
}

TEST_F(DataLoad, AsIsReachesTheAccountImportAndCutOffBoxIsWrittenBack) {
  panel_.chkCutOff = 1;
  panel_.CutOff[4] = "";
  Load(true);
  EXPECT_EQ(panel_.CutOff[4], " ");
  EXPECT_EQ(
      ImportTest::Rows(state_.workDbPath, "SELECT AccountKey FROM tAccount ORDER BY SortByKeyVal"),
      (Strings{"21", "43"}));
  Load(false);
  EXPECT_EQ(
      ImportTest::Rows(state_.workDbPath, "SELECT AccountKey FROM tAccount ORDER BY SortByKeyVal"),
      (Strings{"12", "34"}));
}

TEST_F(DataLoad, LinksTheSelectionTableOnceThePickerWasUsed) {
  state_.selectDbPath = CreateSelectDB(seam_);
  ASSERT_FALSE(state_.selectDbPath.empty());
  Load();
  EXPECT_EQ(Count(state_.workDbPath, "tSelectAccount"), 0);
}

// A generated company of ordinary size: every live account with a key of its own becomes one
// row, and every distinct account of a ledger transaction or batch one tTransact row.
TEST_F(DataLoad, GeneratedCompanyRowsMatchWhatWasWritten) {
  zdrgen::Options options;
  const zdrgen::CompanyTruth truth =
      zdrgen::WriteCompany(root_ / "generated", options, "חברה לדוגמה");
  state_.companyPath = truth.folder.string();
  panel_.chkTransType = 1;
  panel_.txtTransType = "*";
  panel_.chkReadTempTrans = 1;
  Load(false);
  EXPECT_TRUE(seam_.messages.empty()) << seam_.messages[0].text;

  int64_t accounts = 0;
  std::set<std::string> stored;
  for (const std::string& k :
       ImportTest::Rows(state_.workDbPath, "SELECT AccountKey FROM tAccount")) {
    stored.insert(k);
  }
  for (const auto& a : truth.accounts) {
    if (a.deleted || a.duplicateKey) continue;
    ++accounts;
    if (a.unambiguousKey) {
      EXPECT_TRUE(stored.count(a.key)) << a.key;
    }
  }
  EXPECT_EQ(Rows("tAccount"), accounts);

  auto distinctKeys = [&](const std::array<int, 4>& entries) {
    std::set<std::string> keys;
    for (int idx : entries) {
      if (idx >= 0) keys.insert(truth.accounts[static_cast<size_t>(idx)].key);
    }
    return static_cast<int64_t>(keys.size());
  };
  int64_t transacts = 0;
  for (const auto& t : truth.ledger) transacts += distinctKeys(t.accountIndex);
  for (const auto& b : truth.batches) {
    if (b.number == 0) continue;
    for (const auto& t : b.transactions) transacts += distinctKeys(t.accountIndex);
  }
  EXPECT_EQ(Rows("tTransact"), transacts);
}

// The dispatch load (not as-is) converts the keys of the ledger, the batches and the cash
// receipts as it converts the account keys. Were they converted otherwise, digit keys would
// miss their accounts and the payers would drop out of the dispatch file.
TEST_F(DataLoad, DispatchLoadLostPayersWhoseKeysConvertDifferently) {
  zdrgen::Options options;
  const zdrgen::CompanyTruth truth =
      zdrgen::WriteCompany(root_ / "generated", options, "חברה לדוגמה");
  state_.companyPath = truth.folder.string();
  struct Source {
    const char* table;
    void (*criterion)(Panel&);
  };
  const Source sources[] = {
      {"tTransact",
       [](Panel& p) {
         p.chkTransType = 1;
         p.txtTransType = "*";
         p.chkReadTempTrans = 1;
       }},
      {"tCash",
       [](Panel& p) {
         p.ChkDates = 1;
         p.cmbDocType = kCashReceiptsRow;
       }},
  };
  for (const Source& source : sources) {
    SCOPED_TRACE(source.table);
    panel_ = Panel();
    source.criterion(panel_);
    Load(false);
    ASSERT_TRUE(seam_.messages.empty()) << seam_.messages[0].text;
    const std::string table = source.table;
    const Strings payers =
        ImportTest::Rows(state_.workDbPath, "SELECT DISTINCT AccountKey FROM " + table);
    ASSERT_GT(payers.size(), 10u);
    EXPECT_EQ(ImportTest::Rows(state_.workDbPath,
                               "SELECT AccountKey FROM " + table +
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
