// The label settings dialog's part for labels on stock, driven offscreen.
#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <QApplication>
#include <QCheckBox>
#include <QComboBox>
#include <QDoubleSpinBox>
#include <filesystem>

#include "control/control.h"
#include "control/settings.h"
#include "gui/labelstockbox.h"
#include "support/recordingseam.h"

namespace fs = std::filesystem;
using namespace zdr;
using namespace zdr::gui;

namespace {

class LabelStockBoxTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    static int argc = 1;
    static char name[] = "test_labelstockbox";
    static char* argv[] = {name, nullptr};
    if (qEnvironmentVariableIsEmpty("QT_QPA_PLATFORM")) qputenv("QT_QPA_PLATFORM", "offscreen");
    static QApplication app(argc, argv);
  }
  void SetUp() override {
    dir_ = fs::temp_directory_path() / ("zdr_stockbox_" + std::to_string(::getpid()));
    fs::create_directories(dir_);
    setenv("Temp", dir_.c_str(), 1);
    control_.Initialize();
  }
  void TearDown() override { fs::remove_all(dir_); }
  std::string Stored(std::string_view section, std::string_view key) {
    return store_.Get(kSettingsApp, section, key, "<missing>");
  }

  fs::path dir_;
  MemorySettingsStore store_;
  test::RecordingSeam seam_;
  Control control_{store_, seam_};
};

TEST_F(LabelStockBoxTest, ChoicesAreKeptAndAStocksOwnOffsetStaysWithIt) {
  LabelStockBox box(control_);
  box.Load();
  EXPECT_EQ(box.ChosenStock(), kDefaultStockId);
  EXPECT_EQ(box.cmbStock->count(), static_cast<int>(ShippedLabelStocks().size()));
  EXPECT_EQ(box.cmbOutput->currentIndex(), 0);

  box.cmbStock->setCurrentIndex(box.cmbStock->findData(QStringLiteral("a4-2x4-105x74")));
  box.txtOffsetX->setValue(1.3);
  box.txtOffsetY->setValue(-0.4);
  box.cmbOutput->setCurrentIndex(1);
  box.Save();
  EXPECT_EQ(Stored(kLabelPdfSection, "Template"), "a4-2x4-105x74");
  EXPECT_EQ(Stored(kLabelPdfSection, "OffsetX"), "1.3");
  EXPECT_EQ(Stored(kLabelPdfSection, "OffsetY"), "-0.4");
  EXPECT_EQ(Stored(kLabelPdfSection, "Output"), "1");
  EXPECT_EQ(control_.labelPdfSettings().Output, 1);

  // An offset of the chosen stock's own leaves the user's as it was.
  box.chkOwnOffset->setChecked(true);
  box.txtOffsetX->setValue(-2.0);
  box.Save();
  EXPECT_EQ(Stored(kLabelPdfSection, "OffsetX"), "1.3");
  EXPECT_EQ(Stored("LabelStock.a4-2x4-105x74", "OffsetX"), "-2");
  box.cmbStock->setCurrentIndex(0);  // another stock shows the user's offset
  EXPECT_FALSE(box.chkOwnOffset->isChecked());
  EXPECT_DOUBLE_EQ(box.txtOffsetX->value(), 1.3);

  LabelStockBox again(control_);
  again.Load();
  EXPECT_EQ(again.ChosenStock(), "a4-2x4-105x74");
  EXPECT_TRUE(again.chkOwnOffset->isChecked());
  EXPECT_DOUBLE_EQ(again.txtOffsetX->value(), -2.0);
  EXPECT_EQ(again.cmbOutput->currentIndex(), 1);
}

TEST_F(LabelStockBoxTest, NewStockIsListedAndCalibrationPageOpens) {
  LabelStockBox box(control_);
  box.Load();
  LabelStock mine = *FindShippedStock(kDefaultStockId);
  EXPECT_NE(box.AddStock(mine), "");  // a shipped id
  mine.id = "mine";
  mine.rows = 7;
  EXPECT_EQ(box.AddStock(mine), "");
  EXPECT_EQ(box.ChosenStock(), "mine");
  EXPECT_EQ(box.cmbStock->count(), static_cast<int>(ShippedLabelStocks().size()) + 1);

  const std::string page = box.CmdCalibrate_Click();
  ASSERT_EQ(fs::path(page), dir_ / "zdrcalib.pdf");
  EXPECT_TRUE(fs::exists(page));
  ASSERT_EQ(seam_.opened.size(), 1u);
  EXPECT_EQ(seam_.opened[0], page);
}

}  // namespace
