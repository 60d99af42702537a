// The address list.
#include <gtest/gtest.h>

#include "output/outputtest.h"

namespace zdr::test {
namespace {

std::vector<std::string> ListHead(const std::string& date) {
  return {"<HTML>",
          "<!-- saved from url=(0024)http://www.vornak.co.il/ -->",
          "<HEAD>",
          "<TITLE>Vornak מערכות מידע מציגה</TITLE>",
          "<meta http-equiv='Content-Type' content='text/html; charset=windows-1255'>",
          "<style>.MyClass1{font-size : 10pt; color: blue;}",
          "       .Title1 {font-size : 12pt; color: blue; font-weight : bold;}",
          "       TD {font-family: Arial; font-size : 8pt;}",
          "       TABLE {font-family: Arial; font-size : 8pt; color: black;}",
          "</style>",
          "</HEAD>",
          "<BODY class=MyClass1 BGCOLOR='#FFFFFF' TEXT='#000000' LINK='#0000FF' VLINK='#800080'>",
          "<p class=Title1 align='left'>" + date + "</p>",
          "<p class=Title1 align='right'>Mirdal לTavlor קלאסית</p>",
          "<table width='100%' border='0' cellpadding='1' cellspacing='0'>",
          "  <tr><td colspan='5'><hr noshade size='2'></td></tr>",
          "  <tr valign='middle' bgcolor='white' align='right'>",
          "    <td width='10%' valign='middle'>מיקוד</td>",
          "    <td width='10%' valign='middle'>עיר</td>",
          "    <td width='30%' valign='middle'>כתובת</td>",
          "    <td width='20%' valign='middle'>איש קשר</td>",
          "    <td width='30%' valign='middle'>שם</td>",
          "  </tr>",
          "  <tr><td colspan='5'><hr noshade size='2'></td></tr>"};
}

class AddressListTest : public OutputTest {
 protected:
  std::string Write(const std::vector<AccountRow>& rows) {
    const std::string out = PathOf("zdrlab2.htm");
    CreateHTML(out, BuildDb(rows), panel, docTypes, "", seam, Date::FromParts(2024, 3, 5));
    return Utf8File(out);
  }
  static std::string Totals(int64_t count, int64_t pages) {
    return "<p class=Title1 align='right'>מספר הכרטיסים ברשימה: " + std::to_string(count) +
           "</p>\r\n<p class=Title1 align='right'>מספר הדפים הנדרשים: " + std::to_string(pages) +
           "</p>\r\n";
  }
};

TEST_F(AddressListTest, WholeListExact) {
  std::vector<std::string> want = ListHead("05/03/2024");
  want.insert(want.end(), {"  <tr valign='middle' bgcolor='#FFFFFF' align='right'>",
                           "    <td>31000</td>",
                           "    <td dir=rtl>חיפה</td>",
                           "    <td dir=rtl>הרצל 5</td>",
                           "    <td dir=rtl>דנה</td>",
                           "    <td dir=rtl dir=rtl>כהן משה</td>",
                           "  </tr>",
                           "  <tr valign='middle' bgcolor='#FFFFFF' align='right'>",
                           "    <td>&nbsp;</td>",
                           "    <td dir=rtl>&nbsp;</td>",
                           "    <td dir=rtl>&nbsp;</td>",
                           "    <td dir=rtl>&nbsp;</td>",
                           "    <td dir=rtl dir=rtl>לוי</td>",
                           "  </tr>",
                           "</table>",
                           "<hr noshade width='100%' size='2'>",
                           "<p class=Title1 align='right'>מספר הכרטיסים ברשימה: 2</p>",
                           "<p class=Title1 align='right'>מספר הדפים הנדרשים: 1</p>",
                           "<br>",
                           "<p class=Title1 align='center'>Vornak מערכות מידע</p>",
                           "</BODY>",
                           "</HTML>"});
  EXPECT_EQ(Write({{"1", "כהן משה", "הרצל 5", "חיפה", "31000", "כרמל", "דנה", "04-8500000"},
                   {"2", "לוי", std::nullopt, std::nullopt, std::nullopt, std::nullopt,
                    std::nullopt, std::nullopt}}),
            Lines(want));
}

TEST_F(AddressListTest, NoRecipientsStopsAfterHeadings) {
  EXPECT_EQ(Write({}), Lines(ListHead("05/03/2024")));
}

TEST_F(AddressListTest, NoRecipientsNeedsNoGeometry) {
  panel.txtRows = "0";
  EXPECT_EQ(Write({}), Lines(ListHead("05/03/2024")));
}

TEST_F(AddressListTest, PagesNeededRoundUp) {
  EXPECT_NE(Write(NumberedAccounts(25)).find(Totals(25, 2)), std::string::npos);
  panel.txtCopies = "2";
  EXPECT_NE(Write(NumberedAccounts(25)).find(Totals(25, 3)), std::string::npos);
  panel.txtCopies = "1";
  EXPECT_NE(Write(NumberedAccounts(24)).find(Totals(24, 1)), std::string::npos);
  panel.txtStartFrom = "20";  // the start position is not counted
  EXPECT_NE(Write(NumberedAccounts(24)).find(Totals(24, 1)), std::string::npos);
  panel.txtCopies = "0";
  EXPECT_NE(Write(NumberedAccounts(3)).find(Totals(3, 0)), std::string::npos);
}

TEST_F(AddressListTest, BadGeometryFailsWithoutHalfAList) {
  const std::string out = PathOf("zdrlab2.htm");
  const std::string db = BuildDb(NumberedAccounts(3));
  std::ofstream(out) << "old";
  panel.txtCols = "0";
  EXPECT_THROW(CreateHTML(out, db, panel, docTypes, "", seam), OutputError);
  EXPECT_EQ(Count(ReadBytes(out), "bgcolor='#FFFFFF'"), 0u);
  panel.txtCols = "3";
  panel.txtCopies = "x";
  EXPECT_THROW(CreateHTML(out, db, panel, docTypes, "", seam), OutputError);
  EXPECT_EQ(seam.progress.back(), 0);
}

TEST_F(AddressListTest, DocumentZipIsAnEmptyCell) {
  UseDocuments();
  const std::string out = PathOf("zdrlab2.htm");
  CreateHTML(out,
             BuildDb({{"1", "חשבון", "כתובת חשבון", "עכו", "24000", "", "דנה", "04"}},
                     {{"1", 501, "לקוח במסמך", "הנשיא 3", "נהריה", "הערה"}}),
             panel, docTypes, "", seam, Date::FromParts(2024, 12, 31));
  const std::string list = Utf8File(out);
  EXPECT_NE(list.find("<p class=Title1 align='left'>31/12/2024</p>"), std::string::npos);
  EXPECT_NE(list.find("    <td></td>\r\n    <td dir=rtl>נהריה</td>\r\n"
                      "    <td dir=rtl>הנשיא 3</td>\r\n    <td dir=rtl>דנה</td>\r\n"
                      "    <td dir=rtl dir=rtl>לקוח במסמך</td>\r\n"),
            std::string::npos);
}

// Faults mended.

// Regression: an empty field of the document header printed the word "Null" in the list.
TEST_F(AddressListTest, EmptyHeaderFieldPrintedTheWordNull) {
  UseDocuments();
  const std::string out = PathOf("zdrlab2.htm");
  CreateHTML(out,
             BuildDb({{"1", "חשבון", "כתובת", "עכו", "24000", "", "", "04"}},
                     {{"1", 501, std::nullopt, std::nullopt, std::nullopt, std::nullopt}}),
             panel, docTypes, "", seam, Date::FromParts(2024, 12, 31));
  const std::string list = Utf8File(out);
  EXPECT_EQ(list.find("Null"), std::string::npos);
  EXPECT_NE(list.find("    <td></td>\r\n    <td dir=rtl>&nbsp;</td>\r\n"
                      "    <td dir=rtl>&nbsp;</td>\r\n    <td dir=rtl>&nbsp;</td>\r\n"
                      "    <td dir=rtl dir=rtl>&nbsp;</td>\r\n"),
            std::string::npos)
      << list;
}

TEST_F(AddressListTest, ValuesWithMarkupAreEscaped) {
  const std::string list = Write({{"1", "A&B <סניף>", "<i>", "a&b", "<9>", "", "x>y", ""}});
  EXPECT_NE(list.find("    <td dir=rtl dir=rtl>A&amp;B &lt;סניף&gt;</td>"), std::string::npos);
  EXPECT_NE(list.find("    <td>&lt;9&gt;</td>"), std::string::npos);
  EXPECT_NE(list.find("    <td dir=rtl>a&amp;b</td>"), std::string::npos);
  EXPECT_NE(list.find("    <td dir=rtl>&lt;i&gt;</td>"), std::string::npos);
  EXPECT_NE(list.find("    <td dir=rtl>x&gt;y</td>"), std::string::npos);
}

TEST_F(AddressListTest, WideCountGivesCompleteList) {
  const std::string list = Write(NumberedAccounts(100000));
  EXPECT_EQ(Count(list, "<td dir=rtl dir=rtl>"), 100000u);
  EXPECT_NE(list.find(Totals(100000, 4167)), std::string::npos);
}

}  // namespace
}  // namespace zdr::test
