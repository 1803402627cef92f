#include "app/File.h"

#include "app/Data.h"

#include <QDir>
#include <QFileInfo>
#include <QStandardPaths>

namespace
{
constexpr int NumberWidth = 6;
constexpr int FormatNumber = 1;
const QLatin1String DataFile("/data.adr");

QByteArray number(int value)
{
    return QStringLiteral("%1").arg(value, NumberWidth, 10, QLatin1Char('0')).toLatin1();
}

/// 0 for everything that is no number of zero or more.
int parseNumber(const QByteArray &digits)
{
    const auto length = qstrnlen(digits.constData(), static_cast<uint>(digits.size()));
    return qMax(0, digits.left(static_cast<int>(length)).toInt());
}
} // namespace

File::File()
{
    const QStringList folders = QStandardPaths::standardLocations(QStandardPaths::DataLocation);
    if (!folders.isEmpty()) // without a folder there is no file, and nothing is kept
        setFileName(folders.first() + DataFile);
}

bool File::addData(Data *item)
{
    m_items.append(item);
    return true;
}

void File::readData()
{
    // Nothing but a regular file: opening a pipe would wait for its other end.
    if (!QFileInfo(fileName()).isFile() || !open(QIODevice::ReadOnly))
        return;
    read(NumberWidth); // the format number, of which there is only one so far
    for (Data *item : qAsConst(m_items))
        item->setData(readNumbered());
    close();
}

/// At most what the file holds, whatever the length says.
QByteArray File::readNumbered()
{
    const qint64 length = parseNumber(read(NumberWidth));
    return read(qMin(length, bytesAvailable()));
}

void File::saveData()
{
    const QFileInfo info(fileName());
    if (fileName().isEmpty() || (info.exists() && !info.isFile()))
        return;
    QDir().mkpath(fileName().remove(DataFile));
    if (!open(QIODevice::WriteOnly))
        return;
    write(number(FormatNumber));
    for (Data *item : qAsConst(m_items)) {
        const QByteArray bytes = item->getData();
        write(number(bytes.size()));
        write(bytes);
    }
    close();
}
