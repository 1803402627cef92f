#include "panels/OpenModeParameter.h"

#include "panels/ParameterStore.h"

#include <visa.h>

#include <QCheckBox>

OpenModeParameter::OpenModeParameter(QWidget *parent)
    : QVBoxLayout(parent), m_exclusiveLock(new QCheckBox(tr("Exclusive Lock"))),
      m_loadConfig(new QCheckBox(tr("Load Config")))
{
    m_exclusiveLock->setObjectName(QStringLiteral("openExclusiveLock"));
    m_exclusiveLock->setToolTip(tr("Open the resource only if nobody else holds a lock on it, and lock it."));
    m_loadConfig->setObjectName(QStringLiteral("openLoadConfig"));
    m_loadConfig->setToolTip(tr("Start the session with the attribute values of the VISA library's configuration."));
    addWidget(m_exclusiveLock);
    addWidget(m_loadConfig);
}

OpenModeParameter::~OpenModeParameter()
{
    for (const QPointer<QCheckBox> &box : {m_exclusiveLock, m_loadConfig}) {
        if (box && !box->parent())
            delete box.data();
    }
}

bool OpenModeParameter::getParameter(Parameter &parameter)
{
    std::uint32_t mode = VI_NULL;
    if (m_exclusiveLock && m_exclusiveLock->isChecked())
        mode |= VI_EXCLUSIVE_LOCK;
    if (m_loadConfig && m_loadConfig->isChecked())
        mode |= VI_LOAD_CONFIG;
    storeUInt32(parameter.uintValue, mode);
    return true;
}
