// The WHERE clause of the recipients statement and the ledger-criterion switch.

#include <gtest/gtest.h>

#include <string>

#include "import/doctypes.h"
#include "select/select.h"
#include "workdb/jetsql.h"

namespace zdr {
namespace {

constexpr const char* kBase = " Where (1 > 0)";
constexpr const char* kStockJoin =
    " AND tStockHead.Include AND tAccount.AccountKey = tStockHead.AccountKey";
constexpr const char* kCashIn =
    " AND tAccount.AccountKey In (Select Distinct AccountKey From tCash)";
constexpr const char* kNotIssued =
    " AND tAccount.AccountKey Not In (Select Distinct AccountKey From tStockHead Where "
    "tStockHead.Include)";
constexpr const char* kLedger =
    " AND tAccount.AccountKey In (Select Distinct AccountKey From tTransact)";
constexpr const char* kPicked =
    " AND tAccount.SortByKey In (Select SA.SortByKey From tSelectAccount SA Where SA.Include)";
constexpr const char* kNotPicked =
    " AND tAccount.SortByKey Not In (Select SA.SortByKey From tSelectAccount SA Where "
    "SA.Include)";
const std::string kSelectDb = "/tmp/zdracc.DB";

class CriteriaTest : public ::testing::Test {
 protected:
  std::string Build(bool useDocs = false, bool notIssued = false,
                    const std::string& selectDb = "") {
    return BuildCriteria(panel_, docTypes_, selectDb, useDocs, notIssued);
  }
  Panel panel_;
  DocTypeTable docTypes_;
};

TEST_F(CriteriaTest, AllCriteriaOffGivesTheBareClause) {
  EXPECT_EQ(Build(), kBase);
}

TEST_F(CriteriaTest, CityAndPhonePrefixes) {
  panel_.ChkCity = 1;
  panel_.TxtCity = "חי";
  panel_.ChkPhone = 1;
  panel_.txtPhone = "04";
  EXPECT_EQ(Build(), std::string(kBase) + " AND tAccount.City LIKE \"חי*\"" +
                         " AND tAccount.Telephone LIKE \"04*\"");
}

TEST_F(CriteriaTest, PrefixTextIsNeitherTrimmedNorChanged) {
  panel_.ChkCity = 1;
  panel_.TxtCity = " תל אביב ";
  panel_.ChkPhone = 1;
  panel_.txtPhone = "03-5'?";
  EXPECT_EQ(Build(), std::string(kBase) + " AND tAccount.City LIKE \" תל אביב *\"" +
                         " AND tAccount.Telephone LIKE \"03-5'?*\"");
}

TEST_F(CriteriaTest, EmptyCityMatchesAnyCity) {
  panel_.ChkCity = 1;
  EXPECT_EQ(Build(), std::string(kBase) + " AND tAccount.City LIKE \"*\"");
}

TEST_F(CriteriaTest, GreyedOrOffBoxesAddNothing) {
  panel_.ChkCity = 2;
  panel_.TxtCity = "חי";
  panel_.ChkPhone = 0;
  panel_.txtPhone = "04";
  panel_.ChkSelectAccount = 2;
  EXPECT_EQ(Build(false, false, kSelectDb), kBase);
}

// A typed double quote used to end the literal early, so the rest of the box became part
// of the statement. It is now doubled inside the literal.
TEST_F(CriteriaTest, DoubleQuoteInCityOrPhoneEndedLiteralEarly) {
  panel_.ChkCity = 1;
  panel_.TxtCity = "x\" OR 1=1 OR \"";
  EXPECT_EQ(Build(), std::string(kBase) + " AND tAccount.City LIKE \"x\"\" OR 1=1 OR \"\"*\"");

  panel_.ChkCity = 0;
  panel_.ChkPhone = 1;
  panel_.txtPhone = "\"04";
  EXPECT_EQ(Build(), std::string(kBase) + " AND tAccount.Telephone LIKE \"\"\"04*\"");

  // The database sees the typed text as one literal.
  panel_.ChkCity = 1;
  const std::string sql = db::TranslateJetSql("SELECT AccountKey FROM tAccount" + Build());
  EXPECT_NE(sql.find("LIKE 'x\" OR 1=1 OR \"*'"), std::string::npos) << sql;
}

TEST_F(CriteriaTest, HandPickedAccountsNeedThePickerDatabase) {
  panel_.ChkSelectAccount = 1;
  EXPECT_EQ(Build(false, false, ""), kBase);
  EXPECT_EQ(Build(false, false, kSelectDb), std::string(kBase) + kPicked);
}

TEST_F(CriteriaTest, HandPickedNegationOnlyOnSecondEntry) {
  panel_.ChkSelectAccount = 1;
  panel_.cmbInAccounts = 1;
  EXPECT_EQ(Build(false, false, kSelectDb), std::string(kBase) + kNotPicked);
  for (int index : {0, -1, 2, 7}) {
    panel_.cmbInAccounts = index;
    EXPECT_EQ(Build(false, false, kSelectDb), std::string(kBase) + kPicked) << index;
  }
}

TEST_F(CriteriaTest, IssuedStockDocumentsJoinTheHeaders) {
  for (int row : {0, 13, 25, 27}) {
    panel_.cmbDocType = row;
    EXPECT_EQ(Build(true), std::string(kBase) + kStockJoin) << row;
  }
}

TEST_F(CriteriaTest, IssuedCashReceiptsUseTheCashSubqueryWithoutJoin) {
  panel_.cmbDocType = kCashReceiptsRow;
  EXPECT_EQ(Build(true), std::string(kBase) + kCashIn);
}

TEST_F(CriteriaTest, EmptyRowsOfTheTableAreNotStockDocuments) {
  panel_.cmbDocType = 41;
  EXPECT_EQ(Build(true), std::string(kBase) + kCashIn);
}

TEST_F(CriteriaTest, NotIssuedAlwaysTestsStockHeaders) {
  EXPECT_EQ(Build(false, true), std::string(kBase) + kNotIssued);
  panel_.cmbDocType = kCashReceiptsRow;
  EXPECT_EQ(Build(false, true), std::string(kBase) + kNotIssued);
}

TEST_F(CriteriaTest, DocumentTypeOutsideTheTableGivesError) {
  for (int row : {-1, 42, 1000}) {
    panel_.cmbDocType = row;
    EXPECT_EQ(Build(true), "Error") << row;
    // Without documents used the row is never looked up.
    EXPECT_EQ(Build(false, true), std::string(kBase) + kNotIssued) << row;
  }
}

TEST_F(CriteriaTest, LedgerCriterionRequiresTransactions) {
  panel_.chkTransType = 1;
  panel_.txtTransType = "12";
  EXPECT_EQ(Build(), std::string(kBase) + kLedger);
}

TEST_F(CriteriaTest, EveryStepInItsFixedOrder) {
  panel_.ChkCity = 1;
  panel_.TxtCity = "חי";
  panel_.ChkPhone = 1;
  panel_.txtPhone = "04";
  panel_.ChkSelectAccount = 1;
  panel_.cmbInAccounts = 1;
  panel_.ChkJournal = 1;
  panel_.txtFromJournal = "5";
  EXPECT_EQ(Build(true, true, kSelectDb), std::string(kBase) + " AND tAccount.City LIKE \"חי*\"" +
                                              " AND tAccount.Telephone LIKE \"04*\"" + kNotPicked +
                                              kStockJoin + kNotIssued + kLedger);
}

TEST(UseTransactionsTest, OffWhenNoBoxIsTicked) {
  Panel panel;  // the ledger dates have designed texts, but no box is ticked
  EXPECT_FALSE(UseTransactions(panel));
}

TEST(UseTransactionsTest, EachOfTheSevenPairsTurnsItOn) {
  struct Pair {
    int Panel::*check;
    std::string Panel::*text;
  };
  const Pair pairs[] = {
      {&Panel::ChkJournal, &Panel::txtFromJournal},
      {&Panel::ChkJournal, &Panel::txtToJournal},
      {&Panel::chkTransType, &Panel::txtTransType},
      {&Panel::chkTransDates, &Panel::txtFromTransDate},
      {&Panel::chkTransDates, &Panel::txtToTransDate},
      {&Panel::chkTransVDate, &Panel::txtFromTransVDate},
      {&Panel::chkTransVDate, &Panel::txtToTransVDate},
  };
  for (const Pair& pair : pairs) {
    Panel panel;
    panel.txtFromTransDate.clear();
    panel.txtToTransDate.clear();
    panel.txtFromTransVDate.clear();
    panel.txtToTransVDate.clear();
    panel.*pair.check = 1;
    EXPECT_FALSE(UseTransactions(panel)) << "ticked box with empty text";
    panel.*pair.text = "1";
    EXPECT_TRUE(UseTransactions(panel));
    panel.*pair.check = 2;
    EXPECT_FALSE(UseTransactions(panel)) << "greyed box counts as off";
  }
}

TEST(UseTransactionsTest, TickedDateBoxWithDesignedDatesIsOn) {
  Panel panel;
  panel.chkTransVDate = 1;
  EXPECT_TRUE(UseTransactions(panel));
}

TEST(BuildDatesCriteriaTest, OnlyANegativeIndexGivesTheAlwaysTrueTest) {
  const Date from = Date::FromParts(2020, 1, 1);
  const Date to = Date::FromParts(2020, 12, 31);
  EXPECT_EQ(BuildDatesCriteria(from, to, -1), " AND (1 > 0)");
  EXPECT_EQ(BuildDatesCriteria(from, to, -300), " AND (1 > 0)");
  EXPECT_EQ(BuildDatesCriteria(from, to, 0), "");
  EXPECT_EQ(BuildDatesCriteria(to, from, 41), "");
}

}  // namespace
}  // namespace zdr
