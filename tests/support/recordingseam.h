// A UserSeam for tests: records every message box, status line, progress step and file
// handed over, and answers questions as it is told.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "common/userseam.h"

namespace zdr::test {

struct ShownMessage {
  std::string text, title;
  MsgIcon icon;
};

class RecordingSeam : public UserSeam {
 public:
  void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) override {
    messages.push_back({std::string(text), std::string(title), icon});
  }
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) override {
    questions.push_back({std::string(text), std::string(title), icon});
    return answerYes;
  }
  void SetStatus(std::string_view text) override { statuses.emplace_back(text); }
  void SetProgress(int fillWidth) override { progress.push_back(fillWidth); }
  bool OpenInBrowser(const std::string& path) override {
    opened.push_back(path);
    return true;
  }
  bool OpenInSpreadsheet(const std::string& path) override {
    opened.push_back(path);
    return spreadsheetWorks;
  }

  std::vector<ShownMessage> messages;
  std::vector<ShownMessage> questions;
  std::vector<std::string> statuses;
  std::vector<int> progress;
  std::vector<std::string> opened;
  bool answerYes = true;
  bool spreadsheetWorks = true;
};

}  // namespace zdr::test
