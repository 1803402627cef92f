#include "panels/HexEscapes.h"

#include <QString>

namespace
{
bool isHexDigit(QChar c, HexDigits allowed)
{
    return (c >= QLatin1Char('0') && c <= QLatin1Char('9')) || (c >= QLatin1Char('A') && c <= QLatin1Char('F')) ||
           (allowed == HexDigits::AnyCase && c >= QLatin1Char('a') && c <= QLatin1Char('f'));
}

bool isEscape(const QString &text, int at, int digits, HexDigits allowed)
{
    if (at + 2 + digits > text.size() || text[at] != QLatin1Char('\\') || text[at + 1] != QLatin1Char('x'))
        return false;
    for (int digit = 0; digit < digits; ++digit)
        if (!isHexDigit(text[at + 2 + digit], allowed))
            return false;
    return true;
}
} // namespace

void expandHexEscapes(QString &text, int digits, HexDigits allowed)
{
    QString expanded;
    expanded.reserve(text.size());
    for (int at = 0; at < text.size();) {
        if (!isEscape(text, at, digits, allowed)) {
            expanded += text[at++];
            continue;
        }
        // The character takes the place of the escape's last digit and is looked at again.
        const uint code = text.midRef(at + 2, digits).toUInt(nullptr, 16);
        at += 2 + digits - 1;
        text[at] = QLatin1Char(static_cast<char>(code & 0xFF));
    }
    text = expanded;
}
