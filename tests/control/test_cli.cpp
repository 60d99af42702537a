// The zdrlab command line end to end on a generated company: the files it writes, what it
// prints, and its exit codes. Most runs are rows of one table; the runs that compare
// outputs with each other or run side by side have tests of their own.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "import/codepage.h"
#include "support/files.h"
#include "support/scratchtemp.h"
#include "workdb/worklock.h"
#include "zdrgen/generator.h"

namespace fs = std::filesystem;
using zdr::test::ReadBytes;

namespace {

struct RunResult {
  int exitCode = -1;
  std::string out, err;
};

std::string Quote(const std::string& s) {
  std::string q = "'";
  for (char c : s) q += (c == '\'') ? std::string("'\\''") : std::string(1, c);
  return q + "'";
}

// A page or dispatch file as text; other files as they are.
std::string Contents(const fs::path& p) {
  const std::string ext = p.extension().string();
  return ext == ".htm" || ext == ".csv" ? zdr::Win1255ToUtf8(ReadBytes(p)) : ReadBytes(p);
}

// "=x": exactly x; "^x": starts with x; "!x": does not hold x; else holds x.
bool Matches(const std::string& text, const std::string& spec) {
  if (spec.starts_with("=")) return text == spec.substr(1);
  if (spec.starts_with("^")) return text.starts_with(spec.substr(1));
  if (spec.starts_with("!")) return text.find(spec.substr(1)) == std::string::npos;
  return text.find(spec) != std::string::npos;
}

const std::string kBusy = "תפוסים בידי הפעלה אחרת של התוכנה";

class CliTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    scratch_ = new zdr::test::ScratchTemp;
    zdrgen::Options options;
    options.seed = 11;
    options.accounts = 60;
    options.documents = 40;
    truth_ = new zdrgen::CompanyTruth(
        zdrgen::WriteCompany(scratch_->dir() / "company", options, "חברה לדוגמה"));
  }
  static void TearDownTestSuite() {
    delete truth_;
    delete scratch_;
  }
  void SetUp() override {
    NewTemp(::testing::UnitTest::GetInstance()->current_test_info()->name());
  }

  // A fresh temporary folder for the runs to come, with an empty settings file.
  void NewTemp(const std::string& name) {
    temp_ = scratch_->dir() / name;
    fs::create_directories(temp_);
    settings_ = temp_ / "settings.ini";
    std::ofstream(settings_).flush();
  }
  static fs::path Company() { return scratch_->dir() / "company"; }

  // `text` with {C} the company folder, {S} the settings file and {T} the temporary folder.
  std::string Expand(std::string text) const {
    const std::pair<std::string, std::string> names[] = {
        {"{C}", Company().string()}, {"{S}", settings_.string()}, {"{T}", temp_.string()}};
    for (const auto& [from, to] : names) {
      for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at))
        text.replace(at, from.size(), to);
    }
    return text;
  }

  // Starts zdrlab with `args`; `env` is put before the command (NAME=VALUE words, or a
  // command such as "timeout 30 env").
  FILE* Start(const std::vector<std::string>& args, const std::string& env = "") {
    std::string cmd = env + " Temp=" + Quote(temp_.string()) + " " +
                      Quote(std::string(ZDR_BINARY_DIR) + "/src/zdrlab");
    for (const auto& a : args) cmd += " " + Quote(a);
    cmd += " 2>" + Quote((temp_ / ("stderr" + std::to_string(++runs_))).string());
    FILE* pipe = ::popen(cmd.c_str(), "r");
    EXPECT_NE(pipe, nullptr);
    return pipe;
  }
  RunResult Finish(FILE* pipe, int run) {
    RunResult r;
    std::array<char, 4096> buf;
    for (size_t n; (n = std::fread(buf.data(), 1, buf.size(), pipe)) > 0;)
      r.out.append(buf.data(), n);
    const int status = ::pclose(pipe);
    r.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    r.err = ReadBytes(temp_ / ("stderr" + std::to_string(run)));
    return r;
  }
  RunResult Run(const std::vector<std::string>& args, const std::string& env = "") {
    FILE* pipe = Start(args, env);
    return Finish(pipe, runs_);
  }
  // `command` on the company with the test's settings file, then `more`.
  std::vector<std::string> Base(const std::string& command, std::vector<std::string> more = {}) {
    std::vector<std::string> args = {command, "--company", Company().string(), "--settings",
                                     settings_.string()};
    args.insert(args.end(), more.begin(), more.end());
    return args;
  }

  static zdr::test::ScratchTemp* scratch_;
  static zdrgen::CompanyTruth* truth_;
  fs::path temp_, settings_;
  int runs_ = 0;
};

zdr::test::ScratchTemp* CliTest::scratch_ = nullptr;
zdrgen::CompanyTruth* CliTest::truth_ = nullptr;

// A stand-in for the desktop's opener in `bin`: copies the file it is given to $COPY_TO, or
// fails with `exitCode`.
void FakeOpener(const fs::path& bin, int exitCode = 0) {
  fs::create_directories(bin);
  std::ofstream(bin / "xdg-open") << "#!/bin/sh\n"
                                  << (exitCode == 0 ? "/bin/cp \"$1\" \"$COPY_TO\"\n" : "")
                                  << "exit " << exitCode << "\n";
  fs::permissions(bin / "xdg-open", fs::perms::owner_all);
}

struct CliRun {
  std::string name;               // regression runs carry the fault's name
  std::vector<std::string> args;  // "@cmd" stands for cmd --company {C} --settings {S}
  int exit = 0;
  std::vector<std::string> out = {}, err = {};                  // specs for Matches; err in order
  std::vector<std::pair<std::string, std::string>> files = {};  // path, spec ("-": none)
  std::string env = {};
  std::function<std::shared_ptr<void>(const fs::path&)> setup = {};  // its result lives on
  std::function<void(const fs::path&)> check = {};
};

std::vector<CliRun> Runs() {
  const std::string post = "FilePath={T}/post.xlsx";
  const std::string heading = "^חומרה,שורה,מפתח חשבון,שדה,ערך,הודעה\n";
  const std::string badPhone = ",טלפון,123-45,הטלפון אינו מספר ישראלי\n";
  const std::string noLoad = "!מאתחל בסיס נתונים";
  std::vector<CliRun> runs = {
      {"LabelsWritesTheSheetInTempAndPrintsItsPath",
       {"@labels", "--set", "UseTitle1=1"},
       0,
       {"={T}/zdrlab1.htm\n"},
       {"מאתחל בסיס נתונים", "קורא רשימת כרטיסים", "קריאת הנתונים הסתיימה", "מכין רשימה",
        "הכנת הרשימה הסתיימה"},
       {{"{T}/zdrlab1.htm", "^<HTML>"}}},
      {"ListCountsTheRecipients",
       {"@list"},
       0,
       {"={T}/zdrlab2.htm\n"},
       {},
       {{"{T}/zdrlab2.htm", "מספר הכרטיסים ברשימה: "},
        {"{T}/zdrlab2.htm", "מספר הדפים הנדרשים: "}}},
      {"PostWithoutOutputFileIsRefused", {"@post"}, 1, {"="}, {"לא הוגדר קובץ פלט", noLoad}},
      {"PostWritesTheWorkbook",
       {"@post", "--set", post, "--set", "Weight=0.5"},
       0,
       {"={T}/post.xlsx\n"},
       {"הכנת הקובץ הסתיימה. שגיאות: "},
       {{"{T}/post.xlsx", "^PK"},
        {"{T}/zdpost1.csv", "^מספר,שם משפחה,שם פרטי,"},
        {"{T}/zdpost1.csv", ",0.5,"}}},
      // The generated company holds rows the post refuses, planted on purpose.
      {"PostCheckPrintsTheFindings",
       {"@post", "--set", post, "--check"},
       0,
       {heading, badPhone},
       {"הבדיקה הסתיימה. שגיאות: "},
       {{"{T}/zdpost1.csv", "-"}, {"{T}/post.xlsx", "-"}}},
      {"CheckWithStrictRefusesTheErrors", {"@post", "--set", post, "--check", "--strict"}, 3},
      {"StrictRefusesTheErrors",
       {"@post", "--set", post, "--strict"},
       3,
       {heading, badPhone},
       {"הקובץ לא נכתב. שגיאות: "},
       {{"{T}/zdpost1.csv", "-"}, {"{T}/post.xlsx", "-"}}},
      {"CheckIsForThePostOnly", {"@labels", "--check"}, 2},
      {"MissingCompanyFolderReportsTheAccountFault",
       {"labels", "--company", "{T}/nowhere", "--settings", "{S}"},
       1,
       {},
       {"תקלה בקריאת החשבונות"}},
      {"NoCommandGivesTheWindowsOptions", {"--bogus"}, 2},
      {"UnknownCommand", {"print"}, 2},
      {"OptionWithoutItsValue", {"labels", "--company"}, 2},
      {"UnknownOption", {"labels", "--bogus"}, 2},
      {"UnknownSetting", {"@labels", "--set", "NoSuchKey=1"}, 2, {}, {"NoSuchKey"}},
      {"SetValueTheControlRefusesStopsBeforeTheCommand",
       {"@labels", "--set", "SortBy=12"},
       2,
       {},
       {},
       {{"{T}/zdrlab1.htm", "-"}}},
      {"RunWaitingOnAHeldTempFolderTouchedTheOtherRunsFiles",
       {"@labels"},
       1,
       {},
       {kBusy, noLoad},
       {{"{T}/zdrlab.DB", "=the other run's database"}, {"{T}/zdrlab1.htm", "-"}},
       "",
       [](const fs::path& t) {
         std::ofstream(t / "zdrlab.DB") << "the other run's database";
         return std::make_shared<zdr::WorkFilesLock>(t);
       }},
      {"FailedPostLostTheOldWorkbook",
       {"post", "--company", "{T}/no such company", "--settings", "{S}", "--set", post},
       1,
       {"="},
       {"לא נכתב מחדש"},
       {{"{T}/post.xlsx", "=last week's workbook"}},
       "",
       [](const fs::path& t) {
         std::ofstream(t / "post.xlsx") << "last week's workbook";
         return nullptr;
       }},
      {"WorkingDatabaseWasReadableByEveryone",
       {"@labels"},
       0,
       {},
       {},
       {},
       "",
       nullptr,
       [](const fs::path& t) {
         struct stat st {};
         ASSERT_EQ(::stat((t / "zdrlab.DB").c_str(), &st), 0);
         EXPECT_EQ(st.st_mode & 0777, 0600u);
       }},
      {"FifoInPlaceOfTheAccountFileHungTheRun",
       {"labels", "--company", "{T}/fifo", "--settings", "{S}"},
       1,
       {},
       {"ACT.fix", "לא נמצא"},
       {},
       "timeout 30 env",
       [](const fs::path& t) {
         fs::create_directories(t / "fifo");
         EXPECT_EQ(::mkfifo((t / "fifo" / "ACT.fix").c_str(), 0600), 0);
         return nullptr;
       }},
      {"EqualsFormOfAnOptionWasRefused",
       {"post", "--company={C}", "--settings={S}", "--set=" + post, "--set=FileFormat=1"},
       0,
       {"={T}/post.xlsx\n"},
       {},
       {{"{T}/zdpost1.csv", "^קוד לקוח,"}}},
      {"EqualsFormOfASwitchIsRefused", {"labels", "--open=yes"}, 2},
      {"LabelsAsPdfOnStock",
       {"@labels", "--set", "UseTitle1=1", "--pdf", "{T}/labels.pdf", "--template", "a4-2x4-105x74",
        "--offset", "0.5,-1"},
       0,
       {"={T}/labels.pdf\n"},
       {},
       {{"{T}/labels.pdf", "^%PDF-"}, {"{T}/zdrlab1.htm", "-"}}},
      {"CalibrationPage",
       {"calibrate", "--settings", "{S}", "--pdf", "{T}/calibration.pdf"},
       0,
       {},
       {},
       {{"{T}/calibration.pdf", "^%PDF-"}}},
      {"SettingsThatAskForThePdfGiveIt",
       {"@labels"},
       0,
       {"={T}/zdrlab1.pdf\n"},
       {},
       {{"{T}/zdrlab1.pdf", "^%PDF-"}},
       "",
       [](const fs::path& t) {
         std::ofstream(t / "settings.ini")
             << "[ZDRLab]\nLabelPdf\\Output=1\nLabelPdf\\Template=a4-3x8-70x37\n";
         return nullptr;
       }},
  };
  // A settings file that cannot be read gave the defaults silently.
  const std::pair<const char*, const char*> settingsFiles[] = {
      {"missing.ini", "לא נמצא"}, {"a folder", "הוא תיקייה"}, {"locked.ini", "לא ניתן לקרוא"}};
  for (const auto& [file, message] : settingsFiles) {
    if (std::string(file) == "locked.ini" && ::geteuid() == 0) continue;  // root reads it
    runs.push_back({std::string("SettingsFileThatCannotBeReadGaveTheDefaultsSilently ") + file,
                    {"labels", "--company", "{C}", "--settings", std::string("{T}/") + file},
                    2,
                    {},
                    {message},
                    {{"{T}/zdrlab.DB", "-"}},
                    "",
                    [](const fs::path& t) {
                      fs::create_directories(t / "a folder");
                      std::ofstream(t / "locked.ini") << "[Params]\n";
                      fs::permissions(t / "locked.ini", fs::perms::none);
                      return nullptr;
                    }});
  }
  for (const char* set : {"FileFormat=2", "FileFormat=-1", "FileFormat=abc", "FileFormat=1.0",
                          "FileFormat=", "OpenExcel=yes", "OpenExcel=3", "ChkByItems=x"}) {
    runs.push_back({std::string("DispatchValueThePanelRefusesWroteAnEmptyFile ") + set,
                    {"@post", "--set", post, "--set", set},
                    2,
                    {},
                    {"ערך לא חוקי"},
                    {{"{T}/post.xlsx", "-"}}});
  }
  for (const char* bin : {"none", "bin3"}) {
    runs.push_back({std::string("OpenReportedSuccessWhenNoProgramStarted ") + bin,
                    {"@labels", "--open"},
                    1,
                    {"="},
                    {"לא ניתן לפתוח"},
                    {},
                    std::string("PATH={T}/") + bin,
                    [](const fs::path& t) {
                      FakeOpener(t / "bin3", 3);
                      return nullptr;
                    }});
  }
  const std::vector<std::vector<std::string>> wrongPdf = {
      {"calibrate"},                                           // no --pdf
      {"labels", "--template", "a4-2x4-105x74"},               // --template without --pdf
      {"labels", "--pdf", "{T}/x.pdf", "--offset", "10.5,0"},  // beyond 10 mm
      {"labels", "--pdf", "{T}/x.pdf", "--offset", "0.05,0"},  // not a step of 0.1
      {"labels", "--pdf", "{T}/x.pdf", "--template", "no-such-stock"},
      {"list", "--pdf", "{T}/x.pdf"}};
  for (std::vector<std::string> args : wrongPdf) {
    args.insert(args.end(), {"--settings", "{S}"});
    runs.push_back({"PdfOptionsAreChecked", args, 2, {}, {}, {{"{T}/x.pdf", "-"}}});
  }
  // A link planted in the temporary folder redirected the output.
  for (const char* command : {"list", "post"}) {
    runs.push_back({std::string("LinkPlantedInTempRedirectedTheOutput ") + command,
                    {"@" + std::string(command), "--set", "FilePath={T}/p.xlsx"},
                    0,
                    {},
                    {},
                    {{"{T}/victim", "=not yours"}},
                    "",
                    [](const fs::path& t) {
                      std::ofstream(t / "victim") << "not yours";
                      for (const char* name : {"zdrlab.DB", "zdrlab2.htm", "zdpost1.csv"})
                        fs::create_symlink(t / "victim", t / name);
                      return nullptr;
                    },
                    [list = command[0] == 'l'](const fs::path& t) {
                      for (const char* name : {"zdrlab.DB", list ? "zdrlab2.htm" : "zdpost1.csv"})
                        EXPECT_FALSE(fs::is_symlink(t / name)) << name;
                    }});
  }
  return runs;
}

TEST_F(CliTest, EveryRunGivesItsExitCodeOutputAndFiles) {
  const std::vector<CliRun> runs = Runs();
  for (size_t i = 0; i < runs.size(); ++i) {
    const CliRun& c = runs[i];
    SCOPED_TRACE(c.name);
    NewTemp("run" + std::to_string(i));
    const std::shared_ptr<void> held = c.setup ? c.setup(temp_) : nullptr;
    std::vector<std::string> args;
    for (const auto& a : c.args) {
      if (a.starts_with("@")) {
        const auto base = Base(a.substr(1));
        args.insert(args.end(), base.begin(), base.end());
      } else {
        args.push_back(Expand(a));
      }
    }
    const RunResult r = Run(args, Expand(c.env));
    EXPECT_EQ(r.exitCode, c.exit) << r.err;
    for (const auto& spec : c.out)
      EXPECT_TRUE(Matches(r.out, Expand(spec))) << spec << "\n" << r.out;
    size_t at = 0;
    for (const auto& spec : c.err) {
      const bool ordered = !spec.starts_with("!");
      EXPECT_TRUE(Matches(r.err.substr(ordered ? at : 0), spec)) << spec << "\n" << r.err;
      if (ordered && r.err.find(spec, at) != std::string::npos) at = r.err.find(spec, at);
    }
    for (const auto& [file, spec] : c.files) {
      const fs::path p = Expand(file);
      if (spec == "-") {
        EXPECT_FALSE(fs::exists(fs::symlink_status(p))) << p;
      } else {
        EXPECT_TRUE(Matches(Contents(p), spec)) << p << ": " << spec;
      }
    }
    if (c.check) c.check(temp_);
    for (const auto& e : fs::directory_iterator(temp_)) {
      const std::string name = e.path().filename().string();
      EXPECT_TRUE(name.find(".xlsx.") == std::string::npos && name.find(".pdf.") == name.npos)
          << "temporary file left: " << name;
    }
  }
}

TEST_F(CliTest, NoCommandWithoutADisplayAborted) {
  const RunResult r = Run({}, "env -u DISPLAY -u WAYLAND_DISPLAY -u QT_QPA_PLATFORM");
  if (r.exitCode == 2 && r.err.find("without its window") != std::string::npos) {
    GTEST_SKIP() << "built without the window";
  }
  EXPECT_EQ(r.exitCode, 1) << r.err;
  EXPECT_NE(r.err.find("DISPLAY"), std::string::npos) << r.err;
}

// A page cell or dispatch field as the clerk reads it: markup undone, a comma as the
// dispatch file writes it (a blank), no surrounding blanks.
std::string Readable(std::string t) {
  for (const auto& [from, to] : {std::pair<std::string, std::string>{"&nbsp;", ""},
                                 {"&lt;", "<"},
                                 {"&gt;", ">"},
                                 {"&amp;", "&"},
                                 {",", " "}}) {
    for (size_t p = t.find(from); p != std::string::npos; p = t.find(from, p + to.size()))
      t.replace(p, from.size(), to);
  }
  const size_t first = t.find_first_not_of(' ');
  return first == t.npos ? "" : t.substr(first, t.find_last_not_of(' ') - first + 1);
}

// The readable texts between `open` and `close`, in order.
std::vector<std::string> Between(const std::string& page, const std::string& open,
                                 const std::string& close) {
  std::vector<std::string> out;
  for (size_t at = page.find(open); at != std::string::npos; at = page.find(open, at)) {
    at += open.size();
    out.push_back(Readable(page.substr(at, page.find(close, at) - at)));
  }
  return out;
}

// Regression: with addresses from the document header, the label sheet and the list printed
// the header's name and address reversed ("12 הרצל" as "הרצל 21"), while the dispatch file
// had them in reading order. The three outputs agree on every recipient, by accounts and by
// documents, and hold the names the books hold.
TEST_F(CliTest, DocumentAddressOnTheSheetWasReversed) {
  const std::vector<std::vector<std::string>> variants = {
      {},
      {"--set", "UseDates=1", "--set", "FromDate=01/01/2000", "--set", "ToDate=31/12/2015", "--set",
       "DocType=27", "--set", "AddressFrom=0"}};
  for (const auto& criteria : variants) {
    SCOPED_TRACE(criteria.empty() ? "accounts" : "documents");
    for (auto args :
         {Base("labels", {"--set", "UseTitle1=1", "--set", "UseTitle4=1", "--set", "UseTitle5=1"}),
          Base("list"),
          Base("post",
               {"--set", "FilePath=" + (temp_ / "p.xlsx").string(), "--set", "FileFormat=1"})}) {
      args.insert(args.end(), criteria.begin(), criteria.end());
      const RunResult r = Run(args);
      ASSERT_EQ(r.exitCode, 0) << r.err;
    }
    using Recipients = std::multiset<std::string>;  // "name | address | city"
    const std::string sheet = Contents(temp_ / "zdrlab1.htm");
    const auto lines = [&](const char* line) {
      return Between(sheet, std::string("<tr class='") + line + "' align='right'><td>", "</td>");
    };
    const auto names = lines("Line1"), addresses = lines("Line4"), cities = lines("Line5");
    ASSERT_EQ(names.size(), addresses.size());
    ASSERT_EQ(names.size(), cities.size());
    Recipients onSheet, inList, inFile;
    for (size_t i = 0; i < names.size(); ++i)
      onSheet.insert(names[i] + " | " + addresses[i] + " | " + cities[i]);
    // The list's cells: city, address, contact, name, each after its attributes' ">".
    auto cells = Between(Contents(temp_ / "zdrlab2.htm"), "    <td dir=rtl", "</td>");
    ASSERT_EQ(cells.size() % 4, 0u);
    for (auto& c : cells) c = Readable(c.substr(c.find('>') + 1));
    for (size_t i = 0; i < cells.size(); i += 4)
      inList.insert(cells[i + 3] + " | " + cells[i + 1] + " | " + cells[i]);
    std::istringstream csv(Contents(temp_ / "zdpost1.csv"));
    std::string line;
    std::getline(csv, line);  // headings
    while (std::getline(csv, line)) {
      std::vector<std::string> f;
      std::stringstream fields(line);
      for (std::string v; std::getline(fields, v, ',');) f.push_back(Readable(v));
      ASSERT_GE(f.size(), 5u) << line;
      inFile.insert(f[1] + " | " + f[2] + " | " + f[4]);  // key, name, street, number, city
    }
    EXPECT_FALSE(onSheet.empty());
    EXPECT_EQ(onSheet, inList);
    EXPECT_EQ(onSheet, inFile);
    if (criteria.empty()) {
      size_t known = 0;
      for (const auto& a : truth_->accounts)
        known += !a.deleted && !a.duplicateKey && a.unambiguousText && !a.name.empty() &&
                 std::find(names.begin(), names.end(), a.name) != names.end();
      EXPECT_GT(known, 0u) << "names as the books hold them";
    }
  }
}

TEST_F(CliTest, CityPrefixSelectsOnlyThatCity) {
  std::string city;
  for (const auto& a : truth_->accounts)
    if (city.empty() && !a.deleted && !a.duplicateKey && a.unambiguousText && !a.city.empty())
      city = a.city;
  ASSERT_FALSE(city.empty());
  const RunResult r = Run(Base("list", {"--set", "UseCity=1", "--set", "City=" + city}));
  ASSERT_EQ(r.exitCode, 0) << r.err;
  // The list's cells: city, address, contact, name; every city starts with the prefix.
  const auto cells = Between(Contents(temp_ / "zdrlab2.htm"), "    <td dir=rtl>", "</td>");
  ASSERT_GT(cells.size(), 0u);
  for (size_t i = 0; i < cells.size(); i += 3) EXPECT_TRUE(cells[i].starts_with(city)) << cells[i];
}

// Two companies listed at once in one temporary folder: each run gives exactly the page it
// gives alone, or is refused with the message; never a page mixed from both companies.
TEST_F(CliTest, TwoRunsSharingATempFolderMixedTheirCompanies) {
  zdrgen::Options options;
  options.accounts = 4000;
  options.documents = 0;
  options.ledger = 30000;
  options.keepDetail = false;
  for (int c = 0; c < 2; ++c) {
    options.seed = 31 + c;
    zdrgen::WriteCompany(temp_ / std::to_string(c), options, c == 0 ? "חברה א" : "חברה ב");
  }
  FakeOpener(temp_ / "bin");
  auto args = [&](int c) {
    return std::vector<std::string>{"list",
                                    "--company",
                                    (temp_ / std::to_string(c)).string(),
                                    "--settings",
                                    settings_.string(),
                                    "--set",
                                    "UseTransType=1",
                                    "--set",
                                    "TransType=*",
                                    "--open"};
  };
  auto env = [&](const std::string& copy) {
    return "PATH=" + Quote((temp_ / "bin").string()) + " COPY_TO=" + Quote((temp_ / copy).string());
  };
  std::string solo[2];
  for (int c = 0; c < 2; ++c) {
    ASSERT_EQ(Run(args(c), env("solo" + std::to_string(c))).exitCode, 0);
    solo[c] = ReadBytes(temp_ / ("solo" + std::to_string(c)));
    ASSERT_FALSE(solo[c].empty());
  }
  ASSERT_NE(solo[0], solo[1]);
  for (int round = 0; round < 2; ++round) {
    FILE* pipes[2];
    int ids[2];
    for (int c = 0; c < 2; ++c) {
      pipes[c] = Start(args(c), env("run" + std::to_string(round) + std::to_string(c)));
      ids[c] = runs_;
    }
    for (int c = 0; c < 2; ++c) {
      const RunResult r = Finish(pipes[c], ids[c]);
      const fs::path copy = temp_ / ("run" + std::to_string(round) + std::to_string(c));
      if (r.exitCode == 0) {
        EXPECT_TRUE(ReadBytes(copy) == solo[c]) << "company " << c << " round " << round;
      } else {
        EXPECT_EQ(r.exitCode, 1);
        EXPECT_NE(r.err.find(kBusy), std::string::npos) << r.err;
        EXPECT_FALSE(fs::exists(copy));
      }
    }
  }
}

// A bad dispatch target is refused before anything is loaded, and nothing at it or in the
// company folder changes.
TEST_F(CliTest, PostDeletedTheTargetBeforeCheckingIt) {
  const fs::path company = temp_ / "company";
  fs::copy(Company(), company);
  fs::create_directories(temp_ / "empty folder");
  std::ofstream(temp_ / "old.xls") << "old workbook";
  std::ofstream(temp_ / "notes.txt") << "old notes";
  fs::create_symlink(company / "ACT.fix", temp_ / "link.xlsx");
  const std::pair<fs::path, const char*> targets[] = {
      {company / "ACT.fix", "נמצא בתיקיית החברה"},
      {company / "out.xlsx", "נמצא בתיקיית החברה"},
      {temp_ / "link.xlsx", "נמצא בתיקיית החברה"},
      {temp_ / "amv.fix", "קובץ הנהלת חשבונות"},
      {temp_ / "empty folder", "הוא תיקייה"},
      {temp_ / "old.xls", "לא נמצאה תוכנה שממירה"},
      {temp_ / "notes.txt", "לא ניתן לכתוב גיליון עבודה"},
      {temp_ / "book", "אין סיומת"},
      {temp_ / "nowhere" / "book.xlsx", "לא נמצאה"},
  };
  std::vector<std::pair<fs::path, std::string>> before;
  for (const auto& e : fs::directory_iterator(company))
    before.emplace_back(e.path(), ReadBytes(e.path()));
  for (const auto& [target, message] : targets) {
    SCOPED_TRACE(target.string());
    const std::string oldBytes = fs::is_regular_file(target) ? ReadBytes(target) : "";
    const bool existed = fs::exists(fs::symlink_status(target));
    auto args = Base("post", {"--set", "FilePath=" + target.string()});
    args[2] = company.string();
    const RunResult r = Run(args, "PATH=" + Quote((temp_ / "no programs").string()));
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_NE(r.err.find(message), std::string::npos) << r.err;
    EXPECT_EQ(r.err.find("מאתחל בסיס נתונים"), std::string::npos) << "checked before the load";
    EXPECT_EQ(fs::exists(fs::symlink_status(target)), existed);
    EXPECT_EQ(fs::is_regular_file(target) ? ReadBytes(target) : "", oldBytes);
  }
  EXPECT_TRUE(fs::is_directory(temp_ / "empty folder"));
  EXPECT_TRUE(fs::is_symlink(temp_ / "link.xlsx"));
  std::vector<std::pair<fs::path, std::string>> after;
  for (const auto& e : fs::directory_iterator(company))
    after.emplace_back(e.path(), ReadBytes(e.path()));
  EXPECT_TRUE(after == before) << "the company folder changed";
}

}  // namespace
