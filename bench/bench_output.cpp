// The three outputs, the label sheet as PDF, the dispatch checks and the workbook for
// 100,000 recipients.
#include <benchmark/benchmark.h>
#include <stdlib.h>
#include <sys/resource.h>

#include <cstdio>
#include <filesystem>
#include <string>

#include "common/panel.h"
#include "hostfile/doctypes.h"
#include "output/output.h"
#include "output/pdflabels.h"
#include "output/preflight.h"
#include "select/select.h"
#include "workdb/schema.h"

#include "engine/engine.h"

namespace {

constexpr int kRecipients = 100000;

class QuietSeam : public zdr::UserSeam {
 public:
  void ShowMessage(std::string_view, std::string_view, zdr::MsgIcon) override {}
  bool AskYesNo(std::string_view, std::string_view, zdr::MsgIcon) override { return false; }
  void SetStatus(std::string_view) override {}
  void SetProgress(int) override {}
  bool OpenInBrowser(const std::string&) override { return true; }
  bool OpenInSpreadsheet(const std::string&) override { return true; }
};

struct Fixture {
  std::filesystem::path dir;
  std::string db;
  zdr::Panel panel;
  zdr::DocTypeTable docTypes;
  zdr::LabelSettings labels;
  zdr::PostILSettings post;
  QuietSeam seam;

  Fixture() {
    std::string pattern = (std::filesystem::temp_directory_path() / "zdrbench.XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) std::abort();
    dir = pattern;
    setenv("Temp", dir.c_str(), 1);
    db = zdr::CreateWorkDB("", seam);
    zdr::db::Database database = zdr::db::Database::Open(db);
    zdr::db::TableRecordset t = database.OpenTable("tAccount");
    const int key = t.FieldIndex("AccountKey"), name = t.FieldIndex("AccountName"),
              address = t.FieldIndex("Address"), city = t.FieldIndex("City"),
              zip = t.FieldIndex("Zip"), details = t.FieldIndex("Details"),
              phone = t.FieldIndex("Telephone"), sortKey = t.FieldIndex("SortByKey"),
              sortName = t.FieldIndex("SortByName"), sortVal = t.FieldIndex("SortByKeyVal");
    char buf[64];
    for (int i = 1; i <= kRecipients; ++i) {
      t.AddNew();
      std::snprintf(buf, sizeof buf, "%d", i);
      t.SetText(key, buf);
      std::snprintf(buf, sizeof buf, "%08d", i);
      t.SetText(sortKey, buf);
      t.SetText(sortName, buf);
      t.SetDouble(sortVal, i);
      std::snprintf(buf, sizeof buf, "כהן ובניו בע\"מ %d", i);
      t.SetText(name, buf);
      std::snprintf(buf, sizeof buf, "רחוב הרצל %d", i % 200);
      t.SetText(address, buf);
      t.SetText(city, i % 2 ? "תל אביב-יפו" : "חיפה");
      std::snprintf(buf, sizeof buf, "%07d", i);
      t.SetText(zip, buf);
      t.SetText(details, "משה לוי");
      std::snprintf(buf, sizeof buf, "03-%07d", i);
      t.SetText(phone, buf);
      t.Update();
    }
    t.Close();
    panel.ChkTitle = {1, 1, 1, 1, 1, 1, 1, 1, 1};
  }
  ~Fixture() {
    std::error_code ec;
    std::filesystem::remove_all(dir, ec);
  }
  std::string Path(const char* name) const { return (dir / name).string(); }
};

Fixture& Data() {
  static Fixture f;
  return f;
}

// The recipients statement alone, for comparison: what every output spends before writing.
void BM_QueryOnly(benchmark::State& state) {
  Fixture& f = Data();
  for (auto _ : state) {
    zdr::db::Database database = zdr::db::Database::Open(f.db);
    zdr::db::Snapshot rs =
        database.OpenSnapshot(zdr::BuildRecipientsStatement(f.panel, f.docTypes, ""));
    rs.MoveLast();
    benchmark::DoNotOptimize(rs.RecordCount());
  }
  state.SetItemsProcessed(state.iterations() * kRecipients);
}

void BM_LabelSheet(benchmark::State& state) {
  Fixture& f = Data();
  for (auto _ : state) {
    zdr::CreateLabFile(f.Path("zdrlab1.htm"), f.db, f.panel, f.docTypes, "", f.labels, f.seam);
  }
  state.SetItemsProcessed(state.iterations() * kRecipients);
  state.counters["MB"] = std::filesystem::file_size(f.Path("zdrlab1.htm")) / 1e6;
}

// The sheet as PDF on 3 x 8 stock: 4,167 pages. Reports the process's peak resident size
// before and after (the fixture's rows are already in memory before).
void BM_LabelPdf(benchmark::State& state) {
  Fixture& f = Data();
  const zdr::LabelStock stock = *zdr::FindShippedStock(zdr::kDefaultStockId);
  auto peakMb = [] {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss / 1024.0;
  };
  const double before = peakMb();
  for (auto _ : state) {
    zdr::CreateLabPdf(f.Path("zdrlab1.pdf"), f.db, f.panel, f.docTypes, "", f.labels, stock, {},
                      f.seam);
  }
  state.SetItemsProcessed(state.iterations() * kRecipients);
  state.counters["MB"] = std::filesystem::file_size(f.Path("zdrlab1.pdf")) / 1e6;
  state.counters["peakMB_before"] = before;
  state.counters["peakMB_after"] = peakMb();
}

void BM_AddressList(benchmark::State& state) {
  Fixture& f = Data();
  for (auto _ : state) {
    zdr::CreateHTML(f.Path("zdrlab2.htm"), f.db, f.panel, f.docTypes, "", f.seam);
  }
  state.SetItemsProcessed(state.iterations() * kRecipients);
}

void BM_DispatchFile(benchmark::State& state) {
  Fixture& f = Data();
  for (auto _ : state) {
    zdr::CreateCSV(f.Path("zdpost1.csv"), f.db, static_cast<int16_t>(state.range(0)), f.panel,
                   f.docTypes, "", f.post, f.seam);
  }
  state.SetItemsProcessed(state.iterations() * kRecipients);
}

// The dispatch checks over the same rows (all clean: the cost of looking, not of reporting).
void BM_DispatchChecks(benchmark::State& state) {
  Fixture& f = Data();
  for (auto _ : state) {
    const zdr::PreflightResult r = zdr::RunPreflight(f.db, static_cast<int16_t>(state.range(0)),
                                                     f.panel, f.docTypes, "", f.seam);
    benchmark::DoNotOptimize(r.findings.size());
  }
  state.SetItemsProcessed(state.iterations() * kRecipients);
}

void BM_Workbook(benchmark::State& state) {
  Fixture& f = Data();
  zdr::CreateCSV(f.Path("zdpost1.csv"), f.db, 0, f.panel, f.docTypes, "", f.post, f.seam);
  for (auto _ : state) {
    zdr::ConvertToExcel(f.Path("zdpost1.csv"), f.Path("zdpost1.xlsx"), false, f.seam);
  }
  state.SetItemsProcessed(state.iterations() * kRecipients);
}

BENCHMARK(BM_QueryOnly)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_LabelSheet)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_LabelPdf)->Unit(benchmark::kMillisecond)->Iterations(1);
BENCHMARK(BM_AddressList)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_DispatchFile)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_DispatchChecks)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_Workbook)->Unit(benchmark::kMillisecond)->Iterations(2);

}  // namespace

BENCHMARK_MAIN();
