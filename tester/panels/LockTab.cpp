#include "panels/LockTab.h"

#include "panels/LineEditParameter.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QGridLayout>
#include <QLabel>
#include <QLineEdit>

#include <limits>

LockTab::LockTab(VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::SharedLock),
      m_requestedKey(new LineEditParameter(this)), m_requestedKeyLabel(new QLabel(this)),
      m_accessKey(new QLineEdit(this)), m_accessKeyLabel(new QLabel(this)), m_timeout(new SpinBoxParameter(this)),
      m_timeoutLabel(new QLabel(this)),
      m_exclusive(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::ExclusiveLock, this)),
      m_shared(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::SharedLock, this)),
      m_unlock(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Unlock, this)),
      m_local(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GpibControlREN, this)),
      m_remote(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GpibControlREN, this))
{
    m_localMode.setParameterValueUInt(VI_GPIB_REN_DEASSERT_GTL);
    m_remoteMode.setParameterValueUInt(VI_GPIB_REN_ASSERT_ADDRESS);
    m_exclusive->setParameter(m_timeout);
    m_shared->setParameter(m_timeout);
    m_shared->setParameter(m_requestedKey);
    m_local->setParameter(&m_localMode);
    m_remote->setParameter(&m_remoteMode);
    setupUi();
}

void LockTab::setupUi()
{
    setupNames();
    setupTexts();

    m_accessKey->setReadOnly(true);
    m_timeout->setRange(0, std::numeric_limits<int>::max());
    m_timeout->setSingleStep(1000);
    m_timeout->setValue(2000);
    m_requestedKeyLabel->setBuddy(m_requestedKey);
    m_accessKeyLabel->setBuddy(m_accessKey);
    m_timeoutLabel->setBuddy(m_timeout);

    // Request buttons answer the mouse only; keeping them out of the tab chain leaves no stop where the keys do nothing.
    for (VisaFunctionCallButton *button : {m_exclusive, m_shared, m_unlock, m_local, m_remote})
        button->setFocusPolicy(Qt::NoFocus);

    auto *fields = new QGridLayout;
    fields->addWidget(m_requestedKeyLabel, 0, 0);
    fields->addWidget(m_requestedKey, 0, 1);
    fields->addWidget(m_accessKeyLabel, 1, 0);
    fields->addWidget(m_accessKey, 1, 1);
    fields->addWidget(m_timeoutLabel, 2, 0);
    fields->addWidget(m_timeout, 2, 1);
    auto *buttons = new QGridLayout;
    buttons->addWidget(m_exclusive, 0, 0);
    buttons->addWidget(m_shared, 0, 1);
    buttons->addWidget(m_unlock, 0, 2);
    buttons->addWidget(m_local, 1, 0);
    buttons->addWidget(m_remote, 1, 1);
    auto *layout = new QVBoxLayout(this);
    layout->addLayout(fields);
    layout->addLayout(buttons);
    layout->addStretch();

    setTabOrder(m_requestedKey, m_accessKey);
    setTabOrder(m_accessKey, m_timeout);
}

void LockTab::setupNames()
{
    setObjectName(QStringLiteral("lockTab"));
    m_requestedKeyLabel->setObjectName(QStringLiteral("lockRequestedKeyLabel"));
    m_requestedKey->setObjectName(QStringLiteral("lockRequestedKey"));
    m_accessKeyLabel->setObjectName(QStringLiteral("lockAccessKeyLabel"));
    m_accessKey->setObjectName(QStringLiteral("lockAccessKey"));
    m_timeoutLabel->setObjectName(QStringLiteral("lockTimeoutLabel"));
    m_timeout->setObjectName(QStringLiteral("lockTimeout"));
    m_exclusive->setObjectName(QStringLiteral("lockExclusive"));
    m_shared->setObjectName(QStringLiteral("lockShared"));
    m_unlock->setObjectName(QStringLiteral("lockUnlock"));
    m_local->setObjectName(QStringLiteral("lockGoToLocal"));
    m_remote->setObjectName(QStringLiteral("lockGoToRemote"));

    m_requestedKey->setAccessibleName(tr("Requested key"));
    m_accessKey->setAccessibleName(tr("Actual access key"));
    m_timeout->setAccessibleName(tr("Lock timeout"));
}

void LockTab::setupTexts()
{
    m_requestedKeyLabel->setText(tr("Requested Key:"));
    m_requestedKey->setToolTip(
        tr("Key to share a lock with other sessions; the library makes one up when this is empty."));
    m_accessKeyLabel->setText(tr("Actual AccessKey"));
    m_accessKey->setToolTip(tr("Key of the last shared lock: who asks for it shares the lock."));
    m_timeoutLabel->setText(tr("Timeout:"));
    m_timeout->setToolTip(tr("Time to wait for the lock, in milliseconds."));
    m_exclusive->setText(tr("Exclusive Lock"));
    m_exclusive->setToolTip(tr("Lock the resource for this session alone."));
    m_shared->setText(tr("Shared Lock"));
    m_shared->setToolTip(tr("Lock the resource for all sessions that ask for the same key."));
    m_unlock->setText(tr("Unlock"));
    m_unlock->setToolTip(tr("Give the last lock back."));
    m_local->setText(tr("Go to Local"));
    m_local->setToolTip(tr("Let the instrument's front panel control it."));
    m_remote->setText(tr("Go to Remote"));
    m_remote->setToolTip(tr("Let the interface control the instrument."));
}

void LockTab::visaFunctionCallFinished(_visaFunctionCall &call)
{
    if (call.status < 0)
        return;
    m_accessKey->setText(QString::fromStdString(call.parameter[0].stringValue));
}
