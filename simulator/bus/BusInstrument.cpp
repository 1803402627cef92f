#include "simulator/bus/BusInstrument.h"

#include <utility>

namespace simulator
{

BusInstrument::BusInstrument(BusAddress address, Instrument &instrument, Vxi11Device::Events events)
    : BusStation(address), m_instrument(instrument), m_device(instrument, std::move(events))
{
}

} // namespace simulator
