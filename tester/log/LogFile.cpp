#include "log/LogFile.h"

#include "log/FastBuffer.h"
#include "pipeline/VisaError.h"

#include <QDateTime>
#include <QFileInfo>
#include <QMutexLocker>
#include <QStandardPaths>

#include <cstring>

namespace
{
constexpr unsigned long long LogFolderId = 3;

QString defaultFolder()
{
    return QStandardPaths::standardLocations(QStandardPaths::DocumentsLocation).value(0) +
           QStringLiteral("/KyVisaTester");
}
} // namespace

LogFile::LogFile(QObject *parent) : QObject(parent), Data(LogFolderId), m_folder(defaultFolder())
{
    if (!m_folder.exists())
        m_folder.mkpath(m_folder.absolutePath());
    openFile(m_folder.absoluteFilePath(getStandardLogName()));
}

LogFile::~LogFile()
{
    closeFile();
}

QString LogFile::getStandardLogName()
{
    return QStringLiteral("log") + QDateTime::currentDateTime().toString(QStringLiteral("yyyyMMdd_hhmmss")) +
           QStringLiteral(".txt");
}

QString LogFile::getCurrentStandardDir() const
{
    return QDir::toNativeSeparators(m_folder.absolutePath());
}

void LogFile::setCurrentStandardDir(const QString &path)
{
    m_folder.setPath(path);
    startNewStandardFile();
}

QString LogFile::getCurrentFileName() const
{
    // Asks the folder, not the open file: that one lives on after somebody has deleted its name.
    const QString name = m_file.fileName();
    return QFileInfo::exists(name) ? QDir::toNativeSeparators(m_folder.absoluteFilePath(name)) : QString();
}

bool LogFile::createNewFile(const QString &path)
{
    {
        const QMutexLocker guard(&m_mutex);
        const QString previous = QFileInfo(m_file.fileName()).absoluteFilePath();
        closeFile();
        if (!openFile(path)) {
            openFile(previous);
            return false;
        }
    }
    notify();
    return true;
}

void LogFile::writeData(const FastBuffer &line)
{
    QByteArray bytes;
    bytes.reserve(FastBuffer::TextSize + 128);
    bytes.append(QByteArray::number(static_cast<qulonglong>(line.line)))
        .append('\t')
        .append(VisaError::StatusCode(line.status))
        .append('\t')
        .append(line.text, static_cast<int>(strnlen(line.text, sizeof line.text)))
        .append('\t')
        .append(QByteArray::number(static_cast<qulonglong>(line.duration)))
        .append(" nsec\n");

    const QMutexLocker guard(&m_mutex);
    if (!m_file.isOpen())
        return;
    if (m_lineCut)
        bytes.prepend('\n'); // the disk was full in the middle of a line; this one starts on a line of its own
    const qint64 written = m_file.write(bytes);
    if (written > 0)
        m_lineCut = written < bytes.size();
}

QByteArray LogFile::getData()
{
    return getCurrentStandardDir().toLocal8Bit();
}

void LogFile::setData(const QByteArray &data)
{
    const QByteArray path = data.left(static_cast<int>(qstrnlen(data.constData(), static_cast<uint>(data.size()))));
    if (path.isEmpty())
        return;

    // getData() writes the local encoding: a folder that exists only when read that way is the one that was meant.
    m_folder.setPath(QString::fromLatin1(path));
    if (!m_folder.exists() && QDir(QString::fromLocal8Bit(path)).exists())
        m_folder.setPath(QString::fromLocal8Bit(path));
    if (!m_folder.exists())
        m_folder.mkpath(m_folder.absolutePath());
    startNewStandardFile();
}

void LogFile::startNewStandardFile()
{
    {
        const QMutexLocker guard(&m_mutex);
        closeFile();
        openFile(m_folder.absoluteFilePath(getStandardLogName()));
    }
    notify();
}

bool LogFile::openFile(const QString &path)
{
    m_lineCut = false;
    m_file.setFileName(QDir::toNativeSeparators(path));
    // Append, so that neither an older log nor the lines of a second program are overwritten. Unbuffered, so that each
    // line is on its way to the disk when it has been written, and lines that a full disk refused do not come back.
    return !path.isEmpty() &&
           m_file.open(QIODevice::ReadWrite | QIODevice::Text | QIODevice::Append | QIODevice::Unbuffered);
}

void LogFile::closeFile()
{
    // An empty log is not left behind. Only a regular file is removed, whatever the user chose; and not one that
    // somebody else has meanwhile put in its place.
    const QFileInfo onDisk(m_file.fileName());
    if (m_file.isOpen() && m_file.size() == 0 && onDisk.isFile() && onDisk.size() == 0)
        m_file.remove();
    m_file.close();
}
