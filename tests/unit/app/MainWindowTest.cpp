#include "app/MainWindow.h"
#include "pipeline/VisaDispatcher.h"
#include "support/EventLoop.h"
#include "support/StartedProgram.h"
#include "support/standin/Standin.h"

#include <visa.h>

#include <QAction>
#include <QGuiApplication>
#include <QLabel>
#include <QPushButton>
#include <QScreen>
#include <QSettings>
#include <QStatusBar>
#include <QTest>
#include <QToolBar>

#include <gtest/gtest.h>

#include <memory>

namespace
{
class MainWindowTest : public testing::Test
{
protected:
    MainWindowTest()
    {
        standin::reset();
        QSettings().clear();
        standin::setTextAttribute(VI_ATTR_RSRC_MANF_NAME, "Acme");
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500100);
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4015, 2);
    }

    ~MainWindowTest() override
    {
        if (m_gate)
            m_gate->open();
    }

    /// The library holds back the answers for the title, so that the test can be quicker.
    void holdAnswers()
    {
        m_gate = std::make_shared<standin::Gate>();
        standin::script("viGetAttribute", {.gate = m_gate});
    }

    static _visaFunctionCall finished(VisaFunctionCallTyp type, ViStatus status = 0)
    {
        _visaFunctionCall call;
        call.type = type;
        call.status = status;
        return call;
    }

    static _visaFunctionCall attribute(std::uint64_t id, std::uint64_t value, const std::string &text = "")
    {
        _visaFunctionCall call = finished(VisaFunctionCallTyp::GetAttribute);
        call.parameter[0].uintValue = id;
        call.parameter[1].uintValue = value;
        call.parameter[1].stringValue = text;
        return call;
    }

    static void deliver(MainWindow &window, _visaFunctionCall call) { window.visaFunctionCallFinished(call); }

    static bool titleBecomes(const MainWindow &window, const char *title)
    {
        return processEventsUntil([&window, title] { return window.windowTitle() == title; });
    }

    std::shared_ptr<standin::Gate> m_gate;
};

const char *const PlainTitle = "KyVisaTester 5.8.6";

TEST_F(MainWindowTest, OpensCentredAt750By480WithThePlainTitle)
{
    holdAnswers();
    MainWindow window(nullptr);
    EXPECT_EQ(window.size(), QSize(750, 480));
    EXPECT_FALSE(window.isMaximized());
    EXPECT_EQ(window.windowTitle(), "KyVisaTester 5.8.6");
    const QRect screen = QGuiApplication::primaryScreen()->geometry();
    EXPECT_EQ(window.pos(), QPoint((screen.width() - 1) / 2 - 749 / 2, (screen.height() - 1) / 2 - 479 / 2));
    m_gate->open();
}

TEST_F(MainWindowTest, IsCentredForTheStoredSizeWhileNoPositionIsStored)
{
    QSettings().setValue("MainWindow/size", QSize(640, 500));
    MainWindow window(nullptr);
    const QRect screen = QGuiApplication::primaryScreen()->geometry();
    EXPECT_EQ(window.pos(), QPoint((screen.width() - 1) / 2 - 639 / 2, (screen.height() - 1) / 2 - 499 / 2));
}

TEST_F(MainWindowTest, OwnsTheDispatcher)
{
    const MainWindow window(nullptr);
    EXPECT_EQ(VisaDispatcher::getVisaDispatcherInstance(nullptr)->parent(), &window);
}

TEST_F(MainWindowTest, NamesTheVisaImplementationInItsTitle)
{
    MainWindow window(nullptr);
    EXPECT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"));
    const auto asked = standin::calls("viGetAttribute");
    ASSERT_GE(asked.size(), 3u);
    EXPECT_EQ(asked[0].numbers.at(0), 0xBFFF0174u);
    EXPECT_EQ(asked[1].numbers.at(0), 0x3FFF0003u);
    EXPECT_EQ(asked[2].numbers.at(0), 0x3FFF0175u);
}

TEST_F(MainWindowTest, ShowsThreeFieldsOfTheVersion)
{
    standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0xFEDCBA98);
    MainWindow window(nullptr);
    EXPECT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from Acme (4077.3258.152)"));
}

TEST_F(MainWindowTest, ShowsAVersionOfZeroAsSuch)
{
    standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0);
    standin::setTextAttribute(VI_ATTR_RSRC_MANF_NAME, "M\xC3\xBCller 100%1");
    MainWindow window(nullptr);
    EXPECT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from M\xC3\xBCller 100%1 (0.0.0)"));
}

TEST_F(MainWindowTest, KeepsThePlainTitleWhenTheFirstAnswerFails)
{
    standin::script("viGetAttribute", {.status = VI_ERROR_NSUP_ATTR});
    MainWindow window(nullptr);
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viGetAttribute").size() >= 3; }));
    auto *label = window.findChild<QLabel *>("statusLabel");
    ASSERT_TRUE(processEventsUntil([label] { return label->text() == "Status: VI_SUCCESS"; }));
    EXPECT_EQ(window.windowTitle(), PlainTitle);
}

TEST_F(MainWindowTest, AnyFailingCallEndsTheTitle)
{
    holdAnswers();
    MainWindow window(nullptr);
    deliver(window, attribute(0xBFFF0174, 0, "Acme"));
    deliver(window, finished(VisaFunctionCallTyp::Clear, VI_ERROR_TMO));
    deliver(window, attribute(0x3FFF0175, 1));
    EXPECT_EQ(window.windowTitle(), PlainTitle);
    m_gate->open();
}

TEST_F(MainWindowTest, APositiveStatusEndsTheTitleToo)
{
    holdAnswers();
    MainWindow window(nullptr);
    deliver(window, finished(VisaFunctionCallTyp::Read, VI_SUCCESS_MAX_CNT));
    deliver(window, attribute(0x3FFF0175, 1));
    EXPECT_EQ(window.windowTitle(), PlainTitle);
    m_gate->open();
}

TEST_F(MainWindowTest, AnotherAttributeThatComesFirstEndsTheTitle)
{
    holdAnswers();
    MainWindow window(nullptr);
    deliver(window, attribute(0x3FFF001A, 2000));
    deliver(window, attribute(0x3FFF0175, 1));
    EXPECT_EQ(window.windowTitle(), PlainTitle);
    m_gate->open();
}

TEST_F(MainWindowTest, ARefusedRequestEndsTheTitle)
{
    holdAnswers();
    MainWindow window(nullptr);
    ASSERT_TRUE(m_gate->waitForArrival());
    for (int i = 0; i < 342; ++i) // with the first three, more requests than the ring has room for
        window.updateTitle();
    deliver(window, attribute(0xBFFF0174, 0, "Acme"));
    deliver(window, attribute(0x3FFF0175, 1));
    EXPECT_EQ(window.windowTitle(), PlainTitle);
    m_gate->open();
}

TEST_F(MainWindowTest, OtherSuccessfulCallsLeaveTheTitlePending)
{
    holdAnswers();
    MainWindow window(nullptr);
    deliver(window, finished(VisaFunctionCallTyp::Open));
    deliver(window, attribute(0xBFFF0174, 0, "Acme"));
    deliver(window, finished(VisaFunctionCallTyp::GetAttributeDef));
    deliver(window, attribute(0x3FFF0003, 0x00100203));
    EXPECT_EQ(window.windowTitle(), PlainTitle);
    deliver(window, attribute(0x3FFF0175, 1));
    EXPECT_EQ(window.windowTitle(), "KyVisaTester 5.8.6 Visa from Acme (1.2.3)");
    deliver(window, attribute(0xBFFF0174, 0, "Other"));
    deliver(window, attribute(0x3FFF0175, 1));
    EXPECT_EQ(window.windowTitle(), "KyVisaTester 5.8.6 Visa from Acme (1.2.3)");
    m_gate->open();
}

TEST_F(MainWindowTest, SaysWhatRunsAndWhatFinished)
{
    MainWindow window(nullptr);
    EXPECT_EQ(window.statusBar()->currentMessage(), "Running function"); // the title's requests
    ASSERT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"));
    EXPECT_EQ(window.statusBar()->currentMessage(), "Function finished");
    window.newVisaCallStarted(VisaFunctionCallTyp::Read);
    EXPECT_EQ(window.statusBar()->currentMessage(), "Running function");
    deliver(window, finished(VisaFunctionCallTyp::Read, VI_ERROR_TMO));
    EXPECT_EQ(window.statusBar()->currentMessage(), "Function finished");
    EXPECT_TRUE(QTest::qWaitFor([&window] { return window.statusBar()->currentMessage().isEmpty(); }, 30000));
}

TEST_F(MainWindowTest, MessagesLeaveTheStatusLabelInPlace)
{
    MainWindow window(nullptr);
    window.show();
    deliver(window, finished(VisaFunctionCallTyp::Read));
    ASSERT_EQ(window.statusBar()->currentMessage(), "Function finished");
    EXPECT_TRUE(window.findChild<QLabel *>("statusLabel")->isVisible());
}

TEST_F(MainWindowTest, OffersFourToolsInOrder)
{
    MainWindow window(nullptr);
    const auto *bar = window.findChild<QToolBar *>("toolBar");
    ASSERT_TRUE(bar);
    QStringList texts;
    for (const QAction *action : bar->actions())
        texts << action->text();
    EXPECT_EQ(texts, QStringList({"Find Resource", "Logging", "KyVisa Config", "KyVisa TraceTool"}));
}

TEST_F(MainWindowTest, ToolsStartTheirProgramsWithoutArguments)
{
    MainWindow window(nullptr);
    const StartedProgram started;
    QTest::mouseClick(window.findChild<QWidget *>("actionKyVisaConfigButton"), Qt::LeftButton);
    EXPECT_EQ(started.commandLine(), "/usr/bin/KyVisaConfigure");
    QTest::mouseClick(window.findChild<QWidget *>("actionKyVisaTraceToolButton"), Qt::LeftButton);
    EXPECT_EQ(started.commandLine(), "/usr/bin/KyVisaTraceTool");
}

TEST_F(MainWindowTest, AToolThatIsNotInstalledIsPassedOverInSilence)
{
    MainWindow window(nullptr);
    window.kyVisaConfigClicked();
    window.kyVisaTraceToolClicked();
    EXPECT_EQ(QApplication::activeModalWidget(), nullptr);
}

TEST_F(MainWindowTest, HooksDoNothing)
{
    MainWindow window(nullptr);
    ASSERT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"));
    const auto before = standin::calls().size();
    window.chooseImplementation();
    window.changeVisa(1);
    EXPECT_EQ(standin::calls().size(), before);
}

TEST_F(MainWindowTest, RemembersSizeAndPosition)
{
    {
        MainWindow window(nullptr);
        window.resize(900, 610);
        window.move(33, 44);
    }
    QSettings settings;
    EXPECT_EQ(settings.value("MainWindow/size").toSize(), QSize(900, 610));
    EXPECT_EQ(settings.value("MainWindow/pos").toPoint(), QPoint(33, 44));
    EXPECT_EQ(settings.value("MainWindow/fullscreen").toBool(), false);
    MainWindow window(nullptr);
    EXPECT_EQ(window.size(), QSize(900, 610));
    EXPECT_EQ(window.pos(), QPoint(33, 44));
}

TEST_F(MainWindowTest, RemembersThatItWasMaximised)
{
    {
        MainWindow window(nullptr);
        window.showMaximized();
    }
    EXPECT_TRUE(QSettings().value("MainWindow/fullscreen").toBool());
    MainWindow window(nullptr);
    EXPECT_TRUE(window.isMaximized());
}

TEST_F(MainWindowTest, TakesSizeAndPositionAsTheyAreStored)
{
    {
        QSettings settings;
        settings.setValue("MainWindow/size", QSize(5000, 4000));
        settings.setValue("MainWindow/pos", QPoint(-3000, 9000));
    }
    MainWindow window(nullptr);
    EXPECT_EQ(window.size(), QSize(5000, 4000));
    EXPECT_EQ(window.pos(), QPoint(-3000, 9000));
}

TEST_F(MainWindowTest, AStoredSizeOfNothingStillShowsAWindow)
{
    QSettings().setValue("MainWindow/size", QSize(0, 0));
    MainWindow window(nullptr);
    window.show();
    EXPECT_GE(window.width(), window.minimumSizeHint().width());
    EXPECT_GE(window.height(), window.minimumSizeHint().height());
}

TEST_F(MainWindowTest, StartsOnSettingsThatMakeNoSense)
{
    {
        QSettings settings;
        settings.setValue("MainWindow/size", "large");
        settings.setValue("MainWindow/pos", QByteArray("\xFF\x00", 2));
        settings.setValue("MainWindow/fullscreen", 17.5);
    }
    MainWindow window(nullptr);
    window.show();
    EXPECT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"));
}

TEST_F(MainWindowTest, ALostConnectionClosesTheSessionAndBringsConnectBack)
{
    MainWindow window(nullptr);
    ASSERT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"));
    auto *connect = window.findChild<QPushButton *>("resourceConnect");
    auto *disconnect = window.findChild<QPushButton *>("resourceDisconnect");
    QTest::mouseClick(connect, Qt::LeftButton);
    ASSERT_TRUE(processEventsUntil([&] { return !disconnect->isHidden(); }));
    standin::script("viReadSTB", {.status = VI_ERROR_CONN_LOST});
    QTest::mouseClick(window.findChild<QPushButton *>("basicReadStb"), Qt::LeftButton);
    EXPECT_TRUE(processEventsUntil([&] { return !connect->isHidden(); }));
    EXPECT_EQ(standin::calls("viClose").size(), 1u);
}

TEST_F(MainWindowTest, WindowsOneAfterTheOtherEachHaveTheirSession)
{
    for (int i = 0; i < 3; ++i) {
        MainWindow window(nullptr);
        EXPECT_TRUE(titleBecomes(window, "KyVisaTester 5.8.6 Visa from Acme (5.1.0)"));
    }
}

TEST_F(MainWindowTest, EndsWhileAnswersAreOnTheirWay)
{
    for (int i = 0; i < 20; ++i) {
        MainWindow window(nullptr);
        if (i % 2)
            QCoreApplication::processEvents();
    }
}
} // namespace
