#include "panels/EventTab.h"

#include "panels/EventComboBox.h"
#include "panels/MechanismFrame.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <QGridLayout>
#include <QLabel>

EventTab::EventTab(VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::Close), m_typeLabel(new QLabel(this)),
      m_type(new EventComboBox(this)), m_mechanism(new MechanismFrame(this)),
      m_enable(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::EnableEvent, this)),
      m_disable(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::DisableEvent, this)),
      m_discard(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::DiscardEvents, this)),
      m_wait(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::WaitOnEvent, this)),
      m_install(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::InstallHandler, this)),
      m_uninstall(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::UninstallHandler, this))
{
    for (VisaFunctionCallButton *button : {m_enable, m_disable, m_discard, m_wait, m_install, m_uninstall})
        button->setParameter(m_type);
    for (VisaFunctionCallButton *button : {m_enable, m_disable, m_discard})
        button->setParameter(m_mechanism);
    setupUi();
}

void EventTab::setupUi()
{
    setupNames();
    setupTexts();

    m_type->showAllEvents();
    m_typeLabel->setBuddy(m_type);

    // Request buttons answer the mouse only; keeping them out of the tab chain leaves no stop where the keys do nothing.
    for (VisaFunctionCallButton *button : {m_enable, m_disable, m_discard, m_wait, m_install, m_uninstall})
        button->setFocusPolicy(Qt::NoFocus);

    auto *event = new QHBoxLayout;
    event->addWidget(m_typeLabel);
    event->addWidget(m_type, 1);
    auto *buttons = new QGridLayout;
    buttons->addWidget(m_enable, 0, 0);
    buttons->addWidget(m_disable, 1, 0);
    buttons->addWidget(m_discard, 2, 0);
    buttons->addWidget(m_wait, 0, 1);
    buttons->addWidget(m_install, 1, 1);
    buttons->addWidget(m_uninstall, 2, 1);
    auto *below = new QHBoxLayout;
    below->addWidget(m_mechanism);
    below->addLayout(buttons, 1);
    auto *layout = new QVBoxLayout(this);
    layout->addLayout(event);
    layout->addLayout(below);
    layout->addStretch();
}

void EventTab::setupNames()
{
    setObjectName(QStringLiteral("eventTab"));
    m_typeLabel->setObjectName(QStringLiteral("eventTypeLabel"));
    m_type->setObjectName(QStringLiteral("eventType"));
    m_mechanism->setObjectName(QStringLiteral("eventMechanism"));
    m_enable->setObjectName(QStringLiteral("eventEnable"));
    m_disable->setObjectName(QStringLiteral("eventDisable"));
    m_discard->setObjectName(QStringLiteral("eventDiscard"));
    m_wait->setObjectName(QStringLiteral("eventWait"));
    m_install->setObjectName(QStringLiteral("eventInstall"));
    m_uninstall->setObjectName(QStringLiteral("eventUninstall"));

    m_type->setAccessibleName(tr("Event type"));
}

void EventTab::setupTexts()
{
    m_typeLabel->setText(tr("Eventtype:"));
    m_type->setToolTip(tr("The kind of event that the buttons are about."));
    m_enable->setText(tr("Enable Event"));
    m_enable->setToolTip(tr("Let the session receive such events, by the mechanism chosen."));
    m_disable->setText(tr("Disable Event"));
    m_disable->setToolTip(tr("Receive no more of them; those that wait in the queue stay."));
    m_discard->setText(tr("Discard Event"));
    m_discard->setToolTip(tr("Throw away those that wait."));
    m_wait->setText(tr("Wait On Event"));
    m_wait->setToolTip(tr("Fetch one from the queue, waiting 2 seconds at most. The log shows it."));
    m_install->setText(tr("Install Handler"));
    m_install->setToolTip(tr("Log such events as they arrive.\n"
                             "Install the handler first, then enable the event with the mechanism \"Handler\"."));
    m_uninstall->setText(tr("Uninstall Handler"));
    m_uninstall->setToolTip(tr("Log them no more."));
}

void EventTab::visaFunctionCallFinished(_visaFunctionCall &) {}
