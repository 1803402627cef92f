#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QPointer>
#include <QVBoxLayout>

class QCheckBox;

/**
 * The access mode of an open request: two check boxes, one over the other.
 *
 * A layout, not a widget. The check boxes start without a parent and belong to the widget that the layout is installed
 * on; a layout that never was installed anywhere deletes them itself.
 */
class OpenModeParameter : public QVBoxLayout, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit OpenModeParameter(QWidget *parent);
    ~OpenModeParameter() override;

    bool getParameter(Parameter &parameter) override;

private:
    QPointer<QCheckBox> m_exclusiveLock;
    QPointer<QCheckBox> m_loadConfig;
};
