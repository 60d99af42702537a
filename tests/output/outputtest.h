// Test support for the outputs: a fresh temporary folder as `Temp`, a working database
// filled with given accounts (and document headers) straight through the engine, a seam that
// records what the outputs report, and file helpers.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>
#include <vector>

#include "common/panel.h"
#include "common/userseam.h"
#include "engine/engine.h"
#include "hostfile/doctypes.h"
#include "hosttext/codepage.h"
#include "output/outputinternal.h"
#include "support/files.h"
#include "support/recordingseam.h"
#include "support/scratchtemp.h"
#include "workdb/schema.h"

namespace zdr::test {

using Text = std::optional<std::string>;

struct AccountRow {
  std::string key;
  Text name = {}, address = {}, city = {}, zip = {}, district = {}, details = {}, telephone = {};
};

// A document header of the chosen type, joined to its account by `key`.
struct HeadRow {
  std::string key;
  int64_t reference = 0;
  Text customerName, address1, address2, detailsLine1;
};

// A file of tests/data/output as the outputs write it: its lines end in CR LF, its text is
// Windows-1255 (the file itself is UTF-8 with LF line ends, to read and to diff).
inline std::string Golden(const std::string& name) {
  std::string out;
  for (char c : ReadBytes(std::string(ZDR_TEST_DATA) + "/output/" + name)) {
    if (c == '\n') out += '\r';
    out += c;
  }
  return Utf8ToWin1255(out);
}

inline std::vector<AccountRow> NumberedAccounts(int n) {
  std::vector<AccountRow> rows;
  for (int i = 1; i <= n; ++i) {
    const std::string k = std::to_string(i);
    rows.push_back(
        {k, "לקוח " + k, "רחוב " + k, "חיפה", "3100" + k, "כרמל", "משה " + k, "04-555" + k});
  }
  return rows;
}

// Whether the system Python can read workbooks back (it has openpyxl).
inline bool HavePython() {
  static const bool have = std::system("/usr/bin/python3 -c 'import openpyxl' 2>/dev/null") == 0;
  return have;
}

class OutputTest : public ::testing::Test {
 protected:
  void SetUp() override {
    dir_ = scratch_.dir();
    panel.CmbSortBy = 0;  // by sort key: the order rows were added in
    panel.CmbSortDir = 0;
  }

  // A new working database holding `accounts` (sorted in the given order) and `heads`, an
  // empty text left Null as the importers leave it.
  std::string BuildDb(const std::vector<AccountRow>& accounts,
                      const std::vector<HeadRow>& heads = {}) {
    RecordingSeam createSeam;
    const std::string path = CreateWorkDB("", createSeam);
    EXPECT_FALSE(path.empty()) << (createSeam.messages.empty() ? "" : createSeam.messages[0].text);
    db::Database database = db::Database::Open(path);
    // A new row of `t` for account `key`, ordered n-th, with its texts set.
    auto add = [](db::TableRecordset& t, int64_t n, const std::string& key,
                  std::initializer_list<std::pair<const char*, const Text*>> texts) {
      t.AddNew();
      char order[16];
      std::snprintf(order, sizeof order, "%08lld", static_cast<long long>(n));
      t.Set("AccountKey", key);
      t.Set("SortByName", std::string(order));
      for (const auto& [field, value] : texts)
        if (value->has_value() && !(*value)->empty()) t.Set(field, **value);
      return std::string(order);
    };
    db::TableRecordset t = database.OpenTable("tAccount");
    int64_t n = 0;
    for (const AccountRow& a : accounts) {
      t.Set("SortByKey", add(t, ++n, a.key,
                             {{"AccountName", &a.name},
                              {"Address", &a.address},
                              {"City", &a.city},
                              {"Zip", &a.zip},
                              {"District", &a.district},
                              {"Details", &a.details},
                              {"Telephone", &a.telephone}}));
      t.Set("SortByKeyVal", static_cast<double>(n));
      t.Update();
    }
    t.Close();
    db::TableRecordset h = database.OpenTable("tStockHead");
    n = 0;
    for (const HeadRow& r : heads) {
      add(h, ++n, r.key,
          {{"CustomerName", &r.customerName},
           {"Address1", &r.address1},
           {"Address2", &r.address2},
           {"DetailsLine1", &r.detailsLine1}});
      for (const auto& [field, value] : {std::pair<const char*, int64_t>{"CompID", 1},
                                         {"TavFileID", 3},
                                         {"HeadIndx", n},
                                         {"DocType2", 1},
                                         {"Reference1", r.reference}})
        h.Set(field, value);
      h.SetBool(h.FieldIndex("Include"), true);
      h.Update();
    }
    h.Close();
    database.Close();
    return path;
  }

  // The panel of the document variant: invoices issued, address from the document header,
  // ordered by the document's name key.
  void UseDocuments() {
    panel.ChkDates = 1;
    panel.cmbByDoc = 0;
    panel.cmbDocType = 0;
    panel.cmbAddressFrom = 0;
    panel.CmbSortBy = 1;
  }

  std::string PathOf(const std::string& name) const { return (dir_ / name).string(); }

  // What `script` prints when Python runs it on `args`; the run must succeed.
  std::string RunPython(const std::string& script, const std::string& args) {
    std::ofstream(PathOf("read.py")) << script;
    const std::string cmd = "PYTHONIOENCODING=utf-8 /usr/bin/python3 " + PathOf("read.py") + " " +
                            args + " > " + PathOf("read.out") + " 2>&1";
    EXPECT_EQ(std::system(cmd.c_str()), 0) << ReadBytes(PathOf("read.out"));
    return ReadBytes(PathOf("read.out"));
  }
  std::string Utf8File(const std::string& path) const { return Win1255ToUtf8(ReadBytes(path)); }

  test::ScratchTemp scratch_;
  std::filesystem::path dir_;
  Panel panel;
  DocTypeTable docTypes;
  LabelSettings labels;
  PostILSettings post;
  RecordingSeam seam;
};

}  // namespace zdr::test
