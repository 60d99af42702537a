// Helpers for the importer tests: a throw-away company folder and working database per test,
// a seam that records what the user was shown, and reading rows back as text.
#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>

#include <cmath>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#include "engine/engine.h"
#include "support/recordingseam.h"
#include "support/scratchtemp.h"
#include "workdb/schema.h"
#include "zdrgen/generator.h"

namespace zdr::test {

// A fixture with its own Temp folder (the working database goes there) and company folder.
class ImportTest : public ::testing::Test {
 protected:
  void SetUp() override {
    root_ = scratch_.dir();
    std::filesystem::create_directories(root_ / "company");
    company_ = (root_ / "company").string();
  }

  // A new, empty working database; fails the test when it cannot be created.
  std::string WorkDb() {
    std::string path = CreateWorkDB("", seam_);
    EXPECT_FALSE(path.empty()) << (seam_.messages.empty() ? "" : seam_.messages[0].text);
    return path;
  }

  // Writes `records` to the company file `name`.
  void Write(const std::string& name, const std::vector<std::string>& records) {
    zdrgen::WriteRecords(std::filesystem::path(company_) / name, records);
  }
  // Appends raw bytes to a company file (a ragged tail).
  void AppendBytes(const std::string& name, std::string_view bytes) {
    std::ofstream out(std::filesystem::path(company_) / name, std::ios::binary | std::ios::app);
    out.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
  }

  // The rows of a statement over `dbPath`, each row its fields joined with "|"; Null is
  // "<null>", numbers print as integers when whole.
  static std::vector<std::string> Rows(const std::string& dbPath, std::string_view sql) {
    db::Database db = db::Database::Open(dbPath);
    db::Snapshot snap = db.OpenSnapshot(sql);
    std::vector<std::string> rows;
    for (; !snap.AtEnd(); snap.MoveNext()) {
      std::string row;
      for (int i = 0; i < snap.FieldCount(); ++i) {
        const db::Value& v = snap.Field(i);
        const auto* d = std::get_if<double>(&v);
        row += (i > 0 ? "|" : "") +
               (db::IsNull(v)               ? "<null>"
                : std::get_if<int64_t>(&v)  ? std::to_string(std::get<int64_t>(v))
                : d && *d == std::trunc(*d) ? std::to_string(static_cast<int64_t>(*d))
                : d                         ? std::to_string(*d)
                                            : std::get<std::string>(v));
      }
      rows.push_back(row);
    }
    return rows;
  }
  static int64_t Count(const std::string& dbPath, const std::string& table) {
    return std::stoll(Rows(dbPath, "SELECT Count(*) AS N FROM " + table).at(0));
  }

  ScratchTemp scratch_;
  std::filesystem::path root_;
  std::string company_;
  RecordingSeam seam_;
};

// Host text of logical UTF-8 in display order (Hebrew and ASCII), padded to `width`.
inline std::string HostText(std::string_view utf8, size_t width) {
  return zdrgen::HostField(utf8, width);
}

}  // namespace zdr::test
