#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QComboBox>

/// What to do with the GPIB remote enable line: 16 bits.
class GpibRenComboBox : public QComboBox, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit GpibRenComboBox(QWidget *parent);

    /// Appends the seven modes; the owner calls it once.
    void showAllMode();
    bool getParameter(Parameter &parameter) override;
};
