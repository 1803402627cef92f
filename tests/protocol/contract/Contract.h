#pragma once

#include "support/SimulatorProcess.h"
#include "support/VisaSession.h"

#include <cstdlib>
#include <gtest/gtest.h>
#include <string>
#include <vector>

/**
 * One contract for all protocols: what a program may rely on whichever way it reaches its instrument. Where a protocol cannot,
 * its row here says so, and the case expects what the standard says instead.
 */
namespace contract
{

enum class Locks {
    OnThisMachine, ///< the protocol has none: other sessions are refused at once (VPP-4.3 3.6)
    InTheDevice,   ///< HiSLIP: the device keeps others waiting (IVI-6.1 6.5)
    OnePortOneSession,
};

struct Protocol {
    const char *name;
    const char *service; ///< of the simulator
    std::vector<std::string> options;
    bool hasEnd = true;             ///< a raw socket has no END: reads end by termination character or count
    bool clearReachesDevice = true; ///< on sockets and serial lines viClear drops what is on this side (VPP-4.3 6.1)
    bool answersAreKept = false;    ///< overlapped HiSLIP: unread answers stay, in order (IVI-6.1 3.1.3)
    /// A late answer is dropped once it has arrived: nothing on a raw connection tells it from the next one, and over VXI-11 the
    /// instrument may take the next question before it has made the answer.
    bool lateAnswersMustHaveCome = false;
    bool stringsForStatus = false; ///< status byte and trigger only as "*STB?" and "*TRG"
    Locks locks = Locks::OnThisMachine;
    std::size_t largestBlock = 64 << 20;
};

inline const std::vector<Protocol> &protocols()
{
    static const std::vector<Protocol> all = {
        {.name = "socket",
         .service = "socket",
         .options = {"--socket", "0"},
         .hasEnd = false,
         .clearReachesDevice = false,
         .lateAnswersMustHaveCome = true,
         .stringsForStatus = true},
        {.name = "hislip", .service = "hislip", .options = {"--hislip", "0"}, .locks = Locks::InTheDevice},
        {.name = "overlapped",
         .service = "hislip",
         .options = {"--hislip", "0", "--hislip-overlap"},
         .answersAreKept = true,
         .locks = Locks::InTheDevice},
        {.name = "vxi11",
         .service = "vxi11",
         .options = {"--vxi11", "0", "--portmapper", "0"},
         .lateAnswersMustHaveCome = true},
        {.name = "gateway",
         .service = "gpib",
         .options = {"--gpib", "--vxi11", "0", "--portmapper", "0"},
         .lateAnswersMustHaveCome = true},
        {.name = "serial",
         .service = "serial",
         .options = {"--serial"},
         .clearReachesDevice = false,
         .lateAnswersMustHaveCome = true,
         .stringsForStatus = true,
         .locks = Locks::OnePortOneSession,
         .largestBlock = 1 << 20},
    };
    return all;
}

inline std::string nameOf(const testing::TestParamInfo<Protocol> &info)
{
    return info.param.name;
}

/// Keeps the addresses of its members out of the names of the tests.
inline void PrintTo(const Protocol &protocol, std::ostream *out)
{
    *out << protocol.name;
}

class Contract : public testing::TestWithParam<Protocol>
{
protected:
    void SetUp() override { open(m_session); }

    std::string resource() const { return m_simulator.resource(GetParam().service); }

    void open(test::VisaSession &session)
    {
        ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator.resource("portmapper").c_str(), 1);
        ASSERT_EQ(session.open(resource(), 10000), VI_SUCCESS) << resource();
        session.set(VI_ATTR_TMO_VALUE, 20000);
        if (!GetParam().hasEnd)
            session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE);
        if (GetParam().stringsForStatus)
            session.set(VI_ATTR_IO_PROT, VI_PROT_4882_STRS);
    }
    /// The status of a read that took a whole answer.
    ViStatus whole() const { return GetParam().hasEnd ? VI_SUCCESS : VI_SUCCESS_TERM_CHAR; }
    std::string query(test::VisaSession &session, const std::string &question)
    {
        EXPECT_EQ(session.write(question + "\n"), VI_SUCCESS);
        EXPECT_EQ(session.read(), whole());
        return session.text;
    }
    std::string query(const std::string &question) { return query(m_session, question); }

    /// Ends of messages inside binary data must not count.
    void readBinary(test::VisaSession &session, bool on)
    {
        if (!GetParam().hasEnd)
            session.set(VI_ATTR_TERMCHAR_EN, on ? VI_FALSE : VI_TRUE);
        if (GetParam().locks == Locks::OnePortOneSession)
            session.set(VI_ATTR_ASRL_END_IN, on ? VI_ASRL_END_NONE : VI_ASRL_END_TERMCHAR);
    }

    test::SimulatorProcess m_simulator{GetParam().options};
    test::VisaSession m_session;
};

} // namespace contract
