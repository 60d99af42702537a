#include "workdb/worklock.h"

#include <cerrno>
#include <cstring>
#include <string>
#include <system_error>
#include <thread>

#ifdef _WIN32
#include <windows.h>
#else
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>
#endif

#include "workdb/schema.h"

namespace zdr {
namespace {

constexpr std::chrono::milliseconds kRetryEvery{50};

std::string BusyText(const std::filesystem::path& folder) {
  return "קבצי העבודה בתיקייה " + folder.string() +
         " תפוסים בידי הפעלה אחרת של התוכנה. יש לנסות שוב כשהיא תסתיים";
}

std::string OpenFailedText(const std::filesystem::path& lockFile, const std::string& why) {
  return "לא ניתן לפתוח את קובץ הנעילה " + lockFile.string() + ": " + why;
}

}  // namespace

#ifdef _WIN32

WorkFilesLock::WorkFilesLock(const std::filesystem::path& folder, std::chrono::milliseconds wait)
    : handle_(0) {
  const std::filesystem::path lockFile = folder / kWorkLockName;
  const auto deadline = std::chrono::steady_clock::now() + wait;
  while (true) {
    // No sharing: while this handle is open, every other open of the file fails.
    HANDLE h = CreateFileW(lockFile.c_str(), GENERIC_READ | GENERIC_WRITE, 0, nullptr, OPEN_ALWAYS,
                           FILE_ATTRIBUTE_NORMAL, nullptr);
    if (h != INVALID_HANDLE_VALUE) {
      handle_ = reinterpret_cast<intptr_t>(h);
      return;
    }
    const DWORD err = GetLastError();
    if (err != ERROR_SHARING_VIOLATION && err != ERROR_LOCK_VIOLATION) {
      throw WorkFilesLockError(OpenFailedText(lockFile, "שגיאה " + std::to_string(err)));
    }
    if (std::chrono::steady_clock::now() >= deadline) throw WorkFilesLockError(BusyText(folder));
    std::this_thread::sleep_for(kRetryEvery);
  }
}

WorkFilesLock::~WorkFilesLock() {
  CloseHandle(reinterpret_cast<HANDLE>(handle_));
}

#else

WorkFilesLock::WorkFilesLock(const std::filesystem::path& folder, std::chrono::milliseconds wait)
    : handle_(-1) {
  const std::filesystem::path lockFile = folder / kWorkLockName;
  const int fd = ::open(lockFile.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600);
  if (fd < 0) throw WorkFilesLockError(OpenFailedText(lockFile, std::strerror(errno)));
  const auto deadline = std::chrono::steady_clock::now() + wait;
  while (::flock(fd, LOCK_EX | LOCK_NB) != 0) {
    const int err = errno;
    if (err == EINTR) continue;
    if (err != EWOULDBLOCK || std::chrono::steady_clock::now() >= deadline) {
      ::close(fd);
      if (err != EWOULDBLOCK)
        throw WorkFilesLockError(OpenFailedText(lockFile, std::strerror(err)));
      throw WorkFilesLockError(BusyText(folder));
    }
    std::this_thread::sleep_for(kRetryEvery);
  }
  handle_ = fd;
}

WorkFilesLock::~WorkFilesLock() {
  // Closing the only descriptor of the open file releases the lock.
  ::close(static_cast<int>(handle_));
}

#endif

std::optional<WorkFilesLock> LockWorkFiles() {
  const std::filesystem::path folder = TempFolder();
  std::error_code ec;
  if (folder.empty() || !std::filesystem::is_directory(folder, ec)) return std::nullopt;
  return std::optional<WorkFilesLock>(std::in_place, folder);
}

}  // namespace zdr
