#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QLineEdit>

/// Free text, sent as UTF-8. An empty line is a value like any other.
class LineEditParameter : public QLineEdit, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit LineEditParameter(QWidget *parent);

    bool getParameter(Parameter &parameter) override;
};
