#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <QWidget>

class GpibAtnComboBox;
class GpibCommandEdit;
class GpibRenComboBox;
class QLabel;
class SpinBoxParameter;
class VisaFunctionCallButton;

/**
 * The page with direct control of a GPIB bus: its lines, its commands, and who is in control.
 *
 * What came of a request stands in the log and in the status label; the page shows nothing of it.
 */
class GpibTab : public QWidget, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    GpibTab(VisaFunctionCallHandler *handler, QWidget *parent);

    void visaFunctionCallFinished(_visaFunctionCall &call) override;

private:
    void setupUi();
    void setupNames();
    void setupTexts();
    void setupLayout();

    QLabel *m_renLabel;
    GpibRenComboBox *m_ren;
    VisaFunctionCallButton *m_sendRen;
    QLabel *m_atnLabel;
    GpibAtnComboBox *m_atn;
    VisaFunctionCallButton *m_sendAtn;
    QLabel *m_ifcLabel;
    VisaFunctionCallButton *m_sendIfc;
    QLabel *m_commandLabel;
    GpibCommandEdit *m_command;
    VisaFunctionCallButton *m_sendCommand;
    QLabel *m_passControlLabel;
    QLabel *m_primaryLabel;
    SpinBoxParameter *m_primary;
    QLabel *m_secondaryLabel;
    SpinBoxParameter *m_secondary;
    VisaFunctionCallButton *m_passControl;
};
