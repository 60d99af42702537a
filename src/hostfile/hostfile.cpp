#include "hostfile/hostfile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <limits>
#include <system_error>

namespace zdr {
namespace {

// About a mebibyte of whole records per positioned read.
constexpr size_t kWindowBytes = size_t{1} << 20;

bool SameNoCase(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return false;
  for (size_t i = 0; i < a.size(); ++i) {
    unsigned char x = static_cast<unsigned char>(a[i]);
    unsigned char y = static_cast<unsigned char>(b[i]);
    if (x >= 'A' && x <= 'Z') x = static_cast<unsigned char>(x - 'A' + 'a');
    if (y >= 'A' && y <= 'Z') y = static_cast<unsigned char>(y - 'A' + 'a');
    if (x != y) return false;
  }
  return true;
}

std::string_view StripLeadingSeparators(std::string_view name) {
  while (!name.empty() && (name.front() == '\\' || name.front() == '/')) name.remove_prefix(1);
  return name;
}

// A regular file, or a link to one. A FIFO or a device is not a host file: reading one
// could wait forever.
bool IsFileEntry(const std::filesystem::path& p) {
  std::error_code ec;
  auto st = std::filesystem::status(p, ec);
  return !ec && std::filesystem::is_regular_file(st);
}

std::string ErrnoText(int err) {
  return std::generic_category().message(err);
}

}  // namespace

std::optional<std::filesystem::path> FindFileNoCase(const std::filesystem::path& folder,
                                                    std::string_view name) {
  name = StripLeadingSeparators(name);
  if (name.empty()) return std::nullopt;
  std::filesystem::path exact = folder / std::filesystem::path(std::string(name));
  if (IsFileEntry(exact)) return exact;

  std::error_code ec;
  std::filesystem::directory_iterator it(folder, ec);
  if (ec) return std::nullopt;
  std::optional<std::filesystem::path> best;
  std::string bestName;
  for (; it != std::filesystem::directory_iterator(); it.increment(ec)) {
    if (ec) break;
    std::string entry = it->path().filename().string();
    if (!SameNoCase(entry, name) || !IsFileEntry(it->path())) continue;
    if (!best || entry < bestName) {
      best = it->path();
      bestName = std::move(entry);
    }
  }
  return best;
}

HostRecordFile::HostRecordFile(const std::filesystem::path& folder, std::string_view name,
                               size_t recordLength)
    : recLen_(recordLength) {
  std::optional<std::filesystem::path> found = FindFileNoCase(folder, name);
  if (!found) {
    path_ = folder / std::filesystem::path(std::string(StripLeadingSeparators(name)));
    throw HostFileError("הקובץ " + path_.string() + " לא נמצא");
  }
  OpenPath(*found);
}

HostRecordFile::HostRecordFile(const std::filesystem::path& path, size_t recordLength)
    : recLen_(recordLength) {
  OpenPath(path);
}

HostRecordFile::~HostRecordFile() {
  if (fd_ >= 0) ::close(fd_);
}

void HostRecordFile::OpenPath(const std::filesystem::path& path) {
  path_ = path;
  if (recLen_ == 0) throw HostFileError("אורך רשומה 0 בקובץ " + path_.string());
  // Read-only and without any lock: the host may hold the file open and write it.
  // Non-blocking, so that opening a FIFO put in a file's place returns at once; it is then
  // refused below. Regular files ignore the flag.
  fd_ = ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
  if (fd_ < 0) {
    int err = errno;
    if (err == ENOENT) throw HostFileError("הקובץ " + path_.string() + " לא נמצא");
    throw HostFileError("לא ניתן לפתוח את הקובץ " + path_.string() + ": " + ErrnoText(err));
  }
  struct stat st {};
  if (::fstat(fd_, &st) != 0) {
    int err = errno;
    ::close(fd_);
    fd_ = -1;
    throw HostFileError("לא ניתן לקרוא את הקובץ " + path_.string() + ": " + ErrnoText(err));
  }
  if (S_ISDIR(st.st_mode)) {
    ::close(fd_);
    fd_ = -1;
    throw HostFileError("הנתיב " + path_.string() + " הוא תיקייה ולא קובץ");
  }
  if (!S_ISREG(st.st_mode)) {
    ::close(fd_);
    fd_ = -1;
    throw HostFileError("לא ניתן לקרוא את הקובץ " + path_.string() + ": אינו קובץ רגיל");
  }
  size_ = static_cast<uint64_t>(st.st_size);
}

int64_t HostRecordFile::ReadAheadRecords() const {
  return static_cast<int64_t>(std::max<size_t>(1, kWindowBytes / recLen_));
}

bool HostRecordFile::Fill(Window& w, int64_t n) const {
  const int64_t whole = WholeRecords();
  const int64_t perWindow = ReadAheadRecords();
  const int64_t want = std::min(perWindow, whole - n + 1);
  const size_t bytes = static_cast<size_t>(want) * recLen_;
  if (w.bytes.size() < bytes) {
    // Sized once for the file: a whole block, or the whole file when it is smaller.
    w.bytes.resize(static_cast<size_t>(std::min(perWindow, whole)) * recLen_);
  }
  const off_t start = static_cast<off_t>(n - 1) * static_cast<off_t>(recLen_);
  size_t got = 0;
  w.count = 0;
  while (got < bytes) {
    ssize_t r = ::pread(fd_, w.bytes.data() + got, bytes - got, start + static_cast<off_t>(got));
    if (r < 0) {
      if (errno == EINTR) continue;
      int err = errno;
      throw HostFileError("שגיאה בקריאת הקובץ " + path_.string() + ": " + ErrnoText(err));
    }
    if (r == 0) break;  // the host cut the file since it was opened
    got += static_cast<size_t>(r);
  }
  w.first = n;
  w.count = static_cast<int64_t>(got / recLen_);
  return w.count > 0;
}

std::string_view HostRecordFile::Record(int64_t n) const {
  if (n < 1 || n > WholeRecords()) return {};
  const Window* w = nullptr;
  if (windows_[newest_].Holds(n)) {
    w = &windows_[newest_];
  } else if (windows_[1 - newest_].Holds(n)) {
    w = &windows_[1 - newest_];
  } else {
    // Refill the block filled earlier: the newest one holds what a scan may still hold.
    newest_ = 1 - newest_;
    if (!Fill(windows_[newest_], n)) return {};
    w = &windows_[newest_];
  }
  return std::string_view(w->bytes.data() + static_cast<size_t>(n - w->first) * recLen_, recLen_);
}

int64_t RoundHalfEven(double x) {
  if (std::isnan(x)) return 0;
  if (x >= 9.2233720368547758e18) return std::numeric_limits<int64_t>::max();
  if (x <= -9.2233720368547758e18) return std::numeric_limits<int64_t>::min();
  double lower = std::floor(x);
  double diff = x - lower;
  int64_t base = static_cast<int64_t>(lower);
  if (diff > 0.5) return base + 1;
  if (diff < 0.5) return base;
  return (base % 2 == 0) ? base : base + 1;
}

}  // namespace zdr
