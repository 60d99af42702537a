// What the engine's own files share: the connection, the database's state, statement and error
// helpers. Not for use outside the engine (callers include engine.h).
#pragma once

#include <sqlite3.h>

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "engine/engine.h"
#include "engine/jetsql.h"

namespace zdr::db {

// Prefixes of the CHECK constraint names, which tell which refusal a failed check means.
inline constexpr std::string_view kCheckZeroLength = "zdr_zero_length:";
inline constexpr std::string_view kCheckTooLong = "zdr_too_long:";
inline constexpr std::string_view kCheckRange = "zdr_range:";

bool EqualsNoCase(std::string_view a, std::string_view b);
// The table that keeps the distinct values of `table`.`field` (see TableDef::keptDistinct). It
// exists only while it holds exactly those values.
inline std::string KeptDistinctTable(std::string_view table, std::string_view field) {
  return std::string(table) + ".distinct." + std::string(field);
}
std::string QuoteId(std::string_view id);
const char* TypeName(FieldType t);
// The values an integer field of type `t` holds.
void IntegerRange(FieldType t, int64_t& lo, int64_t& hi);
std::string SqliteMessage(sqlite3* db);
// The engine error for a failed step or exec on `db`.
EngineError StepFailure(sqlite3* db, int rc, std::string_view sql);
void ExecOrThrow(sqlite3* db, const char* sql);

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

// The shared connection: the Database and every open recordset hold it, so rows appended
// through a recordset still reach the file when the Database object is closed first.
struct Connection {
  sqlite3* db = nullptr;
  int openRecordsets = 0;
  bool ownsTransaction = false;

  Connection() = default;
  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;
  ~Connection();

  // Called when a recordset opens: the first one begins the shared transaction.
  void RecordsetOpened();
  // Called when a recordset closes: the last one commits. Returns the failure (kErrDiskFull
  // for a full disk), nothing when the rows are in the file.
  std::optional<EngineError> RecordsetClosed();
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
bool ReadTableDef(sqlite3* db, const std::string& schema, const std::string& table, TableDef& def);

struct Database::Impl {
  std::shared_ptr<Connection> conn;
  std::filesystem::path path;
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
  void Prepare(const std::string& sql, Statement& st, std::string_view shownSql) const;
  void Exec(const std::string& sql) const;
  const LinkState* FindLink(std::string_view name) const;
  bool HasLocalObject(const std::string& name, const char* metaTable) const;
  // A table, link or query already named `name` (names compare without regard to case).
  void RefuseTakenName(const std::string& name) const;
  // Attaches the link's file and puts a view under the link's name over its source table.
  // Throws when the file or the table cannot be read; the link then stays unresolved.
  void Resolve(LinkState& link);
  // Stored queries are temporary views made again at every open: a view kept in the file
  // could not read a link, whose view is temporary too.
  void CreateQueryView(const std::string& name, std::string_view jet);
  void LoadQueries();
  void LoadLinks();
  // Where the rows of `table` live: "main", or the schema of a resolved link.
  bool Locate(const std::string& table, std::string& schema, TableDef& def) const;
  // The kept-distinct table of a local table's field as it is stored, or "" when none is kept.
  std::string FindKeptDistinct(std::string_view table, std::string_view field) const;
  // The fields of a local table whose distinct values are kept.
  std::vector<std::string> KeptDistinctFields(const std::string& table) const;
  // Drops what is kept of the distinct values of every local table `jetSql` names: the
  // statement may change their rows.
  void DropKeptDistinctNamedIn(std::string_view jetSql) const;
  // For the translator: where a SELECT may read a field's distinct values.
  DistinctValuesTable KeptDistinctSource() const;
};

}  // namespace zdr::db
