#pragma once

#include "simulator/instrument/CommandTable.h"
#include "simulator/instrument/InputBuffer.h"
#include "simulator/instrument/Response.h"
#include "simulator/instrument/StatusModel.h"
#include "simulator/traffic/TrafficLog.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <span>
#include <vector>

namespace simulator
{

class Instrument;
struct ScpiError;

/**
 * The message exchange of IEEE 488.2 for one client: input buffer, parser, execution, response formatter, output queue.
 *
 * A transport hands in bytes as they come and takes out a response when it is complete:
 *
 *     while (!bytes.empty() && exchange.accepting()) {
 *         exchange.receive(bytes);               // stops behind each program message
 *         if (exchange.output().isComplete())
 *             send(exchange.output().take());
 *     }
 *
 * A command that waits (*WAI, *OPC?, SYSTem:DELay) holds the client's input: accepting() is false until Client::inputAccepted(). The
 * transport keeps what it has by then, and stops reading when it has enough; other clients notice nothing.
 */
class MessageExchange
{
public:
    /// The transport's side. Neither is called from inside receive(), end() or clear().
    class Client
    {
    public:
        /// A held command has ended; a response may be complete.
        virtual void inputAccepted() = 0;

    protected:
        ~Client() = default;
    };

    /// How the transport differs from others.
    struct Traits {
        bool hasEnd;             ///< messages can end with END
        bool availableFromQueue; ///< MAV follows the output queue; else the transport says (HiSLIP)
        std::function<void(std::uint8_t)> serviceRequest; ///< called with the status byte; must not come back
    };
    using Continuation = std::function<void(ResponseUnit &)>;

    MessageExchange(Instrument &instrument, Client &client, Traits traits);
    ~MessageExchange();
    MessageExchange(const MessageExchange &) = delete;
    MessageExchange &operator=(const MessageExchange &) = delete;

    // For the transport.
    bool accepting() const { return !m_held; }
    /// Takes bytes from the front; returns behind a message's end, when the input is held, or when all are taken.
    void receive(std::span<const std::byte> &bytes);
    /// END came with the last byte received.
    void end();
    /// Where the next bytes can be received directly, then told to directReceived(); empty when not inside a block.
    std::span<std::byte> directInput() { return accepting() ? m_input.blockSpace() : std::span<std::byte>{}; }
    void directReceived(std::size_t count);
    bool inMessage() const { return m_held || m_input.inMessage(); }
    OutputQueue &output() { return m_output; }
    /// The client sent something new before it had read its answer: -410, and the answer is gone.
    void interrupted();
    /// The client wants to read, and there is nothing that would give it an answer: -420, and a message that has begun is forgotten.
    void unterminated();
    /// Device clear: exchange and pending waits as after power-on; settings, status and errors stay.
    void clear();
    /// Group execute trigger; inside a program message it is refused.
    void trigger();
    void setMessageAvailable(bool available);
    /// Serial poll.
    std::uint8_t poll();
    bool requestsService() const { return m_service.requesting(); }

    /// Who is told what passes from now on; null for nobody. Must outlive the exchange or be taken back.
    void setTraffic(TrafficLog::Client *traffic) { m_traffic = traffic; }
    TrafficLog::Client *traffic() const { return m_traffic; }

    // For commands and the instrument.
    std::uint8_t statusByte() const;
    std::uint8_t masterSummaryByte() const; ///< as *STB? answers: bit 6 is MSS
    void updateService();
    /// Holds the client's input; then @p then may add to the answer.
    void holdFor(std::chrono::nanoseconds delay, Continuation then);
    void holdUntilIdle(Continuation then);
    /// *OPC: the event bit when what is pending now has ended.
    void noteOperationComplete();
    void forgetOperationComplete();

private:
    void runMessage();
    void runUnit(bool endsMessage);
    void resume();
    void finishUnit();
    void finishMessage();
    void report(const ScpiError &error);

    Instrument &m_instrument;
    Client &m_client;
    const Traits m_traits;
    TrafficLog::Client *m_traffic = nullptr;

    InputBuffer m_input;
    OutputQueue m_output;
    ResponseUnit m_response;
    const CommandTable::Node *m_path = nullptr; ///< where a relative header starts
    std::vector<unsigned> m_pathSuffixes;
    bool m_endsMessage = false;
    bool m_indefiniteSent = false;
    bool m_deadlocked = false;

    bool m_held = false;
    std::uint64_t m_holdTimer = 0;
    std::uint64_t m_holdOperation = 0;
    Continuation m_then;
    std::uint64_t m_operationComplete = 0;

    bool m_available = false;
    ServiceRequest m_service;
};

} // namespace simulator
