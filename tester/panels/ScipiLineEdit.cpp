#include "panels/ScipiLineEdit.h"

#include "panels/HexEscapes.h"

#include <QKeyEvent>
#include <QLineEdit>

namespace
{
constexpr unsigned long long CommandHistoryId = 4;

/// The passes and their order are what users' commands rely on: three digits before two, and the doubled backslash last,
/// so that it protects nothing. "\0" disappears; a NUL is written "\x00".
QString expandEscapes(QString text)
{
    expandHexEscapes(text, 3, HexDigits::AnyCase);
    expandHexEscapes(text, 2, HexDigits::AnyCase);
    text.replace(QLatin1String("\\n"), QLatin1String("\n"));
    text.replace(QLatin1String("\\r"), QLatin1String("\r"));
    text.replace(QLatin1String("\\t"), QLatin1String("\t"));
    text.remove(QLatin1String("\\0"));
    text.replace(QLatin1String("\\\\"), QLatin1String("\\"));
    return text;
}
} // namespace

ScipiLineEdit::ScipiLineEdit(QWidget *parent) : QComboBox(parent), Data(CommandHistoryId)
{
    setEditable(true); // brings the auto-completion along
    setDuplicatesEnabled(false);
    setInsertPolicy(QComboBox::NoInsert);
    clear();
}

QString ScipiLineEdit::getCommand()
{
    const QString command = currentText();
    if (!command.isEmpty())
        remember(command);
    return expandEscapes(command);
}

void ScipiLineEdit::remember(const QString &command)
{
    if (count() > HistorySize - 1)
        removeItem(count() - 1);
    const int known = findText(command, Qt::MatchExactly | Qt::MatchCaseSensitive);
    if (known >= 0)
        removeItem(known);
    insertItem(0, command);
    setCurrentIndex(0); // so that Down leads to the command before this one
    setEditText(command);
    lineEdit()->selectAll();
}

bool ScipiLineEdit::getParameter(Parameter &parameter)
{
    parameter.stringValue = getCommand().toStdString();
    lineEdit()->selectAll();
    return true;
}

QByteArray ScipiLineEdit::getData()
{
    QStringList history;
    for (int i = 0; i < count(); ++i)
        history.append(itemText(i));
    return history.join(QLatin1Char('\n')).toLatin1();
}

void ScipiLineEdit::setData(const QByteArray &bytes)
{
    QComboBox::clear();
    const auto length = qstrnlen(bytes.constData(), static_cast<uint>(bytes.size()));
    const QString history = QString::fromLatin1(bytes.constData(), static_cast<int>(length));
    if (history.isEmpty())
        return;
    // A damaged file can hold any number of line feeds.
    addItems(history.split(QLatin1Char('\n')).mid(0, HistorySize));
    setEditText(QString());
}

void ScipiLineEdit::clear()
{
    QComboBox::clear();
    addItem(QStringLiteral(":syst:err?\\n"));
    addItem(QStringLiteral("*IDN?\\n"));
}

void ScipiLineEdit::keyPressEvent(QKeyEvent *event)
{
    const bool entered = event->key() == Qt::Key_Return || event->key() == Qt::Key_Enter;
    if (entered) {
        if (currentText() == QLatin1String("r")) {
            emit read();
            clearEditText();
        } else {
            emit write();
        }
    }
    // Return accepts the inline completion of what was typed last, whatever the line shows by now, and drops the selection.
    // A command that was sent must stay as it is, selected for the next one to replace it.
    const QString text = currentText();
    const int index = currentIndex();
    const bool keep = entered && !text.isEmpty() && lineEdit()->selectedText() == text;
    QComboBox::keyPressEvent(event);
    if (keep) {
        setCurrentIndex(index);
        setEditText(text);
        lineEdit()->selectAll();
    }
}
