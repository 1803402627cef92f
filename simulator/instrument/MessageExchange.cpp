#include "simulator/instrument/MessageExchange.h"

#include "simulator/instrument/Command.h"
#include "simulator/instrument/Parser.h"
#include "simulator/instrument/StatusBits.h"
#include "simulator/instrument/Timers.h"

#include <new>
#include <utility>

namespace simulator
{
namespace
{
constexpr std::size_t MaxUnitText = 1024 * 1024;
}

MessageExchange::MessageExchange(Instrument &instrument, Client &client, Traits traits)
    : m_instrument(instrument), m_client(client), m_traits(std::move(traits)),
      m_input(instrument.blocks, {instrument.options().maxMessage, MaxUnitText}, m_traits.hasEnd)
{
    m_instrument.attach(*this);
    // What is a reason already is not a new one for a client that comes later.
    m_service.update(statusByte(), m_instrument.status.serviceEnable());
    m_service.poll(0);
}

MessageExchange::~MessageExchange()
{
    clear();
    m_instrument.detach(*this);
}

void MessageExchange::receive(std::span<const std::byte> &bytes)
{
    while (!bytes.empty() && accepting()) {
        const std::span<const std::byte> before = bytes;
        const InputBuffer::Found found = m_input.scan(bytes);
        if (m_traffic != nullptr)
            m_traffic->received(before.first(before.size() - bytes.size()));
        switch (found) {
        case InputBuffer::Found::Nothing:
            break;
        case InputBuffer::Found::Unit:
            runUnit(false);
            break;
        case InputBuffer::Found::Message:
            return runMessage();
        }
    }
}

void MessageExchange::end()
{
    if (m_input.end() == InputBuffer::Found::Message)
        runMessage();
}

void MessageExchange::directReceived(std::size_t count)
{
    if (m_traffic != nullptr)
        m_traffic->blockReceived(count);
    m_input.blockFilled(count);
}

void MessageExchange::runMessage()
{
    if (m_traffic != nullptr)
        m_traffic->messageEnds();
    runUnit(true);
}

void MessageExchange::runUnit(bool endsMessage)
{
    m_endsMessage = endsMessage;
    MessageUnit &unit = m_input.unit();
    if (!unit.text.empty() || unit.overrun) {
        try {
            if (unit.overrun)
                throw ScpiError{-363, {}};
            ParsedUnit parsed = parseUnit(unit);
            CommandTable::Match match = m_instrument.commands.find(parsed.header, m_path, m_pathSuffixes);
            m_path = match.path;
            m_pathSuffixes = std::move(match.pathSuffixes);
            if (parsed.parameters.size() < match.entry->arity.least)
                throw ScpiError{-109, std::string{parsed.header.text}};
            if (parsed.parameters.size() > match.entry->arity.most)
                throw ScpiError{-108, std::string{parsed.header.text}};
            Arguments arguments(std::move(parsed.parameters));
            Command command{m_instrument, *this, arguments, m_response, match.suffixes};
            match.entry->handler(command);
        } catch (const ScpiError &error) {
            m_response.take();
            report(error);
        } catch (const std::bad_alloc &) {
            m_response.take();
            report({-321, {}});
        }
    }
    if (!m_held)
        finishUnit();
}

void MessageExchange::finishUnit()
{
    if (!m_response.empty()) {
        const bool indefinite = m_response.indefinite();
        ResponseSegments answer = m_response.take();
        if (m_indefiniteSent) {
            report({-440, {}});
        } else if (!m_deadlocked && !m_output.add(std::move(answer))) {
            // The answer is full and the client is still sending: neither side could go on.
            m_output.clear();
            m_deadlocked = true;
            report({-430, {}});
        }
        m_indefiniteSent = m_indefiniteSent || indefinite;
    }
    m_input.nextUnit();
    if (m_endsMessage)
        finishMessage();
    m_instrument.publishStatus();
}

void MessageExchange::finishMessage()
{
    m_path = nullptr;
    m_pathSuffixes.clear();
    m_indefiniteSent = false;
    m_deadlocked = false;
    if (m_output.empty())
        return;
    m_output.complete();
    if (m_traffic != nullptr)
        m_traffic->answered(m_output.segments());
}

void MessageExchange::report(const ScpiError &error)
{
    m_instrument.report(error);
}

void MessageExchange::interrupted()
{
    m_output.clear();
    m_available = false;
    report({-410, {}});
    m_instrument.publishStatus();
}

void MessageExchange::unterminated()
{
    m_input.clear();
    m_response.take();
    m_output.clear();
    finishMessage();
    if (m_traffic != nullptr)
        m_traffic->forget();
    m_available = false;
    report({-420, {}});
    m_instrument.publishStatus();
}

void MessageExchange::clear()
{
    m_instrument.timers.cancel(std::exchange(m_holdTimer, Timers::None));
    m_instrument.operations.forget(std::exchange(m_holdOperation, 0));
    m_held = false;
    m_then = nullptr;
    forgetOperationComplete();
    m_input.clear();
    m_response.take();
    m_output.clear();
    finishMessage();
    if (m_traffic != nullptr)
        m_traffic->forget();
    m_available = false;
    updateService();
}

void MessageExchange::trigger()
{
    if (m_traffic != nullptr)
        m_traffic->event("trigger");
    try {
        if (m_input.inMessage())
            throw ScpiError{-105, {}};
        m_instrument.trigger();
    } catch (const ScpiError &error) {
        report(error);
    }
    m_instrument.publishStatus();
}

std::uint8_t MessageExchange::poll()
{
    const std::uint8_t byte = m_service.poll(statusByte());
    if (m_traffic != nullptr)
        m_traffic->event("serial poll", byte);
    return byte;
}

void MessageExchange::setMessageAvailable(bool available)
{
    m_available = available;
    updateService();
}

std::uint8_t MessageExchange::statusByte() const
{
    const bool available = m_traits.availableFromQueue ? !m_output.empty() : m_available;
    return static_cast<std::uint8_t>(m_instrument.statusSummary() | (available ? unsigned{StbMessageAvailable} : 0u));
}

std::uint8_t MessageExchange::masterSummaryByte() const
{
    const std::uint8_t byte = statusByte();
    const bool summary = (byte & m_instrument.status.serviceEnable()) != 0;
    return static_cast<std::uint8_t>(byte | (summary ? unsigned{StbRequestService} : 0u));
}

void MessageExchange::updateService()
{
    const std::uint8_t byte = statusByte();
    if (!m_service.update(byte, m_instrument.status.serviceEnable()) || !m_traits.serviceRequest)
        return;
    const auto request = static_cast<std::uint8_t>(byte | StbRequestService);
    if (m_traffic != nullptr)
        m_traffic->event("service request", request);
    m_traits.serviceRequest(request);
}

void MessageExchange::holdFor(std::chrono::nanoseconds delay, Continuation then)
{
    m_held = true;
    m_then = std::move(then);
    m_holdTimer = m_instrument.timers.after(delay, [this] { resume(); });
}

void MessageExchange::holdUntilIdle(Continuation then)
{
    if (m_instrument.operations.idle())
        return then(m_response);
    m_held = true;
    m_then = std::move(then);
    m_holdOperation = m_instrument.operations.whenIdle([this] { resume(); });
}

void MessageExchange::resume()
{
    m_held = false;
    m_holdTimer = Timers::None;
    m_holdOperation = 0;
    const Continuation then = std::exchange(m_then, nullptr);
    try {
        then(m_response);
    } catch (const ScpiError &error) {
        m_response.take();
        report(error);
    }
    if (m_held)
        return;
    finishUnit();
    m_client.inputAccepted();
}

void MessageExchange::noteOperationComplete()
{
    forgetOperationComplete();
    if (m_instrument.operations.idle()) {
        m_instrument.status.setEvent(EsrOperationComplete);
        return;
    }
    m_operationComplete = m_instrument.operations.whenIdle([this] {
        m_operationComplete = 0;
        m_instrument.status.setEvent(EsrOperationComplete);
        m_instrument.publishStatus();
    });
}

void MessageExchange::forgetOperationComplete()
{
    m_instrument.operations.forget(std::exchange(m_operationComplete, 0));
}

} // namespace simulator
