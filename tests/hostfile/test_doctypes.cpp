// The document-type table by its shape and the rules the importers rely on, not row by row:
// a type code names one kind, its range names the host file, and only the cash receipts
// are not a stock document.
#include "hostfile/doctypes.h"

#include <gtest/gtest.h>

#include <set>
#include <stdexcept>
#include <string>

namespace zdr {
namespace {

// The host files by the range of the type code: 1..19 IMV, 20..29 ISHP, 30..39 IORDR,
// 40..49 IBD; the receipts and the all-invoices entry stand apart.
std::string FileOfCode(int code) {
  if (code == 101) return "ICASH2.FIX";
  if (code < 20 || code == 102) return "IMV.FIX";
  if (code < 30) return "ISHP.FIX";
  if (code < 40) return "IORDR.FIX";
  return "IBD.FIX";
}

TEST(DocTypeTableTest, FilledRowsThenEmptyOnes) {
  const DocTypeTable t;
  const auto combo = DocTypeComboNames(t);
  std::set<int> codes;
  std::set<std::string> names;
  int previous = 0;
  for (int i = 0; i < kDocTypeRows; ++i) {
    SCOPED_TRACE(i);
    const DocTypeDef& r = t.Row(i);
    if (i >= kDocTypesFilled) {
      EXPECT_EQ(r.DocCode, 0);
      EXPECT_TRUE(r.HebName.empty() && r.EngName.empty());
      EXPECT_EQ(t.FileOfRow(i), "");
      EXPECT_FALSE(r.IsStockDoc);
      continue;
    }
    EXPECT_GT(r.DocCode, previous);  // ascending, so each code names one kind
    previous = r.DocCode;
    EXPECT_EQ(t.FileOfRow(i), FileOfCode(r.DocCode));
    EXPECT_EQ(r.IsStockDoc, r.DocCode != 101);
    EXPECT_FALSE(r.EngName.empty());
    EXPECT_TRUE(names.insert(r.HebName).second) << r.HebName;
    EXPECT_EQ(combo[i], r.HebName);
  }
  EXPECT_LT(previous, 256);                      // the header stores the type in one byte
  EXPECT_EQ(t.Row(0).HebName, "חשבונית מס");     // the combo's first entry
  EXPECT_EQ(t.Row(2).HebName, "חשבונית  סוכן");  // with its two blanks
  EXPECT_EQ(t.Row(kCashReceiptsRow).DocCode, 101);
  EXPECT_EQ(t.Row(kAllSalesInvoicesRow).DocCode, 102);
  for (int i : {-1, kDocTypeRows}) EXPECT_THROW(t.Row(i), std::out_of_range) << i;
  for (int i : {-1, 6}) EXPECT_THROW(t.FileName(i), std::out_of_range) << i;
  EXPECT_EQ(t.FileName(0), "");
}

}  // namespace
}  // namespace zdr
