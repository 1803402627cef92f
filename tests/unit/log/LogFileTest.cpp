#include "log/LogFile.h"

#include "TemporaryHome.h"

#include <QDateTime>
#include <QRegularExpression>

#include <atomic>
#include <functional>
#include <thread>

namespace
{

constexpr std::int32_t ErrorTimeOut = -1073807339;

/// Counts what it hears; the first update comes with being added.
class Listener : public Observer
{
public:
    void update(Subject *) override
    {
        ++count;
        if (onUpdate)
            onUpdate();
    }

    int count = 0;
    std::function<void()> onUpdate;
};

class LogFileTest : public TemporaryHome
{
};

TEST_F(LogFileTest, CreatesTheFolderBelowTheDocumentsWithItsParents)
{
    const LogFile file(nullptr);
    EXPECT_EQ(file.getCurrentStandardDir(), home("Documents/KyVisaTester"));
    EXPECT_TRUE(QDir(home("Documents/KyVisaTester")).exists());
}

TEST_F(LogFileTest, TakesTheDocumentsFolderOfTheDesktop)
{
    QDir().mkpath(home(".config"));
    writeFile(home(".config/user-dirs.dirs"), "XDG_DOCUMENTS_DIR=\"$HOME/Papers\"\n");
    const LogFile file(nullptr);
    EXPECT_EQ(file.getCurrentStandardDir(), home("Papers/KyVisaTester"));
}

TEST_F(LogFileTest, NamesAFileAfterTheLocalDateAndTime)
{
    const QDateTime before = QDateTime::currentDateTime();
    const QString name = LogFile::getStandardLogName();
    const QRegularExpression pattern("^log(\\d{8}_\\d{6})\\.txt$");
    const QRegularExpressionMatch match = pattern.match(name);
    ASSERT_TRUE(match.hasMatch()) << name.toStdString();
    const QDateTime named = QDateTime::fromString(match.captured(1), "yyyyMMdd_hhmmss");
    EXPECT_GE(named, before.addSecs(-1));
    EXPECT_LE(named, QDateTime::currentDateTime());
}

TEST_F(LogFileTest, StartsWithAnEmptyFileInTheStandardFolder)
{
    const LogFile file(nullptr);
    const QStringList files = filesIn(standardFolder());
    ASSERT_EQ(files.size(), 1);
    EXPECT_TRUE(QRegularExpression("^log\\d{8}_\\d{6}\\.txt$").match(files[0]).hasMatch());
    EXPECT_EQ(file.getCurrentFileName(), standardFolder() + "/" + files[0]);
    EXPECT_EQ(contentOf(file.getCurrentFileName()), "");
}

TEST_F(LogFileTest, LeavesNoFileBehindWithoutALine)
{
    {
        LogFile file(nullptr);
        file.setCurrentStandardDir(standardFolder());
        EXPECT_TRUE(file.createNewFile(home("mine.txt")));
    }
    EXPECT_EQ(filesIn(standardFolder()), QStringList());
    EXPECT_EQ(filesIn(home()), QStringList({"Documents"}));
}

TEST_F(LogFileTest, KeepsAFileWithLines)
{
    {
        LogFile file(nullptr);
        file.writeData(line(1, "x"));
    }
    EXPECT_EQ(filesIn(standardFolder()).size(), 1);
}

TEST_F(LogFileTest, WritesNumberStatusTextAndDuration)
{
    LogFile file(nullptr);
    const QString path = file.getCurrentFileName();
    file.writeData(line(17, "viRead(vi= 3,cnt= 10)", ErrorTimeOut, 2000000000));
    EXPECT_EQ(contentOf(path), "17\tVI_ERROR_TMO\tviRead(vi= 3,cnt= 10)\t2000000000 nsec\n") << "flushed at once";
    file.writeData(line(18, "Test started"));
    file.writeData(line(18446744073709551615u, "", 0x3FFF0006, 18446744073709551615u));
    EXPECT_EQ(contentOf(path), "17\tVI_ERROR_TMO\tviRead(vi= 3,cnt= 10)\t2000000000 nsec\n"
                               "18\tVI_SUCCESS\tTest started\t0 nsec\n"
                               "18446744073709551615\tVI_SUCCESS_MAX_CNT\t\t18446744073709551615 nsec\n");
}

TEST_F(LogFileTest, WritesTheTextAsItIsStored)
{
    LogFile file(nullptr);
    file.writeData(line(1, "µ \xff\x80 a\tb"));
    EXPECT_EQ(contentOf(file.getCurrentFileName()), "1\tVI_SUCCESS\t\xc2\xb5 \xff\x80 a\tb\t0 nsec\n");
}

TEST_F(LogFileTest, StopsAtTheEndOfATextWithoutAZeroByte)
{
    LogFile file(nullptr);
    FastBuffer full = line(1, "");
    std::fill_n(full.text, sizeof full.text, 'x');
    file.writeData(full);
    EXPECT_EQ(contentOf(file.getCurrentFileName()), "1\tVI_SUCCESS\t" + std::string(450, 'x') + "\t0 nsec\n");
}

TEST_F(LogFileTest, AppendsToAFileThatExists)
{
    writeFile(home("old.txt"), "yesterday\n");
    LogFile file(nullptr);
    ASSERT_TRUE(file.createNewFile(home("old.txt")));
    file.writeData(line(1, "today"));
    EXPECT_EQ(contentOf(home("old.txt")), "yesterday\n1\tVI_SUCCESS\ttoday\t0 nsec\n");
}

TEST_F(LogFileTest, AppendsToAStandardFileOfTheSameSecond)
{
    // Four tries at most: the clock may tick in between.
    for (int attempt = 0; attempt < 4; ++attempt) {
        const QString folder = home(("folder" + std::to_string(attempt)).c_str());
        QDir().mkpath(folder);
        LogFile file(nullptr);
        file.setCurrentStandardDir(folder);
        file.writeData(line(1, "first"));
        const QString first = file.getCurrentFileName();
        file.setCurrentStandardDir(folder);
        if (file.getCurrentFileName() != first)
            continue;
        file.writeData(line(2, "second"));
        EXPECT_EQ(contentOf(first), "1\tVI_SUCCESS\tfirst\t0 nsec\n2\tVI_SUCCESS\tsecond\t0 nsec\n");
        return;
    }
    FAIL() << "no two files within one second";
}

TEST_F(LogFileTest, GivesTheSameStandardNameInTwoFoldersWithinASecond)
{
    QDir().mkpath(home("a"));
    QDir().mkpath(home("b"));
    LogFile file(nullptr);
    for (int attempt = 0; attempt < 4; ++attempt) {
        const QString name = LogFile::getStandardLogName();
        file.setCurrentStandardDir(home("a"));
        const QString first = file.getCurrentFileName();
        file.setCurrentStandardDir(home("b"));
        const QString second = file.getCurrentFileName();
        if (LogFile::getStandardLogName() != name)
            continue;
        EXPECT_EQ(first, home("a/") + name);
        EXPECT_EQ(second, home("b/") + name);
        return;
    }
    FAIL() << "never quick enough";
}

TEST_F(LogFileTest, SharesAFileWithASecondProgramWithoutOverwriting)
{
    LogFile one(nullptr);
    LogFile two(nullptr);
    ASSERT_TRUE(one.createNewFile(home("shared.txt")));
    ASSERT_TRUE(two.createNewFile(home("shared.txt")));
    one.writeData(line(1, "one"));
    two.writeData(line(2, "two"));
    one.writeData(line(3, "one again"));
    EXPECT_EQ(contentOf(home("shared.txt")), "1\tVI_SUCCESS\tone\t0 nsec\n"
                                             "2\tVI_SUCCESS\ttwo\t0 nsec\n"
                                             "3\tVI_SUCCESS\tone again\t0 nsec\n");
}

TEST_F(LogFileTest, StartsANewFileInANewFolder)
{
    QDir().mkpath(home("new"));
    LogFile file(nullptr);
    file.writeData(line(1, "old"));
    const QString old = file.getCurrentFileName();
    file.setCurrentStandardDir(home("new"));
    EXPECT_EQ(file.getCurrentStandardDir(), home("new"));
    file.writeData(line(2, "new"));
    EXPECT_EQ(contentOf(old), "1\tVI_SUCCESS\told\t0 nsec\n");
    ASSERT_EQ(filesIn(home("new")).size(), 1);
    EXPECT_EQ(contentOf(file.getCurrentFileName()), "2\tVI_SUCCESS\tnew\t0 nsec\n");
}

TEST_F(LogFileTest, DoesNotCreateTheFolderThatIsSetAndSkipsItsLines)
{
    LogFile file(nullptr);
    Listener listener;
    file.addObserver(&listener);
    file.setCurrentStandardDir(home("missing"));
    EXPECT_EQ(listener.count, 2);
    file.writeData(line(1, "nowhere"));
    EXPECT_EQ(file.getCurrentFileName(), QString());
    EXPECT_EQ(file.getCurrentStandardDir(), home("missing"));
    EXPECT_FALSE(QDir(home("missing")).exists());
    EXPECT_EQ(filesIn(standardFolder()), QStringList());

    ASSERT_TRUE(file.createNewFile(home("mine.txt")));
    file.writeData(line(2, "here"));
    EXPECT_EQ(contentOf(home("mine.txt")), "2\tVI_SUCCESS\there\t0 nsec\n");
}

TEST_F(LogFileTest, SwitchesToAFileOfTheUser)
{
    LogFile file(nullptr);
    Listener listener;
    file.addObserver(&listener);
    EXPECT_TRUE(file.createNewFile(home("mine.txt")));
    EXPECT_EQ(listener.count, 2);
    EXPECT_EQ(file.getCurrentFileName(), home("mine.txt"));
    EXPECT_EQ(file.getCurrentStandardDir(), standardFolder());
    EXPECT_EQ(filesIn(standardFolder()), QStringList()) << "the empty file before it is gone";
}

TEST_F(LogFileTest, GoesOnWithThePreviousFileWhenTheNewOneCannotBeOpened)
{
    LogFile file(nullptr);
    file.writeData(line(1, "before"));
    const QString previous = file.getCurrentFileName();
    Listener listener;
    file.addObserver(&listener);
    QDir().mkpath(home("folder"));
    for (const QString &path : {home("folder"), home("missing/x.txt"), QString(), QString(5000, 'x')}) {
        EXPECT_FALSE(file.createNewFile(path)) << path.toStdString();
        EXPECT_EQ(file.getCurrentFileName(), previous);
    }
    EXPECT_EQ(listener.count, 1);
    file.writeData(line(2, "after"));
    EXPECT_EQ(contentOf(previous), "1\tVI_SUCCESS\tbefore\t0 nsec\n2\tVI_SUCCESS\tafter\t0 nsec\n");
}

TEST_F(LogFileTest, BringsAnEmptyPreviousFileBackWhenTheNewOneCannotBeOpened)
{
    LogFile file(nullptr);
    const QString previous = file.getCurrentFileName();
    EXPECT_FALSE(file.createNewFile(home("missing/x.txt")));
    EXPECT_EQ(file.getCurrentFileName(), previous);
    file.writeData(line(1, "x"));
    EXPECT_EQ(contentOf(previous), "1\tVI_SUCCESS\tx\t0 nsec\n");
}

TEST_F(LogFileTest, TellsObserversWithoutHoldingTheFile)
{
    QDir().mkpath(home("new"));
    LogFile file(nullptr);
    Listener listener;
    int lines = 0;
    listener.onUpdate = [&] {
        // A writer that had to wait for the file here would never return.
        std::thread([&] { file.writeData(line(1, "x")); }).join();
        EXPECT_EQ(contentOf(file.getCurrentFileName()), "1\tVI_SUCCESS\tx\t0 nsec\n");
        ++lines;
    };
    file.addObserver(&listener);
    file.setCurrentStandardDir(home("new"));
    EXPECT_TRUE(file.createNewFile(home("mine.txt")));
    QDir().mkpath(home("newer"));
    file.setData(home("newer").toLocal8Bit());
    EXPECT_EQ(lines, 4);
    file.removeObserver(&listener);
}

TEST_F(LogFileTest, LosesNoLineWhileFilesAreSwitched)
{
    constexpr int Lines = 20000;
    std::atomic<int> written{0};
    {
        LogFile file(nullptr);
        std::thread writer([&] {
            for (int i = 1; i <= Lines; ++i) {
                file.writeData(line(static_cast<std::uint64_t>(i), "x"));
                written = i;
            }
        });
        for (int i = 0; written < Lines; ++i)
            EXPECT_TRUE(file.createNewFile(home(i % 2 ? "odd.txt" : "even.txt")));
        writer.join();
    }
    std::vector<int> seen(Lines + 1);
    QStringList paths = {home("odd.txt"), home("even.txt")};
    for (const QString &name : filesIn(standardFolder()))
        paths << standardFolder() + "/" + name;
    for (const QString &path : paths) {
        QFile content(path);
        if (!content.open(QIODevice::ReadOnly))
            continue;
        while (!content.atEnd()) {
            const QByteArray text = content.readLine();
            ASSERT_TRUE(text.endsWith("\tVI_SUCCESS\tx\t0 nsec\n")) << text.toStdString();
            ++seen.at(static_cast<std::size_t>(text.left(text.indexOf('\t')).toInt()));
        }
    }
    EXPECT_EQ(seen[0], 0);
    for (std::size_t i = 1; i <= Lines; ++i)
        ASSERT_EQ(seen[i], 1) << "line " << i;
}

TEST_F(LogFileTest, IsTheThirdItemOfTheDataStore)
{
    class Item : public Data
    {
    public:
        Item() : Data(3) {}
        QByteArray getData() override { return {}; }
        void setData(const QByteArray &) override {}
    } third;
    const LogFile file(nullptr);
    EXPECT_TRUE(file == third);
}

TEST_F(LogFileTest, StoresTheFolderInTheLocalEncoding)
{
    LogFile file(nullptr);
    QDir().mkpath(home("J\xc3\xbcrgen"));
    file.setCurrentStandardDir(home("J\xc3\xbcrgen"));
    EXPECT_EQ(file.getData().toStdString(), home().toStdString() + "/J\xc3\xbcrgen");
}

TEST_F(LogFileTest, RestoresAFolderAndCreatesItWithItsParents)
{
    LogFile file(nullptr);
    Listener listener;
    file.addObserver(&listener);
    file.setData(home("deep/er/logs").toLatin1());
    EXPECT_EQ(listener.count, 2);
    EXPECT_EQ(file.getCurrentStandardDir(), home("deep/er/logs"));
    ASSERT_EQ(filesIn(home("deep/er/logs")).size(), 1);
    EXPECT_EQ(file.getCurrentFileName(), home("deep/er/logs/") + filesIn(home("deep/er/logs"))[0]);
    EXPECT_EQ(filesIn(standardFolder()), QStringList());
}

TEST_F(LogFileTest, RestoresUpToTheFirstZeroByte)
{
    LogFile file(nullptr);
    file.setData(home("logs").toLatin1() + QByteArray("\0garbage", 8));
    EXPECT_EQ(file.getCurrentStandardDir(), home("logs"));
}

TEST_F(LogFileTest, RestoresInLatin1)
{
    LogFile file(nullptr);
    file.setData(home().toLatin1() + "/J\xfcrgen");
    EXPECT_EQ(file.getCurrentStandardDir(), home("J\xc3\xbcrgen"));
}

TEST_F(LogFileTest, RestoresTheFolderItStoredWhenOnlyTheLocalEncodingFindsIt)
{
    QDir().mkpath(home("J\xc3\xbcrgen"));
    LogFile file(nullptr);
    file.setData(QByteArray(home("J\xc3\xbcrgen").toUtf8()));
    EXPECT_EQ(file.getCurrentStandardDir(), home("J\xc3\xbcrgen"));
    EXPECT_EQ(filesIn(home()), QStringList({"Documents", QString::fromUtf8("J\xc3\xbcrgen")}));
}

TEST_F(LogFileTest, PrefersTheLatin1ReadingOfTheFolder)
{
    // The bytes of "ü" in UTF-8 are "Ã¼" in Latin-1.
    QDir().mkpath(home("J\xc3\xbcrgen"));
    QDir().mkpath(home("J\xc3\x83\xc2\xbcrgen"));
    LogFile file(nullptr);
    file.setData(QByteArray(home("J\xc3\xbcrgen").toUtf8()));
    EXPECT_EQ(file.getCurrentStandardDir(), home("J\xc3\x83\xc2\xbcrgen"));
}

TEST_F(LogFileTest, CreatesTheLatin1ReadingOfAFolderThatIsNowhere)
{
    LogFile file(nullptr);
    file.setData(QByteArray(home("J\xc3\xbcrgen").toUtf8()));
    EXPECT_EQ(file.getCurrentStandardDir(), home("J\xc3\x83\xc2\xbcrgen"));
    EXPECT_TRUE(QDir(home("J\xc3\x83\xc2\xbcrgen")).exists());
}

TEST_F(LogFileTest, KeepsTheFolderWhenNothingWasStored)
{
    LogFile file(nullptr);
    const QString path = file.getCurrentFileName();
    for (const QByteArray &data : {QByteArray(), QByteArray("\0abc", 4)}) {
        file.setData(data);
        EXPECT_EQ(file.getCurrentStandardDir(), standardFolder());
        EXPECT_EQ(file.getCurrentFileName(), path);
    }
}

} // namespace
