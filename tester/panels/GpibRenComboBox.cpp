#include "panels/GpibRenComboBox.h"

#include "panels/ParameterStore.h"

#include <visa.h>

#include <QVariant>

GpibRenComboBox::GpibRenComboBox(QWidget *parent) : QComboBox(parent) {}

void GpibRenComboBox::showAllMode()
{
    addItem(QStringLiteral("VI_GPIB_REN_DEASSERT"), VI_GPIB_REN_DEASSERT);
    addItem(QStringLiteral("VI_GPIB_REN_ASSERT"), VI_GPIB_REN_ASSERT);
    addItem(QStringLiteral("VI_GPIB_REN_DEASSERT_GTL"), VI_GPIB_REN_DEASSERT_GTL);
    addItem(QStringLiteral("VI_GPIB_REN_ASSERT_ADDRESS"), VI_GPIB_REN_ASSERT_ADDRESS);
    addItem(QStringLiteral("VI_GPIB_REN_ASSERT_LLO"), VI_GPIB_REN_ASSERT_LLO);
    addItem(QStringLiteral("VI_GPIB_REN_ASSERT_ADDRESS_LLO"), VI_GPIB_REN_ASSERT_ADDRESS_LLO);
    addItem(QStringLiteral("VI_GPIB_REN_ADDRESS_GTL"), VI_GPIB_REN_ADDRESS_GTL);
}

bool GpibRenComboBox::getParameter(Parameter &parameter)
{
    storeUInt16(parameter.uintValue, static_cast<std::uint16_t>(currentData().toUInt()));
    return true;
}
