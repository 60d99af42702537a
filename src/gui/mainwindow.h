// The desktop window of the system: a QMainWindow, right to left, holding one MainCard over
// the user's own settings store.
#pragma once

#include <string>

namespace zdr::gui {

// Creates the application, opens the window and runs until it is closed; returns the exit
// code. A non-empty `companyOverride` is used as the company path for this run instead of
// the stored one (the stored setting is left as it is).
int RunMainWindow(int& argc, char** argv, const std::string& companyOverride);

// Renders the panel and each dialog offscreen into PNG files in `outDir` (created when
// missing): panel.png, frmLogon.png, frmOpenDir.png, frmLabDef.png, frmSelectCard.png,
// frmPostIL.png, and fileChooser.png (the file chooser of the settings dialogs). Uses a settings
// store in memory, so the user's settings are neither read nor changed. A non-empty
// `companyOverride` is the company the panel and the picker show; the company chooser shows the
// folder that holds it. Returns 0 when every file was written.
int RenderScreenshots(int& argc, char** argv, const std::string& outDir,
                      const std::string& companyOverride);

}  // namespace zdr::gui
