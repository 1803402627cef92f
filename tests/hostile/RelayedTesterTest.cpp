// The tester's session behind a relay that splits, delays and throttles what goes through it, or cuts the connection at any byte.
#include "hostile/TesterSession.h"
#include "hostile/Ways.h"

#include "support/Relay.h"

#include <gtest/gtest.h>

namespace hostile
{
namespace
{

using test::Relay;

constexpr unsigned Long = 30000; // milliseconds

std::vector<Way> waysWithAPort()
{
    std::vector<Way> some = ways();
    std::erase_if(some, [](const Way &way) {
        const std::string service = way.service;
        return service != "socket" && service != "hislip";
    });
    return some;
}

class RelayedTester : public testing::TestWithParam<Way>
{
protected:
    std::string through(const Relay &relay) const
    {
        std::string name = m_simulator.resource(GetParam().service);
        const std::string port = std::to_string(m_simulator.port(GetParam().service));
        return name.replace(name.find(port), port.size(), std::to_string(relay.port()));
    }

    /// What somebody does with an instrument. The status of the first operation that fails; its line is the log's last one.
    ViStatus use(TesterSession &session, const std::string &resource)
    {
        return TesterSession::statusOf([&] {
            session.open(resource, Long);
            session->setTimeout(Long);
            if (!GetParam().hasEnd) {
                session->setAttribute(VI_ATTR_TERMCHAR_EN, VI_TRUE, true);
                session->setAttribute(VI_ATTR_IO_PROT, VI_PROT_4882_STRS, true);
            }
            std::vector<char> text(1024);
            const unsigned count = session->query("*ESE 5;*ESE?\n", 13, text.data(), 1024);
            EXPECT_EQ(std::string(text.data(), count), "5\n");
            session->getSTB();
            session->clear();
            session->lockExclusive(Long);
            session->unlock();
            EXPECT_EQ(session->query("*OPC?\n", 6, text.data(), 1024), 2u);
        });
    }

    /// True when the cut came behind all of it.
    bool survives(Relay::Manners manners)
    {
        Relay relay(m_simulator.port(GetParam().service), manners);
        TesterSession session;
        const ViStatus status = use(session, through(relay));
        const FastBuffer line = session.lastLine();
        EXPECT_TRUE(status == VI_SUCCESS || line.status == status) << line.text << " has " << shortName(line.status);
        if (status == VI_SUCCESS)
            return true;
        const bool opening = std::string(line.text).starts_with("viOpen(");
        EXPECT_EQ(shortName(status), opening ? "RSRC_NFOUND" : "CONN_LOST") << line.text;
        return false;
    }

    test::SimulatorProcess m_simulator{GetParam().options};
};

INSTANTIATE_TEST_SUITE_P(Over, RelayedTester, testing::ValuesIn(waysWithAPort()), nameOf);

TEST_P(RelayedTester, GetsItsAnswersByteByByteLateAndMerged)
{
    EXPECT_TRUE(survives({.piece = 1}));
    EXPECT_TRUE(survives({.piece = 1, .delay = std::chrono::microseconds(200)}));
    EXPECT_TRUE(survives({.piece = 7, .delay = std::chrono::microseconds(500)}));
    EXPECT_TRUE(survives({.delay = std::chrono::milliseconds(5)}));
}

TEST_P(RelayedTester, SaysThatTheConnectionIsLostAtWhateverByteItIsCut)
{
    constexpr std::size_t Most = 2000;
    std::size_t cut = 0;
    while (cut < Most && !survives({.cutAfter = cut}))
        ++cut;
    EXPECT_GT(cut, 2u);
    EXPECT_LT(cut, Most);
    cut = 0;
    while (cut < Most && !survives({.cutAfterSent = cut}))
        ++cut;
    EXPECT_GT(cut, 2u);
    EXPECT_LT(cut, Most);
    EXPECT_TRUE(survives({})) << "the instrument does not mind";
}

} // namespace
} // namespace hostile
