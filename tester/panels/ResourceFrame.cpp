#include "panels/ResourceFrame.h"

#include "panels/ObserverLineEdit.h"
#include "panels/OpenModeParameter.h"
#include "panels/ResourceName.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <QCheckBox>
#include <QHBoxLayout>
#include <QLabel>
#include <QVBoxLayout>

ResourceFrame::ResourceFrame(VisaFunctionCallHandler *handler, QWidget *parent)
    : QFrame(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::Open),
      m_resource(new ObserverLineEdit(this)),
      m_connect(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Open, this)),
      m_disconnect(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Close, this)),
      m_accessMode(new OpenModeParameter(nullptr)), m_timeout(new SpinBoxParameter(this)),
      m_showLog(new QCheckBox(tr("Show Log"), this)), m_writeLog(new QCheckBox(tr("Write Log"), this))
{
    listenToType(VisaFunctionCallTyp::Close);
    setupUi();

    m_connect->setParameter(m_resource);
    m_connect->setParameter(m_accessMode);
    m_connect->setParameter(m_timeout);
    connect(m_resource, &QLineEdit::returnPressed, m_connect, &QPushButton::click);
    connect(m_connect, &QPushButton::clicked, this, &ResourceFrame::newResourceName);
}

void ResourceFrame::setupUi()
{
    setObjectName(QStringLiteral("resourceFrame"));

    auto *resourceLabel = new QLabel(tr("Resource"), this);
    resourceLabel->setObjectName(QStringLiteral("resourceLabel"));
    resourceLabel->setBuddy(m_resource);
    m_resource->setObjectName(QStringLiteral("resourceName"));
    m_resource->setAccessibleName(tr("Resource"));
    m_resource->setToolTip(tr("VISA resource string or alias, for example TCPIP::192.168.1.20::hislip0::INSTR"));
    m_resource->setMinimumSize(200, 20);

    // Request buttons answer the mouse only; keeping them out of the tab chain leaves no stop where the keys do nothing.
    m_connect->setObjectName(QStringLiteral("resourceConnect"));
    m_connect->setText(tr("Connect"));
    m_connect->setToolTip(tr("Open a session to the resource."));
    m_connect->setFixedWidth(90);
    m_connect->setFocusPolicy(Qt::NoFocus);
    m_disconnect->setObjectName(QStringLiteral("resourceDisconnect"));
    m_disconnect->setText(tr("Disconnect"));
    m_disconnect->setToolTip(tr("Close the session."));
    m_disconnect->setFixedWidth(90);
    m_disconnect->setFocusPolicy(Qt::NoFocus);
    m_disconnect->hide();

    auto *timeoutLabel = new QLabel(tr("Timeout"), this);
    timeoutLabel->setObjectName(QStringLiteral("openTimeoutLabel"));
    timeoutLabel->setBuddy(m_timeout);
    m_timeout->setObjectName(QStringLiteral("openTimeout"));
    m_timeout->setAccessibleName(tr("Timeout"));
    m_timeout->setToolTip(tr("Time to wait for the open, in milliseconds."));
    m_timeout->setRange(0, 10000000);
    m_timeout->setSingleStep(1000);
    m_timeout->setValue(2000);

    m_showLog->setObjectName(QStringLiteral("showLog"));
    m_showLog->setToolTip(tr("Show each VISA call in the live log."));
    m_showLog->setChecked(true);
    m_writeLog->setObjectName(QStringLiteral("writeLog"));
    m_writeLog->setToolTip(tr("Write each VISA call to the log file."));

    auto *resource = new QVBoxLayout;
    resource->addWidget(resourceLabel);
    resource->addWidget(m_resource);
    auto *buttons = new QHBoxLayout;
    buttons->addWidget(m_connect, 0, Qt::AlignLeft | Qt::AlignBottom);
    buttons->addWidget(m_disconnect, 0, Qt::AlignLeft | Qt::AlignBottom);
    auto *timeout = new QVBoxLayout;
    timeout->addWidget(timeoutLabel);
    timeout->addWidget(m_timeout, 0, Qt::AlignLeft | Qt::AlignBottom);
    auto *logSwitches = new QVBoxLayout;
    logSwitches->addWidget(m_showLog);
    logSwitches->addWidget(m_writeLog);

    auto *row = new QHBoxLayout(this);
    row->addLayout(resource, 1);
    row->addLayout(buttons);
    row->addLayout(m_accessMode);
    row->addLayout(timeout);
    row->addLayout(logSwitches);

    QWidget *previous = m_resource;
    for (QWidget *next :
         {m_accessMode->itemAt(0)->widget(), m_accessMode->itemAt(1)->widget(), static_cast<QWidget *>(m_timeout),
          static_cast<QWidget *>(m_showLog), static_cast<QWidget *>(m_writeLog)}) {
        setTabOrder(previous, next);
        previous = next;
    }
}

void ResourceFrame::setResourceName(ResourceName *name)
{
    name->addObserver(m_resource);
    m_resourceName = name;
}

void ResourceFrame::newResourceName()
{
    if (m_resourceName)
        m_resourceName->setName(m_resource->text());
}

void ResourceFrame::visaFunctionCallFinished(_visaFunctionCall &call)
{
    if (call.type == VisaFunctionCallTyp::Open && call.status >= 0)
        setConnected(true);
    else if (call.type == VisaFunctionCallTyp::Close)
        setConnected(false);
}

void ResourceFrame::setConnected(bool connected)
{
    // The one that goes first: both at once would push the window apart.
    QPushButton *gone = connected ? m_connect : m_disconnect;
    QPushButton *there = connected ? m_disconnect : m_connect;
    gone->hide();
    there->show();
    m_resource->setEnabled(!connected);
}
