#include "control/dataload.h"

#include <cstdint>
#include <stdexcept>

#include "import/importers.h"
#include "select/select.h"
#include "workdb/schema.h"

namespace zdr {

void ReadAllData(bool pAsIs, Panel& panel, ControlState& state, const DocTypeTable& docTypes,
                 UserSeam& ui) {
  ui.SetStatus(kStatusInitDb);
  // An empty path is stored as it is; the importers then report that they cannot open it.
  state.workDbPath = CreateWorkDB(state.selectDbPath, ui);
  const std::string& dbFile = state.workDbPath;

  ui.SetStatus(kStatusAccounts);
  ReadACT(state.companyPath, dbFile, true, pAsIs, panel, ui);

  if (Panel::On(panel.ChkDates) && panel.cmbDocType >= 0) {
    if (panel.cmbDocType == kCashReceiptsRow) {
      ui.SetStatus(kStatusCash);
      ReadCash(state.companyPath, dbFile, pAsIs, panel, ui);
    } else {
      ui.SetStatus(kStatusDocuments);
      if (panel.cmbDocType > UINT8_MAX) {
        throw std::out_of_range("סוג המסמך " + std::to_string(panel.cmbDocType) +
                                " אינו בטבלת סוגי המסמכים");
      }
      const bool byItems = Panel::On(panel.ChkByItems);
      ReadStock(1, state.companyPath, panel.TxtFromDate, panel.TxtToDate, dbFile,
                static_cast<uint8_t>(panel.cmbDocType), byItems, pAsIs, panel, docTypes, ui);
      if (byItems) {
        ui.SetStatus(kStatusItems);
        ReadItem(state.companyPath, dbFile, panel, ui);
      }
    }
  }

  if (UseTransactions(panel)) {
    ui.SetStatus(kStatusLedger);
    ReadTransactions(state.companyPath, dbFile, pAsIs, panel, ui);
    if (Panel::On(panel.chkReadTempTrans)) {
      ui.SetStatus(kStatusBatches);
      ReadAllTempTrans(state.companyPath, dbFile, pAsIs, panel, ui);
    }
  }

  ui.SetStatus(kStatusLoaded);
}

}  // namespace zdr
