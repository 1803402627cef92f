#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QComboBox>

/// An event type by its standard name: 64 bits.
class EventComboBox : public QComboBox, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit EventComboBox(QWidget *parent);

    /// Appends the fifteen event types; the owner calls it once. VI_ALL_ENABLED_EVENTS is not offered.
    void showAllEvents();
    bool getParameter(Parameter &parameter) override;
};
