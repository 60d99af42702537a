// The working database and the account-selection database: their tables, and how each
// file is thrown away and created again.
#include "workdb/schema.h"

#include <cstdlib>
#include <system_error>
#include <utility>

namespace zdr {
namespace {

using db::FieldType;
using db::TableDef;

// A failure of one creation step, with the description the user is shown.
struct CreateFailure {
  std::string description;
};

// Removes a leftover database file. A folder of that name is not removed: it is reported.
void RemoveOldFile(const std::filesystem::path& path) {
  namespace fs = std::filesystem;
  std::error_code ec;
  const fs::file_status st = fs::symlink_status(path, ec);
  if (!fs::exists(st)) return;
  if (fs::is_directory(st)) {
    throw CreateFailure{"לא ניתן ליצור את מסד הנתונים: קיימת תיקייה בשם " + path.string()};
  }
  if (!fs::remove(path, ec) && ec) {
    throw CreateFailure{"לא ניתן למחוק את הקובץ " + path.string() + ": " + ec.message()};
  }
}

// A database file being created: removed again unless its creation was done, so that a
// failed creation (a full disk) leaves no half-made file behind.
struct RemovedUnlessDone {
  std::filesystem::path path;
  bool done = false;
  ~RemovedUnlessDone() {
    if (done) return;
    std::error_code ec;
    std::filesystem::remove(path, ec);
  }
};

// The full path of a database file in the temporary folder, after checking that the folder
// is there to write into.
std::filesystem::path PathInTemp(const char* fileName) {
  namespace fs = std::filesystem;
  const fs::path folder = TempFolder();
  if (folder.empty()) {
    throw CreateFailure{
        "לא נמצאה תיקייה לקבצים זמניים: משתנה הסביבה Temp ריק ואין תיקייה זמנית במערכת"};
  }
  std::error_code ec;
  if (!fs::is_directory(folder, ec)) {
    throw CreateFailure{"תיקיית הקבצים הזמניים לא נמצאה: " + folder.string()};
  }
  return folder / fileName;
}

// Runs one creation; on any failure shows it as a fault and returns "".
template <typename Steps>
std::string CreateOrReport(UserSeam& ui, Steps&& steps) {
  std::string description;
  try {
    return steps();
  } catch (const CreateFailure& f) {
    description = f.description;
  } catch (const db::EngineError& e) {
    description = e.description();
  } catch (const std::filesystem::filesystem_error& e) {
    description = "תקלה בגישה לקובץ " + e.path1().string() + ": " + e.code().message();
  } catch (const std::exception& e) {
    description = e.what();
  }
  ui.ShowMessage(description, kTitleFault, MsgIcon::Critical);
  return "";
}

}  // namespace

std::vector<TableDef> WorkDbTables() {
  std::vector<TableDef> tables;

  TableDef account("tAccount");
  account.Field("AccountKey", FieldType::Text, 20)
      .Field("AccountName", FieldType::Text, 100)
      .Field("CategoryCode", FieldType::Text, 3)
      .Field("CutOff", FieldType::Text, 4)
      .Field("Address", FieldType::Text, 100)
      .Field("City", FieldType::Text, 50)
      .Field("Zip", FieldType::Text, 10)
      .Field("District", FieldType::Text, 50)
      .Field("Details", FieldType::Text, 100)
      .Field("Telephone", FieldType::Text, 50)
      .Field("Include", FieldType::Boolean)
      .Field("SortByName", FieldType::Text, 50)
      .Field("SortByKey", FieldType::Text, 20)
      .Field("SortByCity", FieldType::Text, 20)
      .Field("SortByZip", FieldType::Text, 10)
      .Field("SortByKeyVal", FieldType::Double)
      .Index("PrimaryKey", {"AccountKey"}, true, true)
      .Index("SortByKey", {"SortByKey"}, false, true);
  tables.push_back(std::move(account));

  TableDef head("tStockHead");
  head.Field("CompID", FieldType::Integer)
      .Field("TavFileID", FieldType::Integer)
      .Field("HeadIndx", FieldType::Long)
      .Field("DocType2", FieldType::Byte)
      .Field("Reference1", FieldType::Long)
      .Field("AccountKey", FieldType::Text, 8)
      .Field("RefDate", FieldType::Date)
      .Field("DueDate", FieldType::Date)
      .Field("CustomerName", FieldType::Text, 100)
      .Field("Address1", FieldType::Text, 100)
      .Field("Address2", FieldType::Text, 100)
      .Field("DetailsLine1", FieldType::Text, 100)
      .Field("SortByName", FieldType::Text, 50)
      .Field("SortByCity", FieldType::Text, 50)
      .Field("SortByZip", FieldType::Text, 10)
      .Field("Include", FieldType::Boolean)
      .Index("PrimaryKey", {"CompID", "TavFileID", "HeadIndx"}, true, true);
  tables.push_back(std::move(head));

  TableDef line("tStockLine");
  line.Field("CompID", FieldType::Integer)
      .Field("TavFileID", FieldType::Integer)
      .Field("HeadIndx", FieldType::Long)
      .Field("LineIndx", FieldType::Long)
      .Field("Agent", FieldType::Byte)
      .Field("ItemKey", FieldType::Text, 20)
      .Index("PrimaryKey", {"CompID", "TavFileID", "HeadIndx", "LineIndx"}, true, true);
  tables.push_back(std::move(line));

  TableDef transact("tTransact");
  transact.Field("FileID", FieldType::Long)
      .Field("TransID", FieldType::Long)
      .Field("AccountKey", FieldType::Text, 8)
      .Index("PrimaryKey", {"FileID", "TransID", "AccountKey"}, true, true)
      // The recipients statement asks which accounts have ledger rows: read from the accounts
      // kept here rather than from every ledger row.
      .KeepDistinct("AccountKey");
  tables.push_back(std::move(transact));

  TableDef cash("tCash");
  cash.Field("TransID", FieldType::Long)
      .Field("AccountKey", FieldType::Text, 8)
      .Index("PrimaryKey", {"TransID", "AccountKey"}, true, true)
      .KeepDistinct("AccountKey");
  tables.push_back(std::move(cash));

  TableDef item("tItem");
  item.Field("ItemKey", FieldType::Text, 20).Index("PrimaryKey", {"ItemKey"}, true, true);
  tables.push_back(std::move(item));

  return tables;
}

TableDef SelectAccountTable() {
  TableDef select("tSelectAccount");
  select.Field("AccountKey", FieldType::Text, 20)
      .Field("SortByKey", FieldType::Text, 20)
      .Field("SortByName", FieldType::Text, 100)
      .Field("Include", FieldType::Boolean)
      .Index("AccountKey", {"AccountKey"}, true, true)
      .Index("SortByKey", {"SortByKey"}, false, true);
  return select;
}

std::string HeadByItemSql() {
  std::string sql = "SELECT tStockLine.CompID, tStockLine.TavFileID, tStockLine.HeadIndx";
  sql += " FROM tItem INNER JOIN tStockLine ON tItem.ItemKey = tStockLine.ItemKey";
  sql += " GROUP BY tStockLine.CompID, tStockLine.TavFileID, tStockLine.HeadIndx";
  return sql;
}

std::filesystem::path TempFolder() {
  const char* temp = std::getenv("Temp");
  if (temp != nullptr && *temp != '\0') return temp;
  std::error_code ec;
  std::filesystem::path system = std::filesystem::temp_directory_path(ec);
  if (ec) return {};
  return system;
}

std::string CreateWorkDB(const std::string& selectDbPath, UserSeam& ui) {
  return CreateOrReport(ui, [&]() -> std::string {
    const std::filesystem::path path = PathInTemp(kWorkDbName);
    RemoveOldFile(path);
    RemovedUnlessDone partial{path};
    db::Database work = db::Database::Create(path, kHebrewLocale, db::Durability::Scratch);
    for (const TableDef& table : WorkDbTables()) work.CreateTable(table);
    if (!selectDbPath.empty()) {
      std::error_code ec;
      if (!std::filesystem::is_regular_file(selectDbPath, ec)) {
        throw CreateFailure{"מסד הנתונים של בחירת הכרטיסים לא נמצא: " + selectDbPath};
      }
      work.LinkTable("tSelectAccount", selectDbPath, "tSelectAccount");
    }
    work.CreateQuery("qHeadByItem", HeadByItemSql());
    work.Close();
    partial.done = true;
    return path.string();
  });
}

std::string CreateSelectDB(UserSeam& ui) {
  return CreateOrReport(ui, [&]() -> std::string {
    const std::filesystem::path path = PathInTemp(kSelectDbName);
    RemoveOldFile(path);
    RemovedUnlessDone partial{path};
    db::Database select = db::Database::Create(path, kHebrewLocale, db::Durability::Durable);
    select.CreateTable(SelectAccountTable());
    select.Close();
    partial.done = true;
    return path.string();
  });
}

}  // namespace zdr
