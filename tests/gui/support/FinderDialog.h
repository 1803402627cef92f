#pragma once

#include "gui/support/WindowTest.h"

#include "support/ModalAnswer.h"

#include <QElapsedTimer>
#include <QGuiApplication>
#include <QTest>
#include <QTreeWidget>

#include <functional>
#include <vector>

/// The finder as a person uses it. @p Base is WindowTest or one of its kind.
template <typename Base>
class FinderDialog : public Base
{
protected:
    /// Something to do in the dialog; false when it is not the time yet.
    using Step = std::function<bool()>;

    ~FinderDialog() override { EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr) << "the wait cursor stayed"; }

    /// Opens the finder with the mouse and takes the steps one after the other. The last one closes it.
    void inFinder(const std::vector<Step> &steps)
    {
        std::size_t next = 0;
        QElapsedTimer timer;
        timer.start();
        const ModalAnswer finder("resourceDialog", [&](QDialog *) {
            if (next == steps.size() || timer.hasExpired(30000)) {
                ADD_FAILURE() << "the finder stays open after " << next << " of " << steps.size() << " steps";
                Base::press("finderCancel");
            } else if (steps[next]()) {
                ++next;
            }
        });
        Base::press("actionFindResourceButton");
        EXPECT_EQ(next, steps.size());
        EXPECT_EQ(finder.unexpected(), 0);
    }

    /// A step that is always in time.
    static Step now(const std::function<void()> &action)
    {
        return [action] {
            action();
            return true;
        };
    }
    Step search()
    {
        return now([this] { Base::press("finderFind"); });
    }
    Step cancel()
    {
        return now([this] { Base::press("finderCancel"); });
    }

    QTreeWidget *tree() { return qobject_cast<QTreeWidget *>(Base::widget("finderResults")); }
    static bool waiting()
    {
        return QGuiApplication::overrideCursor() && QGuiApplication::overrideCursor()->shape() == Qt::WaitCursor;
    }
    void clickResource(int device, int resource)
    {
        const auto *item = tree()->topLevelItem(device)->child(resource);
        QTest::mouseClick(tree()->viewport(), Qt::LeftButton, {}, tree()->visualItemRect(item).center());
    }
};
