#include "hostfile/hostfile.h"

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
  static std::string_view RecordIn(const std::string& bytes, int64_t n, size_t length) {
    return std::string_view(bytes).substr(static_cast<size_t>(n - 1) * length, length);
  }

  test::ScratchTemp scratch_;
  const fs::path dir_ = scratch_.dir();
};

// Each file: whole records and a partial tail. Only whole records are read, each in place;
// numbers outside them give empty views, and the rounded count of a tail over half a record
// names a record that is not there.
TEST_F(HostFileTest, OnlyWholeRecordsAreReadEachInPlace) {
  struct Case {
    int whole;
    size_t length, tail;
    int64_t rounded;
  };
  for (const Case& c : {Case{0, 650, 0, 0}, Case{1, 500, 0, 1}, Case{10, 650, 0, 10},
                        Case{3, 90, 40, 3}, Case{3, 90, 60, 4}}) {
    SCOPED_TRACE(std::to_string(c.whole) + " records + " + std::to_string(c.tail));
    const std::string bytes = Records(c.whole, c.length) + std::string(c.tail, 'Z');
    Write("f.fix", bytes);
    HostRecordFile f(dir_, "f.fix", c.length);
    EXPECT_DOUBLE_EQ(f.Count(), static_cast<double>(bytes.size()) / static_cast<double>(c.length));
    EXPECT_EQ(f.WholeRecords(), c.whole);
    EXPECT_EQ(f.FileSize(), bytes.size());
    EXPECT_EQ(RoundHalfEven(f.Count()), c.rounded);
    for (int n = c.whole; n >= 1; --n) EXPECT_EQ(f.Record(n), RecordIn(bytes, n, c.length)) << n;
    for (int64_t n : {int64_t{0}, int64_t{-1}, int64_t{c.whole + 1}, int64_t{1'000'000'000'000}}) {
      EXPECT_TRUE(f.Record(n).empty()) << n;
    }
  }
  const std::string binary = std::string("\x01\x80\x9a\xff", 4) + std::string(3, '\0') + " ";
  Write("ADF.FIX", binary);
  EXPECT_EQ(HostRecordFile(dir_, "ADF.FIX", 8).Record(1), binary);
}

// 170 does not divide the read block: records straddle every block boundary, are read again
// out of order, and a document header held while its lines are read survives the refills.
// A record longer than the block is read whole. The host cuts a file during a scan.
TEST_F(HostFileTest, RecordsAcrossBlocksHeldHeaderAndCutFile) {
  Write("IMV.FIX", "");
  const int64_t perBlock = HostRecordFile(dir_, "IMV.FIX", 170).ReadAheadRecords();
  ASSERT_EQ(perBlock, (1 << 20) / 170);
  const int count = static_cast<int>(3 * perBlock + 100);
  const std::string docs = Records(count, 170);
  const fs::path p = Write("IMV.FIX", docs);
  fs::permissions(p, fs::perms::owner_read);  // opened read-only
  HostRecordFile f(dir_, "IMV.FIX", 170);
  // A header every 257 records (a header, its second record and up to 255 lines).
  int64_t held = 1;
  std::string_view head = f.Record(1);
  for (int64_t n = 2; n <= count; ++n) {
    ASSERT_EQ(f.Record(n), RecordIn(docs, n, 170)) << n;
    ASSERT_EQ(head, RecordIn(docs, held, 170)) << "header " << held << " after reading " << n;
    if ((n - 1) % 257 == 0) head = f.Record(held = n);
  }
  for (int n : {2, 6168, 6169, 6167, 1, 12336, count})
    ASSERT_EQ(f.Record(n), RecordIn(docs, n, 170)) << n;
  fs::permissions(p, fs::perms::owner_all);
  fs::resize_file(p, 170 * 4 + 50);
  EXPECT_EQ(f.Record(4).substr(0, 2), "4:");
  EXPECT_TRUE(f.Record(5).empty());
  const size_t huge = (1u << 20) + 7;
  const std::string big = Records(2, huge);
  Write("big.fix", big);
  HostRecordFile b(dir_, "big.fix", huge);
  EXPECT_EQ(b.Record(2), RecordIn(big, 2, huge));
  EXPECT_EQ(b.Record(1), RecordIn(big, 1, huge));
}

// An exact match wins; else the name first by bytes; the host's leading backslash is
// ignored; only whole names of plain files match.
TEST_F(HostFileTest, FindFileNoCase) {
  Write("ACT.FIX", "upper");
  Write("act.fix", "lower");
  Write("Act.Fix", "mixed");
  Write("IMV.FIX", "y");
  Write("a12.tmp", "1");
  fs::create_directories(dir_ / "itm.fix");
  const std::pair<const char*, const char*> cases[] = {
      {"act.fix", "act.fix"},
      {"ACT.FIX", "ACT.FIX"},
      {"Act.Fix", "Act.Fix"},
      {"ACT.fix", "ACT.FIX"},
      {"\\IMV.FIX", "IMV.FIX"},
      {"\\imv.fix", "IMV.FIX"},
      {"imv.FIX", "IMV.FIX"},
      {"ITM.fix", nullptr},
      {"a1.tmp", nullptr},
      {"a12.tmp2", nullptr},
      {"", nullptr},
  };
  for (const auto& [name, found] : cases) {
    const auto path = FindFileNoCase(dir_, name);
    EXPECT_EQ(path ? path->filename().string() : "-", found ? found : "-") << name;
  }
  EXPECT_EQ(HostRecordFile(dir_, "act.fix", 5).Record(1), "lower");
  EXPECT_EQ(HostRecordFile(dir_, "imv.FIX", 1).Record(1), "y");
  EXPECT_FALSE(FindFileNoCase(dir_ / "no_such_company", "ACT.fix"));
}

TEST_F(HostFileTest, MissingOrUnreadableFilesRaiseHostFileError) {
  try {
    HostRecordFile f(dir_ / "no_such_company", "ACT.fix", 650);
    FAIL() << "opened a file in a missing folder";
  } catch (const HostFileError& e) {
    EXPECT_NE(std::string(e.what()).find("no_such_company/ACT.fix"), std::string::npos) << e.what();
  }
  EXPECT_THROW(HostRecordFile(dir_, "ITM.fix", 500), HostFileError);
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
  const std::pair<double, int64_t> cases[] = {
      {0.5, 0},    {1.5, 2},   {2.5, 2},          {3.5, 4},
      {-0.5, 0},   {-1.5, -2}, {-2.5, -2},        {2.4999, 2},
      {2.5001, 3}, {-1.0, -1}, {std::nan(""), 0}, {1e300, std::numeric_limits<int64_t>::max()},
  };
  for (const auto& [x, rounded] : cases) EXPECT_EQ(RoundHalfEven(x), rounded) << x;
}

}  // namespace
}  // namespace zdr
