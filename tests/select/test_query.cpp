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
  const CriteriaCase cases[] = {
      {"none", [](Panel&) {}, false, false, true, ""},
      {"greyed boxes", [](Panel& p) { p.ChkCity = p.ChkSelectAccount = 2, p.TxtCity = "חי"; },
       false, false, true, ""},
      {"picker never opened", [](Panel& p) { p.ChkSelectAccount = 1; }, false, false, false, ""},
      {"picked", [](Panel& p) { p.ChkSelectAccount = 1, p.cmbInAccounts = 2; }, false, false, true,
       kPicked},
      {"not picked", [](Panel& p) { p.ChkSelectAccount = 1, p.cmbInAccounts = 1; }, false, false,
       true, kNotPicked},
      {"empty row", [](Panel& p) { p.cmbDocType = 41; }, true, false, false, kCashIn},
      {"row not looked up", [](Panel& p) { p.cmbDocType = 42; }, false, true, false, kNotIssued},
      {"row out of range", [](Panel& p) { p.cmbDocType = -1; }, true, false, false, "Error"},
      {"all",
       [](Panel& p) {
         p.ChkCity = p.ChkPhone = p.ChkSelectAccount = p.cmbInAccounts = p.ChkJournal = 1;
         p.TxtCity = "חי", p.txtPhone = "04", p.txtFromJournal = "5";
       },
       true, true, true,
       " AND tAccount.City LIKE \"חי*\" AND tAccount.Telephone LIKE \"04*\"" +
           std::string(kNotPicked) + kStockJoin + kNotIssued + kLedger},
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
  using P = Panel;
  const std::pair<int P::*, std::string P::*> pairs[] = {
      {&P::ChkJournal, &P::txtFromJournal},    {&P::ChkJournal, &P::txtToJournal},
      {&P::chkTransType, &P::txtTransType},    {&P::chkTransDates, &P::txtFromTransDate},
      {&P::chkTransDates, &P::txtToTransDate}, {&P::chkTransVDate, &P::txtFromTransVDate},
      {&P::chkTransVDate, &P::txtToTransVDate}};
  EXPECT_FALSE(UseTransactions(Panel()));  // designed dates, no box ticked
  for (const auto& [check, text] : pairs) {
    Panel panel;
    for (const auto& pair : pairs) (panel.*pair.second).clear();
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

// The address comes from the document header only for stock documents (not cash receipts),
// with documents used, on entry 0 of the address list; an unknown document row is refused.
TEST(SelectTest, AddressFromTheHeaderOnlyForStockDocumentsOnEntryZero) {
  const std::tuple<int, int, int, bool> cases[] = {
      // dates, document row, address entry
      {0, 13, 0, false},  {1, 13, 0, true},  {1, 13, 1, false},
      {1, 13, -1, false}, {2, 13, 0, false}, {1, kCashReceiptsRow, 0, false}};
  for (const auto& [dates, docType, addressFrom, expected] : cases) {
    Panel panel;
    panel.ChkDates = dates, panel.cmbDocType = docType, panel.cmbAddressFrom = addressFrom;
    EXPECT_EQ(AddressFromDocumentHeader(panel, DocTypeTable()), expected) << docType << addressFrom;
  }
  for (int row : {-1, 42}) {
    Panel panel;
    panel.cmbDocType = row;
    EXPECT_THROW(BuildRecipientsStatement(panel, DocTypeTable(), ""), std::out_of_range);
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
