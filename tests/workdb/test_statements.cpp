// The statements the system runs, on real databases made by CreateWorkDB and CreateSelectDB:
// the marks the updates leave, the picker's rows, and the rows the fields and indexes refuse.
// The recipients statement itself runs in test_selection_rows.
#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "support/recordingseam.h"
#include "support/scratchtemp.h"
#include "support/statements.h"
#include "workdb/schema.h"

namespace zdr {
namespace {

using namespace test;  // the statement pieces
using db::Value;
using Row = std::vector<std::pair<const char*, Value>>;
using Keys = std::vector<std::string>;

Value T(const char* s) {
  return std::string(s);
}
Value I(int64_t v) {
  return v;
}

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

// One column of every row of a statement, in order.
Keys Column(db::Database& d, const std::string& jet, const char* field) {
  Keys out;
  for (db::Snapshot rs = d.OpenSnapshot(jet); !rs.AtEnd(); rs.MoveNext()) {
    const Value v = rs.Field(field);
    if (db::IsNull(v)) {
      out.push_back("NULL");
    } else if (const auto* s = std::get_if<std::string>(&v)) {
      out.push_back(*s);
    } else {
      out.push_back(std::to_string(std::get<int64_t>(v)));
    }
  }
  return out;
}

// Six accounts (two of them ticked in the picker), four document headers, a receipt and a
// ledger line, in a working database linked to its account-selection database.
class StatementTest : public ::testing::Test {
 protected:
  void SetUp() override {
    selectPath_ = CreateSelectDB(ui_);
    work_.emplace(db::Database::Open(CreateWorkDB(selectPath_, ui_)));
    select_.emplace(db::Database::Open(selectPath_));
    ASSERT_TRUE(ui_.messages.empty());
    const struct {
      const char *key, *name;
      bool picked;
    } accounts[] = {{"100", "כהן משה", true}, {"20", "לוי דוד", false}, {"3", "סמית ג'ון", false},
                    {"40", "אברהם", true},    {"5", "צבי", false},      {"6", "ג'ון כהן", false}};
    for (const auto& a : accounts) {
      const Value sortKey = std::string(5 - std::string(a.key).size(), ' ') + a.key;
      Insert(*work_, "tAccount",
             {{"AccountKey", T(a.key)}, {"AccountName", T(a.name)}, {"SortByKey", sortKey}});
      Insert(*select_, "tSelectAccount",
             {{"AccountKey", T(a.key)},
              {"SortByKey", sortKey},
              {"SortByName", T(a.name)},
              {"Include", I(a.picked ? -1 : 0)}});
    }
    for (auto [file, head] : {std::pair{1, 1}, {1, 2}, {1, 3}, {2, 1}}) {
      Insert(*work_, "tStockHead",
             {{"CompID", I(1)}, {"TavFileID", I(file)}, {"HeadIndx", I(head)}, {"Include", I(-1)}});
    }
    Insert(*work_, "tCash", {{"TransID", I(3)}, {"AccountKey", T("5")}});
    Insert(*work_, "tTransact", {{"FileID", I(-1)}, {"TransID", I(1)}, {"AccountKey", T("6")}});
  }

  Keys Recipients(const std::string& from, const std::string& criteria) {
    return Column(*work_,
                  std::string(kAccountColumns) + from + kWhere + criteria +
                      " ORDER BY tAccount.SortByKey ASC",
                  "AccountKey");
  }

  ScratchTemp temp_;
  RecordingSeam ui_;
  std::string selectPath_;
  std::optional<db::Database> work_, select_;
};

TEST_F(StatementTest, HeadersMarkedByTheirChosenItemsOnce) {
  const std::tuple<int, int, const char*> lines[] = {
      {1, 1, "A"}, {1, 1, "B"}, {1, 2, "Z"}, {1, 3, "B"}, {2, 1, "Z"}};
  int lineNo = 0;
  for (const auto& [file, head, item] : lines) {
    Insert(*work_, "tStockLine",
           {{"CompID", I(1)},
            {"TavFileID", I(file)},
            {"HeadIndx", I(head)},
            {"LineIndx", I(++lineNo)},
            {"ItemKey", T(item)}});
  }
  const char* marks = "SELECT Include FROM tStockHead ORDER BY TavFileID, HeadIndx";
  work_->Execute(kClearHeaders);
  EXPECT_EQ(work_->Execute(kMarkHeadersByItem), 0);  // no item chosen yet
  EXPECT_EQ(Column(*work_, marks, "Include"), (Keys{"0", "0", "0", "0"}));
  Insert(*work_, "tItem", {{"ItemKey", T("A")}});
  Insert(*work_, "tItem", {{"ItemKey", T("B")}});
  EXPECT_EQ(Column(*work_, "SELECT * FROM qHeadByItem ORDER BY TavFileID, HeadIndx", "HeadIndx"),
            (Keys{"1", "3"}));
  EXPECT_EQ(work_->Execute(kMarkHeadersByItem), 2);
  EXPECT_EQ(Column(*work_, marks, "Include"), (Keys{"-1", "0", "-1", "0"}));
}

TEST_F(StatementTest, PickerRowsAndTheLinkToThem) {
  const std::string base =
      "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > ''";
  // The filter goes in with its own Or: the names that match plus every ticked account.
  EXPECT_EQ(Column(*select_,
                   base + " And SortByName Like '*ג''ון*' Or Include = True Order By SortByName",
                   "SortByName"),
            (Keys{"אברהם", "ג'ון כהן", "כהן משה", "סמית ג'ון"}));
  EXPECT_EQ(select_->Execute("Update tSelectAccount Set Include = True Where Include = False"), 4);
  EXPECT_EQ(select_->Execute("Update tSelectAccount Set Include = False Where Include = True"), 6);
  // With nothing ticked, "in the selection" matches nobody and "not in it" everybody; the
  // working database sees the change through its link.
  EXPECT_TRUE(Recipients(" FROM tAccount", kPicked).empty());
  EXPECT_EQ(Recipients(" FROM tAccount", kNotPicked).size(), 6u);
}

TEST_F(StatementTest, FieldsAndIndexesRefuseWhatTheyMust) {
  const Row line = {{"CompID", I(1)}, {"TavFileID", I(1)}, {"HeadIndx", I(1)}, {"LineIndx", I(1)}};
  struct Case {
    db::Database* d;
    const char* table;
    Row row;
    int error;
  };
  const Case cases[] = {
      {&*work_,
       "tAccount",
       {{"AccountKey", T("100")}, {"SortByKey", T("x")}},
       db::kErrDuplicateKey},
      {&*work_,
       "tAccount",
       {{"AccountKey", T("n")}, {"SortByKey", T("  100")}},
       db::kErrDuplicateKey},
      {&*work_,
       "tStockHead",
       {{"CompID", I(1)}, {"TavFileID", I(1)}, {"HeadIndx", I(1)}},
       db::kErrDuplicateKey},
      {&*work_, "tStockLine", line, 0},
      {&*work_, "tStockLine", line, db::kErrDuplicateKey},
      {&*work_,
       "tTransact",
       {{"FileID", I(-1)}, {"TransID", I(1)}, {"AccountKey", T("6")}},
       db::kErrDuplicateKey},
      {&*work_, "tTransact", {{"FileID", I(-1)}, {"TransID", I(1)}, {"AccountKey", T("7")}}, 0},
      {&*work_, "tCash", {{"TransID", I(3)}, {"AccountKey", T("5")}}, db::kErrDuplicateKey},
      {&*work_, "tItem", {{"ItemKey", T("A")}}, 0},
      {&*work_, "tItem", {{"ItemKey", T("A")}}, db::kErrDuplicateKey},
      {&*select_,
       "tSelectAccount",
       {{"AccountKey", T("100")}, {"SortByKey", T("q")}},
       db::kErrDuplicateKey},
      {&*select_,
       "tSelectAccount",
       {{"AccountKey", T("q")}, {"SortByKey", T("  100")}},
       db::kErrDuplicateKey},
      {&*work_, "tItem", {{"ItemKey", T("")}}, db::kErrZeroLength},
      {&*work_,
       "tAccount",
       {{"AccountKey", T("n1")}, {"SortByKey", T("n1")}, {"City", T("")}},
       db::kErrZeroLength},
      {&*work_,
       "tAccount",
       {{"AccountKey", T("n2")}, {"SortByKey", T("n2")}, {"CategoryCode", T("1234")}},
       db::kErrFieldTooSmall},
      // The width counts characters: three Hebrew letters fit in Text(3).
      {&*work_,
       "tAccount",
       {{"AccountKey", T("n3")}, {"SortByKey", T("n3")}, {"CategoryCode", T("אבג")}},
       0},
      {&*work_,
       "tCash",
       {{"TransID", I(9)}, {"AccountKey", T("123456789")}},
       db::kErrFieldTooSmall},
  };
  for (const Case& c : cases) {
    EXPECT_EQ(InsertError(*c.d, c.table, c.row), c.error) << c.table << " case " << (&c - cases);
  }
  // Nothing of the refused rows was stored; the first row stays as it was.
  EXPECT_EQ(Column(*work_,
                   "SELECT AccountName FROM tAccount WHERE AccountKey Like 'n*' OR "
                   "AccountKey = '100' ORDER BY 1",
                   "AccountName"),
            (Keys{"NULL", "כהן משה"}));
}

}  // namespace
}  // namespace zdr
