#include "gui/support/StandinWindowTest.h"

#include <visa.h>

#include <QDir>
#include <QRegularExpression>

namespace
{

class LogFileOfTheWindow : public StandinWindowTest
{
protected:
    QStringList lines()
    {
        if (logFiles().isEmpty())
            return {};
        return QString::fromUtf8(contents(logFiles().constFirst())).split('\n', Qt::SkipEmptyParts);
    }
};

TEST_F(LogFileOfTheWindow, HoldsTheSameLinesAsTheLiveView)
{
    openWindow();
    tick("writeLog");
    meanwhile(50);
    connectSession();
    press("basicClear");
    ASSERT_TRUE(eventually([this] { return logRow("viClear(vi= 2)") >= 0; }));
    ASSERT_TRUE(eventually([this] { return lines().size() >= 3; }));
    const QStringList written = lines();
    ASSERT_EQ(written.size(), 3);
    for (const QString &line : written) {
        const QStringList pieces = line.split('\t');
        ASSERT_EQ(pieces.size(), 4) << line.toStdString();
        const int row = logRow(pieces.at(2));
        ASSERT_GE(row, 0) << line.toStdString();
        EXPECT_EQ(pieces.at(0), logCell(row, 0));
        EXPECT_EQ(pieces.at(1), logCell(row, 2));
        EXPECT_TRUE(QRegularExpression("^[0-9]+ nsec$").match(pieces.at(3)).hasMatch()) << pieces.at(3).toStdString();
    }
    EXPECT_TRUE(
        written.at(0).contains("\tviOpen(sesn= 1, rsrc= TCPIP::localhost::hislip0, mode= 0, timeout= 2000, vi= 2)\t"));
    EXPECT_TRUE(written.at(2).contains("\tviClear(vi= 2)\t"));
}

TEST_F(LogFileOfTheWindow, IsNamedAfterDateAndTimeInTheDocumentsFolder)
{
    openWindow();
    ASSERT_EQ(logFiles().size(), 1);
    EXPECT_TRUE(QRegularExpression("/Documents/KyVisaTester/log[0-9]{8}_[0-9]{6}\\.txt$")
                    .match(logFiles().constFirst())
                    .hasMatch())
        << logFiles().constFirst().toStdString();
}

TEST_F(LogFileOfTheWindow, LeavesNoFileBehindWhenNothingWasWritten)
{
    openWindow();
    connectSession();
    closeWindow();
    EXPECT_TRUE(logFiles().isEmpty());
}

TEST_F(LogFileOfTheWindow, StaysWhenLinesWereWritten)
{
    openWindow();
    tick("writeLog");
    meanwhile(50);
    connectSession();
    ASSERT_TRUE(eventually([this] { return lines().size() >= 2; }));
    closeWindow();
    EXPECT_EQ(logFiles().size(), 1);
    EXPECT_GE(lines().size(), 2);
}

TEST_F(LogFileOfTheWindow, AVanishedFolderIsNoMatter)
{
    openWindow();
    ASSERT_TRUE(QDir(home() + "/Documents/KyVisaTester").removeRecursively());
    tick("writeLog");
    meanwhile(50);
    connectSession();
    press("basicClear");
    EXPECT_TRUE(eventually([this] { return logRow("viClear(vi= 2)") >= 0; }));
    closeWindow();
}

TEST_F(LogFileOfTheWindow, AHomeWithoutADocumentsFolderGetsOne)
{
    ASSERT_TRUE(QDir(home()).rmdir("Documents"));
    openWindow();
    EXPECT_TRUE(QDir(home() + "/Documents/KyVisaTester").exists());
    EXPECT_EQ(logFiles().size(), 1);
}

} // namespace
