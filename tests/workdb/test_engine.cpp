#include <gtest/gtest.h>
#include <sqlite3.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <optional>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "workdb/collation.h"
#include "workdb/engine.h"

namespace zdr::db {
namespace {

namespace fs = std::filesystem;

constexpr const char* kLocale = ";LANGID=0x040D;CP=1255;COUNTRY=0";

class EngineTest : public ::testing::Test {
 protected:
  void SetUp() override {
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    dir_ = fs::temp_directory_path() / ("zdr_engine_" + std::to_string(::getpid()) + "_" +
                                        info->test_suite_name() + "_" + info->name());
    fs::remove_all(dir_);
    fs::create_directories(dir_);
  }
  void TearDown() override { fs::remove_all(dir_); }

  fs::path File(const std::string& name) const { return dir_ / name; }

  static TableDef AccountDef() {
    TableDef t("tAccount");
    t.Field("AccountKey", FieldType::Text, 20)
        .Field("AccountName", FieldType::Text, 100)
        .Field("CategoryCode", FieldType::Text, 3)
        .Field("City", FieldType::Text, 50)
        .Field("Include", FieldType::Boolean)
        .Field("SortByKey", FieldType::Text, 20)
        .Field("SortByKeyVal", FieldType::Double)
        .Index("PrimaryKey", {"AccountKey"}, true, true)
        .Index("SortByKey", {"SortByKey"}, false, true);
    return t;
  }

  static TableDef NumbersDef() {
    TableDef t("tNumbers");
    t.Field("B", FieldType::Byte)
        .Field("I", FieldType::Integer)
        .Field("L", FieldType::Long)
        .Field("D", FieldType::Double)
        .Field("When", FieldType::Date)
        .Field("Flag", FieldType::Boolean)
        .Field("Code", FieldType::Text, 3);
    return t;
  }

  // Appends one account; returns the engine error number, 0 when stored.
  static int AddAccount(TableRecordset& rs, const std::string& key, const std::string& name,
                        std::optional<std::string> sortKey = std::nullopt,
                        const std::string& city = "") {
    try {
      rs.AddNew();
      rs.SetText(rs.FieldIndex("AccountKey"), key);
      rs.SetText(rs.FieldIndex("AccountName"), name);
      rs.SetText(rs.FieldIndex("SortByKey"), sortKey.value_or(key));
      if (!city.empty()) rs.SetText(rs.FieldIndex("City"), city);
      rs.SetBool(rs.FieldIndex("Include"), true);
      rs.Update();
      return 0;
    } catch (const EngineError& e) {
      return e.number();
    }
  }

  static int64_t Count(Database& db, const std::string& table) {
    Snapshot s = db.OpenSnapshot("SELECT Count(*) AS N FROM " + table);
    return std::get<int64_t>(s.Field("N"));
  }

  static std::vector<std::string> Column(Database& db, const std::string& sql,
                                         const std::string& field) {
    std::vector<std::string> out;
    Snapshot s = db.OpenSnapshot(sql);
    while (!s.AtEnd()) {
      const Value& v = s.Field(field);
      out.push_back(IsNull(v) ? "<null>" : std::get<std::string>(v));
      s.MoveNext();
    }
    return out;
  }

  template <typename F>
  static int ErrorOf(F&& f) {
    try {
      f();
    } catch (const EngineError& e) {
      return e.number();
    }
    return 0;
  }

  fs::path dir_;
};

// ---------------------------------------------------------------------------------------
// Files

TEST_F(EngineTest, CreateOpenCloseKeepsTheTables) {
  {
    Database db = Database::Create(File("a.DB"), kLocale);
    EXPECT_TRUE(db.IsOpen());
    EXPECT_EQ(db.Path(), File("a.DB"));
    db.CreateTable(AccountDef());
    db.Close();
    EXPECT_FALSE(db.IsOpen());
  }
  Database db = Database::Open(File("a.DB"));
  EXPECT_TRUE(db.HasTable("tAccount"));
  EXPECT_TRUE(db.HasTable("TACCOUNT"));
  EXPECT_FALSE(db.HasTable("tItem"));
}

TEST_F(EngineTest, CreateOverAnExistingFileIsRefused) {
  { std::ofstream(File("old.DB")) << "keep me"; }
  EXPECT_EQ(ErrorOf([&] { Database::Create(File("old.DB"), kLocale); }), kErrFileExists);
  std::ifstream in(File("old.DB"));
  std::string content;
  std::getline(in, content);
  EXPECT_EQ(content, "keep me");
}

TEST_F(EngineTest, CreateInAMissingFolderFailsWithCannotOpen) {
  EXPECT_EQ(ErrorOf([&] { Database::Create(File("no/such/dir/x.DB"), kLocale); }), kErrCannotOpen);
}

TEST_F(EngineTest, OpenMissingFileFailsAndCreatesNothing) {
  try {
    Database::Open(File("missing.DB"));
    FAIL() << "opened a missing file";
  } catch (const EngineError& e) {
    EXPECT_EQ(e.number(), kErrCannotOpen);
    EXPECT_NE(std::string(e.description()).find("missing.DB"), std::string::npos);
  }
  EXPECT_FALSE(fs::exists(File("missing.DB")));
}

TEST_F(EngineTest, OpenGarbageOrForeignFileFailsWithCannotOpen) {
  { std::ofstream(File("junk.DB"), std::ios::binary) << std::string(5000, '\x5a'); }
  EXPECT_EQ(ErrorOf([&] { Database::Open(File("junk.DB")); }), kErrCannotOpen);

  sqlite3* raw = nullptr;
  ASSERT_EQ(sqlite3_open(File("plain.db").string().c_str(), &raw), SQLITE_OK);
  sqlite3_exec(raw, "CREATE TABLE t (a)", nullptr, nullptr, nullptr);
  sqlite3_close(raw);
  EXPECT_EQ(ErrorOf([&] { Database::Open(File("plain.db")); }), kErrCannotOpen);
}

TEST_F(EngineTest, StaleJournalBesideANewFileIsNotReplayed) {
  // A hot journal left by a crashed run of an earlier file of the same name.
  { std::ofstream(File("w.DB-journal"), std::ios::binary) << std::string(4096, '\x01'); }
  Database db = Database::Create(File("w.DB"), kLocale);
  EXPECT_FALSE(fs::exists(File("w.DB-journal")));
  db.CreateTable(AccountDef());
  db.Close();
  Database again = Database::Open(File("w.DB"));
  EXPECT_TRUE(again.HasTable("tAccount"));
}

TEST_F(EngineTest, DescribeReturnsFieldsAndIndexesAfterReopen) {
  {
    Database db = Database::Create(File("d.DB"), kLocale);
    db.CreateTable(AccountDef());
    TableDef cash("tCash");
    cash.Field("TransID", FieldType::Long)
        .Field("AccountKey", FieldType::Text, 8)
        .Index("PrimaryKey", {"TransID", "AccountKey"}, true, true);
    db.CreateTable(cash);  // a second "PrimaryKey" index in the same file
  }
  Database db = Database::Open(File("d.DB"));
  const TableDef t = db.Describe("taccount");
  EXPECT_EQ(t.name, "tAccount");
  const TableDef want = AccountDef();
  ASSERT_EQ(t.fields.size(), want.fields.size());
  for (size_t i = 0; i < want.fields.size(); ++i) {
    EXPECT_EQ(t.fields[i].name, want.fields[i].name);
    EXPECT_EQ(t.fields[i].type, want.fields[i].type);
    EXPECT_EQ(t.fields[i].size, want.fields[i].size);
  }
  ASSERT_EQ(t.indexes.size(), 2u);
  EXPECT_EQ(t.indexes[0].name, "PrimaryKey");
  EXPECT_EQ(t.indexes[0].fields, std::vector<std::string>{"AccountKey"});
  EXPECT_TRUE(t.indexes[0].primary);
  EXPECT_TRUE(t.indexes[0].unique);
  EXPECT_EQ(t.indexes[1].name, "SortByKey");
  EXPECT_FALSE(t.indexes[1].primary);
  EXPECT_TRUE(t.indexes[1].unique);

  const TableDef c = db.Describe("tCash");
  ASSERT_EQ(c.indexes.size(), 1u);
  EXPECT_EQ(c.indexes[0].fields, (std::vector<std::string>{"TransID", "AccountKey"}));
  EXPECT_EQ(ErrorOf([&] { db.Describe("tNothing"); }), kErrNoSuchObject);
}

TEST_F(EngineTest, BadDefinitionsAreRefusedBeforeAnythingIsCreated) {
  Database db = Database::Create(File("bad.DB"), kLocale);
  db.CreateTable(AccountDef());
  EXPECT_EQ(ErrorOf([&] { db.CreateTable(AccountDef()); }), kErrObjectExists);
  TableDef noWidth("tW");
  noWidth.Field("A", FieldType::Text, 0);
  EXPECT_NE(ErrorOf([&] { db.CreateTable(noWidth); }), 0);
  TableDef badIndex("tX");
  badIndex.Field("A", FieldType::Long).Index("PrimaryKey", {"B"}, true, true);
  EXPECT_EQ(ErrorOf([&] { db.CreateTable(badIndex); }), kErrNoSuchField);
  EXPECT_FALSE(db.HasTable("tX"));
  EXPECT_FALSE(db.HasTable("tW"));
}

// ---------------------------------------------------------------------------------------
// Appending rows

TEST_F(EngineTest, RefusalsCarryTheirNumbers) {
  Database db = Database::Create(File("r.DB"), kLocale);
  db.CreateTable(NumbersDef());
  TableRecordset rs = db.OpenTable("tNumbers");
  auto tryRow = [&](auto setter) {
    return ErrorOf([&] {
      rs.AddNew();
      setter();
      rs.Update();
    });
  };
  const int code = rs.FieldIndex("code");
  EXPECT_EQ(tryRow([&] { rs.SetText(code, ""); }), kErrZeroLength);
  EXPECT_EQ(tryRow([&] { rs.SetText(code, "אבג"); }), 0);  // three letters, six bytes
  EXPECT_EQ(tryRow([&] { rs.SetText(code, "אבגד"); }), kErrFieldTooSmall);
  EXPECT_EQ(tryRow([&] { rs.SetText(code, "abcd"); }), kErrFieldTooSmall);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("B"), 255); }), 0);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("B"), 256); }), kErrNumericOverflow);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("B"), -1); }), kErrNumericOverflow);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("I"), 32767); }), 0);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("I"), 32768); }), kErrNumericOverflow);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("I"), -32769); }), kErrNumericOverflow);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("L"), 2147483647); }), 0);
  EXPECT_EQ(tryRow([&] { rs.SetInt(rs.FieldIndex("L"), int64_t{1} << 31); }), kErrNumericOverflow);
  EXPECT_EQ(tryRow([&] { rs.SetDouble(rs.FieldIndex("I"), 32767.5); }), kErrNumericOverflow);
  EXPECT_EQ(tryRow([&] { rs.SetDouble(rs.FieldIndex("L"), NAN); }), kErrNumericOverflow);
  EXPECT_EQ(tryRow([&] { rs.SetText(rs.FieldIndex("L"), "12x"); }), kErrTypeConversion);
  EXPECT_EQ(tryRow([&] { rs.SetText(code, "\xd7"); }), kErrTypeConversion);  // cut UTF-8
  rs.Close();
  EXPECT_EQ(Count(db, "tNumbers"), 4);
}

TEST_F(EngineTest, ZeroLengthRefusalNamesTheField) {
  Database db = Database::Create(File("z.DB"), kLocale);
  db.CreateTable(AccountDef());
  TableRecordset rs = db.OpenTable("tAccount");
  rs.AddNew();
  rs.SetText(rs.FieldIndex("AccountKey"), "1");
  rs.SetText(rs.FieldIndex("City"), "");
  try {
    rs.Update();
    FAIL();
  } catch (const EngineError& e) {
    EXPECT_EQ(e.number(), kErrZeroLength);
    EXPECT_NE(std::string(e.description()).find("'City'"), std::string::npos);
  }
}

TEST_F(EngineTest, ValuesConvertToTheFieldTypes) {
  Database db = Database::Create(File("v.DB"), kLocale);
  db.CreateTable(NumbersDef());
  {
    TableRecordset rs = db.OpenTable("tNumbers");
    rs.AddNew();
    rs.SetDouble(rs.FieldIndex("I"), 2.5);  // half to even
    rs.SetText(rs.FieldIndex("L"), " 42 ");
    rs.SetInt(rs.FieldIndex("D"), 7);
    rs.SetDate(rs.FieldIndex("When"), Date::FromParts(2024, 2, 29));
    rs.SetInt(rs.FieldIndex("Flag"), 5);
    rs.SetInt(rs.FieldIndex("Code"), 123);
    rs.Update();
    rs.AddNew();
    rs.Set("flag", Value{int64_t{0}});
    rs.Set("B", Value{});
    rs.Update();
  }
  Snapshot s = db.OpenSnapshot("SELECT * FROM tNumbers ORDER BY Flag");
  EXPECT_EQ(std::get<int64_t>(s.Field("I")), 2);
  EXPECT_EQ(std::get<int64_t>(s.Field("L")), 42);
  EXPECT_EQ(std::get<double>(s.Field("D")), 7.0);
  EXPECT_EQ(std::get<double>(s.Field("When")),
            static_cast<double>(Date::FromParts(2024, 2, 29).serial));
  EXPECT_EQ(std::get<int64_t>(s.Field("Flag")), -1);
  EXPECT_EQ(std::get<std::string>(s.Field("Code")), "123");
  EXPECT_TRUE(IsNull(s.Field("B")));
  s.MoveNext();
  EXPECT_EQ(std::get<int64_t>(s.Field("Flag")), 0);
  EXPECT_TRUE(IsNull(s.Field("Code")));
}

TEST_F(EngineTest, SettingFieldsWithoutAddNewIsRefused) {
  Database db = Database::Create(File("e.DB"), kLocale);
  db.CreateTable(NumbersDef());
  TableRecordset rs = db.OpenTable("tNumbers");
  EXPECT_EQ(ErrorOf([&] { rs.SetInt(0, 1); }), kErrNotEditing);
  EXPECT_EQ(ErrorOf([&] { rs.Update(); }), kErrNotEditing);
  rs.AddNew();
  rs.SetInt(0, 1);
  rs.Update();
  EXPECT_EQ(ErrorOf([&] { rs.Update(); }), kErrNotEditing);  // no second copy of the row
  EXPECT_EQ(ErrorOf([&] { rs.FieldIndex("Nope"); }), kErrNoSuchField);
  rs.Close();
  EXPECT_EQ(Count(db, "tNumbers"), 1);
}

TEST_F(EngineTest, DuplicateKeyOnPrimaryAndUniqueIndexKeepsTheRecordsetUsable) {
  Database db = Database::Create(File("k.DB"), kLocale);
  db.CreateTable(AccountDef());
  {
    TableRecordset rs = db.OpenTable("tAccount");
    EXPECT_EQ(AddAccount(rs, "100", "כהן"), 0);
    EXPECT_EQ(AddAccount(rs, "200", "לוי"), 0);
    EXPECT_EQ(AddAccount(rs, "100", "אחר", "999"), kErrDuplicateKey);  // primary
    EXPECT_EQ(AddAccount(rs, "300", "אחר", "200"), kErrDuplicateKey);  // SortByKey only
    EXPECT_EQ(AddAccount(rs, "400", "מזרחי"), 0);
  }
  EXPECT_EQ(Column(db, "SELECT AccountName FROM tAccount ORDER BY AccountKey", "AccountName"),
            (std::vector<std::string>{"כהן", "לוי", "מזרחי"}));
  Snapshot check = db.OpenSnapshot("SELECT AccountKey FROM tAccount WHERE SortByKey = \"200\"");
  EXPECT_EQ(std::get<std::string>(check.Field(0)), "200");
  char* err = nullptr;
  std::string result;
  sqlite3_exec(
      db.Handle(), "PRAGMA integrity_check",
      [](void* out, int, char** values, char**) {
        *static_cast<std::string*>(out) += values[0];
        return 0;
      },
      &result, &err);
  sqlite3_free(err);
  EXPECT_EQ(result, "ok");
}

TEST_F(EngineTest, DuplicateKeyDescriptionNamesTheIndex) {
  Database db = Database::Create(File("kd.DB"), kLocale);
  db.CreateTable(AccountDef());
  TableRecordset rs = db.OpenTable("tAccount");
  AddAccount(rs, "1", "a", "k");
  try {
    rs.AddNew();
    rs.SetText(0, "2");
    rs.SetText(rs.FieldIndex("SortByKey"), "k");
    rs.Update();
    FAIL();
  } catch (const EngineError& e) {
    EXPECT_EQ(e.number(), kErrDuplicateKey);
    EXPECT_NE(std::string(e.description()).find("'SortByKey'"), std::string::npos);
  }
}

TEST_F(EngineTest, NullInThePrimaryKeyIsRefusedNotStoredTwice) {
  Database db = Database::Create(File("n.DB"), kLocale);
  db.CreateTable(AccountDef());
  TableRecordset rs = db.OpenTable("tAccount");
  for (int i = 0; i < 2; ++i) {
    rs.AddNew();
    rs.SetText(rs.FieldIndex("AccountName"), "ללא מפתח");
    EXPECT_EQ(ErrorOf([&] { rs.Update(); }), kErrNullKey);
  }
  rs.Close();
  EXPECT_EQ(Count(db, "tAccount"), 0);
}

TEST_F(EngineTest, UniqueIndexAcceptsManyNulls) {
  Database db = Database::Create(File("un.DB"), kLocale);
  db.CreateTable(AccountDef());
  TableRecordset rs = db.OpenTable("tAccount");
  for (const char* key : {"1", "2"}) {
    rs.AddNew();
    rs.SetText(0, key);
    rs.Update();
  }
  rs.Close();
  EXPECT_EQ(Count(db, "tAccount"), 2);
}

TEST_F(EngineTest, RowsStayWhenTheCallerLeavesThroughAnException) {
  {
    Database db = Database::Create(File("x.DB"), kLocale, Durability::Durable);
    db.CreateTable(AccountDef());
  }
  try {
    Database db = Database::Open(File("x.DB"));
    TableRecordset rs = db.OpenTable("tAccount");
    AddAccount(rs, "1", "ראשון");
    AddAccount(rs, "2", "שני");
    throw std::runtime_error("import stopped");
  } catch (const std::runtime_error&) {
  }
  Database other = Database::Open(File("x.DB"));
  EXPECT_EQ(Count(other, "tAccount"), 2);
}

TEST_F(EngineTest, RowsStayWhenTheDatabaseClosesBeforeTheRecordset) {
  {
    Database db = Database::Create(File("o.DB"), kLocale, Durability::Durable);
    db.CreateTable(AccountDef());
  }
  std::optional<TableRecordset> rs;
  {
    Database db = Database::Open(File("o.DB"));
    rs.emplace(db.OpenTable("tAccount"));
  }
  EXPECT_EQ(AddAccount(*rs, "1", "עדיין פתוח"), 0);
  rs.reset();
  Database again = Database::Open(File("o.DB"));
  EXPECT_EQ(Count(again, "tAccount"), 1);
}

TEST_F(EngineTest, TwoRecordsetsShareOneTransactionCommittedByTheLast) {
  {
    Database db = Database::Create(File("t.DB"), kLocale, Durability::Durable);
    db.CreateTable(AccountDef());
    db.CreateTable(NumbersDef());
  }
  Database db = Database::Open(File("t.DB"));
  Database reader = Database::Open(File("t.DB"));
  TableRecordset accounts = db.OpenTable("tAccount");
  TableRecordset numbers = db.OpenTable("tNumbers");
  AddAccount(accounts, "1", "א");
  numbers.AddNew();
  numbers.SetInt(0, 9);
  numbers.Update();
  // Inside the transaction the writer sees its rows; another connection does not yet.
  EXPECT_EQ(Count(db, "tAccount"), 1);
  EXPECT_EQ(Count(reader, "tAccount"), 0);
  accounts.Close();
  EXPECT_NE(AddAccount(accounts, "2", "ב"), 0);  // closed
  EXPECT_EQ(Count(reader, "tNumbers"), 0);
  numbers.Close();
  EXPECT_EQ(Count(reader, "tAccount"), 1);
  EXPECT_EQ(Count(reader, "tNumbers"), 1);
}

// ---------------------------------------------------------------------------------------
// Snapshots

class SnapshotTest : public EngineTest {
 protected:
  void SetUp() override {
    EngineTest::SetUp();
    db_.emplace(Database::Create(File("s.DB"), kLocale));
    db_->CreateTable(AccountDef());
    TableRecordset rs = db_->OpenTable("tAccount");
    AddAccount(rs, "1", "אלף", std::nullopt, "חיפה");
    AddAccount(rs, "2", "בית");
    AddAccount(rs, "3", "גימל", std::nullopt, "אילת");
  }
  std::optional<Database> db_;
};

TEST_F(SnapshotTest, NavigationAndRecordCountFollowTheDesktopEngine) {
  Snapshot s = db_->OpenSnapshot("SELECT AccountKey FROM tAccount ORDER BY AccountKey");
  EXPECT_FALSE(s.AtStart());
  EXPECT_FALSE(s.AtEnd());
  EXPECT_EQ(s.RecordCount(), 1);
  EXPECT_EQ(std::get<std::string>(s.Field("AccountKey")), "1");
  s.MoveNext();
  EXPECT_EQ(s.RecordCount(), 2);
  s.MoveLast();
  EXPECT_EQ(s.RecordCount(), 3);
  EXPECT_EQ(std::get<std::string>(s.Field(0)), "3");
  s.MoveNext();
  EXPECT_TRUE(s.AtEnd());
  EXPECT_EQ(ErrorOf([&] { s.Field(0); }), kErrNoCurrentRecord);
  EXPECT_EQ(ErrorOf([&] { s.MoveNext(); }), kErrNoCurrentRecord);
  s.MovePrevious();
  EXPECT_EQ(std::get<std::string>(s.Field(0)), "3");
  s.MoveFirst();
  s.MovePrevious();
  EXPECT_TRUE(s.AtStart());
  EXPECT_FALSE(s.AtEnd());
  EXPECT_EQ(ErrorOf([&] { s.Field("AccountKey"); }), kErrNoCurrentRecord);
  EXPECT_EQ(ErrorOf([&] { s.MovePrevious(); }), kErrNoCurrentRecord);
  EXPECT_EQ(s.RecordCount(), 3);
}

TEST_F(SnapshotTest, EmptyResultIsAtBothEnds) {
  Snapshot s = db_->OpenSnapshot("SELECT AccountKey FROM tAccount WHERE AccountKey = \"9\"");
  EXPECT_TRUE(s.AtStart());
  EXPECT_TRUE(s.AtEnd());
  EXPECT_EQ(s.RecordCount(), 0);
  EXPECT_EQ(ErrorOf([&] { s.MoveFirst(); }), kErrNoCurrentRecord);
  EXPECT_EQ(ErrorOf([&] { s.MoveLast(); }), kErrNoCurrentRecord);
  EXPECT_EQ(s.FieldCount(), 1);
}

// A forward snapshot gives the whole snapshot's rows in its order, knows their number at once,
// refuses to move back but reads them again from the first, and leaves nothing behind in the
// database.
TEST_F(SnapshotTest, ForwardSnapshotStreamsTheSameRowsAndCountsThemAtOpen) {
  const char* sql = "SELECT AccountKey, City FROM tAccount ORDER BY AccountName DESC";
  std::vector<std::string> whole;
  for (Snapshot w = db_->OpenSnapshot(sql); !w.AtEnd(); w.MoveNext()) {
    whole.push_back(std::get<std::string>(w.Field("AccountKey")));
  }
  Snapshot f = db_->OpenSnapshot(sql, SnapshotKind::Forward);
  EXPECT_EQ(f.TotalRows(), 3);
  EXPECT_EQ(f.RecordCount(), 1);
  f.MoveFirst();  // already there
  db_->Close();   // the snapshot keeps the connection it reads through
  std::vector<std::string> forward;
  std::vector<bool> cityNull;
  for (; !f.AtEnd(); f.MoveNext()) {
    forward.push_back(std::get<std::string>(f.Field("AccountKey")));
    cityNull.push_back(IsNull(f.Field(1)));
    if (forward.size() == 2) {
      EXPECT_EQ(ErrorOf([&] { f.MovePrevious(); }), kErrForwardOnly);
      EXPECT_EQ(ErrorOf([&] { f.MoveLast(); }), kErrForwardOnly);
    }
  }
  EXPECT_EQ(forward, whole);
  EXPECT_EQ(cityNull, (std::vector<bool>{false, true, false}));
  EXPECT_EQ(f.RecordCount(), 3);
  EXPECT_EQ(ErrorOf([&] { f.MoveNext(); }), kErrNoCurrentRecord);
  std::vector<std::string> reread;
  for (f.MoveFirst(); !f.AtEnd(); f.MoveNext()) {
    reread.push_back(std::get<std::string>(f.Field("AccountKey")));
  }
  EXPECT_EQ(reread, whole);

  Database again = Database::Open(File("s.DB"));
  Snapshot empty = again.OpenSnapshot("SELECT AccountKey FROM tAccount WHERE AccountKey = \"9\"",
                                      SnapshotKind::Forward);
  EXPECT_TRUE(empty.AtStart());
  EXPECT_TRUE(empty.AtEnd());
  EXPECT_EQ(empty.TotalRows(), 0);
  EXPECT_EQ(ErrorOf([&] { empty.MoveFirst(); }), kErrNoCurrentRecord);
  // Each forward snapshot keeps its rows in a temporary table until it is done with them.
  Snapshot open = again.OpenSnapshot(sql, SnapshotKind::Forward);
  auto spools = [&] {
    sqlite3_stmt* st = nullptr;
    sqlite3_prepare_v2(again.Handle(),
                       "SELECT count(*) FROM sqlite_temp_master WHERE type = 'table'", -1, &st,
                       nullptr);
    sqlite3_step(st);
    const int n = sqlite3_column_int(st, 0);
    sqlite3_finalize(st);
    return n;
  };
  EXPECT_EQ(spools(), 1);
  open.Close();
  EXPECT_EQ(spools(), 0);
}

// "(Select Distinct F From T)" reads the values kept as rows were appended; every way the
// table's rows change must leave the answer what the rows themselves give.
TEST_F(EngineTest, KeptDistinctValuesAnswerAsTheRowsDo) {
  Database d = Database::Create(File("k.DB"), kLocale);
  TableDef ledger("tLedger");
  ledger.Field("Id", FieldType::Long)
      .Field("AccountKey", FieldType::Text, 8)
      .Field("Memo", FieldType::Text, 8)
      .Index("PrimaryKey", {"Id", "AccountKey"}, true, true)
      .KeepDistinct("AccountKey");
  d.CreateTable(ledger);
  d.CreateTable(AccountDef());
  {
    TableRecordset a = d.OpenTable("tAccount");
    for (const char* key : {"1", "2", "3", "4", "א"}) AddAccount(a, key, "x");
  }
  const auto append = [&](std::vector<std::pair<int, std::string>> rows) {
    TableRecordset t = d.OpenTable("tLedger");
    for (const auto& [id, key] : rows) {
      t.AddNew();
      t.SetInt(0, id);
      t.SetText(1, key);
      try {
        t.Update();
      } catch (const EngineError&) {  // a repeated key is passed over
      }
    }
  };
  const auto members = [&](const std::string& in, const char* where = "") {
    std::string keys;
    Snapshot s = d.OpenSnapshot("SELECT AccountKey FROM tAccount WHERE AccountKey " + in +
                                    " (Select Distinct AccountKey From tLedger" + where +
                                    ") ORDER BY AccountKey",
                                SnapshotKind::Forward);
    for (; !s.AtEnd(); s.MoveNext()) keys += std::get<std::string>(s.Field(0));
    return keys;
  };
  const auto sql = [&](const char* statement) {
    sqlite3_stmt* st = nullptr;
    sqlite3_prepare_v2(d.Handle(), statement, -1, &st, nullptr);
    sqlite3_step(st);
    const int n = sqlite3_column_int(st, 0);
    sqlite3_finalize(st);
    return n;
  };
  const auto kept = [&] {
    return sql("SELECT count(*) FROM sqlite_master WHERE instr(name, '.distinct.') > 0");
  };
  EXPECT_EQ(members("In"), "");
  append({{1, "1"}, {2, "1"}, {2, "א"}, {2, "א"}});
  append({{3, "3"}, {4, "1"}});  // a second recordset adds to what is kept
  EXPECT_EQ(members("In"), "13א");
  EXPECT_EQ(members("Not In"), "24");
  // The answer comes from the kept values, and only for the bare subquery.
  sql("INSERT INTO \"tLedger.distinct.AccountKey\" VALUES ('4')");
  EXPECT_EQ(members("In"), "134א");
  EXPECT_EQ(members("In", " Where Id > 0"), "13א");
  d.Execute("DELETE FROM tLedger WHERE AccountKey = \"3\"");
  EXPECT_EQ(kept(), 0);  // a statement changed the rows: the table itself answers
  EXPECT_EQ(members("In"), "1א");
  append({{5, "2"}});
  EXPECT_EQ(members("In"), "12א");
  // Kept values come only from a text field of the primary key.
  TableDef wrong("tWrong");
  wrong.Field("Id", FieldType::Long).Field("K", FieldType::Text, 8).KeepDistinct("K");
  EXPECT_EQ(ErrorOf([&] { d.CreateTable(wrong); }), kErrEngine);
}

TEST_F(SnapshotTest, NullFieldsAndBooleansReadBack) {
  Snapshot s = db_->OpenSnapshot(
      "SELECT City, Include, CategoryCode, SortByKeyVal FROM tAccount WHERE AccountKey = "
      "\"2\"");
  EXPECT_TRUE(IsNull(s.Field("City")));
  EXPECT_TRUE(IsNull(s.Field("CategoryCode")));
  EXPECT_TRUE(IsNull(s.Field("SortByKeyVal")));
  EXPECT_EQ(std::get<int64_t>(s.Field("Include")), -1);
  db_->Execute("UPDATE tAccount SET Include = False WHERE AccountKey = \"2\"");
  Snapshot after = db_->OpenSnapshot("SELECT Include FROM tAccount WHERE Include = False");
  ASSERT_FALSE(after.AtEnd());
  EXPECT_EQ(std::get<int64_t>(after.Field(0)), 0);
}

TEST_F(SnapshotTest, QualifiedColumnsAreReachableByTheirFieldName) {
  Snapshot s = db_->OpenSnapshot(
      "SELECT tAccount.AccountKey, tAccount.City, '' As Zip, 1000 As Reference1 FROM tAccount "
      "ORDER BY tAccount.AccountKey");
  EXPECT_EQ(s.FieldName(0), "AccountKey");
  EXPECT_EQ(std::get<std::string>(s.Field("accountkey")), "1");
  EXPECT_EQ(std::get<std::string>(s.Field("tAccount.City")), "חיפה");
  EXPECT_EQ(std::get<int64_t>(s.Field("Reference1")), 1000);
  EXPECT_EQ(ErrorOf([&] { s.Field("Nope"); }), kErrNoSuchField);
  EXPECT_EQ(ErrorOf([&] { s.Field(4); }), kErrNoSuchField);
}

TEST_F(SnapshotTest, StatementErrorsCarryNumberAndStatement) {
  try {
    db_->OpenSnapshot("SELECT Nope FROM tAccount");
    FAIL();
  } catch (const EngineError& e) {
    EXPECT_EQ(e.number(), kErrSyntax);
    EXPECT_NE(std::string(e.description()).find("Nope"), std::string::npos);
  }
  EXPECT_EQ(ErrorOf([&] { db_->OpenSnapshot("SELECT * FROM tMissing"); }), kErrNoSuchObject);
}

TEST_F(SnapshotTest, ExecuteReturnsRowsChangedAndKeepsFieldRules) {
  EXPECT_EQ(db_->Execute("UPDATE tAccount SET CategoryCode = \"ב\" WHERE City Is Null"), 1);
  EXPECT_EQ(db_->Execute("UPDATE tAccount SET Include = True"), 3);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("UPDATE tAccount SET City = \"\""); }), kErrZeroLength);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("UPDATE tAccount SET CategoryCode = \"אבגד\""); }),
            kErrFieldTooSmall);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("UPDATE tAccount SET SortByKey = \"x\""); }),
            kErrDuplicateKey);
  // The failed statement left no row half-changed.
  EXPECT_EQ(Column(*db_, "SELECT SortByKey FROM tAccount ORDER BY AccountKey", "SortByKey"),
            (std::vector<std::string>{"1", "2", "3"}));
}

TEST_F(SnapshotTest, ExecutedInsertsKeepFieldRulesToo) {
  db_->CreateTable(NumbersDef());
  EXPECT_EQ(ErrorOf([&] {
              db_->Execute("INSERT INTO tAccount (AccountKey, City) VALUES (\"9\", \"\")");
            }),
            kErrZeroLength);
  EXPECT_EQ(
      ErrorOf([&] {
        db_->Execute("INSERT INTO tAccount (AccountKey, CategoryCode) VALUES (\"9\", \"abcd\")");
      }),
      kErrFieldTooSmall);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("INSERT INTO tNumbers (B) VALUES (256)"); }),
            kErrNumericOverflow);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("INSERT INTO tNumbers (I) VALUES (-32769)"); }),
            kErrNumericOverflow);
  EXPECT_EQ(db_->Execute("INSERT INTO tNumbers (B, I, Code) VALUES (255, -32768, \"abc\")"), 1);
  EXPECT_EQ(Count(*db_, "tAccount"), 3);
  EXPECT_EQ(Count(*db_, "tNumbers"), 1);
}

TEST_F(SnapshotTest, FieldRulesHoldOnBothPathsWhileARecordsetIsOpen) {
  TableRecordset rs = db_->OpenTable("tAccount");
  EXPECT_EQ(AddAccount(rs, "4", "דלת"), 0);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("UPDATE tAccount SET City = \"\""); }), kErrZeroLength);
  EXPECT_EQ(db_->Execute("UPDATE tAccount SET City = \"עכו\" WHERE AccountKey = \"4\""), 1);
  // Appends after the statements still refuse what they refused before.
  EXPECT_EQ(AddAccount(rs, "5", "הא"), 0);
  EXPECT_EQ(AddAccount(rs, "6", ""), kErrZeroLength);
  EXPECT_EQ(AddAccount(rs, "7", "ו", "123456789012345678901"), kErrFieldTooSmall);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("UPDATE tAccount SET CategoryCode = \"אבגד\""); }),
            kErrFieldTooSmall);
  rs.Close();
  EXPECT_EQ(Column(*db_, "SELECT City FROM tAccount WHERE AccountKey = \"4\"", "City"),
            (std::vector<std::string>{"עכו"}));
  EXPECT_EQ(Count(*db_, "tAccount"), 5);
}

TEST_F(SnapshotTest, WritingStatementOpenedAsSnapshotKeepsFieldRules) {
  EXPECT_EQ(ErrorOf([&] { db_->OpenSnapshot("UPDATE tAccount SET City = \"\""); }), kErrZeroLength);
  EXPECT_EQ(Count(*db_, "tAccount"), 3);
}

TEST_F(SnapshotTest, TheFileKeepsItsFieldRulesForOtherPrograms) {
  db_->Close();
  sqlite3* raw = nullptr;
  ASSERT_EQ(sqlite3_open(File("s.DB").c_str(), &raw), SQLITE_OK);
  RegisterHebrewCollation(raw);
  EXPECT_EQ(sqlite3_exec(raw, "UPDATE tAccount SET City = ''", nullptr, nullptr, nullptr),
            SQLITE_CONSTRAINT);
  EXPECT_EQ(sqlite3_extended_errcode(raw), SQLITE_CONSTRAINT_CHECK);
  sqlite3_close(raw);
}

// ---------------------------------------------------------------------------------------
// Links and stored queries

TEST_F(EngineTest, LinkReadsTheOtherFilesCurrentRows) {
  const fs::path selectDb = File("zdracc.DB");
  {
    Database sel = Database::Create(selectDb, kLocale, Durability::Durable);
    TableDef t("tSelectAccount");
    t.Field("AccountKey", FieldType::Text, 20)
        .Field("SortByKey", FieldType::Text, 20)
        .Field("SortByName", FieldType::Text, 100)
        .Field("Include", FieldType::Boolean)
        .Index("AccountKey", {"AccountKey"}, true, true)
        .Index("SortByKey", {"SortByKey"}, false, true);
    sel.CreateTable(t);
    TableRecordset rs = sel.OpenTable("tSelectAccount");
    rs.AddNew();
    rs.SetText(0, "1");
    rs.SetText(1, "1");
    rs.SetBool(3, true);
    rs.Update();
  }
  {
    Database work = Database::Create(File("zdrlab.DB"), kLocale);
    work.LinkTable("tSelectAccount", selectDb, "tSelectAccount");
    EXPECT_TRUE(work.HasTable("tSelectAccount"));
    EXPECT_EQ(Count(work, "tSelectAccount"), 1);
  }
  {
    // The picker writes through its own connection after the link was made.
    Database sel = Database::Open(selectDb);
    TableRecordset rs = sel.OpenTable("tSelectAccount");
    rs.AddNew();
    rs.SetText(0, "2");
    rs.SetText(1, "2");
    rs.SetBool(3, false);
    rs.Update();
  }
  Database work = Database::Open(File("zdrlab.DB"));
  EXPECT_EQ(Count(work, "tSelectAccount"), 2);
  EXPECT_EQ(Column(work, "SELECT SortByKey FROM tSelectAccount WHERE Include = True", "SortByKey"),
            std::vector<std::string>{"1"});
  const TableDef linked = work.Describe("tSelectAccount");
  EXPECT_EQ(linked.fields.size(), 4u);
  EXPECT_EQ(linked.indexes[0].name, "AccountKey");
}

TEST_F(EngineTest, StoredQueryReadsALinkAfterReopen) {
  const fs::path selectDb = File("zdracc.DB");
  {
    Database sel = Database::Create(selectDb, kLocale, Durability::Durable);
    sel.CreateTable(TableDef("tSelectAccount")
                        .Field("SortByKey", FieldType::Text, 20)
                        .Field("Include", FieldType::Boolean));
    TableRecordset rs = sel.OpenTable("tSelectAccount");
    for (bool include : {true, false}) {
      rs.AddNew();
      rs.SetText(0, include ? "1" : "2");
      rs.SetBool(1, include);
      rs.Update();
    }
  }
  {
    Database work = Database::Create(File("zdrlab.DB"), kLocale);
    work.LinkTable("tSelectAccount", selectDb, "tSelectAccount");
    work.CreateQuery("qTicked", "SELECT SortByKey FROM tSelectAccount WHERE Include = True");
    EXPECT_EQ(Count(work, "qTicked"), 1);
  }
  Database work = Database::Open(File("zdrlab.DB"));
  EXPECT_EQ(Column(work, "SELECT SortByKey FROM qTicked", "SortByKey"),
            std::vector<std::string>{"1"});
}

TEST_F(EngineTest, LinkToAMissingFileFailsAtOnceAndAtUse) {
  Database work = Database::Create(File("zdrlab.DB"), kLocale);
  EXPECT_EQ(ErrorOf([&] { work.LinkTable("tSelectAccount", File("none.DB"), "tSelectAccount"); }),
            kErrCannotOpen);
  EXPECT_FALSE(fs::exists(File("none.DB")));  // never created by the attempt
  EXPECT_FALSE(work.HasTable("tSelectAccount"));

  const fs::path selectDb = File("zdracc.DB");
  {
    Database sel = Database::Create(selectDb, kLocale, Durability::Durable);
    sel.CreateTable(TableDef("tSelectAccount").Field("SortByKey", FieldType::Text, 20));
  }
  EXPECT_EQ(ErrorOf([&] { work.LinkTable("tOther", selectDb, "tNoSuch"); }), kErrNoSuchObject);
  work.LinkTable("tSelectAccount", selectDb, "tSelectAccount");
  work.Close();
  fs::remove(selectDb);

  Database again = Database::Open(File("zdrlab.DB"));  // opens despite the missing file
  EXPECT_TRUE(again.HasTable("tSelectAccount"));
  try {
    again.OpenSnapshot("SELECT * FROM tSelectAccount");
    FAIL();
  } catch (const EngineError& e) {
    EXPECT_EQ(e.number(), kErrCannotOpen);
    EXPECT_NE(std::string(e.description()).find("zdracc.DB"), std::string::npos);
  }
}

TEST_F(EngineTest, StoredQueryIsKeptAndUsableByName) {
  const std::string jet =
      "SELECT tStockLine.HeadIndx FROM tItem INNER JOIN tStockLine ON tItem.ItemKey = "
      "tStockLine.ItemKey GROUP BY tStockLine.HeadIndx";
  {
    Database db = Database::Create(File("q.DB"), kLocale);
    db.CreateTable(TableDef("tItem")
                       .Field("ItemKey", FieldType::Text, 20)
                       .Index("PrimaryKey", {"ItemKey"}, true, true));
    db.CreateTable(TableDef("tStockLine")
                       .Field("HeadIndx", FieldType::Long)
                       .Field("ItemKey", FieldType::Text, 20));
    db.CreateQuery("qHeadByItem", jet);
    EXPECT_EQ(ErrorOf([&] { db.CreateQuery("qHeadByItem", jet); }), kErrObjectExists);
    TableRecordset items = db.OpenTable("tItem");
    items.AddNew();
    items.SetText(0, "A");
    items.Update();
    TableRecordset lines = db.OpenTable("tStockLine");
    for (int head : {1, 1, 2}) {
      lines.AddNew();
      lines.SetInt(0, head);
      lines.SetText(1, head == 2 ? "B" : "A");
      lines.Update();
    }
  }
  Database db = Database::Open(File("q.DB"));
  EXPECT_EQ(db.QueryNames(), std::vector<std::string>{"qHeadByItem"});
  EXPECT_EQ(db.QuerySql("qHeadByItem"), jet);
  EXPECT_EQ(ErrorOf([&] { db.QuerySql("qNone"); }), kErrNoSuchObject);
  Snapshot s = db.OpenSnapshot("SELECT HeadIndx FROM qHeadByItem");
  s.MoveLast();
  EXPECT_EQ(s.RecordCount(), 1);
  EXPECT_EQ(std::get<int64_t>(s.Field("HeadIndx")), 1);
}

// ---------------------------------------------------------------------------------------
// Hebrew collation and LIKE

class CollationTest : public EngineTest {
 protected:
  void Fill(const std::vector<std::string>& names) {
    db_.emplace(Database::Create(File("c.DB"), kLocale));
    db_->CreateTable(TableDef("tName")
                         .Field("Id", FieldType::Long)
                         .Field("Name", FieldType::Text, 50)
                         .Index("Name", {"Name"}, false, true));
    TableRecordset rs = db_->OpenTable("tName");
    int id = 0;
    for (const std::string& n : names) {
      rs.AddNew();
      rs.SetInt(0, ++id);
      rs.SetText(1, n);
      rs.Update();
    }
  }
  std::vector<std::string> Names(const std::string& where = "", const char* order = "ASC") {
    return Column(*db_, "SELECT Name FROM tName " + where + " ORDER BY Name " + order, "Name");
  }
  std::optional<Database> db_;
};

TEST_F(CollationTest, HebrewDictionaryOrderKeepsFinalLettersWithTheirBase) {
  Fill({"אבל", "אבךב", "אבכא", "ת", "אבך", "אבכ", "ב"});
  // By code point ך comes before כ; in the dictionary they are one letter.
  EXPECT_EQ(Names(), (std::vector<std::string>{"אבכ", "אבך", "אבכא", "אבךב", "אבל", "ב", "ת"}));
  EXPECT_EQ(Names("", "DESC").front(), "ת");
}

TEST_F(CollationTest, MixedLatinAndHebrewOrder) {
  Fill({"תל אביב", "Haifa", "אילת", "haifa", "Akko", "12", "באר שבע"});
  EXPECT_EQ(Names(), (std::vector<std::string>{"12", "אילת", "באר שבע", "תל אביב", "Akko", "haifa",
                                               "Haifa"}));
}

TEST_F(CollationTest, NamesTheCollatorRanksEqualAreNeverMerged) {
  const std::string composed = "Caf\xc3\xa9";     // é as one code point
  const std::string decomposed = "Cafe\xcc\x81";  // e and a combining acute
  ASSERT_NE(CompareHebrew(composed, decomposed), 0);
  Fill({composed, decomposed});  // both pass the unique index
  EXPECT_EQ(Column(*db_, "SELECT DISTINCT Name FROM tName", "Name").size(), 2u);
  EXPECT_EQ(Count(*db_, "tName WHERE Name = \"" + composed + "\""), 1);
}

TEST_F(CollationTest, CompareHebrewIsATotalOrder) {
  EXPECT_EQ(CompareHebrew("כהן", "כהן"), 0);
  EXPECT_LT(CompareHebrew("כהן", "לוי"), 0);
  EXPECT_GT(CompareHebrew("לוי", "כהן"), 0);
  EXPECT_LT(CompareHebrew("", "א"), 0);
  // Bytes that are not UTF-8 still compare, consistently.
  const int ab = CompareHebrew("\xff\x01", "\xff\x02");
  EXPECT_NE(ab, 0);
  EXPECT_EQ(CompareHebrew("\xff\x02", "\xff\x01"), -ab);
}

// Texts of printable ASCII alone are ordered without ICU; the order must be ICU's to the pair.
int Sign(int v) {
  return (v > 0) - (v < 0);
}

TEST(AsciiShortcutTest, IsInUseWhereIcuHasItsData) {
  EXPECT_TRUE(HasAsciiShortcut());
}

TEST(AsciiShortcutTest, AgreesWithIcuOnEveryPairOfShortTexts) {
  // Every text of up to three printable characters. Both orders are total (bytes break the
  // collator's ties), so if neighbours in one's sorted order are in the other's order too,
  // the two agree on every pair: 860,000 texts checked in full without 10^11 comparisons.
  std::vector<std::string> texts(1);
  for (int a = 0x20; a <= 0x7E; ++a) {
    texts.emplace_back(1, static_cast<char>(a));
    for (int b = 0x20; b <= 0x7E; ++b) {
      texts.push_back({static_cast<char>(a), static_cast<char>(b)});
      for (int c = 0x20; c <= 0x7E; ++c) {
        texts.push_back({static_cast<char>(a), static_cast<char>(b), static_cast<char>(c)});
      }
    }
  }
  std::sort(texts.begin(), texts.end(),
            [](const std::string& x, const std::string& y) { return CompareHebrew(x, y) < 0; });
  int disagreements = 0;
  for (size_t i = 1; i < texts.size() && disagreements < 5; ++i) {
    if (CompareHebrewWithIcu(texts[i - 1], texts[i]) >= 0) {
      ADD_FAILURE() << "\"" << texts[i - 1] << "\" before \"" << texts[i] << "\"";
      ++disagreements;
    }
  }
  // And pair by pair for every text of one character against every text of up to two.
  for (const std::string& x : texts) {
    if (x.size() > 2) continue;
    for (int a = 0x20; a <= 0x7E; ++a) {
      const std::string y(1, static_cast<char>(a));
      ASSERT_EQ(Sign(CompareHebrew(x, y)), Sign(CompareHebrewWithIcu(x, y))) << x << " " << y;
      ASSERT_EQ(Sign(CompareHebrew(y, x)), Sign(CompareHebrewWithIcu(y, x))) << y << " " << x;
    }
  }
}

TEST(AsciiShortcutTest, AgreesWithIcuOnAMillionRandomPairs) {
  std::mt19937 rng(20240611);
  const std::string alphabets[] = {
      "0123456789",
      " -./,'\"()",
      "abcABCxyzXYZ",
      " !\"#$%&'()*+,-./"
      "0123456789:;<=>?@ABCDEFGHIJKLMNOPQRSTUVWXYZ[\\]^_`abcdefghijklmnopqrstuvwxyz"
      "{|}~",
  };
  // Now and then a byte the shortcut must leave to ICU: a tab, DEL, a Hebrew letter, é.
  const std::string outsiders[] = {"\t", "\x7f", "\xd7\x90", "\xc3\xa9", "\x1f"};
  auto text = [&](const std::string& alphabet, size_t len) {
    std::string t;
    for (size_t i = 0; i < len; ++i) t += alphabet[rng() % alphabet.size()];
    if (rng() % 50 == 0) t.insert(rng() % (t.size() + 1), outsiders[rng() % 5]);
    return t;
  };
  for (int i = 0; i < 1'000'000; ++i) {
    const std::string& alphabet = alphabets[rng() % 4];
    std::string x = text(alphabet, rng() % 13);
    std::string y;
    switch (rng() % 4) {
      case 0:  // a prefix of the other
        y = x.substr(0, rng() % (x.size() + 1));
        break;
      case 1:  // the same with one character changed
        y = x;
        if (!y.empty()) y[rng() % y.size()] = alphabet[rng() % alphabet.size()];
        break;
      case 2:  // the same with one letter's case changed, or longer
        y = x;
        if (!y.empty()) y[rng() % y.size()] ^= 0x20;
        if (rng() % 2) y += alphabet[rng() % alphabet.size()];
        break;
      default:
        y = text(alphabet, rng() % 13);
        break;
    }
    ASSERT_EQ(Sign(CompareHebrew(x, y)), Sign(CompareHebrewWithIcu(x, y)))
        << "\"" << x << "\" and \"" << y << "\"";
  }
}

TEST_F(CollationTest, AsciiKeysInAnIndexFollowIcuOrder) {
  std::mt19937 rng(7);
  const std::string alphabet = " -.0123456789aAbBzZ/";
  std::vector<std::string> keys;
  for (int i = 0; i < 3000; ++i) {
    std::string k;
    for (size_t n = 1 + rng() % 8; n > 0; --n) k += alphabet[rng() % alphabet.size()];
    if (std::find(keys.begin(), keys.end(), k) == keys.end()) keys.push_back(k);
  }
  Fill(keys);
  std::sort(keys.begin(), keys.end(), [](const std::string& x, const std::string& y) {
    return CompareHebrewWithIcu(x, y) < 0;
  });
  EXPECT_EQ(Names(), keys);
}

TEST_F(CollationTest, LikeUsesJetWildcardsAndTakesPercentLiterally) {
  Fill({"100% כותנה", "1000 כותנה", "a_b", "axb", "תל אביב"});
  EXPECT_EQ(Names("WHERE Name LIKE \"100%*\""), std::vector<std::string>{"100% כותנה"});
  EXPECT_EQ(Names("WHERE Name LIKE \"a_b\""), std::vector<std::string>{"a_b"});
  EXPECT_EQ(Names("WHERE Name LIKE \"A?B\""), (std::vector<std::string>{"a_b", "axb"}));
  EXPECT_EQ(Names("WHERE Name LIKE \"תל*\""), std::vector<std::string>{"תל אביב"});
  EXPECT_EQ(Names("WHERE Name LIKE \"*\"").size(), 5u);
  EXPECT_EQ(Names("WHERE Name NOT LIKE \"*כותנה\"").size(), 3u);
}

TEST_F(CollationTest, LikeOverNullGivesNoRow) {
  db_.emplace(Database::Create(File("ln.DB"), kLocale));
  db_->CreateTable(AccountDef());
  {
    TableRecordset rs = db_->OpenTable("tAccount");
    AddAccount(rs, "1", "א");  // City Null
    AddAccount(rs, "2", "ב", std::nullopt, "חיפה");
  }
  EXPECT_EQ(Column(*db_, "SELECT AccountKey FROM tAccount WHERE City LIKE \"*\"", "AccountKey"),
            std::vector<std::string>{"2"});
}

TEST_F(CollationTest, LikeWithEscapeIsRefused) {
  Fill({"a"});
  sqlite3_stmt* st = nullptr;
  ASSERT_EQ(sqlite3_prepare_v2(db_->Handle(), "SELECT 'a' LIKE 'a' ESCAPE '!'", -1, &st, nullptr),
            SQLITE_OK);
  EXPECT_EQ(sqlite3_step(st), SQLITE_ERROR);
  sqlite3_finalize(st);
}

}  // namespace
}  // namespace zdr::db
