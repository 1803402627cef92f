#include "simulator/bus/BusStation.h"

#include "simulator/bus/InterfaceMessages.h"

namespace simulator
{

void BusStation::take(std::uint8_t message, bool remoteEnable)
{
    if (m_addressing.take(message) && remoteEnable)
        remote();
    const bool selected = listening();
    switch (message) {
    case bus::GoToLocal:
        if (selected)
            goToLocal();
        break;
    case bus::SelectedDeviceClear:
        if (selected)
            clear();
        break;
    case bus::GroupExecuteTrigger:
        if (selected)
            trigger();
        break;
    case bus::LocalLockout:
        if (remoteEnable)
            lockOut();
        break;
    case bus::DeviceClear:
        clear();
        break;
    default:
        break;
    }
}

} // namespace simulator
