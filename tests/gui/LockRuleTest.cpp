#include "gui/support/StandinWindowTest.h"

#include <visa.h>

namespace
{

class LockRule : public StandinWindowTest
{
protected:
    LockRule()
    {
        openWindow();
        connectSession();
    }
};

TEST_F(LockRule, WhileAButtonsRequestRunsAnotherButtonSendsNothing)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viClear", {.gate = gate});
    press("basicClear");
    ASSERT_TRUE(gate->waitForArrival());
    press("basicReadStb");
    press("basicTrigger");
    gate->open();
    ASSERT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_SUCCESS"; }));
    meanwhile();
    EXPECT_TRUE(standin::calls("viReadSTB").empty());
    EXPECT_TRUE(standin::calls("viAssertTrigger").empty());
    press("basicReadStb");
    EXPECT_TRUE(called("viReadSTB", 1));
}

TEST_F(LockRule, ARefusedWriteStillSaysItWasSentAndEmptiesTheReadView)
{
    standin::script("viRead", {.status = VI_SUCCESS, .bytes = "shown"});
    press("basicRead");
    ASSERT_TRUE(eventually([this] { return shown("basicReadView", "plainText").toString() == "shown"; }));
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viClear", {.gate = gate});
    press("basicClear");
    ASSERT_TRUE(gate->waitForArrival());
    enter("basicCommand", "x");
    press("basicWrite");
    EXPECT_EQ(shown("basicReadView", "plainText").toString(), "");
    gate->open();
    meanwhile();
    EXPECT_TRUE(standin::calls("viWrite").empty());
}

TEST_F(LockRule, ANonLockingRequestFreesTheButtons)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viClear", {.gate = gate});
    press("basicClear");
    ASSERT_TRUE(gate->waitForArrival());
    tick("basicSendEnd"); // sends without the lock, and so clears it
    press("basicReadStb");
    gate->open();
    EXPECT_TRUE(called("viReadSTB", 1));
}

TEST_F(LockRule, TheWindowStaysAliveWhileACallHangs)
{
    auto gate = std::make_shared<standin::Gate>();
    standin::script("viRead", {.gate = gate});
    press("basicRead");
    ASSERT_TRUE(gate->waitForArrival());
    enter("basicCommand", "typed while the call hangs");
    EXPECT_EQ(shown("basicCommand", "currentText").toString(), "typed while the call hangs");
    gate->open();
}

} // namespace
