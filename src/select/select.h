// The statement that picks and orders the recipients: BuildSelect + BuildCriteria +
// BuildOrderBy over the working database.
#pragma once

#include <string>

#include "common/panel.h"
#include "common/value.h"
#include "hostfile/doctypes.h"

namespace zdr {

// True when a ledger criterion is on: a ticked box with a non-empty text box among the
// journal range, the type, the transaction dates and the value dates.
bool UseTransactions(const Panel& panel);

// The WHERE clause, starting " Where (1 > 0)". Returns "Error" when the document-type row
// cannot be read. `selectDbPath` is the account-selection database path (empty until the
// account picker has been opened). The city and telephone prefixes go into double-quoted
// LIKE literals as typed, a typed double quote doubled, with "*" appended.
std::string BuildCriteria(const Panel& panel, const DocTypeTable& docTypes,
                          const std::string& selectDbPath, bool pUseDocs, bool pNotIssued);

// " AND (1 > 0)" when `pDocIndex` is negative, else an empty string; the dates are ignored.
std::string BuildDatesCriteria(Date pFromDate, Date pToDate, int16_t pDocIndex);

// The column list and FROM clause. `pDocIndex` is not used: the document type and the
// address source are read from the panel. Resets `pUseDocs` to false when the chosen document
// type is not a stock document. Throws std::out_of_range for a document type outside 0..41.
std::string BuildSelect(const Panel& panel, const DocTypeTable& docTypes, int16_t pDocIndex,
                        bool& pUseDocs);

// The ORDER BY clause, with the same reset of `pUseDocs` and the same exception.
std::string BuildOrderBy(const Panel& panel, const DocTypeTable& docTypes, bool& pUseDocs);

// True when the recipients' name and address come from the document header: documents are
// used (ChkDates on, cmbByDoc "issued"), the type is a stock document and cmbAddressFrom is on
// the header. Such rows carry no zip. Throws std::out_of_range like BuildSelect.
bool AddressFromDocumentHeader(const Panel& panel, const DocTypeTable& docTypes);

// The whole statement as every output builds it: pUseDocs and pNotIssued computed from
// ChkDates and cmbByDoc before each of the three calls. Throws std::out_of_range like
// BuildSelect.
std::string BuildRecipientsStatement(const Panel& panel, const DocTypeTable& docTypes,
                                     const std::string& selectDbPath);

}  // namespace zdr
