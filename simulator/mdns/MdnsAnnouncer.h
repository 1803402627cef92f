#pragma once

#include "simulator/mdns/MdnsResponder.h"
#include "simulator/mdns/MdnsSocket.h"
#include "simulator/server/ListenAddress.h"

#include <memory>
#include <string>
#include <vector>

namespace simulator
{

class EventLoop;

/// The responder with a socket for each interface on which the simulator listens, and on no other.
class MdnsAnnouncer
{
public:
    MdnsAnnouncer(EventLoop &loop, const std::vector<ListenAddress> &addresses, MdnsRecords records,
                  std::function<void(const std::string &)> told);

    const std::string &instance() const { return m_responder.instance(); }
    /// Where it cannot be announced, and why: one line an interface.
    const std::vector<std::string> &notes() const { return m_notes; }

private:
    std::vector<std::unique_ptr<MdnsSocket>> m_sockets;
    std::vector<std::string> m_notes;
    MdnsResponder m_responder;
};

} // namespace simulator
