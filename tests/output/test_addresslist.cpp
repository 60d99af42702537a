// The address list.
#include <gtest/gtest.h>

#include "output/outputtest.h"

namespace zdr::test {
namespace {

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

// The whole list byte for byte; without recipients it stops after the headings, and needs
// no geometry.
TEST_F(AddressListTest, WholeListByteForByte) {
  Write({{"1", "כהן משה", "הרצל 5", "חיפה", "31000", "כרמל", "דנה", "04-8500000"},
         {"2", "לוי", std::nullopt, std::nullopt, std::nullopt, std::nullopt, std::nullopt,
          std::nullopt}});
  const std::string list = ReadBytes(PathOf("zdrlab2.htm"));
  EXPECT_EQ(list, Golden("address-list.htm"));
  panel.txtRows = "0";
  Write({});
  const std::string empty = ReadBytes(PathOf("zdrlab2.htm"));
  EXPECT_TRUE(empty.ends_with("<hr noshade size='2'></td></tr>\r\n") && list.starts_with(empty));
  EXPECT_EQ(Count(empty, "<tr"), 3u);
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

}  // namespace
}  // namespace zdr::test
