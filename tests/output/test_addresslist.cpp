// The address list.
#include <gtest/gtest.h>

#include "output/outputtest.h"

namespace zdr::test {
namespace {

std::vector<std::string> ListHead(const std::string& date) {
  std::vector<std::string> head = {
      "<HTML>",
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
      "  <tr valign='middle' bgcolor='white' align='right'>"};
  for (const char* h :
       {"10%' valign='middle'>מיקוד", "10%' valign='middle'>עיר", "30%' valign='middle'>כתובת",
        "20%' valign='middle'>איש קשר", "30%' valign='middle'>שם"})
    head.push_back(std::string("    <td width='") + h + "</td>");
  head.insert(head.end(), {"  </tr>", "  <tr><td colspan='5'><hr noshade size='2'></td></tr>"});
  return head;
}

// One row's five cells: zip, city, address, contact, name.
std::string Row(const std::string& zip, const std::string& city, const std::string& address,
                const std::string& contact, const std::string& name) {
  return "    <td>" + zip + "</td>\r\n    <td dir=rtl>" + city + "</td>\r\n    <td dir=rtl>" +
         address + "</td>\r\n    <td dir=rtl>" + contact + "</td>\r\n    <td dir=rtl dir=rtl>" +
         name + "</td>\r\n";
}

class AddressListTest : public OutputTest {
 protected:
  std::string Write(const std::vector<AccountRow>& rows, const std::vector<HeadRow>& heads = {}) {
    const std::string out = PathOf("zdrlab2.htm");
    CreateHTML(out, BuildDb(rows, heads), panel, docTypes, "", seam, Date::FromParts(2024, 3, 5));
    return Utf8File(out);
  }
  static std::string Totals(int64_t count, int64_t pages) {
    return "<p class=Title1 align='right'>מספר הכרטיסים ברשימה: " + std::to_string(count) +
           "</p>\r\n<p class=Title1 align='right'>מספר הדפים הנדרשים: " + std::to_string(pages) +
           "</p>\r\n";
  }
};

TEST_F(AddressListTest, WholeListByteForByte) {
  const std::string tr = "  <tr valign='middle' bgcolor='#FFFFFF' align='right'>\r\n";
  const std::string want =
      Lines(ListHead("05/03/2024")) + tr + Row("31000", "חיפה", "הרצל 5", "דנה", "כהן משה") +
      "  </tr>\r\n" + tr + Row("&nbsp;", "&nbsp;", "&nbsp;", "&nbsp;", "לוי") + "  </tr>\r\n" +
      Lines({"</table>", "<hr noshade width='100%' size='2'>"}) + Totals(2, 1) +
      Lines(
          {"<br>", "<p class=Title1 align='center'>Vornak מערכות מידע</p>", "</BODY>", "</HTML>"});
  Write({{"1", "כהן משה", "הרצל 5", "חיפה", "31000", "כרמל", "דנה", "04-8500000"},
         {"2", "לוי", std::nullopt, std::nullopt, std::nullopt, std::nullopt, std::nullopt,
          std::nullopt}});
  EXPECT_EQ(ReadBytes(PathOf("zdrlab2.htm")), Utf8ToWin1255(want));
  // No recipients: the list stops after the headings, and needs no geometry.
  panel.txtRows = "0";
  EXPECT_EQ(Write({}), Lines(ListHead("05/03/2024")));
}

TEST_F(AddressListTest, PagesNeededRoundUp) {
  const std::tuple<const char*, const char*, int, int> cases[] = {{"1", "1", 25, 2},
                                                                  {"2", "1", 25, 3},
                                                                  {"1", "1", 24, 1},
                                                                  {"1", "20", 24, 1},
                                                                  {"0", "1", 3, 0}};
  for (const auto& [copies, start, count, pages] : cases) {
    panel.txtCopies = copies;
    panel.txtStartFrom = start;  // the start position is not counted
    EXPECT_NE(Write(NumberedAccounts(count)).find(Totals(count, pages)), std::string::npos)
        << copies << " copies of " << count;
  }
  panel.txtCopies = "1";
  const std::string list = Write(NumberedAccounts(100000));
  EXPECT_EQ(Count(list, "<td dir=rtl dir=rtl>"), 100000u);
  EXPECT_NE(list.find(Totals(100000, 4167)), std::string::npos);
}

TEST_F(AddressListTest, BadGeometryFailsWithoutHalfAList) {
  const std::string out = PathOf("zdrlab2.htm");
  const std::string db = BuildDb(NumberedAccounts(3));
  panel.txtCols = "0";
  EXPECT_THROW(CreateHTML(out, db, panel, docTypes, "", seam), OutputError);
  EXPECT_EQ(Count(ReadBytes(out), "bgcolor='#FFFFFF'"), 0u);
  panel.txtCols = "3";
  panel.txtCopies = "x";
  EXPECT_THROW(CreateHTML(out, db, panel, docTypes, "", seam), OutputError);
  EXPECT_EQ(seam.progress.back(), 0);
}

// Regression: an empty field of the document header printed the word "Null" in the list.
// The document's zip is an empty cell, its name and address the header's.
TEST_F(AddressListTest, EmptyHeaderFieldPrintedTheWordNull) {
  UseDocuments();
  const std::string list =
      Write({{"1", "חשבון", "כתובת חשבון", "עכו", "24000", "", "דנה", "04"}},
            {{"1", 501, "לקוח במסמך", "הנשיא 3", "נהריה", "הערה"},
             {"1", 502, std::nullopt, std::nullopt, std::nullopt, std::nullopt}});
  EXPECT_EQ(list.find("Null"), std::string::npos);
  EXPECT_NE(list.find(Row("", "נהריה", "הנשיא 3", "דנה", "לקוח במסמך")), std::string::npos);
  EXPECT_NE(list.find(Row("", "&nbsp;", "&nbsp;", "דנה", "&nbsp;")), std::string::npos) << list;
}

TEST_F(AddressListTest, ValuesWithMarkupAreEscaped) {
  const std::string list = Write({{"1", "A&B <סניף>", "<i>", "a&b", "<9>", "", "x>y", ""}});
  EXPECT_NE(list.find(Row("&lt;9&gt;", "a&amp;b", "&lt;i&gt;", "x&gt;y", "A&amp;B &lt;סניף&gt;")),
            std::string::npos)
      << list;
}

}  // namespace
}  // namespace zdr::test
