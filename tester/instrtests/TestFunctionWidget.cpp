#include "instrtests/TestFunctionWidget.h"

#include "finder/ResourceDialog.h"
#include "instrtests/visatestfunctions.h"
#include "panels/ComboBoxParamerter.h"
#include "panels/LineEditParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <QFontMetrics>
#include <QHBoxLayout>
#include <QLabel>
#include <QMessageBox>
#include <QPointer>
#include <QVBoxLayout>

#include <utility>

namespace
{
constexpr int ResultMargin = 10; // pixels beside the line of the result
constexpr int Spacing = 3;
} // namespace

/// Hears which requests the handler takes, from the moment a button asks for the slot's number, its last parameter, until
/// the button says that it has sent.
class TestFunctionWidget::SendWatch final : public VisaFunctionCallListener
{
public:
    SendWatch() : VisaFunctionCallListener(nullptr, VisaFunctionCallTyp::All) {}

    void begin(VisaFunctionCallHandler *handler)
    {
        m_taken = false;
        setVisaFunctionCallHandler(handler);
    }

    /// True when a request was taken since begin().
    bool end()
    {
        setVisaFunctionCallHandler(nullptr);
        return std::exchange(m_taken, false);
    }

    void visaFunctionCallFinished(_visaFunctionCall &) override {}
    void newVisaCallStarted(const VisaFunctionCallTyp &) override { m_taken = true; }

private:
    bool m_taken = false;
};

TestFunctionWidget::TestFunctionWidget(unsigned id, VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::StopTest), m_id(id),
      m_watch(std::make_unique<SendWatch>()), m_status(new QLabel(this)), m_resource(new LineEditParameter(this)),
      m_find(new QPushButton(tr("Find Resource"), this)), m_chooser(new ComboBoxParamerter(this)),
      m_start(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::Test, this)),
      m_stop(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::StopTest, this)), m_result(new QLabel(this))
{
    setupUi();
    setupConnections();
}

TestFunctionWidget::~TestFunctionWidget() = default;

void TestFunctionWidget::setupUi()
{
    const QString name = QStringLiteral("test%1").arg(m_id);
    setObjectName(name);
    m_status->setObjectName(name + "Status");
    m_status->setWordWrap(true);
    m_resource->setObjectName(name + "Resource");
    m_resource->setAccessibleName(tr("Resource of test %1").arg(m_id + 1));
    m_resource->setToolTip(tr("VISA resource string or alias of the instrument to test"));
    m_find->setObjectName(name + "Find");
    m_find->setToolTip(tr("Search for resources and pick the one to test."));
    m_chooser->setObjectName(name + "Chooser");
    m_chooser->setAccessibleName(tr("Test %1").arg(m_id + 1));
    m_chooser->setToolTip(tr("The test to run"));
    m_chooser->setParameterType(ComboBoxParamerter::ComboBoxType::DataUInt64);
    fillChooser();

    // Request buttons answer the mouse only, like those of the other pages.
    m_start->setObjectName(name + "Start");
    m_start->setText(tr("Start Test"));
    m_start->setToolTip(tr("Open the resource in a session of its own and run the test. Its results go to the log."));
    m_start->setFocusPolicy(Qt::NoFocus);
    m_stop->setObjectName(name + "Stop");
    m_stop->setText(tr("Stop Test"));
    m_stop->setToolTip(tr("End the test at its next step. The performance test runs to its end."));
    m_stop->setFocusPolicy(Qt::NoFocus);
    m_stop->setEnabled(false);
    m_result->setObjectName(name + "Result");
    m_result->setMinimumHeight(QFontMetrics(QFont()).height() + ResultMargin);

    auto *resource = new QHBoxLayout;
    resource->addWidget(m_resource);
    resource->addWidget(m_find);
    auto *test = new QHBoxLayout;
    test->addWidget(m_chooser, 10);
    test->addWidget(m_start);
    test->addWidget(m_stop);
    auto *layout = new QVBoxLayout(this);
    layout->setContentsMargins(0, 0, 0, 0); // the page has its own
    layout->setSpacing(Spacing);
    layout->addWidget(m_status);
    layout->addLayout(resource);
    layout->addLayout(test);
    layout->addWidget(m_result);
}

void TestFunctionWidget::setupConnections()
{
    m_start->setParameter(m_resource);
    m_start->setParameter(m_chooser);
    m_start->setParameter(this);
    m_stop->setParameter(this);
    connect(m_start, &VisaFunctionCallButton::functionCallSended, this, &TestFunctionWidget::testStarted);
    connect(m_stop, &VisaFunctionCallButton::functionCallSended, this, &TestFunctionWidget::stopTestClicked);
    connect(m_find, &QPushButton::clicked, this, &TestFunctionWidget::findResourceClicked);
}

void TestFunctionWidget::fillChooser()
{
    const _visatest *tests = nullptr;
    unsigned count = 0;
    getListOfTests(&tests, &count);
    for (unsigned i = 0; i < count; ++i)
        m_chooser->addItem(QString::fromUtf8(tests[i].name),
                           static_cast<qulonglong>(reinterpret_cast<quintptr>(tests[i].function)));
}

void TestFunctionWidget::setResourceText(const QString &name)
{
    m_resource->setText(name);
}

void TestFunctionWidget::setResourceFixed()
{
    m_resource->setReadOnly(true);
    m_resource->setToolTip(tr("The resource of the session, as typed above"));
}

void TestFunctionWidget::enableFindButton(bool enable)
{
    m_find->setVisible(enable);
}

bool TestFunctionWidget::getParameter(Parameter &parameter)
{
    parameter.uintValue = m_id;
    m_watch->begin(m_handler);
    return true;
}

void TestFunctionWidget::testStarted()
{
    m_running = m_watch->end();
    m_start->setEnabled(false);
    m_stop->setEnabled(true);
    showResult(tr("Running %1").arg(m_chooser->currentText()), Qt::black);
    if (!m_running)
        m_status->setText(tr("Not started: another call is running. Press \"Stop Test\", then start again."));
}

void TestFunctionWidget::stopTestClicked()
{
    const bool taken = m_watch->end();
    setCursor(Qt::WaitCursor);
    // Either way the lock is gone afterwards, which nobody would clear before the test ends.
    sendUnlocked(taken ? VisaFunctionCallTyp::ParseRsrc : VisaFunctionCallTyp::StopTest);
    if (!m_running)
        becomeIdle(); // there is no test whose end could do it
}

void TestFunctionWidget::visaFunctionCallFinished(_visaFunctionCall &call)
{
    const auto &[id, result, unused] = call.parameter;
    if (call.type != VisaFunctionCallTyp::StopTest || id.uintValue != m_id)
        return;
    becomeIdle();
    if (call.status == 0 && result.uintValue == 0)
        return;
    showResult(tr("Error occurred"), Qt::red);
    warn();
}

void TestFunctionWidget::becomeIdle()
{
    m_running = false;
    setCursor(Qt::ArrowCursor);
    m_start->setEnabled(true);
    m_stop->setEnabled(false);
    m_status->clear();
    m_result->clear();
}

void TestFunctionWidget::showResult(const QString &text, Qt::GlobalColor color)
{
    QPalette palette = m_result->palette();
    palette.setColor(QPalette::WindowText, color);
    m_result->setPalette(palette);
    m_result->setText(text);
}

void TestFunctionWidget::warn()
{
    // The page may go away while the box is open; nothing here is touched after it.
    const QPointer<QMessageBox> box(new QMessageBox(QMessageBox::Warning, tr("An error occurred"),
                                                    tr("Test aborted due to a VISA error!"), QMessageBox::Ok, this));
    box->setObjectName(QStringLiteral("testAborted"));
    box->exec();
    delete box;
}

void TestFunctionWidget::findResourceClicked()
{
    const QPointer<ResourceDialog> dialog(new ResourceDialog(m_handler, this));
    if (dialog->exec() == QDialog::Accepted && dialog)
        setResourceText(dialog->getSelectedResource());
    delete dialog;
}

void TestFunctionWidget::sendUnlocked(VisaFunctionCallTyp type)
{
    _visaFunctionCall call;
    call.type = type;
    call.parameter[0].uintValue = m_id;
    sendVisaFunctionCall(call);
}
