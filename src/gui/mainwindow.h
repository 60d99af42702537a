// The desktop window of the system: a QMainWindow, right to left, holding one MainCard over
// the user's own settings store.
#pragma once

#include <QString>
#include <string>

class QApplication;

namespace zdr::gui {

// Creates the application, opens the window and runs until it is closed; returns the exit
// code. A non-empty `companyOverride` is used as the company path for this run instead of
// the stored one (the stored setting is left as it is).
int RunMainWindow(int& argc, char** argv, const std::string& companyOverride);

// Sets `app` up as the window runs it: its names, right to left, the Hebrew font and Qt's
// own texts in Hebrew.
void SetUpApplication(QApplication& app);

// The window's title.
QString WindowTitle();

}  // namespace zdr::gui
