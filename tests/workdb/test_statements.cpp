// The statements the system runs, on real databases made by CreateWorkDB and CreateSelectDB:
// the marks the updates leave, the picker's rows, the criteria's subqueries, and the rows the
// fields and indexes refuse. The recipients statement as a whole runs in test_selection_rows.
#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include "support/recordingseam.h"
#include "support/scratchtemp.h"
#include "support/statements.h"
#include "workdb/schema.h"

namespace zdr {
namespace {

using namespace test;  // the statement pieces
using Keys = std::vector<std::string>;

// The number of the engine error a statement raises, or 0.
int ErrorOf(db::Database& d, const std::string& jet) {
  try {
    d.Execute(jet);
  } catch (const db::EngineError& e) {
    return e.number();
  }
  return 0;
}

// One column of every row of a statement, in order.
Keys Column(db::Database& d, const std::string& jet, const char* field) {
  Keys out;
  for (db::Snapshot rs = d.OpenSnapshot(jet); !rs.AtEnd(); rs.MoveNext()) {
    const db::Value v = rs.Field(field);
    out.push_back(db::IsNull(v)                        ? "NULL"
                  : std::holds_alternative<int64_t>(v) ? std::to_string(std::get<int64_t>(v))
                                                       : std::get<std::string>(v));
  }
  return out;
}

// Six accounts (two of them ticked in the picker), four document headers, a receipt and a
// ledger line, in a working database linked to its account-selection database.
class StatementTest : public ::testing::Test {
 protected:
  void SetUp() override {
    select_.emplace(db::Database::Open(CreateSelectDB(ui_)));
    work_.emplace(db::Database::Open(CreateWorkDB(select_->Path().string(), ui_)));
    ASSERT_TRUE(ui_.messages.empty());
    const char* accounts[][3] = {{"100", "כהן משה", "True"},   {"20", "לוי דוד", "False"},
                                 {"3", "סמית ג''ון", "False"}, {"40", "אברהם", "True"},
                                 {"5", "צבי", "False"},        {"6", "ג''ון כהן", "False"}};
    for (const auto& [key, name, picked] : accounts) {
      const std::string sortKey = std::string(5 - std::string(key).size(), ' ') + key;
      const std::string values = "VALUES ('" + std::string(key) + "', '" + sortKey + "', '" + name;
      work_->Execute("INSERT INTO tAccount (AccountKey, SortByKey, AccountName) " + values + "')");
      select_->Execute("INSERT INTO tSelectAccount (AccountKey, SortByKey, SortByName, Include) " +
                       values + "', " + picked + ")");
    }
    work_->Execute(
        "INSERT INTO tStockHead (CompID, TavFileID, HeadIndx, AccountKey, Include) VALUES "
        "(1, 1, 1, '20', True), (1, 1, 2, '3', True), (1, 1, 3, '5', False), (1, 2, 1, '40', "
        "True)");
    work_->Execute("INSERT INTO tCash (TransID, AccountKey) VALUES (3, '5')");
    work_->Execute("INSERT INTO tTransact (FileID, TransID, AccountKey) VALUES (-1, 1, '6')");
  }

  Keys Recipients(const std::string& criteria, const char* from = " FROM tAccount") {
    return Column(*work_,
                  std::string(kAccountColumns) + from + kWhere + criteria +
                      " ORDER BY tAccount.SortByKey ASC",
                  "AccountKey");
  }

  ScratchTemp temp_;
  RecordingSeam ui_;
  std::optional<db::Database> select_, work_;
};

TEST_F(StatementTest, HeadersMarkedByTheirChosenItemsOnce) {
  work_->Execute(
      "INSERT INTO tStockLine (CompID, TavFileID, HeadIndx, LineIndx, ItemKey) VALUES "
      "(1, 1, 1, 1, 'A'), (1, 1, 1, 2, 'B'), (1, 1, 2, 3, 'Z'), (1, 1, 3, 4, 'B'), (1, 2, 1, 5, "
      "'Z')");
  const char* marks = "SELECT Include FROM tStockHead ORDER BY TavFileID, HeadIndx";
  work_->Execute(kClearHeaders);
  work_->Execute("INSERT INTO tItem (ItemKey) VALUES ('A'), ('B')");
  EXPECT_EQ(Column(*work_, "SELECT * FROM qHeadByItem ORDER BY TavFileID, HeadIndx", "HeadIndx"),
            (Keys{"1", "3"}));
  EXPECT_EQ(work_->Execute(kMarkHeadersByItem), 2);
  EXPECT_EQ(Column(*work_, marks, "Include"), (Keys{"-1", "0", "-1", "0"}));
}

TEST_F(StatementTest, PickerRowsAndTheCriteriaThroughTheLink) {
  // The filter goes in with its own Or: the names that match plus every ticked account.
  EXPECT_EQ(Column(*select_,
                   "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > "
                   "'' And SortByName Like '*ג''ון*' Or Include = True Order By SortByName",
                   "SortByName"),
            (Keys{"אברהם", "ג'ון כהן", "כהן משה", "סמית ג'ון"}));
  EXPECT_EQ(Recipients(kPicked), (Keys{"40", "100"}));
  EXPECT_EQ(Recipients(kNotPicked), (Keys{"3", "5", "6", "20"}));
  EXPECT_EQ(Recipients(kCashIn), Keys{"5"});
  EXPECT_EQ(Recipients(kLedger), Keys{"6"});
  EXPECT_EQ(Recipients(kNotIssued), (Keys{"5", "6", "100"}));
  EXPECT_EQ(Recipients(kStockJoin, " FROM tAccount, tStockHead"), (Keys{"3", "20", "40"}));
  // A joined update reads each account's own row of the other file.
  EXPECT_EQ(work_->Execute("UPDATE tAccount INNER JOIN tSelectAccount AS S ON tAccount.AccountKey "
                           "= S.AccountKey SET tAccount.City = S.SortByName WHERE Not S.Include"),
            4);
  EXPECT_EQ(Column(*work_, "SELECT City FROM tAccount WHERE AccountKey In ('3', '100')", "City"),
            (Keys{"NULL", "סמית ג'ון"}));
  // With nothing ticked, "in the selection" matches nobody and "not in it" everybody; the
  // working database sees the change through its link.
  EXPECT_EQ(select_->Execute("Update tSelectAccount Set Include = False Where Include = True"), 2);
  EXPECT_TRUE(Recipients(kPicked).empty());
  EXPECT_EQ(Recipients(kNotPicked).size(), 6u);
}

TEST_F(StatementTest, FieldsAndIndexesRefuseWhatTheyMust) {
  const std::pair<const char*, int> cases[] = {
      {"tAccount (AccountKey, SortByKey) VALUES ('100', 'x')", db::kErrDuplicateKey},
      {"tAccount (AccountKey, SortByKey) VALUES ('n', '  100')", db::kErrDuplicateKey},
      {"tAccount (AccountKey, CategoryCode) VALUES ('n', '1234')", db::kErrFieldTooSmall},
      // The width counts characters: three Hebrew letters fit in Text(3).
      {"tAccount (AccountKey, CategoryCode) VALUES ('n', 'אבג')", 0},
      {"tStockHead (CompID, TavFileID, HeadIndx) VALUES (1, 1, 1)", db::kErrDuplicateKey},
      {"tStockLine (CompID, TavFileID, HeadIndx, LineIndx) VALUES (1, 1, 1, 1)", 0},
      {"tStockLine (CompID, TavFileID, HeadIndx, LineIndx) VALUES (1, 1, 1, 1)",
       db::kErrDuplicateKey},
      {"tTransact (FileID, TransID, AccountKey) VALUES (-1, 1, '6')", db::kErrDuplicateKey},
      {"tTransact (FileID, TransID, AccountKey) VALUES (-1, 1, '7')", 0},
      {"tCash (TransID, AccountKey) VALUES (3, '5')", db::kErrDuplicateKey},
      {"tItem (ItemKey) VALUES ('A')", 0},
      {"tItem (ItemKey) VALUES ('A')", db::kErrDuplicateKey},
      {"tSelectAccount (AccountKey, SortByKey) VALUES ('100', 'q')", db::kErrDuplicateKey},
      {"tSelectAccount (AccountKey, SortByKey) VALUES ('q', '  100')", db::kErrDuplicateKey}};
  for (const auto& [insert, error] : cases) {
    db::Database& d = std::string(insert).starts_with("tSelect") ? *select_ : *work_;
    EXPECT_EQ(ErrorOf(d, std::string("INSERT INTO ") + insert), error) << insert;
  }
}

}  // namespace
}  // namespace zdr
