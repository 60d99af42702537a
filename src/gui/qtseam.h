// The Qt side of the UserSeam: message boxes, the panel's status line and progress bar,
// and the hand-over of finished files to desktop programs. Message boxes, file choosers
// and the desktop go through small interfaces of their own so that tests can answer them
// without a person.
#pragma once

#include <QFont>
#include <QString>
#include <QStringList>
#include <functional>
#include <string>
#include <string_view>

#include "common/userseam.h"

class QCoreApplication;
class QFileDialog;
class QLabel;
class QProgressBar;
class QWidget;

namespace zdr::gui {

// Shows message boxes. The Qt implementation is a modal QMessageBox, right to left, over
// the window that is active at the time.
class Prompter {
 public:
  virtual ~Prompter() = default;
  virtual void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) = 0;
  // Returns true for Yes.
  virtual bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) = 0;
};

class MessageBoxPrompter : public Prompter {
 public:
  void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) override;
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) override;
};

// Opens a finished file in the desktop's program for it (browser, spreadsheet).
class DesktopOpener {
 public:
  virtual ~DesktopOpener() = default;
  // `path` is UTF-8. Returns false when no program could be started.
  virtual bool OpenPage(const std::string& path) = 0;
  virtual bool OpenWorkbook(const std::string& path) = 0;
};

// QDesktopServices::openUrl on the file's URL.
class SystemDesktopOpener : public DesktopOpener {
 public:
  bool OpenPage(const std::string& path) override;
  bool OpenWorkbook(const std::string& path) override;
};

// The open-file dialog of the settings dialogs.
class FileChooser {
 public:
  virtual ~FileChooser() = default;
  // Shows an open-file dialog offering `filters` (Qt form, "PNG Files (*.png)") with
  // `selectedFilter` (0-based) preselected, starting at `startPath` (may be empty).
  // Returns the chosen path, or an empty string when the user cancelled.
  virtual QString ChooseOpenFile(QWidget* parent, const QString& title, const QStringList& filters,
                                 int selectedFilter, const QString& startPath) = 0;
};

// Qt's own file dialog (not the desktop's), right to left and in Hebrew once the Hebrew
// translations are installed, with its paths shown left to right. The user may type a new
// name: the dialog does not insist on an existing file (the dispatch file's path is chosen
// with it).
class QtFileChooser : public FileChooser {
 public:
  QString ChooseOpenFile(QWidget* parent, const QString& title, const QStringList& filters,
                         int selectedFilter, const QString& startPath) override;
};

// Sets up `dialog` as QtFileChooser shows it (the window with its pictures uses it too).
void PrepareFileDialog(QFileDialog& dialog, const QStringList& filters, int selectedFilter);

// A filter list in the common dialog's form, "Name (*.x)|*.x|Name2 (*.y)|*.y", as the
// list of its names for a Qt file dialog.
QStringList FilterListToQt(std::string_view pipeSeparated);

QString ToQ(std::string_view utf8);
std::string FromQ(const QString& text);

// The user-interface font: one family that holds Hebrew and Latin letters and digits alike
// (Culmus Simple, else DejaVu Sans), so that Latin text next to Hebrew is never drawn in a
// fallback font of another size.
QFont HebrewUiFont();
// Right to left with the Hebrew font, for the panel and every dialog.
void ApplyHebrewLook(QWidget& widget);
// A box that holds a path: paths are left-to-right text, so their separators stay in place
// inside a right-to-left dialog.
void ShowAsPath(QWidget& box);

// Makes Hebrew the application's language: Qt's own texts (standard dialogs, the text
// boxes' context menus) from the Qt translations installed with the system, and the
// Hebrew locale. Returns false when the translations are not installed; Qt's texts then
// stay in English.
bool InstallHebrewTranslations(QCoreApplication& app);

// The seam the panel hands to its Control. `status`, `progress`, `prompter` and `opener`
// must outlive it. The progress bar's range is 0..kProgressFrameWidth.
class QtSeam : public UserSeam {
 public:
  QtSeam(QLabel& status, QProgressBar& progress, Prompter& prompter, DesktopOpener& opener);

  void ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) override;
  bool AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) override;
  void SetStatus(std::string_view text) override;
  void SetProgress(int fillWidth) override;
  // Lets the window repaint (QCoreApplication::processEvents).
  void YieldToEvents() override;
  bool OpenInBrowser(const std::string& path) override;
  bool OpenInSpreadsheet(const std::string& path) override;

  // Called with every status text after it is shown (for a log or a test).
  void SetStatusObserver(std::function<void(const QString&)> observer) {
    statusObserver_ = std::move(observer);
  }

 private:
  QLabel& status_;
  QProgressBar& progress_;
  Prompter& prompter_;
  DesktopOpener& opener_;
  std::function<void(const QString&)> statusObserver_;
};

}  // namespace zdr::gui
