// The one seam between the core and the person in front of it.
//
// The core never shows anything itself: message boxes, the yes/no question, the status
// line, the progress bar and the hand-over of a finished file to a browser or spreadsheet
// program all go through a UserSeam. The Qt panel, the command line and the tests each
// implement it (the tests record what was shown and answer questions from a script).
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace zdr {

enum class MsgIcon { Critical, Question, Exclamation, Information };

// Titles used across the system.
inline constexpr std::string_view kTitleFault = "תקלה";
inline constexpr std::string_view kTitleError = "שגיאה";
inline constexpr std::string_view kTitleMessage = "הודעה";
inline constexpr std::string_view kTitleAttention = "שימו לב";

// Width of the progress frame in the core's units. The fill runs from 0 to this width;
// a front end scales it to its own widget.
inline constexpr int kProgressFrameWidth = 3000;

class UserSeam {
 public:
  virtual ~UserSeam() = default;

  // A message box with an OK button. Texts are UTF-8. Returns when the user has seen it.
  virtual void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) = 0;

  // A message box with Yes and No buttons. Returns true for Yes.
  virtual bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) = 0;

  // The status line (LblMessage). The text stays until the next call replaces it.
  virtual void SetStatus(std::string_view text) = 0;

  // The progress bar: the fill's width, 0..kProgressFrameWidth.
  virtual void SetProgress(int fillWidth) = 0;

  // Lets the window repaint between the major steps of a command. No-op by default.
  virtual void YieldToEvents() {}

  // Opens a finished page in a new browser window. Returns false when no browser could be
  // started; the caller reports that.
  virtual bool OpenInBrowser(const std::string& path) = 0;

  // Opens a finished workbook in the desktop's spreadsheet program.
  virtual bool OpenInSpreadsheet(const std::string& path) = 0;
};

// Progress over a loop of `total` steps: reports 0 at construction and at destruction, and
// frame width x done / total in between (rounded), as the long loops of the core do.
class ProgressReporter {
 public:
  ProgressReporter(UserSeam& ui, double total) : ui_(ui), total_(total) { ui_.SetProgress(0); }
  ~ProgressReporter() { ui_.SetProgress(0); }
  ProgressReporter(const ProgressReporter&) = delete;
  ProgressReporter& operator=(const ProgressReporter&) = delete;

  void Update(double done) {
    if (total_ <= 0) return;
    double w = kProgressFrameWidth * done / total_;
    if (w < 0) w = 0;
    if (w > kProgressFrameWidth) w = kProgressFrameWidth;
    ui_.SetProgress(static_cast<int>(w + 0.5));
  }

 private:
  UserSeam& ui_;
  double total_;
};

}  // namespace zdr
