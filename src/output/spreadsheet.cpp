// The dispatch file as a workbook: libxlsxwriter writes .xlsx; other formats go through
// LibreOffice's headless converter when it is installed.
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <xlsxwriter.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <vector>

#include "hosttext/codepage.h"
#include "output/outputinternal.h"
#include "output/targetfile.h"

extern char** environ;

namespace zdr {
namespace {

namespace fs = std::filesystem;

using output_internal::LowerAscii;
using output_internal::PathFromUtf8;
using output_internal::ResolvedPath;

// Splits at every comma (the file quotes nothing) into `cells`, reusing its strings.
void SplitCsvLine(std::string_view line, std::vector<std::string>& cells) {
  size_t n = 0;
  size_t from = 0;
  while (true) {
    const size_t comma = line.find(',', from);
    const size_t end = comma == std::string_view::npos ? line.size() : comma;
    if (n == cells.size()) cells.emplace_back();
    cells[n++].assign(line.substr(from, end - from));
    if (comma == std::string_view::npos) break;
    from = comma + 1;
  }
  cells.resize(n);
}

// The dispatch file read line by line, decoded to UTF-8; a workbook is written from it in two
// passes (the column widths, then the cells), so memory does not grow with the file.
class CsvLineReader {
 public:
  explicit CsvLineReader(const std::string& path) : in_(path, std::ios::binary) {
    if (!in_) throw OutputError("לא ניתן לקרוא את הקובץ " + path);
  }
  bool Next(std::string& line) {
    if (!std::getline(in_, raw_)) return false;
    if (!raw_.empty() && raw_.back() == '\r') raw_.pop_back();
    line.clear();
    AppendWin1255AsUtf8(raw_, line);
    return true;
  }

 private:
  std::ifstream in_;
  std::string raw_;
};

bool ParseNumber(const std::string& text, double& out) {
  const size_t b = text.find_first_not_of(' ');
  if (b == std::string::npos) return false;
  const size_t e = text.find_last_not_of(' ');
  const std::string t = text.substr(b, e - b + 1);
  char* end = nullptr;
  errno = 0;
  const double v = std::strtod(t.c_str(), &end);
  if (end != t.c_str() + t.size() || errno != 0 || !std::isfinite(v)) return false;
  out = v;
  return true;
}

void Check(lxw_error err, const std::string& what) {
  if (err != LXW_NO_ERROR) {
    throw OutputError("כתיבת גיליון העבודה " + what + " נכשלה: " + lxw_strerror(err));
  }
}

// The findings sheet: the headings, then one row per finding, every cell text.
lxw_error WriteFindingsSheet(lxw_workbook* wb, const std::vector<Finding>& findings, bool show) {
  lxw_worksheet* ws = workbook_add_worksheet(wb, std::string(kFindingsSheetName).c_str());
  if (ws == nullptr) return LXW_ERROR_MEMORY_MALLOC_FAILED;
  worksheet_right_to_left(ws);
  if (show) worksheet_activate(ws);
  std::array<size_t, kFindingHeadings.size()> widths{};
  for (size_t c = 0; c < widths.size(); ++c) widths[c] = Utf8Length(kFindingHeadings[c]);
  for (const Finding& f : findings) {
    const auto cells = FindingCells(f);
    for (size_t c = 0; c < widths.size(); ++c) {
      widths[c] = std::max(widths[c], Utf8Length(cells[c]));
    }
  }
  for (size_t c = 0; c < widths.size(); ++c) {
    const double width = std::clamp(static_cast<double>(widths[c]) * 1.1 + 2.0, 6.0, 80.0);
    worksheet_set_column(ws, static_cast<lxw_col_t>(c), static_cast<lxw_col_t>(c), width, nullptr);
  }
  lxw_error err = LXW_NO_ERROR;
  for (size_t c = 0; c < kFindingHeadings.size() && err == LXW_NO_ERROR; ++c) {
    err = worksheet_write_string(ws, 0, static_cast<lxw_col_t>(c),
                                 std::string(kFindingHeadings[c]).c_str(), nullptr);
  }
  for (size_t r = 0; r < findings.size() && err == LXW_NO_ERROR; ++r) {
    const auto cells = FindingCells(findings[r]);
    for (size_t c = 0; c < cells.size() && err == LXW_NO_ERROR; ++c) {
      if (cells[c].empty()) continue;
      err = worksheet_write_string(ws, static_cast<lxw_row_t>(r + 1), static_cast<lxw_col_t>(c),
                                   cells[c].c_str(), nullptr);
    }
  }
  return err;
}

void WriteXlsx(const std::string& csvPath, const std::string& xlsxPath, bool rightToLeft,
               const std::vector<Finding>& findings, bool showFindings) {
  // The reference column is numeric; which column it is depends on the layout.
  int numericCol = -1;
  std::vector<size_t> widths;
  std::vector<std::string> cells;
  std::string line;
  CsvLineReader widthPass(csvPath);
  for (bool first = true; widthPass.Next(line); first = false) {
    if (first && line == kPostILHeader0) numericCol = 0;
    if (first && line == kPostILHeader1) numericCol = 10;
    SplitCsvLine(line, cells);
    if (widths.size() < cells.size()) widths.resize(cells.size(), 0);
    for (size_t c = 0; c < cells.size(); ++c) {
      widths[c] = std::max(widths[c], Utf8Length(cells[c]));
    }
  }

  lxw_workbook_options options{};
  options.constant_memory = LXW_TRUE;
  lxw_workbook* wb = workbook_new_opt(xlsxPath.c_str(), &options);
  if (wb == nullptr) throw OutputError("לא ניתן ליצור את גיליון העבודה " + xlsxPath);
  lxw_worksheet* ws = workbook_add_worksheet(wb, nullptr);
  if (ws == nullptr) {
    workbook_close(wb);
    throw OutputError("לא ניתן ליצור את גיליון העבודה " + xlsxPath);
  }
  if (rightToLeft) worksheet_right_to_left(ws);
  for (size_t c = 0; c < widths.size(); ++c) {
    const double width = std::clamp(static_cast<double>(widths[c]) * 1.1 + 2.0, 6.0, 80.0);
    worksheet_set_column(ws, static_cast<lxw_col_t>(c), static_cast<lxw_col_t>(c), width, nullptr);
  }
  lxw_error err = LXW_NO_ERROR;
  CsvLineReader cellPass(csvPath);
  for (size_t r = 0; err == LXW_NO_ERROR && cellPass.Next(line); ++r) {
    SplitCsvLine(line, cells);
    for (size_t c = 0; c < cells.size() && err == LXW_NO_ERROR; ++c) {
      const std::string& cell = cells[c];
      if (cell.empty()) continue;
      double number = 0;
      const auto row = static_cast<lxw_row_t>(r);
      const auto col = static_cast<lxw_col_t>(c);
      if (r > 0 && static_cast<int>(c) == numericCol && ParseNumber(cell, number)) {
        err = worksheet_write_number(ws, row, col, number, nullptr);
      } else {
        err = worksheet_write_string(ws, row, col, cell.c_str(), nullptr);
      }
    }
  }
  if (err == LXW_NO_ERROR && !findings.empty()) {
    err = WriteFindingsSheet(wb, findings, showFindings);
  }
  const lxw_error closed = workbook_close(wb);
  Check(err, xlsxPath);
  Check(closed, xlsxPath);
}

// The full path of an executable found on PATH, or "".
std::string FindOnPath(const char* name) {
  const char* path = std::getenv("PATH");
  if (path == nullptr) return {};
  std::stringstream dirs(path);
  std::string dir;
  while (std::getline(dirs, dir, ':')) {
    if (dir.empty()) continue;
    const fs::path candidate = fs::path(dir) / name;
    if (access(candidate.c_str(), X_OK) == 0) return candidate.string();
  }
  return {};
}

// Runs a program with arguments (no shell) and returns its exit status, -1 if it could not
// be started.
int RunProgram(const std::vector<std::string>& args) {
  std::vector<char*> argv;
  for (const std::string& a : args) argv.push_back(const_cast<char*>(a.c_str()));
  argv.push_back(nullptr);
  pid_t pid = 0;
  if (posix_spawn(&pid, argv[0], nullptr, nullptr, argv.data(), environ) != 0) return -1;
  int status = 0;
  while (waitpid(pid, &status, 0) < 0) {
    if (errno != EINTR) return -1;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

fs::path TempDir() {
  const char* t = std::getenv("Temp");
  if (t != nullptr && *t != '\0') return fs::path(t);
  return fs::temp_directory_path();
}

std::string FindOffice() {
  std::string office = FindOnPath("soffice");
  if (office.empty()) office = FindOnPath("libreoffice");
  return office;
}

void ConvertWithOffice(const std::string& csvPath, const fs::path& target, const fs::path& into,
                       bool rightToLeft, const std::vector<Finding>& findings, bool showFindings) {
  const std::string office = FindOffice();
  if (office.empty()) {
    throw OutputError("לא נמצאה תוכנה שממירה לתבנית " + target.extension().string() +
                      ". יש לבחור קובץ פלט שסיומתו .xlsx");
  }
  std::string pattern = (TempDir() / "zdrxls.XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) {
    throw OutputError("לא ניתן ליצור תיקייה זמנית: " + std::string(std::strerror(errno)));
  }
  const fs::path work(pattern);
  struct Cleanup {
    fs::path dir;
    ~Cleanup() {
      std::error_code ec;
      fs::remove_all(dir, ec);
    }
  } cleanup{work};

  const fs::path xlsx = work / (target.stem().string() + ".xlsx");
  WriteXlsx(csvPath, xlsx.string(), rightToLeft, findings, showFindings);
  const fs::path outDir = work / "out";
  fs::create_directories(outDir);
  const std::string ext = target.extension().string().substr(1);
  const int rc = RunProgram(
      {office, "--headless", "--convert-to", ext, "--outdir", outDir.string(), xlsx.string()});
  const fs::path produced = outDir / (target.stem().string() + "." + ext);
  std::error_code ec;
  if (rc != 0 || !fs::exists(produced, ec)) {
    throw OutputError("ההמרה לתבנית " + ext + " נכשלה. יש לבחור קובץ פלט שסיומתו .xlsx");
  }
  // Copied through the writer's name for the new file, which may be one with no file name.
  std::ifstream from(produced, std::ios::binary);
  std::ofstream to(into, std::ios::binary | std::ios::trunc);
  to << from.rdbuf();
  to.close();
  if (!from || !to) throw OutputError("לא ניתן לשמור את הקובץ " + target.string());
}

}  // namespace

namespace output_internal {

bool OfficeConverterInstalled() {
  return !FindOffice().empty();
}

}  // namespace output_internal

void ConvertToExcel(const std::string& pCsvFile, const std::string& pXlsFile, bool pOpenExcel,
                    UserSeam& ui, const std::vector<std::string>& companyFolders,
                    const std::vector<Finding>& findings, bool showFindings) {
  CheckOutputTarget(pXlsFile, TargetKind::kWorkbook, companyFolders);
  { const CsvLineReader readable(pCsvFile); }  // a missing file is reported before writing
  const fs::path target = PathFromUtf8(pXlsFile);
  // Written beside the file a link points to, so the link keeps pointing at the workbook.
  ReplacingFile pending(ResolvedPath(target));
  if (LowerAscii(target.extension().string()) == ".xlsx") {
    WriteXlsx(pCsvFile, pending.writePath(), pOpenExcel, findings, showFindings);
  } else {
    ConvertWithOffice(pCsvFile, target, pending.writePath(), pOpenExcel, findings, showFindings);
  }
  pending.Commit();
  if (pOpenExcel && !ui.OpenInSpreadsheet(pXlsFile)) {
    throw OutputError("לא ניתן לפתוח את הקובץ " + pXlsFile + " בתוכנת הגיליונות");
  }
}

}  // namespace zdr
