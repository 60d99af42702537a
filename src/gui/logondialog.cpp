#include "gui/logondialog.h"

#include <QGroupBox>
#include <QHBoxLayout>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QVBoxLayout>
#include <exception>
#include <filesystem>
#include <stdexcept>

#include "control/control.h"
#include "control/settings.h"
#include "gui/opendirdialog.h"
#include "gui/qtseam.h"
#include "gui/widgets.h"
#include "hostfile/hostfile.h"

namespace zdr::gui {

namespace {
constexpr const char* kCheckAdvice = "מומלץ לבצע בדיקה לאחר שינוי ערכי ההתחברות!";
constexpr const char* kCheckPassed = "הבדיקה הסתיימה בהצלחה";
constexpr const char* kCheckFailed = "הבדיקה לא הסתיימה בהצלחה";
}  // namespace

frmLogon::frmLogon(Control& control, frmOpenDir& openDir, QWidget* parent)
    : QDialog(parent), control_(control), openDir_(openDir) {
  setObjectName(QStringLiteral("frmLogon"));
  setWindowTitle(QStringLiteral("הגדרות התחברות לTavlor קלאסית"));
  ApplyHebrewLook(*this);
  setModal(true);

  auto* frame = new QGroupBox(QStringLiteral("ערכי התחברות"), this);
  frame->setObjectName(QStringLiteral("fraStep3"));
  txtConnDatabase_ = MakeEdit(QStringLiteral("txtConnDatabase"), frame);
  txtConnDatabase_->setMinimumWidth(460);
  ShowAsPath(*txtConnDatabase_);
  auto* open = MakeButton("cmdOpen", QStringLiteral("עיון..."), frame);
  auto* row = new QHBoxLayout(frame);
  row->addWidget(MakeLabel(QStringLiteral("מחיצה:"), frame, "lblStep3"));
  row->addWidget(txtConnDatabase_, 1);
  row->addWidget(open);

  lblMsg_ = MakeLabel(ToQ(kCheckAdvice), this, "LblMsg");
  lblMsg_->setWordWrap(true);
  auto* check = MakeButton("CmdCheck", QStringLiteral("בדיקה"), this);
  auto* ok = MakeButton("cmdOK", QStringLiteral("אישור"), this);
  auto* cancel = MakeButton("cmdCancel", QStringLiteral("ביטול"), this);
  check->setMinimumWidth(90);

  auto* buttons = OkCancelRow(ok, cancel);
  buttons->insertWidget(0, check);
  auto* all = new QVBoxLayout(this);
  all->addWidget(frame);
  all->addWidget(lblMsg_);
  all->addLayout(buttons);

  connect(open, &QPushButton::clicked, this, [this] { cmdOpen_Click(); });
  connect(check, &QPushButton::clicked, this, [this] { CmdCheck_Click(); });
  connect(ok, &QPushButton::clicked, this, [this] { cmdOK_Click(); });
  connect(cancel, &QPushButton::clicked, this, [this] { cmdCancel_Click(); });
}

void frmLogon::ShowModal() {
  Load();
  exec();
}

void frmLogon::Load() {
  txtConnDatabase_->setText(ToQ(control_.state().companyPath));
  lblMsg_->setText(ToQ(kCheckAdvice));
}

void frmLogon::cmdOpen_Click() {
  openDir_.ShowModal();
  txtConnDatabase_->setText(ToQ(control_.state().companyPath));
}

void frmLogon::CmdCheck_Click() {
  try {
    std::string folder = FromQ(txtConnDatabase_->text());
    // An empty box looks in the root folder, as "\act.fix" does.
    if (folder.empty()) folder.assign(1, '/');
    if (folder.find('\0') != std::string::npos) {
      throw std::invalid_argument("שם המחיצה אינו תקין");
    }
    const auto found = FindFileNoCase(std::filesystem::path(folder), "act.fix");
    if (found) {
      control_.ui().ShowMessage(kCheckPassed, kTitleMessage, MsgIcon::Information);
      lblMsg_->setText(ToQ(kCheckPassed));
    } else {
      lblMsg_->setText(ToQ(kCheckFailed));
    }
  } catch (const std::exception& e) {
    control_.ui().ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
  }
}

void frmLogon::cmdOK_Click() {
  std::string typed = FromQ(txtConnDatabase_->text());
  control_.state().companyPath = typed;
  try {
    SetGetRegConnParams(kActionSave, control_.store(), typed);
  } catch (...) {
    // Confirming never fails: the folder is in use until the panel is created again.
  }
  accept();
}

void frmLogon::cmdCancel_Click() {
  reject();
}

}  // namespace zdr::gui
