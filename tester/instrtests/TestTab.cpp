#include "instrtests/TestTab.h"

#include "instrtests/TestFunctionWidget.h"
#include "log/SessionLog.h"

#include <QCheckBox>
#include <QScrollArea>
#include <QScrollBar>
#include <QVBoxLayout>

namespace
{
constexpr int Spacing = 3; ///< pixels: all of it fits into the window as it opens
}

TestTab::TestTab(VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), m_showLog(new QCheckBox(tr("Show Log"), this)), m_writeLog(new QCheckBox(tr("Write Log"), this)),
      m_sessionTest(new TestFunctionWidget(0, handler, this)), m_otherTest(new TestFunctionWidget(1, handler, this))
{
    setObjectName(QStringLiteral("testTab"));
    m_showLog->setObjectName(QStringLiteral("testShowLog"));
    m_showLog->setToolTip(tr("Show each VISA call of the tests in the live log. Their own lines are always shown."));
    m_writeLog->setObjectName(QStringLiteral("testWriteLog"));
    m_writeLog->setToolTip(tr("Write the lines of the tests to the log file."));
    m_sessionTest->setResourceFixed();
    m_sessionTest->enableFindButton(false);

    auto *column = new QWidget(this);
    auto *layout = new QVBoxLayout(column);
    layout->setSpacing(Spacing);
    layout->addWidget(m_showLog);
    layout->addWidget(m_writeLog);
    layout->addWidget(m_sessionTest);
    layout->addWidget(m_otherTest);
    layout->addStretch();

    // The tallest of the pages: in a large font it is scrolled, and the window keeps its size.
    auto *area = new QScrollArea(this);
    area->setFrameShape(QFrame::NoFrame);
    area->setHorizontalScrollBarPolicy(Qt::ScrollBarAlwaysOff);
    area->setWidgetResizable(true);
    area->setWidget(column);
    area->setMinimumWidth(column->minimumSizeHint().width() + area->verticalScrollBar()->sizeHint().width());
    area->setFocusPolicy(Qt::NoFocus);
    area->viewport()->setAutoFillBackground(false);
    column->setAutoFillBackground(false);
    auto *page = new QVBoxLayout(this);
    page->setContentsMargins(0, 0, 0, 0);
    page->addWidget(area);
}

void TestTab::setTestLog(SessionLog *log)
{
    m_testLog = log;
    m_testLog->showLog(m_showLog->isChecked());
    m_testLog->writeLogFile(m_writeLog->isChecked());
    connect(m_showLog, &QCheckBox::toggled, m_testLog, &SessionLog::showLog);
    connect(m_writeLog, &QCheckBox::toggled, m_testLog, &SessionLog::writeLogFile);
}

void TestTab::resourceNameChanged(const QString &name)
{
    m_sessionTest->setResourceText(name);
}

void TestTab::showTestTwo(bool) {}
