#include "panels/StatusLabel.h"

#include "pipeline/VisaError.h"

#include <visa.h>

StatusLabel::StatusLabel(VisaFunctionCallHandler *handler, QWidget *parent)
    : QLabel(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::All), m_success(palette()),
      m_warning(palette()), m_error(palette())
{
    setObjectName(QStringLiteral("statusLabel"));
    setToolTip(tr("Status of the last VISA call."));
    m_success.setColor(QPalette::WindowText, Qt::blue);
    m_warning.setColor(QPalette::WindowText, QColor::fromHsl(30, 255, 128, 255));
    m_error.setColor(QPalette::WindowText, Qt::red);
}

void StatusLabel::setStatus(const unsigned int &status)
{
    if (status == 0)
        setPalette(m_success);
    else if (status < 0x7FFFFFFF)
        setPalette(m_warning);
    else
        setPalette(m_error);
    setText(tr("Status: %1").arg(QLatin1String(VisaError::StatusCode(static_cast<int>(status)))));
}

void StatusLabel::setDefault()
{
    setPalette(m_success);
    setText(tr("Status: ----"));
}

void StatusLabel::visaFunctionCallFinished(_visaFunctionCall &call)
{
    setStatus(static_cast<unsigned int>(call.status));
    if (call.status == VI_ERROR_CONN_LOST) {
        _visaFunctionCall close;
        close.type = VisaFunctionCallTyp::Close;
        sendVisaFunctionCall(close);
    }
}

void StatusLabel::newVisaCallStarted(const VisaFunctionCallTyp &)
{
    setDefault();
}
