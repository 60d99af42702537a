#include "gui/pickermodel.h"

#include <array>
#include <exception>

#include "gui/qtseam.h"

namespace zdr::gui {

namespace {
constexpr std::array<const char*, 3> kPickerCaptions{"מפתח חשבון", "שם חשבון", "להדפיס?"};
constexpr int kIncludeColumn = 2;
}  // namespace

PickerModel::PickerModel(QObject* parent) : QAbstractTableModel(parent) {}

void PickerModel::SetSource(const std::string& dbPath, const std::string& recordSource) {
  dbPath_ = dbPath;
  recordSource_ = recordSource;
}

bool PickerModel::Refresh() {
  std::vector<Row> rows;
  try {
    rows = ReadPickerRows(dbPath_, recordSource_);
  } catch (const std::exception&) {
    return false;
  }
  beginResetModel();
  rows_ = std::move(rows);
  endResetModel();
  return true;
}

bool PickerModel::Execute(const std::string& jetSql) {
  try {
    ExecutePickerSQL(dbPath_, jetSql);
    return true;
  } catch (const std::exception&) {
    return false;
  }
}

bool PickerModel::SetInclude(int row, bool include) {
  if (row < 0 || row >= static_cast<int>(rows_.size())) return false;
  if (!Execute(BuildSetIncludeSQL(rows_[row].key, include))) return false;
  rows_[row].include = include;
  const QModelIndex at = index(row, kIncludeColumn);
  emit dataChanged(at, at, {Qt::CheckStateRole});
  return true;
}

int PickerModel::rowCount(const QModelIndex& parent) const {
  return parent.isValid() ? 0 : static_cast<int>(rows_.size());
}

int PickerModel::columnCount(const QModelIndex& parent) const {
  return parent.isValid() ? 0 : 3;
}

QVariant PickerModel::data(const QModelIndex& index, int role) const {
  if (!index.isValid() || index.row() >= static_cast<int>(rows_.size())) return {};
  const Row& r = rows_[index.row()];
  switch (index.column()) {
    case 0:
      if (role == Qt::DisplayRole) return ToQ(r.key);
      break;
    case 1:
      if (role == Qt::DisplayRole) return ToQ(r.name);
      break;
    case kIncludeColumn:
      if (role == Qt::CheckStateRole) return r.include ? Qt::Checked : Qt::Unchecked;
      break;
  }
  return {};
}

bool PickerModel::setData(const QModelIndex& index, const QVariant& value, int role) {
  if (!index.isValid() || index.column() != kIncludeColumn || role != Qt::CheckStateRole) {
    return false;
  }
  return SetInclude(index.row(), value.toInt() == Qt::Checked);
}

Qt::ItemFlags PickerModel::flags(const QModelIndex& index) const {
  Qt::ItemFlags f = Qt::ItemIsEnabled | Qt::ItemIsSelectable;
  if (index.column() == kIncludeColumn) f |= Qt::ItemIsUserCheckable;
  return f;
}

QVariant PickerModel::headerData(int section, Qt::Orientation orientation, int role) const {
  if (role != Qt::DisplayRole) return {};
  if (orientation == Qt::Vertical) return section + 1;
  if (section >= 0 && section < 3) return ToQ(kPickerCaptions[section]);
  return {};
}

}  // namespace zdr::gui
