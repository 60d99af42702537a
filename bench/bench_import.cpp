// Importer speed on a large generated company, against the floor each importer cannot beat:
// reading the same files' bytes, plus bare SQLite appends of the rows it wrote.
//
// The company (100,000 accounts, 200,000 documents of 3-5 lines, 1,000,000 ledger
// transactions, 20 batches of 10,000, 100,000 receipts) is generated once into
// $ZDR_BENCH_DIR (default: the system temp folder)/zdr_bench_import_large and reused.
// Every importer runs with all its criteria on, set wide so that nearly every record passes.
//
// The floor of an importer (BM_Floor.../0) reads every record of the same files and appends the
// very rows the importer wrote through bare SQLite, into tables made by the engine's own table
// and index statements (same Hebrew collation, constraints and indexes) under the working
// database's pragmas. BM_Floor.../1 appends them through the engine instead, into a fresh
// working database.
//
// Counters: records/s (host records read), rows (rows written), peak_rss_mb (peak resident
// memory during the run, reset before each benchmark).

#include <benchmark/benchmark.h>
#include <sqlite3.h>
#include <stdlib.h>

#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "common/panel.h"
#include "common/userseam.h"
#include "control/control.h"
#include "control/dataload.h"
#include "engine/collation.h"
#include "engine/engine.h"
#include "hostfile/doctypes.h"
#include "hostfile/hostfile.h"
#include "import/importers.h"
#include "workdb/schema.h"
#include "zdrgen/generator.h"

namespace {

namespace fs = std::filesystem;
using namespace zdr;

class QuietSeam : public UserSeam {
 public:
  void ShowMessage(std::string_view text, std::string_view title, MsgIcon) override {
    std::fprintf(stderr, "message: %.*s (%.*s)\n", static_cast<int>(text.size()), text.data(),
                 static_cast<int>(title.size()), title.data());
  }
  bool AskYesNo(std::string_view, std::string_view, MsgIcon) override { return true; }
  void SetStatus(std::string_view) override {}
  void SetProgress(int) override {}
  bool OpenInBrowser(const std::string&) override { return true; }
  bool OpenInSpreadsheet(const std::string&) override { return true; }
};

// ZDR_BENCH_TENTH=1 runs on a company a tenth of the size, to see what grows with it.
bool Tenth() {
  const char* v = std::getenv("ZDR_BENCH_TENTH");
  return v != nullptr && std::string_view(v) == "1";
}

zdrgen::Options CompanyOptions() {
  zdrgen::Options o = zdrgen::Options::Large();
  if (Tenth()) {
    o.accounts /= 10;
    o.documents /= 10;
    o.ledger /= 10;
    o.batchSize /= 10;
    o.receipts /= 10;
  }
  return o;
}

fs::path BenchRoot() {
  const char* dir = std::getenv("ZDR_BENCH_DIR");
  return fs::path(dir != nullptr && *dir != '\0' ? dir : fs::temp_directory_path().string()) /
         (Tenth() ? "zdr_bench_import_tenth" : "zdr_bench_import_large");
}

// The company folder, generated on first use.
const std::string& Company() {
  static const std::string folder = [] {
    fs::path root = BenchRoot();
    fs::path company = root / "company";
    if (!fs::exists(root / "complete")) {
      fs::remove_all(root);
      std::fprintf(stderr, "generating the large company in %s ...\n", company.c_str());
      zdrgen::WriteCompany(company, CompanyOptions(), "חברה גדולה");
      std::ofstream(root / "complete") << "1\n";
    }
    fs::create_directories(root / "temp");
    ::setenv("Temp", (root / "temp").c_str(), 1);
    return company.string();
  }();
  return folder;
}

Panel WidePanel() {
  Panel p;
  p.ChkAgent = 1;
  p.txtAgent = "0";
  p.txtToAgent = "255";
  p.ChkAccKey = 1;
  p.TxtFromCrd = "0";
  p.TxtToCrd = "תתתת";
  p.ChkCatCode = 1;
  p.txtFromSort = " ";
  p.txtToSort = "תתת";
  p.chkCutOff = 1;  // every box "*": on, and passes all
  p.ChkDates = 1;
  p.cmbDocType = kAllSalesInvoicesRow;
  p.TxtFromDate = "01/01/1900";
  p.TxtToDate = "31/12/2099";
  p.txtFromRef = "0";
  p.txtToRef = "99999";
  p.ChkByItems = 1;
  p.txtFromItmSort = "";
  p.txtToItmSort = "תתת";
  p.txtFromItmKey = "";
  p.txtToItmKey = "תתתתתתתתתתתת";
  p.ChkJournal = 1;
  p.txtFromJournal = "-32768";
  p.txtToJournal = "32767";
  p.chkTransType = 1;
  p.txtTransType = "*";
  p.chkTransDates = 1;
  p.txtFromTransDate = "01/01/1900";
  p.txtToTransDate = "31/12/2099";
  p.chkTransVDate = 1;
  p.txtFromTransVDate = "01/01/1900";
  p.txtToTransVDate = "31/12/2099";
  p.chkReadTempTrans = 1;
  return p;
}

void ResetPeakRss() {
  std::ofstream("/proc/self/clear_refs") << "5";
}
double PeakRssMb() {
  std::ifstream in("/proc/self/status");
  std::string line;
  while (std::getline(in, line)) {
    if (line.rfind("VmHWM:", 0) == 0) return std::stod(line.substr(6)) / 1024.0;
  }
  return 0;
}

std::vector<fs::path> BatchFiles() {
  std::vector<fs::path> files;
  for (const auto& e : fs::directory_iterator(Company())) {
    std::string n = e.path().filename().string();
    if (n.size() > 5 && (n[0] == 'a' || n[0] == 'A') && n.ends_with(".tmp")) {
      files.push_back(e.path());
    }
  }
  return files;
}

int64_t RecordsIn(const fs::path& file, size_t len) {
  return static_cast<int64_t>(fs::file_size(file) / len);
}

int64_t TableRows(const std::string& db, const std::string& table) {
  db::Database d = db::Database::Open(db);
  db::Snapshot s = d.OpenSnapshot("SELECT Count(*) AS N FROM " + table);
  return std::get<int64_t>(s.Field(0));
}

// One importer run per iteration, on a fresh working database made outside the timing.
template <typename Run>
void RunImporter(benchmark::State& state, int64_t records, const std::vector<std::string>& tables,
                 Run run) {
  Company();
  QuietSeam ui;
  int64_t rows = 0;
  ResetPeakRss();
  for (auto _ : state) {
    state.PauseTiming();
    std::string db = CreateWorkDB("", ui);
    state.ResumeTiming();
    run(db, ui);
    state.PauseTiming();
    rows = 0;
    for (const auto& t : tables) rows += TableRows(db, t);
    state.ResumeTiming();
  }
  state.counters["records/s"] = benchmark::Counter(static_cast<double>(records),
                                                   benchmark::Counter::kIsIterationInvariantRate);
  state.counters["rows"] = static_cast<double>(rows);
  state.counters["peak_rss_mb"] = PeakRssMb();
}

const std::string& CompanyFile(const std::string& name) {
  static std::map<std::string, std::string> paths;
  auto it = paths.find(name);
  if (it == paths.end()) {
    it = paths.emplace(name, FindFileNoCase(Company(), name)->string()).first;
  }
  return it->second;
}

void BM_ReadACT(benchmark::State& state) {
  Panel panel = WidePanel();
  RunImporter(
      state, RecordsIn(CompanyFile("ACT.fix"), 650), {"tAccount"},
      [&](const std::string& db, UserSeam& ui) { ReadACT(Company(), db, true, true, panel, ui); });
}

void BM_ReadStock(benchmark::State& state) {
  const Panel panel = WidePanel();
  DocTypeTable docTypes;
  RunImporter(state, RecordsIn(CompanyFile("IMV.FIX"), 170), {"tStockHead", "tStockLine"},
              [&](const std::string& db, UserSeam& ui) {
                ReadStock(1, Company(), panel.TxtFromDate, panel.TxtToDate, db,
                          kAllSalesInvoicesRow, true, true, panel, docTypes, ui);
              });
}

void BM_ReadItem(benchmark::State& state) {
  const Panel panel = WidePanel();
  RunImporter(state, RecordsIn(CompanyFile("ITM.fix"), 500), {"tItem"},
              [&](const std::string& db, UserSeam& ui) { ReadItem(Company(), db, panel, ui); });
}

void BM_ReadTransactions(benchmark::State& state) {
  const Panel panel = WidePanel();
  RunImporter(state, RecordsIn(CompanyFile("amv.fix"), 180), {"tTransact"},
              [&](const std::string& db, UserSeam& ui) {
                ReadTransactions(Company(), db, true, panel, ui);
              });
}

void BM_ReadAllTempTrans(benchmark::State& state) {
  const Panel panel = WidePanel();
  int64_t records = 0;
  for (const auto& f : BatchFiles()) records += RecordsIn(f, 220);
  RunImporter(state, records, {"tTransact"}, [&](const std::string& db, UserSeam& ui) {
    ReadAllTempTrans(Company(), db, true, panel, ui);
  });
}

void BM_ReadCash(benchmark::State& state) {
  const Panel panel = WidePanel();
  RunImporter(
      state, RecordsIn(CompanyFile("icash2.fix"), 90), {"tCash"},
      [&](const std::string& db, UserSeam& ui) { ReadCash(Company(), db, true, panel, ui); });
}

void BM_ReadAllData(benchmark::State& state) {
  Company();
  QuietSeam ui;
  DocTypeTable docTypes;
  int64_t records = RecordsIn(CompanyFile("ACT.fix"), 650) +
                    RecordsIn(CompanyFile("IMV.FIX"), 170) +
                    RecordsIn(CompanyFile("ITM.fix"), 500) + RecordsIn(CompanyFile("amv.fix"), 180);
  for (const auto& f : BatchFiles()) records += RecordsIn(f, 220);
  ResetPeakRss();
  for (auto _ : state) {
    Panel panel = WidePanel();
    ControlState cs;
    cs.companyPath = Company();
    ReadAllData(true, panel, cs, docTypes, ui);
  }
  state.counters["records/s"] = benchmark::Counter(static_cast<double>(records),
                                                   benchmark::Counter::kIsIterationInvariantRate);
  state.counters["peak_rss_mb"] = PeakRssMb();
}

// ---- The floor.

// Reads every record of `file` and touches each record's bytes.
uint64_t ReadBytes(const fs::path& file, size_t len) {
  HostRecordFile f(file, len);
  uint64_t sum = 0;
  const int64_t n = f.WholeRecords();
  for (int64_t i = 1; i <= n; ++i) {
    std::string_view r = f.Record(i);
    for (size_t k = 0; k < r.size(); k += 8) sum += static_cast<unsigned char>(r[k]);
  }
  return sum;
}

// The rows an importer wrote, with its tables' definitions, captured once.
struct CapturedTable {
  db::TableDef def{""};
  std::vector<std::string> ddl;  // the table's statement, then its indexes'
  std::vector<std::vector<db::Value>> rows;
};
struct Captured {
  std::vector<CapturedTable> tables;
  int64_t Rows() const {
    int64_t n = 0;
    for (const auto& t : tables) n += static_cast<int64_t>(t.rows.size());
    return n;
  }
};

Captured Capture(const std::vector<std::string>& tables,
                 const std::function<void(const std::string&, UserSeam&)>& run) {
  QuietSeam ui;
  std::string path = CreateWorkDB("", ui);
  run(path, ui);
  db::Database db = db::Database::Open(path);
  Captured c;
  for (const auto& name : tables) {
    CapturedTable t;
    t.def = db.Describe(name);
    sqlite3_stmt* st = nullptr;
    sqlite3_prepare_v2(db.Handle(),
                       "SELECT sql FROM sqlite_master WHERE tbl_name = ?1 AND sql IS NOT NULL"
                       " ORDER BY type DESC",
                       -1, &st, nullptr);
    sqlite3_bind_text(st, 1, name.c_str(), -1, SQLITE_STATIC);
    while (sqlite3_step(st) == SQLITE_ROW) {
      t.ddl.emplace_back(reinterpret_cast<const char*>(sqlite3_column_text(st, 0)));
    }
    sqlite3_finalize(st);
    db::Snapshot s = db.OpenSnapshot("SELECT * FROM " + name);
    while (!s.AtEnd()) {
      std::vector<db::Value> row;
      for (int i = 0; i < s.FieldCount(); ++i) row.push_back(s.Field(i));
      t.rows.push_back(std::move(row));
      s.MoveNext();
    }
    c.tables.push_back(std::move(t));
  }
  return c;
}

// Appends the captured rows through bare SQLite to tables made by the engine's own statements
// (Hebrew collation, checks, keys), through one prepared statement per table, in one
// transaction, under the working database's pragmas.
void BareAppends(const Captured& captured) {
  fs::path path = BenchRoot() / "temp" / "floor.db";
  fs::remove(path);
  sqlite3* db = nullptr;
  sqlite3_open(path.c_str(), &db);
  db::RegisterHebrewCollation(db);
  sqlite3_exec(db,
               "PRAGMA journal_mode=OFF; PRAGMA synchronous=OFF; PRAGMA temp_store=FILE;"
               " PRAGMA cache_size=-8192; PRAGMA ignore_check_constraints=ON; BEGIN",
               nullptr, nullptr, nullptr);
  for (const CapturedTable& t : captured.tables) {
    std::string insert = "INSERT INTO \"" + t.def.name + "\" VALUES(";
    for (size_t i = 0; i < t.def.fields.size(); ++i) insert += i ? ",?" : "?";
    insert += ")";
    for (const std::string& sql : t.ddl) {
      if (sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK) {
        std::fprintf(stderr, "floor: %s\n", sqlite3_errmsg(db));
      }
    }
    sqlite3_stmt* st = nullptr;
    sqlite3_prepare_v2(db, insert.c_str(), -1, &st, nullptr);
    for (const auto& row : t.rows) {
      for (size_t i = 0; i < row.size(); ++i) {
        const int col = static_cast<int>(i) + 1;
        if (const auto* v = std::get_if<int64_t>(&row[i])) {
          sqlite3_bind_int64(st, col, *v);
        } else if (const auto* d = std::get_if<double>(&row[i])) {
          sqlite3_bind_double(st, col, *d);
        } else if (const auto* x = std::get_if<std::string>(&row[i])) {
          sqlite3_bind_text(st, col, x->data(), static_cast<int>(x->size()), SQLITE_STATIC);
        } else {
          sqlite3_bind_null(st, col);
        }
      }
      if (sqlite3_step(st) != SQLITE_DONE) {
        std::fprintf(stderr, "floor: %s\n", sqlite3_errmsg(db));
      }
      sqlite3_reset(st);
    }
    sqlite3_finalize(st);
  }
  sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr);
  sqlite3_close(db);
}

// The same rows appended through the engine (typed checks, Hebrew collation) into a fresh
// working database: what is left of an importer's time above this is its own.
void EngineAppends(const Captured& captured) {
  QuietSeam ui;
  db::Database db = db::Database::Open(CreateWorkDB("", ui));
  for (const CapturedTable& t : captured.tables) {
    db::TableRecordset rs = db.OpenTable(t.def.name);
    for (const auto& row : t.rows) {
      rs.AddNew();
      for (size_t i = 0; i < row.size(); ++i) {
        const int col = static_cast<int>(i);
        if (const auto* v = std::get_if<int64_t>(&row[i])) {
          rs.SetInt(col, *v);
        } else if (const auto* d = std::get_if<double>(&row[i])) {
          rs.SetDouble(col, *d);
        } else if (const auto* x = std::get_if<std::string>(&row[i])) {
          rs.SetText(col, *x);
        }
      }
      rs.Update();
    }
    rs.Close();
  }
}

void RunFloor(benchmark::State& state, const std::vector<fs::path>& files, size_t recordLength,
              const Captured& captured) {
  int64_t records = 0;
  for (const auto& f : files) records += RecordsIn(f, recordLength);
  const bool throughEngine = state.range(0) == 1;
  for (auto _ : state) {
    uint64_t sum = 0;
    for (const auto& f : files) sum += ReadBytes(f, recordLength);
    benchmark::DoNotOptimize(sum);
    if (throughEngine) {
      EngineAppends(captured);
    } else {
      BareAppends(captured);
    }
  }
  state.counters["records/s"] = benchmark::Counter(static_cast<double>(records),
                                                   benchmark::Counter::kIsIterationInvariantRate);
  state.counters["rows"] = static_cast<double>(captured.Rows());
}

void BM_FloorACT(benchmark::State& state) {
  static const Captured c = Capture({"tAccount"}, [](const std::string& db, UserSeam& ui) {
    Panel p = WidePanel();
    ReadACT(Company(), db, true, true, p, ui);
  });
  RunFloor(state, {CompanyFile("ACT.fix")}, 650, c);
}
void BM_FloorStock(benchmark::State& state) {
  static const Captured c =
      Capture({"tStockHead", "tStockLine"}, [](const std::string& db, UserSeam& ui) {
        const Panel p = WidePanel();
        DocTypeTable t;
        ReadStock(1, Company(), p.TxtFromDate, p.TxtToDate, db, kAllSalesInvoicesRow, true, true, p,
                  t, ui);
      });
  RunFloor(state, {CompanyFile("IMV.FIX")}, 170, c);
}
void BM_FloorItem(benchmark::State& state) {
  static const Captured c = Capture({"tItem"}, [](const std::string& db, UserSeam& ui) {
    ReadItem(Company(), db, WidePanel(), ui);
  });
  RunFloor(state, {CompanyFile("ITM.fix")}, 500, c);
}
void BM_FloorTransactions(benchmark::State& state) {
  static const Captured c = Capture({"tTransact"}, [](const std::string& db, UserSeam& ui) {
    ReadTransactions(Company(), db, true, WidePanel(), ui);
  });
  RunFloor(state, {CompanyFile("amv.fix")}, 180, c);
}
void BM_FloorAllTempTrans(benchmark::State& state) {
  static const Captured c = Capture({"tTransact"}, [](const std::string& db, UserSeam& ui) {
    ReadAllTempTrans(Company(), db, true, WidePanel(), ui);
  });
  RunFloor(state, BatchFiles(), 220, c);
}
void BM_FloorCash(benchmark::State& state) {
  static const Captured c = Capture({"tCash"}, [](const std::string& db, UserSeam& ui) {
    ReadCash(Company(), db, true, WidePanel(), ui);
  });
  RunFloor(state, {CompanyFile("icash2.fix")}, 90, c);
}

}  // namespace

// The importers first: the floors keep the rows they append in memory, which would swell the
// peak memory of whatever runs after them.
BENCHMARK(BM_ReadACT)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_ReadStock)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_ReadItem)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_ReadTransactions)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_ReadAllTempTrans)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_ReadCash)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_ReadAllData)->Unit(benchmark::kMillisecond)->Iterations(1);
BENCHMARK(BM_FloorACT)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_FloorStock)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_FloorItem)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_FloorTransactions)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_FloorAllTempTrans)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_FloorCash)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);

BENCHMARK_MAIN();
