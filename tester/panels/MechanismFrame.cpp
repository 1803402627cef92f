#include "panels/MechanismFrame.h"

#include "panels/ParameterStore.h"

#include <visa.h>

#include <QLabel>
#include <QRadioButton>
#include <QVBoxLayout>

MechanismFrame::MechanismFrame(QWidget *parent) : QFrame(parent), m_queue(new QRadioButton(tr("Queue"), this))
{
    auto *label = new QLabel(tr("Mechanism"), this);
    auto *handler = new QRadioButton(tr("Handler"), this);
    label->setObjectName(QStringLiteral("mechanismLabel"));
    m_queue->setObjectName(QStringLiteral("mechanismQueue"));
    m_queue->setToolTip(tr("Events wait in the session's queue until they are fetched."));
    m_queue->setChecked(true);
    handler->setObjectName(QStringLiteral("mechanismHandler"));
    handler->setToolTip(tr("Events are reported at once through the installed handler."));

    auto *layout = new QVBoxLayout(this);
    layout->addWidget(label);
    layout->addWidget(m_queue);
    layout->addWidget(handler);

    setFrameShape(QFrame::StyledPanel);
    setFrameShadow(QFrame::Plain);
    setAccessibleName(tr("Mechanism"));
}

bool MechanismFrame::getParameter(Parameter &parameter)
{
    storeUInt16(parameter.uintValue, m_queue->isChecked() ? VI_QUEUE : VI_HNDLR);
    return true;
}
