#include "app/cli.h"

#ifndef _WIN32
#include <sys/resource.h>
#endif

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <map>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "app/consoleseam.h"
#include "control/control.h"
#include "control/settings.h"
#include "qtstore/qtsettings.h"

namespace zdr {
namespace {

const char* const kUsage =
    "שימוש: zdrlab labels|list|post [--company DIR] [--settings FILE] [--set NAME=VALUE]... "
    "[--open] [--times]\n"
    "       zdrlab post [--check] [--strict] ...\n"
    "       zdrlab labels --pdf FILE [--template ID] [--offset X,Y] [--scale X,Y] [...]\n"
    "       zdrlab calibrate --pdf FILE [--template ID] [--offset X,Y] [--scale X,Y] "
    "[--settings FILE]\n"
    "  labels     דף המדבקות zdrlab1.htm; עם --pdf, המדבקות כ-PDF על תבנית המדבקות ID\n"
    "             (בלי --template: התבנית השמורה בהגדרות, בהתחלה a4-3x8-70x37; או תבנית\n"
    "             מהקטלוג לפי יצרן ומק\"ט, \"Avery L7160\"), בהיסט X,Y מ\"מ ובקנה מידה X,Y\n"
    "             פרומיל (במקום התיקון השמור; חלק שלא ניתן הוא 0)\n"
    "  calibrate  דף כיול של תבנית מדבקות, כ-PDF\n"
    "  list       רשימת הכתובות zdrlab2.htm\n"
    "  post       קובץ הדואר zdpost1.csv וגיליון העבודה שלו (FilePath), עם ממצאי הבדיקה\n"
    "             בגיליון \"בדיקה\"\n"
    "  --check    post: רק בדיקת השורות; הממצאים נכתבים לפלט התקני כ-CSV\n"
    "  --strict   post: כל ממצא מסוג שגיאה מסתיים בקוד יציאה 3, ושום קובץ אינו נכתב\n"
    "  --times    בסוף הריצה: שניות השעון והמעבד שבהן הגיעה כל שורת מצב\n"
    "  ערך של אפשרות אפשר לתת גם אחרי סימן שוויון: --set=NAME=VALUE\n"
    "הקבצים נכתבים לתיקייה ש-Temp מציין (אחרת לתיקייה הזמנית של המערכת).\n"
    "NAME הוא מפתח של הסעיף Params או PostIL של ההגדרות, או אחד מ-txtFromRef, txtToRef, "
    "ChkByItems, txtFromItmKey, txtToItmKey, txtFromItmSort, txtToItmSort, txtStartFrom.\n";

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

// The commands, as bits of an option's mask.
enum Command : unsigned { kLabels = 1, kList = 2, kPost = 4, kCalibrate = 8 };
constexpr unsigned kAll = kLabels | kList | kPost | kCalibrate;

constexpr std::pair<std::string_view, Command> kCommands[] = {
    {"labels", kLabels}, {"list", kList}, {"post", kPost}, {"calibrate", kCalibrate}};

// What an option takes after it.
enum class Takes {
  kNothing,
  kValue,
  kFileName,  // a file or folder: a word that is itself an option is not taken as one
};

struct OptionDef {
  std::string_view name;
  Takes takes;
  unsigned commands;  // the commands it belongs to
};

constexpr OptionDef kOptions[] = {
    {"--company", Takes::kFileName, kAll},
    {"--settings", Takes::kFileName, kAll},
    {"--set", Takes::kValue, kAll},
    {"--open", Takes::kNothing, kAll},
    {"--times", Takes::kNothing, kAll},
    {"--check", Takes::kNothing, kPost},
    {"--strict", Takes::kNothing, kPost},
    {"--pdf", Takes::kFileName, kLabels | kCalibrate},
    {"--template", Takes::kValue, kLabels | kCalibrate},
    {"--offset", Takes::kValue, kLabels | kCalibrate},
    {"--scale", Takes::kValue, kLabels | kCalibrate},
};

std::optional<Command> CommandOf(std::string_view word) {
  for (const auto& [name, command] : kCommands) {
    if (word == name) return command;
  }
  return std::nullopt;
}

// Wrong usage: what was wrong, in Hebrew.
class UsageError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// The options of one run, as given.
struct Options {
  std::map<std::string_view, std::string> values;               // the last value of each option
  std::vector<std::pair<const SettingDef*, std::string>> sets;  // --set, in order
  bool Has(std::string_view name) const { return values.count(name) != 0; }
  std::optional<std::string> Value(std::string_view name) const {
    const auto it = values.find(name);
    return it == values.end() ? std::nullopt : std::optional(it->second);
  }
};

// NAME=VALUE of --set, checked against the table of values before anything runs.
std::pair<const SettingDef*, std::string> ParseSet(const std::string& kv) {
  const auto eq = kv.find('=');
  if (eq == std::string::npos || eq == 0) {
    throw UsageError("--set מקבל NAME=VALUE, ולא \"" + kv + "\"");
  }
  const std::string name = kv.substr(0, eq), value = kv.substr(eq + 1);
  const SettingDef* def = FindSetting(name);
  if (def == nullptr) throw UsageError("הגדרה לא מוכרת: " + name);
  Panel panel;
  PostILSettings postIL;
  std::string path;
  try {
    ApplySetting(*def, value, {panel, postIL, path});
  } catch (const SettingsValueError& e) {
    throw UsageError(std::string("--set: ") + e.what());
  }
  return {def, value};
}

Options ParseOptions(const std::vector<std::string>& args, Command command) {
  Options options;
  for (size_t i = 1; i < args.size(); ++i) {
    // "--name=value" is "--name value".
    std::string word = args[i];
    std::optional<std::string> inlineValue;
    if (const auto eq = word.find('='); word.starts_with("--") && eq != std::string::npos) {
      inlineValue = word.substr(eq + 1);
      word.resize(eq);
    }
    const OptionDef* def = nullptr;
    for (const OptionDef& o : kOptions) {
      if (o.name == word) def = &o;
    }
    if (def == nullptr) throw UsageError("אפשרות לא מוכרת: " + word);
    if ((def->commands & command) == 0) {
      throw UsageError("האפשרות " + word + " אינה שייכת לפקודה " + args[0]);
    }
    std::string value;
    if (def->takes == Takes::kNothing) {
      if (inlineValue) throw UsageError("האפשרות " + word + " אינה מקבלת ערך");
    } else if (inlineValue) {
      value = *inlineValue;
    } else if (i + 1 < args.size()) {
      value = args[++i];
    } else {
      throw UsageError("חסר ערך לאפשרות " + word);
    }
    if (def->takes == Takes::kFileName) {
      if (value.empty()) throw UsageError("חסר שם של קובץ או תיקייה לאפשרות " + word);
      if (value.starts_with("-")) {
        throw UsageError("חסר שם של קובץ או תיקייה לאפשרות " + word + ": \"" + value +
                         "\" הוא אפשרות ולא שם (שם שמתחיל במקף כותבים ./" + value + ")");
      }
    }
    if (word == "--set") {
      options.sets.push_back(ParseSet(value));
    } else {
      options.values[def->name] = value;
    }
  }
  if (command == kCalibrate && !options.Has("--pdf")) {
    throw UsageError("הפקודה calibrate צריכה --pdf FILE");
  }
  if ((options.Has("--template") || options.Has("--offset") || options.Has("--scale")) &&
      !options.Has("--pdf")) {
    throw UsageError("--template, --offset ו---scale באים עם --pdf FILE");
  }
  if (const auto xy = options.Value("--offset"); xy && !ParseStockOffset(*xy)) {
    throw UsageError("--offset מקבל X,Y במ\"מ, כל אחד בין -10 ל-10 בצעדים של 0.1, ולא " + *xy);
  }
  if (const auto xy = options.Value("--scale"); xy && !ParseStockScale(*xy)) {
    throw UsageError("--scale מקבל X,Y בפרומיל, כל אחד בין -100 ל-100 בצעדים של 0.1, ולא " + *xy);
  }
  return options;
}

}  // namespace

bool IsCliCommand(const std::string& word) {
  return CommandOf(word).has_value();
}

int RunCli(const std::vector<std::string>& args, SettingsStore& defaultStore) {
  const auto usage = [](const std::string& what) {
    if (!what.empty()) std::fprintf(stderr, "zdrlab: %s\n", what.c_str());
    std::fputs(kUsage, stderr);
    return 2;
  };
  const std::optional<Command> command = args.empty() ? std::nullopt : CommandOf(args[0]);
  if (!command) return usage(args.empty() ? "" : "פקודה לא מוכרת: " + args[0]);
  Options options;
  try {
    options = ParseOptions(args, *command);
  } catch (const UsageError& e) {
    return usage(e.what());
  }
  // Wrong usage from here on is about a file or a value, not the words: no synopsis.
  const auto refuse = [](const std::string& what) {
    std::fprintf(stderr, "zdrlab: %s\n", what.c_str());
    return 2;
  };

  const std::optional<std::string> settingsFile = options.Value("--settings");
  if (settingsFile) {
    // A missing or unreadable file would silently give the default criteria.
    if (const std::string problem = SettingsFileProblem(*settingsFile); !problem.empty()) {
      return refuse(problem);
    }
  }
  std::unique_ptr<SettingsStore> fileStore;
  if (settingsFile) fileStore = std::make_unique<QtSettingsStore>(*settingsFile);
  SettingsStore& store = fileStore ? *fileStore : defaultStore;

  const bool times = options.Has("--times");
  StepClock clock;
  TimedConsoleSeam ui(stderr, options.Has("--open"), times ? &clock : nullptr);
  Control control(store, ui);
  // A stored value the panel refuses would drop the criteria after it: the run would choose
  // other recipients than the settings say.
  if (const auto refused = control.Initialize(); !refused.empty()) {
    const std::string where = settingsFile ? *settingsFile : store.Location();
    for (const SettingsValueError& e : refused) refuse("בקובץ ההגדרות " + where + ": " + e.what());
    return 2;
  }
  if (const auto company = options.Value("--company")) control.state().companyPath = *company;
  SettingTargets targets{control.panel(), control.postILSettings(), control.state().companyPath};
  for (const auto& [def, value] : options.sets) ApplySetting(*def, value, targets);

  const std::optional<std::string> pdf = options.Value("--pdf");
  const std::string stockId = options.Value("--template").value_or("");
  std::optional<StockOffset> offset;
  if (const auto xy = options.Value("--offset")) offset = ParseStockOffset(*xy);
  // Given, the offset and the scale replace the kept correction together.
  if (const auto xy = options.Value("--scale")) {
    const StockOffset scale = *ParseStockScale(*xy);
    if (!offset) offset = StockOffset{};
    offset->scaleX = scale.scaleX;
    offset->scaleY = scale.scaleY;
  }
  if (!stockId.empty()) {
    if (const std::string problem = LabelStockChoiceProblem(store, stockId); !problem.empty()) {
      return refuse(problem);
    }
  }

  const bool strict = options.Has("--strict");
  if (options.Has("--check")) {
    if (!control.CmdCheckPostIL() || !control.lastLoad().Complete()) return 1;
    std::cout << FindingsCsv(control.lastPreflight()) << std::flush;
    return strict && control.lastPreflight().errors > 0 ? 3 : 0;
  }

  std::string produced;
  if (*command == kCalibrate) {
    produced = control.CmdCalibrate(*pdf, stockId, offset);
  } else if (*command == kLabels && pdf) {
    produced = control.CmdLabPdf(*pdf, stockId, offset);
  } else if (*command == kLabels) {
    produced = control.CmdLabPrev();
  } else if (*command == kList) {
    produced = control.CmdPreview();
  } else {
    produced = control.CmdBuildPostIL(strict);
    if (produced.empty() && control.lastLoad().Complete() && strict &&
        control.lastPreflight().errors > 0) {
      // Refused: the findings are the only output.
      std::cout << FindingsCsv(control.lastPreflight()) << std::flush;
      return 3;
    }
  }
  if (times) clock.Print(stderr);
  if (produced.empty() || !control.lastLoad().Complete()) return 1;
  std::cout << produced << std::endl;
  return 0;
}

}  // namespace zdr
