#include "app/MainWindow.h"

#include <QApplication>
#include <QIcon>

namespace
{

/// The program's picture, in the sizes that it is drawn for.
QIcon picture()
{
    QIcon icon;
    for (const int size : {32, 48, 64, 128})
        icon.addFile(QStringLiteral(":/icons/kyvisatester-%1.png").arg(size), {size, size});
    return icon;
}

} // namespace

int main(int argc, char **argv)
{
    const QApplication application(argc, argv);
    QApplication::setOrganizationName(QStringLiteral("Oltrava"));
    QApplication::setOrganizationDomain(QStringLiteral("oltrava.example"));
    QApplication::setApplicationName(QStringLiteral("KyVisaTester"));
    QApplication::setApplicationVersion(QStringLiteral("%1.%2.%3").arg(5).arg(8).arg(6));
    QApplication::setDesktopFileName(QStringLiteral("example.oltrava.KyVisaTester"));
    QApplication::setWindowIcon(picture());

    MainWindow window(nullptr);
    window.show();
    return QApplication::exec();
}
