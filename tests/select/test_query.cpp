// The recipients statement as text: the WHERE clause, the column list and how the outputs
// assemble the pieces. What the statement selects, and in which order, is checked on real
// rows in test_selection_rows.

#include <gtest/gtest.h>

#include <functional>
#include <stdexcept>
#include <string>
#include <tuple>

#include "engine/jetsql.h"
#include "hostfile/doctypes.h"
#include "select/select.h"
#include "support/statements.h"

namespace zdr {
namespace {

using namespace test;  // the statement pieces

const std::string kSelectDb = "/tmp/zdracc.DB";

struct CriteriaCase {
  const char* name;
  std::function<void(Panel&)> set;
  bool useDocs, notIssued, pickerOpened;
  std::string expected;  // after " Where (1 > 0)"; "Error" for the whole clause
};

TEST(CriteriaTest, EachCriterionInItsFixedPlace) {
  const std::string cityPhone =
      " AND tAccount.City LIKE \"חי*\" AND tAccount.Telephone LIKE \"04*\"";
  const CriteriaCase cases[] = {
      {"none", [](Panel&) {}, false, false, true, ""},
      {"prefixes as typed",
       [](Panel& p) { p.ChkCity = p.ChkPhone = 1, p.TxtCity = "חי", p.txtPhone = "04"; }, false,
       false, false, cityPhone},
      {"greyed boxes", [](Panel& p) { p.ChkCity = p.ChkSelectAccount = 2, p.TxtCity = "חי"; },
       false, false, true, ""},
      {"picker never opened", [](Panel& p) { p.ChkSelectAccount = 1; }, false, false, false, ""},
      {"picked", [](Panel& p) { p.ChkSelectAccount = 1, p.cmbInAccounts = 2; }, false, false, true,
       kPicked},
      {"not picked", [](Panel& p) { p.ChkSelectAccount = 1, p.cmbInAccounts = 1; }, false, false,
       true, kNotPicked},
      {"issued stock", [](Panel& p) { p.cmbDocType = 27; }, true, false, false, kStockJoin},
      {"issued receipts", [](Panel& p) { p.cmbDocType = kCashReceiptsRow; }, true, false, false,
       kCashIn},
      {"empty row", [](Panel& p) { p.cmbDocType = 41; }, true, false, false, kCashIn},
      {"not issued receipts", [](Panel& p) { p.cmbDocType = kCashReceiptsRow; }, false, true, false,
       kNotIssued},
      {"row not looked up", [](Panel& p) { p.cmbDocType = 42; }, false, true, false, kNotIssued},
      {"row out of range", [](Panel& p) { p.cmbDocType = -1; }, true, false, false, "Error"},
      {"ledger", [](Panel& p) { p.chkTransType = 1, p.txtTransType = "12"; }, false, false, false,
       kLedger},
      {"all",
       [](Panel& p) {
         p.ChkCity = p.ChkPhone = p.ChkSelectAccount = p.cmbInAccounts = p.ChkJournal = 1;
         p.TxtCity = "חי", p.txtPhone = "04", p.txtFromJournal = "5";
       },
       true, true, true, cityPhone + kNotPicked + kStockJoin + kNotIssued + kLedger},
  };
  const DocTypeTable docTypes;
  for (const CriteriaCase& c : cases) {
    Panel panel;
    c.set(panel);
    const std::string where =
        BuildCriteria(panel, docTypes, c.pickerOpened ? kSelectDb : "", c.useDocs, c.notIssued);
    EXPECT_EQ(where, c.expected == "Error" ? c.expected : kWhere + c.expected) << c.name;
  }
}

// A typed double quote ended the LIKE literal early, letting the rest of the box into the
// statement. It is doubled now, and the database sees the typed text as one literal.
TEST(CriteriaTest, DoubleQuoteInCityOrPhoneEndedLiteralEarly) {
  Panel panel;
  panel.ChkCity = panel.ChkPhone = 1;
  panel.TxtCity = "x\" OR 1=1 OR \"";
  panel.txtPhone = "\"04";
  const std::string where = BuildCriteria(panel, DocTypeTable(), "", false, false);
  EXPECT_EQ(where, std::string(kWhere) + " AND tAccount.City LIKE \"x\"\" OR 1=1 OR \"\"*\"" +
                       " AND tAccount.Telephone LIKE \"\"\"04*\"");
  const std::string sql = db::TranslateJetSql("SELECT AccountKey FROM tAccount" + where);
  EXPECT_NE(sql.find("LIKE 'x\" OR 1=1 OR \"*'"), std::string::npos) << sql;
}

TEST(CriteriaTest, EachLedgerBoxNeedsItsTextAndATick) {
  using Text = std::string Panel::*;
  const std::pair<int Panel::*, Text> pairs[] = {
      {&Panel::ChkJournal, &Panel::txtFromJournal},
      {&Panel::ChkJournal, &Panel::txtToJournal},
      {&Panel::chkTransType, &Panel::txtTransType},
      {&Panel::chkTransDates, &Panel::txtFromTransDate},
      {&Panel::chkTransDates, &Panel::txtToTransDate},
      {&Panel::chkTransVDate, &Panel::txtFromTransVDate},
      {&Panel::chkTransVDate, &Panel::txtToTransVDate},
  };
  EXPECT_FALSE(UseTransactions(Panel()));  // designed dates, no box ticked
  for (const auto& [check, text] : pairs) {
    Panel panel;
    for (Text t : {&Panel::txtFromTransDate, &Panel::txtToTransDate, &Panel::txtFromTransVDate,
                   &Panel::txtToTransVDate}) {
      (panel.*t).clear();
    }
    panel.*check = 1;
    EXPECT_FALSE(UseTransactions(panel)) << "ticked box, empty text";
    panel.*text = "1";
    EXPECT_TRUE(UseTransactions(panel));
    panel.*check = 2;
    EXPECT_FALSE(UseTransactions(panel)) << "greyed box";
  }
  EXPECT_EQ(BuildDatesCriteria(Date(), Date(), -1), " AND (1 > 0)");
  EXPECT_EQ(BuildDatesCriteria(Date(), Date(), 0), "");
}

TEST(SelectTest, ColumnsFromTheHeaderOnlyForIssuedStockDocumentsAddressedFromIt) {
  const DocTypeTable docTypes;
  struct Case {
    int docType, addressFrom;
    bool useDocs;
    std::string expected;
    bool useDocsAfter;
  };
  const std::string accounts = std::string(kAccountColumns) + " FROM tAccount";
  const Case cases[] = {
      {0, 0, false, accounts, false},
      {13, 0, true, std::string(kDocumentColumns) + " FROM tAccount, tStockHead", true},
      {0, 1, true, accounts + ", tStockHead", true},  // the join, for the WHERE clause
      {0, -1, true, accounts + ", tStockHead", true},
      {kCashReceiptsRow, 0, true, accounts, false},  // no header to address from
  };
  for (const Case& c : cases) {
    Panel panel;
    panel.cmbDocType = c.docType;
    panel.cmbAddressFrom = c.addressFrom;
    bool useDocs = c.useDocs;
    EXPECT_EQ(BuildSelect(panel, docTypes, kCashReceiptsRow, useDocs), c.expected) << c.docType;
    EXPECT_EQ(useDocs, c.useDocsAfter) << c.docType;
    useDocs = c.useDocs;
    BuildOrderBy(panel, docTypes, useDocs);
    EXPECT_EQ(useDocs, c.useDocsAfter) << c.docType;
    panel.ChkDates = c.useDocs ? 1 : 0;
    EXPECT_EQ(AddressFromDocumentHeader(panel, docTypes), c.useDocsAfter && c.addressFrom == 0);
  }
  for (int row : {-1, 42}) {
    Panel panel;
    panel.cmbDocType = row;
    bool useDocs = false;
    EXPECT_THROW(BuildSelect(panel, docTypes, 0, useDocs), std::out_of_range);
    EXPECT_THROW(BuildOrderBy(panel, docTypes, useDocs), std::out_of_range);
    EXPECT_THROW(BuildRecipientsStatement(panel, docTypes, ""), std::out_of_range);
  }
}

// Each piece gets pUseDocs afresh, so the cash-receipt reset in the column list does not take
// the tCash test out of the WHERE clause; greyed documents ignore the by-document choice.
TEST(StatementTest, PiecesInOrderWithUseDocsComputedForEach) {
  const std::tuple<int, int, int, const char*> cases[] = {
      {1, 0, kCashReceiptsRow, kCashIn}, {1, 1, 13, kNotIssued}, {2, 1, 13, ""}};
  for (const auto& [dates, byDoc, docType, criterion] : cases) {
    Panel panel;
    panel.ChkDates = dates, panel.cmbByDoc = byDoc, panel.cmbDocType = docType;
    EXPECT_EQ(BuildRecipientsStatement(panel, DocTypeTable(), ""),
              std::string(kAccountColumns) + " FROM tAccount" + kWhere + criterion +
                  " ORDER BY tAccount.SortByKey ASC")
        << dates << " " << byDoc;
  }
}

}  // namespace
}  // namespace zdr
