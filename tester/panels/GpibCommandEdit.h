#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QPlainTextEdit>

/**
 * Bytes to put on the GPIB bus with the attention line asserted, typed as text with escapes.
 *
 * Its escapes are not those of the command line: hexadecimal digits are upper-case letters only, and there are none for
 * carriage return and tab. The text leaves as UTF-8, so a code from 0x80 becomes two bytes.
 */
class GpibCommandEdit : public QPlainTextEdit, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit GpibCommandEdit(QWidget *parent);

    /// The whole text, its escapes expanded.
    QString getCommand() const;
    /// An empty text is a command like any other.
    bool getParameter(Parameter &parameter) override;
};
