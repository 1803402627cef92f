#include "app/MainWindow.h"

#include "app/SessionInstanceTab.h"
#include "finder/ResourceDialog.h"
#include "log/LogFileOptionsDialog.h"
#include "panels/StatusLabel.h"
#include "pipeline/VisaDispatcher.h"

#include <visa.h>

#include <QAction>
#include <QGuiApplication>
#include <QPointer>
#include <QProcess>
#include <QScreen>
#include <QSettings>
#include <QStatusBar>
#include <QToolBar>

namespace
{
constexpr int FinishedMessageMs = 4000;
const QSize DefaultSize(750, 480);
} // namespace

MainWindow::MainWindow(QWidget *parent)
    : QMainWindow(parent), VisaFunctionCallListener(nullptr, VisaFunctionCallTyp::All),
      m_dispatcher(VisaDispatcher::getVisaDispatcherInstance(this))
{
    setObjectName(QStringLiteral("mainWindow"));
    setPlainTitle();
    readSettings();
    setupUi();
    setupConnections();
    setVisaFunctionCallHandler(m_sessionTab->getVisaFunctionCallHandler());
    updateTitle();
}

MainWindow::~MainWindow()
{
    writeSettings();
    setVisaFunctionCallHandler(nullptr);
    delete m_sessionTab; // its worker uses the dispatcher, which is the first of the other children
}

void MainWindow::readSettings()
{
    QSettings settings;
    settings.beginGroup(QStringLiteral("MainWindow"));
    const bool fullscreen = settings.value(QStringLiteral("fullscreen"), isMaximized()).toBool();
    resize(settings.value(QStringLiteral("size"), DefaultSize).toSize());
    if (const QScreen *screen = QGuiApplication::primaryScreen())
        move(screen->geometry().center() - rect().center());
    move(settings.value(QStringLiteral("pos"), pos()).toPoint());
    settings.endGroup();
    if (fullscreen)
        showMaximized();
}

void MainWindow::writeSettings()
{
    QSettings settings;
    settings.beginGroup(QStringLiteral("MainWindow"));
    settings.setValue(QStringLiteral("size"), QSize(width(), height()));
    settings.setValue(QStringLiteral("pos"), pos());
    settings.setValue(QStringLiteral("fullscreen"), isMaximized());
    settings.endGroup();
}

void MainWindow::setupUi()
{
    m_sessionTab = new SessionInstanceTab(m_dispatcher, this);
    setCentralWidget(m_sessionTab);

    auto *toolBar = new QToolBar(tr("Tools"), this);
    toolBar->setObjectName(QStringLiteral("toolBar"));
    const auto addAction = [toolBar](const QString &text, const char *name, const QString &toolTip) {
        QAction *action = toolBar->addAction(text);
        action->setObjectName(QLatin1String(name));
        action->setToolTip(toolTip);
        toolBar->widgetForAction(action)->setObjectName(QLatin1String(name) + QLatin1String("Button"));
        return action;
    };
    connect(addAction(tr("Find Resource"), "actionFindResource", tr("Search for instruments.")), &QAction::triggered,
            this, &MainWindow::findResource);
    connect(addAction(tr("Logging"), "actionLogging", tr("Choose the log file and its folder.")), &QAction::triggered,
            this, &MainWindow::showLoggingDialog);
    connect(addAction(tr("KyVisa Config"), "actionKyVisaConfig", tr("Configure the VISA library.")),
            &QAction::triggered, this, &MainWindow::kyVisaConfigClicked);
    connect(addAction(tr("KyVisa TraceTool"), "actionKyVisaTraceTool", tr("Watch the calls of VISA programs.")),
            &QAction::triggered, this, &MainWindow::kyVisaTraceToolClicked);

    VisaFunctionCallHandler *handler = m_sessionTab->getVisaFunctionCallHandler();
    m_statusLabel = new StatusLabel(handler, this);
    m_statusLabel->setVisaFunctionCallHandler(handler);
    m_statusLabel->setDefault();
    auto *statusBar = new QStatusBar(this);
    statusBar->setObjectName(QStringLiteral("statusBar"));
    statusBar->addPermanentWidget(m_statusLabel);
    setStatusBar(statusBar);
    addToolBar(toolBar);
}

/// Nothing to connect beyond what the widgets' set-up connects.
void MainWindow::setupConnections() {}

// Both dialogs may end with the window, while their event loops run.

void MainWindow::findResource()
{
    const QPointer<ResourceDialog> dialog(new ResourceDialog(m_sessionTab->getVisaFunctionCallHandler(), this));
    if (dialog->exec() == QDialog::Accepted && dialog)
        m_sessionTab->getResourceName()->setName(dialog->getSelectedResource());
    delete dialog;
}

void MainWindow::showLoggingDialog()
{
    const QPointer<LogFileOptionsDialog> dialog(new LogFileOptionsDialog(m_sessionTab->getLogFile(), this));
    dialog->setModal(true);
    dialog->exec();
    delete dialog; // applies what was chosen
}

void MainWindow::kyVisaConfigClicked()
{
    QProcess::startDetached(QStringLiteral("/usr/bin/KyVisaConfigure"), {});
}

void MainWindow::kyVisaTraceToolClicked()
{
    QProcess::startDetached(QStringLiteral("/usr/bin/KyVisaTraceTool"), {});
}

void MainWindow::updateTitle()
{
    for (const std::uint64_t attribute : {VI_ATTR_RSRC_MANF_NAME, VI_ATTR_RSRC_IMPL_VERSION, VI_ATTR_RSRC_MANF_ID}) {
        _visaFunctionCall call;
        call.type = VisaFunctionCallTyp::GetAttribute;
        call.parameter[0].uintValue = attribute;
        if (!sendVisaFunctionCall(call)) {
            m_titleDone = true;
            return;
        }
    }
}

/// A hook without behaviour.
void MainWindow::chooseImplementation() {}

/// A hook without behaviour.
void MainWindow::changeVisa(unsigned short) {}

void MainWindow::newVisaCallStarted(const VisaFunctionCallTyp &)
{
    statusBar()->showMessage(tr("Running function"));
}

void MainWindow::visaFunctionCallFinished(_visaFunctionCall &call)
{
    statusBar()->showMessage(tr("Function finished"), FinishedMessageMs);
    if (m_titleDone)
        return;
    if (call.status != 0) {
        m_titleDone = true;
        return;
    }
    if (call.type != VisaFunctionCallTyp::GetAttribute)
        return;
    switch (call.parameter[0].uintValue) {
    case VI_ATTR_RSRC_MANF_NAME:
        m_manufacturer = QString::fromStdString(call.parameter[1].stringValue);
        break;
    case VI_ATTR_RSRC_IMPL_VERSION:
        m_implVersion = static_cast<unsigned>(call.parameter[1].uintValue);
        break;
    case VI_ATTR_RSRC_MANF_ID:
        composeTitle();
        m_titleDone = true;
        break;
    default: // somebody's own attribute came first
        m_titleDone = true;
        break;
    }
}

void MainWindow::setPlainTitle()
{
    setWindowTitle(QStringLiteral("%1 %2").arg(QStringLiteral("KyVisaTester"), QStringLiteral("5.8.6")));
}

void MainWindow::composeTitle()
{
    setPlainTitle();
    const QString version = QStringLiteral("%1.%2.%3")
                                .arg(m_implVersion >> 20 & 0xFFF)
                                .arg(m_implVersion >> 8 & 0xFFF)
                                .arg(m_implVersion & 0xFF);
    setWindowTitle(windowTitle() + tr(" Visa from ") + m_manufacturer + QStringLiteral(" (") + version +
                   QLatin1Char(')'));
}
