// The WHERE clause of the recipients statement. Only the criteria decided at query time
// appear here; the ranges were already applied while the working database was filled.

#include <exception>
#include <string>
#include <string_view>

#include "select/select.h"

namespace zdr {

namespace {

// The text of a prefix box as the body of a double-quoted LIKE literal, with the wildcard
// that makes it a prefix test. A double quote typed in the box is doubled, so the literal
// holds the text as typed instead of ending early and letting the rest into the statement.
void AppendPrefixLiteral(std::string& out, std::string_view typed) {
  out += '"';
  for (char c : typed) {
    if (c == '"') out += '"';
    out += c;
  }
  out += "*\"";
}

}  // namespace

bool UseTransactions(const Panel& panel) {
  const auto filled = [](int check, const std::string& text) {
    return Panel::On(check) && !text.empty();
  };
  return filled(panel.ChkJournal, panel.txtFromJournal) ||
         filled(panel.ChkJournal, panel.txtToJournal) ||
         filled(panel.chkTransType, panel.txtTransType) ||
         filled(panel.chkTransDates, panel.txtFromTransDate) ||
         filled(panel.chkTransDates, panel.txtToTransDate) ||
         filled(panel.chkTransVDate, panel.txtFromTransVDate) ||
         filled(panel.chkTransVDate, panel.txtToTransVDate);
}

std::string BuildCriteria(const Panel& panel, const DocTypeTable& docTypes,
                          const std::string& selectDbPath, bool pUseDocs, bool pNotIssued) {
  try {
    std::string where = " Where (1 > 0)";

    if (Panel::On(panel.ChkCity)) {
      where += " AND tAccount.City LIKE ";
      AppendPrefixLiteral(where, panel.TxtCity);
    }
    if (Panel::On(panel.ChkPhone)) {
      where += " AND tAccount.Telephone LIKE ";
      AppendPrefixLiteral(where, panel.txtPhone);
    }
    // The hand-picked accounts are matched on the sort key, not on the account key.
    if (Panel::On(panel.ChkSelectAccount) && !selectDbPath.empty()) {
      where += " AND tAccount.SortByKey";
      if (panel.cmbInAccounts == 1) where += " Not";
      where += " In (Select SA.SortByKey From tSelectAccount SA Where SA.Include)";
    }
    if (pUseDocs) {
      if (docTypes.Row(panel.cmbDocType).IsStockDoc) {
        where += " AND tStockHead.Include AND tAccount.AccountKey = tStockHead.AccountKey";
      } else {
        where += " AND tAccount.AccountKey In (Select Distinct AccountKey From tCash)";
      }
    }
    // Written whatever the document type: it always tests the stock documents.
    if (pNotIssued) {
      where +=
          " AND tAccount.AccountKey Not In (Select Distinct AccountKey"
          " From tStockHead Where tStockHead.Include)";
    }
    if (UseTransactions(panel)) {
      where += " AND tAccount.AccountKey In (Select Distinct AccountKey From tTransact)";
    }
    return where;
  } catch (const std::exception&) {
    // The caller appends this to its statement, so the database refuses it when it is
    // opened and the output command reports the failure.
    return "Error";
  }
}

std::string BuildDatesCriteria([[maybe_unused]] Date pFromDate, [[maybe_unused]] Date pToDate,
                               int16_t pDocIndex) {
  return pDocIndex < 0 ? " AND (1 > 0)" : "";
}

}  // namespace zdr
