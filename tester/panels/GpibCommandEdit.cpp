#include "panels/GpibCommandEdit.h"

#include "panels/HexEscapes.h"

#include <QTextOption>

GpibCommandEdit::GpibCommandEdit(QWidget *parent) : QPlainTextEdit(parent)
{
    setTabChangesFocus(true); // the keyboard has to get out again; a tab is written \x09
    // Looking for places to break at takes minutes in half a megabyte that has none.
    setWordWrapMode(QTextOption::WrapAnywhere);
}

QString GpibCommandEdit::getCommand() const
{
    QString text = toPlainText();
    expandHexEscapes(text, 3, HexDigits::UpperCase);
    expandHexEscapes(text, 2, HexDigits::UpperCase);
    text.replace(QLatin1String("\\n"), QLatin1String("\n"));
    text.remove(QLatin1String("\\0"));
    text.replace(QLatin1String("\\\\"), QLatin1String("\\"));
    return text;
}

bool GpibCommandEdit::getParameter(Parameter &parameter)
{
    parameter.stringValue = getCommand().toStdString();
    return true;
}
