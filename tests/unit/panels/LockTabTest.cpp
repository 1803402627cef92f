#include "PanelTest.h"

#include "panels/LockTab.h"
#include "panels/SpinBoxParameter.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QLabel>
#include <QLineEdit>

namespace
{
class LockTabTest : public PanelTest
{
protected:
    void granted(const std::string &key, ViStatus status = 0, Kind kind = Kind::SharedLock)
    {
        _visaFunctionCall call = result(kind, status);
        call.parameter[0].stringValue = key;
        finish(call);
    }

    LockTab m_tab{m_handler.get(), nullptr};
    QLineEdit *m_requested = find<QLineEdit>(m_tab, "lockRequestedKey");
    QLineEdit *m_actual = find<QLineEdit>(m_tab, "lockAccessKey");
    SpinBoxParameter *m_timeout = find<SpinBoxParameter>(m_tab, "lockTimeout");
};

TEST_F(LockTabTest, ShowsItsTextsAndRanges)
{
    struct Row {
        const char *name;
        const char *text;
    };
    for (const Row &row : {Row{"lockRequestedKeyLabel", "Requested Key:"},
                           Row{"lockAccessKeyLabel", "Actual AccessKey"}, Row{"lockTimeoutLabel", "Timeout:"}})
        EXPECT_EQ(find<QLabel>(m_tab, row.name)->text(), row.text);
    for (const Row &row :
         {Row{"lockExclusive", "Exclusive Lock"}, Row{"lockShared", "Shared Lock"}, Row{"lockUnlock", "Unlock"},
          Row{"lockGoToLocal", "Go to Local"}, Row{"lockGoToRemote", "Go to Remote"}})
        EXPECT_EQ(find<VisaFunctionCallButton>(m_tab, row.name)->text(), row.text);
    EXPECT_TRUE(m_actual->isReadOnly());
    EXPECT_FALSE(m_requested->isReadOnly());
    EXPECT_EQ(m_timeout->minimum(), 0);
    EXPECT_EQ(m_timeout->maximum(), 2147483647);
    EXPECT_EQ(m_timeout->value(), 2000);
    EXPECT_EQ(m_timeout->singleStep(), 1000);
    m_timeout->stepUp();
    EXPECT_EQ(m_timeout->value(), 3000);
}

TEST_F(LockTabTest, ButtonsSendTheirRequests)
{
    QTest::keyClicks(m_requested, "my key");
    m_timeout->setValue(77);
    struct Row {
        const char *name;
        Kind kind;
        std::uint64_t number;
        std::string key;
    };
    for (const Row &row :
         {Row{"lockExclusive", Kind::ExclusiveLock, 77, ""}, Row{"lockShared", Kind::SharedLock, 77, "my key"},
          Row{"lockUnlock", Kind::Unlock, 0, ""}, Row{"lockGoToLocal", Kind::GpibControlREN, 2, ""},
          Row{"lockGoToRemote", Kind::GpibControlREN, 3, ""}}) {
        press(find<VisaFunctionCallButton>(m_tab, row.name));
        const auto sent = requests();
        ASSERT_EQ(sent.size(), 1u) << row.name;
        EXPECT_EQ(sent[0].type, row.kind) << row.name;
        EXPECT_EQ(sent[0].parameter[0].uintValue, row.number) << row.name;
        EXPECT_EQ(sent[0].parameter[0].stringValue, "") << row.name;
        EXPECT_EQ(sent[0].parameter[1].stringValue, row.key) << row.name;
        finish(result(row.kind, VI_ERROR_TMO)); // frees the buttons
    }
}

TEST_F(LockTabTest, AnEmptyKeyIsAskedForAsItIs)
{
    press(find<VisaFunctionCallButton>(m_tab, "lockShared"));
    const auto sent = requests();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].parameter[1].stringValue, "");
}

TEST_F(LockTabTest, ShowsTheKeyThatWasGrantedWhateverWasAskedFor)
{
    QTest::keyClicks(m_requested, "asked");
    granted("gr\xC3\xBCn");
    EXPECT_EQ(m_actual->text(), QString::fromUtf8("grün"));
    EXPECT_EQ(m_requested->text(), "asked");
}

TEST_F(LockTabTest, ANestedLockShowsItsKeyToo)
{
    granted("nested", VI_SUCCESS_NESTED_SHARED);
    EXPECT_EQ(m_actual->text(), "nested");
}

TEST_F(LockTabTest, AFailedSharedLockLeavesTheKey)
{
    granted("before");
    granted("", VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(m_actual->text(), "before");
}

TEST_F(LockTabTest, TheOldKeyStaysAfterUnlockExclusiveLockAndClose)
{
    granted("before");
    for (const Kind kind : {Kind::Unlock, Kind::ExclusiveLock, Kind::Close, Kind::GpibControlREN})
        granted("other", 0, kind);
    EXPECT_EQ(m_actual->text(), "before");
}

TEST_F(LockTabTest, TabFollowsTheEyeAndPassesTheRequestButtonsBy)
{
    EXPECT_EQ(tabOrder(m_tab, m_requested), (QStringList{"lockRequestedKey", "lockAccessKey", "lockTimeout"}));
}
} // namespace
