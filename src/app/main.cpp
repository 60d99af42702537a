// zdrlab: with a command, the command line; with none, the window that hosts the panel.
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "app/cli.h"
#include "qtstore/qtsettings.h"

#ifdef ZDR_WITH_GUI
#include "gui/mainwindow.h"
#endif

namespace {

// True when the window could not be shown: on X11 or Wayland with neither display named.
// Qt would abort the process; the user gets a message instead.
[[maybe_unused]] bool NoDisplay() {
#if defined(_WIN32) || defined(__APPLE__)
  return false;
#else
  const auto set = [](const char* name) {
    const char* v = std::getenv(name);
    return v != nullptr && *v != '\0';
  };
  const char* platform = std::getenv("QT_QPA_PLATFORM");
  const std::string_view p = platform != nullptr ? platform : "";
  const bool needsDisplay = p.empty() || p.starts_with("xcb") || p.starts_with("wayland");
  return needsDisplay && !set("DISPLAY") && !set("WAYLAND_DISPLAY");
#endif
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> args(argv + 1, argv + argc);
  if (!args.empty() && zdr::IsCliCommand(args[0])) {
    zdr::QtSettingsStore store;
    return zdr::RunCli(args, store);
  }
  std::string company;
  for (size_t i = 0; i < args.size(); ++i) {
    if (args[i] == "--help" || args[i] == "-h") {
      zdr::QtSettingsStore store;
      zdr::RunCli({}, store);
      std::fputs("בלי פקודה zdrlab פותח את החלון שלו: zdrlab [--company DIR]\n", stderr);
      return 0;
    }
    if (args[i] == "--company" && i + 1 < args.size()) {
      company = args[++i];
    } else {
      std::fprintf(stderr, "zdrlab: %s: %s (ראו zdrlab --help)\n",
                   args[i].starts_with("-") ? "אפשרות לא מוכרת" : "פקודה לא מוכרת",
                   args[i].c_str());
      return 2;
    }
  }
#ifdef ZDR_WITH_GUI
  if (NoDisplay()) {
    std::fputs(
        "zdrlab: אין תצוגה גרפית לפתיחת החלון (DISPLAY אינו מוגדר).\n"
        "בלי חלון יש לתת פקודה: zdrlab labels|list|post ... (ראו zdrlab --help)\n",
        stderr);
    return 1;
  }
  return zdr::gui::RunMainWindow(argc, argv, company);
#else
  std::fputs("zdrlab נבנה בלי החלון שלו; יש לתת פקודה (labels, list, post, calibrate).\n", stderr);
  return 2;
#endif
}
