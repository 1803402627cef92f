#include "pipeline/VisaFunctionCallHandler.h"

#include "RecordingListener.h"

#include <gmock/gmock.h>

#include <memory>

namespace
{
class Registration : public testing::Test
{
protected:
    std::unique_ptr<VisaFunctionCallHandler> m_handler = std::make_unique<VisaFunctionCallHandler>(nullptr);

    /// How many copies a finished call of this kind makes.
    static unsigned copies(VisaFunctionCallHandler &handler, VisaFunctionCallTyp type)
    {
        _visaFunctionCall call = makeCall(type);
        handler.VisaFunctionCallFinshed(call);
        unsigned count = 0;
        for (finsihedFunctionCall record; handler.getFinishedVisaFunctionCall(record);)
            count += record.listener != nullptr;
        return count;
    }
    unsigned copies(VisaFunctionCallTyp type) { return copies(*m_handler, type); }
};

TEST_F(Registration, AcceptsKinds0To41Only)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::GetAttributeDef);
    EXPECT_TRUE(listener.listenToType(VisaFunctionCallTyp::All));
    EXPECT_TRUE(listener.listenToType(VisaFunctionCallTyp::SetAttributeDef));
    for (const std::uint32_t refused : {42u, 43u, 99u, 100u, 0xFFFFFFFFu}) {
        const auto type = static_cast<VisaFunctionCallTyp>(refused);
        EXPECT_FALSE(listener.listenToType(type)) << refused;
        EXPECT_FALSE(m_handler->addVisaFunctionCallListener(&listener, type)) << refused;
        EXPECT_FALSE(m_handler->removeVisaFunctionCallListener(&listener, type)) << refused;
    }
}

TEST_F(Registration, TwiceForTheSameKindIsRefused)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
    EXPECT_FALSE(listener.listenToType(VisaFunctionCallTyp::Open));
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 1u);
}

TEST_F(Registration, RemovingAKindThatIsNotRegisteredIsNoFailure)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
    EXPECT_TRUE(m_handler->removeVisaFunctionCallListener(&listener, VisaFunctionCallTyp::Close));
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 1u);
}

TEST_F(Registration, ListeningWithoutAHandlerIsRefusedAndRecordsNothing)
{
    RecordingListener listener(nullptr, VisaFunctionCallTyp::Open);
    EXPECT_FALSE(listener.listenToType(VisaFunctionCallTyp::Close));
    listener.setVisaFunctionCallHandler(m_handler.get());
    EXPECT_EQ(copies(VisaFunctionCallTyp::Close), 0u);
}

TEST_F(Registration, TheKindGivenWithoutAHandlerCountsOnceThereIsOne)
{
    RecordingListener listener(nullptr, VisaFunctionCallTyp::Open);
    listener.setVisaFunctionCallHandler(m_handler.get());
    EXPECT_EQ(listener.handler(), m_handler.get());
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 1u);
}

TEST_F(Registration, AKindThatWasRefusedAtConstructionHindersNoOther)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::End);
    EXPECT_TRUE(listener.listenToType(VisaFunctionCallTyp::Open));
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 1u);
}

TEST_F(Registration, MovesToAnotherHandlerWithAllItsKinds)
{
    const auto other = std::make_unique<VisaFunctionCallHandler>(nullptr);
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
    ASSERT_TRUE(listener.listenToType(VisaFunctionCallTyp::Close));
    listener.setVisaFunctionCallHandler(other.get());
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 0u);
    EXPECT_EQ(copies(VisaFunctionCallTyp::Close), 0u);
    EXPECT_EQ(copies(*other, VisaFunctionCallTyp::Open), 1u);
    EXPECT_EQ(copies(*other, VisaFunctionCallTyp::Close), 1u);

    listener.setVisaFunctionCallHandler(nullptr);
    EXPECT_EQ(copies(*other, VisaFunctionCallTyp::Open), 0u);
    listener.setVisaFunctionCallHandler(m_handler.get());
    EXPECT_EQ(copies(VisaFunctionCallTyp::Close), 1u);
}

TEST_F(Registration, DetachingFromTheHandlersSideForgetsTheHandler)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
    EXPECT_TRUE(m_handler->removeVisaFunctionCallHandlerListener(&listener));
    EXPECT_EQ(listener.handler(), nullptr);
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 0u);
}

TEST_F(Registration, DetachingTellsAListenerEvenWhenItWasNotAttached)
{
    const auto other = std::make_unique<VisaFunctionCallHandler>(nullptr);
    RecordingListener listener(other.get(), VisaFunctionCallTyp::Open);
    EXPECT_TRUE(m_handler->removeVisaFunctionCallHandlerListener(&listener));
    EXPECT_EQ(listener.handler(), nullptr);
    EXPECT_EQ(copies(*other, VisaFunctionCallTyp::Open), 0u) << "the handler it was attached to still reaches it";
}

TEST_F(Registration, AListenerThatForgetsItsHandlerIsForgottenThere)
{
    {
        RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
        _visaFunctionCall call = makeCall(VisaFunctionCallTyp::Open);
        m_handler->VisaFunctionCallFinshed(call);
        listener.removeHandler();
    }
    finsihedFunctionCall record;
    ASSERT_TRUE(m_handler->getFinishedVisaFunctionCall(record));
    EXPECT_EQ(record.listener, nullptr);
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 0u);
    m_handler.reset(); // would reach into the listener that is gone
}

TEST_F(Registration, ADetachedListenerIsNotToldTwice)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
    m_handler->addVisaFunctionCallHandlerListener(&listener); // a second time: no second entry
    listener.setVisaFunctionCallHandler(nullptr);
    m_handler.reset(); // would reach into a listener that it still knew
    EXPECT_EQ(listener.handler(), nullptr);
}

TEST_F(Registration, TheHandlersEndLeavesNoPointerBehind)
{
    RecordingListener first(m_handler.get(), VisaFunctionCallTyp::Open);
    RecordingListener second(m_handler.get(), VisaFunctionCallTyp::All);
    m_handler.reset();
    EXPECT_EQ(first.handler(), nullptr);
    EXPECT_EQ(second.handler(), nullptr);
    _visaFunctionCall call = makeCall(VisaFunctionCallTyp::Read);
    EXPECT_FALSE(first.sendVisaFunctionCall(call));
}

TEST_F(Registration, NullIsRefusedEverywhere)
{
    m_handler->addVisaFunctionCallHandlerListener(nullptr);
    EXPECT_TRUE(m_handler->removeVisaFunctionCallHandlerListener(nullptr));
    EXPECT_FALSE(m_handler->addVisaFunctionCallListener(nullptr, VisaFunctionCallTyp::Open));
    EXPECT_TRUE(m_handler->removeVisaFunctionCallListener(nullptr, VisaFunctionCallTyp::Open));
    EXPECT_EQ(copies(VisaFunctionCallTyp::Open), 0u);
}

TEST_F(Registration, AListenersFollowUpNeitherWaitsForTheLockNorKeepsIt)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(makeCall(VisaFunctionCallTyp::Open), true));
    _visaFunctionCall followUp = makeCall(VisaFunctionCallTyp::GetAttribute, 7);
    EXPECT_TRUE(listener.sendVisaFunctionCall(followUp));
    EXPECT_TRUE(m_handler->sendVisaFunctionCall(makeCall(VisaFunctionCallTyp::Read), true));
}
} // namespace
