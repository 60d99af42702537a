// Helpers for the importer tests: a throw-away company folder and working database per test,
// a seam that records what the user was shown, and reading rows back as text.
#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>

#include <atomic>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#include "control/userseam.h"
#include "import/codepage.h"
#include "support/recordingseam.h"
#include "workdb/engine.h"
#include "workdb/schema.h"
#include "zdrgen/generator.h"

namespace zdr::importtest {

using test::RecordingSeam;
using test::ShownMessage;

// Records messages, status lines and progress; answers every question with Yes.

// A fixture with its own Temp folder (the working database goes there) and company folder.
class ImportTest : public ::testing::Test {
 protected:
  void SetUp() override {
    static std::atomic<int> counter{0};
    root_ = std::filesystem::temp_directory_path() /
            ("zdr_import_test_" + std::to_string(::getpid()) + "_" + std::to_string(counter++));
    std::filesystem::remove_all(root_);
    std::filesystem::create_directories(root_ / "temp");
    std::filesystem::create_directories(root_ / "company");
    ::setenv("Temp", (root_ / "temp").c_str(), 1);
    company_ = (root_ / "company").string();
  }
  void TearDown() override {
    std::error_code ec;
    std::filesystem::remove_all(root_, ec);
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
    while (!snap.AtEnd()) {
      std::string row;
      for (int i = 0; i < snap.FieldCount(); ++i) {
        if (i > 0) row += '|';
        row += ValueText(snap.Field(i));
      }
      rows.push_back(row);
      snap.MoveNext();
    }
    return rows;
  }
  static std::string ValueText(const db::Value& v) {
    if (db::IsNull(v)) return "<null>";
    if (const auto* i = std::get_if<int64_t>(&v)) return std::to_string(*i);
    if (const auto* d = std::get_if<double>(&v)) {
      if (*d == static_cast<double>(static_cast<int64_t>(*d))) {
        return std::to_string(static_cast<int64_t>(*d));
      }
      return std::to_string(*d);
    }
    return std::get<std::string>(v);
  }
  static int64_t Count(const std::string& dbPath, const std::string& table) {
    auto rows = Rows(dbPath, "SELECT Count(*) AS N FROM " + table);
    return rows.empty() ? -1 : std::stoll(rows[0]);
  }

  std::filesystem::path root_;
  std::string company_;
  RecordingSeam seam_;
};

// Host text of logical UTF-8 in display order (Hebrew and ASCII), padded to `width`.
inline std::string HostText(std::string_view utf8, size_t width) {
  return zdrgen::HostField(utf8, width);
}

}  // namespace zdr::importtest
