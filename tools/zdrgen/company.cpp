// Sample company content: accounts, items, documents, ledger, batches, receipts and the
// company descriptor, written in the host's layouts from logical text.
//
// A note on mixed text. The host keeps one display line per field; display order loses the
// information of which neutral characters belonged to which run, so for some mixed texts
// more than one reading order gives the same display (a number between a Hebrew word and a
// Latin word, punctuation at the edge of a Latin run at the end of a line). The generator
// writes such texts too, because real files hold them, but marks them (unambiguousText false)
// so that round-trip checks keep to the texts whose reading order is recoverable. Keys are
// likewise marked when they mix Hebrew letters with digits: the sort-key conversion puts the
// digits first by design.
#include <algorithm>
#include <array>
#include <iterator>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include "generator.h"

namespace zdrgen {
namespace {

namespace fs = std::filesystem;

const char* const kFirstNames[] = {"משה",  "דוד",   "יוסף", "אברהם", "שרה",  "רחל", "יעקב",
                                   "מרים", "אורית", "יצחק", "נועה",  "עומר", "תמר", "אליהו"};
const char* const kFamilies[] = {"כהן",   "לוי",    "מזרחי",  "פרץ",     "ביטון",     "דהן",
                                 "אברהם", "פרידמן", "אזולאי", "כץ",      "יוסף",      "עמר",
                                 "חדד",   "גבאי",   "שפירא",  "רוזנברג", "גולדשטיין", "בן דוד"};
const char* const kTrades[] = {"מאפיית", "מוסך", "נגריית", "חשמל", "שיווק", "סחר",
                               "מסעדת",  "פרחי", "ספריית", "יבוא", "בניין", "אופטיקה"};
const char* const kLatinCompanies[] = {"Intel Israel Ltd",   "Tadiran (1995)",    "Osem Group",
                                       "A.B. Trading",       "Delta Galil",       "Strauss Co",
                                       "Studio 54",          "Osem (Israel) Ltd", "IBM (Israel)",
                                       "Osem (Israel) בע\"מ"};
const char* const kLatinWords[] = {"IBM", "HP", "Intel", "Sano", "Elite"};
const char* const kStreets[] = {"הרצל",    "רוטשילד",  "ז'בוטינסקי",  "בן גוריון", "העצמאות",
                                "הנביאים", "דרך בגין", "שד' ירושלים", "החשמונאים", "ויצמן",
                                "אלנבי",   "יפו",      "הגפן",        "קרן היסוד"};
const char* const kCities[] = {"תל אביב-יפו", "ירושלים", "חיפה",       "באר שבע", "ראשון לציון",
                               "פתח תקווה",   "נתניה",   "אשדוד",      "בני ברק", "רמת גן",
                               "הרצליה",      "כפר סבא", "קרית שמונה", "מודיעין", "אילת",
                               "טבריה",       "נצרת",    "חולון"};
const char* const kLatinCities[] = {"Tel Aviv", "Haifa", "Eilat"};
const char* const kDistricts[] = {"מרכז",  "צפון",  "דרום",      "ירושלים",
                                  "השרון", "השפלה", "גליל עליון"};
const char* const kHebrewKeys[] = {"קופה",   "מזומן", "ספקים", "בנק",   "הלוואה", "עובדים",
                                   "שכר",    "מעמ",   "ביטוח", "פקדון", "ריבית",  "הוצאות",
                                   "הכנסות", "מלאי",  "רכוש",  "קניות"};
const char* const kItemWords[] = {"שולחן", "כסא",  "מנורה", "ארון",  "מדף",
                                  "ספה",   "מזרן", "שטיח",  "וילון", "כרית"};
const char* const kItemNames[] = {"שולחן עץ 120 ס\"מ", "כסא משרדי (שחור)", "מנורת לילה",
                                  "ארון 3 דלתות",      "מדף קיר",          "Monitor 24\"",
                                  "כבל USB 2 מטר",     "נייר A4, 500 דף"};
const char* const kLedgerTypes[] = {"חש", "קב", "זכ", "תש", "מע", "SL", "PR", "1", "12"};
const char* const kDocDetails[] = {"הערה: משלוח דחוף", "הזמנה טלפונית", "לתשלום עד סוף החודש",
                                   "Ref 12/07"};
const char* const kCompanyNames[] = {"מסחר ותעשייה", "Delta Trading", "יבוא ושיווק כללי",
                                     "מאפיות הצפון", "Galil Software"};

struct CodeFile {
  uint8_t code;
  int file;  // index into kDocFiles
};
const char* const kDocFiles[] = {"ISHP.FIX", "IORDR.FIX", "IMV.FIX", "IBD.FIX"};
// Every type code of the document-type table that lives in a stock-document file, and code
// 0, which the host leaves on some invoices and the all-sales-invoices row takes in.
const CodeFile kCodes[] = {{1, 2},  {2, 2},  {3, 2},  {4, 2},  {5, 2},  {6, 2},  {7, 2},
                           {9, 2},  {10, 2}, {12, 2}, {14, 2}, {15, 2}, {19, 2}, {20, 0},
                           {21, 0}, {22, 0}, {23, 0}, {30, 1}, {31, 1}, {32, 1}, {33, 1},
                           {34, 1}, {35, 1}, {36, 1}, {40, 3}, {41, 3}, {0, 2}};

// The fields of an account record that follow from its truth as they are: all but the key
// and the name, which the callers write in their own ways.
void FillAddressFields(const AccountTruth& t, AccountFields& f) {
  f.sortCode = t.sortCode;
  f.cutOff = t.cutOff;
  f.telephone = HostField(t.telephone, account::kTelephone.width);
  f.address = HostField(t.address, account::kAddress.width);
  f.district = HostField(t.district, account::kDistrict.width);
  f.city = HostField(t.city, account::kCity.width);
  f.zip = HostField(t.zip, account::kZip.width);
  f.details = HostField(t.details, account::kDetails.width);
  f.agent = t.agent;
}

std::string Digits(Random& r, int count) {
  std::string s;
  for (int i = 0; i < count; ++i) s.push_back(static_cast<char>('0' + r.Between(0, 9)));
  return s;
}

std::string PersonName(Random& r) {
  return std::string(r.Pick(kFirstNames)) + " " + r.Pick(kFamilies);
}

// True when punctuation stands at an edge of a right-to-left line next to a Latin run
// ("פרץ 5 Intel."): such a character takes the line's direction and moves to the far side of
// the Latin run, so the display reads back with it on the wrong side. A line without a
// Hebrew letter is left to right and reads back as typed.
bool LatinEdgePunctuation(const std::string& text) {
  auto latinOrDigit = [](char c) {
    return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
  };
  auto strong = [&](char c) { return latinOrDigit(c) || (static_cast<unsigned char>(c) >= 0x80); };
  auto hebrew = [](char c) { return static_cast<unsigned char>(c) >= 0x80; };
  if (std::none_of(text.begin(), text.end(), hebrew)) return false;
  // Nearest strong character to each end.
  auto firstStrong = std::find_if(text.begin(), text.end(), strong);
  auto lastStrong = std::find_if(text.rbegin(), text.rend(), strong);
  bool leading =
      firstStrong != text.begin() && firstStrong != text.end() && latinOrDigit(*firstStrong);
  bool trailing =
      lastStrong != text.rbegin() && lastStrong != text.rend() && latinOrDigit(*lastStrong);
  return leading || trailing;
}

// A display text of at most `width` bytes: `text` when it fits, else `fallback`.
std::string Fit(const std::string& text, size_t width, const std::string& fallback) {
  return HostVisual(text).size() <= width ? text : fallback;
}

std::string Phone(Random& r) {
  if (r.Chance(50)) return "0" + std::to_string(r.Between(2, 9)) + "-" + Digits(r, 7);
  return "05" + std::to_string(r.Between(0, 8)) + "-" + Digits(r, 7);
}

HostDate RandomDate(Random& r) {
  return HostDate::Of(r.Between(2003, 2012), r.Between(1, 12), r.Between(1, 28));
}

HostDate AddMonths(HostDate d, int months) {
  int m = d.month - 1 + months;
  return HostDate{static_cast<uint8_t>(d.yearOffset + m / 12), static_cast<uint8_t>(m % 12 + 1),
                  d.day};
}

// An account's fields as the host stores them, kept for the documents, ledger and receipts
// that refer to it.
struct StoredAccount {
  std::string key;   // 8 bytes
  std::string name;  // 30
  std::string address;
  std::string city;     // logical, for the documents' second address line
  bool usable = false;  // not deleted: documents and transactions may refer to it
};

struct Generator {
  Random rnd;
  const Options& opt;
  CompanyTruth truth;
  std::vector<StoredAccount> stored;
  std::vector<int> usable;            // indexes of accounts others may refer to
  std::vector<std::string> itemKeys;  // item key fields (12 bytes) of items with a key

  Generator(uint64_t seed, const Options& o) : rnd(seed), opt(o) {}

  std::pair<std::string, bool> AccountName() {
    const std::string fallback = PersonName(rnd);
    std::string name;
    bool clear = true;
    switch (rnd.Between(0, 11)) {
      case 0:
      case 11:
        name = fallback;
        break;
      case 1:
        name = std::string(rnd.Pick(kFamilies)) + " ושות' בע\"מ";
        break;
      case 2:
        name = std::string(rnd.Pick(kTrades)) + " " + rnd.Pick(kFamilies);
        break;
      case 3:
        name = std::string(rnd.Pick(kTrades)) + " " + rnd.Pick(kFamilies) + " (" +
               std::to_string(rnd.Between(1980, 2010)) + ") בע\"מ";
        break;
      case 4:
        name = rnd.Pick(kLatinCompanies);
        break;
      case 5:
        name = std::string(rnd.Pick(kLatinWords)) + " ישראל בע\"מ";
        break;
      case 6:
        name = std::string("א.ב. ") + rnd.Pick(kTrades);
        break;
      case 7:
        name = std::string(rnd.Pick(kTrades)) + ", " + rnd.Pick(kFamilies);
        break;
      case 8:
        name = std::string(rnd.Pick(kFamilies)) + " " + std::to_string(rnd.Between(1, 2010));
        break;
      case 9:
        name = std::string(rnd.Pick(kFamilies)) + " - " + rnd.Pick(kFirstNames);
        break;
      case 10:
        // A number between a Hebrew and a Latin word: its side is not recoverable.
        name = std::string(rnd.Pick(kTrades)) + " " + std::to_string(rnd.Between(1, 99)) + " " +
               rnd.Pick(kLatinWords);
        clear = false;
        break;
    }
    std::string fitted = Fit(name, 30, fallback);
    if (fitted != name) clear = true;
    if (LatinEdgePunctuation(fitted)) clear = false;
    return {fitted, clear};
  }

  std::string Address() {
    int kind = rnd.Between(0, 19);
    std::string street = rnd.Pick(kStreets);
    std::string text;
    if (kind == 0) return "";
    if (kind == 1) {
      // A post-office box, or an address the clerk typed in Latin letters.
      const int n = rnd.Between(1, 9999);
      text = n % 3 == 0 ? "ת.ד. " + std::to_string(n)
             : n % 3 == 1
                 ? "PO Box " + std::to_string(n)
                 : "Room " + std::to_string(n % 40 + 1) + ", Floor " + std::to_string(n % 9 + 1);
    } else if (kind <= 3) {
      text = street + " " + std::to_string(rnd.Between(1, 200)) + " דירה " +
             std::to_string(rnd.Between(1, 40));
    } else if (kind == 4) {
      text = street + " " + std::to_string(rnd.Between(1, 200)) + "/" +
             std::to_string(rnd.Between(1, 9));
    } else {
      text = street + " " + std::to_string(rnd.Between(1, 200));
    }
    return Fit(text, 30, street);
  }

  std::string City() {
    int k = rnd.Between(0, 99);
    if (k < 3) return "";
    if (k < 6) return rnd.Pick(kLatinCities);
    return rnd.Pick(kCities);
  }

  std::string Details() {
    int k = rnd.Between(0, 9);
    if (k < 4) return "איש קשר: " + PersonName(rnd);
    if (k == 4) return "מנהל חשבונות - " + PersonName(rnd) + " " + Phone(rnd);
    if (k == 5) return "לקוח VIP";
    return "";
  }

  std::string CutOff() {
    std::string c;
    for (int j = 0; j < 4; ++j) {
      int k = rnd.Between(0, 9);
      if (k < 3) {
        c.push_back(' ');
      } else if (k < 6) {
        c.push_back(static_cast<char>('1' + rnd.Between(0, 4)));
      } else if (k < 8) {
        c.push_back(static_cast<char>('A' + rnd.Between(0, 2)));
      } else {
        c.push_back(static_cast<char>(0x80 + rnd.Between(0, 4)));  // alef to he
      }
    }
    return c;
  }

  std::string SortCode() {
    if (rnd.Chance(10)) return "   ";
    std::string n = std::to_string(rnd.Between(1, rnd.Chance(70) ? 20 : 999));
    return std::string(3 - n.size(), ' ') + n;
  }

  static std::string MarkerAccount(const char* key, const char* name) {
    AccountFields f;
    f.key = key;
    f.name = name;
    return AccountRecord(f);
  }

  void WriteAccounts(const fs::path& folder) {
    std::vector<std::string> records;
    records.reserve(static_cast<size_t>(opt.accounts) + 2);
    // The account import never reads the first and the last record of the file.
    records.push_back(MarkerAccount("HEADER", "HEADER RECORD"));
    int64_t number = 10000;
    std::set<std::string> hebrewUsed;
    for (int i = 0; i < opt.accounts; ++i) {
      AccountTruth t;
      t.record = i + 2;
      StoredAccount s;
      AccountFields f;
      int k = rnd.Between(0, 99);
      if (k < 2 && i > 0) {
        t.deleted = true;
        f.key = std::string(1, kDeletedMark);
      } else if (k < 3 && !usable.empty()) {
        const AccountTruth& earlier =
            truth.accounts[usable[rnd.Between(0, (int)usable.size() - 1)]];
        t.key = earlier.key;
        t.unambiguousKey = earlier.unambiguousKey;
        t.duplicateKey = true;
      } else if (k < 10) {
        const char* word = rnd.Pick(kHebrewKeys);
        if (hebrewUsed.insert(word).second) {
          t.key = word;
        } else {
          t.key = std::string("לק") + std::to_string(number += rnd.Between(1, 9));
          t.unambiguousKey = false;
        }
      } else if (k < 20) {
        t.key = std::string(1, static_cast<char>('A' + rnd.Between(0, 3))) +
                std::to_string(number += rnd.Between(1, 9));
      } else {
        t.key = std::to_string(number += rnd.Between(1, 9));
      }
      if (!t.deleted) f.key = HostField(t.key, account::kKey.width);

      auto [name, clear] = AccountName();
      t.name = name;
      t.unambiguousText = clear;
      t.address = Address();
      t.city = City();
      t.zip = rnd.Chance(5) ? "" : Digits(rnd, 5);
      t.district = rnd.Chance(20) ? "" : rnd.Pick(kDistricts);
      int phoneKind = rnd.Between(0, 19);
      t.telephone = phoneKind == 0   ? ""
                    : phoneKind == 1 ? Phone(rnd) + ", " + Phone(rnd)
                                     : Phone(rnd);
      t.details = Details();
      t.sortCode = SortCode();
      t.cutOff = CutOff();
      t.agent = static_cast<uint8_t>(rnd.Between(0, 30));

      f.name = HostField(t.name, account::kName.width);
      FillAddressFields(t, f);
      records.push_back(AccountRecord(f));

      s.key = f.key;
      s.name = f.name;
      s.address = f.address;
      s.city = t.city;
      s.usable = !t.deleted;
      if (s.usable && !t.duplicateKey) usable.push_back(i);
      stored.push_back(std::move(s));
      truth.accounts.push_back(std::move(t));
    }
    PlantDispatchFaults(records);
    records.push_back(MarkerAccount("CLOSING", "CLOSING RECORD"));
    WriteRecords(folder / "ACT.fix", records);
  }

  // Rewrites the last six live accounts of a company of some size with faults a dispatch
  // upload refuses or misroutes, one of each kind the checks must find (see
  // AccountTruth::dispatchFault). Draws no random numbers, so the rest of the company stays
  // as it was.
  void PlantDispatchFaults(std::vector<std::string>& records) {
    if (usable.size() < 20) return;
    const char* const kinds[] = {"address",   "zip",       "telephone",
                                 "duplicate", "duplicate", "character"};
    const size_t first = usable.size() - std::size(kinds);
    for (size_t n = 0; n < std::size(kinds); ++n) {
      const int i = usable[first + n];
      AccountTruth& t = truth.accounts[i];
      const std::string kind = kinds[n];
      t.dispatchFault = kind;
      if (t.address.empty()) t.address = "הרצל 1";
      if (t.city.empty()) t.city = "חיפה";
      if (t.zip.size() != 5) t.zip = "31000";
      if (kind == "address") t.address = "";
      if (kind == "zip") t.zip = "310";
      if (kind == "telephone") t.telephone = "123-45";
      if (kind == "duplicate") {
        t.name = "כהן משה";
        t.address = "הנביאים 12";
        t.city = "ירושלים";
      }
      AccountFields f;
      f.key = HostField(t.key, account::kKey.width);
      f.name = HostField(t.name, account::kName.width);
      if (kind == "character") {
        // A box-drawing character of the host's screen, kept as its byte by the import.
        t.name = "מאפיית כהן";
        f.name = PadRaw("\xD9 " + HostVisual(t.name), account::kName.width);
        t.unambiguousText = false;
      }
      FillAddressFields(t, f);
      records[static_cast<size_t>(t.record - 1)] = AccountRecord(f);
      stored[i].name = f.name;
      stored[i].address = f.address;
      stored[i].city = t.city;
    }
  }

  void WriteItems(const fs::path& folder) {
    std::vector<std::string> records;
    records.push_back(ItemRecord({"HEADER", "HEADER RECORD", "   "}));
    int number = 100;
    std::set<std::string> hebrewUsed;
    for (int i = 0; i < opt.items; ++i) {
      ItemTruth t;
      t.record = i + 2;
      int k = rnd.Between(0, 99);
      if (k < 2) {
        // blank key: the importer stores nothing for it
      } else if (k < 4 && !truth.items.empty() && !truth.items.back().key.empty()) {
        t.key = truth.items.back().key;
        t.duplicateKey = true;
      } else if (k < 15) {
        const char* word = rnd.Pick(kItemWords);
        t.key = hebrewUsed.insert(word).second ? std::string(word)
                                               : "B" + std::to_string(number += rnd.Between(1, 30));
      } else if (k < 40) {
        t.key = "A" + std::to_string(number += rnd.Between(1, 30));
      } else if (k < 60) {
        t.key = "PRT-" + std::to_string(number += rnd.Between(1, 30));
      } else {
        t.key = std::to_string(number += rnd.Between(1, 30));
      }
      t.sortCode = SortCode();
      ItemFields f;
      f.key = HostField(t.key, item::kKey.width);
      f.name = HostField(rnd.Pick(kItemNames), item::kName.width);
      f.sortCode = t.sortCode;
      records.push_back(ItemRecord(f));
      if (!t.key.empty() && !t.duplicateKey) itemKeys.push_back(f.key);
      truth.items.push_back(std::move(t));
    }
    records.push_back(ItemRecord({"CLOSING", "CLOSING RECORD", "   "}));
    WriteRecords(folder / "ITM.fix", records);
  }

  int PickAccount() {
    if (usable.empty()) return -1;
    return usable[rnd.Between(0, static_cast<int>(usable.size()) - 1)];
  }

  void WriteDocuments(const fs::path& folder) {
    std::array<std::unique_ptr<RecordWriter>, 4> files;
    std::array<int64_t, 4> written = {0, 0, 0, 0};
    for (size_t f = 0; f < files.size(); ++f) {
      files[f] = std::make_unique<RecordWriter>(folder / kDocFiles[f]);
    }
    std::array<int, 4> reference = {1000, 5000, 20000, 300};
    constexpr int kCodeCount = static_cast<int>(std::size(kCodes));
    for (int d = 0; d < opt.documents; ++d) {
      const CodeFile cf = d < kCodeCount   ? kCodes[d]
                          : rnd.Chance(30) ? kCodes[0]
                                           : kCodes[rnd.Between(0, kCodeCount - 1)];
      RecordWriter& out = *files[cf.file];
      int64_t& records = written[cf.file];
      DocumentTruth t;
      t.file = kDocFiles[cf.file];
      t.headerRecord = records + 1;
      t.type = cf.code;
      t.accountIndex = rnd.Chance(1) ? -1 : PickAccount();
      reference[cf.file] = reference[cf.file] >= 99999 ? 1 : reference[cf.file] + 1;
      t.reference = reference[cf.file];
      t.date = RandomDate(rnd);
      t.dueDate = AddMonths(t.date, rnd.Between(0, 3));
      int lines = rnd.Chance(2) ? 0 : rnd.Between(opt.linesMin, opt.linesMax);
      lines = std::clamp(lines, 0, 255);

      DocHeaderFields h;
      h.type = cf.code;
      if (t.accountIndex >= 0) {
        const StoredAccount& a = stored[t.accountIndex];
        h.accountKey = a.key;
        h.name = a.name;
        h.address1 = a.address;
        std::string line2 = a.city;
        if (!line2.empty()) {
          line2 += " " + (rnd.Chance(50) ? Digits(rnd, 5) : Digits(rnd, 7));
        }
        h.address2 = HostField(line2, document::kAddress2.width);
      } else {
        h.name = HostField("לקוח מזדמן", document::kName.width);
      }
      h.reference = std::to_string(t.reference);
      h.details = rnd.Chance(30) ? HostField(rnd.Pick(kDocDetails), document::kDetails.width)
                  : rnd.Chance(20) ? HostField("לידי " + PersonName(rnd), document::kDetails.width)
                                   : "";
      h.lineCount = static_cast<uint8_t>(lines);
      out.Add(DocHeaderRecord(h));
      out.Add(DocSecondHeaderRecord(t.date, t.dueDate));
      records += 2;
      for (int j = 0; j < lines; ++j) {
        DocumentTruth::Line line;
        line.record = ++records;
        line.type = cf.code;
        DocLineFields lf;
        int k = rnd.Between(0, 99);
        if (k < 4) {
          lf.itemKey = "#";
        } else if (k < 8) {
          lf.itemKey = "*";
        } else if (k < 10 || itemKeys.empty()) {
          lf.itemKey = "";
        } else {
          lf.itemKey = itemKeys[rnd.Between(0, static_cast<int>(itemKeys.size()) - 1)];
          if (k < 15) line.type = static_cast<uint8_t>(cf.code + 1);  // a line of another type
        }
        lf.type = line.type;
        if (opt.keepDetail) line.itemKey = lf.itemKey;
        out.Add(DocLineRecord(lf));
        if (opt.keepDetail) t.lines.push_back(std::move(line));
      }
      if (opt.keepDetail) truth.documents.push_back(std::move(t));
    }
    for (auto& f : files) f->Close();
  }

  // The four entries of a transaction: some blank, sometimes one account twice.
  std::array<int, 4> Entries() {
    std::array<int, 4> e = {-1, -1, -1, -1};
    if (rnd.Chance(1)) return e;
    int filled = rnd.Between(1, 4);
    for (int k = 0; k < filled; ++k) e[k] = PickAccount();
    if (filled >= 2 && rnd.Chance(10)) e[1] = e[0];
    if (filled >= 3 && rnd.Chance(10)) e[1] = -1;  // a blank entry among filled ones
    return e;
  }

  std::array<std::string, 4> EntryKeys(const std::array<int, 4>& e) {
    std::array<std::string, 4> keys;
    for (int k = 0; k < 4; ++k) keys[k] = e[k] >= 0 ? stored[e[k]].key : "";
    return keys;
  }

  void WriteLedger(const fs::path& folder) {
    RecordWriter out(folder / "amv.fix");
    for (int i = 0; i < opt.ledger; ++i) {
      LedgerTruth t;
      t.record = i + 1;
      t.journal = static_cast<int16_t>(rnd.Between(1, 300));
      t.type = rnd.Pick(kLedgerTypes);
      t.accountIndex = Entries();
      t.date = RandomDate(rnd);
      t.valueDate = AddMonths(t.date, rnd.Between(0, 2));
      LedgerFields f;
      f.journal = t.journal;
      f.type = HostField(t.type, ledger::kType.width);
      f.keys = EntryKeys(t.accountIndex);
      f.date = t.date;
      f.valueDate = t.valueDate;
      out.Add(LedgerRecord(f));
      if (opt.keepDetail) truth.ledger.push_back(std::move(t));
    }
    out.Close();
  }

  void WriteBatches(const fs::path& folder) {
    for (int b = 0; b < opt.batches; ++b) {
      BatchTruth bt;
      bt.number = static_cast<int16_t>(10 + b);
      // The host writes some batch names with leading zeros.
      bool zeros = opt.batches >= 2 && b == opt.batches - 1;
      bt.fileName = (zeros ? "a0" : "a") + std::to_string(bt.number) + ".tmp";
      RecordWriter out(folder / bt.fileName);
      for (int i = 0; i < opt.batchSize; ++i) {
        LedgerTruth t;
        t.record = i + 1;
        t.type = rnd.Pick(kLedgerTypes);
        t.accountIndex = Entries();
        t.date = RandomDate(rnd);
        t.valueDate = AddMonths(t.date, rnd.Between(0, 2));
        BatchFields f;
        f.type = HostField(t.type, batch::kType.width);
        f.keys = EntryKeys(t.accountIndex);
        f.date = t.date;
        f.valueDate = t.valueDate;
        out.Add(BatchRecord(f));
        if (opt.keepDetail) bt.transactions.push_back(std::move(t));
      }
      out.Close();
      truth.batches.push_back(std::move(bt));
    }
  }

  void WriteReceipts(const fs::path& folder) {
    RecordWriter out(folder / "icash2.fix");
    for (int i = 0; i < opt.receipts; ++i) {
      CashTruth t;
      t.record = i + 1;
      t.accountIndex = rnd.Chance(3) ? -1 : PickAccount();
      t.date = RandomDate(rnd);
      out.Add(CashRecord({t.accountIndex >= 0 ? stored[t.accountIndex].key : "", t.date}));
      if (opt.keepDetail) truth.receipts.push_back(t);
    }
    out.Close();
  }
};

}  // namespace

CompanyTruth WriteCompany(const fs::path& folder, const Options& options,
                          std::string_view companyName) {
  if (options.accounts < 0 || options.documents < 0 || options.items < 0 || options.ledger < 0 ||
      options.batches < 0 || options.batchSize < 0 || options.receipts < 0 ||
      options.linesMin < 0 || options.linesMax < options.linesMin || options.linesMax > 255) {
    throw std::invalid_argument("sizes must be non-negative and lines-min <= lines-max <= 255");
  }
  fs::create_directories(folder);
  Generator g(options.seed, options);
  g.truth.folder = folder;
  g.truth.companyName = std::string(companyName);
  WriteRecords(folder / "ADF.FIX", {CompanyRecord(HostField(companyName, company::kName.width))});
  g.WriteAccounts(folder);
  g.WriteItems(folder);
  g.WriteDocuments(folder);
  g.WriteLedger(folder);
  g.WriteBatches(folder);
  g.WriteReceipts(folder);
  return std::move(g.truth);
}

std::vector<CompanyTruth> WriteCompanies(const fs::path& root, int count, const Options& options) {
  std::vector<CompanyTruth> out;
  for (int i = 1; i <= count; ++i) {
    Options o = options;
    o.seed = options.seed + static_cast<uint64_t>(i - 1);
    std::string name = i == 2 ? "" : kCompanyNames[(i - 1) % std::size(kCompanyNames)];
    out.push_back(WriteCompany(root / ("company" + std::to_string(i)), o, name));
  }
  return out;
}

}  // namespace zdrgen
