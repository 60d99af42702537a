// The dispatch file: comma-separated recipients in the national post's bulk-mail layout (0)
// or the courier's shipment layout (1). Nothing is quoted, so a field never carries a comma
// or a line break of its own.
#include <cmath>

#include "hosttext/codepage.h"
#include "output/outputinternal.h"
#include "select/select.h"

#include "engine/engine.h"

namespace zdr {
namespace output_internal {

void AppendCsvField(const db::Value& v, int pMaxLen, std::string& out) {
  if (db::IsNull(v)) return;
  std::string_view text;
  std::string number;
  if (const auto* s = std::get_if<std::string>(&v)) {
    text = *s;
  } else {
    AppendValueText(v, number);
    text = number;
  }
  size_t end = text.size();
  if (pMaxLen > 0) {
    // Cut after pMaxLen characters, not bytes.
    size_t pos = 0;
    for (int n = 0; n < pMaxLen && pos < text.size(); ++n) NextCodePoint(text, pos);
    end = pos;
  }
  for (size_t i = 0; i < end; ++i) {
    const char c = text[i];
    out += (c == ',' || c == '\r' || c == '\n') ? ' ' : c;
  }
}

}  // namespace output_internal

std::string CsvField(const db::Value& v, int pMaxLen) {
  std::string out;
  output_internal::AppendCsvField(v, pMaxLen, out);
  return out;
}

namespace {

using output_internal::AppendCsvField;

// A number as the host's Print writes it: a blank (or the minus sign), the digits, a blank.
void AppendPrintedNumber(const db::Value& v, std::string& out) {
  if (db::IsNull(v)) return;
  if (std::holds_alternative<std::string>(v)) {
    AppendCsvField(v, 0, out);
    return;
  }
  std::string digits;
  output_internal::AppendValueText(v, digits);
  if (!digits.empty() && digits[0] == '-') {
    out += digits;
  } else {
    out += ' ';
    out += digits;
  }
  out += ' ';
}

struct DispatchFields {
  int reference, name, address, city, telephone, key, details;

  explicit DispatchFields(const db::Snapshot& rs)
      : reference(rs.FieldIndex("Reference1")),
        name(rs.FieldIndex("AccountName")),
        address(rs.FieldIndex("Address")),
        city(rs.FieldIndex("City")),
        telephone(rs.FieldIndex("Telephone")),
        key(rs.FieldIndex("AccountKey")),
        details(rs.FieldIndex("DetailsLine1")) {}
};

// Layout 0: מספר, שם משפחה, שם פרטי, כתובת, יישוב, טלפון 1, טלפון 2, סוג שירות, משקל,
// כפולה, אישור מסירה, חיוב נוסף, גוביינא, הערות, מספר משלוחים.
void AppendPostRow(const db::Snapshot& rs, const DispatchFields& c, const std::string& service,
                   const std::string& weight, const std::string& confirm, std::string& line) {
  AppendPrintedNumber(rs.Field(c.reference), line);
  line += ',';
  AppendCsvField(rs.Field(c.name), kPostLengths.name, line);
  line += ",,";
  AppendCsvField(rs.Field(c.address), kPostLengths.address, line);
  line += ',';
  AppendCsvField(rs.Field(c.city), kPostLengths.city, line);
  line += ',';
  AppendCsvField(rs.Field(c.telephone), kPostLengths.telephone, line);
  line += ",,";
  line += service;
  line += ',';
  line += weight;
  line += ",,";
  line += confirm;
  line += ",,,";
  AppendCsvField(rs.Field(c.details), kPostLengths.remarks, line);
  line += ",1";
}

// Layout 1: קוד לקוח, שם לקוח, רחוב, מספר, עיר, טלפון, נייד, איש קשר, תאריך, שעה, אסמכתא,
// סעיף, כמות מארזים, סכום גבייה, תשלום, איסוף, הערות לקוח.
void AppendCourierRow(const db::Snapshot& rs, const DispatchFields& c, const std::string& date,
                      std::string& line) {
  AppendCsvField(rs.Field(c.key), 0, line);
  line += ',';
  AppendCsvField(rs.Field(c.name), kCourierLengths.name, line);
  line += ',';
  AppendCsvField(rs.Field(c.address), kCourierLengths.address, line);
  line += ",,";
  AppendCsvField(rs.Field(c.city), kCourierLengths.city, line);
  line += ',';
  AppendCsvField(rs.Field(c.telephone), kCourierLengths.telephone, line);
  line += ",,,";
  line += date;
  line += ",,";
  AppendPrintedNumber(rs.Field(c.reference), line);
  line += ",1,1,,,,";
  AppendCsvField(rs.Field(c.details), kCourierLengths.remarks, line);
}

// The rows of `rs` from where it stands, with the header, into `f`, which it closes.
void WriteCSV(output_internal::CodePageFile& f, db::Snapshot& rs, int16_t pFileFormat,
              const PostILSettings& settings, UserSeam& ui, Date today);

}  // namespace

void CreateCSV(const std::string& pFileName, const std::string& pDBFile, int16_t pFileFormat,
               const Panel& panel, const DocTypeTable& docTypes, const std::string& selectDbPath,
               const PostILSettings& settings, UserSeam& ui, Date today) {
  output_internal::CodePageFile f(pFileName, output_internal::Unmappable::kFail);
  ProgressReporter started(ui, 1);
  db::Database database = db::Database::Open(pDBFile);
  db::Snapshot rs = database.OpenSnapshot(BuildRecipientsStatement(panel, docTypes, selectDbPath),
                                          db::SnapshotKind::Forward);
  WriteCSV(f, rs, pFileFormat, settings, ui, today);
}

void CreateCSV(const std::string& pFileName, db::Snapshot& recipients, int16_t pFileFormat,
               const PostILSettings& settings, UserSeam& ui, Date today) {
  output_internal::CodePageFile f(pFileName, output_internal::Unmappable::kFail);
  ProgressReporter started(ui, 1);
  if (recipients.TotalRows() > 0) recipients.MoveFirst();
  WriteCSV(f, recipients, pFileFormat, settings, ui, today);
}

namespace {

void WriteCSV(output_internal::CodePageFile& f, db::Snapshot& rs, int16_t pFileFormat,
              const PostILSettings& settings, UserSeam& ui, Date today) {
  if (rs.AtStart() || rs.AtEnd()) {  // either, right after opening: no rows
    f.Close();                       // no recipients: an empty file, not even a header
    return;
  }
  const int64_t count = rs.TotalRows();
  if (pFileFormat != 0 && pFileFormat != 1) {
    f.Close();
    return;
  }
  f.Line(pFileFormat == 0 ? kPostILHeader0 : kPostILHeader1);

  // The fixed columns are free text from the settings: a comma or line break typed there
  // would shift every column after it, so they pass the same cleaning as the fields.
  const std::string service = CsvField(settings.Service, 0);
  const std::string weight = CsvField(settings.Weight, 0);
  const std::string confirm = CsvField(settings.Confirm, 0);
  const std::string date = FormatDate(today);
  const DispatchFields fields(rs);

  ProgressReporter progress(ui, static_cast<double>(count));
  int64_t rows = 0;
  std::string line;
  while (!rs.AtEnd()) {
    ++rows;
    line.clear();
    if (pFileFormat == 0) {
      AppendPostRow(rs, fields, service, weight, confirm, line);
    } else {
      AppendCourierRow(rs, fields, date, line);
    }
    f.Line(line);
    rs.MoveNext();
    if (rows % 2 == 0) progress.Update(static_cast<double>(rows));
  }
  f.Close();
}

}  // namespace

}  // namespace zdr
