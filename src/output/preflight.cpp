// The dispatch preflight: each recipient row of the dispatch file through the rule table.
#include "output/preflight.h"

#include <algorithm>
#include <cstdio>
#include <stdexcept>
#include <unordered_map>

#include "engine/engine.h"
#include "hosttext/codepage.h"
#include "output/outputinternal.h"
#include "select/select.h"

namespace zdr {
namespace {

using output_internal::AppendCsvField;
using output_internal::AppendValueText;

std::string_view Trim(std::string_view s) {
  const size_t b = s.find_first_not_of(' ');
  if (b == std::string_view::npos) return {};
  return s.substr(b, s.find_last_not_of(' ') - b + 1);
}

// Trimmed, with every run of blanks folded into one: how two texts are compared.
std::string Folded(std::string_view s) {
  std::string out;
  for (const char c : Trim(s)) {
    if (c == ' ' && !out.empty() && out.back() == ' ') continue;
    out += c;
  }
  return out;
}

std::string ValueText(const db::Value& v) {
  std::string out;
  AppendValueText(v, out);
  return out;
}

bool AllDigits(std::string_view s) {
  for (const char c : s) {
    if (c < '0' || c > '9') return false;
  }
  return true;
}

// 9 or 10 digits beginning with 0, or a 1-700 or 1-800 number of 10 digits, dashes and
// blanks not counted; "+972" before the number stands for its leading 0.
bool IsIsraeliTelephone(std::string_view s) {
  std::string digits;
  bool international = false;
  for (const char c : Trim(s)) {
    if (c == '-' || c == ' ') continue;
    if (c == '+' && digits.empty() && !international) {
      international = true;
      continue;
    }
    if (c < '0' || c > '9') return false;
    digits += c;
  }
  if (international) {
    if (!digits.starts_with("972")) return false;
    digits.replace(0, 3, 1, '0');
  }
  if (digits.size() == 10 && (digits.starts_with("1700") || digits.starts_with("1800"))) {
    return !international;
  }
  return (digits.size() == 9 || digits.size() == 10) && digits[0] == '0';
}

}  // namespace

bool IsDispatchWeight(std::string_view s) {
  if (s.empty()) return true;
  const size_t point = s.find('.');
  const std::string_view whole = s.substr(0, point);
  const std::string_view part = point == std::string_view::npos ? "" : s.substr(point + 1);
  if (whole.empty() || !AllDigits(whole)) return false;
  if (point != std::string_view::npos && (part.empty() || !AllDigits(part))) return false;
  return s.find_first_of("123456789") != std::string_view::npos;
}

namespace {

// A character the file cannot carry: one Windows-1255 has no byte for (the writer refuses
// the whole file), one of the code page's undefined bytes, or a control character.
bool Uncarried(char32_t cp) {
  if (cp < 0x20 || cp == 0x7F) return true;
  const int b = CodePointToWin1255(cp);
  return b < 0 || !IsWin1255Defined(static_cast<unsigned char>(b));
}

// "U+0416 Ж, U+00D9" for the uncarried characters of `text` (each once, at most five), or
// "" when there are none.
std::string UncarriedCharacters(std::string_view text) {
  std::string out;
  std::vector<char32_t> seen;
  for (size_t pos = 0; pos < text.size();) {
    const char32_t cp = NextCodePoint(text, pos);
    if ((cp >= 0x20 && cp < 0x7F) || !Uncarried(cp) ||
        std::find(seen.begin(), seen.end(), cp) != seen.end())
      continue;
    seen.push_back(cp);
    if (seen.size() > 5) {
      out += ", ...";
      break;
    }
    char code[16];
    std::snprintf(code, sizeof code, "U+%04X", static_cast<unsigned>(cp));
    if (!out.empty()) out += ", ";
    out += code;
    // Show the character itself only when it is printable.
    if (cp >= 0xA0 && cp != 0xFFFD) {
      out += ' ';
      AppendUtf8(cp, out);
    }
  }
  return out;
}

// The first `n` characters of `s`.
std::string Utf8Prefix(std::string_view s, size_t n) {
  size_t pos = 0;
  for (size_t i = 0; i < n && pos < s.size(); ++i) NextCodePoint(s, pos);
  return std::string(s.substr(0, pos));
}

struct RowFields {
  int key, name, address, city, zip, telephone, remarks;

  explicit RowFields(const db::Snapshot& rs)
      : key(rs.FieldIndex("AccountKey")),
        name(rs.FieldIndex("AccountName")),
        address(rs.FieldIndex("Address")),
        city(rs.FieldIndex("City")),
        zip(rs.FieldIndex("Zip")),
        telephone(rs.FieldIndex("Telephone")),
        remarks(rs.FieldIndex("DetailsLine1")) {}
};

// One text field of a row: as the books hold it, and as the file carries it.
struct FieldText {
  std::string books;    // the value's text
  std::string written;  // cleaned and cut as the dispatch file writes it
  std::string lost;     // cleaned text cut off the end; "" when nothing was cut

  FieldText(const db::Value& v, int maxLength) {
    AppendValueText(v, books);
    AppendCsvField(v, maxLength, written);
    // The cleaning changes single bytes into single bytes, so what was cut is the rest of the
    // books' text, cleaned the same way.
    if (books.size() > written.size()) {
      AppendCsvField(db::Value{books.substr(written.size())}, 0, lost);
    }
  }
};

class Checker {
 public:
  Checker(int16_t layout, bool zipCarried, int64_t rows, PreflightResult& result)
      : lengths_(layout == 0 ? kPostLengths : kCourierLengths),
        layout_(layout),
        zipCarried_(zipCarried),
        result_(result) {
    firstRow_.reserve(static_cast<size_t>(rows));
  }

  void Check(const db::Snapshot& rs, const RowFields& c, int64_t row) {
    row_ = row;
    key_ = ValueText(rs.Field(c.key));
    const FieldText name(rs.Field(c.name), lengths_.name);
    const FieldText address(rs.Field(c.address), lengths_.address);
    const FieldText city(rs.Field(c.city), lengths_.city);
    const FieldText telephone(rs.Field(c.telephone), lengths_.telephone);
    const FieldText remarks(rs.Field(c.remarks), lengths_.remarks);

    if (Trim(name.written).empty()) Add(RuleId::kNameMissing, name.books);
    if (Trim(address.written).empty()) Add(RuleId::kAddressMissing, address.books);
    if (Trim(city.written).empty()) Add(RuleId::kCityMissing, city.books);
    if (zipCarried_) {
      const std::string zip = ValueText(rs.Field(c.zip));
      const std::string_view z = Trim(zip);
      if (z.empty()) {
        Add(RuleId::kZipEmpty, zip);
      } else if (!AllDigits(z) || (z.size() != 5 && z.size() != 7)) {
        Add(RuleId::kZipMalformed, zip);
      }
    }
    const std::string_view phone = Trim(telephone.written);
    if (!phone.empty() && !IsIsraeliTelephone(phone)) {
      Add(RuleId::kTelephoneMalformed, telephone.books);
    }
    AddCut(RuleId::kNameCut, name);
    AddCut(RuleId::kAddressCut, address);
    AddCut(RuleId::kCityCut, city);
    AddCut(RuleId::kTelephoneCut, telephone);
    AddCut(RuleId::kRemarksCut, remarks);
    CheckDuplicate(name, address, city);

    if (layout_ == 1) {
      const FieldText key(rs.Field(c.key), 0);
      AddCharacters("מפתח חשבון", key);
    }
    AddCharacters(RuleOf(RuleId::kNameMissing).field, name);
    AddCharacters(RuleOf(RuleId::kAddressMissing).field, address);
    AddCharacters(RuleOf(RuleId::kCityMissing).field, city);
    AddCharacters(RuleOf(RuleId::kTelephoneMalformed).field, telephone);
    AddCharacters(RuleOf(RuleId::kRemarksCut).field, remarks);
  }

  // The dispatch settings' columns of layout 0, the same on every row: found once, row 0.
  void CheckFixed(const PostILSettings& fixed) {
    row_ = 0;
    key_.clear();
    const std::pair<std::string_view, const std::string*> columns[] = {
        {"סוג שירות", &fixed.Service}, {"משקל", &fixed.Weight}, {"אישור מסירה", &fixed.Confirm}};
    for (const auto& [caption, text] : columns) {
      const FieldText f(db::Value{*text}, 0);
      if (text == &fixed.Weight && !IsDispatchWeight(*text)) Add(RuleId::kWeightMalformed, *text);
      if (Utf8Length(f.written) > kWorkbookCellLength) {
        Add(RuleId::kFixedTooLong, Utf8Prefix(*text, 40) + "...",
            std::to_string(Utf8Length(f.written)) + " תווים", caption);
      }
      AddCharacters(caption, f);
    }
  }

 private:
  void Add(RuleId id, std::string value, std::string_view detail = {},
           std::string_view field = {}) {
    const PreflightRule& rule = RuleOf(id);
    Finding f{id,
              rule.severity,
              row_,
              key_,
              std::string(field.empty() ? rule.field : field),
              std::move(value),
              std::string(rule.message)};
    if (!detail.empty()) {
      f.message += ": ";
      f.message += detail;
    }
    (rule.severity == Severity::kError ? result_.errors : result_.warnings) += 1;
    result_.findings.push_back(std::move(f));
  }

  // Only a cut that loses more than blanks is reported.
  void AddCut(RuleId id, const FieldText& f) {
    if (Trim(f.lost).empty()) return;
    Add(id, f.books, "החלק שאבד \"" + f.lost + "\"");
  }

  void AddCharacters(std::string_view field, const FieldText& f) {
    const std::string found = UncarriedCharacters(f.written);
    if (!found.empty()) Add(RuleId::kCharacter, f.books, found, field);
  }

  // Rows with the same name, address and city as an earlier row; rows missing the name or
  // the address are left to those rules.
  void CheckDuplicate(const FieldText& name, const FieldText& address, const FieldText& city) {
    std::string n = Folded(name.written), a = Folded(address.written);
    if (n.empty() || a.empty()) return;
    std::string key = n + '\n' + a + '\n' + Folded(city.written);
    const auto [it, inserted] = firstRow_.try_emplace(std::move(key), row_);
    if (inserted) return;
    std::string value = name.books + " / " + address.books;
    if (!Trim(city.books).empty()) value += " / " + city.books;
    Add(RuleId::kDuplicate, std::move(value), "שורה " + std::to_string(it->second));
  }

  DispatchLengths lengths_;
  int16_t layout_;
  bool zipCarried_;
  PreflightResult& result_;
  int64_t row_ = 0;
  std::string key_;
  std::unordered_map<std::string, int64_t> firstRow_;
};

}  // namespace

const PreflightRule& RuleOf(RuleId id) {
  for (const PreflightRule& r : kPreflightRules) {
    if (r.id == id) return r;
  }
  throw std::logic_error("preflight rule missing from the table");
}

std::string_view SeverityText(Severity s) {
  return s == Severity::kError ? "שגיאה" : "אזהרה";
}

namespace {
// The checks over the rows of `rs` from where it stands.
PreflightResult CheckRows(db::Snapshot& rs, int16_t pFileFormat, bool zipCarried,
                          const PostILSettings& fixed, UserSeam& ui);
}  // namespace

PreflightResult RunPreflight(const std::string& pDBFile, int16_t pFileFormat, const Panel& panel,
                             const DocTypeTable& docTypes, const std::string& selectDbPath,
                             UserSeam& ui, const PostILSettings& fixed) {
  ProgressReporter started(ui, 1);
  if (pFileFormat != 0 && pFileFormat != 1) return {};  // CreateCSV writes no rows
  db::Database database = db::Database::Open(pDBFile);
  db::Snapshot rs = database.OpenSnapshot(BuildRecipientsStatement(panel, docTypes, selectDbPath),
                                          db::SnapshotKind::Forward);
  return CheckRows(rs, pFileFormat, !AddressFromDocumentHeader(panel, docTypes), fixed, ui);
}

PreflightResult RunPreflight(db::Snapshot& recipients, int16_t pFileFormat, const Panel& panel,
                             const DocTypeTable& docTypes, UserSeam& ui,
                             const PostILSettings& fixed) {
  ProgressReporter started(ui, 1);
  if (pFileFormat != 0 && pFileFormat != 1) return {};
  if (recipients.TotalRows() > 0) recipients.MoveFirst();
  return CheckRows(recipients, pFileFormat, !AddressFromDocumentHeader(panel, docTypes), fixed, ui);
}

namespace {

PreflightResult CheckRows(db::Snapshot& rs, int16_t pFileFormat, bool zipCarried,
                          const PostILSettings& fixed, UserSeam& ui) {
  PreflightResult result;
  if (rs.AtStart() || rs.AtEnd()) return result;
  const int64_t count = rs.TotalRows();
  const RowFields fields(rs);
  Checker checker(pFileFormat, zipCarried, count, result);
  if (pFileFormat == 0) checker.CheckFixed(fixed);
  ProgressReporter progress(ui, static_cast<double>(count));
  while (!rs.AtEnd()) {
    ++result.rows;
    checker.Check(rs, fields, result.rows + 1);  // the header is row 1
    rs.MoveNext();
    if (result.rows % 64 == 0) progress.Update(static_cast<double>(result.rows));
  }
  return result;
}

}  // namespace

std::array<std::string, 6> FindingCells(const Finding& f) {
  return {std::string(SeverityText(f.severity)),
          f.row == 0 ? std::string("כל השורות") : std::to_string(f.row),
          f.accountKey,
          f.field,
          f.value,
          f.message};
}

std::string FindingsCsv(const PreflightResult& result) {
  std::string out;
  auto cell = [&out](std::string_view text, bool first) {
    if (!first) out += ',';
    if (text.find_first_of(",\"\r\n") == std::string_view::npos) {
      out += text;
      return;
    }
    out += '"';
    for (const char c : text) {
      if (c == '"') out += '"';
      out += c;
    }
    out += '"';
  };
  for (size_t i = 0; i < kFindingHeadings.size(); ++i) cell(kFindingHeadings[i], i == 0);
  out += '\n';
  for (const Finding& f : result.findings) {
    const auto cells = FindingCells(f);
    for (size_t i = 0; i < cells.size(); ++i) cell(cells[i], i == 0);
    out += '\n';
  }
  return out;
}

std::string PreflightCounts(const PreflightResult& result) {
  return "שגיאות: " + std::to_string(result.errors) +
         ", אזהרות: " + std::to_string(result.warnings);
}

}  // namespace zdr
