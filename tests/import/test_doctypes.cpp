#include "import/doctypes.h"

#include <gtest/gtest.h>

#include <set>
#include <stdexcept>
#include <string>

namespace zdr {
namespace {

struct ExpectedRow {
  int16_t code;
  const char* heb;
  const char* eng;
  int16_t file;
};

// The table as the host's users know it, row by row.
const ExpectedRow kExpected[kDocTypesFilled] = {
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

TEST(DocTypeTableTest, FilledRowsHoldExactlyTheHostsKinds) {
  DocTypeTable t;
  for (int i = 0; i < kDocTypesFilled; ++i) {
    SCOPED_TRACE(i);
    const DocTypeDef& r = t.Row(i);
    EXPECT_EQ(r.DocCode, kExpected[i].code);
    EXPECT_EQ(r.HebName, kExpected[i].heb);
    EXPECT_EQ(r.EngName, kExpected[i].eng);
    EXPECT_EQ(r.FileIndex, kExpected[i].file);
    EXPECT_EQ(r.IsStockDoc, i != kCashReceiptsRow);
  }
}

TEST(DocTypeTableTest, AgentInvoiceNameKeepsItsTwoBlanks) {
  DocTypeTable t;
  EXPECT_EQ(t.Row(2).HebName,
            "\xD7\x97\xD7\xA9\xD7\x91\xD7\x95\xD7\xA0\xD7\x99\xD7\xAA  "
            "\xD7\xA1\xD7\x95\xD7\x9B\xD7\x9F");
}

TEST(DocTypeTableTest, OnlyTheCashReceiptsRowIsNotAStockDocument) {
  DocTypeTable t;
  EXPECT_EQ(kCashReceiptsRow, 26);
  EXPECT_FALSE(t.Row(26).IsStockDoc);
  EXPECT_EQ(t.Row(26).DocCode, 101);
  EXPECT_EQ(t.FileOfRow(26), "ICASH2.FIX");
  EXPECT_EQ(kAllSalesInvoicesRow, 27);
  EXPECT_EQ(t.Row(27).DocCode, 102);
  EXPECT_EQ(t.FileOfRow(27), "IMV.FIX");
}

TEST(DocTypeTableTest, RowsBeyondTheFilledOnesAreEmpty) {
  DocTypeTable t;
  for (int i = kDocTypesFilled; i < kDocTypeRows; ++i) {
    SCOPED_TRACE(i);
    const DocTypeDef& r = t.Row(i);
    EXPECT_EQ(r.DocCode, 0);
    EXPECT_TRUE(r.HebName.empty());
    EXPECT_TRUE(r.EngName.empty());
    EXPECT_EQ(r.FileIndex, 0);
    EXPECT_FALSE(r.IsStockDoc);
    EXPECT_EQ(t.FileOfRow(i), "");
  }
}

TEST(DocTypeTableTest, IndexesOutsideTheTableThrow) {
  DocTypeTable t;
  EXPECT_EQ(kDocTypeRows, 42);
  EXPECT_NO_THROW(t.Row(41));
  EXPECT_THROW(t.Row(42), std::out_of_range);
  EXPECT_THROW(t.Row(-1), std::out_of_range);
  EXPECT_THROW(t.Row(255), std::out_of_range);
}

TEST(DocTypeTableTest, FileListHasFiveHostFilesAndAnUnusedZero) {
  DocTypeTable t;
  EXPECT_EQ(t.FileName(0), "");
  EXPECT_EQ(t.FileName(1), "ISHP.FIX");
  EXPECT_EQ(t.FileName(2), "IORDR.FIX");
  EXPECT_EQ(t.FileName(3), "IMV.FIX");
  EXPECT_EQ(t.FileName(4), "IBD.FIX");
  EXPECT_EQ(t.FileName(5), "ICASH2.FIX");
  EXPECT_THROW(t.FileName(6), std::out_of_range);
  EXPECT_THROW(t.FileName(-1), std::out_of_range);
}

TEST(DocTypeTableTest, TypeCodesAreUniqueSoAHeaderMatchesOneKind) {
  DocTypeTable t;
  std::set<int> codes;
  for (int i = 0; i < kDocTypesFilled; ++i) {
    EXPECT_TRUE(codes.insert(t.Row(i).DocCode).second) << "code repeated in row " << i;
    EXPECT_GE(t.Row(i).FileIndex, 1);
    EXPECT_LE(t.Row(i).FileIndex, 5);
  }
  // The header stores the type in one byte.
  EXPECT_LT(*codes.rbegin(), 256);
}

TEST(DocTypeComboTest, ListsTheHebrewNamesInRowOrder) {
  DocTypeTable t;
  auto names = DocTypeComboNames(t);
  ASSERT_EQ(names.size(), 28u);
  for (int i = 0; i < kDocTypesFilled; ++i) EXPECT_EQ(names[i], kExpected[i].heb) << i;
  // The combo starts on its first entry.
  EXPECT_EQ(names[0], "חשבונית מס");
}

}  // namespace
}  // namespace zdr
