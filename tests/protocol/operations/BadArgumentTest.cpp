// Arguments that are wrong: each gets the status that VPP-4.3 has for it, and nothing else happens.
#include "Operations.h"
#include "support/SimulatorProcess.h"
#include "support/VisaSession.h"

#include <visa.h>

#include <array>
#include <cstdarg>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <gtest/gtest.h>
#include <map>
#include <set>
#include <string>
#include <unistd.h>

using operations::Operation;
using operations::statusName;
using operations::Subject;

namespace
{

/// Operations that do not look at a handle.
const std::set<std::string> WithoutHandle = {"viGetDefaultRM", "viOpenDefaultRM", "viStatusDesc"};

const std::set<std::string> OfEvents = {"viDisableEvent",   "viDiscardEvents",    "viEnableEvent",
                                        "viInstallHandler", "viUninstallHandler", "viWaitOnEvent"};

class BadArguments : public testing::Test
{
protected:
    BadArguments()
    {
        std::ofstream(m_configuration) << "[KYGPIB-GATEWAYS]\nBoard0 = TCPIP::127.0.0.1::gpib0\n";
        ::setenv("KYVISA_CONFIG", m_configuration.c_str(), 1);
        ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator.resource("portmapper").c_str(), 1);
        EXPECT_EQ(viOpenDefaultRM(&m_rm), VI_SUCCESS);
        viSetAttribute(m_rm, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0);
        EXPECT_EQ(viOpen(m_rm, m_hislip.c_str(), VI_NO_LOCK, 20000, &m_vi), VI_SUCCESS);
        EXPECT_EQ(viOpen(m_rm, "GPIB0::INTFC", VI_NO_LOCK, 20000, &m_bus), VI_SUCCESS);
        viSetAttribute(m_vi, VI_ATTR_TMO_VALUE, 20000);
    }
    ~BadArguments() override
    {
        viClose(m_rm);
        std::filesystem::remove(m_configuration);
    }

    Subject subject(ViObject handle) const { return {handle, m_rm, m_hislip, false, m_configuration + ".data"}; }

    /// What each operation answers for a handle that does not stand for anything.
    void refuses(ViObject handle, const char *what)
    {
        for (const Operation &operation : operations::all()) {
            const std::string name = operation.name;
            ViStatus expected = VI_ERROR_INV_OBJECT;
            if (WithoutHandle.contains(name) || !operation.givesStatus)
                expected = VI_SUCCESS;
            if (name == "viClose" && handle == VI_NULL)
                expected = VI_WARN_NULL_OBJECT;
            EXPECT_EQ(statusName(operation.call(subject(handle))), statusName(expected)) << name << " on " << what;
        }
    }
    /// What each operation answers for an object that is no session. Attributes have their own rules.
    void refusesAnObjectThatIsNoSession(ViObject handle, const char *what)
    {
        for (const Operation &operation : operations::all()) {
            const std::string name = operation.name;
            if (WithoutHandle.contains(name) || !operation.givesStatus || name == "viClose" ||
                name == "viGetAttribute" || name == "viSetAttribute" || name == "viFindNext")
                continue;
            const ViStatus expected = OfEvents.contains(name) ? VI_ERROR_INV_EVENT : VI_ERROR_NSUP_OPER;
            EXPECT_EQ(statusName(operation.call(subject(handle))), statusName(expected)) << name << " on " << what;
        }
    }
    /// The session still does what it should.
    void expectSound()
    {
        ViInt32 answer = 0;
        EXPECT_EQ(viQueryf(m_vi, "*ESE 3;*ESE?\n", "%d", &answer), VI_SUCCESS);
        EXPECT_EQ(answer, 3);
    }

    const std::string m_configuration = testing::TempDir() + "bad-arguments-" + std::to_string(::getpid()) + ".ini";
    test::SimulatorProcess m_simulator{{"--hislip", "0", "--vxi11", "0", "--portmapper", "0", "--gpib"}};
    const std::string m_hislip = m_simulator.resource("hislip");
    ViSession m_rm = VI_NULL;
    ViSession m_vi = VI_NULL;
    ViSession m_bus = VI_NULL;
};

TEST_F(BadArguments, HandlesOfNothingAreInvalidForEveryOperation)
{
    refuses(VI_NULL, "no handle");
    refuses(0xFFFFFFFF, "all bits");
    refuses(1, "1");
    refuses(m_vi + 0x10000, "a handle of the future");
    expectSound();
}

TEST_F(BadArguments, ClosedSessionsAreInvalidForEveryOperation)
{
    ViSession closed = VI_NULL;
    ASSERT_EQ(viOpen(m_rm, m_hislip.c_str(), VI_NO_LOCK, 20000, &closed), VI_SUCCESS);
    ASSERT_EQ(viClose(closed), VI_SUCCESS);
    refuses(closed, "a closed session");
    ViSession manager = VI_NULL;
    ViSession child = VI_NULL;
    ASSERT_EQ(viOpenDefaultRM(&manager), VI_SUCCESS);
    ASSERT_EQ(viOpen(manager, m_hislip.c_str(), VI_NO_LOCK, 20000, &child), VI_SUCCESS);
    ASSERT_EQ(viClose(manager), VI_SUCCESS);
    refuses(manager, "a closed resource manager");
    refuses(child, "a session of a closed resource manager");
    expectSound();
}

TEST_F(BadArguments, FindListsAndEventContextsAreNoSessions)
{
    ViFindList list = VI_NULL;
    std::array<ViChar, 256> name{};
    ASSERT_EQ(viFindRsrc(m_rm, "GPIB?*", &list, nullptr, name.data()), VI_SUCCESS);
    refusesAnObjectThatIsNoSession(list, "a find list");
    EXPECT_EQ(viFindNext(list, name.data()), VI_ERROR_RSRC_NFOUND);
    EXPECT_EQ(viGetAttribute(list, VI_ATTR_TMO_VALUE, name.data()), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(viSetAttribute(list, VI_ATTR_TMO_VALUE, 1), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(viClose(list), VI_SUCCESS);
    EXPECT_EQ(viFindNext(list, name.data()), VI_ERROR_INV_OBJECT);

    ViEvent context = VI_NULL;
    ASSERT_EQ(viEnableEvent(m_vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, VI_NULL), VI_SUCCESS);
    ASSERT_GE(viWriteAsync(m_vi, reinterpret_cast<ViConstBuf>("*CLS\n"), 5, nullptr), VI_SUCCESS);
    ASSERT_EQ(viWaitOnEvent(m_vi, VI_EVENT_IO_COMPLETION, 20000, nullptr, &context), VI_SUCCESS);
    refusesAnObjectThatIsNoSession(context, "an event context");
    EXPECT_EQ(viFindNext(context, name.data()), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGetAttribute(context, VI_ATTR_TMO_VALUE, name.data()), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(viSetAttribute(context, VI_ATTR_EVENT_TYPE, 1), VI_ERROR_ATTR_READONLY);
    EXPECT_EQ(viClose(context), VI_SUCCESS);
    expectSound();
}

ViStatus printed(ViSession vi, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVPrintf(vi, format, list);
    va_end(list);
    return status;
}

ViStatus scanned(ViSession vi, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVScanf(vi, format, list);
    va_end(list);
    return status;
}

ViStatus asked(ViSession vi, const char *output, const char *input, ...)
{
    va_list list;
    va_start(list, input);
    const ViStatus status = viVQueryf(vi, output, input, list);
    va_end(list);
    return status;
}

ViStatus printedToText(ViSession vi, ViPBuf to, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVSPrintf(vi, to, format, list);
    va_end(list);
    return status;
}

ViStatus scannedFromText(ViSession vi, ViConstBuf from, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVSScanf(vi, from, format, list);
    va_end(list);
    return status;
}

ViStatus handler(ViSession, ViEventType, ViEvent, ViAddr)
{
    return VI_SUCCESS;
}

TEST_F(BadArguments, GetTheirStatus)
{
    ViUInt32 count = 0;
    ViUInt16 number = 0;
    std::array<ViByte, 16> bytes{};
    std::array<ViChar, 256> text{};
    ViSession session = VI_NULL;
    const auto *some = reinterpret_cast<ViConstBuf>("*CLS\n");
    const std::string tooLong = "TCPIP::" + std::string(1000, 'a') + "::INSTR";
    const std::string longKey(256, 'k');
    const std::string longExpression(1 << 20, '?');
    const std::string noFolder = testing::TempDir() + "there/is/no/such/folder";

    const struct {
        std::string operation;
        const char *what;
        ViStatus expected;
        std::function<ViStatus()> call;
    } rows[] = {
        {"viOpenDefaultRM", "no place", VI_ERROR_INV_PARAMETER, [&] { return viOpenDefaultRM(nullptr); }},
        {"viGetDefaultRM", "no place", VI_ERROR_INV_PARAMETER, [&] { return viGetDefaultRM(nullptr); }},
        {"viOpen", "no name", VI_ERROR_INV_RSRC_NAME, [&] { return viOpen(m_rm, nullptr, 0, 0, &session); }},
        {"viOpen", "no place", VI_ERROR_INV_PARAMETER, [&] { return viOpen(m_rm, m_hislip.c_str(), 0, 0, nullptr); }},
        {"viOpen", "a name of nothing", VI_ERROR_INV_RSRC_NAME, [&] { return viOpen(m_rm, "", 0, 0, &session); }},
        {"viOpen", "too long a name", VI_ERROR_INV_RSRC_NAME,
         [&] { return viOpen(m_rm, tooLong.c_str(), 0, 0, &session); }},
        {"viOpen", "an access mode of nothing", VI_ERROR_INV_ACC_MODE,
         [&] { return viOpen(m_rm, m_hislip.c_str(), 2, 0, &session); }},
        {"viClose", "no object", VI_WARN_NULL_OBJECT, [&] { return viClose(VI_NULL); }},
        {"viFindRsrc", "no expression", VI_ERROR_INV_EXPR,
         [&] { return viFindRsrc(m_rm, nullptr, nullptr, &count, text.data()); }},
        {"viFindRsrc", "an empty expression", VI_ERROR_INV_EXPR,
         [&] { return viFindRsrc(m_rm, "", nullptr, &count, text.data()); }},
        {"viFindRsrc", "too long an expression", VI_ERROR_INV_EXPR,
         [&] { return viFindRsrc(m_rm, longExpression.c_str(), nullptr, &count, text.data()); }},
        {"viFindRsrc", "no places", VI_SUCCESS, [&] { return viFindRsrc(m_rm, "GPIB?*", nullptr, nullptr, nullptr); }},
        {"viFindNext", "a session", VI_ERROR_NSUP_OPER, [&] { return viFindNext(m_rm, text.data()); }},
        {"viFindNext", "no place", VI_ERROR_INV_PARAMETER,
         [&] {
             ViFindList list = VI_NULL;
             viFindRsrc(m_rm, "GPIB?*", &list, nullptr, nullptr);
             const ViStatus status = viFindNext(list, nullptr);
             viClose(list);
             return status;
         }},
        {"viParseRsrc", "no name", VI_ERROR_INV_RSRC_NAME,
         [&] { return viParseRsrc(m_rm, nullptr, &number, &number); }},
        {"viParseRsrc", "too long a name", VI_ERROR_INV_RSRC_NAME,
         [&] { return viParseRsrc(m_rm, tooLong.c_str(), &number, &number); }},
        {"viParseRsrcEx", "too long a name", VI_ERROR_INV_RSRC_NAME,
         [&] { return viParseRsrcEx(m_rm, tooLong.c_str(), &number, &number, text.data(), nullptr, nullptr); }},
        {"viParseRsrc", "no places", VI_ERROR_INV_PARAMETER,
         [&] { return viParseRsrc(m_rm, m_hislip.c_str(), nullptr, nullptr); }},
        {"viParseRsrcEx", "no name", VI_ERROR_INV_RSRC_NAME,
         [&] { return viParseRsrcEx(m_rm, nullptr, &number, &number, text.data(), nullptr, nullptr); }},
        {"viParseRsrcEx", "no place for the number", VI_ERROR_INV_PARAMETER,
         [&] { return viParseRsrcEx(m_rm, m_hislip.c_str(), &number, nullptr, text.data(), nullptr, nullptr); }},
        {"viParseRsrcEx", "no places for texts", VI_SUCCESS,
         [&] { return viParseRsrcEx(m_rm, m_hislip.c_str(), &number, &number, nullptr, nullptr, nullptr); }},
        {"viGetAttribute", "no place", VI_ERROR_INV_PARAMETER,
         [&] { return viGetAttribute(m_vi, VI_ATTR_TMO_VALUE, nullptr); }},
        {"viGetAttribute", "no place on a find list", VI_ERROR_INV_PARAMETER,
         [&] {
             ViFindList list = VI_NULL;
             viFindRsrc(m_rm, "GPIB?*", &list, nullptr, nullptr);
             const ViStatus status = viGetAttribute(list, VI_KY_ATTR_LXI_MANF, nullptr);
             viClose(list);
             return status;
         }},
        {"viGetAttribute", "an attribute of nothing", VI_ERROR_NSUP_ATTR,
         [&] { return viGetAttribute(m_vi, 0x3FFFFFFF, text.data()); }},
        {"viSetAttribute", "an attribute of nothing", VI_ERROR_NSUP_ATTR,
         [&] { return viSetAttribute(m_vi, 0x3FFFFFFF, 1); }},
        {"viSetAttribute", "a state of nothing", VI_ERROR_NSUP_ATTR_STATE,
         [&] { return viSetAttribute(m_vi, VI_ATTR_TERMCHAR_EN, 7); }},
        {"viSetAttribute", "one that is read only", VI_ERROR_ATTR_READONLY,
         [&] { return viSetAttribute(m_vi, VI_ATTR_INTF_NUM, 1); }},
        {"viStatusDesc", "no place", VI_ERROR_INV_PARAMETER, [&] { return viStatusDesc(m_vi, VI_SUCCESS, nullptr); }},
        {"viStatusDesc", "a status of nothing", VI_WARN_UNKNOWN_STATUS,
         [&] { return viStatusDesc(m_vi, 0x12345, text.data()); }},
        {"viTerminate", "a degree", VI_ERROR_INV_DEGREE, [&] { return viTerminate(m_vi, 1, VI_NULL); }},
        {"viTerminate", "a job of nothing", VI_ERROR_INV_JOB_ID, [&] { return viTerminate(m_vi, VI_NULL, 4711); }},
        {"viLock", "a type of nothing", VI_ERROR_INV_LOCK_TYPE,
         [&] { return viLock(m_vi, 7, 0, nullptr, text.data()); }},
        {"viLock", "too long a key", VI_ERROR_INV_ACCESS_KEY,
         [&] { return viLock(m_vi, VI_SHARED_LOCK, 0, longKey.c_str(), text.data()); }},
        {"viUnlock", "nothing locked", VI_ERROR_SESN_NLOCKED, [&] { return viUnlock(m_vi); }},
        {"viEnableEvent", "an event of nothing", VI_ERROR_INV_EVENT,
         [&] { return viEnableEvent(m_vi, 0x3FFFFFFF, VI_QUEUE, VI_NULL); }},
        {"viEnableEvent", "a mechanism of nothing", VI_ERROR_INV_MECH,
         [&] { return viEnableEvent(m_vi, VI_EVENT_IO_COMPLETION, 0x80, VI_NULL); }},
        {"viEnableEvent", "both kinds of handler", VI_ERROR_INV_MECH,
         [&] { return viEnableEvent(m_vi, VI_EVENT_IO_COMPLETION, VI_HNDLR | VI_SUSPEND_HNDLR, VI_NULL); }},
        {"viEnableEvent", "a context", VI_ERROR_INV_CONTEXT,
         [&] { return viEnableEvent(m_vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, 1); }},
        {"viDisableEvent", "an event of nothing", VI_ERROR_INV_EVENT,
         [&] { return viDisableEvent(m_vi, 0x3FFFFFFF, VI_QUEUE); }},
        {"viDisableEvent", "a mechanism of nothing", VI_ERROR_INV_MECH,
         [&] { return viDisableEvent(m_vi, VI_EVENT_IO_COMPLETION, 0x80); }},
        {"viDiscardEvents", "an event of nothing", VI_ERROR_INV_EVENT,
         [&] { return viDiscardEvents(m_vi, 0x3FFFFFFF, VI_QUEUE); }},
        {"viDiscardEvents", "a mechanism of nothing", VI_ERROR_INV_MECH,
         [&] { return viDiscardEvents(m_vi, VI_EVENT_IO_COMPLETION, 0x80); }},
        {"viWaitOnEvent", "an event of nothing", VI_ERROR_INV_EVENT,
         [&] { return viWaitOnEvent(m_vi, 0x3FFFFFFF, 0, nullptr, nullptr); }},
        {"viWaitOnEvent", "one that is not enabled", VI_ERROR_NENABLED,
         [&] { return viWaitOnEvent(m_vi, VI_EVENT_IO_COMPLETION, 0, nullptr, nullptr); }},
        {"viInstallHandler", "no handler", VI_ERROR_INV_HNDLR_REF,
         [&] { return viInstallHandler(m_vi, VI_EVENT_IO_COMPLETION, nullptr, nullptr); }},
        {"viInstallHandler", "an event of nothing", VI_ERROR_INV_EVENT,
         [&] { return viInstallHandler(m_vi, 0x3FFFFFFF, handler, nullptr); }},
        {"viUninstallHandler", "none installed", VI_ERROR_HNDLR_NINSTALLED,
         [&] { return viUninstallHandler(m_vi, VI_EVENT_IO_COMPLETION, handler, nullptr); }},
        {"viRead", "no buffer", VI_ERROR_USER_BUF, [&] { return viRead(m_vi, nullptr, 1, &count); }},
        {"viRead", "no buffer for nothing", VI_SUCCESS_MAX_CNT, [&] { return viRead(m_vi, nullptr, 0, &count); }},
        {"viReadAsync", "no buffer", VI_ERROR_USER_BUF, [&] { return viReadAsync(m_vi, nullptr, 1, &count); }},
        {"viReadToFile", "no file", VI_ERROR_FILE_ACCESS, [&] { return viReadToFile(m_vi, nullptr, 1, &count); }},
        {"viReadToFile", "a folder of nothing", VI_ERROR_FILE_ACCESS,
         [&] { return viReadToFile(m_vi, noFolder.c_str(), 1, &count); }},
        {"viReadToFile", "too long a name", VI_ERROR_FILE_ACCESS,
         [&] { return viReadToFile(m_vi, longExpression.c_str(), 1, &count); }},
        {"viWriteFromFile", "too long a name", VI_ERROR_FILE_ACCESS,
         [&] { return viWriteFromFile(m_vi, longExpression.c_str(), 1, &count); }},
        {"viWrite", "no buffer", VI_ERROR_USER_BUF, [&] { return viWrite(m_vi, nullptr, 1, &count); }},
        {"viWriteAsync", "no buffer", VI_ERROR_USER_BUF, [&] { return viWriteAsync(m_vi, nullptr, 1, &count); }},
        {"viWriteFromFile", "no file", VI_ERROR_FILE_ACCESS, [&] { return viWriteFromFile(m_vi, nullptr, 1, &count); }},
        {"viWriteFromFile", "a file of nothing", VI_ERROR_FILE_ACCESS,
         [&] { return viWriteFromFile(m_vi, noFolder.c_str(), 1, &count); }},
        {"viAssertTrigger", "a protocol of nothing", VI_ERROR_INV_PROT, [&] { return viAssertTrigger(m_vi, 99); }},
        {"viReadSTB", "no place", VI_ERROR_INV_PARAMETER, [&] { return viReadSTB(m_vi, nullptr); }},
        {"viSetBuf", "a mask of nothing", VI_ERROR_INV_MASK, [&] { return viSetBuf(m_vi, 0x4000, 100); }},
        {"viFlush", "a mask of nothing", VI_ERROR_INV_MASK, [&] { return viFlush(m_vi, 0x4000); }},
        {"viBufWrite", "no buffer", VI_ERROR_USER_BUF, [&] { return viBufWrite(m_vi, nullptr, 1, &count); }},
        {"viBufRead", "no buffer", VI_ERROR_USER_BUF, [&] { return viBufRead(m_vi, nullptr, 1, &count); }},
        {"viPrintf", "no format", VI_ERROR_INV_FMT, [&] { return viPrintf(m_vi, nullptr); }},
        {"viVPrintf", "no format", VI_ERROR_INV_FMT, [&] { return printed(m_vi, nullptr); }},
        {"viSPrintf", "no format", VI_ERROR_INV_FMT, [&] { return viSPrintf(m_vi, bytes.data(), nullptr); }},
        {"viSPrintf", "no buffer", VI_ERROR_USER_BUF, [&] { return viSPrintf(m_vi, nullptr, "a"); }},
        {"viVSPrintf", "no format", VI_ERROR_INV_FMT, [&] { return printedToText(m_vi, bytes.data(), nullptr); }},
        {"viVSPrintf", "no buffer", VI_ERROR_USER_BUF, [&] { return printedToText(m_vi, nullptr, "a"); }},
        {"viScanf", "no format", VI_ERROR_INV_FMT, [&] { return viScanf(m_vi, nullptr); }},
        {"viVScanf", "no format", VI_ERROR_INV_FMT, [&] { return scanned(m_vi, nullptr); }},
        {"viSScanf", "no format", VI_ERROR_INV_FMT, [&] { return viSScanf(m_vi, some, nullptr); }},
        {"viSScanf", "no text", VI_ERROR_USER_BUF, [&] { return viSScanf(m_vi, nullptr, "a"); }},
        {"viVSScanf", "no format", VI_ERROR_INV_FMT, [&] { return scannedFromText(m_vi, some, nullptr); }},
        {"viVSScanf", "no text", VI_ERROR_USER_BUF, [&] { return scannedFromText(m_vi, nullptr, "a"); }},
        {"viQueryf", "no question", VI_ERROR_INV_FMT, [&] { return viQueryf(m_vi, nullptr, "%d", &count); }},
        {"viQueryf", "no answer", VI_ERROR_INV_FMT, [&] { return viQueryf(m_vi, "*IDN?\n", nullptr); }},
        {"viVQueryf", "no question", VI_ERROR_INV_FMT, [&] { return asked(m_vi, nullptr, "%d", &count); }},
        {"viVQueryf", "no answer", VI_ERROR_INV_FMT, [&] { return asked(m_vi, "*IDN?\n", nullptr); }},
        {"viGpibControlREN", "a mode of nothing", VI_ERROR_INV_MODE, [&] { return viGpibControlREN(m_bus, 99); }},
        {"viGpibControlATN", "a mode of nothing", VI_ERROR_INV_MODE, [&] { return viGpibControlATN(m_bus, 99); }},
        {"viGpibCommand", "no buffer", VI_ERROR_USER_BUF, [&] { return viGpibCommand(m_bus, nullptr, 1, &count); }},
        {"viGpibPassControl", "an address of nothing", VI_ERROR_INV_PARAMETER,
         [&] { return viGpibPassControl(m_bus, 99, VI_NO_SEC_ADDR); }},
    };

    std::set<std::string> tried;
    for (const auto &row : rows) {
        EXPECT_EQ(statusName(row.call()), statusName(row.expected)) << row.operation << " with " << row.what;
        EXPECT_EQ(session, static_cast<ViSession>(VI_NULL)) << row.operation << " with " << row.what;
        tried.insert(row.operation);
        ASSERT_NO_FATAL_FAILURE(expectSound()) << row.operation << " with " << row.what;
    }
    // No operation is missing. Those of other interfaces are refused whatever their arguments, and the rest have none.
    const std::set<std::string> withoutArguments = {"viClear", "viGpibSendIFC"};
    for (const Operation &operation : operations::all()) {
        if (std::string(operation.name) == "viClose")
            continue; // it would close the session that the others are tried on
        const bool known = tried.contains(operation.name) || withoutArguments.contains(operation.name);
        const bool refused = !operation.givesStatus || operation.call(subject(m_bus)) == VI_ERROR_NSUP_OPER;
        EXPECT_TRUE(known || refused) << operation.name;
    }
}

TEST_F(BadArguments, PlacesForResultsMayBeLeftOutWhereTheStandardSaysSo)
{
    EXPECT_EQ(viWrite(m_vi, reinterpret_cast<ViConstBuf>("*OPC?\n"), 6, nullptr), VI_SUCCESS);
    std::array<ViByte, 16> bytes{};
    EXPECT_EQ(viRead(m_vi, bytes.data(), 16, nullptr), VI_SUCCESS);
    EXPECT_EQ(viLock(m_vi, VI_EXCLUSIVE_LOCK, 20000, nullptr, nullptr), VI_SUCCESS);
    EXPECT_EQ(viUnlock(m_vi), VI_SUCCESS);
    EXPECT_EQ(viGpibCommand(m_bus, reinterpret_cast<ViConstBuf>("?_"), 2, nullptr), VI_SUCCESS);
    EXPECT_EQ(viEnableEvent(m_vi, VI_EVENT_IO_COMPLETION, VI_QUEUE, VI_NULL), VI_SUCCESS);
    EXPECT_GE(viWriteAsync(m_vi, reinterpret_cast<ViConstBuf>("*CLS\n"), 5, nullptr), VI_SUCCESS);
    EXPECT_EQ(viWaitOnEvent(m_vi, VI_EVENT_IO_COMPLETION, 20000, nullptr, nullptr), VI_SUCCESS);
    expectSound();
}

TEST_F(BadArguments, OperationsOfOtherInterfacesDoNotTouchTheirArguments)
{
    EXPECT_EQ(viIn32(m_vi, 1, 0, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viMoveIn8(m_vi, 1, 0, 8, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viMapAddress(m_vi, 1, 0, 8, VI_FALSE, nullptr, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viMemAlloc(m_vi, 8, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viMoveAsync(m_vi, 1, 0, 1, 1, 0, 1, 8, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viUsbControlIn(m_vi, 0, 0, 0, 0, 8, nullptr, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viVxiCommandQuery(m_vi, 0, 0, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viPxiReserveTriggers(m_vi, 1, nullptr, nullptr, nullptr), VI_ERROR_NSUP_OPER);
    viPeek32(m_vi, nullptr, nullptr);
    expectSound();
}

} // namespace
