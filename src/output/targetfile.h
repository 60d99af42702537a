// The files the program writes where the user tells it to (the workbook, the label PDF, the
// calibration page, and any output added later): one check of the place before any work, and
// one writer that puts a complete file there or leaves the old one as it was.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace zdr {

// What is written at a target: each kind takes its own extensions.
enum class TargetKind {
  kWorkbook,  // .xlsx; .xls and .ods when LibreOffice is installed
  kPdf,       // .pdf
};

// Checks, before anything is loaded or written, that a file of `kind` may be written at
// `path` (UTF-8): it is not a folder; it is not inside any of `companyFolders` (the company
// in use and the one the settings keep; links resolved, empty entries ignored); it is not
// named as a host file (*.fix, a*.tmp); its extension is one `kind` takes; an existing file
// there is a regular file (not a FIFO or a device); its folder exists and may be written.
// Throws OutputError saying, in Hebrew, what is wrong.
void CheckOutputTarget(const std::string& path, TargetKind kind,
                       const std::vector<std::string>& companyFolders);

// A new file that takes the place of `target` only when it is complete.
//
// The contents are written into a file with no name in the target's folder (a hidden
// temporary name where the file system cannot make one without a name); Commit() puts it at
// `target` in one step, replacing a file or a link there (a link is replaced, never written
// through). Until then, and when the object is destroyed without Commit(), the old target
// stays as it was and nothing new is left behind. Creating the object also removes what a
// killed run writing the same target left in that folder; a leftover another live run is
// still writing is kept.
class ReplacingFile {
 public:
  // Who may read the new file: only its owner (files in the temporary folder, which hold the
  // customers' names), or as any new file of the user (the umask decides); in the second
  // case a file already at the target passes its permissions on.
  enum class Access { kOwnerOnly, kAsNewFile };

  // Throws OutputError (Hebrew) when no file can be made in the target's folder.
  explicit ReplacingFile(const std::filesystem::path& target, Access access = Access::kAsNewFile);
  ~ReplacingFile();
  ReplacingFile(const ReplacingFile&) = delete;
  ReplacingFile& operator=(const ReplacingFile&) = delete;

  // The new file, open for writing. Stays owned by this object.
  int fd() const { return fd_; }
  // A name that opens the new file, for a library that writes to a file name; valid until
  // Commit() or destruction.
  const std::string& writePath() const { return writePath_; }

  // Flushes the new file to disk and puts it at the target. Throws OutputError (Hebrew) when
  // that fails; the old target then stays as it was.
  void Commit();

 private:
  std::filesystem::path target_;
  std::filesystem::path named_;  // the temporary name, when the file has one
  std::string writePath_;
  int fd_ = -1;
};

// Removes the temporary files that runs killed while writing `target` left beside it: hidden
// ".<name>.XXXXXX" files, and "<name>.XXXXXX" PDF files of earlier versions. Only regular
// files of this user that no live run holds are removed. ReplacingFile calls it.
void RemoveLeftoversOf(const std::filesystem::path& target);

}  // namespace zdr
