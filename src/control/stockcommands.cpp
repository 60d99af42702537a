// The label sheet on stock as PDF and the stock's calibration page.
#include <exception>
#include <stdexcept>

#include "control/control.h"
#include "control/settings.h"
#include "output/output.h"
#include "output/pdflabels.h"
#include "workdb/worklock.h"

namespace zdr {
namespace {

// The stock and offset a PDF command prints with.
struct StockChoice {
  LabelStock stock;
  StockOffset offset;
};

StockChoice ChooseStock(SettingsStore& store, const LabelPdfSettings& pdf,
                        const std::string& stockId, const std::optional<StockOffset>& offset,
                        UserSeam& ui) {
  const std::string id = stockId.empty() ? pdf.Template : stockId;
  std::optional<LabelStock> stock = FindLabelStock(store, id);
  if (!stock) throw std::runtime_error(LabelStockChoiceProblem(store, id));
  if (IsRetiredStock(stock->id)) {
    ui.SetStatus("תבנית המדבקות " + stock->id +
                 " אינה לפי גיליון מפורסם ואינה מוצעת עוד; היא מודפסת כבעבר. מומלץ לבחור "
                 "תבנית אחרת בהגדרות המדבקה");
  }
  return {*stock, offset ? *offset : EffectiveStockOffset(store, pdf, stock->id)};
}

// The desktop's program for the file's type shows it: for a PDF, the PDF viewer.
void OpenPdf(UserSeam& ui, const std::string& path) {
  if (!ui.OpenInBrowser(path)) throw std::runtime_error("לא ניתן לפתוח את הקובץ " + path);
}

}  // namespace

std::string Control::CmdLabPdf(const std::string& path, const std::string& stockId,
                               std::optional<StockOffset> offset) {
  lastLoad_ = {true, 0};
  if (TargetRefused(path, TargetKind::kPdf)) return "";
  try {
    const StockChoice choice = ChooseStock(store_, labelPdf_, stockId, offset, ui_);
    // The data load rebuilds the temporary folder's working database: no other run may.
    const auto lock = LockWorkFiles();
    if (!ReadAllData(true).databaseUsable) return "";
    ui_.YieldToEvents();
    ui_.SetStatus("מכין רשימה");
    CreateLabPdf(path, state_.workDbPath, panel_, docTypes_, state_.selectDbPath, labels_,
                 choice.stock, choice.offset, ui_);
    OpenPdf(ui_, path);
    ui_.SetStatus("הכנת הרשימה הסתיימה");
    return path;
  } catch (const std::exception& e) {
    ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return "";
  }
}

std::string Control::CmdCalibrate(const std::string& path, const std::string& stockId,
                                  std::optional<StockOffset> offset) {
  lastLoad_ = {true, 0};
  if (TargetRefused(path, TargetKind::kPdf)) return "";
  try {
    const StockChoice choice = ChooseStock(store_, labelPdf_, stockId, offset, ui_);
    CreateCalibrationPdf(path, choice.stock, choice.offset);
    OpenPdf(ui_, path);
    return path;
  } catch (const std::exception& e) {
    ui_.ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
    return "";
  }
}

}  // namespace zdr
