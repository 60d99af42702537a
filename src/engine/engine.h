// A thin database engine over SQLite that keeps the desktop-database semantics the rest of
// the system is written against: typed fields with widths, primary and unique indexes,
// linked tables, stored queries, append-only table recordsets, snapshot recordsets, and
// the Jet dialect of SQL (translated inside, see jetsql.h).
//
// Every failure raises EngineError with a number and a description. The numbers callers
// test are the constants below.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "common/value.h"

struct sqlite3;
struct sqlite3_stmt;

namespace zdr::db {

// Error numbers.
inline constexpr int kErrDuplicateKey = 3022;     // a unique index would repeat a value
inline constexpr int kErrZeroLength = 3315;       // zero-length string in a text field
inline constexpr int kErrFieldTooSmall = 3163;    // text longer than the field's width
inline constexpr int kErrNumericOverflow = 3349;  // number outside the field's type
inline constexpr int kErrSyntax = 3075;           // statement the engine cannot run
inline constexpr int kErrNoSuchObject = 3078;     // table or query not found
inline constexpr int kErrCannotOpen = 3024;       // database file missing or unreadable
inline constexpr int kErrFileExists = 3204;       // create over an existing file
inline constexpr int kErrNoCurrentRecord = 3021;  // field read with no current row
inline constexpr int kErrNoSuchField = 3265;      // field name not in the recordset
inline constexpr int kErrEngine = 3000;           // any other engine failure
inline constexpr int kErrObjectExists = 3012;     // table, link or query name already taken
inline constexpr int kErrNotEditing = 3020;       // field set or Update without AddNew
inline constexpr int kErrNullKey = 3058;          // Null in a field of the primary index
inline constexpr int kErrTypeConversion = 3421;   // value cannot become the field's type
inline constexpr int kErrForwardOnly = 3219;      // move back in a forward-only snapshot
inline constexpr int kErrDiskFull = 3026;         // no room left on the disk

class EngineError : public std::runtime_error {
 public:
  EngineError(int number, const std::string& description)
      : std::runtime_error(description), number_(number) {}
  int number() const { return number_; }
  const char* description() const { return what(); }

 private:
  int number_;
};

enum class FieldType { Text, Byte, Integer, Long, Double, Date, Boolean };

struct FieldDef {
  std::string name;
  FieldType type = FieldType::Text;
  int size = 0;  // Text(n): at most n characters
};

struct IndexDef {
  std::string name;
  std::vector<std::string> fields;
  bool primary = false;
  bool unique = false;
};

// A table definition: fields appended in order, then indexes appended in order.
struct TableDef {
  std::string name;
  std::vector<FieldDef> fields;
  std::vector<IndexDef> indexes;
  // Text fields of the primary key whose distinct values the engine keeps in a table of their
  // own as rows are appended, so that a statement's "(Select Distinct F From T)" reads those
  // values instead of every row of T. Kept only while every row came through a recordset: a
  // statement that changes the table's rows drops them, and the subquery then reads T again.
  // Another database file writing T through a link goes unseen: keep them only for tables
  // that no other file links to.
  std::vector<std::string> keptDistinct;

  explicit TableDef(std::string n) : name(std::move(n)) {}
  TableDef& Field(std::string fieldName, FieldType type, int size = 0) {
    fields.push_back({std::move(fieldName), type, size});
    return *this;
  }
  TableDef& Index(std::string indexName, std::vector<std::string> indexFields, bool isPrimary,
                  bool isUnique) {
    indexes.push_back({std::move(indexName), std::move(indexFields), isPrimary, isUnique});
    return *this;
  }
  TableDef& KeepDistinct(std::string fieldName) {
    keptDistinct.push_back(std::move(fieldName));
    return *this;
  }
};

// How carefully a database writes. The working database is thrown away at every load and
// runs without journal or sync; the account-selection database holds the user's ticks and
// keeps a rollback journal with full sync. The choice is kept in the file and applies again
// at every Open.
enum class Durability { Scratch, Durable };

class Database;

// Appends rows to one table. Opening it begins a transaction on its database (shared with
// other recordsets open at the same time); the last recordset to close commits it, so the
// rows appended stay even when the caller leaves through an exception. Rows are written
// through one prepared statement. A recordset shares the connection with its Database and
// may outlive it: the file closes when both are gone. Not for use from two threads.
class TableRecordset {
 public:
  TableRecordset(TableRecordset&&) noexcept;
  TableRecordset& operator=(TableRecordset&&) noexcept;
  ~TableRecordset();

  // Starts a new row with every field Null.
  void AddNew();
  // Index of a field by name, without regard to case; throws kErrNoSuchField.
  int FieldIndex(std::string_view name) const;
  // Set a field of the new row (kErrNotEditing before AddNew). Text is UTF-8. A value of
  // another type is converted as the desktop engine does: numbers become text, numeric text
  // becomes a number (else kErrTypeConversion), any non-zero number a True (-1) Boolean, a
  // fraction a whole number by round-half-even when the row is updated.
  void SetNull(int field);
  void SetText(int field, std::string_view utf8);
  void SetInt(int field, int64_t v);
  void SetDouble(int field, double v);
  void SetBool(int field, bool v);
  void SetDate(int field, Date d);
  void Set(std::string_view name, const Value& v);
  // Checks the new row against the fields' types (zero-length text, width in characters,
  // well-formed UTF-8, number range, Null in the primary key) and inserts it. On failure
  // (kErrZeroLength, kErrFieldTooSmall, kErrTypeConversion, kErrNumericOverflow,
  // kErrNullKey, kErrDuplicateKey) nothing is stored, the row stays current and the
  // recordset and its transaction go on.
  void Update();
  // Commits (when this is the last open recordset of its database). Throws when the commit
  // fails; the destructor closes the same way and keeps quiet.
  void Close();

 private:
  friend class Database;
  struct Impl;
  explicit TableRecordset(std::unique_ptr<Impl> impl);
  std::unique_ptr<Impl> impl_;
};

// How a snapshot holds the rows of its statement.
enum class SnapshotKind {
  // Read whole when opened: every move is allowed, and no open database is needed after that.
  Whole,
  // Kept in a temporary file when opened and read back one row at a time as the snapshot
  // moves forward, so memory stays flat however many rows there are. Only MoveNext moves
  // forward, and MoveFirst reads the rows again from the first; the snapshot keeps the
  // database's connection and the temporary file until it is closed. For statements that only
  // read (others are read whole).
  Forward,
};

// The rows of a statement. It starts on the first row (at start and at end together when there
// is none). Moving past either end, or MoveFirst/MoveLast with no rows, throws
// kErrNoCurrentRecord; moving back in a forward snapshot throws kErrForwardOnly.
class Snapshot {
 public:
  Snapshot(Snapshot&&) noexcept;
  Snapshot& operator=(Snapshot&&) noexcept;
  ~Snapshot();

  bool AtStart() const;  // before the first row (also when there are none)
  bool AtEnd() const;    // after the last row (also when there are none)
  void MoveFirst();
  void MoveLast();
  void MoveNext();
  void MovePrevious();
  // Rows seen so far: complete after MoveLast, as with the desktop engine.
  int64_t RecordCount() const;
  // Every row of the statement, known from the moment the snapshot opens.
  int64_t TotalRows() const;
  // Column index by result name, without regard to case; throws kErrNoSuchField. A
  // qualified name ("tStockHead.Reference1") finds the column Reference1 of that table.
  int FieldIndex(std::string_view name) const;
  // The current row's value (kErrNoCurrentRecord at start or at end). The reference stays valid
  // until the next move or Close.
  const Value& Field(int index) const;
  const Value& Field(std::string_view name) const;
  int FieldCount() const;
  const std::string& FieldName(int index) const;
  void Close();

 private:
  friend class Database;
  struct Impl;
  explicit Snapshot(std::unique_ptr<Impl> impl);
  std::unique_ptr<Impl> impl_;
};

class Database {
 public:
  // Creates a new database file; the file must not exist (kErrFileExists: callers delete an
  // old one). A journal left beside an earlier file of that name is removed first. A folder
  // that is missing or not writable gives kErrCannotOpen.
  // The locale string is the desktop engine's (";LANGID=0x040D;CP=1255;COUNTRY=0" for
  // Hebrew); text fields compare by the Hebrew collation whatever it says.
  static Database Create(const std::filesystem::path& path, std::string_view locale,
                         Durability durability = Durability::Scratch);
  // Opens an existing database file and resolves its linked tables. A missing or unreadable
  // file, or one this engine did not create, gives kErrCannotOpen. A link whose file is
  // missing does not stop the open; statements that read the link fail with kErrCannotOpen.
  static Database Open(const std::filesystem::path& path);

  Database(Database&&) noexcept;
  Database& operator=(Database&&) noexcept;
  ~Database();

  void Close();
  bool IsOpen() const;
  const std::filesystem::path& Path() const;

  void CreateTable(const TableDef& def);
  // A linked table `name` that reads table `sourceTable` of the database file `otherPath`.
  // The link is kept in this file and resolved at every open; statements read the other
  // file's current rows. A missing file (kErrCannotOpen) or table (kErrNoSuchObject) is
  // refused at once and nothing is kept. Not while a recordset is open.
  void LinkTable(const std::string& name, const std::filesystem::path& otherPath,
                 const std::string& sourceTable);
  // A stored query with Jet SQL text, usable by name in later statements.
  void CreateQuery(const std::string& name, std::string_view jetSql);

  // Runs a statement that changes rows (Jet SQL). Returns the number of rows changed.
  int64_t Execute(std::string_view jetSql);
  TableRecordset OpenTable(const std::string& table);
  Snapshot OpenSnapshot(std::string_view jetSql, SnapshotKind kind = SnapshotKind::Whole);

  // The table's definition as created (fields and indexes), for tests and tools.
  TableDef Describe(const std::string& table);
  bool HasTable(const std::string& name);
  std::vector<std::string> QueryNames();
  std::string QuerySql(const std::string& name);

  // The underlying connection, for benchmarks and tests that compare with bare SQLite.
  sqlite3* Handle() const;

 private:
  struct Impl;
  explicit Database(std::unique_ptr<Impl> impl);
  std::unique_ptr<Impl> impl_;
  friend class TableRecordset;
};

}  // namespace zdr::db
