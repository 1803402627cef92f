#include "panels/ObserverLineEdit.h"

#include "panels/ResourceName.h"

ObserverLineEdit::ObserverLineEdit(QWidget *parent) : QLineEdit(parent) {}

void ObserverLineEdit::update(Subject *subject)
{
    setText(static_cast<ResourceName *>(subject)->getName());
    emit textChanged(text());
}

bool ObserverLineEdit::getParameter(Parameter &parameter)
{
    parameter.stringValue = text().toStdString();
    return true;
}
