#include "finder/DeviceKey.h"

#include <QString>

namespace
{
const QString Separator = QStringLiteral("::");

/// Length of the text before the @p count th separator, -1 when there are fewer.
int lengthBeforeSeparator(const QString &resource, int count)
{
    int position = resource.indexOf(Separator);
    for (int found = 1; found < count && position >= 0; ++found)
        position = resource.indexOf(Separator, position + Separator.size());
    return position;
}
} // namespace

QString deviceKey(const QString &resource)
{
    // Upper and lower case, but no mixture; the two kinds below are less particular.
    if (resource.startsWith(QLatin1String("USB")) || resource.startsWith(QLatin1String("usb")))
        return resource.left(lengthBeforeSeparator(resource, 4));
    // All GPIB resources share one key, and so do all serial ports.
    if (resource.startsWith(QLatin1String("gpib"), Qt::CaseInsensitive) ||
        resource.startsWith(QLatin1String("asrl"), Qt::CaseInsensitive))
        return resource.left(4);
    return resource.left(lengthBeforeSeparator(resource, 2)); // left(-1) is the whole text
}
