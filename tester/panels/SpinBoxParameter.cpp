#include "panels/SpinBoxParameter.h"

#include "panels/ParameterStore.h"

SpinBoxParameter::SpinBoxParameter(QWidget *parent) : QSpinBox(parent) {}

bool SpinBoxParameter::getParameter(Parameter &parameter)
{
    storeUInt32(parameter.uintValue, static_cast<std::uint32_t>(value()));
    return true;
}
