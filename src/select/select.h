// The statement that picks and orders the recipients: BuildSelect + BuildCriteria +
// BuildOrderBy over the working database.
#pragma once

#include <string>

#include "control/panel.h"
#include "import/doctypes.h"
#include "workdb/value.h"

namespace zdr {

// True when a ledger criterion is on: a ticked box with a non-empty text box among the
// journal range, the type, the transaction dates and the value dates.
bool UseTransactions(const Panel& panel);

// The WHERE clause, starting " Where (1 > 0)". Returns "Error" when the document-type row
// cannot be read. `selectDbPath` is the account-selection database path (empty until the
// account picker has been opened).
std::string BuildCriteria(const Panel& panel, const DocTypeTable& docTypes,
                          const std::string& selectDbPath, bool pUseDocs, bool pNotIssued);

std::string BuildDatesCriteria(Date pFromDate, Date pToDate, int16_t pDocIndex);

// The column list and FROM clause. Resets `pUseDocs` to false when the chosen document
// type is not a stock document. Throws std::out_of_range for a document type outside 0..41.
std::string BuildSelect(const Panel& panel, const DocTypeTable& docTypes, int16_t pDocIndex,
                        bool& pUseDocs);

// The ORDER BY clause, with the same reset of `pUseDocs`.
std::string BuildOrderBy(const Panel& panel, const DocTypeTable& docTypes, bool& pUseDocs);

// The whole statement as every output builds it: pUseDocs and pNotIssued computed from
// ChkDates and cmbByDoc before each of the three calls.
std::string BuildRecipientsStatement(const Panel& panel, const DocTypeTable& docTypes,
                                     const std::string& selectDbPath);

}  // namespace zdr
