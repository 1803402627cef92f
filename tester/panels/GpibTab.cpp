#include "panels/GpibTab.h"

#include "panels/GpibAtnComboBox.h"
#include "panels/GpibCommandEdit.h"
#include "panels/GpibRenComboBox.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <QGridLayout>
#include <QLabel>

namespace
{
constexpr int LargestAddress =
    0x10009; ///< far beyond the bus: what the library says to such addresses can be tried too
constexpr int AddressWidth = 100;
constexpr int LeastCommandLines = 1; ///< that the editor shows
constexpr int MostCommandLines = 6;
constexpr int LabelGap = 2; ///< between a label and the input below it
constexpr int GroupGap = 2;
} // namespace

GpibTab::GpibTab(VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::GpibControlREN),
      m_renLabel(new QLabel(this)), m_ren(new GpibRenComboBox(this)),
      m_sendRen(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GpibControlREN, this)),
      m_atnLabel(new QLabel(this)), m_atn(new GpibAtnComboBox(this)),
      m_sendAtn(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GpibControlATN, this)),
      m_ifcLabel(new QLabel(this)),
      m_sendIfc(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GpibSendIFC, this)),
      m_commandLabel(new QLabel(this)), m_command(new GpibCommandEdit(this)),
      m_sendCommand(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GpibCommand, this)),
      m_passControlLabel(new QLabel(this)), m_primaryLabel(new QLabel(this)), m_primary(new SpinBoxParameter(this)),
      m_secondaryLabel(new QLabel(this)), m_secondary(new SpinBoxParameter(this)),
      m_passControl(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GpibPassControl, this))
{
    m_sendRen->setParameter(m_ren);
    m_sendAtn->setParameter(m_atn);
    m_sendCommand->setParameter(m_command);
    m_passControl->setParameter(m_primary);
    m_passControl->setParameter(m_secondary);
    setupUi();
}

void GpibTab::setupUi()
{
    setupNames();
    setupTexts();

    m_ren->showAllMode();
    m_atn->showAllMode();
    // In a large font the closed boxes may get narrower than their longest names; the window keeps its size.
    for (QComboBox *mode : {static_cast<QComboBox *>(m_ren), static_cast<QComboBox *>(m_atn)})
        mode->setMinimumWidth(mode->minimumSizeHint().width() / 2);
    for (SpinBoxParameter *address : {m_primary, m_secondary}) {
        address->setRange(0, LargestAddress);
        address->setMinimumWidth(AddressWidth);
    }
    const QMargins margins = m_command->contentsMargins();
    const int line = m_command->fontMetrics().lineSpacing();
    const int around = margins.top() + margins.bottom() + qRound(2 * m_command->document()->documentMargin());
    m_command->setMinimumHeight(LeastCommandLines * line + around);
    m_command->setMaximumHeight(MostCommandLines * line + around);
    m_renLabel->setBuddy(m_ren);
    m_atnLabel->setBuddy(m_atn);
    m_commandLabel->setBuddy(m_command);
    m_primaryLabel->setBuddy(m_primary);
    m_secondaryLabel->setBuddy(m_secondary);

    // Request buttons answer the mouse only; keeping them out of the tab chain leaves no stop where the keys do nothing.
    for (VisaFunctionCallButton *button : {m_sendRen, m_sendAtn, m_sendIfc, m_sendCommand, m_passControl})
        button->setFocusPolicy(Qt::NoFocus);

    setupLayout();
    setTabOrder(m_ren, m_atn);
    setTabOrder(m_atn, m_command);
    setTabOrder(m_command, m_primary);
    setTabOrder(m_primary, m_secondary);
}

void GpibTab::setupLayout()
{
    auto *grid = new QGridLayout(this);
    grid->setVerticalSpacing(LabelGap);
    int row = 0;
    grid->addWidget(m_renLabel, row++, 0, 1, 3);
    grid->addWidget(m_ren, row, 0, 1, 3);
    grid->addWidget(m_sendRen, row++, 3);
    grid->setRowMinimumHeight(row++, GroupGap);
    grid->addWidget(m_atnLabel, row++, 0, 1, 3);
    grid->addWidget(m_atn, row, 0, 1, 3);
    grid->addWidget(m_sendAtn, row++, 3);
    grid->setRowMinimumHeight(row++, GroupGap);
    grid->addWidget(m_ifcLabel, row, 0, 1, 3);
    grid->addWidget(m_sendIfc, row++, 3);
    grid->addWidget(m_commandLabel, row++, 0, 1, 3);
    grid->addWidget(m_command, row, 0, 1, 3);
    grid->addWidget(m_sendCommand, row, 3, Qt::AlignTop);
    grid->setRowStretch(row++, 1);
    grid->addWidget(m_primaryLabel, row, 1);
    grid->addWidget(m_secondaryLabel, row++, 2);
    grid->addWidget(m_passControlLabel, row, 0);
    grid->addWidget(m_primary, row, 1);
    grid->addWidget(m_secondary, row, 2);
    grid->addWidget(m_passControl, row++, 3);
    grid->setRowStretch(row, 1);
    grid->setColumnStretch(1, 1);
    grid->setColumnStretch(2, 1);
}

void GpibTab::setupNames()
{
    setObjectName(QStringLiteral("gpibTab"));
    m_renLabel->setObjectName(QStringLiteral("gpibRenLabel"));
    m_ren->setObjectName(QStringLiteral("gpibRen"));
    m_sendRen->setObjectName(QStringLiteral("gpibSendRen"));
    m_atnLabel->setObjectName(QStringLiteral("gpibAtnLabel"));
    m_atn->setObjectName(QStringLiteral("gpibAtn"));
    m_sendAtn->setObjectName(QStringLiteral("gpibSendAtn"));
    m_ifcLabel->setObjectName(QStringLiteral("gpibIfcLabel"));
    m_sendIfc->setObjectName(QStringLiteral("gpibSendIfc"));
    m_commandLabel->setObjectName(QStringLiteral("gpibCommandLabel"));
    m_command->setObjectName(QStringLiteral("gpibCommand"));
    m_sendCommand->setObjectName(QStringLiteral("gpibSendCommand"));
    m_passControlLabel->setObjectName(QStringLiteral("gpibPassControlLabel"));
    m_primaryLabel->setObjectName(QStringLiteral("gpibPrimaryLabel"));
    m_primary->setObjectName(QStringLiteral("gpibPrimary"));
    m_secondaryLabel->setObjectName(QStringLiteral("gpibSecondaryLabel"));
    m_secondary->setObjectName(QStringLiteral("gpibSecondary"));
    m_passControl->setObjectName(QStringLiteral("gpibPassControl"));

    // All five buttons carry the same text.
    m_ren->setAccessibleName(tr("Control REN"));
    m_sendRen->setAccessibleName(tr("Send control REN"));
    m_atn->setAccessibleName(tr("Control ATN"));
    m_sendAtn->setAccessibleName(tr("Send control ATN"));
    m_sendIfc->setAccessibleName(tr("Send IFC"));
    m_command->setAccessibleName(tr("Command"));
    m_sendCommand->setAccessibleName(tr("Send command"));
    m_primary->setAccessibleName(tr("Primary address"));
    m_secondary->setAccessibleName(tr("Secondary address"));
    m_passControl->setAccessibleName(tr("Send pass control"));
}

void GpibTab::setupTexts()
{
    m_renLabel->setText(tr("Control REN"));
    m_ren->setToolTip(tr("What to do with the remote enable line."));
    m_atnLabel->setText(tr("Control ATN"));
    m_atn->setToolTip(tr("What to do with the attention line."));
    m_ifcLabel->setText(tr("Send IFC"));
    m_sendIfc->setToolTip(tr("Pulse the interface clear line: all talkers and listeners let go of the bus."));
    m_commandLabel->setText(tr("Command"));
    m_command->setToolTip(tr("Bytes to send with the attention line asserted.\n"
                             "Escapes: \\x3F (upper-case hexadecimal digits), \\n"));
    m_passControlLabel->setText(tr("Pass Control:"));
    m_passControl->setToolTip(tr("Make the device at this address the controller in charge."));
    m_primaryLabel->setText(tr("Primary:"));
    m_primary->setToolTip(tr("Primary address of the device, 0 to 30."));
    m_secondaryLabel->setText(tr("Second:"));
    m_secondary->setToolTip(tr("Secondary address of the device: 0 to 30, or 65535 for none."));
    for (VisaFunctionCallButton *button : {m_sendRen, m_sendAtn, m_sendIfc, m_sendCommand, m_passControl})
        button->setText(tr("Send"));
}

void GpibTab::visaFunctionCallFinished(_visaFunctionCall &) {}
