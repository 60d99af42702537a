#include "engine/engine.h"

#ifndef _WIN32
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#endif

#include <algorithm>
#include <system_error>
#include <utility>

#include "common/diskfull.h"
#include "engine/collation.h"
#include "engine/engineinternal.h"
#include "engine/jetsql.h"

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

}  // namespace

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

std::string SqliteMessage(sqlite3* db) {
  const char* m = db != nullptr ? sqlite3_errmsg(db) : nullptr;
  return m != nullptr ? m : "unknown SQLite failure";
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
  if ((rc & 0xFF) == SQLITE_FULL || (extended & 0xFF) == SQLITE_FULL) {
    const char* file = db != nullptr ? sqlite3_db_filename(db, "main") : nullptr;
    return EngineError(kErrDiskFull,
                       DiskFullMessage(file != nullptr && *file != '\0' ? file : "zdrlab.DB"));
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

// ---------------------------------------------------------------------------------------
// Connection

Connection::~Connection() {
  if (db == nullptr) return;
  if (ownsTransaction) sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr);
  sqlite3_close_v2(db);
}

void Connection::RecordsetOpened() {
  if (openRecordsets == 0 && sqlite3_get_autocommit(db) != 0) {
    ExecOrThrow(db, "BEGIN");
    ownsTransaction = true;
  }
  ++openRecordsets;
}

std::optional<EngineError> Connection::RecordsetClosed() {
  if (openRecordsets > 0) --openRecordsets;
  if (openRecordsets == 0 && ownsTransaction) {
    ownsTransaction = false;
    const int rc = sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr);
    if (rc != SQLITE_OK) {
      const int code = sqlite3_extended_errcode(db);
      std::optional<EngineError> failure;
      if ((rc & 0xFF) == SQLITE_FULL || (code & 0xFF) == SQLITE_FULL) {
        failure = StepFailure(db, SQLITE_FULL, "");
      } else {
        failure = EngineError(kErrEngine, "לא ניתן לשמור את הרשומות בקובץ: " + SqliteMessage(db));
      }
      // A failed COMMIT may leave the transaction open; end it so the connection does not
      // keep holding the file's lock.
      if (sqlite3_get_autocommit(db) == 0) {
        sqlite3_exec(db, "ROLLBACK", nullptr, nullptr, nullptr);
      }
      return failure;
    }
  }
  return std::nullopt;
}

// ---------------------------------------------------------------------------------------
// Database

void Database::Impl::Prepare(const std::string& sql, Statement& st,
                             std::string_view shownSql) const {
  sqlite3* h = db();
  const char* tail = nullptr;
  const int rc = sqlite3_prepare_v2(h, sql.c_str(), static_cast<int>(sql.size()), st.out(), &tail);
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

void Database::Impl::Exec(const std::string& sql) const {
  ExecOrThrow(db(), sql.c_str());
}

const LinkState* Database::Impl::FindLink(std::string_view name) const {
  for (const LinkState& link : links) {
    if (EqualsNoCase(link.name, name)) return &link;
  }
  return nullptr;
}

bool Database::Impl::HasLocalObject(const std::string& name, const char* metaTable) const {
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

void Database::Impl::RefuseTakenName(const std::string& name) const {
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

void Database::Impl::Resolve(LinkState& link) {
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

void Database::Impl::CreateQueryView(const std::string& name, std::string_view jet) {
  const std::string select = TranslateJetSql(jet);
  Statement view;
  Prepare("CREATE TEMP VIEW " + QuoteId(name) + " AS " + select, view, jet);
  const int rc = sqlite3_step(view.get());
  if (rc != SQLITE_DONE) throw StepFailure(db(), rc, jet);
}

void Database::Impl::LoadQueries() {
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

void Database::Impl::LoadLinks() {
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

bool Database::Impl::Locate(const std::string& table, std::string& schema, TableDef& def) const {
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

namespace {

// Whether `text` holds `word`, without regard to the case of ASCII letters.
bool ContainsNoCase(std::string_view text, std::string_view word) {
  if (word.empty() || word.size() > text.size()) return word.empty();
  for (size_t i = 0; i + word.size() <= text.size(); ++i) {
    if (EqualsNoCase(text.substr(i, word.size()), word)) return true;
  }
  return false;
}

}  // namespace

std::string Database::Impl::FindKeptDistinct(std::string_view table, std::string_view field) const {
  if (FindLink(table) != nullptr) return "";
  Statement st;
  const std::string sql =
      "SELECT name FROM main.sqlite_master WHERE type = 'table' AND name = ?1 COLLATE NOCASE";
  Prepare(sql, st, sql);
  const std::string name = KeptDistinctTable(table, field);
  sqlite3_bind_text(st.get(), 1, name.data(), static_cast<int>(name.size()), SQLITE_TRANSIENT);
  const int rc = sqlite3_step(st.get());
  if (rc == SQLITE_ROW) return reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0));
  if (rc != SQLITE_DONE) throw StepFailure(db(), rc, sql);
  return "";
}

std::vector<std::string> Database::Impl::KeptDistinctFields(const std::string& table) const {
  Statement st;
  const std::string sql =
      "SELECT substr(name, length(?1) + 1) FROM main.sqlite_master WHERE type = 'table'"
      " AND substr(name, 1, length(?1)) = ?1 COLLATE NOCASE";
  Prepare(sql, st, sql);
  const std::string prefix = KeptDistinctTable(table, "");
  sqlite3_bind_text(st.get(), 1, prefix.data(), static_cast<int>(prefix.size()), SQLITE_TRANSIENT);
  std::vector<std::string> fields;
  int rc;
  while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
    fields.emplace_back(reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0)));
  }
  if (rc != SQLITE_DONE) throw StepFailure(db(), rc, sql);
  return fields;
}

void Database::Impl::DropKeptDistinctNamedIn(std::string_view jetSql) const {
  std::vector<std::string> drop;
  {
    Statement st;
    const std::string sql =
        "SELECT name, substr(name, 1, instr(name, '.distinct.') - 1) FROM main.sqlite_master"
        " WHERE type = 'table' AND instr(name, '.distinct.') > 0";
    Prepare(sql, st, sql);
    int rc;
    while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
      const auto* table = reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 1));
      if (ContainsNoCase(jetSql, table)) {
        drop.emplace_back(reinterpret_cast<const char*>(sqlite3_column_text(st.get(), 0)));
      }
    }
    if (rc != SQLITE_DONE) throw StepFailure(db(), rc, sql);
  }
  for (const std::string& name : drop) Exec("DROP TABLE main." + QuoteId(name));
}

DistinctValuesTable Database::Impl::KeptDistinctSource() const {
  return [this](std::string_view table, std::string_view field) {
    return FindKeptDistinct(table, field);
  };
}

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
  if (!sqlite3_stmt_readonly(st.get())) impl_->DropKeptDistinctNamedIn(jetSql);
  int rc;
  while ((rc = sqlite3_step(st.get())) == SQLITE_ROW) {
  }
  if (rc != SQLITE_DONE) throw StepFailure(impl_->db(), rc, jetSql);
  return sqlite3_changes64(impl_->db());
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

}  // namespace zdr::db
