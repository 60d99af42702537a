#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "engine/engine.h"
#include "engine/engineinternal.h"

namespace zdr::db {

namespace {

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

// A set of short texts for the hot path of appending rows: a key of up to 15 bytes lives in its
// slot of an open-addressing table, so a lookup of a key already there (nearly every lookup)
// touches one cache line. Longer keys go to an ordinary set.
class TextSet {
 public:
  // Adds `s`; returns false when it was there already.
  bool Insert(std::string_view s) {
    if (s.size() > kInline) return long_.emplace(s).second;
    if ((count_ + 1) * 4 > slots_.size() * 3) Grow();
    Slot& slot = Find(s);
    if (slot.len != 0) return false;
    slot.len = static_cast<uint8_t>(s.size() + 1);
    std::memcpy(slot.bytes, s.data(), s.size());
    ++count_;
    return true;
  }

  // Brings the slot of `s` towards the cache, so that an Insert after other work finds it there.
  void Prefetch(std::string_view s) const {
    if (s.size() <= kInline && !slots_.empty()) {
      __builtin_prefetch(&slots_[Hash(s) & (slots_.size() - 1)]);
    }
  }

 private:
  static constexpr size_t kInline = 15;
  struct Slot {
    uint8_t len = 0;  // the key's length + 1; 0: empty
    char bytes[kInline] = {};
  };

  static uint64_t Hash(std::string_view s) {
    uint64_t a = 0, b = 0;
    std::memcpy(&a, s.data(), std::min<size_t>(s.size(), 8));
    if (s.size() > 8) std::memcpy(&b, s.data() + 8, s.size() - 8);
    // Every byte reaches the low bits the table indexes by.
    uint64_t h = (a ^ (s.size() << 56)) * 0x9E3779B97F4A7C15ULL ^ b * 0xC2B2AE3D27D4EB4FULL;
    h ^= h >> 32;
    h *= 0xD6E8FEB86659FD93ULL;
    return h ^ (h >> 29);
  }

  // The slot that holds `s`, or the empty slot where it belongs.
  Slot& Find(std::string_view s) {
    const size_t mask = slots_.size() - 1;
    for (size_t i = Hash(s) & mask;; i = (i + 1) & mask) {
      Slot& slot = slots_[i];
      if (slot.len == 0) return slot;
      if (slot.len == s.size() + 1 && std::memcmp(slot.bytes, s.data(), s.size()) == 0) {
        return slot;
      }
    }
  }

  void Grow() {
    std::vector<Slot> old(std::max<size_t>(1024, slots_.size() * 2));
    old.swap(slots_);
    for (const Slot& slot : old) {
      if (slot.len != 0) Find({slot.bytes, slot.len - 1u}) = slot;
    }
  }

  std::vector<Slot> slots_;
  size_t count_ = 0;
  std::unordered_set<std::string> long_;
};

// The distinct values of one field as rows are appended: each value new to this recordset is
// offered once to the kept table (which may hold it from an earlier recordset already).
struct KeptField {
  size_t field = 0;
  std::string keptTable;
  sqlite3_stmt* insert = nullptr;
  TextSet seen;
};

}  // namespace

struct TableRecordset::Impl {
  std::shared_ptr<Connection> conn;
  sqlite3_stmt* insert = nullptr;
  std::vector<KeptField> kept;
  std::string table;
  std::vector<FieldDef> fields;
  std::vector<IndexDef> indexes;
  std::vector<Slot> row;
  bool editing = false;

  Impl() = default;
  Impl(const Impl&) = delete;
  Impl& operator=(const Impl&) = delete;
  ~Impl() { CloseQuietly(); }

  // Returns the commit's failure, nothing when the rows are in the file.
  std::optional<EngineError> CloseQuietly() {
    if (!conn) return std::nullopt;
    sqlite3_finalize(insert);
    insert = nullptr;
    for (KeptField& k : kept) sqlite3_finalize(k.insert);
    kept.clear();
    std::optional<EngineError> failure = conn->RecordsetClosed();
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

  // Records the appended row's values of the kept fields. When a value cannot be kept, what
  // is kept of that field is dropped, and statements read the table itself again: the row is
  // stored and answers stay right. Only when even that fails is the failure raised.
  void KeepDistinct() {
    for (size_t i = 0; i < kept.size(); ++i) {
      KeptField& k = kept[i];
      const std::string& value = row[k.field].text;
      if (!k.seen.Insert(value)) continue;
      sqlite3_bind_text(k.insert, 1, value.data(), static_cast<int>(value.size()), SQLITE_STATIC);
      const int rc = sqlite3_step(k.insert);
      sqlite3_reset(k.insert);
      if (rc == SQLITE_DONE) continue;
      const EngineError failure = StepFailure(conn->db, rc, "");
      sqlite3_finalize(k.insert);
      const std::string drop = "DROP TABLE main." + QuoteId(k.keptTable);
      kept.erase(kept.begin() + static_cast<std::ptrdiff_t>(i--));
      if (sqlite3_exec(conn->db, drop.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK) {
        throw failure;
      }
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
    params += '?';
    params += std::to_string(i + 1);
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
  if (schema == "main") {
    for (const std::string& name : impl_->KeptDistinctFields(def.name)) {
      KeptField k;
      for (size_t i = 0; i < def.fields.size(); ++i) {
        if (EqualsNoCase(def.fields[i].name, name)) k.field = i;
      }
      k.keptTable = KeptDistinctTable(def.name, name);
      const std::string keepSql =
          "INSERT OR IGNORE INTO main." + QuoteId(k.keptTable) + " VALUES (?1)";
      if (sqlite3_prepare_v3(h, keepSql.c_str(), -1, SQLITE_PREPARE_PERSISTENT, &k.insert,
                             nullptr) != SQLITE_OK) {
        const std::string message = SqliteMessage(h);
        sqlite3_finalize(k.insert);
        throw EngineError(kErrEngine, "לא ניתן לפתוח את הטבלה '" + table + "': " + message);
      }
      rs->kept.push_back(std::move(k));
    }
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
  // The kept values' lookup after the step would wait on memory; the step hides the wait.
  for (const KeptField& k : r.kept) k.seen.Prefetch(r.row[k.field].text);
  const int rc = sqlite3_step(r.insert);
  if (rc == SQLITE_DONE) {
    sqlite3_reset(r.insert);
    r.editing = false;
    if (!r.kept.empty()) r.KeepDistinct();
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
  if (std::optional<EngineError> failure = impl_->CloseQuietly()) throw *failure;
}

}  // namespace zdr::db
