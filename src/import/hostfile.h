// Host record files: a plain run of fixed-length records, numbered from 1, read shared and
// never written. The file is mapped (or read in large blocks) once; records are views into
// it, so reading a record allocates nothing.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace zdr {

class HostFileError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Looks up `name` in `folder` without regard to case ("ACT.fix", "ACT.FIX" and "act.fix" are
// the same file). An exact match wins; otherwise the first entry whose name matches
// case-insensitively. Returns nothing when there is none or the folder cannot be listed.
std::optional<std::filesystem::path> FindFileNoCase(const std::filesystem::path& folder,
                                                    std::string_view name);

class HostRecordFile {
 public:
  // Opens `folder`/`name` (name matched without regard to case) for reading records of
  // `recordLength` bytes. Throws HostFileError with a readable message when the file is
  // missing or cannot be read.
  HostRecordFile(const std::filesystem::path& folder, std::string_view name,
                 size_t recordLength);
  // Opens an exact path.
  HostRecordFile(const std::filesystem::path& path, size_t recordLength);
  ~HostRecordFile();
  HostRecordFile(const HostRecordFile&) = delete;
  HostRecordFile& operator=(const HostRecordFile&) = delete;

  // File length / record length as a floating-point number.
  double Count() const { return static_cast<double>(size_) / static_cast<double>(recLen_); }
  // Number of whole records in the file; a trailing partial record is not counted.
  int64_t WholeRecords() const { return static_cast<int64_t>(size_ / recLen_); }
  size_t RecordLength() const { return recLen_; }
  uint64_t FileSize() const { return size_; }
  const std::filesystem::path& Path() const { return path_; }

  // The bytes of record n (1-based). Returns an empty view when record n is not wholly in
  // the file (beyond the end, or the partial last record), so a partial record is never
  // read as if whole. The view lives as long as this object.
  std::string_view Record(int64_t n) const;

 private:
  void OpenPath(const std::filesystem::path& path);

  std::filesystem::path path_;
  size_t recLen_;
  uint64_t size_ = 0;
  const char* data_ = nullptr;
  int fd_ = -1;
};

// Round to nearest, halves to even (the host's conversion of a count to a record number).
int64_t RoundHalfEven(double x);

}  // namespace zdr
