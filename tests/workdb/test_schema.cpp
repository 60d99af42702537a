// The two databases as created: every table, field and index, the link, the stored query,
// the replacement of old files and the failures shown to the user.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>
#include <vector>

#include "support/recordingseam.h"
#include "workdb/schema.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;
using db::FieldType;
using test::RecordingSeam;

// Sets an environment variable for the life of the object, then puts the old value back.
class ScopedEnv {
 public:
  ScopedEnv(const char* name, const char* value) : name_(name) {
    if (const char* old = std::getenv(name)) old_ = old;
    if (value) {
      setenv(name, value, 1);
    } else {
      unsetenv(name);
    }
  }
  ~ScopedEnv() {
    if (old_) {
      setenv(name_, old_->c_str(), 1);
    } else {
      unsetenv(name_);
    }
  }

 private:
  const char* name_;
  std::optional<std::string> old_;
};

// Each test gets its own folder as Temp.
class SchemaTest : public ::testing::Test {
 protected:
  void SetUp() override {
    std::string pattern = (fs::temp_directory_path() / "zdr_schema_XXXXXX").string();
    ASSERT_NE(mkdtemp(pattern.data()), nullptr);
    dir_ = pattern;
    temp_.emplace("Temp", dir_.c_str());
  }
  void TearDown() override {
    temp_.reset();
    std::error_code ec;
    fs::remove_all(dir_, ec);
  }

  fs::path dir_;
  std::optional<ScopedEnv> temp_;
  RecordingSeam ui_;
};

struct F {
  const char* name;
  FieldType type;
  int size;
};

void ExpectFields(const db::TableDef& def, const std::vector<F>& expected) {
  ASSERT_EQ(def.fields.size(), expected.size()) << def.name;
  for (size_t i = 0; i < expected.size(); ++i) {
    EXPECT_EQ(def.fields[i].name, expected[i].name) << def.name << " #" << i + 1;
    EXPECT_EQ(def.fields[i].type, expected[i].type) << def.name << "." << expected[i].name;
    if (expected[i].type == FieldType::Text) {
      EXPECT_EQ(def.fields[i].size, expected[i].size) << def.name << "." << expected[i].name;
    }
  }
}

void ExpectIndexes(const db::TableDef& def, const std::vector<db::IndexDef>& expected) {
  ASSERT_EQ(def.indexes.size(), expected.size()) << def.name;
  for (size_t i = 0; i < expected.size(); ++i) {
    EXPECT_EQ(def.indexes[i].name, expected[i].name) << def.name;
    EXPECT_EQ(def.indexes[i].fields, expected[i].fields) << def.name << " " << expected[i].name;
    EXPECT_EQ(def.indexes[i].primary, expected[i].primary) << def.name << " " << expected[i].name;
    EXPECT_EQ(def.indexes[i].unique, expected[i].unique) << def.name << " " << expected[i].name;
  }
}

constexpr FieldType kText = FieldType::Text;

// ---------------------------------------------------------------------------------------
// The working database

TEST_F(SchemaTest, WorkDbHasEveryTableFieldAndIndex) {
  const std::string path = CreateWorkDB("", ui_);
  ASSERT_EQ(path, (dir_ / "zdrlab.DB").string());
  EXPECT_TRUE(ui_.messages.empty());
  db::Database work = db::Database::Open(path);

  const db::TableDef account = work.Describe("tAccount");
  ExpectFields(account, {{"AccountKey", kText, 20},
                         {"AccountName", kText, 100},
                         {"CategoryCode", kText, 3},
                         {"CutOff", kText, 4},
                         {"Address", kText, 100},
                         {"City", kText, 50},
                         {"Zip", kText, 10},
                         {"District", kText, 50},
                         {"Details", kText, 100},
                         {"Telephone", kText, 50},
                         {"Include", FieldType::Boolean, 0},
                         {"SortByName", kText, 50},
                         {"SortByKey", kText, 20},
                         {"SortByCity", kText, 20},
                         {"SortByZip", kText, 10},
                         {"SortByKeyVal", FieldType::Double, 0}});
  ExpectIndexes(account, {{"PrimaryKey", {"AccountKey"}, true, true},
                          {"SortByKey", {"SortByKey"}, false, true}});

  const db::TableDef head = work.Describe("tStockHead");
  ExpectFields(head, {{"CompID", FieldType::Integer, 0},
                      {"TavFileID", FieldType::Integer, 0},
                      {"HeadIndx", FieldType::Long, 0},
                      {"DocType2", FieldType::Byte, 0},
                      {"Reference1", FieldType::Long, 0},
                      {"AccountKey", kText, 8},
                      {"RefDate", FieldType::Date, 0},
                      {"DueDate", FieldType::Date, 0},
                      {"CustomerName", kText, 100},
                      {"Address1", kText, 100},
                      {"Address2", kText, 100},
                      {"DetailsLine1", kText, 100},
                      {"SortByName", kText, 50},
                      {"SortByCity", kText, 50},
                      {"SortByZip", kText, 10},
                      {"Include", FieldType::Boolean, 0}});
  ExpectIndexes(head, {{"PrimaryKey", {"CompID", "TavFileID", "HeadIndx"}, true, true}});

  const db::TableDef line = work.Describe("tStockLine");
  ExpectFields(line, {{"CompID", FieldType::Integer, 0},
                      {"TavFileID", FieldType::Integer, 0},
                      {"HeadIndx", FieldType::Long, 0},
                      {"LineIndx", FieldType::Long, 0},
                      {"Agent", FieldType::Byte, 0},
                      {"ItemKey", kText, 20}});
  ExpectIndexes(line,
                {{"PrimaryKey", {"CompID", "TavFileID", "HeadIndx", "LineIndx"}, true, true}});

  const db::TableDef transact = work.Describe("tTransact");
  ExpectFields(
      transact,
      {{"FileID", FieldType::Long, 0}, {"TransID", FieldType::Long, 0}, {"AccountKey", kText, 8}});
  ExpectIndexes(transact, {{"PrimaryKey", {"FileID", "TransID", "AccountKey"}, true, true}});

  const db::TableDef cash = work.Describe("tCash");
  ExpectFields(cash, {{"TransID", FieldType::Long, 0}, {"AccountKey", kText, 8}});
  ExpectIndexes(cash, {{"PrimaryKey", {"TransID", "AccountKey"}, true, true}});

  const db::TableDef item = work.Describe("tItem");
  ExpectFields(item, {{"ItemKey", kText, 20}});
  ExpectIndexes(item, {{"PrimaryKey", {"ItemKey"}, true, true}});
}

TEST_F(SchemaTest, StoredQueryTextIsExact) {
  const std::string path = CreateWorkDB("", ui_);
  ASSERT_FALSE(path.empty());
  db::Database work = db::Database::Open(path);
  EXPECT_THAT(work.QueryNames(), ::testing::ElementsAre("qHeadByItem"));
  EXPECT_EQ(work.QuerySql("qHeadByItem"),
            "SELECT tStockLine.CompID, tStockLine.TavFileID, tStockLine.HeadIndx FROM tItem "
            "INNER JOIN tStockLine ON tItem.ItemKey = tStockLine.ItemKey GROUP BY "
            "tStockLine.CompID, tStockLine.TavFileID, tStockLine.HeadIndx");
  EXPECT_EQ(HeadByItemSql(), work.QuerySql("qHeadByItem"));
  db::Snapshot rows = work.OpenSnapshot("SELECT * FROM qHeadByItem");
  EXPECT_TRUE(rows.AtEnd());
}

TEST_F(SchemaTest, LinkOnlyWhenTheSelectionDbPathIsSet) {
  {
    db::Database work = db::Database::Open(CreateWorkDB("", ui_));
    EXPECT_FALSE(work.HasTable("tSelectAccount"));
  }
  const std::string select = CreateSelectDB(ui_);
  ASSERT_EQ(select, (dir_ / "zdracc.DB").string());
  {
    db::Database work = db::Database::Open(CreateWorkDB(select, ui_));
    EXPECT_TRUE(work.HasTable("tSelectAccount"));
    db::Snapshot rows = work.OpenSnapshot("SELECT SortByKey FROM tSelectAccount");
    EXPECT_TRUE(rows.AtEnd());
  }
  EXPECT_TRUE(ui_.messages.empty());
}

TEST_F(SchemaTest, SelectDbHasItsTableAndIndexes) {
  const std::string path = CreateSelectDB(ui_);
  ASSERT_FALSE(path.empty());
  db::Database select = db::Database::Open(path);
  const db::TableDef def = select.Describe("tSelectAccount");
  ExpectFields(def, {{"AccountKey", kText, 20},
                     {"SortByKey", kText, 20},
                     {"SortByName", kText, 100},
                     {"Include", FieldType::Boolean, 0}});
  ExpectIndexes(
      def, {{"AccountKey", {"AccountKey"}, true, true}, {"SortByKey", {"SortByKey"}, false, true}});
  EXPECT_TRUE(select.QueryNames().empty());
}

// ---------------------------------------------------------------------------------------
// Old files

void WriteFile(const fs::path& p, const std::string& bytes) {
  std::ofstream(p, std::ios::binary) << bytes;
}

TEST_F(SchemaTest, LeftoverFileIsReplacedWithoutAQuestion) {
  WriteFile(dir_ / "zdrlab.DB", "not a database at all");
  const std::string path = CreateWorkDB("", ui_);
  ASSERT_FALSE(path.empty());
  EXPECT_TRUE(ui_.messages.empty());
  db::Database work = db::Database::Open(path);
  EXPECT_TRUE(work.HasTable("tAccount"));
}

TEST_F(SchemaTest, RecreationEmptiesTheTables) {
  const std::string path = CreateSelectDB(ui_);
  {
    db::Database select = db::Database::Open(path);
    db::TableRecordset rs = select.OpenTable("tSelectAccount");
    rs.AddNew();
    rs.Set("AccountKey", std::string("1"));
    rs.Set("SortByKey", std::string("    1"));
    rs.Set("Include", int64_t{-1});
    rs.Update();
    rs.Close();
  }
  ASSERT_EQ(CreateSelectDB(ui_), path);
  db::Database select = db::Database::Open(path);
  db::Snapshot rows = select.OpenSnapshot("SELECT * FROM tSelectAccount");
  EXPECT_TRUE(rows.AtEnd());
}

// ---------------------------------------------------------------------------------------
// Failures: shown as a fault, and nothing returned

void ExpectFault(const RecordingSeam& ui) {
  ASSERT_EQ(ui.messages.size(), 1u);
  EXPECT_EQ(ui.messages[0].title, "תקלה");
  EXPECT_EQ(ui.messages[0].icon, MsgIcon::Critical);
  EXPECT_FALSE(ui.messages[0].text.empty());
}

TEST_F(SchemaTest, TempUnderARegularFileIsAFault) {
  WriteFile(dir_ / "plain", "x");
  ScopedEnv temp("Temp", (dir_ / "plain" / "sub").c_str());
  EXPECT_EQ(CreateWorkDB("", ui_), "");
  ExpectFault(ui_);
  EXPECT_EQ(CreateSelectDB(ui_), "");
  EXPECT_EQ(ui_.messages.size(), 2u);
}

TEST_F(SchemaTest, TempMissingFolderIsAFault) {
  ScopedEnv temp("Temp", (dir_ / "missing").c_str());
  EXPECT_EQ(CreateSelectDB(ui_), "");
  ExpectFault(ui_);
  EXPECT_NE(ui_.messages[0].text.find((dir_ / "missing").string()), std::string::npos);
  EXPECT_FALSE(fs::exists(dir_ / "missing"));
}

TEST_F(SchemaTest, DirectoryInTheWayIsAFault) {
  fs::create_directory(dir_ / "zdrlab.DB");
  EXPECT_EQ(CreateWorkDB("", ui_), "");
  ExpectFault(ui_);
  EXPECT_TRUE(fs::is_directory(dir_ / "zdrlab.DB"));
}

TEST_F(SchemaTest, LinkToAMissingSelectionDbIsAFault) {
  EXPECT_EQ(CreateWorkDB((dir_ / "gone.DB").string(), ui_), "");
  ExpectFault(ui_);
}

TEST_F(SchemaTest, EmptyTempFallsBackToTheSystemFolder) {
  const fs::path system = dir_ / "system";
  fs::create_directory(system);
  ScopedEnv tmpdir("TMPDIR", system.c_str());
  ScopedEnv temp("Temp", "");
  EXPECT_EQ(TempFolder(), system);
  EXPECT_EQ(CreateWorkDB("", ui_), (system / "zdrlab.DB").string());
  EXPECT_TRUE(ui_.messages.empty());
}

TEST_F(SchemaTest, NoTempAtAllIsAFaultNotTheRootFolder) {
  ScopedEnv tmpdir("TMPDIR", (dir_ / "nowhere").c_str());
  ScopedEnv temp("Temp", nullptr);
  EXPECT_TRUE(TempFolder().empty());
  EXPECT_EQ(CreateWorkDB("", ui_), "");
  ExpectFault(ui_);
  EXPECT_FALSE(fs::exists("/zdrlab.DB"));
}

TEST_F(SchemaTest, TempFolderIsTheVariableWhenSet) {
  EXPECT_EQ(TempFolder(), dir_);
}

}  // namespace
}  // namespace zdr
