#pragma once

#include "app/File.h"
#include "app/PageTabs.h"
#include "instrtests/TestTab.h"
#include "log/LogTextDisplay.h"
#include "panels/AttributesTab.h"
#include "panels/BasicTab.h"
#include "panels/EventTab.h"
#include "panels/GpibTab.h"
#include "panels/LockTab.h"
#include "panels/ResourceFrame.h"
#include "panels/ResourceName.h"
#include "pipeline/VisaFunctionCallHandler.h"
#include "pipeline/VisaSessionWorker.h"
#include "pipeline/VisaThread.h"

#include <QWidget>

class LogFile;
class VisaDispatcher;

/**
 * One VISA session with everything around it: handler, worker and thread, the resource frame, the live log, the pages,
 * and the store of what survives the run.
 *
 * The rings inside the members make it very large: it lives on the heap. The order of the members is the order in which
 * they are built, and backwards the one in which they end. It ends like this:
 *
 *     close the handler         the worker finishes its call and leaves
 *     save the store            before anything can go wrong
 *     wait 4000 ms at most      a worker that is stuck in the VISA library must not keep the program alive:
 *                               the process ends at once, with status 55
 *     destroy the members
 */
class SessionInstanceTab : public QWidget
{
    Q_OBJECT

public:
    static constexpr int WorkerStuckStatus = 55; ///< exit status of the process

    SessionInstanceTab(VisaDispatcher *dispatcher, QWidget *parent);
    ~SessionInstanceTab() override;

    VisaFunctionCallHandler *getVisaFunctionCallHandler() { return &m_handler; }
    ResourceName *getResourceName() { return &m_resourceName; }
    LogFile *getLogFile() { return m_worker.getLogFile(); }

    void openRM() { m_worker.openRM(); }
    void closeRM() { m_worker.closeRM(); }

protected:
    /// Hotkeys of the basic page, pressed somewhere else in the tab.
    void keyPressEvent(QKeyEvent *event) override;

private:
    void setupUi();
    void addPage(QWidget &page, const QString &label);
    void setupConnections();

    VisaFunctionCallHandler m_handler;
    VisaSessionWorker m_worker;
    ResourceFrame m_resourceFrame;
    LogTextDisplay m_logTextDisplay;
    PageTabs m_tabWidget;
    BasicTab m_basicTab;
    LockTab m_lockTab;
    AttributesTab m_attributesTab;
    EventTab m_eventTab;
    GpibTab m_gpibTab;
    TestTab m_testTab;
    ResourceName m_resourceName;
    File m_file;
    VisaThread m_thread;
};
