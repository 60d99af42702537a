// The two databases of the system: the working database zdrlab.DB, rebuilt by every data
// load, and the account-selection database zdracc.DB that holds the hand-picked accounts.
#pragma once

#include <filesystem>
#include <string>

#include "control/userseam.h"

namespace zdr {

inline constexpr const char* kHebrewLocale = ";LANGID=0x040D;CP=1255;COUNTRY=0";
inline constexpr const char* kWorkDbName = "zdrlab.DB";
inline constexpr const char* kSelectDbName = "zdracc.DB";

// The temporary folder: the `Temp` environment variable when set and not empty, else the
// system's temporary folder.
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
