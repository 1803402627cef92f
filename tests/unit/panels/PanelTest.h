#pragma once

#include "pipeline/VisaDispatcher.h"
#include "pipeline/VisaFunctionCallHandler.h"
#include "pipeline/VisaFunctionCallListener.h"

#include <QCoreApplication>
#include <QObject>
#include <QStringList>
#include <QTest>
#include <QWidget>

#include <gtest/gtest.h>

#include <memory>
#include <vector>

/// A panel's surroundings: a real handler and dispatcher, with the test in the worker's place.
class PanelTest : public testing::Test
{
protected:
    using Kind = VisaFunctionCallTyp;

    /// Requests that were sent since the last call, in order.
    std::vector<_visaFunctionCall> requests()
    {
        std::vector<_visaFunctionCall> taken(m_started.count);
        for (_visaFunctionCall &call : taken)
            EXPECT_TRUE(m_handler->getVisaFunctionCall(call));
        m_started.count = 0;
        return taken;
    }

    /// The worker finishes a call; its listeners hear of it before this returns.
    void finish(_visaFunctionCall call)
    {
        m_handler->VisaFunctionCallFinshed(call);
        QCoreApplication::sendPostedEvents();
    }

    static _visaFunctionCall result(Kind kind, ViStatus status = 0)
    {
        _visaFunctionCall call;
        call.type = kind;
        call.status = status;
        return call;
    }

    template <class Widget>
    static Widget *find(const QWidget &parent, const char *name)
    {
        auto *widget = parent.findChild<Widget *>(QString::fromLatin1(name));
        EXPECT_NE(widget, nullptr) << name;
        return widget;
    }

    /// Names of the widgets that the Tab key visits, beginning with @p first.
    static QStringList tabOrder(const QWidget &panel, QWidget *first)
    {
        QStringList names;
        QWidget *widget = first;
        do {
            if (panel.isAncestorOf(widget) && (widget->focusPolicy() & Qt::TabFocus) && !widget->focusProxy())
                names << widget->objectName();
            widget = widget->nextInFocusChain();
        } while (widget != first);
        return names;
    }

    static void press(QWidget *widget) { QTest::mouseClick(widget, Qt::LeftButton); }

    QObject m_parent;
    VisaDispatcher *m_dispatcher = VisaDispatcher::getVisaDispatcherInstance(&m_parent);
    std::unique_ptr<VisaFunctionCallHandler> m_handler = std::make_unique<VisaFunctionCallHandler>(m_dispatcher);

private:
    struct Started final : VisaFunctionCallListener {
        explicit Started(VisaFunctionCallHandler *handler) : VisaFunctionCallListener(handler, Kind::All) {}
        void visaFunctionCallFinished(_visaFunctionCall &) override {}
        void newVisaCallStarted(const Kind &) override { ++count; }
        std::size_t count = 0;
    };
    Started m_started{m_handler.get()};
};
