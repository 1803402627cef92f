#include "app/File.h"
#include "app/Data.h"

#include <QDir>
#include <QFileInfo>
#include <QStandardPaths>

#include <gtest/gtest.h>

#include <sys/stat.h>

namespace
{
struct Item final : Data {
    explicit Item(const QByteArray &bytes = "default") : Data(0), state(bytes) {}
    QByteArray getData() override { return state; }
    void setData(const QByteArray &bytes) override
    {
        state = bytes;
        ++restored;
    }
    QByteArray state;
    int restored = 0;
};

class DataStore : public testing::Test
{
protected:
    DataStore() { remove(); }
    ~DataStore() override { remove(); }

    void remove() const { QDir(m_folder).removeRecursively(); }

    void put(const QByteArray &bytes) const
    {
        QDir().mkpath(m_folder);
        QFile file(m_path);
        ASSERT_TRUE(file.open(QIODevice::WriteOnly));
        ASSERT_EQ(file.write(bytes), bytes.size());
    }

    QByteArray content() const
    {
        QFile file(m_path);
        EXPECT_TRUE(file.open(QIODevice::ReadOnly));
        return file.readAll();
    }

    /// What three items hold after reading @p bytes.
    QList<QByteArray> readInto(const QByteArray &bytes)
    {
        put(bytes);
        Item one, two, three;
        File file;
        file.addData(&one);
        file.addData(&two);
        file.addData(&three);
        file.readData();
        EXPECT_FALSE(file.isOpen());
        return {one.state, two.state, three.state};
    }

    const QString m_folder = QString::fromLocal8Bit(qgetenv("XDG_DATA_HOME")) + "/Oltrava/KyVisaTester";
    const QString m_path = m_folder + "/data.adr";
};

TEST_F(DataStore, LiesInTheApplicationsDataFolderAndTouchesNothingWhenBuilt)
{
    File file;
    EXPECT_EQ(file.fileName(), m_path);
    EXPECT_FALSE(QFileInfo::exists(m_folder));
}

TEST_F(DataStore, AFirstRunRestoresNothing)
{
    Item item;
    File file;
    EXPECT_TRUE(file.addData(&item));
    file.readData();
    EXPECT_EQ(item.restored, 0);
    EXPECT_FALSE(QFileInfo::exists(m_path));
}

TEST_F(DataStore, WritesHeaderLengthsAndBytesInOrderOfRegistration)
{
    Item one("GPIB0::5::INSTR"), two(""), three(QByteArray("a\0\r\n", 4));
    File file;
    file.addData(&one);
    file.addData(&two);
    file.addData(&three);
    file.saveData();
    EXPECT_EQ(content(), QByteArray("000001000015GPIB0::5::INSTR000000000004a\0\r\n", 43));
    EXPECT_FALSE(file.isOpen());
}

TEST_F(DataStore, WithoutItemsWritesTheHeaderAlone)
{
    File().saveData();
    EXPECT_EQ(content(), "000001");
}

TEST_F(DataStore, ReplacesALongerFile)
{
    put(QByteArray(5000, 'x'));
    Item item("ab");
    File file;
    file.addData(&item);
    file.saveData();
    EXPECT_EQ(content(), "000001000002ab");
}

TEST_F(DataStore, WritesInPlaceSoThatALinkStaysALink)
{
    QDir().mkpath(m_folder);
    ASSERT_TRUE(QFile::link(m_folder + "/kept-elsewhere", m_path));
    File().saveData();
    EXPECT_TRUE(QFileInfo(m_path).isSymLink());
    EXPECT_TRUE(QFileInfo(m_folder + "/kept-elsewhere").isFile());
    EXPECT_EQ(content(), "000001");
}

TEST_F(DataStore, ReadsBackWhatItWrote)
{
    EXPECT_EQ(readInto(QByteArray("000001000003abc000000000004\0\n\xFFz", 31)),
              QList<QByteArray>({"abc", "", QByteArray("\0\n\xFFz", 4)}));
}

TEST_F(DataStore, AnItemRegisteredTwiceIsWrittenTwice)
{
    Item item("x");
    File file;
    EXPECT_TRUE(file.addData(&item));
    EXPECT_TRUE(file.addData(&item));
    file.saveData();
    EXPECT_EQ(content(), "000001000001x000001x");
}

TEST_F(DataStore, AnotherOrderFeedsEachItemAnothersBytes)
{
    Item one("first"), two("second");
    File writer;
    writer.addData(&one);
    writer.addData(&two);
    writer.saveData();
    File reader;
    reader.addData(&two);
    reader.addData(&one);
    reader.readData();
    EXPECT_EQ(two.state, "first");
    EXPECT_EQ(one.state, "second");
}

TEST_F(DataStore, DoesNotCheckTheFormatNumber)
{
    EXPECT_EQ(readInto("999999000001a000001b000001c"), QList<QByteArray>({"a", "b", "c"}));
    EXPECT_EQ(readInto("??????000001a000001b000001c"), QList<QByteArray>({"a", "b", "c"}));
}

TEST_F(DataStore, GivesShortOrEmptyBytesFromADamagedFile)
{
    const QByteArray whole("000001000003abc000002de000001f");
    EXPECT_EQ(readInto(whole), QList<QByteArray>({"abc", "de", "f"}));
    for (int length = 0; length < whole.size(); ++length) {
        const QList<QByteArray> items = readInto(whole.left(length));
        EXPECT_EQ(items[0], QByteArray("abc").left(qMax(0, length - 12))) << length;
        EXPECT_EQ(items[1], QByteArray("de").left(qMax(0, length - 21))) << length;
        EXPECT_EQ(items[2], "") << length;
    }
}

TEST_F(DataStore, TakesALengthThatIsNoNumberForNone)
{
    EXPECT_EQ(readInto("000001zzzzzz000001b000001c"), QList<QByteArray>({"", "b", "c"}));
    EXPECT_EQ(readInto("000001-00005000001b000001c"), QList<QByteArray>({"", "b", "c"}));
}

TEST_F(DataStore, TakesALengthUpToItsFirstZeroByte)
{
    EXPECT_EQ(readInto(QByteArray("0000012\0xxxxab000001b000001c", 28)), QList<QByteArray>({"ab", "b", "c"}));
}

TEST_F(DataStore, TakesNoMoreThanTheFileHoldsWhateverTheLengthSays)
{
    const QList<QByteArray> items = readInto("000001999999abc");
    EXPECT_EQ(items[0], "abc");
    EXPECT_LT(items[0].capacity(), 100000);
}

TEST_F(DataStore, AnItemOfMoreThan999999BytesPutsTheFileOutOfStep)
{
    Item big(QByteArray(1000000, 'a')), small("s");
    File file;
    file.addData(&big);
    file.addData(&small);
    file.saveData();
    EXPECT_EQ(content().left(13), "0000011000000");
    file.readData();
    EXPECT_EQ(big.state, QByteArray("0") + QByteArray(99999, 'a'));
}

TEST_F(DataStore, AFolderOrAPipeInItsPlaceLosesTheDataAndNothingElse)
{
    Item item;
    File file;
    file.addData(&item);
    QDir().mkpath(m_path);
    file.readData();
    file.saveData();
    EXPECT_EQ(item.restored, 0);
    EXPECT_TRUE(QFileInfo(m_path).isDir());

    remove();
    QDir().mkpath(m_folder);
    ASSERT_EQ(mkfifo(m_path.toLocal8Bit().constData(), 0600), 0);
    file.readData(); // would wait for ever for the other end
    file.saveData();
    EXPECT_EQ(item.restored, 0);
}

TEST_F(DataStore, AnUnwritableLocationLosesTheData)
{
    // A file where the folder belongs: not even root can create the folder then.
    QDir().mkpath(QFileInfo(m_folder).path());
    QFile blocker(m_folder);
    ASSERT_TRUE(blocker.open(QIODevice::WriteOnly));
    Item item("x");
    File file;
    file.addData(&item);
    file.saveData();
    file.readData();
    EXPECT_EQ(item.restored, 0);
    EXPECT_TRUE(QFileInfo(m_folder).isFile());
    ASSERT_TRUE(blocker.remove());
}
} // namespace
