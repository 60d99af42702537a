#include "control/dataload.h"

#include <cstdint>
#include <exception>
#include <filesystem>
#include <stdexcept>

#include "engine/engine.h"
#include "import/importers.h"
#include "select/select.h"
#include "workdb/schema.h"

namespace zdr {
namespace {

// Whether the working database still opens. A step that failed on a full disk leaves the
// journal-less working database broken; every later step would only report that again. A
// broken one is removed, which gives the disk its room back.
bool StillUsable(std::string& dbFile) {
  try {
    db::Database::Open(dbFile).Close();
    return true;
  } catch (const std::exception&) {
    std::error_code ec;
    std::filesystem::remove(dbFile, ec);
    dbFile.clear();
    return false;
  }
}

}  // namespace

LoadResult ReadAllData(bool pAsIs, Panel& panel, ControlState& state, const DocTypeTable& docTypes,
                       UserSeam& ui) {
  LoadResult result;
  ui.SetStatus(kStatusInitDb);
  state.workDbPath = CreateWorkDB(state.selectDbPath, ui);
  std::string& dbFile = state.workDbPath;
  result.databaseUsable = !dbFile.empty();
  if (!result.databaseUsable) {
    result.failures = 1;
    return result;
  }
  // Counts a step that failed; false when the load cannot go on.
  const auto goesOn = [&](bool done) {
    if (done) return true;
    ++result.failures;
    result.databaseUsable = StillUsable(dbFile);
    return result.databaseUsable;
  };

  ui.SetStatus(kStatusAccounts);
  if (!goesOn(ReadACT(state.companyPath, dbFile, true, pAsIs, panel, ui))) return result;

  if (Panel::On(panel.ChkDates) && panel.cmbDocType >= 0) {
    if (panel.cmbDocType == kCashReceiptsRow) {
      ui.SetStatus(kStatusCash);
      if (!goesOn(ReadCash(state.companyPath, dbFile, pAsIs, panel, ui) != 0)) return result;
    } else {
      ui.SetStatus(kStatusDocuments);
      if (panel.cmbDocType > UINT8_MAX) {
        throw std::out_of_range("סוג המסמך " + std::to_string(panel.cmbDocType) +
                                " אינו בטבלת סוגי המסמכים");
      }
      const bool byItems = Panel::On(panel.ChkByItems);
      if (!goesOn(ReadStock(1, state.companyPath, panel.TxtFromDate, panel.TxtToDate, dbFile,
                            static_cast<uint8_t>(panel.cmbDocType), byItems, pAsIs, panel, docTypes,
                            ui) != 0)) {
        return result;
      }
      if (byItems) {
        ui.SetStatus(kStatusItems);
        if (!goesOn(ReadItem(state.companyPath, dbFile, panel, ui))) return result;
      }
    }
  }

  if (UseTransactions(panel)) {
    ui.SetStatus(kStatusLedger);
    if (!goesOn(ReadTransactions(state.companyPath, dbFile, pAsIs, panel, ui) != 0)) {
      return result;
    }
    if (Panel::On(panel.chkReadTempTrans)) {
      ui.SetStatus(kStatusBatches);
      const int failed = ReadAllTempTrans(state.companyPath, dbFile, pAsIs, panel, ui);
      result.failures += failed;
      if (failed > 0 && !StillUsable(dbFile)) {
        result.databaseUsable = false;
        return result;
      }
    }
  }

  ui.SetStatus(kStatusLoaded);
  return result;
}

}  // namespace zdr
