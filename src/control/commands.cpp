// The three output commands. Each runs the data load, writes its file in the temporary
// folder and hands it to the browser or the spreadsheet program; any failure on the way is
// shown under "תקלה" and ends the command.
#include <exception>
#include <filesystem>
#include <system_error>

#include "control/control.h"
#include "control/dataload.h"
#include "output/output.h"
#include "workdb/engine.h"
#include "workdb/schema.h"

namespace zdr {
namespace {

class CommandError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

std::string TempFile(const char* name) {
  return (TempFolder() / name).string();
}

std::filesystem::path PathFromUtf8(const std::string& s) {
  return std::filesystem::path(std::u8string(s.begin(), s.end()));
}

void OpenPage(UserSeam& ui, const std::string& path) {
  if (!ui.OpenInBrowser(path)) throw CommandError("לא ניתן לפתוח את הדפדפן על הקובץ " + path);
}

}  // namespace

void Control::ReadAllData(bool pAsIs) {
  zdr::ReadAllData(pAsIs, panel_, state_, docTypes_, ui_);
}

// The label sheet and the address list: the data load as-is, then the page in the temporary
// folder, opened in a new browser window.
template <typename WritePage>
static std::string RunPageCommand(Control& control, const char* fileName, WritePage writePage) {
  UserSeam& ui = control.ui();
  try {
    control.ReadAllData(true);
    ui.YieldToEvents();
    ui.SetStatus("מכין רשימה");
    const std::string path = TempFile(fileName);
    writePage(path);
    OpenPage(ui, path);
    ui.SetStatus("הכנת הרשימה הסתיימה");
    return path;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return "";
  }
}

std::string Control::CmdLabPrev() {
  return RunPageCommand(*this, "zdrlab1.htm", [this](const std::string& path) {
    CreateLabFile(path, state_.workDbPath, panel_, docTypes_, state_.selectDbPath, labels_, ui_);
  });
}

std::string Control::CmdPreview() {
  return RunPageCommand(*this, "zdrlab2.htm", [this](const std::string& path) {
    CreateHTML(path, state_.workDbPath, panel_, docTypes_, state_.selectDbPath, ui_);
  });
}

std::string Control::CmdBuildPostIL() {
  try {
    if (postIL_.FilePath.empty()) {
      ui_.ShowMessage("לא הוגדר קובץ פלט", kTitleError, MsgIcon::Critical);
      return "";
    }
    const std::filesystem::path target = PathFromUtf8(postIL_.FilePath);
    std::error_code ec;
    if (std::filesystem::exists(target, ec)) {
      std::filesystem::remove(target, ec);
      if (ec)
        throw CommandError("לא ניתן למחוק את הקובץ הקודם " + postIL_.FilePath + ": " +
                           ec.message());
    }
    ReadAllData(false);
    ui_.YieldToEvents();
    ui_.SetStatus("מכין קובץ");
    const std::string csv = TempFile("zdpost1.csv");
    CreateCSV(csv, state_.workDbPath, postIL_.FileFormat, panel_, docTypes_, state_.selectDbPath,
              postIL_, ui_);
    ui_.YieldToEvents();
    ConvertToExcel(csv, postIL_.FilePath, postIL_.OpenExcel == 1, ui_);
    ui_.SetStatus("הכנת הקובץ הסתיימה");
    return postIL_.FilePath;
  } catch (const std::exception& e) {
    ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return "";
  }
}

}  // namespace zdr
