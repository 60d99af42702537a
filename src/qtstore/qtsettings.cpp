#include "qtstore/qtsettings.h"

#include <QSettings>
#include <QString>
#include <QStringList>
#include <QVariant>

namespace zdr {

namespace {

QString FromUtf8(std::string_view text) {
  return QString::fromUtf8(text.data(), static_cast<qsizetype>(text.size()));
}

QString ValueKey(std::string_view app, std::string_view section, std::string_view key) {
  return FromUtf8(app) + u'/' + FromUtf8(section) + u'/' + FromUtf8(key);
}

}  // namespace

QtSettingsStore::QtSettingsStore()
    : settings_(std::make_unique<QSettings>(QSettings::NativeFormat, QSettings::UserScope,
                                            QStringLiteral("ZDRLab"), QStringLiteral("ZDRLab"))) {}

QtSettingsStore::QtSettingsStore(const std::string& iniPath)
    : settings_(
          std::make_unique<QSettings>(QString::fromStdString(iniPath), QSettings::IniFormat)) {}

QtSettingsStore::~QtSettingsStore() = default;

std::string QtSettingsStore::Get(std::string_view app, std::string_view section,
                                 std::string_view key, std::string_view defaultValue) {
  const QVariant value = settings_->value(ValueKey(app, section, key));
  if (!value.isValid()) return std::string(defaultValue);
  // An INI value edited by hand with an unquoted comma reads back as a list; keep it whole.
  if (value.typeId() == QMetaType::QStringList) {
    return value.toStringList().join(u',').toStdString();
  }
  return value.toString().toStdString();
}

void QtSettingsStore::Save(std::string_view app, std::string_view section, std::string_view key,
                           std::string_view value) {
  settings_->setValue(ValueKey(app, section, key), FromUtf8(value));
  settings_->sync();
  if (settings_->status() != QSettings::NoError) {
    throw SettingsStoreError("לא ניתן לשמור את ההגדרות ב-" + Location());
  }
}

std::string QtSettingsStore::Location() const {
  return settings_->fileName().toStdString();
}

}  // namespace zdr
