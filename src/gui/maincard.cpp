#include "gui/maincard.h"

#include <QComboBox>
#include <QCoreApplication>
#include <QGridLayout>
#include <QGroupBox>
#include <QHBoxLayout>
#include <QLabel>
#include <QLineEdit>
#include <QMouseEvent>
#include <QProgressBar>
#include <QPushButton>
#include <QVBoxLayout>
#include <algorithm>
#include <exception>

#include "control/settings.h"
#include "gui/labeldefdialog.h"
#include "gui/logondialog.h"
#include "gui/opendirdialog.h"
#include "gui/postdialog.h"
#include "gui/selectcarddialog.h"
#include "gui/widgets.h"
#include "import/importers.h"
#include "output/output.h"
#include "select/select.h"

namespace zdr::gui {

// ---------------------------------------------------------------------------------------
// ClickLabel

ClickLabel::ClickLabel(const QString& text, QWidget* parent) : QWidget(parent) {
  label_ = new QLabel(text, this);
  // Looks like a link: it copies the range's start into its end.
  label_->setStyleSheet(
      QStringLiteral("QLabel { color: #1a4f9c; text-decoration: underline }"
                     "QLabel:disabled { color: palette(mid); text-decoration: none }"));
  auto* l = new QHBoxLayout(this);
  l->setContentsMargins(0, 0, 0, 0);
  l->addWidget(label_);
  setCursor(Qt::PointingHandCursor);
  setToolTip(QStringLiteral("העתקה מהשדה הקודם"));
}

void ClickLabel::mousePressEvent(QMouseEvent* event) {
  if (event->button() == Qt::LeftButton) Click();
  QWidget::mousePressEvent(event);
}

// ---------------------------------------------------------------------------------------
// MainCard: construction

namespace {
constexpr const char* kDesignedMaxLength = "designedMaxLength";

// Tab follows reading order, right to left and top to bottom: in each row the check box,
// then "from", then "to"; row after row and group after group (the accounts and the
// documents on the right, then the ledger and the label layout); then the commands. Set
// here once rather than left to the order the widgets happen to be created in.
// clang-format off
constexpr std::array kTabOrder{
    // Accounts.
    "ChkAccKey", "TxtFromCrd", "TxtToCrd",
    "ChkCatCode", "txtFromSort", "txtToSort",
    "ChkAgent", "txtAgent", "txtToAgent",
    "chkCutOff", "CutOff1", "CutOff2", "CutOff3", "CutOff4",
    "ChkCity", "TxtCity",
    "ChkPhone", "txtPhone",
    "ChkSelectAccount", "cmbInAccounts", "cmdSelectAccount",
    // Documents.
    "ChkDates", "cmbDocType", "cmbByDoc",
    "TxtFromDate", "TxtToDate",
    "txtFromRef", "txtToRef",
    "ChkByItems",
    "txtFromItmKey", "txtToItmKey",
    "txtFromItmSort", "txtToItmSort",
    "cmbAddressFrom",
    // Ledger.
    "ChkJournal", "txtFromJournal", "txtToJournal",
    "chkTransType", "txtTransType",
    "chkTransDates", "txtFromTransDate", "txtToTransDate",
    "chkTransVDate", "txtFromTransVDate", "txtToTransVDate",
    "chkReadTempTrans",
    // Order and label layout.
    "CmbSortBy", "CmbSortDir",
    "txtRows", "txtCols",
    "txtCopies", "txtStartFrom",
    "ChkTitle0", "ChkTitle1", "ChkTitle2",
    "ChkTitle3", "ChkTitle4", "ChkTitle5",
    "ChkTitle6", "ChkTitle7", "ChkTitle8",
    "ChkLogo0", "ChkLogo1",
    // Commands.
    "CmdLabPrev", "CmdPreview", "cmdBuildPostIL",
    "CmdLabDef", "cmdPostDef", "CmdDef", "CmdConnect"};
// clang-format on
}  // namespace

template <typename Widget>
Widget* MainCard::Named(const char* name, Widget* w) {
  w->setObjectName(QString::fromLatin1(name));
  return w;
}

QLineEdit* MainCard::Text(const char* name, std::string Panel::*field) {
  auto* e = Named(name, new QLineEdit(this));
  if (const int max = TextBoxMaxLength(name); max > 0) {
    e->setMaxLength(max);
    e->setProperty(kDesignedMaxLength, max);
  }
  if (field) texts_.emplace_back(e, field);
  return e;
}

PanelCheckBox* MainCard::Check(const char* name, const QString& caption, int Panel::*field) {
  auto* c = Named(name, new PanelCheckBox(caption, this));
  if (field) checks_.emplace_back(c, field);
  return c;
}

QComboBox* MainCard::List(const char* name, int Panel::*field) {
  auto* c = Named(name, new QComboBox(this));
  if (field) lists_.emplace_back(c, field);
  return c;
}

QPushButton* MainCard::Command(const char* name, const QString& caption) {
  auto* b = Named(name, new QPushButton(caption, this));
  b->setAutoDefault(false);
  commands_.push_back(b);
  return b;
}

namespace {

QLabel* Caption(const QString& text, QWidget* parent) {
  return new QLabel(text, parent);
}

// Shows a stored or computed text whole. The length limit only stops typing: a longer
// value set by the program widens the limit for as long as it is there.
void SetWholeText(QLineEdit* edit, const QString& text) {
  const QVariant designed = edit->property(kDesignedMaxLength);
  if (designed.isValid()) edit->setMaxLength(std::max(designed.toInt(), int(text.size())));
  edit->setText(text);
}

template <typename Strings>
void AddEntries(QComboBox* c, const Strings& entries) {
  for (const auto& e : entries) c->addItem(ToQ(e));
}

// A one- or two-box range row: [check] from-box  to-caption  to-box.
void RangeRow(QGridLayout* g, int row, QWidget* check, QWidget* from, QWidget* toCaption,
              QWidget* to) {
  g->addWidget(check, row, 0);
  g->addWidget(from, row, 1);
  if (toCaption) g->addWidget(toCaption, row, 2, Qt::AlignCenter);
  if (to) g->addWidget(to, row, 3);
}

}  // namespace

MainCard::MainCard(SettingsStore& store, MainCardServices services, QWidget* parent)
    : QWidget(parent), store_(store) {
  setObjectName(QStringLiteral("MainCard"));
  ApplyHebrewLook(*this);

  if (!services.prompter) ownPrompter_ = std::make_unique<MessageBoxPrompter>();
  if (!services.opener) ownOpener_ = std::make_unique<SystemDesktopOpener>();
  if (!services.chooser) ownChooser_ = std::make_unique<QtFileChooser>();
  prompter_ = services.prompter ? services.prompter : ownPrompter_.get();
  opener_ = services.opener ? services.opener : ownOpener_.get();
  chooser_ = services.chooser ? services.chooser : ownChooser_.get();

  lblMessage_ = Named("LblMessage", new QLabel(this));
  progress_ = Named("ProgressFill", new QProgressBar(this));
  seam_ = std::make_unique<QtSeam>(*lblMessage_, *progress_, *prompter_, *opener_);
  control_ = std::make_unique<Control>(store_, *seam_);

  BuildLayout();
  Initialize();
}

MainCard::~MainCard() = default;

void MainCard::BuildLayout() {
  QGroupBox* accounts = BuildAccounts();
  QGroupBox* documents = BuildDocuments();
  QGroupBox* ledger = BuildLedger();
  QGroupBox* layoutBox = BuildLabelLayout();
  const auto [outputs, settings] = BuildCommands();

  // Status line and progress bar.
  lblMessage_->setMinimumHeight(24);
  lblMessage_->setFrameShape(QFrame::StyledPanel);
  lblMessage_->setFrameShadow(QFrame::Sunken);
  progress_->setTextVisible(false);
  progress_->setMaximumHeight(14);

  auto* right = new QVBoxLayout;
  right->addWidget(accounts);
  right->addWidget(documents);
  right->addStretch(1);
  auto* left = new QVBoxLayout;
  left->addWidget(ledger);
  left->addWidget(layoutBox);
  left->addStretch(1);
  auto* columns = new QHBoxLayout;
  columns->addLayout(right, 1);
  columns->addLayout(left, 1);

  inputGroups_ = {accounts, documents, ledger, layoutBox};
  SetTabOrder();

  auto* all = new QVBoxLayout(this);
  all->addLayout(columns, 1);
  all->addLayout(outputs);
  all->addLayout(settings);
  all->addWidget(lblMessage_);
  all->addWidget(progress_);
}

QGroupBox* MainCard::BuildAccounts() {
  auto* accounts = new QGroupBox(QStringLiteral("טווח הכרטיסים:"), this);
  auto* ga = new QGridLayout(accounts);
  RangeRow(ga, 0, Check("ChkAccKey", QStringLiteral("מכרטיס:"), &Panel::ChkAccKey),
           Text("TxtFromCrd", &Panel::TxtFromCrd), Caption(QStringLiteral("עד:"), this),
           Text("TxtToCrd", &Panel::TxtToCrd));
  RangeRow(ga, 1, Check("ChkCatCode", QStringLiteral("מקוד מיון:"), &Panel::ChkCatCode),
           Text("txtFromSort", &Panel::txtFromSort), Caption(QStringLiteral("עד:"), this),
           Text("txtToSort", &Panel::txtToSort));
  RangeRow(ga, 2, Check("ChkAgent", QStringLiteral("סוכנים:"), &Panel::ChkAgent),
           Text("txtAgent", &Panel::txtAgent), Caption(QStringLiteral("עד:"), this),
           Text("txtToAgent", &Panel::txtToAgent));
  {
    auto* cut = new QHBoxLayout;
    for (int i = 1; i <= 4; ++i) {
      const std::string name = "CutOff" + std::to_string(i);
      cutOff_[i] = Text(name.c_str(), nullptr);
      cutOff_[i]->setFixedWidth(34);
      cutOff_[i]->setAlignment(Qt::AlignCenter);
      cut->addWidget(cutOff_[i]);
    }
    cut->addStretch(1);
    ga->addWidget(Check("chkCutOff", QStringLiteral("חתך:"), &Panel::chkCutOff), 3, 0);
    ga->addLayout(cut, 3, 1, 1, 3);
  }
  ga->addWidget(Check("ChkCity", QStringLiteral("כל הערים ששמן מתחיל ב:"), &Panel::ChkCity), 4, 0);
  ga->addWidget(Text("TxtCity", &Panel::TxtCity), 4, 1, 1, 3);
  ga->addWidget(Check("ChkPhone", QStringLiteral("כל הטלפונים שמתחילים ב:"), &Panel::ChkPhone), 5,
                0);
  ga->addWidget(Text("txtPhone", &Panel::txtPhone), 5, 1, 1, 3);
  {
    auto* chosen = new QHBoxLayout;
    auto* inAccounts = List("cmbInAccounts", &Panel::cmbInAccounts);
    AddEntries(inAccounts, kInAccountsEntries);
    auto* choose = Command("cmdSelectAccount", QStringLiteral("בחירה..."));
    chosen->addWidget(inAccounts, 1);
    chosen->addWidget(choose);
    ga->addWidget(
        Check("ChkSelectAccount", QStringLiteral("כרטיסים שנבחרו:"), &Panel::ChkSelectAccount), 6,
        0);
    ga->addLayout(chosen, 6, 1, 1, 3);
    connect(choose, &QPushButton::clicked, this, [this] { cmdSelectAccount_Click(); });
  }
  ga->setColumnStretch(1, 1);
  ga->setColumnStretch(3, 1);
  return accounts;
}

QGroupBox* MainCard::BuildDocuments() {
  auto* documents = new QGroupBox(QStringLiteral("מסמכים"), this);
  auto* gd = new QGridLayout(documents);
  {
    auto* kind = new QHBoxLayout;
    cmbDocType_ = List("cmbDocType", &Panel::cmbDocType);
    cmbDocType_->setMaxVisibleItems(28);
    auto* byDoc = List("cmbByDoc", &Panel::cmbByDoc);
    AddEntries(byDoc, kByDocEntries);
    kind->addWidget(cmbDocType_, 2);
    kind->addWidget(byDoc, 1);
    gd->addWidget(Check("ChkDates", QStringLiteral("לפי מסמכים:"), &Panel::ChkDates), 0, 0);
    gd->addLayout(kind, 0, 1, 1, 3);
  }
  auto* lblToDate = Named("lblToDate", new ClickLabel(QStringLiteral("עד"), this));
  RangeRow(gd, 1, Caption(QStringLiteral("מתאריך:"), this),
           Text("TxtFromDate", &Panel::TxtFromDate), lblToDate,
           Text("TxtToDate", &Panel::TxtToDate));
  auto* lblToRef = Named("lblToRef", new ClickLabel(QStringLiteral("עד:"), this));
  RangeRow(gd, 2, Caption(QStringLiteral("ממספר:"), this), Text("txtFromRef", &Panel::txtFromRef),
           lblToRef, Text("txtToRef", &Panel::txtToRef));
  gd->addWidget(
      Check("ChkByItems", QStringLiteral("רק מסמכים המכילים פריטים בטווח:"), &Panel::ChkByItems), 3,
      0, 1, 4);
  auto* label48 = Named("Label48", new ClickLabel(QStringLiteral("עד:"), this));
  RangeRow(gd, 4, Caption(QStringLiteral("ממפתח:"), this),
           Text("txtFromItmKey", &Panel::txtFromItmKey), label48,
           Text("txtToItmKey", &Panel::txtToItmKey));
  auto* label45 = Named("Label45", new ClickLabel(QStringLiteral("עד:"), this));
  RangeRow(gd, 5, Caption(QStringLiteral("ממיון:"), this),
           Text("txtFromItmSort", &Panel::txtFromItmSort), label45,
           Text("txtToItmSort", &Panel::txtToItmSort));
  {
    auto* from = List("cmbAddressFrom", &Panel::cmbAddressFrom);
    AddEntries(from, kAddressFromEntries);
    gd->addWidget(Caption(QStringLiteral("כתובת מתוך:"), this), 6, 0);
    gd->addWidget(from, 6, 1, 1, 3);
  }
  gd->setColumnStretch(1, 1);
  gd->setColumnStretch(3, 1);
  lblToDate->SetOnClick([this] { lblToDate_Click(); });
  lblToRef->SetOnClick([this] { lblToRef_Click(); });
  label48->SetOnClick([this] { Label48_Click(); });
  label45->SetOnClick([this] { Label45_Click(); });
  return documents;
}

QGroupBox* MainCard::BuildLedger() {
  auto* ledger = new QGroupBox(QStringLiteral("לפי טווח תנועות הנהלת חשבונות:"), this);
  auto* gl = new QGridLayout(ledger);
  RangeRow(gl, 0, Check("ChkJournal", QStringLiteral("ממנה:"), &Panel::ChkJournal),
           Text("txtFromJournal", &Panel::txtFromJournal), Caption(QStringLiteral("עד:"), this),
           Text("txtToJournal", &Panel::txtToJournal));
  RangeRow(gl, 1, Check("chkTransType", QStringLiteral("סוג תנועה:"), &Panel::chkTransType),
           Text("txtTransType", &Panel::txtTransType), nullptr, nullptr);
  RangeRow(gl, 2, Check("chkTransDates", QStringLiteral("מתאריך:"), &Panel::chkTransDates),
           Text("txtFromTransDate", &Panel::txtFromTransDate), Caption(QStringLiteral("עד:"), this),
           Text("txtToTransDate", &Panel::txtToTransDate));
  RangeRow(gl, 3, Check("chkTransVDate", QStringLiteral("מתאריך ערך:"), &Panel::chkTransVDate),
           Text("txtFromTransVDate", &Panel::txtFromTransVDate),
           Caption(QStringLiteral("עד:"), this), Text("txtToTransVDate", &Panel::txtToTransVDate));
  gl->addWidget(
      Check("chkReadTempTrans", QStringLiteral("גם ממאגר זמני?"), &Panel::chkReadTempTrans), 4, 0,
      1, 4);
  gl->setColumnStretch(1, 1);
  gl->setColumnStretch(3, 1);
  return ledger;
}

QGroupBox* MainCard::BuildLabelLayout() {
  auto* layoutBox = new QGroupBox(QStringLiteral("מיון ומבנה המדבקות"), this);
  auto* gm = new QGridLayout(layoutBox);
  {
    auto* sortBy = List("CmbSortBy", &Panel::CmbSortBy);
    AddEntries(sortBy, kSortByEntries);
    auto* sortDir = List("CmbSortDir", &Panel::CmbSortDir);
    AddEntries(sortDir, kSortDirEntries);
    auto* sort = new QHBoxLayout;
    sort->addWidget(sortBy, 2);
    sort->addWidget(sortDir, 1);
    gm->addWidget(Caption(QStringLiteral("מיון לפי:"), this), 0, 0);
    gm->addLayout(sort, 0, 1);
  }
  {
    auto* page = new QHBoxLayout;
    auto* rows = Text("txtRows", &Panel::txtRows);
    auto* cols = Text("txtCols", &Panel::txtCols);
    auto* copies = Text("txtCopies", &Panel::txtCopies);
    auto* start = Text("txtStartFrom", &Panel::txtStartFrom);
    for (QLineEdit* e : {rows, cols, copies, start}) {
      e->setFixedWidth(48);
      e->setAlignment(Qt::AlignCenter);
    }
    page->addWidget(rows);
    page->addWidget(Caption(QStringLiteral("שורות"), this));
    page->addSpacing(10);
    page->addWidget(cols);
    page->addWidget(Caption(QStringLiteral("עמודות"), this));
    page->addStretch(1);
    gm->addWidget(Caption(QStringLiteral("מבנה הדף:"), this), 1, 0);
    gm->addLayout(page, 1, 1);
    auto* more = new QHBoxLayout;
    more->addWidget(copies);
    more->addSpacing(16);
    more->addWidget(Caption(QStringLiteral("התחל ממדבקה:"), this));
    more->addWidget(start);
    more->addStretch(1);
    gm->addWidget(Caption(QStringLiteral("עותקים:"), this), 2, 0);
    gm->addLayout(more, 2, 1);
  }
  gm->addWidget(BuildLabelContent(), 3, 0, 1, 2);
  gm->setColumnStretch(1, 1);
  return layoutBox;
}

QGroupBox* MainCard::BuildLabelContent() {
  auto* content = new QGroupBox(QStringLiteral("תוכן המדבקה: (סמן את השורות הרצויות)"), this);
  auto* gc = new QGridLayout(content);
  static const std::array<const char*, 9> kTitleCaptions{
      "לכבוד", "שם כרטיס", "קוד כרטיס", "לידי: איש קשר", "כתובת", "עיר", "שכונה", "טלפון", "מיקוד"};
  for (int i = 0; i < 9; ++i) {
    const std::string name = "ChkTitle" + std::to_string(i);
    chkTitle_[i] = Check(name.c_str(), ToQ(kTitleCaptions[i]), nullptr);
    gc->addWidget(chkTitle_[i], i / 3, i % 3);
  }
  chkLogo_[0] = Check("ChkLogo0", QStringLiteral("תמונה עליונה"), nullptr);
  chkLogo_[1] = Check("ChkLogo1", QStringLiteral("תמונה תחתונה"), nullptr);
  gc->addWidget(chkLogo_[0], 3, 0);
  gc->addWidget(chkLogo_[1], 3, 1);
  return content;
}

std::pair<QHBoxLayout*, QHBoxLayout*> MainCard::BuildCommands() {
  auto* labPrev = Command("CmdLabPrev", QStringLiteral("הצג מדבקות"));
  auto* preview = Command("CmdPreview", QStringLiteral("הצג רשימה"));
  auto* buildPost = Command("cmdBuildPostIL", QStringLiteral("הכן קובץ לדואר"));
  auto* postDef = Command("cmdPostDef", QStringLiteral("הגדרות קובץ לדואר"));
  auto* labDef = Command("CmdLabDef", QStringLiteral("הגדרות מדבקה"));
  auto* def = Command("CmdDef", QStringLiteral("שמור הגדרות"));
  auto* connectButton = Command("CmdConnect", QStringLiteral("התחברות לTavlor"));
  for (QPushButton* b : {labPrev, preview, buildPost}) {
    b->setMinimumHeight(34);
    b->setStyleSheet(QStringLiteral("font-weight: bold"));
  }
  auto* outputs = new QHBoxLayout;
  for (QPushButton* b : {labPrev, preview, buildPost}) outputs->addWidget(b, 1);
  auto* settings = new QHBoxLayout;
  for (QPushButton* b : {labDef, postDef, def, connectButton}) settings->addWidget(b, 1);

  connect(labPrev, &QPushButton::clicked, this, [this] { CmdLabPrev_Click(); });
  connect(preview, &QPushButton::clicked, this, [this] { CmdPreview_Click(); });
  connect(buildPost, &QPushButton::clicked, this, [this] { cmdBuildPostIL_Click(); });
  connect(postDef, &QPushButton::clicked, this, [this] { cmdPostDef_Click(); });
  connect(labDef, &QPushButton::clicked, this, [this] { CmdLabDef_Click(); });
  connect(def, &QPushButton::clicked, this, [this] { CmdDef_Click(); });
  connect(connectButton, &QPushButton::clicked, this, [this] { CmdConnect_Click(); });
  return {outputs, settings};
}

void MainCard::SetTabOrder() {
  QWidget* previous = nullptr;
  for (const char* name : kTabOrder) {
    auto* w = findChild<QWidget*>(QString::fromLatin1(name));
    if (!w) continue;
    if (previous) QWidget::setTabOrder(previous, w);
    previous = w;
  }
}

// ---------------------------------------------------------------------------------------
// Start-up and the panel's values

void MainCard::Initialize() {
  std::vector<SettingsValueError> refused;
  try {
    refused = control_->Initialize();
  } catch (...) {
  }
  try {
    InitCmbDocType();
  } catch (...) {
  }
  WritePanel();
  // The load stops where it must, but the clerk learns which value stopped it: otherwise the
  // criteria after it look like chosen defaults.
  if (!refused.empty()) {
    seam_->ShowMessage(RefusedSettingsMessage(refused, store_.Location()), kTitleError,
                       MsgIcon::Exclamation);
  }
}

void MainCard::InitCmbDocType() {
  for (const std::string& name : DocTypeComboNames(control_->docTypes())) {
    cmbDocType_->addItem(ToQ(name));
  }
  cmbDocType_->setCurrentIndex(0);
}

void MainCard::ReadPanel() {
  Panel& p = control_->panel();
  for (auto& [edit, field] : texts_) p.*field = FromQ(edit->text());
  for (auto& [check, field] : checks_) p.*field = check->value();
  for (auto& [list, field] : lists_) p.*field = list->currentIndex();
  for (int i = 1; i <= 4; ++i) p.CutOff[i] = FromQ(cutOff_[i]->text());
  for (int i = 0; i < 9; ++i) p.ChkTitle[i] = chkTitle_[i]->value();
  for (int i = 0; i < 2; ++i) p.ChkLogo[i] = chkLogo_[i]->value();
}

void MainCard::WritePanel() {
  const Panel& p = control_->panel();
  for (auto& [edit, field] : texts_) SetWholeText(edit, ToQ(p.*field));
  for (auto& [check, field] : checks_) check->setValue(p.*field);
  for (auto& [list, field] : lists_) {
    const int i = p.*field;
    list->setCurrentIndex(i >= -1 && i < list->count() ? i : -1);
  }
  for (int i = 1; i <= 4; ++i) SetWholeText(cutOff_[i], ToQ(p.CutOff[i]));
  for (int i = 0; i < 9; ++i) chkTitle_[i]->setValue(p.ChkTitle[i]);
  for (int i = 0; i < 2; ++i) chkLogo_[i]->setValue(p.ChkLogo[i]);
}

// ---------------------------------------------------------------------------------------
// Commands

void MainCard::LockPanel(bool locked) {
  if (locked) {
    // Greyed, the inputs take no keys and no clicks, so nothing typed meanwhile is lost
    // when the command writes the panel back; the focus comes back where it was.
    QWidget* focus = window()->focusWidget();
    refocus_ = focus && isAncestorOf(focus) ? focus : nullptr;
  }
  for (QGroupBox* g : inputGroups_) g->setEnabled(!locked);
  for (QPushButton* b : commands_) b->setEnabled(!locked);
  if (!locked && refocus_) refocus_->setFocus(Qt::OtherFocusReason);
}

std::string MainCard::RunCommand(const std::function<std::string()>& command) {
  if (busy_) return {};
  busy_ = true;
  LockPanel(true);
  std::string produced;
  try {
    ReadPanel();
    produced = command();
  } catch (const std::exception& e) {
    seam_->ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
  }
  // The importers may have adjusted the panel (an empty cut-off box becomes a blank).
  WritePanel();
  LockPanel(false);
  busy_ = false;
  return produced;
}

std::string MainCard::CmdLabPrev_Click() {
  return RunCommand([this] { return control_->CmdLabPrev(); });
}

std::string MainCard::CmdPreview_Click() {
  return RunCommand([this] { return control_->CmdPreview(); });
}

std::string MainCard::cmdBuildPostIL_Click() {
  const std::string produced = RunCommand([this] { return control_->CmdBuildPostIL(); });
  if (!produced.empty()) OfferPostILFindings();
  return produced;
}

void MainCard::OfferPostILFindings() {
  const PreflightResult& checked = control_->lastPreflight();
  if (checked.findings.empty()) return;
  const std::string counts = "בבדיקת הקובץ לדואר נמצאו " + PreflightCounts(checked) + ".\n";
  if (control_->postILSettings().OpenExcel == 1) {
    // The workbook is open already; its findings sheet is one tab away.
    seam_->ShowMessage(counts + "הממצאים בגיליון \"בדיקה\" של חוברת העבודה.", kTitleMessage,
                       MsgIcon::Information);
  } else if (seam_->AskYesNo(counts + "לפתוח את חוברת העבודה בגיליון \"בדיקה\"?", kTitleAttention,
                             MsgIcon::Question)) {
    control_->OpenPostILFindings();
  }
}

void MainCard::CmdDef_Click() {
  if (busy_) return;
  ReadPanel();
  try {
    control_->CmdDef();
  } catch (...) {
  }
}

frmOpenDir* MainCard::openDir() {
  if (!openDir_) openDir_ = std::make_unique<frmOpenDir>(*control_, this);
  return openDir_.get();
}

frmSelectCard* MainCard::selectCard() {
  if (!selectCard_) selectCard_ = std::make_unique<frmSelectCard>(*control_, this);
  return selectCard_.get();
}

frmLabDef* MainCard::labDefDialog() {
  if (!labDef_) labDef_ = std::make_unique<frmLabDef>(*control_, *chooser_, this);
  return labDef_.get();
}

frmPostIL* MainCard::postILDialog() {
  if (!postIL_) postIL_ = std::make_unique<frmPostIL>(*control_, *chooser_, this);
  return postIL_.get();
}

void MainCard::CmdConnect_Click() {
  if (busy_) return;
  // Loaded anew at every showing: its buttons close it.
  frmLogon logon(*control_, *openDir(), this);
  logon.ShowModal();
}

void MainCard::CmdLabDef_Click() {
  if (busy_) return;
  labDefDialog()->ShowModal();
}

void MainCard::cmdPostDef_Click() {
  if (busy_) return;
  postILDialog()->ShowModal();
}

void MainCard::cmdSelectAccount_Click() {
  if (busy_) return;
  busy_ = true;
  LockPanel(true);
  std::string dbPath;
  try {
    ReadPanel();
    dbPath = control_->PrepareAccountPicker();
  } catch (const std::exception& e) {
    seam_->ShowMessage(e.what(), kTitleFault, MsgIcon::Critical);
  }
  LockPanel(false);
  busy_ = false;
  // Without an account-selection database there is nothing to pick from; its creation has
  // already said why.
  if (!dbPath.empty()) selectCard()->ShowModal();
}

void MainCard::CopyBox(const char* from, const char* to) {
  SetWholeText(findChild<QLineEdit*>(QString::fromLatin1(to)),
               findChild<QLineEdit*>(QString::fromLatin1(from))->text());
}

void MainCard::lblToDate_Click() {
  CopyBox("TxtFromDate", "TxtToDate");
}
void MainCard::lblToRef_Click() {
  CopyBox("txtFromRef", "txtToRef");
}
void MainCard::Label48_Click() {
  CopyBox("txtFromItmKey", "txtToItmKey");
}
void MainCard::Label45_Click() {
  CopyBox("txtFromItmSort", "txtToItmSort");
}

// ---------------------------------------------------------------------------------------
// The control's public methods

std::string MainCard::BuildDatesCriteria(Date pFromDate, Date pToDate, int16_t pDocIndex) {
  return zdr::BuildDatesCriteria(pFromDate, pToDate, pDocIndex);
}

std::string MainCard::BuildSelect(int16_t pDocIndex, bool& pUseDocs) {
  ReadPanel();
  return zdr::BuildSelect(control_->panel(), control_->docTypes(), pDocIndex, pUseDocs);
}

std::string MainCard::BuildOrderBy(bool& pUseDocs) {
  ReadPanel();
  return zdr::BuildOrderBy(control_->panel(), control_->docTypes(), pUseDocs);
}

void MainCard::CreateHTML(const std::string& pFileName, const std::string& pDBFile) {
  ReadPanel();
  zdr::CreateHTML(pFileName, pDBFile, control_->panel(), control_->docTypes(),
                  control_->state().selectDbPath, *seam_);
}

void MainCard::CreateLabFile(const std::string& pFileName, const std::string& pDBFile) {
  ReadPanel();
  zdr::CreateLabFile(pFileName, pDBFile, control_->panel(), control_->docTypes(),
                     control_->state().selectDbPath, control_->labelSettings(), *seam_);
}

void MainCard::SetGetRegParams(uint8_t Action) {
  if (Action == kActionSave) ReadPanel();
  try {
    zdr::SetGetRegParams(Action, store_, control_->panel());
  } catch (...) {
    if (Action == kActionLoad) WritePanel();
    throw;
  }
  if (Action == kActionLoad) WritePanel();
}

bool MainCard::ReadACT(const std::string& CompPath, const std::string& pDBFile, bool pAllDetails,
                       bool pAsIs) {
  ReadPanel();
  const bool done = zdr::ReadACT(CompPath, pDBFile, pAllDetails, pAsIs, control_->panel(), *seam_);
  WritePanel();
  return done;
}

int32_t MainCard::ReadStock(int16_t pCompID, const std::string& pCompPath,
                            const std::string& pFromDate, const std::string& pToDate,
                            const std::string& pDBFile, uint8_t pDocTypeIndex, bool pWithLines,
                            bool pAsIs) {
  ReadPanel();
  return zdr::ReadStock(pCompID, pCompPath, pFromDate, pToDate, pDBFile, pDocTypeIndex, pWithLines,
                        pAsIs, control_->panel(), control_->docTypes(), *seam_);
}

int16_t MainCard::ReadTransactions(const std::string& CompPath, const std::string& pDBFile) {
  ReadPanel();
  return zdr::ReadTransactions(CompPath, pDBFile, true, control_->panel(), *seam_);
}

int16_t MainCard::ReadTempTransactions(const std::string& CompPath, const std::string& pDBFile,
                                       int16_t pJournalNo) {
  ReadPanel();
  return zdr::ReadTempTransactions(CompPath, pDBFile, pJournalNo, true, control_->panel(), *seam_);
}

bool MainCard::UseTransactions() {
  ReadPanel();
  return zdr::UseTransactions(control_->panel());
}

int16_t MainCard::ReadCash(const std::string& CompPath, const std::string& pDBFile) {
  ReadPanel();
  return zdr::ReadCash(CompPath, pDBFile, true, control_->panel(), *seam_);
}

void MainCard::ReadAllTempTrans(const std::string& CompPath, const std::string& pDBFile) {
  ReadPanel();
  zdr::ReadAllTempTrans(CompPath, pDBFile, true, control_->panel(), *seam_);
}

void MainCard::ReadItem(const std::string& CompPath, const std::string& pDBFile) {
  ReadPanel();
  zdr::ReadItem(CompPath, pDBFile, control_->panel(), *seam_);
}

void MainCard::CreateCSV(const std::string& pFileName, const std::string& pDBFile,
                         int16_t pFileFormat) {
  ReadPanel();
  zdr::CreateCSV(pFileName, pDBFile, pFileFormat, control_->panel(), control_->docTypes(),
                 control_->state().selectDbPath, control_->postILSettings(), *seam_);
}

}  // namespace zdr::gui
