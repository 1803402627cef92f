#include <gtest/gtest.h>

#include <QApplication>

int main(int argc, char **argv)
{
    ::testing::InitGoogleTest(&argc, argv);
    if (!qEnvironmentVariableIsSet("QT_QPA_PLATFORM"))
        qputenv("QT_QPA_PLATFORM", "offscreen");
    // Texts are compared as written, colours as the plain style paints them.
    qputenv("LC_ALL", "C.UTF-8");
    QApplication application(argc, argv);
    application.setOrganizationName(QStringLiteral("Oltrava"));
    application.setApplicationName(QStringLiteral("KyVisaTester"));
    application.setApplicationVersion(QStringLiteral("5.8.6"));
    return RUN_ALL_TESTS();
}
