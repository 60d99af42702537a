// The document-type table: which host file holds a kind of document, which type code a
// header must carry, and whether the kind is a stock document or the cash receipts.
#pragma once

#include <array>
#include <cstdint>
#include <string>

namespace zdr {

struct DocTypeDef {
  int16_t DocCode = 0;
  std::string HebName;  // UTF-8
  std::string EngName;
  int16_t FileIndex = 0;  // into DocFiles, 1..5
  bool IsStockDoc = false;
};

inline constexpr int kDocTypeRows = 42;     // indexes 0..41
inline constexpr int kDocTypesFilled = 28;  // rows 0..27
inline constexpr int kCashReceiptsRow = 26;
inline constexpr int kAllSalesInvoicesRow = 27;

class DocTypeTable {
 public:
  // Builds the table (InitDocTypes): the file list and rows 0..27.
  DocTypeTable();

  // The row at `index`; throws std::out_of_range outside 0..41.
  const DocTypeDef& Row(int index) const;
  // The host file name of a file index ("\\IMV.FIX" style, with the leading backslash
  // taken off: "IMV.FIX"); throws std::out_of_range outside 0..5.
  const std::string& FileName(int fileIndex) const;
  // The file of a row.
  const std::string& FileOfRow(int index) const { return FileName(Row(index).FileIndex); }

 private:
  std::array<DocTypeDef, kDocTypeRows> rows_;
  std::array<std::string, 6> files_;
};

// The names cmbDocType lists, rows 0..27 in order (InitCmbDocType appends these).
std::array<std::string, kDocTypesFilled> DocTypeComboNames(const DocTypeTable& table);

}  // namespace zdr
