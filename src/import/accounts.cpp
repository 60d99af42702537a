// Accounts: ACT.fix into tAccount or tSelectAccount.

#include <array>
#include <exception>
#include <optional>
#include <string>
#include <string_view>

#include "engine/engine.h"
#include "hostfile/hostfile.h"
#include "hosttext/hosttext.h"
#include "import/importcommon.h"
#include "import/importers.h"

namespace zdr {

namespace {

using importing::CompareCodes;
using importing::FieldOf;
using importing::TextColumn;

constexpr size_t kAccountRecord = 650;

// Fields of the account record: offset, width.
constexpr size_t kKeyAt = 0, kKeyLen = 8;
constexpr size_t kNameAt = 8, kNameLen = 30;
constexpr size_t kSortAt = 38, kSortLen = 3;
constexpr size_t kCutOffAt = 52, kCutOffLen = 4;
constexpr size_t kPhoneAt = 60, kPhoneLen = 30;
constexpr size_t kAddressAt = 90, kAddressLen = 30;
constexpr size_t kDistrictAt = 120, kDistrictLen = 15;
constexpr size_t kCityAt = 135, kCityLen = 15;
constexpr size_t kZipAt = 150, kZipLen = 5;
constexpr size_t kDetailsAt = 167, kDetailsLen = 50;
constexpr size_t kAgentAt = 324;

// The host marks a deleted account with a key of the single byte 0x01.
bool IsDeleted(std::string_view keyField) {
  std::string_view k = TrimSpaces(keyField);
  return k.size() == 1 && k[0] == '\x01';
}

// A sort-code bound of one or two characters is padded with leading spaces to the code's
// width of three, as the host stores short codes.
std::string PadSortBound(std::string bound) {
  if (bound.empty() || bound.size() >= 3) return bound;
  std::string padded(3 - bound.size(), ' ');
  padded.append(bound);
  return padded;
}

// The account criteria, read from the panel once before the loop.
struct AccountCriteria {
  bool useAgent = false;
  bool hasFromAgent = false, hasToAgent = false;
  int fromAgent = 0, toAgent = 0;
  // A bound that is not a byte is reported when the first record reaches the test.
  std::string agentError;

  bool useKey = false;
  std::string fromKey, toKey;  // Windows-1255, as typed
  bool boundsNumeric = false;
  double fromKeyValue = 0, toKeyValue = 0;

  bool useSort = false;
  std::string fromSort, toSort;

  bool useCutOff = false;
  std::array<char, 5> cutOff{};  // indexes 1..4

  static AccountCriteria FromPanel(Panel& panel);
  bool Pass(std::string_view rec, std::string& keyBuf) const;
};

AccountCriteria AccountCriteria::FromPanel(Panel& panel) {
  AccountCriteria c;
  if (Panel::On(panel.ChkAgent)) {
    c.useAgent = true;
    try {
      if (!panel.txtAgent.empty()) {
        c.fromAgent =
            static_cast<int>(importing::PanelWholeNumber(panel.txtAgent, 0, 255, "סוכנים"));
        c.hasFromAgent = true;
      }
      if (!panel.txtToAgent.empty()) {
        c.toAgent =
            static_cast<int>(importing::PanelWholeNumber(panel.txtToAgent, 0, 255, "עד סוכן"));
        c.hasToAgent = true;
      }
    } catch (const importing::ImportError& e) {
      c.agentError = e.what();
    }
  }
  if (Panel::On(panel.ChkAccKey)) {
    c.useKey = true;
    c.fromKey = importing::PanelText(panel.TxtFromCrd);
    c.toKey = importing::PanelText(panel.TxtToCrd);
    c.boundsNumeric = importing::IsNumericText(c.fromKey) && importing::IsNumericText(c.toKey);
    if (c.boundsNumeric) {
      c.fromKeyValue = importing::NumberAtStart(c.fromKey);
      c.toKeyValue = importing::NumberAtStart(c.toKey);
    }
  }
  if (Panel::On(panel.ChkCatCode)) {
    c.useSort = true;
    c.fromSort = PadSortBound(importing::PanelText(panel.txtFromSort));
    c.toSort = PadSortBound(importing::PanelText(panel.txtToSort));
  }
  if (Panel::On(panel.chkCutOff)) {
    for (int j = 1; j <= 4; ++j) {
      if (panel.CutOff[j].empty()) panel.CutOff[j].assign(1, ' ');
      std::string letter = ToHostLetter(importing::PanelText(panel.CutOff[j]));
      c.cutOff[j] = letter.empty() ? ' ' : letter[0];
      if (panel.CutOff[j] != "*") c.useCutOff = true;
    }
  }
  return c;
}

bool AccountCriteria::Pass(std::string_view rec, std::string& keyBuf) const {
  if (useAgent) {
    if (!agentError.empty()) throw importing::ImportError(agentError);
    int agent = importing::ByteOf(rec, kAgentAt);
    if (hasFromAgent && agent < fromAgent) return false;
    if (hasToAgent && agent > toAgent) return false;
  }
  if (useKey) {
    ConvertForSort(FieldOf(rec, kKeyAt, kKeyLen), keyBuf);
    std::string_view k = TrimSpaces(keyBuf);
    if (boundsNumeric && importing::IsNumericText(k)) {
      double v = importing::NumberAtStart(k);
      if (v < fromKeyValue || v > toKeyValue) return false;
    } else {
      if (!fromKey.empty() && CompareCodes(k, fromKey) < 0) return false;
      if (!toKey.empty() && CompareCodes(k, toKey) > 0) return false;
    }
  }
  if (useSort) {
    std::string_view code = FieldOf(rec, kSortAt, kSortLen);
    if (!fromSort.empty() && CompareCodes(code, fromSort) < 0) return false;
    if (!toSort.empty() && CompareCodes(code, toSort) > 0) return false;
  }
  if (useCutOff) {
    for (int j = 1; j <= 4; ++j) {
      if (cutOff[j] != '*' && rec[kCutOffAt + j - 1] != cutOff[j]) return false;
    }
  }
  return true;
}

// Writes the accepted accounts; one per target table layout.
class AccountWriter {
 public:
  AccountWriter(importing::RowTarget& rs, bool allDetails, bool asIs)
      : rs_(rs),
        allDetails_(allDetails),
        asIs_(asIs),
        key_(rs, "AccountKey"),
        sortByKey_(rs, "SortByKey"),
        sortByName_(rs, "SortByName"),
        include_(rs.FieldIndex("Include")) {
    if (allDetails_) {
      name_.emplace(rs, "AccountName");
      category_.emplace(rs, "CategoryCode");
      cutOff_.emplace(rs, "CutOff");
      address_.emplace(rs, "Address");
      city_.emplace(rs, "City");
      zip_.emplace(rs, "Zip");
      district_.emplace(rs, "District");
      details_.emplace(rs, "Details");
      phone_.emplace(rs, "Telephone");
      sortByCity_.emplace(rs, "SortByCity");
      sortByZip_.emplace(rs, "SortByZip");
      sortByKeyVal_ = rs.FieldIndex("SortByKeyVal");
    }
  }

  void Write(std::string_view rec) {
    std::string_view keyField = FieldOf(rec, kKeyAt, kKeyLen);
    ConvertForDisplay(keyField, asIs_, displayKey_);
    std::string_view key = TrimSpaces(displayKey_);
    // A blank key cannot be stored; such a record is passed over like a deleted one instead of
    // ending the import and losing every account after it.
    if (key.empty()) return;

    ConvertWithBidi(FieldOf(rec, kNameAt, kNameLen), nameText_);
    ConvertSpaced(TrimSpaces(keyField), sortKey_);

    rs_.AddNew();
    key_.Set(rs_, key);
    if (allDetails_) {
      std::string_view city = FieldOf(rec, kCityAt, kCityLen);
      std::string_view zip = FieldOf(rec, kZipAt, kZipLen);
      name_->SetOr(rs_, nameText_, ".");
      category_->Set(rs_, FieldOf(rec, kSortAt, kSortLen));
      ReverseAndMirror(FieldOf(rec, kCutOffAt, kCutOffLen), scratch_);
      cutOff_->Set(rs_, scratch_);
      ConvertWithBidi(FieldOf(rec, kAddressAt, kAddressLen), scratch_);
      address_->SetOr(rs_, scratch_, " ");
      ConvertWithBidi(city, scratch_);
      city_->SetOr(rs_, scratch_, " ");
      ConvertWithBidi(zip, scratch_);
      zip_->SetOr(rs_, scratch_, " ");
      ConvertWithBidi(FieldOf(rec, kDistrictAt, kDistrictLen), scratch_);
      district_->SetOr(rs_, scratch_, " ");
      ExtractHebrewWords(TrimSpaces(FieldOf(rec, kDetailsAt, kDetailsLen)), 20, words_);
      ConvertWithBidi(words_, scratch_);
      details_->SetOr(rs_, scratch_, " ");
      ConvertSpaced(FieldOf(rec, kPhoneAt, kPhoneLen), scratch_);
      phone_->SetOr(rs_, TrimSpaces(scratch_), " ");
      ConvertForSort(TrimSpaces(city), scratch_);
      sortByCity_->SetOr(rs_, scratch_, " ");
      ConvertForSort(TrimSpaces(zip), scratch_);
      sortByZip_->SetOr(rs_, scratch_, " ");
    }
    sortByKey_.SetOr(rs_, sortKey_, " ");
    if (allDetails_) {
      rs_.SetDouble(sortByKeyVal_, importing::NumberAtStart(sortKey_));
    }
    sortByName_.SetOr(rs_, nameText_, " ");
    rs_.SetBool(include_, true);
    rs_.UpdatePassingDuplicates();
  }

 private:
  importing::RowTarget& rs_;
  bool allDetails_, asIs_;
  TextColumn key_, sortByKey_, sortByName_;
  int include_;
  std::optional<TextColumn> name_, category_, cutOff_, address_, city_, zip_, district_, details_,
      phone_, sortByCity_, sortByZip_;
  int sortByKeyVal_ = -1;
  // Conversion buffers reused from record to record (each column copies what it is given).
  std::string displayKey_, nameText_, sortKey_, words_, scratch_;
};

}  // namespace

bool ReadACT(const std::string& CompPath, const std::string& pDBFile, bool pAllDetails, bool pAsIs,
             Panel& panel, UserSeam& ui) {
  try {
    HostRecordFile file(CompPath, "ACT.fix", kAccountRecord);
    // Neither the first record nor the last is read.
    const double q = file.Count() - 1;
    const int64_t last = RoundHalfEven(q);
    ProgressReporter progress(ui, q);
    const AccountCriteria criteria = AccountCriteria::FromPanel(panel);

    db::Database db = db::Database::Open(pDBFile);
    db::TableRecordset rs = db.OpenTable(pAllDetails ? "tAccount" : "tSelectAccount");
    importing::ImportPipeline pipeline(progress);
    AccountWriter writer(pipeline.Add(rs), pAllDetails, pAsIs);
    std::string keyBuf;

    pipeline.Run([&] {
      for (int64_t n = 2; n <= last; ++n) {
        std::string_view rec = importing::RecordOf(file, n);
        if (!IsDeleted(FieldOf(rec, kKeyAt, kKeyLen)) && criteria.Pass(rec, keyBuf)) {
          writer.Write(rec);
        }
        if (n % 5 == 0) pipeline.Progress(static_cast<double>(n));
        pipeline.RecordDone();
      }
    });
    rs.Close();
    db.Close();
    return true;
  } catch (const std::exception& e) {
    ui.ShowMessage(e.what(), kTitleAccountsFault, MsgIcon::Critical);
    return false;
  }
}

}  // namespace zdr
