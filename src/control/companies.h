// The company scan of the company chooser: which subfolders of a folder hold a host
// company (a company descriptor ADF.FIX), and the company's name from it.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace zdr {

// Length of one ADF.FIX record; only record 1's first field, the name, is read.
inline constexpr size_t kAdfRecordLength = 7359;
inline constexpr size_t kAdfNameWidth = 20;

struct CompanyEntry {
  std::string Path;  // the company folder, whole, without a trailing separator (UTF-8)
  std::string Name;  // the company's name (UTF-8), trimmed; may be empty
};

struct CompanyScan {
  // Every subfolder that holds a descriptor, in folder-name order (letters without regard
  // to case), blank names too.
  std::vector<CompanyEntry> entries;
  // Empty when the scan ran to the end; otherwise the description of the failure that
  // ended it (the entries found before the failure are kept).
  std::string error;

  // Indexes into `entries` of the companies to list: those with a non-blank name.
  std::vector<size_t> Listed() const;
};

// FindTavPaths: scans the subfolders of `pDrive` (a folder path, with or without a trailing
// separator) for a descriptor file ADF.FIX, matched without regard to case. An entry's Path
// is `pDrive` followed by the subfolder's name; its Name is the first 20 bytes of the
// descriptor, converted from the host's text and trimmed. A descriptor shorter than a whole
// record still gives the name it holds. Never throws: a folder that cannot be listed or a
// descriptor that cannot be read ends the scan with `error` set.
CompanyScan FindTavPaths(const std::string& pDrive);

}  // namespace zdr
