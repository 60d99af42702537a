// The pages in a real browser: headless Chromium reads the Windows-1255 pages, shows the
// Hebrew names as held, and prints the label sheet on as many pages as it has grids.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>

#include "output/outputtest.h"

namespace zdr::testing {
namespace {

constexpr const char* kChromium = "/usr/bin/chromium";

class BrowserTest : public OutputTest {
 protected:
  void SetUp() override {
    OutputTest::SetUp();
    if (!std::filesystem::exists(kChromium)) GTEST_SKIP() << "chromium is not installed";
  }

  // Runs headless Chromium on a local page with `what` ("--dump-dom" or
  // "--print-to-pdf=..."), bounded to 60 seconds; returns its standard output.
  std::string Chromium(const std::string& page, const std::string& what) {
    const std::string profile = PathOf("profile" + std::to_string(++runs_));
    std::filesystem::create_directories(profile);
    const std::string out = PathOf("chromium.out");
    const std::string cmd = std::string("timeout 60 ") + kChromium +
                            " --headless --no-sandbox --disable-gpu"
                            " --disable-background-networking --disable-component-update"
                            " --disable-sync --no-first-run --user-data-dir=" +
                            profile + " " + what + " file://" + page + " > " + out + " 2>/dev/null";
    const int rc = std::system(cmd.c_str());
    EXPECT_EQ(rc, 0) << cmd;
    return ReadBytes(out);
  }

  int runs_ = 0;
};

TEST_F(BrowserTest, LabelSheetShowsHebrewNames) {
  panel.ChkTitle = {1, 1, 1, 0, 1, 1, 0, 1, 1};
  const std::string page = PathOf("zdrlab1.htm");
  CreateLabFile(page,
                BuildDb({{"12 3", "כהן & בניו <סניף>", "הרצל 5", "חיפה", "31000", "", "", "04"},
                         {"7", "לוי", "", "", "", "", "", ""}}),
                panel, docTypes, "", labels, seam);
  const std::string dom = Chromium(page, "--dump-dom");
  EXPECT_NE(dom.find("כהן &amp; בניו &lt;סניף&gt;"), std::string::npos) << dom;
  EXPECT_NE(dom.find("לכבוד"), std::string::npos);
  EXPECT_NE(dom.find("חיפה    31000"), std::string::npos);
  EXPECT_NE(dom.find("<td>לוי</td>"), std::string::npos);
}

TEST_F(BrowserTest, AddressListShowsHebrewNamesAndTotals) {
  const std::string page = PathOf("zdrlab2.htm");
  CreateHTML(page, BuildDb(NumberedAccounts(3)), panel, docTypes, "", seam,
             Date::FromParts(2024, 3, 5));
  const std::string dom = Chromium(page, "--dump-dom");
  EXPECT_NE(dom.find("לקוח 3"), std::string::npos) << dom;
  EXPECT_NE(dom.find("מספר הכרטיסים ברשימה: 3"), std::string::npos);
  EXPECT_NE(dom.find("05/03/2024"), std::string::npos);
}

TEST_F(BrowserTest, SheetOfTwentyFivePrintsOnTwoPages) {
  panel.ChkTitle = {1, 1, 0, 0, 1, 1, 0, 0, 0};
  const std::string page = PathOf("zdrlab1.htm");
  CreateLabFile(page, BuildDb(NumberedAccounts(25)), panel, docTypes, "", labels, seam);
  const std::string pdf = PathOf("sheet.pdf");
  Chromium(page, "--no-pdf-header-footer --print-to-pdf=" + pdf);
  ASSERT_TRUE(std::filesystem::exists(pdf));
  const std::string info = PathOf("pdfinfo.txt");
  ASSERT_EQ(std::system(("pdfinfo " + pdf + " > " + info).c_str()), 0);
  const std::string text = ReadBytes(info);
  const size_t at = text.find("Pages:");
  ASSERT_NE(at, std::string::npos) << text;
  EXPECT_EQ(std::stoi(text.substr(at + 6)), 2) << text;
}

}  // namespace
}  // namespace zdr::testing
