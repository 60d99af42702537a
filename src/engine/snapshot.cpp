#include <algorithm>
#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "engine/engine.h"
#include "engine/engineinternal.h"
#include "engine/jetsql.h"

namespace zdr::db {

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
    // The spool stays until Close: MoveFirst may read it again.
    if (rc == SQLITE_DONE) return;
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
  std::string sql = TranslateJetSql(jetSql, impl_->KeptDistinctSource());
  Statement st;
  impl_->Prepare(sql, st, jetSql);
  if (!sqlite3_stmt_readonly(st.get())) {
    // A statement that writes may change the rows whose distinct values are kept: those are
    // dropped, and the statement reads the tables themselves.
    impl_->DropKeptDistinctNamedIn(jetSql);
    sql = TranslateJetSql(jetSql);
    Statement plain;
    impl_->Prepare(sql, plain, jetSql);
    std::swap(*st.out(), *plain.out());
  }
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
    if (snap->done) {  // no rows: nothing to read again
      snap->Release();
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
    if (impl_->pos == 0 && !impl_->done) return;
    if (impl_->stmt == nullptr) throw EngineError(kErrEngine, "הרשומות כבר נסגרו.");
    sqlite3_reset(impl_->stmt);
    impl_->pos = -1;
    impl_->done = false;
    impl_->StepForward();
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
