// The dialogs behind the tool bar, from the press of the tool to what came of it: window, worker and a scripted VISA library.
#include "app/MainWindow.h"
#include "support/EventLoop.h"
#include "support/ModalAnswer.h"
#include "support/standin/Standin.h"

#include <visa.h>

#include <QDialogButtonBox>
#include <QDir>
#include <QGuiApplication>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QSettings>
#include <QSpinBox>
#include <QTest>
#include <QToolButton>
#include <QTreeWidget>

#include <gtest/gtest.h>

#include <memory>

namespace
{
class ToolDialogs : public testing::Test
{
protected:
    ToolDialogs()
    {
        standin::reset();
        QSettings().clear();
        standin::setTextAttribute(VI_ATTR_RSRC_MANF_NAME, "Acme");
        standin::setAttribute(VI_ATTR_RSRC_IMPL_VERSION, 0x00500100);
        standin::setAttribute(VI_ATTR_RSRC_MANF_ID, 4015, 2);
        standin::setAttribute(0x0FAF0002, 4);
        standin::setAttribute(0x0FAF0001, 1234);
        standin::addResource({"TCPIP::a::hislip0::INSTR"});
        standin::addResource({"ASRL1::INSTR"});
        standin::addResource({"TCPIP::a::inst0::INSTR"});
        m_window = std::make_unique<MainWindow>(nullptr);
        m_window->show();
    }

    ~ToolDialogs() override { EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr); }

    template <class Widget>
    static Widget *find(const QWidget *parent, const char *name)
    {
        auto *widget = parent->findChild<Widget *>(QString::fromLatin1(name));
        EXPECT_NE(widget, nullptr) << name;
        return widget;
    }
    static void click(const QWidget *parent, const char *name)
    {
        QTest::mouseClick(find<QWidget>(parent, name), Qt::LeftButton);
    }
    static QTreeWidget *tree(const QDialog *dialog) { return find<QTreeWidget>(dialog, "finderResults"); }
    static bool idle(const QDialog *dialog) { return find<QPushButton>(dialog, "finderFind")->isEnabled(); }

    /// Opens the finder and does @p steps in it, one each time it is looked at and the last one until it has closed.
    void inFinder(const std::vector<std::function<void(QDialog *)>> &steps)
    {
        std::size_t step = 0;
        ModalAnswer finder("resourceDialog", [&](QDialog *dialog) {
            const std::size_t now = std::min(step++, steps.size() - 1);
            steps[now](dialog);
        });
        click(m_window.get(), "actionFindResourceButton");
        EXPECT_GE(finder.count(), static_cast<int>(steps.size()));
        EXPECT_EQ(finder.unexpected(), 0);
    }

    std::string resource() { return find<QLineEdit>(m_window.get(), "resourceName")->text().toStdString(); }
    static void search(QDialog *dialog) { click(dialog, "finderFind"); }
    static void cancel(QDialog *dialog) { click(dialog, "finderCancel"); }

    std::unique_ptr<MainWindow> m_window;
};
} // namespace

TEST_F(ToolDialogs, AFoundResourceGoesIntoTheResourceField)
{
    inFinder({search, [](QDialog *dialog) {
                  if (!idle(dialog) || tree(dialog)->topLevelItemCount() == 0)
                      return;
                  EXPECT_EQ(tree(dialog)->topLevelItemCount(), 2);
                  const QTreeWidgetItem *item = tree(dialog)->topLevelItem(1)->child(1);
                  QTest::mouseClick(tree(dialog)->viewport(), Qt::LeftButton, {},
                                    tree(dialog)->visualItemRect(item).center());
                  click(dialog, "finderSelect");
              }});
    EXPECT_EQ(resource(), "TCPIP::a::inst0::INSTR");
    EXPECT_EQ(standin::calls("viFindRsrc").size(), 1U);
    EXPECT_EQ(standin::calls("viFindNext").size(), 2U);
}

TEST_F(ToolDialogs, ACancelledSearchLeavesTheResourceField)
{
    const std::string before = resource();
    inFinder({[](QDialog *dialog) {
        if (find<QSpinBox>(dialog, "finderTimeOut")->value() == 1234) // the library's, so its answers have arrived
            cancel(dialog);
    }});
    EXPECT_EQ(resource(), before);
}

TEST_F(ToolDialogs, AFinderClosedInTheMiddleOfASearchLeavesNothingBehind)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viFindNext", {.gate = gate});
    inFinder({search, [](QDialog *dialog) {
                  if (standin::calls("viFindNext").size() == 1) // the worker stands at the gate
                      cancel(dialog);
              }});
    EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr);
    gate->open();
    const auto *status = find<QLabel>(m_window.get(), "statusLabel");
    EXPECT_TRUE(processEventsUntil([status] { return status->text() == "Status: VI_SUCCESS"; }));

    // The next one finds all there is.
    inFinder({search, [](QDialog *dialog) {
                  if (idle(dialog) && tree(dialog)->topLevelItemCount() == 2)
                      cancel(dialog);
              }});
}

TEST_F(ToolDialogs, ASearchThatLosesTheLibraryEnds)
{
    standin::script("viFindRsrc", {.status = VI_ERROR_CONN_LOST});
    inFinder({search, [](QDialog *dialog) {
                  if (!idle(dialog))
                      return;
                  EXPECT_EQ(tree(dialog)->topLevelItemCount(), 0);
                  cancel(dialog);
              }});
    EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr);
}

TEST_F(ToolDialogs, AWindowThatEndsTakesTheFinderWithIt)
{
    ModalAnswer finder("resourceDialog", [&](QDialog *dialog) {
        search(dialog);
        m_window.reset();
    });
    m_window->findResource();
    EXPECT_EQ(finder.count(), 1);
    EXPECT_EQ(m_window, nullptr);
}

TEST_F(ToolDialogs, AWindowThatEndsTakesTheLogOptionsWithIt)
{
    ModalAnswer options("logFileOptionsDialog", [&](QDialog *) { m_window.reset(); });
    m_window->showLoggingDialog();
    EXPECT_EQ(options.count(), 1);
}

TEST_F(ToolDialogs, LogOptionsSwitchTheSessionsLog)
{
    const QString path = QDir::homePath() + "/chosen.txt";
    ModalAnswer first("logFileOptionsDialog", [&](QDialog *dialog) {
        EXPECT_TRUE(dialog->isModal());
        auto *field = find<QLineEdit>(dialog, "logFileEdit");
        EXPECT_TRUE(QFile::exists(field->text()));
        QTest::keyClick(field, Qt::Key_A, Qt::ControlModifier);
        QTest::keyClicks(field, path);
        QTest::keyClick(field, Qt::Key_Return);
    });
    click(m_window.get(), "actionLoggingButton");
    EXPECT_EQ(first.count(), 1);
    EXPECT_TRUE(QFile::exists(path));

    ModalAnswer second("logFileOptionsDialog", [&](QDialog *dialog) {
        EXPECT_EQ(find<QLineEdit>(dialog, "logFileEdit")->text(), path);
        dialog->reject();
    });
    m_window->showLoggingDialog();
}
