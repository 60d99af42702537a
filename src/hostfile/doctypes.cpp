#include "hostfile/doctypes.h"

#include <stdexcept>

namespace zdr {

DocTypeTable::DocTypeTable() {
  files_ = {"", "ISHP.FIX", "IORDR.FIX", "IMV.FIX", "IBD.FIX", "ICASH2.FIX"};
  // A filled row as written here: code, names and file; every one but the cash receipts is a
  // stock document.
  struct DocTypeEntry {
    int16_t code;
    const char* heb;
    const char* eng;
    int16_t file;
  };
  static const DocTypeEntry kEntries[kDocTypesFilled] = {
      {1, "חשבונית מס", "Invoice", 3},
      {2, "חשבונית מס קבלה", "Invoice/Receipt", 3},
      {3, "חשבונית  סוכן", "Agent Invoice", 3},
      {4, "חשבונית ריכוז", "Summary invoice", 3},
      {5, "חשבונית זיכוי", "Credit Invoice", 3},
      {6, "חשבון יצוא", "Export Invoice", 3},
      {7, "חשבונית רכש", "Purchase invoice", 3},
      {9, "כניסה ישירה מיבוא", "Import file", 3},
      {10, "דוח יצור - אבות", "Production report", 3},
      {12, "העברות בין מחסנים - כניסה", "Transfer between warehouses", 3},
      {14, "יתרת פתיחה", "Opening Balance", 3},
      {15, "עדכון בעקבות ספירת מלאי", "Stock Taking Report", 3},
      {19, "יציאה ממחסן ערובה", "Bonded Exit", 3},
      {20, "תעודת משלוח", "Delivery Note", 1},
      {21, "תעודת משלוח סוכן", "Agent Delivery Note", 1},
      {22, "החזרה", "Return Delivery Note", 1},
      {23, "תעודת משלוח רכש", "Purchase Delivery Note", 1},
      {30, "הזמנת לקוח", "Order", 2},
      {31, "הזמנת סוכן", "Agent Order", 2},
      {32, "הזמנת יצוא", "Export Order", 2},
      {33, "חשבונית שריון", "Lay-Bye Invoice", 2},
      {34, "הזמנת רכש", "Purchase Order", 2},
      {35, "הזמנת יבוא", "Import Order", 2},
      {36, "הוראת עבודה", "Job Instructions", 2},
      {40, "הצעת מחיר", "Quotation", 4},
      {41, "הצעת מחיר רכש", "Purchase Quotation", 4},
      {101, "קבלות", "Cash transactions", 5},
      {102, "*חשבוניות מכירה*", "All Invoices", 3},
  };
  for (int i = 0; i < kDocTypesFilled; ++i) {
    const DocTypeEntry& e = kEntries[i];
    rows_[i] = DocTypeDef{e.code, e.heb, e.eng, e.file, true};
  }
  rows_[kCashReceiptsRow].IsStockDoc = false;
}

const DocTypeDef& DocTypeTable::Row(int index) const {
  if (index < 0 || index >= kDocTypeRows) {
    throw std::out_of_range("מספר סוג מסמך מחוץ לתחום: " + std::to_string(index));
  }
  return rows_[index];
}

const std::string& DocTypeTable::FileName(int fileIndex) const {
  if (fileIndex < 0 || fileIndex >= static_cast<int>(files_.size())) {
    throw std::out_of_range("מספר קובץ מסמכים מחוץ לתחום: " + std::to_string(fileIndex));
  }
  return files_[fileIndex];
}

std::array<std::string, kDocTypesFilled> DocTypeComboNames(const DocTypeTable& table) {
  std::array<std::string, kDocTypesFilled> names;
  for (int i = 0; i < kDocTypesFilled; ++i) names[i] = table.Row(i).HebName;
  return names;
}

}  // namespace zdr
