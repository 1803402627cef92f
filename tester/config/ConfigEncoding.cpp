#include "config/ConfigEncoding.h"

#include <QByteArray>
#include <QTextCodec>

QTextCodec *configEncoding(const QByteArray &bytes)
{
    QTextCodec *const utf8 = QTextCodec::codecForName("UTF-8");
    QTextCodec::ConverterState state(QTextCodec::IgnoreHeader);
    utf8->toUnicode(bytes.constData(), bytes.size(), &state);
    const bool valid = state.invalidChars == 0 && state.remainingChars == 0;
    return valid ? utf8 : QTextCodec::codecForName("ISO-8859-1");
}
