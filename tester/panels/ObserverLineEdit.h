#pragma once

#include "panels/Subject.h"
#include "pipeline/VisaFunctionCallParameter.h"

#include <QLineEdit>

/// The resource line: shows a ResourceName and follows it. Sent as UTF-8; an empty line is accepted.
class ObserverLineEdit : public QLineEdit, public Observer, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit ObserverLineEdit(QWidget *parent);

    using QLineEdit::update;
    /// @p subject is a ResourceName. Announces the text also when it is the one shown already.
    void update(Subject *subject) override;
    bool getParameter(Parameter &parameter) override;
};
