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

TEST(CsvFieldTest, CleansAndCuts) {
  EXPECT_EQ(CsvField(db::Value{}, 0), "");
  EXPECT_EQ(CsvField(db::Value{std::string("כהן, משה")}, 0), "כהן  משה");
  EXPECT_EQ(CsvField(db::Value{std::string(",,a,")}, 0), "  a ");
  EXPECT_EQ(CsvField(db::Value{std::string("אבגדה")}, 3), "אבג");  // characters, not bytes
  EXPECT_EQ(CsvField(db::Value{std::string("אבג")}, 10), "אבג");
  EXPECT_EQ(CsvField(db::Value{std::string(" \"x\" ")}, 0), " \"x\" ");
  EXPECT_EQ(CsvField(db::Value{int64_t{1000}}, 0), "1000");
}

TEST(CsvFieldTest, LineBreaksBecomeBlanks) {
  EXPECT_EQ(CsvField(db::Value{std::string("רחוב\r\nהרצל\n5\r")}, 0), "רחוב  הרצל 5 ");
}

TEST_F(DispatchTest, PostLayoutWithCommaInName) {
  post.Service = "רגיל";
  post.Weight = "0.5";
  post.Confirm = "כן";
  EXPECT_EQ(Write({{"1", "כהן, משה", "הרצל 5", "חיפה", "31000", "", "דנה", "04-8500000"},
                   {"2", "לוי", std::nullopt, std::nullopt, std::nullopt, std::nullopt,
                    std::nullopt, std::nullopt}},
                  0),
            Lines({kHeader0, " 1000 ,כהן  משה,,הרצל 5,חיפה,04-8500000,,רגיל,0.5,,כן,,,0,1",
                   " 1000 ,לוי,,,,,,רגיל,0.5,,כן,,,0,1"}));
}

TEST_F(DispatchTest, PostLayoutCutsItsColumns) {
  const std::string name(30, 'n'), address = std::string(45, 'a'), city = "ירושלים עיר הקודש",
                                   phone = "03-555-12345678";
  const std::string file = Write({{"1", name, address, city, "1", "", "", phone}}, 0);
  EXPECT_EQ(file, Lines({kHeader0, " 1000 ," + std::string(25, 'n') + ",," + std::string(40, 'a') +
                                       ",ירושלים עיר הקו,03-555-1234,,,,,,,,0,1"}));
}

TEST_F(DispatchTest, CourierLayoutWithDate) {
  const std::string name(30, 'n');
  EXPECT_EQ(Write({{"A1", "כהן, משה", "הרצל 5", "חיפה", "31000", "", "דנה", "04-8500000"},
                   {"B2", name, std::nullopt, std::nullopt, std::nullopt, std::nullopt,
                    std::nullopt, std::nullopt}},
                  1),
            Lines({kHeader1, "A1,כהן  משה,הרצל 5,,חיפה,04-8500000,,,05/03/2024,, 1000 ,1,1,,,,0",
                   "B2," + name + ",,,,,,,05/03/2024,, 1000 ,1,1,,,,0"}));
}

TEST_F(DispatchTest, DocumentVariantCarriesNumberAndRemarks) {
  UseDocuments();
  const std::string remark = std::string(98, 'r') + "אב";  // the field's full width
  const std::string file = Write({{"7", "חשבון", "כתובת", "עכו", "24000", "", "", "04"}}, 1,
                                 {{"7", 501, "לקוח, במסמך", "הנשיא 3", "נהריה", remark}});
  EXPECT_EQ(file, Lines({kHeader1,
                         "7,לקוח  במסמך,הנשיא 3,,נהריה,04,,,05/03/2024,, 501 ,1,1,,,," + remark}));
}

TEST_F(DispatchTest, NoRecipientsGiveAnEmptyFile) {
  for (int16_t format : {0, 1}) {
    EXPECT_EQ(Write({}, format), "");
    EXPECT_TRUE(std::filesystem::exists(PathOf("zdpost1.csv")));
  }
}

TEST_F(DispatchTest, UnknownLayoutWritesNothing) {
  EXPECT_EQ(Write(NumberedAccounts(3), -1), "");
  EXPECT_EQ(Write(NumberedAccounts(3), 2), "");
}

TEST_F(DispatchTest, FileIsWindows1255WithCrLf) {
  Write(NumberedAccounts(2), 0);
  const std::string bytes = ReadBytes(PathOf("zdpost1.csv"));
  EXPECT_TRUE(bytes.starts_with("\xEE\xF1\xF4\xF8,"));  // מספר
  EXPECT_EQ(Count(bytes, "\r\n"), 3u);
  EXPECT_EQ(Count(bytes, "\n"), 3u);
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

// Faults mended.

TEST_F(DispatchTest, LineBreakInFieldKeepsOneRow) {
  const std::string file = Write({{"1", "שם\r\nשני", "רחוב\n3", "", "", "", "", ""}}, 1);
  EXPECT_EQ(file, Lines({kHeader1, "1,שם  שני,רחוב 3,,,,,,05/03/2024,, 1000 ,1,1,,,,0"}));
}

TEST_F(DispatchTest, CommaInSettingsKeepsColumns) {
  post.Service = "א,ב";
  post.Weight = "0,5";
  post.Confirm = "כן\r\n";
  EXPECT_EQ(Write(NumberedAccounts(1), 0),
            Lines({kHeader0, " 1000 ,לקוח 1,,רחוב 1,חיפה,04-5551,,א ב,0 5,,כן  ,,,0,1"}));
}

TEST_F(DispatchTest, WideCountGivesCompleteFile) {
  const std::string file = Write(NumberedAccounts(100000), 0);
  EXPECT_EQ(Count(file, "\r\n"), 100001u);
  EXPECT_NE(file.find(" 1000 ,לקוח 100000,"), std::string::npos);
}

// The workbook, read back with openpyxl.

class WorkbookTest : public DispatchTest {
 protected:
  // The sheet as "rtl|rows|cols" then one line per row of "type:value" cells.
  std::string ReadBack(const std::string& xlsx) {
    const std::string script = PathOf("read.py"), out = PathOf("read.txt");
    std::ofstream(script) << "import sys, openpyxl\n"
                             "ws = openpyxl.load_workbook(sys.argv[1]).active\n"
                             "print('%s|%d|%d' % (ws.sheet_view.rightToLeft, ws.max_row, "
                             "ws.max_column))\n"
                             "for row in ws.iter_rows():\n"
                             "    print('|'.join('%s:%s' % (type(c.value).__name__, c.value) "
                             "for c in row))\n";
    const std::string cmd =
        "PYTHONIOENCODING=utf-8 " + python_ + " " + script + " " + xlsx + " > " + out + " 2>&1";
    EXPECT_EQ(std::system(cmd.c_str()), 0) << ReadBytes(out);
    return ReadBytes(out);
  }
  void SetUp() override {
    DispatchTest::SetUp();
    python_ = Python();
    if (python_.empty()) GTEST_SKIP() << "python3 with openpyxl is not installed";
  }
  std::string python_;
};

TEST_F(WorkbookTest, PostLayoutKeepsTextAndNumbers) {
  post.Weight = "0.5";
  Write({{"1", "כהן", "הרצל 5", "חיפה", "031000", "", "", "03-5551234"}}, 0);
  const std::string xlsx = PathOf("out.XLSX");
  ConvertToExcel(PathOf("zdpost1.csv"), xlsx, true, seam);
  const std::string sheet = ReadBack(xlsx);
  EXPECT_TRUE(sheet.starts_with("True|2|15\n")) << sheet;
  EXPECT_NE(sheet.find("str:מספר|str:שם משפחה|str:שם פרטי|"), std::string::npos) << sheet;
  EXPECT_NE(sheet.find("int:1000|str:כהן|NoneType:None|str:הרצל 5|str:חיפה|str:03-5551234|"
                       "NoneType:None|NoneType:None|str:0.5|"),
            std::string::npos)
      << sheet;
  ASSERT_EQ(seam.opened.size(), 1u);
  EXPECT_EQ(seam.opened[0], xlsx);
}

TEST_F(WorkbookTest, CourierLayoutReferenceIsANumber) {
  Write({{"0123", "כהן", "", "", "", "", "", "0521234567"}}, 1);
  const std::string xlsx = PathOf("out.xlsx");
  ConvertToExcel(PathOf("zdpost1.csv"), xlsx, false, seam);
  const std::string sheet = ReadBack(xlsx);
  EXPECT_TRUE(sheet.starts_with("None|2|17\n") || sheet.starts_with("False|2|17\n")) << sheet;
  EXPECT_NE(sheet.find("str:0123|str:כהן|NoneType:None|NoneType:None|NoneType:None|"
                       "str:0521234567|NoneType:None|NoneType:None|str:05/03/2024|"
                       "NoneType:None|int:1000|str:1|str:1|"),
            std::string::npos)
      << sheet;
  EXPECT_TRUE(seam.opened.empty());
}

TEST_F(WorkbookTest, EmptyFileGivesEmptySheet) {
  Write({}, 0);
  const std::string xlsx = PathOf("empty.xlsx");
  ConvertToExcel(PathOf("zdpost1.csv"), xlsx, false, seam);
  EXPECT_EQ(ReadBack(xlsx), "None|1|1\n");  // no cell at all
}

TEST_F(DispatchTest, OtherFormatWithoutConverterAsksForXlsx) {
  Write(NumberedAccounts(1), 0);
  const char* oldPath = std::getenv("PATH");
  const std::string saved = oldPath ? oldPath : "";
  setenv("PATH", PathOf("nothing").c_str(), 1);
  try {
    ConvertToExcel(PathOf("zdpost1.csv"), PathOf("out.xls"), false, seam);
    ADD_FAILURE();
  } catch (const OutputError& e) {
    EXPECT_NE(std::string(e.what()).find(".xlsx"), std::string::npos) << e.what();
  }
  setenv("PATH", saved.c_str(), 1);
  EXPECT_FALSE(std::filesystem::exists(PathOf("out.xls")));
}

TEST_F(DispatchTest, SpreadsheetThatCannotOpenIsReported) {
  Write(NumberedAccounts(1), 0);
  seam.spreadsheetWorks = false;
  EXPECT_THROW(ConvertToExcel(PathOf("zdpost1.csv"), PathOf("o.xlsx"), true, seam), OutputError);
}

TEST_F(DispatchTest, MissingCsvIsReported) {
  EXPECT_THROW(ConvertToExcel(PathOf("none.csv"), PathOf("o.xlsx"), false, seam), OutputError);
  EXPECT_THROW(ConvertToExcel(PathOf("none.csv"), "", false, seam), OutputError);
}

}  // namespace
}  // namespace zdr::test
