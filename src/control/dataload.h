// The data load every output command runs first: a fresh working database, the accounts, and
// the other host data the panel's criteria need.
#pragma once

#include "common/panel.h"
#include "common/userseam.h"
#include "control/control.h"
#include "hostfile/doctypes.h"

namespace zdr {

// Status messages of the load, in the order they can appear.
inline constexpr std::string_view kStatusInitDb = "מאתחל בסיס נתונים";
inline constexpr std::string_view kStatusAccounts = "קורא רשימת כרטיסים";
inline constexpr std::string_view kStatusCash = "קורא תנועות קופה...";
inline constexpr std::string_view kStatusDocuments = "קורא מסמכים...";
inline constexpr std::string_view kStatusItems = "קורא פריטים...";
inline constexpr std::string_view kStatusLedger = "קורא תנועות הנהלת חשבונות...";
inline constexpr std::string_view kStatusBatches = "קורא מנות ממאגר זמני...";
inline constexpr std::string_view kStatusLoaded = "קריאת הנתונים הסתיימה";

// Recreates the working database (its path, empty when creation failed, goes to
// state.workDbPath) and imports into it. When the creation fails, its message is the only
// one: nothing is imported, since every importer would only report the missing database; so
// is the message of a failed step after which the database no longer opens (a full disk).
// Otherwise it imports the accounts always; with ChkDates on, the cash
// receipts (document type 26) or the documents of the chosen type and, with ChkByItems on,
// the items; with a ledger criterion on, the ledger and, with chkReadTempTrans on, the
// temporary batches. pAsIs goes to the account and document imports. The importers report
// their own failures and the load goes on, counting them in the result; an error of the
// ledger-criteria test or of the batch listing (a journal bound that is not a number) ends the load
// and is thrown to the caller. The panel may change: ReadACT writes a space into an empty CutOff
// box.
LoadResult ReadAllData(bool pAsIs, Panel& panel, ControlState& state, const DocTypeTable& docTypes,
                       UserSeam& ui);

}  // namespace zdr
