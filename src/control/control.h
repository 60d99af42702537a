// The control: everything the panel's commands share for the control's whole life, and the
// commands themselves, free of widgets. The Qt panel (MainCard), the command line and the
// tests each own one Control and talk to the person through a UserSeam.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "control/panel.h"
#include "control/userseam.h"
#include "import/doctypes.h"
#include "output/outputdefs.h"

namespace zdr {

class SettingsStore;

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
  // A failing step is skipped and the next one runs.
  void Initialize();

  // CmdDef: saves the panel to the store, ignoring errors.
  void CmdDef();

  // The data load every output runs first.
  void ReadAllData(bool pAsIs);

  // The three output commands. Each returns the path of the file it produced, or an empty
  // string when it failed (the failure has been shown through the seam).
  std::string CmdLabPrev();
  std::string CmdPreview();
  std::string CmdBuildPostIL();

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
  SettingsStore& store() { return store_; }
  UserSeam& ui() { return ui_; }

 private:
  SettingsStore& store_;
  UserSeam& ui_;
  Panel panel_;
  ControlState state_;
  DocTypeTable docTypes_;
  LabelSettings labels_;
  PostILSettings postIL_;
};

}  // namespace zdr
