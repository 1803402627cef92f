#include "panels/EventComboBox.h"

#include <visa.h>

#include <QVariant>

namespace
{
struct EventType {
    const char *name;
    quint64 value;
};

constexpr EventType eventTypes[] = {
    {"VI_EVENT_IO_COMPLETION", VI_EVENT_IO_COMPLETION},
    {"VI_EVENT_TRIG", VI_EVENT_TRIG},
    {"VI_EVENT_SERVICE_REQ", VI_EVENT_SERVICE_REQ},
    {"VI_EVENT_CLEAR", VI_EVENT_CLEAR},
    {"VI_EVENT_EXCEPTION", VI_EVENT_EXCEPTION},
    {"VI_EVENT_GPIB_CIC", VI_EVENT_GPIB_CIC},
    {"VI_EVENT_GPIB_TALK", VI_EVENT_GPIB_TALK},
    {"VI_EVENT_GPIB_LISTEN", VI_EVENT_GPIB_LISTEN},
    {"VI_EVENT_VXI_VME_SYSFAIL", VI_EVENT_VXI_VME_SYSFAIL},
    {"VI_EVENT_VXI_VME_SYSRESET", VI_EVENT_VXI_VME_SYSRESET},
    {"VI_EVENT_VXI_SIGP", VI_EVENT_VXI_SIGP},
    {"VI_EVENT_VXI_VME_INTR", VI_EVENT_VXI_VME_INTR},
    {"VI_EVENT_PXI_INTR", VI_EVENT_PXI_INTR},
    {"VI_EVENT_TCPIP_CONNECT", VI_EVENT_TCPIP_CONNECT},
    {"VI_EVENT_USB_INTR", VI_EVENT_USB_INTR},
};
} // namespace

EventComboBox::EventComboBox(QWidget *parent) : QComboBox(parent) {}

void EventComboBox::showAllEvents()
{
    for (const EventType &event : eventTypes)
        addItem(QLatin1String(event.name), event.value);
}

bool EventComboBox::getParameter(Parameter &parameter)
{
    parameter.uintValue = currentData().toULongLong();
    return true;
}
