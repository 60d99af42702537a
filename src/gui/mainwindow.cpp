#include "gui/mainwindow.h"

#include <QApplication>
#include <QMainWindow>

#include "gui/maincard.h"
#include "gui/qtseam.h"
#include "qtstore/qtsettings.h"

namespace zdr::gui {

void SetUpApplication(QApplication& app) {
  QApplication::setOrganizationName(QStringLiteral("ZDRLab"));
  QApplication::setApplicationName(QStringLiteral("ZDRLab"));
  app.setLayoutDirection(Qt::RightToLeft);
  app.setFont(HebrewUiFont());
  InstallHebrewTranslations(app);
}

QString WindowTitle() {
  return QStringLiteral("ZDRLab - מדבקות וקובצי דיוור");
}

int RunMainWindow(int& argc, char** argv, const std::string& companyOverride) {
  QApplication app(argc, argv);
  SetUpApplication(app);
  QtSettingsStore store;
  QMainWindow window;
  window.setLayoutDirection(Qt::RightToLeft);
  window.setWindowTitle(WindowTitle());
  auto* card = new MainCard(store);
  if (!companyOverride.empty()) card->control().state().companyPath = companyOverride;
  window.setCentralWidget(card);
  window.show();
  return app.exec();
}

}  // namespace zdr::gui
