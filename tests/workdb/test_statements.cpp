// The statements the system runs, on real databases made by CreateWorkDB and CreateSelectDB
// and filled with Hebrew and Latin rows: the rows that come back, their order, the marks
// the updates leave, and the rows the fields and indexes refuse.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <initializer_list>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "workdb/schema.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;
using db::Value;

class SilentSeam : public UserSeam {
 public:
  void ShowMessage(std::string_view text, std::string_view, MsgIcon) override {
    ADD_FAILURE() << "unexpected message: " << text;
  }
  bool AskYesNo(std::string_view, std::string_view, MsgIcon) override { return false; }
  void SetStatus(std::string_view) override {}
  void SetProgress(int) override {}
  bool OpenInBrowser(const std::string&) override { return true; }
  bool OpenInSpreadsheet(const std::string&) override { return true; }
};

using Row = std::vector<std::pair<const char*, Value>>;

void Insert(db::Database& d, const std::string& table, const Row& row) {
  db::TableRecordset rs = d.OpenTable(table);
  rs.AddNew();
  for (const auto& [name, value] : row) rs.Set(name, value);
  rs.Update();
  rs.Close();
}

// The number of the engine error that inserting `row` raises, or 0.
int InsertError(db::Database& d, const std::string& table, const Row& row) {
  try {
    Insert(d, table, row);
  } catch (const db::EngineError& e) {
    return e.number();
  }
  return 0;
}

std::string AsText(const Value& v) {
  if (db::IsNull(v)) return "NULL";
  if (const auto* s = std::get_if<std::string>(&v)) return *s;
  if (const auto* i = std::get_if<int64_t>(&v)) return std::to_string(*i);
  return std::to_string(std::get<double>(v));
}

// One column of every row of a statement, in order.
std::vector<std::string> Column(db::Database& d, const std::string& jet, const char* field) {
  std::vector<std::string> out;
  db::Snapshot rs = d.OpenSnapshot(jet);
  const int f = rs.FieldIndex(field);
  while (!rs.AtEnd()) {
    out.push_back(AsText(rs.Field(f)));
    rs.MoveNext();
  }
  return out;
}

using Keys = std::vector<std::string>;

Value T(const char* s) {
  return std::string(s);
}
Value I(int64_t v) {
  return v;
}
const Value kTrue = int64_t{-1};
const Value kFalse = int64_t{0};

// The statement builders' pieces, written out.
const char* const kDocColumns =
    "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey"
    ", tStockHead.CustomerName As AccountName, tStockHead.Address1 As Address"
    ", tStockHead.Address2 As City, '' As Zip, tStockHead.Reference1, tStockHead.DetailsLine1"
    ", tAccount.District, tAccount.Details, tAccount.Telephone"
    ", tAccount.SortByKey, tAccount.SortByKeyVal, tStockHead.SortByName"
    ", tStockHead.SortByCity, tStockHead.SortByZip";
const char* const kAccountColumns =
    "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey, tAccount.AccountName"
    ", tAccount.Address, tAccount.City, tAccount.Zip, 1000 As Reference1, '0' As DetailsLine1"
    ", tAccount.District, tAccount.Details, tAccount.Telephone"
    ", tAccount.SortByKey, tAccount.SortByKeyVal, tAccount.SortByName"
    ", tAccount.SortByCity, tAccount.SortByZip";
const char* const kWhere = " Where (1 > 0)";
const char* const kByKey = " ORDER BY tAccount.SortByKey ASC";

// Six accounts, four document headers, cash receipts, ledger lines and picker ticks, in a
// working database linked to its account-selection database.
class StatementTest : public ::testing::Test {
 protected:
  void SetUp() override {
    std::string pattern = (fs::temp_directory_path() / "zdr_stmt_XXXXXX").string();
    ASSERT_NE(mkdtemp(pattern.data()), nullptr);
    dir_ = pattern;
    oldTemp_ = std::getenv("Temp") ? std::optional<std::string>(std::getenv("Temp")) : std::nullopt;
    setenv("Temp", dir_.c_str(), 1);
    selectPath_ = CreateSelectDB(ui_);
    ASSERT_FALSE(selectPath_.empty());
    workPath_ = CreateWorkDB(selectPath_, ui_);
    ASSERT_FALSE(workPath_.empty());
    work_.emplace(db::Database::Open(workPath_));
    Fill();
  }
  void TearDown() override {
    work_.reset();
    if (oldTemp_) {
      setenv("Temp", oldTemp_->c_str(), 1);
    } else {
      unsetenv("Temp");
    }
    std::error_code ec;
    fs::remove_all(dir_, ec);
  }

  void Account(const char* key, const char* name, const char* cat, const char* city,
               const char* zip, const char* phone, double keyVal) {
    std::string sortKey = std::string(5 - std::string(key).size(), ' ') + key;
    Row row = {{"AccountKey", T(key)},  {"AccountName", T(name)}, {"CategoryCode", T(cat)},
               {"City", T(city)},       {"Zip", T(zip)},          {"Address", T("רחוב 1")},
               {"Include", kTrue},      {"SortByName", T(name)},  {"SortByKey", sortKey},
               {"SortByCity", T(city)}, {"SortByZip", T(zip)},    {"SortByKeyVal", keyVal}};
    if (phone) row.push_back({"Telephone", T(phone)});
    Insert(*work_, "tAccount", row);
    db::Database select = db::Database::Open(selectPath_);
    Insert(select, "tSelectAccount",
           {{"AccountKey", T(key)},
            {"SortByKey", sortKey},
            {"SortByName", T(name)},
            {"Include", keyVal == 100 || keyVal == 40 ? kTrue : kFalse}});
  }

  void Head(int file, int indx, const char* key, int ref, const char* name, bool include) {
    Insert(*work_, "tStockHead",
           {{"CompID", I(1)},
            {"TavFileID", I(file)},
            {"HeadIndx", I(indx)},
            {"DocType2", I(1)},
            {"Reference1", I(ref)},
            {"AccountKey", T(key)},
            {"CustomerName", T(name)},
            {"Address1", T("הרצל 1")},
            {"Address2", T("עכו")},
            {"DetailsLine1", T("פרטים")},
            {"SortByName", T(name)},
            {"SortByCity", T("עכו")},
            {"Include", include ? kTrue : kFalse}});
  }

  void Fill() {
    Account("100", "כהן משה", "1", "חיפה", "31000", "04-8123456", 100);
    Account("20", "לוי דוד", "2", "תל אביב", "61000", "03-5551234", 20);
    Account("3", "סמית ג'ון", "1", "חולון", "58000", "03-1234567", 3);
    Account("40", "אברהם", "3", "ירושלים", "91000", "02-6543210", 40);
    Account("5", "צבי", "2", "חיפה", "32000", nullptr, 5);
    Account("6", "ג'ון כהן", "3", "חדרה", "38000", "04-6666666", 6);
    Head(1, 1, "100", 5001, "כהן משה בע\"מ", true);
    Head(1, 2, "100", 5002, "אלון כהן", true);
    Head(1, 3, "20", 5003, "לוי", false);
    Head(2, 1, "40", 5004, "מלך", true);
    Insert(*work_, "tCash", {{"TransID", I(1)}, {"AccountKey", T("3")}});
    Insert(*work_, "tCash", {{"TransID", I(2)}, {"AccountKey", T("3")}});
    Insert(*work_, "tCash", {{"TransID", I(3)}, {"AccountKey", T("5")}});
    Insert(*work_, "tTransact", {{"FileID", I(-1)}, {"TransID", I(1)}, {"AccountKey", T("6")}});
    Insert(*work_, "tTransact", {{"FileID", I(7)}, {"TransID", I(2)}, {"AccountKey", T("20")}});
  }

  Keys AccountKeys(const std::string& jet) { return Column(*work_, jet, "AccountKey"); }

  fs::path dir_;
  std::optional<std::string> oldTemp_;
  SilentSeam ui_;
  std::string selectPath_, workPath_;
  std::optional<db::Database> work_;
};

// ---------------------------------------------------------------------------------------
// Criteria fragments on the account variant

TEST_F(StatementTest, EachCriterionPicksItsAccounts) {
  const std::string accounts = std::string(kAccountColumns) + " FROM tAccount" + kWhere;
  const std::string withHeads =
      std::string(kAccountColumns) + " FROM tAccount, tStockHead" + kWhere;
  EXPECT_EQ(AccountKeys(accounts + kByKey), (Keys{"3", "5", "6", "20", "40", "100"}));
  EXPECT_EQ(AccountKeys(accounts + " AND tAccount.City LIKE \"חי*\"" + kByKey), (Keys{"5", "100"}));
  EXPECT_EQ(AccountKeys(accounts + " AND tAccount.Telephone LIKE \"04*\"" + kByKey),
            (Keys{"6", "100"}));
  EXPECT_EQ(AccountKeys(accounts +
                        " AND tAccount.SortByKey In (Select SA.SortByKey From tSelectAccount SA "
                        "Where SA.Include)" +
                        kByKey),
            (Keys{"40", "100"}));
  EXPECT_EQ(AccountKeys(accounts +
                        " AND tAccount.SortByKey Not In (Select SA.SortByKey From tSelectAccount "
                        "SA Where SA.Include)" +
                        kByKey),
            (Keys{"3", "5", "6", "20"}));
  EXPECT_EQ(AccountKeys(withHeads +
                        " AND tStockHead.Include AND tAccount.AccountKey = tStockHead.AccountKey" +
                        kByKey),
            (Keys{"40", "100"}));
  EXPECT_EQ(
      AccountKeys(accounts + " AND tAccount.AccountKey In (Select Distinct AccountKey From tCash)" +
                  kByKey),
      (Keys{"3", "5"}));
  EXPECT_EQ(AccountKeys(accounts +
                        " AND tAccount.AccountKey Not In (Select Distinct AccountKey From "
                        "tStockHead Where tStockHead.Include)" +
                        kByKey),
            (Keys{"3", "5", "6", "20"}));
  EXPECT_EQ(AccountKeys(accounts +
                        " AND tAccount.AccountKey In (Select Distinct AccountKey From tTransact)" +
                        kByKey),
            (Keys{"6", "20"}));
}

TEST_F(StatementTest, CriteriaCombineWithAnd) {
  const std::string accounts = std::string(kAccountColumns) + " FROM tAccount" + kWhere;
  EXPECT_EQ(AccountKeys(accounts + " AND tAccount.City LIKE \"חי*\"" +
                        " AND tAccount.Telephone LIKE \"04*\"" + kByKey),
            (Keys{"100"}));
  // An empty prefix keeps every account that has a telephone.
  EXPECT_EQ(AccountKeys(accounts + " AND tAccount.Telephone LIKE \"*\"" + kByKey),
            (Keys{"3", "6", "20", "40", "100"}));
}

TEST_F(StatementTest, DocumentVariantGivesOneRowPerHeader) {
  const std::string jet = std::string(kDocColumns) + " FROM tAccount, tStockHead" + kWhere +
                          " AND tStockHead.Include AND tAccount.AccountKey = "
                          "tStockHead.AccountKey ORDER BY tStockHead.Reference1 DESC"
                          ",tStockHead.SortByName";
  EXPECT_EQ(Column(*work_, jet, "Reference1"), (Keys{"5004", "5002", "5001"}));
  EXPECT_EQ(Column(*work_, jet, "AccountName"), (Keys{"מלך", "אלון כהן", "כהן משה בע\"מ"}));
  EXPECT_EQ(Column(*work_, jet, "City"), (Keys{"עכו", "עכו", "עכו"}));
  EXPECT_EQ(Column(*work_, jet, "Zip"), (Keys{"", "", ""}));
  // The address from the account card: one row per account.
  const std::string card = std::string(kAccountColumns) + " FROM tAccount, tStockHead" + kWhere +
                           " AND tStockHead.Include AND tAccount.AccountKey = "
                           "tStockHead.AccountKey ORDER BY tAccount.SortByName ";
  EXPECT_EQ(Column(*work_, card, "AccountName"), (Keys{"אברהם", "כהן משה"}));
  EXPECT_EQ(Column(*work_, card, "Reference1"), (Keys{"1000", "1000"}));
  EXPECT_EQ(Column(*work_, card, "DetailsLine1"), (Keys{"0", "0"}));
}

TEST_F(StatementTest, ResultColumnsAreNamedAsTheOutputsReadThem) {
  const char* const names[] = {"CategoryCode", "AccountKey", "AccountName", "Address",
                               "City",         "Zip",        "Reference1",  "DetailsLine1",
                               "District",     "Details",    "Telephone",   "SortByKey",
                               "SortByKeyVal", "SortByName", "SortByCity",  "SortByZip"};
  for (const std::string& jet :
       {std::string(kDocColumns) + " FROM tAccount, tStockHead" + kWhere + kByKey,
        std::string(kAccountColumns) + " FROM tAccount" + kWhere + kByKey}) {
    db::Snapshot rs = work_->OpenSnapshot(jet);
    ASSERT_EQ(rs.FieldCount(), 16) << jet;
    for (int i = 0; i < 16; ++i) EXPECT_EQ(rs.FieldName(i), names[i]) << jet;
  }
  db::Snapshot rs = work_->OpenSnapshot(std::string(kAccountColumns) + " FROM tAccount" + kWhere +
                                        " AND tAccount.AccountKey = '100'" + kByKey);
  ASSERT_FALSE(rs.AtEnd());
  EXPECT_EQ(rs.Field("Reference1"), Value(int64_t{1000}));
  EXPECT_EQ(rs.Field("DetailsLine1"), Value(std::string("0")));
  EXPECT_EQ(rs.Field("SortByKeyVal"), Value(100.0));
}

// ---------------------------------------------------------------------------------------
// ORDER BY

TEST_F(StatementTest, EveryAccountOrder) {
  const std::string base = std::string(kAccountColumns) + " FROM tAccount" + kWhere;
  const std::pair<const char*, Keys> cases[] = {
      {" ORDER BY tAccount.SortByKey ASC", {"3", "5", "6", "20", "40", "100"}},
      {" ORDER BY tAccount.SortByKey DESC", {"100", "40", "20", "6", "5", "3"}},
      {" ORDER BY tAccount.SortByKey ", {"3", "5", "6", "20", "40", "100"}},
      {" ORDER BY tAccount.SortByName ASC", {"40", "6", "100", "20", "3", "5"}},
      {" ORDER BY tAccount.SortByCity DESC, tAccount.SortByName",
       {"20", "40", "100", "5", "3", "6"}},
      {" ORDER BY tAccount.SortByZip ASC, tAccount.SortByName", {"100", "5", "6", "3", "20", "40"}},
      {" ORDER BY tAccount.Telephone ASC, tAccount.SortByName", {"5", "40", "3", "20", "6", "100"}},
      {" ORDER BY tAccount.CategoryCode DESC, tAccount.SortByName",
       {"40", "6", "20", "5", "100", "3"}},
      {" ORDER BY tAccount.SortByKeyVal ASC", {"3", "5", "6", "20", "40", "100"}},
      {" ORDER BY tAccount.SortByKeyVal DESC", {"100", "40", "20", "6", "5", "3"}},
  };
  for (const auto& [order, keys] : cases) EXPECT_EQ(AccountKeys(base + order), keys) << order;
}

TEST_F(StatementTest, EveryDocumentOrder) {
  const std::string base = std::string(kDocColumns) + " FROM tAccount, tStockHead" + kWhere +
                           " AND tStockHead.Include AND tAccount.AccountKey = "
                           "tStockHead.AccountKey";
  const std::pair<const char*, Keys> cases[] = {
      {" ORDER BY tStockHead.SortByName ASC", {"5002", "5001", "5004"}},
      {" ORDER BY tStockHead.SortByName DESC", {"5004", "5001", "5002"}},
      {" ORDER BY tStockHead.SortByCity ASC, tStockHead.SortByName", {"5002", "5001", "5004"}},
      {" ORDER BY tAccount.Telephone ,tStockHead.SortByName", {"5004", "5002", "5001"}},
      {" ORDER BY tAccount.CategoryCode DESC,tStockHead.SortByName", {"5004", "5002", "5001"}},
      {" ORDER BY tStockHead.Reference1 ASC,tStockHead.SortByName", {"5001", "5002", "5004"}},
      {" ORDER BY tAccount.SortByKeyVal DESC", {"5001", "5002", "5004"}},
  };
  for (const auto& [order, refs] : cases) {
    Keys got = Column(*work_, base + order, "Reference1");
    if (std::string(order) == " ORDER BY tAccount.SortByKeyVal DESC") {
      // Two headers of one account: only the account order is fixed.
      ASSERT_EQ(got.size(), 3u);
      EXPECT_EQ(got[2], "5004");
      continue;
    }
    EXPECT_EQ(got, refs) << order;
  }
}

TEST_F(StatementTest, HebrewNamesSortInDictionaryOrder) {
  db::Database select = db::Database::Open(selectPath_);
  int n = 0;
  for (const char* name : {"תמר", "מלכה", "מלך", "אבנר", "אבן גבירול", "בית", "ים", "ימה", "Banana",
                           "apple", "cherry", "צפת", "צור"}) {
    const std::string key = "k" + std::to_string(++n);
    Insert(
        select, "tSelectAccount",
        {{"AccountKey", T(key.c_str())}, {"SortByKey", T(key.c_str())}, {"SortByName", T(name)}});
  }
  Keys names = Column(select,
                      "Select SortByName From tSelectAccount Where SortByKey Like 'k*' "
                      "Order By SortByName",
                      "SortByName");
  // Latin words among themselves without regard to case; Hebrew by the alphabet, a final
  // letter in the place of its letter.
  Keys latin, hebrew;
  for (const std::string& s : names) ((s[0] & 0x80) ? hebrew : latin).push_back(s);
  EXPECT_EQ(latin, (Keys{"apple", "Banana", "cherry"}));
  EXPECT_EQ(hebrew,
            (Keys{"אבן גבירול", "אבנר", "בית", "ים", "ימה", "מלך", "מלכה", "צור", "צפת", "תמר"}));
}

// ---------------------------------------------------------------------------------------
// Marking documents by item

TEST_F(StatementTest, HeadByItemAndTheTwoMarkingUpdates) {
  auto line = [&](int file, int head, int lineNo, const char* item) {
    Insert(*work_, "tStockLine",
           {{"CompID", I(1)},
            {"TavFileID", I(file)},
            {"HeadIndx", I(head)},
            {"LineIndx", I(lineNo)},
            {"ItemKey", T(item)}});
  };
  line(1, 1, 1, "A");
  line(1, 1, 2, "B");  // two chosen items on one header: marked once
  line(1, 2, 3, "Z");  // only another item
  line(1, 3, 4, "B");
  line(2, 1, 5, "Z");
  EXPECT_TRUE(Column(*work_, "SELECT * FROM qHeadByItem", "HeadIndx").empty());
  Insert(*work_, "tItem", {{"ItemKey", T("A")}});
  Insert(*work_, "tItem", {{"ItemKey", T("B")}});
  EXPECT_EQ(Column(*work_, "SELECT * FROM qHeadByItem ORDER BY TavFileID, HeadIndx", "HeadIndx"),
            (Keys{"1", "3"}));

  work_->Execute("UPDATE tStockHead SET tStockHead.Include = False");
  EXPECT_EQ(Column(*work_, "SELECT Include FROM tStockHead", "Include"),
            (Keys{"0", "0", "0", "0"}));
  std::string mark = "UPDATE DISTINCTROW tStockHead INNER JOIN qHeadByItem";
  mark += " ON (tStockHead.CompID = qHeadByItem.CompID)";
  mark += " AND (tStockHead.TavFileID = qHeadByItem.TavFileID)";
  mark += " AND (tStockHead.HeadIndx = qHeadByItem.HeadIndx)";
  mark += " SET tStockHead.Include = True";
  EXPECT_EQ(work_->Execute(mark), 2);
  EXPECT_EQ(
      Column(*work_, "SELECT Include FROM tStockHead ORDER BY TavFileID, HeadIndx", "Include"),
      (Keys{"-1", "0", "-1", "0"}));
}

TEST_F(StatementTest, MarkingWithNoItemsClearsEveryHeader) {
  work_->Execute("UPDATE tStockHead SET tStockHead.Include = False");
  EXPECT_EQ(work_->Execute("UPDATE DISTINCTROW tStockHead INNER JOIN qHeadByItem ON "
                           "(tStockHead.CompID = qHeadByItem.CompID) AND (tStockHead.TavFileID "
                           "= qHeadByItem.TavFileID) AND (tStockHead.HeadIndx = "
                           "qHeadByItem.HeadIndx) SET tStockHead.Include = True"),
            0);
  EXPECT_EQ(Column(*work_, "SELECT Include FROM tStockHead", "Include"),
            (Keys{"0", "0", "0", "0"}));
}

// ---------------------------------------------------------------------------------------
// The account picker, on the account-selection database

const char* const kPickerBase =
    "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > ''";

TEST_F(StatementTest, PickerRecordSources) {
  db::Database select = db::Database::Open(selectPath_);
  EXPECT_EQ(Column(select, std::string(kPickerBase) + " Order By SortByKey", "SortByName"),
            (Keys{"סמית ג'ון", "צבי", "ג'ון כהן", "לוי דוד", "אברהם", "כהן משה"}));
  EXPECT_EQ(Column(select, std::string(kPickerBase) + " And Include = True Order By SortByName",
                   "SortByName"),
            (Keys{"אברהם", "כהן משה"}));
  // The filter goes in with its own Or: the name matches plus every ticked account.
  EXPECT_EQ(Column(select,
                   std::string(kPickerBase) +
                       " And SortByName Like '*ג''ון*' Or Include = True Order By SortByName",
                   "SortByName"),
            (Keys{"אברהם", "ג'ון כהן", "כהן משה", "סמית ג'ון"}));
  EXPECT_EQ(Column(select,
                   std::string(kPickerBase) +
                       " And SortByName Like '*כהן*' Or Include = True Order By SortByKey",
                   "SortByName"),
            (Keys{"ג'ון כהן", "אברהם", "כהן משה"}));
}

TEST_F(StatementTest, PickerMarkAllAndNone) {
  db::Database select = db::Database::Open(selectPath_);
  EXPECT_EQ(select.Execute("Update tSelectAccount Set Include = True Where Include = False"), 4);
  EXPECT_EQ(Column(select, std::string(kPickerBase) + " And Include = True Order By SortByKey",
                   "SortByKey")
                .size(),
            6u);
  EXPECT_EQ(select.Execute("Update tSelectAccount Set Include = False Where Include = True"), 6);
  EXPECT_TRUE(Column(select, std::string(kPickerBase) + " And Include = True Order By SortByKey",
                     "SortByKey")
                  .empty());
  // With nothing ticked, "in the selection" matches nobody and "not in it" everybody.
  const std::string accounts = std::string(kAccountColumns) + " FROM tAccount" + kWhere;
  EXPECT_TRUE(AccountKeys(accounts +
                          " AND tAccount.SortByKey In (Select SA.SortByKey From tSelectAccount "
                          "SA Where SA.Include)" +
                          kByKey)
                  .empty());
  EXPECT_EQ(AccountKeys(accounts +
                        " AND tAccount.SortByKey Not In (Select SA.SortByKey From tSelectAccount "
                        "SA Where SA.Include)" +
                        kByKey)
                .size(),
            6u);
}

TEST_F(StatementTest, LinkSeesRowsWrittenAfterItWasMade) {
  const char* count = "SELECT SortByKey FROM tSelectAccount WHERE SortByKey = 'new'";
  EXPECT_TRUE(Column(*work_, count, "SortByKey").empty());
  {
    db::Database select = db::Database::Open(selectPath_);
    Insert(select, "tSelectAccount",
           {{"AccountKey", T("new")}, {"SortByKey", T("new")}, {"Include", kTrue}});
  }
  EXPECT_EQ(Column(*work_, count, "SortByKey"), (Keys{"new"}));
  work_.reset();
  db::Database reopened = db::Database::Open(workPath_);
  EXPECT_EQ(Column(reopened, count, "SortByKey"), (Keys{"new"}));
}

// ---------------------------------------------------------------------------------------
// What the fields and indexes refuse

TEST_F(StatementTest, DuplicateOnEveryUniqueIndexIs3022) {
  db::Database& w = *work_;
  EXPECT_EQ(InsertError(w, "tAccount", {{"AccountKey", T("100")}, {"SortByKey", T("x")}}),
            db::kErrDuplicateKey);
  EXPECT_EQ(InsertError(w, "tAccount", {{"AccountKey", T("new")}, {"SortByKey", T("  100")}}),
            db::kErrDuplicateKey);
  EXPECT_EQ(
      InsertError(w, "tStockHead", {{"CompID", I(1)}, {"TavFileID", I(1)}, {"HeadIndx", I(1)}}),
      db::kErrDuplicateKey);
  const Row line = {{"CompID", I(1)}, {"TavFileID", I(1)}, {"HeadIndx", I(1)}, {"LineIndx", I(1)}};
  EXPECT_EQ(InsertError(w, "tStockLine", line), 0);
  EXPECT_EQ(InsertError(w, "tStockLine", line), db::kErrDuplicateKey);
  EXPECT_EQ(
      InsertError(w, "tTransact", {{"FileID", I(-1)}, {"TransID", I(1)}, {"AccountKey", T("6")}}),
      db::kErrDuplicateKey);
  EXPECT_EQ(
      InsertError(w, "tTransact", {{"FileID", I(-1)}, {"TransID", I(1)}, {"AccountKey", T("7")}}),
      0);
  EXPECT_EQ(InsertError(w, "tCash", {{"TransID", I(3)}, {"AccountKey", T("5")}}),
            db::kErrDuplicateKey);
  EXPECT_EQ(InsertError(w, "tItem", {{"ItemKey", T("A")}}), 0);
  EXPECT_EQ(InsertError(w, "tItem", {{"ItemKey", T("A")}}), db::kErrDuplicateKey);
  db::Database select = db::Database::Open(selectPath_);
  EXPECT_EQ(
      InsertError(select, "tSelectAccount", {{"AccountKey", T("100")}, {"SortByKey", T("q")}}),
      db::kErrDuplicateKey);
  EXPECT_EQ(
      InsertError(select, "tSelectAccount", {{"AccountKey", T("q")}, {"SortByKey", T("  100")}}),
      db::kErrDuplicateKey);
  // The first row stays as it was.
  EXPECT_EQ(Column(w, "SELECT AccountName FROM tAccount WHERE AccountKey = '100'", "AccountName"),
            (Keys{"כהן משה"}));
}

TEST_F(StatementTest, ZeroLengthAndOverlongTextRefused) {
  db::Database& w = *work_;
  EXPECT_EQ(InsertError(w, "tItem", {{"ItemKey", T("")}}), db::kErrZeroLength);
  EXPECT_EQ(InsertError(w, "tAccount",
                        {{"AccountKey", T("n1")}, {"SortByKey", T("n1")}, {"City", T("")}}),
            db::kErrZeroLength);
  EXPECT_EQ(
      InsertError(w, "tAccount",
                  {{"AccountKey", T("n2")}, {"SortByKey", T("n2")}, {"CategoryCode", T("1234")}}),
      db::kErrFieldTooSmall);
  // The width counts characters: three Hebrew letters fit in Text(3).
  EXPECT_EQ(
      InsertError(w, "tAccount",
                  {{"AccountKey", T("n3")}, {"SortByKey", T("n3")}, {"CategoryCode", T("אבג")}}),
      0);
  EXPECT_EQ(InsertError(w, "tCash", {{"TransID", I(9)}, {"AccountKey", T("123456789")}}),
            db::kErrFieldTooSmall);
  // Nothing of the refused rows was stored.
  EXPECT_EQ(Column(w, "SELECT AccountKey FROM tAccount WHERE AccountKey Like 'n*'", "AccountKey"),
            (Keys{"n3"}));
}

// ---------------------------------------------------------------------------------------
// Statements that must fail

TEST_F(StatementTest, CriteriaErrorFailsTheStatement) {
  auto fails = [&](const std::string& jet) {
    try {
      work_->OpenSnapshot(jet);
    } catch (const db::EngineError&) {
      return true;
    }
    return false;
  };
  EXPECT_TRUE(fails(std::string(kAccountColumns) + " FROM tAccountError" + kByKey));
  EXPECT_TRUE(fails(std::string(kDocColumns) + " FROM tAccount, tStockHeadError" + kByKey));
  EXPECT_TRUE(fails(std::string(kAccountColumns) + " FROM tAccount Error" + kByKey));
  // A typed double quote ends the literal early.
  EXPECT_TRUE(fails(std::string(kAccountColumns) + " FROM tAccount" + kWhere +
                    " AND tAccount.City LIKE \"ח\"י*\"" + kByKey));
}

}  // namespace
}  // namespace zdr
