// The per-user settings store and the routines that move the panel, the company path, the
// label appearance and the dispatch settings to and from it.
//
// Every value is a UTF-8 string addressed by application, section and key. For the
// routines below, action 1 saves and action 2 loads; any other action does nothing.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <tuple>
#include <variant>
#include <vector>

#include "common/panel.h"
#include "output/outputdefs.h"

namespace zdr {

inline constexpr std::string_view kSettingsApp = "ZDRLab";
inline constexpr std::string_view kParamsSection = "Params";
inline constexpr std::string_view kConnDataBaseKey = "ConnDataBase";
inline constexpr std::string_view kLabPicsSection = "LabPics";
inline constexpr std::string_view kPostILSection = "PostIL";
inline constexpr std::string_view kLabelPdfSection = "LabelPdf";
inline constexpr std::string_view kLabelStocksSection = "LabelStocks";

inline constexpr uint8_t kActionSave = 1;
inline constexpr uint8_t kActionLoad = 2;

// The kinds of control value SetGetRegValue moves.
inline constexpr uint8_t kKindText = 1;   // a text box's text, as typed
inline constexpr uint8_t kKindList = 2;   // a combo box's list index, "-1" for no entry
inline constexpr uint8_t kKindCheck = 3;  // a check box's value: "0", "1" or "2" (greyed)

// The entries of the panel's combo boxes, which a stored list index must fit.
inline constexpr int kDocTypeListSize = 28;
inline constexpr int kByDocListSize = 2;
inline constexpr int kSortByListSize = 8;
inline constexpr int kSortDirListSize = 2;
inline constexpr int kInAccountsListSize = 2;
inline constexpr int kAddressFromListSize = 2;

// Where values are kept. Implementations: MemorySettingsStore (below) and QtSettingsStore
// (qtstore/qtsettings.h).
class SettingsStore {
 public:
  virtual ~SettingsStore() = default;

  // The value stored under app/section/key, or `defaultValue` when there is none.
  virtual std::string Get(std::string_view app, std::string_view section, std::string_view key,
                          std::string_view defaultValue) = 0;

  // Stores `value` under app/section/key, replacing any earlier value. Throws
  // SettingsStoreError when the store cannot be written.
  virtual void Save(std::string_view app, std::string_view section, std::string_view key,
                    std::string_view value) = 0;

  // Where the values live, for messages (a file's path); "" when nowhere a person could open.
  virtual std::string Location() const { return ""; }
};

// The store could not be written (for example a read-only settings file).
class SettingsStoreError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// A value that its control refuses: a list index outside the list, a non-number for a list
// index or a check value, a check value other than 0, 1 or 2, a weight that is not a
// positive number. what() is a Hebrew message naming the key, the value and what the key
// takes.
class SettingsValueError : public std::runtime_error {
 public:
  SettingsValueError(std::string section, std::string key, std::string value);
  const std::string& section() const { return section_; }
  const std::string& key() const { return key_; }
  const std::string& value() const { return value_; }

 private:
  std::string section_;
  std::string key_;
  std::string value_;
};

// A store in memory, for tests and for running without a per-user store. Keeps every
// value and a log of every save in order.
class MemorySettingsStore : public SettingsStore {
 public:
  struct Saved {
    std::string app, section, key, value;
  };
  using Address = std::tuple<std::string, std::string, std::string>;  // app, section, key

  std::string Get(std::string_view app, std::string_view section, std::string_view key,
                  std::string_view defaultValue) override;
  void Save(std::string_view app, std::string_view section, std::string_view key,
            std::string_view value) override;

  // Every stored value, ordered by address.
  const std::map<Address, std::string>& Values() const { return values_; }
  // Every Save call since construction or the last ClearLog(), in call order.
  const std::vector<Saved>& SaveLog() const { return log_; }
  void ClearLog() { log_.clear(); }
  // True when a value is stored under the address.
  bool Has(std::string_view app, std::string_view section, std::string_view key) const;
  // Forgets one value; a later Get returns its default.
  void Remove(std::string_view app, std::string_view section, std::string_view key);

 private:
  std::map<Address, std::string> values_;
  std::vector<Saved> log_;
};

// One control's value as SetGetRegValue moves it: a text, a list index with the number
// of entries in its list, or a check value. Refers to the value; does not own it.
class ControlValueRef {
 public:
  static ControlValueRef Text(std::string& text) { return ControlValueRef(&text, nullptr, 0); }
  static ControlValueRef ListIndex(int& index, int listSize) {
    return ControlValueRef(nullptr, &index, listSize);
  }
  static ControlValueRef CheckValue(int& value) { return ControlValueRef(nullptr, &value, -1); }

  std::string* text() const { return text_; }
  int* number() const { return number_; }
  bool isList() const { return number_ != nullptr && listSize_ >= 0; }
  int listSize() const { return listSize_; }

 private:
  ControlValueRef(std::string* text, int* number, int listSize)
      : text_(text), number_(number), listSize_(listSize) {}
  std::string* text_;
  int* number_;
  int listSize_;  // -1 for a check value
};

// Moves one control's value. Action 1 stores its text form by `kind`; action 2 reads the
// setting (`defaultValue` when missing) and assigns it. Any other action or kind does
// nothing. On load, throws SettingsValueError for a value the control refuses and leaves
// the control as it was; throws std::invalid_argument when `value` is not of `kind`'s sort.
void SetGetRegValue(uint8_t action, SettingsStore& store, std::string_view app,
                    std::string_view section, std::string_view key, ControlValueRef value,
                    uint8_t kind, std::string_view defaultValue);

// ---- One table of the values the settings, the command line and the dialogs take --------

// What a value must be for its control to take it.
enum class ValueRule {
  kText,    // any text
  kCheck,   // a check box's value: 0, 1 or 2 (greyed)
  kList,    // a combo box's index: -1 (no entry) up to the list's last entry
  kWeight,  // empty, or a positive number with a decimal point ("0.5", "2")
};

// How a value reaches the settings store.
enum class Stored {
  kByParams,    // section Params, moved with the whole panel by SetGetRegParams
  kByPostIL,    // section PostIL, moved by SetGetRegPostILDefs
  kConnection,  // Params/ConnDataBase, moved by SetGetRegConnParams
  kNot,         // a panel control the store does not keep
};

// Where the values live: the panel, the dispatch settings and the company path.
struct SettingTargets {
  Panel& panel;
  PostILSettings& postIL;
  std::string& companyPath;
};

// One value: its name (the store's key, or the control's name when not stored), how it is
// stored, the rule its values meet, its list's size (kList), the default a load takes when
// the store has none, and where it lives.
struct SettingDef {
  std::string name;
  Stored stored;
  ValueRule rule;
  int listSize;
  std::string_view defaultValue;
  // The value in `t`: a text, a panel number, or a 16-bit number of the dispatch settings.
  std::variant<std::string*, int*, int16_t*> (*at)(SettingTargets& t, int index);
  int index;  // of a control array (CutOff, ChkTitle, ChkLogo); 0 otherwise
};

// Every value, the keys of section Params in the order SetGetRegParams moves them, then the
// dispatch settings in their order, the company path and the unstored panel controls.
const std::vector<SettingDef>& SettingsTable();

// The value named `name` (exact case), or nullptr.
const SettingDef* FindSetting(std::string_view name);

// The store's section of a stored value ("" for Stored::kNot).
std::string_view SectionOf(const SettingDef& def);

// What `def` takes, in Hebrew, for a message ("0, 1 או 2").
std::string AllowedValues(const SettingDef& def);

// Gives `def` the value `text` in `targets`, as its control would take it (a number from
// its text, blanks around it allowed). Throws SettingsValueError and leaves the value as it
// was when the rule refuses `text`.
void ApplySetting(const SettingDef& def, std::string_view text, SettingTargets targets);

// The keys of section Params, in the order SetGetRegParams moves them.
std::vector<std::string> ParamsKeys();

// Saves or loads the whole panel under ZDRLab/Params, key by key in the fixed order. A
// failure ends the pass at that key by throwing (SettingsValueError on load,
// SettingsStoreError on save); the keys after it are not moved. Callers ignore it.
void SetGetRegParams(uint8_t action, SettingsStore& store, Panel& panel);

// The company path used when none is stored: "c:\ztest" on Windows, the folder `ztest` in
// the user's home folder elsewhere.
std::string DefaultConnDataBase();

// Saves or loads the company path (ZDRLab/Params/ConnDataBase, default
// DefaultConnDataBase()). Errors are ignored.
void SetGetRegConnParams(uint8_t action, SettingsStore& store, std::string& connDataBase);

// Saves or loads the label appearance: sections LabelDef0..LabelDef7 (Font, FontSize,
// FontWeight, FontUL, FontItalic; defaults 0, 9, 0, 0, 0) and LabPics (Pic0, Pic1; default
// empty). Line 8 is not moved. Errors are ignored value by value: a stored value that is
// not a whole number from 0 to 255 leaves the old one.
void SetGetRegLabelDefs(uint8_t action, SettingsStore& store, LabelSettings& labels);

// Saves or loads the dispatch settings in section PostIL, keys Service, Weight, Confirm,
// FilePath, OpenExcel, FileFormat in that order (texts default empty, integers 0). Errors
// are ignored value by value: a stored value its rule refuses (a weight that is not a
// positive number, OpenExcel other than 0, 1 or 2, FileFormat other than -1, 0 or 1)
// leaves the old one, and the load returns such values in order. A save returns nothing.
std::vector<SettingsValueError> SetGetRegPostILDefs(uint8_t action, SettingsStore& store,
                                                    PostILSettings& postIL);

// A Hebrew message for the clerk about the stored values a load refused (`refused`, from
// SetGetRegParams and SetGetRegPostILDefs) in the store at `where`: which key and value,
// and what was therefore not loaded.
std::string RefusedSettingsMessage(const std::vector<SettingsValueError>& refused,
                                   std::string_view where);

// Saves or loads how the label command prints: section LabelPdf, keys Template (default
// a4-3x8-70x37), OffsetX and OffsetY (millimetres, default 0), ScaleX and ScaleY (per
// mille, default 0) and Output (0 the HTML sheet, 1 the PDF). Errors are ignored value by
// value: an offset that is not a number within +-10 on a step of 0.1, a scale not within
// +-100 on a step of 0.1, or an output other than 0 or 1, leaves the old value.
void SetGetRegLabelPdf(uint8_t action, SettingsStore& store, LabelPdfSettings& pdf);

// The user's own label stocks. Section LabelStocks, key Ids lists their ids separated by
// ";"; each stock is kept in section "LabelStock." + id under the keys Name, PageWidth,
// PageHeight, Top, Side, LabelWidth, LabelHeight, PitchX, PitchY, Rows, Cols, Padding.
// A stock whose values are missing or unusable is left out; so is one that takes a
// shipped stock's id.
std::vector<LabelStock> LoadUserStocks(SettingsStore& store);

// The user's listed stocks that LoadUserStocks leaves out, each with the reason (Hebrew):
// a value missing or not a number (naming its key), LabelStockProblem's reason, or a shipped
// stock's id.
std::vector<std::pair<std::string, std::string>> UnusableUserStocks(SettingsStore& store);

// Why labels cannot be printed on the stock named `id` (Hebrew): a user stock that fails its
// check, with the reason, a catalogue template this system cannot print, with the reason, or
// an id no stock has, with the ids there are. "" when FindLabelStock finds it.
std::string LabelStockChoiceProblem(SettingsStore& store, std::string_view id);

// Adds or replaces a user stock. Throws std::invalid_argument (Hebrew) for a stock that
// UserStockIdProblem or LabelStockProblem refuses or that takes a shipped stock's id;
// SettingsStoreError when the store cannot be written.
void SaveUserStock(SettingsStore& store, const LabelStock& stock);

// Drops a user stock from the list (its values stay behind, unused).
void RemoveUserStock(SettingsStore& store, std::string_view id);

// The shipped stocks, then the user's.
std::vector<LabelStock> AvailableLabelStocks(SettingsStore& store);

// The stock named `id` among AvailableLabelStocks, a retired shipped stock, or a stock of
// the installed catalogue that can be printed ("Avery L7160"); nothing otherwise.
std::optional<LabelStock> FindLabelStock(SettingsStore& store, std::string_view id);

// A stock's own correction (keys OffsetX, OffsetY, ScaleX and ScaleY of section
// "LabelStock." + id), when both offsets are kept and valid; a scale missing or not valid
// counts as 0.
std::optional<StockOffset> LoadStockOffset(SettingsStore& store, std::string_view id);

// Keeps a stock's own correction, or with nothing clears it (empty values). Throws
// std::invalid_argument for an invalid offset or scale, SettingsStoreError when the store cannot be
// written.
void SaveStockOffset(SettingsStore& store, std::string_view id,
                     const std::optional<StockOffset>& offset);

// The offset that labels on stock `id` print with: the stock's own when it has one, else
// the user's.
StockOffset EffectiveStockOffset(SettingsStore& store, const LabelPdfSettings& pdf,
                                 std::string_view id);

}  // namespace zdr
