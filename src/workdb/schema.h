// The two databases of the system: the working database zdrlab.DB, rebuilt by every data
// load, and the account-selection database zdracc.DB that holds the hand-picked accounts.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "common/userseam.h"
#include "engine/engine.h"

namespace zdr {

inline constexpr const char* kHebrewLocale = ";LANGID=0x040D;CP=1255;COUNTRY=0";
inline constexpr const char* kWorkDbName = "zdrlab.DB";
inline constexpr const char* kSelectDbName = "zdracc.DB";

// The tables of the working database in creation order, each with its fields and indexes
// (tSelectAccount, which is linked, is not among them).
std::vector<db::TableDef> WorkDbTables();

// The one table of the account-selection database.
db::TableDef SelectAccountTable();

// The SQL text of the stored query qHeadByItem: the headers that have a line whose item is
// in tItem, each once.
std::string HeadByItemSql();

// The temporary folder: the `Temp` environment variable when set and not empty, else the
// system's temporary folder. Empty when neither exists: there is then no place to write.
std::filesystem::path TempFolder();

// Deletes an old zdrlab.DB in the temporary folder and creates it anew with every table,
// index, the link to tSelectAccount (when `selectDbPath` is not empty) and the stored query
// qHeadByItem. Returns the file's full path, or an empty string after showing the failure
// under the title "תקלה" with the critical icon.
std::string CreateWorkDB(const std::string& selectDbPath, UserSeam& ui);

// Deletes an old zdracc.DB and creates it anew with tSelectAccount. Returns the path, or an
// empty string after showing the failure as above.
std::string CreateSelectDB(UserSeam& ui);

}  // namespace zdr
