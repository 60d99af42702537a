// The per-user settings store on QtCore's QSettings: the registry on Windows, an INI file
// elsewhere (~/.config/ZDRLab/ZDRLab.conf on Linux), or a given INI file.
//
// Layout: a value lives in group "<app>/<section>" under its key, so the panel's sort key
// is "ZDRLab/Params/SortBy". Values are kept as strings; INI files are UTF-8, so Hebrew
// text survives as typed.
#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "control/settings.h"

class QSettings;

namespace zdr {

class QtSettingsStore : public SettingsStore {
 public:
  // The user's own store in the platform's native format (organisation and application
  // "ZDRLab").
  QtSettingsStore();
  // An INI file at `iniPath` (UTF-8 path); created on the first save.
  explicit QtSettingsStore(const std::string& iniPath);
  ~QtSettingsStore() override;

  QtSettingsStore(const QtSettingsStore&) = delete;
  QtSettingsStore& operator=(const QtSettingsStore&) = delete;

  std::string Get(std::string_view app, std::string_view section, std::string_view key,
                  std::string_view defaultValue) override;
  // Writes through to the file or registry at once, so another store on the same place
  // sees the value; throws SettingsStoreError when it cannot be written.
  void Save(std::string_view app, std::string_view section, std::string_view key,
            std::string_view value) override;

  // The file or registry path the values live in (UTF-8).
  std::string Location() const override;

 private:
  std::unique_ptr<QSettings> settings_;
};

}  // namespace zdr
