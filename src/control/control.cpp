#include "control/control.h"

#include <exception>

#include "control/settings.h"
#include "import/importers.h"
#include "workdb/schema.h"
#include "workdb/worklock.h"

namespace zdr {

Control::Control(SettingsStore& store, UserSeam& ui) : store_(store), ui_(ui) {}

Control::~Control() = default;

std::vector<SettingsValueError> Control::Initialize() {
  std::vector<SettingsValueError> refused;
  // Every step may fail on its own; the panel always comes up.
  try {
    state_.companyPath = store_.Get(kSettingsApp, "Params", "ConnDataBase", DefaultConnDataBase());
  } catch (const std::exception&) {
  }
  // The document types are built with the control; InitCmbDocType selects the first entry.
  panel_.cmbDocType = 0;
  try {
    SetGetRegParams(2, store_, panel_);
  } catch (const SettingsValueError& e) {
    refused.push_back(e);  // the keys from this one on keep their designed values
  } catch (const std::exception&) {
  }
  try {
    SetGetRegLabelDefs(2, store_, labels_);
  } catch (const std::exception&) {
  }
  try {
    for (SettingsValueError& e : SetGetRegPostILDefs(2, store_, postIL_)) refused.push_back(e);
  } catch (const std::exception&) {
  }
  try {
    SetGetRegLabelPdf(2, store_, labelPdf_);
  } catch (const std::exception&) {
  }
  state_.selectDbPath.clear();
  return refused;
}

void Control::CmdDef() {
  try {
    SetGetRegParams(1, store_, panel_);
  } catch (const std::exception&) {
  }
}

std::string Control::PrepareAccountPicker() {
  const bool scan = state_.selectDbPath.empty() || ui_.AskYesNo("לסרוק מחדש את רשימת הכרטיסים?",
                                                                kTitleAttention, MsgIcon::Question);
  if (scan) {
    // zdracc.DB is shared by every run of this temporary folder: rebuilt under the lock.
    try {
      const auto lock = LockWorkFiles();
      state_.selectDbPath = CreateSelectDB(ui_);
      ui_.SetStatus("קורא רשימת כרטיסים");
      ReadACT(state_.companyPath, state_.selectDbPath, false, false, panel_, ui_);
    } catch (const WorkFilesLockError& e) {
      ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    }
  }
  state_.pickerSortIndex = static_cast<int16_t>(panel_.CmbSortBy);
  return state_.selectDbPath;
}

}  // namespace zdr
