// A UserSeam for the command line: status messages, message boxes and a progress bar on
// standard error; questions answered No (the command line asks nothing); files handed to
// the desktop's programs only when asked to open them.
#pragma once

#include <cstdio>
#include <string>

#include "common/userseam.h"

namespace zdr {

class ConsoleSeam : public UserSeam {
 public:
  // `err` receives everything shown; `openFiles` hands finished files to the desktop.
  explicit ConsoleSeam(std::FILE* err = stderr, bool openFiles = false);

  void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) override;
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) override;
  void SetStatus(std::string_view text) override;
  void SetProgress(int fillWidth) override;
  bool OpenInBrowser(const std::string& path) override;
  bool OpenInSpreadsheet(const std::string& path) override;

 private:
  void EndProgressLine();

  std::FILE* err_;
  bool openFiles_;
  bool tty_;
  int lastPercent_ = -1;
  bool progressShown_ = false;
};

// Hands a file to the desktop's program for its type (xdg-open, open, or the shell's open
// verb on Windows), started directly. Returns false when the opener cannot be started or
// reports that it could not open the file.
bool OpenWithDesktop(const std::string& path);

}  // namespace zdr
