#pragma once

#include "simulator/instrument/LockTable.h"
#include "simulator/instrument/MessageExchange.h"
#include "simulator/server/SerialLine.h"
#include "simulator/traffic/TrafficLog.h"

namespace simulator
{

class Instrument;

/**
 * The instrument's serial port: program messages that end with a line feed, answers that end with one. There is no END, no status byte, no clear; an answer
 * that nobody has read is simply the first one read next, by the same client.
 */
class SerialServer final : SerialLine::Owner, MessageExchange::Client
{
public:
    /// Throws std::system_error where there are no pseudo terminals.
    SerialServer(EventLoop &loop, Instrument &instrument);
    ~SerialServer();
    SerialServer(const SerialServer &) = delete;
    SerialServer &operator=(const SerialServer &) = delete;

    /// The name of the port, as a resource string has it behind ASRL.
    const std::string &port() const { return m_line.name(); }

private:
    bool mayGoOn() const;
    void answer();
    void forgetUnfinished();

    void received() override;
    void drained() override { received(); }
    void replaced() override { forgetUnfinished(); }
    void inputAccepted() override { received(); }

    Instrument &m_instrument;
    SerialLine m_line;
    TrafficLog::Client m_traffic;
    MessageExchange m_exchange;
    const LockTable::Owner m_lockOwner;
};

} // namespace simulator
