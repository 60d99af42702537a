#include "import/hostfile.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cmath>
#include <filesystem>
#include <fstream>
#include <limits>
#include <string>

#include "support/scratchtemp.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;

class HostFileTest : public ::testing::Test {
 protected:
  fs::path Write(const std::string& name, const std::string& bytes) {
    fs::path p = dir_ / name;
    std::ofstream(p, std::ios::binary) << bytes;
    return p;
  }

  // `count` records of `length` bytes; record n is filled with a byte derived from n and
  // starts with its number in decimal, so a record read from the wrong place shows.
  static std::string Records(int count, size_t length) {
    std::string out;
    for (int n = 1; n <= count; ++n) {
      std::string rec(length, static_cast<char>('a' + n % 26));
      std::string num = std::to_string(n) + ":";
      rec.replace(0, std::min(num.size(), length), num.substr(0, length));
      out += rec;
    }
    return out;
  }

  test::ScratchTemp scratch_;
  const fs::path dir_ = scratch_.dir();
};

TEST_F(HostFileTest, EmptyFileHasNoRecords) {
  Write("ACT.fix", "");
  HostRecordFile f(dir_, "ACT.fix", 650);
  EXPECT_EQ(f.Count(), 0.0);
  EXPECT_EQ(f.WholeRecords(), 0);
  EXPECT_TRUE(f.Record(1).empty());
  EXPECT_TRUE(f.Record(0).empty());
}

TEST_F(HostFileTest, OneRecordIsReadWhole) {
  Write("ITM.fix", Records(1, 500));
  HostRecordFile f(dir_, "ITM.fix", 500);
  EXPECT_EQ(f.Count(), 1.0);
  ASSERT_EQ(f.Record(1).size(), 500u);
  EXPECT_EQ(f.Record(1).substr(0, 2), "1:");
  EXPECT_TRUE(f.Record(2).empty());
}

TEST_F(HostFileTest, ExactFileReadsEveryRecordInPlace) {
  const std::string bytes = Records(10, 650);
  Write("ACT.fix", bytes);
  HostRecordFile f(dir_, "ACT.fix", 650);
  EXPECT_EQ(f.Count(), 10.0);
  EXPECT_EQ(f.WholeRecords(), 10);
  EXPECT_EQ(f.FileSize(), 6500u);
  for (int n = 1; n <= 10; ++n) {
    EXPECT_EQ(f.Record(n), std::string_view(bytes).substr((n - 1) * 650, 650)) << n;
  }
  // Backwards too: a record behind the window refills it.
  for (int n = 10; n >= 1; --n) {
    EXPECT_EQ(f.Record(n), std::string_view(bytes).substr((n - 1) * 650, 650)) << n;
  }
}

TEST_F(HostFileTest, RecordNumbersOutsideTheFileGiveEmptyViews) {
  Write("amv.fix", Records(3, 180));
  HostRecordFile f(dir_, "amv.fix", 180);
  EXPECT_TRUE(f.Record(0).empty());
  EXPECT_TRUE(f.Record(-1).empty());
  EXPECT_TRUE(f.Record(4).empty());
  EXPECT_TRUE(f.Record(1'000'000'000'000).empty());
  EXPECT_EQ(f.Record(3).substr(0, 2), "3:");
}

TEST_F(HostFileTest, RaggedFileNeverReadsThePartialRecordAsWhole) {
  std::string bytes = Records(3, 90) + std::string(40, 'Z');
  Write("icash2.fix", bytes);
  HostRecordFile f(dir_, "icash2.fix", 90);
  EXPECT_DOUBLE_EQ(f.Count(), 310.0 / 90.0);
  EXPECT_EQ(f.WholeRecords(), 3);
  EXPECT_EQ(f.Record(3).size(), 90u);
  EXPECT_TRUE(f.Record(4).empty());
  // The importers round the count; a ragged tail can round up to a record that is not there.
  EXPECT_EQ(RoundHalfEven(f.Count()), 3);
  Write("b.fix", Records(3, 90) + std::string(60, 'Z'));
  HostRecordFile g(dir_, "b.fix", 90);
  EXPECT_EQ(RoundHalfEven(g.Count()), 4);
  EXPECT_TRUE(g.Record(4).empty());
}

TEST_F(HostFileTest, RecordsCrossingTheBlockWindowReadCorrectly) {
  // 650 does not divide a mebibyte: records straddle every block boundary of the raw file,
  // and the window must still hold whole records.
  const int count = 4000;  // about 2.5 MB
  const std::string bytes = Records(count, 650);
  Write("ACT.fix", bytes);
  HostRecordFile f(dir_, "ACT.fix", 650);
  ASSERT_EQ(f.WholeRecords(), count);
  for (int n = 1; n <= count; ++n) {
    std::string_view r = f.Record(n);
    ASSERT_EQ(r, std::string_view(bytes).substr(static_cast<size_t>(n - 1) * 650, 650)) << n;
  }
  // Random access across windows.
  for (int n : {count, 1, 1613, 1614, 1612, 3227, 2, count - 1}) {
    ASSERT_EQ(f.Record(n), std::string_view(bytes).substr(static_cast<size_t>(n - 1) * 650, 650))
        << n;
  }
}

// A document header is held while its lines are read; a block refill between them must not
// overwrite the header's bytes.
TEST_F(HostFileTest, HeldHeaderSurvivesWindowRefill) {
  Write("IMV.FIX", "");
  const int64_t perBlock = HostRecordFile(dir_, "IMV.FIX", 170).ReadAheadRecords();
  ASSERT_EQ(perBlock, (1 << 20) / 170);
  const int count = static_cast<int>(3 * perBlock + 100);
  const std::string bytes = Records(count, 170);
  Write("IMV.FIX", bytes);
  HostRecordFile f(dir_, "IMV.FIX", 170);
  auto expected = [&](int64_t n) {
    return std::string_view(bytes).substr(static_cast<size_t>(n - 1) * 170, 170);
  };
  // A header every 257 records (a header, its second record and up to 255 lines), held
  // while the scan reads on across every block boundary.
  int64_t held = 1;
  std::string_view head = f.Record(1);
  for (int64_t n = 2; n <= count; ++n) {
    ASSERT_EQ(f.Record(n), expected(n)) << n;
    ASSERT_EQ(head, expected(held)) << "header " << held << " after reading " << n;
    if ((n - 1) % 257 == 0) {
      held = n;
      head = f.Record(n);
    }
  }
}

TEST_F(HostFileTest, RecordLongerThanTheWindowIsReadWhole) {
  const size_t length = (1u << 20) + 7;
  const std::string bytes = Records(2, length);
  Write("big.fix", bytes);
  HostRecordFile f(dir_, "big.fix", length);
  EXPECT_EQ(f.Record(2), std::string_view(bytes).substr(length, length));
  EXPECT_EQ(f.Record(1), std::string_view(bytes).substr(0, length));
}

TEST_F(HostFileTest, FileCutByTheHostDuringAScanReadsAsEmpty) {
  fs::path p = Write("amv.fix", Records(10, 180));
  HostRecordFile f(dir_, "amv.fix", 180);
  ASSERT_EQ(f.WholeRecords(), 10);
  fs::resize_file(p, 180 * 4 + 50);
  EXPECT_EQ(f.Record(4).substr(0, 2), "4:");
  EXPECT_TRUE(f.Record(5).empty());
  EXPECT_TRUE(f.Record(10).empty());
}

TEST_F(HostFileTest, HighBytesAndZerosArePassedThrough) {
  std::string rec = std::string("\x01\x80\x9a\xff", 4) + std::string(3, '\0') + " ";
  Write("ADF.FIX", rec);
  HostRecordFile f(dir_, "ADF.FIX", 8);
  EXPECT_EQ(f.Record(1), rec);
}

TEST_F(HostFileTest, OpenIsReadOnlyAndLeavesTheFileUntouched) {
  fs::path p = Write("ACT.fix", Records(2, 650));
  fs::permissions(p, fs::perms::owner_read | fs::perms::group_read | fs::perms::others_read);
  auto before = fs::last_write_time(p);
  {
    HostRecordFile f(dir_, "ACT.fix", 650);
    EXPECT_EQ(f.Record(2).substr(0, 2), "2:");
  }
  EXPECT_EQ(fs::last_write_time(p), before);
  EXPECT_EQ(fs::file_size(p), 1300u);
  fs::permissions(p, fs::perms::owner_all);
}

class FindFileNoCaseTest : public HostFileTest {};

TEST_F(FindFileNoCaseTest, MatchesWhateverCaseTheHostUsed) {
  Write("ACT.FIX", "x");
  auto found = FindFileNoCase(dir_, "ACT.fix");
  ASSERT_TRUE(found);
  EXPECT_EQ(found->filename(), "ACT.FIX");
  EXPECT_EQ(FindFileNoCase(dir_, "act.fix")->filename(), "ACT.FIX");
  HostRecordFile f(dir_, "act.FIX", 1);
  EXPECT_EQ(f.Record(1), "x");
}

TEST_F(FindFileNoCaseTest, ExactMatchWinsOverOtherCases) {
  Write("ACT.FIX", "upper");
  Write("act.fix", "lower");
  Write("Act.Fix", "mixed");
  EXPECT_EQ(FindFileNoCase(dir_, "act.fix")->filename(), "act.fix");
  EXPECT_EQ(FindFileNoCase(dir_, "ACT.FIX")->filename(), "ACT.FIX");
  EXPECT_EQ(FindFileNoCase(dir_, "Act.Fix")->filename(), "Act.Fix");
  // No exact match: the choice is the same on every run (first by bytes).
  EXPECT_EQ(FindFileNoCase(dir_, "ACT.fix")->filename(), "ACT.FIX");
  HostRecordFile f(dir_, "act.fix", 5);
  EXPECT_EQ(f.Record(1), "lower");
}

TEST_F(FindFileNoCaseTest, HostStyleLeadingBackslashIsIgnored) {
  Write("IMV.FIX", "y");
  EXPECT_EQ(FindFileNoCase(dir_, "\\IMV.FIX")->filename(), "IMV.FIX");
  EXPECT_EQ(FindFileNoCase(dir_, "\\imv.fix")->filename(), "IMV.FIX");
}

TEST_F(FindFileNoCaseTest, FoldersAreNotFiles) {
  fs::create_directories(dir_ / "act.fix");
  EXPECT_FALSE(FindFileNoCase(dir_, "ACT.fix"));
  EXPECT_FALSE(FindFileNoCase(dir_, "act.fix"));
  Write("ACT.FIX", "z");
  EXPECT_EQ(FindFileNoCase(dir_, "act.fix")->filename(), "ACT.FIX");
}

TEST_F(FindFileNoCaseTest, OnlyWholeNamesMatch) {
  Write("a12.tmp", "1");
  EXPECT_FALSE(FindFileNoCase(dir_, "a1.tmp"));
  EXPECT_FALSE(FindFileNoCase(dir_, "a12.tmp2"));
  EXPECT_FALSE(FindFileNoCase(dir_, ""));
}

TEST_F(FindFileNoCaseTest, MissingFolderFindsNothingAndOpenNamesTheFile) {
  fs::path missing = dir_ / "no_such_company";
  EXPECT_FALSE(FindFileNoCase(missing, "ACT.fix"));
  try {
    HostRecordFile f(missing, "ACT.fix", 650);
    FAIL() << "opened a file in a missing folder";
  } catch (const HostFileError& e) {
    EXPECT_NE(std::string(e.what()).find("ACT.fix"), std::string::npos) << e.what();
    EXPECT_NE(std::string(e.what()).find("no_such_company"), std::string::npos) << e.what();
  }
}

TEST_F(HostFileTest, MissingOrUnreadableFilesRaiseHostFileError) {
  EXPECT_THROW(HostRecordFile(dir_, "ITM.fix", 500), HostFileError);
  EXPECT_THROW(HostRecordFile(dir_ / "ITM.fix", 500), HostFileError);
  EXPECT_THROW(HostRecordFile(dir_, 650), HostFileError);  // a folder
  // A FIFO in a file's place is refused at once, never waited on.
  ASSERT_EQ(::mkfifo((dir_ / "ACT.fix").c_str(), 0600), 0);
  EXPECT_FALSE(FindFileNoCase(dir_, "ACT.fix"));
  EXPECT_THROW(HostRecordFile(dir_ / "ACT.fix", 650), HostFileError);
  Write("zero.fix", "abc");
  EXPECT_THROW(HostRecordFile(dir_, "zero.fix", 0), HostFileError);
  if (::geteuid() != 0) {  // root reads whatever the permissions say
    fs::path p = Write("locked.fix", "abc");
    fs::permissions(p, fs::perms::none);
    EXPECT_THROW(HostRecordFile(p, 1), HostFileError);
    fs::permissions(p, fs::perms::owner_all);
  }
}

TEST(RoundHalfEvenTest, HalvesGoToTheEvenNeighbour) {
  EXPECT_EQ(RoundHalfEven(0.5), 0);
  EXPECT_EQ(RoundHalfEven(1.5), 2);
  EXPECT_EQ(RoundHalfEven(2.5), 2);
  EXPECT_EQ(RoundHalfEven(3.5), 4);
  EXPECT_EQ(RoundHalfEven(-0.5), 0);
  EXPECT_EQ(RoundHalfEven(-1.5), -2);
  EXPECT_EQ(RoundHalfEven(-2.5), -2);
  EXPECT_EQ(RoundHalfEven(2.4999), 2);
  EXPECT_EQ(RoundHalfEven(2.5001), 3);
  EXPECT_EQ(RoundHalfEven(-1.0), -1);
  EXPECT_EQ(RoundHalfEven(0.0), 0);
  // A ten-record account file: the last record read is 10 - 1 = 9.
  EXPECT_EQ(RoundHalfEven(6500.0 / 650.0 - 1), 9);
  EXPECT_EQ(RoundHalfEven(std::nan("")), 0);
  EXPECT_EQ(RoundHalfEven(1e300), std::numeric_limits<int64_t>::max());
}

}  // namespace
}  // namespace zdr
