#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QFrame>

class QRadioButton;

/// The event mechanism, queue or handler: 16 bits.
class MechanismFrame : public QFrame, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit MechanismFrame(QWidget *parent);

    bool getParameter(Parameter &parameter) override;

private:
    QRadioButton *m_queue;
};
