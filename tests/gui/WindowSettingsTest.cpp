#include "gui/support/StandinWindowTest.h"

#include "app/MainWindow.h"

#include <visa.h>

#include <QAction>
#include <QGuiApplication>
#include <QScreen>
#include <QSettings>
#include <QToolBar>

namespace
{

class WindowSettings : public StandinWindowTest
{
protected:
    WindowSettings()
    {
        // QSettings looks the folder up once a process; with several tests in one process it is emptied instead.
        QSettings().clear();
    }
};

TEST_F(WindowSettings, FirstStartIs750By480CentredAndNotMaximised)
{
    openWindow();
    EXPECT_EQ(window().size(), QSize(750, 480));
    EXPECT_FALSE(window().isMaximized());
    const QRect screen = QGuiApplication::primaryScreen()->geometry();
    // The window's frame is the window manager's; offscreen there is none.
    EXPECT_NEAR(window().pos().x(), (screen.right() - screen.left()) / 2 - 749 / 2, 2);
    EXPECT_NEAR(window().pos().y(), (screen.bottom() - screen.top()) / 2 - 479 / 2, 2);
}

TEST_F(WindowSettings, SizeAndPlaceSurviveARestart)
{
    openWindow();
    window().resize(900, 600); // acts as the system: the user drags a corner of the frame
    window().move(37, 41);     // acts as the system: the user drags the title bar
    closeWindow();
    openWindow();
    EXPECT_EQ(window().size(), QSize(900, 600));
    EXPECT_EQ(window().pos(), QPoint(37, 41));
    EXPECT_FALSE(window().isMaximized());
}

TEST_F(WindowSettings, AMaximisedWindowComesBackMaximised)
{
    openWindow();
    window().showMaximized(); // acts as the system: the user presses the frame's button
    ASSERT_TRUE(eventually([this] { return window().isMaximized(); }));
    closeWindow();
    openWindow();
    EXPECT_TRUE(window().isMaximized());
}

TEST_F(WindowSettings, AreKeptUnderTheirNames)
{
    openWindow();
    closeWindow();
    QSettings settings;
    EXPECT_EQ(settings.value("MainWindow/size").toSize(), QSize(750, 480));
    EXPECT_TRUE(settings.contains("MainWindow/pos"));
    EXPECT_EQ(settings.value("MainWindow/fullscreen").toBool(), false);
}

TEST_F(WindowSettings, GarbageInTheSettingsStillOpensAWindow)
{
    QSettings().setValue("MainWindow/size", "huge"); // acts as the system: a damaged settings file
    const QByteArray garbage("\xff\xfe\x00", 3);
    QSettings().setValue("MainWindow/pos", garbage);          // acts as the system: a damaged settings file
    QSettings().setValue("MainWindow/fullscreen", "perhaps"); // acts as the system: a damaged settings file
    openWindow();
    EXPECT_TRUE(window().isVisible());
}

TEST_F(WindowSettings, ToolBarHasItsFourActionsInOrder)
{
    openWindow();
    auto *bar = window().findChild<QToolBar *>();
    ASSERT_NE(bar, nullptr);
    QStringList texts;
    for (const QAction *action : bar->actions())
        texts << action->text();
    EXPECT_EQ(texts, (QStringList{"Find Resource", "Logging", "KyVisa Config", "KyVisa TraceTool"}));
}

TEST_F(WindowSettings, AToolThatIsNotInstalledIsNoMatter)
{
    openWindow();
    auto *bar = window().findChild<QToolBar *>();
    for (int i : {2, 3}) {
        QWidget *button = bar->widgetForAction(bar->actions().at(i));
        button->setObjectName("tool"); // acts as the system: gives the button a name to press it by
        press("tool");
        button->setObjectName(QString());
    }
    meanwhile();
    EXPECT_TRUE(window().isVisible());
}

TEST_F(WindowSettings, TwoWindowsOneAfterTheOtherWork)
{
    for (int i = 0; i < 2; ++i) {
        standin::reset();
        standin::setTextAttribute(VI_ATTR_RSRC_MANF_NAME, "Acme");
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500806);
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4015, 2);
        openWindow();
        ASSERT_TRUE(eventually([this] { return window().windowTitle() != "KyVisaTester 5.8.6"; }));
        closeWindow();
        EXPECT_EQ(standin::openObjects(), 0u);
    }
}

} // namespace
