#include "control/consoleseam.h"

#include <cstdlib>
#include <string>

#ifdef _WIN32
#include <io.h>
#define ZDR_ISATTY _isatty
#define ZDR_FILENO _fileno
#else
#include <unistd.h>
#define ZDR_ISATTY isatty
#define ZDR_FILENO fileno
#endif

namespace zdr {
namespace {

const char* IconWord(MsgIcon icon) {
  switch (icon) {
    case MsgIcon::Critical:
      return "!!";
    case MsgIcon::Question:
      return "??";
    case MsgIcon::Exclamation:
      return "!";
    case MsgIcon::Information:
      return "i";
  }
  return "";
}

std::string ShellQuote(const std::string& s) {
  std::string q = "'";
  for (char c : s) {
    if (c == '\'')
      q += "'\\''";
    else
      q += c;
  }
  return q + "'";
}

}  // namespace

ConsoleSeam::ConsoleSeam(std::FILE* err, bool openFiles)
    : err_(err), openFiles_(openFiles), tty_(ZDR_ISATTY(ZDR_FILENO(err)) != 0) {}

void ConsoleSeam::EndProgressLine() {
  if (progressShown_) {
    std::fputc('\n', err_);
    progressShown_ = false;
  }
  lastPercent_ = -1;
}

void ConsoleSeam::ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) {
  EndProgressLine();
  // A critical box, or a fault or error title (some importers report with the information
  // icon), means the command did not do all it should.
  if (icon == MsgIcon::Critical || title.rfind(kTitleFault, 0) == 0 ||
      title.rfind(kTitleError, 0) == 0)
    ++failures_;
  std::fprintf(err_, "[%s] %.*s: %.*s\n", IconWord(icon), static_cast<int>(title.size()),
               title.data(), static_cast<int>(text.size()), text.data());
  std::fflush(err_);
}

bool ConsoleSeam::AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) {
  EndProgressLine();
  std::fprintf(err_, "[%s] %.*s: %.*s (לא)\n", IconWord(icon), static_cast<int>(title.size()),
               title.data(), static_cast<int>(text.size()), text.data());
  return false;
}

void ConsoleSeam::SetStatus(std::string_view text) {
  EndProgressLine();
  std::fprintf(err_, "%.*s\n", static_cast<int>(text.size()), text.data());
  std::fflush(err_);
}

void ConsoleSeam::SetProgress(int fillWidth) {
  const int percent = fillWidth * 100 / kProgressFrameWidth;
  if (fillWidth == 0) {
    EndProgressLine();
    return;
  }
  // Redraw only when the share moves a whole percent (a terminal) or ten (a log).
  const int step = tty_ ? 1 : 10;
  if (lastPercent_ >= 0 && percent / step == lastPercent_ / step) return;
  lastPercent_ = percent;
  constexpr int kBar = 40;
  const int filled = percent * kBar / 100;
  std::string bar(filled, '#');
  bar.append(kBar - filled, '.');
  if (tty_) {
    std::fprintf(err_, "\r[%s] %3d%%", bar.c_str(), percent);
  } else {
    std::fprintf(err_, "%s[%s] %3d%%", progressShown_ ? "\n" : "", bar.c_str(), percent);
  }
  progressShown_ = true;
  std::fflush(err_);
}

bool ConsoleSeam::OpenInBrowser(const std::string& path) {
  return openFiles_ ? OpenWithDesktop(path) : true;
}

bool ConsoleSeam::OpenInSpreadsheet(const std::string& path) {
  return openFiles_ ? OpenWithDesktop(path) : true;
}

bool OpenWithDesktop(const std::string& path) {
#if defined(_WIN32)
  const std::string cmd = "start \"\" \"" + path + "\"";
#elif defined(__APPLE__)
  const std::string cmd = "open " + ShellQuote(path) + " >/dev/null 2>&1";
#else
  const std::string cmd = "xdg-open " + ShellQuote(path) + " >/dev/null 2>&1 &";
#endif
  return std::system(cmd.c_str()) == 0;
}

}  // namespace zdr
