// The Jet SQL translator as text, and Jet's LIKE. What the statements the system sends select
// and change on real databases is checked in test_statements.
#include <gtest/gtest.h>

#include <string>

#include "engine/engine.h"
#include "engine/jetsql.h"
#include "support/statements.h"

namespace zdr::db {
namespace {

TEST(TranslateTest, StatementsReadAsMeant) {
  const std::pair<std::string, const char*> cases[] = {
      // Literals: one quoting for SQLite, and nothing inside a literal rewritten.
      {"SELECT \"it's\", \"say \"\"hi\"\"\", 'ג''ון', \"\" FROM t WHERE c LIKE \"חי*\"",
       "SELECT 'it''s', 'say \"hi\"', 'ג''ון', '' FROM t WHERE c LIKE 'חי*'"},
      {"SELECT 'True', \"False\", 'Select * From x', 'Error', 'DISTINCTROW; DROP TABLE x' FROM t",
       "SELECT 'True', 'False', 'Select * From x', 'Error', 'DISTINCTROW; DROP TABLE x' FROM t"},
      // Yes/no constants, except as a field name.
      {"SELECT * FROM t WHERE Include = True OR x = false",
       "SELECT * FROM t WHERE Include = -1 OR x = 0"},
      {"SELECT t.True, [Error] FROM t", "SELECT t.True, [Error] FROM t"},
      {"select distinctrow a from t", "select DISTINCT a from t"},
      {"SELECT [Include], tAccount![City] FROM [tAccount]",
       "SELECT [Include], tAccount.[City] FROM [tAccount]"},
      // Two-digit years 00-29 are 20xx, 30-99 19xx.
      {"SELECT #12/31/1999#, #1899-12-30#, #3/1/00#, #1/1/29#, #1/1/30#",
       "SELECT 36525, 0, 36586, 47119, 10959"},
      // Minus minus must not become a comment.
      {"SELECT HeadIndx Mod 2, Mod, 3--2, 1-True FROM t",
       "SELECT HeadIndx % 2, Mod, 3- -2, 1- -1 FROM t"},
      {"SELECT a FROM t;  ", "SELECT a FROM t"},
      // Updates: the target's own qualifier dropped, a joined table read through EXISTS.
      {"UPDATE DISTINCTROW tAccount SET tAccount.Include = True, tAccount.Zip = \"1\" WHERE "
       "tAccount.City = 'x'",
       "UPDATE tAccount SET Include = -1, Zip = '1' WHERE tAccount.City = 'x'"},
      {"UPDATE tAccount AS A SET A.Include = False", "UPDATE tAccount AS A SET Include = 0"},
      {"UPDATE tStockHead INNER JOIN qHeadByItem ON tStockHead.HeadIndx = qHeadByItem.HeadIndx "
       "SET tStockHead.Include = True WHERE tStockHead.CompID = 1",
       "UPDATE tStockHead SET Include = -1 WHERE EXISTS (SELECT 1 FROM qHeadByItem WHERE "
       "tStockHead.HeadIndx = qHeadByItem.HeadIndx) AND (tStockHead.CompID = 1)"},
      // A value read from the joined row comes from the matching row.
      {"UPDATE tAccount INNER JOIN tSelectAccount AS S ON tAccount.AccountKey = S.AccountKey "
       "SET tAccount.AccountName = S.SortByName, tAccount.Include = True WHERE S.Include",
       "UPDATE tAccount SET AccountName = (SELECT S.SortByName FROM tSelectAccount AS S WHERE "
       "(tAccount.AccountKey = S.AccountKey) AND (S.Include)), Include = -1 WHERE EXISTS (SELECT 1 "
       "FROM tSelectAccount AS S WHERE (tAccount.AccountKey = S.AccountKey) AND (S.Include))"},
      {"DELETE tItem.* FROM tItem WHERE ItemKey = \"A\"", "DELETE FROM tItem WHERE ItemKey = 'A'"},
  };
  for (const auto& [jet, sql] : cases) EXPECT_EQ(TranslateJetSql(jet), sql) << jet;
}

TEST(TranslateTest, WhatCannotBeTranslatedIsASyntaxError) {
  const std::string cases[] = {
      "", "   ", "SELECT 'open", "SELECT \"open", "SELECT (a FROM t", "SELECT a) FROM t",
      "SELECT a & b FROM t", "SELECT a FROM t WHERE b = ?", "SELECT TOP 5 a FROM t",
      "DROP TABLE tAccount", "SELECT 12abc FROM t", std::string("SELECT 'a\0b'", 12),
      "SELECT a FROM t; DROP TABLE t", "SELECT a FROM t WHERE DISTINCTROW",
      "SELECT [Include FROM t", "SELECT [] FROM t", "SELECT #2/30/2001#",
      "SELECT #12/31/1999 10:00#", "SELECT #12/31/1999", "UPDATE tAccount", "UPDATE tAccount SET",
      "UPDATE tAccount SET Include", "UPDATE tAccount SET Include = True WHERE",
      "UPDATE tAccount SET tItem.ItemKey = 'x'",
      "UPDATE tAccount INNER JOIN tItem ON tAccount.Zip = tItem.ItemKey SET tItem.ItemKey = 'x'",
      "UPDATE tAccount LEFT JOIN tCash ON tAccount.AccountKey = tCash.AccountKey SET "
      "tAccount.Include = True",
      "UPDATE tAccount INNER JOIN tCash SET tAccount.Include = True",
      "UPDATE tAccount INNER JOIN tCash ON tAccount.AccountKey = tCash.AccountKey INNER JOIN "
      "tItem ON tItem.ItemKey = tAccount.Zip SET tAccount.Include = True",
      // The criteria builder's "Error" in place of the WHERE clause must not run.
      std::string(test::kAccountColumns) + " FROM tAccount Error ORDER BY tAccount.SortByKey"};
  for (const std::string& jet : cases) {
    try {
      TranslateJetSql(jet);
      ADD_FAILURE() << "translated: " << jet;
    } catch (const EngineError& e) {
      EXPECT_EQ(e.number(), kErrSyntax) << jet;
    }
  }
}

// ---------------------------------------------------------------------------------------
// LIKE

// "pattern|text": pairs that match, then pairs that do not. Latin letters (Latin-1 ones too,
// in a list as well) match their other case.
TEST(JetLikeTest, WildcardsAndBrokenUtf8) {
  const std::string matches[] = {
      "*|",      "*|anything", "|",          "abc|ABC",        "a**c|abcbc", "a?c|abc",
      "?|ש",     "#|0",        "#|9",        "04*|04-8123",    "[abc]|b",    "[a-c]x|bx",
      "[a-c]|B", "[!A]|B",     "[-a]|-",     "[a-]|-",         "[*]|*",      "a[]b|ab",
      "[ab|[ab", "%|%",        "a%b_|a%b_",  "[!]|!",          "É*|école",   "é|É",
      "[é]|É",   "חי*|חיפה",   "[א-ט]*|בית", "[!א-ט]*|ירושלים"};
  const std::string misses[] = {
      "|a",      "a|",          "abc|abcd",       "abc|ab",   "*x*|abc",     "a**c|abcb",
      "?|",      "?|ab",        "???|של",         "#|x",      "04*|03-8123", "[abc]|d",
      "[A-C]|D", "[!A]|A",      "[!A]|a",         "[!a-c]|b", "[*]|x",       "%|abc",
      "_|a",     "חי*|תל אביב", "[א-ט]*|ירושלים", "ם|מ"};
  const auto like = [](const std::string& m) {
    return JetLike(m.substr(0, m.find('|')), m.substr(m.find('|') + 1));
  };
  for (const std::string& m : matches) EXPECT_TRUE(like(m)) << m;
  for (const std::string& m : misses) EXPECT_FALSE(like(m)) << m;
  EXPECT_FALSE(JetLike("ABC", "abc", true));
  EXPECT_FALSE(JetLike("[a-c]", "B", true));
  // Broken UTF-8 matches byte for byte: a lead byte cut off is one character, an overlong
  // sequence three.
  EXPECT_TRUE(JetLike("a\xD7", "a\xD7") && JetLike("a?", "a\xD7") &&
              JetLike("???", "\xE0\x80\x80"));
  EXPECT_FALSE(JetLike("a\xD7", "a\xD8") || JetLike("??", "\xE0\x80\x80"));
  // Stars stay linear.
  const std::string text(4000, 'a');
  EXPECT_FALSE(JetLike("*a*a*a*a*a*a*a*a*a*a*a*a*b", text));
  EXPECT_TRUE(JetLike("*a*a*a*a*a*a*a*a*a*a*a*a*", text));
}

}  // namespace
}  // namespace zdr::db
