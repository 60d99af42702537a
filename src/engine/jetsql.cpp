// The Jet dialect of SQL, translated for SQLite, and Jet's LIKE.
//
// A statement is cut into tokens, the tokens are rewritten (literals, Boolean constants,
// DISTINCTROW, the joined UPDATE, qualified SET targets) and written out again. The text
// between tokens is never searched, so nothing inside a literal is ever rewritten.
#include "engine/jetsql.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "common/value.h"
#include "engine/engine.h"

namespace zdr::db {
namespace {

// ---------------------------------------------------------------------------------------
// Tokens

enum class Tok {
  Word,       // plain identifier or keyword, as written
  Bracketed,  // [identifier]; text is the name inside the brackets
  String,     // literal; text is the value, quotes undone
  Number,     // numeric literal as written (also True/False and #dates# once rewritten)
  Op,         // = <> < > <= >= + - * /
  LParen,
  RParen,
  Comma,
  Dot,
};

struct Token {
  Tok kind;
  std::string text;
  bool spaceBefore = false;
  size_t pos = 0;  // byte offset in the statement, for messages
};

[[noreturn]] void Fail(const std::string& what) {
  throw EngineError(kErrSyntax, "שגיאת תחביר במשפט SQL: " + what);
}

[[noreturn]] void FailAt(const std::string& what, size_t pos) {
  Fail(what + " (מיקום " + std::to_string(pos + 1) + ")");
}

bool IsAsciiLetter(unsigned char c) {
  return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
}
bool IsDigit(unsigned char c) {
  return c >= '0' && c <= '9';
}
bool IsWordStart(unsigned char c) {
  return IsAsciiLetter(c) || c == '_' || c >= 0x80;
}
bool IsWordChar(unsigned char c) {
  return IsWordStart(c) || IsDigit(c);
}

bool EqualsNoCase(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return false;
  for (size_t i = 0; i < a.size(); ++i) {
    unsigned char x = a[i], y = b[i];
    if (x >= 'A' && x <= 'Z') x += 32;
    if (y >= 'A' && y <= 'Z') y += 32;
    if (x != y) return false;
  }
  return true;
}

bool IsLeap(int64_t y) {
  return (y % 4 == 0 && y % 100 != 0) || y % 400 == 0;
}

int DaysInMonth(int64_t y, int64_t m) {
  static const int kDays[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  return m == 2 && IsLeap(y) ? 29 : kDays[m - 1];
}

// A Jet date literal without the #s: m/d/yyyy (two-digit years 00-29 are 20xx, 30-99 are
// 19xx) or yyyy-mm-dd. Dates are stored as day serials, so the literal becomes one.
std::string DateLiteral(std::string_view body, size_t pos) {
  int64_t parts[3] = {0, 0, 0};
  int digits[3] = {0, 0, 0};
  int n = 0;
  char sep = 0;
  for (char c : body) {
    if (IsDigit(c)) {
      if (digits[n] >= 4) FailAt("תאריך לא תקין #" + std::string(body) + "#", pos);
      parts[n] = parts[n] * 10 + (c - '0');
      ++digits[n];
    } else if ((c == '/' || c == '-') && n < 2 && digits[n] > 0 && (sep == 0 || sep == c)) {
      sep = c;
      ++n;
    } else {
      FailAt("תאריך לא תקין #" + std::string(body) + "#", pos);
    }
  }
  if (n != 2 || digits[2] == 0) FailAt("תאריך לא תקין #" + std::string(body) + "#", pos);
  int64_t y, m, d;
  if (digits[0] == 4) {
    y = parts[0], m = parts[1], d = parts[2];
  } else {
    m = parts[0], d = parts[1], y = parts[2];
    if (digits[2] <= 2) y += y < 30 ? 2000 : 1900;
  }
  if (m < 1 || m > 12 || d < 1 || d > DaysInMonth(y, m) || y < 100) {
    FailAt("תאריך לא תקין #" + std::string(body) + "#", pos);
  }
  return std::to_string(
      Date::FromParts(static_cast<int>(y), static_cast<int>(m), static_cast<int>(d)).serial);
}

std::vector<Token> Tokenize(std::string_view s) {
  std::vector<Token> out;
  bool space = false;
  size_t i = 0;
  auto push = [&](Tok kind, std::string text, size_t pos) {
    out.push_back({kind, std::move(text), space, pos});
    space = false;
  };
  while (i < s.size()) {
    const unsigned char c = s[i];
    const size_t start = i;
    if (c == ' ' || c == '\t' || c == '\r' || c == '\n') {
      space = true;
      ++i;
    } else if (c == '\'' || c == '"') {
      std::string value;
      ++i;
      for (;;) {
        if (i >= s.size()) FailAt("מחרוזת שלא נסגרה", start);
        if (s[i] == '\0') FailAt("תו אפס בתוך מחרוזת", i);
        if (s[i] == static_cast<char>(c)) {
          if (i + 1 < s.size() && s[i + 1] == static_cast<char>(c)) {
            value += s[i];
            i += 2;
            continue;
          }
          ++i;
          break;
        }
        value += s[i++];
      }
      push(Tok::String, std::move(value), start);
    } else if (c == '[') {
      const size_t close = s.find(']', i + 1);
      if (close == std::string_view::npos) FailAt("סוגר מרובע שלא נסגר", start);
      std::string name(s.substr(i + 1, close - i - 1));
      if (name.empty()) FailAt("שם ריק בין סוגריים מרובעים", start);
      if (name.find_first_of("[\0", 0, 2) != std::string::npos) {
        FailAt("שם לא תקין בין סוגריים מרובעים", start);
      }
      push(Tok::Bracketed, std::move(name), start);
      i = close + 1;
    } else if (IsDigit(c) || (c == '.' && i + 1 < s.size() && IsDigit(s[i + 1]) &&
                              (out.empty() || out.back().kind != Tok::Word || space))) {
      while (i < s.size() && IsDigit(s[i])) ++i;
      if (i < s.size() && s[i] == '.') {
        ++i;
        while (i < s.size() && IsDigit(s[i])) ++i;
      }
      if (i < s.size() && (s[i] == 'e' || s[i] == 'E')) {
        size_t j = i + 1;
        if (j < s.size() && (s[j] == '+' || s[j] == '-')) ++j;
        if (j < s.size() && IsDigit(s[j])) {
          i = j;
          while (i < s.size() && IsDigit(s[i])) ++i;
        }
      }
      if (i < s.size() && IsWordChar(s[i])) {
        FailAt("מספר לא תקין " + std::string(s.substr(start, i - start + 1)), start);
      }
      push(Tok::Number, std::string(s.substr(start, i - start)), start);
    } else if (IsWordStart(c)) {
      while (i < s.size() && IsWordChar(s[i])) ++i;
      push(Tok::Word, std::string(s.substr(start, i - start)), start);
    } else if (c == '#') {
      const size_t close = s.find('#', i + 1);
      if (close == std::string_view::npos) FailAt("תאריך שלא נסגר", start);
      push(Tok::Number, DateLiteral(s.substr(i + 1, close - i - 1), start), start);
      i = close + 1;
    } else if (c == '<' || c == '>') {
      std::string op(1, c);
      ++i;
      if (i < s.size() && (s[i] == '=' || (c == '<' && s[i] == '>'))) op += s[i++];
      push(Tok::Op, std::move(op), start);
    } else if (c == '=' || c == '+' || c == '-' || c == '*' || c == '/') {
      ++i;
      push(Tok::Op, std::string(1, c), start);
    } else if (c == '(') {
      ++i;
      push(Tok::LParen, "(", start);
    } else if (c == ')') {
      ++i;
      push(Tok::RParen, ")", start);
    } else if (c == ',') {
      ++i;
      push(Tok::Comma, ",", start);
    } else if (c == '.' || c == '!') {
      // Table!Field is Jet's other way to write Table.Field.
      if (c == '!' && (out.empty() || space ||
                       (out.back().kind != Tok::Word && out.back().kind != Tok::Bracketed))) {
        FailAt("התו ! במקום לא צפוי", start);
      }
      ++i;
      push(Tok::Dot, ".", start);
    } else if (c == ';') {
      // One statement only: a closing semicolon may stand at the very end.
      for (size_t j = i + 1; j < s.size(); ++j) {
        if (s[j] != ' ' && s[j] != '\t' && s[j] != '\r' && s[j] != '\n') {
          FailAt("טקסט אחרי סוף המשפט", j);
        }
      }
      i = s.size();
    } else if (c == '&') {
      FailAt("שרשור מחרוזות ב-& אינו נתמך", start);
    } else {
      FailAt(std::string("תו לא צפוי '") + static_cast<char>(c) + "'", start);
    }
  }
  return out;
}

// ---------------------------------------------------------------------------------------
// Token helpers

bool IsWord(const Token& t, std::string_view w) {
  return t.kind == Tok::Word && EqualsNoCase(t.text, w);
}

bool IsName(const Token& t) {
  return t.kind == Tok::Word || t.kind == Tok::Bracketed;
}

bool SameName(const Token& t, std::string_view name) {
  return IsName(t) && EqualsNoCase(t.text, name);
}

// Words that are part of the language, never column names, inside an expression.
bool IsExpressionKeyword(const Token& t) {
  static const char* const kWords[] = {
      "AND",  "OR",     "NOT",   "NULL", "IS",    "LIKE",     "IN", "BETWEEN", "SELECT",
      "FROM", "WHERE",  "GROUP", "BY",   "ORDER", "DISTINCT", "AS", "EXISTS",  "ASC",
      "DESC", "HAVING", "INNER", "LEFT", "RIGHT", "JOIN",     "ON", "UNION",   "ALL",
      "CASE", "WHEN",   "THEN",  "ELSE", "END",   "ESCAPE",   "MOD"};
  if (t.kind != Tok::Word) return false;
  for (const char* w : kWords) {
    if (EqualsNoCase(t.text, w)) return true;
  }
  return false;
}

using Range = std::vector<Token>;

// Index of the first word `w` at parenthesis depth 0 in [from, to), or `to`.
size_t FindTop(const Range& t, size_t from, size_t to, std::string_view w) {
  int depth = 0;
  for (size_t i = from; i < to; ++i) {
    if (t[i].kind == Tok::LParen) ++depth;
    if (t[i].kind == Tok::RParen) --depth;
    if (depth == 0 && IsWord(t[i], w)) return i;
  }
  return to;
}

void Append(std::string& out, const Token& t, bool space) {
  if (!out.empty() && out.back() != ' ' && out.back() != '(') {
    // Never let two tokens run together into a comment opener.
    const char first = t.kind == Tok::Number || t.kind == Tok::Op ? t.text.front() : 0;
    if (space || (out.back() == '-' && first == '-') || (out.back() == '/' && first == '*')) {
      out += ' ';
    }
  }
  switch (t.kind) {
    case Tok::String:
      out += '\'';
      for (char c : t.text) {
        if (c == '\'') out += '\'';
        out += c;
      }
      out += '\'';
      break;
    case Tok::Bracketed:
      out += '[';
      out += t.text;
      out += ']';
      break;
    default:
      out += t.text;
  }
}

// Writes tokens [from, to); the first one gets a blank before it when `lead` says so.
void Emit(std::string& out, const Range& t, size_t from, size_t to, bool lead = true) {
  for (size_t i = from; i < to; ++i) Append(out, t[i], i == from ? lead : t[i].spaceBefore);
}

// ---------------------------------------------------------------------------------------
// Rewrites that do not depend on the kind of statement

void CheckParentheses(const Range& t) {
  int depth = 0;
  for (const Token& tok : t) {
    if (tok.kind == Tok::LParen) ++depth;
    if (tok.kind == Tok::RParen && --depth < 0) FailAt("סוגר ) ללא סוגר ( מתאים", tok.pos);
  }
  if (depth != 0) Fail("סוגריים שלא נסגרו");
}

void RewriteCommon(Range& t) {
  Range out;
  out.reserve(t.size());
  for (size_t i = 0; i < t.size(); ++i) {
    Token& tok = t[i];
    const bool qualified =
        (i > 0 && t[i - 1].kind == Tok::Dot) || (i + 1 < t.size() && t[i + 1].kind == Tok::Dot);
    if (tok.kind == Tok::Word && !qualified) {
      if (EqualsNoCase(tok.text, "True") || EqualsNoCase(tok.text, "False")) {
        // Yes/no fields hold -1 and 0.
        tok.kind = Tok::Number;
        tok.text = EqualsNoCase(tok.text, "True") ? "-1" : "0";
      } else if (EqualsNoCase(tok.text, "Error")) {
        // The criteria builder hands back this word when it fails; the statement must not
        // run with the criteria quietly missing.
        FailAt("המשפט מכיל את המילה Error: בניית התנאים נכשלה", tok.pos);
      } else if (EqualsNoCase(tok.text, "DISTINCTROW")) {
        if (!out.empty() && IsWord(out.back(), "SELECT")) {
          tok.text = "DISTINCT";
        } else if (!out.empty() && IsWord(out.back(), "UPDATE")) {
          continue;
        } else if (!out.empty() && IsWord(out.back(), "DELETE")) {
          continue;
        } else {
          FailAt("DISTINCTROW במקום לא צפוי", tok.pos);
        }
      } else if (EqualsNoCase(tok.text, "TOP") && !out.empty() &&
                 (IsWord(out.back(), "SELECT") || IsWord(out.back(), "DISTINCT"))) {
        FailAt("TOP אינו נתמך", tok.pos);
      } else if (EqualsNoCase(tok.text, "Mod") && !out.empty() &&
                 (out.back().kind != Tok::Op && out.back().kind != Tok::LParen &&
                  out.back().kind != Tok::Comma && !IsExpressionKeyword(out.back()))) {
        // Jet's remainder operator, after an operand.
        tok.kind = Tok::Op;
        tok.text = "%";
      }
    }
    out.push_back(std::move(tok));
  }
  t = std::move(out);
}

// ---------------------------------------------------------------------------------------
// UPDATE

// A SET list: assignments between `from` and `to`, split at top-level commas.
struct Assignment {
  size_t targetBegin, targetEnd;  // the field, perhaps qualified
  size_t exprBegin, exprEnd;
};

std::vector<Assignment> ParseSetList(const Range& t, size_t from, size_t to) {
  std::vector<Assignment> list;
  size_t begin = from;
  int depth = 0;
  for (size_t i = from; i <= to; ++i) {
    if (i < to && t[i].kind == Tok::LParen) ++depth;
    if (i < to && t[i].kind == Tok::RParen) --depth;
    if (i == to || (depth == 0 && t[i].kind == Tok::Comma)) {
      size_t eq = begin;
      while (eq < i && !(t[eq].kind == Tok::Op && t[eq].text == "=")) ++eq;
      if (begin == i || eq == i || eq + 1 == i) Fail("השמה לא תקינה אחרי SET");
      const size_t len = eq - begin;
      const bool plain = len == 1 && IsName(t[begin]);
      const bool dotted =
          len == 3 && IsName(t[begin]) && t[begin + 1].kind == Tok::Dot && IsName(t[begin + 2]);
      if (!plain && !dotted) FailAt("שדה לא תקין אחרי SET", t[begin].pos);
      list.push_back({begin, eq, eq + 1, i});
      begin = i + 1;
    }
  }
  return list;
}

// The names a table is known by in a statement: its own name and its alias, if any.
struct TableNames {
  std::string table;
  std::string alias;
  // A table with an alias is known only by the alias, as in the engine itself.
  bool Matches(const Token& q) const { return SameName(q, alias.empty() ? table : alias); }
};

// Reads `name [AS] [alias]` in [from, to). Returns false when the range is anything else.
bool ParseTableRef(const Range& t, size_t from, size_t to, TableNames& names) {
  if (from >= to || !IsName(t[from])) return false;
  names.table = t[from].text;
  names.alias.clear();
  size_t i = from + 1;
  if (i < to && IsWord(t[i], "AS")) ++i;
  if (i < to && IsName(t[i]) && !IsExpressionKeyword(t[i])) {
    names.alias = t[i].text;
    ++i;
  }
  return i == to;
}

// The field name of a SET target, after checking that its qualifier names the updated table.
const Token& SetField(const Range& t, const Assignment& a, const TableNames& target) {
  if (a.targetEnd - a.targetBegin == 1) return t[a.targetBegin];
  const Token& q = t[a.targetBegin];
  if (!target.Matches(q)) {
    FailAt("אפשר לעדכן רק שדות של הטבלה " + target.table + ", לא " + q.text, q.pos);
  }
  return t[a.targetBegin + 2];
}

// Whether the expression reads any column that does not belong to the updated table.
bool ReadsOtherTable(const Range& t, size_t from, size_t to, const TableNames& target) {
  for (size_t i = from; i < to; ++i) {
    if (!IsName(t[i]) || IsExpressionKeyword(t[i])) continue;
    if (i > from && t[i - 1].kind == Tok::Dot) continue;       // the field part
    if (i + 1 < to && t[i + 1].kind == Tok::LParen) continue;  // a function
    if (i + 1 < to && t[i + 1].kind == Tok::Dot) {
      if (!target.Matches(t[i])) return true;
      continue;
    }
    return true;  // an unqualified field: it may come from the joined table
  }
  return false;
}

void EmitSetList(std::string& out, const Range& t, const std::vector<Assignment>& list,
                 const TableNames& target, const std::string* correlatedFrom) {
  for (size_t n = 0; n < list.size(); ++n) {
    const Assignment& a = list[n];
    if (n > 0) out += ',';
    Append(out, SetField(t, a, target), true);
    out += " =";
    if (correlatedFrom && ReadsOtherTable(t, a.exprBegin, a.exprEnd, target)) {
      out += " (SELECT";
      Emit(out, t, a.exprBegin, a.exprEnd);
      out += *correlatedFrom;
      out += ')';
    } else {
      Emit(out, t, a.exprBegin, a.exprEnd);
    }
  }
}

// UPDATE T1 INNER JOIN T2 ON cond SET T1.f = e [, ...] [WHERE w]
//   -> UPDATE T1 SET f = e WHERE EXISTS (SELECT 1 FROM T2 WHERE cond) [AND (w)]
// An expression that reads T2 becomes a subquery over the matching T2 row; a WHERE that
// reads T2 moves into the EXISTS.
std::string TranslateJoinUpdate(const Range& t, size_t join, size_t set, size_t where) {
  size_t joinKind = join - 1;
  if (!IsWord(t[joinKind], "INNER")) {
    if (IsWord(t[joinKind], "LEFT") || IsWord(t[joinKind], "RIGHT")) {
      FailAt("עדכון עם LEFT/RIGHT JOIN אינו נתמך", t[joinKind].pos);
    }
    FailAt("JOIN ללא INNER בעדכון", t[join].pos);
  }
  TableNames target;
  if (!ParseTableRef(t, 1, joinKind, target)) {
    FailAt("עדכון עם צירוף: צפוי שם טבלה אחרי UPDATE", t[1].pos);
  }
  const size_t on = FindTop(t, join + 1, set, "ON");
  if (on == set || on == join + 1) FailAt("עדכון עם צירוף ללא ON", t[join].pos);
  if (FindTop(t, on + 1, set, "JOIN") != set) {
    FailAt("עדכון עם יותר מצירוף אחד אינו נתמך", t[on].pos);
  }
  if (on + 1 == set) FailAt("תנאי ריק אחרי ON", t[on].pos);
  // The joined table: a table or stored query, or a subquery, with an optional alias.
  TableNames joined;
  if (!ParseTableRef(t, join + 1, on, joined)) {
    const Token& last = t[on - 1];
    if (on - join >= 3 && IsName(last) && !IsExpressionKeyword(last)) {
      joined.alias = last.text;
    }
  }
  const std::string& joinedName = joined.alias.empty() ? joined.table : joined.alias;
  if (!joinedName.empty() &&
      EqualsNoCase(joinedName, target.alias.empty() ? target.table : target.alias)) {
    FailAt("צירוף טבלה לעצמה בעדכון דורש כינוי", t[join].pos);
  }

  const size_t end = t.size();
  const bool whereReadsJoined = where < end && ReadsOtherTable(t, where + 1, end, target);
  std::string matching = " FROM";
  Emit(matching, t, join + 1, on);
  matching += " WHERE";
  if (whereReadsJoined) {
    matching += " (";
    Emit(matching, t, on + 1, set, false);
    matching += ") AND (";
    Emit(matching, t, where + 1, end, false);
    matching += ')';
  } else {
    Emit(matching, t, on + 1, set);
  }

  const std::vector<Assignment> list = ParseSetList(t, set + 1, where);
  std::string out = "UPDATE";
  Emit(out, t, 1, joinKind);
  out += " SET";
  EmitSetList(out, t, list, target, &matching);
  out += " WHERE EXISTS (SELECT 1";
  out += matching;
  out += ')';
  if (where < end && !whereReadsJoined) {
    out += " AND (";
    Emit(out, t, where + 1, end, false);
    out += ')';
  }
  return out;
}

std::string TranslateUpdate(const Range& t) {
  const size_t end = t.size();
  const size_t set = FindTop(t, 1, end, "SET");
  if (set == end) Fail("UPDATE ללא SET");
  if (set + 1 == end) Fail("SET ללא השמות");
  const size_t where = FindTop(t, set + 1, end, "WHERE");
  if (where + 1 == end) Fail("WHERE ללא תנאי");
  const size_t join = FindTop(t, 1, set, "JOIN");
  if (join != set) return TranslateJoinUpdate(t, join, set, where);

  TableNames target;
  if (!ParseTableRef(t, 1, set, target)) {
    FailAt("צפוי שם טבלה אחרי UPDATE", t.size() > 1 ? t[1].pos : 0);
  }
  const std::vector<Assignment> list = ParseSetList(t, set + 1, where);
  std::string out = "UPDATE";
  Emit(out, t, 1, set);
  out += " SET";
  EmitSetList(out, t, list, target, nullptr);
  Emit(out, t, where, end);
  return out;
}

// DELETE [T.* | *] FROM T [WHERE w] -> DELETE FROM T [WHERE w]
std::string TranslateDelete(const Range& t) {
  const size_t end = t.size();
  const size_t from = FindTop(t, 1, end, "FROM");
  if (from == end) Fail("DELETE ללא FROM");
  const bool star = from == 2 && t[1].kind == Tok::Op && t[1].text == "*";
  const bool tableStar = from == 4 && IsName(t[1]) && t[2].kind == Tok::Dot &&
                         t[3].kind == Tok::Op && t[3].text == "*";
  if (from != 1 && !star && !tableStar) FailAt("רשימה לא צפויה אחרי DELETE", t[1].pos);
  if (FindTop(t, from + 1, end, "JOIN") != end) Fail("מחיקה עם צירוף אינה נתמכת");
  std::string out = "DELETE";
  Emit(out, t, from, end);
  return out;
}

// "( SELECT DISTINCT F FROM T )" -> "( SELECT F FROM <table of T's distinct F values> )" where
// such a table is kept. Only this exact shape: a WHERE, a qualifier or a second column would
// make the subquery's values differ from the kept ones.
void RewriteDistinctSubqueries(Range& t, const DistinctValuesTable& distinctValues) {
  for (size_t i = 0; i + 6 < t.size(); ++i) {
    if (t[i].kind != Tok::LParen || !IsWord(t[i + 1], "SELECT") || !IsWord(t[i + 2], "DISTINCT") ||
        !IsName(t[i + 3]) || IsExpressionKeyword(t[i + 3]) || !IsWord(t[i + 4], "FROM") ||
        !IsName(t[i + 5]) || t[i + 6].kind != Tok::RParen) {
      continue;
    }
    const std::string kept = distinctValues(t[i + 5].text, t[i + 3].text);
    if (kept.empty()) continue;
    t[i + 5].kind = Tok::Bracketed;
    t[i + 5].text = kept;
    // The kept values are distinct already.
    t.erase(t.begin() + static_cast<std::ptrdiff_t>(i + 2));
  }
}

}  // namespace

std::string TranslateJetSql(std::string_view jet, const DistinctValuesTable& distinctValues) {
  Range t = Tokenize(jet);
  if (t.empty()) Fail("משפט ריק");
  CheckParentheses(t);
  RewriteCommon(t);
  const Token& first = t.front();
  if (IsWord(first, "UPDATE")) return TranslateUpdate(t);
  if (IsWord(first, "DELETE")) return TranslateDelete(t);
  if (IsWord(first, "SELECT") || IsWord(first, "INSERT") || first.kind == Tok::LParen) {
    if (distinctValues && !IsWord(first, "INSERT")) RewriteDistinctSubqueries(t, distinctValues);
    std::string out;
    out.reserve(jet.size() + 16);
    Emit(out, t, 0, t.size(), false);
    return out;
  }
  FailAt("סוג משפט לא נתמך: " + first.text, first.pos);
}

// ---------------------------------------------------------------------------------------
// LIKE

namespace {

// Next code point of UTF-8 text at `i`, advancing `i`. A byte that does not start a valid
// sequence stands for itself, mapped into the surrogate range so that it matches only
// the same byte.
char32_t NextChar(std::string_view s, size_t& i) {
  const unsigned char b0 = s[i];
  if (b0 < 0x80) {
    ++i;
    return b0;
  }
  int len = 0;
  char32_t c = 0;
  char32_t min = 0;
  if ((b0 & 0xE0) == 0xC0) {
    len = 2, c = b0 & 0x1F, min = 0x80;
  } else if ((b0 & 0xF0) == 0xE0) {
    len = 3, c = b0 & 0x0F, min = 0x800;
  } else if ((b0 & 0xF8) == 0xF0) {
    len = 4, c = b0 & 0x07, min = 0x10000;
  }
  if (len == 0 || i + len > s.size()) {
    ++i;
    return 0xDC00 | b0;
  }
  for (int k = 1; k < len; ++k) {
    const unsigned char b = s[i + k];
    if ((b & 0xC0) != 0x80) {
      ++i;
      return 0xDC00 | b0;
    }
    c = (c << 6) | (b & 0x3F);
  }
  if (c < min || c > 0x10FFFF || (c >= 0xD800 && c <= 0xDFFF)) {
    ++i;
    return 0xDC00 | b0;
  }
  i += len;
  return c;
}

// The other case of a Latin letter (ASCII and Latin-1), or the character itself.
char32_t OtherCase(char32_t c) {
  if (c >= 'A' && c <= 'Z') return c + 32;
  if (c >= 'a' && c <= 'z') return c - 32;
  if (c >= 0xC0 && c <= 0xDE && c != 0xD7) return c + 32;
  if (c >= 0xE0 && c <= 0xFE && c != 0xF7) return c - 32;
  return c;
}

char32_t Fold(char32_t c) {
  if ((c >= 'A' && c <= 'Z') || (c >= 0xC0 && c <= 0xDE && c != 0xD7)) return c + 32;
  return c;
}

// One element of a pattern, read from `p`.
struct Element {
  enum Kind { Literal, Any, Digit, List, Empty } kind;
  char32_t ch = 0;       // Literal
  size_t listBegin = 0;  // List: the characters between `[` (or `[!`) and `]`
  size_t listEnd = 0;
  bool negated = false;
  size_t next = 0;  // where the following element starts
};

Element ReadElement(std::string_view pat, size_t p) {
  Element e{};
  const char c = pat[p];
  if (c == '?') {
    e.kind = Element::Any;
    e.next = p + 1;
  } else if (c == '#') {
    e.kind = Element::Digit;
    e.next = p + 1;
  } else if (c == '[') {
    const size_t close = pat.find(']', p + 1);
    if (close == std::string_view::npos) {
      // An unclosed bracket is taken as itself.
      e.kind = Element::Literal;
      e.ch = '[';
      e.next = p + 1;
    } else if (close == p + 1) {
      e.kind = Element::Empty;  // "[]" matches the empty string
      e.next = close + 1;
    } else {
      e.kind = Element::List;
      e.listBegin = p + 1;
      if (pat[e.listBegin] == '!' && e.listBegin + 1 < close) {
        e.negated = true;
        ++e.listBegin;
      }
      e.listEnd = close;
      e.next = close + 1;
    }
  } else {
    e.kind = Element::Literal;
    size_t q = p;
    e.ch = NextChar(pat, q);
    e.next = q;
  }
  return e;
}

bool InList(std::string_view pat, const Element& e, char32_t c, bool caseSensitive) {
  const char32_t alt = caseSensitive ? c : OtherCase(c);
  size_t i = e.listBegin;
  bool found = false;
  while (i < e.listEnd && !found) {
    const char32_t lo = NextChar(pat, i);
    char32_t hi = lo;
    // a-z is a range; a '-' first or last in the list stands for itself.
    if (i + 1 < e.listEnd && pat[i] == '-') {
      size_t j = i + 1;
      hi = NextChar(pat, j);
      i = j;
    }
    found = (c >= lo && c <= hi) || (alt >= lo && alt <= hi);
  }
  return found != e.negated;
}

bool Matches(std::string_view pat, const Element& e, char32_t c, bool caseSensitive) {
  switch (e.kind) {
    case Element::Any:
      return true;
    case Element::Digit:
      return c >= '0' && c <= '9';
    case Element::List:
      return InList(pat, e, c, caseSensitive);
    case Element::Literal:
      return caseSensitive ? e.ch == c : Fold(e.ch) == Fold(c);
    case Element::Empty:
      return false;
  }
  return false;
}

}  // namespace

bool JetLike(std::string_view pattern, std::string_view text, bool caseSensitive) {
  constexpr size_t kNone = static_cast<size_t>(-1);
  size_t p = 0, t = 0;
  size_t starP = kNone, starT = 0;  // where to retry after the last '*'
  while (t < text.size()) {
    if (p < pattern.size()) {
      if (pattern[p] == '*') {
        while (p < pattern.size() && pattern[p] == '*') ++p;
        starP = p;
        starT = t;
        continue;
      }
      const Element e = ReadElement(pattern, p);
      if (e.kind == Element::Empty) {
        p = e.next;
        continue;
      }
      size_t tNext = t;
      const char32_t c = NextChar(text, tNext);
      if (Matches(pattern, e, c, caseSensitive)) {
        p = e.next;
        t = tNext;
        continue;
      }
    }
    if (starP == kNone) return false;
    // Let the last '*' swallow one more character and try again from there.
    NextChar(text, starT);
    t = starT;
    p = starP;
  }
  while (p < pattern.size()) {
    if (pattern[p] == '*') {
      ++p;
    } else if (pattern[p] == '[' && p + 1 < pattern.size() && pattern[p + 1] == ']') {
      p += 2;
    } else {
      return false;
    }
  }
  return true;
}

}  // namespace zdr::db
