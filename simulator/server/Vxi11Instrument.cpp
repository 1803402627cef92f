#include "simulator/server/Vxi11Instrument.h"

#include <utility>

namespace simulator
{

Vxi11Instrument::Vxi11Instrument(Instrument &instrument, Vxi11Device::Events events)
    : m_instrument(instrument), m_device(instrument, std::move(events))
{
}

std::optional<Vxi11Target::Error> Vxi11Instrument::write(std::span<const std::byte> bytes, bool end)
{
    if (!m_device.hasRoom())
        return std::nullopt;
    m_instrument.remote.addressed();
    m_device.write(bytes, end);
    return Error::NoError;
}

void Vxi11Instrument::beginRead()
{
    m_instrument.remote.addressed();
    m_device.readBegins();
}

std::optional<Vxi11Target::Reading> Vxi11Instrument::read(std::size_t most, std::optional<std::uint8_t> termination)
{
    if (!m_device.answerReady())
        return std::nullopt;
    return Reading{Error::NoError, m_device.read(most, termination)};
}

std::optional<Vxi11Target::Error> Vxi11Instrument::trigger()
{
    if (!m_device.acceptsTrigger())
        return std::nullopt;
    m_instrument.remote.addressed();
    m_device.trigger();
    return Error::NoError;
}

Vxi11Target::Error Vxi11Instrument::clear()
{
    m_instrument.remote.addressed();
    m_device.clear();
    return Error::NoError;
}

Vxi11Target::Error Vxi11Instrument::remote()
{
    m_instrument.remote.setRemoteEnable(true);
    m_instrument.remote.addressed();
    return Error::NoError;
}

Vxi11Target::Error Vxi11Instrument::local()
{
    m_instrument.remote.goToLocal();
    return Error::NoError;
}

wire::vxi11::ReadStbResult Vxi11Instrument::poll()
{
    m_instrument.remote.addressed();
    return {Error::NoError, m_device.poll()};
}

} // namespace simulator
