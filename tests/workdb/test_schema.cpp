// The two databases as created: the tables the engine made from their definitions, the link,
// the stored query, the replacement of old files and the failures shown to the user.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <string>
#include <tuple>

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

// What the engine describes after reopening is what was defined.
void ExpectAsDefined(db::Database& d, const db::TableDef& def) {
  const db::TableDef made = d.Describe(def.name);
  ASSERT_EQ(made.fields.size(), def.fields.size()) << def.name;
  for (size_t i = 0; i < def.fields.size(); ++i) {
    const db::FieldDef &m = made.fields[i], &f = def.fields[i];
    EXPECT_EQ(std::tie(m.name, m.type, m.size), std::tie(f.name, f.type, f.size)) << def.name;
  }
  ASSERT_EQ(made.indexes.size(), def.indexes.size()) << def.name;
  for (size_t i = 0; i < def.indexes.size(); ++i) {
    const db::IndexDef &m = made.indexes[i], &x = def.indexes[i];
    EXPECT_EQ(std::tie(m.name, m.fields, m.primary, m.unique),
              std::tie(x.name, x.fields, x.primary, x.unique));
  }
}

// Leftovers of an earlier run are replaced without a question.
TEST_F(SchemaTest, BothDatabasesHoldTheirTablesTheLinkAndTheStoredQuery) {
  std::ofstream(dir_ / "zdrlab.DB", std::ios::binary) << "not a database at all";
  const std::string select = CreateSelectDB(ui_);
  ASSERT_EQ(select, (dir_ / "zdracc.DB").string());
  db::Database::Open(select).Execute("INSERT INTO tSelectAccount (AccountKey) VALUES ('1')");
  ASSERT_EQ(CreateSelectDB(ui_), select);
  EXPECT_TRUE(db::Database::Open(select).OpenSnapshot("SELECT * FROM tSelectAccount").AtEnd());
  const std::string path = CreateWorkDB(select, ui_);
  ASSERT_EQ(path, (dir_ / "zdrlab.DB").string());
  db::Database work = db::Database::Open(path);
  for (const db::TableDef& def : WorkDbTables()) ExpectAsDefined(work, def);
  ExpectAsDefined(work, SelectAccountTable());  // through the link
  EXPECT_THAT(work.QueryNames(), ::testing::ElementsAre("qHeadByItem"));
  EXPECT_TRUE(db::Database::Open(select).QueryNames().empty());
  EXPECT_TRUE(ui_.messages.empty());
  EXPECT_FALSE(db::Database::Open(CreateWorkDB("", ui_)).HasTable("tSelectAccount"));
}

// The temporary folder is the Temp variable, else the system's; when neither serves, or the
// selection database is gone, or a folder stands where the file goes, the user sees a fault.
TEST_F(SchemaTest, EveryFailureIsShownAsAFaultAndNothingReturned) {
  EXPECT_EQ(TempFolder(), dir_);
  fs::create_directory(dir_ / "system");
  {
    ScopedEnv tmpdir("TMPDIR", (dir_ / "system").c_str());
    ScopedEnv temp("Temp", "");
    EXPECT_EQ(CreateSelectDB(ui_), (dir_ / "system" / "zdracc.DB").string());
    EXPECT_TRUE(ui_.messages.empty());
  }
  // Temp (under the scratch folder; nullptr unsets it), TMPDIR, the selection database. A Temp
  // that is no folder is the data load's and the picker's case.
  const std::tuple<const char*, const char*, std::string> cases[] = {
      {"", "", (dir_ / "gone.DB").string()}, {nullptr, "nowhere", ""}, {"", "", ""}};
  for (size_t i = 0; i < std::size(cases); ++i) {
    const auto& [temp, tmpdir, selectDb] = cases[i];
    if (i == 2) fs::remove(dir_ / "zdrlab.DB"), fs::create_directory(dir_ / "zdrlab.DB");
    test::RecordingSeam ui;
    const std::string tempPath = temp ? (dir_ / temp).string() : "";
    ScopedEnv setTemp("Temp", temp ? tempPath.c_str() : nullptr);
    ScopedEnv setTmpdir("TMPDIR", (dir_ / tmpdir).c_str());
    EXPECT_EQ(CreateWorkDB(selectDb, ui), "") << i;
    ASSERT_EQ(ui.messages.size(), 1u) << i;
    EXPECT_EQ(ui.messages[0].title, "תקלה");
    EXPECT_EQ(ui.messages[0].icon, MsgIcon::Critical);
    EXPECT_FALSE(ui.messages[0].text.empty());
  }
  EXPECT_FALSE(fs::exists(dir_ / "gone.DB"));
  EXPECT_TRUE(fs::is_directory(dir_ / "zdrlab.DB"));
  EXPECT_FALSE(fs::exists("/zdrlab.DB"));
}

}  // namespace
}  // namespace zdr
