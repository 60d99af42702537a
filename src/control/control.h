// The control: everything the panel's commands share for the control's whole life, and the
// commands themselves, free of widgets. The Qt panel (MainCard), the command line and the
// tests each own one Control and talk to the person through a UserSeam.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "common/panel.h"
#include "common/userseam.h"
#include "control/settings.h"
#include "engine/engine.h"
#include "hostfile/doctypes.h"
#include "output/outputdefs.h"
#include "output/preflight.h"
#include "output/targetfile.h"

namespace zdr {

// What a data load did. Each step that could not do all it should (the database creation, an
// importer, one batch file) has shown its own message and counts here; callers decide from
// this, never from the messages shown.
struct LoadResult {
  // False when the load ended because the working database could not be created or a failed
  // step broke it (a full disk): that step's message is the last, and no output follows.
  bool databaseUsable = false;
  int failures = 0;
  bool Complete() const { return failures == 0; }
};

// State the control keeps for its lifetime.
struct ControlState {
  std::string companyPath;   // folder of the host files of one company, no trailing separator
  std::string workDbPath;    // zdrlab.DB of the last data load; empty until then
  std::string selectDbPath;  // zdracc.DB; empty until the account picker's first scan
  int16_t pickerSortIndex = 0;
};

class Control {
 public:
  // `store` and `ui` must outlive the control.
  Control(SettingsStore& store, UserSeam& ui);
  ~Control();

  // Start-up: the company path, the document types, the panel, the label appearance and
  // the dispatch settings from the store; clears the account-selection database path.
  // A failing step is skipped and the next one runs. Returns the stored values the panel
  // and the dispatch settings refused, in order (RefusedSettingsMessage words them): the
  // panel's load stopped at its first; a dispatch setting keeps its default. Shows nothing.
  std::vector<SettingsValueError> Initialize();

  // CmdDef: saves the panel to the store, ignoring errors.
  void CmdDef();

  // The data load every output runs first; its result is also kept as lastLoad().
  LoadResult ReadAllData(bool pAsIs);

  // The data load of the last command; a command that loads nothing (or has not run) leaves
  // a complete one. The command line's exit code reads it.
  const LoadResult& lastLoad() const { return lastLoad_; }

  // The three output commands. Each returns the path of the file it produced, or an empty
  // string when it failed (the failure has been shown through the seam).
  // CmdLabPrev gives the HTML sheet, or the PDF on stock (zdrlab1.pdf in the temporary
  // folder) when the label settings ask for it.
  std::string CmdLabPrev();
  std::string CmdPreview();
  // The dispatch command checks the recipient rows before it writes them (RunPreflight),
  // puts the findings on the workbook's sheet "בדיקה" and their counts in the status line.
  // With `strict`, an error finding stops it before the dispatch file and the workbook are
  // written; it then returns "" with the counts in the status line and nothing shown.
  std::string CmdBuildPostIL(bool strict = false);

  // The dispatch checks alone: the data load and RunPreflight, no file written, the counts
  // in the status line. Returns false when the load or the checks failed (shown through
  // the seam); the findings are then those of an empty check.
  bool CmdCheckPostIL();

  // The checks of the last dispatch command or check.
  const PreflightResult& lastPreflight() const { return preflight_; }

  // Writes the workbook of the last dispatch command again, opening on its findings sheet,
  // and hands it to the spreadsheet program. Returns false when there is no such workbook
  // or it failed (shown through the seam).
  bool OpenPostILFindings();

  // The label sheet as PDF at `path` on the stock named `stockId` (empty: the one the
  // settings keep), moved by `offset` (nothing: the stock's own offset, else the user's).
  // The finished file goes to the desktop's viewer. Returns `path`, or an empty string on
  // failure (shown through the seam).
  std::string CmdLabPdf(const std::string& path, const std::string& stockId = "",
                        std::optional<StockOffset> offset = std::nullopt);

  // The calibration page of a stock, as CmdLabPdf chooses stock and offset. Reads no data.
  std::string CmdCalibrate(const std::string& path, const std::string& stockId = "",
                           std::optional<StockOffset> offset = std::nullopt);

  // The account picker flow up to showing the picker: asks whether to rescan when the
  // accounts were scanned before, scans when needed, and records the picker sort index.
  // Returns the account-selection database path the picker should show.
  std::string PrepareAccountPicker();

  Panel& panel() { return panel_; }
  const Panel& panel() const { return panel_; }
  ControlState& state() { return state_; }
  const DocTypeTable& docTypes() const { return docTypes_; }
  LabelSettings& labelSettings() { return labels_; }
  PostILSettings& postILSettings() { return postIL_; }
  LabelPdfSettings& labelPdfSettings() { return labelPdf_; }
  SettingsStore& store() { return store_; }
  UserSeam& ui() { return ui_; }

 private:
  // The company folders no output may be written into: the one in use and the one the
  // settings keep.
  std::vector<std::string> CompanyFolders();
  // Checks a target with CheckOutputTarget; a refusal is shown under "שגיאה" and returns true.
  bool TargetRefused(const std::string& path, TargetKind kind);

  // The recipients through RunPreflight into preflight_. Returns them, open, for the
  // dispatch file to read again.
  db::Snapshot RunPostILChecks();

  SettingsStore& store_;
  UserSeam& ui_;
  Panel panel_;
  ControlState state_;
  DocTypeTable docTypes_;
  LabelSettings labels_;
  PostILSettings postIL_;
  PreflightResult preflight_;
  std::string lastPostCsv_, lastPostWorkbook_;  // of the last dispatch command that wrote
  LabelPdfSettings labelPdf_;
  LoadResult lastLoad_{true, 0};
};

}  // namespace zdr
