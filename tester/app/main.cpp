#include "app/MainWindow.h"

#include <QApplication>

int main(int argc, char **argv)
{
    const QApplication application(argc, argv);
    QApplication::setOrganizationName(QStringLiteral("Oltrava"));
    QApplication::setOrganizationDomain(QStringLiteral("oltrava.example"));
    QApplication::setApplicationName(QStringLiteral("KyVisaTester"));
    QApplication::setApplicationVersion(QStringLiteral("%1.%2.%3").arg(5).arg(8).arg(6));

    MainWindow window(nullptr);
    window.show();
    return QApplication::exec();
}
