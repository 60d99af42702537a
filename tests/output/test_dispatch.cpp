// The dispatch file, its field cleaning and its workbook copy.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <stdlib.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <set>

#include "output/outputtest.h"
#include "output/targetfile.h"

namespace zdr::test {
namespace {

const std::string kHeader0(kPostILHeader0);
const std::string kHeader1(kPostILHeader1);

class DispatchTest : public OutputTest {
 protected:
  std::string Write(const std::vector<AccountRow>& rows, int16_t format,
                    const std::vector<HeadRow>& heads = {}) {
    const std::string out = PathOf("zdpost1.csv");
    CreateCSV(out, BuildDb(rows, heads), format, panel, docTypes, "", post, seam,
              Date::FromParts(2024, 3, 5));
    return Utf8File(out);
  }
};

// Every layout byte for byte: the columns after the name, the cuts of layout 0, the date of
// layout 1, the document variant's number and remarks; commas and line breaks in fields and
// in the settings become blanks so that no column moves and every recipient keeps one row.
TEST_F(DispatchTest, LayoutsByteForByte) {
  const AccountRow full{"1", "כהן, משה", "הרצל 5", "חיפה", "31000", "", "דנה", "04-8500000"};
  const AccountRow empty{"2",          "לוי",        std::nullopt, std::nullopt,
                         std::nullopt, std::nullopt, std::nullopt, std::nullopt};
  const AccountRow broken{"3", "שם\r\nשני", "רחוב\n3", "", "", "", "", ""};
  const AccountRow wide{
      "4", std::string(30, 'n'), std::string(45, 'a'), "ירושלים עיר הקודש", "1", "",
      "",  "03-555-12345678"};
  const std::string remark = std::string(98, 'r') + "אב";  // the field's full width
  post.Service = "א,ב";
  post.Weight = "0,5";
  post.Confirm = "כן\r\n";
  for (const std::string variant : {"post-0-accounts.csv", "post-1-accounts.csv",
                                    "post-0-documents.csv", "post-1-documents.csv"}) {
    SCOPED_TRACE(variant);
    panel = Panel{};
    if (variant.ends_with("documents.csv")) UseDocuments();
    Write({full, empty, broken, wide}, variant[5] - '0',
          {{"1", 501, "לקוח, במסמך", "הנשיא 3", "נהריה", remark}});
    EXPECT_EQ(ReadBytes(PathOf("zdpost1.csv")), Golden(variant));
  }
}

TEST_F(DispatchTest, EmptyFilesUnknownLayoutsAndACountOfAHundredThousand) {
  for (int16_t format : {0, 1}) {
    EXPECT_EQ(Write({}, format), "");
    EXPECT_TRUE(std::filesystem::exists(PathOf("zdpost1.csv")));
  }
  EXPECT_EQ(Write(NumberedAccounts(3), -1), "");
  EXPECT_EQ(Write(NumberedAccounts(3), 2), "");
  const std::string file = Write(NumberedAccounts(100000), 0);
  EXPECT_EQ(Count(file, "\r\n"), 100001u);
  EXPECT_TRUE(file.ends_with(" 1000 ,לקוח 100000,,רחוב 100000,חיפה,04-55510000,,,,,,,,0,1\r\n"));
}

TEST_F(DispatchTest, CharacterOutsideCodePageIsAnError) {
  try {
    Write({{"1", "Жук", "", "", "", "", "", ""}}, 0);
    ADD_FAILURE();
  } catch (const OutputError& e) {
    EXPECT_NE(std::string(e.what()).find("U+0416"), std::string::npos) << e.what();
  }
  EXPECT_EQ(seam.progress.back(), 0);
}

// The workbook, read back with openpyxl: text cells but for the reference number, right to
// left when it opens, handed to the spreadsheet.
TEST_F(DispatchTest, WorkbookKeepsTextAndNumbers) {
  if (!HavePython()) GTEST_SKIP() << "python3 with openpyxl is not installed";
  auto readBack = [&](const std::string& xlsx) {
    return RunPython(
        "import sys, openpyxl\nws = openpyxl.load_workbook(sys.argv[1]).active\n"
        "print('%s|%d|%d' % (ws.sheet_view.rightToLeft, ws.max_row, ws.max_column))\n"
        "for row in ws.iter_rows():\n"
        "    print('|'.join('%s:%s' % (type(c.value).__name__, c.value) for c in row))\n",
        xlsx);
  };
  post.Weight = "0.5";
  Write({{"0123", "כהן", "הרצל 5", "חיפה", "031000", "", "", "03-5551234"}}, 0);
  ConvertToExcel(PathOf("zdpost1.csv"), PathOf("out.XLSX"), true, seam);
  std::string sheet = readBack(PathOf("out.XLSX"));
  EXPECT_TRUE(sheet.starts_with("True|2|15\nstr:מספר|str:שם משפחה|str:שם פרטי|")) << sheet;
  EXPECT_NE(sheet.find("\nint:1000|str:כהן|NoneType:None|str:הרצל 5|str:חיפה|str:03-5551234|"
                       "NoneType:None|NoneType:None|str:0.5|"),
            std::string::npos)
      << sheet;
  EXPECT_EQ(seam.opened, std::vector<std::string>{PathOf("out.XLSX")});

  Write({{"0123", "כהן", "", "", "", "", "", "0521234567"}}, 1);
  ConvertToExcel(PathOf("zdpost1.csv"), PathOf("out.xlsx"), false, seam);
  sheet = readBack(PathOf("out.xlsx"));
  EXPECT_TRUE(sheet.starts_with("None|2|17\n") || sheet.starts_with("False|2|17\n")) << sheet;
  EXPECT_NE(sheet.find("\nstr:0123|str:כהן|NoneType:None|NoneType:None|NoneType:None|"
                       "str:0521234567|NoneType:None|NoneType:None|str:05/03/2024|"
                       "NoneType:None|int:1000|str:1|str:1|"),
            std::string::npos)
      << sheet;
  EXPECT_EQ(seam.opened.size(), 1u);

  Write({}, 0);
  ConvertToExcel(PathOf("zdpost1.csv"), PathOf("empty.xlsx"), false, seam);
  EXPECT_EQ(readBack(PathOf("empty.xlsx")), "None|1|1\n");  // no cell at all
}

TEST_F(DispatchTest, WorkbookFailuresAreReported) {
  EXPECT_THROW(ConvertToExcel(PathOf("none.csv"), PathOf("o.xlsx"), false, seam), OutputError);
  EXPECT_THROW(ConvertToExcel(PathOf("none.csv"), "", false, seam), OutputError);
  Write(NumberedAccounts(1), 0);
  seam.spreadsheetWorks = false;
  EXPECT_THROW(ConvertToExcel(PathOf("zdpost1.csv"), PathOf("o.xlsx"), true, seam), OutputError);
}

// Regression: a killed run left its temporary workbook or PDF, holding customer names, beside
// the target for ever. The next run for the target removes what a dead run left and keeps
// what a live run is writing; a writer that does not finish leaves nothing at all.
TEST_F(DispatchTest, LeftoversOfAKilledRunAreRemovedAndALiveOnesKept) {
  const auto plant = [&](const std::string& name, const std::string& bytes, mode_t mode) {
    std::ofstream(PathOf(name)) << bytes;
    ::chmod(PathOf(name).c_str(), mode);
  };
  const std::pair<const char*, bool> files[] = {
      {".out.pdf.Ab12Cd", true},     // a dead run's hidden file
      {"out.pdf.Zz9Yy8", true},      // an earlier version's PDF: private, "%PDF-"
      {"out.pdf.backup", false},     // the user's copy, readable by others
      {"out.pdf.Qq1Ww2", false},     // private, but not a PDF
      {".out.pdf.Live12", false},    // a live run's, held locked
      {".out.pdf.seven77", false},   // not the shape of a temporary name
      {".other.pdf.Ab12Cd", false},  // another target's
  };
  for (const auto& [name, gone] : files) {
    const std::string n = name;
    plant(n, n == "out.pdf.Qq1Ww2" ? "notes" : "%PDF-1.5 names",
          n == "out.pdf.backup" ? 0644 : 0600);
  }
  const int live = ::open(PathOf(".out.pdf.Live12").c_str(), O_RDONLY);
  ASSERT_EQ(::flock(live, LOCK_EX), 0);
  const auto listing = [&] {
    std::set<std::string> names;
    for (const auto& e : std::filesystem::directory_iterator(dir_))
      names.insert(e.path().filename().string());
    return names;
  };
  std::set<std::string> expected = listing();
  for (const auto& [name, gone] : files)
    if (gone) expected.erase(name);
  { ReplacingFile unfinished(PathOf("out.pdf")); }
  EXPECT_EQ(listing(), expected);
  ::close(live);
}

}  // namespace
}  // namespace zdr::test
