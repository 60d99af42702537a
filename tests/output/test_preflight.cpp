// The dispatch checks: one row per rule on a hand-made company, the layouts' differences,
// the findings sheet and CSV.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <map>
#include <set>

#include "output/outputtest.h"
#include "output/preflight.h"

namespace zdr::test {
namespace {

using Rows = std::pair<std::vector<int64_t>, std::vector<RuleId>>;
using enum RuleId;

// The findings' rows and their rules, in order.
Rows Found(const PreflightResult& r) {
  Rows out;
  for (const Finding& f : r.findings) {
    out.first.push_back(f.row);
    out.second.push_back(f.rule);
  }
  return out;
}

class PreflightTest : public OutputTest {
 protected:
  PreflightResult Check(const std::vector<AccountRow>& rows, int16_t layout,
                        const std::vector<HeadRow>& heads = {}) {
    return RunPreflight(BuildDb(rows, heads), layout, panel, docTypes, "", seam);
  }
};

const AccountRow kClean{"1", "כהן משה", "הרצל 5", "חיפה", "31000", "", "", "04-8500000"};

AccountRow With(std::string key, Text AccountRow::*field, Text value) {
  AccountRow r = kClean;
  r.key = std::move(key);
  r.name = "לקוח " + r.key;  // distinct from the clean row: no duplicate
  r.*field = std::move(value);
  return r;
}

// One row per rule after a clean row (row 2), so that each rule is found once, on its row.
std::vector<AccountRow> OneRowPerRule() {
  AccountRow duplicate = kClean;
  duplicate.key = "13";
  duplicate.name = " כהן  משה ";  // blanks do not make it another recipient
  return {
      kClean,                                                            // row 2
      With("3", &AccountRow::name, std::nullopt),                        // 3 name missing
      With("4", &AccountRow::address, " "),                              // 4 address missing
      With("5", &AccountRow::city, std::nullopt),                        // 5 city missing
      With("6", &AccountRow::zip, std::nullopt),                         // 6 zip empty
      With("7", &AccountRow::zip, "3100A"),                              // 7 zip malformed
      With("8", &AccountRow::telephone, "8500000"),                      // 8 not a telephone
      With("9", &AccountRow::name, std::string(26, 'n') + "xy"),         // 9 name cut
      With("10", &AccountRow::address, "רחוב " + std::string(40, 'a')),  // 10 address cut
      With("11", &AccountRow::city, "ירושלים עיר הקודש"),                // 11 city cut
      With("12", &AccountRow::telephone, "03-555-1234/5"),               // 12 telephone cut
      duplicate,                                                         // 13 duplicate
      With("14", &AccountRow::address, "הרצל Ж 5"),                      // 14 character
  };
}

// Each rule found once, on its row, with the account key, the field, the value as the books
// hold it and what was lost.
TEST_F(PreflightTest, EachRuleFoundOnceOnItsRow) {
  const PreflightResult r = Check(OneRowPerRule(), 0);
  EXPECT_EQ(Found(r), Rows({3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14},
                           {kNameMissing, kAddressMissing, kCityMissing, kZipEmpty, kZipMalformed,
                            kTelephoneMalformed, kNameCut, kAddressCut, kCityCut, kTelephoneCut,
                            kDuplicate, kCharacter}));
  EXPECT_EQ(std::tuple(r.rows, r.errors, r.warnings), std::tuple(13, 6, 6));
  EXPECT_EQ(seam.progress.back(), 0);
  std::map<int64_t, std::array<std::string, 6>> cells;
  for (const Finding& f : r.findings) cells[f.row] = FindingCells(f);
  using Cells = std::array<std::string, 6>;
  EXPECT_EQ(cells[9], (Cells{"אזהרה", "9", "9", "שם", std::string(26, 'n') + "xy",
                             "השם נחתך ל-25 תווים: החלק שאבד \"nxy\""}));
  EXPECT_EQ(cells[12], (Cells{"אזהרה", "12", "12", "טלפון", "03-555-1234/5",
                              "הטלפון נחתך ל-11 תווים: החלק שאבד \"/5\""}));
  EXPECT_EQ(cells[13], (Cells{"אזהרה", "13", "13", "שם וכתובת", " כהן  משה  / הרצל 5 / חיפה",
                              "אותו שם וכתובת כבר מופיעים בקובץ: שורה 2"}));
  EXPECT_EQ(cells[14], (Cells{"שגיאה", "14", "14", "כתובת", "הרצל Ж 5",
                              "תווים שהקובץ אינו יכול לשאת: U+0416 Ж"}));
  EXPECT_EQ(cells[7][4], "3100A");
}

// The courier layout cuts only the remarks and carries the account key.
TEST_F(PreflightTest, CourierLayoutCutsNothingButChecksTheKey) {
  std::vector<AccountRow> rows = OneRowPerRule();
  AccountRow tabInKey = kClean;
  tabInKey.key = "קוד\t15";
  tabInKey.name = "לקוח 15";
  rows.push_back(tabInKey);
  const PreflightResult r = Check(rows, 1);
  EXPECT_EQ(Found(r),
            Rows({3, 4, 5, 6, 7, 8, 12, 13, 14, 15},
                 {kNameMissing, kAddressMissing, kCityMissing, kZipEmpty, kZipMalformed,
                  kTelephoneMalformed, kTelephoneMalformed, kDuplicate, kCharacter, kCharacter}));
  EXPECT_EQ(r.findings.back().field, "מפתח חשבון");
  EXPECT_EQ(r.findings.back().message, "תווים שהקובץ אינו יכול לשאת: U+0009");
}

// Which telephones, zips and characters a row may hold.
// Regression for the telephones: 1-700 and 1-800 numbers and the +972 forms, valid business
// numbers, were errors, and with --strict one such customer stopped the dispatch file.
TEST_F(PreflightTest, TelephonesZipsAndCharacters) {
  const auto kTel = &AccountRow::telephone, kZip = &AccountRow::zip, kName = &AccountRow::name;
  const std::tuple<Text AccountRow::*, Text, bool> cases[] = {{kTel, "052-1234567", false},
                                                              {kTel, "052 123 4567", false},
                                                              {kTel, "0521234567", false},
                                                              {kTel, std::nullopt, false},
                                                              {kTel, "4-8500000", true},
                                                              {kTel, "+972-52-1234567", false},
                                                              {kTel, "+97231234567", false},
                                                              {kTel, "1-800-123456", false},
                                                              {kTel, "1700-500-500", false},
                                                              {kTel, "1-900-123456", true},
                                                              {kTel, "+1-800-123456", true},
                                                              {kTel, "+972-052-1234567", true},
                                                              {kTel, "972-52-1234567", true},
                                                              {kTel, "05+2-1234567", true},
                                                              {kTel, "1-800-12345", true},
                                                              {kTel, "0-52-123-45", true},
                                                              {kTel, "אין", true},
                                                              {kZip, "1234567", false},
                                                              {kZip, "123456", true},
                                                              {kZip, "3100", true},
                                                              {kName, "א €₪\"'", false},
                                                              {kName, "é", true},
                                                              {kName, "\xC3\x99", true},
                                                              {kName, "א\x7F", true}};
  std::vector<AccountRow> rows;
  std::set<int64_t> expected, found;
  for (const auto& [field, value, bad] : cases) {
    rows.push_back(With(std::to_string(rows.size() + 2), field, value));
    if (field == kName) rows.back().name = *value + " " + rows.back().key;
    if (bad) expected.insert(static_cast<int64_t>(rows.size()) + 1);
  }
  for (const Finding& f : Check(rows, 1).findings) found.insert(f.row);
  EXPECT_EQ(found, expected);
}

// Regression: a weight of "abc" went into every row and the checks found nothing, though the
// post would refuse the file. The dispatch settings' columns of layout 0, the same on every
// row, are checked once, as findings of every row; the courier layout does not carry them.
TEST_F(PreflightTest, FixedColumnsAreCheckedOnceForEveryRow) {
  const std::string db = BuildDb({kClean, With("2", &AccountRow::city, "עכו")});
  const std::string huge(kWorkbookCellLength + 1, 'x');
  const std::tuple<std::string, std::string, std::string, std::vector<RuleId>> cases[] = {
      {"", "", "", {}},
      {"רשום", "0.5", "כן", {}},
      {"", "12", "", {}},
      {"", "abc", "", {kWeightMalformed}},
      {"", "0", "", {kWeightMalformed}},
      {"", "-1", "", {kWeightMalformed}},
      {"", "0,5", "", {kWeightMalformed}},
      {"", ".5", "", {kWeightMalformed}},
      {"א\tב", "", "", {kCharacter}},
      {"", "", "Ж", {kCharacter}},
      {huge, "", "", {kFixedTooLong}},
  };
  for (const auto& [service, weight, confirm, rules] : cases) {
    SCOPED_TRACE(service.substr(0, 10) + "|" + weight + "|" + confirm);
    const PostILSettings fixed{service, weight, confirm, "", 0, 0};
    const PreflightResult r = RunPreflight(db, 0, panel, docTypes, "", seam, fixed);
    EXPECT_EQ(Found(r), Rows(std::vector<int64_t>(rules.size(), 0), rules));
    EXPECT_EQ(r.errors, static_cast<int64_t>(rules.size()));
    if (!r.findings.empty()) {
      EXPECT_EQ(FindingCells(r.findings[0])[1], "כל השורות");
    }
    EXPECT_TRUE(RunPreflight(db, 1, panel, docTypes, "", seam, fixed).findings.empty());
  }
}

// With the address from the document header there is no zip to check; the rest reads the
// header's name and address.
TEST_F(PreflightTest, DocumentVariantChecksNoZip) {
  UseDocuments();
  for (int16_t layout : {0, 1}) {
    const PreflightResult r =
        Check({kClean}, layout,
              {{"1", 501, "כהן משה", "הרצל 5", "חיפה", "הערה"},
               {"1", 502, "לוי", std::nullopt, "עכו", std::string(100, 'r')}});
    EXPECT_EQ(Found(r), Rows({3}, {kAddressMissing}));
  }
}

TEST_F(PreflightTest, NoRowsNoFindings) {
  EXPECT_EQ(Check({}, 0).rows, 0);
  const PreflightResult r = Check(OneRowPerRule(), 2);  // a layout CreateCSV writes nothing for
  EXPECT_EQ(std::pair(r.rows, r.findings.size()), std::pair(int64_t{0}, size_t{0}));
}

TEST(FindingsCsvTest, HeaderThenQuotedCells) {
  PreflightResult r;
  r.findings.push_back(
      {RuleId::kNameCut, Severity::kWarning, 4, "A1", "שם", "כהן, \"משה\"", "השם נחתך"});
  EXPECT_EQ(FindingsCsv(r),
            "חומרה,שורה,מפתח חשבון,שדה,ערך,הודעה\n"
            "אזהרה,4,A1,שם,\"כהן, \"\"משה\"\"\",השם נחתך\n");
  r.errors = 1;
  r.warnings = 2;
  EXPECT_EQ(PreflightCounts(r), "שגיאות: 1, אזהרות: 2");
}

// The workbook's findings sheet, read back with Python: the dispatch sheet is the same with
// and without it; it reads right to left, holds text only and can open first.
TEST_F(PreflightTest, FindingsSheetLeavesTheDispatchSheetAsItWas) {
  if (!HavePython()) GTEST_SKIP() << "python3 with openpyxl is not installed";
  std::vector<AccountRow> rows = OneRowPerRule();
  rows.pop_back();  // a character the file cannot hold would stop CreateCSV
  const std::string db = BuildDb(rows);
  const std::string csv = PathOf("zdpost1.csv");
  CreateCSV(csv, db, 1, panel, docTypes, "", post, seam, Date::FromParts(2024, 3, 5));
  const PreflightResult r = RunPreflight(db, 1, panel, docTypes, "", seam);
  ASSERT_FALSE(r.findings.empty());
  for (bool open : {false, true}) {
    const std::string tag = open ? "open" : "closed";
    ConvertToExcel(csv, PathOf("plain-" + tag + ".xlsx"), open, seam);
    ConvertToExcel(csv, PathOf("checked-" + tag + ".xlsx"), open, seam, {}, r.findings);
  }
  ConvertToExcel(csv, PathOf("shown.xlsx"), false, seam, {}, r.findings, true);
  const std::string got = RunPython(
      "import sys, zipfile, openpyxl\n"
      "for tag in ('closed', 'open'):\n"
      "    a = zipfile.ZipFile(sys.argv[1] + '/plain-' + tag + '.xlsx')\n"
      "    b = zipfile.ZipFile(sys.argv[1] + '/checked-' + tag + '.xlsx')\n"
      "    print(a.read('xl/worksheets/sheet1.xml') == b.read('xl/worksheets/sheet1.xml'))\n"
      "wb = openpyxl.load_workbook(sys.argv[1] + '/shown.xlsx')\n"
      "print(wb.sheetnames, wb.active.title)\n"
      "ws = wb['בדיקה']\n"
      "print(ws.sheet_view.rightToLeft, ws.max_row)\n"
      "print(set(type(c.value).__name__ for row in ws.iter_rows() for c in row if c.value is "
      "not None))\n"
      "print('|'.join(c.value or '' for c in ws[1]))\n"
      "print('|'.join(c.value or '' for c in ws[2]))\n",
      dir_.string());
  EXPECT_EQ(got, "True\nTrue\n['Sheet1', 'בדיקה'] בדיקה\nTrue " +
                     std::to_string(r.findings.size() + 1) +
                     "\n{'str'}\nחומרה|שורה|מפתח חשבון|שדה|ערך|הודעה\n"
                     "שגיאה|3|3|שם||חסר שם הנמען\n");
}

}  // namespace
}  // namespace zdr::test
