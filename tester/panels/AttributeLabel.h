#pragma once

#include <QLineEdit>

struct AttributeEx;

/// Shows the value of an attribute; read-only, but its text can be selected and copied.
class AttributeLabel : public QLineEdit
{
    Q_OBJECT

public:
    explicit AttributeLabel(QWidget *parent);

    /// A number in hexadecimal and decimal, "0x7d0 (2000)"; a text as it is.
    void showAttributeValue(const AttributeEx &attribute);
};
