#include <algorithm>
#include <string>
#include <vector>

#include "engine/engine.h"
#include "engine/engineinternal.h"

namespace zdr::db {

namespace {

// Separates the field names of one index inside _zdr_indexes.fields.
constexpr char kFieldSeparator = '\x1f';

bool TypeFromName(std::string_view name, FieldType& t) {
  for (FieldType c : {FieldType::Text, FieldType::Byte, FieldType::Integer, FieldType::Long,
                      FieldType::Double, FieldType::Date, FieldType::Boolean}) {
    if (name == TypeName(c)) {
      t = c;
      return true;
    }
  }
  return false;
}

const FieldDef* FindField(const TableDef& def, const std::string& name) {
  for (const FieldDef& f : def.fields) {
    if (EqualsNoCase(f.name, name)) return &f;
  }
  return nullptr;
}

// Refuses a definition the engine cannot keep: no fields, a field without a name or a Text
// width outside 1 to 255, a field or index name given twice, an index without a name or over
// a field the table lacks, more than one primary index. Returns the primary index, if any.
const IndexDef* CheckTableDef(const TableDef& def) {
  if (def.fields.empty()) {
    throw EngineError(kErrEngine, "לטבלה '" + def.name + "' אין שדות.");
  }
  for (size_t i = 0; i < def.fields.size(); ++i) {
    const FieldDef& f = def.fields[i];
    if (f.name.empty()) throw EngineError(kErrEngine, "חסר שם לשדה בטבלה '" + def.name + "'.");
    if (f.type == FieldType::Text && (f.size < 1 || f.size > 255)) {
      throw EngineError(kErrEngine, "רוחב השדה '" + f.name + "' חייב להיות בין 1 ל-255.");
    }
    for (size_t j = 0; j < i; ++j) {
      if (EqualsNoCase(def.fields[j].name, f.name)) {
        throw EngineError(kErrObjectExists,
                          "השדה '" + f.name + "' מופיע פעמיים בטבלה '" + def.name + "'.");
      }
    }
  }
  const IndexDef* primary = nullptr;
  for (size_t i = 0; i < def.indexes.size(); ++i) {
    const IndexDef& ix = def.indexes[i];
    if (ix.name.empty() || ix.fields.empty()) {
      throw EngineError(kErrEngine, "אינדקס ללא שם או ללא שדות בטבלה '" + def.name + "'.");
    }
    for (const std::string& f : ix.fields) {
      if (FindField(def, f) == nullptr) {
        throw EngineError(kErrNoSuchField,
                          "השדה '" + f + "' של האינדקס '" + ix.name + "' אינו בטבלה.");
      }
    }
    for (size_t j = 0; j < i; ++j) {
      if (EqualsNoCase(def.indexes[j].name, ix.name)) {
        throw EngineError(kErrObjectExists, "האינדקס '" + ix.name + "' כבר קיים.");
      }
    }
    if (ix.primary) {
      if (primary != nullptr) {
        throw EngineError(kErrEngine, "לטבלה '" + def.name + "' יותר ממפתח ראשי אחד.");
      }
      primary = &ix;
    }
  }
  // Kept distinct values come from a Text field of the primary key: never Null, so the kept
  // values and the subquery's are the same set.
  for (const std::string& name : def.keptDistinct) {
    const FieldDef* f = FindField(def, name);
    const bool inKey = primary != nullptr &&
                       std::any_of(primary->fields.begin(), primary->fields.end(),
                                   [&](const std::string& k) { return EqualsNoCase(k, name); });
    if (f == nullptr || f->type != FieldType::Text || !inKey) {
      throw EngineError(
          kErrEngine,
          "ערכי השדה '" + name + "' נשמרים רק לשדה טקסט של המפתח הראשי בטבלה '" + def.name + "'.");
    }
  }
  return primary;
}

// The statements that make the table: CREATE TABLE, then CREATE INDEX for every index but the
// primary one (which the table's PRIMARY KEY holds).
std::vector<std::string> TableDdl(const TableDef& def, const IndexDef* primary) {
  // Columns: typed, text under the Hebrew collation; the checks repeat the recordset's
  // refusals for rows that UPDATE statements change.
  std::string ddl = "CREATE TABLE " + QuoteId(def.name) + " (";
  for (size_t i = 0; i < def.fields.size(); ++i) {
    const FieldDef& f = def.fields[i];
    const std::string col = QuoteId(f.name);
    if (i > 0) ddl += ", ";
    ddl += col;
    switch (f.type) {
      case FieldType::Text:
        ddl += " TEXT COLLATE HEBREW CONSTRAINT " +
               QuoteId(std::string(kCheckZeroLength) + f.name) + " CHECK (length(" + col +
               ") > 0) CONSTRAINT " + QuoteId(std::string(kCheckTooLong) + f.name) +
               " CHECK (length(" + col + ") <= " + std::to_string(f.size) + ")";
        break;
      case FieldType::Byte:
      case FieldType::Integer:
      case FieldType::Long: {
        int64_t lo, hi;
        IntegerRange(f.type, lo, hi);
        ddl += " INTEGER CONSTRAINT " + QuoteId(std::string(kCheckRange) + f.name) + " CHECK (" +
               col + " BETWEEN " + std::to_string(lo) + " AND " + std::to_string(hi) + ")";
        break;
      }
      case FieldType::Boolean:
        ddl += " INTEGER";
        break;
      case FieldType::Double:
      case FieldType::Date:
        ddl += " REAL";
        break;
    }
    if (primary != nullptr) {
      for (const std::string& k : primary->fields) {
        if (EqualsNoCase(k, f.name)) {
          ddl += " NOT NULL";
          break;
        }
      }
    }
  }
  if (primary != nullptr) {
    ddl += ", PRIMARY KEY (";
    for (size_t k = 0; k < primary->fields.size(); ++k) {
      if (k > 0) ddl += ", ";
      ddl += QuoteId(FindField(def, primary->fields[k])->name);
    }
    ddl += ")";
  }
  ddl += ")";
  std::vector<std::string> statements;
  statements.push_back(std::move(ddl));
  for (const IndexDef& ix : def.indexes) {
    if (ix.primary) continue;
    // Index names are the table's own: "PrimaryKey" or "SortByKey" may repeat in other
    // tables, so the SQLite name carries the table name.
    std::string sql = std::string(ix.unique ? "CREATE UNIQUE INDEX " : "CREATE INDEX ") +
                      QuoteId(def.name + "." + ix.name) + " ON " + QuoteId(def.name) + " (";
    for (size_t k = 0; k < ix.fields.size(); ++k) {
      if (k > 0) sql += ", ";
      sql += QuoteId(FindField(def, ix.fields[k])->name);
    }
    sql += ")";
    statements.push_back(std::move(sql));
  }
  for (const std::string& name : def.keptDistinct) {
    const FieldDef& f = *FindField(def, name);
    statements.push_back("CREATE TABLE " + QuoteId(KeptDistinctTable(def.name, f.name)) + " (" +
                         QuoteId(f.name) +
                         " TEXT COLLATE HEBREW NOT NULL PRIMARY KEY) WITHOUT ROWID");
  }
  return statements;
}

}  // namespace

const char* TypeName(FieldType t) {
  switch (t) {
    case FieldType::Text:
      return "Text";
    case FieldType::Byte:
      return "Byte";
    case FieldType::Integer:
      return "Integer";
    case FieldType::Long:
      return "Long";
    case FieldType::Double:
      return "Double";
    case FieldType::Date:
      return "Date";
    case FieldType::Boolean:
      return "Boolean";
  }
  return "Text";
}

void IntegerRange(FieldType t, int64_t& lo, int64_t& hi) {
  switch (t) {
    case FieldType::Byte:
      lo = 0, hi = 255;
      break;
    case FieldType::Integer:
      lo = INT16_MIN, hi = INT16_MAX;
      break;
    default:
      lo = INT32_MIN, hi = INT32_MAX;
      break;
  }
}

bool ReadTableDef(sqlite3* db, const std::string& schema, const std::string& table, TableDef& def) {
  const std::string q = QuoteId(schema);
  {
    Statement st;
    const std::string sql =
        "SELECT name, type, size FROM " + q + "._zdr_fields WHERE tbl = ?1 ORDER BY pos";
    if (sqlite3_prepare_v2(db, sql.c_str(), -1, st.out(), nullptr) != SQLITE_OK) {
      throw StepFailure(db, sqlite3_errcode(db), sql);
    }
    sqlite3_bind_text(st.get(), 1, table.data(), static_cast<int>(table.size()), SQLITE_TRANSIENT);
    int rc;
    while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
      FieldDef f;
      f.name = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0));
      TypeFromName(reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 1)), f.type);
      f.size = sqlite3_column_int(st.get(), 2);
      def.fields.push_back(std::move(f));
    }
    if (rc != SQLITE_DONE) throw StepFailure(db, rc, sql);
  }
  if (def.fields.empty()) return false;
  Statement st;
  const std::string sql = "SELECT name, fields, is_primary, is_unique FROM " + q +
                          "._zdr_indexes WHERE tbl = ?1 ORDER BY pos";
  if (sqlite3_prepare_v2(db, sql.c_str(), -1, st.out(), nullptr) != SQLITE_OK) {
    throw StepFailure(db, sqlite3_errcode(db), sql);
  }
  sqlite3_bind_text(st.get(), 1, table.data(), static_cast<int>(table.size()), SQLITE_TRANSIENT);
  int rc;
  while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
    IndexDef ix;
    ix.name = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0));
    const std::string joined = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 1));
    size_t start = 0;
    while (start <= joined.size()) {
      const size_t end = std::min(joined.find(kFieldSeparator, start), joined.size());
      ix.fields.push_back(joined.substr(start, end - start));
      start = end + 1;
    }
    ix.primary = sqlite3_column_int(st.get(), 2) != 0;
    ix.unique = sqlite3_column_int(st.get(), 3) != 0;
    def.indexes.push_back(std::move(ix));
  }
  if (rc != SQLITE_DONE) throw StepFailure(db, rc, sql);
  // The stored name keeps the case it was created with.
  Statement nameSt;
  const std::string nameSql = "SELECT tbl FROM " + q + "._zdr_fields WHERE tbl = ?1 LIMIT 1";
  if (sqlite3_prepare_v2(db, nameSql.c_str(), -1, nameSt.out(), nullptr) == SQLITE_OK) {
    sqlite3_bind_text(nameSt.get(), 1, table.data(), static_cast<int>(table.size()),
                      SQLITE_TRANSIENT);
    if (sqlite3_step(nameSt.get()) == SQLITE_ROW) {
      def.name = reinterpret_cast<const char*>(sqlite3_column_text(nameSt.get(), 0));
    }
  }
  return true;
}

void Database::CreateTable(const TableDef& def) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  Impl& d = *impl_;
  d.RefuseTakenName(def.name);
  const IndexDef* primary = CheckTableDef(def);
  const std::vector<std::string> ddl = TableDdl(def, primary);

  const bool ownTransaction = sqlite3_get_autocommit(d.db()) != 0;
  if (ownTransaction) d.Exec("BEGIN");
  try {
    for (const std::string& sql : ddl) d.Exec(sql);
    Statement fieldSt;
    const std::string fieldSql =
        "INSERT INTO _zdr_fields (tbl, pos, name, type, size) VALUES (?1, ?2, ?3, ?4, ?5)";
    d.Prepare(fieldSql, fieldSt, fieldSql);
    for (size_t i = 0; i < def.fields.size(); ++i) {
      const FieldDef& f = def.fields[i];
      sqlite3_bind_text(fieldSt.get(), 1, def.name.c_str(), -1, SQLITE_STATIC);
      sqlite3_bind_int64(fieldSt.get(), 2, static_cast<int64_t>(i));
      sqlite3_bind_text(fieldSt.get(), 3, f.name.c_str(), -1, SQLITE_STATIC);
      sqlite3_bind_text(fieldSt.get(), 4, TypeName(f.type), -1, SQLITE_STATIC);
      sqlite3_bind_int(fieldSt.get(), 5, f.type == FieldType::Text ? f.size : 0);
      const int rc = sqlite3_step(fieldSt.get());
      if (rc != SQLITE_DONE) throw StepFailure(d.db(), rc, fieldSql);
      sqlite3_reset(fieldSt.get());
    }
    Statement indexSt;
    const std::string indexSql =
        "INSERT INTO _zdr_indexes (tbl, pos, name, fields, is_primary, is_unique)"
        " VALUES (?1, ?2, ?3, ?4, ?5, ?6)";
    d.Prepare(indexSql, indexSt, indexSql);
    for (size_t i = 0; i < def.indexes.size(); ++i) {
      const IndexDef& ix = def.indexes[i];
      std::string joined;
      for (size_t k = 0; k < ix.fields.size(); ++k) {
        if (k > 0) joined += kFieldSeparator;
        joined += ix.fields[k];
      }
      sqlite3_bind_text(indexSt.get(), 1, def.name.c_str(), -1, SQLITE_STATIC);
      sqlite3_bind_int64(indexSt.get(), 2, static_cast<int64_t>(i));
      sqlite3_bind_text(indexSt.get(), 3, ix.name.c_str(), -1, SQLITE_STATIC);
      sqlite3_bind_text(indexSt.get(), 4, joined.c_str(), -1, SQLITE_TRANSIENT);
      sqlite3_bind_int(indexSt.get(), 5, ix.primary ? 1 : 0);
      // A primary index is always unique.
      sqlite3_bind_int(indexSt.get(), 6, (ix.unique || ix.primary) ? 1 : 0);
      const int rc = sqlite3_step(indexSt.get());
      if (rc != SQLITE_DONE) throw StepFailure(d.db(), rc, indexSql);
      sqlite3_reset(indexSt.get());
    }
  } catch (...) {
    if (ownTransaction) sqlite3_exec(d.db(), "ROLLBACK", nullptr, nullptr, nullptr);
    throw;
  }
  if (ownTransaction) d.Exec("COMMIT");
}

TableDef Database::Describe(const std::string& table) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  TableDef def(table);
  std::string schema;
  if (!impl_->Locate(table, schema, def)) {
    throw EngineError(kErrNoSuchObject, "הטבלה '" + table + "' אינה קיימת.");
  }
  if (impl_->FindLink(table) != nullptr) def.name = impl_->FindLink(table)->name;
  return def;
}

}  // namespace zdr::db
