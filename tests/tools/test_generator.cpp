// zdrgen: host text in display order, and sample companies checked against their truth by
// the conversions that read them back. The record layouts themselves are checked by the
// importers' tests, which read records these builders write.
#include "zdrgen/generator.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
#include <stdexcept>
#include <string>

#include "hostfile/doctypes.h"
#include "hostfile/hostfile.h"
#include "hosttext/codepage.h"
#include "hosttext/hosttext.h"
#include "support/scratchtemp.h"

namespace zdrgen {
namespace {

namespace fs = std::filesystem;
using zdr::HostRecordFile;
using zdr::TrimSpaces;

std::string ReadAll(const fs::path& p) {
  std::ifstream in(p, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), {});
}

// Logical UTF-8 as the Windows-1255 bytes the conversions return.
std::string W(std::string_view utf8) {
  return zdr::Utf8ToWin1255(utf8);
}

// The host's three bytes of a date.
std::string Bytes(HostDate d) {
  return {static_cast<char>(d.yearOffset), static_cast<char>(d.month), static_cast<char>(d.day)};
}

TEST(HostTextTest, HebrewInDisplayOrderInCodePage862) {
  // The first letter is the last byte, digits keep their order, brackets around Hebrew are
  // mirrored as the host shows them.
  const std::pair<const char*, std::string> cases[] = {
      // clang-format off
      {"שלום", "\x8D\x85\x8C\x99"}, {"אב 12", "12 \x81\x80"}, {"Intel Israel Ltd", "Intel Israel Ltd"},
      {"(אב)", "(\x81\x80)"}, {"א<ב", "\x81>\x80"}, {"א [1998] ב", "\x81 [1998] \x80"}, {"", ""},
      // clang-format on
  };
  for (const auto& [logical, shown] : cases) EXPECT_EQ(HostVisual(logical), shown) << logical;
  EXPECT_EQ(HostField("אב", 5), "\x81\x80   ");
  EXPECT_EQ(HostBytes("אב1ת"), std::string("\x80\x81") + "1\x9A");
  EXPECT_EQ(PadRaw("\x01", 8), std::string("\x01       ", 8));
  EXPECT_THROW(HostField("אבגדה", 4), std::length_error);
  EXPECT_THROW(PadRaw("123456789", 8), std::length_error);
  // e acute, an emoji, cut UTF-8, a Hebrew point, a tab.
  for (const char* bad : {"caf\xC3\xA9", "\xF0\x9F\x98\x80", "\xD7", "\xD6\xB0", "a\tb"}) {
    EXPECT_THROW(HostVisual(bad), std::invalid_argument) << bad;
  }
}

TEST(GeneratorTest, RecordsAreWrittenWholeOrTheFileIsNamed) {
  zdr::test::ScratchTemp dir;
  std::ofstream(dir.dir() / "plain") << "x";
  try {
    WriteRecords(dir.dir() / "plain" / "ACT.fix", {"abc"});
    FAIL() << "wrote below a plain file";
  } catch (const std::runtime_error& e) {
    EXPECT_NE(std::string(e.what()).find("plain"), std::string::npos) << e.what();
  }
  WriteRecords(dir.dir() / "sub" / "x.fix", {"ab", "cd"});
  EXPECT_EQ(ReadAll(dir.dir() / "sub" / "x.fix"), "abcd");
  AccountFields f;
  f.name = std::string(31, 'x');
  EXPECT_THROW(AccountRecord(f), std::length_error);
  // splitmix64's first output for seed 0, fixed so the samples never drift between builds.
  EXPECT_EQ(Random(0).Next(), 0xE220A8397B1DCDAFull);
}

class CompanyTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    dir_ = new zdr::test::ScratchTemp;
    truth_ = new CompanyTruth(WriteCompany(dir_->dir() / "c", {.seed = 7}, "מסחר ותעשייה"));
  }
  static void TearDownTestSuite() {
    delete truth_;
    delete dir_;
  }
  static const fs::path& folder() { return truth_->folder; }
  // Account record `n` of ACT.fix.
  static std::string Account(int64_t n) {
    return std::string(HostRecordFile(folder(), "ACT.fix", 650).Record(n));
  }

  static inline zdr::test::ScratchTemp* dir_ = nullptr;
  static inline CompanyTruth* truth_ = nullptr;
};

TEST_F(CompanyTest, FilesOfWholeRecordsBetweenTheMarkers) {
  const std::pair<const char*, size_t> sizes[] = {// clang-format off
      {"ACT.fix", 650 * 202}, {"amv.fix", 180 * 500}, {"icash2.fix", 90 * 100}, {"ADF.FIX", 7359},
      {"a012.tmp", 220 * 50}};
  // clang-format on
  for (const auto& [name, size] : sizes) EXPECT_EQ(fs::file_size(folder() / name), size) << name;
  for (const char* name : {"ISHP.FIX", "IORDR.FIX", "IMV.FIX", "IBD.FIX"}) {
    EXPECT_TRUE(fs::file_size(folder() / name) % 170 == 0 && fs::file_size(folder() / name) > 0);
  }
  HostRecordFile act(folder(), "ACT.fix", 650), itm(folder(), "ITM.fix", 500);
  EXPECT_EQ(act.Record(1).substr(0, 8), "HEADER  ");
  EXPECT_EQ(act.Record(act.WholeRecords()).substr(0, 8), "CLOSING ");
  EXPECT_EQ(itm.Record(itm.WholeRecords()).substr(0, 12), PadRaw("CLOSING", 12));
  // The importers' last record: the count minus one, rounded.
  EXPECT_EQ(truth_->accounts.front().record, 2);
  EXPECT_EQ(zdr::RoundHalfEven(act.Count() - 1), truth_->accounts.back().record);
  EXPECT_EQ(zdr::RoundHalfEven(itm.Count() - 1), truth_->items.back().record);
}

// Every text field of an account, read back with the conversion the system reads it with.
TEST_F(CompanyTest, AccountsRoundTripThroughTheConversions) {
  int checked = 0, hebrewKeys = 0;
  for (const AccountTruth& a : truth_->accounts) {
    const std::string r = Account(a.record);
    SCOPED_TRACE("record " + std::to_string(a.record) + ": " + a.name);
    if (a.deleted) {
      EXPECT_EQ(r.substr(0, 8), std::string("\x01       ", 8));
      continue;
    }
    if (a.unambiguousText) {
      const std::pair<size_t, size_t> at[] = {{8, 30}, {90, 30}, {120, 15}, {135, 15}, {150, 5}};
      const std::string* truth[] = {&a.name, &a.address, &a.district, &a.city, &a.zip};
      for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(zdr::ConvertWithBidi(r.substr(at[i].first, at[i].second)), W(*truth[i]));
      }
      ++checked;
    }
    if (a.unambiguousKey) {
      const std::string_view key = TrimSpaces(std::string_view(r).substr(0, 8));
      EXPECT_EQ(TrimSpaces(zdr::ConvertForSort(key)), W(a.key));
      EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(key)), W(a.key));
      // A Hebrew key is stored reversed, so the ledger's reversal reads it too.
      if (static_cast<unsigned char>(key[0]) >= 0x80 && ++hebrewKeys) {
        EXPECT_EQ(zdr::ReverseAndMirror(key), W(a.key));
      }
    }
    EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(TrimSpaces(r.substr(60, 30)))), W(a.telephone));
    EXPECT_EQ(r.substr(38, 3) + r.substr(52, 4) + r[324], a.sortCode + a.cutOff + char(a.agent));
  }
  EXPECT_GT(checked, 150);
  EXPECT_GT(hebrewKeys, 0);
}

// Documents, ledger transactions, batches and receipts name their accounts by the bytes of
// the account's key field, where the truth says.
TEST_F(CompanyTest, RecordsNameTheirAccountsWhereTheTruthSays) {
  auto keyOf = [&](int index) {
    return index < 0 ? std::string(8, ' ') : Account(truth_->accounts[index].record).substr(0, 8);
  };
  for (const DocumentTruth& d : truth_->documents) {
    HostRecordFile f(folder(), d.file, 170);
    const std::string head(f.Record(d.headerRecord)), second(f.Record(d.headerRecord + 1));
    SCOPED_TRACE(d.file + " record " + std::to_string(d.headerRecord));
    EXPECT_EQ(head.substr(0, 2), (std::string{1, static_cast<char>(d.type)}));
    EXPECT_EQ(head.substr(2, 8), keyOf(d.accountIndex));
    EXPECT_EQ(zdr::HostIntValue(TrimSpaces(head.substr(100, 5))), d.reference);
    EXPECT_EQ(static_cast<unsigned char>(head[158]), d.lines.size());
    EXPECT_EQ(second.substr(102, 6), Bytes(d.date) + Bytes(d.dueDate));
    for (const auto& l : d.lines) {
      const std::string_view line = f.Record(l.record);
      EXPECT_EQ(line.substr(0, 13), '\x02' + PadRaw(l.itemKey, 12));
      EXPECT_EQ(static_cast<unsigned char>(line[93]), l.type);
    }
  }
  HostRecordFile amv(folder(), "amv.fix", 180), cash(folder(), "icash2.fix", 90);
  for (const LedgerTruth& t : truth_->ledger) {
    const std::string r(amv.Record(t.record));
    EXPECT_EQ(r.substr(0, 2), (std::string{static_cast<char>(t.journal & 0xFF),
                                           static_cast<char>((t.journal >> 8) & 0xFF)}));
    EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(TrimSpaces(r.substr(2, 3)))), W(t.type));
    for (int k = 0; k < 4; ++k) EXPECT_EQ(r.substr(44 + 8 * k, 8), keyOf(t.accountIndex[k]));
    EXPECT_EQ(r.substr(76, 6), Bytes(t.date) + Bytes(t.valueDate));
  }
  for (const CashTruth& c : truth_->receipts) {
    const std::string r(cash.Record(c.record));
    EXPECT_EQ(r.substr(0, 8), keyOf(c.accountIndex));
    EXPECT_EQ(r.substr(14, 3), Bytes(c.date));
  }
  for (const BatchTruth& b : truth_->batches) {
    HostRecordFile f(folder(), b.fileName, 220);
    for (const LedgerTruth& t : b.transactions) {
      const std::string r(f.Record(t.record));
      for (int k = 0; k < 4; ++k) EXPECT_EQ(r.substr(57 + 8 * k, 8), keyOf(t.accountIndex[k]));
      EXPECT_EQ(r.substr(89, 6), Bytes(t.date) + Bytes(t.valueDate));
    }
  }
}

// The same seed writes the same bytes, another seed others; the chooser's companies each have
// a seed of their own and the second a blank name; empty sizes still write every file.
TEST(GeneratorTest, SeedsChooserCompaniesAndEmptySizes) {
  zdr::test::ScratchTemp dir;
  Options o;
  o.seed = 99;
  o.accounts = o.documents = o.ledger = o.items = o.receipts = o.batchSize = 5;
  o.batches = 1;
  WriteCompany(dir.dir() / "a", o, "Delta Trading");
  WriteCompany(dir.dir() / "b", o, "Delta Trading");
  int files = 0;
  for (const auto& e : fs::directory_iterator(dir.dir() / "a")) {
    EXPECT_EQ(ReadAll(e.path()), ReadAll(dir.dir() / "b" / e.path().filename())) << e.path();
    ++files;
  }
  EXPECT_EQ(files, 10);  // the descriptor, eight record files and one batch
  const auto written = WriteCompanies(dir.dir() / "chooser", 3, o);
  ASSERT_EQ(written.size(), 3u);
  for (int i = 1; i <= 3; ++i) {
    const fs::path company = dir.dir() / "chooser" / ("company" + std::to_string(i));
    EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(ReadAll(company / "ADF.FIX").substr(0, 20))),
              W(written[i - 1].companyName));
    EXPECT_EQ(written[i - 1].companyName.empty(), i == 2);
  }
  EXPECT_NE(ReadAll(dir.dir() / "chooser" / "company1" / "ACT.fix"),
            ReadAll(dir.dir() / "chooser" / "company3" / "ACT.fix"));
  o.accounts = o.documents = o.items = o.ledger = o.batches = o.receipts = 0;
  WriteCompany(dir.dir() / "empty", o, "");
  // The account and item files hold their two markers.
  for (auto [name, size] :
       {std::pair{"ACT.fix", 1300u}, {"ITM.fix", 1000u}, {"amv.fix", 0u}, {"IMV.FIX", 0u}}) {
    EXPECT_EQ(fs::file_size(dir.dir() / "empty" / name), size) << name;
  }
  o.linesMin = 5;
  o.linesMax = 4;
  EXPECT_THROW(WriteCompany(dir.dir() / "empty", o, ""), std::invalid_argument);
}

}  // namespace
}  // namespace zdrgen
