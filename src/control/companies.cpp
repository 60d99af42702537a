#include "control/companies.h"

#include <algorithm>
#include <fstream>
#include <system_error>

#include "hostfile/hostfile.h"
#include "hosttext/codepage.h"
#include "hosttext/hosttext.h"

namespace zdr {

namespace fs = std::filesystem;

std::vector<size_t> CompanyScan::Listed() const {
  std::vector<size_t> out;
  for (size_t i = 0; i < entries.size(); ++i) {
    if (!entries[i].Name.empty()) out.push_back(i);
  }
  return out;
}

namespace {

// The name field of a descriptor, as Windows-1255 bytes in reading order, trimmed.
std::string ReadCompanyName(const fs::path& descriptor) {
  std::ifstream in(descriptor, std::ios::binary);
  if (!in) throw HostFileError("לא ניתן לפתוח את הקובץ " + descriptor.string());
  char buf[kAdfNameWidth];
  in.read(buf, sizeof buf);
  if (in.bad()) throw HostFileError("לא ניתן לקרוא את הקובץ " + descriptor.string());
  std::string_view field(buf, static_cast<size_t>(in.gcount()));
  // The host pads with blanks and sometimes ends a short name with a null.
  field = CutAtNull(field);
  return std::string(TrimSpaces(ConvertSpaced(field)));
}

// Folder names as a file manager lists them: letters without regard to case, then bytes.
bool FolderNameLess(const std::string& a, const std::string& b) {
  const auto folded = [](std::string s) {
    for (char& c : s)
      if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return s;
  };
  const std::string fa = folded(a);
  const std::string fb = folded(b);
  return fa != fb ? fa < fb : a < b;
}

}  // namespace

CompanyScan FindTavPaths(const std::string& pDrive) {
  CompanyScan scan;
  std::string base = pDrive;
  if (base.empty() || (base.back() != '/' && base.back() != '\\')) base += '/';

  std::vector<std::string> folders;
  try {
    std::error_code ec;
    fs::directory_iterator it(fs::path(base), ec);
    if (ec) throw fs::filesystem_error("לא ניתן לקרוא את המחיצה " + base, ec);
    for (; it != fs::directory_iterator(); it.increment(ec)) {
      if (ec) throw fs::filesystem_error("לא ניתן לקרוא את המחיצה " + base, ec);
      std::error_code dirEc;
      if (!it->is_directory(dirEc)) continue;
      std::string name = it->path().filename().string();
      if (name == "." || name == "..") continue;
      folders.push_back(std::move(name));
    }
    // The listing's own order is the file system's; the clerk looks for folders by name.
    std::sort(folders.begin(), folders.end(), FolderNameLess);

    for (const std::string& name : folders) {
      std::string path = base + name;
      auto descriptor = FindFileNoCase(fs::path(path), "ADF.FIX");
      if (!descriptor) continue;
      CompanyEntry entry;
      entry.Path = path;
      entry.Name = Win1255ToUtf8(ReadCompanyName(*descriptor));
      scan.entries.push_back(std::move(entry));
    }
  } catch (const std::exception& e) {
    scan.error = e.what();
  }
  return scan;
}

}  // namespace zdr
