#include "app/consoleseam.h"

#include <chrono>
#include <string>
#include <thread>

#ifdef _WIN32
#include <io.h>
#include <shellapi.h>
#include <windows.h>
#define ZDR_ISATTY _isatty
#define ZDR_FILENO _fileno
#else
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>
#define ZDR_ISATTY isatty
#define ZDR_FILENO fileno
extern char** environ;
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
#ifdef _WIN32
  const INT_PTR rc = reinterpret_cast<INT_PTR>(
      ShellExecuteA(nullptr, "open", path.c_str(), nullptr, nullptr, SW_SHOWNORMAL));
  return rc > 32;
#else
#ifdef __APPLE__
  const char* opener = "open";
#else
  const char* opener = "xdg-open";
#endif
  // Started directly, not through a shell, so that a missing opener is seen. Its standard
  // output is not ours: the command line prints the produced path there.
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  std::string file = path;
  char* argv[] = {const_cast<char*>(opener), file.data(), nullptr};
  pid_t pid = 0;
  const int spawned = posix_spawnp(&pid, opener, &actions, nullptr, argv, environ);
  posix_spawn_file_actions_destroy(&actions);
  if (spawned != 0) return false;
  // The opener hands the file to the program for its type and ends; when it cannot, its exit
  // status says so. One still running after a while (some desktops wait for the program to
  // close) has started it.
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
  while (std::chrono::steady_clock::now() < deadline) {
    int status = 0;
    const pid_t done = ::waitpid(pid, &status, WNOHANG);
    if (done == pid) return WIFEXITED(status) && WEXITSTATUS(status) == 0;
    if (done < 0) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
  std::thread([pid] {
    int status = 0;
    ::waitpid(pid, &status, 0);
  }).detach();
  return true;
#endif
}

}  // namespace zdr
