// What a VXI-11 client may still do that has just given way to another one: nothing.
#include "protocol/simulator/RpcCaller.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/server/Listener.h"
#include "simulator/server/Vxi11Server.h"

#include <gtest/gtest.h>

#include <sys/epoll.h>
#include <sys/eventfd.h>

using namespace simulator;
using test::RpcCaller;

namespace
{

class ForgottenVxi11Client : public testing::Test
{
protected:
    /// Lets the server do what it has to do now.
    void work()
    {
        for (int round = 0; round < 20; ++round) {
            loop.after({}, [this] { loop.stop(); });
            loop.run();
        }
    }

    std::string call(RpcCaller &client, std::string_view procedure, std::string_view arguments,
                     std::string_view data = {})
    {
        client.send(procedure, arguments, data);
        work();
        return client.results();
    }

    EventLoop loop;
    Instrument instrument{loop, {}};
    Vxi11Server server{loop, instrument, 1};
    Listener listener{
        loop, {"127.0.0.1", false}, 0, [this](FileDescriptor socket) { server.accept(std::move(socket)); }};
    /// Connections for which the test chooses the moment.
    Listener later{loop, {"127.0.0.1", false}, 0, [this](FileDescriptor socket) { accepted = std::move(socket); }};
    FileDescriptor accepted;
};

} // namespace

TEST_F(ForgottenVxi11Client, TakesNoLockByACallThatIsThereAlready)
{
    RpcCaller silent(listener.port(), "000607AF");
    RpcCaller next(later.port(), "000607AF");
    work();
    ASSERT_TRUE(accepted);
    // In one round of the loop the next client comes, and then the call of the one that has to give way is looked at.
    const FileDescriptor moment(::eventfd(1, EFD_CLOEXEC | EFD_NONBLOCK));
    EventLoop::WatchId watch = 0;
    watch = loop.watch(moment.get(), EPOLLIN, [&](std::uint32_t) {
        loop.remove(watch);
        server.accept(std::move(accepted));
    });
    silent.send("0000000A", "00000001 00000001 00000000 00000005", "inst0");
    work();
    EXPECT_EQ(silent.client().receiveAll(), "");
    EXPECT_EQ(call(next, "0000000A", "00000001 00000000 00000000 00000005", "inst0").substr(0, 18),
              "00000000 00000000 ");
    EXPECT_EQ(call(next, "00000012", "00000000 00000000 00000000"), "00000000 ") << "nobody holds the lock";
}
