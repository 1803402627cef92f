#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QSpinBox>

/// A count, a time-out or an address: 32 bits. Range and default are the owner's.
class SpinBoxParameter : public QSpinBox, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit SpinBoxParameter(QWidget *parent);

    bool getParameter(Parameter &parameter) override;
};
