// The import pipeline over many batches: rows in the order recorded, the seam only on the
// calling thread, and a failure on either side raised where one thread would have raised it.
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "import/importcommon.h"
#include "support/importtest.h"

namespace zdr {
namespace {

using importing::ImportError;
using importing::ImportPipeline;
using importing::RowTarget;

// Well beyond the ring of batches, so the converting thread has to wait for the writing one.
constexpr int kRows = 200000;
// This row repeats the key before it, and is refused rather than passed over.
constexpr int kRefused = 7 * 21428;

std::string KeyOf(int row) {
  return "K" + std::to_string(row % 7 == 0 ? row - 1 : row);
}

class ThreadRecordingSeam : public test::RecordingSeam {
 public:
  void SetProgress(int fillWidth) override {
    if (std::this_thread::get_id() != caller) ++callsFromAnotherThread;
    RecordingSeam::SetProgress(fillWidth);
  }
  std::thread::id caller = std::this_thread::get_id();
  int callsFromAnotherThread = 0;
};

class Pipeline : public test::ImportTest {
 protected:
  void SetUp() override {
    ImportTest::SetUp();
    db_ = WorkDb();
  }

  // Offers the items K1..K<kRows> to tItem (each seventh repeats the one before, and is passed
  // over but for kRefused), with progress every fifth row; `fail(i)` may throw before row i is
  // recorded. Counts the rows converted in converted_.
  template <typename Fail>
  void Offer(UserSeam& ui, Fail fail) {
    db::Database database = db::Database::Open(db_);
    db::TableRecordset table = database.OpenTable("tItem");
    ProgressReporter progress(ui, kRows);
    ImportPipeline pipeline(progress);
    RowTarget& rs = pipeline.Add(table);
    const int key = rs.FieldIndex("ItemKey");
    try {
      pipeline.Run([&] {
        for (int i = 1; i <= kRows; ++i) {
          fail(i);
          rs.AddNew();
          rs.SetText(key, KeyOf(i));
          if (i == kRefused) {
            rs.Update();
          } else {
            rs.UpdatePassingDuplicates();
          }
          if (i % 5 == 0) pipeline.Progress(i);
          pipeline.RecordDone();
          ++converted_;
        }
      });
    } catch (...) {
      table.Close();
      throw;
    }
    table.Close();
  }

  // The item keys in the order they were written.
  std::vector<std::string> KeysInTableOrder() {
    return Rows(db_, "SELECT ItemKey FROM tItem ORDER BY rowid");
  }

  std::string db_;
  int converted_ = 0;
};

TEST_F(Pipeline, ConversionFailureComesAfterTheRowsBeforeIt) {
  ThreadRecordingSeam ui;
  EXPECT_THROW(Offer(ui,
                     [](int i) {
                       if (i == 100001) throw ImportError("רשומה 100001 אינה שלמה");
                     }),
               ImportError);
  std::vector<std::string> expected;
  for (int i = 1; i <= 100000; ++i) {
    if (i % 7 != 0) expected.push_back(KeyOf(i));
  }
  EXPECT_EQ(KeysInTableOrder(), expected);
  EXPECT_EQ(ui.callsFromAnotherThread, 0);
  ASSERT_EQ(ui.progress.size(), 100000u / 5 + 2);  // 0, each fifth row, 0
  EXPECT_EQ(ui.progress[ui.progress.size() - 2], 1500);
  EXPECT_EQ(ui.progress.back(), 0);
}

TEST_F(Pipeline, WriteFailureStopsTheConversionAndKeepsTheRowsBefore) {
  ThreadRecordingSeam ui;
  try {
    Offer(ui, [](int) {});
    FAIL() << "the refused row did not stop the import";
  } catch (const db::EngineError& e) {
    EXPECT_EQ(e.number(), db::kErrDuplicateKey);
  }
  EXPECT_LT(converted_, kRows);
  EXPECT_EQ(Count(db_, "tItem"), (kRefused - 1) - (kRefused - 1) / 7);
  EXPECT_EQ(ui.callsFromAnotherThread, 0);
}

}  // namespace
}  // namespace zdr
