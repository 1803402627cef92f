// A source file to add to a test program that touches settings or data: the identity that the program has, which decides where
// they lie. QtEnvironment.cpp gives the test a home of its own for them.
#include <QCoreApplication>

namespace
{
struct ProgramIdentity {
    ProgramIdentity()
    {
        QCoreApplication::setOrganizationName(QStringLiteral("Oltrava"));
        QCoreApplication::setApplicationName(QStringLiteral("KyVisaTester"));
    }
};

const ProgramIdentity s_identity;
} // namespace
