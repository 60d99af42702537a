#include "app/cli.h"

#ifndef _WIN32
#include <sys/resource.h>
#endif

#include <charconv>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "app/consoleseam.h"
#include "control/control.h"
#include "control/settings.h"
#include "qtstore/qtsettings.h"

namespace zdr {
namespace {

const char* const kUsage =
    "usage: zdrlab labels|list|post [--company DIR] [--settings FILE] [--set NAME=VALUE]... "
    "[--open] [--times]\n"
    "       zdrlab post [--check] [--strict] ...\n"
    "       zdrlab labels --pdf FILE [--template ID] [--offset X,Y] [--scale X,Y] [options as "
    "above]\n"
    "       zdrlab calibrate --pdf FILE [--template ID] [--offset X,Y] [--scale X,Y] [--settings "
    "FILE]\n"
    "  labels  the label sheet zdrlab1.htm; with --pdf, the sheet as PDF on label stock ID\n"
    "          (default: the stock the settings keep, a4-3x8-70x37; or a catalogue stock by\n"
    "          brand and part, \"Avery L7160\"), moved by X,Y mm and grown by X,Y per mille\n"
    "          (given, they replace the kept correction; a part not given is 0)\n"
    "  calibrate  the calibration page of a label stock as PDF\n"
    "  (each option's value may also follow an equals sign: --set=NAME=VALUE)\n"
    "  list    the address list zdrlab2.htm\n"
    "  post    the dispatch file zdpost1.csv and its workbook (FilePath), the rows' findings\n"
    "          on its sheet \"בדיקה\"\n"
    "  --check   post: only check the rows; the findings go to standard output as CSV\n"
    "  --strict  post: any error finding gives exit code 3, and no file is written\n"
    "Files are written in the folder named by Temp (else the system's temporary folder).\n"
    "NAME is a key of section Params or PostIL of the settings, or one of txtFromRef, "
    "txtToRef, ChkByItems, txtFromItmKey, txtToItmKey, txtFromItmSort, txtToItmSort, "
    "txtStartFrom.\n"
    "--times prints, at the end, the wall and processor seconds at which each status line was "
    "reached.\n";

// Wall and processor seconds since the command started, taken at every status line, for the
// whole-process benchmark: it splits a command into the data load and the output this way.
class StepClock {
 public:
  StepClock() : start_(std::chrono::steady_clock::now()) {}
  void Mark(std::string_view step) { steps_.push_back({std::string(step), Wall(), Processor()}); }
  void Print(std::FILE* out) {
    Mark("end");
    for (const Step& s : steps_) {
      std::fprintf(out, "times\t%.3f\t%.3f\t%s\n", s.wall, s.processor, s.name.c_str());
    }
  }

 private:
  struct Step {
    std::string name;
    double wall, processor;
  };
  double Wall() const {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
  }
  // Every thread of the process, user and system time.
  static double Processor() {
#ifdef _WIN32
    return 0;
#else
    rusage r{};
    getrusage(RUSAGE_SELF, &r);
    auto seconds = [](const timeval& t) { return t.tv_sec + t.tv_usec / 1e6; };
    return seconds(r.ru_utime) + seconds(r.ru_stime);
#endif
  }
  std::chrono::steady_clock::time_point start_;
  std::vector<Step> steps_;
};

// The console seam, also marking the clock at every status line.
class TimedConsoleSeam : public ConsoleSeam {
 public:
  TimedConsoleSeam(std::FILE* err, bool openFiles, StepClock* clock)
      : ConsoleSeam(err, openFiles), clock_(clock) {}
  void SetStatus(std::string_view text) override {
    if (clock_ != nullptr) clock_->Mark(text);
    ConsoleSeam::SetStatus(text);
  }

 private:
  StepClock* clock_;
};

// Settings whose control takes only some whole numbers: a value the control could not hold
// is refused here, before anything runs, instead of being dropped or reaching the output.
struct NumberCheck {
  const char* name;
  long low;
  long high;
  const char* allowed;  // shown when a value is refused
};
constexpr NumberCheck kNumberChecks[] = {
    {"FileFormat", 0, 1, "0 (דואר ישראל) או 1 (הובלות עם שחר)"},
    {"OpenExcel", 0, 1, "0 או 1"},
    {"ChkByItems", 0, 2, "0, 1 או 2"},
};

// The value of NAME=VALUE as the control would take it: unchanged for free text, the whole
// number in decimal for a checked setting. Throws std::runtime_error for a refused value.
std::string CheckedValue(const std::string& name, const std::string& value) {
  for (const NumberCheck& check : kNumberChecks) {
    if (name != check.name) continue;
    long number = 0;
    const char* end = value.data() + value.size();
    const auto [at, ec] = std::from_chars(value.data(), end, number);
    if (value.empty() || ec != std::errc() || at != end || number < check.low ||
        number > check.high) {
      throw std::runtime_error(name + ": ערך לא חוקי \"" + value + "\" (" + check.allowed + ")");
    }
    return std::to_string(number);
  }
  return value;
}

// Panel controls whose values the settings store does not keep.
bool SetUnstoredControl(Panel& p, const std::string& name, const std::string& value) {
  if (name == "txtFromRef") {
    p.txtFromRef = value;
  } else if (name == "txtToRef") {
    p.txtToRef = value;
  } else if (name == "ChkByItems") {
    p.ChkByItems = std::stoi(value);  // checked by CheckedValue
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

// Why the settings file cannot be used, or "" when it can be read.
std::string SettingsFileProblem(const std::string& file) {
  namespace fs = std::filesystem;
  const fs::path path(std::u8string(file.begin(), file.end()));
  std::error_code ec;
  const fs::file_status st = fs::status(path, ec);
  if (!fs::exists(st)) return "קובץ ההגדרות " + file + " לא נמצא";
  if (fs::is_directory(st)) return "קובץ ההגדרות " + file + " הוא תיקייה ולא קובץ";
  if (!fs::is_regular_file(st)) return "קובץ ההגדרות " + file + " אינו קובץ רגיל";
  std::ifstream in(path, std::ios::binary);
  char probe;
  if (!in || (!in.get(probe) && !in.eof())) return "לא ניתן לקרוא את קובץ ההגדרות " + file;
  return "";
}

// Applies NAME=VALUE through the store's own routines: the current values are saved into a
// scratch store, the one key is replaced there, and everything is loaded back, so a value
// takes exactly the checks and conversions a stored one would.
void ApplySet(Control& control, const std::string& name, const std::string& typed) {
  const std::string value = CheckedValue(name, typed);
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
  return word == "labels" || word == "list" || word == "post" || word == "calibrate";
}

int RunCli(const std::vector<std::string>& args, SettingsStore& defaultStore) {
  if (args.empty() || !IsCliCommand(args[0])) {
    std::fputs(kUsage, stderr);
    return 2;
  }
  const std::string command = args[0];
  std::optional<std::string> company, settingsFile;
  std::vector<std::pair<std::string, std::string>> sets;
  bool open = false, check = false, strict = false, times = false;
  std::optional<std::string> pdf, stockId;
  std::optional<StockOffset> offset, scale;
  for (size_t i = 1; i < args.size(); ++i) {
    // "--name=value" is "--name value".
    std::string a = args[i];
    std::optional<std::string> inlineValue;
    if (const auto eq = a.find('='); a.rfind("--", 0) == 0 && eq != std::string::npos) {
      inlineValue = a.substr(eq + 1);
      a.resize(eq);
    }
    auto needValue = [&](const char* opt) -> std::string {
      if (inlineValue) return *inlineValue;
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
        const std::string kv = needValue("--set");
        const auto eq = kv.find('=');
        if (eq == std::string::npos || eq == 0)
          throw std::invalid_argument("--set takes NAME=VALUE, not " + kv);
        sets.emplace_back(kv.substr(0, eq), kv.substr(eq + 1));
      } else if (a == "--open" && !inlineValue) {
        open = true;
      } else if ((a == "--check" || a == "--strict") && command == "post" && !inlineValue) {
        (a == "--check" ? check : strict) = true;
      } else if (a == "--pdf" && (command == "labels" || command == "calibrate")) {
        pdf = needValue("--pdf");
        if (pdf->empty()) throw std::invalid_argument("--pdf needs a file name");
      } else if (a == "--template" && (command == "labels" || command == "calibrate")) {
        stockId = needValue("--template");
      } else if (a == "--offset" && (command == "labels" || command == "calibrate")) {
        const std::string& xy = needValue("--offset");
        offset = ParseStockOffset(xy);
        if (!offset)
          throw std::invalid_argument(
              "--offset takes X,Y in mm, each -10 to 10 in steps of 0.1, not " + xy);
      } else if (a == "--scale" && (command == "labels" || command == "calibrate")) {
        const std::string& xy = needValue("--scale");
        scale = ParseStockScale(xy);
        if (!scale)
          throw std::invalid_argument(
              "--scale takes X,Y per mille, each -100 to 100 in steps of 0.1, not " + xy);
      } else if (a == "--times" && !inlineValue) {
        times = true;
      } else {
        throw std::invalid_argument("unknown option " + a);
      }
    } catch (const std::invalid_argument& e) {
      std::fprintf(stderr, "zdrlab: %s\n%s", e.what(), kUsage);
      return 2;
    }
  }

  if (settingsFile) {
    // A missing or unreadable file would silently give the default criteria.
    if (const std::string problem = SettingsFileProblem(*settingsFile); !problem.empty()) {
      std::fprintf(stderr, "zdrlab: %s\n", problem.c_str());
      return 2;
    }
  }
  if (command == "calibrate" && !pdf) {
    std::fprintf(stderr, "zdrlab: calibrate needs --pdf FILE\n%s", kUsage);
    return 2;
  }
  if ((stockId || offset || scale) && !pdf) {
    std::fprintf(stderr, "zdrlab: --template, --offset and --scale go with --pdf FILE\n%s", kUsage);
    return 2;
  }

  std::unique_ptr<SettingsStore> fileStore;
  if (settingsFile) fileStore = std::make_unique<QtSettingsStore>(*settingsFile);
  SettingsStore& store = fileStore ? *fileStore : defaultStore;

  StepClock clock;
  TimedConsoleSeam ui(stderr, open, times ? &clock : nullptr);
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

  if (check) {
    if (!control.CmdCheckPostIL() || ui.failures() > 0) return 1;
    std::cout << FindingsCsv(control.lastPreflight()) << std::flush;
    return strict && control.lastPreflight().errors > 0 ? 3 : 0;
  }
  if (stockId && !FindLabelStock(store, *stockId)) {
    // The shipped and the user's stocks are named; the catalogue's are too many to list.
    std::string known;
    for (const LabelStock& s : AvailableLabelStocks(store)) known += " " + s.id;
    std::fprintf(stderr, "zdrlab: %s. התבניות:%s, ותבניות הקטלוג לפי יצרן ומק\"ט\n",
                 LabelStockLookupProblem(store, *stockId).c_str(), known.c_str());
    return 2;
  }
  if (scale) {
    if (!offset) offset = StockOffset{};
    offset->scaleX = scale->scaleX;
    offset->scaleY = scale->scaleY;
  }

  std::string produced;
  if (command == "calibrate") {
    produced = control.CmdCalibrate(*pdf, stockId.value_or(""), offset);
  } else if (command == "labels" && pdf) {
    produced = control.CmdLabPdf(*pdf, stockId.value_or(""), offset);
  } else if (command == "labels") {
    produced = control.CmdLabPrev();
  } else if (command == "list") {
    produced = control.CmdPreview();
  } else {
    produced = control.CmdBuildPostIL(strict);
    if (produced.empty() && ui.failures() == 0 && strict && control.lastPreflight().errors > 0) {
      // Refused: the findings are the only output.
      std::cout << FindingsCsv(control.lastPreflight()) << std::flush;
      return 3;
    }
  }
  if (times) clock.Print(stderr);
  if (produced.empty() || ui.failures() > 0) return 1;
  std::cout << produced << std::endl;
  return 0;
}

}  // namespace zdr
