// The one message for a full disk, shared by every writer: the database engine, the pages and
// the dispatch file, the label PDF.
#pragma once

#include <filesystem>
#include <string>

namespace zdr {

// Names the folder of `file` and the full disk (Hebrew).
inline std::string DiskFullMessage(const std::filesystem::path& file) {
  const std::filesystem::path folder = file.parent_path();
  return "אין מקום פנוי בדיסק: התיקייה " + (folder.empty() ? std::string(".") : folder.string()) +
         " מלאה, ולא ניתן לכתוב בה את הקובץ " + file.filename().string() +
         ". יש לפנות מקום בדיסק ולנסות שוב";
}

}  // namespace zdr
