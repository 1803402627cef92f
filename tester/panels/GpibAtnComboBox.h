#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QComboBox>

/// What to do with the GPIB attention line: 16 bits.
class GpibAtnComboBox : public QComboBox, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit GpibAtnComboBox(QWidget *parent);

    /// Appends the four modes; the owner calls it once.
    void showAllMode();
    bool getParameter(Parameter &parameter) override;
};
