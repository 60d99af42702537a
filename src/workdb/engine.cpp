#include "workdb/engine.h"

#include <sqlite3.h>

#ifndef _WIN32
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#endif

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstring>
#include <optional>
#include <system_error>
#include <utility>

#include "workdb/collation.h"
#include "workdb/jetsql.h"

namespace zdr::db {
namespace fs = std::filesystem;

namespace {

// Definitions live in these tables of every file, so a reopened file describes itself.
constexpr const char* kMetadataDdl =
    "CREATE TABLE _zdr_info (key TEXT PRIMARY KEY, value TEXT);"
    "CREATE TABLE _zdr_fields (tbl TEXT COLLATE NOCASE, pos INTEGER, name TEXT, type TEXT,"
    " size INTEGER, PRIMARY KEY (tbl, pos));"
    "CREATE TABLE _zdr_indexes (tbl TEXT COLLATE NOCASE, pos INTEGER, name TEXT, fields TEXT,"
    " is_primary INTEGER, is_unique INTEGER, PRIMARY KEY (tbl, pos));"
    "CREATE TABLE _zdr_links (name TEXT PRIMARY KEY COLLATE NOCASE, path TEXT, source TEXT);"
    "CREATE TABLE _zdr_queries (name TEXT PRIMARY KEY COLLATE NOCASE, jet TEXT);";

// Separates the field names of one index inside _zdr_indexes.fields.
constexpr char kFieldSeparator = '\x1f';

// Prefixes of the CHECK constraint names, which tell which refusal a failed check means.
constexpr std::string_view kCheckZeroLength = "zdr_zero_length:";
constexpr std::string_view kCheckTooLong = "zdr_too_long:";
constexpr std::string_view kCheckRange = "zdr_range:";

// Pragmas per durability. The working database is rebuilt at every load and needs neither
// journal nor sync; the account-selection database keeps the user's ticks.
// The working database's page cache is 8 MB: the load appends (mostly in key order) and runs as
// fast with it as with 64 MB, and the sorter of a selection spills to its file beyond the same
// size. Temporary tables and sort runs go to files, so a selection of any size (and the
// snapshot that keeps its rows, see OpenSnapshot) takes no more memory than that.
// Both leave the CHECK constraints unevaluated on the connection: a table recordset checks
// every row it appends itself, before binding it, and paying the same checks again in SQLite
// was a third of an account load. Statements that may write (Execute, and a snapshot of a
// statement that is not read-only) run under EnforcedChecks instead.
constexpr const char* kScratchPragmas =
    "PRAGMA journal_mode=OFF; PRAGMA synchronous=OFF; PRAGMA temp_store=FILE;"
    " PRAGMA cache_size=-8192; PRAGMA ignore_check_constraints=ON;";
constexpr const char* kDurablePragmas =
    "PRAGMA journal_mode=DELETE; PRAGMA synchronous=FULL; PRAGMA ignore_check_constraints=ON;";

constexpr int kBusyTimeoutMs = 5000;

char LowerAscii(char c) {
  return (c >= 'A' && c <= 'Z') ? static_cast<char>(c - 'A' + 'a') : c;
}

bool EqualsNoCase(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return false;
  for (size_t i = 0; i < a.size(); ++i) {
    if (LowerAscii(a[i]) != LowerAscii(b[i])) return false;
  }
  return true;
}

std::string QuoteId(std::string_view id) {
  std::string out = "\"";
  for (char c : id) {
    if (c == '"') out += '"';
    out += c;
  }
  out += '"';
  return out;
}

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

// Number of code points in `s`, or -1 when `s` is not well-formed UTF-8.
int64_t CountUtf8(std::string_view s) {
  const auto* p = reinterpret_cast<const unsigned char*>(s.data());
  const auto* end = p + s.size();
  int64_t count = 0;
  while (p < end) {
    const unsigned char c = *p;
    if (c < 0x80) {
      ++p;
    } else if (c >= 0xC2 && c <= 0xDF) {
      if (end - p < 2 || (p[1] & 0xC0) != 0x80) return -1;
      p += 2;
    } else if (c >= 0xE0 && c <= 0xEF) {
      if (end - p < 3 || (p[1] & 0xC0) != 0x80 || (p[2] & 0xC0) != 0x80) return -1;
      if (c == 0xE0 && p[1] < 0xA0) return -1;   // overlong
      if (c == 0xED && p[1] >= 0xA0) return -1;  // surrogate
      p += 3;
    } else if (c >= 0xF0 && c <= 0xF4) {
      if (end - p < 4 || (p[1] & 0xC0) != 0x80 || (p[2] & 0xC0) != 0x80 || (p[3] & 0xC0) != 0x80)
        return -1;
      if (c == 0xF0 && p[1] < 0x90) return -1;   // overlong
      if (c == 0xF4 && p[1] >= 0x90) return -1;  // above U+10FFFF
      p += 4;
    } else {
      return -1;
    }
    ++count;
  }
  return count;
}

std::string SqliteMessage(sqlite3* db) {
  const char* m = db != nullptr ? sqlite3_errmsg(db) : nullptr;
  return m != nullptr ? m : "unknown SQLite failure";
}

// A prepared statement finalized on every way out.
class Statement {
 public:
  Statement() = default;
  Statement(const Statement&) = delete;
  Statement& operator=(const Statement&) = delete;
  ~Statement() { sqlite3_finalize(stmt_); }
  sqlite3_stmt** out() { return &stmt_; }
  sqlite3_stmt* get() const { return stmt_; }

 private:
  sqlite3_stmt* stmt_ = nullptr;
};

// Refusal that a failed CHECK constraint stands for (see the constraint names above).
EngineError CheckFailure(std::string_view message) {
  const size_t at = message.find("failed: ");
  const std::string_view name = at == std::string_view::npos ? "" : message.substr(at + 8);
  if (name.starts_with(kCheckZeroLength)) {
    return EngineError(kErrZeroLength, "השדה '" +
                                           std::string(name.substr(kCheckZeroLength.size())) +
                                           "' אינו יכול להכיל מחרוזת באורך אפס.");
  }
  if (name.starts_with(kCheckTooLong)) {
    return EngineError(
        kErrFieldTooSmall,
        "הטקסט ארוך מדי עבור השדה '" + std::string(name.substr(kCheckTooLong.size())) + "'.");
  }
  if (name.starts_with(kCheckRange)) {
    return EngineError(
        kErrNumericOverflow,
        "הערך חורג מתחום השדה '" + std::string(name.substr(kCheckRange.size())) + "'.");
  }
  return EngineError(kErrEngine, "תנאי תקינות נכשל: " + std::string(message));
}

// The engine error for a failed step or exec on `db`.
EngineError StepFailure(sqlite3* db, int rc, std::string_view sql) {
  const int extended = sqlite3_extended_errcode(db);
  const std::string message = SqliteMessage(db);
  switch (extended) {
    case SQLITE_CONSTRAINT_PRIMARYKEY:
    case SQLITE_CONSTRAINT_UNIQUE:
      return EngineError(kErrDuplicateKey,
                         "הרשומה לא נשמרה: הערך כבר קיים באינדקס ייחודי (" + message + ").");
    case SQLITE_CONSTRAINT_NOTNULL:
      return EngineError(kErrNullKey,
                         "שדה של המפתח הראשי אינו יכול להיות ריק (Null) (" + message + ").");
    case SQLITE_CONSTRAINT_CHECK:
      return CheckFailure(message);
    default:
      break;
  }
  if ((rc & 0xFF) == SQLITE_CANTOPEN || (rc & 0xFF) == SQLITE_NOTADB) {
    return EngineError(kErrCannotOpen, "לא ניתן לקרוא את מסד הנתונים: " + message);
  }
  std::string description = "תקלה במנוע מסד הנתונים: " + message;
  if (!sql.empty()) description += "\nבמשפט: " + std::string(sql);
  return EngineError(kErrEngine, description);
}

void ExecOrThrow(sqlite3* db, const char* sql) {
  char* err = nullptr;
  const int rc = sqlite3_exec(db, sql, nullptr, nullptr, &err);
  sqlite3_free(err);
  if (rc != SQLITE_OK) throw StepFailure(db, rc, sql);
}

// While alive, the connection evaluates the tables' CHECK constraints. Statements must be
// prepared inside the scope: SQLite builds the checks into a statement when it compiles it,
// and every switch of the pragma makes the connection's statements compile again at their
// next step (so a recordset's append, outside the scope, goes back to its own checks).
class EnforcedChecks {
 public:
  explicit EnforcedChecks(sqlite3* db) : db_(db) {
    ExecOrThrow(db_, "PRAGMA ignore_check_constraints=OFF");
  }
  EnforcedChecks(const EnforcedChecks&) = delete;
  EnforcedChecks& operator=(const EnforcedChecks&) = delete;
  ~EnforcedChecks() {
    sqlite3_exec(db_, "PRAGMA ignore_check_constraints=ON", nullptr, nullptr, nullptr);
  }

 private:
  sqlite3* db_;
};

// "file:" URI for a path, so ATTACH can ask for an existing file only (mode=rw) and never
// creates an empty one where the other database should be.
std::string FileUri(const fs::path& path, const char* mode) {
  static const char* kHex = "0123456789ABCDEF";
  std::string uri = "file:";
  for (unsigned char c : path.generic_u8string()) {
    if ((c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '/' ||
        c == '-' || c == '_' || c == '.' || c == '~') {
      uri += static_cast<char>(c);
    } else {
      uri += '%';
      uri += kHex[c >> 4];
      uri += kHex[c & 0xF];
    }
  }
  uri += "?mode=";
  uri += mode;
  return uri;
}

std::string PathText(const fs::path& p) {
  const auto u8 = p.u8string();
  return std::string(u8.begin(), u8.end());
}

// The shared connection: the Database and every open recordset hold it, so rows appended
// through a recordset still reach the file when the Database object is closed first.
struct Connection {
  sqlite3* db = nullptr;
  int openRecordsets = 0;
  bool ownsTransaction = false;

  Connection() = default;
  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;
  ~Connection() {
    if (db == nullptr) return;
    if (ownsTransaction) sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr);
    sqlite3_close_v2(db);
  }

  // Called when a recordset opens: the first one begins the shared transaction.
  void RecordsetOpened() {
    if (openRecordsets == 0 && sqlite3_get_autocommit(db) != 0) {
      ExecOrThrow(db, "BEGIN");
      ownsTransaction = true;
    }
    ++openRecordsets;
  }

  // Called when a recordset closes: the last one commits. Returns the failure's
  // description, empty when the rows are in the file.
  std::string RecordsetClosed() {
    if (openRecordsets > 0) --openRecordsets;
    if (openRecordsets == 0 && ownsTransaction) {
      ownsTransaction = false;
      if (sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr) != SQLITE_OK) {
        std::string failure = SqliteMessage(db);
        // A failed COMMIT may leave the transaction open; end it so the connection does not
        // keep holding the file's lock.
        if (sqlite3_get_autocommit(db) == 0) {
          sqlite3_exec(db, "ROLLBACK", nullptr, nullptr, nullptr);
        }
        return failure;
      }
    }
    return std::string();
  }
};

struct LinkState {
  std::string name;
  std::string path;
  std::string source;
  std::string schema;   // the ATTACH name, empty while unresolved
  std::string failure;  // why the link could not be resolved at open
};

// Reads a table definition from the metadata of `schema` ("main" or a link's schema).
// Returns false when the table is not there.
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

}  // namespace

// ---------------------------------------------------------------------------------------
// Database

struct Database::Impl {
  std::shared_ptr<Connection> conn;
  fs::path path;
  std::vector<LinkState> links;
  // Stored queries whose view could not be made at open, with the reason.
  std::vector<std::pair<std::string, std::string>> brokenQueries;
  int nextLinkSchema = 1;
  int nextSpool = 1;

  sqlite3* db() const {
    if (!conn) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
    return conn->db;
  }

  // Prepares `sql` on the connection; a failure names the statement, and a table that is
  // missing because its link could not be resolved names the link's file.
  void Prepare(const std::string& sql, Statement& st, std::string_view shownSql) const {
    sqlite3* h = db();
    const char* tail = nullptr;
    const int rc =
        sqlite3_prepare_v2(h, sql.c_str(), static_cast<int>(sql.size()), st.out(), &tail);
    if (rc == SQLITE_OK && st.get() == nullptr) {
      throw EngineError(kErrSyntax, "המשפט ריק: " + std::string(shownSql));
    }
    if (rc == SQLITE_OK) {
      while (tail != nullptr && *tail != '\0' &&
             (*tail == ' ' || *tail == ';' || *tail == '\n' || *tail == '\r' || *tail == '\t'))
        ++tail;
      if (tail != nullptr && *tail != '\0') {
        throw EngineError(kErrSyntax, "תווים אחרי סוף המשפט: " + std::string(shownSql));
      }
      return;
    }
    const std::string message = SqliteMessage(h);
    if ((rc & 0xFF) == SQLITE_NOTADB || (rc & 0xFF) == SQLITE_CANTOPEN) {
      throw EngineError(kErrCannotOpen, "לא ניתן לקרוא את מסד הנתונים: " + message);
    }
    constexpr std::string_view kNoSuchTable = "no such table: ";
    if (message.starts_with(kNoSuchTable)) {
      std::string missing = message.substr(kNoSuchTable.size());
      if (const size_t dot = missing.rfind('.'); dot != std::string::npos) {
        missing = missing.substr(dot + 1);
      }
      for (const LinkState& link : links) {
        if (EqualsNoCase(link.name, missing) && link.schema.empty()) {
          throw EngineError(kErrCannotOpen, "לא ניתן לקרוא את הטבלה המקושרת '" + link.name +
                                                "' מהקובץ '" + link.path + "': " + link.failure);
        }
      }
      for (const auto& [query, failure] : brokenQueries) {
        if (EqualsNoCase(query, missing)) {
          throw EngineError(kErrSyntax,
                            "לא ניתן להריץ את השאילתה השמורה '" + query + "': " + failure);
        }
      }
      throw EngineError(kErrNoSuchObject, "הטבלה או השאילתה '" + missing +
                                              "' אינה קיימת.\nבמשפט: " + std::string(shownSql));
    }
    throw EngineError(kErrSyntax,
                      "לא ניתן להריץ את המשפט: " + message + "\nבמשפט: " + std::string(shownSql));
  }

  void Exec(const std::string& sql) const { ExecOrThrow(db(), sql.c_str()); }

  const LinkState* FindLink(std::string_view name) const {
    for (const LinkState& link : links) {
      if (EqualsNoCase(link.name, name)) return &link;
    }
    return nullptr;
  }

  bool HasLocalObject(const std::string& name, const char* metaTable) const {
    Statement st;
    const std::string sql = std::string("SELECT 1 FROM ") + metaTable + " WHERE " +
                            (std::string_view(metaTable) == "_zdr_fields" ? "tbl" : "name") +
                            " = ?1 LIMIT 1";
    Prepare(sql, st, sql);
    sqlite3_bind_text(st.get(), 1, name.data(), static_cast<int>(name.size()), SQLITE_TRANSIENT);
    const int rc = sqlite3_step(st.get());
    if (rc != SQLITE_ROW && rc != SQLITE_DONE) throw StepFailure(db(), rc, sql);
    return rc == SQLITE_ROW;
  }

  // A table, link or query already named `name` (names compare without regard to case).
  void RefuseTakenName(const std::string& name) const {
    if (name.empty()) throw EngineError(kErrEngine, "חסר שם לטבלה או לשאילתה.");
    if (name.starts_with("_zdr_") ||
        EqualsNoCase(name.substr(0, std::min<size_t>(7, name.size())), "sqlite_")) {
      throw EngineError(kErrEngine, "השם '" + name + "' שמור למנוע מסד הנתונים.");
    }
    if (HasLocalObject(name, "_zdr_fields") || HasLocalObject(name, "_zdr_queries") ||
        FindLink(name) != nullptr) {
      throw EngineError(kErrObjectExists, "האובייקט '" + name + "' כבר קיים.");
    }
  }

  // Attaches the link's file and puts a view under the link's name over its source table.
  // Throws when the file or the table cannot be read; the link then stays unresolved.
  void Resolve(LinkState& link) {
    sqlite3* h = db();
    link.schema.clear();
    std::error_code ec;
    const fs::path other = fs::u8path(link.path);
    if (!fs::is_regular_file(other, ec)) {
      throw EngineError(kErrCannotOpen,
                        "לא נמצא הקובץ '" + link.path + "' של הטבלה המקושרת '" + link.name + "'.");
    }
    const std::string schema = "zdr_link_" + std::to_string(nextLinkSchema++);
    {
      Statement st;
      const std::string sql = "ATTACH ?1 AS " + QuoteId(schema);
      Prepare(sql, st, sql);
      const std::string uri = FileUri(other, "rw");
      sqlite3_bind_text(st.get(), 1, uri.data(), static_cast<int>(uri.size()), SQLITE_TRANSIENT);
      const int rc = sqlite3_step(st.get());
      if (rc != SQLITE_DONE) {
        throw EngineError(kErrCannotOpen, "לא ניתן לפתוח את הקובץ '" + link.path +
                                              "' של הטבלה המקושרת '" + link.name +
                                              "': " + SqliteMessage(h));
      }
    }
    try {
      Statement st;
      const std::string sql = "SELECT 1 FROM " + QuoteId(schema) +
                              ".sqlite_master WHERE type IN ('table', 'view') AND name = ?1 "
                              "COLLATE NOCASE";
      const int prc = sqlite3_prepare_v2(h, sql.c_str(), -1, st.out(), nullptr);
      int rc = prc;
      if (prc == SQLITE_OK) {
        sqlite3_bind_text(st.get(), 1, link.source.data(), static_cast<int>(link.source.size()),
                          SQLITE_TRANSIENT);
        rc = sqlite3_step(st.get());
      }
      if (rc == SQLITE_DONE) {
        throw EngineError(kErrNoSuchObject,
                          "הטבלה '" + link.source + "' אינה קיימת בקובץ '" + link.path + "'.");
      }
      if (rc != SQLITE_ROW) {
        throw EngineError(kErrCannotOpen, "לא ניתן לקרוא את הקובץ '" + link.path +
                                              "' של הטבלה המקושרת '" + link.name +
                                              "': " + SqliteMessage(h));
      }
      Exec("CREATE TEMP VIEW " + QuoteId(link.name) + " AS SELECT * FROM " + QuoteId(schema) + "." +
           QuoteId(link.source));
    } catch (...) {
      sqlite3_exec(h, ("DETACH " + QuoteId(schema)).c_str(), nullptr, nullptr, nullptr);
      throw;
    }
    link.schema = schema;
    link.failure.clear();
  }

  // Stored queries are temporary views made again at every open: a view kept in the file
  // could not read a link, whose view is temporary too.
  void CreateQueryView(const std::string& name, std::string_view jet) {
    const std::string select = TranslateJetSql(jet);
    Statement view;
    Prepare("CREATE TEMP VIEW " + QuoteId(name) + " AS " + select, view, jet);
    const int rc = sqlite3_step(view.get());
    if (rc != SQLITE_DONE) throw StepFailure(db(), rc, jet);
  }

  void LoadQueries() {
    Statement st;
    const std::string sql = "SELECT name, jet FROM _zdr_queries ORDER BY rowid";
    Prepare(sql, st, sql);
    int rc;
    while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
      const std::string name = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0));
      const std::string jet = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 1));
      try {
        CreateQueryView(name, jet);
      } catch (const EngineError& e) {
        brokenQueries.emplace_back(name, e.description());
      }
    }
    if (rc != SQLITE_DONE) throw StepFailure(db(), rc, sql);
  }

  void LoadLinks() {
    Statement st;
    const std::string sql = "SELECT name, path, source FROM _zdr_links ORDER BY rowid";
    Prepare(sql, st, sql);
    int rc;
    while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
      LinkState link;
      link.name = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0));
      link.path = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 1));
      link.source = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 2));
      links.push_back(std::move(link));
    }
    if (rc != SQLITE_DONE) throw StepFailure(db(), rc, sql);
    // A link whose file is missing now leaves the database usable; statements that read the
    // link report the reason.
    for (LinkState& link : links) {
      try {
        Resolve(link);
      } catch (const EngineError& e) {
        link.failure = e.description();
      }
    }
  }

  // Where the rows of `table` live: "main", or the schema of a resolved link.
  bool Locate(const std::string& table, std::string& schema, TableDef& def) const {
    if (const LinkState* link = FindLink(table)) {
      if (link->schema.empty()) {
        throw EngineError(kErrCannotOpen, "לא ניתן לקרוא את הטבלה המקושרת '" + link->name +
                                              "' מהקובץ '" + link->path + "': " + link->failure);
      }
      schema = link->schema;
      if (!ReadTableDef(db(), schema, link->source, def)) return false;
      def.name = link->source;
      return true;
    }
    schema = "main";
    return ReadTableDef(db(), schema, table, def);
  }
};

Database::Database(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}
Database::Database(Database&&) noexcept = default;
Database& Database::operator=(Database&&) noexcept = default;
Database::~Database() = default;

namespace {

std::shared_ptr<Connection> OpenConnection(const fs::path& path, int flags) {
  auto conn = std::make_shared<Connection>();
  const int rc = sqlite3_open_v2(FileUri(path, (flags & SQLITE_OPEN_CREATE) ? "rwc" : "rw").c_str(),
                                 &conn->db, flags | SQLITE_OPEN_URI, nullptr);
  if (rc != SQLITE_OK) {
    const std::string message = SqliteMessage(conn->db);
    throw EngineError(kErrCannotOpen,
                      "לא ניתן לפתוח את קובץ מסד הנתונים '" + PathText(path) + "': " + message);
  }
  sqlite3_extended_result_codes(conn->db, 1);
  sqlite3_busy_timeout(conn->db, kBusyTimeoutMs);
  if (RegisterHebrewCollation(conn->db) != SQLITE_OK || RegisterJetLike(conn->db) != SQLITE_OK) {
    throw EngineError(kErrEngine, "לא ניתן להכין את החיבור: " + SqliteMessage(conn->db));
  }
  return conn;
}

// The databases hold customers' names and addresses and live in a temporary folder that may
// be shared: the file is made here, exclusively, readable by its owner only and never
// through a link, before the engine opens it (the engine gives its journals the same mode).
void CreatePrivateFile(const fs::path& path) {
#ifndef _WIN32
  const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
  if (fd < 0) {
    const int err = errno;
    throw EngineError(err == EEXIST ? kErrFileExists : kErrCannotOpen,
                      "לא ניתן ליצור את קובץ מסד הנתונים '" + PathText(path) +
                          "': " + std::generic_category().message(err));
  }
  ::close(fd);
#else
  (void)path;
#endif
}

bool IsLink(const fs::path& path) {
  std::error_code ec;
  return fs::is_symlink(fs::symlink_status(path, ec));
}

}  // namespace

Database Database::Create(const fs::path& path, std::string_view locale, Durability durability) {
  std::error_code ec;
  if (fs::exists(fs::symlink_status(path, ec))) {
    throw EngineError(kErrFileExists, "קובץ מסד הנתונים '" + PathText(path) + "' כבר קיים.");
  }
  // A journal left beside a deleted file would be rolled into the new one on first open.
  for (const char* suffix : {"-journal", "-wal", "-shm"}) {
    fs::path companion = path;
    companion += suffix;
    fs::remove(companion, ec);
  }
  CreatePrivateFile(path);
  auto impl = std::make_unique<Impl>();
  impl->path = path;
  impl->conn = OpenConnection(path, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE);
  sqlite3* h = impl->conn->db;
  ExecOrThrow(h, durability == Durability::Scratch ? kScratchPragmas : kDurablePragmas);
  ExecOrThrow(h, "BEGIN");
  ExecOrThrow(h, kMetadataDdl);
  {
    Statement st;
    const char* sql = "INSERT INTO _zdr_info (key, value) VALUES (?1, ?2)";
    if (sqlite3_prepare_v2(h, sql, -1, st.out(), nullptr) != SQLITE_OK) {
      throw StepFailure(h, sqlite3_errcode(h), sql);
    }
    const std::pair<std::string, std::string> rows[] = {
        {"durability", durability == Durability::Scratch ? "scratch" : "durable"},
        {"locale", std::string(locale)},
        {"format", "1"}};
    for (const auto& [key, value] : rows) {
      sqlite3_bind_text(st.get(), 1, key.data(), static_cast<int>(key.size()), SQLITE_STATIC);
      sqlite3_bind_text(st.get(), 2, value.data(), static_cast<int>(value.size()), SQLITE_STATIC);
      const int rc = sqlite3_step(st.get());
      if (rc != SQLITE_DONE) throw StepFailure(h, rc, sql);
      sqlite3_reset(st.get());
    }
  }
  ExecOrThrow(h, "COMMIT");
  return Database(std::move(impl));
}

Database Database::Open(const fs::path& path) {
  std::error_code ec;
  if (!fs::is_regular_file(path, ec)) {
    throw EngineError(kErrCannotOpen, "לא נמצא קובץ מסד הנתונים '" + PathText(path) + "'.");
  }
  if (IsLink(path)) {
    throw EngineError(kErrCannotOpen,
                      "קובץ מסד הנתונים '" + PathText(path) + "' הוא קישור סמלי; הוא לא נפתח.");
  }
  auto impl = std::make_unique<Impl>();
  impl->path = path;
  impl->conn = OpenConnection(path, SQLITE_OPEN_READWRITE);
  sqlite3* h = impl->conn->db;
  std::string durability;
  {
    Statement st;
    const char* sql = "SELECT value FROM _zdr_info WHERE key = 'durability'";
    const int rc = sqlite3_prepare_v2(h, sql, -1, st.out(), nullptr);
    if (rc != SQLITE_OK) {
      const bool foreign = SqliteMessage(h).starts_with("no such table");
      throw EngineError(
          kErrCannotOpen,
          "לא ניתן לפתוח את קובץ מסד הנתונים '" + PathText(path) + "': " +
              (foreign ? std::string("הקובץ אינו מסד נתונים של התוכנה.") : SqliteMessage(h)));
    }
    if (sqlite3_step(st.get()) == SQLITE_ROW) {
      durability = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0));
    }
  }
  ExecOrThrow(h, durability == "scratch" ? kScratchPragmas : kDurablePragmas);
  impl->LoadLinks();
  impl->LoadQueries();
  return Database(std::move(impl));
}

void Database::Close() {
  if (impl_) impl_->conn.reset();
}

bool Database::IsOpen() const {
  return impl_ && impl_->conn;
}

const fs::path& Database::Path() const {
  static const fs::path kNone;
  return impl_ ? impl_->path : kNone;
}

sqlite3* Database::Handle() const {
  return impl_ && impl_->conn ? impl_->conn->db : nullptr;
}

void Database::CreateTable(const TableDef& def) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  Impl& d = *impl_;
  d.RefuseTakenName(def.name);
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
  auto findField = [&](const std::string& name) -> const FieldDef* {
    for (const FieldDef& f : def.fields) {
      if (EqualsNoCase(f.name, name)) return &f;
    }
    return nullptr;
  };
  const IndexDef* primary = nullptr;
  for (size_t i = 0; i < def.indexes.size(); ++i) {
    const IndexDef& ix = def.indexes[i];
    if (ix.name.empty() || ix.fields.empty()) {
      throw EngineError(kErrEngine, "אינדקס ללא שם או ללא שדות בטבלה '" + def.name + "'.");
    }
    for (const std::string& f : ix.fields) {
      if (findField(f) == nullptr) {
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
      ddl += QuoteId(findField(primary->fields[k])->name);
    }
    ddl += ")";
  }
  ddl += ")";

  const bool ownTransaction = sqlite3_get_autocommit(d.db()) != 0;
  if (ownTransaction) d.Exec("BEGIN");
  try {
    d.Exec(ddl);
    for (const IndexDef& ix : def.indexes) {
      if (ix.primary) continue;
      // Index names are the table's own: "PrimaryKey" or "SortByKey" may repeat in other
      // tables, so the SQLite name carries the table name.
      std::string sql = std::string(ix.unique ? "CREATE UNIQUE INDEX " : "CREATE INDEX ") +
                        QuoteId(def.name + "." + ix.name) + " ON " + QuoteId(def.name) + " (";
      for (size_t k = 0; k < ix.fields.size(); ++k) {
        if (k > 0) sql += ", ";
        sql += QuoteId(findField(ix.fields[k])->name);
      }
      sql += ")";
      d.Exec(sql);
    }
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

void Database::LinkTable(const std::string& name, const fs::path& otherPath,
                         const std::string& sourceTable) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  Impl& d = *impl_;
  d.RefuseTakenName(name);
  LinkState link;
  link.name = name;
  link.path = PathText(fs::absolute(otherPath));
  link.source = sourceTable;
  d.Resolve(link);
  Statement st;
  const std::string sql = "INSERT INTO _zdr_links (name, path, source) VALUES (?1, ?2, ?3)";
  d.Prepare(sql, st, sql);
  sqlite3_bind_text(st.get(), 1, link.name.c_str(), -1, SQLITE_STATIC);
  sqlite3_bind_text(st.get(), 2, link.path.c_str(), -1, SQLITE_STATIC);
  sqlite3_bind_text(st.get(), 3, link.source.c_str(), -1, SQLITE_STATIC);
  const int rc = sqlite3_step(st.get());
  if (rc != SQLITE_DONE) {
    const EngineError error = StepFailure(d.db(), rc, sql);
    sqlite3_exec(d.db(), ("DROP VIEW temp." + QuoteId(link.name)).c_str(), nullptr, nullptr,
                 nullptr);
    sqlite3_exec(d.db(), ("DETACH " + QuoteId(link.schema)).c_str(), nullptr, nullptr, nullptr);
    throw error;
  }
  d.links.push_back(std::move(link));
}

void Database::CreateQuery(const std::string& name, std::string_view jetSql) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  Impl& d = *impl_;
  d.RefuseTakenName(name);
  d.CreateQueryView(name, jetSql);
  Statement st;
  const std::string sql = "INSERT INTO _zdr_queries (name, jet) VALUES (?1, ?2)";
  d.Prepare(sql, st, sql);
  sqlite3_bind_text(st.get(), 1, name.c_str(), -1, SQLITE_STATIC);
  sqlite3_bind_text(st.get(), 2, jetSql.data(), static_cast<int>(jetSql.size()), SQLITE_STATIC);
  const int rc = sqlite3_step(st.get());
  if (rc != SQLITE_DONE) {
    const EngineError error = StepFailure(d.db(), rc, sql);
    sqlite3_exec(d.db(), ("DROP VIEW temp." + QuoteId(name)).c_str(), nullptr, nullptr, nullptr);
    throw error;
  }
}

int64_t Database::Execute(std::string_view jetSql) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  const std::string sql = TranslateJetSql(jetSql);
  const EnforcedChecks checks(impl_->db());
  Statement st;
  impl_->Prepare(sql, st, jetSql);
  int rc;
  while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
  }
  if (rc != SQLITE_DONE) throw StepFailure(impl_->db(), rc, jetSql);
  return sqlite3_changes64(impl_->db());
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

bool Database::HasTable(const std::string& name) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  return impl_->FindLink(name) != nullptr || impl_->HasLocalObject(name, "_zdr_fields");
}

std::vector<std::string> Database::QueryNames() {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  Statement st;
  const std::string sql = "SELECT name FROM _zdr_queries ORDER BY rowid";
  impl_->Prepare(sql, st, sql);
  std::vector<std::string> names;
  int rc;
  while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
    names.emplace_back(reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0)));
  }
  if (rc != SQLITE_DONE) throw StepFailure(impl_->db(), rc, sql);
  return names;
}

std::string Database::QuerySql(const std::string& name) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  Statement st;
  const std::string sql = "SELECT jet FROM _zdr_queries WHERE name = ?1";
  impl_->Prepare(sql, st, sql);
  sqlite3_bind_text(st.get(), 1, name.c_str(), -1, SQLITE_STATIC);
  const int rc = sqlite3_step(st.get());
  if (rc == SQLITE_ROW) return reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0));
  if (rc != SQLITE_DONE) throw StepFailure(impl_->db(), rc, sql);
  throw EngineError(kErrNoSuchObject, "השאילתה '" + name + "' אינה קיימת.");
}

// ---------------------------------------------------------------------------------------
// TableRecordset

namespace {

// One field of the row being added. The text buffer keeps its capacity from row to row, so
// appending does not allocate once the longest value has been seen.
struct Slot {
  enum class Kind : uint8_t { Null, Int, Real, Text };
  Kind kind = Kind::Null;
  int64_t i = 0;
  double d = 0;
  std::string text;
};

bool ParseNumber(std::string_view s, int64_t& i, double& d, bool& isInt) {
  while (!s.empty() && (s.front() == ' ' || s.front() == '\t')) s.remove_prefix(1);
  while (!s.empty() && (s.back() == ' ' || s.back() == '\t')) s.remove_suffix(1);
  if (!s.empty() && s.front() == '+') s.remove_prefix(1);
  if (s.empty()) return false;
  const char* end = s.data() + s.size();
  auto ri = std::from_chars(s.data(), end, i);
  if (ri.ec == std::errc() && ri.ptr == end) {
    isInt = true;
    return true;
  }
  auto rd = std::from_chars(s.data(), end, d);
  if (rd.ec == std::errc() && rd.ptr == end) {
    isInt = false;
    return true;
  }
  return false;
}

}  // namespace

struct TableRecordset::Impl {
  std::shared_ptr<Connection> conn;
  sqlite3_stmt* insert = nullptr;
  std::string table;
  std::vector<FieldDef> fields;
  std::vector<IndexDef> indexes;
  std::vector<Slot> row;
  bool editing = false;

  Impl() = default;
  Impl(const Impl&) = delete;
  Impl& operator=(const Impl&) = delete;
  ~Impl() { CloseQuietly(); }

  // Returns the commit's failure, empty when the rows are in the file.
  std::string CloseQuietly() {
    if (!conn) return std::string();
    sqlite3_finalize(insert);
    insert = nullptr;
    std::string failure = conn->RecordsetClosed();
    conn.reset();
    return failure;
  }

  Slot& Editable(int field) {
    if (!conn) throw EngineError(kErrEngine, "הטבלה '" + table + "' סגורה.");
    if (!editing) {
      throw EngineError(kErrNotEditing, "אין רשומה חדשה בעריכה: יש לקרוא ל-AddNew תחילה.");
    }
    if (field < 0 || static_cast<size_t>(field) >= row.size()) {
      throw EngineError(kErrNoSuchField,
                        "אין שדה במקום " + std::to_string(field) + " בטבלה '" + table + "'.");
    }
    return row[static_cast<size_t>(field)];
  }

  [[noreturn]] void ConversionError(int field, std::string_view value) const {
    throw EngineError(kErrTypeConversion, "לא ניתן להמיר את הערך '" + std::string(value) +
                                              "' לסוג השדה '" + fields[field].name + "' (" +
                                              TypeName(fields[field].type) + ").");
  }

  [[noreturn]] void Overflow(const FieldDef& f, const std::string& value) const {
    int64_t lo, hi;
    IntegerRange(f.type, lo, hi);
    throw EngineError(kErrNumericOverflow, "הערך " + value + " חורג מתחום השדה '" + f.name + "' (" +
                                               TypeName(f.type) + ": " + std::to_string(lo) +
                                               " עד " + std::to_string(hi) + ").");
  }

  // Checks slot `i` against its field and binds it. Throws the field's refusal.
  void CheckAndBind(size_t i) {
    const FieldDef& f = fields[i];
    Slot& s = row[i];
    const int param = static_cast<int>(i) + 1;
    if (s.kind == Slot::Kind::Null) {
      sqlite3_bind_null(insert, param);
      return;
    }
    switch (f.type) {
      case FieldType::Text: {
        if (s.text.empty()) {
          throw EngineError(kErrZeroLength,
                            "השדה '" + f.name + "' אינו יכול להכיל מחרוזת באורך אפס.");
        }
        const int64_t chars = CountUtf8(s.text);
        if (chars < 0) {
          throw EngineError(kErrTypeConversion,
                            "הטקסט לשדה '" + f.name + "' אינו UTF-8 תקין; הרשומה לא נשמרה.");
        }
        if (chars > f.size) {
          throw EngineError(kErrFieldTooSmall,
                            "הטקסט ארוך מדי עבור השדה '" + f.name + "': " + std::to_string(chars) +
                                " תווים, והשדה מקבל עד " + std::to_string(f.size) + ".");
        }
        // The buffer stays untouched until the statement has been stepped and reset.
        sqlite3_bind_text(insert, param, s.text.data(), static_cast<int>(s.text.size()),
                          SQLITE_STATIC);
        return;
      }
      case FieldType::Byte:
      case FieldType::Integer:
      case FieldType::Long: {
        int64_t lo, hi;
        IntegerRange(f.type, lo, hi);
        int64_t v = s.i;
        if (s.kind == Slot::Kind::Real) {
          // Whole numbers by round-half-even, as the desktop engine converts.
          const double r = std::nearbyint(s.d);
          if (!std::isfinite(r) || r < static_cast<double>(lo) || r > static_cast<double>(hi)) {
            char buf[32];
            const auto res = std::to_chars(buf, buf + sizeof buf, s.d);
            Overflow(f, std::string(buf, res.ptr));
          }
          v = static_cast<int64_t>(r);
        }
        if (v < lo || v > hi) Overflow(f, std::to_string(v));
        sqlite3_bind_int64(insert, param, v);
        return;
      }
      case FieldType::Double:
      case FieldType::Date:
        sqlite3_bind_double(insert, param,
                            s.kind == Slot::Kind::Int ? static_cast<double>(s.i) : s.d);
        return;
      case FieldType::Boolean:
        sqlite3_bind_int(insert, param, s.i != 0 ? -1 : 0);
        return;
    }
  }

  // Names the unique index that refused the row, for the description.
  std::string RefusingIndex(std::string_view message) const {
    const size_t at = message.find("failed: ");
    if (at == std::string_view::npos) return "";
    std::vector<std::string_view> cols;
    std::string_view rest = message.substr(at + 8);
    while (!rest.empty()) {
      const size_t comma = rest.find(", ");
      std::string_view item = rest.substr(0, comma);
      if (const size_t dot = item.find('.'); dot != std::string_view::npos) {
        item = item.substr(dot + 1);
      }
      cols.push_back(item);
      if (comma == std::string_view::npos) break;
      rest = rest.substr(comma + 2);
    }
    for (const IndexDef& ix : indexes) {
      if (ix.fields.size() != cols.size()) continue;
      bool same = true;
      for (size_t k = 0; k < cols.size() && same; ++k) same = EqualsNoCase(ix.fields[k], cols[k]);
      if (same) return ix.name;
    }
    return "";
  }
};

TableRecordset::TableRecordset(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}
TableRecordset::TableRecordset(TableRecordset&&) noexcept = default;
TableRecordset& TableRecordset::operator=(TableRecordset&&) noexcept = default;
TableRecordset::~TableRecordset() = default;

TableRecordset Database::OpenTable(const std::string& table) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  TableDef def(table);
  std::string schema;
  if (!impl_->Locate(table, schema, def)) {
    throw EngineError(kErrNoSuchObject, "הטבלה '" + table + "' אינה קיימת.");
  }
  auto rs = std::make_unique<TableRecordset::Impl>();
  rs->table = def.name;
  std::string sql = "INSERT INTO " + QuoteId(schema) + "." + QuoteId(def.name) + " (";
  std::string params;
  for (size_t i = 0; i < def.fields.size(); ++i) {
    if (i > 0) {
      sql += ", ";
      params += ", ";
    }
    sql += QuoteId(def.fields[i].name);
    params += "?" + std::to_string(i + 1);
  }
  sql += ") VALUES (" + params + ")";
  sqlite3* h = impl_->db();
  if (sqlite3_prepare_v3(h, sql.c_str(), -1, SQLITE_PREPARE_PERSISTENT, &rs->insert, nullptr) !=
      SQLITE_OK) {
    const std::string message = SqliteMessage(h);
    sqlite3_finalize(rs->insert);
    rs->insert = nullptr;
    throw EngineError(kErrEngine, "לא ניתן לפתוח את הטבלה '" + table + "': " + message);
  }
  rs->conn = impl_->conn;
  try {
    rs->conn->RecordsetOpened();
  } catch (...) {
    sqlite3_finalize(rs->insert);
    rs->insert = nullptr;
    rs->conn.reset();
    throw;
  }
  rs->fields = std::move(def.fields);
  rs->indexes = std::move(def.indexes);
  rs->row.resize(rs->fields.size());
  return TableRecordset(std::move(rs));
}

void TableRecordset::AddNew() {
  if (!impl_ || !impl_->conn) throw EngineError(kErrEngine, "הטבלה סגורה.");
  for (Slot& s : impl_->row) s.kind = Slot::Kind::Null;
  impl_->editing = true;
}

int TableRecordset::FieldIndex(std::string_view name) const {
  if (impl_) {
    for (size_t i = 0; i < impl_->fields.size(); ++i) {
      if (EqualsNoCase(impl_->fields[i].name, name)) return static_cast<int>(i);
    }
  }
  throw EngineError(kErrNoSuchField, "השדה '" + std::string(name) + "' אינו קיים בטבלה '" +
                                         (impl_ ? impl_->table : std::string()) + "'.");
}

void TableRecordset::SetNull(int field) {
  if (!impl_) throw EngineError(kErrEngine, "הטבלה סגורה.");
  impl_->Editable(field).kind = Slot::Kind::Null;
}

void TableRecordset::SetText(int field, std::string_view utf8) {
  if (!impl_) throw EngineError(kErrEngine, "הטבלה סגורה.");
  Slot& s = impl_->Editable(field);
  const FieldType type = impl_->fields[field].type;
  if (type == FieldType::Text) {
    s.text.assign(utf8.data(), utf8.size());
    s.kind = Slot::Kind::Text;
    return;
  }
  int64_t i = 0;
  double d = 0;
  bool isInt = false;
  if (type == FieldType::Boolean) {
    if (EqualsNoCase(utf8, "true") || EqualsNoCase(utf8, "yes")) {
      s.kind = Slot::Kind::Int, s.i = -1;
      return;
    }
    if (EqualsNoCase(utf8, "false") || EqualsNoCase(utf8, "no")) {
      s.kind = Slot::Kind::Int, s.i = 0;
      return;
    }
  }
  if (!ParseNumber(utf8, i, d, isInt)) impl_->ConversionError(field, utf8);
  if (isInt) {
    SetInt(field, i);
  } else {
    SetDouble(field, d);
  }
}

void TableRecordset::SetInt(int field, int64_t v) {
  if (!impl_) throw EngineError(kErrEngine, "הטבלה סגורה.");
  Slot& s = impl_->Editable(field);
  switch (impl_->fields[field].type) {
    case FieldType::Text: {
      char buf[24];
      const auto res = std::to_chars(buf, buf + sizeof buf, v);
      s.text.assign(buf, res.ptr);
      s.kind = Slot::Kind::Text;
      return;
    }
    case FieldType::Boolean:
      s.kind = Slot::Kind::Int, s.i = v != 0 ? -1 : 0;
      return;
    default:
      s.kind = Slot::Kind::Int, s.i = v;
      return;
  }
}

void TableRecordset::SetDouble(int field, double v) {
  if (!impl_) throw EngineError(kErrEngine, "הטבלה סגורה.");
  Slot& s = impl_->Editable(field);
  switch (impl_->fields[field].type) {
    case FieldType::Text: {
      char buf[32];
      const auto res = std::to_chars(buf, buf + sizeof buf, v);
      s.text.assign(buf, res.ptr);
      s.kind = Slot::Kind::Text;
      return;
    }
    case FieldType::Boolean:
      s.kind = Slot::Kind::Int, s.i = v != 0 ? -1 : 0;
      return;
    default:
      s.kind = Slot::Kind::Real, s.d = v;
      return;
  }
}

void TableRecordset::SetBool(int field, bool v) {
  if (!impl_) throw EngineError(kErrEngine, "הטבלה סגורה.");
  if (impl_->fields.size() > static_cast<size_t>(std::max(field, 0)) &&
      impl_->fields[field].type == FieldType::Text) {
    SetText(field, v ? "True" : "False");
    return;
  }
  SetInt(field, v ? -1 : 0);
}

void TableRecordset::SetDate(int field, Date d) {
  if (!impl_) throw EngineError(kErrEngine, "הטבלה סגורה.");
  if (impl_->fields.size() > static_cast<size_t>(std::max(field, 0)) &&
      impl_->fields[field].type == FieldType::Text) {
    SetText(field, FormatDate(d));
    return;
  }
  SetInt(field, d.serial);
}

void TableRecordset::Set(std::string_view name, const Value& v) {
  const int field = FieldIndex(name);
  if (IsNull(v)) {
    SetNull(field);
  } else if (const auto* i = std::get_if<int64_t>(&v)) {
    SetInt(field, *i);
  } else if (const auto* d = std::get_if<double>(&v)) {
    SetDouble(field, *d);
  } else {
    SetText(field, std::get<std::string>(v));
  }
}

void TableRecordset::Update() {
  if (!impl_ || !impl_->conn) throw EngineError(kErrEngine, "הטבלה סגורה.");
  Impl& r = *impl_;
  if (!r.editing) {
    throw EngineError(kErrNotEditing, "אין רשומה חדשה בעריכה: יש לקרוא ל-AddNew תחילה.");
  }
  for (size_t i = 0; i < r.row.size(); ++i) r.CheckAndBind(i);
  const int rc = sqlite3_step(r.insert);
  if (rc == SQLITE_DONE) {
    sqlite3_reset(r.insert);
    r.editing = false;
    return;
  }
  sqlite3* h = r.conn->db;
  // sqlite3_reset returns the step's error and keeps the message until the next call.
  sqlite3_reset(r.insert);
  const int extended = sqlite3_extended_errcode(h);
  const std::string message = SqliteMessage(h);
  if (extended == SQLITE_CONSTRAINT_PRIMARYKEY || extended == SQLITE_CONSTRAINT_UNIQUE) {
    const std::string index = r.RefusingIndex(message);
    throw EngineError(kErrDuplicateKey, "הרשומה לא נשמרה: הערך כבר קיים באינדקס הייחודי" +
                                            (index.empty() ? std::string() : " '" + index + "'") +
                                            " של הטבלה '" + r.table + "'.");
  }
  if (extended == SQLITE_CONSTRAINT_NOTNULL) {
    std::string field = message.substr(std::min(message.size(), message.find("failed: ") + 8));
    if (const size_t dot = field.find('.'); dot != std::string::npos) field = field.substr(dot + 1);
    throw EngineError(kErrNullKey, "השדה '" + field +
                                       "' שייך למפתח הראשי ואינו יכול להיות ריק (Null); הרשומה "
                                       "לא נשמרה.");
  }
  throw StepFailure(h, extended, "");
}

void TableRecordset::Close() {
  if (!impl_) return;
  const std::string failure = impl_->CloseQuietly();
  if (!failure.empty()) {
    throw EngineError(kErrEngine, "לא ניתן לשמור את הרשומות בקובץ: " + failure);
  }
}

// ---------------------------------------------------------------------------------------
// Snapshot

namespace {

enum class CellTag : uint8_t { Null, Int, Real, Text };

template <typename T>
void AppendRaw(std::vector<unsigned char>& out, const T& v) {
  const size_t at = out.size();
  out.resize(at + sizeof(T));
  std::memcpy(out.data() + at, &v, sizeof(T));
}

template <typename T>
T ReadRaw(const unsigned char*& p) {
  T v;
  std::memcpy(&v, p, sizeof(T));
  p += sizeof(T);
  return v;
}

}  // namespace

struct Snapshot::Impl {
  // The statement's column names and source tables; returns their count.
  int ReadColumnNames(sqlite3_stmt* st) {
    const int columns = sqlite3_column_count(st);
    for (int c = 0; c < columns; ++c) {
      const char* name = sqlite3_column_name(st, c);
      const char* table = sqlite3_column_table_name(st, c);
      names.emplace_back(name != nullptr ? name : "");
      tables.emplace_back(table != nullptr ? table : "");
    }
    return columns;
  }

  // A forward snapshot reads its rows back from a temporary table (the spool) as it moves,
  // through the connection it keeps.
  bool forward = false;
  std::shared_ptr<Connection> conn;
  sqlite3_stmt* stmt = nullptr;
  std::string spool;
  int64_t total = 0;
  std::string shownSql;
  bool empty = false;  // forward: the statement gave no row at all
  bool done = false;   // forward: moved past the last row

  Impl() = default;
  Impl(const Impl&) = delete;
  Impl& operator=(const Impl&) = delete;
  ~Impl() { Release(); }

  std::vector<std::string> names;
  std::vector<std::string> tables;  // the source table of a plain column, else empty
  // Rows one after the other: per cell a tag, then 8 bytes of number or a 4-byte length
  // and the text.
  std::vector<unsigned char> cells;
  std::vector<size_t> rowStart;
  int64_t pos = -1;     // -1 before the first row, rowCount after the last
  int64_t visited = 0;  // rows reached so far
  std::vector<Value> current;

  int64_t RowCount() const { return static_cast<int64_t>(rowStart.size()); }

  void Release() {
    sqlite3_finalize(stmt);
    stmt = nullptr;
    if (conn && !spool.empty()) {
      sqlite3_exec(conn->db, ("DROP TABLE temp." + QuoteId(spool)).c_str(), nullptr, nullptr,
                   nullptr);
    }
    spool.clear();
    conn.reset();
  }

  // Forward: the statement's next row into `current`, or past the end.
  void StepForward() {
    const int rc = sqlite3_step(stmt);
    if (rc == SQLITE_ROW) {
      ++pos;
      visited = pos + 1;
      for (int c = 0; c < static_cast<int>(current.size()); ++c) {
        Value& v = current[static_cast<size_t>(c)];
        switch (sqlite3_column_type(stmt, c)) {
          case SQLITE_NULL:
            v = std::monostate{};
            break;
          case SQLITE_INTEGER:
            v = static_cast<int64_t>(sqlite3_column_int64(stmt, c));
            break;
          case SQLITE_FLOAT:
            v = sqlite3_column_double(stmt, c);
            break;
          default: {
            const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(stmt, c));
            const auto n = static_cast<size_t>(sqlite3_column_bytes(stmt, c));
            if (auto* str = std::get_if<std::string>(&v)) {
              str->assign(text, n);
            } else {
              v = std::string(text, n);
            }
            break;
          }
        }
      }
      return;
    }
    done = true;
    ++pos;
    if (rc == SQLITE_DONE) {
      Release();
      return;
    }
    const EngineError failure = StepFailure(conn->db, rc, shownSql);
    Release();
    throw failure;
  }

  [[noreturn]] static void ForwardOnly() {
    throw EngineError(kErrForwardOnly, "הרשומות נקראות קדימה בלבד: אין חזרה לרשומה קודמת.");
  }

  void MoveTo(int64_t p) {
    pos = p;
    if (pos < 0 || pos >= RowCount()) return;
    visited = std::max(visited, pos + 1);
    const unsigned char* c = cells.data() + rowStart[static_cast<size_t>(pos)];
    for (Value& v : current) {
      switch (static_cast<CellTag>(*c++)) {
        case CellTag::Null:
          v = std::monostate{};
          break;
        case CellTag::Int:
          v = ReadRaw<int64_t>(c);
          break;
        case CellTag::Real:
          v = ReadRaw<double>(c);
          break;
        case CellTag::Text: {
          const auto n = ReadRaw<uint32_t>(c);
          if (auto* s = std::get_if<std::string>(&v)) {
            s->assign(reinterpret_cast<const char*>(c), n);
          } else {
            v = std::string(reinterpret_cast<const char*>(c), n);
          }
          c += n;
          break;
        }
      }
    }
  }

  void RequireRows() const {
    if (forward ? empty : rowStart.empty()) {
      throw EngineError(kErrNoCurrentRecord, "אין רשומה נוכחית.");
    }
  }
};

Snapshot::Snapshot(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}
Snapshot::Snapshot(Snapshot&&) noexcept = default;
Snapshot& Snapshot::operator=(Snapshot&&) noexcept = default;
Snapshot::~Snapshot() = default;

Snapshot Database::OpenSnapshot(std::string_view jetSql, SnapshotKind kind) {
  if (!impl_) throw EngineError(kErrEngine, "מסד הנתונים סגור.");
  const std::string sql = TranslateJetSql(jetSql);
  Statement st;
  impl_->Prepare(sql, st, jetSql);
  if (kind == SnapshotKind::Forward && sqlite3_stmt_readonly(st.get())) {
    auto snap = std::make_unique<Snapshot::Impl>();
    snap->forward = true;
    snap->shownSql = jetSql;
    const int columns = snap->ReadColumnNames(st.get());
    snap->current.resize(static_cast<size_t>(columns));
    // The rows go once into a temporary table, in the statement's order; the working database
    // keeps temporary tables in a file, so they take no memory however many there are. The
    // count comes from there, and the rows are read back one at a time.
    const std::string spool = "zdr_snapshot_" + std::to_string(impl_->nextSpool++);
    {
      Statement create;
      impl_->Prepare("CREATE TEMP TABLE " + QuoteId(spool) + " AS " + sql, create, jetSql);
      const int rc = sqlite3_step(create.get());
      if (rc != SQLITE_DONE) throw StepFailure(impl_->db(), rc, jetSql);
    }
    snap->conn = impl_->conn;
    snap->spool = spool;
    {
      Statement count;
      const std::string countSql = "SELECT count(*) FROM temp." + QuoteId(spool);
      impl_->Prepare(countSql, count, countSql);
      if (sqlite3_step(count.get()) != SQLITE_ROW) {
        throw StepFailure(impl_->db(), sqlite3_errcode(impl_->db()), countSql);
      }
      snap->total = sqlite3_column_int64(count.get(), 0);
    }
    Statement read;
    const std::string readSql = "SELECT * FROM temp." + QuoteId(spool) + " ORDER BY rowid";
    impl_->Prepare(readSql, read, readSql);
    std::swap(snap->stmt, *read.out());
    snap->StepForward();
    if (snap->done) {
      snap->empty = true;
      snap->pos = -1;
    }
    return Snapshot(std::move(snap));
  }
  // A statement that writes is made again with the field rules in force.
  std::optional<EnforcedChecks> checks;
  if (!sqlite3_stmt_readonly(st.get())) {
    checks.emplace(impl_->db());
    Statement checked;
    impl_->Prepare(sql, checked, jetSql);
    std::swap(*st.out(), *checked.out());
  }
  auto snap = std::make_unique<Snapshot::Impl>();
  const int columns = snap->ReadColumnNames(st.get());
  auto& out = snap->cells;
  int rc;
  while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
    snap->rowStart.push_back(out.size());
    for (int c = 0; c < columns; ++c) {
      switch (sqlite3_column_type(st.get(), c)) {
        case SQLITE_NULL:
          out.push_back(static_cast<uint8_t>(CellTag::Null));
          break;
        case SQLITE_INTEGER:
          out.push_back(static_cast<uint8_t>(CellTag::Int));
          AppendRaw(out, static_cast<int64_t>(sqlite3_column_int64(st.get(), c)));
          break;
        case SQLITE_FLOAT:
          out.push_back(static_cast<uint8_t>(CellTag::Real));
          AppendRaw(out, sqlite3_column_double(st.get(), c));
          break;
        default: {
          const auto* text = sqlite3_column_text(st.get(), c);
          const auto n = static_cast<uint32_t>(sqlite3_column_bytes(st.get(), c));
          out.push_back(static_cast<uint8_t>(CellTag::Text));
          AppendRaw(out, n);
          out.insert(out.end(), text, text + n);
          break;
        }
      }
    }
  }
  if (rc != SQLITE_DONE) throw StepFailure(impl_->db(), rc, jetSql);
  out.shrink_to_fit();
  snap->current.resize(static_cast<size_t>(columns));
  snap->MoveTo(snap->rowStart.empty() ? -1 : 0);
  return Snapshot(std::move(snap));
}

bool Snapshot::AtStart() const {
  if (impl_->forward) return impl_->empty;
  return impl_->pos < 0 || impl_->rowStart.empty();
}
bool Snapshot::AtEnd() const {
  if (impl_->forward) return impl_->done;
  return impl_->rowStart.empty() || impl_->pos >= impl_->RowCount();
}

void Snapshot::MoveFirst() {
  impl_->RequireRows();
  if (impl_->forward) {
    if (impl_->pos != 0 || impl_->done) Impl::ForwardOnly();
    return;
  }
  impl_->MoveTo(0);
}

void Snapshot::MoveLast() {
  impl_->RequireRows();
  if (impl_->forward) Impl::ForwardOnly();
  impl_->MoveTo(impl_->RowCount() - 1);
}

void Snapshot::MoveNext() {
  if (AtEnd()) throw EngineError(kErrNoCurrentRecord, "אין רשומה נוכחית.");
  if (impl_->forward) {
    impl_->StepForward();
    return;
  }
  impl_->MoveTo(impl_->pos + 1);
}

void Snapshot::MovePrevious() {
  if (AtStart()) throw EngineError(kErrNoCurrentRecord, "אין רשומה נוכחית.");
  if (impl_->forward) Impl::ForwardOnly();
  impl_->MoveTo(impl_->pos - 1);
}

int64_t Snapshot::RecordCount() const {
  return impl_->visited;
}

int64_t Snapshot::TotalRows() const {
  return impl_->forward ? impl_->total : impl_->RowCount();
}

int Snapshot::FieldIndex(std::string_view name) const {
  const Impl& s = *impl_;
  const int n = static_cast<int>(s.names.size());
  for (int i = 0; i < n; ++i) {
    if (EqualsNoCase(s.names[i], name)) return i;
  }
  // "tStockHead.Reference1": the column named Reference1 that comes from tStockHead, or
  // the only column of that name.
  if (const size_t dot = name.rfind('.'); dot != std::string_view::npos) {
    const std::string_view table = name.substr(0, dot);
    const std::string_view column = name.substr(dot + 1);
    int only = -1;
    int count = 0;
    for (int i = 0; i < n; ++i) {
      if (!EqualsNoCase(s.names[i], column)) continue;
      if (EqualsNoCase(s.tables[i], table)) return i;
      only = i;
      ++count;
    }
    if (count == 1) return only;
  }
  // A result named "tStockHead.Reference1" is reachable as "Reference1".
  for (int i = 0; i < n; ++i) {
    const std::string_view stored = s.names[i];
    const size_t dot = stored.rfind('.');
    if (dot != std::string_view::npos && EqualsNoCase(stored.substr(dot + 1), name)) return i;
  }
  throw EngineError(kErrNoSuchField, "השדה '" + std::string(name) + "' אינו קיים בתוצאה.");
}

const Value& Snapshot::Field(int index) const {
  if (index < 0 || index >= FieldCount()) {
    throw EngineError(kErrNoSuchField, "אין שדה במקום " + std::to_string(index) + " בתוצאה.");
  }
  if (AtStart() || AtEnd()) throw EngineError(kErrNoCurrentRecord, "אין רשומה נוכחית.");
  return impl_->current[static_cast<size_t>(index)];
}

const Value& Snapshot::Field(std::string_view name) const {
  return Field(FieldIndex(name));
}

int Snapshot::FieldCount() const {
  return static_cast<int>(impl_->names.size());
}

const std::string& Snapshot::FieldName(int index) const {
  if (index < 0 || index >= FieldCount()) {
    throw EngineError(kErrNoSuchField, "אין שדה במקום " + std::to_string(index) + " בתוצאה.");
  }
  return impl_->names[static_cast<size_t>(index)];
}

void Snapshot::Close() {
  if (!impl_) return;
  Impl& s = *impl_;
  if (s.forward) {
    s.Release();
    s.empty = s.done = true;
    s.total = 0;
  }
  s.cells.clear();
  s.cells.shrink_to_fit();
  s.rowStart.clear();
  s.rowStart.shrink_to_fit();
  s.pos = -1;
  s.visited = 0;
}

}  // namespace zdr::db
