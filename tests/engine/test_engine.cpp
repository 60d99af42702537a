// The database engine: its files, table definitions, appended rows and what they refuse,
// snapshots, statements, links, and the Hebrew collation every connection carries. Jet's LIKE
// is checked in test_jetsql (and in SQL through the picker's filter in test_statements), the
// tables the system defines in test_schema.
#include <gtest/gtest.h>
#include <sqlite3.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <functional>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

#include "engine/collation.h"
#include "engine/engine.h"
#include "support/scratchtemp.h"

namespace zdr::db {
namespace {

namespace fs = std::filesystem;
using Texts = std::vector<std::string>;

constexpr const char* kLocale = ";LANGID=0x040D;CP=1255;COUNTRY=0";

TableDef AccountDef() {
  return TableDef("tAccount")
      .Field("AccountKey", FieldType::Text, 20)
      .Field("AccountName", FieldType::Text, 100)
      .Field("CategoryCode", FieldType::Text, 3)
      .Field("City", FieldType::Text, 50)
      .Field("Include", FieldType::Boolean)
      .Field("SortByKey", FieldType::Text, 20)
      .Index("PrimaryKey", {"AccountKey"}, true, true)
      .Index("SortByKey", {"SortByKey"}, false, true);
}

TableDef NumbersDef() {
  return TableDef("tNumbers")
      .Field("B", FieldType::Byte)
      .Field("I", FieldType::Integer)
      .Field("L", FieldType::Long)
      .Field("D", FieldType::Double)
      .Field("When", FieldType::Date)
      .Field("Flag", FieldType::Boolean)
      .Field("Code", FieldType::Text, 3);
}

struct Outcome {
  int number = 0;  // 0 when nothing was raised
  std::string description;
};
Outcome Try(const std::function<void()>& f) {
  try {
    f();
  } catch (const EngineError& e) {
    return {e.number(), e.description()};
  }
  return {};
}
int ErrorOf(const std::function<void()>& f) {
  return Try(f).number;
}

// Appends one account; returns the engine error number, 0 when stored.
int AddAccount(TableRecordset& rs, const std::string& key, const std::string& name,
               const std::string& city = "", std::optional<std::string> sortKey = std::nullopt) {
  return ErrorOf([&] {
    rs.AddNew();
    rs.SetText(rs.FieldIndex("AccountKey"), key);
    rs.SetText(rs.FieldIndex("AccountName"), name);
    rs.SetText(rs.FieldIndex("SortByKey"), sortKey.value_or(key));
    if (!city.empty()) rs.SetText(rs.FieldIndex("City"), city);
    rs.SetBool(rs.FieldIndex("Include"), true);
    rs.Update();
  });
}

// The first column of every row, as text.
Texts Column(Database& db, const std::string& sql) {
  Texts out;
  for (Snapshot s = db.OpenSnapshot(sql); !s.AtEnd(); s.MoveNext()) {
    const Value& v = s.Field(0);
    out.push_back(IsNull(v)                            ? "<null>"
                  : std::holds_alternative<int64_t>(v) ? std::to_string(std::get<int64_t>(v))
                                                       : std::get<std::string>(v));
  }
  return out;
}

std::string Count(Database& db, const std::string& from) {
  return Column(db, "SELECT Count(*) FROM " + from).at(0);
}

class EngineTest : public ::testing::Test {
 protected:
  fs::path File(const std::string& name) const { return temp_.dir() / name; }
  test::ScratchTemp temp_;
};

// ---------------------------------------------------------------------------------------
// Files and definitions

TEST_F(EngineTest, FilesAreMadeOnlyNewAndOpenedOnlyWhenTheEngineMadeThem) {
  { std::ofstream(File("old.DB")) << "keep me"; }
  { std::ofstream(File("junk.DB"), std::ios::binary) << std::string(5000, '\x5a'); }
  // A hot journal left by a crashed run of an earlier file of the same name is not replayed.
  { std::ofstream(File("d.DB-journal"), std::ios::binary) << std::string(4096, '\x01'); }
  sqlite3* raw = nullptr;  // an SQLite file of another program
  ASSERT_EQ(sqlite3_open(File("plain.db").c_str(), &raw), SQLITE_OK);
  sqlite3_exec(raw, "CREATE TABLE t (a)", nullptr, nullptr, nullptr);
  sqlite3_close(raw);
  const std::pair<std::function<void()>, int> cases[] = {
      {[&] { Database::Create(File("old.DB"), kLocale); }, kErrFileExists},
      {[&] { Database::Open(File("missing.DB")); }, kErrCannotOpen},
      {[&] { Database::Open(File("junk.DB")); }, kErrCannotOpen},
      {[&] { Database::Open(File("plain.db")); }, kErrCannotOpen}};
  for (size_t i = 0; i < std::size(cases); ++i) {
    EXPECT_EQ(ErrorOf(cases[i].first), cases[i].second) << i;
  }
  EXPECT_NE(Try(cases[1].first).description.find("missing.DB"), std::string::npos);
  EXPECT_FALSE(fs::exists(File("missing.DB")));
  EXPECT_EQ(fs::file_size(File("old.DB")), 7u);  // left as it was
  Database::Create(File("d.DB"), kLocale).CreateTable(AccountDef());
  EXPECT_FALSE(fs::exists(File("d.DB-journal")));
  Database db = Database::Open(File("d.DB"));
  EXPECT_TRUE(db.HasTable("TACCOUNT") && !db.HasTable("tItem"));
  EXPECT_EQ(ErrorOf([&] { db.Describe("tNothing"); }), kErrNoSuchObject);
}

TEST_F(EngineTest, BadDefinitionsAreRefusedBeforeAnythingIsCreated) {
  Database db = Database::Create(File("bad.DB"), kLocale);
  db.CreateTable(AccountDef());
  auto w = [] { return TableDef("tW").Field("A", FieldType::Long); };
  const std::pair<TableDef, int> cases[] = {
      {TableDef("TACCOUNT").Field("A", FieldType::Long), kErrObjectExists},
      {TableDef("tW"), kErrEngine},
      {TableDef("tW").Field("A", FieldType::Text, 256), kErrEngine},
      {w().Field("a", FieldType::Long), kErrObjectExists},
      {w().Index("PrimaryKey", {"B"}, true, true), kErrNoSuchField},
      {w().Index("X", {"A"}, false, false).Index("x", {"A"}, false, true), kErrObjectExists},
      {w().Field("B", FieldType::Long).Index("P", {"A"}, true, true).Index("Q", {"B"}, true, true),
       kErrEngine}};
  for (size_t i = 0; i < std::size(cases); ++i) {
    EXPECT_EQ(ErrorOf([&] { db.CreateTable(cases[i].first); }), cases[i].second) << i;
  }
  EXPECT_FALSE(db.HasTable("tW"));
}

// ---------------------------------------------------------------------------------------
// Appending rows

TEST_F(EngineTest, RowsAreCheckedAndConvertedToTheFieldTypes) {
  Database db = Database::Create(File("r.DB"), kLocale);
  db.CreateTable(NumbersDef());
  TableRecordset rs = db.OpenTable("tNumbers");
  EXPECT_EQ(ErrorOf([&] { rs.SetInt(0, 1); }), kErrNotEditing);
  rs.AddNew();
  rs.Update();
  EXPECT_EQ(ErrorOf([&] { rs.Update(); }), kErrNotEditing);  // no second copy of the row
  auto add = [&](const char* field, const Value& v) {
    return ErrorOf([&] {
      rs.AddNew();
      rs.Set(field, v);
      rs.Update();
    });
  };
  // Three Hebrew letters (six bytes) fit in Text(3); a cut UTF-8 sequence is no text.
  const std::pair<std::string, int> texts[] = {
      {"", kErrZeroLength}, {"אבג", 0}, {"אבגד", kErrFieldTooSmall}, {"\xd7", kErrTypeConversion}};
  for (const auto& [text, error] : texts) EXPECT_EQ(add("code", text), error) << text;
  using Range = std::tuple<const char*, int64_t, int64_t>;
  for (auto [field, lo, hi] :
       {Range{"B", 0, 255}, {"I", -32768, 32767}, {"L", INT32_MIN, INT32_MAX}}) {
    EXPECT_EQ(add(field, lo) + add(field, hi), 0) << field;
    EXPECT_EQ(add(field, lo - 1), kErrNumericOverflow) << field;
    EXPECT_EQ(add(field, hi + 1), kErrNumericOverflow) << field;
  }
  EXPECT_EQ(add("I", 32767.5), kErrNumericOverflow);
  EXPECT_EQ(add("L", NAN), kErrNumericOverflow);
  EXPECT_EQ(add("L", std::string("12x")), kErrTypeConversion);
  EXPECT_EQ(Count(db, "tNumbers"), "8");
  // What is stored is converted as the desktop engine converts.
  rs.AddNew();
  rs.SetDouble(1, 2.5);  // half to even
  rs.SetText(2, " 42 ");
  rs.SetDate(4, Date::FromParts(2024, 2, 29));
  rs.SetInt(5, 5);
  rs.SetInt(rs.FieldIndex("code"), 123);
  rs.Update();
  rs.Close();
  Snapshot s = db.OpenSnapshot("SELECT * FROM tNumbers WHERE L = 42");
  EXPECT_EQ(std::get<int64_t>(s.Field("I")), 2);
  EXPECT_EQ(std::get<double>(s.Field("When")), Date::FromParts(2024, 2, 29).serial);
  EXPECT_EQ(std::get<int64_t>(s.Field("Flag")), -1);
  EXPECT_EQ(std::get<std::string>(s.Field("Code")), "123");
  EXPECT_TRUE(IsNull(s.Field("B")));
}

// The rows appended stay in the file when the recordset goes, also after its Database;
// recordsets open together share one transaction that the last one to close commits.
TEST_F(EngineTest, AppendedRowsReachTheFileWhenTheLastRecordsetCloses) {
  {
    Database db = Database::Create(File("t.DB"), kLocale, Durability::Durable);
    db.CreateTable(AccountDef());
    db.CreateTable(NumbersDef());
  }
  std::optional<TableRecordset> accounts;
  Database reader = Database::Open(File("t.DB"));
  {
    Database db = Database::Open(File("t.DB"));
    accounts.emplace(db.OpenTable("tAccount"));
    TableRecordset numbers = db.OpenTable("tNumbers");
    numbers.AddNew();
    numbers.Update();
    EXPECT_EQ(AddAccount(*accounts, "1", "ראשון"), 0);
    EXPECT_EQ(Count(db, "tAccount"), "1");  // the writer sees its rows, others not yet
    EXPECT_EQ(Count(reader, "tAccount"), "0");
    numbers.Close();
    EXPECT_EQ(Count(reader, "tNumbers"), "0");
  }
  EXPECT_EQ(AddAccount(*accounts, "2", "עדיין פתוח"), 0);
  accounts.reset();
  EXPECT_EQ(Count(reader, "tAccount"), "2");
  EXPECT_EQ(Count(reader, "tNumbers"), "1");
}

// ---------------------------------------------------------------------------------------
// Snapshots and statements

class SnapshotTest : public EngineTest {
 protected:
  void SetUp() override {
    db_.emplace(Database::Create(File("s.DB"), kLocale));
    db_->CreateTable(AccountDef());
    TableRecordset rs = db_->OpenTable("tAccount");
    AddAccount(rs, "1", "אלף", "חיפה");
    AddAccount(rs, "2", "בית");
    AddAccount(rs, "3", "גימל", "אילת");
  }
  std::optional<Database> db_;
};

TEST_F(SnapshotTest, KeysRefuseRepeatsAndNullsAndTheRefusalNamesTheIndex) {
  TableRecordset rs = db_->OpenTable("tAccount");
  EXPECT_EQ(AddAccount(rs, "1", "אחר", "", "999"), kErrDuplicateKey);  // primary
  EXPECT_EQ(AddAccount(rs, "4", "אחר", "", "2"), kErrDuplicateKey);    // SortByKey only
  // The row stays current after a refusal; each refusal names its index or field.
  EXPECT_NE(Try([&] { rs.Update(); }).description.find("'SortByKey'"), std::string::npos);
  rs.SetText(rs.FieldIndex("City"), "");
  EXPECT_NE(Try([&] { rs.Update(); }).description.find("'City'"), std::string::npos);
  // No Null in the primary key; a unique index takes any number of Nulls.
  for (const char* key : {"", "5", "6"}) {
    rs.AddNew();
    if (*key) rs.SetText(0, key);
    EXPECT_EQ(ErrorOf([&] { rs.Update(); }), *key ? 0 : kErrNullKey) << key;
  }
  rs.Close();
  EXPECT_EQ(Column(*db_, "SELECT AccountName FROM tAccount ORDER BY AccountKey"),
            (Texts{"אלף", "בית", "גימל", "<null>", "<null>"}));
}

// Fields are found by their name, also qualified, or by their place.
TEST_F(SnapshotTest, NavigationAndRecordCountFollowTheDesktopEngine) {
  Snapshot s = db_->OpenSnapshot(
      "SELECT tAccount.AccountKey, tAccount.City FROM tAccount ORDER BY AccountKey");
  EXPECT_FALSE(s.AtStart() || s.AtEnd());
  EXPECT_EQ(s.TotalRows(), 3);
  EXPECT_EQ(s.RecordCount(), 1);
  EXPECT_EQ(std::get<std::string>(s.Field("accountkey")), "1");
  EXPECT_EQ(std::get<std::string>(s.Field("tAccount.City")), "חיפה");
  EXPECT_EQ(ErrorOf([&] { s.Field("Nope"); }) + ErrorOf([&] { s.Field(2); }), 2 * kErrNoSuchField);
  s.MoveNext();
  EXPECT_EQ(s.RecordCount(), 2);
  s.MoveLast();
  EXPECT_EQ(s.RecordCount(), 3);
  EXPECT_EQ(std::get<std::string>(s.Field(0)), "3");
  s.MoveNext();
  EXPECT_TRUE(s.AtEnd());
  EXPECT_EQ(ErrorOf([&] { s.Field(0); }) + ErrorOf([&] { s.MoveNext(); }), 2 * kErrNoCurrentRecord);
  s.MoveFirst();
  s.MovePrevious();
  EXPECT_TRUE(s.AtStart() && !s.AtEnd());
  EXPECT_EQ(ErrorOf([&] { s.Field("AccountKey"); }), kErrNoCurrentRecord);
  for (SnapshotKind kind : {SnapshotKind::Whole, SnapshotKind::Forward}) {
    Snapshot none = db_->OpenSnapshot("SELECT AccountKey FROM tAccount WHERE 1 = 0", kind);
    EXPECT_TRUE(none.AtStart() && none.AtEnd());
    EXPECT_EQ(none.TotalRows() + none.RecordCount(), 0);
    EXPECT_EQ(ErrorOf([&] { none.MoveFirst(); }) + ErrorOf([&] { none.MoveLast(); }),
              2 * kErrNoCurrentRecord);
  }
  EXPECT_EQ(ErrorOf([&] { db_->OpenSnapshot("SELECT * FROM tMissing"); }), kErrNoSuchObject);
}

// A forward snapshot gives the rows in the statement's order, knows their number at once,
// refuses to move back but reads them again from the first, and leaves nothing behind in the
// database.
TEST_F(SnapshotTest, ForwardSnapshotStreamsTheRowsAndCountsThemAtOpen) {
  const char* sql = "SELECT AccountKey, City FROM tAccount ORDER BY AccountName DESC";
  const char* spools = "SELECT count(*) FROM sqlite_temp_master WHERE type = 'table'";
  Snapshot f = db_->OpenSnapshot(sql, SnapshotKind::Forward);
  EXPECT_EQ(Column(*db_, spools), Texts{"1"});  // its rows wait in a temporary table
  EXPECT_EQ(f.TotalRows(), 3);
  f.MoveFirst();  // already there
  db_->Close();   // the snapshot keeps the connection it reads through
  Texts rows;
  for (; !f.AtEnd(); f.MoveNext()) {
    rows.push_back(std::get<std::string>(f.Field("AccountKey")));
    if (IsNull(f.Field(1))) rows.back() += " without a city";
    if (rows.size() == 2) {
      EXPECT_EQ(ErrorOf([&] { f.MovePrevious(); }), kErrForwardOnly);
      EXPECT_EQ(ErrorOf([&] { f.MoveLast(); }), kErrForwardOnly);
    }
  }
  EXPECT_EQ(rows, (Texts{"3", "2 without a city", "1"}));
  EXPECT_EQ(f.RecordCount(), 3);
  EXPECT_EQ(ErrorOf([&] { f.MoveNext(); }), kErrNoCurrentRecord);
  Texts reread;
  for (f.MoveFirst(); !f.AtEnd(); f.MoveNext()) {
    reread.push_back(std::get<std::string>(f.Field("AccountKey")));
  }
  EXPECT_EQ(reread, (Texts{"3", "2", "1"}));
  db_.emplace(Database::Open(File("s.DB")));
  db_->OpenSnapshot(sql, SnapshotKind::Forward).Close();
  EXPECT_EQ(Column(*db_, spools), Texts{"0"});
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
      ErrorOf([&] { t.Update(); });  // a repeated key is passed over
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
  EXPECT_EQ(members("In"), "");
  append({{1, "1"}, {2, "1"}, {2, "א"}, {2, "א"}});
  append({{3, "3"}, {4, "1"}});  // a second recordset adds to what is kept
  EXPECT_EQ(members("In"), "13א");
  EXPECT_EQ(members("Not In"), "24");
  // The answer comes from the kept values, and only for the bare subquery.
  sqlite3_exec(d.Handle(), "INSERT INTO \"tLedger.distinct.AccountKey\" VALUES ('4')", nullptr,
               nullptr, nullptr);
  EXPECT_EQ(members("In"), "134א");
  EXPECT_EQ(members("In", " Where Id > 0"), "13א");
  d.Execute("DELETE FROM tLedger WHERE AccountKey = \"3\"");
  // A statement changed the rows: the table itself answers.
  EXPECT_EQ(Count(d, "sqlite_master WHERE instr(name, '.distinct.') > 0"), "0");
  EXPECT_EQ(members("In"), "1א");
  append({{5, "2"}});
  EXPECT_EQ(members("In"), "12א");
  // Kept values come only from a text field of the primary key.
  TableDef wrong("tWrong");
  wrong.Field("Id", FieldType::Long).Field("K", FieldType::Text, 8).KeepDistinct("K");
  EXPECT_EQ(ErrorOf([&] { d.CreateTable(wrong); }), kErrEngine);
}

// Rows that statements write keep the field rules, whichever way the statement is sent and
// while a recordset appends with its own checks.
TEST_F(SnapshotTest, StatementsThatWriteKeepTheFieldRules) {
  db_->CreateTable(NumbersDef());
  const std::pair<const char*, int> refused[] = {
      {"UPDATE tAccount SET City = \"\"", kErrZeroLength},
      {"UPDATE tAccount SET CategoryCode = \"אבגד\"", kErrFieldTooSmall},
      {"UPDATE tAccount SET SortByKey = \"x\"", kErrDuplicateKey},
      {"INSERT INTO tNumbers (I) VALUES (-32769)", kErrNumericOverflow}};
  for (bool appending : {false, true}) {
    std::optional<TableRecordset> rs;
    if (appending) rs.emplace(db_->OpenTable("tAccount"));
    for (const auto& [sql, error] : refused) {
      EXPECT_EQ(ErrorOf([&] { db_->Execute(sql); }), error) << sql;
      EXPECT_EQ(ErrorOf([&] { db_->OpenSnapshot(sql); }), error) << sql;
    }
    if (!appending) {  // the failed statements left no row half-changed
      EXPECT_EQ(Column(*db_, "SELECT SortByKey FROM tAccount ORDER BY AccountKey"),
                (Texts{"1", "2", "3"}));
    }
    if (rs) {  // appends after the statements still refuse what they refused before
      EXPECT_EQ(AddAccount(*rs, "4", ""), kErrZeroLength);
      EXPECT_EQ(AddAccount(*rs, "5", "ו", "", "123456789012345678901"), kErrFieldTooSmall);
      EXPECT_EQ(AddAccount(*rs, "4", "דלת"), 0);
    }
  }
  EXPECT_EQ(db_->Execute("UPDATE tAccount SET Include = False WHERE City Is Null"), 2);
  EXPECT_EQ(db_->Execute("INSERT INTO tNumbers (B, I, Code) VALUES (255, -32768, \"abc\")"), 1);
  EXPECT_EQ(ErrorOf([&] { db_->Execute("UPDATE tNumbers SET B = B + 1"); }), kErrNumericOverflow);
}

// ---------------------------------------------------------------------------------------
// Links (read through in test_statements; a missing file at link time in test_schema)

TEST_F(EngineTest, LinkToAMissingFileFailsAtUse) {
  Database work = Database::Create(File("zdrlab.DB"), kLocale);
  const fs::path selectDb = File("zdracc.DB");
  Database::Create(selectDb, kLocale, Durability::Durable).CreateTable(AccountDef());
  EXPECT_EQ(ErrorOf([&] { work.LinkTable("tOther", selectDb, "tNoSuch"); }), kErrNoSuchObject);
  work.LinkTable("tSelectAccount", selectDb, "tAccount");
  work.Close();
  fs::remove(selectDb);
  Database again = Database::Open(File("zdrlab.DB"));  // opens despite the missing file
  const Outcome use = Try([&] { again.OpenSnapshot("SELECT * FROM tSelectAccount"); });
  EXPECT_EQ(use.number, kErrCannotOpen);
  EXPECT_NE(use.description.find("zdracc.DB"), std::string::npos);
}

// ---------------------------------------------------------------------------------------
// Hebrew collation

TEST_F(EngineTest, DictionaryOrderWithFinalLettersBesideTheirBaseAndLatinAfterHebrew) {
  Database db = Database::Create(File("c.DB"), kLocale);
  db.CreateTable(
      TableDef("tName").Field("Name", FieldType::Text, 50).Index("N", {"Name"}, false, true));
  const std::pair<Texts, Texts> cases[] = {
      // By code point ך comes before כ; in the dictionary they are one letter.
      {{"אבל", "אבךב", "אבכא", "ת", "אבך", "אבכ", "ב"},
       {"אבכ", "אבך", "אבכא", "אבךב", "אבל", "ב", "ת"}},
      {{"תל אביב", "Haifa", "אילת", "haifa", "Akko", "12", "באר שבע"},
       {"12", "אילת", "באר שבע", "תל אביב", "Akko", "haifa", "Haifa"}},
      // The collator ranks é as one code point and as e with an accent equal; both are
      // kept (the index is unique) and their bytes order them.
      {{"Caf\xc3\xa9", "Cafe\xcc\x81"}, {"Cafe\xcc\x81", "Caf\xc3\xa9"}}};
  for (const auto& [names, order] : cases) {
    db.Execute("DELETE FROM tName");
    TableRecordset rs = db.OpenTable("tName");
    for (const std::string& n : names) {
      rs.AddNew();
      rs.SetText(0, n);
      rs.Update();
    }
    rs.Close();
    EXPECT_EQ(Column(db, "SELECT Name FROM tName ORDER BY Name"), order);
    EXPECT_EQ(Column(db, "SELECT Name FROM tName ORDER BY Name DESC"),
              Texts(order.rbegin(), order.rend()));
  }
  EXPECT_EQ(Column(db, "SELECT DISTINCT Name FROM tName").size(), 2u);
  EXPECT_EQ(Count(db, "tName WHERE Name = \"Caf\xc3\xa9\""), "1");
  // Bytes that are not UTF-8 still compare, consistently.
  EXPECT_EQ(CompareHebrew("\xff\x01", "\xff\x02"), -CompareHebrew("\xff\x02", "\xff\x01"));
  EXPECT_NE(CompareHebrew("\xff\x01", "\xff\x02"), 0);
}

// Texts of printable ASCII alone are ordered without ICU; the order must be ICU's to the pair,
// also next to the bytes just outside that range (0x1F and DEL), which go to ICU.
TEST(AsciiShortcutTest, AgreesWithIcuOnEveryPairOfShortTexts) {
  ASSERT_TRUE(HasAsciiShortcut());
  // Every text of up to three such characters. Both orders are total (bytes break the
  // collator's ties), so if neighbours in one's sorted order are in the other's order too,
  // the two agree on every pair: 900,000 texts checked in full without 10^11 comparisons.
  Texts texts(1);
  std::string chars;
  for (int c = 0x1F; c <= 0x7F; ++c) chars += static_cast<char>(c);
  for (char a : chars) {
    texts.emplace_back(1, a);
    for (char b : chars) {
      texts.push_back({a, b});
      for (char c : chars) texts.push_back({a, b, c});
    }
  }
  std::sort(texts.begin(), texts.end(),
            [](const std::string& x, const std::string& y) { return CompareHebrew(x, y) < 0; });
  for (size_t i = 1; i < texts.size(); ++i) {
    ASSERT_LT(CompareHebrewWithIcu(texts[i - 1], texts[i]), 0) << texts[i - 1] << "|" << texts[i];
  }
}

}  // namespace
}  // namespace zdr::db
