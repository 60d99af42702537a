#include "zdrgen/generator.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <set>
#include <stdexcept>
#include <string>

#include "import/codepage.h"
#include "import/doctypes.h"
#include "import/hostfile.h"
#include "import/hosttext.h"
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

// A scratch folder, removed with everything in it afterwards.
struct TempDir : zdr::test::ScratchTemp {
  const fs::path& path() const { return dir(); }
};

// ---------------------------------------------------------------------------------------
// Host text.

TEST(HostTextTest, HebrewIsStoredInDisplayOrderInCodePage862) {
  // shalom: shin lamed vav final-mem; the first letter is the last byte.
  EXPECT_EQ(HostVisual("שלום"), "\x8D\x85\x8C\x99");
  // Digits keep their own left-to-right order inside a right-to-left line.
  EXPECT_EQ(HostVisual("אב 12"), "12 \x81\x80");
  EXPECT_EQ(HostVisual("10023"), "10023");
  EXPECT_EQ(HostVisual("Intel Israel Ltd"), "Intel Israel Ltd");
  EXPECT_EQ(HostVisual(""), "");
}

TEST(HostTextTest, BracketsAroundHebrewAreMirroredAsTheHostShowsThem) {
  // Logical "(alef bet)" shows as "(" bet alef ")" from left to right.
  EXPECT_EQ(HostVisual("(אב)"), "(\x81\x80)");
  EXPECT_EQ(HostVisual("א<ב"), "\x81>\x80");
  EXPECT_EQ(HostVisual("א [1998] ב"), "\x81 [1998] \x80");
}

TEST(HostTextTest, FieldsArePaddedAndNeverCut) {
  EXPECT_EQ(HostField("אב", 5), "\x81\x80   ");
  EXPECT_EQ(HostField("", 3), "   ");
  EXPECT_THROW(HostField("אבגדה", 4), std::length_error);
  EXPECT_EQ(PadRaw("\x01", 8), std::string("\x01       ", 8));
  EXPECT_THROW(PadRaw("123456789", 8), std::length_error);
}

TEST(HostTextTest, CharactersTheHostCannotHoldAreRefused) {
  EXPECT_THROW(HostVisual("caf\xC3\xA9"), std::invalid_argument);       // e acute
  EXPECT_THROW(HostVisual("\xF0\x9F\x98\x80"), std::invalid_argument);  // emoji
  EXPECT_THROW(HostVisual("\xD7"), std::invalid_argument);              // cut UTF-8
  EXPECT_THROW(HostVisual("\xD6\xB0"), std::invalid_argument);          // Hebrew point
  EXPECT_THROW(HostVisual("a\tb"), std::invalid_argument);
}

TEST(HostTextTest, HostBytesKeepsTheGivenOrder) {
  EXPECT_EQ(HostBytes("אב1"),
            "\x80\x81"
            "1");
  EXPECT_EQ(HostBytes("ת"), "\x9A");
}

// ---------------------------------------------------------------------------------------
// Record builders, byte for byte.

TEST(RecordBuilderTest, AccountFieldsSitAtTheirOffsets) {
  AccountFields f;
  f.key = "K1";
  f.name = "NAME";
  f.sortCode = "  5";
  f.cutOff = "AB\x80 ";
  f.telephone = "03-1234567";
  f.address = "ADDR";
  f.district = "DIST";
  f.city = "CITY";
  f.zip = "12345";
  f.details = "DET";
  f.agent = 200;
  std::string r = AccountRecord(f);
  ASSERT_EQ(r.size(), 650u);
  EXPECT_EQ(r.substr(0, 8), "K1      ");
  EXPECT_EQ(r.substr(8, 30), PadRaw("NAME", 30));
  EXPECT_EQ(r.substr(38, 3), "  5");
  EXPECT_EQ(r.substr(52, 4), "AB\x80 ");
  EXPECT_EQ(r.substr(60, 30), PadRaw("03-1234567", 30));
  EXPECT_EQ(r.substr(90, 30), PadRaw("ADDR", 30));
  EXPECT_EQ(r.substr(120, 15), PadRaw("DIST", 15));
  EXPECT_EQ(r.substr(135, 15), PadRaw("CITY", 15));
  EXPECT_EQ(r.substr(150, 5), "12345");
  EXPECT_EQ(r.substr(167, 50), PadRaw("DET", 50));
  EXPECT_EQ(static_cast<unsigned char>(r[324]), 200);
  f.name = std::string(31, 'x');
  EXPECT_THROW(AccountRecord(f), std::length_error);
}

TEST(RecordBuilderTest, ItemKeyAndSortCode) {
  std::string r = ItemRecord({"A100", "chair", " 12"});
  ASSERT_EQ(r.size(), 500u);
  EXPECT_EQ(r.substr(0, 12), PadRaw("A100", 12));
  EXPECT_EQ(r.substr(12, 5), "chair");
  EXPECT_EQ(r.substr(52, 3), " 12");
}

TEST(RecordBuilderTest, DocumentRecords) {
  DocHeaderFields h;
  h.type = 20;
  h.accountKey = "10001";
  h.name = "N";
  h.address1 = "A1";
  h.address2 = "A2";
  h.reference = "12345";
  h.details = "D";
  h.lineCount = 3;
  std::string r = DocHeaderRecord(h);
  ASSERT_EQ(r.size(), 170u);
  EXPECT_EQ(r[0], 1);
  EXPECT_EQ(r[1], 20);
  EXPECT_EQ(r.substr(2, 8), "10001   ");
  EXPECT_EQ(r.substr(10, 2), "N ");
  EXPECT_EQ(r.substr(40, 3), "A1 ");
  EXPECT_EQ(r.substr(70, 3), "A2 ");
  EXPECT_EQ(r.substr(100, 5), "12345");
  EXPECT_EQ(r.substr(110, 2), "D ");
  EXPECT_EQ(r[158], 3);

  std::string s = DocSecondHeaderRecord(HostDate::Of(2007, 3, 5), HostDate::Of(2008, 12, 31));
  ASSERT_EQ(s.size(), 170u);
  EXPECT_NE(s[0], 1);
  EXPECT_EQ(s.substr(102, 6), std::string("\x6B\x03\x05\x6C\x0C\x1F", 6));

  std::string l = DocLineRecord({2, "A100", 20});
  ASSERT_EQ(l.size(), 170u);
  EXPECT_NE(l[0], 1);
  EXPECT_EQ(l.substr(1, 12), PadRaw("A100", 12));
  EXPECT_EQ(l[93], 20);
}

TEST(RecordBuilderTest, LedgerBatchAndCashRecords) {
  LedgerFields f;
  f.journal = -2;
  f.type = "SL";
  f.keys = {"K1", "", "K3", ""};
  f.date = HostDate::Of(1985, 12, 31);
  f.valueDate = HostDate::Of(2010, 1, 1);
  std::string r = LedgerRecord(f);
  ASSERT_EQ(r.size(), 180u);
  EXPECT_EQ(r.substr(0, 2), "\xFE\xFF");
  EXPECT_EQ(r.substr(2, 3), "SL ");
  EXPECT_EQ(r.substr(44, 32), PadRaw("K1", 8) + PadRaw("", 8) + PadRaw("K3", 8) + PadRaw("", 8));
  EXPECT_EQ(r.substr(76, 6), std::string("\x55\x0C\x1F\x6E\x01\x01", 6));

  BatchFields b;
  b.type = "12";
  b.keys = {"", "", "", "K4"};
  b.date = HostDate::Of(2000, 2, 29);
  b.valueDate = HostDate::Of(2001, 3, 1);
  std::string t = BatchRecord(b);
  ASSERT_EQ(t.size(), 220u);
  EXPECT_EQ(t.substr(1, 3), "12 ");
  EXPECT_EQ(t.substr(57 + 24, 8), PadRaw("K4", 8));
  EXPECT_EQ(t.substr(89, 6), std::string("\x64\x02\x1D\x65\x03\x01", 6));

  std::string c = CashRecord({"K5", HostDate::Of(2007, 3, 5)});
  ASSERT_EQ(c.size(), 90u);
  EXPECT_EQ(c.substr(0, 8), PadRaw("K5", 8));
  EXPECT_EQ(c.substr(14, 3), "\x6B\x03\x05");

  std::string a = CompanyRecord("ACME");
  ASSERT_EQ(a.size(), 7359u);
  EXPECT_EQ(a.substr(0, 20), PadRaw("ACME", 20));
}

TEST(RecordBuilderTest, WriteRecordsNamesTheFileItCannotWrite) {
  TempDir dir;
  std::ofstream(dir.path() / "plain") << "x";
  try {
    WriteRecords(dir.path() / "plain" / "ACT.fix", {"abc"});
    FAIL() << "wrote below a plain file";
  } catch (const std::runtime_error& e) {
    EXPECT_NE(std::string(e.what()).find("plain"), std::string::npos) << e.what();
  }
  WriteRecords(dir.path() / "sub" / "x.fix", {"ab", "cd"});
  EXPECT_EQ(ReadAll(dir.path() / "sub" / "x.fix"), "abcd");
}

TEST(RandomTest, SameSeedSameSequenceAndBoundsHold) {
  Random a(42), b(42), c(43);
  bool differs = false;
  for (int i = 0; i < 1000; ++i) {
    uint64_t x = a.Next();
    EXPECT_EQ(x, b.Next());
    differs |= x != c.Next();
    int v = a.Between(-3, 3);
    b.Between(-3, 3);
    EXPECT_GE(v, -3);
    EXPECT_LE(v, 3);
  }
  EXPECT_TRUE(differs);
  // splitmix64's first output for seed 0, fixed so the samples never drift between builds.
  EXPECT_EQ(Random(0).Next(), 0xE220A8397B1DCDAFull);
}

// ---------------------------------------------------------------------------------------
// A generated company.

class CompanyTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    dir_ = new TempDir;
    Options o;
    o.seed = 7;
    truth_ = new CompanyTruth(WriteCompany(dir_->path() / "c", o, "מסחר ותעשייה"));
  }
  static void TearDownTestSuite() {
    delete truth_;
    delete dir_;
  }
  static const fs::path& folder() { return truth_->folder; }

  static TempDir* dir_;
  static CompanyTruth* truth_;
};
TempDir* CompanyTest::dir_ = nullptr;
CompanyTruth* CompanyTest::truth_ = nullptr;

TEST_F(CompanyTest, EveryFileIsAWholeNumberOfRecords) {
  const std::map<std::string, size_t> lengths = {
      {"ACT.fix", 650}, {"ITM.fix", 500}, {"ISHP.FIX", 170},  {"IORDR.FIX", 170}, {"IMV.FIX", 170},
      {"IBD.FIX", 170}, {"amv.fix", 180}, {"icash2.fix", 90}, {"ADF.FIX", 7359}};
  for (const auto& [name, length] : lengths) {
    ASSERT_TRUE(fs::exists(folder() / name)) << name;
    EXPECT_EQ(fs::file_size(folder() / name) % length, 0u) << name;
    EXPECT_GT(fs::file_size(folder() / name), 0u) << name;
  }
  ASSERT_EQ(truth_->batches.size(), 3u);
  for (const BatchTruth& b : truth_->batches) {
    EXPECT_EQ(fs::file_size(folder() / b.fileName), 50u * 220) << b.fileName;
  }
  EXPECT_EQ(fs::file_size(folder() / "ADF.FIX"), 7359u);
  EXPECT_EQ(fs::file_size(folder() / "ACT.fix"), (200u + 2) * 650);
  EXPECT_EQ(fs::file_size(folder() / "amv.fix"), 500u * 180);
  EXPECT_EQ(fs::file_size(folder() / "icash2.fix"), 100u * 90);
}

TEST_F(CompanyTest, FirstAndLastAccountAndItemRecordsAreTheMarkers) {
  HostRecordFile act(folder(), "ACT.fix", 650);
  EXPECT_EQ(act.Record(1).substr(0, 8), "HEADER  ");
  EXPECT_EQ(act.Record(act.WholeRecords()).substr(0, 8), "CLOSING ");
  EXPECT_EQ(truth_->accounts.front().record, 2);
  EXPECT_EQ(truth_->accounts.back().record, act.WholeRecords() - 1);
  // The importers' last record: the count minus one, rounded.
  EXPECT_EQ(zdr::RoundHalfEven(act.Count() - 1), truth_->accounts.back().record);

  HostRecordFile itm(folder(), "ITM.fix", 500);
  EXPECT_EQ(itm.Record(1).substr(0, 12), PadRaw("HEADER", 12));
  EXPECT_EQ(itm.Record(itm.WholeRecords()).substr(0, 12), PadRaw("CLOSING", 12));
  EXPECT_EQ(zdr::RoundHalfEven(itm.Count() - 1), truth_->items.back().record);
}

TEST_F(CompanyTest, CompanyNameReadsBackThroughTheSpacedConversion) {
  HostRecordFile adf(folder(), "ADF.FIX", 7359);
  EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(adf.Record(1).substr(0, 20))), W("מסחר ותעשייה"));
}

TEST_F(CompanyTest, NamesAndAddressesRoundTripThroughTheBidiConversion) {
  HostRecordFile act(folder(), "ACT.fix", 650);
  int checked = 0, latinWithNumber = 0, latinBrackets = 0;
  auto latin = [](const std::string& t) {
    return !t.empty() && std::all_of(t.begin(), t.end(), [](char c) { return c > 0; });
  };
  for (const AccountTruth& a : truth_->accounts) {
    if (a.deleted || !a.unambiguousText) continue;
    std::string_view r = act.Record(a.record);
    SCOPED_TRACE("record " + std::to_string(a.record) + ": " + a.name);
    EXPECT_EQ(zdr::ConvertWithBidi(r.substr(8, 30)), W(a.name));
    EXPECT_EQ(zdr::ConvertWithBidi(r.substr(90, 30)), W(a.address));
    EXPECT_EQ(zdr::ConvertWithBidi(r.substr(120, 15)), W(a.district));
    EXPECT_EQ(zdr::ConvertWithBidi(r.substr(135, 15)), W(a.city));
    EXPECT_EQ(zdr::ConvertWithBidi(r.substr(150, 5)), W(a.zip));
    ++checked;
    for (const std::string* t : {&a.name, &a.address}) {
      latinWithNumber += latin(*t) && t->find_first_of("0123456789") != std::string::npos;
    }
    latinBrackets += a.name.find("(Israel)") != std::string::npos;
  }
  EXPECT_GT(checked, 150);
  // Latin lines ending in a number and Latin text in brackets, in Latin and in Hebrew lines.
  EXPECT_GT(latinWithNumber, 0);
  EXPECT_GT(latinBrackets, 0);
}

TEST_F(CompanyTest, KeysAndTelephonesRoundTripThroughTheSortKeyConversions) {
  HostRecordFile act(folder(), "ACT.fix", 650);
  int hebrewKeys = 0;
  for (const AccountTruth& a : truth_->accounts) {
    std::string_view r = act.Record(a.record);
    SCOPED_TRACE("record " + std::to_string(a.record) + ": " + a.key);
    if (a.deleted) {
      EXPECT_EQ(r.substr(0, 8), std::string("\x01       ", 8));
      continue;
    }
    if (a.unambiguousKey) {
      std::string_view key = TrimSpaces(r.substr(0, 8));
      EXPECT_EQ(TrimSpaces(zdr::ConvertForSort(key)), W(a.key));
      EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(key)), W(a.key));
      if (static_cast<unsigned char>(key[0]) >= 0x80) {
        ++hebrewKeys;
        // A Hebrew key is stored reversed, so the ledger's reversal reads it too.
        EXPECT_EQ(zdr::ReverseAndMirror(key), W(a.key));
      }
    }
    EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(TrimSpaces(r.substr(60, 30)))), W(a.telephone));
    EXPECT_EQ(r.substr(38, 3), a.sortCode);
    EXPECT_EQ(r.substr(52, 4), a.cutOff);
    EXPECT_EQ(static_cast<unsigned char>(r[324]), a.agent);
  }
  EXPECT_GT(hebrewKeys, 0);
}

TEST_F(CompanyTest, ContentCoversTheCasesTheImportersMustHandle) {
  int deleted = 0, duplicate = 0, mixedText = 0;
  for (const AccountTruth& a : truth_->accounts) {
    deleted += a.deleted;
    duplicate += a.duplicateKey;
    mixedText += !a.unambiguousText;
  }
  EXPECT_GT(deleted, 0);
  EXPECT_GT(duplicate, 0);
  EXPECT_GT(mixedText, 0);

  int blankItems = 0;
  for (const ItemTruth& i : truth_->items) blankItems += i.key.empty();
  EXPECT_GT(blankItems, 0);

  // Every stock-document type code of the table, and code 0, in its own file.
  zdr::DocTypeTable table;
  std::set<std::pair<std::string, int>> seen;
  int hashLines = 0, starLines = 0, otherType = 0;
  for (const DocumentTruth& d : truth_->documents) {
    seen.insert({d.file, d.type});
    for (const auto& l : d.lines) {
      hashLines += TrimSpaces(l.itemKey) == "#";
      starLines += TrimSpaces(l.itemKey) == "*";
      otherType += l.type != d.type;
    }
  }
  for (int row = 0; row < zdr::kDocTypesFilled; ++row) {
    const zdr::DocTypeDef& def = table.Row(row);
    if (!def.IsStockDoc || row == zdr::kAllSalesInvoicesRow) continue;
    EXPECT_TRUE(seen.count({table.FileName(def.FileIndex), def.DocCode})) << def.DocCode;
  }
  EXPECT_TRUE(seen.count({"IMV.FIX", 0}));
  EXPECT_GT(hashLines, 0);
  EXPECT_GT(starLines, 0);
  EXPECT_GT(otherType, 0);

  int blankEntries = 0, twice = 0;
  for (const LedgerTruth& t : truth_->ledger) {
    for (int k = 0; k < 4; ++k) blankEntries += t.accountIndex[k] < 0;
    twice += t.accountIndex[0] >= 0 && t.accountIndex[0] == t.accountIndex[1];
  }
  EXPECT_GT(blankEntries, 0);
  EXPECT_GT(twice, 0);

  std::set<int> years;
  for (const DocumentTruth& d : truth_->documents) years.insert(d.date.yearOffset);
  EXPECT_GE(years.size(), 3u);

  EXPECT_EQ(truth_->batches.back().fileName, "a012.tmp");
}

TEST_F(CompanyTest, DocumentsAreWhereTheTruthSays) {
  std::map<std::string, std::unique_ptr<HostRecordFile>> files;
  for (const char* name : {"ISHP.FIX", "IORDR.FIX", "IMV.FIX", "IBD.FIX"}) {
    files[name] = std::make_unique<HostRecordFile>(folder(), name, 170);
  }
  HostRecordFile act(folder(), "ACT.fix", 650);
  for (const DocumentTruth& d : truth_->documents) {
    HostRecordFile& f = *files.at(d.file);
    std::string head(f.Record(d.headerRecord));
    SCOPED_TRACE(d.file + " record " + std::to_string(d.headerRecord));
    ASSERT_EQ(head[0], 1);
    EXPECT_EQ(static_cast<unsigned char>(head[1]), d.type);
    EXPECT_EQ(static_cast<size_t>(static_cast<unsigned char>(head[158])), d.lines.size());
    EXPECT_EQ(zdr::HostIntValue(TrimSpaces(head.substr(100, 5))), d.reference);
    if (d.accountIndex >= 0) {
      const AccountTruth& a = truth_->accounts[d.accountIndex];
      EXPECT_EQ(head.substr(2, 8), act.Record(a.record).substr(0, 8));
    } else {
      EXPECT_EQ(head.substr(2, 8), "        ");
    }
    std::string second(f.Record(d.headerRecord + 1));
    EXPECT_EQ(static_cast<unsigned char>(second[102]), d.date.yearOffset);
    EXPECT_EQ(static_cast<unsigned char>(second[103]), d.date.month);
    EXPECT_EQ(static_cast<unsigned char>(second[104]), d.date.day);
    EXPECT_EQ(static_cast<unsigned char>(second[105]), d.dueDate.yearOffset);
    for (size_t j = 0; j < d.lines.size(); ++j) {
      std::string_view line = f.Record(d.headerRecord + 2 + static_cast<int64_t>(j));
      EXPECT_EQ(d.lines[j].record, d.headerRecord + 2 + static_cast<int64_t>(j));
      EXPECT_NE(line[0], 1);
      EXPECT_EQ(line.substr(1, 12), PadRaw(d.lines[j].itemKey, 12));
      EXPECT_EQ(static_cast<unsigned char>(line[93]), d.lines[j].type);
    }
  }
}

TEST_F(CompanyTest, LedgerAndReceiptKeysMatchTheAccountsUnderTheReversal) {
  HostRecordFile act(folder(), "ACT.fix", 650);
  HostRecordFile amv(folder(), "amv.fix", 180);
  auto accountKey = [&](int index) {
    return std::string(act.Record(truth_->accounts[index].record).substr(0, 8));
  };
  for (const LedgerTruth& t : truth_->ledger) {
    std::string r(amv.Record(t.record));
    EXPECT_EQ(static_cast<int16_t>(static_cast<unsigned char>(r[0]) |
                                   (static_cast<unsigned char>(r[1]) << 8)),
              t.journal);
    EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(TrimSpaces(r.substr(2, 3)))), W(t.type));
    for (int k = 0; k < 4; ++k) {
      std::string field = r.substr(44 + 8 * k, 8);
      if (t.accountIndex[k] < 0) {
        EXPECT_EQ(field, "        ");
      } else {
        EXPECT_EQ(TrimSpaces(zdr::ReverseAndMirror(field)),
                  TrimSpaces(zdr::ReverseAndMirror(accountKey(t.accountIndex[k]))));
      }
    }
    EXPECT_EQ(static_cast<unsigned char>(r[76]), t.date.yearOffset);
    EXPECT_EQ(static_cast<unsigned char>(r[80]), t.valueDate.month);
  }
  HostRecordFile cash(folder(), "icash2.fix", 90);
  for (const CashTruth& c : truth_->receipts) {
    std::string r(cash.Record(c.record));
    EXPECT_EQ(r.substr(0, 8), c.accountIndex < 0 ? "        " : accountKey(c.accountIndex));
    EXPECT_EQ(static_cast<unsigned char>(r[16]), c.date.day);
  }
  for (const BatchTruth& b : truth_->batches) {
    HostRecordFile f(folder(), b.fileName, 220);
    for (const LedgerTruth& t : b.transactions) {
      std::string r(f.Record(t.record));
      for (int k = 0; k < 4; ++k) {
        EXPECT_EQ(r.substr(57 + 8 * k, 8),
                  t.accountIndex[k] < 0 ? "        " : accountKey(t.accountIndex[k]));
      }
    }
  }
}

TEST(GeneratorTest, SameSeedWritesTheSameBytes) {
  TempDir dir;
  Options o;
  o.seed = 99;
  o.accounts = 60;
  o.documents = 80;
  o.ledger = 70;
  WriteCompany(dir.path() / "a", o, "Delta Trading");
  WriteCompany(dir.path() / "b", o, "Delta Trading");
  o.seed = 100;
  WriteCompany(dir.path() / "c", o, "Delta Trading");
  int files = 0;
  for (const auto& e : fs::directory_iterator(dir.path() / "a")) {
    std::string name = e.path().filename().string();
    EXPECT_EQ(ReadAll(e.path()), ReadAll(dir.path() / "b" / name)) << name;
    ++files;
  }
  EXPECT_EQ(files, 12);  // the descriptor, eight record files and three batches
  EXPECT_NE(ReadAll(dir.path() / "a" / "ACT.fix"), ReadAll(dir.path() / "c" / "ACT.fix"));
}

TEST(GeneratorTest, CompaniesForTheChooserWithOneBlankName) {
  TempDir dir;
  Options o;
  o.accounts = 5;
  o.documents = 5;
  o.ledger = 5;
  o.items = 5;
  o.batches = 1;
  o.batchSize = 5;
  o.receipts = 5;
  auto written = WriteCompanies(dir.path(), 3, o);
  ASSERT_EQ(written.size(), 3u);
  for (int i = 1; i <= 3; ++i) {
    fs::path adf = dir.path() / ("company" + std::to_string(i)) / "ADF.FIX";
    ASSERT_TRUE(fs::exists(adf));
    std::string name = ReadAll(adf).substr(0, 20);
    if (i == 2) {
      EXPECT_EQ(name, std::string(20, ' '));
      EXPECT_TRUE(written[1].companyName.empty());
    } else {
      EXPECT_EQ(TrimSpaces(zdr::ConvertSpaced(name)), W(written[i - 1].companyName));
      EXPECT_FALSE(written[i - 1].companyName.empty());
    }
  }
  // Different seeds per company.
  EXPECT_NE(ReadAll(dir.path() / "company1" / "ACT.fix"),
            ReadAll(dir.path() / "company3" / "ACT.fix"));
}

TEST(GeneratorTest, EmptySizesStillWriteEveryFile) {
  TempDir dir;
  Options o;
  o.accounts = 0;
  o.documents = 0;
  o.items = 0;
  o.ledger = 0;
  o.batches = 0;
  o.receipts = 0;
  WriteCompany(dir.path(), o, "");
  EXPECT_EQ(fs::file_size(dir.path() / "ACT.fix"), 2u * 650);  // the two markers
  EXPECT_EQ(fs::file_size(dir.path() / "ITM.fix"), 2u * 500);
  EXPECT_EQ(fs::file_size(dir.path() / "amv.fix"), 0u);
  EXPECT_EQ(fs::file_size(dir.path() / "IMV.FIX"), 0u);
  o.linesMin = 5;
  o.linesMax = 4;
  EXPECT_THROW(WriteCompany(dir.path(), o, ""), std::invalid_argument);
}

}  // namespace
}  // namespace zdrgen
