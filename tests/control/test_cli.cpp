// The zdrlab command line end to end on a generated company: the files it writes, what it
// prints, and its exit codes.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "import/codepage.h"
#include "zdrgen/generator.h"

namespace fs = std::filesystem;

namespace {

struct RunResult {
  int exitCode = -1;
  std::string out;
  std::string err;
};

std::string Quote(const std::string& s) {
  std::string q = "'";
  for (char c : s) q += (c == '\'') ? std::string("'\\''") : std::string(1, c);
  return q + "'";
}

std::string ReadFile(const fs::path& p) {
  std::ifstream in(p, std::ios::binary);
  std::stringstream ss;
  ss << in.rdbuf();
  return ss.str();
}

class CliTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    root_ = fs::temp_directory_path() / ("zdr-cli-" + std::to_string(::getpid()));
    fs::remove_all(root_);
    zdrgen::Options options;
    options.seed = 11;
    options.accounts = 60;
    options.documents = 40;
    truth_ =
        new zdrgen::CompanyTruth(zdrgen::WriteCompany(root_ / "company", options, "חברה לדוגמה"));
  }
  static void TearDownTestSuite() {
    delete truth_;
    fs::remove_all(root_);
  }

  void SetUp() override {
    temp_ = root_ / ::testing::UnitTest::GetInstance()->current_test_info()->name();
    fs::create_directories(temp_);
    settings_ = temp_ / "settings.ini";
  }

  RunResult Run(const std::vector<std::string>& args) {
    std::string cmd =
        "Temp=" + Quote(temp_.string()) + " " + Quote(std::string(ZDR_BINARY_DIR) + "/src/zdrlab");
    for (const auto& a : args) cmd += " " + Quote(a);
    const fs::path errFile = temp_ / "stderr.txt";
    cmd += " 2>" + Quote(errFile.string());
    RunResult r;
    FILE* pipe = ::popen(cmd.c_str(), "r");
    EXPECT_NE(pipe, nullptr);
    std::array<char, 4096> buf;
    size_t n;
    while ((n = std::fread(buf.data(), 1, buf.size(), pipe)) > 0) r.out.append(buf.data(), n);
    const int status = ::pclose(pipe);
    r.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    r.err = ReadFile(errFile);
    return r;
  }

  std::vector<std::string> Base(const std::string& command) {
    return {command, "--company", (root_ / "company").string(), "--settings", settings_.string()};
  }

  static fs::path root_;
  static zdrgen::CompanyTruth* truth_;
  fs::path temp_;
  fs::path settings_;
};

fs::path CliTest::root_;
zdrgen::CompanyTruth* CliTest::truth_ = nullptr;

TEST_F(CliTest, LabelsWritesTheSheetInTempAndPrintsItsPath) {
  auto args = Base("labels");
  args.insert(args.end(), {"--set", "UseTitle1=1"});
  const RunResult r = Run(args);
  ASSERT_EQ(r.exitCode, 0) << r.err;
  const fs::path sheet = temp_ / "zdrlab1.htm";
  EXPECT_EQ(r.out, sheet.string() + "\n");
  ASSERT_TRUE(fs::exists(sheet));
  // The status line's messages, in order.
  const std::vector<std::string> steps = {"מאתחל בסיס נתונים", "קורא רשימת כרטיסים",
                                          "קריאת הנתונים הסתיימה", "מכין רשימה",
                                          "הכנת הרשימה הסתיימה"};
  size_t at = 0;
  for (const auto& s : steps) {
    const size_t found = r.err.find(s, at);
    ASSERT_NE(found, std::string::npos) << s << "\n" << r.err;
    at = found + s.size();
  }
  // A name of the company appears in the sheet as the host holds it.
  const std::string page = zdr::Win1255ToUtf8(ReadFile(sheet));
  bool anyName = false;
  for (const auto& a : truth_->accounts) {
    if (!a.deleted && !a.duplicateKey && a.unambiguousText && !a.name.empty() &&
        a.name.find_first_of("&<>") == std::string::npos && page.find(a.name) != std::string::npos)
      anyName = true;
  }
  EXPECT_TRUE(anyName);
}

TEST_F(CliTest, ListCountsTheRecipients) {
  const RunResult r = Run(Base("list"));
  ASSERT_EQ(r.exitCode, 0) << r.err;
  const std::string page = zdr::Win1255ToUtf8(ReadFile(temp_ / "zdrlab2.htm"));
  EXPECT_NE(page.find("מספר הכרטיסים ברשימה: "), std::string::npos);
  EXPECT_NE(page.find("מספר הדפים הנדרשים: "), std::string::npos);
}

TEST_F(CliTest, PostWithoutOutputFileIsRefused) {
  const RunResult r = Run(Base("post"));
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.err.find("לא הוגדר קובץ פלט"), std::string::npos) << r.err;
  EXPECT_EQ(r.err.find("מאתחל בסיס נתונים"), std::string::npos) << "no data load";
  EXPECT_TRUE(r.out.empty());
}

TEST_F(CliTest, PostWritesTheWorkbook) {
  const fs::path book = temp_ / "post.xlsx";
  auto args = Base("post");
  args.insert(args.end(), {"--set", "FilePath=" + book.string(), "--set", "Weight=0.5"});
  const RunResult r = Run(args);
  ASSERT_EQ(r.exitCode, 0) << r.err;
  EXPECT_EQ(r.out, book.string() + "\n");
  const std::string bytes = ReadFile(book);
  ASSERT_GE(bytes.size(), 4u);
  EXPECT_EQ(bytes.substr(0, 2), "PK");
  const std::string csv = zdr::Win1255ToUtf8(ReadFile(temp_ / "zdpost1.csv"));
  EXPECT_EQ(csv.rfind("מספר,שם משפחה,שם פרטי,", 0), 0u);
  EXPECT_NE(csv.find(",0.5,"), std::string::npos);
  EXPECT_NE(r.err.find("הכנת הקובץ הסתיימה"), std::string::npos);
}

TEST_F(CliTest, MissingCompanyFolderReportsTheAccountFaultAndFails) {
  const RunResult r =
      Run({"labels", "--company", (temp_ / "nowhere").string(), "--settings", settings_.string()});
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.err.find("תקלה בקריאת החשבונות"), std::string::npos) << r.err;
}

TEST_F(CliTest, WrongUsageExitsWithTwo) {
  EXPECT_EQ(Run({"--bogus"}).exitCode, 2);  // no command: the window's options
  EXPECT_EQ(Run({"print"}).exitCode, 2);
  EXPECT_EQ(Run({"labels", "--company"}).exitCode, 2);
  EXPECT_EQ(Run({"labels", "--bogus"}).exitCode, 2);
  auto unknown = Base("labels");
  unknown.insert(unknown.end(), {"--set", "NoSuchKey=1"});
  const RunResult r = Run(unknown);
  EXPECT_EQ(r.exitCode, 2);
  EXPECT_NE(r.err.find("NoSuchKey"), std::string::npos);
}

TEST_F(CliTest, SetValueTheControlRefusesStopsBeforeTheCommand) {
  auto args = Base("labels");
  args.insert(args.end(), {"--set", "SortBy=12"});
  const RunResult r = Run(args);
  EXPECT_EQ(r.exitCode, 2);
  EXPECT_FALSE(fs::exists(temp_ / "zdrlab1.htm"));
}

TEST_F(CliTest, CityPrefixSelectsOnlyThatCity) {
  // Take the city of a live account and ask for the accounts of that city only.
  std::string city;
  for (const auto& a : truth_->accounts)
    if (!a.deleted && !a.duplicateKey && a.unambiguousText && !a.city.empty()) {
      city = a.city;
      break;
    }
  ASSERT_FALSE(city.empty());
  auto args = Base("list");
  args.insert(args.end(), {"--set", "UseCity=1", "--set", "City=" + city});
  const RunResult r = Run(args);
  ASSERT_EQ(r.exitCode, 0) << r.err;
  const std::string page = zdr::Win1255ToUtf8(ReadFile(temp_ / "zdrlab2.htm"));
  // Every data row's city cell starts with the prefix.
  const std::string cell = "    <td dir=rtl>";
  size_t rows = 0, pos = 0;
  while ((pos = page.find("  <tr valign='middle' bgcolor='#FFFFFF' align='right'>", pos)) !=
         std::string::npos) {
    const size_t c = page.find(cell, page.find("    <td>", pos));
    ASSERT_NE(c, std::string::npos);
    EXPECT_EQ(page.compare(c + cell.size(), city.size(), city), 0);
    ++rows;
    pos = c;
  }
  EXPECT_GT(rows, 0u);
}

}  // namespace
