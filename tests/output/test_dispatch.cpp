// The dispatch file, its field cleaning and its workbook copy.
#include <gtest/gtest.h>
#include <stdlib.h>

#include <cstdlib>

#include "output/outputtest.h"

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

}  // namespace
}  // namespace zdr::test
