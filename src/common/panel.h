// The values of the main panel's controls, by the controls' own names.
//
// Plain data: the Qt panel fills it from its widgets and writes it back, the command line
// and the tests build it directly. Text boxes hold their text (UTF-8, as typed), check boxes
// their value (0 off, 1 on, 2 greyed: a box counts as on only when its value is 1), combo
// boxes their list index (-1 when no entry is chosen). The default values are the panel's
// designed values, which are also the settings store's defaults.
#pragma once

#include <array>
#include <string>
#include <string_view>

namespace zdr {

struct Panel {
  // Accounts (read while importing accounts).
  int ChkAccKey = 0;
  std::string TxtFromCrd, TxtToCrd;
  int ChkCatCode = 0;
  std::string txtFromSort, txtToSort;
  int chkCutOff = 0;
  std::array<std::string, 5> CutOff{"", "*", "*", "*", "*"};  // indexes 1..4; 0 unused
  int ChkAgent = 0;
  std::string txtAgent, txtToAgent;

  // Decided when the recipients are selected.
  int ChkCity = 0;
  std::string TxtCity;
  int ChkPhone = 0;
  std::string txtPhone;
  int ChkSelectAccount = 0;
  int cmbInAccounts = 0;  // 0 "מופיע בבחירה", 1 "לא מופיע בבחירה"

  // Documents.
  int ChkDates = 0;
  int cmbDocType = 0;  // a row of the document-type table; 26 is cash receipts
  int cmbByDoc = 0;    // 0 "הופק", 1 "לא הופק"
  std::string TxtFromDate = "01/01/1980", TxtToDate = "01/01/2025";
  std::string txtFromRef, txtToRef;
  int ChkByItems = 0;
  std::string txtFromItmKey, txtToItmKey, txtFromItmSort, txtToItmSort;

  // Ledger.
  int ChkJournal = 0;
  std::string txtFromJournal, txtToJournal;
  int chkTransType = 0;
  std::string txtTransType;
  int chkTransDates = 0;
  std::string txtFromTransDate = "01/01/1980", txtToTransDate = "01/01/2025";
  int chkTransVDate = 0;
  std::string txtFromTransVDate = "01/01/1980", txtToTransVDate = "01/01/2025";
  int chkReadTempTrans = 0;

  // Order and layout.
  int CmbSortBy = 0;       // 0..7
  int CmbSortDir = 0;      // 0 "עולה", 1 "יורד"
  int cmbAddressFrom = 0;  // 0 "כותרת המסמך", 1 "כרטיס החשבון"
  std::string txtRows = "8", txtCols = "3", txtCopies = "1";
  std::string txtStartFrom = "1";
  std::array<int, 9> ChkTitle{};
  std::array<int, 2> ChkLogo{};

  static bool On(int checkValue) { return checkValue == 1; }
};

// Characters the user can type into a text box; 0 means no limit. For the widgets.
int TextBoxMaxLength(std::string_view controlName);

// The entries of the panel's fixed combo boxes, in list order (the document types come
// from the document-type table).
inline constexpr std::array<std::string_view, 2> kInAccountsEntries{"מופיע בבחירה",
                                                                    "לא מופיע בבחירה"};
inline constexpr std::array<std::string_view, 2> kByDocEntries{"הופק", "לא הופק"};
inline constexpr std::array<std::string_view, 8> kSortByEntries{
    "מפתח כרטיס", "שם כרטיס", "עיר", "מיקוד", "טלפון", "קוד מיון", "כרטיס ספרתי", "מספר מסמך"};
inline constexpr std::array<std::string_view, 2> kSortDirEntries{"עולה", "יורד"};
inline constexpr std::array<std::string_view, 2> kAddressFromEntries{"כותרת המסמך", "כרטיס החשבון"};

}  // namespace zdr
