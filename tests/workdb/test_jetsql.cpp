// The Jet SQL translator and Jet's LIKE, checked against bare SQLite: every statement the
// system sends must translate and prepare, and the tricky ones must mean what they meant.
#include <sqlite3.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/statements.h"
#include "workdb/engine.h"
#include "workdb/jetsql.h"

namespace zdr::db {
namespace {

using Rows = std::vector<std::string>;

void SqliteLike(sqlite3_context* ctx, int, sqlite3_value** argv) {
  if (sqlite3_value_type(argv[0]) == SQLITE_NULL || sqlite3_value_type(argv[1]) == SQLITE_NULL) {
    return sqlite3_result_null(ctx);
  }
  const auto text = [](sqlite3_value* v) {
    const char* p = reinterpret_cast<const char*>(sqlite3_value_text(v));
    return std::string_view(p, static_cast<size_t>(sqlite3_value_bytes(v)));
  };
  sqlite3_result_int(ctx, JetLike(text(argv[0]), text(argv[1])) ? 1 : 0);
}

// A bare SQLite database with the working tables, Jet's LIKE, and the stored query.
class BareDb {
 public:
  BareDb() {
    EXPECT_EQ(sqlite3_open(":memory:", &db_), SQLITE_OK);
    sqlite3_create_function(db_, "like", 2, SQLITE_UTF8 | SQLITE_DETERMINISTIC, nullptr, SqliteLike,
                            nullptr, nullptr);
    Exec(
        "CREATE TABLE tAccount (AccountKey TEXT PRIMARY KEY, AccountName, CategoryCode, CutOff, "
        "Address, City, Zip, District, Details, Telephone, Include, SortByName, SortByKey UNIQUE, "
        "SortByCity, SortByZip, SortByKeyVal REAL);"
        "CREATE TABLE tStockHead (CompID, TavFileID, HeadIndx, DocType2, Reference1, AccountKey, "
        "RefDate, DueDate, CustomerName, Address1, Address2, DetailsLine1, SortByName, "
        "SortByCity, SortByZip, Include, PRIMARY KEY (CompID, TavFileID, HeadIndx));"
        "CREATE TABLE tStockLine (CompID, TavFileID, HeadIndx, LineIndx, Agent, ItemKey);"
        "CREATE TABLE tTransact (FileID, TransID, AccountKey);"
        "CREATE TABLE tCash (TransID, AccountKey);"
        "CREATE TABLE tItem (ItemKey TEXT PRIMARY KEY);"
        "CREATE TABLE tSelectAccount (AccountKey PRIMARY KEY, SortByKey UNIQUE, SortByName, "
        "Include);");
    Exec("CREATE VIEW qHeadByItem AS " +
         TranslateJetSql("SELECT tStockLine.CompID, tStockLine.TavFileID, tStockLine.HeadIndx"
                         " FROM tItem INNER JOIN tStockLine ON tItem.ItemKey = tStockLine.ItemKey"
                         " GROUP BY tStockLine.CompID, tStockLine.TavFileID, "
                         "tStockLine.HeadIndx"));
  }
  ~BareDb() { sqlite3_close(db_); }

  void Exec(const std::string& sql) {
    char* err = nullptr;
    EXPECT_EQ(sqlite3_exec(db_, sql.c_str(), nullptr, nullptr, &err), SQLITE_OK)
        << sql << "\n"
        << (err ? err : "");
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
  Rows Query(const std::string& jet) {
    const std::string sql = TranslateJetSql(jet);
    sqlite3_stmt* st = nullptr;
    Rows rows;
    if (sqlite3_prepare_v2(db_, sql.c_str(), -1, &st, nullptr) != SQLITE_OK) {
      ADD_FAILURE() << sql << "\n" << sqlite3_errmsg(db_);
      return rows;
    }
    while (sqlite3_step(st) == SQLITE_ROW) {
      std::string row;
      for (int c = 0; c < sqlite3_column_count(st); ++c) {
        const unsigned char* v = sqlite3_column_text(st, c);
        row += (c ? "|" : "") + std::string(v ? reinterpret_cast<const char*>(v) : "NULL");
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

TEST(TranslateTest, StatementsReadAsMeant) {
  const std::pair<const char*, const char*> cases[] = {
      // Literals: one quoting for SQLite, and nothing inside a literal rewritten.
      {"SELECT * FROM t WHERE City LIKE \"חי*\"", "SELECT * FROM t WHERE City LIKE 'חי*'"},
      {"SELECT \"it's\", \"say \"\"hi\"\"\", 'ג''ון', \"\"",
       "SELECT 'it''s', 'say \"hi\"', 'ג''ון', ''"},
      {"SELECT 'True', \"False\", 'Select * From x', 'Error', 'DISTINCTROW; DROP TABLE x' FROM t",
       "SELECT 'True', 'False', 'Select * From x', 'Error', 'DISTINCTROW; DROP TABLE x' FROM t"},
      // Yes/no constants, except as a field name.
      {"SELECT * FROM t WHERE Include = True OR x = false",
       "SELECT * FROM t WHERE Include = -1 OR x = 0"},
      {"SELECT t.True, [Error] FROM t", "SELECT t.True, [Error] FROM t"},
      {"select distinctrow a from t", "select DISTINCT a from t"},
      {"SELECT [Include], tAccount![City] FROM [tAccount]",
       "SELECT [Include], tAccount.[City] FROM [tAccount]"},
      {"SELECT #12/31/1999#, #1899-12-30#, #3/1/00#, #1/1/29#, #1/1/30#",
       "SELECT 36525, 0, 36586, 47119, 10959"},
      {"SELECT HeadIndx Mod 2, Mod FROM t", "SELECT HeadIndx % 2, Mod FROM t"},
      {"SELECT a FROM t;  ", "SELECT a FROM t"},
      // Updates: the target's own qualifier dropped, a joined table read through EXISTS.
      {"UPDATE DISTINCTROW tAccount SET tAccount.Include = True, tAccount.Zip = \"1\" WHERE "
       "tAccount.City = 'x'",
       "UPDATE tAccount SET Include = -1, Zip = '1' WHERE tAccount.City = 'x'"},
      {"UPDATE tAccount AS A SET A.Include = False", "UPDATE tAccount AS A SET Include = 0"},
      {test::kMarkHeadersByItem,
       "UPDATE tStockHead SET Include = -1 WHERE EXISTS (SELECT 1 FROM qHeadByItem WHERE "
       "(tStockHead.CompID = qHeadByItem.CompID) AND (tStockHead.TavFileID = "
       "qHeadByItem.TavFileID) AND (tStockHead.HeadIndx = qHeadByItem.HeadIndx))"},
      {"UPDATE tStockHead INNER JOIN qHeadByItem ON tStockHead.HeadIndx = qHeadByItem.HeadIndx "
       "SET tStockHead.Include = True WHERE tStockHead.CompID = 1",
       "UPDATE tStockHead SET Include = -1 WHERE EXISTS (SELECT 1 FROM qHeadByItem WHERE "
       "tStockHead.HeadIndx = qHeadByItem.HeadIndx) AND (tStockHead.CompID = 1)"},
      {"DELETE tItem.* FROM tItem WHERE ItemKey = \"A\"", "DELETE FROM tItem WHERE ItemKey = 'A'"},
      {"DELETE * FROM tItem", "DELETE FROM tItem"},
  };
  for (const auto& [jet, sql] : cases) EXPECT_EQ(TranslateJetSql(jet), sql) << jet;
}

TEST(TranslateTest, WhatCannotBeTranslatedIsASyntaxError) {
  const std::string cases[] = {
      "",
      "   ",
      "SELECT 'open",
      "SELECT \"open",
      "SELECT (a FROM t",
      "SELECT a) FROM t",
      "SELECT a & b FROM t",
      "SELECT a FROM t WHERE b = ?",
      "SELECT TOP 5 a FROM t",
      "DROP TABLE tAccount",
      "SELECT 12abc FROM t",
      std::string("SELECT 'a\0b'", 12),
      "SELECT a FROM t; DROP TABLE t",
      "SELECT a FROM t WHERE DISTINCTROW",
      "SELECT [Include FROM t",
      "SELECT [] FROM t",
      "SELECT #2/30/2001#",
      "SELECT #12/31/1999 10:00#",
      "SELECT #12/31/1999",
      "UPDATE tAccount",
      "UPDATE tAccount SET",
      "UPDATE tAccount SET Include",
      "UPDATE tAccount SET Include = True WHERE",
      "UPDATE tAccount SET tItem.ItemKey = 'x'",
      "UPDATE tAccount INNER JOIN tItem ON tAccount.Zip = tItem.ItemKey SET tItem.ItemKey = 'x'",
      "UPDATE tAccount LEFT JOIN tCash ON tAccount.AccountKey = tCash.AccountKey SET "
      "tAccount.Include = True",
      "UPDATE tAccount INNER JOIN tCash SET tAccount.Include = True",
      "UPDATE tAccount INNER JOIN tCash ON tAccount.AccountKey = tCash.AccountKey INNER JOIN "
      "tItem ON tItem.ItemKey = tAccount.Zip SET tAccount.Include = True",
      // The criteria builder's "Error" in place of the WHERE clause must not run.
      std::string(test::kAccountColumns) + " FROM tAccount Error ORDER BY tAccount.SortByKey",
  };
  for (const std::string& jet : cases) {
    try {
      TranslateJetSql(jet);
      ADD_FAILURE() << "translated: " << jet;
    } catch (const EngineError& e) {
      EXPECT_EQ(e.number(), kErrSyntax) << jet;
    }
  }
  // Glued to the FROM list, it names a table that does not exist.
  BareDb db;
  EXPECT_NE(db.PrepareError(TranslateJetSql(std::string(test::kAccountColumns) +
                                            " FROM tAccountError ORDER BY tAccount.SortByKey")),
            "");
}

TEST(TranslateTest, RowsThroughTheTranslator) {
  BareDb db;
  db.Exec(
      "INSERT INTO tSelectAccount VALUES ('1','1','כהן משה',0),('2','2','לוי',-1),"
      "('3','3','ג''ון סמית',NULL),('4','4','אבי',0),('5','','כהן',-1);"
      "INSERT INTO tAccount (AccountKey, SortByKey) VALUES ('1','1'),('2','2'),('3','3');"
      "INSERT INTO tCash VALUES (1,'1'),(2,'1'),(3,'3');"
      "INSERT INTO tStockHead (CompID, TavFileID, HeadIndx, AccountKey, Include) VALUES "
      "(1,1,1,'2',-1),(1,1,2,'3',0);");
  // The picker's filter: AND binds tighter than OR, so the ticked rows stay in view.
  EXPECT_EQ(db.Query("Select SortByKey, SortByName, Include From tSelectAccount Where SortByKey "
                     "> '' And SortByName Like '*כהן*' Or Include = True Order By SortByKey"),
            (Rows{"|כהן|-1", "1|כהן משה|0", "2|לוי|-1"}));
  EXPECT_EQ(db.Query("Select SortByKey From tSelectAccount Where SortByName Like '*ג''ון*'"),
            (Rows{"3"}));
  EXPECT_EQ(db.Query("Select SA.SortByKey From tSelectAccount SA Where SA.Include Order By 1"),
            (Rows{"", "2"}));
  EXPECT_EQ(db.Query("Select SortByKey From tSelectAccount Where Not Include Order By 1"),
            (Rows{"1", "4"}));
  EXPECT_EQ(db.Query("SELECT tAccount.AccountKey FROM tAccount Where (1 > 0)" +
                     std::string(test::kCashIn) + " ORDER BY tAccount.SortByKey "),
            (Rows{"1", "3"}));
  EXPECT_EQ(db.Query("SELECT tAccount.AccountKey FROM tAccount Where (1 > 0)" +
                     std::string(test::kNotIssued) + " ORDER BY tAccount.SortByKey DESC"),
            (Rows{"3", "1"}));
  // Minus minus must not become a comment.
  EXPECT_EQ(db.Query("SELECT \"a'b\", 'c\"d', \"True\", 1-True, 3--2, 7 MOD 3, (8) mod 5"),
            (Rows{"a'b|c\"d|True|2|5|1|3"}));
}

TEST(TranslateTest, JoinedUpdatesMarkAndReadTheJoinedRows) {
  BareDb db;
  db.Exec(
      "INSERT INTO tStockHead (CompID, TavFileID, HeadIndx, Include) VALUES "
      "(1,1,10,0),(1,1,11,-1),(1,2,10,-1),(1,2,12,0);"
      "INSERT INTO tStockLine (CompID, TavFileID, HeadIndx, LineIndx, ItemKey) VALUES "
      "(1,1,10,1,'A'),(1,1,10,2,'B'),(1,1,11,3,'C'),(1,2,10,4,'B'),(1,2,12,5,'Z');"
      "INSERT INTO tItem VALUES ('A'),('B');"
      "INSERT INTO tAccount (AccountKey, AccountName, Include) VALUES ('1','a',0),('2','b',0);"
      "INSERT INTO tSelectAccount VALUES ('1','1','x',-1),('2','2','y',0);");
  db.Run(test::kClearHeaders);
  db.Run(test::kMarkHeadersByItem);
  EXPECT_EQ(db.Query("SELECT TavFileID, HeadIndx, Include FROM tStockHead ORDER BY 1, 2"),
            (Rows{"1|10|-1", "1|11|0", "2|10|-1", "2|12|0"}));
  db.Run(
      "UPDATE tAccount INNER JOIN tSelectAccount AS S ON tAccount.AccountKey = S.AccountKey "
      "SET tAccount.AccountName = S.SortByName, tAccount.Include = True WHERE S.Include");
  EXPECT_EQ(db.Query("SELECT AccountKey, AccountName, Include FROM tAccount ORDER BY 1"),
            (Rows{"1|x|-1", "2|b|0"}));
}

// ---------------------------------------------------------------------------------------
// LIKE

TEST(JetLikeTest, Wildcards) {
  struct Case {
    const char* pattern;
    const char* text;
    bool match;
  };
  const Case cases[] = {
      {"*", "", true},
      {"*", "anything", true},
      {"", "", true},
      {"", "a", false},
      {"a", "", false},
      {"abc", "abcd", false},
      {"ab", "abc", false},
      {"a*", "abc", true},
      {"*c", "abc", true},
      {"*x*", "abc", false},
      {"a*c", "abcbc", true},
      {"a*c", "abcb", false},
      {"a**c", "abxc", true},
      {"?", "", false},
      {"a?c", "abc", true},
      {"?", "ab", false},
      {"#", "0", true},
      {"#", "x", false},
      {"##", "19", true},
      {"04*", "04-8123", true},
      {"04*", "03-8123", false},
      {"[abc]", "b", true},
      {"[abc]", "d", false},
      {"[a-c]x", "bx", true},
      {"[A-C]", "D", false},
      {"[!A]", "B", true},
      {"[!A]", "A", false},
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
      {"_", "a", false},
      {"a%b_", "a%b_", true},
      {"]", "]", true},
      {"[!]", "!", true},
      {"ABC", "abc", true},
      {"*smith*", "SMITH", true},
      {"[a-c]", "B", true},
      {"[!a]", "A", false},
      {"É*", "école", true},
      {"é", "É", true},
      {"[é]", "É", true},
      {"חי*", "חיפה", true},
      {"חי*", "תל אביב", false},
      {"*ג'ון*", "ג'ון סמית", true},
      {"?", "ש", true},
      {"???", "של", false},
      {"[א-ט]*", "בית", true},
      {"[א-ט]*", "ירושלים", false},
      {"[!א-ט]*", "ירושלים", true},
      {"ם", "מ", false},
  };
  for (const Case& c : cases) {
    EXPECT_EQ(JetLike(c.pattern, c.text), c.match) << c.pattern << " ~ " << c.text;
  }
  EXPECT_FALSE(JetLike("ABC", "abc", true));
  EXPECT_FALSE(JetLike("[a-c]", "B", true));
}

TEST(JetLikeTest, BrokenUtf8MatchesByteForByteAndStarsStayLinear) {
  EXPECT_TRUE(JetLike("a\xD7", "a\xD7"));  // a lead byte cut off
  EXPECT_FALSE(JetLike("a\xD7", "a\xD8"));
  EXPECT_TRUE(JetLike("a?", "a\xD7"));
  // An overlong sequence is three stray bytes, each one character.
  EXPECT_FALSE(JetLike("??", "\xE0\x80\x80"));
  EXPECT_TRUE(JetLike("???", "\xE0\x80\x80"));
  const std::string text(4000, 'a');
  EXPECT_FALSE(JetLike("*a*a*a*a*a*a*a*a*a*a*a*a*b", text));
  EXPECT_TRUE(JetLike("*a*a*a*a*a*a*a*a*a*a*a*a*", text));
}

}  // namespace
}  // namespace zdr::db
