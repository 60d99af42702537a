// The dispatch file as a workbook: libxlsxwriter writes .xlsx; other formats go through
// LibreOffice's headless converter when it is installed.
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>
#include <xlsxwriter.h>

#include <algorithm>
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

#include "import/codepage.h"
#include "output/output.h"

extern char** environ;

namespace zdr {
namespace {

namespace fs = std::filesystem;

std::string Lower(std::string s) {
  for (char& c : s) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return s;
}

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

// The dispatch file's lines, decoded to UTF-8.
std::vector<std::string> ReadCsvLines(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) throw OutputError("לא ניתן לקרוא את הקובץ " + path);
  const std::string bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  std::vector<std::string> lines;
  size_t from = 0;
  while (from < bytes.size()) {
    size_t end = bytes.find('\n', from);
    const size_t next = end == std::string::npos ? bytes.size() : end + 1;
    if (end == std::string::npos) end = bytes.size();
    if (end > from && bytes[end - 1] == '\r') --end;
    lines.push_back(Win1255ToUtf8(std::string_view(bytes).substr(from, end - from)));
    from = next;
  }
  return lines;
}

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

void WriteXlsx(const std::vector<std::string>& lines, const std::string& xlsxPath,
               bool rightToLeft) {
  // The reference column is numeric; which column it is depends on the layout.
  int numericCol = -1;
  if (!lines.empty()) {
    if (lines[0] == kPostILHeader0) numericCol = 0;
    if (lines[0] == kPostILHeader1) numericCol = 10;
  }
  std::vector<size_t> widths;
  std::vector<std::string> cells;
  for (const std::string& line : lines) {
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
  for (size_t r = 0; r < lines.size() && err == LXW_NO_ERROR; ++r) {
    SplitCsvLine(lines[r], cells);
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

void ConvertWithOffice(const std::vector<std::string>& lines, const fs::path& target,
                       bool rightToLeft) {
  std::string office = FindOnPath("soffice");
  if (office.empty()) office = FindOnPath("libreoffice");
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
  WriteXlsx(lines, xlsx.string(), rightToLeft);
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
  fs::copy_file(produced, target, fs::copy_options::overwrite_existing, ec);
  if (ec) throw OutputError("לא ניתן לשמור את הקובץ " + target.string() + ": " + ec.message());
}

}  // namespace

void ConvertToExcel(const std::string& pCsvFile, const std::string& pXlsFile, bool pOpenExcel,
                    UserSeam& ui) {
  if (pXlsFile.empty()) throw OutputError("לא הוגדר קובץ פלט");
  const std::vector<std::string> lines = ReadCsvLines(pCsvFile);
  const fs::path target(pXlsFile);
  const std::string ext = Lower(target.extension().string());
  if (ext == ".xlsx") {
    WriteXlsx(lines, pXlsFile, pOpenExcel);
  } else if (ext.size() < 2) {
    throw OutputError("לקובץ הפלט " + pXlsFile + " אין סיומת. יש לבחור קובץ פלט שסיומתו .xlsx");
  } else {
    ConvertWithOffice(lines, target, pOpenExcel);
  }
  if (pOpenExcel && !ui.OpenInSpreadsheet(pXlsFile)) {
    throw OutputError("לא ניתן לפתוח את הקובץ " + pXlsFile + " בתוכנת הגיליונות");
  }
}

}  // namespace zdr
