#include "panels/ExprLineEdit.h"

ExprLineEdit::ExprLineEdit(QWidget *parent) : QLineEdit(parent) {}

bool ExprLineEdit::getParameter(Parameter &parameter)
{
    if (text().isEmpty())
        return false;
    parameter.stringValue = text().toStdString();
    return true;
}
