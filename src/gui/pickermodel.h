// The rows of tSelectAccount the account picker shows, as a table model for its grid.
#pragma once

#include <QAbstractTableModel>
#include <string>
#include <vector>

#include "select/picker.h"

namespace zdr::gui {

// The rows come from the account-selection database through ReadPickerRows, and a tick is
// written there as soon as it changes. Every statement opens the database anew; a failure
// leaves the rows as they were.
class PickerModel : public QAbstractTableModel {
 public:
  using Row = PickerRow;

  explicit PickerModel(QObject* parent = nullptr);

  // The database and the statement the rows come from; Refresh reads them.
  void SetSource(const std::string& dbPath, const std::string& recordSource);
  // Reruns the record source. Returns false (rows unchanged) when it fails.
  bool Refresh();
  // Runs a changing statement on the database. Returns false when it fails.
  bool Execute(const std::string& jetSql);
  // Ticks or unticks one row in the database and in the view.
  bool SetInclude(int row, bool include);

  const std::vector<Row>& Rows() const { return rows_; }
  const std::string& RecordSource() const { return recordSource_; }

  int rowCount(const QModelIndex& parent = QModelIndex()) const override;
  int columnCount(const QModelIndex& parent = QModelIndex()) const override;
  QVariant data(const QModelIndex& index, int role) const override;
  bool setData(const QModelIndex& index, const QVariant& value, int role) override;
  Qt::ItemFlags flags(const QModelIndex& index) const override;
  QVariant headerData(int section, Qt::Orientation orientation, int role) const override;

 private:
  std::string dbPath_;
  std::string recordSource_;
  std::vector<Row> rows_;
};

}  // namespace zdr::gui
