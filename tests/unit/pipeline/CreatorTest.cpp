#include "pipeline/VisaFunctionCallCreator.h"

#include "RecordingListener.h"
#include "pipeline/VisaFunctionCallButton.h"
#include "pipeline/VisaFunctionCallHandler.h"
#include "pipeline/VisaFunctionCallParameter.h"

#include <gtest/gtest.h>

#include <QApplication>
#include <QMouseEvent>

#include <memory>

namespace
{
class Creator final : public VisaFunctionCallCreator
{
public:
    using VisaFunctionCallCreator::VisaFunctionCallCreator;
};

class Refusing final : public VisaFunctionCallParameter
{
public:
    bool getParameter(Parameter &) override
    {
        ++asked;
        return false;
    }
    int asked = 0;
};

class CallCreator : public testing::Test
{
protected:
    const std::unique_ptr<VisaFunctionCallHandler> m_handler = std::make_unique<VisaFunctionCallHandler>(nullptr);
    RecordingListener m_label{m_handler.get(), VisaFunctionCallTyp::All};

    _visaFunctionCall take()
    {
        _visaFunctionCall call;
        if (m_label.started.empty() || !m_handler->getVisaFunctionCall(call))
            ADD_FAILURE() << "nothing was sent";
        return call;
    }
};

TEST_F(CallCreator, FillsTheSlotsFromItsSourcesInOrder)
{
    VisaFunctionCallParameterValue first;
    VisaFunctionCallParameterValue second;
    VisaFunctionCallParameterValue third;
    first.setParameterValueString("*IDN?\n");
    second.setParameterValueUInt(1024);
    Creator creator(m_handler.get());
    creator.setType(VisaFunctionCallTyp::Query);
    EXPECT_TRUE(creator.setParameter(&first));
    EXPECT_TRUE(creator.setParameter(&second));
    EXPECT_TRUE(creator.setParameter(&third));
    EXPECT_FALSE(creator.setParameter(&first));
    EXPECT_TRUE(creator.sendFunctionCall());

    const _visaFunctionCall call = take();
    EXPECT_EQ(call.type, VisaFunctionCallTyp::Query);
    EXPECT_EQ(call.status, 0);
    EXPECT_EQ(call.parameter[0].stringValue, "*IDN?\n");
    EXPECT_EQ(call.parameter[1].uintValue, 1024u);
    EXPECT_EQ(call.parameter[2].uintValue, 0u);
    EXPECT_EQ(call.parameter[2].stringValue, "");
}

TEST_F(CallCreator, SendsNothingWhenASourceRefuses)
{
    VisaFunctionCallParameterValue good;
    Refusing refusing;
    Refusing neverAsked;
    Creator creator(m_handler.get());
    creator.setParameter(&good);
    creator.setParameter(&refusing);
    creator.setParameter(&neverAsked);
    EXPECT_FALSE(creator.sendFunctionCall());
    EXPECT_TRUE(m_label.started.empty());
    EXPECT_EQ(refusing.asked, 1);
    EXPECT_EQ(neverAsked.asked, 0);
}

TEST_F(CallCreator, ANullSourceLeavesItsSlotEmpty)
{
    VisaFunctionCallParameterValue second;
    second.setParameterValueUInt(5);
    Creator creator(m_handler.get());
    EXPECT_TRUE(creator.setParameter(nullptr));
    EXPECT_TRUE(creator.setParameter(&second));
    EXPECT_TRUE(creator.sendFunctionCall());
    const _visaFunctionCall call = take();
    EXPECT_EQ(call.parameter[0].uintValue, 0u);
    EXPECT_EQ(call.parameter[1].uintValue, 5u);
}

TEST_F(CallCreator, AnswersTrueWithoutAHandlerAndAsksNoSource)
{
    Refusing refusing;
    Creator creator(nullptr);
    creator.setParameter(&refusing);
    EXPECT_TRUE(creator.sendFunctionCall());
    EXPECT_EQ(refusing.asked, 0);
}

TEST_F(CallCreator, AnswersTrueForARequestThatTheLockRefused)
{
    Creator creator(m_handler.get());
    creator.setType(VisaFunctionCallTyp::Read);
    EXPECT_TRUE(creator.sendFunctionCall());
    EXPECT_TRUE(creator.sendFunctionCall());
    EXPECT_EQ(m_label.started.size(), 1u);
}

TEST_F(CallCreator, SendsLockingRequestsUnlessToldOtherwise)
{
    Creator creator(m_handler.get());
    creator.setLock(false);
    creator.sendFunctionCall();
    creator.sendFunctionCall();
    EXPECT_EQ(m_label.started.size(), 2u);
    creator.setLock(true);
    creator.sendFunctionCall();
    creator.sendFunctionCall();
    EXPECT_EQ(m_label.started.size(), 3u);
}

TEST_F(CallCreator, SendsToTheHandlerItIsGivenLater)
{
    Creator creator(nullptr);
    creator.setType(VisaFunctionCallTyp::Read);
    creator.setVisaFunctionCallHandler(m_handler.get());
    EXPECT_TRUE(creator.sendFunctionCall());
    EXPECT_EQ(take().type, VisaFunctionCallTyp::Read);

    auto other = std::make_unique<VisaFunctionCallHandler>(nullptr);
    creator.setVisaFunctionCallHandler(other.get());
    EXPECT_TRUE(creator.sendFunctionCall());
    _visaFunctionCall call;
    EXPECT_TRUE(other->getVisaFunctionCall(call));
    EXPECT_EQ(m_label.started.size(), 1u);

    other.reset(); // tells the creator, which would otherwise send to what is gone
    EXPECT_TRUE(creator.sendFunctionCall());
}

TEST(CallParameterValue, ClearKeepsTheNumber)
{
    Parameter start{7, std::string("a\0b", 3)};
    VisaFunctionCallParameterValue value(start);
    Parameter out;
    EXPECT_TRUE(value.getParameter(out));
    EXPECT_EQ(out.uintValue, 7u);
    EXPECT_EQ(out.stringValue, std::string("a\0b", 3));
    value.clear();
    EXPECT_TRUE(value.getParameter(out));
    EXPECT_EQ(out.uintValue, 7u);
    EXPECT_EQ(out.stringValue, "");
}

TEST(CallParameterValue, SettersChangeWhatTheirNameSays)
{
    VisaFunctionCallParameterValue value;
    Parameter out{1, "x"};
    EXPECT_TRUE(value.getParameter(out));
    EXPECT_EQ(out.uintValue, 0u);
    EXPECT_EQ(out.stringValue, "");
    EXPECT_TRUE(value.setParameterValue(Parameter{1, "one"}));
    EXPECT_TRUE(value.setParameterValueUInt(0xFFFFFFFFFFFFFFFFull));
    value.getParameter(out);
    EXPECT_EQ(out.uintValue, 0xFFFFFFFFFFFFFFFFull);
    EXPECT_EQ(out.stringValue, "one");
    EXPECT_TRUE(value.setParameterValueString("two"));
    value.getParameter(out);
    EXPECT_EQ(out.uintValue, 0xFFFFFFFFFFFFFFFFull);
    EXPECT_EQ(out.stringValue, "two");
}

class CallButton : public CallCreator
{
protected:
    VisaFunctionCallButton m_button{m_handler.get(), VisaFunctionCallTyp::Read, nullptr};
    int m_sent = 0;

    CallButton()
    {
        QObject::connect(&m_button, &VisaFunctionCallButton::functionCallSended, [this] { ++m_sent; });
    }
    static void release(QWidget &widget, Qt::MouseButton button = Qt::LeftButton)
    {
        QMouseEvent event(QEvent::MouseButtonRelease, QPointF(2, 2), button, Qt::NoButton, Qt::NoModifier);
        QApplication::sendEvent(&widget, &event);
    }
};

TEST_F(CallButton, SendsOnMouseReleaseBeforeTheClick)
{
    m_button.resize(40, 20);
    std::size_t startedAtClick = 0;
    QObject::connect(&m_button, &QPushButton::clicked, [&] { startedAtClick = m_label.started.size(); });
    QMouseEvent press(QEvent::MouseButtonPress, QPointF(2, 2), Qt::LeftButton, Qt::LeftButton, Qt::NoModifier);
    QApplication::sendEvent(&m_button, &press);
    EXPECT_TRUE(m_label.started.empty());
    release(m_button);
    EXPECT_EQ(m_sent, 1);
    EXPECT_EQ(startedAtClick, 1u);
    EXPECT_EQ(take().type, VisaFunctionCallTyp::Read);
}

TEST_F(CallButton, SendsOnTheReleaseOfAnyMouseButton)
{
    release(m_button, Qt::RightButton);
    EXPECT_EQ(m_sent, 1);
    EXPECT_EQ(m_label.started.size(), 1u);
}

TEST_F(CallButton, AClickByProgramSendsNothing)
{
    bool clicked = false;
    QObject::connect(&m_button, &QPushButton::clicked, [&] { clicked = true; });
    m_button.click();
    EXPECT_TRUE(clicked);
    EXPECT_EQ(m_sent, 0);
    EXPECT_TRUE(m_label.started.empty());
}

TEST_F(CallButton, SpaceAndReturnSendNothing)
{
    for (const int key : {Qt::Key_Space, Qt::Key_Return}) {
        QKeyEvent press(QEvent::KeyPress, key, Qt::NoModifier);
        QKeyEvent up(QEvent::KeyRelease, key, Qt::NoModifier);
        QApplication::sendEvent(&m_button, &press);
        QApplication::sendEvent(&m_button, &up);
    }
    EXPECT_EQ(m_sent, 0);
    EXPECT_TRUE(m_label.started.empty());
}

TEST_F(CallButton, ASecondPressWhileARequestIsOutstandingSaysSentAndSendsNothing)
{
    release(m_button);
    release(m_button);
    EXPECT_EQ(m_sent, 2);
    EXPECT_EQ(m_label.started.size(), 1u);
}

TEST_F(CallButton, SaysNothingWhenASourceRefuses)
{
    Refusing refusing;
    m_button.setParameter(&refusing);
    m_button.sendFunctionCall();
    EXPECT_EQ(m_sent, 0);
    EXPECT_TRUE(m_label.started.empty());
}

TEST_F(CallButton, MayBeDeletedByWhoeverHearsOfItsRequest)
{
    auto *button = new VisaFunctionCallButton(m_handler.get(), VisaFunctionCallTyp::Close, nullptr);
    QObject::connect(button, &VisaFunctionCallButton::functionCallSended, [&] { delete button; });
    release(*button);
    EXPECT_EQ(take().type, VisaFunctionCallTyp::Close);
}
} // namespace
