// The zdrlab command line end to end on a generated company: the files it writes, what it
// prints, and its exit codes. Most runs are rows of one table; the runs that compare
// outputs with each other or run side by side have tests of their own.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <future>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "hosttext/codepage.h"
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

std::vector<std::string> Split(const std::string& text, char by) {
  std::vector<std::string> parts;
  std::stringstream in(text);
  for (std::string part; std::getline(in, part, by);)
    if (!part.empty()) parts.push_back(part);
  return parts;
}

// A page or dispatch file as text; other files as they are.
std::string Contents(const fs::path& p) {
  const std::string ext = p.extension().string();
  return ext == ".htm" || ext == ".csv" ? zdr::Win1255ToUtf8(ReadBytes(p)) : ReadBytes(p);
}

// "=x": exactly x; "^x": starts with x; "!x": does not hold x; else holds x.
bool Matches(const std::string& text, const std::string& pattern) {
  if (pattern.starts_with("=")) return text == pattern.substr(1);
  if (pattern.starts_with("^")) return text.starts_with(pattern.substr(1));
  if (pattern.starts_with("!")) return text.find(pattern.substr(1)) == std::string::npos;
  return text.find(pattern) != std::string::npos;
}

class CliTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    scratch_ = new zdr::test::ScratchTemp;
    zdrgen::WriteCompany(scratch_->dir() / "company", {.seed = 11, .accounts = 60, .documents = 40},
                         "חברה לדוגמה");
  }
  static void TearDownTestSuite() { delete scratch_; }
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
  fs::path company_ = Company();  // what {C} stands for

  // `text` with {C} the company folder, {S} the settings file, {T} the temporary folder and
  // {_} a blank within one argument.
  std::string Expand(std::string text) const {
    for (const auto& [from, to] :
         {std::pair{"{C}", company_}, {"{S}", settings_}, {"{T}", temp_}, {"{_}", fs::path(" ")}})
      for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at))
        text.replace(at, 3, to.string());
    return text;
  }

  // Runs zdrlab with `args` split at blanks and expanded, "@cmd" standing for
  // cmd --company {C} --settings {S}; `env` is put before the command (NAME=VALUE words, or
  // a command such as "timeout 30 env"). Safe to call from two threads at once.
  RunResult Run(const std::string& args, const std::string& env = "") {
    std::string cmd = Expand(env) + " Temp=" + Quote(temp_.string()) + " " +
                      Quote(std::string(ZDR_BINARY_DIR) + "/src/zdrlab");
    std::vector<std::string> words = Split(args, ' ');
    if (!words.empty() && words[0].starts_with("@"))
      words = Split(
          words[0].substr(1) + " --company {C} --settings {S}" + args.substr(words[0].size()), ' ');
    for (const auto& word : words) cmd += " " + Quote(Expand(word));
    const std::string out = (temp_ / ("run" + std::to_string(++runs_))).string();
    const int status =
        std::system((cmd + " >" + Quote(out + ".out") + " 2>" + Quote(out + ".err")).c_str());
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, ReadBytes(out + ".out"),
            ReadBytes(out + ".err")};
  }

  static zdr::test::ScratchTemp* scratch_;
  fs::path temp_, settings_;
  std::atomic<int> runs_ = 0;
};

zdr::test::ScratchTemp* CliTest::scratch_ = nullptr;

// A stand-in for the desktop's opener in `bin`: copies the file it is given to $COPY_TO, or
// fails with `exitCode`.
void FakeOpener(const fs::path& bin, int exitCode = 0) {
  fs::create_directories(bin);
  std::ofstream(bin / "xdg-open") << "#!/bin/sh\n"
                                  << (exitCode == 0 ? "/bin/cp \"$1\" \"$COPY_TO\"\n" : "")
                                  << "exit " << exitCode << "\n";
  fs::permissions(bin / "xdg-open", fs::perms::owner_all);
}

// The part-th of `text`'s parts split at ';', or all of it when it has none.
std::string Part(const std::string& text, size_t part) {
  if (text.find(';') == std::string::npos) return text;
  size_t from = 0;
  for (; part > 0; --part) from = text.find(';', from) + 1;
  return text.substr(from, text.find(';', from) - from);
}

// One run, or several split at ';' that end alike (or with an out, err, files and env part
// each). Args are split at blanks, "@cmd" standing for cmd --company {C} --settings {S}; `out`
// and `err` hold patterns for Matches split at '|', the err ones found in order; `files` holds
// "name pattern" pairs split at '|' for files in the temporary folder, the pattern "-" for no such
// file and "#" for a file of its own (not a link). `setup` names what the folder holds before
// the run.
struct CliRun {
  const char *name, *args;
  int exit;
  const char *out = "", *err = "", *files = "", *env = "", *setup = "";
};

const std::string kFindings =
    "^חומרה,שורה,מפתח חשבון,שדה,ערך,הודעה\n|,טלפון,123-45,הטלפון אינו מספר ישראלי\n";

const CliRun kRuns[] = {
    {"LabelsWritesTheSheetInTempAndPrintsItsPath", "@labels --set UseTitle1=1", 0,
     "={T}/zdrlab1.htm\n",
     "מאתחל בסיס נתונים|קורא רשימת כרטיסים|קריאת הנתונים הסתיימה|מכין רשימה|הכנת הרשימה הסתיימה",
     "zdrlab1.htm ^<HTML>"},
    {"WorkingDatabaseWasReadableByEveryone", "@labels", 0, "", "", "zdrlab.DB #600"},
    {"PostWithoutOutputFileIsRefused", "@post", 1, "=", "לא הוגדר קובץ פלט|!מאתחל בסיס נתונים"},
    {"PostWritesTheWorkbook", "@post --set FilePath={T}/post.xlsx --set Weight=0.5", 0,
     "={T}/post.xlsx\n", "הכנת הקובץ הסתיימה. שגיאות: ",
     "post.xlsx ^PK|zdpost1.csv ^מספר,שם משפחה,שם פרטי,|zdpost1.csv ,0.5,"},
    // The generated company holds rows the post refuses, planted on purpose.
    {"PostCheckPrintsTheFindings", "@post --set FilePath={T}/post.xlsx --check", 0, nullptr,
     "הבדיקה הסתיימה. שגיאות: ", "zdpost1.csv -|post.xlsx -"},
    {"StrictRefusesTheErrors",
     "@post --set FilePath={T}/post.xlsx --check --strict;@post --set FilePath={T}/post.xlsx "
     "--strict",
     3, nullptr, ";הקובץ לא נכתב. שגיאות: ", "zdpost1.csv -|post.xlsx -"},
    {"MissingCompanyFolderReportsTheAccountFault", "labels --company {T}/none --settings {S}", 1,
     "", "תקלה בקריאת החשבונות"},
    {"WrongUsage",
     "--bogus;print;labels --company;labels --bogus;labels --open=yes;@labels --check;"
     "@labels --set NoSuchKey=1",
     2, "", ";;;;;;NoSuchKey"},
    {"SetValueTheControlRefusesStopsBeforeTheCommand", "@labels --set SortBy=12", 2, "", "",
     "zdrlab1.htm -"},
    {"RunWaitingOnAHeldTempFolderTouchedTheOtherRunsFiles", "@labels", 1, "",
     "תפוסים בידי הפעלה אחרת של התוכנה|!מאתחל בסיס נתונים",
     "zdrlab.DB =the other run's database|zdrlab1.htm -", "", "held"},
    {"FailedPostLostTheOldWorkbook",
     "post --company {T}/none --settings {S} --set FilePath={T}/post.xlsx", 1, "=", "לא נכתב מחדש",
     "post.xlsx =last week's workbook", "", "oldbook"},
    {"FifoInPlaceOfTheAccountFileHungTheRun", "labels --company {T}/fifo --settings {S}", 1, "",
     "ACT.fix|לא נמצא", "", "timeout 30 env", "fifo"},
    {"SettingsFileThatCannotBeReadGaveTheDefaultsSilently",
     "labels --company {C} --settings {T}/missing.ini;labels --company {C} --settings {T}/folder;"
     "labels --company {C} --settings {T}/locked.ini",
     2, "", "לא נמצא;הוא תיקייה;לא ניתן לקרוא", "zdrlab.DB -", "", "unreadable"},
    {"EqualsFormOfAnOptionWasRefused",
     "post --company={C} --settings={S} --set=FilePath={T}/post.xlsx --set=FileFormat=1", 0,
     "={T}/post.xlsx\n", "", "zdpost1.csv ^קוד לקוח,"},
    {"OpenReportedSuccessWhenNoProgramStarted", "@labels --open;@labels --open", 1, "=",
     "לא ניתן לפתוח", "", "PATH={T}/none;PATH={T}/bin", "opener"},
    {"LabelsAsPdfOnStockAndCalibrationPage",
     "@labels --set UseTitle1=1 --pdf {T}/labels.pdf --template a4-2x4-105x74 --offset 0.5,-1;"
     "calibrate --settings {S} --pdf {T}/calibration.pdf",
     0, "={T}/labels.pdf\n;={T}/calibration.pdf\n", "",
     "labels.pdf ^%PDF-|zdrlab1.htm -;calibration.pdf ^%PDF-"},
    {"CatalogueStockByBrandAndPart",
     "@labels --set UseTitle1=1 --pdf {T}/l.pdf --template Avery{_}L7160 --scale 15.2,-3", 0,
     "={T}/l.pdf\n", "", "l.pdf ^%PDF-"},
    {"StockThatCannotBePrintedSaysWhy",
     "calibrate --settings {S} --pdf {T}/c.pdf --template Avery{_}L6015;"
     "calibrate --settings {S} --pdf {T}/c.pdf --scale 100.5,0",
     2, "", "מדבקות תקליטור;--scale", "c.pdf -"},
    {"SettingsThatAskForThePdfGiveIt", "@labels", 0, "={T}/zdrlab1.pdf\n", "", "zdrlab1.pdf ^%PDF-",
     "", "pdfsettings"},
    {"PdfOptionsAreChecked",
     "calibrate --settings {S};labels --template a4-2x4-105x74 --settings {S};"
     "labels --pdf {T}/x.pdf --offset 10.5,0 --settings {S};"
     "labels --pdf {T}/x.pdf --offset 0.05,0 --settings {S};"
     "labels --pdf {T}/x.pdf --template none --settings {S};list --pdf {T}/x.pdf --settings {S}",
     2, "", "", "x.pdf -"},
    {"LinkPlantedInTempRedirectedTheOutput", "@list;@post --set FilePath={T}/p.xlsx", 0,
     "={T}/zdrlab2.htm\n;={T}/p.xlsx\n", "",
     "victim =not yours|zdrlab.DB #|zdrlab2.htm #;victim =not yours|zdrlab.DB #|zdpost1.csv #", "",
     "links"},
    // A bad dispatch target is refused before anything is loaded; nothing at it or in the
    // company folder changes.
    {"PostDeletedTheTargetBeforeCheckingIt",
     "@post --set FilePath={T}/company/ACT.fix;@post --set FilePath={T}/company/out.xlsx;"
     "@post --set FilePath={T}/link.xlsx;@post --set FilePath={T}/amv.fix;"
     "@post --set FilePath={T}/folder;@post --set FilePath={T}/old.xls;"
     "@post --set FilePath={T}/notes.txt;@post --set FilePath={T}/book;"
     "@post --set FilePath={T}/none/book.xlsx",
     1, "",
     "נמצא בתיקיית החברה|!מאתחל;נמצא בתיקיית החברה|!מאתחל;נמצא בתיקיית החברה|!מאתחל;"
     "קובץ הנהלת חשבונות|!מאתחל;הוא תיקייה|!מאתחל;לא נמצאה תוכנה שממירה|!מאתחל;"
     "לא ניתן לכתוב גיליון עבודה|!מאתחל;אין סיומת|!מאתחל;לא נמצאה|!מאתחל",
     ";;;amv.fix -;;old.xls =old workbook;notes.txt =old notes;book -;", "PATH={T}/none",
     "targets"},
};

// A company folder's file names and their bytes.
std::vector<std::pair<fs::path, std::string>> Snapshot(const fs::path& folder) {
  std::vector<std::pair<fs::path, std::string>> files;
  for (const auto& e : fs::directory_iterator(folder))
    files.emplace_back(e.path().filename(), ReadBytes(e.path()));
  std::sort(files.begin(), files.end());
  return files;
}

std::shared_ptr<void> Prepare(const std::string& what, const fs::path& t, const fs::path& company) {
  if (what == "held") {
    std::ofstream(t / "zdrlab.DB") << "the other run's database";
    return std::make_shared<zdr::WorkFilesLock>(t);
  }
  if (what == "oldbook") std::ofstream(t / "post.xlsx") << "last week's workbook";
  if (what == "fifo") {
    fs::create_directories(t / "fifo");
    EXPECT_EQ(::mkfifo((t / "fifo" / "ACT.fix").c_str(), 0600), 0);
  }
  if (what == "unreadable" || what == "targets") fs::create_directories(t / "folder");
  if (what == "unreadable") {
    std::ofstream(t / "locked.ini") << "[Params]\n";
    fs::permissions(t / "locked.ini", fs::perms::none);
  }
  if (what == "opener") FakeOpener(t / "bin", 3);
  if (what == "pdfsettings") {
    std::ofstream(t / "settings.ini")
        << "[ZDRLab]\nLabelPdf\\Output=1\nLabelPdf\\Template=a4-3x8-70x37\n";
  }
  if (what == "links") {
    std::ofstream(t / "victim") << "not yours";
    for (const char* name : {"zdrlab.DB", "zdrlab2.htm", "zdpost1.csv"})
      fs::create_symlink(t / "victim", t / name);
  }
  if (what == "targets") {
    fs::copy(company, t / "company");
    std::ofstream(t / "old.xls") << "old workbook";
    std::ofstream(t / "notes.txt") << "old notes";
    fs::create_symlink(t / "company" / "ACT.fix", t / "link.xlsx");
  }
  return nullptr;
}

TEST_F(CliTest, EveryRunGivesItsExitCodeOutputAndFiles) {
  size_t n = 0;
  for (const CliRun& c : kRuns)
    for (size_t part = 0; part < Split(c.args, ';').size(); ++part) {
      const std::string args = Split(c.args, ';')[part], err = Part(c.err, part),
                        files = Part(c.files, part), out = Part(c.out ? c.out : kFindings, part);
      SCOPED_TRACE(std::string(c.name) + ": " + args);
      NewTemp("run" + std::to_string(++n));
      if (args.find("locked") != args.npos && ::geteuid() == 0) continue;  // root reads it
      const bool targets = std::string(c.setup) == "targets";
      const std::shared_ptr<void> held = Prepare(c.setup, temp_, Company());
      company_ = targets ? temp_ / "company" : Company();
      const RunResult r = Run(args, Part(c.env, part));
      EXPECT_EQ(r.exitCode, c.exit) << r.err;
      for (const auto& pattern : Split(out, '|'))
        EXPECT_TRUE(Matches(r.out, Expand(pattern))) << pattern << "\n" << r.out;
      size_t at = 0;
      for (const auto& pattern : Split(err, '|')) {
        EXPECT_TRUE(Matches(r.err.substr(pattern.starts_with("!") ? 0 : at), pattern))
            << pattern << r.err;
        if (!pattern.starts_with("!")) at = std::min(r.err.size(), r.err.find(pattern, at));
      }
      for (const auto& file : Split(files, '|')) {
        const fs::path p = temp_ / file.substr(0, file.find(' '));
        const std::string pattern = file.substr(file.find(' ') + 1);
        if (pattern == "-") {
          EXPECT_FALSE(fs::exists(fs::symlink_status(p))) << p;
        } else if (pattern.starts_with("#")) {  // "#600": and readable by its owner only
          const fs::file_status st = fs::symlink_status(p);
          EXPECT_TRUE(fs::is_regular_file(st) &&
                      (pattern == "#" ||
                       st.permissions() == (fs::perms::owner_read | fs::perms::owner_write)))
              << p;
        } else {
          EXPECT_TRUE(Matches(Contents(p), pattern)) << p << ": " << pattern;
        }
      }
      if (targets) {
        EXPECT_TRUE(Snapshot(temp_ / "company") == Snapshot(Company())) << "the company changed";
        EXPECT_TRUE(fs::is_directory(temp_ / "folder") && fs::is_symlink(temp_ / "link.xlsx"));
      }
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
  const std::string undo[] = {"&nbsp;", "", "&lt;", "<", "&gt;", ">", "&amp;", "&", ",", " "};
  for (size_t i = 0; i < std::size(undo); i += 2) {
    for (size_t p = t.find(undo[i]); p != t.npos; p = t.find(undo[i], p + undo[i + 1].size()))
      t.replace(p, undo[i].size(), undo[i + 1]);
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
// documents.
TEST_F(CliTest, DocumentAddressOnTheSheetWasReversed) {
  for (const std::string criteria :
       {"",
        " --set UseDates=1 --set FromDate=01/01/2000 --set ToDate=31/12/2015 --set DocType=27 "
        "--set AddressFrom=0"}) {
    SCOPED_TRACE(criteria.empty() ? "accounts" : "documents");
    for (const char* run : {"@labels --set UseTitle1=1 --set UseTitle4=1 --set UseTitle5=1",
                            "@list", "@post --set FilePath={T}/p.xlsx --set FileFormat=1"}) {
      const RunResult r = Run(run + criteria);
      ASSERT_EQ(r.exitCode, 0) << r.err;
    }
    std::multiset<std::string> onSheet, inList, inFile;  // "name | address | city"
    const std::string sheet = Contents(temp_ / "zdrlab1.htm");
    const auto line = [&](char n) {
      return Between(sheet, std::string("'Line") + n + "' align='right'><td>", "</td>");
    };
    const auto names = line('1'), addresses = line('4'), cities = line('5');
    ASSERT_TRUE(names.size() == addresses.size() && names.size() == cities.size());
    for (size_t i = 0; i < names.size(); ++i)
      onSheet.insert(names[i] + " | " + addresses[i] + " | " + cities[i]);
    // The list's cells after the zip: city, address, contact, name.
    const auto cells = Between(Contents(temp_ / "zdrlab2.htm"), "dir=rtl>", "</td>");
    for (size_t i = 0; i + 3 < cells.size(); i += 4)
      inList.insert(cells[i + 3] + " | " + cells[i + 1] + " | " + cells[i]);
    const auto rows = Split(Contents(temp_ / "zdpost1.csv"), '\n');
    for (size_t i = 1; i < rows.size(); ++i) {  // key, name, street, number, city, ...
      const auto f = Between("," + rows[i], ",", ",");
      ASSERT_GE(f.size(), 5u) << rows[i];
      inFile.insert(f[1] + " | " + f[2] + " | " + f[4]);
    }
    EXPECT_FALSE(onSheet.empty());
    EXPECT_EQ(onSheet, inList);
    EXPECT_EQ(onSheet, inFile);
  }
}

// Two companies listed at once in one temporary folder: each run gives exactly the page it
// gives alone, or is refused with the message; never a page mixed from both companies.
TEST_F(CliTest, TwoRunsSharingATempFolderMixedTheirCompanies) {
  for (int c = 0; c < 2; ++c) {
    const zdrgen::Options options{
        .seed = 31u + c, .accounts = 4000, .documents = 0, .ledger = 30000, .keepDetail = false};
    zdrgen::WriteCompany(temp_ / std::to_string(c), options, c == 0 ? "חברה א" : "חברה ב");
  }
  FakeOpener(temp_ / "bin");
  auto args = [&](int c) {
    return "list --company {T}/" + std::to_string(c) +
           " --settings {S} --set UseTransType=1 --set TransType=* --open";
  };
  auto env = [&](const std::string& copy) { return "PATH={T}/bin COPY_TO={T}/" + copy; };
  std::string solo[2];
  for (int c = 0; c < 2; ++c) {
    ASSERT_EQ(Run(args(c), env("solo" + std::to_string(c))).exitCode, 0);
    solo[c] = ReadBytes(temp_ / ("solo" + std::to_string(c)));
    ASSERT_FALSE(solo[c].empty());
  }
  ASSERT_NE(solo[0], solo[1]);
  for (int round = 0; round < 2; ++round) {
    const auto copy = [&](int c) { return "copy" + std::to_string(round) + std::to_string(c); };
    std::future<RunResult> runs[2];
    for (int c = 0; c < 2; ++c)
      runs[c] = std::async(std::launch::async, [&, c] { return Run(args(c), env(copy(c))); });
    for (int c = 0; c < 2; ++c) {
      const RunResult r = runs[c].get();
      if (r.exitCode == 0) {
        EXPECT_TRUE(ReadBytes(temp_ / copy(c)) == solo[c]) << "company " << c << " round " << round;
      } else {
        EXPECT_EQ(r.exitCode, 1);
        EXPECT_NE(r.err.find("תפוסים בידי הפעלה אחרת של התוכנה"), std::string::npos) << r.err;
        EXPECT_FALSE(fs::exists(temp_ / copy(c)));
      }
    }
  }
}

}  // namespace
