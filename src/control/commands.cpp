// The three output commands. Each runs the data load, writes its file in the temporary
// folder and hands it to the browser or the spreadsheet program; any failure on the way is
// shown under "תקלה" and ends the command.
#include <exception>
#include <filesystem>
#include <optional>
#include <system_error>

#include "control/control.h"
#include "control/dataload.h"
#include "control/settings.h"
#include "engine/engine.h"
#include "output/output.h"
#include "select/select.h"
#include "workdb/schema.h"
#include "workdb/worklock.h"

namespace zdr {
namespace {

class CommandError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

std::string TempFile(const char* name) {
  return (TempFolder() / name).string();
}

void OpenPage(UserSeam& ui, const std::string& path) {
  if (!ui.OpenInBrowser(path)) throw CommandError("לא ניתן לפתוח את הדפדפן על הקובץ " + path);
}

}  // namespace

LoadResult Control::ReadAllData(bool pAsIs) {
  lastLoad_ = LoadResult{false, 1};  // what stays when the load ends by an error
  lastLoad_ = zdr::ReadAllData(pAsIs, panel_, state_, docTypes_, ui_);
  return lastLoad_;
}

std::vector<std::string> Control::CompanyFolders() {
  std::vector<std::string> folders{state_.companyPath};
  try {
    folders.push_back(
        store_.Get(kSettingsApp, kParamsSection, kConnDataBaseKey, DefaultConnDataBase()));
  } catch (const std::exception&) {
  }
  return folders;
}

bool Control::TargetRefused(const std::string& path, TargetKind kind) {
  try {
    CheckOutputTarget(path, kind, CompanyFolders());
    return false;
  } catch (const OutputError& e) {
    ui_.ShowMessage(e.what(), kTitleError, MsgIcon::Critical);
    return true;
  }
}

// The label sheet and the address list: the data load as-is, then the page in the temporary
// folder, opened in a new browser window. A load that could not create its database has
// shown why, and nothing follows it; a load whose importers failed still gives its page.
template <typename WritePage>
static std::string RunPageCommand(Control& control, const char* fileName, WritePage writePage) {
  UserSeam& ui = control.ui();
  try {
    const auto lock = LockWorkFiles();
    if (!control.ReadAllData(true).databaseUsable) return "";
    ui.YieldToEvents();
    ui.SetStatus("מכין רשימה");
    const std::string path = TempFile(fileName);
    writePage(path);
    OpenPage(ui, path);
    ui.SetStatus("הכנת הרשימה הסתיימה");
    return path;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return "";
  }
}

std::string Control::CmdLabPrev() {
  lastLoad_ = {true, 0};
  if (labelPdf_.Output == 1) return CmdLabPdf(TempFile("zdrlab1.pdf"));
  return RunPageCommand(*this, "zdrlab1.htm", [this](const std::string& path) {
    CreateLabFile(path, state_.workDbPath, panel_, docTypes_, state_.selectDbPath, labels_, ui_);
  });
}

std::string Control::CmdPreview() {
  lastLoad_ = {true, 0};
  return RunPageCommand(*this, "zdrlab2.htm", [this](const std::string& path) {
    CreateHTML(path, state_.workDbPath, panel_, docTypes_, state_.selectDbPath, ui_);
  });
}

// The checks' counts after a status text: "הכנת הקובץ הסתיימה. שגיאות: 0, אזהרות: 2".
static std::string WithCounts(std::string_view status, const PreflightResult& r) {
  return std::string(status) + ". " + PreflightCounts(r);
}

db::Snapshot Control::RunPostILChecks() {
  preflight_ = {};
  ui_.SetStatus("בודק את הנמענים");
  // The dispatch file reads the same rows again, so the statement runs once for both.
  db::Snapshot recipients =
      db::Database::Open(state_.workDbPath)
          .OpenSnapshot(BuildRecipientsStatement(panel_, docTypes_, state_.selectDbPath),
                        db::SnapshotKind::Forward);
  preflight_ = RunPreflight(recipients, postIL_.FileFormat, panel_, docTypes_, ui_, postIL_);
  return recipients;
}

// The dispatch file. The workbook named by FilePath is checked before anything is loaded,
// and replaced only by a complete workbook from a load whose every step was done: until
// then the old file stays as it was.
std::string Control::CmdBuildPostIL(bool strict) {
  preflight_ = {};
  lastPostCsv_.clear();
  lastPostWorkbook_.clear();
  lastLoad_ = {true, 0};
  try {
    if (postIL_.FilePath.empty()) {
      ui_.ShowMessage("לא הוגדר קובץ פלט", kTitleError, MsgIcon::Critical);
      return "";
    }
    if (TargetRefused(postIL_.FilePath, TargetKind::kWorkbook)) return "";
    const auto lock = LockWorkFiles();
    const LoadResult load = ReadAllData(false);
    if (!load.databaseUsable) return "";
    ui_.YieldToEvents();
    db::Snapshot recipients = RunPostILChecks();
    if (strict && preflight_.errors > 0) {
      ui_.SetStatus(WithCounts("הקובץ לא נכתב", preflight_));
      return "";
    }
    ui_.SetStatus("מכין קובץ");
    const std::string csv = TempFile("zdpost1.csv");
    CreateCSV(csv, recipients, postIL_.FileFormat, postIL_, ui_);
    recipients.Close();
    if (!load.Complete()) {
      throw CommandError("הקובץ " + postIL_.FilePath +
                         " לא נכתב מחדש, כי קריאת הנתונים לא הושלמה (ראו את ההודעה הקודמת)");
    }
    ui_.YieldToEvents();
    ConvertToExcel(csv, postIL_.FilePath, postIL_.OpenExcel == 1, ui_, CompanyFolders(),
                   preflight_.findings);
    lastPostCsv_ = csv;
    lastPostWorkbook_ = postIL_.FilePath;
    ui_.SetStatus(WithCounts("הכנת הקובץ הסתיימה", preflight_));
    return postIL_.FilePath;
  } catch (const std::exception& e) {
    ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return "";
  }
}

bool Control::CmdCheckPostIL() {
  preflight_ = {};
  lastLoad_ = {true, 0};
  try {
    const auto lock = LockWorkFiles();
    if (!ReadAllData(false).databaseUsable) return false;
    ui_.YieldToEvents();
    RunPostILChecks();
    ui_.SetStatus(WithCounts("הבדיקה הסתיימה", preflight_));
    return true;
  } catch (const std::exception& e) {
    preflight_ = {};
    ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return false;
  }
}

bool Control::OpenPostILFindings() {
  if (lastPostWorkbook_.empty() || preflight_.findings.empty()) return false;
  try {
    const auto lock = LockWorkFiles();  // the dispatch file is read again from the temp folder
    ConvertToExcel(lastPostCsv_, lastPostWorkbook_, true, ui_, CompanyFolders(),
                   preflight_.findings, true);
    return true;
  } catch (const std::exception& e) {
    ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return false;
  }
}

}  // namespace zdr
