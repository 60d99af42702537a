// The lock that keeps two runs from sharing one temporary folder's working files.
//
// Every output command throws zdrlab.DB away and builds it again, then writes its page or
// dispatch file beside it; a second run with the same temporary folder would delete the
// database under the first one's feet. A run therefore holds WorkFilesLock from the
// database's creation to its last output, and the account picker holds it while it
// rebuilds and fills zdracc.DB. The lock is an exclusive lock on the file zdrlab.lock
// beside the databases (flock; on Windows, the file held open without sharing), so the
// system drops it when the process ends, however it ends. The lock file itself stays.
#pragma once

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <stdexcept>

namespace zdr {

inline constexpr const char* kWorkLockName = "zdrlab.lock";

// How long a run waits for another run of the same folder to finish before refusing.
inline constexpr std::chrono::milliseconds kWorkLockWait{3000};

// Another run holds the folder after the wait, or the lock file cannot be opened. what()
// is the Hebrew description shown to the user.
class WorkFilesLockError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class WorkFilesLock {
 public:
  // Takes the lock of `folder` (the temporary folder), waiting up to `wait` while another
  // run holds it. Throws WorkFilesLockError when it cannot be taken; nothing in the folder
  // but the lock file is touched. A symbolic link at the lock file's path is refused.
  explicit WorkFilesLock(const std::filesystem::path& folder,
                         std::chrono::milliseconds wait = kWorkLockWait);
  ~WorkFilesLock();
  WorkFilesLock(const WorkFilesLock&) = delete;
  WorkFilesLock& operator=(const WorkFilesLock&) = delete;

 private:
  intptr_t handle_;  // a file descriptor, or a Windows HANDLE
};

// The lock of TempFolder(). Nothing when there is no temporary folder: there is then nothing
// to hold, and the database creation reports the missing folder. Throws as the constructor.
std::optional<WorkFilesLock> LockWorkFiles();

}  // namespace zdr
