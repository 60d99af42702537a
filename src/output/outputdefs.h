// The label appearance and the dispatch settings, kept in memory by the control.
#pragma once

#include <array>
#include <cstdint>
#include <string>

#include "common/labelstock.h"

namespace zdr {

struct LabelLineDef {
  uint8_t Font = 0;        // 0 "Arial (Hebrew)", 1 "David", 2 "Miriam"
  uint8_t FontSize = 9;    // points
  uint8_t FontWeight = 0;  // 0 Normal, 1 Bolder, 2 Bold
  uint8_t FontUL = 0;      // 1 underline
  uint8_t FontItalic = 0;  // 1 italic
};

struct LabelSettings {
  std::array<LabelLineDef, 9> LabelDefs{};  // 0..7 are the style lines Line0..Line7
  std::array<std::string, 2> LabPics;       // top and bottom picture paths (UTF-8)
};

struct PostILSettings {
  std::string Service, Weight, Confirm, FilePath;  // UTF-8
  int16_t OpenExcel = 0;                           // 1: open the workbook when done
  int16_t FileFormat = 0;  // 0 "דואר ישראל", 1 "הובלות עם שחר"
};

// How the label command prints, and on which stock.
struct LabelPdfSettings {
  std::string Template = std::string(kDefaultStockId);  // a stock id
  StockOffset Offset;                                   // the user's printer offset
  int16_t Output = 0;                                   // 0 the HTML sheet, 1 the PDF on stock
};

inline constexpr std::array<const char*, 2> kFileFormatEntries{"דואר ישראל", "הובלות עם שחר"};

}  // namespace zdr
