#include "output/targetfile.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cctype>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <random>
#include <string_view>

#include "output/outputinternal.h"

namespace zdr {
namespace {

namespace fs = std::filesystem;

using output_internal::LowerAscii;
using output_internal::PathFromUtf8;
using output_internal::ResolvedPath;

bool EndsWith(std::string_view text, std::string_view tail) {
  return text.size() >= tail.size() && text.substr(text.size() - tail.size()) == tail;
}

bool IsWithin(const fs::path& path, const fs::path& folder) {
  auto p = path.begin();
  for (auto f = folder.begin(); f != folder.end(); ++f, ++p) {
    if (f->empty() && std::next(f) == folder.end()) break;  // a trailing separator
    if (p == path.end() || *p != *f) return false;
  }
  return true;
}

// The names the host accounting system gives its files: record files "*.fix" (ACT.fix,
// ADF.FIX, amv.fix ...) and the temporary batches "a*.tmp".
bool IsHostFileName(const fs::path& p) {
  const std::string name = LowerAscii(p.filename().string());
  return EndsWith(name, ".fix") || (name.size() > 5 && name[0] == 'a' && EndsWith(name, ".tmp"));
}

// The extension a kind is asked for when the given one will not do.
const char* Suggested(TargetKind kind) {
  return kind == TargetKind::kPdf ? ".pdf" : ".xlsx";
}

// Whether `kind` is written with extension `ext` (lower case, with its dot). Throws for an
// extension the kind takes only with a program that is not installed.
bool TakesExtension(TargetKind kind, const std::string& ext, const fs::path& target) {
  if (kind == TargetKind::kPdf) return ext == ".pdf";
  if (ext == ".xlsx") return true;
  if (ext != ".xls" && ext != ".ods") return false;
  if (!output_internal::OfficeConverterInstalled()) {
    throw OutputError("לא נמצאה תוכנה שממירה לתבנית " + target.extension().string() +
                      ". יש לבחור קובץ פלט שסיומתו .xlsx");
  }
  return true;
}

// ".<name>.", the start of a hidden temporary name beside `target`.
std::string HiddenPrefix(const fs::path& target) {
  std::string name(1, '.');
  name += target.filename().string();
  name += '.';
  return name;
}

// A hidden temporary name beside `target`: ".<name>.XXXXXX", the X letters and digits.
fs::path TemporaryName(const fs::path& target) {
  static const char kChars[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
  thread_local std::mt19937 random{std::random_device{}()};
  std::uniform_int_distribution<size_t> pick(0, sizeof kChars - 2);
  std::string name = HiddenPrefix(target);
  for (int i = 0; i < 6; ++i) name += kChars[pick(random)];
  return target.parent_path() / name;
}

// Six letters or digits: the tail mkstemp and TemporaryName give a temporary name.
bool IsTemporaryTail(std::string_view tail) {
  if (tail.size() != 6) return false;
  for (const char c : tail) {
    if (!std::isalnum(static_cast<unsigned char>(c))) return false;
  }
  return true;
}

// Puts the finished file `from` at `target` in one step, replacing what is there.
// The one place a file takes its target's name: on Windows, where a rename does not replace
// an existing file, the replacing move belongs here.
void PutInPlace(const fs::path& from, const fs::path& target) {
  if (std::rename(from.c_str(), target.c_str()) != 0) {
    throw OutputError("לא ניתן לשמור את הקובץ " + target.string() + ": " + std::strerror(errno));
  }
}

}  // namespace

namespace output_internal {

std::string LowerAscii(std::string s) {
  for (char& c : s) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return s;
}

fs::path PathFromUtf8(const std::string& s) {
  return fs::path(std::u8string(s.begin(), s.end()));
}

fs::path ResolvedPath(const fs::path& p) {
  std::error_code ec;
  fs::path abs = fs::absolute(p, ec);
  if (ec) return p.lexically_normal();
  fs::path canon = fs::weakly_canonical(abs, ec);
  return ec ? abs.lexically_normal() : canon;
}

}  // namespace output_internal

void CheckOutputTarget(const std::string& path, TargetKind kind,
                       const std::vector<std::string>& companyFolders) {
  if (path.empty()) throw OutputError("לא הוגדר קובץ פלט");
  const fs::path target = PathFromUtf8(path);
  const fs::path resolved = ResolvedPath(target);
  std::error_code ec;
  const fs::file_status st = fs::status(resolved, ec);
  if (fs::is_directory(st)) {
    throw OutputError("קובץ הפלט " + path + " הוא תיקייה. יש לבחור שם של קובץ");
  }
  for (const std::string& company : companyFolders) {
    if (!company.empty() && IsWithin(resolved, ResolvedPath(PathFromUtf8(company)))) {
      throw OutputError("קובץ הפלט " + path +
                        " נמצא בתיקיית החברה. יש לבחור קובץ פלט מחוץ לתיקיית הנהלת החשבונות");
    }
  }
  if (IsHostFileName(resolved) || IsHostFileName(target)) {
    throw OutputError("קובץ הפלט " + path +
                      " הוא בשם של קובץ הנהלת חשבונות. יש לבחור קובץ פלט שסיומתו " +
                      Suggested(kind));
  }
  const std::string ext = LowerAscii(target.extension().string());
  if (ext.size() < 2) {
    throw OutputError("לקובץ הפלט " + path + " אין סיומת. יש לבחור קובץ פלט שסיומתו " +
                      Suggested(kind));
  }
  if (!TakesExtension(kind, ext, target)) {
    throw OutputError(kind == TargetKind::kPdf
                          ? "לא ניתן לכתוב קובץ PDF בתבנית " + target.extension().string() +
                                ". יש לבחור קובץ פלט שסיומתו .pdf"
                          : "לא ניתן לכתוב גיליון עבודה בתבנית " + target.extension().string() +
                                ". יש לבחור קובץ פלט שסיומתו .xlsx, .xls או .ods");
  }
  if (fs::exists(st) && !fs::is_regular_file(st)) {
    throw OutputError("קובץ הפלט " + path +
                      " אינו קובץ רגיל (למשל צינור או התקן). יש לבחור שם של קובץ אחר");
  }
  if (!fs::is_directory(resolved.parent_path(), ec)) {
    throw OutputError("התיקייה של קובץ הפלט " + path + " לא נמצאה");
  }
  if (::access(resolved.parent_path().c_str(), W_OK | X_OK) != 0) {
    throw OutputError("אין הרשאה לכתוב בתיקייה של קובץ הפלט " + path);
  }
}

void RemoveLeftoversOf(const fs::path& target) {
  const std::string name = target.filename().string();
  if (name.empty()) return;
  const fs::path folder = target.parent_path().empty() ? fs::path(".") : target.parent_path();
  DIR* dir = ::opendir(folder.c_str());
  if (dir == nullptr) return;
  const std::string hidden = HiddenPrefix(target);
  const std::string plain = name + ".";
  while (const dirent* e = ::readdir(dir)) {
    const std::string_view entry = e->d_name;
    const bool isHidden = entry.starts_with(hidden) && IsTemporaryTail(entry.substr(hidden.size()));
    // Earlier versions wrote the PDF as "<name>.XXXXXX", private, starting "%PDF-".
    const bool isOldPdf = !isHidden && entry.starts_with(plain) &&
                          IsTemporaryTail(entry.substr(plain.size())) &&
                          EndsWith(LowerAscii(name), ".pdf");
    if (!isHidden && !isOldPdf) continue;
    const fs::path leftover = folder / std::string(entry);
    const int fd = ::open(leftover.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) continue;
    struct stat st {};
    bool remove = ::fstat(fd, &st) == 0 && S_ISREG(st.st_mode) && st.st_uid == ::geteuid() &&
                  ::flock(fd, LOCK_EX | LOCK_NB) == 0;  // a live run holds its file locked
    if (remove && isOldPdf) {
      char head[5] = {};
      const ssize_t n = ::read(fd, head, sizeof head);
      remove = (st.st_mode & 07777) == 0600 &&
               (n == 0 || (n == 5 && std::string_view(head, 5) == "%PDF-"));
    }
    if (remove) ::unlink(leftover.c_str());
    ::close(fd);
  }
  ::closedir(dir);
}

ReplacingFile::ReplacingFile(const fs::path& target, Access access) : target_(target) {
  const fs::path folder = target.parent_path().empty() ? fs::path(".") : target.parent_path();
  RemoveLeftoversOf(target);
  mode_t mode = 0600;
  if (access == Access::kAsNewFile) {
    struct stat old {};
    if (::stat(target.c_str(), &old) == 0 && S_ISREG(old.st_mode)) {
      mode = old.st_mode & 0777;
    } else {
      const mode_t mask = ::umask(0);
      ::umask(mask);
      mode = 0666 & ~mask;
    }
  }
#ifdef O_TMPFILE
  // A file with no name: a run killed while writing it leaves nothing behind.
  fd_ = ::open(folder.c_str(), O_TMPFILE | O_WRONLY | O_CLOEXEC, 0600);
  if (fd_ >= 0) {
    writePath_ = "/proc/self/fd/" + std::to_string(fd_);
    if (::access(writePath_.c_str(), W_OK) != 0) {  // no /proc: it could not be named later
      ::close(fd_);
      fd_ = -1;
    }
  }
#endif
  if (fd_ < 0) {
    // Where the file system cannot: a hidden name, locked while this run writes it, so that
    // another run cleaning leftovers keeps it.
    std::string pattern = (folder / (HiddenPrefix(target) + "XXXXXX")).string();
    fd_ = ::mkostemp(pattern.data(), O_CLOEXEC);
    if (fd_ < 0) {
      throw OutputError("לא ניתן ליצור קובץ בתיקייה של " + target.string() + ": " +
                        std::strerror(errno));
    }
    named_ = pattern;
    writePath_ = pattern;
  }
  ::flock(fd_, LOCK_EX | LOCK_NB);
  ::fchmod(fd_, mode);
}

ReplacingFile::~ReplacingFile() {
  if (fd_ >= 0) ::close(fd_);
  if (!named_.empty()) ::unlink(named_.c_str());
}

void ReplacingFile::Commit() {
  if (::fsync(fd_) != 0 && errno != EINVAL) {
    throw OutputError("כתיבת הקובץ " + target_.string() + " נכשלה: " + std::strerror(errno));
  }
  if (named_.empty()) {
    // The file gets a hidden name for the moment of the replacing rename.
    for (int attempt = 0; named_.empty(); ++attempt) {
      const fs::path name = TemporaryName(target_);
      if (::linkat(AT_FDCWD, writePath_.c_str(), AT_FDCWD, name.c_str(), AT_SYMLINK_FOLLOW) == 0) {
        named_ = name;
      } else if (errno != EEXIST || attempt > 100) {
        throw OutputError("לא ניתן לשמור את הקובץ " + target_.string() + ": " +
                          std::strerror(errno));
      }
    }
  }
  PutInPlace(named_, target_);
  named_.clear();
  ::close(fd_);
  fd_ = -1;
}

}  // namespace zdr
