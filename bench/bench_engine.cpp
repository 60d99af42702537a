// Appending ledger rows: the engine layer against bare SQLite on the same file layout.
//
// Both runs write 1,000,000 tTransact rows (FileID Long, TransID Long, AccountKey Text(8),
// primary key on the three) into a fresh file in one transaction. The bare run uses the
// table and index statements the layer created, the same HEBREW collation and the same
// pragmas as a scratch database, and binds, steps and resets one prepared INSERT. Creating
// the file is outside the timing in both. The program ends with both best times and their
// ratio.
#include <benchmark/benchmark.h>
#include <sqlite3.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <ctime>
#include <filesystem>
#include <limits>
#include <string>
#include <utility>
#include <vector>

#include "engine/collation.h"
#include "engine/engine.h"

namespace {

namespace fs = std::filesystem;
using zdr::db::Database;
using zdr::db::FieldType;
using zdr::db::TableDef;
using zdr::db::TableRecordset;

constexpr int kRows = 1'000'000;
constexpr const char* kLocale = ";LANGID=0x040D;CP=1255;COUNTRY=0";
// The scratch pragmas of the layer (engine.cpp), repeated for the bare run.
constexpr const char* kScratchPragmas =
    "PRAGMA journal_mode=OFF; PRAGMA synchronous=OFF; PRAGMA temp_store=FILE;"
    " PRAGMA cache_size=-8192; PRAGMA ignore_check_constraints=ON;";

// Best times over the runs, wall clock and this thread's processor time. On a shared machine
// the processor time is the steadier measure of the work done.
struct Best {
  double wall = std::numeric_limits<double>::infinity();
  double cpu = std::numeric_limits<double>::infinity();
};
Best bestLayer;
Best bestBare;

double ThreadCpuSeconds() {
  timespec ts{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &ts);
  return static_cast<double>(ts.tv_sec) + static_cast<double>(ts.tv_nsec) * 1e-9;
}

// Times one run of `work` into `best`.
template <typename F>
void TimeRun(Best& best, F&& work) {
  const auto wallStart = std::chrono::steady_clock::now();
  const double cpuStart = ThreadCpuSeconds();
  work();
  const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - wallStart;
  best.wall = std::min(best.wall, wall.count());
  best.cpu = std::min(best.cpu, ThreadCpuSeconds() - cpuStart);
}

fs::path BenchFile(const char* name) {
  return fs::temp_directory_path() /
         ("zdr_bench_engine_" + std::to_string(::getpid()) + "_" + name + ".DB");
}

TableDef TransactDef() {
  TableDef t("tTransact");
  t.Field("FileID", FieldType::Long)
      .Field("TransID", FieldType::Long)
      .Field("AccountKey", FieldType::Text, 8)
      .Index("PrimaryKey", {"FileID", "TransID", "AccountKey"}, true, true);
  return t;
}

// Account keys as the host writes them: mostly digits, some Hebrew letters.
const std::vector<std::string>& Keys() {
  static const std::vector<std::string> keys = [] {
    std::vector<std::string> k;
    const char* hebrew[] = {"א", "ב", "ג", "ד", "ה"};
    for (int i = 0; i < 3000; ++i) {
      std::string key = std::to_string(10000 + i * 13);
      if (i % 10 == 0) key = std::string(hebrew[i % 5]) + key.substr(0, 4);
      k.push_back(key);
    }
    return k;
  }();
  return keys;
}

struct Row {
  int64_t fileId;
  int64_t transId;
  const std::string* key;
};

// Two entries per transaction, the last fifth from temporary batches.
Row RowAt(int i) {
  const auto& keys = Keys();
  Row r;
  r.fileId = i < kRows * 4 / 5 ? -1 : (i % 7) + 1;
  r.transId = i / 2 + 1;
  r.key = &keys[(static_cast<size_t>(i) * 7919) % keys.size()];
  return r;
}

// The table and index statements as the layer wrote them into its file.
std::vector<std::string> LayerDdl() {
  const fs::path file = BenchFile("ddl");
  fs::remove(file);
  std::vector<std::string> ddl;
  {
    Database db = Database::Create(file, kLocale);
    db.CreateTable(TransactDef());
    sqlite3_stmt* st = nullptr;
    sqlite3_prepare_v2(db.Handle(),
                       "SELECT sql FROM sqlite_master WHERE tbl_name = 'tTransact' AND sql IS "
                       "NOT NULL ORDER BY type DESC",
                       -1, &st, nullptr);
    while (sqlite3_step(st) == SQLITE_ROW) {
      ddl.emplace_back(reinterpret_cast<const char*>(sqlite3_column_text(st, 0)));
    }
    sqlite3_finalize(st);
  }
  fs::remove(file);
  return ddl;
}

void BM_AppendThroughLayer(benchmark::State& state) {
  const fs::path file = BenchFile("layer");
  Keys();
  for (auto _ : state) {
    state.PauseTiming();
    fs::remove(file);
    Database db = Database::Create(file, kLocale);
    db.CreateTable(TransactDef());
    state.ResumeTiming();
    TimeRun(bestLayer, [&] {
      TableRecordset rs = db.OpenTable("tTransact");
      const int fileId = rs.FieldIndex("FileID");
      const int transId = rs.FieldIndex("TransID");
      const int accountKey = rs.FieldIndex("AccountKey");
      for (int i = 0; i < kRows; ++i) {
        const Row r = RowAt(i);
        rs.AddNew();
        rs.SetInt(fileId, r.fileId);
        rs.SetInt(transId, r.transId);
        rs.SetText(accountKey, *r.key);
        rs.Update();
      }
      rs.Close();
    });
    state.PauseTiming();
    db.Close();
    fs::remove(file);
    state.ResumeTiming();
  }
  state.SetItemsProcessed(state.iterations() * kRows);
}

void BM_AppendBareSqlite(benchmark::State& state) {
  const fs::path file = BenchFile("bare");
  const std::vector<std::string> ddl = LayerDdl();
  Keys();
  for (auto _ : state) {
    state.PauseTiming();
    fs::remove(file);
    sqlite3* db = nullptr;
    sqlite3_open_v2(file.c_str(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE, nullptr);
    sqlite3_exec(db, kScratchPragmas, nullptr, nullptr, nullptr);
    zdr::db::RegisterHebrewCollation(db);
    for (const std::string& s : ddl) {
      if (sqlite3_exec(db, s.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK) {
        state.SkipWithError(sqlite3_errmsg(db));
      }
    }
    state.ResumeTiming();
    TimeRun(bestBare, [&] {
      sqlite3_stmt* insert = nullptr;
      sqlite3_prepare_v3(db,
                         "INSERT INTO \"main\".\"tTransact\" (\"FileID\", \"TransID\", "
                         "\"AccountKey\") VALUES (?1, ?2, ?3)",
                         -1, SQLITE_PREPARE_PERSISTENT, &insert, nullptr);
      sqlite3_exec(db, "BEGIN", nullptr, nullptr, nullptr);
      for (int i = 0; i < kRows; ++i) {
        const Row r = RowAt(i);
        sqlite3_bind_int64(insert, 1, r.fileId);
        sqlite3_bind_int64(insert, 2, r.transId);
        sqlite3_bind_text(insert, 3, r.key->data(), static_cast<int>(r.key->size()), SQLITE_STATIC);
        if (sqlite3_step(insert) != SQLITE_DONE) state.SkipWithError(sqlite3_errmsg(db));
        sqlite3_reset(insert);
      }
      sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr);
      sqlite3_finalize(insert);
    });
    state.PauseTiming();
    sqlite3_close(db);
    fs::remove(file);
    state.ResumeTiming();
  }
  state.SetItemsProcessed(state.iterations() * kRows);
}

// Layer and bare runs alternate, so a burst of load from other programs falls on both.
constexpr int kRounds = 3;

}  // namespace

int main(int argc, char** argv) {
  for (int round = 1; round <= kRounds; ++round) {
    const std::string suffix = "/round:" + std::to_string(round);
    for (auto [name, fn] : {std::pair{"BM_AppendThroughLayer", &BM_AppendThroughLayer},
                            std::pair{"BM_AppendBareSqlite", &BM_AppendBareSqlite}}) {
      benchmark::RegisterBenchmark((name + suffix).c_str(), fn)
          ->Iterations(2)
          ->Unit(benchmark::kMillisecond)
          ->UseRealTime();
    }
  }
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  if (std::isfinite(bestLayer.wall) && std::isfinite(bestBare.wall)) {
    std::printf("append %d rows, best of runs\n", kRows);
    std::printf("  wall clock: layer %.3f s, bare SQLite %.3f s, ratio %.3f\n", bestLayer.wall,
                bestBare.wall, bestLayer.wall / bestBare.wall);
    std::printf("  processor:  layer %.3f s, bare SQLite %.3f s, ratio %.3f\n", bestLayer.cpu,
                bestBare.cpu, bestLayer.cpu / bestBare.cpu);
  }
  return 0;
}
