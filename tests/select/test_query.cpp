// The column list, the ORDER BY clause and the statement as the outputs assemble it.

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

#include "import/doctypes.h"
#include "select/select.h"
#include "workdb/jetsql.h"

namespace zdr {
namespace {

constexpr const char* kAccountColumns =
    "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey, tAccount.AccountName, "
    "tAccount.Address, tAccount.City, tAccount.Zip, 1000 As Reference1, '0' As DetailsLine1, "
    "tAccount.District, tAccount.Details, tAccount.Telephone, tAccount.SortByKey, "
    "tAccount.SortByKeyVal, tAccount.SortByName, tAccount.SortByCity, tAccount.SortByZip";
constexpr const char* kDocumentColumns =
    "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey, tStockHead.CustomerName As "
    "AccountName, tStockHead.Address1 As Address, tStockHead.Address2 As City, '' As Zip, "
    "tStockHead.Reference1, tStockHead.DetailsLine1, tAccount.District, tAccount.Details, "
    "tAccount.Telephone, tAccount.SortByKey, tAccount.SortByKeyVal, tStockHead.SortByName, "
    "tStockHead.SortByCity, tStockHead.SortByZip";

class QueryTest : public ::testing::Test {
 protected:
  std::string Select(bool& useDocs) { return BuildSelect(panel_, docTypes_, 0, useDocs); }
  std::string OrderBy(bool useDocs) { return BuildOrderBy(panel_, docTypes_, useDocs); }
  Panel panel_;
  DocTypeTable docTypes_;
};

TEST_F(QueryTest, WithoutDocumentsTheAccountVariantFromAccountsAlone) {
  for (int addressFrom : {0, 1, -1}) {
    panel_.cmbAddressFrom = addressFrom;
    bool useDocs = false;
    EXPECT_EQ(Select(useDocs), std::string(kAccountColumns) + " FROM tAccount");
    EXPECT_FALSE(useDocs);
  }
}

TEST_F(QueryTest, DocumentsWithAddressFromHeaderGiveTheDocumentVariant) {
  panel_.cmbDocType = 13;
  panel_.cmbAddressFrom = 0;
  bool useDocs = true;
  EXPECT_EQ(Select(useDocs), std::string(kDocumentColumns) + " FROM tAccount, tStockHead");
  EXPECT_TRUE(useDocs);
}

TEST_F(QueryTest, DocumentsWithAddressFromAccountStillJoinHeaders) {
  panel_.cmbDocType = 0;
  for (int addressFrom : {1, -1, 5}) {
    panel_.cmbAddressFrom = addressFrom;
    bool useDocs = true;
    EXPECT_EQ(Select(useDocs), std::string(kAccountColumns) + " FROM tAccount, tStockHead");
  }
}

TEST_F(QueryTest, CashReceiptsResetUseDocsForTheCaller) {
  panel_.cmbDocType = kCashReceiptsRow;
  bool useDocs = true;
  EXPECT_EQ(Select(useDocs), std::string(kAccountColumns) + " FROM tAccount");
  EXPECT_FALSE(useDocs);

  useDocs = true;
  EXPECT_EQ(BuildOrderBy(panel_, docTypes_, useDocs), " ORDER BY tAccount.SortByKey ASC");
  EXPECT_FALSE(useDocs);
}

TEST_F(QueryTest, SelectIgnoresTheIndexArgument) {
  panel_.cmbDocType = 0;
  bool useDocs = true;
  EXPECT_EQ(BuildSelect(panel_, docTypes_, kCashReceiptsRow, useDocs),
            std::string(kDocumentColumns) + " FROM tAccount, tStockHead");
  EXPECT_TRUE(useDocs);
}

TEST_F(QueryTest, DocumentTypeOutsideTheTableThrows) {
  for (int row : {-1, 42}) {
    panel_.cmbDocType = row;
    for (bool initial : {true, false}) {
      bool useDocs = initial;
      EXPECT_THROW(Select(useDocs), std::out_of_range) << row;
      useDocs = initial;
      EXPECT_THROW(BuildOrderBy(panel_, docTypes_, useDocs), std::out_of_range) << row;
    }
    EXPECT_THROW(BuildRecipientsStatement(panel_, docTypes_, ""), std::out_of_range);
  }
}

struct SortCase {
  int sortBy;
  const char* accountOrder;   // direction "ASC"
  const char* documentOrder;  // documents used, address from the header
};

class SortByTest : public QueryTest, public ::testing::WithParamInterface<SortCase> {};

TEST_P(SortByTest, FirstColumnDirectionAndSecondColumn) {
  const SortCase& c = GetParam();
  panel_.CmbSortBy = c.sortBy;
  panel_.CmbSortDir = 0;
  panel_.cmbDocType = 0;
  panel_.cmbAddressFrom = 0;
  EXPECT_EQ(OrderBy(false), c.accountOrder);
  EXPECT_EQ(OrderBy(true), c.documentOrder);
  // Documents with the address from the account card order like the account variant.
  panel_.cmbAddressFrom = 1;
  EXPECT_EQ(OrderBy(true), c.accountOrder);
}

INSTANTIATE_TEST_SUITE_P(
    EverySortEntry, SortByTest,
    ::testing::Values(
        SortCase{0, " ORDER BY tAccount.SortByKey ASC", " ORDER BY tAccount.SortByKey ASC"},
        SortCase{1, " ORDER BY tAccount.SortByName ASC", " ORDER BY tStockHead.SortByName ASC"},
        SortCase{2, " ORDER BY tAccount.SortByCity ASC, tAccount.SortByName",
                 " ORDER BY tStockHead.SortByCity ASC, tStockHead.SortByName"},
        SortCase{3, " ORDER BY tAccount.SortByZip ASC, tAccount.SortByName",
                 " ORDER BY tStockHead.SortByZip ASC, tStockHead.SortByName"},
        SortCase{4, " ORDER BY tAccount.Telephone ASC, tAccount.SortByName",
                 " ORDER BY tAccount.Telephone ASC,tStockHead.SortByName"},
        SortCase{5, " ORDER BY tAccount.CategoryCode ASC, tAccount.SortByName",
                 " ORDER BY tAccount.CategoryCode ASC,tStockHead.SortByName"},
        SortCase{6, " ORDER BY tAccount.SortByKeyVal ASC", " ORDER BY tAccount.SortByKeyVal ASC"},
        SortCase{7, " ORDER BY tAccount.CategoryCode ASC, tAccount.SortByName",
                 " ORDER BY tStockHead.Reference1 ASC,tStockHead.SortByName"},
        SortCase{8, " ORDER BY tAccount.SortByName ASC", " ORDER BY tStockHead.SortByName ASC"},
        SortCase{-1, " ORDER BY tAccount.SortByName ASC", " ORDER BY tStockHead.SortByName ASC"}));

TEST_F(QueryTest, DirectionAppliesToTheFirstColumnOnly) {
  panel_.CmbSortBy = 2;
  panel_.CmbSortDir = 1;
  EXPECT_EQ(OrderBy(false), " ORDER BY tAccount.SortByCity DESC, tAccount.SortByName");
  panel_.CmbSortBy = 0;
  panel_.CmbSortDir = 0;
  EXPECT_EQ(OrderBy(false), " ORDER BY tAccount.SortByKey ASC");
}

TEST_F(QueryTest, NoDirectionLeavesTheTrailingBlank) {
  panel_.CmbSortBy = 0;
  for (int dir : {-1, 2}) {
    panel_.CmbSortDir = dir;
    EXPECT_EQ(OrderBy(false), " ORDER BY tAccount.SortByKey ");
  }
  panel_.CmbSortBy = 4;
  panel_.CmbSortDir = -1;
  EXPECT_EQ(OrderBy(true), " ORDER BY tAccount.Telephone ,tStockHead.SortByName");
}

TEST_F(QueryTest, SortByDocumentNumberWithoutDocumentsUsesSortCode) {
  panel_.CmbSortBy = 7;
  panel_.CmbSortDir = 1;
  EXPECT_EQ(OrderBy(false), " ORDER BY tAccount.CategoryCode DESC, tAccount.SortByName");
}

// The whole statement: pUseDocs is computed afresh for each piece, so the cash-receipt
// reset in the column list does not take the tCash test out of the WHERE clause.
class StatementTest : public QueryTest {
 protected:
  std::string Pieces(bool useDocs, bool notIssued) {
    bool forSelect = useDocs;
    std::string sql =
        BuildSelect(panel_, docTypes_, static_cast<int16_t>(panel_.cmbDocType), forSelect);
    sql += BuildCriteria(panel_, docTypes_, selectDb_, useDocs, notIssued);
    bool forOrder = useDocs;
    return sql + BuildOrderBy(panel_, docTypes_, forOrder);
  }
  std::string selectDb_;
};

TEST_F(StatementTest, NoDocumentsIsSelectCriteriaOrderBy) {
  panel_.ChkCity = 1;
  panel_.TxtCity = "חי";
  panel_.CmbSortBy = 2;
  panel_.CmbSortDir = 1;
  const std::string sql = BuildRecipientsStatement(panel_, docTypes_, selectDb_);
  EXPECT_EQ(sql, Pieces(false, false));
  EXPECT_EQ(sql, std::string(kAccountColumns) +
                     " FROM tAccount Where (1 > 0) AND tAccount.City LIKE \"חי*\""
                     " ORDER BY tAccount.SortByCity DESC, tAccount.SortByName");
}

TEST_F(StatementTest, IssuedStockDocumentsFromTheHeader) {
  panel_.ChkDates = 1;
  panel_.cmbByDoc = 0;
  panel_.cmbDocType = 13;
  panel_.CmbSortBy = 4;
  const std::string sql = BuildRecipientsStatement(panel_, docTypes_, selectDb_);
  EXPECT_EQ(sql, Pieces(true, false));
  EXPECT_EQ(sql, std::string(kDocumentColumns) +
                     " FROM tAccount, tStockHead Where (1 > 0) AND tStockHead.Include AND "
                     "tAccount.AccountKey = tStockHead.AccountKey ORDER BY tAccount.Telephone "
                     "ASC,tStockHead.SortByName");
}

TEST_F(StatementTest, IssuedCashReceiptsKeepTheCashTest) {
  panel_.ChkDates = 1;
  panel_.cmbByDoc = 0;
  panel_.cmbDocType = kCashReceiptsRow;
  const std::string sql = BuildRecipientsStatement(panel_, docTypes_, selectDb_);
  EXPECT_EQ(sql, Pieces(true, false));
  EXPECT_EQ(sql, std::string(kAccountColumns) +
                     " FROM tAccount Where (1 > 0) AND tAccount.AccountKey In (Select Distinct "
                     "AccountKey From tCash) ORDER BY tAccount.SortByKey ASC");
}

TEST_F(StatementTest, NotIssuedAndHandPicked) {
  panel_.ChkDates = 1;
  panel_.cmbByDoc = 1;
  panel_.ChkSelectAccount = 1;
  selectDb_ = "/tmp/zdracc.DB";
  const std::string sql = BuildRecipientsStatement(panel_, docTypes_, selectDb_);
  EXPECT_EQ(sql, Pieces(false, true));
  EXPECT_NE(sql.find(" FROM tAccount Where"), std::string::npos);
  EXPECT_NE(sql.find("Not In (Select Distinct AccountKey From tStockHead"), std::string::npos);
  EXPECT_NE(sql.find("SortByKey In (Select SA.SortByKey"), std::string::npos);
}

TEST_F(StatementTest, DocumentsOffIgnoresByDocAndDocType) {
  panel_.ChkDates = 2;  // greyed counts as off
  panel_.cmbByDoc = 1;
  panel_.cmbDocType = 5;
  EXPECT_EQ(BuildRecipientsStatement(panel_, docTypes_, selectDb_),
            std::string(kAccountColumns) +
                " FROM tAccount Where (1 > 0) ORDER BY "
                "tAccount.SortByKey ASC");
}

}  // namespace
}  // namespace zdr

namespace zdr {
namespace {

TEST(StatementTranslationTest, EveryVariantIsAcceptedByTheTranslator) {
  const DocTypeTable docTypes;
  for (int docType : {0, 13, kCashReceiptsRow, 27}) {
    for (int byDoc : {0, 1, -1}) {
      for (int addressFrom : {0, 1}) {
        for (int sortBy = -1; sortBy <= 8; ++sortBy) {
          for (int sortDir : {-1, 0, 1}) {
            Panel panel;
            panel.ChkDates = 1;
            panel.cmbDocType = docType;
            panel.cmbByDoc = byDoc;
            panel.cmbAddressFrom = addressFrom;
            panel.CmbSortBy = sortBy;
            panel.CmbSortDir = sortDir;
            panel.ChkCity = 1;
            panel.TxtCity = "חי\"פה";
            panel.ChkSelectAccount = 1;
            panel.ChkJournal = 1;
            panel.txtFromJournal = "1";
            const std::string sql = BuildRecipientsStatement(panel, docTypes, "zdracc.DB");
            EXPECT_NO_THROW(db::TranslateJetSql(sql)) << sql;
          }
        }
      }
    }
  }
}

}  // namespace
}  // namespace zdr
