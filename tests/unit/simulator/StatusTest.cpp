#include "simulator/instrument/ErrorQueue.h"
#include "simulator/instrument/StatusModel.h"

#include <gtest/gtest.h>

using namespace simulator;

TEST(ServiceRequest, NeedsANewReason)
{
    ServiceRequest request;
    EXPECT_FALSE(request.update(0x20, 0x00)) << "not enabled";
    EXPECT_TRUE(request.update(0x20, 0x20));
    EXPECT_FALSE(request.update(0x20, 0x20)) << "the same reason";
    EXPECT_EQ(request.poll(0x20), 0x60);
    EXPECT_EQ(request.poll(0x20), 0x20) << "a poll answers the request";
    EXPECT_FALSE(request.update(0x20, 0x20)) << "the reason is still the old one";
    EXPECT_FALSE(request.update(0x00, 0x20));
    EXPECT_TRUE(request.update(0x20, 0x20)) << "it went and came again";
}

TEST(ServiceRequest, StaysOneRequestWhenASecondReasonJoinsBeforeThePoll)
{
    ServiceRequest request;
    EXPECT_TRUE(request.update(0x20, 0x30));
    EXPECT_FALSE(request.update(0x30, 0x30));
    EXPECT_EQ(request.poll(0x30), 0x70);
    EXPECT_EQ(request.poll(0x30), 0x30);
}

TEST(ServiceRequest, RisesAgainForASecondReasonAfterThePoll)
{
    ServiceRequest request;
    request.update(0x20, 0x30);
    request.poll(0x20);
    EXPECT_TRUE(request.update(0x30, 0x30));
}

TEST(ServiceRequest, IsWithdrawnWithItsCause)
{
    ServiceRequest request;
    request.update(0x20, 0x20);
    request.update(0x00, 0x20);
    EXPECT_EQ(request.poll(0x00), 0x00);
    request.update(0x20, 0x20);
    request.update(0x20, 0x00);
    EXPECT_EQ(request.poll(0x20), 0x20);
}

TEST(RegisterGroup, RecordsTheTransitionsThatItsFiltersPass)
{
    RegisterGroup group;
    group.setCondition(0x0010);
    EXPECT_EQ(group.takeEvent(), 0x0010);
    EXPECT_EQ(group.takeEvent(), 0) << "reading clears";
    group.setCondition(0);
    EXPECT_EQ(group.takeEvent(), 0) << "falls are filtered out at first";
    group.positive = 0;
    group.negative = 0x0010;
    group.setCondition(0x0010);
    EXPECT_EQ(group.takeEvent(), 0);
    group.setCondition(0);
    EXPECT_EQ(group.takeEvent(), 0x0010);
}

TEST(RegisterGroup, NeverSetsBit15)
{
    RegisterGroup group;
    group.setCondition(0xFFFF);
    EXPECT_EQ(group.condition(), 0x7FFF);
    EXPECT_EQ(group.takeEvent(), 0x7FFF);
}

TEST(StatusModel, SummarisesIntoTheStatusByte)
{
    StatusModel status;
    EXPECT_EQ(status.summary(false), 0);
    EXPECT_EQ(status.summary(true), 0x04);
    EXPECT_EQ(status.takeEvent(), 0x80) << "power on";
    status.setEvent(0x20);
    EXPECT_EQ(status.summary(false), 0);
    status.setEventEnable(0x20);
    EXPECT_EQ(status.summary(false), 0x20);
    status.questionable.enable = 1;
    status.questionable.setCondition(1);
    EXPECT_EQ(status.summary(false), 0x28);
    status.operation.enable = 0x10;
    status.operation.setCondition(0x10);
    EXPECT_EQ(status.summary(false), 0xA8);
    status.clearEvents();
    EXPECT_EQ(status.summary(false), 0);
    EXPECT_EQ(status.eventEnable(), 0x20);
    EXPECT_EQ(status.operation.enable, 0x10);
}

TEST(StatusModel, IgnoresBit6OfTheServiceEnable)
{
    StatusModel status;
    status.setServiceEnable(0xFF);
    EXPECT_EQ(status.serviceEnable(), 0xBF);
}

TEST(ErrorQueue, IsFirstInFirstOut)
{
    ErrorQueue queue;
    queue.push({-113, "A"});
    queue.push({-222, ""});
    EXPECT_EQ(errorResponse(queue.pop()), "-113,\"Undefined header;A\"");
    EXPECT_EQ(errorResponse(queue.pop()), "-222,\"Data out of range\"");
    EXPECT_EQ(errorResponse(queue.pop()), "0,\"No error\"");
}

TEST(ErrorQueue, ReplacesItsNewestEntryWhenItOverflows)
{
    ErrorQueue queue;
    for (int i = 0; i < 40; ++i)
        queue.push({-100 - i % 2, ""});
    EXPECT_EQ(queue.size(), 30u);
    for (int i = 0; i < 29; ++i)
        EXPECT_EQ(queue.pop().number, -100 - i % 2);
    EXPECT_EQ(errorResponse(queue.pop()), "-350,\"Queue overflow\"");
    EXPECT_TRUE(queue.empty());
}

TEST(ErrorQueue, TakesErrorsAgainWhenThereIsRoom)
{
    ErrorQueue queue;
    for (int i = 0; i < 31; ++i)
        queue.push({-100, ""});
    queue.pop();
    queue.push({-222, ""});
    for (int i = 0; i < 28; ++i)
        EXPECT_EQ(queue.pop().number, -100);
    EXPECT_EQ(queue.pop().number, -350);
    EXPECT_EQ(queue.pop().number, -222);
}

TEST(ErrorQueue, KeepsItsTextPrintableQuotedAndShort)
{
    EXPECT_EQ(errorResponse({-113, "a\"b\n\x80"}), "-113,\"Undefined header;a\"\"b??\"");
    const std::string text = errorResponse({-113, std::string(1000, '"')});
    EXPECT_LE(text.size(), std::string("-113,").size() + 255 + 2);
    EXPECT_EQ(std::count(text.begin(), text.end(), '"') % 2, 0) << "doubled quotes are not torn";
}

TEST(ErrorQueue, TellsWhichEventAnErrorIs)
{
    EXPECT_EQ(eventOfError(-100), 0x20);
    EXPECT_EQ(eventOfError(-199), 0x20);
    EXPECT_EQ(eventOfError(-222), 0x10);
    EXPECT_EQ(eventOfError(-350), 0x08);
    EXPECT_EQ(eventOfError(17), 0x08);
    EXPECT_EQ(eventOfError(-410), 0x04);
    EXPECT_EQ(eventOfError(-500), 0x80);
    EXPECT_EQ(eventOfError(-600), 0x40);
    EXPECT_EQ(eventOfError(-700), 0x02);
    EXPECT_EQ(eventOfError(-800), 0x01);
}
