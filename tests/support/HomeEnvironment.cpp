// A source file to add to a test program that touches settings, data or documents: a home of its own, that lasts as long as the
// program, and the application's identity. Set before anything else runs, because Qt remembers the first answer.
#include <QCoreApplication>
#include <QDir>
#include <QTemporaryDir>

namespace
{
struct HomeEnvironment {
    HomeEnvironment()
    {
        qputenv("HOME", folder.path().toLocal8Bit());
        for (const char *variable : {"XDG_CONFIG_HOME", "XDG_DATA_HOME", "XDG_CACHE_HOME"}) {
            const QString path = folder.filePath(QString::fromLatin1(variable).toLower());
            QDir().mkpath(path);
            qputenv(variable, path.toLocal8Bit());
        }
        QCoreApplication::setOrganizationName(QStringLiteral("Oltrava"));
        QCoreApplication::setApplicationName(QStringLiteral("KyVisaTester"));
    }

    QTemporaryDir folder;
};

const HomeEnvironment s_home;
} // namespace
