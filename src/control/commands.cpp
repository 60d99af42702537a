// The three output commands. Each runs the data load, writes its file in the temporary
// folder and hands it to the browser or the spreadsheet program; any failure on the way is
// shown under "תקלה" and ends the command.
#include <exception>
#include <filesystem>
#include <optional>
#include <system_error>

#include "control/control.h"
#include "control/dataload.h"
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

// Passes everything on to the person's seam and notes whether a failure was shown, so that
// a load that went wrong does not replace the user's workbook.
class FailureWatch : public UserSeam {
 public:
  explicit FailureWatch(UserSeam& ui) : ui_(ui) {}
  void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) override {
    if (IsFailureMessage(title, icon)) failed_ = true;
    ui_.ShowMessage(text, title, icon);
  }
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) override {
    return ui_.AskYesNo(text, title, icon);
  }
  void SetStatus(std::string_view text) override { ui_.SetStatus(text); }
  void SetProgress(int fillWidth) override { ui_.SetProgress(fillWidth); }
  void YieldToEvents() override { ui_.YieldToEvents(); }
  bool OpenInBrowser(const std::string& path) override { return ui_.OpenInBrowser(path); }
  bool OpenInSpreadsheet(const std::string& path) override { return ui_.OpenInSpreadsheet(path); }
  bool failed() const { return failed_; }

 private:
  UserSeam& ui_;
  bool failed_ = false;
};

void OpenPage(UserSeam& ui, const std::string& path) {
  if (!ui.OpenInBrowser(path)) throw CommandError("לא ניתן לפתוח את הדפדפן על הקובץ " + path);
}

}  // namespace

void Control::ReadAllData(bool pAsIs) {
  zdr::ReadAllData(pAsIs, panel_, state_, docTypes_, ui_);
}

// The label sheet and the address list: the data load as-is, then the page in the temporary
// folder, opened in a new browser window.
template <typename WritePage>
static std::string RunPageCommand(Control& control, const char* fileName, WritePage writePage) {
  UserSeam& ui = control.ui();
  try {
    const auto lock = LockWorkFiles();
    control.ReadAllData(true);
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
  if (labelPdf_.Output == 1) return CmdLabPdf(TempFile("zdrlab1.pdf"));
  return RunPageCommand(*this, "zdrlab1.htm", [this](const std::string& path) {
    CreateLabFile(path, state_.workDbPath, panel_, docTypes_, state_.selectDbPath, labels_, ui_);
  });
}

std::string Control::CmdPreview() {
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
  preflight_ = RunPreflight(recipients, postIL_.FileFormat, panel_, docTypes_, ui_);
  return recipients;
}

// The dispatch file. The workbook named by FilePath is checked before anything is loaded,
// and replaced only by a complete workbook from a load that reported no failure: until then
// the old file stays as it was.
std::string Control::CmdBuildPostIL(bool strict) {
  preflight_ = {};
  lastPostCsv_.clear();
  lastPostWorkbook_.clear();
  try {
    if (postIL_.FilePath.empty()) {
      ui_.ShowMessage("לא הוגדר קובץ פלט", kTitleError, MsgIcon::Critical);
      return "";
    }
    try {
      CheckWorkbookTarget(postIL_.FilePath, state_.companyPath);
    } catch (const OutputError& e) {
      ui_.ShowMessage(e.what(), kTitleError, MsgIcon::Critical);
      return "";
    }
    const auto lock = LockWorkFiles();
    FailureWatch watch(ui_);
    zdr::ReadAllData(false, panel_, state_, docTypes_, watch);
    ui_.YieldToEvents();
    db::Snapshot recipients = RunPostILChecks();
    if (strict && preflight_.errors > 0) {
      ui_.SetStatus(WithCounts("הקובץ לא נכתב", preflight_));
      return "";
    }
    ui_.SetStatus("מכין קובץ");
    const std::string csv = TempFile("zdpost1.csv");
    CreateCSV(csv, recipients, postIL_.FileFormat, postIL_, watch);
    recipients.Close();
    if (watch.failed()) {
      throw CommandError("הקובץ " + postIL_.FilePath +
                         " לא נכתב מחדש, כי קריאת הנתונים לא הושלמה (ראו את ההודעה הקודמת)");
    }
    ui_.YieldToEvents();
    ConvertToExcel(csv, postIL_.FilePath, postIL_.OpenExcel == 1, ui_, state_.companyPath,
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
  try {
    const auto lock = LockWorkFiles();
    ReadAllData(false);
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
    ConvertToExcel(lastPostCsv_, lastPostWorkbook_, true, ui_, state_.companyPath,
                   preflight_.findings, true);
    return true;
  } catch (const std::exception& e) {
    ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return false;
  }
}

}  // namespace zdr
