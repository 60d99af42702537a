// The zdrlab command line end to end on a generated company: the files it writes, what it
// prints, and its exit codes.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <set>
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

// The text of a page cell or a dispatch field as the clerk reads it: markup undone, a comma
// as the dispatch file writes it (a blank), no surrounding blanks.
std::string Readable(std::string t) {
  const std::pair<std::string, std::string> entities[] = {
      {"&nbsp;", ""}, {"&lt;", "<"}, {"&gt;", ">"}, {"&amp;", "&"}};
  for (const auto& [from, to] : entities) {
    for (size_t at = t.find(from); at != std::string::npos; at = t.find(from, at + to.size()))
      t.replace(at, from.size(), to);
  }
  for (char& c : t) c = c == ',' ? ' ' : c;
  const size_t first = t.find_first_not_of(' ');
  return first == std::string::npos ? "" : t.substr(first, t.find_last_not_of(' ') - first + 1);
}

// The texts between `open` and `close` from `from` on, in order.
std::vector<std::string> Between(const std::string& page, const std::string& open,
                                 const std::string& close) {
  std::vector<std::string> out;
  for (size_t at = page.find(open); at != std::string::npos; at = page.find(open, at)) {
    at += open.size();
    const size_t end = page.find(close, at);
    out.push_back(Readable(page.substr(at, end - at)));
  }
  return out;
}

using Recipients = std::multiset<std::string>;  // "name | address | city"

std::string Recipient(const std::string& name, const std::string& address,
                      const std::string& city) {
  return name + " | " + address + " | " + city;
}

// Regression: with addresses from the document header, the label sheet and the list printed
// the header's name and address reversed ("12 הרצל" as "הרצל 21"), while the dispatch file
// had them in reading order. The three outputs agree on every recipient, by accounts and by
// documents.
TEST_F(CliTest, DocumentAddressOnTheSheetWasReversed) {
  const std::vector<std::vector<std::string>> variants = {
      {},
      {"--set", "UseDates=1", "--set", "FromDate=01/01/2000", "--set", "ToDate=31/12/2015", "--set",
       "DocType=27", "--set", "AddressFrom=0"}};
  for (const auto& criteria : variants) {
    SCOPED_TRACE(criteria.empty() ? "accounts" : "documents");
    auto run = [&](const std::string& command, std::vector<std::string> extra) {
      auto args = Base(command);
      args.insert(args.end(), criteria.begin(), criteria.end());
      args.insert(args.end(), extra.begin(), extra.end());
      const RunResult r = Run(args);
      EXPECT_EQ(r.exitCode, 0) << r.err;
    };
    run("labels", {"--set", "UseTitle1=1", "--set", "UseTitle4=1", "--set", "UseTitle5=1"});
    run("list", {});
    run("post", {"--set", "FilePath=" + (temp_ / "post.xlsx").string(), "--set", "FileFormat=1"});

    const std::string sheet = zdr::Win1255ToUtf8(ReadFile(temp_ / "zdrlab1.htm"));
    const auto names = Between(sheet, "<tr class='Line1' align='right'><td>", "</td></tr>");
    const auto addresses = Between(sheet, "<tr class='Line4' align='right'><td>", "</td></tr>");
    const auto cities = Between(sheet, "<tr class='Line5' align='right'><td>", "</td></tr>");
    ASSERT_EQ(names.size(), addresses.size());
    ASSERT_EQ(names.size(), cities.size());
    Recipients onSheet;
    for (size_t i = 0; i < names.size(); ++i)
      onSheet.insert(Recipient(names[i], addresses[i], cities[i]));

    const std::string list = zdr::Win1255ToUtf8(ReadFile(temp_ / "zdrlab2.htm"));
    const auto cells = Between(list, "    <td dir=rtl", "</td>");
    ASSERT_EQ(cells.size() % 4, 0u);
    Recipients inList;
    // City, address, contact, name; each cell text after its attributes' ">".
    auto cell = [&](size_t i) { return Readable(cells[i].substr(cells[i].find('>') + 1)); };
    for (size_t i = 0; i < cells.size(); i += 4)
      inList.insert(Recipient(cell(i + 3), cell(i + 1), cell(i)));

    std::istringstream csv(zdr::Win1255ToUtf8(ReadFile(temp_ / "zdpost1.csv")));
    std::string line;
    std::getline(csv, line);  // headings
    Recipients inFile;
    while (std::getline(csv, line)) {
      if (!line.empty() && line.back() == '\r') line.pop_back();
      std::vector<std::string> f;
      std::stringstream fields(line);
      for (std::string v; std::getline(fields, v, ',');) f.push_back(Readable(v));
      ASSERT_GE(f.size(), 5u) << line;
      inFile.insert(Recipient(f[1], f[2], f[4]));  // key, name, street, number, city
    }
    EXPECT_FALSE(onSheet.empty());
    EXPECT_EQ(onSheet, inList);
    EXPECT_EQ(onSheet, inFile);
  }
}

}  // namespace
