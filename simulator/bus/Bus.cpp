#include "simulator/bus/Bus.h"

#include "simulator/bus/InterfaceMessages.h"

#include <algorithm>
#include <array>
#include <utility>

namespace simulator
{
namespace
{

constexpr std::size_t MostAtOnce = 64 * 1024; ///< bytes that pass before somebody else has a turn
constexpr std::uint8_t DataBits = 0x7F;       ///< of a command

std::vector<std::byte> join(const std::vector<Outgoing> &pieces)
{
    std::vector<std::byte> bytes;
    for (const Outgoing &piece : pieces) {
        const std::span<const std::byte> text = std::as_bytes(std::span{piece.text});
        bytes.insert(bytes.end(), text.begin(), text.end());
        bytes.insert(bytes.end(), piece.bytes.begin(), piece.bytes.end());
    }
    return bytes;
}

} // namespace

Bus::~Bus()
{
    m_timers.cancel(m_flow);
}

BusStation &Bus::add(std::unique_ptr<BusStation> station)
{
    return *m_stations.emplace_back(std::move(station));
}

bool Bus::command(std::span<const std::uint8_t> messages)
{
    for (const std::uint8_t byte : messages) {
        if (!m_inCharge)
            return false;
        m_attention = true;
        const auto message = static_cast<std::uint8_t>(byte & DataBits);
        m_own.take(message);
        for (const auto &station : m_stations)
            station->take(message, m_remoteEnable);
        // Control leaves the interface unless it hands it to itself, also when the one that should take it cannot.
        if (message == bus::TakeControl && !m_own.talking())
            m_inCharge = m_attention = false;
    }
    return m_inCharge || !messages.empty();
}

bool Bus::setAttention(bool attention)
{
    if (!m_inCharge)
        return false;
    m_attention = true;
    if (!attention)
        standBy();
    return true;
}

bool Bus::passControl(std::uint8_t address)
{
    return command(std::array{bus::Unlisten, bus::talk(address), bus::TakeControl});
}

void Bus::setRemoteEnable(bool enable)
{
    m_remoteEnable = enable;
    for (const auto &station : m_stations)
        station->setRemoteEnable(enable);
}

void Bus::interfaceClear()
{
    m_inCharge = true;
    m_attention = true;
    m_own.interfaceClear();
    for (const auto &station : m_stations)
        station->interfaceClear();
}

bool Bus::serviceRequested() const
{
    return std::any_of(m_stations.begin(), m_stations.end(),
                       [](const auto &station) { return station->requestsService(); });
}

bool Bus::somebodyListens() const
{
    return std::any_of(m_stations.begin(), m_stations.end(), [](const auto &station) { return station->listening(); });
}

bool Bus::notDataAccepted() const
{
    return m_attention ? !m_stations.empty() : m_own.listening() || somebodyListens();
}

bool Bus::listenersHaveRoom() const
{
    return std::all_of(m_stations.begin(), m_stations.end(),
                       [](const auto &station) { return !station->listening() || station->hasRoom(); });
}

BusStation *Bus::talker() const
{
    const auto found =
        std::find_if(m_stations.begin(), m_stations.end(), [](const auto &station) { return station->talking(); });
    return found == m_stations.end() ? nullptr : found->get();
}

void Bus::tellListeners(std::span<const std::byte> bytes, bool end)
{
    for (const auto &station : m_stations)
        if (station->listening())
            station->write(bytes, end);
}

Bus::Transfer Bus::write(std::span<const std::byte> bytes, bool end)
{
    if (!m_own.talking())
        return Transfer::NotAddressed;
    m_attention = false;
    if (!somebodyListens() || !listenersHaveRoom())
        return Transfer::Later;
    tellListeners(bytes, end);
    return Transfer::Done;
}

void Bus::beginRead()
{
    if (!m_own.listening())
        return;
    m_attention = false;
    if (BusStation *station = talker(); station && !station->polled())
        station->readBegins();
}

Bus::Transfer Bus::read(std::size_t most, std::optional<std::uint8_t> termination, Vxi11Response::Piece &piece)
{
    if (!m_own.listening())
        return Transfer::NotAddressed;
    m_attention = false;
    BusStation *station = talker();
    if (!station || !listenersHaveRoom())
        return Transfer::Later;
    if (station->polled()) {
        const auto byte = static_cast<char>(station->poll());
        piece = {{{std::string(1, byte), nullptr, {}}}, 1, false, termination == static_cast<std::uint8_t>(byte)};
    } else if (station->answerReady()) {
        piece = station->read(somebodyListens() ? std::min(most, MostAtOnce) : most, termination);
    } else {
        return Transfer::Later;
    }
    if (somebodyListens())
        tellListeners(join(piece.bytes), piece.last);
    return Transfer::Done;
}

void Bus::standBy()
{
    m_attention = false;
    if (m_own.listening() || !somebodyListens())
        return;
    if (BusStation *station = talker(); station && !station->polled()) {
        station->readBegins();
        changed();
    }
}

void Bus::changed()
{
    if (!m_attention && !m_own.listening() && talker() && m_flow == Timers::None)
        m_flow = m_timers.after({}, [this] { flow(); });
}

void Bus::flow()
{
    m_flow = Timers::None;
    BusStation *station = talker();
    // The interface may have taken the bus meanwhile.
    if (m_attention || m_own.listening() || !station || station->polled() || !somebodyListens() ||
        !listenersHaveRoom() || !station->answerReady())
        return;
    const Vxi11Response::Piece piece = station->read(MostAtOnce, std::nullopt);
    tellListeners(join(piece.bytes), piece.last);
    changed();
}

} // namespace simulator
