#include "gui/qtseam.h"

#include <QAbstractButton>
#include <QApplication>
#include <QComboBox>
#include <QDesktopServices>
#include <QFileDialog>
#include <QKeyEvent>
#include <QLabel>
#include <QLibraryInfo>
#include <QLineEdit>
#include <QLocale>
#include <QMessageBox>
#include <QProgressBar>
#include <QStyleOptionComboBox>
#include <QStylePainter>
#include <QTranslator>
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
  // Culmus Miriam has no Latin letters: "IBM" beside a Hebrew name came out larger, in
  // another font.
  font.setFamilies({QStringLiteral("Simple CLM"), QStringLiteral("DejaVu Sans")});
  font.setPointSize(11);
  return font;
}

void ApplyHebrewLook(QWidget& widget) {
  widget.setLayoutDirection(Qt::RightToLeft);
  widget.setFont(HebrewUiFont());
}

namespace {

// Paints a combo box's text left to right. A combo draws its text with the application's
// direction whatever its own, so "/home/acc" showed as "home/acc/".
class LeftToRightComboText : public QObject {
 public:
  using QObject::QObject;
  bool eventFilter(QObject* watched, QEvent* event) override {
    auto* combo = qobject_cast<QComboBox*>(watched);
    if (event->type() != QEvent::Paint || !combo || combo->isEditable()) return false;
    QStylePainter painter(combo);
    painter.setLayoutDirection(Qt::LeftToRight);
    QStyleOptionComboBox option;
    option.initFrom(combo);
    option.frame = true;
    option.currentText = combo->currentText();
    option.currentIcon = combo->itemIcon(combo->currentIndex());
    option.iconSize = combo->iconSize();
    const QRect field = combo->style()->subControlRect(QStyle::CC_ComboBox, &option,
                                                       QStyle::SC_ComboBoxEditField, combo);
    // Long paths lose their middle, as the file dialog's own list does.
    option.currentText = option.fontMetrics.elidedText(option.currentText, Qt::ElideMiddle,
                                                       field.width() - option.iconSize.width() - 4);
    painter.drawComplexControl(QStyle::CC_ComboBox, option);
    painter.drawControl(QStyle::CE_ComboBoxLabel, option);
    return true;
  }
};

}  // namespace

void ShowAsPath(QWidget& box) {
  box.setLayoutDirection(Qt::LeftToRight);
  if (qobject_cast<QComboBox*>(&box)) box.installEventFilter(new LeftToRightComboText(&box));
  if (qobject_cast<QLineEdit*>(&box)) {
    // A text box lays its text out in the direction of the text's first letter, whatever
    // its own: "/משרד/חברה" came out as "חברה/משרד/". The direction key (what Ctrl with
    // the left Shift gives on Windows) is the one way to fix it left to right.
    QKeyEvent leftToRight(QEvent::KeyPress, Qt::Key_Direction_L, Qt::NoModifier);
    QCoreApplication::sendEvent(&box, &leftToRight);
  }
}

bool InstallHebrewTranslations(QCoreApplication& app) {
  const QLocale hebrew(QLocale::Hebrew, QLocale::Israel);
  QLocale::setDefault(hebrew);
  auto* qt = new QTranslator(&app);
  if (!qt->load(hebrew, QStringLiteral("qtbase"), QStringLiteral("_"),
                QLibraryInfo::path(QLibraryInfo::TranslationsPath))) {
    delete qt;
    return false;
  }
  return QCoreApplication::installTranslator(qt);
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

void PrepareFileDialog(QFileDialog& dialog, const QStringList& filters, int selectedFilter) {
  // The desktop's own dialog would speak the desktop's language, whatever the panel's.
  dialog.setOption(QFileDialog::DontUseNativeDialog);
  ApplyHebrewLook(dialog);
  dialog.setAcceptMode(QFileDialog::AcceptOpen);
  dialog.setFileMode(QFileDialog::AnyFile);
  dialog.setNameFilters(filters);
  if (selectedFilter >= 0 && selectedFilter < filters.size()) {
    dialog.selectNameFilter(filters.at(selectedFilter));
  }
  // The dialog's detail columns (type, size, date) are not all translated and do not read
  // well right to left; names alone do.
  dialog.setViewMode(QFileDialog::List);
  // The folder list and the name box hold paths.
  for (const char* name : {"lookInCombo", "fileNameEdit"}) {
    if (auto* box = dialog.findChild<QWidget*>(QString::fromLatin1(name))) ShowAsPath(*box);
  }
}

QString QtFileChooser::ChooseOpenFile(QWidget* parent, const QString& title,
                                      const QStringList& filters, int selectedFilter,
                                      const QString& startPath) {
  QFileDialog dialog(parent, title, startPath);
  PrepareFileDialog(dialog, filters, selectedFilter);
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
