// The Jet SQL translator and Jet's LIKE, checked against bare SQLite: every statement the
// system sends must translate and prepare, and the tricky ones must mean what they meant.
#include <sqlite3.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "workdb/engine.h"
#include "workdb/jetsql.h"

namespace zdr::db {
namespace {

// ---------------------------------------------------------------------------------------
// A bare SQLite database with the working tables, Jet's LIKE, and the stored query.

void SqliteLike(sqlite3_context* ctx, int, sqlite3_value** argv) {
  if (sqlite3_value_type(argv[0]) == SQLITE_NULL || sqlite3_value_type(argv[1]) == SQLITE_NULL) {
    sqlite3_result_null(ctx);
    return;
  }
  const char* p = reinterpret_cast<const char*>(sqlite3_value_text(argv[0]));
  const int pn = sqlite3_value_bytes(argv[0]);
  const char* t = reinterpret_cast<const char*>(sqlite3_value_text(argv[1]));
  const int tn = sqlite3_value_bytes(argv[1]);
  sqlite3_result_int(ctx, JetLike({p, size_t(pn)}, {t, size_t(tn)}) ? 1 : 0);
}

class BareDb {
 public:
  BareDb() {
    EXPECT_EQ(sqlite3_open(":memory:", &db_), SQLITE_OK);
    sqlite3_create_function(db_, "like", 2, SQLITE_UTF8 | SQLITE_DETERMINISTIC, nullptr, SqliteLike,
                            nullptr, nullptr);
    Exec(
        "CREATE TABLE tAccount (AccountKey TEXT PRIMARY KEY, AccountName TEXT, CategoryCode "
        "TEXT, CutOff TEXT, Address TEXT, City TEXT, Zip TEXT, District TEXT, Details TEXT, "
        "Telephone TEXT, Include INTEGER, SortByName TEXT, SortByKey TEXT UNIQUE, SortByCity "
        "TEXT, SortByZip TEXT, SortByKeyVal REAL);"
        "CREATE TABLE tStockHead (CompID INTEGER, TavFileID INTEGER, HeadIndx INTEGER, "
        "DocType2 INTEGER, Reference1 INTEGER, AccountKey TEXT, RefDate REAL, DueDate REAL, "
        "CustomerName TEXT, Address1 TEXT, Address2 TEXT, DetailsLine1 TEXT, SortByName TEXT, "
        "SortByCity TEXT, SortByZip TEXT, Include INTEGER, "
        "PRIMARY KEY (CompID, TavFileID, HeadIndx));"
        "CREATE TABLE tStockLine (CompID INTEGER, TavFileID INTEGER, HeadIndx INTEGER, "
        "LineIndx INTEGER, Agent INTEGER, ItemKey TEXT);"
        "CREATE TABLE tTransact (FileID INTEGER, TransID INTEGER, AccountKey TEXT);"
        "CREATE TABLE tCash (TransID INTEGER, AccountKey TEXT);"
        "CREATE TABLE tItem (ItemKey TEXT PRIMARY KEY);"
        "CREATE TABLE tSelectAccount (AccountKey TEXT PRIMARY KEY, SortByKey TEXT UNIQUE, "
        "SortByName TEXT, Include INTEGER);");
    Exec("CREATE VIEW qHeadByItem AS " +
         TranslateJetSql("SELECT tStockLine.CompID, tStockLine.TavFileID, tStockLine.HeadIndx"
                         " FROM tItem INNER JOIN tStockLine ON tItem.ItemKey = tStockLine.ItemKey"
                         " GROUP BY tStockLine.CompID, tStockLine.TavFileID, "
                         "tStockLine.HeadIndx"));
  }
  ~BareDb() { sqlite3_close(db_); }

  void Exec(const std::string& sql) {
    char* err = nullptr;
    const int rc = sqlite3_exec(db_, sql.c_str(), nullptr, nullptr, &err);
    EXPECT_EQ(rc, SQLITE_OK) << sql << "\n" << (err ? err : "");
    sqlite3_free(err);
  }

  // Empty when the statement prepares, else SQLite's message.
  std::string PrepareError(const std::string& sql) {
    sqlite3_stmt* st = nullptr;
    const int rc = sqlite3_prepare_v2(db_, sql.c_str(), -1, &st, nullptr);
    std::string msg = rc == SQLITE_OK ? "" : sqlite3_errmsg(db_);
    sqlite3_finalize(st);
    return msg;
  }

  // Runs a Jet statement and returns its rows, columns joined with '|'.
  std::vector<std::string> Rows(const std::string& jet) {
    const std::string sql = TranslateJetSql(jet);
    sqlite3_stmt* st = nullptr;
    std::vector<std::string> rows;
    if (sqlite3_prepare_v2(db_, sql.c_str(), -1, &st, nullptr) != SQLITE_OK) {
      ADD_FAILURE() << sql << "\n" << sqlite3_errmsg(db_);
      return rows;
    }
    while (sqlite3_step(st) == SQLITE_ROW) {
      std::string row;
      for (int c = 0; c < sqlite3_column_count(st); ++c) {
        if (c) row += '|';
        const unsigned char* v = sqlite3_column_text(st, c);
        row += v ? reinterpret_cast<const char*>(v) : "NULL";
      }
      rows.push_back(row);
    }
    sqlite3_finalize(st);
    return rows;
  }

  void Run(const std::string& jet) { Exec(TranslateJetSql(jet)); }

 private:
  sqlite3* db_ = nullptr;
};

int SyntaxErrorOf(const std::string& jet) {
  try {
    TranslateJetSql(jet);
  } catch (const EngineError& e) {
    return e.number();
  }
  return 0;
}

// ---------------------------------------------------------------------------------------
// The statements the system sends, written out as the builders assemble them.

const char* const kDocColumns =
    "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey"
    ", tStockHead.CustomerName As AccountName, tStockHead.Address1 As Address"
    ", tStockHead.Address2 As City, '' As Zip, tStockHead.Reference1, tStockHead.DetailsLine1"
    ", tAccount.District, tAccount.Details, tAccount.Telephone"
    ", tAccount.SortByKey, tAccount.SortByKeyVal, tStockHead.SortByName"
    ", tStockHead.SortByCity, tStockHead.SortByZip";
const char* const kAccountColumns =
    "SELECT Distinct tAccount.CategoryCode, tAccount.AccountKey, tAccount.AccountName"
    ", tAccount.Address, tAccount.City, tAccount.Zip, 1000 As Reference1, '0' As DetailsLine1"
    ", tAccount.District, tAccount.Details, tAccount.Telephone"
    ", tAccount.SortByKey, tAccount.SortByKeyVal, tAccount.SortByName"
    ", tAccount.SortByCity, tAccount.SortByZip";

const char* const kCriteria[] = {
    "",
    " AND tAccount.City LIKE \"חי*\"",
    " AND tAccount.Telephone LIKE \"04*\"",
    " AND tAccount.SortByKey In (Select SA.SortByKey From tSelectAccount SA Where SA.Include)",
    " AND tAccount.SortByKey Not In (Select SA.SortByKey From tSelectAccount SA Where "
    "SA.Include)",
    " AND tStockHead.Include AND tAccount.AccountKey = tStockHead.AccountKey",
    " AND tAccount.AccountKey In (Select Distinct AccountKey From tCash)",
    " AND tAccount.AccountKey Not In (Select Distinct AccountKey From tStockHead Where "
    "tStockHead.Include)",
    " AND tAccount.AccountKey In (Select Distinct AccountKey From tTransact)",
};

const char* const kAccountOrders[] = {
    " ORDER BY tAccount.SortByKey ASC",
    " ORDER BY tAccount.SortByKey ",
    " ORDER BY tAccount.SortByName DESC",
    " ORDER BY tAccount.SortByCity DESC, tAccount.SortByName",
    " ORDER BY tAccount.SortByZip ASC, tAccount.SortByName",
    " ORDER BY tAccount.Telephone , tAccount.SortByName",
    " ORDER BY tAccount.CategoryCode ASC, tAccount.SortByName",
    " ORDER BY tAccount.SortByKeyVal DESC",
};
const char* const kDocOrders[] = {
    " ORDER BY tAccount.SortByKey ASC",
    " ORDER BY tStockHead.SortByName DESC",
    " ORDER BY tStockHead.SortByCity ASC, tStockHead.SortByName",
    " ORDER BY tStockHead.SortByZip , tStockHead.SortByName",
    " ORDER BY tAccount.Telephone ASC,tStockHead.SortByName",
    " ORDER BY tAccount.CategoryCode DESC,tStockHead.SortByName",
    " ORDER BY tAccount.SortByKeyVal ASC",
    " ORDER BY tStockHead.Reference1 ASC,tStockHead.SortByName",
};

TEST(TranslateStatements, EverySelectionVariantPrepares) {
  BareDb db;
  for (const char* criteria : kCriteria) {
    // The join on tStockHead comes only with tStockHead in the FROM list.
    const bool joinsHeads = std::string(criteria).find("= tStockHead") != std::string::npos;
    for (const char* order : kAccountOrders) {
      for (const char* from : {" FROM tAccount", " FROM tAccount, tStockHead"}) {
        if (joinsHeads && std::string(from) == " FROM tAccount") continue;
        const std::string jet =
            std::string(kAccountColumns) + from + " Where (1 > 0)" + criteria + order;
        const std::string sql = TranslateJetSql(jet);
        EXPECT_EQ(db.PrepareError(sql), "") << jet << "\n" << sql;
      }
    }
    for (const char* order : kDocOrders) {
      const std::string jet = std::string(kDocColumns) + " FROM tAccount, tStockHead" +
                              " Where (1 > 0)" + criteria + order;
      const std::string sql = TranslateJetSql(jet);
      EXPECT_EQ(db.PrepareError(sql), "") << jet << "\n" << sql;
    }
  }
}

TEST(TranslateStatements, PickerStatementsPrepare) {
  BareDb db;
  const char* const statements[] = {
      "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > '' Order By "
      "SortByKey",
      "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > '' And "
      "Include = True Order By SortByName",
      "Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey > '' And "
      "SortByName Like '*ג''ון*' Or Include = True Order By SortByName",
      "Update tSelectAccount Set Include = True Where Include = False",
      "Update tSelectAccount Set Include = False Where Include = True",
  };
  for (const char* jet : statements) {
    const std::string sql = TranslateJetSql(jet);
    EXPECT_EQ(db.PrepareError(sql), "") << jet << "\n" << sql;
  }
}

TEST(TranslateStatements, MarkingStatementsRead) {
  EXPECT_EQ(TranslateJetSql("UPDATE tStockHead SET tStockHead.Include = False"),
            "UPDATE tStockHead SET Include = 0");
  EXPECT_EQ(TranslateJetSql("UPDATE DISTINCTROW tStockHead INNER JOIN qHeadByItem"
                            " ON (tStockHead.CompID = qHeadByItem.CompID)"
                            " AND (tStockHead.TavFileID = qHeadByItem.TavFileID)"
                            " AND (tStockHead.HeadIndx = qHeadByItem.HeadIndx)"
                            " SET tStockHead.Include = True"),
            "UPDATE tStockHead SET Include = -1 WHERE EXISTS (SELECT 1 FROM qHeadByItem WHERE "
            "(tStockHead.CompID = qHeadByItem.CompID) AND (tStockHead.TavFileID = "
            "qHeadByItem.TavFileID) AND (tStockHead.HeadIndx = qHeadByItem.HeadIndx))");
}

TEST(TranslateStatements, JoinedUpdateMarksOnlyHeadersWithChosenItems) {
  BareDb db;
  db.Exec(
      "INSERT INTO tStockHead (CompID, TavFileID, HeadIndx, Include) VALUES "
      "(1,1,10,0),(1,1,11,-1),(1,2,10,-1),(1,2,12,0);"
      "INSERT INTO tStockLine (CompID, TavFileID, HeadIndx, LineIndx, ItemKey) VALUES "
      "(1,1,10,1,'A'),(1,1,10,2,'B'),(1,1,11,3,'C'),(1,2,10,4,'B'),(1,2,12,5,'Z');"
      "INSERT INTO tItem VALUES ('A'),('B');");
  db.Run("UPDATE tStockHead SET tStockHead.Include = False");
  db.Run(
      "UPDATE DISTINCTROW tStockHead INNER JOIN qHeadByItem ON (tStockHead.CompID = "
      "qHeadByItem.CompID) AND (tStockHead.TavFileID = qHeadByItem.TavFileID) AND "
      "(tStockHead.HeadIndx = qHeadByItem.HeadIndx) SET tStockHead.Include = True");
  EXPECT_EQ(db.Rows("SELECT TavFileID, HeadIndx, Include FROM tStockHead ORDER BY TavFileID, "
                    "HeadIndx"),
            (std::vector<std::string>{"1|10|-1", "1|11|0", "2|10|-1", "2|12|0"}));
}

TEST(TranslateStatements, JoinedUpdateReadsTheJoinedRow) {
  BareDb db;
  db.Exec(
      "INSERT INTO tAccount (AccountKey, AccountName, Include) VALUES ('1','a',0),('2','b',0),"
      "('3','c',0);"
      "INSERT INTO tSelectAccount (AccountKey, SortByKey, SortByName, Include) VALUES "
      "('1','1','x',-1),('2','2','y',0);");
  const std::string sql = TranslateJetSql(
      "UPDATE tAccount INNER JOIN tSelectAccount AS S ON tAccount.AccountKey = S.AccountKey "
      "SET tAccount.AccountName = S.SortByName, tAccount.Include = True WHERE S.Include");
  EXPECT_NE(sql.find("(SELECT S.SortByName FROM"), std::string::npos) << sql;
  db.Exec(sql);
  EXPECT_EQ(db.Rows("SELECT AccountKey, AccountName, Include FROM tAccount ORDER BY 1"),
            (std::vector<std::string>{"1|x|-1", "2|b|0", "3|c|0"}));
}

TEST(TranslateStatements, JoinedUpdateWithWhereOnTheUpdatedTable) {
  const std::string sql = TranslateJetSql(
      "UPDATE tStockHead INNER JOIN qHeadByItem ON tStockHead.HeadIndx = qHeadByItem.HeadIndx "
      "SET tStockHead.Include = True WHERE tStockHead.CompID = 1");
  EXPECT_EQ(sql,
            "UPDATE tStockHead SET Include = -1 WHERE EXISTS (SELECT 1 FROM qHeadByItem WHERE "
            "tStockHead.HeadIndx = qHeadByItem.HeadIndx) AND (tStockHead.CompID = 1)");
}

TEST(TranslateStatements, PlainUpdateStripsOnlyItsOwnQualifier) {
  EXPECT_EQ(TranslateJetSql("UPDATE DISTINCTROW tAccount SET tAccount.Include = True, "
                            "tAccount.Zip = \"1\" WHERE tAccount.City = 'x'"),
            "UPDATE tAccount SET Include = -1, Zip = '1' WHERE tAccount.City = 'x'");
  EXPECT_EQ(TranslateJetSql("UPDATE tAccount AS A SET A.Include = False"),
            "UPDATE tAccount AS A SET Include = 0");
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount SET tItem.ItemKey = 'x'"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount INNER JOIN tItem ON tAccount.Zip = tItem.ItemKey "
                          "SET tItem.ItemKey = 'x'"),
            kErrSyntax);
}

TEST(TranslateStatements, UnsupportedUpdatesAreRefused) {
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount SET"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount SET Include"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount SET Include = True WHERE"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount LEFT JOIN tCash ON tAccount.AccountKey = "
                          "tCash.AccountKey SET tAccount.Include = True"),
            kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount INNER JOIN tCash SET tAccount.Include = True"),
            kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("UPDATE tAccount INNER JOIN tCash ON tAccount.AccountKey = "
                          "tCash.AccountKey INNER JOIN tItem ON tItem.ItemKey = tAccount.Zip "
                          "SET tAccount.Include = True"),
            kErrSyntax);
}

TEST(TranslateStatements, DeleteDropsTheJetTargetList) {
  EXPECT_EQ(TranslateJetSql("DELETE tItem.* FROM tItem WHERE ItemKey = \"A\""),
            "DELETE FROM tItem WHERE ItemKey = 'A'");
  EXPECT_EQ(TranslateJetSql("DELETE * FROM tItem"), "DELETE FROM tItem");
  EXPECT_EQ(TranslateJetSql("Delete From tItem"), "DELETE From tItem");
}

// ---------------------------------------------------------------------------------------
// Literals and words

TEST(TranslateLiterals, DoubleQuotedBecomesSingleQuoted) {
  EXPECT_EQ(TranslateJetSql("SELECT * FROM tAccount WHERE City LIKE \"חי*\""),
            "SELECT * FROM tAccount WHERE City LIKE 'חי*'");
  EXPECT_EQ(TranslateJetSql("SELECT \"it's\""), "SELECT 'it''s'");
  EXPECT_EQ(TranslateJetSql("SELECT \"say \"\"hi\"\"\""), "SELECT 'say \"hi\"'");
  EXPECT_EQ(TranslateJetSql("SELECT 'say \"hi\"'"), "SELECT 'say \"hi\"'");
  EXPECT_EQ(TranslateJetSql("SELECT 'ג''ון'"), "SELECT 'ג''ון'");
  EXPECT_EQ(TranslateJetSql("SELECT ''"), "SELECT ''");
  EXPECT_EQ(TranslateJetSql("SELECT \"\""), "SELECT ''");
}

TEST(TranslateLiterals, WordsInsideLiteralsStayLiterals) {
  EXPECT_EQ(TranslateJetSql("SELECT 'True', \"False\", 'Select * From x', '*', 'Error' FROM t"),
            "SELECT 'True', 'False', 'Select * From x', '*', 'Error' FROM t");
  EXPECT_EQ(TranslateJetSql("SELECT 'DISTINCTROW; DROP TABLE x' FROM t"),
            "SELECT 'DISTINCTROW; DROP TABLE x' FROM t");
  BareDb db;
  EXPECT_EQ(db.Rows("SELECT \"a'b\", 'c\"d', \"True\""),
            (std::vector<std::string>{"a'b|c\"d|True"}));
}

TEST(TranslateLiterals, BooleansBecomeMinusOneAndZero) {
  EXPECT_EQ(TranslateJetSql("SELECT * FROM t WHERE Include = True OR x = false"),
            "SELECT * FROM t WHERE Include = -1 OR x = 0");
  // A field that happens to be called True stays a field.
  EXPECT_EQ(TranslateJetSql("SELECT t.True FROM t"), "SELECT t.True FROM t");
  BareDb db;
  // Minus minus must not become a comment.
  EXPECT_EQ(db.Rows("SELECT 1-True, 3--2"), (std::vector<std::string>{"2|5"}));
}

TEST(TranslateLiterals, BareBooleanFieldIsACondition) {
  BareDb db;
  db.Exec("INSERT INTO tSelectAccount VALUES ('1','1','a',-1),('2','2','b',0),('3','3','c',NULL)");
  EXPECT_EQ(db.Rows("Select SA.SortByKey From tSelectAccount SA Where SA.Include"),
            (std::vector<std::string>{"1"}));
  EXPECT_EQ(db.Rows("Select SortByKey From tSelectAccount Where Not Include"),
            (std::vector<std::string>{"2"}));
}

TEST(TranslateLiterals, DistinctRowAndKeywordsInAnyCase) {
  EXPECT_EQ(TranslateJetSql("SELECT DISTINCTROW a FROM t"), "SELECT DISTINCT a FROM t");
  EXPECT_EQ(TranslateJetSql("select distinctrow a from t"), "select DISTINCT a from t");
  EXPECT_EQ(SyntaxErrorOf("SELECT a FROM t WHERE DISTINCTROW"), kErrSyntax);
}

TEST(TranslateLiterals, BracketedNamesAndBangQualifier) {
  EXPECT_EQ(TranslateJetSql("SELECT [Include], tAccount![City] FROM [tAccount]"),
            "SELECT [Include], tAccount.[City] FROM [tAccount]");
  EXPECT_EQ(SyntaxErrorOf("SELECT [Include FROM t"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT [] FROM t"), kErrSyntax);
}

TEST(TranslateLiterals, DateLiteralsBecomeSerials) {
  EXPECT_EQ(TranslateJetSql("SELECT #12/31/1999#"), "SELECT 36525");
  EXPECT_EQ(TranslateJetSql("SELECT #1899-12-30#, #3/1/00#"), "SELECT 0, 36586");
  EXPECT_EQ(SyntaxErrorOf("SELECT #2/30/2001#"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT #12/31/1999 10:00#"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT #12/31/1999"), kErrSyntax);
}

TEST(TranslateLiterals, ModIsTheRemainderOnlyBetweenOperands) {
  EXPECT_EQ(TranslateJetSql("SELECT HeadIndx Mod 2 FROM t"), "SELECT HeadIndx % 2 FROM t");
  EXPECT_EQ(TranslateJetSql("SELECT Mod FROM t"), "SELECT Mod FROM t");
  BareDb db;
  EXPECT_EQ(db.Rows("SELECT 7 MOD 3, (8) mod 5"), (std::vector<std::string>{"1|3"}));
}

TEST(TranslateLiterals, TrailingSemicolonOnlyAtTheEnd) {
  EXPECT_EQ(TranslateJetSql("SELECT a FROM t;  "), "SELECT a FROM t");
  EXPECT_EQ(SyntaxErrorOf("SELECT a FROM t; DROP TABLE t"), kErrSyntax);
}

// ---------------------------------------------------------------------------------------
// Statements that must fail

TEST(TranslateFailures, BrokenInputIsASyntaxError) {
  EXPECT_EQ(SyntaxErrorOf(""), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("   "), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT 'open"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT \"open"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT (a FROM t"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT a) FROM t"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT a & b FROM t"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT a FROM t WHERE b = ?"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT TOP 5 a FROM t"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("DROP TABLE tAccount"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf("SELECT 12abc FROM t"), kErrSyntax);
  EXPECT_EQ(SyntaxErrorOf(std::string("SELECT 'a\0b'", 12)), kErrSyntax);
}

TEST(TranslateFailures, CriteriaErrorMakesTheStatementFail) {
  // The criteria builder's "Error" replaces the WHERE clause, which starts with a blank;
  // the word therefore lands glued to the FROM list or standing alone.
  const std::string select = std::string(kAccountColumns) + " FROM tAccount";
  EXPECT_EQ(SyntaxErrorOf(select + " Error ORDER BY tAccount.SortByKey ASC"), kErrSyntax);
  BareDb db;
  const std::string glued = TranslateJetSql(select + "Error ORDER BY tAccount.SortByKey ASC");
  EXPECT_NE(db.PrepareError(glued), "");
  const std::string gluedDocs = TranslateJetSql(std::string(kDocColumns) +
                                                " FROM tAccount, tStockHeadError ORDER BY "
                                                "tAccount.SortByKey ASC");
  EXPECT_NE(db.PrepareError(gluedDocs), "");
  // A field that is really called Error can still be named in brackets.
  EXPECT_EQ(TranslateJetSql("SELECT [Error] FROM t"), "SELECT [Error] FROM t");
}

TEST(TranslateFailures, MessageSaysWhatIsWrong) {
  try {
    TranslateJetSql("SELECT 'open");
    FAIL();
  } catch (const EngineError& e) {
    EXPECT_NE(std::string(e.description()).find("מחרוזת שלא נסגרה"), std::string::npos)
        << e.description();
  }
}

// ---------------------------------------------------------------------------------------
// Rows through the translator

TEST(TranslateRows, AndBindsTighterThanOrInThePicker) {
  BareDb db;
  // The ticked row with an empty key comes in through the OR, as the picker shows it.
  db.Exec(
      "INSERT INTO tSelectAccount VALUES ('1','1','כהן משה',0),('2','2','לוי',-1),"
      "('3','3','ג''ון סמית',0),('4','4','אבי',0),('5','','כהן',-1)");
  EXPECT_EQ(db.Rows("Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey "
                    "> '' And SortByName Like '*כהן*' Or Include = True Order By SortByKey"),
            (std::vector<std::string>{"|כהן|-1", "1|כהן משה|0", "2|לוי|-1"}));
  EXPECT_EQ(db.Rows("Select SortByKey From tSelectAccount Where SortByKey > '' And SortByName "
                    "Like '*ג''ון*' Order By SortByKey"),
            (std::vector<std::string>{"3"}));
}

TEST(TranslateRows, InAndNotInWithSubqueries) {
  BareDb db;
  db.Exec(
      "INSERT INTO tAccount (AccountKey, SortByKey) VALUES ('1','1'),('2','2'),('3','3');"
      "INSERT INTO tCash VALUES (1,'1'),(2,'1'),(3,'3');"
      "INSERT INTO tStockHead (CompID, TavFileID, HeadIndx, AccountKey, Include) VALUES "
      "(1,1,1,'2',-1),(1,1,2,'3',0);");
  EXPECT_EQ(db.Rows("SELECT tAccount.AccountKey FROM tAccount Where (1 > 0) AND "
                    "tAccount.AccountKey In (Select Distinct AccountKey From tCash) ORDER BY "
                    "tAccount.SortByKey "),
            (std::vector<std::string>{"1", "3"}));
  EXPECT_EQ(db.Rows("SELECT tAccount.AccountKey FROM tAccount Where (1 > 0) AND "
                    "tAccount.AccountKey Not In (Select Distinct AccountKey From tStockHead "
                    "Where tStockHead.Include) ORDER BY tAccount.SortByKey DESC"),
            (std::vector<std::string>{"3", "1"}));
}

// ---------------------------------------------------------------------------------------
// LIKE

struct LikeCase {
  const char* pattern;
  const char* text;
  bool match;
};

TEST(JetLikeTable, Wildcards) {
  const LikeCase cases[] = {
      {"*", "", true},
      {"*", "anything", true},
      {"", "", true},
      {"", "a", false},
      {"a", "", false},
      {"abc", "abc", true},
      {"abc", "abcd", false},
      {"ab", "abc", false},
      {"a*", "abc", true},
      {"*c", "abc", true},
      {"*b*", "abc", true},
      {"*x*", "abc", false},
      {"a*c", "ac", true},
      {"a*c", "abcbc", true},
      {"a*c", "abcb", false},
      {"a**c", "abxc", true},
      {"?", "", false},
      {"?", "a", true},
      {"?", "ab", false},
      {"a?c", "abc", true},
      {"#", "7", true},
      {"#", "x", false},
      {"##", "12", true},
      {"#*", "04-8123456", true},
      {"04*", "04-8123456", true},
      {"04*", "03-8123456", false},
      {"[abc]", "b", true},
      {"[abc]", "d", false},
      {"[a-c]x", "bx", true},
      {"[A-C]", "D", false},
      {"[!A]", "B", true},
      {"[!A]", "A", false},
      {"[!a-c]", "d", true},
      {"[!a-c]", "b", false},
      {"[-a]", "-", true},
      {"[a-]", "-", true},
      {"[*]", "*", true},
      {"[*]", "x", false},
      {"[?]", "?", true},
      {"[#]", "#", true},
      {"a[]b", "ab", true},
      {"[ab", "[ab", true},
      {"%", "%", true},
      {"%", "abc", false},
      {"_", "_", true},
      {"_", "a", false},
      {"a%b_", "a%b_", true},
      {"]", "]", true},
      {"[!]", "!", true},
  };
  for (const LikeCase& c : cases) {
    EXPECT_EQ(JetLike(c.pattern, c.text), c.match) << c.pattern << " ~ " << c.text;
  }
}

TEST(JetLikeTable, LatinCaseAndHebrew) {
  EXPECT_TRUE(JetLike("ABC", "abc"));
  EXPECT_TRUE(JetLike("*smith*", "John SMITH"));
  EXPECT_FALSE(JetLike("ABC", "abc", true));
  EXPECT_TRUE(JetLike("ABC", "ABC", true));
  EXPECT_TRUE(JetLike("[a-c]", "B"));
  EXPECT_FALSE(JetLike("[a-c]", "B", true));
  EXPECT_FALSE(JetLike("[!a]", "A"));
  EXPECT_TRUE(JetLike("É*", "école"));
  EXPECT_TRUE(JetLike("חי*", "חיפה"));
  EXPECT_FALSE(JetLike("חי*", "תל אביב"));
  EXPECT_TRUE(JetLike("*כהן*", "משה כהן בע\"מ"));
  EXPECT_TRUE(JetLike("*ג'ון*", "ג'ון סמית"));
  EXPECT_TRUE(JetLike("?", "ש"));  // one character, however many bytes
  EXPECT_TRUE(JetLike("??", "של"));
  EXPECT_FALSE(JetLike("???", "של"));
  EXPECT_TRUE(JetLike("[א-ט]*", "בית"));
  EXPECT_FALSE(JetLike("[א-ט]*", "ירושלים"));
  EXPECT_TRUE(JetLike("[!א-ט]*", "ירושלים"));
  EXPECT_TRUE(JetLike("ם", "ם"));
  EXPECT_FALSE(JetLike("ם", "מ"));  // a final letter is its own letter
}

TEST(JetLikeTable, BrokenUtf8MatchesByteForByte) {
  const std::string broken = "a\xD7";  // a lead byte cut off
  const std::string other = "a\xD8";
  EXPECT_TRUE(JetLike(broken, broken));
  EXPECT_FALSE(JetLike(broken, other));
  EXPECT_TRUE(JetLike("a?", broken));
  EXPECT_TRUE(JetLike("*", "\xFF\xFE"));
  // An overlong sequence is three stray bytes, each one character.
  EXPECT_FALSE(JetLike("??", "\xE0\x80\x80"));
  EXPECT_TRUE(JetLike("???", "\xE0\x80\x80"));
}

TEST(JetLikeTable, ManyStarsDoNotBlowUp) {
  // Backtracking over every star would take ages here; the greedy matcher is linear-ish.
  const std::string text(4000, 'a');
  EXPECT_FALSE(JetLike("*a*a*a*a*a*a*a*a*a*a*a*a*b", text));
  EXPECT_TRUE(JetLike("*a*a*a*a*a*a*a*a*a*a*a*a*", text));
}

}  // namespace
}  // namespace zdr::db
