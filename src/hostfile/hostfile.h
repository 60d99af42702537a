// Host record files: a plain run of fixed-length records, numbered from 1, read shared and
// never written or locked (the host accounting system may have them open meanwhile). Records
// are read through a window of whole records that is refilled with one positioned read when
// a record leaves it, so a sequential scan reads in large blocks and allocates nothing per
// record. The file is not mapped: a host that truncates the file during a scan makes the
// missing records read as empty instead of faulting.
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

// Looks up the file `name` in `folder` without regard to ASCII case ("ACT.fix", "ACT.FIX" and
// "act.fix" are the same file). An exact match wins; otherwise, of the entries whose names
// match case-insensitively, the one that sorts first by bytes (so the choice does not depend
// on the directory's listing order). Only regular files (or links to them) are matched, never
// folders, FIFOs or devices. A leading "\" or "/" on
// `name` (the host's "\ACT.fix" form) is ignored. Returns nothing when there is no such file
// or the folder cannot be listed.
std::optional<std::filesystem::path> FindFileNoCase(const std::filesystem::path& folder,
                                                    std::string_view name);

class HostRecordFile {
 public:
  // Opens `folder`/`name` (name found by FindFileNoCase) for reading records of
  // `recordLength` bytes (at least 1). Throws HostFileError with a message naming the file
  // when it is missing, cannot be read or is not a regular file (a FIFO is refused at once,
  // never waited on). The length is taken once, at opening.
  HostRecordFile(const std::filesystem::path& folder, std::string_view name, size_t recordLength);
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
  // the file (n < 1, beyond the end, the partial last record, or a record the host cut off
  // since the file was opened), so a partial record is never read as if whole. Throws
  // HostFileError on a read error. Not safe for concurrent use of one object.
  //
  // The view is valid until the next call of Record, with one relaxation that scans rely
  // on: in a scan that reads records in increasing order, the view of record n stays valid
  // until a record beyond n + ReadAheadRecords() is read, so a document header may be held
  // while its lines are read.
  std::string_view Record(int64_t n) const;

  // Records per read block (at least 1; 6168 for 170-byte records).
  int64_t ReadAheadRecords() const;

 private:
  // A block of whole records: records first .. first + count - 1 are in bytes.
  struct Window {
    std::string bytes;
    int64_t first = 0;
    int64_t count = 0;
    bool Holds(int64_t n) const { return n >= first && n < first + count; }
  };

  void OpenPath(const std::filesystem::path& path);
  // Reads the block that starts at record n into `w`; false when nothing whole was read.
  bool Fill(Window& w, int64_t n) const;

  std::filesystem::path path_;
  size_t recLen_;
  uint64_t size_ = 0;
  int fd_ = -1;
  // Two blocks, refilled in turn, so the block read last before a refill survives it.
  mutable Window windows_[2];
  mutable int newest_ = 0;
};

// Round to nearest, halves to even (the host's conversion of a count to a record number),
// whatever the floating-point rounding mode. NaN gives 0; values beyond int64 saturate.
int64_t RoundHalfEven(double x);

}  // namespace zdr
