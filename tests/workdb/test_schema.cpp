// The two databases as created: the tables the engine made from their definitions, the link,
// the stored query, the replacement of old files and the failures shown to the user.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>

#include "support/recordingseam.h"
#include "support/scratchtemp.h"
#include "workdb/schema.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;
using test::ScopedEnv;

class SchemaTest : public ::testing::Test {
 protected:
  test::ScratchTemp temp_;
  const fs::path& dir_ = temp_.dir();
  test::RecordingSeam ui_;
};

// What the engine describes is what was defined, and each definition keeps the rules the
// statements rely on: one unique primary key, indexes over fields that exist, text keys.
void ExpectAsDefined(db::Database& d, const db::TableDef& def) {
  const db::TableDef made = d.Describe(def.name);
  ASSERT_EQ(made.fields.size(), def.fields.size()) << def.name;
  for (size_t i = 0; i < def.fields.size(); ++i) {
    EXPECT_EQ(made.fields[i].name, def.fields[i].name) << def.name;
    EXPECT_EQ(made.fields[i].type, def.fields[i].type) << def.fields[i].name;
    if (def.fields[i].type == db::FieldType::Text) {
      EXPECT_EQ(made.fields[i].size, def.fields[i].size) << def.fields[i].name;
    }
  }
  ASSERT_EQ(made.indexes.size(), def.indexes.size()) << def.name;
  int primaries = 0;
  for (size_t i = 0; i < def.indexes.size(); ++i) {
    const db::IndexDef& index = def.indexes[i];
    EXPECT_EQ(made.indexes[i].fields, index.fields) << def.name << " " << index.name;
    EXPECT_EQ(made.indexes[i].unique, index.unique) << def.name << " " << index.name;
    primaries += index.primary;
    EXPECT_TRUE(!index.primary || index.unique) << def.name;
    for (const std::string& field : index.fields) {
      EXPECT_TRUE(std::any_of(def.fields.begin(), def.fields.end(),
                              [&](const db::FieldDef& f) { return f.name == field; }))
          << def.name << "." << field;
    }
  }
  EXPECT_EQ(primaries, 1) << def.name;
  for (const db::FieldDef& f : def.fields) {
    if (f.name == "AccountKey") {
      EXPECT_EQ(f.type, db::FieldType::Text) << def.name;
    }
  }
}

TEST_F(SchemaTest, BothDatabasesHoldTheirTablesTheLinkAndTheStoredQuery) {
  const std::string select = CreateSelectDB(ui_);
  ASSERT_EQ(select, (dir_ / "zdracc.DB").string());
  {
    db::Database d = db::Database::Open(select);
    ExpectAsDefined(d, SelectAccountTable());
    EXPECT_TRUE(d.QueryNames().empty());
  }
  const std::string path = CreateWorkDB(select, ui_);
  ASSERT_EQ(path, (dir_ / "zdrlab.DB").string());
  db::Database work = db::Database::Open(path);
  std::vector<std::string> names;
  for (const db::TableDef& def : WorkDbTables()) {
    names.push_back(def.name);
    ExpectAsDefined(work, def);
  }
  EXPECT_THAT(names, ::testing::ElementsAre("tAccount", "tStockHead", "tStockLine", "tTransact",
                                            "tCash", "tItem"));
  EXPECT_TRUE(work.HasTable("tSelectAccount"));
  EXPECT_THAT(work.QueryNames(), ::testing::ElementsAre("qHeadByItem"));
  EXPECT_EQ(work.QuerySql("qHeadByItem"), HeadByItemSql());
  EXPECT_TRUE(ui_.messages.empty());

  EXPECT_FALSE(db::Database::Open(CreateWorkDB("", ui_)).HasTable("tSelectAccount"));
}

TEST_F(SchemaTest, LeftoversAreReplacedWithoutAQuestion) {
  std::ofstream(dir_ / "zdrlab.DB", std::ios::binary) << "not a database at all";
  const std::string path = CreateSelectDB(ui_);
  db::Database::Open(path).Execute(
      "INSERT INTO tSelectAccount (AccountKey, SortByKey) VALUES ('1', '1')");
  ASSERT_EQ(CreateSelectDB(ui_), path);
  EXPECT_TRUE(db::Database::Open(path).OpenSnapshot("SELECT * FROM tSelectAccount").AtEnd());
  EXPECT_TRUE(db::Database::Open(CreateWorkDB("", ui_)).HasTable("tAccount"));
  EXPECT_TRUE(ui_.messages.empty());
}

TEST_F(SchemaTest, EveryFailureIsShownAsAFaultAndNothingReturned) {
  std::ofstream(dir_ / "plain") << "x";
  struct Case {
    const char* name;
    const char* temp;  // relative to the scratch folder; nullptr unsets Temp
    const char* tmpdir;
    std::function<void()> prepare;
    std::string selectDb;
  };
  const Case cases[] = {
      {"Temp under a file", "plain/sub", "", [] {}, ""},
      {"Temp missing", "missing", "", [] {}, ""},
      {"selection db gone", "", "", [] {}, (dir_ / "gone.DB").string()},
      {"folder in the way", "", "",
       [&] { fs::remove(dir_ / "zdrlab.DB"), fs::create_directory(dir_ / "zdrlab.DB"); }, ""},
      {"no Temp, no system folder", nullptr, "nowhere", [] {}, ""},
  };
  for (const Case& c : cases) {
    test::RecordingSeam ui;
    const std::string temp = c.temp ? (dir_ / c.temp).string() : "";
    ScopedEnv setTemp("Temp", c.temp ? temp.c_str() : nullptr);
    ScopedEnv setTmpdir("TMPDIR", (dir_ / c.tmpdir).c_str());
    c.prepare();
    EXPECT_EQ(CreateWorkDB(c.selectDb, ui), "") << c.name;
    ASSERT_EQ(ui.messages.size(), 1u) << c.name;
    EXPECT_EQ(ui.messages[0].title, "תקלה");
    EXPECT_EQ(ui.messages[0].icon, MsgIcon::Critical);
    EXPECT_FALSE(ui.messages[0].text.empty());
  }
  EXPECT_FALSE(fs::exists(dir_ / "missing"));
  EXPECT_TRUE(fs::is_directory(dir_ / "zdrlab.DB"));
  EXPECT_FALSE(fs::exists("/zdrlab.DB"));
}

TEST_F(SchemaTest, TempFolderIsTheVariableElseTheSystemFolder) {
  EXPECT_EQ(TempFolder(), dir_);
  const fs::path system = dir_ / "system";
  fs::create_directory(system);
  ScopedEnv tmpdir("TMPDIR", system.c_str());
  ScopedEnv temp("Temp", "");
  EXPECT_EQ(TempFolder(), system);
  EXPECT_EQ(CreateSelectDB(ui_), (system / "zdracc.DB").string());
  EXPECT_TRUE(ui_.messages.empty());
}

}  // namespace
}  // namespace zdr
