// The zdrlab command line end to end on a generated company: the files it writes, what it
// prints, and its exit codes.
#include <gtest/gtest.h>
#include <sys/stat.h>
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
#include "support/scratchtemp.h"
#include "workdb/worklock.h"
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
    scratch_ = new zdr::test::ScratchTemp;
    root_ = scratch_->dir();
    zdrgen::Options options;
    options.seed = 11;
    options.accounts = 60;
    options.documents = 40;
    truth_ =
        new zdrgen::CompanyTruth(zdrgen::WriteCompany(root_ / "company", options, "חברה לדוגמה"));
  }
  static void TearDownTestSuite() {
    delete truth_;
    delete scratch_;
  }

  void SetUp() override {
    temp_ = root_ / ::testing::UnitTest::GetInstance()->current_test_info()->name();
    fs::create_directories(temp_);
    settings_ = temp_ / "settings.ini";
    std::ofstream(settings_).flush();
  }

  // A run started and not yet waited for.
  struct Started {
    FILE* pipe;
    fs::path errFile;
  };

  // Starts zdrlab with `args`; `env` is put before the command as NAME=VALUE words (for
  // `env -u NAME`, a leading "env -u NAME").
  Started Start(const std::vector<std::string>& args, const std::string& env = "") {
    static int runs = 0;
    const fs::path errFile = temp_ / ("stderr" + std::to_string(++runs) + ".txt");
    std::string cmd = env + " Temp=" + Quote(temp_.string()) + " " +
                      Quote(std::string(ZDR_BINARY_DIR) + "/src/zdrlab");
    for (const auto& a : args) cmd += " " + Quote(a);
    cmd += " 2>" + Quote(errFile.string());
    FILE* pipe = ::popen(cmd.c_str(), "r");
    EXPECT_NE(pipe, nullptr);
    return {pipe, errFile};
  }

  static RunResult Finish(Started s) {
    RunResult r;
    std::array<char, 4096> buf;
    size_t n;
    while ((n = std::fread(buf.data(), 1, buf.size(), s.pipe)) > 0) r.out.append(buf.data(), n);
    const int status = ::pclose(s.pipe);
    r.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    r.err = ReadFile(s.errFile);
    return r;
  }

  RunResult Run(const std::vector<std::string>& args, const std::string& env = "") {
    return Finish(Start(args, env));
  }

  // A folder holding a stand-in for the desktop's opener: it copies the file it is given to
  // $COPY_TO, or fails with `exitCode`.
  fs::path FakeOpener(int exitCode = 0) {
    const fs::path bin = temp_ / ("bin" + std::to_string(exitCode));
    fs::create_directories(bin);
    std::ofstream(bin / "xdg-open")
        << "#!/bin/sh\n"
        << (exitCode == 0 ? "/bin/cp \"$1\" \"$COPY_TO\"\n" : "") << "exit " << exitCode << "\n";
    fs::permissions(bin / "xdg-open", fs::perms::owner_all);
    return bin;
  }

  std::vector<std::string> Base(const std::string& command) {
    return {command, "--company", (root_ / "company").string(), "--settings", settings_.string()};
  }

  static zdr::test::ScratchTemp* scratch_;
  static fs::path root_;
  static zdrgen::CompanyTruth* truth_;
  fs::path temp_;
  fs::path settings_;
};

zdr::test::ScratchTemp* CliTest::scratch_ = nullptr;
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
  EXPECT_NE(r.err.find("הכנת הקובץ הסתיימה. שגיאות: "), std::string::npos) << r.err;
}

// The generated company holds rows the post refuses, planted on purpose.
TEST_F(CliTest, PostCheckPrintsTheFindingsAndStrictRefusesTheErrors) {
  const fs::path book = temp_ / "post.xlsx";
  auto args = Base("post");
  args.insert(args.end(), {"--set", "FilePath=" + book.string(), "--check"});
  const RunResult check = Run(args);
  ASSERT_EQ(check.exitCode, 0) << check.err;
  EXPECT_EQ(check.out.rfind("חומרה,שורה,מפתח חשבון,שדה,ערך,הודעה\n", 0), 0u) << check.out;
  EXPECT_NE(check.out.find(",טלפון,123-45,הטלפון אינו מספר ישראלי\n"), std::string::npos);
  EXPECT_NE(check.err.find("הבדיקה הסתיימה. שגיאות: "), std::string::npos) << check.err;
  EXPECT_FALSE(fs::exists(temp_ / "zdpost1.csv"));
  EXPECT_FALSE(fs::exists(book));

  args.push_back("--strict");
  EXPECT_EQ(Run(args).exitCode, 3);
  args.erase(args.end() - 2);  // --strict without --check
  const RunResult strict = Run(args);
  EXPECT_EQ(strict.exitCode, 3) << strict.err;
  EXPECT_EQ(strict.out, check.out);
  EXPECT_NE(strict.err.find("הקובץ לא נכתב. שגיאות: "), std::string::npos) << strict.err;
  EXPECT_FALSE(fs::exists(temp_ / "zdpost1.csv"));
  EXPECT_FALSE(fs::exists(book));

  auto labels = Base("labels");
  labels.push_back("--check");
  EXPECT_EQ(Run(labels).exitCode, 2);
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

// --- Runs sharing a temporary folder ---

const std::string kBusy = "תפוסים בידי הפעלה אחרת של התוכנה";

TEST_F(CliTest, RunWaitingOnAHeldTempFolderTouchedTheOtherRunsFiles) {
  std::ofstream(temp_ / "zdrlab.DB") << "the other run's database";
  zdr::WorkFilesLock held(temp_);
  const RunResult r = Run(Base("labels"));
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.err.find(kBusy), std::string::npos) << r.err;
  EXPECT_EQ(r.err.find("מאתחל בסיס נתונים"), std::string::npos) << "no data load";
  EXPECT_EQ(ReadFile(temp_ / "zdrlab.DB"), "the other run's database");
  EXPECT_FALSE(fs::exists(temp_ / "zdrlab1.htm"));
}

// Two companies listed at once in one temporary folder: each run gives exactly the page it
// gives alone, or is refused with the message; never a page mixed from both companies.
TEST_F(CliTest, TwoRunsSharingATempFolderMixedTheirCompanies) {
  zdrgen::Options options;
  options.accounts = 4000;
  options.documents = 0;
  options.ledger = 30000;
  options.keepDetail = false;
  const fs::path companies[2] = {temp_ / "a", temp_ / "b"};
  for (int c = 0; c < 2; ++c) {
    options.seed = 31 + c;
    zdrgen::WriteCompany(companies[c], options, c == 0 ? "חברה א" : "חברה ב");
  }
  const fs::path bin = FakeOpener();
  auto args = [&](int c) {
    return std::vector<std::string>{"list",
                                    "--company",
                                    companies[c].string(),
                                    "--settings",
                                    settings_.string(),
                                    "--set",
                                    "UseTransType=1",
                                    "--set",
                                    "TransType=*",
                                    "--open"};
  };
  auto env = [&](const fs::path& copy) {
    return "PATH=" + Quote(bin.string()) + " COPY_TO=" + Quote(copy.string());
  };
  std::string solo[2];
  for (int c = 0; c < 2; ++c) {
    const fs::path copy = temp_ / ("solo" + std::to_string(c));
    ASSERT_EQ(Run(args(c), env(copy)).exitCode, 0);
    solo[c] = ReadFile(copy);
    ASSERT_FALSE(solo[c].empty());
  }
  ASSERT_NE(solo[0], solo[1]);
  int refused = 0;
  for (int round = 0; round < 2; ++round) {
    fs::path copies[2];
    Started runs[2];
    for (int c = 0; c < 2; ++c) {
      copies[c] = temp_ / ("run" + std::to_string(round) + std::to_string(c));
      runs[c] = Start(args(c), env(copies[c]));
    }
    for (int c = 0; c < 2; ++c) {
      const RunResult r = Finish(runs[c]);
      if (r.exitCode == 0) {
        EXPECT_TRUE(ReadFile(copies[c]) == solo[c]) << "company " << c << " round " << round;
      } else {
        ++refused;
        EXPECT_EQ(r.exitCode, 1);
        EXPECT_NE(r.err.find(kBusy), std::string::npos) << r.err;
        EXPECT_FALSE(fs::exists(copies[c]));
      }
    }
  }
  RecordProperty("refused", refused);
}

// --- The dispatch target ---

struct BadTarget {
  const char* fault;
  std::string (*path)(const fs::path& temp, const fs::path& company);
  const char* message;
};

TEST_F(CliTest, PostDeletedTheTargetBeforeCheckingIt) {
  // A copy of the company, so its host files can be compared before and after.
  const fs::path company = temp_ / "company";
  fs::copy(root_ / "company", company);
  fs::create_directories(temp_ / "empty folder");
  std::ofstream(temp_ / "old.xls") << "old workbook";
  std::ofstream(temp_ / "notes.txt") << "old notes";
  fs::create_symlink(company / "ACT.fix", temp_ / "link.xlsx");
  const BadTarget cases[] = {
      {"host account file",
       [](const fs::path&, const fs::path& c) { return (c / "ACT.fix").string(); },
       "נמצא בתיקיית החברה"},
      {"workbook inside the company folder",
       [](const fs::path&, const fs::path& c) { return (c / "out.xlsx").string(); },
       "נמצא בתיקיית החברה"},
      {"link to a host file",
       [](const fs::path& t, const fs::path&) { return (t / "link.xlsx").string(); },
       "נמצא בתיקיית החברה"},
      {"host file name elsewhere",
       [](const fs::path& t, const fs::path&) { return (t / "amv.fix").string(); },
       "קובץ הנהלת חשבונות"},
      {"folder", [](const fs::path& t, const fs::path&) { return (t / "empty folder").string(); },
       "הוא תיקייה"},
      {"xls without a converter",
       [](const fs::path& t, const fs::path&) { return (t / "old.xls").string(); },
       "לא נמצאה תוכנה שממירה"},
      {"text file", [](const fs::path& t, const fs::path&) { return (t / "notes.txt").string(); },
       "לא ניתן לכתוב גיליון עבודה"},
      {"no extension", [](const fs::path& t, const fs::path&) { return (t / "book").string(); },
       "אין סיומת"},
      {"missing folder",
       [](const fs::path& t, const fs::path&) { return (t / "nowhere" / "book.xlsx").string(); },
       "לא נמצאה"},
  };
  std::vector<std::pair<fs::path, std::string>> before;
  for (const auto& e : fs::directory_iterator(company))
    before.emplace_back(e.path(), ReadFile(e.path()));
  for (const BadTarget& c : cases) {
    SCOPED_TRACE(c.fault);
    const std::string target = c.path(temp_, company);
    const std::string oldBytes = fs::is_regular_file(target) ? ReadFile(target) : "";
    const bool existed = fs::exists(fs::symlink_status(target));
    auto args = Base("post");
    args[2] = company.string();
    args.insert(args.end(), {"--set", "FilePath=" + target});
    const RunResult r = Run(args, "PATH=" + Quote((temp_ / "no programs").string()));
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_NE(r.err.find(c.message), std::string::npos) << r.err;
    EXPECT_EQ(r.err.find("מאתחל בסיס נתונים"), std::string::npos) << "checked before the load";
    EXPECT_EQ(fs::exists(fs::symlink_status(target)), existed);
    if (fs::is_regular_file(target)) {
      EXPECT_EQ(ReadFile(target), oldBytes);
    }
  }
  EXPECT_TRUE(fs::is_directory(temp_ / "empty folder"));
  EXPECT_TRUE(fs::is_symlink(temp_ / "link.xlsx"));
  size_t still = 0;
  for (const auto& e : fs::directory_iterator(company)) {
    ++still;
    for (const auto& [path, bytes] : before) {
      if (path == e.path()) {
        EXPECT_EQ(ReadFile(path), bytes) << path;
      }
    }
  }
  EXPECT_EQ(still, before.size());
}

TEST_F(CliTest, FailedPostLostTheOldWorkbook) {
  const fs::path book = temp_ / "post.xlsx";
  std::ofstream(book) << "last week's workbook";
  auto args = Base("post");
  args[2] = (temp_ / "no such company").string();
  args.insert(args.end(), {"--set", "FilePath=" + book.string()});
  const RunResult r = Run(args);
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.err.find("לא נכתב מחדש"), std::string::npos) << r.err;
  EXPECT_TRUE(r.out.empty());
  EXPECT_EQ(ReadFile(book), "last week's workbook");
  for (const auto& e : fs::directory_iterator(temp_))
    EXPECT_EQ(e.path().filename().string().find(".post.xlsx."), std::string::npos) << e.path();
}

// --- Files in the temporary folder ---

TEST_F(CliTest, LinkPlantedInTempRedirectedTheOutput) {
  const fs::path victim = temp_ / "victim";
  std::ofstream(victim) << "not yours";
  for (const char* name : {"zdrlab.DB", "zdrlab2.htm", "zdpost1.csv"}) {
    fs::create_symlink(victim, temp_ / name);
  }
  const RunResult list = Run(Base("list"));
  ASSERT_EQ(list.exitCode, 0) << list.err;
  auto post = Base("post");
  post.insert(post.end(), {"--set", "FilePath=" + (temp_ / "p.xlsx").string()});
  const RunResult r = Run(post);
  ASSERT_EQ(r.exitCode, 0) << r.err;
  EXPECT_EQ(ReadFile(victim), "not yours");
  for (const char* name : {"zdrlab.DB", "zdrlab2.htm", "zdpost1.csv"}) {
    EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(temp_ / name))) << name;
  }
}

TEST_F(CliTest, WorkingDatabaseWasReadableByEveryone) {
  ASSERT_EQ(Run(Base("labels")).exitCode, 0);
  struct stat st {};
  ASSERT_EQ(::stat((temp_ / "zdrlab.DB").c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 0777, 0600u);
}

TEST_F(CliTest, FifoInPlaceOfTheAccountFileHungTheRun) {
  const fs::path company = temp_ / "fifo company";
  fs::create_directories(company);
  ASSERT_EQ(::mkfifo((company / "ACT.fix").c_str(), 0600), 0);
  auto args = Base("labels");
  args[2] = company.string();
  const RunResult r = Run(args, "timeout 30 env");
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.err.find("ACT.fix"), std::string::npos) << r.err;
  EXPECT_NE(r.err.find("לא נמצא"), std::string::npos) << r.err;
}

// --- The command line's own checks ---

TEST_F(CliTest, SettingsFileThatCannotBeReadGaveTheDefaultsSilently) {
  fs::create_directories(temp_ / "a folder");
  std::ofstream(temp_ / "locked.ini") << "[Params]\n";
  fs::permissions(temp_ / "locked.ini", fs::perms::none);
  const std::pair<fs::path, const char*> cases[] = {
      {temp_ / "missing.ini", "לא נמצא"},
      {temp_ / "a folder", "הוא תיקייה"},
      {temp_ / "locked.ini", "לא ניתן לקרוא"},
  };
  for (const auto& [file, message] : cases) {
    if (file.filename() == "locked.ini" && ::geteuid() == 0) continue;  // root reads it
    const RunResult r =
        Run({"labels", "--company", (root_ / "company").string(), "--settings", file.string()});
    EXPECT_EQ(r.exitCode, 2) << file;
    EXPECT_NE(r.err.find(message), std::string::npos) << r.err;
    EXPECT_FALSE(fs::exists(temp_ / "zdrlab.DB"));
  }
}

TEST_F(CliTest, DispatchValueThePanelRefusesWroteAnEmptyFile) {
  const fs::path book = temp_ / "post.xlsx";
  for (const char* set : {"FileFormat=2", "FileFormat=-1", "FileFormat=abc", "FileFormat=1.0",
                          "FileFormat=", "OpenExcel=yes", "OpenExcel=3", "ChkByItems=x"}) {
    auto args = Base("post");
    args.insert(args.end(), {"--set", "FilePath=" + book.string(), "--set", set});
    const RunResult r = Run(args);
    EXPECT_EQ(r.exitCode, 2) << set;
    EXPECT_NE(r.err.find("ערך לא חוקי"), std::string::npos) << set << r.err;
    EXPECT_FALSE(fs::exists(book)) << set;
  }
}

TEST_F(CliTest, EqualsFormOfAnOptionWasRefused) {
  const fs::path book = temp_ / "post.xlsx";
  const RunResult r =
      Run({"post", "--company=" + (root_ / "company").string(), "--settings=" + settings_.string(),
           "--set=FilePath=" + book.string(), "--set=FileFormat=1"});
  ASSERT_EQ(r.exitCode, 0) << r.err;
  EXPECT_EQ(r.out, book.string() + "\n");
  const std::string csv = zdr::Win1255ToUtf8(ReadFile(temp_ / "zdpost1.csv"));
  EXPECT_EQ(csv.rfind("קוד לקוח,", 0), 0u);
  EXPECT_EQ(Run({"labels", "--open=yes"}).exitCode, 2);
}

TEST_F(CliTest, OpenReportedSuccessWhenNoProgramStarted) {
  const fs::path none = temp_ / "no programs";
  fs::create_directories(none);
  const std::string failing = FakeOpener(3).string();
  for (const std::string& path : {none.string(), failing}) {
    auto args = Base("labels");
    args.push_back("--open");
    const RunResult r = Run(args, "PATH=" + Quote(path));
    EXPECT_EQ(r.exitCode, 1) << path;
    EXPECT_NE(r.err.find("לא ניתן לפתוח"), std::string::npos) << r.err;
    EXPECT_TRUE(r.out.empty());
  }
  auto args = Base("labels");
  args.push_back("--open");
  const RunResult r = Run(args, "PATH=" + Quote(FakeOpener().string()) +
                                    " COPY_TO=" + Quote((temp_ / "seen").string()));
  EXPECT_EQ(r.exitCode, 0) << r.err;
  EXPECT_EQ(ReadFile(temp_ / "seen"), ReadFile(temp_ / "zdrlab1.htm"));
}

TEST_F(CliTest, NoCommandWithoutADisplayAborted) {
  const RunResult r = Run({}, "env -u DISPLAY -u WAYLAND_DISPLAY -u QT_QPA_PLATFORM");
  if (r.exitCode == 2 && r.err.find("without its window") != std::string::npos) {
    GTEST_SKIP() << "built without the window";
  }
  EXPECT_EQ(r.exitCode, 1) << r.err;
  EXPECT_NE(r.err.find("DISPLAY"), std::string::npos) << r.err;
}

TEST_F(CliTest, LabelsAsPdfOnStockAndTheCalibrationPage) {
  auto args = Base("labels");
  const fs::path pdf = temp_ / "labels.pdf";
  args.insert(args.end(), {"--set", "UseTitle1=1", "--pdf", pdf.string(), "--template",
                           "a4-2x4-105x74", "--offset", "0.5,-1"});
  RunResult r = Run(args);
  ASSERT_EQ(r.exitCode, 0) << r.err;
  EXPECT_EQ(r.out, pdf.string() + "\n");
  EXPECT_EQ(ReadFile(pdf).substr(0, 5), "%PDF-");
  EXPECT_FALSE(fs::exists(temp_ / "zdrlab1.htm"));

  const fs::path page = temp_ / "calibration.pdf";
  r = Run({"calibrate", "--settings", settings_.string(), "--pdf", page.string()});
  ASSERT_EQ(r.exitCode, 0) << r.err;
  EXPECT_EQ(ReadFile(page).substr(0, 5), "%PDF-");

  // Settings that ask for the PDF make the plain label command give it.
  std::ofstream(settings_) << "[ZDRLab]\nLabelPdf\\Output=1\nLabelPdf\\Template=a4-3x8-70x37\n";
  r = Run(Base("labels"));
  ASSERT_EQ(r.exitCode, 0) << r.err;
  EXPECT_EQ(r.out, (temp_ / "zdrlab1.pdf").string() + "\n");
  EXPECT_EQ(ReadFile(temp_ / "zdrlab1.pdf").substr(0, 5), "%PDF-");
}

TEST_F(CliTest, PdfOptionsAreChecked) {
  const std::string pdf = (temp_ / "x.pdf").string();
  const std::vector<std::vector<std::string>> wrong = {
      {"calibrate"},                                   // no --pdf
      {"labels", "--template", "a4-2x4-105x74"},       // --template without --pdf
      {"labels", "--pdf", pdf, "--offset", "10.5,0"},  // beyond 10 mm
      {"labels", "--pdf", pdf, "--offset", "0.05,0"},  // not a step of 0.1
      {"labels", "--pdf", pdf, "--template", "no-such-stock"},
      {"list", "--pdf", pdf},
  };
  for (const auto& args : wrong) {
    std::vector<std::string> full = args;
    full.insert(full.end(), {"--settings", settings_.string()});
    EXPECT_EQ(Run(full).exitCode, 2) << args[0] << " " << (args.size() > 1 ? args[1] : "");
  }
  EXPECT_FALSE(fs::exists(pdf));
}

}  // namespace
