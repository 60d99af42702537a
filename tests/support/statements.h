// The pieces of the recipients statement as the outputs read them, for the tests that send
// the statement to a database without building it, and for the builder's own tests.
#pragma once

namespace zdr::test {

// The column list with names and addresses from the account card.
inline constexpr const char* kAccountColumns =
    "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey, tAccount.AccountName, "
    "tAccount.Address, tAccount.City, tAccount.Zip, 1000 As Reference1, '0' As DetailsLine1, "
    "tAccount.District, tAccount.Details, tAccount.Telephone, tAccount.SortByKey, "
    "tAccount.SortByKeyVal, tAccount.SortByName, tAccount.SortByCity, tAccount.SortByZip";

// The WHERE clause with no criterion, and each criterion it may gain.
inline constexpr const char* kWhere = " Where (1 > 0)";
inline constexpr const char* kPicked =
    " AND tAccount.SortByKey In (Select SA.SortByKey From tSelectAccount SA Where SA.Include)";
inline constexpr const char* kNotPicked =
    " AND tAccount.SortByKey Not In (Select SA.SortByKey From tSelectAccount SA Where "
    "SA.Include)";
inline constexpr const char* kStockJoin =
    " AND tStockHead.Include AND tAccount.AccountKey = tStockHead.AccountKey";
inline constexpr const char* kCashIn =
    " AND tAccount.AccountKey In (Select Distinct AccountKey From tCash)";
inline constexpr const char* kNotIssued =
    " AND tAccount.AccountKey Not In (Select Distinct AccountKey From tStockHead Where "
    "tStockHead.Include)";
inline constexpr const char* kLedger =
    " AND tAccount.AccountKey In (Select Distinct AccountKey From tTransact)";

// qHeadByItem's marking of the headers that have a chosen item, as the data load sends it.
inline constexpr const char* kClearHeaders = "UPDATE tStockHead SET tStockHead.Include = False";
inline constexpr const char* kMarkHeadersByItem =
    "UPDATE DISTINCTROW tStockHead INNER JOIN qHeadByItem ON (tStockHead.CompID = "
    "qHeadByItem.CompID) AND (tStockHead.TavFileID = qHeadByItem.TavFileID) AND "
    "(tStockHead.HeadIndx = qHeadByItem.HeadIndx) SET tStockHead.Include = True";

}  // namespace zdr::test
