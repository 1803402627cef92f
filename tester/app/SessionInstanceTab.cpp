#include "app/SessionInstanceTab.h"

#include "log/LogFile.h"
#include "log/SessionLog.h"
#include "panels/ObserverLineEdit.h"
#include "panels/ScipiLineEdit.h"

#include <QCheckBox>
#include <QHBoxLayout>
#include <QVBoxLayout>

#include <cstdlib>

namespace
{
constexpr unsigned long long ResourceNameId = 2;
constexpr unsigned long WorkerEndMs = 4000;
} // namespace

SessionInstanceTab::SessionInstanceTab(VisaDispatcher *dispatcher, QWidget *parent)
    : QWidget(parent), m_handler(dispatcher), m_worker(&m_handler), m_resourceFrame(&m_handler, this),
      m_logTextDisplay(&m_handler, this), m_tabWidget(this), m_basicTab(&m_handler, &m_tabWidget),
      m_lockTab(&m_handler, &m_tabWidget), m_attributesTab(&m_handler, &m_tabWidget),
      m_eventTab(&m_handler, &m_tabWidget), m_gpibTab(&m_handler, &m_tabWidget), m_testTab(&m_handler, &m_tabWidget),
      m_resourceName(ResourceNameId)
{
    m_thread.setWorker(&m_worker);
    setupUi();
    setupConnections();
    // The order is part of the file's format.
    m_file.addData(&m_resourceName);
    m_file.addData(m_worker.getLogFile());
    m_file.addData(m_basicTab.getCommandLine());
    m_file.readData();
    m_thread.start();
}

SessionInstanceTab::~SessionInstanceTab()
{
    m_handler.close();
    m_file.saveData();
    if (!m_thread.wait(WorkerEndMs))
        std::_Exit(WorkerStuckStatus); // no destructors below a worker that still runs
}

void SessionInstanceTab::setupUi()
{
    setObjectName(QStringLiteral("sessionTab"));
    m_tabWidget.setObjectName(QStringLiteral("sessionPages"));
    addPage(m_basicTab, tr("Basics"));
    addPage(m_lockTab, tr("Locking"));
    addPage(m_attributesTab, tr("Attributes"));
    addPage(m_eventTab, tr("Events"));
    addPage(m_gpibTab, tr("Gpib"));
    addPage(m_testTab, tr("Tests"));
    m_resourceFrame.setFrameShape(QFrame::Panel);
    m_resourceFrame.setFrameShadow(QFrame::Raised);

    auto *below = new QHBoxLayout;
    below->addWidget(&m_logTextDisplay, 9);
    below->addWidget(&m_tabWidget, 1, Qt::AlignRight);
    auto *layout = new QVBoxLayout(this);
    layout->addWidget(&m_resourceFrame, 1);
    layout->addLayout(below, 20);
}

void SessionInstanceTab::addPage(QWidget &page, const QString &label)
{
    page.setAutoFillBackground(true);
    m_tabWidget.addTab(&page, label);
}

void SessionInstanceTab::setupConnections()
{
    m_logTextDisplay.setQueue(m_worker.getStringMessageQueue());

    // The frame registers its line edit once more: every change of the name reaches it twice.
    m_resourceName.addObserver(m_resourceFrame.getLineEdit());
    m_resourceFrame.setResourceName(&m_resourceName);
    m_testTab.setTestLog(m_worker.getTestLog());
    connect(m_resourceFrame.getLineEdit(), &QLineEdit::textChanged, &m_testTab, &TestTab::resourceNameChanged);

    SessionLog *log = m_worker.getLog();
    const QCheckBox *show = m_resourceFrame.getShowLog();
    const QCheckBox *write = m_resourceFrame.getWriteLog();
    connect(show, &QCheckBox::toggled, log, &SessionLog::showLog, Qt::QueuedConnection);
    connect(write, &QCheckBox::toggled, log, &SessionLog::writeLogFile, Qt::QueuedConnection);
    log->showLog(show->isChecked());
    log->writeLogFile(write->isChecked());
}

void SessionInstanceTab::keyPressEvent(QKeyEvent *event)
{
    if (m_basicTab.isVisible())
        m_basicTab.keyPressEvent(event);
}
