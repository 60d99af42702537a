// A throw-away folder that stands in as the temporary folder (the Temp variable) for one
// test, removed with everything in it afterwards.
#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>

namespace zdr::test {

// Sets an environment variable (unsets it for nullptr) for the life of the object.
class ScopedEnv {
 public:
  ScopedEnv(const char* name, const char* value) : name_(name) {
    if (const char* old = std::getenv(name)) old_ = old;
    value ? ::setenv(name, value, 1) : ::unsetenv(name);
  }
  ~ScopedEnv() { old_ ? ::setenv(name_, old_->c_str(), 1) : ::unsetenv(name_); }
  ScopedEnv(const ScopedEnv&) = delete;
  ScopedEnv& operator=(const ScopedEnv&) = delete;

 private:
  const char* name_;
  std::optional<std::string> old_;
};

class ScratchTemp {
 public:
  ScratchTemp() : dir_(Make()), temp_("Temp", dir_.c_str()) {}
  ~ScratchTemp() {
    std::error_code ec;
    std::filesystem::remove_all(dir_, ec);
  }
  const std::filesystem::path& dir() const { return dir_; }

 private:
  static std::filesystem::path Make() {
    std::string pattern = (std::filesystem::temp_directory_path() / "zdr_test_XXXXXX").string();
    if (::mkdtemp(pattern.data()) == nullptr) ADD_FAILURE() << "no scratch folder";
    return pattern;
  }
  std::filesystem::path dir_;
  ScopedEnv temp_;
};

}  // namespace zdr::test
