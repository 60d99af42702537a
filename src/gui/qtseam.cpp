#include "gui/qtseam.h"

#include <QAbstractButton>
#include <QApplication>
#include <QDesktopServices>
#include <QFileDialog>
#include <QLabel>
#include <QMessageBox>
#include <QProgressBar>
#include <QUrl>
#include <algorithm>

namespace zdr::gui {

QString ToQ(std::string_view utf8) {
  return QString::fromUtf8(utf8.data(), static_cast<qsizetype>(utf8.size()));
}

std::string FromQ(const QString& text) {
  return text.toUtf8().toStdString();
}

QFont HebrewUiFont() {
  QFont font;
  font.setFamilies(
      {QStringLiteral("Miriam CLM"), QStringLiteral("Simple CLM"), QStringLiteral("DejaVu Sans")});
  font.setPointSize(11);
  return font;
}

void ApplyHebrewLook(QWidget& widget) {
  widget.setLayoutDirection(Qt::RightToLeft);
  widget.setFont(HebrewUiFont());
}

namespace {

QMessageBox::Icon ToQtIcon(MsgIcon icon) {
  switch (icon) {
    case MsgIcon::Critical:
      return QMessageBox::Critical;
    case MsgIcon::Question:
      return QMessageBox::Question;
    case MsgIcon::Exclamation:
      return QMessageBox::Warning;
    case MsgIcon::Information:
      return QMessageBox::Information;
  }
  return QMessageBox::NoIcon;
}

// The window a message belongs to: the modal dialog in front, else the active window.
QWidget* MessageParent() {
  if (QWidget* w = QApplication::activeModalWidget()) return w;
  return QApplication::activeWindow();
}

}  // namespace

void MessageBoxPrompter::ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) {
  QMessageBox box(ToQtIcon(icon), ToQ(title), ToQ(text), QMessageBox::Ok, MessageParent());
  box.setLayoutDirection(Qt::RightToLeft);
  box.button(QMessageBox::Ok)->setText(QStringLiteral("אישור"));
  box.exec();
}

bool MessageBoxPrompter::AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) {
  QMessageBox box(ToQtIcon(icon), ToQ(title), ToQ(text), QMessageBox::Yes | QMessageBox::No,
                  MessageParent());
  box.setLayoutDirection(Qt::RightToLeft);
  box.button(QMessageBox::Yes)->setText(QStringLiteral("כן"));
  box.button(QMessageBox::No)->setText(QStringLiteral("לא"));
  box.setDefaultButton(QMessageBox::Yes);
  return box.exec() == QMessageBox::Yes;
}

bool SystemDesktopOpener::OpenPage(const std::string& path) {
  return QDesktopServices::openUrl(QUrl::fromLocalFile(ToQ(path)));
}

bool SystemDesktopOpener::OpenWorkbook(const std::string& path) {
  return QDesktopServices::openUrl(QUrl::fromLocalFile(ToQ(path)));
}

QString QtFileChooser::ChooseOpenFile(QWidget* parent, const QString& title,
                                      const QStringList& filters, int selectedFilter,
                                      const QString& startPath) {
  QFileDialog dialog(parent, title, startPath);
  dialog.setLayoutDirection(Qt::RightToLeft);
  dialog.setAcceptMode(QFileDialog::AcceptOpen);
  dialog.setFileMode(QFileDialog::AnyFile);
  dialog.setNameFilters(filters);
  if (selectedFilter >= 0 && selectedFilter < filters.size()) {
    dialog.selectNameFilter(filters.at(selectedFilter));
  }
  if (dialog.exec() != QDialog::Accepted) return {};
  const QStringList chosen = dialog.selectedFiles();
  return chosen.isEmpty() ? QString() : chosen.first();
}

QStringList FilterListToQt(std::string_view pipeSeparated) {
  const QStringList parts = ToQ(pipeSeparated).split(QLatin1Char('|'));
  QStringList names;
  for (qsizetype i = 0; i + 1 < parts.size(); i += 2) names << parts.at(i);
  return names;
}

QtSeam::QtSeam(QLabel& status, QProgressBar& progress, Prompter& prompter, DesktopOpener& opener)
    : status_(status), progress_(progress), prompter_(prompter), opener_(opener) {
  progress_.setRange(0, kProgressFrameWidth);
  progress_.setValue(0);
}

void QtSeam::ShowMessage(std::string_view text, std::string_view title, MsgIcon icon) {
  prompter_.ShowMessage(text, title, icon);
}

bool QtSeam::AskYesNo(std::string_view text, std::string_view title, MsgIcon icon) {
  return prompter_.AskYesNo(text, title, icon);
}

void QtSeam::SetStatus(std::string_view text) {
  status_.setText(ToQ(text));
  // The status line must show at once, also inside a loop that does not yield.
  status_.repaint();
  if (statusObserver_) statusObserver_(status_.text());
}

void QtSeam::SetProgress(int fillWidth) {
  progress_.setValue(std::clamp(fillWidth, 0, kProgressFrameWidth));
}

void QtSeam::YieldToEvents() {
  QCoreApplication::processEvents();
}

bool QtSeam::OpenInBrowser(const std::string& path) {
  return opener_.OpenPage(path);
}

bool QtSeam::OpenInSpreadsheet(const std::string& path) {
  return opener_.OpenWorkbook(path);
}

}  // namespace zdr::gui
