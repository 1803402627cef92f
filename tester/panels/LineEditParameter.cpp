#include "panels/LineEditParameter.h"

LineEditParameter::LineEditParameter(QWidget *parent) : QLineEdit(parent) {}

bool LineEditParameter::getParameter(Parameter &parameter)
{
    parameter.stringValue = text().toStdString();
    return true;
}
