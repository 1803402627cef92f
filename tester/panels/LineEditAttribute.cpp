#include "panels/LineEditAttribute.h"

#include <QRegularExpression>
#include <QRegularExpressionValidator>

LineEditAttribute::LineEditAttribute(QWidget *parent) : QLineEdit(parent)
{
    const QRegularExpression number(QStringLiteral("^0?x?[0-9a-fA-F]{0,20}$"));
    setValidator(new QRegularExpressionValidator(number, this));
}

bool LineEditAttribute::getParameter(Parameter &parameter)
{
    bool converted = false;
    const QString value = text();
    if (value.indexOf(QLatin1String("0x")) < 0)
        parameter.uintValue = value.toULongLong(&converted, 10);
    else // the first two characters go wherever "0x" was found; the validator lets it stand at the start only
        parameter.uintValue = value.mid(2).toULongLong(&converted, 16);
    return converted;
}
