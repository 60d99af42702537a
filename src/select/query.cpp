// The column list, FROM clause and ORDER BY clause of the recipients statement, and the
// statement as a whole.

#include <string>

#include "select/select.h"

namespace zdr {

namespace {

// Documents are used only for stock documents: the cash receipts have no header to take
// a name or an address from. Throws std::out_of_range for a row outside the table.
void ResetUseDocsForDocType(const Panel& panel, const DocTypeTable& docTypes, bool& pUseDocs) {
  if (!docTypes.Row(panel.cmbDocType).IsStockDoc) pUseDocs = false;
}

// The address comes from the document header only on entry 0 of cmbAddressFrom.
bool AddressFromDocument(const Panel& panel) {
  return panel.cmbAddressFrom == 0;
}

}  // namespace

std::string BuildSelect(const Panel& panel, const DocTypeTable& docTypes,
                        [[maybe_unused]] int16_t pDocIndex, bool& pUseDocs) {
  ResetUseDocsForDocType(panel, docTypes, pUseDocs);

  std::string sql = "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey";
  if (pUseDocs && AddressFromDocument(panel)) {
    sql +=
        ", tStockHead.CustomerName As AccountName"
        ", tStockHead.Address1 As Address"
        ", tStockHead.Address2 As City"
        ", '' As Zip"
        ", tStockHead.Reference1"
        ", tStockHead.DetailsLine1"
        ", tAccount.District"
        ", tAccount.Details"
        ", tAccount.Telephone"
        ", tAccount.SortByKey, tAccount.SortByKeyVal"
        ", tStockHead.SortByName"
        ", tStockHead.SortByCity, tStockHead.SortByZip";
  } else {
    sql +=
        ", tAccount.AccountName"
        ", tAccount.Address, tAccount.City, tAccount.Zip"
        ", 1000 As Reference1"
        ", '0' As DetailsLine1"
        ", tAccount.District"
        ", tAccount.Details"
        ", tAccount.Telephone"
        ", tAccount.SortByKey, tAccount.SortByKeyVal"
        ", tAccount.SortByName"
        ", tAccount.SortByCity, tAccount.SortByZip";
  }
  // With documents used, tStockHead is joined even when the address comes from the
  // account card; the WHERE clause holds the join condition.
  sql += " FROM tAccount";
  if (pUseDocs) sql += ", tStockHead";
  return sql;
}

std::string BuildOrderBy(const Panel& panel, const DocTypeTable& docTypes, bool& pUseDocs) {
  const bool fromDocument = AddressFromDocument(panel);
  ResetUseDocsForDocType(panel, docTypes, pUseDocs);
  const bool docCase = pUseDocs && fromDocument;

  const char* first = nullptr;
  const char* second = "";
  switch (panel.CmbSortBy) {
    case 0:
      first = "tAccount.SortByKey";
      break;
    case 1:
      first = docCase ? "tStockHead.SortByName" : "tAccount.SortByName";
      break;
    case 2:
      first = docCase ? "tStockHead.SortByCity" : "tAccount.SortByCity";
      second = docCase ? ", tStockHead.SortByName" : ", tAccount.SortByName";
      break;
    case 3:
      first = docCase ? "tStockHead.SortByZip" : "tAccount.SortByZip";
      second = docCase ? ", tStockHead.SortByName" : ", tAccount.SortByName";
      break;
    // Telephone, sort code and document number write the document-case second column
    // without a blank after the comma; the statement means the same either way.
    case 4:
      first = "tAccount.Telephone";
      second = docCase ? ",tStockHead.SortByName" : ", tAccount.SortByName";
      break;
    case 5:
      first = "tAccount.CategoryCode";
      second = docCase ? ",tStockHead.SortByName" : ", tAccount.SortByName";
      break;
    case 6:
      first = "tAccount.SortByKeyVal";
      break;
    case 7:
      first = docCase ? "tStockHead.Reference1" : "tAccount.CategoryCode";
      second = docCase ? ",tStockHead.SortByName" : ", tAccount.SortByName";
      break;
    default:
      first = docCase ? "tStockHead.SortByName" : "tAccount.SortByName";
      break;
  }

  const char* direction = "";
  if (panel.CmbSortDir == 0) {
    direction = "ASC";
  } else if (panel.CmbSortDir == 1) {
    direction = "DESC";
  }

  // The direction applies to the first column only; the second always runs ascending.
  std::string orderBy = " ORDER BY ";
  orderBy += first;
  orderBy += ' ';
  orderBy += direction;
  orderBy += second;
  return orderBy;
}

bool AddressFromDocumentHeader(const Panel& panel, const DocTypeTable& docTypes) {
  bool useDocs = Panel::On(panel.ChkDates) && panel.cmbByDoc == 0;
  ResetUseDocsForDocType(panel, docTypes, useDocs);
  return useDocs && AddressFromDocument(panel);
}

std::string BuildRecipientsStatement(const Panel& panel, const DocTypeTable& docTypes,
                                     const std::string& selectDbPath) {
  const bool documentsOn = Panel::On(panel.ChkDates);
  // Each piece may reset its own copy; the reset must not carry over to the next piece.
  const auto useDocs = [&] { return documentsOn && panel.cmbByDoc == 0; };
  const bool notIssued = documentsOn && panel.cmbByDoc == 1;

  bool pUseDocs = useDocs();
  std::string sql = BuildSelect(panel, docTypes, static_cast<int16_t>(panel.cmbDocType), pUseDocs);
  pUseDocs = useDocs();
  sql += BuildCriteria(panel, docTypes, selectDbPath, pUseDocs, notIssued);
  pUseDocs = useDocs();
  sql += BuildOrderBy(panel, docTypes, pUseDocs);
  return sql;
}

}  // namespace zdr
