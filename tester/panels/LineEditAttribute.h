#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QLineEdit>

/**
 * The value of a numeric attribute, decimal or with a leading "0x" hexadecimal: 64 bits.
 *
 * The validator keeps other characters out while typing; it lets through what does not convert ("ff", "x1F", "0x", more
 * than 64 bits), and such a text refuses the call.
 */
class LineEditAttribute : public QLineEdit, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit LineEditAttribute(QWidget *parent);

    /// Stores 0 when the text is no number.
    bool getParameter(Parameter &parameter) override;
};
