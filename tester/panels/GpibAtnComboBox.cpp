#include "panels/GpibAtnComboBox.h"

#include "panels/ParameterStore.h"

#include <visa.h>

#include <QVariant>

GpibAtnComboBox::GpibAtnComboBox(QWidget *parent) : QComboBox(parent) {}

void GpibAtnComboBox::showAllMode()
{
    addItem(QStringLiteral("VI_GPIB_ATN_DEASSERT"), VI_GPIB_ATN_DEASSERT);
    addItem(QStringLiteral("VI_GPIB_ATN_ASSERT"), VI_GPIB_ATN_ASSERT);
    addItem(QStringLiteral("VI_GPIB_ATN_DEASSERT_HANDSHAKE"), VI_GPIB_ATN_DEASSERT_HANDSHAKE);
    addItem(QStringLiteral("VI_GPIB_ATN_ASSERT_IMMEDIATE"), VI_GPIB_ATN_ASSERT_IMMEDIATE);
}

bool GpibAtnComboBox::getParameter(Parameter &parameter)
{
    storeUInt16(parameter.uintValue, static_cast<std::uint16_t>(currentData().toUInt()));
    return true;
}
