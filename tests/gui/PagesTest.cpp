// What all pages have in common.

#include "gui/support/StandinWindowTest.h"

#include "app/MainWindow.h"

#include <QAbstractButton>
#include <QComboBox>
#include <QLabel>
#include <QScrollArea>
#include <QTabWidget>

namespace
{

class Pages : public StandinWindowTest
{
protected:
    struct Page {
        const char *label;
        const char *name;
    };
    static constexpr Page pages[] = {{"Basics", "basicTab"}, {"Locking", "lockTab"}, {"Attributes", "attributesTab"},
                                     {"Events", "eventTab"}, {"Gpib", "gpibTab"},    {"Tests", "testTab"}};

    Pages()
    {
        openWindow();
        connectSession();
    }

    QList<QWidget *> parts(const char *page) const
    {
        QList<QWidget *> visible;
        for (auto *part : widget(page)->findChildren<QWidget *>())
            if (part->isVisible() && !part->objectName().isEmpty() && !part->objectName().startsWith("qt_"))
                visible << part;
        return visible;
    }

    /// What the part has to fit into: its page, or what is scrolled on it.
    static const QWidget *ground(const QWidget *part, const QWidget *page)
    {
        for (const QWidget *around = part->parentWidget(); around != page; around = around->parentWidget())
            if (const auto *area = qobject_cast<const QScrollArea *>(around))
                return area->widget();
        return page;
    }
    /// Where the widget stands in its page.
    static QRect place(const QWidget *part, const QWidget *page)
    {
        return {part->mapTo(page, QPoint(0, 0)), part->size()};
    }
};

TEST_F(Pages, FollowEachOtherInTheirOrder)
{
    const auto *tabs = qobject_cast<QTabWidget *>(widget("sessionPages"));
    ASSERT_EQ(tabs->count(), 6);
    for (int tab = 0; tab < 6; ++tab) {
        EXPECT_EQ(tabs->tabText(tab), pages[tab].label);
        showPage(pages[tab].label);
        EXPECT_TRUE(isVisible(pages[tab].name));
    }
}

TEST_F(Pages, ShowNothingCutInASmallWindow)
{
    ASSERT_EQ(window().size(), QSize(750, 480));
    for (const Page &page : pages) {
        showPage(page.label);
        meanwhile(20); // the layout comes with the event loop
        for (const QWidget *part : parts(page.name)) {
            const std::string name = part->objectName().toStdString();
            const QWidget *around = ground(part, widget(page.name));
            EXPECT_TRUE(around->rect().contains(place(part, around))) << name;
            if (qobject_cast<const QLabel *>(part) || qobject_cast<const QAbstractButton *>(part)) {
                EXPECT_GE(part->width(), part->sizeHint().width()) << name;
                EXPECT_GE(part->height(), part->sizeHint().height()) << name;
            }
        }
    }
    EXPECT_EQ(window().size(), QSize(750, 480)) << "no page has pushed the window apart";
}

TEST_F(Pages, LeaveTheWindowItsSizeWhenSessionsComeAndGo)
{
    for (int i = 0; i < 2; ++i) {
        press("resourceDisconnect");
        ASSERT_TRUE(eventually([this] { return isVisible("resourceConnect"); }));
        EXPECT_EQ(window().size(), QSize(750, 480));
        press("resourceConnect");
        ASSERT_TRUE(eventually([this] { return isVisible("resourceDisconnect"); }));
        EXPECT_EQ(window().size(), QSize(750, 480));
    }
}

TEST_F(Pages, HaveNoPartsOnTopOfEachOther)
{
    for (const Page &page : pages) {
        showPage(page.label);
        meanwhile(20);
        const auto all = parts(page.name);
        for (const QWidget *one : all)
            for (const QWidget *other : all)
                if (one != other && !one->isAncestorOf(other) && !other->isAncestorOf(one)) {
                    EXPECT_FALSE(place(one, widget(page.name)).intersects(place(other, widget(page.name))))
                        << one->objectName().toStdString() << " " << other->objectName().toStdString();
                }
    }
}

TEST_F(Pages, NameAndExplainWhatTakesInput)
{
    for (const Page &page : pages) {
        showPage(page.label);
        for (const QWidget *part : parts(page.name)) {
            if (!(part->focusPolicy() & Qt::TabFocus) && !qobject_cast<const QAbstractButton *>(part))
                continue;
            const std::string name = part->objectName().toStdString();
            const auto *button = qobject_cast<const QAbstractButton *>(part);
            EXPECT_FALSE(part->accessibleName().isEmpty() && (!button || button->text().isEmpty())) << name;
            if (name != "gpibSendRen" && name != "gpibSendAtn" && name != "gpibSendCommand") {
                EXPECT_FALSE(part->toolTip().isEmpty()) << name;
            }
        }
    }
}

TEST_F(Pages, HotkeysOfTheFirstOneDoNothingOnTheOthers)
{
    for (const Page &page : pages) {
        if (std::string(page.name) == "basicTab")
            continue;
        showPage(page.label);
        key(Qt::Key_R, Qt::ControlModifier);
        key(Qt::Key_W, Qt::ControlModifier);
        key(Qt::Key_Q, Qt::ControlModifier);
    }
    meanwhile();
    EXPECT_TRUE(standin::calls("viRead").empty());
    EXPECT_TRUE(standin::calls("viWrite").empty());
}

TEST_F(Pages, ListsAndTextsGrowWithTheWindowAndButtonsDoNot)
{
    showPage("Attributes");
    const int list = widget("attributesList")->height();
    const int get = widget("attributesGet")->height();
    window().resize(1280, 800); // acts as the system: the window manager
    meanwhile(50);
    EXPECT_GT(widget("attributesList")->height(), list + 250);
    EXPECT_EQ(widget("attributesGet")->height(), get);
    showPage("Gpib");
    meanwhile(20);
    EXPECT_LT(widget("gpibCommand")->height(), 200) << "its row stays near the others";
}

} // namespace
