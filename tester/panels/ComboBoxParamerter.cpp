#include "panels/ComboBoxParamerter.h"

#include "panels/ParameterStore.h"

#include <QVariant>

ComboBoxParamerter::ComboBoxParamerter(QWidget *parent) : QComboBox(parent) {}

void ComboBoxParamerter::setParameterType(const ComboBoxType &type)
{
    m_type = type;
}

bool ComboBoxParamerter::getParameter(Parameter &parameter)
{
    switch (m_type) {
    case ComboBoxType::Index:
        storeUInt32(parameter.uintValue, static_cast<std::uint32_t>(currentIndex()));
        return true;
    case ComboBoxType::Text:
        parameter.stringValue = currentText().toStdString();
        return true;
    case ComboBoxType::DataString:
        parameter.stringValue = currentData().toString().toStdString();
        return true;
    case ComboBoxType::DataUInt64:
        parameter.uintValue = currentData().toULongLong();
        return true;
    }
    return false;
}
