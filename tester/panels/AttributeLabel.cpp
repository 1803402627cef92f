#include "panels/AttributeLabel.h"

#include "panels/AttributeEx.h"

AttributeLabel::AttributeLabel(QWidget *parent) : QLineEdit(parent)
{
    setReadOnly(true);
    setFixedHeight(20);
}

void AttributeLabel::showAttributeValue(const AttributeEx &attribute)
{
    if (attribute.isText()) {
        setText(attribute.value.toString());
        setCursorPosition(0); // of a long text, the beginning
        return;
    }
    const qulonglong number = attribute.value.toULongLong();
    setText(QStringLiteral("0x%1 (%2)").arg(number, 0, 16).arg(number));
}
