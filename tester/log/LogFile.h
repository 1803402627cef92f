#pragma once

#include "app/Data.h"
#include "panels/Subject.h"

#include <QDir>
#include <QFile>
#include <QMutex>
#include <QObject>

struct FastBuffer;

/**
 * The text file that receives a session's log lines, and the folder in which new ones are created.
 *
 * From construction on there is a current file; while it is empty it goes away with the next switch or at the end, so
 * that only files with lines survive. An existing file is appended to. Observers hear of every new current file.
 *
 * writeData() belongs to the writer thread, everything else to the user-interface thread. A mutex keeps a line from
 * being written while the file is switched; it is not held while observers are told. Failures are silent: lines for a
 * file that cannot be opened or written are skipped.
 */
class LogFile : public QObject, public Data, public Subject
{
    Q_OBJECT

public:
    explicit LogFile(QObject *parent);
    ~LogFile() override;

    static QString getStandardLogName(); ///< "log", date and time, ".txt"
    QString getCurrentStandardDir() const;
    /// Sets the folder, which is not created here, and starts a new file in it.
    void setCurrentStandardDir(const QString &path);
    /// Path of the current file, empty when it does not exist.
    QString getCurrentFileName() const;
    /// Switches to @p path. False when it cannot be opened; the previous file stays current then.
    bool createNewFile(const QString &path);

    /// Writer thread: appends one line and flushes.
    void writeData(const FastBuffer &line);

    /// The folder's path in the local 8-bit encoding.
    QByteArray getData() override;
    /// Takes a folder, creates it if it is missing and starts a new file in it. An empty one changes nothing.
    void setData(const QByteArray &data) override;

private:
    void startNewStandardFile();
    bool openFile(const QString &path);
    void closeFile();

    QDir m_folder;
    QFile m_file; ///< guarded by m_mutex, but for its name, which only the user-interface thread touches
    mutable QMutex m_mutex;
    bool m_lineCut = false; ///< the last line got only partly to the disk; guarded by m_mutex
};
