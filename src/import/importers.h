// The importers: each reads one kind of host record file of a company and appends the rows
// that pass the panel's criteria to its table of a database file created beforehand.
//
// Contract shared by all of them:
// - `CompPath` is the company folder (no trailing separator); host file names are looked up
//   in it without regard to case. Host files are only read.
// - `pDBFile` is the path of an existing database holding the target table (the working
//   database, or the account-selection database for ReadACT with pAllDetails false). Rows are
//   appended through one prepared statement inside one transaction; rows appended before a
//   failure stay.
// - A failure is shown through `ui` (its text, title and icon are each importer's own) and the
//   importer returns normally, saying so in its result; only ReadAllTempTrans lets errors of
//   its own steps escape. Callers decide from the result, never from the message shown.
// - A second row with a key already in the table is passed over silently.
// - Progress goes to `ui.SetProgress`, 0 at the start and at the end.
// - Parameters in one order: the host routine's own (company folder, database, then the
//   rest), the as-is flag, the panel, the document-type table, and last the seam.
#pragma once

#include <cstdint>
#include <string>

#include "common/panel.h"
#include "common/userseam.h"
#include "hostfile/doctypes.h"

namespace zdr {

// Titles of the importers' messages.
inline constexpr std::string_view kTitleAccountsFault = "תקלה בקריאת החשבונות";
// Shown by ReadStock when the document file of the chosen type is missing.
inline constexpr std::string_view kMsgNoDocumentFiles = "קבצי מסמכים לא נמצאו";

// Accounts from ACT.fix into tAccount (pAllDetails: every column) or tSelectAccount (key, sort
// key, sort name, Include), applying the agent, account-key, sort-code and cut-off criteria.
// pAsIs chooses the display conversion of the key. With the cut-off criterion on, an empty
// CutOff box of `panel` is set to one space. Returns true when the file was read to its end,
// false after showing a failure (title kTitleAccountsFault, critical icon).
bool ReadACT(const std::string& CompPath, const std::string& pDBFile, bool pAllDetails, bool pAsIs,
             Panel& panel, UserSeam& ui);

// Items of the panel's item ranges from ITM.fix into tItem, then marks tStockHead.Include True
// for exactly the headers with a line of such an item. Returns true when both were done,
// false after showing a failure (information icon, "תקלה").
bool ReadItem(const std::string& CompPath, const std::string& pDBFile, const Panel& panel,
              UserSeam& ui);

// Documents of row `pDocTypeIndex` of `docTypes` dated pFromDate..pToDate (texts as typed; one
// shorter than 6 characters is no bound) and numbered txtFromRef..txtToRef into tStockHead, and
// their lines into tStockLine when pWithLines. A header is written only when its document has
// an accepted line. Returns 0 when the file is missing (kMsgNoDocumentFiles, critical, "שגיאה")
// or a failure stopped the scan (its text, critical, "שגיאה"); else the scan's record counter
// at its end, which is greater than the file's record count.
int32_t ReadStock(int16_t pCompID, const std::string& pCompPath, const std::string& pFromDate,
                  const std::string& pToDate, const std::string& pDBFile, uint8_t pDocTypeIndex,
                  bool pWithLines, bool pAsIs, const Panel& panel, const DocTypeTable& docTypes,
                  UserSeam& ui);

// Ledger transactions of amv.fix that pass the journal range, the type pattern and both date
// ranges into tTransact with FileID -1, one row per account entry. Returns -1 when the file was
// read to its end, 0 after showing a failure (information icon, "תקלה").
//
// The account keys of the receipt, ledger and batch imports are converted as the account
// import of the same load converts its keys (`pAsIs`), so that they match tAccount's: with
// the as-is flag off a key of digits stays in stored order on both sides. The default, on,
// reverses the key and mirrors its brackets.
int16_t ReadTransactions(const std::string& CompPath, const std::string& pDBFile, bool pAsIs,
                         const Panel& panel, UserSeam& ui);

// Lists the company's temporary batches (a<number>.tmp, any case) and reads each whose number
// is not 0 and lies in the panel's journal range as ReadTempTransactions does. Names whose
// middle is not a number, or a number outside the 16-bit range, and folders are passed over;
// a FIFO or device under a batch's name is reported as an unreadable batch. Returns the number
// of batches that failed (each shown as ReadTempTransactions shows it). Throws what it does
// not handle itself: a journal bound that is not a 16-bit whole number.
int ReadAllTempTrans(const std::string& CompPath, const std::string& pDBFile, bool pAsIs,
                     const Panel& panel, UserSeam& ui);

// Transactions of batch `pJournalNo` (the file a<pJournalNo>.tmp) that pass the type pattern
// and both date ranges into tTransact with FileID pJournalNo. Returns -1 / 0 as
// ReadTransactions, with the same failure message.
int16_t ReadTempTransactions(const std::string& CompPath, const std::string& pDBFile,
                             int16_t pJournalNo, bool pAsIs, const Panel& panel, UserSeam& ui);
// The same for the batch file `pFileName` (a name in CompPath, as the listing found it, looked
// up without regard to case), whose rows carry `pJournalNo`.
int16_t ReadTempTransactions(const std::string& CompPath, const std::string& pDBFile,
                             int16_t pJournalNo, const std::string& pFileName, bool pAsIs,
                             const Panel& panel, UserSeam& ui);

// Cash receipts of icash2.fix dated within the panel's document dates (when ChkDates is on;
// any non-empty date text is a bound) into tCash. Returns -1 / 0 as ReadTransactions.
int16_t ReadCash(const std::string& CompPath, const std::string& pDBFile, bool pAsIs,
                 const Panel& panel, UserSeam& ui);

}  // namespace zdr
