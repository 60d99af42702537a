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
  Text name, address, city, zip, district, details, telephone;
};

// A document header of the chosen type, joined to its account by `key`.
struct HeadRow {
  std::string key;
  int64_t reference = 0;
  Text customerName, address1, address2, detailsLine1;
};

// Joins lines with CR LF after each.
inline std::string Lines(const std::vector<std::string>& lines) {
  std::string out;
  for (const auto& l : lines) out += l + "\r\n";
  return out;
}

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

// A Python that has openpyxl, to read workbooks back; "" when there is none.
inline std::string Python() {
  static const std::string found = [] {
    for (const char* p : {"/usr/bin/python3", "python3"}) {
      const std::string cmd = std::string(p) + " -c 'import openpyxl' >/dev/null 2>&1";
      if (std::system(cmd.c_str()) == 0) return std::string(p);
    }
    return std::string();
  }();
  return found;
}

class OutputTest : public ::testing::Test {
 protected:
  void SetUp() override {
    dir_ = scratch_.dir();
    panel.CmbSortBy = 0;  // by sort key: the order rows were added in
    panel.CmbSortDir = 0;
  }

  // A new working database holding `accounts` (sorted in the given order) and `heads`.
  std::string BuildDb(const std::vector<AccountRow>& accounts,
                      const std::vector<HeadRow>& heads = {}) {
    RecordingSeam createSeam;
    const std::string path = CreateWorkDB("", createSeam);
    EXPECT_FALSE(path.empty()) << (createSeam.messages.empty() ? "" : createSeam.messages[0].text);
    db::Database database = db::Database::Open(path);
    {
      db::TableRecordset t = database.OpenTable("tAccount");
      const int key = t.FieldIndex("AccountKey"), sortKey = t.FieldIndex("SortByKey"),
                sortVal = t.FieldIndex("SortByKeyVal"), sortName = t.FieldIndex("SortByName");
      const int name = t.FieldIndex("AccountName"), address = t.FieldIndex("Address"),
                city = t.FieldIndex("City"), zip = t.FieldIndex("Zip"),
                district = t.FieldIndex("District"), details = t.FieldIndex("Details"),
                telephone = t.FieldIndex("Telephone");
      char order[16];
      int n = 0;
      for (const AccountRow& a : accounts) {
        t.AddNew();
        std::snprintf(order, sizeof order, "%08d", ++n);
        t.SetText(key, a.key);
        t.SetText(sortKey, order);
        t.SetText(sortName, order);
        t.SetDouble(sortVal, n);
        const std::pair<int, const Text*> texts[] = {
            {name, &a.name},         {address, &a.address}, {city, &a.city},          {zip, &a.zip},
            {district, &a.district}, {details, &a.details}, {telephone, &a.telephone}};
        for (const auto& [field, value] : texts) {
          // Like the importers, an empty text is left Null.
          if (value->has_value() && !(*value)->empty()) t.SetText(field, **value);
        }
        t.Update();
      }
      t.Close();
    }
    if (!heads.empty()) {
      db::TableRecordset t = database.OpenTable("tStockHead");
      char order[16];
      int n = 0;
      for (const HeadRow& h : heads) {
        t.AddNew();
        std::snprintf(order, sizeof order, "%08d", ++n);
        t.Set("CompID", int64_t{1});
        t.Set("TavFileID", int64_t{3});
        t.Set("HeadIndx", int64_t{n});
        t.Set("DocType2", int64_t{1});
        t.Set("Reference1", h.reference);
        t.Set("AccountKey", h.key);
        t.Set("SortByName", std::string(order));
        t.SetBool(t.FieldIndex("Include"), true);
        if (h.customerName) t.Set("CustomerName", *h.customerName);
        if (h.address1) t.Set("Address1", *h.address1);
        if (h.address2) t.Set("Address2", *h.address2);
        if (h.detailsLine1) t.Set("DetailsLine1", *h.detailsLine1);
        t.Update();
      }
      t.Close();
    }
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
