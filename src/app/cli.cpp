#include "app/cli.h"

#include <cstdio>
#include <iostream>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "control/consoleseam.h"
#include "control/control.h"
#include "control/qtsettings.h"
#include "control/settings.h"

namespace zdr {
namespace {

const char* const kUsage =
    "usage: zdrlab labels|list|post [--company DIR] [--settings FILE] [--set NAME=VALUE]... "
    "[--open]\n"
    "  labels  the label sheet zdrlab1.htm\n"
    "  list    the address list zdrlab2.htm\n"
    "  post    the dispatch file zdpost1.csv and its workbook (FilePath)\n"
    "Files are written in the folder named by Temp (else the system's temporary folder).\n"
    "NAME is a key of section Params or PostIL of the settings, or one of txtFromRef, "
    "txtToRef, ChkByItems, txtFromItmKey, txtToItmKey, txtFromItmSort, txtToItmSort, "
    "txtStartFrom.\n";

// Panel controls whose values the settings store does not keep.
bool SetUnstoredControl(Panel& p, const std::string& name, const std::string& value) {
  if (name == "txtFromRef") {
    p.txtFromRef = value;
  } else if (name == "txtToRef") {
    p.txtToRef = value;
  } else if (name == "ChkByItems") {
    if (value != "0" && value != "1" && value != "2")
      throw std::runtime_error("ChkByItems: ערך לא חוקי \"" + value + "\" (0, 1 או 2)");
    p.ChkByItems = value[0] - '0';
  } else if (name == "txtFromItmKey") {
    p.txtFromItmKey = value;
  } else if (name == "txtToItmKey") {
    p.txtToItmKey = value;
  } else if (name == "txtFromItmSort") {
    p.txtFromItmSort = value;
  } else if (name == "txtToItmSort") {
    p.txtToItmSort = value;
  } else if (name == "txtStartFrom") {
    p.txtStartFrom = value;
  } else {
    return false;
  }
  return true;
}

// Applies NAME=VALUE through the store's own routines: the current values are saved into a
// scratch store, the one key is replaced there, and everything is loaded back, so a value
// takes exactly the checks and conversions a stored one would.
void ApplySet(Control& control, const std::string& name, const std::string& value) {
  if (SetUnstoredControl(control.panel(), name, value)) return;
  if (name == "ConnDataBase") {
    control.state().companyPath = value;
    return;
  }
  MemorySettingsStore scratch;
  SetGetRegParams(1, scratch, control.panel());
  if (scratch.Has(kSettingsApp, "Params", name)) {
    scratch.Save(kSettingsApp, "Params", name, value);
    SetGetRegParams(2, scratch, control.panel());
    return;
  }
  SetGetRegPostILDefs(1, scratch, control.postILSettings());
  if (scratch.Has(kSettingsApp, "PostIL", name)) {
    PostILSettings checked = control.postILSettings();
    scratch.Save(kSettingsApp, "PostIL", name, value);
    SetGetRegPostILDefs(2, scratch, checked);
    control.postILSettings() = checked;
    return;
  }
  throw std::runtime_error("הגדרה לא מוכרת: " + name);
}

}  // namespace

bool IsCliCommand(const std::string& word) {
  return word == "labels" || word == "list" || word == "post";
}

int RunCli(const std::vector<std::string>& args, SettingsStore& defaultStore) {
  if (args.empty() || !IsCliCommand(args[0])) {
    std::fputs(kUsage, stderr);
    return 2;
  }
  const std::string command = args[0];
  std::optional<std::string> company, settingsFile;
  std::vector<std::pair<std::string, std::string>> sets;
  bool open = false;
  for (size_t i = 1; i < args.size(); ++i) {
    const std::string& a = args[i];
    auto needValue = [&](const char* opt) -> const std::string& {
      if (i + 1 >= args.size()) {
        throw std::invalid_argument(std::string(opt) + " needs a value");
      }
      return args[++i];
    };
    try {
      if (a == "--company") {
        company = needValue("--company");
      } else if (a == "--settings") {
        settingsFile = needValue("--settings");
      } else if (a == "--set") {
        const std::string& kv = needValue("--set");
        const auto eq = kv.find('=');
        if (eq == std::string::npos || eq == 0)
          throw std::invalid_argument("--set takes NAME=VALUE, not " + kv);
        sets.emplace_back(kv.substr(0, eq), kv.substr(eq + 1));
      } else if (a == "--open") {
        open = true;
      } else {
        throw std::invalid_argument("unknown option " + a);
      }
    } catch (const std::invalid_argument& e) {
      std::fprintf(stderr, "zdrlab: %s\n%s", e.what(), kUsage);
      return 2;
    }
  }

  std::unique_ptr<SettingsStore> fileStore;
  if (settingsFile) fileStore = std::make_unique<QtSettingsStore>(*settingsFile);
  SettingsStore& store = fileStore ? *fileStore : defaultStore;

  ConsoleSeam ui(stderr, open);
  Control control(store, ui);
  control.Initialize();
  if (company) control.state().companyPath = *company;
  for (const auto& [name, value] : sets) {
    try {
      ApplySet(control, name, value);
    } catch (const std::exception& e) {
      ui.ShowMessage(e.what(), kTitleError, MsgIcon::Critical);
      return 2;
    }
  }

  std::string produced;
  if (command == "labels") {
    produced = control.CmdLabPrev();
  } else if (command == "list") {
    produced = control.CmdPreview();
  } else {
    produced = control.CmdBuildPostIL();
  }
  if (produced.empty() || ui.failures() > 0) return 1;
  std::cout << produced << std::endl;
  return 0;
}

}  // namespace zdr
