#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QLineEdit>

/// A search expression, sent as UTF-8. An empty line refuses the call.
class ExprLineEdit : public QLineEdit, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit ExprLineEdit(QWidget *parent);

    bool getParameter(Parameter &parameter) override;
};
