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
    // The pages and the dispatch file hold the same names as the working database.
    {"OutputsWereReadableByEveryone", "@labels;@list;@post --set FilePath={T}/p.xlsx", 0, "", "",
     "zdrlab.DB #600|zdrlab1.htm #600;zdrlab2.htm #600;zdpost1.csv #600"},
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
    // Said in Hebrew; an option word where a file name belongs is not taken as the name.
    {"WrongUsage",
     "--bogus;print;labels --company;labels --bogus;labels --open=yes;@labels --check;"
     "@labels --set NoSuchKey=1;calibrate --pdf --template;labels --company --settings {S}",
     2, "",
     "אפשרות לא מוכרת: --bogus;פקודה לא מוכרת: print;חסר ערך;אפשרות לא מוכרת;אינה מקבלת ערך;"
     "אינה שייכת לפקודה;הגדרה לא מוכרת: NoSuchKey;--template\" הוא אפשרות;--settings\" הוא אפשרות",
     "--template -"},
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
    {"SettingsThatAskForThePdfGiveIt", "@labels", 0, "={T}/zdrlab1.pdf\n", "",
     "zdrlab1.pdf ^%PDF-|zdrlab1.pdf #600", "", "pdfsettings"},
    // A user stock ("mine", its PageHeight missing) that fails its check says why.
    {"PdfOptionsAreChecked",
     "calibrate --settings {S};labels --template a4-2x4-105x74 --settings {S};"
     "labels --pdf {T}/x.pdf --offset 10.5,0 --settings {S};"
     "labels --pdf {T}/x.pdf --offset 0.05,0 --settings {S};"
     "labels --pdf {T}/x.pdf --template none --settings {S};list --pdf {T}/x.pdf --settings {S};"
     "labels --pdf {T}/x.pdf --template mine --settings {S}",
     2, "",
     "צריכה --pdf;באים עם --pdf;--offset מקבל;--offset מקבל;\"none\" אינה מוכרת;אינה שייכת;"
     "\"mine\" שבהגדרות אינה תקינה: הערך PageHeight",
     "x.pdf -", "", "badstock"},
    {"LinkPlantedInTempRedirectedTheOutput", "@list;@post --set FilePath={T}/p.xlsx", 0,
     "={T}/zdrlab2.htm\n;={T}/p.xlsx\n", "",
     "victim =not yours|zdrlab.DB #|zdrlab2.htm #;victim =not yours|zdrlab.DB #|zdpost1.csv #", "",
     "links"},
};

// A company folder's file names and their bytes.
std::vector<std::pair<fs::path, std::string>> Snapshot(const fs::path& folder) {
  std::vector<std::pair<fs::path, std::string>> files;
  for (const auto& e : fs::directory_iterator(folder))
    files.emplace_back(e.path().filename(), ReadBytes(e.path()));
  std::sort(files.begin(), files.end());
  return files;
}

std::shared_ptr<void> Prepare(const std::string& what, const fs::path& t) {
  if (what == "held") {
    std::ofstream(t / "zdrlab.DB") << "the other run's database";
    return std::make_shared<zdr::WorkFilesLock>(t);
  }
  if (what == "oldbook") std::ofstream(t / "post.xlsx") << "last week's workbook";
  if (what == "fifo") {
    fs::create_directories(t / "fifo");
    EXPECT_EQ(::mkfifo((t / "fifo" / "ACT.fix").c_str(), 0600), 0);
  }
  if (what == "unreadable") fs::create_directories(t / "folder");
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
  if (what == "badstock") {
    std::ofstream(t / "settings.ini") << "[ZDRLab]\nLabelStocks\\Ids=mine\n"
                                      << "LabelStock.mine\\PageWidth=210\n";
  }
  return nullptr;
}

// Temporary files of a writer left in `folder` (".out.xlsx.XXXXXX", "out.pdf.XXXXXX").
std::vector<std::string> TemporaryFilesIn(const fs::path& folder) {
  std::vector<std::string> left;
  for (const auto& e : fs::directory_iterator(folder)) {
    const std::string name = e.path().filename().string();
    if (name.find(".xlsx.") != name.npos || name.find(".pdf.") != name.npos) left.push_back(name);
  }
  return left;
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
      const std::shared_ptr<void> held = Prepare(c.setup, temp_);
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
      EXPECT_EQ(TemporaryFilesIn(temp_), std::vector<std::string>{}) << "temporary file left";
    }
}

// ---- One target check for every file the user names -------------------------------------

// The writers of a file at a path the user gives: {TARGET} is the path, with "X" in it the
// writer's extension.
struct Writer {
  const char *name, *args, *ext, *magic;
};
const Writer kWriters[] = {
    {"workbook", "@post --set FilePath={TARGET}", "xlsx", "PK"},
    {"label PDF", "@labels --pdf {TARGET}", "pdf", "%PDF-"},
    {"calibration PDF", "calibrate --company {C} --settings {S} --pdf {TARGET}", "pdf", "%PDF-"},
};

struct TargetCase {
  const char* name;
  const char* target;  // {C} the company, {T} the temporary folder
  int exit[std::size(kWriters)];
  const char* message;  // a pattern for all writers, or one per writer split at ';'
  const char* env = "";
};

// Regression: `labels --pdf C/ACT.fix` and `calibrate --pdf amv.fix` (run in the company
// folder) replaced the host's files with a PDF, and `calibrate --pdf --template` wrote a file
// named "--template"; only the workbook was checked. The settings keep the company {T}/kept.
const TargetCase kTargets[] = {
    {"HostFileInTheCompany", "{C}/ACT.fix", {1, 1, 1}, "נמצא בתיקיית החברה"},
    {"OtherFileInTheCompany", "{C}/out.X", {1, 1, 1}, "נמצא בתיקיית החברה"},
    {"LinkIntoTheCompany", "{T}/link.X", {1, 1, 1}, "נמצא בתיקיית החברה"},
    {"HostNameRunInTheCompany", "amv.fix", {1, 1, 1}, "נמצא בתיקיית החברה", "cd {C} &&"},
    {"CompanyTheSettingsKeep", "{T}/kept/out.X", {1, 1, 1}, "נמצא בתיקיית החברה"},
    {"HostNameElsewhere", "{T}/amv.fix", {1, 1, 1}, "בשם של קובץ הנהלת חשבונות"},
    {"BatchNameElsewhere", "{T}/A12.TMP", {1, 1, 1}, "בשם של קובץ הנהלת חשבונות"},
    {"Folder", "{T}/folder", {1, 1, 1}, "הוא תיקייה"},
    {"OtherExtension",
     "{T}/notes.txt",
     {1, 1, 1},
     "לא ניתן לכתוב גיליון עבודה;לא ניתן לכתוב קובץ PDF;לא ניתן לכתוב קובץ PDF"},
    {"NoExtension", "{T}/book", {1, 1, 1}, "אין סיומת"},
    {"NoSuchFolder", "{T}/none/out.X", {1, 1, 1}, "לא נמצאה"},
    {"Fifo", "{T}/fifo.X", {1, 1, 1}, "אינו קובץ רגיל"},
    {"OptionWord", "--template", {1, 2, 2}, "אין סיומת;\"--template\" הוא אפשרות;הוא אפשרות"},
    {"Written", "{T}/out.X", {0, 0, 0}, "!שגיאה"},
};

TEST_F(CliTest, EveryWriterRefusesTheSameTargets) {
  for (const TargetCase& c : kTargets) {
    for (size_t w = 0; w < std::size(kWriters); ++w) {
      const Writer& writer = kWriters[w];
      SCOPED_TRACE(std::string(c.name) + " by the " + writer.name);
      NewTemp(std::string(c.name) + "_" + writer.ext + std::to_string(w));
      company_ = temp_ / "company";
      fs::copy(Company(), company_);
      fs::create_directories(temp_ / "folder");
      fs::create_directories(temp_ / "kept");
      std::ofstream(settings_) << "[ZDRLab]\nParams\\ConnDataBase=" << (temp_ / "kept").string()
                               << "\n";
      std::ofstream(temp_ / "notes.txt") << "old notes";
      ASSERT_EQ(::mkfifo((temp_ / ("fifo." + std::string(writer.ext))).c_str(), 0600), 0);
      fs::create_symlink(company_ / "ACT.fix", temp_ / ("link." + std::string(writer.ext)));
      // What a killed run writing out.X left: gone after the next run for out.X.
      const std::string out = "out." + std::string(writer.ext);
      std::ofstream(temp_ / ("." + out + ".Ab12Cd")) << writer.magic << "customer names";

      std::string target = Expand(c.target);
      if (const size_t x = target.rfind(".X"); x != std::string::npos && x + 2 == target.size())
        target.replace(x + 1, 1, writer.ext);
      std::string args = writer.args;
      args.replace(args.find("{TARGET}"), 8, target);
      const RunResult r = Run(args, c.env);

      EXPECT_EQ(r.exitCode, c.exit[w]) << r.err;
      EXPECT_TRUE(Matches(r.err, Part(c.message, w))) << Part(c.message, w) << "\n" << r.err;
      EXPECT_TRUE(Snapshot(company_) == Snapshot(Company())) << "the company changed";
      EXPECT_EQ(ReadBytes(temp_ / "notes.txt"), "old notes");
      EXPECT_FALSE(fs::exists(temp_ / "--template"));
      if (c.exit[w] == 0) {
        EXPECT_TRUE(ReadBytes(temp_ / out).starts_with(writer.magic));
        EXPECT_EQ(TemporaryFilesIn(temp_), std::vector<std::string>{});
      } else if (c.exit[w] == 1) {
        EXPECT_FALSE(Matches(r.err, "מאתחל בסיס נתונים")) << "refused before any work";
      }
    }
  }
}

// ---- One table of values for --set and the settings file --------------------------------

// Regression: a settings file with one value its control refuses (UseCatCode=7, SortBy=99)
// silently dropped every key after it, the criteria included: the run chose 197 recipients
// instead of 10. A weight of "abc" went into every row of the dispatch file. Such a value is
// wrong usage, by --set or in a settings file, and nothing is written.
TEST_F(CliTest, RefusedValueIsWrongUsageByEveryWayIn) {
  const std::tuple<const char*, const char*, const char*> kBadValues[] = {
      {"Params", "UseCatCode", "7"},  {"Params", "SortBy", "99"},    {"Params", "DocType", "x"},
      {"PostIL", "Weight", "abc"},    {"PostIL", "Weight", "-1"},    {"PostIL", "Weight", "0,5"},
      {"PostIL", "OpenExcel", "yes"}, {"PostIL", "FileFormat", "2"}, {"", "ChkByItems", "3"},
  };
  for (const auto& [section, key, value] : kBadValues) {
    for (const bool inFile : {false, true}) {
      if (inFile && *section == '\0') continue;  // not a stored value
      SCOPED_TRACE(std::string(key) + "=" + value +
                   (inFile ? " in the settings file" : " by --set"));
      NewTemp(std::string(key) + value + (inFile ? "file" : "set"));
      if (inFile) {
        std::ofstream(settings_) << "[ZDRLab]\n" << section << "\\" << key << "=" << value << "\n";
      }
      const std::string set = inFile ? "" : std::string(" --set ") + key + "=" + value;
      const RunResult r = Run("@post --set FilePath={T}/p.xlsx" + set);
      EXPECT_EQ(r.exitCode, 2) << r.err;
      const std::string said = std::string(key) + " אינו תקין";
      EXPECT_TRUE(Matches(r.err, "\"" + std::string(value) + "\" של ההגדרה " + said)) << r.err;
      if (inFile) {
        EXPECT_TRUE(Matches(r.err, settings_.string())) << r.err;
      }
      for (const char* file : {"p.xlsx", "zdpost1.csv", "zdrlab.DB"})
        EXPECT_FALSE(fs::exists(temp_ / file)) << file;
    }
  }
}

// ---- A full temporary folder ---------------------------------------------------------------

// Regression: a full temporary folder gave SQLite's English cause, then two misleading
// "database file not found" messages, and left 0-byte pages. Now one Hebrew message names the
// folder and the full disk, and no page is left. The folder is a small file system mounted
// for the run alone (a user and mount namespace); without them the test is skipped.
TEST_F(CliTest, FullTempFolderIsOneMessage) {
  const fs::path full = temp_ / "full";
  fs::create_directories(full);
  const std::string probe = "unshare -rm sh -c " +
                            Quote("mount -t tmpfs tmpfs " + Quote(full.string())) +
                            " >/dev/null 2>&1";
  if (std::system(probe.c_str()) != 0) GTEST_SKIP() << "no mount namespace for a small tmpfs";
  // Runs the label sheet with a file system of `kb` KB as the temporary folder; the exit code,
  // standard error, and the files left ("name bytes" lines).
  const auto runIn = [&](int kb) {
    const std::string run =
        "mount -t tmpfs -o size=" + std::to_string(kb) + "k tmpfs " + Quote(full.string()) +
        " && Temp=" + Quote(full.string()) + " " +
        Quote(std::string(ZDR_BINARY_DIR) + "/src/zdrlab") + " labels --company " +
        Quote(Company().string()) + " --settings " + Quote(settings_.string()) +
        " --set UseTitle1=1 --set UseTitle4=1 --set UseTransType=1 --set TransType=*"
        " --set ReadTempTrans=1 2>" +
        Quote((temp_ / "err").string()) + "; echo $? >" + Quote((temp_ / "rc").string()) + "; cd " +
        Quote(full.string()) + " && for f in *; do echo \"$f $(stat -c %s \"$f\")\"; done >" +
        Quote((temp_ / "left").string());
    EXPECT_EQ(std::system(("unshare -rm sh -c " + Quote(run)).c_str()), 0);
    return std::tuple(ReadBytes(temp_ / "rc"), ReadBytes(temp_ / "err"), ReadBytes(temp_ / "left"));
  };
  // With room, to learn the database's size.
  const auto [rc, err, left] = runIn(4096);
  ASSERT_EQ(rc, "0\n") << err;
  const size_t at = left.find("zdrlab.DB ");
  ASSERT_NE(at, std::string::npos) << left;
  const int dbKb = (std::stoi(left.substr(at + 10)) + 4095) / 4096 * 4;
  // No room for the database; room for the database but not the page.
  for (const auto& [kb, file] : {std::pair(16, "zdrlab.DB"), std::pair(dbKb + 4, "zdrlab1.htm")}) {
    SCOPED_TRACE(std::to_string(kb) + " KB");
    const auto [rc, err, left] = runIn(kb);
    EXPECT_EQ(rc, "1\n") << err;
    size_t messages = 0;
    for (const auto& line : Split(err, '\n'))
      messages += line.starts_with("[!") || line.starts_with("[i]");
    EXPECT_EQ(messages, 1u) << err;
    EXPECT_TRUE(Matches(err, "אין מקום פנוי בדיסק: התיקייה " + full.string() +
                                 " מלאה, ולא ניתן לכתוב בה את הקובץ " + file))
        << err;
    EXPECT_TRUE(Matches(left, "!zdrlab1.htm")) << left;
    EXPECT_TRUE(Matches(left, "!zdrlab.DB 0")) << left;
  }
}

TEST_F(CliTest, NoCommandWithoutADisplayAborted) {
  const RunResult r = Run({}, "env -u DISPLAY -u WAYLAND_DISPLAY -u QT_QPA_PLATFORM");
  if (r.exitCode == 2 && r.err.find("נבנה בלי החלון") != std::string::npos) {
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
