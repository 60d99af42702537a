#include "gui/postdialog.h"

#include <QComboBox>
#include <QGridLayout>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QVBoxLayout>

#include "control/control.h"
#include "control/settings.h"
#include "gui/qtseam.h"
#include "gui/widgets.h"

namespace zdr::gui {

frmPostIL::frmPostIL(Control& control, FileChooser& chooser, QWidget* parent)
    : QDialog(parent), control_(control), chooser_(chooser) {
  setObjectName(QStringLiteral("frmPostIL"));
  setWindowTitle(QStringLiteral("הגדרות לקובץ לדואר שליחים"));
  ApplyHebrewLook(*this);
  setModal(true);

  txtService = MakeEdit(QStringLiteral("txtService"), this);
  txtWeight = MakeEdit(QStringLiteral("txtWeight"), this);
  txtConfirm = MakeEdit(QStringLiteral("txtConfirm"), this);
  txtFilePath = MakeEdit(QStringLiteral("txtFilePath"), this);
  txtFilePath->setMinimumWidth(320);
  ShowAsPath(*txtFilePath);
  auto* dir = MakeButton("CmdDir", QStringLiteral("עיון..."), this);
  ChkOpenExcel = new PanelCheckBox(QStringLiteral("לפתוח את הקובץ אוטומטית באקסל?"), this);
  ChkOpenExcel->setObjectName(QStringLiteral("ChkOpenExcel"));
  CmbFileFormat = new QComboBox(this);
  CmbFileFormat->setObjectName(QStringLiteral("CmbFileFormat"));
  for (const char* entry : kFileFormatEntries) CmbFileFormat->addItem(ToQ(entry));

  auto* grid = new QGridLayout;
  const auto caption = [this](QLineEdit* box, const QString& text) {
    QLabel* label = MakeLabel(text, this);
    captionOf_.insert(box, label);
    return label;
  };
  grid->addWidget(caption(txtService, QStringLiteral("סוג שירות:")), 0, 0);
  grid->addWidget(txtService, 0, 1, 1, 2);
  grid->addWidget(caption(txtWeight, QStringLiteral("משקל:")), 1, 0);
  grid->addWidget(txtWeight, 1, 1, 1, 2);
  grid->addWidget(caption(txtConfirm, QStringLiteral("אישור מסירה:")), 2, 0);
  grid->addWidget(txtConfirm, 2, 1, 1, 2);
  grid->addWidget(caption(txtFilePath, QStringLiteral("קובץ הפלט:")), 3, 0);
  grid->addWidget(txtFilePath, 3, 1);
  grid->addWidget(dir, 3, 2);
  grid->addWidget(ChkOpenExcel, 4, 1, 1, 2);
  grid->addWidget(MakeLabel(QStringLiteral("תבנית הקובץ:"), this), 5, 0);
  grid->addWidget(CmbFileFormat, 5, 1, 1, 2);
  grid->setColumnStretch(1, 1);

  auto* ok = MakeButton("cmdOK", QStringLiteral("אישור"), this);
  auto* cancel = MakeButton("cmdCancel", QStringLiteral("ביטול"), this);
  auto* all = new QVBoxLayout(this);
  all->addLayout(grid);
  all->addSpacing(8);
  all->addLayout(OkCancelRow(ok, cancel));

  connect(dir, &QPushButton::clicked, this, [this] { CmdDir_Click(); });
  connect(ok, &QPushButton::clicked, this, [this] { cmdOK_Click(); });
  connect(cancel, &QPushButton::clicked, this, [this] { cmdCancel_Click(); });
}

void frmPostIL::ShowModal() {
  Load();
  exec();
}

void frmPostIL::Load() {
  std::vector<SettingsValueError> refused;
  try {
    refused = SetGetRegPostILDefs(kActionLoad, control_.store(), control_.postILSettings());
  } catch (...) {
  }
  GetSetFormPostILDefs(1);
  if (!refused.empty()) {
    control_.ui().ShowMessage(RefusedSettingsMessage(refused, control_.store().Location()),
                              kTitleError, MsgIcon::Exclamation);
  }
}

void frmPostIL::GetSetFormPostILDefs(uint8_t Action) {
  PostILSettings& s = control_.postILSettings();
  if (Action == 1) {
    txtConfirm->setText(ToQ(s.Confirm));
    txtFilePath->setText(ToQ(s.FilePath));
    txtService->setText(ToQ(s.Service));
    txtWeight->setText(ToQ(s.Weight));
    if (!ChkOpenExcel->setValue(s.OpenExcel)) ChkOpenExcel->setValue(0);
    SetListIndex(CmbFileFormat, s.FileFormat);
  } else if (Action == 2) {
    s.Confirm = FromQ(txtConfirm->text());
    s.FilePath = FromQ(txtFilePath->text());
    s.Service = FromQ(txtService->text());
    s.Weight = FromQ(txtWeight->text());
    s.OpenExcel = static_cast<int16_t>(ChkOpenExcel->value());
    s.FileFormat = static_cast<int16_t>(CmbFileFormat->currentIndex());
  }
}

void frmPostIL::cmdOK_Click() {
  // Each box's text goes through the rule of its setting; a refused one keeps the dialog
  // open on that box, with everything typed still there.
  const std::pair<QLineEdit*, const char*> boxes[] = {{txtService, "Service"},
                                                      {txtWeight, "Weight"},
                                                      {txtConfirm, "Confirm"},
                                                      {txtFilePath, "FilePath"}};
  for (const auto& [box, key] : boxes) {
    PostILSettings scratch;
    Panel panel;
    std::string path;
    const SettingDef& def = *FindSetting(key);
    const std::string typed = FromQ(box->text());
    try {
      ApplySetting(def, typed, {panel, scratch, path});
    } catch (const SettingsValueError&) {
      QString name = captionOf_.value(box)->text();
      if (name.endsWith(QLatin1Char(':'))) name.chop(1);
      control_.ui().ShowMessage("בתיבה \"" + FromQ(name) + "\" הוקלד \"" + typed +
                                    "\", שאינו תקין. יש להקליד " + AllowedValues(def),
                                kTitleError, MsgIcon::Exclamation);
      box->setFocus();
      box->selectAll();
      return;
    }
  }
  GetSetFormPostILDefs(2);
  try {
    SetGetRegPostILDefs(kActionSave, control_.store(), control_.postILSettings());
  } catch (...) {
  }
  accept();
}

void frmPostIL::cmdCancel_Click() {
  reject();
}

void frmPostIL::CmdDir_Click() {
  const QString chosen =
      chooser_.ChooseOpenFile(this, QStringLiteral("קובץ הפלט"), FilterListToQt(kWorkbookFilter),
                              kWorkbookFilterPreselected, txtFilePath->text());
  if (!chosen.isEmpty()) txtFilePath->setText(chosen);
}

}  // namespace zdr::gui
