#include "gui/support/StandinWindowTest.h"

#include "app/MainWindow.h"

#include <QComboBox>
#include <QDir>
#include <QFile>

namespace
{

class Persistence : public StandinWindowTest
{
protected:
    void store(const QByteArray &bytes)
    {
        QDir().mkpath(dataFile().section('/', 0, -2));
        QFile file(dataFile());
        ASSERT_TRUE(file.open(QIODevice::WriteOnly));
        file.write(bytes);
    }

    QStringList history()
    {
        auto *box = qobject_cast<QComboBox *>(widget("basicCommand"));
        QStringList items;
        for (int i = 0; i < box->count(); ++i)
            items << box->itemText(i);
        return items;
    }

    QByteArray logFolder() { return (home() + "/Documents/KyVisaTester").toLocal8Bit(); }
};

TEST_F(Persistence, AFirstRunRestoresNothingAndWritesTheFile)
{
    openWindow();
    EXPECT_EQ(text("resourceName"), "");
    closeWindow();
    const QByteArray folder = logFolder();
    const QByteArray presets = ":syst:err?\\n\n*IDN?\\n";
    const QByteArray expected = "000001"
                                "000000" +
                                QByteArray::number(folder.size()).rightJustified(6, '0') + folder + "000020" + presets;
    EXPECT_EQ(contents(dataFile()), expected);
}

TEST_F(Persistence, NameFolderAndHistorySurvive)
{
    openWindow();
    connectSession();
    enter("basicCommand", "*RST\\n");
    press("basicWrite");
    ASSERT_TRUE(called("viWrite", 1));
    closeWindow();
    standin::reset();
    openWindow();
    EXPECT_EQ(text("resourceName"), "TCPIP::localhost::hislip0");
    EXPECT_EQ(history(), (QStringList{"*RST\\n", ":syst:err?\\n", "*IDN?\\n"}));
    EXPECT_EQ(shown("basicCommand", "currentText").toString(), "");
}

TEST_F(Persistence, ANameIsWrittenAsUtf8AndReadAsLatin1)
{
    store(QByteArray("000001"
                     "000004"
                     "a\xC3\xA4"
                     "b"
                     "000000"
                     "000000"));
    openWindow();
    EXPECT_EQ(text("resourceName"), QString::fromUtf8("a\xC3\x83\xC2\xA4"
                                                      "b"));
}

TEST_F(Persistence, AnEmptyHistoryLeavesTheListEmpty)
{
    store("000001"
          "000000"
          "000000"
          "000000");
    openWindow();
    EXPECT_TRUE(history().isEmpty());
}

TEST_F(Persistence, ALineBreakInANameIsNotShown)
{
    store("000001"
          "000005"
          "TCP\nI"
          "000000"
          "000000");
    openWindow();
    EXPECT_EQ(text("resourceName"), "TCPI");
}

/// Each of these files must give a window that works, and a sound file at the end.
class DamagedData : public Persistence, public ::testing::WithParamInterface<const char *>
{
};

TEST_P(DamagedData, StillOpensWorksAndEnds)
{
    store(QByteArray::fromPercentEncoding(GetParam()));
    openWindow();
    enter("resourceName", "TCPIP::localhost::hislip0");
    press("resourceConnect");
    EXPECT_TRUE(eventually([this] { return isVisible("resourceDisconnect"); }));
    closeWindow();
    EXPECT_TRUE(contents(dataFile()).startsWith("000001000025TCPIP::localhost::hislip0"))
        << contents(dataFile()).toStdString();
}

INSTANTIATE_TEST_SUITE_P(Files, DamagedData,
                         ::testing::Values("", "0", "000001", "000001000", "00000100002", "000001000025TCPIP",
                                           "000001999999x", "000001-00005abc", "000001-99999", "000001      ",
                                           "000001abcdef000000000000", "%00%00%00%00%00%00%00%00%00%00%00%00",
                                           "%FF%FE%FD%FC%FB%FA%F9%F8%F7%F6%F5%F4%F3%F2",
                                           "SQLite format 3%00%10%00%01%01", "000001000000000009/dev/null000000",
                                           "000001000000000005%00abcd000003%0A%0A%0A",
                                           "<?xml version=\"1.0\"?><data/>"));

TEST_F(Persistence, AMissingFolderIsMade)
{
    openWindow();
    closeWindow();
    EXPECT_TRUE(QFile::exists(dataFile()));
}

TEST_F(Persistence, AFileInPlaceOfTheFolderIsNoMatter)
{
    ASSERT_TRUE(QDir().mkpath(home() + "/.local"));
    QFile blocker(home() + "/.local/share");
    ASSERT_TRUE(blocker.open(QIODevice::WriteOnly));
    blocker.close();
    openWindow();
    EXPECT_TRUE(isVisible("resourceConnect"));
    closeWindow();
    EXPECT_FALSE(QFile::exists(dataFile()));
}

} // namespace
