#include "FinderTest.h"
#include "support/ModalAnswer.h"

#include <QContextMenuEvent>
#include <QDesktopServices>
#include <QMenu>
#include <QMessageBox>
#include <QUrl>

namespace
{
/// Which pages the desktop was asked to show.
class Browser : public QObject
{
    Q_OBJECT

public:
    Browser() { QDesktopServices::setUrlHandler("http", this, "open"); }
    ~Browser() override { QDesktopServices::unsetUrlHandler("http"); }

    QList<QUrl> opened;

public slots:
    void open(const QUrl &url) { opened.append(url); }
};

class FinderSelection : public Finder
{
protected:
    void SetUp() override
    {
        open();
        press(child<QPushButton>("finderFind"));
        finish(found(Kind::FindRsrc, "TCPIP::a::INSTR", 1, "Maker", "A meter", "meter.local"));
        finish(found(Kind::FindNext, "ASRL1::INSTR", 0));
        requests();
    }

    const QTreeWidgetItem *device(int index) { return tree()->topLevelItem(index); }
    const QTreeWidgetItem *serial() { return device(0)->child(0); }
    const QTreeWidgetItem *meter() { return device(1)->child(0); }
    std::string shown() { return child<QLabel>("finderSelected")->text().toStdString(); }

    /// The menu that a right click on @p position of the tree opens, null when there is none.
    QMenu *menuAt(const QPoint &position)
    {
        QContextMenuEvent event(QContextMenuEvent::Mouse, position, tree()->viewport()->mapToGlobal(position));
        QCoreApplication::sendEvent(tree()->viewport(), &event);
        return m_dialog->findChild<QMenu *>("finderMenu");
    }
    QMenu *menuOn(const QTreeWidgetItem *item) { return menuAt(tree()->visualItemRect(item).center()); }

    /// Answers the box that asks for a selection while @p action runs.
    template <typename Action>
    void expectBox(Action action)
    {
        ModalAnswer answer("noResourceSelected", [](QDialog *dialog) {
            const auto *box = qobject_cast<QMessageBox *>(dialog);
            EXPECT_EQ(box->windowTitle(), "No resource selected");
            EXPECT_EQ(box->text(), "Please select one resource!");
            QTest::keyClick(dialog, Qt::Key_Return);
        });
        action();
        EXPECT_EQ(answer.count(), 1);
        EXPECT_EQ(answer.unexpected(), 0);
        EXPECT_TRUE(m_dialog->isVisible());
    }
};
} // namespace

TEST_F(FinderSelection, AClickSelectsAndSelectAccepts)
{
    clickRow(serial());
    EXPECT_EQ(shown(), "ASRL1::INSTR");
    clickRow(meter());
    EXPECT_EQ(shown(), "TCPIP::a::INSTR");
    EXPECT_TRUE(m_dialog->isVisible());
    press(child<QPushButton>("finderSelect"));
    EXPECT_EQ(m_dialog->result(), QDialog::Accepted);
    EXPECT_FALSE(m_dialog->isVisible());
    EXPECT_EQ(m_dialog->getSelectedResource(), "TCPIP::a::INSTR");
}

TEST_F(FinderSelection, AClickInAnyColumnSelects)
{
    const QRect row = tree()->visualItemRect(meter());
    QTest::mouseClick(tree()->viewport(), Qt::LeftButton, {},
                      {tree()->columnViewportPosition(2) + 10, row.center().y()});
    EXPECT_EQ(shown(), "TCPIP::a::INSTR");
}

TEST_F(FinderSelection, ADoubleClickSelectsAndAccepts)
{
    doubleClickRow(meter());
    EXPECT_EQ(m_dialog->result(), QDialog::Accepted);
    EXPECT_FALSE(m_dialog->isVisible());
    EXPECT_EQ(m_dialog->getSelectedResource(), "TCPIP::a::INSTR");
}

TEST_F(FinderSelection, ReturnInTheTreeDoesAsADoubleClick)
{
    tree()->setFocus();
    tree()->setCurrentItem(tree()->topLevelItem(0)->child(0));
    QTest::keyClick(tree(), Qt::Key_Return);
    EXPECT_EQ(m_dialog->result(), QDialog::Accepted);
    EXPECT_EQ(m_dialog->getSelectedResource(), "ASRL1::INSTR");
}

TEST_F(FinderSelection, AClickOnADeviceLeavesNothingSelected)
{
    clickRow(meter());
    clickRow(device(1));
    EXPECT_EQ(shown(), "");
    EXPECT_EQ(m_dialog->getSelectedResource(), "");
    expectBox([&] { press(child<QPushButton>("finderSelect")); });
}

TEST_F(FinderSelection, ADoubleClickOnADeviceAsksForAResource)
{
    clickRow(meter());
    expectBox([&] { doubleClickRow(device(0)); });
}

TEST_F(FinderSelection, SelectWithoutASelectionAsksForOneAndStays)
{
    expectBox([&] { press(child<QPushButton>("finderSelect")); });
}

TEST_F(FinderSelection, CancelRejects)
{
    clickRow(meter());
    press(child<QPushButton>("finderCancel"));
    EXPECT_EQ(m_dialog->result(), QDialog::Rejected);
}

TEST_F(FinderSelection, EscapeRejects)
{
    QTest::keyClick(m_dialog.get(), Qt::Key_Escape);
    EXPECT_FALSE(m_dialog->isVisible());
    EXPECT_EQ(m_dialog->result(), QDialog::Rejected);
}

TEST_F(FinderSelection, TheMenuOpensTheInstrumentsPage)
{
    Browser browser;
    QMenu *menu = menuOn(meter());
    ASSERT_NE(menu, nullptr);
    ASSERT_EQ(menu->actions().size(), 1);
    EXPECT_EQ(menu->actions()[0]->text(), "Go to webpage");
    QTest::mouseClick(menu, Qt::LeftButton, {}, menu->actionGeometry(menu->actions()[0]).center());
    ASSERT_EQ(browser.opened.size(), 1);
    EXPECT_EQ(browser.opened[0].toString(), "http://meter.local");
}

TEST_F(FinderSelection, TheMenuOfADeviceOpensThePageOfItsResources)
{
    Browser browser;
    QMenu *menu = menuOn(device(1));
    ASSERT_NE(menu, nullptr);
    QTest::mouseClick(menu, Qt::LeftButton, {}, menu->actionGeometry(menu->actions()[0]).center());
    ASSERT_EQ(browser.opened.size(), 1);
    EXPECT_EQ(browser.opened[0].toString(), "http://meter.local");
}

TEST_F(FinderSelection, TheMenuOpensNothingWithoutAHostName)
{
    Browser browser;
    QMenu *menu = menuOn(serial());
    ASSERT_NE(menu, nullptr);
    EXPECT_FALSE(menu->actions()[0]->isEnabled());
    QTest::mouseClick(menu, Qt::LeftButton, {}, menu->actionGeometry(menu->actions()[0]).center());
    EXPECT_TRUE(browser.opened.isEmpty());
}

TEST_F(FinderSelection, ThereIsNoMenuBesideTheItems)
{
    EXPECT_EQ(menuAt(QPoint(10, tree()->viewport()->height() - 5)), nullptr);
}

#include "FinderSelectionTest.moc"
